#include "LUXPlugin/LUXSearchController.h"

#include <algorithm>
#include <utility>

#include "host/Luxwell/HelpLUXIndex.h"
#include "host/Luxwell/HelpLUXModel.h"
#include "host/Luxwell/HelpTokenizer.h"
#include "host/Zebrine/ZEBHelpBook.h"
#include "host/Zebrine/ZEBLog.h"
#include "host/Zebrine/ZEBPluginOwner.h"
#include "platform/Environment.h"
#include "platform/Files.h"
#include "platform/OperationQueue.h"
#include "plugin/records/ZEBHelpindexIndex.h"

namespace {

constexpr platform::Seconds acquisitionPause{0.1};

std::string registryKey(const std::string& modelGroupName, const std::string& language) {
  return ZEBStringWithFormat("%@_%@", modelGroupName, language);
}

std::shared_ptr<platform::OperationQueue> makeSerialQueue() {
  std::shared_ptr<platform::OperationQueue> queue = platform::OperationQueue::init();
  queue->setMaxConcurrentOperationCount(1);
  return queue;
}

}  // namespace

LUXSearchController::LUXSearchController(const std::shared_ptr<ZEBPluginOwner>& owner)
    : _pluginOwner(owner),
      _runLoop(platform::RunLoop::current()),
      _serialModelUpdateQueue(makeSerialQueue()) {}

LUXSearchController::~LUXSearchController() = default;

std::shared_ptr<LUXSearchController> LUXSearchController::initWithOwner(
    const std::shared_ptr<ZEBPluginOwner>& owner) {
  return std::shared_ptr<LUXSearchController>(new LUXSearchController(owner));
}

std::shared_ptr<LUXSearchController> LUXSearchController::init() { return initWithOwner(nullptr); }

std::shared_ptr<ZEBIndexshelf> LUXSearchController::indexshelf() const {
  const platform::MonitorLock lock(_monitor);
  return _indexshelf;
}

void LUXSearchController::setIndexshelf(const std::shared_ptr<ZEBIndexshelf>& indexshelf) {
  {
    const platform::MonitorLock lock(_monitor);
    _indexshelf = indexshelf;
  }
  if (indexshelf) {
    indexshelf->addObserver(shared_from_this());
  }
}

void LUXSearchController::useShorterTimeouts(bool useShorterTimeouts) {
  _acquisitionTimeout = useShorterTimeouts ? 1 : 8;
  _searchTimeout = useShorterTimeouts ? 1 : 16;
}

void LUXSearchController::completeSearchQuery(const std::shared_ptr<ZEBQuery>& /*query*/) {
  const platform::MonitorLock lock(_monitor);
  _searchResults.clear();
}

std::shared_ptr<HelpLUXModel> LUXSearchController::modelForGroupName(
    const std::string& modelGroupName, const std::string& language, bool createIfNecessary,
    int activity) {
  const std::string key = registryKey(modelGroupName, language);
  const platform::MonitorLock lock(_registryMonitor);
  const auto found = _activeLUXModels.find(key);
  std::shared_ptr<HelpLUXModel> model = found == _activeLUXModels.end() ? nullptr : found->second;
  if (!model && createIfNecessary) {
    model = HelpLUXModel::initWithDirectoryPath(
        HelpLUXModel::directoryPathForModelGroupName(modelGroupName, language), language);
    if (model) {
      _activeLUXModels[key] = model;
    }
  }
  if (!model || model->activity() != kLUXModelActivityNone) {
    return nullptr;
  }
  model->setActivity(activity);
  if (activity == kLUXModelActivityBuilding) {
    _markAsBuilding(*model, modelGroupName, language);
  }
  return model;
}

void LUXSearchController::_markAsBuilding(const HelpLUXModel& model,
                                          const std::string& modelGroupName,
                                          const std::string& language) {
  const platform::MonitorLock lock(_registryMonitor);
  auto& mark = _buildMarks[registryKey(modelGroupName, language)];
  if (!mark) {
    mark = platform::Environment::current()->files->markFolder(model.modelDirectoryPath());
  }
}

std::shared_ptr<HelpLUXModel> LUXSearchController::aquiredModelWithGroupName(
    const std::string& modelGroupName, const std::string& language, int forActivity,
    double maxWaitInterval) {
  const std::shared_ptr<platform::Clock> clock = platform::Environment::current()->clock;
  const platform::Clock::Instant start = clock->elapsed();
  while (clock->elapsed() - start < platform::Seconds(maxWaitInterval)) {
    std::shared_ptr<HelpLUXModel> model;
    {
      const platform::MonitorLock lock(_registryMonitor);
      const bool isFree =
          _activityForModelGroupName(modelGroupName, language) == kLUXModelActivityNone;
      const bool mustWaitForBuild = forActivity == kLUXModelActivityBuilding &&
                                    activeModelCountWithActivity(kLUXModelActivityBuilding) != 0;
      if (isFree && !mustWaitForBuild) {
        model = modelForGroupName(modelGroupName, language, true, forActivity);
      }
    }
    if (model) {
      return model;
    }
    clock->sleep(acquisitionPause);
  }
  return nullptr;
}

void LUXSearchController::finishedActivity(int activity, const std::string& modelGroupName,
                                           const std::string& language) {
  const platform::MonitorLock lock(_registryMonitor);
  if (activity == kLUXModelActivityBuilding) {
    _buildMarks.erase(registryKey(modelGroupName, language));
  }
  const auto found = _activeLUXModels.find(registryKey(modelGroupName, language));
  if (found == _activeLUXModels.end()) {
    return;
  }
  const int current = found->second->activity();
  if (current != activity) {
    ZEBLog(3,
           "Attemping to finish wrong activity. Current model activity: %d, trying to finish "
           "activity: %d",
           current, activity);
  } else {
    found->second->setActivity(kLUXModelActivityNone);
  }
  if (activity == kLUXModelActivityBuilding) {
    _activeLUXModels.erase(found);
  }
}

size_t LUXSearchController::activeModelCountWithActivity(int activity) const {
  const platform::MonitorLock lock(_registryMonitor);
  return static_cast<size_t>(
      std::count_if(_activeLUXModels.begin(), _activeLUXModels.end(),
                    [&](const auto& entry) { return entry.second->activity() == activity; }));
}

int LUXSearchController::_activityForModelGroupName(const std::string& modelGroupName,
                                                    const std::string& language) const {
  const platform::MonitorLock lock(_registryMonitor);
  const auto found = _activeLUXModels.find(registryKey(modelGroupName, language));
  return found == _activeLUXModels.end() ? kLUXModelActivityNone : found->second->activity();
}

std::map<std::string, int> LUXSearchController::_registeredModels() const {
  std::map<std::string, int> models;
  const platform::MonitorLock lock(_registryMonitor);
  for (const auto& entry : _activeLUXModels) {
    models.emplace(entry.first, entry.second->activity());
  }
  return models;
}

std::shared_ptr<HelpLUXIndex> LUXSearchController::_luxIndexForHelpbookIdentifier(
    const std::optional<std::string>& helpbookIdentifier) {
  if (!helpbookIdentifier) {
    return nullptr;
  }
  {
    const platform::MonitorLock lock(_indexFileObjectMonitor);
    const auto found = _indexFileObjectForHelpbookTable.find(*helpbookIdentifier);
    if (found != _indexFileObjectForHelpbookTable.end()) {
      return found->second;
    }
  }
  const std::shared_ptr<ZEBPluginOwner> host = owner();
  const std::shared_ptr<ZEBIndexshelf> shelf = indexshelf();
  std::shared_ptr<HelpLUXIndex> index;
  if (host && shelf) {
    const std::shared_ptr<ZEBHelpBook> book = host->bookWithID(*helpbookIdentifier);
    shelf->ensureRegistrationForBook(book);
    const ZEBIndexshelf::Indices indices = shelf->indicesForBook(book);
    if (!indices.empty()) {
      if (const auto record = std::dynamic_pointer_cast<ZEBHelpindexIndex>(indices.front())) {
        index = record->luxIndex();
      }
    }
  }
  if (!index) {
    ZEBLog(5, "Didn't find lux index for book ID: %@", *helpbookIdentifier);
    return nullptr;
  }
  const platform::MonitorLock lock(_indexFileObjectMonitor);
  _indexFileObjectForHelpbookTable[*helpbookIdentifier] = index;
  return index;
}

std::string LUXSearchController::currentLanguageFolderName() {
  const auto environment = platform::Environment::current();
  for (const std::string& language : environment->preferredLanguages) {
    if (const auto localization = HelpTokenizer::luxLocalizationForLanguage(language)) {
      return *localization;
    }
  }
  return "English";
}
