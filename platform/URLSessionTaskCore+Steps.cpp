#include <algorithm>
#include <utility>

#include "platform/URLError.h"
#include "platform/URLSessionImplementation.h"
#include "platform/URLSessionTaskCore.h"
#include "platform/WorkerThreads.h"

namespace platform {

URLSessionTaskCore::Reply::~Reply() {
  // Nobody can answer any more.
  give([task = _task] { task->complete(URLError(URLErrorCancelled)); });
}

void URLSessionTaskCore::Reply::give(Step step) {
  if (!_given.exchange(true)) {
    _task->takeReply(_number, std::move(step));
  }
}

std::shared_ptr<URLSessionTaskCore::Reply> URLSessionTaskCore::awaitReply() {
  const MutexLock lock(mutex);
  // A cancelled task goes to its end, whatever is answered.
  waiting = state == URLSessionDataTask::State::running;
  return std::make_shared<Reply>(shared_from_this(), ++replyNumber);
}

void URLSessionTaskCore::takeReply(uint64_t number, Step step) {
  const MutexLock lock(mutex);
  if (!waiting || number != replyNumber) {
    return;
  }
  waiting = false;
  steps.push_front(std::move(step));
  schedulePump();
}

void URLSessionTaskCore::schedulePump() {
  if (!pumping && !waiting && !steps.empty()) {
    pumping = true;
    delegateQueue->async([task = shared_from_this()] { task->pump(); });
  }
}

void URLSessionTaskCore::pump() {
  while (true) {
    Step step;
    {
      const MutexLock lock(mutex);
      if (waiting || steps.empty()) {
        pumping = false;
        return;
      }
      step = std::move(steps.front());
      steps.pop_front();
    }
    runLoggingExceptions(step);
  }
}

void URLSessionTaskCore::takeRedirect(const URLRequest& newRequest,
                                      const std::shared_ptr<const URLResponse>& redirectResponse) {
  if (++redirects > URLSession::maximumRedirects) {
    complete(URLError(URLErrorHTTPTooManyRedirects));
    return;
  }
  const std::shared_ptr<URLSessionDelegate> delegate = delegateOfTask();
  if (delegate == nullptr) {
    follow(newRequest);
    return;
  }
  delegate->URLSessionTaskWillPerformHTTPRedirection(
      sessionOfTask(), selfOfTask(), redirectResponse, newRequest,
      [task = shared_from_this(), reply = awaitReply()](std::optional<URLRequest> request) {
        reply->give([task, request = std::move(request)] {
          if (request) {
            task->follow(*request);
          }
        });
      });
}

void URLSessionTaskCore::follow(const URLRequest& request) {
  std::shared_ptr<URLProtocol> left;
  {
    const MutexLock lock(mutex);
    if (state != URLSessionDataTask::State::running) {
      return;
    }
    left = std::exchange(protocol, nullptr);
    // What the protocol has told of the redirect's own body.
    steps.clear();
    backlog = 0;
    received = 0;
    current = request;
  }
  stopProtocol(std::move(left));
  loads->async([task = shared_from_this(), request] { task->load(request); });
}

void URLSessionTaskCore::takeResponse(const std::shared_ptr<const URLResponse>& answer,
                                      URLCacheStoragePolicy policy) {
  hasResponse = true;
  {
    const MutexLock lock(mutex);
    response = answer;
  }
  const std::shared_ptr<URLSessionDelegate> delegate = delegateOfTask();
  if (delegate == nullptr) {
    considerCaching(answer, policy);
    return;
  }
  using Disposition = URLSessionResponseDisposition;
  delegate->URLSessionDataTaskDidReceiveResponse(
      sessionOfTask(), selfOfTask(), answer,
      [task = shared_from_this(), reply = awaitReply(), answer, policy](Disposition disposition) {
        reply->give([task, answer, policy, disposition] {
          if (disposition == Disposition::allow) {
            task->considerCaching(answer, policy);
          } else {
            task->complete(URLError(URLErrorCancelled));
          }
        });
      });
}

void URLSessionTaskCore::considerCaching(const std::shared_ptr<const URLResponse>& answer,
                                         URLCacheStoragePolicy policy) {
  cache = configuration.URLCache();
  if (policy == URLCacheStoragePolicy::notAllowed || cache == nullptr) {
    return;
  }
  const auto proposed = CachedURLResponse::initWithResponse(answer, Data(), policy);
  const std::shared_ptr<URLSessionDelegate> delegate = delegateOfTask();
  if (delegate == nullptr) {
    toBeCached = proposed;
    return;
  }
  delegate->URLSessionDataTaskWillCacheResponse(
      sessionOfTask(), selfOfTask(), proposed,
      [task = shared_from_this(),
       reply = awaitReply()](std::shared_ptr<const CachedURLResponse> chosen) {
        reply->give([task, chosen = std::move(chosen)] {
          const bool stores =
              chosen != nullptr && chosen->storagePolicy() != URLCacheStoragePolicy::notAllowed;
          task->toBeCached = stores ? chosen : nullptr;
        });
      });
}

void URLSessionTaskCore::takeData(const Data& data) {
  if (!hasResponse) {
    complete(URLError(URLErrorUnknown, "a body without a head"));
    return;
  }
  uint64_t limit = 0;
  {
    const MutexLock lock(mutex);
    backlog -= std::min<uint64_t>(backlog, data.length());
    limit = transferSettings.maximumBodyLength;
  }
  delivered += data.length();
  if (delivered > limit) {
    complete(URLError(URLErrorDataLengthExceedsMaximum));
    return;
  }
  collectForCache(data);
  if (hasCompletionHandler) {
    body.append(data.view());
  } else if (const auto delegate = delegateOfTask()) {
    delegate->URLSessionDataTaskDidReceiveData(sessionOfTask(), selfOfTask(), data);
  }
  adjustFlow();
}

void URLSessionTaskCore::collectForCache(const Data& data) {
  if (toBeCached == nullptr) {
    return;
  }
  const size_t limit = std::max(cache->memoryCapacity(), cache->diskCapacity());
  if (collected.size() + data.length() > limit) {
    toBeCached = nullptr;
    collected = {};
  } else {
    collected.append(data.view());
  }
}

void URLSessionTaskCore::takeEnd() {
  if (!hasResponse) {
    complete(URLError(URLErrorUnknown, "an end without a head"));
    return;
  }
  if (toBeCached == nullptr) {
    complete(std::nullopt);
    return;
  }
  // Not here: it writes a file, and this may be the main thread.
  std::shared_ptr<URLRequest> loaded;
  {
    const MutexLock lock(mutex);
    loaded = std::make_shared<URLRequest>(protocol != nullptr ? protocol->request() : current);
  }
  runOnWorkerThread([task = shared_from_this(), reply = awaitReply(), loaded, store = cache,
                     whole = CachedURLResponse::initWithResponse(
                         toBeCached->response(), Data::adopt(std::exchange(collected, {})),
                         toBeCached->storagePolicy())] {
    store->storeCachedResponse(whole, *loaded);
    reply->give([task] { task->complete(std::nullopt); });
  });
}

void URLSessionTaskCore::complete(std::optional<Error> outcome) {
  std::shared_ptr<URLProtocol> left;
  std::shared_ptr<URLSessionDataTask> keptTask;
  std::shared_ptr<URLSession> keptSession;
  std::shared_ptr<const URLResponse> answer;
  {
    const MutexLock lock(mutex);
    if (state == URLSessionDataTask::State::completed) {
      return;
    }
    state = URLSessionDataTask::State::completed;
    error = outcome;
    steps.clear();
    backlog = 0;
    left = std::exchange(protocol, nullptr);
    keptTask = std::exchange(self, nullptr);
    keptSession = std::exchange(session, nullptr);
    answer = response;
  }
  stopProtocol(std::move(left));
  collected = {};
  toBeCached = nullptr;
  const URLSession::CompletionHandler handler = std::exchange(completionHandler, nullptr);
  runLoggingExceptions([&] {
    if (handler != nullptr && outcome) {
      handler(std::nullopt, nullptr, outcome);
    } else if (handler != nullptr) {
      handler(Data::adopt(std::exchange(body, {})), answer, std::nullopt);
    } else if (const auto delegate = keptSession != nullptr ? keptSession->delegate() : nullptr) {
      delegate->URLSessionTaskDidCompleteWithError(keptSession, keptTask, outcome);
    }
  });
  body = {};
  if (keptSession != nullptr) {
    keptSession->_implementation->taskDidComplete(keptSession, *keptTask);
  }
}

}  // namespace platform
