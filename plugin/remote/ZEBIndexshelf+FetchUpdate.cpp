#include <optional>
#include <utility>

#include "host/Zebrine/ZEBCacheManager.h"
#include "host/Zebrine/ZEBHelpBook.h"
#include "platform/URL.h"
#include "platform/URLSession.h"
#include "plugin/operations/ZEBOperationQueue.h"
#include "plugin/records/ZEBHelpindexIndex.h"
#include "plugin/remote/ZEBIndexConnectionDelegate.h"
#include "plugin/shelf/ZEBIndexGenerationOperation.h"
#include "plugin/shelf/ZEBIndexshelf.h"

namespace {

constexpr platform::Seconds fetchTimeout{60.0};

}  // namespace

void ZEBIndexshelf::_startFetchingUpdatedIndexForType3BookWithParams(
    const ZEBIndexFetchParameters& params) {
  const std::vector<std::string> indexPaths =
      params.book ? params.book->indexPaths() : std::vector<std::string>();
  if (indexPaths.empty()) {
    return;
  }
  const platform::URL local = platform::URL::fileURLWithPath(indexPaths.front());
  const auto remote = ZEBCacheManager::remoteURLForLocalURL(local, params.book);
  if (!remote || !_startIndexFetch(*remote, fetchTimeout, params.book, params.existingIndex)) {
    _generateSemanticIndexIfMissing(params.book, params.existingIndex);
  }
}

bool ZEBIndexshelf::_startIndexFetch(const platform::URL& url, platform::Seconds timeout,
                                     const std::shared_ptr<ZEBHelpBook>& book,
                                     const std::shared_ptr<ZEBIndex>& existingIndex) {
  auto request = platform::URLRequest::requestWithURL(
      url, platform::URLRequestCachePolicy::useProtocolCachePolicy, timeout);
  if (!request || !existingIndex) {
    return false;
  }
  request->setHTTPShouldHandleCookies(false);
  existingIndex->setIsDownloading(true);
  const auto session = platform::URLSession::sessionWithConfiguration(
      platform::URLSessionConfiguration::defaultSessionConfiguration(),
      ZEBIndexConnectionDelegate::delegateWithIndex(existingIndex, shared_from_this(), book),
      platform::DispatchQueue::main());
  const auto task = session->dataTaskWithRequest(std::move(*request));
  if (!task) {
    existingIndex->setIsDownloading(false);
    return false;
  }
  task->resume();
  // The session goes when its one task has ended.
  session->finishTasksAndInvalidate();
  return true;
}

void ZEBIndexshelf::_generateSemanticIndexIfMissing(
    const std::shared_ptr<ZEBHelpBook>& book, const std::shared_ptr<ZEBIndex>& existingIndex) {
  const auto existing = std::dynamic_pointer_cast<ZEBHelpindexIndex>(existingIndex);
  if (existing && existing->luxIndexData()) {
    return;
  }
  const auto operation =
      ZEBIndexGenerationOperation::initWithBook(book, existingIndex, shared_from_this(), true);
  const platform::MonitorLock lock(_monitor);
  _indexGeneratingQueue->addOperation(operation);
}
