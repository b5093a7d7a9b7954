// The shelf itself: construction, observers, where generated files lie.
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "host/Zebrine/ZEBConstants.h"
#include "plugin/operations/ZEBOperationQueue.h"
#include "plugin/records/ZEBHelpindexIndex.h"
#include "tests/plugin/shelf/ShelfWorld.h"

using testing::ElementsAre;
using testing::IsEmpty;
using tests::RecordingObserver;
using tests::ShelfWorld;

namespace {

constexpr const char* changeNotification = "ZEBIndexDidChangeNotification";

TEST(ZEBIndexshelf, startsEmptyWithoutACacheFile) {
  ShelfWorld world;
  EXPECT_THAT(world.makeShelf()._knownIndices(), IsEmpty());
  EXPECT_THAT(world.logged(), IsEmpty());
}

TEST(ZEBIndexshelf, startsEmptyWithAnEmptyCacheFile) {
  ShelfWorld world;
  world.folder.write("caches/help/HelpindexCache.plist", "");
  EXPECT_THAT(world.makeShelf()._knownIndices(), IsEmpty());
}

TEST(ZEBIndexshelf, startsWithTheEntriesOfAValidCacheFile) {
  ShelfWorld world;
  const auto book = world.makeBookWithIndex("org.one");
  world.makeShelf().indicesForBook(book);
  world.shelf->archiveKnownIndices();
  const auto known = world.makeShelf()._knownIndices();
  ASSERT_EQ(known.size(), 1U);
  ASSERT_EQ(known.at("org.one").size(), 1U);
  EXPECT_EQ(known.at("org.one").front()->path(), book->indexPaths().front());
}

TEST(ZEBIndexshelf, startsInLazyModeWithNobodyLoggedIn) {
  ShelfWorld world;
  const auto shelf = ZEBIndexshelf::initWithOwner(world.owner);
  EXPECT_TRUE(shelf->shouldBeLazy());
  EXPECT_FALSE(shelf->userLoggedIn());
}

TEST(ZEBIndexshelf, keepsItsCacheFileInTheHelpCachesFolderOfItsOwner) {
  ShelfWorld world;
  EXPECT_EQ(world.makeShelf()._helpIndexCachePath(), world.helpCaches + "/HelpindexCache.plist");
}

TEST(ZEBIndexshelf, hasNoCacheFileWithoutACachesFolder) {
  ShelfWorld world;
  const auto shelf =
      ZEBIndexshelf::initWithOwner(std::make_shared<tests::ShelfOwner>(std::nullopt));
  EXPECT_EQ(shelf->_helpIndexCachePath(), std::nullopt);
  shelf->archiveKnownIndices();
  shelf->clearIndexCache();
  EXPECT_THAT(world.logged(), IsEmpty());
}

TEST(ZEBIndexshelf, doesNotKeepItsOwnerAlive) {
  ShelfWorld world;
  auto owner = std::make_shared<tests::ShelfOwner>(world.helpCaches);
  const auto shelf = ZEBIndexshelf::initWithOwner(owner);
  EXPECT_EQ(shelf->owner(), owner);
  owner.reset();
  EXPECT_EQ(shelf->owner(), nullptr);
}

TEST(ZEBIndexshelf, worksWithoutAnOwner) {
  ShelfWorld world;
  const auto shelf = ZEBIndexshelf::initWithOwner(nullptr);
  EXPECT_EQ(shelf->owner(), nullptr);
  const auto book = world.makeBookWithIndex("org.one");
  EXPECT_EQ(shelf->indicesForBook(book).size(), 1U);
  shelf->removeIndexForBookID("org.one");
  EXPECT_THAT(shelf->_knownIndices(), IsEmpty());
}

TEST(ZEBIndexshelf, runsOneOperationAtATimeOnFourQueuesAndAnyNumberOfAssetDownloads) {
  ShelfWorld world;
  const ZEBIndexshelf& shelf = world.makeShelf();
  EXPECT_EQ(shelf.indexGeneratingQueue()->maxConcurrentOperationCount(), 1);
  EXPECT_EQ(shelf.indexRegistrationQueue()->maxConcurrentOperationCount(), 1);
  EXPECT_EQ(shelf.indexFetchUpdateQueue()->maxConcurrentOperationCount(), 1);
  EXPECT_EQ(shelf.indexDownloadQueue()->maxConcurrentOperationCount(), 1);
  EXPECT_EQ(shelf.assetDownloadQueue()->maxConcurrentOperationCount(),
            ZEBOperationQueue::defaultMaxConcurrentOperationCount);
}

TEST(ZEBIndexshelf, hasDrainBlocksOnTheQueuesThatChangeIndicesAndOnNoOther) {
  ShelfWorld world;
  const ZEBIndexshelf& shelf = world.makeShelf();
  EXPECT_TRUE(shelf.indexGeneratingQueue()->completionBlock());
  EXPECT_TRUE(shelf.indexFetchUpdateQueue()->completionBlock());
  EXPECT_TRUE(shelf.indexDownloadQueue()->completionBlock());
  EXPECT_FALSE(shelf.indexRegistrationQueue()->completionBlock());
  EXPECT_FALSE(shelf.assetDownloadQueue()->completionBlock());
}

TEST(ZEBIndexshelf, drainBlocksHoldTheShelfOnlyWeakly) {
  ShelfWorld world;
  world.makeShelf();
  const auto queue = world.shelf->indexGeneratingQueue();
  const std::weak_ptr<ZEBIndexshelf> weak = world.shelf;
  world.dropShelf();
  EXPECT_TRUE(weak.expired());
  queue->completionBlock()();
  EXPECT_FALSE(ShelfWorld::exists(world.cachePath()));
}

TEST(ZEBIndexshelf, withoutLazinessGeneratesAsManyIndexesAsThereAreProcessors) {
  ShelfWorld world;
  ZEBIndexshelf& shelf = world.makeShelf();
  shelf.setShouldBeLazy(false);
  EXPECT_FALSE(shelf.shouldBeLazy());
  EXPECT_EQ(shelf.indexGeneratingQueue()->maxConcurrentOperationCount(), 8);
  shelf.setShouldBeLazy(true);
  EXPECT_TRUE(shelf.shouldBeLazy());
  EXPECT_EQ(shelf.indexGeneratingQueue()->maxConcurrentOperationCount(), 1);
}

TEST(ZEBIndexshelf, countsOneProcessorWhereTheirNumberCannotBeTold) {
  ShelfWorld world;
  EXPECT_EQ(ZEBIndexshelf::processorCoreCount(), 8);
  world.change(
      [](platform::Environment& environment) { environment.processorCount = [] { return 0; }; });
  EXPECT_EQ(ZEBIndexshelf::processorCoreCount(), 1);
}

TEST(ZEBIndexshelf, tellsAnObserverThatWasAddedTwiceTwice) {
  ShelfWorld world;
  ZEBIndexshelf& shelf = world.makeShelf();
  shelf.addObserver(world.observer);
  const auto record = ZEBIndex::init();
  shelf._notifyObserversOfChange(ZEBIndexChangeUpdated, record);
  ASSERT_THAT(world.observer->kinds(), ElementsAre(ZEBIndexChangeUpdated, ZEBIndexChangeUpdated));
  EXPECT_EQ(world.observer->changes().front().index, record);
}

TEST(ZEBIndexshelf, tellsObserversInTheOrderInWhichTheyWereAddedOnTheCallingThread) {
  ShelfWorld world;
  ZEBIndexshelf& shelf = world.makeShelf();
  std::string order;
  std::vector<std::shared_ptr<RecordingObserver>> observers;
  for (char name = 'a'; name <= 'd'; ++name) {
    observers.push_back(std::make_shared<RecordingObserver>());
    observers.back()->onChange = [&order, name](const auto&) { order += name; };
    shelf.addObserver(observers.back());
  }
  std::thread::id caller;
  std::thread([&] {
    caller = std::this_thread::get_id();
    shelf._notifyObserversOfChange(ZEBIndexChangeAdded, ZEBIndex::init());
  }).join();
  EXPECT_EQ(order, "abcd");
  EXPECT_EQ(observers.back()->changes().front().thread, caller);
}

TEST(ZEBIndexshelf, keepsItsObserversAlive) {
  ShelfWorld world;
  ZEBIndexshelf& shelf = world.makeShelf();
  const std::weak_ptr<RecordingObserver> weak = world.observer;
  world.observer.reset();
  EXPECT_FALSE(weak.expired());
  shelf._notifyObserversOfChange(ZEBIndexChangeAdded, ZEBIndex::init());
  EXPECT_EQ(weak.lock()->changes().size(), 1U);
}

TEST(ZEBIndexshelf, callsObserversWithoutTheLockOfTheirList) {
  ShelfWorld world;
  ZEBIndexshelf& shelf = world.makeShelf();
  const auto late = std::make_shared<RecordingObserver>();
  world.observer->onChange = [&](const auto&) {
    // Another thread, so that a lock held here would not let it in.
    std::thread([&] { shelf.addObserver(late); }).join();
  };
  shelf._notifyObserversOfChange(ZEBIndexChangeAdded, ZEBIndex::init());
  EXPECT_THAT(late->changes(), IsEmpty());
  world.observer->onChange = nullptr;
  shelf._notifyObserversOfChange(ZEBIndexChangeAdded, ZEBIndex::init());
  EXPECT_EQ(late->changes().size(), 1U);
}

TEST(ZEBIndexshelf, broadcastsAChangeAfterItsObserversHeardOfIt) {
  ShelfWorld world;
  ZEBIndexshelf& shelf = world.makeShelf();
  shelf.addObserver(world.observer);
  size_t toldBeforePost = 0;
  world.center->onPost = [&] { toldBeforePost = world.observer->changes().size(); };
  shelf._notifyObserversOfChange(ZEBIndexChangeAdded, ZEBIndex::init());
  EXPECT_EQ(toldBeforePost, 2U);
  const auto posted = world.center->posted();
  ASSERT_EQ(posted.size(), 1U);
  EXPECT_EQ(posted.front().name, changeNotification);
  EXPECT_EQ(posted.front().object, std::nullopt);
}

TEST(ZEBIndexshelf, broadcastsAChangeWithoutAnyObserver) {
  ShelfWorld world;
  const auto shelf = ZEBIndexshelf::initWithOwner(world.owner);
  int heard = 0;
  const auto observation =
      world.center->addObserver(changeNotification, [&](const auto&) { ++heard; });
  shelf->_notifyObserversOfChange(ZEBIndexChangeRemoved, ZEBIndex::init());
  EXPECT_TRUE(world.runMainLoopUntil([&] { return heard > 0; }));
  EXPECT_EQ(heard, 1);
}

TEST(ZEBIndexshelf, addingARecordReplacesTheBooksEntry) {
  ShelfWorld world;
  ZEBIndexshelf& shelf = world.makeShelf();
  const auto first = ZEBIndex::init();
  const auto second = ZEBIndex::init();
  shelf._addIndex(first, "org.one");
  shelf._addIndex(second, "org.one");
  EXPECT_THAT(shelf._knownIndices().at("org.one"), ElementsAre(second));
  EXPECT_THAT(world.observer->changes(), IsEmpty());
}

TEST(ZEBIndexshelf, addsARecordUnderItsLock) {
  ShelfWorld world;
  ZEBIndexshelf& shelf = world.makeShelf();
  std::atomic<bool> added{false};
  std::thread adder;
  {
    const platform::MonitorLock lock(shelf._shelfMonitor());
    adder = std::thread([&] {
      shelf._addIndex(ZEBIndex::init(), "org.one");
      added = true;
    });
    std::this_thread::sleep_for(std::chrono::milliseconds(5));
    EXPECT_FALSE(added);
  }
  adder.join();
  EXPECT_TRUE(added);
}

TEST(ZEBIndexshelf, generatedIndexesLieInAFolderOfTheBookUnderTheNameOfTheLocalization) {
  ShelfWorld world;
  ZEBIndexshelf& shelf = world.makeShelf();
  EXPECT_EQ(shelf._generatedIndexPathForBookID("org.one", "de"),
            world.caches + "/org.zeb.zebd/GeneratedIndexes/org.one/de.helpindex");
  EXPECT_EQ(shelf._generatedExactMatchPathForBookID("org.one", "de"),
            world.caches + "/org.zeb.zebd/GeneratedIndexes/org.one/de.exactmatch.plist");
}

TEST(ZEBIndexshelf, withoutALocalizationGeneratedFilesAreNamedAfterTheBook) {
  ShelfWorld world;
  ZEBIndexshelf& shelf = world.makeShelf();
  const std::string folder = world.generatedRoot() + "/org.one/";
  EXPECT_EQ(shelf._generatedExactMatchPathForBookID("org.one", ""),
            folder + "org.one.exactmatch.plist");
  EXPECT_EQ(shelf._generatedIndexPathForBookID("org.one", std::nullopt),
            folder + "org.one.helpindex");
}

TEST(ZEBIndexshelf, aGeneratedPathWithoutABookIsNone) {
  ShelfWorld world;
  ZEBIndexshelf& shelf = world.makeShelf();
  EXPECT_EQ(shelf._generatedIndexPathForBookID("", "de"), std::nullopt);
  EXPECT_EQ(shelf._generatedIndexPathForBookID(std::nullopt, "de"), std::nullopt);
  EXPECT_EQ(shelf._generatedExactMatchPathForBookID("", ""), std::nullopt);
}

TEST(ZEBIndexshelf, asksAgainForACachesFolderUntilThereIsOneAndThenNoMore) {
  ShelfWorld world;
  world.change([](platform::Environment& environment) { environment.cachesDirectory.reset(); });
  ZEBIndexshelf& shelf = world.makeShelf();
  EXPECT_EQ(shelf._generatedIndexPathForBookID("org.one", "de"), std::nullopt);
  world.change([](platform::Environment& environment) { environment.cachesDirectory = "/first"; });
  const std::string path = "/first/org.zeb.zebd/GeneratedIndexes/org.one/de.helpindex";
  EXPECT_EQ(shelf._generatedIndexPathForBookID("org.one", "de"), path);
  world.change([](platform::Environment& environment) { environment.cachesDirectory = "/other"; });
  EXPECT_EQ(shelf._generatedIndexPathForBookID("org.one", "de"), path);
}

TEST(ZEBIndexshelf, observesTheRegistrationNotificationAlone) {
  ShelfWorld world;
  world.makeShelf();
  EXPECT_THAT(world.center->observedNames, ElementsAre(QWBookRegistrationNotification));
}

TEST(ZEBIndexshelf, ceasesToListenWhenItIsGone) {
  ShelfWorld world;
  world.makeShelf();
  const auto observer = world.observer;
  world.dropShelf();
  world.center->postNotification(QWBookRegistrationNotification, "org.one");
  bool delivered = false;
  const auto observation =
      world.center->addObserver("probe", [&](const auto&) { delivered = true; });
  world.center->postNotification("probe", std::nullopt);
  EXPECT_TRUE(world.runMainLoopUntil([&] { return delivered; }));
  EXPECT_THAT(observer->changes(), IsEmpty());
}

}  // namespace
