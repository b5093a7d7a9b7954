#include "zebd/HelpService.h"

#include <gmock/gmock.h>

#include <cerrno>
#include <filesystem>
#include <future>
#include <map>
#include <stdexcept>
#include <string>
#include <utility>
#include <vector>

#include "host/Zebrine/ZEBConstants.h"
#include "platform/OperationQueue.h"
#include "tests/support/Latch.h"
#include "tests/support/ScriptedServer.h"
#include "tests/zebd/HostWorld.h"
#include "zebd/BookFolder.h"

namespace {

using testing::Contains;
using testing::ElementsAre;
using testing::IsEmpty;
using testing::Not;
using testing::UnorderedElementsAre;
using tests::ample;
using zebd::SearchEnding;

/// Keeps what clients are told.
class Listener : public zebd::SearchListener {
 public:
  void searchFound(const std::string& client, uint64_t handle,
                   const std::vector<zebd::FoundItem>& items) override {
    const platform::MutexLock lock(_mutex);
    for (const zebd::FoundItem& item : items) {
      _found[handle].push_back(item);
    }
    EXPECT_FALSE(client.empty());
  }
  void searchEnded(const std::string& client, uint64_t handle, SearchEnding ending,
                   platform::Seconds waited) override {
    const platform::MutexLock lock(_mutex);
    _ends.emplace_back(client, handle);
    _endings[handle] = ending;
    EXPECT_GE(waited.count(), 0);
  }

  bool hasEnded(uint64_t handle) const {
    const platform::MutexLock lock(_mutex);
    return _endings.contains(handle);
  }
  SearchEnding ending(uint64_t handle) const {
    const platform::MutexLock lock(_mutex);
    return _endings.at(handle);
  }
  std::vector<std::string> titles(uint64_t handle) const {
    const platform::MutexLock lock(_mutex);
    std::vector<std::string> titles;
    const auto found = _found.find(handle);
    if (found != _found.end()) {
      for (const zebd::FoundItem& item : found->second) {
        titles.push_back(item.title);
      }
    }
    return titles;
  }
  std::vector<zebd::FoundItem> items(uint64_t handle) const {
    const platform::MutexLock lock(_mutex);
    return _found.at(handle);
  }
  /// Handles in the order of their ends.
  std::vector<uint64_t> order() const {
    const platform::MutexLock lock(_mutex);
    std::vector<uint64_t> handles;
    for (const auto& end : _ends) {
      handles.push_back(end.second);
    }
    return handles;
  }

 private:
  mutable platform::Mutex _mutex;
  std::map<uint64_t, std::vector<zebd::FoundItem>> _found GUARDED_BY(_mutex);
  std::map<uint64_t, SearchEnding> _endings GUARDED_BY(_mutex);
  std::vector<std::pair<std::string, uint64_t>> _ends GUARDED_BY(_mutex);
};

/// A computer whose folders cannot be listed.
class ThrowingFiles : public platform::FileManager {
 public:
  std::optional<std::vector<std::string>> namesInDirectory(const std::string&) const override {
    throw std::runtime_error("no folder can be read");
  }
};

/// A bus on which news may take their time.
class HeldNews : public platform::DistributedNotificationCenter {
 public:
  Observation addObserver(const std::string& name, Handler handler) override {
    return _center->addObserver(name, std::move(handler));
  }
  void postNotification(const std::string& name, std::optional<std::string> object) override {
    const platform::MutexLock lock(_mutex);
    if (_holds) {
      _held.emplace_back(name, std::move(object));
    } else {
      _center->postNotification(name, std::move(object));
    }
  }

  void hold() {
    const platform::MutexLock lock(_mutex);
    _holds = true;
  }
  void release() {
    const platform::MutexLock lock(_mutex);
    _holds = false;
    for (auto& [name, object] : std::exchange(_held, {})) {
      _center->postNotification(name, std::move(object));
    }
  }

 private:
  const std::shared_ptr<DistributedNotificationCenter> _center =
      platform::localNotificationCenter();
  platform::Mutex _mutex;
  bool _holds GUARDED_BY(_mutex) = false;
  std::vector<std::pair<std::string, std::optional<std::string>>> _held GUARDED_BY(_mutex);
};

zebd::SearchRequest request(const std::string& text) {
  zebd::SearchRequest request;
  request.text = text;
  request.kinds = {ZEBHelpArticleResult};
  return request;
}

class HelpServiceTest : public testing::Test, protected tests::HostWorld {
 protected:
  HelpServiceTest() {
    writePage("share/help/en/garden/index.html", "Roses", "Cut roses in spring.");
    writePage("share/help/en/kitchen/index.html", "Boiling", "Put water into a pot.");
  }
  ~HelpServiceTest() override {
    if (service != nullptr) {
      EXPECT_TRUE(waitUntilQuiet(service->owner()));
    }
  }

  /// Serves, and waits until the books are found.
  void start() {
    auto started = startHost();
    host = started.get();
    service = std::make_unique<zebd::HelpService>(std::move(started), settings(), listener);
    service->begin();
    EXPECT_TRUE(runUntil([this] { return service->status().watchedFolderCount > 0; }));
  }
  /// A book on a server that nobody reaches.
  static zebd::CatalogueEntry remoteEntry() {
    zebd::CatalogueEntry entry;
    entry.bookID = "org.remote";
    entry.title = "Remote";
    entry.type = ZEBHelpBookType4;
    entry.folder = "/nowhere";
    entry.accessPagePath = "/nowhere/index.html";
    entry.catalogueURL = "http://127.0.0.1:9/catalogue.json";
    return entry;
  }
  zebd::BookKeeper::Settings settings() const {
    return {{folder.path("share")}, folder.path("caches/zeb/books"), {"en"}};
  }
  static bool runUntil(const std::function<bool()>& condition) {
    return zebd::Host::runMainLoopUntil(condition, ample);
  }
  zebd::BookChanges scan() {
    std::optional<zebd::BookChanges> changes;
    service->scan([&](const zebd::BookChanges& made) { changes = made; });
    EXPECT_TRUE(runUntil([&] { return changes.has_value(); }));
    return changes.value_or(zebd::BookChanges());
  }
  uint64_t begin(const std::string& client, const std::string& text) {
    return service->searches().start(client, request(text)).value();
  }
  std::vector<std::string> search(const std::string& text) {
    const uint64_t handle = begin("client", text);
    EXPECT_TRUE(runUntil([&] { return listener->hasEnded(handle); }));
    EXPECT_EQ(listener->ending(handle), SearchEnding::complete);
    return listener->titles(handle);
  }
  /// Until a search finds exactly this: indexes are made in the background.
  void waitUntilFound(const std::string& text, const std::vector<std::string>& titles) {
    std::vector<std::string> found;
    for (int tries = 0; tries < 400 && found != titles; ++tries) {
      found = search(text);
      runUntil([this] { return service->owner().isQuietFor(platform::Seconds(0.2)); });
    }
    EXPECT_EQ(found, titles);
  }
  std::vector<std::string> bookIDs() const {
    std::vector<std::string> bookIDs;
    for (const zebd::BookStatus& book : service->books()) {
      bookIDs.push_back(book.bookID);
    }
    return bookIDs;
  }

  std::shared_ptr<Listener> listener = std::make_shared<Listener>();
  std::unique_ptr<zebd::HelpService> service;
  /// Of the service.
  zebd::Host* host = nullptr;
};

TEST_F(HelpServiceTest, FindsTheBooksOfTheDataFoldersAndServesSearches) {
  start();
  EXPECT_THAT(bookIDs(), ElementsAre("garden", "kitchen"));
  waitUntilFound("spring", {"Roses"});
  EXPECT_TRUE(runUntil([this] { return service->status().indexedBookCount == 2; }));
  EXPECT_EQ(service->status().bookCount, 2U);
}

TEST_F(HelpServiceTest, ItemTellsPageBookAndKind) {
  start();
  waitUntilFound("spring", {"Roses"});
  const uint64_t handle = begin("client", "spring");
  EXPECT_TRUE(runUntil([&] { return listener->hasEnded(handle); }));
  const zebd::FoundItem item = listener->items(handle).front();
  EXPECT_EQ(item.kind, ZEBHelpArticleResult);
  EXPECT_EQ(item.bookID, "garden");
  EXPECT_EQ(item.bookTitle, "Roses");
  EXPECT_EQ(item.url, "file://" + folder.path("share/help/en/garden/index.html"));
  EXPECT_GT(item.relevance, 0);
  EXPECT_FALSE(item.isExactMatch);
}

TEST_F(HelpServiceTest, AnchorIsLookedUp) {
  start();
  waitUntilFound("spring", {"Roses"});
  zebd::SearchRequest anchor = request("Boiling");
  anchor.isAnchor = true;
  const uint64_t handle = service->searches().start("client", anchor).value();
  EXPECT_TRUE(runUntil([&] { return listener->hasEnded(handle); }));
  EXPECT_THAT(listener->titles(handle), ElementsAre("Boiling"));
}

TEST_F(HelpServiceTest, BookThatIsInstalledIsFoundByItself) {
  start();
  writePage("share/help/en/music/index.html", "Playing", "Play a melody.");
  EXPECT_TRUE(runUntil([this] { return service->books().size() == 3; }));
  waitUntilFound("melody", {"Playing"});
}

TEST_F(HelpServiceTest, PageThatChangesIsFoundUnderItsNewWordsOnly) {
  start();
  waitUntilFound("spring", {"Roses"});
  writePage("share/help/en/garden/index.html", "Roses", "Cut roses in autumn, all of them.");
  EXPECT_TRUE(runUntil([this] { return !search("autumn").empty(); }));
  // The model of the language follows a little later.
  waitUntilFound("spring", {});
}

TEST_F(HelpServiceTest, PageThatIsAddedIsFound) {
  start();
  waitUntilFound("spring", {"Roses"});
  writePage("share/help/en/garden/deep/tulips.html", "Tulips", "Plant tulips in winter.");
  EXPECT_TRUE(runUntil([this] { return !search("tulips").empty(); }));
}

TEST_F(HelpServiceTest, BookThatIsRemovedIsForgottenWithItsIndex) {
  start();
  waitUntilFound("spring", {"Roses"});
  ASSERT_TRUE(hasIndex("garden", "en"));
  std::filesystem::remove_all(folder.path("share/help/en/garden"));
  EXPECT_TRUE(runUntil([this] { return service->books().size() == 1; }));
  EXPECT_TRUE(runUntil([this] { return !hasIndex("garden", "en"); }));
  EXPECT_THAT(search("spring"), IsEmpty());
}

TEST_F(HelpServiceTest, NothingIsDoneAgainWhereNothingHasChanged) {
  start();
  waitUntilFound("water", {"Boiling"});
  const zebd::BookChanges changes = scan();
  EXPECT_EQ(changes.changed, 0U);
  EXPECT_EQ(changes.unchanged, 2U);
  EXPECT_EQ(changes.forgotten, 0U);
  EXPECT_EQ(changes.failed, 0U);
}

TEST_F(HelpServiceTest, BookThatAnotherProgramHasEnteredIsServed) {
  start();
  waitUntilFound("spring", {"Roses"});
  writePage("elsewhere/index.html", "Painting", "Paint the wall.");
  std::string reason;
  const auto entry = zebd::entryForFolder(folder.path("elsewhere"), "painting", "en", reason);
  ASSERT_TRUE(entry.has_value()) << reason;
  zebd::Catalogue(folder.path("caches/zeb/books")).store(*entry);
  EXPECT_TRUE(runUntil([this] { return service->books().size() == 3; }));
  waitUntilFound("wall", {"Painting"});
}

TEST_F(HelpServiceTest, BookThatAnotherProgramHasBroughtUpToDateIsLookedAtAnew) {
  start();
  waitUntilFound("spring", {"Roses"});
  // Before the watcher tells, the catalogue says already what the pages are.
  writePage("share/help/en/garden/index.html", "Roses", "Cut roses in autumn, all of them.");
  std::string reason;
  const auto entry =
      zebd::entryForFolder(folder.path("share/help/en/garden"), "garden", "en", reason);
  ASSERT_TRUE(entry.has_value()) << reason;
  zebd::Catalogue(folder.path("caches/zeb/books")).store(*entry);
  EXPECT_EQ(scan().changed, 1U);
  waitUntilFound("autumn", {"Roses"});
}

TEST_F(HelpServiceTest, SecondServiceKnowsTheBooksBeforeItHasLookedForThem) {
  start();
  waitUntilFound("spring", {"Roses"});
  EXPECT_TRUE(waitUntilQuiet(service->owner()));
  service.reset();
  listener = std::make_shared<Listener>();
  service = std::make_unique<zebd::HelpService>(startHost(), settings(), listener);
  service->begin();
  EXPECT_THAT(bookIDs(), ElementsAre("garden", "kitchen"));
  EXPECT_THAT(search("spring"), ElementsAre("Roses"));
}

TEST_F(HelpServiceTest, NothingIsForgottenWhereLookingForBooksBreaksOff) {
  start();
  waitUntilFound("spring", {"Roses"});
  platform::Environment broken = *platform::Environment::current();
  broken.files = std::make_shared<ThrowingFiles>();
  zebd::BookChanges changes;
  {
    const platform::EnvironmentOverride override(broken);
    changes = scan();
  }
  EXPECT_EQ(changes.failed, 1U);
  EXPECT_EQ(changes.forgotten, 0U);
  EXPECT_THAT(log->messages(0), Contains(testing::HasSubstr("no folder can be read")));
  EXPECT_THAT(bookIDs(), ElementsAre("garden", "kitchen"));
  EXPECT_TRUE(hasIndex("garden", "en"));
}

TEST_F(HelpServiceTest, ScansThatAreAskedForDuringAScanAreOneMore) {
  start();
  int ends = 0;
  for (int i = 0; i < 5; ++i) {
    service->scan([&](const zebd::BookChanges&) { ++ends; });
  }
  EXPECT_TRUE(runUntil([&] { return ends == 5; }));
}

TEST_F(HelpServiceTest, ScanThatIsAskedForAtTheEndOfAnotherRunsAfterThoseThatWait) {
  start();
  std::vector<int> ends;
  zebd::ScanRequest ofItsOwn;
  ofItsOwn.folderBooksEvenIfUnchanged = true;
  ofItsOwn.allBooksEvenIfUnchanged = true;
  service->scan([&](const zebd::BookChanges&) {
    ends.push_back(1);
    service->scan([&](const zebd::BookChanges&) { ends.push_back(3); });
  });
  service->scan(ofItsOwn, [&](const zebd::BookChanges& changes) {
    EXPECT_EQ(changes.changed, 2U);
    ends.push_back(2);
  });
  EXPECT_TRUE(runUntil([&] { return ends.size() == 3; }));
  EXPECT_THAT(ends, ElementsAre(1, 2, 3));
  EXPECT_FALSE(service->status().isScanning);
}

TEST_F(HelpServiceTest, SearchesOfSeveralClientsRunInTheOrderOfTheirRequests) {
  start();
  const uint64_t first = begin("a", "spring");
  const uint64_t second = begin("b", "water");
  const uint64_t third = begin("c", "pot");
  EXPECT_EQ(service->searches().count(), 3U);
  EXPECT_TRUE(runUntil([&] { return listener->hasEnded(third); }));
  EXPECT_THAT(listener->order(), ElementsAre(first, second, third));
  EXPECT_EQ(service->searches().count(), 0U);
}

TEST_F(HelpServiceTest, NewerSearchOfAClientTakesTheOlderBack) {
  start();
  const uint64_t running = begin("a", "spring");
  const uint64_t waiting = begin("a", "wat");
  const uint64_t last = begin("a", "water");
  EXPECT_TRUE(listener->hasEnded(waiting)) << "one that waits ends at once";
  EXPECT_TRUE(runUntil([&] { return listener->hasEnded(last); }));
  EXPECT_EQ(listener->ending(running), SearchEnding::cancelled);
  EXPECT_EQ(listener->ending(waiting), SearchEnding::cancelled);
  EXPECT_EQ(listener->ending(last), SearchEnding::complete);
}

TEST_F(HelpServiceTest, OnlyTheClientItselfCanTakeASearchBack) {
  start();
  const uint64_t handle = begin("a", "spring");
  EXPECT_FALSE(service->searches().cancel("b", handle));
  EXPECT_TRUE(service->searches().cancel("a", handle));
  EXPECT_TRUE(runUntil([&] { return listener->hasEnded(handle); }));
  EXPECT_EQ(listener->ending(handle), SearchEnding::cancelled);
  EXPECT_FALSE(service->searches().cancel("a", handle)) << "it has ended";
}

TEST_F(HelpServiceTest, SearchesOfAClientThatLeavesAreTakenBack) {
  start();
  const uint64_t running = begin("a", "spring");
  const uint64_t waiting = begin("b", "water");
  service->searches().clientLeft("b");
  EXPECT_TRUE(listener->hasEnded(waiting));
  service->searches().clientLeft("a");
  EXPECT_TRUE(runUntil([&] { return listener->hasEnded(running); }));
  EXPECT_EQ(listener->ending(running), SearchEnding::cancelled);
}

TEST_F(HelpServiceTest, MoreClientsThanThereIsRoomForAreRefused) {
  start();
  for (size_t i = 0; i < zebd::ClientSearches::maximumClientCount; ++i) {
    ASSERT_TRUE(service->searches().start(std::to_string(i), request("spring")).has_value());
  }
  EXPECT_FALSE(service->searches().start("one more", request("spring")).has_value());
  EXPECT_TRUE(service->searches().start("0", request("water")).has_value());
  for (size_t i = 0; i < zebd::ClientSearches::maximumClientCount; ++i) {
    service->searches().clientLeft(std::to_string(i));
  }
  EXPECT_TRUE(runUntil([this] { return service->searches().count() == 0; }));
}

TEST_F(HelpServiceTest, RequestsOutOfBoundsMeetAnObjection) {
  using zebd::HelpService;
  EXPECT_EQ(HelpService::objection(request("words")), std::nullopt);
  EXPECT_EQ(HelpService::objection(request("")), std::nullopt);
  EXPECT_EQ(HelpService::objection(request(std::string(5000, 'a'))), "the text is too long");
  EXPECT_EQ(HelpService::objection(request("\xff")), "the text is no text");
  zebd::SearchRequest bad = request("words");
  bad.bookIDs = {"../../etc"};
  EXPECT_EQ(HelpService::objection(bad), "\"../../etc\" cannot be a book's identifier");
  bad.bookIDs.assign(1001, "a");
  EXPECT_EQ(HelpService::objection(bad), "there are too many books");
  bad = request("words");
  bad.kinds = {"nonsense"};
  EXPECT_EQ(HelpService::objection(bad), "there is no such kind of result");
  bad.kinds = {};
  EXPECT_EQ(HelpService::objection(bad), "there is no such kind of result");
  bad = request("words");
  bad.limit = 10'001;
  EXPECT_EQ(HelpService::objection(bad), "the limit is too high");
  bad = request("words");
  bad.languages.assign(1001, "en");
  EXPECT_EQ(HelpService::objection(bad), "there are too many languages");
}

TEST_F(HelpServiceTest, ListOfBooksThatCannotBeLockedHoldsUpNoScan) {
  std::filesystem::create_directories(folder.path("caches/zeb/books"));
  // As in a folder that cannot be written, which is no hindrance to root.
  std::filesystem::create_directories(folder.path("caches/zeb/books.lock"));
  start();
  EXPECT_EQ(scan().unchanged, 2U);
  EXPECT_FALSE(service->status().isScanning);
}

TEST_F(HelpServiceTest, StatusCountsWorkThatStillWaitsItsTurn) {
  start();
  waitUntilFound("spring", {"Roses"});
  EXPECT_TRUE(waitUntilQuiet(service->owner()));
  EXPECT_EQ(service->status().operationCount, 0U);
  tests::Latch mayEnd;
  const auto queue = platform::OperationQueue::init();
  queue->setMaxConcurrentOperationCount(1);
  for (int i = 0; i < 2; ++i) {
    queue->addOperationWithBlock([&] { mayEnd.wait(); });
  }
  EXPECT_EQ(service->status().operationCount, 2U);
  mayEnd.open();
  EXPECT_TRUE(runUntil([this] { return service->status().operationCount == 0; }));
}

TEST_F(HelpServiceTest, NothingIsHeardOfASearchBeforeItsHandleIsKnown) {
  start();
  waitUntilFound("spring", {"Roses"});
  const uint64_t handle = begin("client", "spring");
  // Of the host's searches one is done after the other: when this one ends, any search before it
  // has found what there is.
  class Ending : public zebd::SearchReceiver {
   public:
    void foundResults(const ZEBResultBatch& /*batch*/) override {}
    void searchEnded(bool /*finished*/) override { ended.set_value(); }
    std::promise<void> ended;
  };
  const auto after = std::make_shared<Ending>();
  host->registerBooks({"garden"}, after);
  after->ended.get_future().wait();
  EXPECT_THAT(listener->titles(handle), IsEmpty());
  EXPECT_TRUE(runUntil([&] { return listener->hasEnded(handle); }));
  EXPECT_THAT(listener->titles(handle), ElementsAre("Roses"));
}

TEST_F(HelpServiceTest, NewsThatAnEarlierScanNeedNotWaitForAnyMoreIsNotMissedInALaterOne) {
  const auto center = std::make_shared<HeldNews>();
  platform::Environment environment = *platform::Environment::current();
  environment.notificationCenter = center;
  const platform::EnvironmentOverride override(environment);
  start();
  const auto clock = environment.clock;
  zebd::ScanRequest forced;
  forced.allBooksEvenIfUnchanged = true;
  std::optional<zebd::BookChanges> first;
  service->scan(forced, [&](const zebd::BookChanges& changes) { first = changes; });
  EXPECT_TRUE(runUntil([&] { return first.has_value(); }));
  const auto begun = clock->elapsed();
  EXPECT_TRUE(runUntil([&] { return clock->elapsed() - begun > platform::Seconds(3); }));
  // Its news are under way when the patience of the first would have been at its end.
  center->hold();
  std::optional<zebd::BookChanges> second;
  service->scan(forced, [&](const zebd::BookChanges& changes) { second = changes; });
  EXPECT_TRUE(runUntil([&] { return clock->elapsed() - begun > platform::Seconds(6); }));
  EXPECT_FALSE(second.has_value());
  center->release();
  EXPECT_TRUE(runUntil([&] { return second.has_value(); }));
  EXPECT_EQ(second->changed, 2U);
  EXPECT_EQ(second->failed, 0U);
  EXPECT_TRUE(waitUntilQuiet(service->owner()));
  service.reset();
}

TEST_F(HelpServiceTest, ScanThatAsksServersEndsWhenTheyHaveAnswered) {
  tests::Latch mayAnswer;
  tests::ScriptedServer server([&](const auto& /*request*/, tests::ScriptedConnection& connection) {
    mayAnswer.wait();
    connection.send(tests::httpAnswer(404, "none"));
  });
  zebd::CatalogueEntry remote = remoteEntry();
  remote.catalogueURL = server.URL("/catalogue.json");
  ASSERT_EQ(zebd::Catalogue(settings().catalogueFolder).store(remote), std::nullopt);
  start();
  zebd::ScanRequest request;
  request.asksServers = true;
  bool hasEnded = false;
  service->scan(request, [&](const zebd::BookChanges&) { hasEnded = true; });
  (void)server.waitForRequests(1);
  EXPECT_TRUE(runUntil([this] { return !service->status().isScanning; }));
  EXPECT_FALSE(hasEnded);
  mayAnswer.open();
  EXPECT_TRUE(runUntil([&] { return hasEnded; }));
}

TEST_F(HelpServiceTest, RemoteBookThatCannotBeForgottenIsAProblem) {
  ASSERT_EQ(zebd::Catalogue(settings().catalogueFolder).store(remoteEntry()), std::nullopt);
  start();
  const auto removed = [this](const std::shared_ptr<platform::FileManager>& files) {
    platform::Environment environment = *platform::Environment::current();
    environment.files = files;
    const platform::EnvironmentOverride override(std::move(environment));
    std::optional<zebd::RemovedBooks> answer;
    service->removeRemote("org.remote", [&](const zebd::RemovedBooks& made) { answer = made; });
    EXPECT_TRUE(runUntil([&] { return answer.has_value(); }));
    return answer.value_or(zebd::RemovedBooks());
  };
  const auto failing = std::make_shared<platform::FailingFileManager>();
  failing->fail(platform::FailingFileManager::Operation::remove, EROFS, "org.remote.plist");
  EXPECT_THAT(removed(failing).problem.value_or(""), testing::StartsWith("org.remote: "));
  EXPECT_EQ(removed(std::make_shared<ThrowingFiles>()).problem,
            "the books could not be looked through");
  const zebd::RemovedBooks gone = removed(std::make_shared<platform::FileManager>());
  EXPECT_EQ(gone.problem, std::nullopt);
  EXPECT_THAT(gone.bookIDs, ElementsAre("org.remote"));
}

TEST_F(HelpServiceTest, BookWhoseEntryCannotBeWrittenIsServedAllTheSame) {
  folder.write("caches/zeb/books", "a file in the place of the folder");
  start();
  EXPECT_THAT(bookIDs(), ElementsAre("garden", "kitchen"));
  EXPECT_THAT(log->messages(1), Contains(testing::StartsWith("Cannot remember the book garden: ")));
  waitUntilFound("spring", {"Roses"});
}

}  // namespace
