#include <unistd.h>

#include <cstdlib>
#include <filesystem>
#include <iostream>
#include <string>
#include <system_error>
#include <vector>

#include "platform/DistributedNotificationCenter.h"
#include "platform/Environment.h"
#include "zeb/Commands.h"
#include "zebd/Host.h"

namespace {

/// Changes of indexes are told to all programs of the user's session, where there is a session.
platform::Environment environmentOfProgram() {
  platform::Environment environment = *platform::Environment::current();
  if (auto center = platform::busNotificationCenter()) {
    environment.notificationCenter = std::move(center);
  }
  return environment;
}

}  // namespace

int main(int argc, char** argv) {
  zeb::Console console(std::cout, std::cerr);
  console.setInIsTerminal(isatty(STDIN_FILENO) == 1);
  console.setOutIsTerminal(isatty(STDOUT_FILENO) == 1);
  console.setErrIsTerminal(isatty(STDERR_FILENO) == 1);
  // No thread has been started yet.
  const char* noColor = std::getenv("NO_COLOR");  // NOLINT(concurrency-mt-unsafe)
  console.setColorsUnwanted(noColor != nullptr && *noColor != '\0');

  const platform::EnvironmentOverride override(environmentOfProgram());
  std::error_code unknown;
  const auto program = std::filesystem::read_symlink("/proc/self/exe", unknown);
  const std::vector<std::string> arguments(argv + (argc > 0 ? 1 : 0), argv + argc);
  const zeb::ExitCode code =
      zeb::run(arguments, zebd::Installation::ofProgramAtPath(program.string()), console);
  zebd::Host::endProcess(static_cast<int>(code));
}
