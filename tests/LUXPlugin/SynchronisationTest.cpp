// Following the changes of books.
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <atomic>

#include "host/Luxwell/HelpLUXIndex.h"
#include "platform/OperationQueue.h"
#include "platform/RunLoop.h"
#include "plugin/operations/ZEBOperationQueue.h"
#include "tests/LUXPlugin/LUXWorld.h"

using testing::AllOf;
using testing::Contains;
using testing::Each;
using testing::ElementsAre;
using testing::IsEmpty;
using testing::Not;
using testing::SizeIs;
using testing::UnorderedElementsAre;
using tests::LogEntry;
using tests::LUXWorld;

namespace {

using Event = std::pair<const std::string, int32_t>;

/// Two groups with a book each and a model that has it. Nothing is pending.
class Synchronisation : public testing::Test {
 protected:
  Synchronisation() {
    world.addBook("org.one", tests::kitchenPages(), "Apps");
    world.addBook("org.two", tests::printerPages(), "System");
    record = recordOf("org.one");
    recordOf("org.two");
    world.build("Apps");
    world.build("System");
    world.controller->_syncModelsWithIndexEvents();
    EXPECT_THAT(pending(), IsEmpty());
    // The timer of those events finds nothing to do.
    world.clock->advance(platform::Seconds(2));
    platform::RunLoop::main()->runPending();
    EXPECT_TRUE(LUXWorld::waitUntil([&] { return passes() == 2; }));
    world.finishWork();
    world.owner->forgetMessages();
    world.log->clear();
    world.clock->forgetSleeps();
    world.clock->onSleep = nullptr;
  }
  std::shared_ptr<ZEBIndex> recordOf(const std::string& bookID) const {
    const auto indices = world.shelf->indicesForBook(world.owner->bookWithID(bookID));
    EXPECT_THAT(indices, SizeIs(1));
    return indices.empty() ? nullptr : indices.front();
  }
  void tell(const std::shared_ptr<ZEBIndex>& index, int32_t kind) const {
    world.controller->indexDidChange(index, static_cast<ZEBIndexChange>(kind));
  }
  void tell(int32_t kind) const { tell(record, kind); }
  std::map<std::string, int32_t> pending() const { return world.controller->_pendingIndexEvents(); }
  void sync() const { world.controller->_syncModelsWithIndexEvents(); }

  /// Lets the shelf end what it has to do on the main loop.
  void settle() const {
    world.finishWork();
    platform::RunLoop::main()->runPending();
  }
  /// How many timers fire when the time moves on.
  size_t firedAfter(double seconds) const {
    world.clock->advance(platform::Seconds(seconds));
    return platform::RunLoop::main()->runPending();
  }
  /// How often a pass was begun, or something else that the daemon must not exit in.
  size_t passes() const {
    const auto messages = world.owner->messages();
    return static_cast<size_t>(std::count(messages.begin(), messages.end(), "disableShutdown"));
  }
  std::vector<LogEntry> logged() const {
    return world.loggedBeginningWith(
        {"Starting build", "Finished build", "Attemping", "Waiting", "Couldn't", "host on fire"});
  }
  std::vector<LogEntry> built(const std::string& group) const {
    return {{4, "Starting build of " + group}, {4, "Finished build of " + group}};
  }

  LUXWorld world;
  std::shared_ptr<ZEBIndex> record;
};

// Events.

TEST_F(Synchronisation, keepsTheHighestKindOfEachBook) {
  tell(1);
  EXPECT_THAT(pending(), ElementsAre(Event{"org.one", 1}));
  tell(3);
  EXPECT_THAT(pending(), ElementsAre(Event{"org.one", 3}));
  tell(1);
  tell(2);
  EXPECT_THAT(pending(), ElementsAre(Event{"org.one", 3}));
  tell(recordOf("org.two"), 2);
  EXPECT_THAT(pending(), ElementsAre(Event{"org.one", 3}, Event{"org.two", 2}));
}

TEST_F(Synchronisation, anEventThatRaisesTheKindBeginsTheQuietSecondAnew) {
  tell(1);
  EXPECT_EQ(firedAfter(0.75), 0U);
  tell(3);
  // A second after the first event, and a quarter of one after the other.
  EXPECT_EQ(firedAfter(0.25), 0U);
  EXPECT_EQ(firedAfter(0.5), 0U);
  EXPECT_EQ(firedAfter(0.25), 1U);
  EXPECT_TRUE(LUXWorld::waitUntil([&] { return pending().empty() && world.owner->guards() == 0; }));
}

TEST_F(Synchronisation, anEventThatDoesNotRaiseTheKindLeavesTheTimerRunning) {
  tell(3);
  EXPECT_EQ(firedAfter(0.75), 0U);
  tell(1);
  tell(3);
  EXPECT_EQ(firedAfter(0.25), 1U);
  EXPECT_TRUE(LUXWorld::waitUntil([&] { return pending().empty() && world.owner->guards() == 0; }));
}

TEST_F(Synchronisation, anEventOfAnotherBookBeginsTheQuietSecondAnew) {
  tell(1);
  EXPECT_EQ(firedAfter(0.75), 0U);
  tell(recordOf("org.two"), 1);
  EXPECT_EQ(firedAfter(0.75), 0U);
  EXPECT_EQ(firedAfter(0.25), 1U);
  EXPECT_TRUE(LUXWorld::waitUntil([&] { return pending().empty() && world.owner->guards() == 0; }));
}

TEST_F(Synchronisation, ignoresBooksThatTakeNoPart) {
  world.addBookWithData("org.none", std::nullopt, "Apps");
  world.addBookWithData("org.unwilling",
                        HelpLUXIndex::versionedDataWithAttributes(
                            platform::Value::Dictionary{{HelpLUXIndexAttributeIgnoreLUXKey, true}}),
                        "Apps");
  tell(recordOf("org.none"), 3);
  tell(recordOf("org.unwilling"), 3);
  EXPECT_THAT(pending(), IsEmpty());
  settle();
  EXPECT_EQ(firedAfter(2), 0U);
}

TEST_F(Synchronisation, ignoresRecordsWithoutABookAndEventsOfNoKind) {
  const auto nameless = ZEBIndex::initWithPath(std::nullopt);
  tell(nameless, 3);
  tell(nullptr, 2);
  tell(0);
  tell(-1);
  EXPECT_THAT(pending(), IsEmpty());
  EXPECT_EQ(firedAfter(2), 0U);
}

TEST_F(Synchronisation, takesARecordAtItsWordThatCannotSayWhetherItTakesPart) {
  const auto plain = ZEBIndex::initWithPath(std::nullopt);
  plain->setBookID("org.one");
  tell(plain, 1);
  EXPECT_THAT(pending(), ElementsAre(Event{"org.one", 1}));
}

TEST_F(Synchronisation, hearsOfARemovalUnderTheShelfsLock) {
  world.shelf->removeIndexForBookID("org.one");
  EXPECT_THAT(pending(), ElementsAre(Event{"org.one", 2}));
}

// From the timer to the pass.

TEST_F(Synchronisation, waitsInStepsOfASecondWhileIndexesAreGenerated) {
  platform::DispatchSemaphore release(0);
  world.shelf->indexGeneratingQueue()->addOperationWithBlock([&] { release.wait(); });
  platform::RunLoop::main()->runPending();
  tell(3);
  for (int step = 0; step < 5; ++step) {
    EXPECT_EQ(firedAfter(0.5), 0U);
    EXPECT_EQ(firedAfter(0.5), 1U);
    EXPECT_EQ(passes(), 0U);
    EXPECT_THAT(pending(), SizeIs(1));
  }
  release.signal();
  world.shelf->indexGeneratingQueue()->waitUntilAllOperationsAreFinished();
  platform::RunLoop::main()->runPending();
  EXPECT_EQ(firedAfter(1), 1U);
  EXPECT_TRUE(LUXWorld::waitUntil([&] { return pending().empty() && world.owner->guards() == 0; }));
}

TEST_F(Synchronisation, runsOnAThreadOfItsOwn) {
  std::mutex mutex;
  std::vector<std::string> threads;
  world.owner->onMessage = [&](const std::string& told) {
    if (told == "disableShutdown") {
      const std::lock_guard lock(mutex);
      threads.push_back(platform::currentThreadName());
    }
  };
  tell(1);
  EXPECT_EQ(firedAfter(1), 1U);
  EXPECT_TRUE(LUXWorld::waitUntil([&] { return pending().empty() && world.owner->guards() == 0; }));
  const std::lock_guard lock(mutex);
  EXPECT_THAT(threads, ElementsAre("lux-model-sync"));
}

TEST_F(Synchronisation, doesNotHoldThePendingTableWhileItAsksTheShelf) {
  // A removal holds the shelf's lock and wants the pending table; the timer wants both.
  std::atomic<bool> inside{false};
  std::atomic<bool> goOn{false};
  std::thread remover([&] {
    const platform::MonitorLock lock(world.shelf->_shelfMonitor());
    inside = true;
    LUXWorld::waitUntil([&] { return goOn.load(); });
    tell(2);
  });
  LUXWorld::waitUntil([&] { return inside.load(); });
  std::thread timer([&] { world.controller->processPendingIndexEvents(); });
  // By now it waits for the shelf.
  world.clock->letOthersWork();
  goOn = true;
  remover.join();
  timer.join();
  EXPECT_TRUE(LUXWorld::waitUntil([&] { return passes() >= 1 && world.owner->guards() == 0; }));
}

// A pass.

TEST_F(Synchronisation, withNothingPendingOnlyGuardsTheDaemon) {
  sync();
  EXPECT_THAT(world.owner->messages(), ElementsAre("disableShutdown", "enableShutdown"));
  EXPECT_THAT(world.log->entries(), IsEmpty());
  EXPECT_THAT(world.clock->sleeps(), IsEmpty());
}

TEST_F(Synchronisation, releasesAModelThatHasTheBookAlready) {
  tell(1);
  sync();
  EXPECT_THAT(pending(), IsEmpty());
  EXPECT_THAT(logged(), IsEmpty());
  // Released as from a build: whoever comes next opens the model afresh.
  EXPECT_THAT(world.controller->_registeredModels(), IsEmpty());
}

TEST_F(Synchronisation, rebuildsAModelThatDoesNotHaveTheBook) {
  world.addBook("org.new", tests::printerPages(), "Apps");
  tell(recordOf("org.new"), 1);
  sync();
  EXPECT_THAT(pending(), IsEmpty());
  EXPECT_EQ(logged(), built("Apps"));
  const auto model =
      world.controller->modelForGroupName("Apps", "English", true, kLUXModelActivityQuerying);
  EXPECT_THAT(model->allHelpbookIDs(), ElementsAre("org.new", "org.one"));
  world.controller->finishedActivity(kLUXModelActivityQuerying, "Apps", "English");
}

TEST_F(Synchronisation, rebuildsAfterARemoval) {
  world.shelf->removeIndexForBookID("org.one");
  world.owner->forgetBook("org.one");
  sync();
  EXPECT_EQ(logged(), built("Apps"));
  EXPECT_THAT(pending(), IsEmpty());
  const auto model =
      world.controller->modelForGroupName("Apps", "English", true, kLUXModelActivityQuerying);
  EXPECT_THAT(model->allHelpbookIDs(), IsEmpty());
  world.controller->finishedActivity(kLUXModelActivityQuerying, "Apps", "English");
}

TEST_F(Synchronisation, rebuildsAfterAnUpdate) {
  tell(3);
  sync();
  EXPECT_EQ(logged(), built("Apps"));
}

TEST_F(Synchronisation, rebuildsOnlyTheGroupsThatNeedIt) {
  tell(1);
  tell(recordOf("org.two"), 3);
  sync();
  EXPECT_EQ(logged(), built("System"));
  EXPECT_THAT(pending(), IsEmpty());
}

TEST_F(Synchronisation, rebuildsAGroupOnceForAllItsBooks) {
  for (const char* bookID : {"org.a", "org.b", "org.c"}) {
    world.addBook(bookID, tests::printerPages(), "Apps");
    tell(recordOf(bookID), 3);
  }
  tell(3);
  sync();
  EXPECT_EQ(logged(), built("Apps"));
  EXPECT_THAT(pending(), IsEmpty());
}

TEST_F(Synchronisation, loadsTheSemanticIndexAfresh) {
  const auto before = world.controller->_luxIndexForHelpbookIdentifier("org.one");
  const auto other = world.controller->_luxIndexForHelpbookIdentifier("org.two");
  std::dynamic_pointer_cast<ZEBHelpindexIndex>(record)->reinitializeWithData(
      *platform::systemFileManager()->contentsAtPath(
          world.writeIndex("org.one", LUXWorld::semanticData(tests::printerPages()))));
  EXPECT_EQ(world.controller->_luxIndexForHelpbookIdentifier("org.one"), before);
  tell(3);
  sync();
  const auto after = world.controller->_luxIndexForHelpbookIdentifier("org.one");
  ASSERT_TRUE(after);
  EXPECT_THAT(after->documentKeys(), Contains("add.html"));
  EXPECT_EQ(world.controller->_luxIndexForHelpbookIdentifier("org.two"), other);
}

TEST_F(Synchronisation, leavesBooksPendingWhoseModelStaysBusy) {
  ASSERT_TRUE(
      world.controller->modelForGroupName("Apps", "English", true, kLUXModelActivityQuerying));
  const auto index = world.controller->_luxIndexForHelpbookIdentifier("org.one");
  tell(3);
  tell(recordOf("org.two"), 3);
  const double before = world.clock->elapsed().count();
  sync();
  EXPECT_NEAR(world.clock->elapsed().count() - before, 5.0, 0.11);
  EXPECT_THAT(pending(), ElementsAre(Event{"org.one", 3}));
  EXPECT_EQ(logged(), built("System"));
  EXPECT_EQ(world.activity("Apps"), kLUXModelActivityQuerying);
  EXPECT_EQ(world.controller->_luxIndexForHelpbookIdentifier("org.one"), index);
  // The next pass takes it up.
  world.controller->finishedActivity(kLUXModelActivityQuerying, "Apps", "English");
  world.log->clear();
  sync();
  EXPECT_THAT(pending(), IsEmpty());
  EXPECT_EQ(logged(), built("Apps"));
}

TEST_F(Synchronisation, asksNobodyToTryAgainForABusyModel) {
  ASSERT_TRUE(
      world.controller->modelForGroupName("Apps", "English", true, kLUXModelActivityQuerying));
  tell(3);
  EXPECT_EQ(firedAfter(1), 1U);
  EXPECT_TRUE(LUXWorld::waitUntil([&] { return passes() == 1 && world.owner->guards() == 0; }));
  EXPECT_THAT(pending(), SizeIs(1));
  EXPECT_EQ(firedAfter(100), 0U);
  // A later event does.
  world.controller->finishedActivity(kLUXModelActivityQuerying, "Apps", "English");
  tell(recordOf("org.two"), 1);
  EXPECT_EQ(firedAfter(1), 1U);
  EXPECT_TRUE(LUXWorld::waitUntil([&] { return pending().empty() && world.owner->guards() == 0; }));
}

TEST_F(Synchronisation, waitsInSecondsForQueriesAndLoading) {
  world.controller->_setQueryInProgress(true);
  world.clock->onSleep = [&](size_t count) {
    if (count == 7) {
      world.controller->_setQueryInProgress(false);
    }
  };
  tell(3);
  sync();
  const auto sleeps = world.clock->sleepsOf("");
  EXPECT_THAT(sleeps, AllOf(SizeIs(7), Each(1.0)));
  EXPECT_THAT(pending(), IsEmpty());
}

TEST_F(Synchronisation, waitsForThePreload) {
  std::thread synchroniser;
  std::atomic<bool> begun{false};
  world.clock->onSleep = [&](size_t count) {
    if (platform::currentThreadName().empty() && count == 1 && !begun.exchange(true)) {
      EXPECT_TRUE(world.controller->_loading());
      synchroniser = std::thread([&] {
        platform::setCurrentThreadName("synchroniser");
        sync();
        EXPECT_FALSE(world.controller->_loading());
      });
      LUXWorld::waitUntil([&] { return !world.clock->sleepsOf("synchroniser").empty(); });
    }
  };
  tell(3);
  world.controller->loadLUXModels();
  synchroniser.join();
  EXPECT_THAT(world.clock->sleepsOf("synchroniser"), Each(1.0));
  EXPECT_THAT(pending(), IsEmpty());
}

TEST_F(Synchronisation, waitsForAllWorkOfTheShelfAndForBuilds) {
  using Queue = std::shared_ptr<platform::OperationQueue>;
  for (const Queue& queue :
       {Queue(world.shelf->indexRegistrationQueue()), Queue(world.shelf->indexGeneratingQueue()),
        Queue(world.shelf->indexDownloadQueue()), Queue(world.shelf->assetDownloadQueue()),
        world.controller->_modelUpdateQueue()}) {
    platform::DispatchSemaphore release(0);
    queue->addOperationWithBlock([&] { release.wait(); });
    std::atomic<bool> over{false};
    std::thread synchroniser([&] {
      sync();
      over = true;
    });
    EXPECT_TRUE(LUXWorld::waitUntil([&] { return world.owner->guards() > 0; }));
    world.clock->letOthersWork();
    EXPECT_FALSE(over);
    release.signal();
    synchroniser.join();
  }
}

TEST_F(Synchronisation, doesNotWaitForFetchedUpdates) {
  platform::DispatchSemaphore release(0);
  world.shelf->indexFetchUpdateQueue()->addOperationWithBlock([&] { release.wait(); });
  sync();
  release.signal();
  world.shelf->indexFetchUpdateQueue()->waitUntilAllOperationsAreFinished();
}

TEST_F(Synchronisation, thatThrowsIsLoggedAndTheNextOneRuns) {
  tell(3);
  std::atomic<bool> broken{true};
  world.owner->onMessage = [&](const std::string& told) {
    // Asked for at the end of a pass that rebuilt something.
    if (broken && told == "shouldBeLazy") {
      throw std::runtime_error("host on fire");
    }
  };
  sync();
  EXPECT_EQ(logged().back(), (LogEntry{0, "host on fire"}));
  EXPECT_EQ(world.owner->guards(), 0);
  broken = false;
  tell(3);
  sync();
  EXPECT_THAT(pending(), IsEmpty());
}

TEST_F(Synchronisation, keepsBooksOfABuildThatThrewOutOfTheNextPass) {
  tell(3);
  std::atomic<bool> broken{true};
  world.owner->onMessage = [&](const std::string& told) {
    if (broken && told == "knownBooks") {
      throw std::runtime_error("host on fire");
    }
  };
  sync();
  // The build caught it and kept the model; for the pass the group was processed.
  EXPECT_EQ(world.activity("Apps"), kLUXModelActivityBuilding);
  EXPECT_THAT(pending(), IsEmpty());
  EXPECT_EQ(world.owner->guards(), 0);
}

TEST_F(Synchronisation, takesNoNoticeOfEventsThatComeWhileItRuns) {
  tell(recordOf("org.two"), 3);
  std::atomic<bool> told{false};
  world.owner->onMessage = [&](const std::string& message) {
    if (message == "knownBooks" && !told.exchange(true)) {
      tell(3);
    }
  };
  sync();
  EXPECT_EQ(logged(), built("System"));
  EXPECT_THAT(pending(), ElementsAre(Event{"org.one", 3}));
}

TEST_F(Synchronisation, buildsInTheLanguageOfTheUser) {
  world.change([](platform::Environment& environment) {
    environment.preferredLanguages = {"de", "en"};
  });
  tell(3);
  sync();
  EXPECT_TRUE(HelpLUXModel::modelExistsForGroupName("Apps", "German"));
}

// Loading what was rebuilt.

class LoadingAfterwards : public Synchronisation {
 protected:
  LoadingAfterwards() {
    world.owner->lazy = false;
    world.owner->loggedIn = true;
    world.controller->onLoad = [this] {
      thread = platform::currentThreadName();
      ++loads;
    };
  }
  /// Rebuilds one model, and tells whether the preload was started.
  bool loadsAfterRebuild() {
    tell(3);
    sync();
    world.clock->letOthersWork();
    return loads > 0;
  }

  std::atomic<int> loads{0};
  std::string thread;
};

TEST_F(LoadingAfterwards, happensOnAThreadOfItsOwn) {
  EXPECT_TRUE(loadsAfterRebuild());
  EXPECT_EQ(thread, "lux-model-load");
}

TEST_F(LoadingAfterwards, doesNotHappenWhereNothingWasRebuilt) {
  tell(1);
  sync();
  world.clock->letOthersWork();
  EXPECT_EQ(loads, 0);
}

TEST_F(LoadingAfterwards, doesNotHappenOnceAPreloadWasComplete) {
  world.controller->onLoad = nullptr;
  world.controller->loadLUXModels();
  ASSERT_TRUE(world.controller->_finalizedStartup());
  world.controller->onLoad = [this] { ++loads; };
  EXPECT_FALSE(loadsAfterRebuild());
}

TEST_F(LoadingAfterwards, doesNotHappenForALazyHost) {
  world.owner->lazy = true;
  EXPECT_FALSE(loadsAfterRebuild());
}

TEST_F(LoadingAfterwards, doesNotHappenWithoutAUser) {
  world.owner->loggedIn = false;
  EXPECT_FALSE(loadsAfterRebuild());
}

}  // namespace
