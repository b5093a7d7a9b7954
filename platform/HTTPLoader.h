// HTTP as a URL protocol: the cache's rules around exchanges with servers. Private to URL sessions.
#pragma once

#include <memory>

#include "platform/HTTPTransfer.h"
#include "platform/ThreadSafety.h"
#include "platform/URLProtocol.h"

namespace platform {

/// The protocol that sessions ask when no other one takes an http or https request. What it reads
/// from the cache it reads on the thread that starts it; what it learns from a server it tells on
/// the transfer thread. Thread-safety: internally synchronised.
class HTTPLoader : public URLProtocol, public HTTPTransferClient {
 public:
  static bool canInitWithRequest(const URLRequest& request);

  /// `cache` may be null.
  static std::shared_ptr<HTTPLoader> initWithRequest(URLRequest request,
                                                     std::shared_ptr<URLProtocolClient> client,
                                                     std::shared_ptr<URLCache> cache,
                                                     HTTPTransferSettings settings);

  void startLoading() override;
  void stopLoading() override;
  void suspendLoading() override;
  void resumeLoading() override;

  void transferDidReceiveResponse(const std::shared_ptr<const URLResponse>& response) override;
  void transferDidReceiveData(const Data& data) override;
  void transferDidEnd(const std::optional<Error>& error) override;

 private:
  HTTPLoader(URLRequest request, std::shared_ptr<URLProtocolClient> client,
             std::shared_ptr<URLCache> cache, HTTPTransferSettings settings);

  std::shared_ptr<HTTPLoader> _self();
  void _transferRequest(URLRequest request);
  void _deliver(const std::shared_ptr<const CachedURLResponse>& cached);
  /// The server says that what is cached still holds.
  void _deliverRevalidated(const std::shared_ptr<const URLResponse>& notModified);
  /// False when the response leads nowhere that may be gone to, which the client was told.
  bool _tellOfRedirect(const std::shared_ptr<const URLResponse>& response);
  std::shared_ptr<HTTPTransfer> _currentTransfer();

  const std::shared_ptr<URLCache> _cache;
  const HTTPTransferSettings _settings;
  Mutex _mutex;
  std::shared_ptr<HTTPTransfer> _transfer GUARDED_BY(_mutex);
  bool _stopped GUARDED_BY(_mutex) = false;
  bool _suspended GUARDED_BY(_mutex) = false;
  /// What the server is asked about; set before the exchange begins.
  std::shared_ptr<const CachedURLResponse> _stale;
  /// The rest of the exchange means nothing: the client was told the end, or will be by another
  /// thread. Confined to the transfer thread.
  bool _ended = false;
};

}  // namespace platform
