// How the help daemon is.
#pragma once

#include <string>

namespace zeb {

struct DaemonState {
  enum class Kind {
    /// It was not asked.
    unasked,
    noBus,
    /// The bus does not know it, and cannot start it.
    notInstalled,
    /// It should be there, but did not answer; `reason` says why.
    silent,
    running,
  };
  Kind kind = Kind::unasked;
  /// Empty where it does not say.
  std::string version;
  /// Whether it looks for books, or indexes some.
  bool isBusy = false;
  std::string reason;
};

/// Asks the daemon on the session bus, or on that at `address` where it is not empty; the bus
/// starts it where it can. Waits for the answer.
DaemonState stateOfDaemon(const std::string& address = {});

}  // namespace zeb
