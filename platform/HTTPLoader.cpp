#include "platform/HTTPLoader.h"

#include <algorithm>
#include <array>
#include <utility>

#include "platform/Environment.h"
#include "platform/HTTPCaching.h"
#include "platform/URLError.h"
#include "platform/URLOrigin.h"
#include "platform/WorkerThreads.h"

namespace platform {

namespace {

bool isRedirect(int status) {
  constexpr std::array<int, 5> all = {301, 302, 303, 307, 308};
  return std::find(all.begin(), all.end(), status) != all.end();
}

/// Servers are careless with what they send as a URL: what no URL may have is escaped.
std::string repairedLocation(std::string_view location) {
  constexpr std::string_view digits = "0123456789ABCDEF";
  constexpr std::string_view forbidden = "\"<>\\^`{|}";
  std::string repaired;
  for (const char c : location) {
    const auto byte = static_cast<unsigned char>(c);
    if (byte <= ' ' || byte >= 0x7F || forbidden.find(c) != std::string_view::npos) {
      repaired.append({'%', digits[byte >> 4], digits[byte & 15]});
    } else {
      repaired += c;
    }
  }
  return repaired;
}

/// A Vary field may name what only the session knows.
bool variesByCookie(const URLResponse& response) {
  std::string names = response.valueForHTTPHeaderField("Vary").value_or("");
  std::transform(names.begin(), names.end(), names.begin(), [](char c) {
    return static_cast<char>(c >= 'A' && c <= 'Z' ? c - 'A' + 'a' : c);
  });
  return names.find("cookie") != std::string::npos;
}

/// Whether the end of the body can be told from the end of the connection.
bool tellsItsLength(const URLResponse& response) {
  return response.valueForHTTPHeaderField("Content-Length") ||
         response.valueForHTTPHeaderField("Transfer-Encoding");
}

}  // namespace

bool HTTPLoader::canInitWithRequest(const URLRequest& request) {
  const std::string scheme = request.URL().scheme();
  return scheme == "http" || scheme == "https";
}

std::shared_ptr<HTTPLoader> HTTPLoader::initWithRequest(URLRequest request,
                                                        std::shared_ptr<URLProtocolClient> client,
                                                        std::shared_ptr<URLCache> cache,
                                                        HTTPTransferSettings settings) {
  return std::shared_ptr<HTTPLoader>(
      new HTTPLoader(std::move(request), std::move(client), std::move(cache), std::move(settings)));
}

HTTPLoader::HTTPLoader(URLRequest request, std::shared_ptr<URLProtocolClient> client,
                       std::shared_ptr<URLCache> cache, HTTPTransferSettings settings)
    : URLProtocol(std::move(request), std::move(client)),
      _cache(std::move(cache)),
      _settings(std::move(settings)) {}

std::shared_ptr<HTTPLoader> HTTPLoader::_self() {
  return std::static_pointer_cast<HTTPLoader>(shared_from_this());
}

std::shared_ptr<HTTPTransfer> HTTPLoader::_currentTransfer() {
  const MutexLock lock(_mutex);
  return _transfer;
}

void HTTPLoader::startLoading() {
  if (request().URL().host().empty()) {
    client().URLProtocolDidFailWithError(*this, URLError(URLErrorBadURL));
    return;
  }
  using Policy = URLRequestCachePolicy;
  const Policy policy = request().cachePolicy();
  const bool looksUp = _cache != nullptr && httpcaching::concernsCache(request()) &&
                       policy != Policy::reloadIgnoringLocalCacheData;
  const auto cached = looksUp ? _cache->cachedResponseForRequest(request()) : nullptr;
  const bool takesAnything =
      policy == Policy::returnCacheDataElseLoad || policy == Policy::returnCacheDataDontLoad;
  if (cached != nullptr &&
      (takesAnything ||
       httpcaching::isFresh(*cached, request(), Environment::current()->clock->now()))) {
    _deliver(cached);
    return;
  }
  if (policy == Policy::returnCacheDataDontLoad) {
    client().URLProtocolDidFailWithError(*this, URLError(URLErrorResourceUnavailable));
    return;
  }
  URLRequest conditional = request();
  if (cached != nullptr && httpcaching::makeConditional(conditional, *cached->response())) {
    _stale = cached;
  }
  _transferRequest(std::move(conditional));
}

void HTTPLoader::_transferRequest(URLRequest request) {
  const auto transfer = std::make_shared<HTTPTransfer>(std::move(request), _settings, _self());
  {
    const MutexLock lock(_mutex);
    if (_stopped) {
      return;
    }
    if (_suspended) {
      transfer->suspend();
    }
    _transfer = transfer;
  }
  transfer->start();
}

void HTTPLoader::stopLoading() {
  std::shared_ptr<HTTPTransfer> transfer;
  {
    const MutexLock lock(_mutex);
    _stopped = true;
    transfer = std::exchange(_transfer, nullptr);
  }
  if (transfer != nullptr) {
    transfer->cancel();
  }
}

void HTTPLoader::suspendLoading() {
  const MutexLock lock(_mutex);
  _suspended = true;
  if (_transfer != nullptr) {
    _transfer->suspend();
  }
}

void HTTPLoader::resumeLoading() {
  std::shared_ptr<HTTPTransfer> transfer;
  {
    const MutexLock lock(_mutex);
    _suspended = false;
    transfer = _transfer;
  }
  if (transfer != nullptr) {
    transfer->resume();
  }
}

void HTTPLoader::_deliver(const std::shared_ptr<const CachedURLResponse>& cached) {
  client().URLProtocolDidReceiveResponse(*this, cached->response(),
                                         URLCacheStoragePolicy::notAllowed);
  if (!cached->data().empty()) {
    client().URLProtocolDidLoadData(*this, cached->data());
  }
  client().URLProtocolDidFinishLoading(*this);
}

void HTTPLoader::_deliverRevalidated(const std::shared_ptr<const URLResponse>& notModified) {
  const URLResponse& stored = *_stale->response();
  const auto response = httpcaching::renewed(stored, *notModified);
  const auto renewed = CachedURLResponse::initWithResponse(response, _stale->data());
  if (!httpcaching::isWorthKeeping(*response, stored)) {
    _deliver(renewed);
    return;
  }
  // Not on the transfer thread: it writes a file.
  runOnWorkerThread([self = _self(), renewed] {
    self->_cache->storeCachedResponse(renewed, self->request());
    self->_deliver(renewed);
  });
}

bool HTTPLoader::_tellOfRedirect(const std::shared_ptr<const URLResponse>& response) {
  const std::string location =
      repairedLocation(response->valueForHTTPHeaderField("Location").value_or(""));
  const std::optional<URL> relative = URL::URLWithStringRelativeToURL(location, request().URL());
  const std::optional<URL> target =
      relative ? std::optional(relative->absoluteURL()) : std::nullopt;
  URLRequest next = request();
  if (!target || !next.setURL(*target)) {
    client().URLProtocolDidFailWithError(*this, URLError(URLErrorBadURL, location));
    return false;
  }
  const bool isDowngrade = request().URL().scheme() == "https" && target->scheme() != "https";
  if (!canInitWithRequest(next) || isDowngrade) {
    client().URLProtocolDidFailWithError(*this,
                                         URLError(URLErrorRedirectToNonExistentLocation, location));
    return false;
  }
  if (originOfURL(*target) != originOfURL(request().URL())) {
    next.setCredential(std::nullopt);
    next.setValueForHTTPHeaderField(std::nullopt, "Authorization");
    next.setValueForHTTPHeaderField(std::nullopt, "Cookie");
  }
  client().URLProtocolWasRedirectedToRequest(*this, next, response);
  return true;
}

void HTTPLoader::transferDidReceiveResponse(const std::shared_ptr<const URLResponse>& response) {
  if (_stale != nullptr && response->statusCode() == 304) {
    _ended = true;
    if (httpcaching::confirms(*response, *_stale->response())) {
      _deliverRevalidated(response);
      return;
    }
    // It speaks of another version than was asked about, and there is no telling which.
    _stale = nullptr;
    const auto confused = _currentTransfer();
    if (confused != nullptr) {
      confused->cancel();
    }
    _ended = false;
    _transferRequest(request());
    return;
  }
  if (isRedirect(response->statusCode()) && response->valueForHTTPHeaderField("Location") &&
      !_tellOfRedirect(response)) {
    _ended = true;
    return;
  }
  const bool mayStore = _cache != nullptr && httpcaching::mayStore(request(), *response) &&
                        tellsItsLength(*response) &&
                        (_settings.cookies == nullptr || !variesByCookie(*response));
  client().URLProtocolDidReceiveResponse(
      *this, response,
      mayStore ? URLCacheStoragePolicy::allowed : URLCacheStoragePolicy::notAllowed);
}

void HTTPLoader::transferDidReceiveData(const Data& data) {
  if (!_ended) {
    client().URLProtocolDidLoadData(*this, data);
  }
}

void HTTPLoader::transferDidEnd(const std::optional<Error>& error) {
  if (_ended) {
    return;
  }
  _ended = true;
  if (error) {
    client().URLProtocolDidFailWithError(*this, *error);
  } else {
    client().URLProtocolDidFinishLoading(*this);
  }
}

}  // namespace platform
