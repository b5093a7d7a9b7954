#include "platform/ProcessInfo.h"

#include "platform/Environment.h"

namespace platform {

const std::shared_ptr<ProcessInfo>& ProcessInfo::processInfo() {
  // Never destroyed: threads may go on while the process ends.
  static const auto& shared = *new std::shared_ptr<ProcessInfo>(std::make_shared<ProcessInfo>());
  return shared;
}

void ProcessInfo::disableSuddenTermination() {
  const MutexLock lock(_mutex);
  ++_suddenTerminationCount;
}

void ProcessInfo::enableSuddenTermination() {
  const MutexLock lock(_mutex);
  if (_suddenTerminationCount > 0 && --_suddenTerminationCount == 0) {
    _enabled.notifyAll();
  }
}

long ProcessInfo::suddenTerminationCount() const {
  const MutexLock lock(_mutex);
  return _suddenTerminationCount;
}

bool ProcessInfo::waitUntilSuddenTerminationIsEnabled(Seconds limit) const {
  const Clock::Instant deadline = Environment::current()->clock->elapsed() + limit;
  const MutexLock lock(_mutex);
  while (_suddenTerminationCount > 0) {
    if (!_enabled.waitUntil(_mutex, deadline) && _suddenTerminationCount > 0) {
      return false;
    }
  }
  return true;
}

}  // namespace platform
