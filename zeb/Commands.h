// The program behind main().
#pragma once

#include <string>
#include <vector>

#include "zeb/CommandLine.h"
#include "zeb/Console.h"

namespace zeb {

/// Runs one command line (the program's name not among the arguments). Results go to the console's
/// output, all that is wrong to its messages. Nothing is thrown.
ExitCode run(const std::vector<std::string>& arguments, Console& console);

}  // namespace zeb
