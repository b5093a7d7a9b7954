// Commands that change what books there are, carried out by the daemon.
#pragma once

#include <memory>

#include "zeb/CommandLine.h"
#include "zeb/Console.h"
#include "zebd/Catalogue.h"

namespace zeb {

class DaemonClient;

// What is printed, and the exit codes, are those of the same commands without a daemon (zeb/Scan.h,
// zeb/Indexing.h, zeb/RemoteBooks.h). The daemon goes on with what has not been waited for.
// Thread-safety: confined to the main thread, whose loop they run.

ExitCode scanWithDaemon(const ScanCommand& command, std::unique_ptr<DaemonClient> daemon,
                        const Waiting& waiting, Console& console);

ExitCode indexWithDaemon(const IndexCommand& command, std::unique_ptr<DaemonClient> daemon,
                         const Waiting& waiting, Console& console);

ExitCode addBooksWithDaemon(const AddCommand& command, std::unique_ptr<DaemonClient> daemon,
                            const Waiting& waiting, Console& console);

/// Takes the names out of `command` that the daemon has forgotten: books on servers. Others are
/// for this process.
ExitCode removeRemoteBooksWithDaemon(RemoveCommand& command, const zebd::Catalogue& catalogue,
                                     DaemonClient& daemon, const Waiting& waiting,
                                     Console& console);

}  // namespace zeb
