#include <utility>

#include "platform/Environment.h"
#include "platform/HTTPLoader.h"
#include "platform/URLError.h"
#include "platform/URLOrigin.h"
#include "platform/URLProtocolRegistry.h"
#include "platform/URLSessionImplementation.h"
#include "platform/URLSessionTaskCore.h"
#include "platform/WorkerThreads.h"

namespace platform {

URLSessionTaskCore::URLSessionTaskCore(std::shared_ptr<URLSession> owner, uint64_t number,
                                       URLRequest request, URLSession::CompletionHandler handler)
    : identifier(number),
      original(std::move(request)),
      configuration(owner->configuration()),
      delegateQueue(owner->delegateQueue()),
      cookies(owner->_implementation->cookies),
      loads(DispatchQueue::serial("url-load")),
      current(original),
      session(std::move(owner)),
      completionHandler(std::move(handler)),
      hasCompletionHandler(completionHandler != nullptr) {}

void URLSessionTaskCore::start(const std::shared_ptr<URLSessionDataTask>& task) {
  const std::shared_ptr<Clock> clock = Environment::current()->clock;
  std::shared_ptr<URLSession> owner;
  {
    const MutexLock lock(mutex);
    if (state != URLSessionDataTask::State::suspended) {
      return;
    }
    state = URLSessionDataTask::State::running;
    self = task;
    owner = session;
    transferSettings.clock = clock;
    transferSettings.resourceDeadline =
        clock->elapsed() + configuration.timeoutIntervalForResource();
    transferSettings.maximumBodyLength = configuration.maximumBodyLength();
    transferSettings.authorityFile = configuration.certificateAuthorityFile();
    transferSettings.cookies = cookies;
  }
  if (!owner->_implementation->admit(task)) {
    cancel(task);
    return;
  }
  loads->async(
      [implementation = shared_from_this()] { implementation->load(implementation->original); });
}

void URLSessionTaskCore::cancel(const std::shared_ptr<URLSessionDataTask>& task) {
  std::shared_ptr<URLProtocol> left;
  {
    const MutexLock lock(mutex);
    if (state == URLSessionDataTask::State::completed ||
        state == URLSessionDataTask::State::canceling) {
      return;
    }
    self = task;
    state = URLSessionDataTask::State::canceling;
    left = std::exchange(protocol, nullptr);
    // Whatever is asked now is not waited for.
    waiting = false;
    ++replyNumber;
    backlog = 0;
    steps.clear();
    steps.push_back([implementation = shared_from_this()] {
      implementation->complete(URLError(URLErrorCancelled));
    });
    schedulePump();
  }
  stopProtocol(std::move(left));
}

URLRequest URLSessionTaskCore::requestToLoad(URLRequest request) const {
  const bool isOriginalServer = originOfURL(request.URL()) == originOfURL(original.URL());
  for (const auto& [name, value] : configuration.HTTPAdditionalHeaders()) {
    const bool tellsWhoAsks =
        isSameHTTPFieldName(name, "Authorization") || isSameHTTPFieldName(name, "Cookie");
    if (!request.valueForHTTPHeaderField(name) && (isOriginalServer || !tellsWhoAsks)) {
      request.setValueForHTTPHeaderField(value, name);
    }
  }
  return request;
}

std::shared_ptr<URLProtocol> URLSessionTaskCore::protocolForRequest(const URLRequest& request) {
  std::vector<std::shared_ptr<const URLProtocolClass>> kinds = configuration.protocolClasses();
  const auto registered = registeredProtocolClasses();
  kinds.insert(kinds.end(), registered.begin(), registered.end());
  for (const auto& kind : kinds) {
    if (kind->canInitWithRequest(request)) {
      return kind->initWithRequest(request, shared_from_this());
    }
  }
  if (!HTTPLoader::canInitWithRequest(request)) {
    return nullptr;
  }
  HTTPTransferSettings settings;
  {
    const MutexLock lock(mutex);
    settings = transferSettings;
  }
  return HTTPLoader::initWithRequest(request, shared_from_this(), configuration.URLCache(),
                                     std::move(settings));
}

void URLSessionTaskCore::load(URLRequest request) {
  std::shared_ptr<URLProtocol> chosen;
  runLoggingExceptions([&] { chosen = protocolForRequest(requestToLoad(std::move(request))); });
  {
    const MutexLock lock(mutex);
    if (state != URLSessionDataTask::State::running) {
      return;
    }
    if (chosen == nullptr) {
      steps.push_back(
          [task = shared_from_this()] { task->complete(URLError(URLErrorUnsupportedURL)); });
      schedulePump();
      return;
    }
    protocol = chosen;
  }
  {
    const MonitorLock lock(flow);
    heldBack = false;
  }
  if (runLoggingExceptions([&] { chosen->startLoading(); })) {
    URLProtocolDidFailWithError(*chosen, URLError(URLErrorUnknown, "the protocol failed"));
  }
}

void URLSessionTaskCore::stopProtocol(std::shared_ptr<URLProtocol> stopped) {
  if (stopped != nullptr) {
    loads->async([stopped = std::move(stopped)] { stopped->stopLoading(); });
  }
}

std::shared_ptr<URLSessionDelegate> URLSessionTaskCore::delegateOfTask() const {
  const std::shared_ptr<URLSession> owner = hasCompletionHandler ? nullptr : sessionOfTask();
  return owner != nullptr ? owner->delegate() : nullptr;
}

std::shared_ptr<URLSession> URLSessionTaskCore::sessionOfTask() const {
  const MutexLock lock(mutex);
  return session;
}

std::shared_ptr<URLSessionDataTask> URLSessionTaskCore::selfOfTask() const {
  const MutexLock lock(mutex);
  return self;
}

void URLSessionTaskCore::addStep(const URLProtocol& teller, uint64_t length, Step step) {
  {
    const MutexLock lock(mutex);
    if (state != URLSessionDataTask::State::running || &teller != protocol.get()) {
      return;
    }
    backlog += length;
    steps.push_back(std::move(step));
    schedulePump();
  }
  if (length > 0) {
    adjustFlow();
    const MutexLock lock(mutex);
    received += length;
  }
}

void URLSessionTaskCore::adjustFlow() {
  const MonitorLock ordered(flow);
  std::shared_ptr<URLProtocol> asked;
  bool holdBack = false;
  {
    const MutexLock lock(mutex);
    asked = protocol;
    // Some way below the limit, so that it does not go to and fro with each piece.
    holdBack = backlog > (heldBack ? URLProtocol::backlogLimit / 2 : URLProtocol::backlogLimit);
  }
  if (asked == nullptr || holdBack == heldBack) {
    return;
  }
  heldBack = holdBack;
  if (holdBack) {
    asked->suspendLoading();
  } else {
    asked->resumeLoading();
  }
}

void URLSessionTaskCore::URLProtocolWasRedirectedToRequest(
    URLProtocol& teller, const URLRequest& newRequest,
    const std::shared_ptr<const URLResponse>& redirectResponse) {
  addStep(teller, 0, [task = shared_from_this(), newRequest, redirectResponse] {
    task->takeRedirect(newRequest, redirectResponse);
  });
}

void URLSessionTaskCore::URLProtocolDidReceiveResponse(
    URLProtocol& teller, const std::shared_ptr<const URLResponse>& answer,
    URLCacheStoragePolicy policy) {
  addStep(teller, 0,
          [task = shared_from_this(), answer, policy] { task->takeResponse(answer, policy); });
}

void URLSessionTaskCore::URLProtocolDidLoadData(URLProtocol& teller, const Data& data) {
  addStep(teller, data.length(), [task = shared_from_this(), data] { task->takeData(data); });
}

void URLSessionTaskCore::URLProtocolDidFinishLoading(URLProtocol& teller) {
  addStep(teller, 0, [task = shared_from_this()] { task->takeEnd(); });
}

void URLSessionTaskCore::URLProtocolDidFailWithError(URLProtocol& teller, const Error& failure) {
  addStep(teller, 0, [task = shared_from_this(), failure] { task->complete(failure); });
}

}  // namespace platform
