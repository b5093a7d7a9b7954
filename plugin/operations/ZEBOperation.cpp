#include "plugin/operations/ZEBOperation.h"

#include <utility>

using platform::isCancelledKey;
using platform::isExecutingKey;
using platform::isFinishedKey;

void ZEBOperation::lockExec(const std::function<void()>& block) const {
  const platform::MutexLock lock(_lock);
  block();
}

void ZEBOperation::finishWithError(std::optional<platform::Error> error) {
  // A queue lets go of the operation in the midst of the announcements.
  const auto self = weak_from_this().lock();
  willChangeValueForKey(isFinishedKey);
  willChangeValueForKey(isExecutingKey);
  lockExec([&] {
    _error = std::move(error);
    _executing = false;
    _finished = true;
  });
  didChangeValueForKey(isExecutingKey);
  didChangeValueForKey(isFinishedKey);
}

void ZEBOperation::cancel() {
  const auto self = weak_from_this().lock();
  willChangeValueForKey(isFinishedKey);
  willChangeValueForKey(isExecutingKey);
  willChangeValueForKey(isCancelledKey);
  lockExec([&] {
    _executing = false;
    _finished = true;
    _cancelled = true;
  });
  didChangeValueForKey(isCancelledKey);
  didChangeValueForKey(isExecutingKey);
  didChangeValueForKey(isFinishedKey);
}

void ZEBOperation::start() {
  if (isCancelled()) {
    finishWithError(std::nullopt);
    return;
  }
  willChangeValueForKey(isExecutingKey);
  lockExec([&] { _executing = true; });
  didChangeValueForKey(isExecutingKey);
  main();
}

bool ZEBOperation::isExecuting() const {
  bool flag = false;
  lockExec([&] { flag = _executing; });
  return flag;
}

bool ZEBOperation::isFinished() const {
  bool flag = false;
  lockExec([&] { flag = _finished; });
  return flag;
}

bool ZEBOperation::isCancelled() const {
  bool flag = false;
  lockExec([&] { flag = _cancelled; });
  return flag;
}

std::optional<platform::Error> ZEBOperation::error() const {
  std::optional<platform::Error> error;
  lockExec([&] { error = _error; });
  return error;
}

void ZEBOperation::setError(std::optional<platform::Error> error) {
  lockExec([&] { _error = std::move(error); });
}
