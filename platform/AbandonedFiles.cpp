#include "platform/AbandonedFiles.h"

#include <charconv>
#include <optional>
#include <set>
#include <string_view>
#include <utility>
#include <vector>

#include "platform/Environment.h"
#include "platform/Files.h"
#include "platform/Processes.h"

namespace platform {

namespace {

/// Takes the text from the last dot on from the end of `name`.
std::optional<std::string_view> takeLastPart(std::string_view& name) {
  const size_t dot = name.rfind('.');
  if (dot == std::string_view::npos) {
    return std::nullopt;
  }
  const std::string_view part = name.substr(dot + 1);
  name.remove_suffix(part.size() + 1);
  return part;
}

/// The number of the process that was writing the temporary file ".name.process.counter.tmp".
/// Absent for other files, and for those of other names than the one that is asked for.
std::optional<int> processOfTemporaryFile(std::string_view file, const std::string& name) {
  if (takeLastPart(file) != "tmp" || !takeLastPart(file)) {
    return std::nullopt;
  }
  const auto process = takeLastPart(file);
  if (!process || !file.starts_with('.') || (!name.empty() && file.substr(1) != name)) {
    return std::nullopt;
  }
  int number = 0;
  const auto [end, error] =
      std::from_chars(process->data(), process->data() + process->size(), number);
  return error == std::errc() && end == process->data() + process->size() ? std::optional(number)
                                                                          : std::nullopt;
}

}  // namespace

void removeAbandonedFiles(const std::string& folder, const std::string& name) {
  const auto environment = Environment::current();
  std::vector<std::pair<std::string, int>> found;
  for (const std::string& file :
       environment->files->namesInDirectory(folder).value_or(std::vector<std::string>())) {
    if (const std::optional<int> process = processOfTemporaryFile(file, name)) {
      found.emplace_back(file, *process);
    }
  }
  std::vector<ProcessEntry> entries;
  if (found.empty() || environment->processTable == nullptr ||
      environment->processTable->readProcesses(entries) != 0) {
    return;
  }
  std::set<int> running;
  for (const ProcessEntry& entry : entries) {
    running.insert(entry.processID);
  }
  for (const auto& file : found) {
    if (!running.contains(file.second)) {
      environment->files->removeItem(stringByAppendingPathComponent(folder, file.first));
    }
  }
}

}  // namespace platform
