// Takes the newer index of an installed book from the server.
#pragma once

#include <memory>
#include <optional>
#include <string>

#include "platform/Data.h"
#include "platform/URLRequest.h"
#include "platform/URLSession.h"

class ZEBHelpBook;
class ZEBIndex;
class ZEBIndexshelf;

/// Hears of one transfer, and pours what came into the record when it is something new. A transfer
/// that brings nothing usable has a record without semantic data completed on this machine instead.
///
/// The request is known only where the server redirects: without a redirect nothing is looked up in
/// the index URL cache and nothing is stored there.
///
/// Confined to the main thread, which is where its session calls.
class ZEBIndexConnectionDelegate : public platform::URLSessionDelegate,
                                   public std::enable_shared_from_this<ZEBIndexConnectionDelegate> {
 public:
  static std::shared_ptr<ZEBIndexConnectionDelegate> delegateWithIndex(
      std::shared_ptr<ZEBIndex> index, std::shared_ptr<ZEBIndexshelf> indexshelf,
      std::shared_ptr<ZEBHelpBook> book);

  /// The cache of the process, which gets its capacities (20 MiB in memory, 60 MiB on disk) at the
  /// first call.
  static std::shared_ptr<platform::URLCache> indexURLCache();

  /// The request of the last redirect.
  const std::optional<platform::URLRequest>& request() const { return _request; }
  void setRequest(std::optional<platform::URLRequest> request) { _request = std::move(request); }
  /// The response that was accepted; null until there is one.
  const std::shared_ptr<const platform::URLResponse>& response() const { return _response; }
  void setResponse(std::shared_ptr<const platform::URLResponse> response) {
    _response = std::move(response);
  }
  /// What was received so far; absent before the first piece.
  std::optional<platform::Data> data() const;
  void setData(const std::optional<platform::Data>& data);
  /// The body cached for the request, when there was one.
  const std::optional<platform::Data>& cachedData() const { return _cachedData; }
  void setCachedData(std::optional<platform::Data> data) { _cachedData = std::move(data); }

  const std::shared_ptr<ZEBIndex>& index() const { return _index; }
  const std::shared_ptr<ZEBIndexshelf>& indexshelf() const { return _indexshelf; }
  const std::shared_ptr<ZEBHelpBook>& book() const { return _book; }

  void URLSessionTaskWillPerformHTTPRedirection(
      const std::shared_ptr<platform::URLSession>& session,
      const std::shared_ptr<platform::URLSessionDataTask>& task,
      const std::shared_ptr<const platform::URLResponse>& response,
      const platform::URLRequest& newRequest, const RedirectHandler& completionHandler) override;
  void URLSessionDataTaskWillCacheResponse(
      const std::shared_ptr<platform::URLSession>& session,
      const std::shared_ptr<platform::URLSessionDataTask>& dataTask,
      const std::shared_ptr<const platform::CachedURLResponse>& proposedResponse,
      const CacheHandler& completionHandler) override;
  void URLSessionDataTaskDidReceiveResponse(
      const std::shared_ptr<platform::URLSession>& session,
      const std::shared_ptr<platform::URLSessionDataTask>& dataTask,
      const std::shared_ptr<const platform::URLResponse>& response,
      const DispositionHandler& completionHandler) override;
  void URLSessionDataTaskDidReceiveData(
      const std::shared_ptr<platform::URLSession>& session,
      const std::shared_ptr<platform::URLSessionDataTask>& dataTask,
      const platform::Data& data) override;
  void URLSessionTaskDidCompleteWithError(const std::shared_ptr<platform::URLSession>& session,
                                          const std::shared_ptr<platform::URLSessionDataTask>& task,
                                          const std::optional<platform::Error>& error) override;

  void _sessionTaskDidFailWithError(const std::shared_ptr<platform::URLSessionDataTask>& task,
                                    const platform::Error& error);
  void _sessionTaskDidFinishLoading(const std::shared_ptr<platform::URLSessionDataTask>& task);

 private:
  ZEBIndexConnectionDelegate(std::shared_ptr<ZEBIndex> index,
                             std::shared_ptr<ZEBIndexshelf> indexshelf,
                             std::shared_ptr<ZEBHelpBook> book);
  std::optional<std::string> _generatedIndexPath() const;
  std::optional<std::string> _requestURL() const;
  void _keep(const platform::Data& data);
  void _storeInCache(const std::shared_ptr<platform::URLSessionDataTask>& task,
                     const platform::Data& data);

  std::optional<platform::URLRequest> _request;
  std::shared_ptr<const platform::URLResponse> _response;
  std::optional<std::string> _data;
  std::optional<platform::Data> _cachedData;
  /// Whether the answer was refused, and what that calls for was done.
  bool _wasRefused = false;
  const std::shared_ptr<ZEBIndex> _index;
  const std::shared_ptr<ZEBIndexshelf> _indexshelf;
  const std::shared_ptr<ZEBHelpBook> _book;
};
