// Searches in remote books whose indexes are on their way.
#include <gtest/gtest.h>

#include <atomic>
#include <thread>

#include "tests/plugin/front/FrontWorld.h"
#include "tests/plugin/remote/ScriptedObjectManager.h"
#include "tests/support/Latch.h"
#include "tests/support/ScriptedServer.h"

using testing::Contains;
using testing::ElementsAre;
using testing::HasSubstr;
using testing::IsEmpty;
using testing::Not;
using testing::SizeIs;
using tests::FrontWorld;
using tests::httpAnswer;
using tests::page;
using tests::titlesOf;

namespace {

std::string indexBytes(const std::string& title) {
  return std::string(
      platform::classicArchiveWithRootObject(
          platform::Value::Dictionary{
              {"SKI_INDEX_DATA", tests::keywordIndex({page("/p.html", title, "print queue")})}})
          .view());
}

/// A world with a content service, and a server that answers for an index when it is told to.
class SearchDownloads : public testing::Test {
 protected:
  SearchDownloads()
      : server([this](const tests::ScriptedRequest&, tests::ScriptedConnection& connection) {
          mayAnswer.wait();
          connection.send(httpAnswer(200, indexBytes("Downloaded")));
        }) {
    RNXObjectManager::setSharedObjectManager(manager);
    world.controller->_shelf()->setUserLoggedIn(true);
  }
  ~SearchDownloads() override {
    mayAnswer.open();
    world.drain();
    RNXObjectManager::setSharedObjectManager(nullptr);
  }

  std::shared_ptr<ZEBHelpBook> addRemoteBook(const std::string& bookID) {
    const auto book = world.addBookWithoutIndex(bookID, ZEBHelpBookType4);
    book->setRemoteURL(platform::URL::URLWithString("https://help.example.org/" + bookID));
    book->setLocalization("en");
    manager->setAnswer(
        bookID, {RNXBook::bookWithID(bookID, "1", "en",
                                     {{RNXBook::remoteSearchIndexKey,
                                       *platform::URL::URLWithString(server.URL("/" + bookID))}}),
                 {}});
    return book;
  }

  std::thread search(const std::vector<std::string>& scope, std::atomic<bool>& ended) {
    return std::thread([this, scope, &ended] {
      world.search(FrontWorld::query("print", scope));
      ended = true;
    });
  }

  void waitUntilDownloaded(const std::shared_ptr<ZEBHelpBook>& book) {
    const auto& shelf = world.controller->_shelf();
    while (shelf->isIndexDownloadingForBook(book)) {
      platform::RunLoop::main()->runPending();
      std::this_thread::yield();
    }
  }

  /// Without search by meaning: only the shelf knows of the user.
  FrontWorld world;
  const std::shared_ptr<tests::ScriptedObjectManager> manager =
      std::make_shared<tests::ScriptedObjectManager>();
  tests::Latch mayAnswer;
  tests::ScriptedServer server;
};

TEST_F(SearchDownloads, AnIndexThatComesInTimeIsSearched) {
  addRemoteBook("r1");
  std::atomic<bool> ended{false};
  std::thread searcher = search({"r1"}, ended);
  world.clock->waitForSleepOf(searcher.get_id(), 1);
  server.waitForRequests(1);
  EXPECT_FALSE(ended);
  mayAnswer.open();
  // No time passes: the end of the download ends the wait.
  searcher.join();
  EXPECT_THAT(titlesOf(world.owner->records(0)), ElementsAre("Downloaded"));
  EXPECT_THAT(world.logged(2), IsEmpty());
}

TEST_F(SearchDownloads, AfterFiveSecondsASearchGoesOnWithoutTheIndex) {
  const auto book = addRemoteBook("r1");
  // Known, so that nothing of it is waited for.
  world.indices(world.addBook("local", {page("/p.html", "Local", "print queue")}));
  world.drain();
  std::atomic<bool> ended{false};
  const auto start = world.clock->elapsed();
  std::thread searcher = search({"r1", "local"}, ended);
  world.clock->waitForSleepOf(searcher.get_id(), 1);
  world.clock->advance(platform::Seconds(4.999));
  EXPECT_FALSE(ended);
  // More than is left: five seconds in two parts may come to a little less.
  world.clock->advance(platform::Seconds(0.002));
  searcher.join();
  EXPECT_NEAR((world.clock->elapsed() - start).count(), 5.0, 0.002);
  EXPECT_THAT(titlesOf(world.owner->records(0)), ElementsAre("Local"));
  EXPECT_THAT(world.logged(2),
              ElementsAre("====== Timed out waiting for index download completion for r1"));
  mayAnswer.open();
  waitUntilDownloaded(book);
  world.search(FrontWorld::query("print", {"r1"}));
  EXPECT_THAT(world.owner->deliveries(), Contains("found"));
}

TEST_F(SearchDownloads, OfTwoSearchesThatWaitOneIsToldAndTheOtherWaitsToItsEnd) {
  addRemoteBook("r1");
  std::atomic<bool> ended[2] = {false, false};
  std::thread first = search({"r1"}, ended[0]);
  world.clock->waitForSleepOf(first.get_id(), 1);
  std::thread second = search({"r1"}, ended[1]);
  world.clock->waitForSleepOf(second.get_id(), 1);
  // One download for both.
  EXPECT_THAT(world.logged(4), Contains("Index download for r1 already in progress"));
  mayAnswer.open();
  while (!ended[0] && !ended[1]) {
    std::this_thread::yield();
  }
  EXPECT_NE(ended[0], ended[1]);
  world.clock->advance(platform::Seconds(5));
  first.join();
  second.join();
  EXPECT_THAT(server.requests(), SizeIs(1));
  EXPECT_THAT(world.logged(2),
              ElementsAre("====== Timed out waiting for index download completion for r1"));
  // The one that was told has searched the index; the other found no record when it began.
  ASSERT_THAT(world.owner->batches(), SizeIs(1));
  EXPECT_THAT(titlesOf(world.owner->records(0)), ElementsAre("Downloaded"));
}

TEST_F(SearchDownloads, AnOlderIndexIsPolledForUntilTheNewerHasCome) {
  const auto book = addRemoteBook("r1");
  world.folder.write("caches/org.zeb.zebd/GeneratedIndexes/r1/en.helpindex", indexBytes("Older"));
  std::atomic<bool> ended{false};
  std::thread searcher = search({"r1"}, ended);
  server.waitForRequests(1);
  world.clock->waitForSleepOf(searcher.get_id(), 1);
  mayAnswer.open();
  waitUntilDownloaded(book);
  while (!ended) {
    world.clock->advance(platform::Seconds(0.010));
    std::this_thread::yield();
  }
  searcher.join();
  EXPECT_THAT(titlesOf(world.owner->records(0)), ElementsAre("Downloaded"));
}

TEST_F(SearchDownloads, AnOlderIndexIsSearchedAsItStandsAfterFiveSeconds) {
  addRemoteBook("r1");
  world.folder.write("caches/org.zeb.zebd/GeneratedIndexes/r1/en.helpindex", indexBytes("Older"));
  std::atomic<bool> ended{false};
  const auto start = world.clock->elapsed();
  std::thread searcher = search({"r1"}, ended);
  server.waitForRequests(1);
  // It looks every 10 ms.
  for (size_t look = 1; look < 500; ++look) {
    world.clock->waitForSleepOf(searcher.get_id(), look);
    world.clock->advance(platform::Seconds(0.010));
  }
  world.clock->waitForSleepOf(searcher.get_id(), 500);
  EXPECT_FALSE(ended);
  world.clock->advance(platform::Seconds(0.011));
  searcher.join();
  EXPECT_NEAR((world.clock->elapsed() - start).count(), 5.0, 0.01);
  EXPECT_THAT(titlesOf(world.owner->records(0)), ElementsAre("Older"));
}

TEST_F(SearchDownloads, OfflineTheTopicIsShownAndNoDownloadBegins) {
  addRemoteBook("r1");
  world.owner->online = false;
  world.search(FrontWorld::query("print", {"r1"}));
  EXPECT_EQ(manager->requestCount(), 0U);
  EXPECT_THAT(world.owner->deliveries(), ElementsAre("finished"));
}

}  // namespace
