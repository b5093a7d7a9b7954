#include "plugin/operations/ZEBOperationQueue.h"

#include <gtest/gtest.h>

#include <atomic>
#include <thread>

#include "platform/DispatchQueue.h"
#include "platform/RunLoop.h"
#include "platform/WorkerThreads.h"

namespace {

using platform::DispatchSemaphore;
using platform::RunLoop;

/// Lets the queue drain, then runs what came of that; returns how many notices that were.
size_t drain(ZEBOperationQueue& queue) {
  queue.waitUntilAllOperationsAreFinished();
  return RunLoop::main()->runPending();
}

/// Runs `count` operations as one burst, in which the number never falls to zero before the end.
void runBurst(ZEBOperationQueue& queue, int count) {
  queue.setMaxConcurrentOperationCount(0);
  for (int i = 0; i < count; ++i) {
    queue.addOperationWithBlock([] {});
  }
  queue.setMaxConcurrentOperationCount(2);
  queue.waitUntilAllOperationsAreFinished();
}

TEST(ZEBOperationQueue, makesItsObserverOnFirstUseAndKeepsIt) {
  const auto queue = ZEBOperationQueue::init();
  const auto observer = queue->observer();
  ASSERT_NE(observer, nullptr);
  EXPECT_EQ(observer->operationQueue(), queue);
  EXPECT_EQ(observer->lastOperationCount(), 0U);
  EXPECT_EQ(queue->observer(), observer);
}

TEST(ZEBOperationQueue, itsBlockIsThatOfTheObserver) {
  const auto queue = ZEBOperationQueue::init();
  EXPECT_FALSE(queue->completionBlock());
  int calls = 0;
  queue->setCompletionBlock([&] { ++calls; });
  queue->completionBlock()();
  queue->observer()->completionBlock()();
  EXPECT_EQ(calls, 2);
  queue->setCompletionBlock({});
  EXPECT_FALSE(queue->observer()->completionBlock());
}

TEST(ZEBOperationQueue, oneOperationOnAnIdleQueueRunsTheBlockOnce) {
  const auto queue = ZEBOperationQueue::init();
  int fired = 0;
  bool finishedBefore = false;
  std::atomic<bool> finished = false;
  queue->setCompletionBlock([&] {
    ++fired;
    finishedBefore = finished;
  });
  queue->addOperationWithBlock([&] { finished = true; });
  EXPECT_EQ(drain(*queue), 2U) << "one notice for each change of the count";
  EXPECT_EQ(fired, 1);
  EXPECT_TRUE(finishedBefore);
}

TEST(ZEBOperationQueue, theBlockRunsOnTheMainThreadThoughTheOperationsDoNot) {
  const auto queue = ZEBOperationQueue::init();
  std::atomic<bool> operationOnMain = true;
  bool blockOnMain = false;
  queue->setCompletionBlock([&] { blockOnMain = platform::isMainThread(); });
  queue->addOperationWithBlock([&] { operationOnMain = platform::isMainThread(); });
  drain(*queue);
  EXPECT_FALSE(operationOnMain);
  EXPECT_TRUE(blockOnMain);
}

TEST(ZEBOperationQueue, nothingRunsUntilTheMainThreadRunsItsLoop) {
  const auto queue = ZEBOperationQueue::init();
  int fired = 0;
  queue->setCompletionBlock([&] { ++fired; });
  queue->addOperationWithBlock([] {});
  queue->waitUntilAllOperationsAreFinished();
  EXPECT_EQ(fired, 0);
  EXPECT_EQ(queue->observer()->lastOperationCount(), 0U);
  RunLoop::main()->runPending();
  EXPECT_EQ(fired, 1);
}

TEST(ZEBOperationQueue, aBurstRunsTheBlockOnceAndEachLaterBurstAgain) {
  const auto queue = ZEBOperationQueue::init();
  int fired = 0;
  queue->setCompletionBlock([&] { ++fired; });
  for (int burst = 1; burst <= 3; ++burst) {
    runBurst(*queue, 10);
    EXPECT_EQ(RunLoop::main()->runPending(), 20U);
    EXPECT_EQ(fired, burst);
  }
}

TEST(ZEBOperationQueue, burstsThatWereNotServedInBetweenStillCountEach) {
  const auto queue = ZEBOperationQueue::init();
  int fired = 0;
  queue->setCompletionBlock([&] { ++fired; });
  runBurst(*queue, 2);
  runBurst(*queue, 3);
  RunLoop::main()->runPending();
  EXPECT_EQ(fired, 2);
}

TEST(ZEBOperationQueue, aQueueThatNeverHadWorkNeverFires) {
  const auto queue = ZEBOperationQueue::init();
  queue->setCompletionBlock([] { FAIL(); });
  EXPECT_EQ(drain(*queue), 0U);
}

TEST(ZEBOperationQueue, settingTheBlockTwiceObservesOnce) {
  const auto queue = ZEBOperationQueue::init();
  int first = 0;
  int second = 0;
  queue->setCompletionBlock([&] { ++first; });
  queue->setCompletionBlock([&] { ++second; });
  queue->addOperationWithBlock([] {});
  EXPECT_EQ(drain(*queue), 2U);
  EXPECT_EQ(first, 0);
  EXPECT_EQ(second, 1);
}

TEST(ZEBOperationQueue, countsFromBeforeTheBlockWasSetAreNotRemembered) {
  const auto queue = ZEBOperationQueue::init();
  DispatchSemaphore release(0);
  queue->addOperationWithBlock([&] { release.wait(); });
  int fired = 0;
  queue->setCompletionBlock([&] { ++fired; });
  release.signal();
  EXPECT_EQ(drain(*queue), 1U);
  EXPECT_EQ(fired, 0) << "the only count seen was zero";
}

TEST(ZEBOperationQueue, aCountAboveZeroSeenSinceMakesTheFirstDrainFire) {
  const auto queue = ZEBOperationQueue::init();
  queue->setMaxConcurrentOperationCount(0);
  queue->addOperationWithBlock([] {});
  queue->addOperationWithBlock([] {});
  int fired = 0;
  queue->setCompletionBlock([&] { ++fired; });
  queue->setMaxConcurrentOperationCount(1);
  EXPECT_EQ(drain(*queue), 2U);
  EXPECT_EQ(fired, 1);
}

TEST(ZEBOperationQueue, clearingTheBlockEndsTheObservationAndALaterBlockBeginsItAgain) {
  const auto queue = ZEBOperationQueue::init();
  queue->setCompletionBlock([] { FAIL(); });
  queue->setCompletionBlock({});
  queue->addOperationWithBlock([] {});
  EXPECT_EQ(drain(*queue), 0U);
  queue->setCompletionBlock({});
  int fired = 0;
  queue->setCompletionBlock([&] { ++fired; });
  queue->addOperationWithBlock([] {});
  EXPECT_EQ(drain(*queue), 2U);
  EXPECT_EQ(fired, 1);
}

TEST(ZEBOperationQueue, noticesUnderWayWhenTheBlockIsClearedOnlyKeepCount) {
  const auto queue = ZEBOperationQueue::init();
  queue->setCompletionBlock([] { FAIL(); });
  queue->addOperationWithBlock([] {});
  queue->waitUntilAllOperationsAreFinished();
  queue->setCompletionBlock({});
  EXPECT_EQ(RunLoop::main()->runPending(), 2U);
}

TEST(ZEBOperationQueue, theBlockStaysInForceUntilItIsReplacedByItselfForExample) {
  const auto queue = ZEBOperationQueue::init();
  std::string record;
  queue->setCompletionBlock([&] {
    record += "first ";
    queue->setCompletionBlock([&] { record += "second "; });
  });
  for (int i = 0; i < 3; ++i) {
    queue->addOperationWithBlock([] {});
    drain(*queue);
  }
  EXPECT_EQ(record, "first second second ");
  queue->setCompletionBlock({});
}

TEST(ZEBOperationQueue, theBlockMayAddOperations) {
  const auto queue = ZEBOperationQueue::init();
  int fired = 0;
  queue->setCompletionBlock([&] {
    if (++fired < 3) {
      queue->addOperationWithBlock([] {});
    }
  });
  queue->addOperationWithBlock([] {});
  while (drain(*queue) > 0) {
  }
  EXPECT_EQ(fired, 3);
}

TEST(ZEBOperationQueue, anotherObserverTakesThePlaceOfTheFirstAndNothingMore) {
  const auto queue = ZEBOperationQueue::init();
  queue->setCompletionBlock([] { FAIL(); });
  const auto replacement = ZEBOperationQueueCountObserver::initWithQueue(queue);
  queue->setObserver(replacement);
  EXPECT_EQ(queue->observer(), replacement);
  EXPECT_FALSE(queue->completionBlock());
  queue->addOperationWithBlock([] {});
  EXPECT_EQ(drain(*queue), 0U) << "nobody observes for it yet, and the first one is gone";

  int fired = 0;
  queue->setCompletionBlock([&] { ++fired; });
  queue->addOperationWithBlock([] {});
  EXPECT_EQ(drain(*queue), 2U);
  EXPECT_EQ(fired, 1);
}

TEST(ZEBOperationQueue, anObserverThatIsReplacedButHeldGoesOnObserving) {
  const auto queue = ZEBOperationQueue::init();
  int fired = 0;
  queue->setCompletionBlock([&] { ++fired; });
  const auto former = queue->observer();
  queue->setObserver(nullptr);
  EXPECT_NE(queue->observer(), former);
  queue->addOperationWithBlock([] {});
  EXPECT_EQ(drain(*queue), 2U);
  EXPECT_EQ(fired, 1);
}

TEST(ZEBOperationQueue, queueAndObserverDoNotKeepEachOtherAlive) {
  auto queue = ZEBOperationQueue::init();
  queue->setCompletionBlock([] {});
  const std::weak_ptr<ZEBOperationQueue> weakQueue = queue;
  const std::weak_ptr<ZEBOperationQueueCountObserver> weakObserver = queue->observer();
  queue.reset();
  EXPECT_TRUE(weakQueue.expired());
  EXPECT_TRUE(weakObserver.expired());
}

TEST(ZEBOperationQueue, aQueueThatIsDroppedAfterDrainingStillRunsItsBlock) {
  int fired = 0;
  {
    const auto queue = ZEBOperationQueue::init();
    queue->setCompletionBlock([&] { ++fired; });
    queue->addOperationWithBlock([] {});
    queue->waitUntilAllOperationsAreFinished();
  }
  RunLoop::main()->runPending();
  EXPECT_EQ(fired, 1);
}

TEST(ZEBOperationQueue, othersMayAddUnderItsMonitor) {
  const auto queue = ZEBOperationQueue::init();
  int fired = 0;
  queue->setCompletionBlock([&] { ++fired; });
  {
    const platform::MonitorLock lock(queue->monitor());
    queue->addOperationWithBlock([queue] { const platform::MonitorLock inner(queue->monitor()); });
  }
  drain(*queue);
  EXPECT_EQ(fired, 1);
}

TEST(ZEBOperationQueue, firesOnceForEachFallToZeroHoweverManyThreadsAddWork) {
  class FallCounter : public platform::KeyValueObserver {
   public:
    void observeValueForKeyPath(std::string_view, platform::KeyValueObservable&,
                                const platform::KeyValueChange& change, void*) override {
      falls += change.newValue.unsignedValue() == 0 ? 1 : 0;
    }
    std::atomic<int> falls = 0;
  };
  const auto queue = ZEBOperationQueue::init();
  const auto counter = std::make_shared<FallCounter>();
  queue->addObserver(counter, platform::operationCountKey, platform::keyValueObservingOptionNew);
  int fired = 0;
  queue->setCompletionBlock([&] { ++fired; });
  std::atomic<int> ran = 0;
  std::atomic<int> adding = 4;
  for (int t = 0; t < 4; ++t) {
    platform::startNamedThread("adder", [&, t] {
      for (int i = 0; i < 100; ++i) {
        queue->addOperationWithBlock([&] { ++ran; });
        if (i % 10 == t) {
          queue->waitUntilAllOperationsAreFinished();
        }
      }
      --adding;
    });
  }
  while (adding > 0) {
    RunLoop::main()->runPending();
    std::this_thread::yield();
  }
  drain(*queue);
  EXPECT_EQ(ran, 400);
  EXPECT_EQ(fired, counter->falls);
  EXPECT_GE(fired, 1);
}

}  // namespace
