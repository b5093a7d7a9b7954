#include <optional>

#include "host/Zebrine/ZEBCacheManager.h"
#include "host/Zebrine/ZEBHelpBook.h"
#include "platform/URL.h"
#include "plugin/operations/ZEBOperationQueue.h"
#include "plugin/records/ZEBHelpindexIndex.h"
#include "plugin/shelf/ZEBIndexGenerationOperation.h"
#include "plugin/shelf/ZEBIndexshelf.h"

void ZEBIndexshelf::_startFetchingUpdatedIndexForType3BookWithParams(
    const ZEBIndexFetchParameters& params) {
  const std::vector<std::string> indexPaths =
      params.book ? params.book->indexPaths() : std::vector<std::string>();
  if (indexPaths.empty()) {
    return;
  }
  const platform::URL local = platform::URL::fileURLWithPath(indexPaths.front());
  const auto existing = std::dynamic_pointer_cast<ZEBHelpindexIndex>(params.existingIndex);
  const bool hasLuxData = existing && existing->luxIndexData();
  if (!ZEBCacheManager::remoteURLForLocalURL(local, params.book) && !hasLuxData) {
    const auto operation = ZEBIndexGenerationOperation::initWithBook(
        params.book, params.existingIndex, shared_from_this(), true);
    const platform::MonitorLock lock(_monitor);
    _indexGeneratingQueue->addOperation(operation);
  }
}
