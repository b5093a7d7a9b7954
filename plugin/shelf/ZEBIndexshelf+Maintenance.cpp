#include "host/Zebrine/ZEBGeneratedFiles.h"
#include "host/Zebrine/ZEBLog.h"
#include "platform/Environment.h"
#include "platform/Files.h"
#include "plugin/operations/ZEBOperationQueue.h"
#include "plugin/records/ZEBIndex.h"
#include "plugin/shelf/ZEBIndexshelf.h"

namespace {

/// Deletes what was generated for a book, never the root of all that is generated nor anything
/// outside it, whatever an identifier looks like: paths are compared in their standardised form.
void deleteGeneratedFolder(const std::optional<std::string>& folder,
                           const std::optional<std::string>& generatedRoot) {
  if (!folder || !generatedRoot) {
    return;
  }
  const auto files = platform::Environment::current()->files;
  const std::string path = platform::stringByStandardizingPath(*folder);
  const std::string root = platform::stringByStandardizingPath(*generatedRoot);
  // With the slash, so that the root's own name as the beginning of a neighbour's does not count.
  const bool isInside = path.starts_with(root + "/");
  if (isInside && files->fileExistsAtPath(path) && !files->removeItem(path)) {
    ZEBLog(4, "Successfully deleted outdated cached index at %@", *folder);
  }
}

}  // namespace

void ZEBIndexshelf::removeIndexForBookID(const std::string& bookID) {
  const platform::MonitorLock lock(_monitor);
  std::shared_ptr<ZEBIndex> record;
  const auto known = _indices.find(bookID);
  if (known != _indices.end() && !known->second.empty()) {
    record = known->second.front();
  }
  std::optional<std::string> folder;
  if (record) {
    const std::optional<std::string> path = record->path();
    if (record->loadedFromGeneratedCache() && path) {
      folder = platform::stringByDeletingLastPathComponent(*path);
    }
  } else if (const auto path = _generatedIndexPathForBookID(bookID, std::nullopt)) {
    folder = platform::stringByDeletingLastPathComponent(*path);
  }
  deleteGeneratedFolder(folder, ZEBGeneratedRoot());
  if (!record) {
    record = ZEBIndex::init();
    record->setBookID(bookID);
  }
  _notifyObserversOfChange(ZEBIndexChangeRemoved, record);
  _indices.erase(bookID);
}

void ZEBIndexshelf::_helpBookDidChange(const platform::DistributedNotification& notification) {
  if (notification.object) {
    removeIndexForBookID(*notification.object);
  }
}

void ZEBIndexshelf::_resetForLanguageChange() {
  const platform::MonitorLock lock(_monitor);
  for (const auto& queue : {_indexFetchUpdateQueue, _indexGeneratingQueue, _indexRegistrationQueue,
                            _indexDownloadQueue, _assetDownloadQueue}) {
    queue->cancelAllOperations();
  }
  _indices.clear();
  clearIndexCache();
  _cachePath.reset();
}

void ZEBIndexshelf::clearIndexCache() {
  const std::optional<std::string> path = _helpIndexCachePath();
  const auto files = platform::Environment::current()->files;
  if (!path || !files->fileExistsAtPath(*path)) {
    return;
  }
  ZEBLog(2, "Clearing index cache...");
  if (const auto error = files->removeItem(*path)) {
    ZEBLog(1, "Error clearing the index cache at %@: %@", *path, *error);
  } else {
    ZEBLog(2, "Index Cache cleared at path: %@", *path);
  }
}
