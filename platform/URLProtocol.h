// Who answers requests: sessions speak HTTP by themselves; a program may put protocols of its own
// before that.
#pragma once

#include <functional>
#include <memory>
#include <optional>
#include <string_view>

#include "platform/Data.h"
#include "platform/Error.h"
#include "platform/URLCache.h"
#include "platform/URLRequest.h"
#include "platform/URLResponse.h"
#include "platform/Value.h"

namespace platform {

class URLProtocol;

/// Takes what a protocol has to tell: the task whose request it loads.
///
/// A protocol tells of zero or one redirect, then of a response, then of any number of pieces of
/// the body, and at last either that it has finished or that it failed; a failure may come at any
/// point. Nothing is told after that, nor is anything told after stopLoading() heeded.
///
/// Thread-safety: internally synchronised; the calls of one protocol come one at a time.
class URLProtocolClient {
 public:
  virtual ~URLProtocolClient() = default;

  /// The protocol goes on with the redirect's own response and body: they are what the task
  /// delivers when its delegate does not follow. When it does, the protocol is stopped.
  virtual void URLProtocolWasRedirectedToRequest(
      URLProtocol& protocol, const URLRequest& newRequest,
      const std::shared_ptr<const URLResponse>& redirectResponse) = 0;
  /// With a policy other than notAllowed the task keeps the answer in its session's cache, if its
  /// delegate agrees, once it has come whole.
  virtual void URLProtocolDidReceiveResponse(URLProtocol& protocol,
                                             const std::shared_ptr<const URLResponse>& response,
                                             URLCacheStoragePolicy cacheStoragePolicy) = 0;
  virtual void URLProtocolDidLoadData(URLProtocol& protocol, const Data& data) = 0;
  virtual void URLProtocolDidFinishLoading(URLProtocol& protocol) = 0;
  virtual void URLProtocolDidFailWithError(URLProtocol& protocol, const Error& error) = 0;
};

/// A kind of protocol, as a session asks for it.
struct URLProtocolClass {
  /// Whether this kind loads the request. Called on any thread, for each request of each session
  /// that is to be loaded and each redirect of one: it must be quick.
  std::function<bool(const URLRequest& request)> canInitWithRequest;
  /// A protocol for such a request. Never null.
  std::function<std::shared_ptr<URLProtocol>(URLRequest request,
                                             std::shared_ptr<URLProtocolClient> client)>
      initWithRequest;
};

/// Loads one request for its client. A subclass takes requests over, as a rule to load them through
/// a session of its own after some change: credentials added, bytes checked before they are passed
/// on. A request that it sends must be marked (setProperty) for its own canInitWithRequest to leave
/// alone, since every session asks the registered kinds.
///
/// startLoading() and stopLoading() are called one at a time, on worker threads. The task keeps the
/// protocol until it has ended or was stopped; the protocol keeps the client, and holds no lock
/// while it calls it.
class URLProtocol : public std::enable_shared_from_this<URLProtocol> {
 public:
  virtual ~URLProtocol();
  URLProtocol(const URLProtocol&) = delete;
  URLProtocol& operator=(const URLProtocol&) = delete;

  const URLRequest& request() const { return _request; }
  URLProtocolClient& client() const { return *_client; }

  /// Begins; the client may be told from within, or later and from any thread.
  virtual void startLoading() = 0;
  /// The client wants to hear no more: it is done with the protocol, or its task was cancelled.
  /// Called once for each startLoading(), after the end was told as well. What is told all the
  /// same is not heard.
  virtual void stopLoading() = 0;

  /// The task's delegate lags behind with `backlogLimit` bytes: hold back until resumeLoading().
  /// A protocol that cannot may ignore it and let its client keep the bytes. Both are called one at
  /// a time, on any thread, also from within calls of the client, and must not call it themselves.
  virtual void suspendLoading() {}
  virtual void resumeLoading() {}

  /// Bytes of body that wait for a delegate before its protocol is asked to hold back.
  static constexpr size_t backlogLimit = 1 << 20;

  /// From now on every session asks this kind, before those registered earlier and before its own
  /// HTTP, but after its configuration's protocolClasses. False when it is registered already.
  static bool registerClass(const std::shared_ptr<const URLProtocolClass>& protocolClass);
  static void unregisterClass(const std::shared_ptr<const URLProtocolClass>& protocolClass);

  /// Properties of requests: marks and parameters for protocols, never sent anywhere. They go with
  /// the request into redirects of it. Absent when there is none of that name.
  static Value propertyForKey(std::string_view key, const URLRequest& inRequest);
  static void setProperty(Value value, std::string_view forKey, URLRequest& inRequest);
  static void removePropertyForKey(std::string_view key, URLRequest& inRequest);

 protected:
  URLProtocol(URLRequest request, std::shared_ptr<URLProtocolClient> client);

 private:
  const URLRequest _request;
  const std::shared_ptr<URLProtocolClient> _client;
};

}  // namespace platform
