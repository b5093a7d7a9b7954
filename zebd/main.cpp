#include <filesystem>
#include <iostream>
#include <string>
#include <system_error>
#include <vector>

#include "zebd/Daemon.h"
#include "zebd/Host.h"

int main(int argc, char** argv) {
  int exitCode = 0;
  const std::vector<std::string> arguments(argv + (argc > 0 ? 1 : 0), argv + argc);
  if (const auto options = zebd::parseDaemonOptions(arguments, std::cout, std::cerr, exitCode)) {
    std::error_code unknown;
    const auto program = std::filesystem::read_symlink("/proc/self/exe", unknown);
    exitCode = zebd::runDaemon(*options, zebd::Installation::ofProgramAtPath(program.string()));
  }
  std::cout.flush();
  zebd::Host::endProcess(exitCode);
}
