// The program behind main().
#pragma once

#include <string>
#include <vector>

#include "zeb/CommandLine.h"
#include "zeb/Console.h"
#include "zebd/Installation.h"

namespace zeb {

using zebd::Installation;

/// Runs one command line (the program's name not among the arguments). Results go to the console's
/// output, all that is wrong to its messages. Nothing is thrown. Runs the main loop; to be called
/// on the main thread. Background work of the plug-in may still be going on when it returns.
ExitCode run(const std::vector<std::string>& arguments, const Installation& installation,
             Console& console);

}  // namespace zeb
