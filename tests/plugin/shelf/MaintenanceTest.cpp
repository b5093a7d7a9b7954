// How indices leave the shelf.
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <cerrno>
#include <filesystem>
#include <future>

#include "host/Zebrine/ZEBConstants.h"
#include "platform/Exception.h"
#include "plugin/operations/ZEBOperationQueue.h"
#include "plugin/records/ZEBHelpindexIndex.h"
#include "tests/plugin/shelf/ShelfWorld.h"

using platform::FailingFileManager;
using testing::ElementsAre;
using testing::IsEmpty;
using tests::LogEntry;
using tests::ShelfWorld;

namespace {

class Maintenance : public testing::Test {
 protected:
  ShelfWorld world;
};

TEST_F(Maintenance, removingAnUnknownBookStillTellsObserversOfABareRecord) {
  const int32_t before = ZEBIndex::init()->indexID();
  world.makeShelf().removeIndexForBookID("org.unknown");
  ASSERT_THAT(world.observer->kinds(), ElementsAre(ZEBIndexChangeRemoved));
  const auto record = world.observer->changes().front().index;
  EXPECT_EQ(record->bookID(), "org.unknown");
  EXPECT_EQ(record->path(), std::nullopt);
  EXPECT_GT(record->indexID(), before);
  EXPECT_EQ(std::dynamic_pointer_cast<ZEBHelpindexIndex>(record), nullptr);
  EXPECT_THAT(world.logged(), IsEmpty());
  EXPECT_EQ(world.center->posted().size(), 1U);
}

TEST_F(Maintenance, removingABookOfAnInstalledIndexKeepsEveryFile) {
  const auto book = world.makeBookWithIndex("org.one");
  const std::string generated = world.writeIndex(world.generatedPath("org.one", "org.one"));
  const auto record = world.makeShelf(false).indicesForBook(book).front();
  world.shelf->removeIndexForBookID("org.one");
  EXPECT_TRUE(ShelfWorld::exists(book->indexPaths().front()));
  EXPECT_TRUE(ShelfWorld::exists(generated));
  EXPECT_THAT(world.shelf->_knownIndices(), IsEmpty());
  ASSERT_THAT(world.observer->kinds(), ElementsAre(ZEBIndexChangeAdded, ZEBIndexChangeRemoved));
  EXPECT_EQ(world.observer->changes().back().index, record);
  EXPECT_THAT(world.logged(), IsEmpty());
}

TEST_F(Maintenance, removingABookOfAGeneratedIndexDeletesItsFolderWithAllThatIsInIt) {
  const auto book = world.makeBook("org.one");
  const std::string folder = world.generatedRoot() + "/org.one";
  world.writeIndex(world.generatedPath("org.one", "org.one"));
  world.writeIndex(world.generatedPath("org.one", "fr"));
  world.writeIndex(world.generatedPath("org.two", "org.two"));
  ASSERT_EQ(world.makeShelf().indicesForBook(book).size(), 1U);
  world.shelf->removeIndexForBookID("org.one");
  EXPECT_FALSE(ShelfWorld::exists(folder));
  EXPECT_TRUE(ShelfWorld::exists(world.generatedPath("org.two", "org.two")));
  EXPECT_THAT(world.logged(),
              ElementsAre(LogEntry{4, "Successfully deleted outdated cached index at " + folder}));
}

TEST_F(Maintenance, removingAnUnknownBookDeletesItsGeneratedFolder) {
  world.writeIndex(world.generatedPath("org.one", "de"));
  world.makeShelf().removeIndexForBookID("org.one");
  EXPECT_FALSE(ShelfWorld::exists(world.generatedRoot() + "/org.one"));
  EXPECT_TRUE(ShelfWorld::exists(world.generatedRoot()));
}

TEST_F(Maintenance, keepsAFolderOutsideTheRootThoughItsRecordCountsAsGenerated) {
  // As a record from the cache file does that came from an installed index.
  const auto book = world.makeBookWithIndex("org.one");
  const auto record = world.makeShelf().indicesForBook(book).front();
  record->setLoadedFromGeneratedCache(true);
  world.shelf->removeIndexForBookID("org.one");
  EXPECT_TRUE(ShelfWorld::exists(book->indexPaths().front()));
}

TEST_F(Maintenance, neverDeletesTheGeneratedRootItself) {
  const std::string path = world.writeIndex(world.generatedRoot() + "/loose.helpindex");
  ZEBIndexshelf& shelf = world.makeShelf();
  const auto record = ZEBIndex::initWithPath(path);
  record->setLoadedFromGeneratedCache(true);
  shelf._addIndex(record, "org.one");
  shelf.removeIndexForBookID("org.one");
  EXPECT_TRUE(ShelfWorld::exists(path));
}

TEST_F(Maintenance, neverDeletesANeighbourWhoseNameBeginsLikeTheRoot) {
  const std::string path = world.writeIndex(world.generatedRoot() + "Old/org.one/de.helpindex");
  ZEBIndexshelf& shelf = world.makeShelf();
  const auto record = ZEBIndex::initWithPath(path);
  record->setLoadedFromGeneratedCache(true);
  shelf._addIndex(record, "org.one");
  shelf.removeIndexForBookID("org.one");
  EXPECT_TRUE(ShelfWorld::exists(path));
}

/// Notes what is to be deleted and deletes nothing: a mistake must not cost anybody their files.
class NotingFiles : public FailingFileManager {
 public:
  std::optional<platform::Error> removeItem(const std::string& path) const override {
    removals.push_back(path);
    return std::nullopt;
  }
  mutable std::vector<std::string> removals;
};

TEST_F(Maintenance, identifiersThatClimbDeleteNothingOutsideTheRoot) {
  const auto files = std::make_shared<NotingFiles>();
  world.change([&](platform::Environment& environment) { environment.files = files; });
  world.writeIndex(world.generatedPath("org.one", "de"));
  for (const std::string& neighbour :
       {world.caches + "/precious/precious/file",
        world.caches + "/org.zeb.zebd/precious/precious/file",
        world.generatedRoot() + "Old/GeneratedIndexesOld/file",
        world.generatedRoot() + "/GeneratedIndexes/file", world.folder.path("precious/file")}) {
    world.writeIndex(neighbour);
  }
  ZEBIndexshelf& shelf = world.makeShelf();
  for (const char* bookID :
       {"..", "../..", "../../..", ".", "./", "/", "//", "a/..", "org.one/../..", "../precious",
        "../../precious", "../../../precious", "../GeneratedIndexesOld", "../GeneratedIndexes",
        "../../org.zeb.zebd/precious", "org.one/../../precious", "../GeneratedIndexes/..",
        "../../../../../../../../tmp"}) {
    shelf.removeIndexForBookID(bookID);
  }
  for (const std::string& path : files->removals) {
    EXPECT_TRUE(path.starts_with(world.generatedRoot() + "/")) << path;
    EXPECT_EQ(path.find("/.."), std::string::npos) << path;
  }
  files->removals.clear();
  shelf.removeIndexForBookID("org.one");
  EXPECT_THAT(files->removals, ElementsAre(world.generatedRoot() + "/org.one"));
}

TEST_F(Maintenance, deletesNothingWithoutACachesFolder) {
  const std::string path = world.writeIndex(world.generatedPath("org.one", "org.one"));
  world.change([](platform::Environment& environment) { environment.cachesDirectory.reset(); });
  world.makeShelf().removeIndexForBookID("org.one");
  EXPECT_TRUE(ShelfWorld::exists(path));
  EXPECT_THAT(world.observer->kinds(), ElementsAre(ZEBIndexChangeRemoved));
}

TEST_F(Maintenance, aFolderThatCannotBeDeletedIsNotReported) {
  world.writeIndex(world.generatedPath("org.one", "org.one"));
  world.makeShelf().indicesForBook(world.makeBook("org.one"));
  world.files->fail(FailingFileManager::Operation::remove, EACCES);
  world.log->clear();
  world.shelf->removeIndexForBookID("org.one");
  EXPECT_THAT(world.logged(), IsEmpty());
  EXPECT_THAT(world.shelf->_knownIndices(), IsEmpty());
  EXPECT_EQ(world.observer->kinds().back(), ZEBIndexChangeRemoved);
}

TEST_F(Maintenance, tellsOfARemovalUnderTheLockOnTheSameThreadBeforeTheEntryGoes) {
  world.makeShelf(false).indicesForBook(world.makeBookWithIndex("org.one"));
  bool knownStill = false;
  bool othersGetIn = true;
  world.observer->onChange = [&](const auto& change) {
    EXPECT_EQ(change.thread, std::this_thread::get_id());
    // The lock is recursive: this thread may ask.
    knownStill = world.shelf->_knownIndices().contains("org.one");
    othersGetIn = world.othersGetTheLock();
  };
  world.shelf->removeIndexForBookID("org.one");
  world.observer->onChange = nullptr;
  EXPECT_EQ(world.observer->changes().back().thread, std::this_thread::get_id());
  EXPECT_TRUE(knownStill);
  EXPECT_FALSE(othersGetIn);
}

TEST_F(Maintenance, tellsOfAnAdditionWithoutTheLock) {
  world.makeShelf(false);
  bool othersGetIn = false;
  world.observer->onChange = [&](const auto&) { othersGetIn = world.othersGetTheLock(); };
  world.shelf->indicesForBook(world.makeBookWithIndex("org.one"));
  world.observer->onChange = nullptr;
  EXPECT_TRUE(othersGetIn);
}

TEST_F(Maintenance, givesItsLockBackWhenAnObserverThrows) {
  world.makeShelf(false).indicesForBook(world.makeBookWithIndex("org.one"));
  world.observer->onChange = [](const auto&) { throw platform::Exception("Test", "unwell"); };
  EXPECT_THROW(world.shelf->removeIndexForBookID("org.one"), platform::Exception);
  world.observer->onChange = nullptr;
  std::thread([&] { EXPECT_EQ(world.shelf->_knownIndices().size(), 1U); }).join();
}

TEST_F(Maintenance, aRemovedBookIsResolvedAnew) {
  const auto book = world.makeBookWithIndex("org.one");
  const auto first = world.makeShelf(false).indicesForBook(book).front();
  world.shelf->removeIndexForBookID("org.one");
  const auto second = world.shelf->indicesForBook(book).front();
  EXPECT_NE(first, second);
}

TEST_F(Maintenance, aRegistrationNotificationRemovesTheBookThatItNames) {
  world.makeShelf(false).indicesForBook(world.makeBookWithIndex("org.one"));
  world.center->postNotification(QWBookRegistrationNotification, "org.one");
  EXPECT_EQ(world.shelf->_knownIndices().size(), 1U);
  EXPECT_TRUE(world.runMainLoopUntil([&] { return world.shelf->_knownIndices().empty(); }));
  EXPECT_THAT(world.observer->kinds(), ElementsAre(ZEBIndexChangeAdded, ZEBIndexChangeRemoved));
}

TEST_F(Maintenance, aRegistrationNotificationWithoutAStringRemovesNothing) {
  world.makeShelf(false).indicesForBook(world.makeBookWithIndex("org.one"));
  world.shelf->_helpBookDidChange({QWBookRegistrationNotification, std::nullopt});
  world.center->postNotification(QWBookRegistrationNotification, std::nullopt);
  world.center->postNotification("org.zeb.another", "org.one");
  world.finishWork();
  EXPECT_EQ(world.shelf->_knownIndices().size(), 1U);
  EXPECT_THAT(world.observer->kinds(), ElementsAre(ZEBIndexChangeAdded));
}

TEST_F(Maintenance, clearingTheCacheDeletesTheFileAndSaysSo) {
  world.makeShelf().archiveKnownIndices();
  world.log->clear();
  world.shelf->clearIndexCache();
  EXPECT_FALSE(ShelfWorld::exists(world.cachePath()));
  EXPECT_THAT(world.log->entries(),
              ElementsAre(LogEntry{2, "Clearing index cache..."},
                          LogEntry{2, "Index Cache cleared at path: " + world.cachePath()}));
}

TEST_F(Maintenance, clearingACacheThatIsNotThereLogsNothing) {
  world.makeShelf().clearIndexCache();
  EXPECT_THAT(world.log->entries(), IsEmpty());
}

TEST_F(Maintenance, aCacheThatCannotBeClearedIsLoggedWithPathAndError) {
  world.makeShelf().archiveKnownIndices();
  world.files->fail(FailingFileManager::Operation::remove, EACCES, "HelpindexCache");
  world.log->clear();
  world.shelf->clearIndexCache();
  const std::string path = world.cachePath();
  EXPECT_THAT(
      world.log->entries(),
      ElementsAre(LogEntry{2, "Clearing index cache..."},
                  LogEntry{1, ZEBStringWithFormat("Error clearing the index cache at %@: %@", path,
                                                  platform::posixError(EACCES, path))}));
  world.files->recover();
}

TEST_F(Maintenance, aLanguageChangeEmptiesTheShelfItsQueuesAndItsCache) {
  ZEBIndexshelf& shelf = world.makeShelf(false);
  shelf.indicesForBook(world.makeBookWithIndex("org.one"));
  shelf.archiveKnownIndices();
  const std::string generated = world.writeIndex(world.generatedPath("org.one", "de"));
  std::atomic<int> ran{0};
  const std::vector<std::shared_ptr<ZEBOperationQueue>> queues = {
      shelf.indexFetchUpdateQueue(), shelf.indexGeneratingQueue(), shelf.indexRegistrationQueue(),
      shelf.indexDownloadQueue(), shelf.assetDownloadQueue()};
  for (const auto& queue : queues) {
    queue->setMaxConcurrentOperationCount(0);
    queue->addOperationWithBlock([&] { ++ran; });
  }
  world.log->clear();
  shelf._resetForLanguageChange();
  EXPECT_THAT(shelf._knownIndices(), IsEmpty());
  EXPECT_FALSE(ShelfWorld::exists(world.cachePath()));
  EXPECT_EQ(shelf._helpIndexCachePath(), std::nullopt);
  EXPECT_TRUE(ShelfWorld::exists(generated));
  EXPECT_THAT(world.log->entries(),
              ElementsAre(LogEntry{2, "Clearing index cache..."},
                          LogEntry{2, "Index Cache cleared at path: " + world.cachePath()}));
  EXPECT_THAT(world.observer->kinds(), ElementsAre(ZEBIndexChangeAdded));
  for (const auto& queue : queues) {
    queue->setMaxConcurrentOperationCount(1);
    queue->waitUntilAllOperationsAreFinished();
  }
  EXPECT_EQ(ran, 0);
}

TEST_F(Maintenance, aLanguageChangeCancelsTheQueuesInTheirOrder) {
  class NotingOperation : public platform::Operation {
   public:
    NotingOperation(std::string& order, char name) : _order(order), _name(name) {}
    void cancel() override {
      _order += _name;
      Operation::cancel();
    }

   private:
    std::string& _order;
    const char _name;
  };
  ZEBIndexshelf& shelf = world.makeShelf(false);
  std::string order;
  const std::vector<std::pair<char, std::shared_ptr<ZEBOperationQueue>>> queues = {
      {'r', shelf.indexRegistrationQueue()},
      {'a', shelf.assetDownloadQueue()},
      {'d', shelf.indexDownloadQueue()},
      {'f', shelf.indexFetchUpdateQueue()},
      {'g', shelf.indexGeneratingQueue()}};
  for (const auto& entry : queues) {
    entry.second->setMaxConcurrentOperationCount(0);
    entry.second->addOperation(std::make_shared<NotingOperation>(order, entry.first));
  }
  shelf._resetForLanguageChange();
  EXPECT_EQ(order, "fgrda");
  for (const auto& entry : queues) {
    entry.second->setMaxConcurrentOperationCount(1);
  }
}

TEST_F(Maintenance, afterALanguageChangeADrainDoesNotWriteTheCacheFile) {
  world.launcher->behave(tests::writesIndex());
  ZEBIndexshelf& shelf = world.makeShelf();
  shelf.archiveKnownIndices();
  shelf._resetForLanguageChange();
  shelf.indicesForBook(world.makeBook("org.one"));
  world.finishWork();
  EXPECT_NE(world.knownRecord("org.one"), nullptr);
  EXPECT_FALSE(ShelfWorld::exists(world.cachePath()));
}

TEST_F(Maintenance, aLanguageChangeLetsARunningOperationFinishOnItsOwn) {
  std::promise<void> started;
  std::promise<void> release;
  world.launcher->behave(
      [&, write = tests::writesIndex()](const tests::RecordingLauncher::Launch& launch) {
        started.set_value();
        release.get_future().wait();
        return write(launch);
      });
  ZEBIndexshelf& shelf = world.makeShelf();
  shelf.indicesForBook(world.makeBook("org.one"));
  started.get_future().wait();
  shelf._resetForLanguageChange();
  EXPECT_EQ(world.owner->depth(), 1);
  release.set_value();
  world.finishWork();
  EXPECT_NE(world.knownRecord("org.one"), nullptr);
}

}  // namespace
