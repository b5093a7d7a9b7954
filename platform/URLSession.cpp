#include "platform/URLSession.h"

#include <utility>
#include <vector>

#include "platform/HTTPTransferExchange.h"
#include "platform/URLSessionImplementation.h"
#include "platform/URLSessionTaskCore.h"
#include "platform/WorkerThreads.h"

namespace platform {

URLSession::Implementation::Implementation(URLSessionConfiguration settings,
                                           std::shared_ptr<URLSessionDelegate> listener,
                                           std::shared_ptr<DispatchQueue> queue)
    : configuration(std::move(settings)),
      delegateQueue(queue != nullptr ? std::move(queue)
                                     : DispatchQueue::serial("url-session-delegate")),
      cookies(configuration.HTTPShouldSetCookies() ? std::make_shared<CookieJar>() : nullptr),
      delegate(std::move(listener)) {}

bool URLSession::Implementation::admit(const std::shared_ptr<URLSessionDataTask>& task) {
  const MutexLock lock(mutex);
  if (finishing) {
    return false;
  }
  running[task.get()] = task;
  return true;
}

void URLSession::Implementation::taskDidComplete(const std::shared_ptr<URLSession>& session,
                                                 const URLSessionDataTask& task) {
  std::shared_ptr<URLSessionDataTask> kept;
  {
    const MutexLock lock(mutex);
    if (const auto found = running.find(&task); found != running.end()) {
      kept = std::move(found->second);
      running.erase(found);
    }
  }
  becomeInvalidIfDone(session);
}

void URLSession::Implementation::becomeInvalidIfDone(const std::shared_ptr<URLSession>& session) {
  {
    const MutexLock lock(mutex);
    if (!finishing || invalid || !running.empty()) {
      return;
    }
    invalid = true;
  }
  delegateQueue->async([session] {
    std::shared_ptr<URLSessionDelegate> last;
    {
      const MutexLock lock(session->_implementation->mutex);
      last = std::exchange(session->_implementation->delegate, nullptr);
    }
    if (last != nullptr) {
      last->URLSessionDidBecomeInvalidWithError(session, std::nullopt);
    }
  });
}

URLSession::URLSession(std::unique_ptr<Implementation> implementation)
    : _implementation(std::move(implementation)) {}

URLSession::~URLSession() = default;

std::shared_ptr<URLSession> URLSession::sharedSession() {
  // Never destroyed: transfers may go on while the process ends.
  static const auto& shared = *new auto([] {
    auto session = sessionWithConfiguration(URLSessionConfiguration::defaultSessionConfiguration());
    session->_implementation->isShared = true;
    return session;
  }());
  return shared;
}

std::shared_ptr<URLSession> URLSession::sessionWithConfiguration(
    URLSessionConfiguration configuration, std::shared_ptr<URLSessionDelegate> delegate,
    std::shared_ptr<DispatchQueue> delegateQueue) {
  return std::shared_ptr<URLSession>(new URLSession(std::make_unique<Implementation>(
      std::move(configuration), std::move(delegate), std::move(delegateQueue))));
}

std::shared_ptr<URLSessionDataTask> URLSession::dataTaskWithRequest(URLRequest request) {
  return dataTaskWithRequest(std::move(request), nullptr);
}

std::shared_ptr<URLSessionDataTask> URLSession::dataTaskWithRequest(
    URLRequest request, CompletionHandler completionHandler) {
  uint64_t identifier = 0;
  {
    const MutexLock lock(_implementation->mutex);
    if (_implementation->finishing) {
      return nullptr;
    }
    identifier = ++_implementation->lastIdentifier;
  }
  return std::shared_ptr<URLSessionDataTask>(
      new URLSessionDataTask(std::make_shared<URLSessionTaskCore>(
          shared_from_this(), identifier, std::move(request), std::move(completionHandler))));
}

void URLSession::finishTasksAndInvalidate() {
  if (_implementation->isShared) {
    return;
  }
  {
    const MutexLock lock(_implementation->mutex);
    _implementation->finishing = true;
  }
  _implementation->becomeInvalidIfDone(shared_from_this());
}

void URLSession::invalidateAndCancel() {
  if (_implementation->isShared) {
    return;
  }
  std::vector<std::shared_ptr<URLSessionDataTask>> running;
  {
    const MutexLock lock(_implementation->mutex);
    _implementation->finishing = true;
    for (const auto& entry : _implementation->running) {
      running.push_back(entry.second);
    }
  }
  for (const auto& task : running) {
    task->cancel();
  }
  _implementation->becomeInvalidIfDone(shared_from_this());
}

const URLSessionConfiguration& URLSession::configuration() const {
  return _implementation->configuration;
}

std::shared_ptr<URLSessionDelegate> URLSession::delegate() const {
  const MutexLock lock(_implementation->mutex);
  return _implementation->delegate;
}

const std::shared_ptr<DispatchQueue>& URLSession::delegateQueue() const {
  return _implementation->delegateQueue;
}

}  // namespace platform
