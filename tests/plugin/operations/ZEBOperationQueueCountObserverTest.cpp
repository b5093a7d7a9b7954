#include <gtest/gtest.h>

#include <thread>

#include "platform/Exception.h"
#include "platform/RunLoop.h"
#include "platform/WorkerThreads.h"
#include "plugin/operations/ZEBOperationQueue.h"
#include "tests/platform/TestEnvironment.h"

namespace {

using Observer = ZEBOperationQueueCountObserver;
using platform::operationCountKey;
using platform::RunLoop;

/// Tells `observer` that the count is now `count`, as a queue does.
void tellCount(Observer& observer, uint64_t count) {
  const auto queue = ZEBOperationQueue::init();
  observer.observeValueForKeyPath(operationCountKey, *queue, {false, platform::Value(count)},
                                  nullptr);
}

TEST(ZEBOperationQueueCountObserver, plainInitWatchesNoQueue) {
  const auto observer = Observer::init();
  EXPECT_EQ(observer->operationQueue(), nullptr);
  EXPECT_FALSE(observer->completionBlock());
  EXPECT_EQ(observer->lastOperationCount(), 0U);
}

TEST(ZEBOperationQueueCountObserver, keepsItsQueueWeakly) {
  auto queue = ZEBOperationQueue::init();
  const auto observer = Observer::initWithQueue(queue);
  EXPECT_EQ(observer->operationQueue(), queue);
  queue.reset();
  EXPECT_EQ(observer->operationQueue(), nullptr);
}

TEST(ZEBOperationQueueCountObserver, itsQueueCanBeReplaced) {
  const auto queue = ZEBOperationQueue::init();
  const auto observer = Observer::init();
  observer->setOperationQueue(queue);
  EXPECT_EQ(observer->operationQueue(), queue);
}

TEST(ZEBOperationQueueCountObserver, doesNotObserveByItself) {
  const auto queue = ZEBOperationQueue::init();
  const auto observer = Observer::initWithQueue(queue);
  observer->setCompletionBlock([] { FAIL(); });
  queue->addOperationWithBlock([] {});
  queue->waitUntilAllOperationsAreFinished();
  EXPECT_EQ(RunLoop::main()->runPending(), 0U);
}

TEST(ZEBOperationQueueCountObserver, firesWhenTheCountFallsToZeroAndOnlyThen) {
  const auto observer = Observer::init();
  int fired = 0;
  observer->setCompletionBlock([&] { ++fired; });
  struct Step {
    uint64_t count;
    int firedAfterwards;
  };
  for (const Step step : {Step{0, 0}, Step{0, 0}, Step{1, 0}, Step{2, 0}, Step{1, 0}, Step{0, 1},
                          Step{0, 1}, Step{5, 1}, Step{0, 2}}) {
    tellCount(*observer, step.count);
    RunLoop::main()->runPending();
    EXPECT_EQ(fired, step.firedAfterwards) << "at count " << step.count;
    EXPECT_EQ(observer->lastOperationCount(), step.count);
  }
}

TEST(ZEBOperationQueueCountObserver, doesAllItsWorkOnTheMainQueue) {
  const auto observer = Observer::init();
  bool fired = false;
  bool onMain = false;
  observer->setCompletionBlock([&] {
    fired = true;
    onMain = platform::isMainThread();
  });
  std::thread worker([&] {
    tellCount(*observer, 3);
    tellCount(*observer, 0);
  });
  worker.join();
  EXPECT_FALSE(fired);
  EXPECT_EQ(observer->lastOperationCount(), 0U);
  EXPECT_EQ(RunLoop::main()->runPending(), 2U);
  EXPECT_TRUE(fired);
  EXPECT_TRUE(onMain);
}

TEST(ZEBOperationQueueCountObserver, theCountIsNotedAfterTheBlockHasRun) {
  const auto observer = Observer::init();
  uint64_t countInside = 0;
  observer->setCompletionBlock([&] { countInside = observer->lastOperationCount(); });
  tellCount(*observer, 4);
  tellCount(*observer, 0);
  RunLoop::main()->runPending();
  EXPECT_EQ(countInside, 4U);
  EXPECT_EQ(observer->lastOperationCount(), 0U);
  observer->setCompletionBlock({});
}

TEST(ZEBOperationQueueCountObserver, withoutABlockItStillKeepsCount) {
  const auto observer = Observer::init();
  tellCount(*observer, 2);
  RunLoop::main()->runPending();
  EXPECT_EQ(observer->lastOperationCount(), 2U);
  tellCount(*observer, 0);
  RunLoop::main()->runPending();
  EXPECT_EQ(observer->lastOperationCount(), 0U);
}

TEST(ZEBOperationQueueCountObserver, theLastCountCanBeSet) {
  const auto observer = Observer::init();
  int fired = 0;
  observer->setCompletionBlock([&] { ++fired; });
  observer->setLastOperationCount(1);
  tellCount(*observer, 0);
  RunLoop::main()->runPending();
  EXPECT_EQ(fired, 1);
}

TEST(ZEBOperationQueueCountObserver, aChangeWithoutANewValueCountsAsZero) {
  const auto observer = Observer::init();
  int fired = 0;
  observer->setCompletionBlock([&] { ++fired; });
  const auto queue = ZEBOperationQueue::init();
  tellCount(*observer, 1);
  observer->observeValueForKeyPath(operationCountKey, *queue, {}, nullptr);
  RunLoop::main()->runPending();
  EXPECT_EQ(fired, 1);
}

TEST(ZEBOperationQueueCountObserver, passesOtherKeyPathsOnToItsBase) {
  const auto queue = ZEBOperationQueue::init();
  const auto observer = Observer::initWithQueue(queue);
  try {
    observer->observeValueForKeyPath("isSuspended", *queue, {}, nullptr);
    FAIL() << "nothing was thrown";
  } catch (const platform::Exception& exception) {
    EXPECT_EQ(exception.name(), platform::internalInconsistencyException);
    EXPECT_NE(exception.reason().find("isSuspended"), std::string::npos);
  }
  EXPECT_THROW(observer->observeValueForKeyPath("operationcount", *queue, {}, nullptr),
               platform::Exception);
  EXPECT_EQ(RunLoop::main()->runPending(), 0U);
}

TEST(ZEBOperationQueueCountObserver, aNoticeUnderWayKeepsItAlive) {
  auto observer = Observer::init();
  int fired = 0;
  observer->setCompletionBlock([&] { ++fired; });
  tellCount(*observer, 1);
  tellCount(*observer, 0);
  const std::weak_ptr<Observer> weak = observer;
  observer.reset();
  EXPECT_FALSE(weak.expired());
  RunLoop::main()->runPending();
  EXPECT_EQ(fired, 1);
  EXPECT_TRUE(weak.expired());
}

TEST(ZEBOperationQueueCountObserver, droppedItLeavesItsQueueAndItsBlock) {
  const auto queue = ZEBOperationQueue::init();
  const auto token = std::make_shared<int>(0);
  auto observer = Observer::initWithQueue(queue);
  observer->setCompletionBlock([token] { FAIL(); });
  queue->addObserver(observer, operationCountKey, platform::keyValueObservingOptionNew);
  observer.reset();
  EXPECT_EQ(token.use_count(), 1);
  queue->addOperationWithBlock([] {});
  queue->waitUntilAllOperationsAreFinished();
  EXPECT_EQ(RunLoop::main()->runPending(), 0U);
}

TEST(ZEBOperationQueueCountObserver, aBlockThatThrowsIsLoggedAndHarmsNothingElse) {
  tests::TestEnvironment environment;
  const auto observer = Observer::init();
  observer->setCompletionBlock([] { throw platform::Exception("Name", "disk full"); });
  tellCount(*observer, 1);
  tellCount(*observer, 0);
  RunLoop::main()->runPending();
  EXPECT_EQ(environment.log().messages(0), (std::vector<std::string>{"disk full"}));
}

}  // namespace
