// Brings the catalogue in line with the help folders that there are.
#pragma once

#include "zeb/CommandLine.h"
#include "zeb/Console.h"
#include "zebd/Catalogue.h"
#include "zebd/Installation.h"

namespace zeb {

using zebd::Catalogue;
using zebd::Installation;

/// Indexes the command's folders, the books of the catalogue, and the computer's installed books,
/// each once and only where something changed; of two folders with one identifier the one named
/// first in this list wins. Books whose folder is gone are forgotten. What was done goes to the
/// console; folders of the command that cannot be books make it a failure, others are passed over.
/// Runs the main loop; to be called on the main thread.
ExitCode scan(const ScanCommand& command, const Catalogue& catalogue,
              const Installation& installation, const Waiting& waiting, Console& console,
              int verbosity);

}  // namespace zeb
