#include "platform/SuddenTermination.h"

#include "platform/Assertion.h"
#include "platform/Condition.h"
#include "platform/Environment.h"
#include "platform/ThreadSafety.h"

namespace platform {

namespace {

struct Count {
  Mutex mutex;
  Condition changed;
  int disabled GUARDED_BY(mutex) = 0;
};

Count& count() {
  // Never destroyed: threads may count while the process ends.
  static auto& count = *new Count;
  return count;
}

}  // namespace

void disableSuddenTermination() {
  const MutexLock lock(count().mutex);
  ++count().disabled;
}

void enableSuddenTermination() {
  const MutexLock lock(count().mutex);
  assertCondition(count().disabled > 0, "suddenTerminationDisableCount > 0");
  if (--count().disabled == 0) {
    count().changed.notifyAll();
  }
}

int suddenTerminationDisableCount() {
  const MutexLock lock(count().mutex);
  return count().disabled;
}

bool waitUntilSuddenTerminationIsEnabled(Seconds timeout) {
  const Clock::Instant deadline = Environment::current()->clock->elapsed() + timeout;
  const MutexLock lock(count().mutex);
  while (count().disabled > 0) {
    if (!count().changed.waitUntil(count().mutex, deadline)) {
      return count().disabled == 0;
    }
  }
  return true;
}

}  // namespace platform
