#include <algorithm>
#include <exception>
#include <utility>

#include "LUXPlugin/HelpLUXModel+ZEBAdditions.h"
#include "LUXPlugin/LUXSearchController.h"
#include "host/Luxwell/HelpLUXIndex.h"
#include "host/Zebrine/ZEBLog.h"
#include "host/Zebrine/ZEBPluginOwner.h"
#include "platform/ClassicArchive.h"
#include "platform/DispatchQueue.h"
#include "platform/Environment.h"
#include "platform/Files.h"
#include "platform/OperationQueue.h"
#include "platform/WorkerThreads.h"
#include "plugin/operations/ZEBOperationQueue.h"
#include "plugin/records/ZEBHelpindexIndex.h"
#include "plugin/shelf/ShutdownGuard.h"

namespace {

constexpr platform::Seconds quietPeriod{1.0};
constexpr platform::Seconds busyPause{1.0};
constexpr double buildAcquisitionWait = 5.0;

/// One pass at a time in the whole process, at background priority.
const std::shared_ptr<platform::DispatchQueue>& modelSyncQueue() {
  // Never destroyed: worker threads may outlast every static object.
  static const auto& queue = *new auto(
      platform::DispatchQueue::serial("modelSyncQueue", platform::ThreadPriority::background));
  return queue;
}

}  // namespace

std::map<std::string, int32_t> LUXSearchController::_pendingIndexEvents() const {
  const platform::MonitorLock lock(_pendingMonitor);
  return _pendingIndexEventsTable;
}

void LUXSearchController::_schedulePendingSync() {
  _pendingIndexModelSync = _runLoop->performAfterDelay(quietPeriod, [weak = weak_from_this()] {
    if (const auto controller = weak.lock()) {
      controller->processPendingIndexEvents();
    }
  });
}

void LUXSearchController::indexDidChange(const std::shared_ptr<ZEBIndex>& index,
                                         ZEBIndexChange didChange) {
  if (const auto record = std::dynamic_pointer_cast<ZEBHelpindexIndex>(index);
      record && !record->shouldUseLUXIndex()) {
    return;
  }
  const std::optional<std::string> bookID = index ? index->bookID() : std::nullopt;
  if (!bookID) {
    return;
  }
  const platform::MonitorLock lock(_pendingMonitor);
  const auto stored = _pendingIndexEventsTable.find(*bookID);
  if (didChange <= (stored == _pendingIndexEventsTable.end() ? 0 : stored->second)) {
    return;
  }
  _pendingIndexEventsTable[*bookID] = didChange;
  if (_pendingIndexModelSync) {
    _pendingIndexModelSync->invalidate();
  }
  _schedulePendingSync();
}

void LUXSearchController::processPendingIndexEvents() {
  {
    const platform::MonitorLock lock(_pendingMonitor);
    _pendingIndexModelSync.reset();
  }
  // Not under the pending table's lock: a removal comes here under the shelf's.
  size_t generating = 0;
  if (const auto shelf = indexshelf()) {
    const platform::MonitorLock lock(shelf->_shelfMonitor());
    generating = shelf->indexGeneratingQueue()->operationCount();
  }
  if (generating > 0) {
    const platform::MonitorLock lock(_pendingMonitor);
    if (_pendingIndexModelSync) {
      _pendingIndexModelSync->invalidate();
    }
    _schedulePendingSync();
    return;
  }
  modelSyncQueue()->async([controller = shared_from_this()] {
    platform::setCurrentThreadName("lux-model-sync");
    controller->_syncModelsWithIndexEvents();
  });
}

void LUXSearchController::_syncModelsWithIndexEvents() {
  const ShutdownGuard guard(owner());
  if (const auto shelf = indexshelf()) {
    for (const auto& queue : {shelf->indexRegistrationQueue(), shelf->indexGeneratingQueue(),
                              shelf->indexDownloadQueue(), shelf->assetDownloadQueue()}) {
      queue->waitUntilAllOperationsAreFinished();
    }
  }
  _serialModelUpdateQueue->waitUntilAllOperationsAreFinished();
  while (_isQueryInProgress || _isLoading) {
    platform::Environment::current()->clock->sleep(busyPause);
  }
  const platform::MutexLock lock(_syncModelsLock);
  try {
    _synchronise();
  } catch (const std::exception& exception) {
    ZEBLog(0, "%@", exception);
  }
}

void LUXSearchController::_synchronise() {
  const std::map<std::string, int32_t> events = _pendingIndexEvents();
  std::map<std::string, std::vector<std::string>> groups;
  for (const auto& event : events) {
    const std::string group = zeb_modelGroupNameForHelpbookID(event.first);
    if (!group.empty()) {
      groups[group].push_back(event.first);
    }
  }
  const std::string language = currentLanguageFolderName();
  bool rebuiltAny = false;
  for (const auto& group : groups) {
    if (!_synchroniseGroup(group.first, group.second, events, language, rebuiltAny)) {
      continue;
    }
    const platform::MonitorLock lock(_pendingMonitor);
    for (const std::string& bookID : group.second) {
      _pendingIndexEventsTable.erase(bookID);
      const platform::MonitorLock indexLock(_indexFileObjectMonitor);
      _indexFileObjectForHelpbookTable.erase(bookID);
    }
  }
  const std::shared_ptr<ZEBPluginOwner> host = owner();
  if (rebuiltAny && !_hasFinalizedStartup && host && !host->shouldBeLazy() &&
      host->userLoggedIn()) {
    platform::startNamedThread("lux-model-load",
                               [controller = shared_from_this()] { controller->loadLUXModels(); });
  }
}

/// Whether the group was processed: its model was to be had.
bool LUXSearchController::_synchroniseGroup(const std::string& modelGroupName,
                                            const std::vector<std::string>& helpbookIDs,
                                            const std::map<std::string, int32_t>& events,
                                            const std::string& language, bool& rebuiltAny) {
  bool processed = false;
  const auto operation = platform::BlockOperation::blockOperationWithBlock([&] {
    const auto model = aquiredModelWithGroupName(modelGroupName, language,
                                                 kLUXModelActivityBuilding, buildAcquisitionWait);
    if (!model) {
      return;
    }
    const std::vector<std::string> known = model->allHelpbookIDs();
    const bool rebuilds =
        std::any_of(helpbookIDs.begin(), helpbookIDs.end(), [&](const std::string& bookID) {
          return events.at(bookID) > ZEBIndexChangeAdded ||
                 std::find(known.begin(), known.end(), bookID) == known.end();
        });
    if (rebuilds) {
      rebuiltAny = true;
      (void)updateExistingModel(model, language, modelGroupName);
    } else {
      finishedActivity(kLUXModelActivityBuilding, modelGroupName, language);
    }
    processed = true;
  });
  operation->setQueuePriority(platform::Operation::Priority::veryLow);
  _serialModelUpdateQueue->addOperation(operation);
  operation->waitUntilFinished();
  return processed;
}

std::string LUXSearchController::_savedIndexDataFolder(const std::string& modelPath) {
  return platform::stringByAppendingPathComponent(modelPath, "HelpLUXIndexFile");
}

bool LUXSearchController::_saveVersionedLUXIndexData(const std::optional<platform::Data>& data,
                                                     const std::string& bookIdentifier,
                                                     const std::string& atLUXModelPath) {
  const auto files = platform::Environment::current()->files;
  const std::string folder = _savedIndexDataFolder(atLUXModelPath);
  if (!files->fileExistsAtPath(folder)) {
    if (const auto error = files->createDirectory(folder)) {
      ZEBLog(3, "Couldn't create directory %@", folder);
      ZEBLog(3, "%@", *error);
      return false;
    }
  }
  const std::string path = platform::stringByAppendingPathComponent(folder, bookIdentifier);
  const auto write = [&] {
    try {
      const platform::Data bytes = platform::classicArchiveWithRootObject(
          platform::Value::Dictionary{{"LUXIndexData", data.value_or(platform::Data())}});
      return !files->writeAtomically(path, bytes).has_value();
    } catch (const std::exception&) {
      return false;
    }
  };
  if (!write()) {
    ZEBLog(3, "Couldn't write LUX index to %@", path);
    return false;
  }
  return true;
}
