#include "zebd/Host.h"

#include <algorithm>
#include <cstdlib>
#include <utility>

#include "host/Luxwell/HelpLUXModel.h"
#include "host/Zebrine/RNXObjectManager.h"
#include "host/Zebrine/ZEBConstants.h"
#include "host/Zebrine/ZEBHelpBook.h"
#include "host/Zebrine/ZEBPlugin.h"
#include "host/Zebrine/ZEBQuery.h"
#include "platform/Environment.h"
#include "platform/ProcessInfo.h"
#include "platform/RunLoop.h"
#include "platform/UserDefaults.h"
#include "platform/WorkerThreads.h"
#include "zebd/PluginLoader.h"

namespace zebd {

namespace {

/// Indexing tools take the blanks from the ends of anchors, so no page carries this one.
constexpr const char* anchorOfNoPage = " ";

/// The setting with the group list.
constexpr const char* modelGroupsKey = "ModelGroups";

/// How soon the main thread notices what no block of its loop tells it.
constexpr platform::Seconds pace{0.01};

/// For a file that is being written; no more than somebody who ends a program waits for.
constexpr platform::Seconds patienceAtTheEnd{5};

}  // namespace

Host::Host(std::shared_ptr<Bookshelf> bookshelf, std::shared_ptr<Owner> owner)
    : _bookshelf(std::move(bookshelf)),
      _owner(std::move(owner)),
      _searches(platform::DispatchQueue::serial(ZEBDaemonBundleID + ".searches")) {}

Host::~Host() { _owner->setBookModifiedHandler(nullptr); }

std::unique_ptr<Host> Host::start(const std::string& pluginBundlePath, OwnerSettings settings,
                                  platform::Error& error) {
  if (const auto defaults = platform::Environment::current()->userDefaults) {
    HelpLUXModel::setGroupList(defaults->valueForKey(modelGroupsKey));
  }
  const auto bookshelf = std::make_shared<Bookshelf>();
  std::unique_ptr<Host> host(
      new Host(bookshelf, std::make_shared<Owner>(bookshelf, std::move(settings))));
  host->_plugin = loadPlugin(pluginBundlePath, host->_owner, error);
  return host->_plugin == nullptr ? nullptr : std::move(host);
}

void Host::startSearch(const std::shared_ptr<ZEBQuery>& query,
                       std::shared_ptr<SearchReceiver> receiver) {
  _owner->beginSearch(query->queryID(), std::move(receiver));
  _searches->async([owner = _owner, plugin = _plugin, query] {
    // A search reports its own failures; what comes through all the same must not keep the receiver
    // waiting.
    platform::runLoggingExceptions([&] { plugin->startSearchForQuery(query); });
    owner->endSearch(query->queryID());
    plugin->completeSearchForQuery(query);
  });
}

void Host::registerBooks(const std::vector<std::string>& bookIDs,
                         std::shared_ptr<SearchReceiver> receiver) {
  const auto query = ZEBQuery::initWithQueryString(anchorOfNoPage);
  query->setScope(bookIDs);
  query->setResultTypes({ZEBHelpArticleResult});
  query->setOptions(platform::Value::Dictionary{{ZEBQueryAnchorSearchOptionKey, true}});
  startSearch(query, std::move(receiver));
}

void Host::announceBooks() {
  for (const auto& entry : _bookshelf->books()) {
    _plugin->finishPopulatingBookWithID(entry.first);
  }
  _plugin->finishPopulatingKnownBooks();
}

void Host::userLanguagesDidChange() {
  const auto service = RNXObjectManager::sharedObjectManager();
  for (const auto& entry : _bookshelf->books()) {
    if (entry.second->type() == ZEBHelpBookType4) {
      // What the service said of it was said for the former languages.
      entry.second->setRemoteBookInfo({});
      service->takeLocalization(entry.second);
    }
  }
  lookAtBooksAnew();
}

void Host::lookAtBooksAnew() {
  _plugin->notifyEvent(ZEBPluginEventLanguageChanged, {});
  announceBooks();
}

void Host::removeIndexOfBook(const std::string& bookID) {
  _plugin->removeIndexForBookWithID(bookID);
}

bool Host::runMainLoopUntil(const std::function<bool()>& condition, platform::Seconds limit) {
  const auto clock = platform::Environment::current()->clock;
  const platform::Clock::Instant deadline = clock->elapsed() + limit;
  while (!condition()) {
    const platform::Clock::Instant now = clock->elapsed();
    if (now >= deadline) {
      return false;
    }
    platform::RunLoop::main()->runFor(std::min(pace, platform::Seconds(deadline - now)));
  }
  return true;
}

void Host::endProcess(int status) {
  platform::ProcessInfo::processInfo()->waitUntilSuddenTerminationIsEnabled(patienceAtTheEnd);
  std::_Exit(status);
}

}  // namespace zebd
