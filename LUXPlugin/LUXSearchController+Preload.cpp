#include <algorithm>

#include "LUXPlugin/LUXSearchController.h"
#include "host/Luxwell/HelpLUXModel.h"
#include "host/Zebrine/ZEBConstants.h"
#include "host/Zebrine/ZEBLog.h"
#include "platform/Environment.h"
#include "plugin/shelf/ShutdownGuard.h"

namespace {

constexpr platform::Seconds pause{0.1};
constexpr int maximumWaits = 600;

void sleepForPause() { platform::Environment::current()->clock->sleep(pause); }

bool viewerIsRunning() {
  const std::vector<std::string> running = platform::Environment::current()->runningApplications();
  return std::find(running.begin(), running.end(), ZEBKestrelBundleID) != running.end();
}

}  // namespace

void LUXSearchController::loadLUXModels() {
  if (_isLoading) {
    return;
  }
  const ShutdownGuard guard(owner());
  _isLoading = true;
  ZEBLog(3, "Waiting to start loading");
  const bool shouldLoad = (viewerIsRunning() || !_isQueryInProgress) && _waitForQuietRegistry();
  ZEBLog(3, "Starting preload");
  std::vector<std::string> openedGroups;
  const std::string language = currentLanguageFolderName();
  const bool completed =
      shouldLoad && _openModels(language, openedGroups) && _loadModels(language, openedGroups);
  for (const std::string& group : openedGroups) {
    if (const auto model = modelForGroupName(group, language, false, kLUXModelActivityPreloading)) {
      model->currentThreadIsAboutToComplete();
      finishedActivity(kLUXModelActivityPreloading, group, language);
    }
  }
  if (completed) {
    _hasFinalizedStartup = true;
  }
  _isLoading = false;
}

/// Whether models may be loaded: nobody holds one any more, and no query has begun.
bool LUXSearchController::_waitForQuietRegistry() const {
  for (int waits = 1;; ++waits) {
    {
      const platform::MonitorLock lock(_registryMonitor);
      if (std::all_of(_activeLUXModels.begin(), _activeLUXModels.end(), [](const auto& entry) {
            return entry.second->activity() <= kLUXModelActivityNone;
          })) {
        break;
      }
    }
    sleepForPause();
    if (_isQueryInProgress || waits == maximumWaits) {
      return false;
    }
  }
  return !_isQueryInProgress;
}

bool LUXSearchController::_openModels(const std::string& language,
                                      std::vector<std::string>& openedGroups) {
  for (const std::string& group : HelpLUXModel::allModelGroupNames()) {
    if (const auto model = modelForGroupName(group, language, true, kLUXModelActivityPreloading)) {
      (void)model->suggestions();
      openedGroups.push_back(group);
      finishedActivity(kLUXModelActivityPreloading, group, language);
    }
    sleepForPause();
    if (_isQueryInProgress) {
      ZEBLog(3, "Bailing preload while opening models");
      return false;
    }
  }
  return true;
}

bool LUXSearchController::_loadModels(const std::string& language,
                                      const std::vector<std::string>& openedGroups) {
  for (const std::string& group : openedGroups) {
    if (const auto model = modelForGroupName(group, language, true, kLUXModelActivityPreloading)) {
      model->loadLSMMap();
      finishedActivity(kLUXModelActivityPreloading, group, language);
    }
    sleepForPause();
    if (_isQueryInProgress) {
      ZEBLog(3, "Bailing preload while loading models");
      return false;
    }
  }
  return true;
}
