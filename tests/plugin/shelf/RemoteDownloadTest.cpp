// Asking whether a download is under way, and waiting for it.
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "host/Zebrine/ZEBConstants.h"
#include "plugin/operations/ZEBOperationQueue.h"
#include "plugin/records/ZEBIndex.h"
#include "plugin/remote/ZEBIndexFetchUpdateOperation.h"
#include "tests/plugin/shelf/ShelfWorld.h"

using testing::IsEmpty;
using tests::ShelfWorld;

namespace {

class RemoteDownload : public testing::Test {
 protected:
  RemoteDownload() { world.makeShelf(); }

  ShelfWorld world;
};

TEST_F(RemoteDownload, ofARemoteBookIsNotUnderWayBeforeItBegins) {
  EXPECT_FALSE(
      world.shelf->isIndexDownloadingForBook(world.makeBook("org.remote", ZEBHelpBookType4)));
  EXPECT_FALSE(world.shelf->isIndexDownloadingForBook(nullptr));
}

TEST_F(RemoteDownload, ofAnInstalledBookIsUnderWayWhileItsFetchIsNotFinished) {
  const auto book = world.makeBookWithIndex("org.one");
  const auto queue = world.shelf->indexFetchUpdateQueue();
  EXPECT_FALSE(world.shelf->isIndexDownloadingForBook(book));
  queue->setMaxConcurrentOperationCount(0);
  world.shelf->indicesForBook(book);
  EXPECT_TRUE(world.shelf->isIndexDownloadingForBook(book));
  queue->setMaxConcurrentOperationCount(1);
  world.finishWork();
  EXPECT_FALSE(world.shelf->isIndexDownloadingForBook(book));
}

TEST_F(RemoteDownload, goesByTheIdentityOfTheBooksIdentifier) {
  const auto book = world.makeBookWithIndex("org.one");
  const auto twin = world.makeBookWithIndex("org.one");
  const auto queue = world.shelf->indexFetchUpdateQueue();
  queue->setMaxConcurrentOperationCount(0);
  queue->addOperation(ZEBIndexFetchUpdateOperation::init());
  world.shelf->indicesForBook(book);
  EXPECT_TRUE(world.shelf->isIndexDownloadingForBook(book));
  EXPECT_FALSE(world.shelf->isIndexDownloadingForBook(twin));
  EXPECT_FALSE(world.shelf->isIndexDownloadingForBook(nullptr));
  queue->setMaxConcurrentOperationCount(1);
}

TEST_F(RemoteDownload, waitingForABookWithNoneReturnsAtOnce) {
  // The clock stands still: a wait would not come back.
  EXPECT_FALSE(world.shelf->waitForIndexDownloadCompletionForType4Book(
      world.makeBook("org.remote", ZEBHelpBookType4), 5));
  EXPECT_FALSE(world.shelf->waitForIndexDownloadCompletionForType4Book(
      world.makeBookWithIndex("org.one"), 5));
  EXPECT_FALSE(world.shelf->waitForIndexDownloadCompletionForType4Book(nullptr, 5));
  EXPECT_THAT(world.logged(), IsEmpty());
}

}  // namespace
