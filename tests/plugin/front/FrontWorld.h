// A plug-in with a recording host, books with real indexes, a clock that stands still and a log.
#pragma once

#include <gmock/gmock.h>

#include <atomic>
#include <functional>
#include <memory>
#include <string>
#include <thread>
#include <utility>
#include <vector>

#include "host/Luxwell/HelpLUXModel.h"
#include "host/Zebrine/ZEBConstants.h"
#include "host/Zebrine/ZEBHelpBook.h"
#include "host/Zebrine/ZEBLog.h"
#include "host/Zebrine/ZEBQuery.h"
#include "host/Zebrine/ZEBResult.h"
#include "platform/DistributedNotificationCenter.h"
#include "platform/Environment.h"
#include "platform/OperationQueue.h"
#include "platform/Processes.h"
#include "platform/PropertyList.h"
#include "platform/RunLoop.h"
#include "plugin/front/HelpPluginController.h"
#include "plugin/operations/ZEBOperationQueue.h"
#include "plugin/records/ZEBHelpindexIndex.h"
#include "plugin/shelf/ZEBIndexshelf.h"
#include "tests/plugin/HelpIndexWorld.h"
#include "tests/plugin/front/RecordingOwner.h"
#include "tests/plugin/front/ScriptedSemantics.h"

namespace tests {

/// Starts nothing, and counts how often it was asked to.
class CountingLauncher : public platform::ProcessLauncher {
 public:
  int launchAndWait(const std::string&, const std::vector<std::string>&) override {
    ++launches;
    return 1;
  }
  std::atomic<int> launches{0};
};

class NoProcesses : public platform::ProcessTable {
 public:
  int readProcesses(std::vector<platform::ProcessEntry>& entries) const override {
    entries.clear();
    return 0;
  }
};

/// A clock that stands still, unless a test lets it follow whoever sleeps: then nobody really
/// waits, and every sleep is written down. Following is for tests with one thread that sleeps.
class FollowingClock : public platform::SimulatedClock {
 public:
  using SimulatedClock::SimulatedClock;

  void sleep(platform::Seconds duration) override {
    if (!follows) {
      SimulatedClock::sleep(duration);
      return;
    }
    sleeps.push_back(duration.count());
    if (onSleep) {
      onSleep();
    }
    advance(duration);
  }

  std::atomic<bool> follows{false};
  std::vector<double> sleeps;
  std::function<void()> onSleep;
};

/// Everything that a test of the plug-in's front needs. When it ends, all background work has, and
/// the shutdown guard must be even.
class FrontWorld {
 public:
  enum class User { loggedOut, loggedIn };

  explicit FrontWorld(User user = User::loggedOut) : _override(_environment()) {
    owner->loggedIn = user == User::loggedIn;
    owner->caches = folder.path("caches");
    controller = HelpPluginController::initWithOwner(owner);
    owner->forgetMessages();
    log->clear();
  }

  ~FrontWorld() {
    owner->onMessage = nullptr;
    clock->follows = false;
    drain();
    EXPECT_EQ(owner->guards(), 0) << "the shutdown guard is not even";
    HelpLUXModel::setGroupList({});
  }

  /// The plug-in of this world searches by meaning from now on.
  std::shared_ptr<ScriptedSemantics> addSemantics() {
    auto semantics = std::make_shared<ScriptedSemantics>();
    controller->_setLuxSearchController(semantics);
    return semantics;
  }

  /// A book that the host knows, with a help index of its own.
  std::shared_ptr<ZEBHelpBook> addBook(const std::string& bookID,
                                       std::vector<searchkit::Document> pages,
                                       platform::Value anchorData = {},
                                       int32_t type = ZEBHelpBookType1) const {
    auto book = addBookWithoutIndex(bookID, type);
    book->setIndexPaths({writeIndex(bookID, std::move(pages), std::move(anchorData))});
    return book;
  }

  std::shared_ptr<ZEBHelpBook> addBookWithoutIndex(const std::string& bookID,
                                                   int32_t type = ZEBHelpBookType1) const {
    auto book = ZEBHelpBook::bookWithID(bookID, type, folder.path(bookID));
    owner->addBook(book);
    return book;
  }

  /// A remote book whose index has been downloaded.
  std::shared_ptr<ZEBHelpBook> addRemoteBook(const std::string& bookID,
                                             std::vector<searchkit::Document> pages,
                                             platform::Value anchorData = {}) const {
    auto book = addBookWithoutIndex(bookID, ZEBHelpBookType4);
    book->setRemoteURL(platform::URL::URLWithString("https://help.example.org/" + bookID));
    auto record = ZEBHelpindexIndex::initWithPath(
        writeIndex(bookID, std::move(pages), std::move(anchorData)));
    record->setBookID(bookID);
    controller->_shelf()->_addIndex(record, bookID);
    return book;
  }

  std::string writeIndex(const std::string& bookID, std::vector<searchkit::Document> pages,
                         platform::Value anchorData) const {
    platform::Value::Dictionary content{{"SKI_INDEX_DATA", keywordIndex(std::move(pages))}};
    if (!anchorData.isAbsent()) {
      content["SKI_ANCHOR_DATA"] = std::move(anchorData);
    }
    return folder.write(bookID + "/book.helpindex",
                        platform::classicArchiveWithRootObject(std::move(content)).view());
  }

  std::string writeList(const std::string& name, platform::Value::Dictionary list) const {
    return folder.write(
        name,
        platform::dataFromPropertyList(std::move(list), platform::PropertyListFormat::xml).view());
  }

  /// Weights by book, in a group of their own that has none.
  static void setBookWeights(const std::map<std::string, double>& weights) {
    platform::Value::Dictionary books;
    for (const auto& [bookID, weight] : weights) {
      books[bookID] = platform::Value::Dictionary{{"Weight", weight}};
    }
    HelpLUXModel::setGroupList(platform::Value::Dictionary{
        {"Groups", platform::Value::Dictionary{
                       {"weighted", platform::Value::Dictionary{{"Books", std::move(books)}}}}}});
  }

  static std::shared_ptr<ZEBQuery> query(
      const std::string& text, std::vector<std::string> scope = {},
      std::vector<std::string> resultTypes = {ZEBHelpArticleResult},
      platform::Value::Dictionary options = {}) {
    auto made = ZEBQuery::initWithQueryString(text);
    made->setScope(std::move(scope));
    made->setResultTypes(std::move(resultTypes));
    made->setOptions(std::move(options));
    return made;
  }

  /// Searches on this thread, and gives the query.
  std::shared_ptr<ZEBQuery> search(std::shared_ptr<ZEBQuery> asked) const {
    controller->startSearchForQuery(asked);
    return asked;
  }

  ZEBIndexshelf::Indices indices(const std::shared_ptr<ZEBHelpBook>& book) const {
    return controller->_shelf()->indicesForBook(book);
  }

  /// Lets background work and the main loop come to rest, time passing as they need it. Whatever
  /// keeps the daemon from exiting is work.
  void drain() const {
    const auto& shelf = controller->_shelf();
    const auto busy = [&] {
      return shelf->indexGeneratingQueue()->operationCount() +
             shelf->indexRegistrationQueue()->operationCount() +
             shelf->indexFetchUpdateQueue()->operationCount() +
             shelf->indexDownloadQueue()->operationCount() + static_cast<size_t>(owner->guards());
    };
    const auto& models = controller->_luxController();
    // A model that somebody else keeps busy is not waited for.
    int patience = 10000;
    const auto modelsAreBehind = [&] {
      return models && --patience > 0 &&
             (models->_modelUpdateQueue()->operationCount() > 0 ||
              !models->_pendingIndexEvents().empty());
    };
    while (platform::RunLoop::main()->runPending() + busy() > 0 || modelsAreBehind()) {
      clock->advance(platform::Seconds(0.5));
      std::this_thread::sleep_for(std::chrono::microseconds(200));
    }
  }

  std::vector<std::string> logged(int level) const { return log->messages(level); }

  TemporaryFolder folder;
  const std::shared_ptr<FollowingClock> clock =
      std::make_shared<FollowingClock>(std::chrono::system_clock::now());
  const std::shared_ptr<platform::CapturingLogSink> log =
      std::make_shared<platform::CapturingLogSink>();
  const std::shared_ptr<CountingLauncher> launcher = std::make_shared<CountingLauncher>();
  const std::shared_ptr<RecordingOwner> owner = std::make_shared<RecordingOwner>();
  std::shared_ptr<HelpPluginController> controller;

 private:
  platform::Environment _environment() const {
    platform::Environment environment = platform::Environment::system();
    environment.clock = clock;
    environment.log = log;
    environment.processLauncher = launcher;
    environment.processTable = std::make_shared<NoProcesses>();
    environment.notificationCenter = platform::localNotificationCenter();
    environment.preferredLanguages = {"en"};
    environment.cachesDirectory = folder.path("caches");
    return environment;
  }

  platform::EnvironmentOverride _override;
};

inline std::vector<std::string> titlesOf(const std::vector<std::shared_ptr<ZEBResult>>& results) {
  std::vector<std::string> titles;
  titles.reserve(results.size());
  for (const auto& result : results) {
    titles.push_back(result->title().value_or("(none)"));
  }
  return titles;
}

inline std::vector<double> relevancesOf(const std::vector<std::shared_ptr<ZEBResult>>& results) {
  std::vector<double> relevances;
  relevances.reserve(results.size());
  for (const auto& result : results) {
    relevances.push_back(result->relevance().doubleValue());
  }
  return relevances;
}

}  // namespace tests
