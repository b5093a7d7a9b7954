#include "zeb/IndexingTools.h"

#include <algorithm>
#include <optional>
#include <string>
#include <vector>

#include "host/Zebrine/ZEBGeneratedFiles.h"
#include "platform/Environment.h"
#include "platform/Processes.h"

namespace zeb {

size_t runningIndexingToolCount() {
  const auto table = platform::Environment::current()->processTable;
  const std::optional<std::string> root = ZEBGeneratedRoot();
  std::vector<platform::ProcessEntry> processes;
  if (!root || table->readProcesses(processes) != 0) {
    return 0;
  }
  // An argument of its own begins behind a NUL.
  const std::string start = '\0' + *root + '/';
  return static_cast<size_t>(
      std::count_if(processes.begin(), processes.end(), [&](const auto& process) {
        const auto arguments = process.commandName == "bvmake"
                                   ? table->argumentsOfProcess(process.processID)
                                   : std::nullopt;
        return arguments && arguments->view().find(start) != std::string_view::npos;
      }));
}

}  // namespace zeb
