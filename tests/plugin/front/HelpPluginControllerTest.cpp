#include "plugin/front/HelpPluginController.h"

#include <gtest/gtest.h>

#include <mutex>

#include "platform/Condition.h"
#include "platform/DispatchQueue.h"
#include "platform/Strings.h"
#include "platform/WorkerThreads.h"
#include "tests/plugin/front/FrontWorld.h"

using platform::RunLoop;
using platform::Seconds;
using testing::Contains;
using testing::ElementsAre;
using testing::IsEmpty;
using testing::Key;
using tests::FrontWorld;
using tests::page;

namespace {

std::shared_ptr<ZEBIndex> recordOf(const std::string& bookID) {
  auto record = ZEBIndex::init();
  record->setBookID(bookID);
  return record;
}

/// A logged-in world whose books wait for nothing but the registration queue.
class LoggedInWorld : public FrontWorld {
 public:
  LoggedInWorld() : FrontWorld(User::loggedIn) {}
};

}  // namespace

TEST(HelpPluginController, AsksWhetherAUserIsLoggedInThreeTimesAndKeepsNoAnswer) {
  const FrontWorld world;
  const auto owner = std::make_shared<tests::RecordingOwner>();
  const auto controller = HelpPluginController::initWithOwner(owner);
  EXPECT_THAT(owner->questions(), ElementsAre("userLoggedIn", "userLoggedIn", "userLoggedIn"));
  EXPECT_FALSE(controller->_shelf()->userLoggedIn());
}

TEST(HelpPluginController, KeepsItsOwnerAndPassesItToTheShelf) {
  const FrontWorld world;
  EXPECT_EQ(world.controller->owner(), world.owner);
  EXPECT_EQ(world.controller->_shelf()->owner(), world.owner);
}

TEST(HelpPluginController, WithoutALoggedInUserIndexChangesAreNotReported) {
  const FrontWorld world;
  world.controller->_shelf()->_notifyObserversOfChange(ZEBIndexChangeAdded, recordOf("book"));
  EXPECT_THAT(world.owner->messages(), IsEmpty());
}

TEST(HelpPluginController, AUserWhoLogsInLaterChangesNothing) {
  const FrontWorld world;
  world.owner->loggedIn = true;
  world.controller->_shelf()->_notifyObserversOfChange(ZEBIndexChangeAdded, recordOf("book"));
  EXPECT_THAT(world.owner->messages(), IsEmpty());
  EXPECT_FALSE(world.controller->_shelf()->userLoggedIn());
}

TEST(HelpPluginController, WithALoggedInUserEveryKindOfIndexChangeIsReportedAlike) {
  const LoggedInWorld world;
  const auto book = world.addBookWithoutIndex("book");
  for (const auto change : {ZEBIndexChangeAdded, ZEBIndexChangeRemoved, ZEBIndexChangeUpdated}) {
    world.controller->_shelf()->_notifyObserversOfChange(change, recordOf("book"));
  }
  EXPECT_THAT(world.owner->messages(),
              ElementsAre("modified book", "modified book", "modified book"));
  EXPECT_TRUE(world.controller->_shelf()->userLoggedIn());
}

TEST(HelpPluginController, AChangeOfABookThatTheHostNoLongerKnowsIsReportedWithoutABook) {
  const LoggedInWorld world;
  world.controller->indexDidChange(recordOf("gone"), ZEBIndexChangeRemoved);
  world.controller->indexDidChange(ZEBIndex::init(), ZEBIndexChangeRemoved);
  world.controller->indexDidChange(nullptr, ZEBIndexChangeRemoved);
  EXPECT_THAT(world.owner->messages(),
              ElementsAre("modified (null)", "modified (null)", "modified (null)"));
}

TEST(HelpPluginController, TheOwnerHearsOfAChangeOnTheThreadThatMadeIt) {
  const LoggedInWorld world;
  std::thread::id told;
  world.owner->onMessage = [&](const std::string&) { told = std::this_thread::get_id(); };
  std::thread::id made;
  std::thread thread([&] {
    made = std::this_thread::get_id();
    world.controller->_shelf()->_notifyObserversOfChange(ZEBIndexChangeAdded, recordOf("book"));
  });
  thread.join();
  EXPECT_EQ(told, made);
}

TEST(HelpPluginController, WithoutALoggedInUserNothingKeepsTheControllerAlive) {
  FrontWorld world;
  std::weak_ptr<HelpPluginController> controller = HelpPluginController::initWithOwner(world.owner);
  EXPECT_TRUE(controller.expired());
}

TEST(HelpPluginController, AControllerThatObservesTheShelfAndTheShelfKeepEachOtherAlive) {
  const LoggedInWorld world;
  const std::weak_ptr<HelpPluginController> controller =
      HelpPluginController::initWithOwner(world.owner);
  EXPECT_FALSE(controller.expired());
}

TEST(HelpPluginController, ResultTypesAreArticleSuggestionSimilarSuggestionAction) {
  const FrontWorld world;
  EXPECT_THAT(world.controller->resultTypes(),
              ElementsAre(ZEBHelpArticleResult, ZEBHelpSuggestionResult,
                          ZEBHelpSimilarSuggestionResult, ZEBHelpActionResult));
}

TEST(HelpPluginController, CodeThatIsInNoBundleHasNoIdentifier) {
  const FrontWorld world;
  EXPECT_EQ(world.controller->pluginID(), "");
}

TEST(HelpPluginController, WithoutSemanticsCompletingAQueryDoesNothing) {
  const FrontWorld world;
  world.controller->completeSearchForQuery(FrontWorld::query("print"));
  world.controller->completeSearchForQuery(nullptr);
  EXPECT_THAT(world.owner->messages(), IsEmpty());
  EXPECT_THAT(world.log->entries(), IsEmpty());
}

TEST(HelpPluginController, ACompletedQueryIsForwardedUnchanged) {
  FrontWorld world;
  const auto semantics = world.addSemantics();
  const auto query = FrontWorld::query("print");
  world.controller->completeSearchForQuery(query);
  EXPECT_THAT(semantics->completed, ElementsAre(query));
}

TEST(HelpPluginController, APopulatedBookIsRegisteredInTheBackground) {
  const FrontWorld world;
  world.addBook("book", {page("/a.html", "A", "applet")});
  world.controller->finishPopulatingBookWithID("book");
  EXPECT_EQ(world.controller->_shelf()->_pendingBookCount(), 1U);
  EXPECT_THAT(world.controller->_shelf()->_knownIndices(), IsEmpty());
  world.drain();
  EXPECT_EQ(world.controller->_shelf()->_pendingBookCount(), 0U);
  EXPECT_THAT(world.controller->_shelf()->_knownIndices(), ElementsAre(Key("book")));
}

TEST(HelpPluginController, ABookThatTheHostDoesNotKnowIsPassedOnAsNone) {
  const FrontWorld world;
  world.controller->finishPopulatingBookWithID("nobody");
  EXPECT_EQ(world.controller->_shelf()->_pendingBookCount(), 0U);
  EXPECT_EQ(world.controller->_shelf()->indexRegistrationQueue()->operationCount(), 1U);
}

TEST(HelpPluginController, ARemovalHappensOneTenthOfASecondLaterOnTheCallersRunLoop) {
  const FrontWorld world;
  const auto book = world.addBook("book", {page("/a.html", "A", "applet")});
  ASSERT_EQ(world.indices(book).size(), 1U);
  const auto loop = RunLoop::current();
  loop->runPending();

  world.controller->removeIndexForBookWithID("book");
  loop->runPending();
  EXPECT_THAT(world.controller->_shelf()->_knownIndices(), ElementsAre(Key("book")));
  world.clock->advance(Seconds(0.099));
  loop->runPending();
  EXPECT_THAT(world.controller->_shelf()->_knownIndices(), ElementsAre(Key("book")));
  world.clock->advance(Seconds(0.001001));
  EXPECT_THAT(world.controller->_shelf()->_knownIndices(), ElementsAre(Key("book")));
  loop->runPending();
  EXPECT_THAT(world.controller->_shelf()->_knownIndices(), IsEmpty());
}

TEST(HelpPluginController, ARemovalAskedForOnAnotherThreadRunsOnThatThreadsLoop) {
  const FrontWorld world;
  const auto book = world.addBook("book", {page("/a.html", "A", "applet")});
  ASSERT_EQ(world.indices(book).size(), 1U);
  bool knownBefore = false;
  bool knownAfter = true;
  std::thread host([&] {
    world.controller->removeIndexForBookWithID("book");
    knownBefore = !world.controller->_shelf()->_knownIndices().empty();
    RunLoop::current()->runFor(Seconds(0.2));
    knownAfter = !world.controller->_shelf()->_knownIndices().empty();
  });
  world.clock->waitForSleepers(1);
  world.clock->advance(Seconds(0.1));
  while (!world.controller->_shelf()->_knownIndices().empty()) {
    std::this_thread::yield();
  }
  world.clock->waitForSleepers(1);
  world.clock->advance(Seconds(0.2));
  host.join();
  EXPECT_TRUE(knownBefore);
  EXPECT_FALSE(knownAfter);
}

TEST(HelpPluginController, AThreadThatNeverRunsItsLoopNeverRemoves) {
  const FrontWorld world;
  const auto book = world.addBook("book", {page("/a.html", "A", "applet")});
  ASSERT_EQ(world.indices(book).size(), 1U);
  std::thread host([&] { world.controller->removeIndexForBookWithID("book"); });
  host.join();
  world.clock->advance(Seconds(10));
  RunLoop::main()->runPending();
  EXPECT_THAT(world.controller->_shelf()->_knownIndices(), ElementsAre(Key("book")));
}

TEST(HelpPluginController, AShelfWaitsForItsRemovalAfterTheControllerIsGone) {
  FrontWorld world;
  const auto book = world.addBook("book", {page("/a.html", "A", "applet")});
  auto controller = HelpPluginController::initWithOwner(world.owner);
  const auto shelf = controller->_shelf();
  ASSERT_EQ(shelf->indicesForBook(book).size(), 1U);
  controller->removeIndexForBookWithID("book");
  controller.reset();
  world.clock->advance(Seconds(0.11));
  RunLoop::main()->runPending();
  EXPECT_THAT(shelf->_knownIndices(), IsEmpty());
}

TEST(HelpPluginController, OnlyEventOneResetsTheShelf) {
  const FrontWorld world;
  const auto book = world.addBook("book", {page("/a.html", "A", "applet")});
  ASSERT_EQ(world.indices(book).size(), 1U);
  for (const int64_t event : {0, 2, -1}) {
    world.controller->notifyEvent(event, platform::Value(true));
    EXPECT_THAT(world.controller->_shelf()->_knownIndices(), ElementsAre(Key("book"))) << event;
    EXPECT_TRUE(world.controller->_shelf()->_helpIndexCachePath()) << event;
  }
  // At once, on this thread, whatever the context is.
  world.controller->notifyEvent(1, platform::Value());
  EXPECT_THAT(world.controller->_shelf()->_knownIndices(), IsEmpty());
  EXPECT_FALSE(world.controller->_shelf()->_helpIndexCachePath());
}

TEST(HelpPluginController, WithoutSemanticsNothingIsPreloaded) {
  const LoggedInWorld world;
  world.owner->lazy = false;
  world.controller->finishPopulatingKnownBooks();
  EXPECT_THAT(world.owner->questions(), ElementsAre("shouldBeLazy", "userLoggedIn"));
}

TEST(HelpPluginController, ALazyHostIsAskedNothingElseAndNothingIsPreloaded) {
  LoggedInWorld world;
  const auto semantics = world.addSemantics();
  std::atomic<bool> loaded{false};
  semantics->onLoad = [&] { loaded = true; };
  world.owner->lazy = true;
  world.controller->finishPopulatingKnownBooks();
  EXPECT_THAT(world.owner->questions(), ElementsAre("shouldBeLazy"));
  std::this_thread::sleep_for(std::chrono::milliseconds(20));
  EXPECT_FALSE(loaded);
}

TEST(HelpPluginController, WithoutALoggedInUserNothingIsPreloaded) {
  FrontWorld world;
  const auto semantics = world.addSemantics();
  std::atomic<bool> loaded{false};
  semantics->onLoad = [&] { loaded = true; };
  world.owner->lazy = false;
  world.controller->finishPopulatingKnownBooks();
  EXPECT_THAT(world.owner->questions(), ElementsAre("shouldBeLazy", "userLoggedIn"));
  std::this_thread::sleep_for(std::chrono::milliseconds(20));
  EXPECT_FALSE(loaded);
}

TEST(HelpPluginController, ModelsArePreloadedOnAThreadNamedBookPreloadAndTheCallReturnsAtOnce) {
  LoggedInWorld world;
  const auto semantics = world.addSemantics();
  world.owner->lazy = false;
  platform::DispatchSemaphore mayLoad(0);
  platform::DispatchSemaphore loaded(0);
  std::string name;
  std::thread::id thread;
  semantics->onLoad = [&] {
    mayLoad.wait();
    name = platform::currentThreadName();
    thread = std::this_thread::get_id();
    loaded.signal();
  };
  world.controller->finishPopulatingKnownBooks();
  mayLoad.signal();
  loaded.wait();
  EXPECT_EQ(name, "book-preload");
  EXPECT_NE(thread, std::this_thread::get_id());
}

TEST(HelpPluginController, AControllerWithoutAnOwnerAnswersNothingAndHoldsUp) {
  const FrontWorld world;
  const auto controller = HelpPluginController::initWithOwner(nullptr);
  controller->startSearchForQuery(FrontWorld::query("print"));
  controller->finishPopulatingBookWithID("book");
  controller->finishPopulatingKnownBooks();
  controller->indexDidChange(recordOf("book"), ZEBIndexChangeAdded);
  controller->notifyEvent(1, {});
  EXPECT_EQ(controller->owner(), nullptr);
  EXPECT_THAT(world.logged(3), Contains("Starting help articles search for query: \"print\""));
  EXPECT_THAT(world.logged(0), IsEmpty());
  world.clock->advance(Seconds(3));
  controller->_shelf()->indexRegistrationQueue()->waitUntilAllOperationsAreFinished();
}

TEST(ZEBStringUtilities, RemovingWhitespaceTakesOutBlanksTabsAndNewlinesWhereverTheyStand) {
  EXPECT_EQ(platform::stringByRemovingWhitespace("  a b\tc\n"), "abc");
  EXPECT_EQ(platform::stringByRemovingWhitespace(""), "");
  EXPECT_EQ(platform::stringByRemovingWhitespace(" "), "");
}
