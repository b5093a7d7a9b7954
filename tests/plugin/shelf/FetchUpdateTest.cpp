// Looking for newer indexes of installed books.
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <filesystem>

#include "host/Luxwell/HelpLUXIndex.h"
#include "host/Zebrine/ZEBConstants.h"
#include "platform/RunLoop.h"
#include "platform/WorkerThreads.h"
#include "plugin/operations/ZEBOperationQueue.h"
#include "plugin/records/ZEBHelpindexIndex.h"
#include "plugin/remote/ZEBIndexFetchUpdateOperation.h"
#include "plugin/shelf/ZEBIndexGenerationOperation.h"
#include "tests/plugin/shelf/ShelfWorld.h"

using testing::IsEmpty;
using tests::ShelfWorld;

namespace {

class FetchUpdate : public testing::Test {
 protected:
  FetchUpdate() {
    world.makeShelf();
    world.shelf->indexGeneratingQueue()->setMaxConcurrentOperationCount(0);
  }
  ~FetchUpdate() override {
    world.shelf->indexGeneratingQueue()->setMaxConcurrentOperationCount(1);
  }

  std::vector<std::shared_ptr<platform::Operation>> generations() const {
    return world.shelf->indexGeneratingQueue()->operations();
  }

  static std::shared_ptr<ZEBHelpindexIndex> record(const std::shared_ptr<ZEBHelpBook>& book) {
    return ZEBHelpindexIndex::initWithPath(book->indexPaths().front());
  }

  ShelfWorld world;
};

TEST_F(FetchUpdate, ofABookWithoutIndexPathsStartsNoFetchAndNoGeneration) {
  const auto book = world.makeBook("org.one", ZEBHelpBookType3);
  world.shelf->_startFetchingUpdatedIndexForType3BookWithParams({book, ZEBIndex::init()});
  world.shelf->_startFetchingUpdatedIndexForType3BookWithParams({});
  EXPECT_THAT(generations(), IsEmpty());
}

TEST_F(FetchUpdate, ofARecordWithoutSemanticDataQueuesASemanticOnlyGeneration) {
  const auto book = world.makeBookWithIndex("org.one", ZEBHelpBookType3);
  const auto existing = record(book);
  world.shelf->_startFetchingUpdatedIndexForType3BookWithParams({book, existing});
  ASSERT_EQ(generations().size(), 1U);
  const auto operation = std::dynamic_pointer_cast<ZEBIndexGenerationOperation>(generations()[0]);
  ASSERT_NE(operation, nullptr);
  EXPECT_EQ(operation->book(), book);
  EXPECT_EQ(operation->index(), existing);
  EXPECT_TRUE(operation->onlyGenerateLUXIndex());
  EXPECT_TRUE(existing->isRebuilding());
  EXPECT_FALSE(existing->isDownloading());
}

TEST_F(FetchUpdate, ofARecordWithSemanticDataQueuesNothing) {
  const auto book = world.makeBookWithIndex(
      "org.one", ZEBHelpBookType3,
      {{"LUXIndexData", HelpLUXIndex::versionedDataWithAttributes(platform::Value::Dictionary{})}});
  world.shelf->_startFetchingUpdatedIndexForType3BookWithParams({book, record(book)});
  EXPECT_THAT(generations(), IsEmpty());
}

TEST_F(FetchUpdate, addsTheGenerationUnderTheLockOfTheShelf) {
  const auto book = world.makeBookWithIndex("org.one", ZEBHelpBookType3);
  const auto existing = record(book);
  std::thread starter;
  {
    const platform::MonitorLock lock(world.shelf->_shelfMonitor());
    starter = std::thread([&] {
      world.shelf->_startFetchingUpdatedIndexForType3BookWithParams({book, existing});
    });
    EXPECT_TRUE(world.runMainLoopUntil([&] { return existing->isRebuilding(); }));
    EXPECT_THAT(generations(), IsEmpty());
  }
  starter.join();
  EXPECT_EQ(generations().size(), 1U);
}

TEST_F(FetchUpdate, runsItsSetUpOnTheMainThreadWhileTheDaemonIsKeptAlive) {
  const auto book = world.makeBookWithIndex("org.one", ZEBHelpBookType3);
  const auto existing = record(book);
  book->setResourcesRootPath(book->path());
  const auto queue = world.shelf->indexFetchUpdateQueue();
  queue->addOperation(
      ZEBIndexFetchUpdateOperation::initWithIndexshelf(world.shelf, {book, existing}));
  // Nothing happens before the main loop runs.
  while (world.owner->disableCount() == 0) {
    std::this_thread::yield();
  }
  EXPECT_EQ(world.owner->depth(), 1);
  EXPECT_THAT(generations(), IsEmpty());
  EXPECT_TRUE(world.runMainLoopUntil([&] { return queue->operationCount() == 0; }));
  EXPECT_EQ(generations().size(), 1U);
  EXPECT_EQ(world.owner->depth(), 0);
}

TEST_F(FetchUpdate, ofABookWithoutAResourceFolderDoesNothingButGuardTheDaemon) {
  const auto book = world.makeBookWithIndex("org.one", ZEBHelpBookType3);
  book->setResourcesRootPath(std::nullopt);
  // On this thread: it would wait for the main loop for ever if it asked for it.
  ZEBIndexFetchUpdateOperation::initWithIndexshelf(world.shelf, {book, record(book)})->start();
  EXPECT_EQ(world.owner->disableCount(), 1);
  EXPECT_THAT(generations(), IsEmpty());
}

TEST_F(FetchUpdate, withoutShelfOrBookDoesNothing) {
  ZEBIndexFetchUpdateOperation::init()->start();
  ZEBIndexFetchUpdateOperation::initWithIndexshelf(world.shelf, {})->start();
  EXPECT_EQ(ZEBIndexFetchUpdateOperation::init()->bookID(), nullptr);
  EXPECT_EQ(world.owner->disableCount(), 1);
}

TEST_F(FetchUpdate, ofARegisteredBookEndsInAGenerationOfItsSemanticData) {
  const auto book = world.makeBookWithIndex("org.one");
  const auto found = world.shelf->indicesForBook(book);
  EXPECT_TRUE(world.runMainLoopUntil([&] { return generations().size() == 1; }));
  EXPECT_TRUE(found.front()->isRebuilding());
}

}  // namespace
