#include "plugin/shelf/ZEBIndexshelf.h"

#include <algorithm>
#include <utility>

#include "host/Zebrine/ZEBConstants.h"
#include "host/Zebrine/ZEBGeneratedFiles.h"
#include "host/Zebrine/ZEBLog.h"
#include "host/Zebrine/ZEBPluginOwner.h"
#include "platform/Environment.h"
#include "platform/Files.h"
#include "plugin/operations/ZEBOperationQueue.h"
#include "plugin/records/ZEBHelpindexIndex.h"

int32_t ZEBIndexshelf::processorCoreCount() {
  return std::max(1, platform::Environment::current()->processorCount());
}

std::shared_ptr<ZEBIndexshelf> ZEBIndexshelf::initWithOwner(
    const std::shared_ptr<ZEBPluginOwner>& owner) {
  std::shared_ptr<ZEBIndexshelf> shelf(new ZEBIndexshelf(owner));
  shelf->_setUp();
  return shelf;
}

void ZEBIndexshelf::_setUp() {
  ZEBHelpindexIndex::registerArchiveClass();
  const std::shared_ptr<ZEBPluginOwner> host = owner();
  const std::optional<std::string> caches =
      host ? host->userHelpCachesDirectoryPath() : std::nullopt;
  {
    const platform::MonitorLock lock(_monitor);
    if (caches) {
      _cachePath = platform::stringByAppendingPathComponent(*caches, ZEBKnownIndicesFileName);
    }
  }
  if (std::optional<std::map<std::string, Indices>> known = unarchiveKnownIndices();
      known && !known->empty()) {
    const platform::MonitorLock lock(_monitor);
    _indices = std::move(*known);
  }

  const auto makeQueue = [](long limit) {
    std::shared_ptr<ZEBOperationQueue> queue = ZEBOperationQueue::init();
    queue->setMaxConcurrentOperationCount(limit);
    return queue;
  };
  _indexGeneratingQueue = makeQueue(1);
  _indexRegistrationQueue = makeQueue(1);
  _indexFetchUpdateQueue = makeQueue(1);
  _indexDownloadQueue = makeQueue(1);
  _assetDownloadQueue = makeQueue(ZEBOperationQueue::defaultMaxConcurrentOperationCount);
  _indicesSyncQueue = platform::DispatchQueue::concurrent(ZEBDaemonBundleID + ".indicesSyncQueue");

  const std::weak_ptr<ZEBIndexshelf> weak = weak_from_this();
  for (const auto& queue : {_indexGeneratingQueue, _indexFetchUpdateQueue, _indexDownloadQueue}) {
    queue->setCompletionBlock([weak] {
      if (const auto shelf = weak.lock()) {
        shelf->archiveKnownIndices();
      }
    });
  }
  _registrationObservation = platform::Environment::current()->notificationCenter->addObserver(
      QWBookRegistrationNotification,
      [weak](const platform::DistributedNotification& notification) {
        if (const auto shelf = weak.lock()) {
          shelf->_helpBookDidChange(notification);
        }
      });
}

ZEBIndexshelf::~ZEBIndexshelf() = default;

void ZEBIndexshelf::setShouldBeLazy(bool shouldBeLazy) {
  const long limit = shouldBeLazy ? 1 : processorCoreCount();
  const platform::MutexLock lock(_lazyMutex);
  _shouldBeLazy = shouldBeLazy;
  _indexGeneratingQueue->setMaxConcurrentOperationCount(limit);
}

void ZEBIndexshelf::addObserver(const std::shared_ptr<ZEBIndexshelfObserver>& observer) {
  const platform::MonitorLock lock(_changeObserversMonitor);
  _changeObservers.push_back(observer);
}

std::map<std::string, ZEBIndexshelf::Indices> ZEBIndexshelf::_knownIndices() const {
  const platform::MonitorLock lock(_monitor);
  return _indices;
}

size_t ZEBIndexshelf::_pendingBookCount() const {
  const platform::MonitorLock lock(_pendingMonitor);
  return _booksToBeRegistered.size();
}

std::optional<std::string> ZEBIndexshelf::_helpIndexCachePath() const {
  const platform::MonitorLock lock(_monitor);
  return _cachePath;
}

void ZEBIndexshelf::_notifyObserversOfChange(ZEBIndexChange change,
                                             const std::shared_ptr<ZEBIndex>& forIndex) {
  std::vector<std::shared_ptr<ZEBIndexshelfObserver>> observers;
  {
    const platform::MonitorLock lock(_changeObserversMonitor);
    observers = _changeObservers;
  }
  for (const auto& observer : observers) {
    observer->indexDidChange(forIndex, change);
  }
  platform::Environment::current()->notificationCenter->postNotification(
      "ZEBIndexDidChangeNotification", std::nullopt);
}

void ZEBIndexshelf::_addIndex(const std::shared_ptr<ZEBIndex>& index,
                              const std::string& forBookID) {
  const platform::MonitorLock lock(_monitor);
  _indices[forBookID] = {index};
}

std::optional<std::string> ZEBIndexshelf::_generatedIndexPathForBookID(
    const std::optional<std::string>& bookID, const std::optional<std::string>& withLocalization) {
  return _generatedFilePathForBookID(bookID, withLocalization, ZEBHelpindexExtension);
}

std::optional<std::string> ZEBIndexshelf::_generatedExactMatchPathForBookID(
    const std::optional<std::string>& bookID, const std::optional<std::string>& withLocalization) {
  return _generatedFilePathForBookID(bookID, withLocalization, ZEBExactMatchListExtension);
}

std::optional<std::string> ZEBIndexshelf::_generatedFilePathForBookID(
    const std::optional<std::string>& bookID, const std::optional<std::string>& withLocalization,
    std::string_view andExtension) {
  if (!bookID || bookID->empty()) {
    return std::nullopt;
  }
  std::optional<std::string> folder;
  {
    const platform::MutexLock lock(_generatedIndexDirMutex);
    if (!_generatedIndexDir) {
      _generatedIndexDir = ZEBGeneratedRoot();
    }
    folder = _generatedIndexDir;
  }
  if (!folder) {
    return std::nullopt;
  }
  return ZEBGeneratedFilePath(*folder, *bookID, withLocalization.value_or(""), andExtension);
}
