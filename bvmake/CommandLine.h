// The words after the program's name.
#pragma once

#include <optional>
#include <string>
#include <vector>

#include "bvmake/Inspect.h"
#include "bvmake/Run.h"

namespace bvmake {

/// What the user asked for.
struct CommandLine {
  enum class Action { create, inspect, check };

  Action action = Action::create;
  /// For Action::create.
  CreateOptions create;
  /// For Action::inspect.
  InspectOptions inspect;
  /// For Action::check: the help-index file.
  std::string checkedPath;
  /// How often --verbose was given.
  int verbosity = 0;
};

/// A command line read: what to do, or what to print instead (help, version, what is wrong).
struct ParsedCommandLine {
  std::optional<CommandLine> command;
  ExitCode exitCode = ExitCode::success;
  /// For standard output.
  std::string output;
  /// For standard error.
  std::string errorOutput;
};

/// Reads the arguments, without the program's name, in whatever order they stand.
ParsedCommandLine parseCommandLine(const std::vector<std::string>& arguments);

/// The whole program: parses, does what was asked for, prints to `output` and `errors`, and returns
/// the exit status.
int runProgram(const std::vector<std::string>& arguments, std::FILE* output, std::FILE* errors);

}  // namespace bvmake
