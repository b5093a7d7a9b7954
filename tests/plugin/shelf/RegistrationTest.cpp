// Books on their way to the shelf: pending ones, the paced queue, and searches that cannot wait.
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "plugin/operations/ZEBOperationQueue.h"
#include "plugin/records/ZEBIndex.h"
#include "plugin/shelf/ZEBIndexRegistrationOperation.h"
#include "tests/plugin/shelf/ShelfWorld.h"

using platform::Seconds;
using testing::ElementsAre;
using testing::IsEmpty;
using tests::ShelfWorld;

namespace {

/// The operation that runs next on the registration queue is in its pause.
void waitForPause(ShelfWorld& world) { world.clock->waitForSleepers(1); }

bool operationCountBecomes(ShelfWorld& world, size_t count) {
  return world.runMainLoopUntil(
      [&] { return world.shelf->indexRegistrationQueue()->operationCount() == count; });
}

TEST(Registration, registersABookTwoSecondsAfterItWasAdded) {
  ShelfWorld world;
  world.makeShelf(false).addRegistrationOperationForBook(world.makeBookWithIndex("org.one"));
  EXPECT_EQ(world.shelf->_pendingBookCount(), 1U);
  waitForPause(world);
  world.clock->advance(Seconds(1.999));
  EXPECT_EQ(world.clock->sleeperCount(), 1U);
  EXPECT_EQ(world.shelf->_pendingBookCount(), 1U);
  world.clock->advance(Seconds(0.001));
  EXPECT_TRUE(operationCountBecomes(world, 0));
  EXPECT_EQ(world.shelf->_pendingBookCount(), 0U);
  EXPECT_NE(world.knownRecord("org.one"), nullptr);
  EXPECT_THAT(world.clock->sleeps(), ElementsAre(2.0));
}

TEST(Registration, registersBooksOneAtATimeAtLeastTwoSecondsApart) {
  ShelfWorld world;
  ZEBIndexshelf& shelf = world.makeShelf(false);
  for (const char* name : {"org.a", "org.b", "org.c"}) {
    shelf.addRegistrationOperationForBook(world.makeBookWithIndex(name));
  }
  for (size_t left = 3; left > 0; --left) {
    waitForPause(world);
    EXPECT_EQ(world.clock->sleeperCount(), 1U);
    EXPECT_EQ(shelf._pendingBookCount(), left);
    EXPECT_EQ(shelf._knownIndices().size(), 3 - left);
    world.clock->advance(Seconds(2));
    ASSERT_TRUE(operationCountBecomes(world, left - 1));
  }
  EXPECT_EQ(shelf._knownIndices().size(), 3U);
}

TEST(Registration, keepsTheDaemonAliveDuringThePauseAndTheWork) {
  ShelfWorld world;
  world.makeShelf(false).addRegistrationOperationForBook(world.makeBookWithIndex("org.one"));
  waitForPause(world);
  EXPECT_EQ(world.owner->depth(), 1);
  world.clock->advance(Seconds(2));
  ASSERT_TRUE(operationCountBecomes(world, 0));
  EXPECT_EQ(world.owner->depth(), 0);
  // Once for the operation, once for the resolution within.
  EXPECT_EQ(world.owner->disableCount(), 2);
}

TEST(Registration, aBookAddedTwiceIsPendingOnceWithTwoOperationsOfWhichTheSecondFindsNothing) {
  ShelfWorld world;
  const auto book = world.makeBookWithIndex("org.one");
  ZEBIndexshelf& shelf = world.makeShelf(false);
  shelf.addRegistrationOperationForBook(book);
  shelf.addRegistrationOperationForBook(book);
  EXPECT_EQ(shelf._pendingBookCount(), 1U);
  EXPECT_EQ(shelf.indexRegistrationQueue()->operationCount(), 2U);
  waitForPause(world);
  world.clock->advance(Seconds(2));
  ASSERT_TRUE(operationCountBecomes(world, 1));
  EXPECT_THAT(world.observer->kinds(), ElementsAre(ZEBIndexChangeAdded));
  waitForPause(world);
  EXPECT_EQ(world.owner->disableCount(), 3);
  world.clock->advance(Seconds(2));
  ASSERT_TRUE(operationCountBecomes(world, 0));
  // The second told the owner of itself alone.
  EXPECT_EQ(world.owner->disableCount(), 3);
  EXPECT_THAT(world.observer->kinds(), ElementsAre(ZEBIndexChangeAdded));
}

TEST(Registration, addingABookAgainReplacesTheOneThatWaits) {
  ShelfWorld world;
  const auto first = world.makeBook("org.one");
  const auto second = world.makeBookWithIndex("org.one");
  ZEBIndexshelf& shelf = world.makeShelf(false);
  shelf.addRegistrationOperationForBook(first);
  shelf.addRegistrationOperationForBook(second);
  world.finishWork();
  ASSERT_NE(world.knownRecord("org.one"), nullptr);
  EXPECT_EQ(world.knownRecord("org.one")->path(), second->indexPaths().front());
}

TEST(Registration, queuesAnOperationForAMissingBookThatTakesWhateverElseIsWaiting) {
  ShelfWorld world;
  ZEBIndexshelf& shelf = world.makeShelf(false);
  shelf.addRegistrationOperationForBook(nullptr);
  EXPECT_EQ(shelf._pendingBookCount(), 0U);
  EXPECT_EQ(shelf.indexRegistrationQueue()->operationCount(), 1U);
  world.finishWork();
  EXPECT_THAT(shelf._knownIndices(), IsEmpty());
}

TEST(Registration, isAddedUnderTheMonitorOfItsQueue) {
  ShelfWorld world;
  ZEBIndexshelf& shelf = world.makeShelf(false);
  std::thread adder;
  {
    const platform::MonitorLock lock(shelf.indexRegistrationQueue()->monitor());
    adder = std::thread([&] { shelf.addRegistrationOperationForBook(world.makeBook("org.one")); });
    // The book is stored before, outside that monitor.
    EXPECT_TRUE(world.runMainLoopUntil([&] { return shelf._pendingBookCount() == 1; }));
    EXPECT_EQ(shelf.indexRegistrationQueue()->operationCount(), 0U);
  }
  adder.join();
  EXPECT_EQ(shelf.indexRegistrationQueue()->operationCount(), 1U);
}

TEST(Registration, isDoneAtOnceForASearchThatNeedsAPendingBook) {
  ShelfWorld world;
  const auto book = world.makeBookWithIndex("org.one");
  ZEBIndexshelf& shelf = world.makeShelf(false);
  shelf.addRegistrationOperationForBook(book);
  waitForPause(world);
  shelf.ensureRegistrationForBook(book);
  EXPECT_EQ(shelf._pendingBookCount(), 0U);
  EXPECT_NE(world.knownRecord("org.one"), nullptr);
  EXPECT_EQ(world.clock->sleeperCount(), 1U);
}

TEST(Registration, ensuredForAPendingBookRegistersTheBookThatIsPassedIn) {
  ShelfWorld world;
  const auto waiting = world.makeBook("org.one");
  const auto passed = world.makeBookWithIndex("org.one");
  ZEBIndexshelf& shelf = world.makeShelf(false);
  shelf.addRegistrationOperationForBook(waiting);
  shelf.ensureRegistrationForBook(passed);
  EXPECT_NE(world.knownRecord("org.one"), nullptr);
}

TEST(Registration, ensuredForABookThatIsNotPendingDoesNothingEvenIfTheShelfDoesNotKnowIt) {
  ShelfWorld world;
  const auto book = world.makeBookWithIndex("org.one");
  ZEBIndexshelf& shelf = world.makeShelf();
  shelf.ensureRegistrationForBook(book);
  shelf.ensureRegistrationForBook(nullptr);
  EXPECT_THAT(shelf._knownIndices(), IsEmpty());
  EXPECT_THAT(world.observer->changes(), IsEmpty());
  EXPECT_EQ(world.owner->disableCount(), 0);
}

TEST(Registration, ofTheNextBookDoesNothingWhenNoneIsPending) {
  ShelfWorld world;
  world.makeShelf()._registerNextBook();
  EXPECT_EQ(world.owner->disableCount(), 0);
}

TEST(Registration, ofTheNextBookLetsOthersAddBooksMeanwhile) {
  ShelfWorld world;
  ZEBIndexshelf& shelf = world.makeShelf(false);
  const auto other = world.makeBookWithIndex("org.two");
  world.observer->onChange = [&](const auto&) {
    // Registering outside the monitor, another thread gets in.
    std::thread([&] { shelf.addRegistrationOperationForBook(other); }).join();
  };
  shelf.addRegistrationOperationForBook(world.makeBookWithIndex("org.one"));
  shelf._registerNextBook();
  world.observer->onChange = nullptr;
  EXPECT_EQ(shelf._pendingBookCount(), 1U);
}

TEST(Registration, takesEachPendingBookExactlyOnceWhoeverAsks) {
  ShelfWorld world;
  ZEBIndexshelf& shelf = world.makeShelf(false);
  std::vector<std::shared_ptr<ZEBHelpBook>> books;
  for (int i = 0; i < 40; ++i) {
    books.push_back(world.makeBookWithIndex("org.book" + std::to_string(i)));
    shelf.addRegistrationOperationForBook(books.back());
  }
  std::vector<std::thread> threads;
  threads.reserve(4);
  for (int i = 0; i < 4; ++i) {
    threads.emplace_back([&, i] {
      for (const auto& book : books) {
        if (i % 2 == 0) {
          shelf._registerNextBook();
        } else {
          shelf.ensureRegistrationForBook(book);
        }
      }
    });
  }
  for (std::thread& thread : threads) {
    thread.join();
  }
  EXPECT_EQ(world.observer->changes().size(), books.size());
  EXPECT_EQ(shelf._knownIndices().size(), books.size());
  EXPECT_EQ(shelf._pendingBookCount(), 0U);
}

TEST(ZEBIndexRegistrationOperation, withoutAShelfPausesAndDoesNothing) {
  ShelfWorld world;
  std::thread runner([] { ZEBIndexRegistrationOperation::init()->start(); });
  waitForPause(world);
  world.clock->advance(Seconds(2));
  runner.join();
}

TEST(ZEBIndexRegistrationOperation, withoutAnOwnerStillRegistersABook) {
  ShelfWorld world;
  const auto shelf = ZEBIndexshelf::initWithOwner(nullptr);
  shelf->addRegistrationOperationForBook(world.makeBookWithIndex("org.one"));
  waitForPause(world);
  world.clock->advance(Seconds(2));
  shelf->indexRegistrationQueue()->waitUntilAllOperationsAreFinished();
  EXPECT_EQ(shelf->_knownIndices().size(), 1U);
}

}  // namespace
