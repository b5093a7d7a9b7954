#include "plugin/remote/ZEBIndexConnectionDelegate.h"

#include <mutex>
#include <utility>

#include "host/Zebrine/ZEBHelpBook.h"
#include "host/Zebrine/ZEBLog.h"
#include "platform/AbandonedFiles.h"
#include "platform/Environment.h"
#include "platform/Files.h"
#include "platform/ProcessInfo.h"
#include "platform/URLError.h"
#include "plugin/records/ZEBHelpindexIndex.h"
#include "plugin/shelf/ZEBIndexshelf.h"

namespace {

constexpr size_t memoryCapacity = 20971520;
constexpr size_t diskCapacity = 62914560;
constexpr platform::Seconds secondTryTimeout{2.0};
constexpr int firstErrorStatus = 400;
constexpr int lastErrorStatus = 599;

std::optional<platform::URLRequest> originalRequest(
    const std::shared_ptr<platform::URLSessionDataTask>& task) {
  return task ? std::optional(task->originalRequest()) : std::nullopt;
}

bool hasLuxIndexData(const std::shared_ptr<ZEBIndex>& index) {
  const auto record = std::dynamic_pointer_cast<ZEBHelpindexIndex>(index);
  return record && record->luxIndexData();
}

}  // namespace

ZEBIndexConnectionDelegate::ZEBIndexConnectionDelegate(std::shared_ptr<ZEBIndex> index,
                                                       std::shared_ptr<ZEBIndexshelf> indexshelf,
                                                       std::shared_ptr<ZEBHelpBook> book)
    : _index(std::move(index)), _indexshelf(std::move(indexshelf)), _book(std::move(book)) {}

std::shared_ptr<ZEBIndexConnectionDelegate> ZEBIndexConnectionDelegate::delegateWithIndex(
    std::shared_ptr<ZEBIndex> index, std::shared_ptr<ZEBIndexshelf> indexshelf,
    std::shared_ptr<ZEBHelpBook> book) {
  return std::shared_ptr<ZEBIndexConnectionDelegate>(
      new ZEBIndexConnectionDelegate(std::move(index), std::move(indexshelf), std::move(book)));
}

std::shared_ptr<platform::URLCache> ZEBIndexConnectionDelegate::indexURLCache() {
  static std::once_flag configured;
  std::call_once(configured, [] {
    const auto cache = platform::URLCache::sharedURLCache();
    cache->setMemoryCapacity(memoryCapacity);
    cache->setDiskCapacity(diskCapacity);
  });
  return platform::URLCache::sharedURLCache();
}

std::optional<platform::Data> ZEBIndexConnectionDelegate::data() const {
  return _data ? std::optional(platform::Data::copy(*_data)) : std::nullopt;
}

void ZEBIndexConnectionDelegate::setData(const std::optional<platform::Data>& data) {
  _data = data ? std::optional(std::string(data->view())) : std::nullopt;
}

std::optional<std::string> ZEBIndexConnectionDelegate::_generatedIndexPath() const {
  return _indexshelf ? _indexshelf->_generatedIndexPathForBookID(
                           _index ? _index->bookID() : std::nullopt,
                           _book ? std::optional(_book->localization()) : std::nullopt)
                     : std::nullopt;
}

std::optional<std::string> ZEBIndexConnectionDelegate::_requestURL() const {
  return _request ? std::optional(_request->URL().absoluteString()) : std::nullopt;
}

void ZEBIndexConnectionDelegate::URLSessionTaskWillPerformHTTPRedirection(
    const std::shared_ptr<platform::URLSession>& /*session*/,
    const std::shared_ptr<platform::URLSessionDataTask>& task,
    const std::shared_ptr<const platform::URLResponse>& /*response*/,
    const platform::URLRequest& newRequest, const RedirectHandler& completionHandler) {
  ZEBLog(4, "Index download: will send request for task %@ (request: %@)", task,
         originalRequest(task));
  _request = newRequest;
  const std::optional<std::string> path = _generatedIndexPath();
  if (path && platform::Environment::current()->files->fileExistsAtPath(*path)) {
    const auto cached = indexURLCache()->cachedResponseForRequest(newRequest);
    _cachedData = cached ? std::optional(cached->data()) : std::nullopt;
  }
  completionHandler(newRequest);
}

void ZEBIndexConnectionDelegate::URLSessionDataTaskWillCacheResponse(
    const std::shared_ptr<platform::URLSession>& /*session*/,
    const std::shared_ptr<platform::URLSessionDataTask>& /*dataTask*/,
    const std::shared_ptr<const platform::CachedURLResponse>& proposedResponse,
    const CacheHandler& completionHandler) {
  ZEBLog(4, "willCacheResponse: %@",
         proposedResponse ? std::optional(proposedResponse->response()->URL()) : std::nullopt);
  completionHandler(proposedResponse);
}

void ZEBIndexConnectionDelegate::URLSessionDataTaskDidReceiveResponse(
    const std::shared_ptr<platform::URLSession>& /*session*/,
    const std::shared_ptr<platform::URLSessionDataTask>& dataTask,
    const std::shared_ptr<const platform::URLResponse>& response,
    const DispositionHandler& completionHandler) {
  const int status = response ? response->statusCode() : 0;
  ZEBLog(4, "Index download: did receive response %d for task %@ (request: %@)", status, dataTask,
         originalRequest(dataTask));
  if (status < firstErrorStatus || status > lastErrorStatus) {
    _response = response;
    completionHandler(platform::URLSessionResponseDisposition::allow);
    return;
  }
  _wasRefused = true;
  _index->setIsDownloading(false);
  _indexshelf->_generateSemanticIndexIfMissing(_book, _index);
  completionHandler(platform::URLSessionResponseDisposition::cancel);
}

void ZEBIndexConnectionDelegate::URLSessionDataTaskDidReceiveData(
    const std::shared_ptr<platform::URLSession>& /*session*/,
    const std::shared_ptr<platform::URLSessionDataTask>& /*dataTask*/, const platform::Data& data) {
  if (!_data) {
    _data.emplace();
  }
  _data->append(data.view());
}

void ZEBIndexConnectionDelegate::URLSessionTaskDidCompleteWithError(
    const std::shared_ptr<platform::URLSession>& /*session*/,
    const std::shared_ptr<platform::URLSessionDataTask>& task,
    const std::optional<platform::Error>& error) {
  if (error) {
    _sessionTaskDidFailWithError(task, *error);
  } else {
    _sessionTaskDidFinishLoading(task);
  }
}

void ZEBIndexConnectionDelegate::_sessionTaskDidFailWithError(
    const std::shared_ptr<platform::URLSessionDataTask>& task, const platform::Error& error) {
  if (platform::isURLError(error, platform::URLErrorResourceUnavailable) && _request &&
      _request->cachePolicy() == platform::URLRequestCachePolicy::returnCacheDataDontLoad) {
    ZEBLog(4, "Index wasn't in the cache; trying again remotely: %@", _requestURL());
    (void)_indexshelf->_startIndexFetch(_request->URL(), secondTryTimeout, _book, _index);
    return;
  }
  ZEBLog(4, "Index download: task %@ (%@) failed loading with error: %@", task,
         originalRequest(task), error);
  _index->setIsDownloading(false);
  // A refused answer has been seen to already; its cancellation is no second failure.
  if (!_wasRefused) {
    _indexshelf->_generateSemanticIndexIfMissing(_book, _index);
  }
}

void ZEBIndexConnectionDelegate::_sessionTaskDidFinishLoading(
    const std::shared_ptr<platform::URLSessionDataTask>& task) {
  const std::optional<platform::Data> received = data();
  const bool changed = received && (!_cachedData || *received != *_cachedData);
  if (changed) {
    _keep(*received);
  } else {
    _index->setIsDownloading(false);
  }
  if (!hasLuxIndexData(_index)) {
    ZEBLog(3, "Finished downloading index - no lux data so creating lux operation for %@",
           _requestURL());
    _indexshelf->_generateSemanticIndexIfMissing(_book, _index);
  } else if (changed) {
    ZEBLog(3, "Finished downloading index - has lux data so adding it to book for %@",
           _requestURL());
    _indexshelf->populateRemoteURLOfBook(_book);
    _indexshelf->_notifyObserversOfChange(ZEBIndexChangeUpdated, _index);
  }
  if (changed) {
    _storeInCache(task, *received);
  }
}

void ZEBIndexConnectionDelegate::_keep(const platform::Data& data) {
  (void)_index->reinitializeWithData(data);
  _index->setLoadedFromGeneratedCache(true);
  const std::string path = _generatedIndexPath().value_or(std::string());
  const auto files = platform::Environment::current()->files;
  const std::string folder = platform::stringByDeletingLastPathComponent(path);
  (void)files->createDirectoryWithParents(folder);
  platform::removeAbandonedFiles(folder);
  if (files->writeAtomically(path, data)) {
    ZEBLog(1, "Couldn't write updated index data to %@", path);
  } else if (_index->path() != path && _index->setPath(path)) {
    // What is remembered of a record over a restart is its file, and the queue of fetches, which
    // has it remembered, has drained by now.
    _indexshelf->archiveKnownIndices();
  }
}

void ZEBIndexConnectionDelegate::_storeInCache(
    const std::shared_ptr<platform::URLSessionDataTask>& task, const platform::Data& data) {
  const auto& process = platform::ProcessInfo::processInfo();
  process->disableSuddenTermination();
  if (_request && _response) {
    indexURLCache()->storeCachedResponse(
        platform::CachedURLResponse::initWithResponse(_response, data), *_request);
  }
  process->enableSuddenTermination();
  ZEBLog(4, "Index download: response has been cached for task %@ (%@)", task,
         originalRequest(task));
}
