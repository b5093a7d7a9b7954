// Brings the catalogue in line with the help folders that there are.
#pragma once

#include "zeb/Catalogue.h"
#include "zeb/CommandLine.h"
#include "zeb/Console.h"

namespace zeb {

/// Indexes the command's folders, the books of the catalogue whose index is in its folder, and the
/// computer's installed books, each once and only where something changed; of two folders with one
/// identifier the one named first in this list wins. Books whose folder is gone are forgotten.
/// Several are indexed at once. What was done goes to the console; folders of the command that
/// cannot be books make it a failure, others only a warning.
ExitCode scan(const ScanCommand& command, const Catalogue& catalogue, Console& console,
              int verbosity);

}  // namespace zeb
