// The download of a remote book, from the request for its information to the record in the shelf.
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "plugin/operations/ZEBOperationQueue.h"
#include "plugin/records/ZEBHelpindexIndex.h"
#include "plugin/remote/ZEBIndexFetchUpdateOperation.h"
#include "tests/plugin/remote/RemoteWorld.h"
#include "tests/support/Latch.h"
#include "tests/support/ScriptedServer.h"

using testing::Contains;
using testing::ElementsAre;
using testing::HasSubstr;
using testing::IsEmpty;
using testing::SizeIs;
using tests::answering;
using tests::httpAnswer;
using tests::LogEntry;
using tests::RemoteWorld;
using tests::ScriptedServer;
using tests::ShelfWorld;
using tests::testURL;

namespace {

const std::string bookID = "org.remote";

std::string bytesOfIndex(const std::string& word = "applet") {
  return std::string(
      platform::classicArchiveWithRootObject(
          platform::Value::Dictionary{
              {"SKI_INDEX_DATA", tests::keywordIndex({tests::page("/a.html", "A", word)})}})
          .view());
}

class RemoteIndexDownload : public testing::Test {
 protected:
  RemoteIndexDownload() { world.makeShelf(); }

  void serve(const std::string& path, const std::string& answer) {
    _handlers[path] = answering(answer);
  }
  /// A server with what was given to serve().
  ScriptedServer& server() {
    if (!_server) {
      _server = ScriptedServer::routing(_handlers);
    }
    return *_server;
  }
  std::shared_ptr<ZEBHelpBook> bookWithBoth() {
    return world.makeRemoteBook(bookID, server().URL("/index"), server().URL("/list"));
  }
  void download(const std::shared_ptr<ZEBHelpBook>& book,
                const std::shared_ptr<ZEBIndex>& existing = nullptr) {
    world.shelf->_addIndexDownloadOperationForType4Book(book, existing);
    EXPECT_TRUE(world.finishDownload(book));
  }
  std::string listPath(const std::string& localization = "en") const {
    return world.generatedRoot() + "/" + bookID + "/" + localization + ".exactmatch.plist";
  }

  RemoteWorld world;

 private:
  std::map<std::string, ScriptedServer::Handler> _handlers;
  std::unique_ptr<ScriptedServer> _server;
};

TEST_F(RemoteIndexDownload, bringsIndexAndListAndTellsEverybody) {
  serve("/index", httpAnswer(200, bytesOfIndex()));
  serve("/list", httpAnswer(200, "list"));
  const auto book = bookWithBoth();
  download(book);
  const auto record = world.knownRecord(bookID);
  ASSERT_NE(record, nullptr);
  EXPECT_EQ(record->bookID(), bookID);
  EXPECT_EQ(record->path(), world.generatedPath(bookID, "en"));
  EXPECT_TRUE(record->loadedFromGeneratedCache());
  EXPECT_FALSE(record->isDownloading());
  EXPECT_EQ(ShelfWorld::contents(listPath()), "list");
  EXPECT_EQ(book->exactMatchPath(), listPath());
  ASSERT_THAT(world.observer->kinds(), ElementsAre(ZEBIndexChangeAdded));
  EXPECT_EQ(world.observer->changes().front().index, record);
  EXPECT_EQ(world.owner->disableCount(), 1);
  // Once for the information, once for the list.
  EXPECT_THAT(world.owner->modified(), ElementsAre(book, book));
}

TEST_F(RemoteIndexDownload, logsItsSteps) {
  serve("/index", httpAnswer(200, bytesOfIndex()));
  const auto book = world.makeRemoteBook(bookID, server().URL("/index"));
  download(book);
  EXPECT_THAT(
      world.logged(),
      ElementsAre(LogEntry{3, "====== Start index downloading of type-4 book: " + bookID},
                  LogEntry{3, "Making book request to TVO for " + bookID},
                  LogEntry{3, "Requesting asset: " + server().URL("/index")},
                  LogEntry{3, "====== Finished index downloading of type-4 book: " + bookID}));
}

TEST_F(RemoteIndexDownload, keepsWhatTheServiceSaysWithTheBook) {
  serve("/index", httpAnswer(404, ""));
  const auto book = bookWithBoth();
  download(book);
  EXPECT_EQ(book->remoteBookInfo(), platform::Value(platform::Value::Dictionary{
                                        {ZEBBookIndexRemoteURLKey, testURL(server().URL("/index"))},
                                        {ZEBBookEMRemoteURLKey, testURL(server().URL("/list"))},
                                        {ZEBBookLocalizationKey, "en"}}));
}

TEST_F(RemoteIndexDownload, leavesMissingURLsOutAndTransfersNothing) {
  const auto book = world.makeRemoteBook(bookID, "");
  download(book);
  EXPECT_EQ(book->remoteBookInfo(),
            platform::Value(platform::Value::Dictionary{{ZEBBookLocalizationKey, "en"}}));
  EXPECT_EQ(world.knownRecord(bookID), nullptr);
  EXPECT_THAT(world.observer->kinds(), IsEmpty());
  EXPECT_EQ(book->exactMatchPath(), std::nullopt);
  EXPECT_THAT(
      world.logged(),
      ElementsAre(LogEntry{3, "====== Start index downloading of type-4 book: " + bookID},
                  LogEntry{3, "Making book request to TVO for " + bookID},
                  LogEntry{3, "====== Finished index downloading of type-4 book: " + bookID}));
}

TEST_F(RemoteIndexDownload, aBookWithoutLocalizationGivesItsFilesItsOwnName) {
  serve("/index", httpAnswer(200, bytesOfIndex()));
  const auto book = world.makeRemoteBook(bookID, server().URL("/index"), "", std::nullopt);
  download(book);
  EXPECT_EQ(world.knownRecord(bookID)->path(), world.generatedPath(bookID, bookID));
  EXPECT_TRUE(book->remoteBookInfo()[ZEBBookLocalizationKey].isAbsent());
}

TEST_F(RemoteIndexDownload, aSecondOneOfTheSameBookIsNotStarted) {
  const auto book = world.makeRemoteBook(bookID, "");
  world.manager->hold();
  world.shelf->_addIndexDownloadOperationForType4Book(book, nullptr);
  const auto existing = ZEBIndex::init();
  world.shelf->_addIndexDownloadOperationForType4Book(book, existing);
  EXPECT_FALSE(existing->isDownloading());
  EXPECT_THAT(world.messages(4),
              ElementsAre("Index download for " + bookID + " already in progress"));
  EXPECT_EQ(world.owner->disableCount(), 1);
  EXPECT_EQ(world.shelf->indexDownloadQueue()->operationCount(), 1U);
  world.manager->release();
  EXPECT_TRUE(world.finishDownload(book));
}

TEST_F(RemoteIndexDownload, aSecondOneAfterTheEndDoesNotAskAgainForTheInformation) {
  serve("/index", httpAnswer(200, bytesOfIndex()));
  const auto book = world.makeRemoteBook(bookID, server().URL("/index"));
  download(book);
  download(book);
  EXPECT_EQ(world.manager->requestCount(), 1U);
  EXPECT_THAT(server().requests(), SizeIs(2));
  EXPECT_EQ(world.owner->disableCount(), 2);
}

TEST_F(RemoteIndexDownload, isUnderWayFromTheFirstMomentToTheLast) {
  const auto book = world.makeRemoteBook(bookID, "");
  const auto existing = ZEBIndex::init();
  EXPECT_FALSE(world.shelf->isIndexDownloadingForBook(book));
  world.manager->hold();
  world.shelf->_addIndexDownloadOperationForType4Book(book, existing);
  EXPECT_TRUE(world.shelf->isIndexDownloadingForBook(book));
  EXPECT_TRUE(existing->isDownloading());
  EXPECT_EQ(world.owner->depth(), 1);
  world.manager->release();
  EXPECT_TRUE(world.finishDownload(book));
  EXPECT_TRUE(world.runMainLoopUntil([&] { return world.owner->depth() == 0; }));
  EXPECT_FALSE(existing->isDownloading());
}

TEST_F(RemoteIndexDownload, anErrorOfTheServiceIsLoggedAndLeavesEverythingAsItWas) {
  const auto book = world.makeRemoteBook(bookID, "");
  book->setExactMatchPath("/former");
  const platform::Error error{"Domain", 7, "unwell"};
  world.manager->setAnswer(bookID, {nullptr, error});
  const auto existing = ZEBIndex::init();
  download(book, existing);
  EXPECT_THAT(world.messages(1), ElementsAre(ZEBStringWithFormat(
                                     "Failed to make book request (%@): %@", bookID, error)));
  EXPECT_TRUE(book->remoteBookInfo().isAbsent());
  EXPECT_EQ(book->exactMatchPath(), "/former");
  EXPECT_FALSE(existing->isDownloading());
  EXPECT_THAT(world.owner->modified(), IsEmpty());
  EXPECT_THAT(world.observer->kinds(), IsEmpty());
}

TEST_F(RemoteIndexDownload, anAnswerWithoutABookEndsWithoutAnythingDone) {
  const auto book = world.makeRemoteBook(bookID, "");
  world.manager->setAnswer(bookID, {});
  download(book);
  EXPECT_THAT(world.messages(1), IsEmpty());
  EXPECT_TRUE(book->remoteBookInfo().isAbsent());
}

TEST_F(RemoteIndexDownload, failedFilesAreLoggedAndLeaveTheFormerOnes) {
  serve("/index", httpAnswer(500, ""));
  const std::string former = world.writeIndex(world.generatedPath(bookID, "en"));
  const auto existing = ZEBIndex::indexWithPath(former);
  const auto book = bookWithBoth();
  book->setExactMatchPath("/former");
  download(book, existing);
  const platform::Error error{"NSURLErrorDomain", -1008, ""};
  EXPECT_THAT(
      world.messages(1),
      ElementsAre(ZEBStringWithFormat("Failed to download remote exactmatch.plist: %@", error),
                  ZEBStringWithFormat("Failed to download remote search index: %@", error)));
  EXPECT_EQ(book->exactMatchPath(), "/former");
  EXPECT_EQ(ShelfWorld::contents(former), bytesOfIndex());
  EXPECT_THAT(world.observer->kinds(), IsEmpty());
  EXPECT_FALSE(existing->isDownloading());
}

TEST_F(RemoteIndexDownload, oneFileMayFailAndTheOtherCome) {
  serve("/index", httpAnswer(200, bytesOfIndex()));
  const auto book = bookWithBoth();
  download(book);
  EXPECT_THAT(world.messages(1), SizeIs(1));
  EXPECT_NE(world.knownRecord(bookID), nullptr);
  EXPECT_EQ(book->exactMatchPath(), std::nullopt);
}

TEST_F(RemoteIndexDownload, aNewerIndexRefillsTheExistingRecordAndTellsOfTheOpenedOne) {
  serve("/index", httpAnswer(200, bytesOfIndex("gadget")));
  const std::string former = world.writeIndex(world.generatedPath(bookID, "en"));
  const auto existing = ZEBIndex::indexWithPath(former);
  existing->setLoadedFromGeneratedCache(true);
  const auto book = world.makeRemoteBook(bookID, server().URL("/index"));
  world.shelf->_addIndex(existing, bookID);
  download(book, existing);
  EXPECT_EQ(world.knownRecord(bookID), existing);
  EXPECT_TRUE(existing->isReinitialized());
  // As with every refilled record.
  EXPECT_FALSE(existing->loadedFromGeneratedCache());
  ASSERT_THAT(world.observer->kinds(), ElementsAre(ZEBIndexChangeUpdated));
  const auto opened = world.observer->changes().front().index;
  EXPECT_NE(opened, existing);
  EXPECT_EQ(opened->bookID(), bookID);
  EXPECT_TRUE(opened->loadedFromGeneratedCache());
}

TEST_F(RemoteIndexDownload, anIndexInAnotherLanguageIsTheOneThatIsRememberedOverARestart) {
  tests::Latch mayAnswer;
  ScriptedServer slow([&](const auto&, tests::ScriptedConnection& connection) {
    mayAnswer.wait();
    connection.send(httpAnswer(200, bytesOfIndex("gadget")));
    connection.close();
  });
  const auto existing =
      ZEBIndex::indexWithPath(world.writeIndex(world.generatedPath(bookID, "de")));
  existing->setBookID(bookID);
  world.shelf->_addIndex(existing, bookID);
  const auto book = world.makeRemoteBook(bookID, slow.URL("/index"));
  world.shelf->_addIndexDownloadOperationForType4Book(book, existing);
  // Everything that drains has drained, and what was known then is written down.
  EXPECT_TRUE(world.runMainLoopUntil([&] { return ShelfWorld::exists(world.cachePath()); }));
  EXPECT_EQ(world.shelf->unarchiveKnownIndices()->at(bookID).front()->path(),
            world.generatedPath(bookID, "de"));
  mayAnswer.open();
  EXPECT_TRUE(world.finishDownload(book));
  EXPECT_EQ(existing->path(), world.generatedPath(bookID, "en"));
  EXPECT_EQ(world.shelf->unarchiveKnownIndices()->at(bookID).front()->path(),
            world.generatedPath(bookID, "en"));
}

TEST_F(RemoteIndexDownload, anUnchangedIndexIsAddedAnewAndToldAsAdded) {
  serve("/index", httpAnswer(200, bytesOfIndex()));
  const std::string former = world.writeIndex(world.generatedPath(bookID, "en"));
  const auto existing = ZEBIndex::indexWithPath(former);
  const auto book = world.makeRemoteBook(bookID, server().URL("/index"));
  world.shelf->_addIndex(existing, bookID);
  download(book, existing);
  const auto record = world.knownRecord(bookID);
  EXPECT_NE(record, existing);
  EXPECT_FALSE(existing->isReinitialized());
  EXPECT_THAT(world.observer->kinds(), ElementsAre(ZEBIndexChangeAdded));
  EXPECT_EQ(world.observer->changes().front().index, record);
}

TEST_F(RemoteIndexDownload, aFileThatDoesNotOpenAddsNothing) {
  serve("/index", httpAnswer(200, "no index"));
  const auto book = world.makeRemoteBook(bookID, server().URL("/index"));
  download(book);
  EXPECT_EQ(world.knownRecord(bookID), nullptr);
  EXPECT_THAT(world.observer->kinds(), IsEmpty());
}

TEST_F(RemoteIndexDownload, aListAtItsPlaceIsNotToldAgain) {
  serve("/list", httpAnswer(200, "list"));
  const auto book = world.makeRemoteBook(bookID, "", server().URL("/list"));
  book->setExactMatchPath(listPath());
  download(book);
  // Only the information.
  EXPECT_THAT(world.owner->modified(), SizeIs(1));
}

TEST_F(RemoteIndexDownload, tellsTheOwnerOfItsOwnBookOrOfNone) {
  const auto book = world.makeRemoteBook(bookID, "");
  world.owner->books.erase(bookID);
  download(book);
  EXPECT_THAT(world.owner->modified(), ElementsAre(nullptr));
}

TEST_F(RemoteIndexDownload, ofSeveralBooksRunsSideBySide) {
  serve("/index", httpAnswer(200, bytesOfIndex()));
  std::vector<std::shared_ptr<ZEBHelpBook>> books;
  for (int i = 0; i < 8; ++i) {
    books.push_back(
        world.makeRemoteBook("org.remote." + std::to_string(i), server().URL("/index")));
    world.shelf->_addIndexDownloadOperationForType4Book(books.back(), nullptr);
  }
  for (const auto& book : books) {
    EXPECT_TRUE(world.finishDownload(book));
    EXPECT_NE(world.knownRecord(book->bookID()), nullptr);
  }
  EXPECT_EQ(world.owner->disableCount(), 8);
}

TEST_F(RemoteIndexDownload, rewritesTheKnownIndicesWhenItsQueueHasDrained) {
  serve("/index", httpAnswer(200, bytesOfIndex()));
  download(world.makeRemoteBook(bookID, server().URL("/index")));
  EXPECT_TRUE(world.runMainLoopUntil([&] { return ShelfWorld::exists(world.cachePath()); }));
}

TEST_F(RemoteIndexDownload, ofARegisteredBookTakesTheGeneratedIndexForNow) {
  serve("/index", httpAnswer(200, bytesOfIndex("gadget")));
  world.writeIndex(world.generatedPath(bookID, "en"));
  const auto book = world.makeRemoteBook(bookID, server().URL("/index"));
  book->setLocalization("en");
  const auto found = world.shelf->indicesForBook(book);
  ASSERT_THAT(found, SizeIs(1));
  EXPECT_TRUE(found.front()->loadedFromGeneratedCache() || found.front()->isReinitialized());
  EXPECT_TRUE(world.finishDownload(book));
  EXPECT_TRUE(found.front()->isReinitialized());
  EXPECT_EQ(world.shelf->indicesForBook(book), found);
  EXPECT_EQ(world.manager->requestCount(), 1U);
}

TEST_F(RemoteIndexDownload, isNotBegunForABookWhileNobodyIsLoggedIn) {
  world.shelf->setUserLoggedIn(false);
  const auto book = world.makeRemoteBook(bookID, "https://a.example/");
  EXPECT_THAT(world.shelf->indicesForBook(book), IsEmpty());
  EXPECT_FALSE(world.shelf->isIndexDownloadingForBook(book));
  EXPECT_EQ(world.manager->requestCount(), 0U);
}

// Waiting.

TEST_F(RemoteIndexDownload, aWaiterIsToldOfTheEnd) {
  const auto book = world.makeRemoteBook(bookID, "");
  world.manager->hold();
  world.shelf->_addIndexDownloadOperationForType4Book(book, nullptr);
  bool finished = false;
  std::thread waiter(
      [&] { finished = world.shelf->waitForIndexDownloadCompletionForType4Book(book, 5.0); });
  world.clock->waitForSleepers(1);
  world.manager->release();
  // The clock stands still: only the signal ends the wait.
  waiter.join();
  EXPECT_TRUE(finished);
  EXPECT_THAT(world.messages(3),
              Contains("====== Waiting index download completion for " + bookID));
  EXPECT_THAT(world.messages(2), IsEmpty());
}

TEST_F(RemoteIndexDownload, aWaiterGivesUpAfterItsTimeAndSaysSo) {
  const auto book = world.makeRemoteBook(bookID, "");
  world.manager->hold();
  world.shelf->_addIndexDownloadOperationForType4Book(book, nullptr);
  std::atomic<bool> returned{false};
  bool finished = true;
  std::thread waiter([&] {
    finished = world.shelf->waitForIndexDownloadCompletionForType4Book(book, 5.0);
    returned = true;
  });
  world.clock->waitForSleepers(1);
  world.clock->advance(platform::Seconds(4.999));
  EXPECT_FALSE(returned);
  world.clock->advance(platform::Seconds(0.002));
  waiter.join();
  EXPECT_FALSE(finished);
  EXPECT_THAT(world.messages(2),
              ElementsAre("====== Timed out waiting for index download completion for " + bookID));
  EXPECT_TRUE(world.shelf->isIndexDownloadingForBook(book));
}

TEST_F(RemoteIndexDownload, ofTwoWaitersOneIsToldAndTheOtherWaitsToItsEnd) {
  const auto book = world.makeRemoteBook(bookID, "");
  world.manager->hold();
  world.shelf->_addIndexDownloadOperationForType4Book(book, nullptr);
  std::atomic<int> finished{0};
  std::atomic<int> returned{0};
  std::vector<std::thread> waiters;
  for (int i = 0; i < 2; ++i) {
    waiters.emplace_back([&] {
      finished += world.shelf->waitForIndexDownloadCompletionForType4Book(book, 5.0) ? 1 : 0;
      ++returned;
    });
  }
  world.clock->waitForSleepers(2);
  world.manager->release();
  EXPECT_TRUE(world.runMainLoopUntil([&] { return returned == 1; }));
  EXPECT_EQ(finished, 1);
  // One that comes now waits for nothing.
  EXPECT_TRUE(world.finishDownload(book));
  EXPECT_FALSE(world.shelf->waitForIndexDownloadCompletionForType4Book(book, 5.0));
  EXPECT_EQ(returned, 1);
  world.clock->advance(platform::Seconds(5));
  for (std::thread& waiter : waiters) {
    waiter.join();
  }
  EXPECT_EQ(finished, 1);
  EXPECT_THAT(world.messages(2), SizeIs(1));
}

// Ends before the end.

TEST_F(RemoteIndexDownload, aLanguageChangeDuringTheRequestEndsIt) {
  const auto book = world.makeRemoteBook(bookID, "https://a.example/");
  const auto existing = ZEBIndex::init();
  world.manager->hold();
  world.shelf->_addIndexDownloadOperationForType4Book(book, existing);
  world.shelf->_resetForLanguageChange();
  EXPECT_TRUE(world.finishDownload(book));
  EXPECT_TRUE(world.runMainLoopUntil([&] { return world.owner->depth() == 0; }));
  EXPECT_FALSE(existing->isDownloading());
  world.manager->release();
  EXPECT_EQ(world.owner->disableCount(), 1);
}

TEST_F(RemoteIndexDownload, aLanguageChangeDuringTheTransferEndsItAndReleasesTheWaiter) {
  ScriptedServer server([](const auto&, tests::ScriptedConnection& connection) {
    connection.waitUntilClientIsGone();
  });
  const auto book = world.makeRemoteBook(bookID, server.URL("/index"), server.URL("/list"));
  const auto existing = ZEBIndex::init();
  world.shelf->_addIndexDownloadOperationForType4Book(book, existing);
  server.waitForRequests(2);
  bool finished = false;
  std::thread waiter(
      [&] { finished = world.shelf->waitForIndexDownloadCompletionForType4Book(book, 5.0); });
  world.clock->waitForSleepers(1);
  world.shelf->_resetForLanguageChange();
  waiter.join();
  EXPECT_TRUE(finished);
  EXPECT_FALSE(existing->isDownloading());
  EXPECT_FALSE(world.shelf->isIndexDownloadingForBook(book));
  EXPECT_TRUE(world.runMainLoopUntil([&] { return world.owner->depth() == 0; }));
  EXPECT_EQ(world.knownRecord(bookID), nullptr);
  server.waitUntilAllClientsAreGone();
}

TEST_F(RemoteIndexDownload, aFinishingStepThatIsCancelledBeforeItStartsStillCompletes) {
  const auto book = world.makeRemoteBook(bookID, "https://a.example/");
  book->setRemoteBookInfo(platform::Value::Dictionary{{ZEBBookLocalizationKey, "en"}});
  const auto existing = ZEBIndex::init();
  // Nothing of the queue starts, so that all of it can be cancelled.
  const auto queue = world.shelf->assetDownloadQueue();
  queue->setMaxConcurrentOperationCount(0);
  world.shelf->_addIndexDownloadOperationForType4Book(book, existing);
  EXPECT_TRUE(world.runMainLoopUntil([&] { return queue->operationCount() == 1; }));
  EXPECT_TRUE(existing->isDownloading());
  world.shelf->_resetForLanguageChange();
  queue->setMaxConcurrentOperationCount(1);
  EXPECT_TRUE(world.finishDownload(book));
  EXPECT_TRUE(world.runMainLoopUntil([&] { return world.owner->depth() == 0; }));
  EXPECT_FALSE(existing->isDownloading());
  EXPECT_THAT(world.messages(3),
              Contains("====== Finished index downloading of type-4 book: " + bookID));
}

TEST_F(RemoteIndexDownload, keepsTheShelfUntilItHasEnded) {
  const auto book = world.makeRemoteBook(bookID, "");
  world.manager->hold();
  world.shelf->_addIndexDownloadOperationForType4Book(book, nullptr);
  const std::weak_ptr<ZEBIndexshelf> weak = world.shelf;
  world.shelf.reset();
  EXPECT_FALSE(weak.expired());
  world.manager->release();
  EXPECT_TRUE(world.runMainLoopUntil([&] { return weak.expired(); }));
  EXPECT_EQ(world.owner->depth(), 0);
}

TEST_F(RemoteIndexDownload, anObserverThatThrowsDoesNotLeakTheDownload) {
  serve("/index", httpAnswer(200, bytesOfIndex()));
  const auto book = world.makeRemoteBook(bookID, server().URL("/index"));
  world.observer->onChange = [](const auto&) { throw platform::Exception("Test", "unwell"); };
  download(book);
  EXPECT_TRUE(world.runMainLoopUntil([&] { return world.owner->depth() == 0; }));
  EXPECT_THAT(world.messages(0), SizeIs(1));
  world.observer->onChange = nullptr;
}

// Assertions.

using RemoteIndexDownloadDeathTest = RemoteIndexDownload;

TEST_F(RemoteIndexDownloadDeathTest, ofABookThatIsNotRemoteStopsTheProcess) {
  GTEST_FLAG_SET(death_test_style, "threadsafe");
  const auto book = world.makeBook("org.one", ZEBHelpBookType3);
  EXPECT_DEATH(world.shelf->_addIndexDownloadOperationForType4Book(book, nullptr),
               "book.type == ZEBHelpBookType4");
  EXPECT_DEATH(world.shelf->_addIndexDownloadOperationForType4Book(nullptr, nullptr),
               "book.type == ZEBHelpBookType4");
}

TEST_F(RemoteIndexDownloadDeathTest, aSearchIndexThatIsNoURLStopsTheProcess) {
  GTEST_FLAG_SET(death_test_style, "threadsafe");
  const auto book = world.makeRemoteBook(bookID, "");
  world.manager->setAnswer(
      bookID,
      {RNXBook::bookWithID(bookID, "1", "en", {{RNXBook::remoteSearchIndexKey, "text"}}), {}});
  const std::string text =
      R"(\(remoteSearchIndex == nil\) \|\| \[remoteSearchIndex isKindOfClass:\[NSURL class\]\])";
  EXPECT_DEATH(download(book), text);
}

TEST_F(RemoteIndexDownloadDeathTest, anExactMatchListThatIsNoURLStopsTheProcess) {
  GTEST_FLAG_SET(death_test_style, "threadsafe");
  const auto book = world.makeRemoteBook(bookID, "");
  world.manager->setAnswer(
      bookID, {RNXBook::bookWithID(bookID, "1", "en", {{RNXBook::remoteExactMatchKey, 1}}), {}});
  const std::string text =
      R"(\(remoteExactMatch == nil\) \|\| \[remoteExactMatch isKindOfClass:\[NSURL class\]\])";
  EXPECT_DEATH(download(book), text);
}

}  // namespace
