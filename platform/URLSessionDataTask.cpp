#include "platform/URLSessionDataTask.h"

#include <utility>

#include "platform/URLSessionTaskCore.h"

namespace platform {

URLSessionDataTask::URLSessionDataTask(std::shared_ptr<URLSessionTaskCore> core)
    : _core(std::move(core)) {}

URLSessionDataTask::~URLSessionDataTask() = default;

void URLSessionDataTask::resume() { _core->start(shared_from_this()); }

void URLSessionDataTask::cancel() { _core->cancel(shared_from_this()); }

URLSessionDataTask::State URLSessionDataTask::state() const {
  const MutexLock lock(_core->mutex);
  return _core->state;
}

uint64_t URLSessionDataTask::taskIdentifier() const { return _core->identifier; }

const URLRequest& URLSessionDataTask::originalRequest() const { return _core->original; }

URLRequest URLSessionDataTask::currentRequest() const {
  const MutexLock lock(_core->mutex);
  return _core->current;
}

std::shared_ptr<const URLResponse> URLSessionDataTask::response() const {
  const MutexLock lock(_core->mutex);
  return _core->response;
}

std::optional<Error> URLSessionDataTask::error() const {
  const MutexLock lock(_core->mutex);
  return _core->error;
}

uint64_t URLSessionDataTask::countOfBytesReceived() const {
  const MutexLock lock(_core->mutex);
  return _core->received;
}

std::string URLSessionDataTask::description() const {
  return "task " + std::to_string(taskIdentifier()) + " <" + originalRequest().description() + ">";
}

}  // namespace platform
