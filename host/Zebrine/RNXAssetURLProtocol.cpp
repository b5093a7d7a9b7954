#include "host/Zebrine/RNXAssetURLProtocol.h"

#include <atomic>
#include <utility>

#include "host/Zebrine/RNXConfig.h"
#include "host/Zebrine/RNXExpectedAssets.h"
#include "host/Zebrine/ZEBAuthChallengeHandler.h"
#include "host/Zebrine/ZEBStrings.h"
#include "platform/URLCache.h"

using platform::URLProtocol;

namespace {

/// Marks what the protocol itself sends, for it to leave alone.
constexpr const char* sentKey = "RNXAssetURLProtocolSent";
/// The URL that was asked for first, whatever servers have pointed to since.
constexpr const char* firstURLKey = "RNXAssetURLProtocolFirstURL";

constexpr int statusOK = 200;
constexpr int32_t fileResourceType = 1;

platform::URL firstURL(const platform::URLRequest& request) {
  const platform::Value value = URLProtocol::propertyForKey(firstURLKey, request);
  return value.urlIf() == nullptr ? request.URL() : *value.urlIf();
}

}  // namespace

/// Hears of the transfer and tells the protocol's client of it, when the time has come. Thread-
/// safety: its session's queue calls it; stop() may come from any thread.
class RNXAssetURLProtocol::Loader : public platform::URLSessionDelegate {
 public:
  Loader(std::weak_ptr<RNXAssetURLProtocol> protocol, platform::URLRequest request,
         std::optional<RNXExpectedAsset> expected)
      : _protocol(std::move(protocol)),
        _request(std::move(request)),
        _expected(std::move(expected)) {}

  /// `self` is this loader.
  void start(const std::shared_ptr<Loader>& self) {
    _session = platform::URLSession::sessionWithConfiguration(
        platform::URLSessionConfiguration::defaultSessionConfiguration(), self);
    const auto task = _session->dataTaskWithRequest(_request);
    task->resume();
    _session->finishTasksAndInvalidate();
  }

  void stop() {
    _stopped = true;
    if (_session) {
      _session->invalidateAndCancel();
    }
  }

  void URLSessionTaskWillPerformHTTPRedirection(
      const std::shared_ptr<platform::URLSession>& /*session*/,
      const std::shared_ptr<platform::URLSessionDataTask>& /*task*/,
      const std::shared_ptr<const platform::URLResponse>& response,
      const platform::URLRequest& newRequest, const RedirectHandler& completionHandler) override {
    if (const auto protocol = _heardProtocol()) {
      platform::URLRequest followed = newRequest;
      URLProtocol::removePropertyForKey(sentKey, followed);
      followed.setCredential(std::nullopt);
      protocol->client().URLProtocolWasRedirectedToRequest(*protocol, followed, response);
    }
    // Whether to follow is the client's decision; it then asks anew.
    completionHandler(std::nullopt);
  }

  void URLSessionDataTaskDidReceiveResponse(
      const std::shared_ptr<platform::URLSession>& /*session*/,
      const std::shared_ptr<platform::URLSessionDataTask>& /*dataTask*/,
      const std::shared_ptr<const platform::URLResponse>& response,
      const DispositionHandler& completionHandler) override {
    _response = response;
    _collects = _expected && response->statusCode() == statusOK;
    completionHandler(platform::URLSessionResponseDisposition::allow);
  }

  void URLSessionDataTaskWillCacheResponse(
      const std::shared_ptr<platform::URLSession>& /*session*/,
      const std::shared_ptr<platform::URLSessionDataTask>& /*dataTask*/,
      const std::shared_ptr<const platform::CachedURLResponse>& proposedResponse,
      const CacheHandler& completionHandler) override {
    // The client's session keeps it, once it is known to be right.
    _storagePolicy = proposedResponse->storagePolicy();
    completionHandler(nullptr);
  }

  void URLSessionDataTaskDidReceiveData(
      const std::shared_ptr<platform::URLSession>& /*session*/,
      const std::shared_ptr<platform::URLSessionDataTask>& /*dataTask*/,
      const platform::Data& data) override {
    if (_collects) {
      _body.append(data.view());
      return;
    }
    const auto protocol = _heardProtocol();
    if (protocol && _tellResponse(*protocol)) {
      protocol->client().URLProtocolDidLoadData(*protocol, data);
    }
  }

  void URLSessionTaskDidCompleteWithError(
      const std::shared_ptr<platform::URLSession>& /*session*/,
      const std::shared_ptr<platform::URLSessionDataTask>& /*task*/,
      const std::optional<platform::Error>& error) override {
    const auto protocol = _heardProtocol();
    if (!protocol) {
      return;
    }
    if (error) {
      protocol->client().URLProtocolDidFailWithError(*protocol, *error);
      return;
    }
    if (_collects) {
      const platform::Data body = platform::Data::adopt(std::move(_body));
      if (const auto wrong = _expected->errorForData(body)) {
        // Or the wrong file would be found again and again.
        platform::URLCache::sharedURLCache()->removeCachedResponseForRequest(_request);
        protocol->client().URLProtocolDidFailWithError(*protocol, *wrong);
        return;
      }
      _tellResponse(*protocol);
      protocol->client().URLProtocolDidLoadData(*protocol, body);
    } else {
      _tellResponse(*protocol);
    }
    protocol->client().URLProtocolDidFinishLoading(*protocol);
  }

 private:
  std::shared_ptr<RNXAssetURLProtocol> _heardProtocol() const {
    return _stopped ? nullptr : _protocol.lock();
  }

  /// Once; whether there is one.
  bool _tellResponse(RNXAssetURLProtocol& protocol) {
    if (_response && !_responseTold) {
      _responseTold = true;
      protocol.client().URLProtocolDidReceiveResponse(protocol, _response, _storagePolicy);
    }
    return _responseTold;
  }

  const std::weak_ptr<RNXAssetURLProtocol> _protocol;
  const platform::URLRequest _request;
  const std::optional<RNXExpectedAsset> _expected;
  std::shared_ptr<platform::URLSession> _session;
  std::atomic<bool> _stopped{false};

  // Of the session's queue.
  std::shared_ptr<const platform::URLResponse> _response;
  platform::URLCacheStoragePolicy _storagePolicy = platform::URLCacheStoragePolicy::notAllowed;
  bool _collects = false;
  bool _responseTold = false;
  std::string _body;
};

namespace {

/// The handler of the registered kind.
class RegisteredHandler {
 public:
  static RegisteredHandler& shared() {
    static auto& shared = *new RegisteredHandler;
    return shared;
  }
  void set(std::shared_ptr<ZEBAuthChallengeHandler> handler) {
    const platform::MutexLock lock(_mutex);
    _handler = std::move(handler);
  }
  std::shared_ptr<ZEBAuthChallengeHandler> get() const {
    const platform::MutexLock lock(_mutex);
    return _handler;
  }

 private:
  mutable platform::Mutex _mutex;
  std::shared_ptr<ZEBAuthChallengeHandler> _handler GUARDED_BY(_mutex);
};

}  // namespace

RNXAssetURLProtocol::RNXAssetURLProtocol(platform::URLRequest request,
                                         std::shared_ptr<platform::URLProtocolClient> client,
                                         std::shared_ptr<ZEBAuthChallengeHandler> authHandler)
    : URLProtocol(std::move(request), std::move(client)), _authHandler(std::move(authHandler)) {}

void RNXAssetURLProtocol::registerProtocolWithAuthHandler(
    std::shared_ptr<ZEBAuthChallengeHandler> authHandler) {
  RegisteredHandler::shared().set(std::move(authHandler));
  static const auto& registered = *new std::shared_ptr<const platform::URLProtocolClass>(
      std::make_shared<const platform::URLProtocolClass>(platform::URLProtocolClass{
          canInitWithRequest,
          [](platform::URLRequest request, std::shared_ptr<platform::URLProtocolClient> client) {
            return std::shared_ptr<URLProtocol>(new RNXAssetURLProtocol(
                std::move(request), std::move(client), RegisteredHandler::shared().get()));
          }}));
  (void)URLProtocol::registerClass(registered);
}

void RNXAssetURLProtocol::ensureRegistration() {
  if (RegisteredHandler::shared().get()) {
    return;
  }
  auto handler =
      ZEBAuthChallengeHandler::initWithServiceName(RNXConfig::sharedConfig()->serviceName());
  handler->setResourceType(fileResourceType);
  registerProtocolWithAuthHandler(std::move(handler));
}

std::shared_ptr<const platform::URLProtocolClass> RNXAssetURLProtocol::protocolClassWithAuthHandler(
    std::shared_ptr<ZEBAuthChallengeHandler> authHandler) {
  return std::make_shared<const platform::URLProtocolClass>(platform::URLProtocolClass{
      canInitWithRequest,
      [handler = std::move(authHandler)](platform::URLRequest request,
                                         std::shared_ptr<platform::URLProtocolClient> client) {
        return std::shared_ptr<URLProtocol>(
            new RNXAssetURLProtocol(std::move(request), std::move(client), handler));
      }});
}

bool RNXAssetURLProtocol::canInitWithRequest(const platform::URLRequest& request) {
  if (propertyForKey(sentKey, request).boolValue()) {
    return false;
  }
  return propertyForKey(RNXAssetURLProtocolRequest, request).boolValue() ||
         RNXExpectedAssets::shared().assetForURL(firstURL(request));
}

platform::URLRequest RNXAssetURLProtocol::_requestToSend() const {
  platform::URLRequest sent = request();
  const platform::URL first = firstURL(sent);
  setProperty(true, sentKey, sent);
  setProperty(first, firstURLKey, sent);
  if (_authHandler && ZEBOriginOfURL(first) == ZEBOriginOfURL(sent.URL())) {
    sent.setCredential(_authHandler->credentialForURL(sent.URL()));
  }
  return sent;
}

void RNXAssetURLProtocol::startLoading() {
  auto expected = RNXExpectedAssets::shared().assetForURL(firstURL(request()));
  if (const auto local = expected ? expected->localData() : std::nullopt) {
    client().URLProtocolDidReceiveResponse(
        *this, platform::URLResponse::initWithURL(request().URL(), statusOK, "HTTP/1.1", {}),
        platform::URLCacheStoragePolicy::notAllowed);
    client().URLProtocolDidLoadData(*this, *local);
    client().URLProtocolDidFinishLoading(*this);
    return;
  }
  const auto loader =
      std::make_shared<Loader>(std::static_pointer_cast<RNXAssetURLProtocol>(shared_from_this()),
                               _requestToSend(), std::move(expected));
  {
    const platform::MutexLock lock(_mutex);
    _loader = loader;
  }
  loader->start(loader);
}

void RNXAssetURLProtocol::stopLoading() {
  std::shared_ptr<Loader> loader;
  {
    const platform::MutexLock lock(_mutex);
    loader = std::move(_loader);
  }
  if (loader) {
    loader->stop();
  }
}
