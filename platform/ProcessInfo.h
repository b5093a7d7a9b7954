// The process itself.
#pragma once

#include <memory>

#include "platform/Condition.h"
#include "platform/ThreadSafety.h"

namespace platform {

/// Counts who does not want the process to be ended without notice: sudden termination is disabled
/// while the count is above zero. A program waits for that, a bounded time, before it ends itself;
/// what is to survive anything more must be written in one step all the same.
/// Thread-safety: internally synchronised.
class ProcessInfo {
 public:
  /// One a process, which it outlives.
  static const std::shared_ptr<ProcessInfo>& processInfo();

  void disableSuddenTermination();
  /// The matching end. One too many is left alone.
  void enableSuddenTermination();

  long suddenTerminationCount() const;
  /// Blocks until sudden termination is enabled or `limit` has passed; returns whether it is.
  bool waitUntilSuddenTerminationIsEnabled(Seconds limit) const;

 private:
  mutable Mutex _mutex;
  mutable Condition _enabled;
  long _suddenTerminationCount GUARDED_BY(_mutex) = 0;
};

}  // namespace platform
