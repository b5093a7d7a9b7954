// The help daemon.
#pragma once

#include <iosfwd>
#include <optional>
#include <string>
#include <vector>

#include "zebd/Installation.h"

namespace zebd {

struct DaemonOptions {
  /// Seconds without anything to do after which the daemon leaves.
  double idleDelay = 60;
  /// The caches folder, for indexes and the catalogue; absent for the user's.
  std::optional<std::string> cacheFolder;
  int verbosity = 0;
};

/// The options in `arguments` (the program's name not among them). Absent when there is nothing
/// left to do: help or version were asked for and have been printed on `out`, or the line is wrong
/// and that has been said on `err`; `exitCode` is then set.
std::optional<DaemonOptions> parseDaemonOptions(const std::vector<std::string>& arguments,
                                                std::ostream& out, std::ostream& err,
                                                int& exitCode);

/// Serves on the session bus until there has been nothing to do for the idle delay, the process is
/// told to end (SIGTERM, SIGINT), or the bus is gone. Returns the exit code: 0, or 1 when it could
/// not begin. Runs the main loop; to be called on the main thread, once, before other threads have
/// been started.
int runDaemon(const DaemonOptions& options, const Installation& installation);

}  // namespace zebd
