// Operations that finish later than their start, as a queue sees them.
#include <gtest/gtest.h>

#include <atomic>
#include <thread>

#include "platform/DispatchQueue.h"
#include "platform/Exception.h"
#include "platform/OperationQueue.h"
#include "tests/platform/TestEnvironment.h"
#include "tests/plugin/operations/SampleOperation.h"

namespace {

using platform::DispatchSemaphore;
using platform::OperationQueue;
using tests::SampleOperation;
using tests::StateRecorder;

std::shared_ptr<OperationQueue> serialQueue() {
  auto queue = OperationQueue::init();
  queue->setMaxConcurrentOperationCount(1);
  return queue;
}

TEST(ZEBOperation, inAQueueStaysUntilSomebodyFinishesIt) {
  const auto queue = serialQueue();
  DispatchSemaphore begun(0);
  const auto operation = SampleOperation::make([&] { begun.signal(); });
  std::atomic<bool> nextRan = false;
  queue->addOperation(operation);
  queue->addOperationWithBlock([&] { nextRan = true; });
  begun.wait();
  EXPECT_EQ(queue->operationCount(), 2U);
  EXPECT_FALSE(nextRan);

  std::thread callback([&] { operation->finishWithError(std::nullopt); });
  queue->waitUntilAllOperationsAreFinished();
  callback.join();
  EXPECT_TRUE(nextRan);
  EXPECT_EQ(operation->flags(), "010");
}

TEST(ZEBOperation, inAQueueMayFinishBeforeItsMainReturns) {
  const auto queue = serialQueue();
  const auto operation = SampleOperation::make();
  operation->body = [self = operation.get()] { self->finishWithError(std::nullopt); };
  queue->addOperation(operation);
  queue->waitUntilAllOperationsAreFinished();
  operation->waitUntilFinished();
  EXPECT_EQ(operation->flags(), "010");
}

TEST(ZEBOperation, inAQueueItsCompletionBlockReadsTheError) {
  const auto queue = serialQueue();
  const platform::Error gone{"TestErrorDomain", 404, "gone"};
  const auto operation = SampleOperation::make();
  operation->body = [&] { operation->finishWithError(gone); };
  std::optional<platform::Error> seen;
  DispatchSemaphore completed(0);
  operation->setCompletionBlock([&] {
    seen = operation->error();
    completed.signal();
  });
  queue->addOperation(operation);
  completed.wait();
  EXPECT_EQ(seen, gone);
  queue->waitUntilAllOperationsAreFinished();
  operation->body = nullptr;
}

TEST(ZEBOperation, inAQueueLeavesOnceHoweverOftenItFinishes) {
  const auto queue = serialQueue();
  queue->setMaxConcurrentOperationCount(2);
  const auto other = SampleOperation::make();
  const auto operation = SampleOperation::make();
  queue->addOperation(other);
  queue->addOperation(operation);
  operation->finishWithError(std::nullopt);
  operation->finishWithError(std::nullopt);
  operation->cancel();
  EXPECT_EQ(queue->operationCount(), 1U);
  other->finishWithError(std::nullopt);
  queue->waitUntilAllOperationsAreFinished();
}

TEST(ZEBOperation, inAQueueCancelledWhileItWaitsItLeavesWithoutRunning) {
  const auto queue = serialQueue();
  queue->setMaxConcurrentOperationCount(0);
  std::atomic<bool> ran = false;
  const auto operation = SampleOperation::make([&] { ran = true; });
  queue->addOperation(operation);
  queue->cancelAllOperations();
  EXPECT_EQ(queue->operationCount(), 0U);
  queue->setMaxConcurrentOperationCount(1);
  queue->waitUntilAllOperationsAreFinished();
  EXPECT_FALSE(ran);
  EXPECT_EQ(operation->flags(), "011");
}

TEST(ZEBOperation, inAQueueCancelledWhileItWorksItMakesRoomAtOnce) {
  const auto queue = serialQueue();
  DispatchSemaphore working(0);
  DispatchSemaphore goOn(0);
  DispatchSemaphore stopped(0);
  const auto operation = SampleOperation::make([&] {
    working.signal();
    goOn.wait();
    stopped.signal();
  });
  queue->addOperation(operation);
  working.wait();
  bool nextRan = false;
  queue->addOperationWithBlock([&] { nextRan = true; });
  operation->cancel();
  queue->waitUntilAllOperationsAreFinished();
  EXPECT_TRUE(nextRan);
  goOn.signal();
  stopped.wait();
}

TEST(ZEBOperation, inAQueueLeavesWithTheAnnouncementOfItsEndNotOfItsCancellation) {
  class CountReader : public platform::KeyValueObserver {
   public:
    void observeValueForKeyPath(std::string_view keyPath, platform::KeyValueObservable&,
                                const platform::KeyValueChange&, void*) override {
      record += std::string(keyPath) + " " + std::to_string(queue->operationCount()) + "; ";
    }
    std::shared_ptr<OperationQueue> queue;
    std::string record;
  };
  const auto reader = std::make_shared<CountReader>();
  reader->queue = serialQueue();
  reader->queue->setMaxConcurrentOperationCount(0);
  const auto operation = SampleOperation::make();
  for (const char* key :
       {platform::isCancelledKey, platform::isExecutingKey, platform::isFinishedKey}) {
    operation->addObserver(reader, key);
  }
  reader->queue->addOperation(operation);
  operation->cancel();
  EXPECT_EQ(reader->record, "isCancelled 1; isExecuting 1; isFinished 0; ");
}

TEST(ZEBOperation, inAQueueAnExceptionOutOfMainEndsItThereAndIsLogged) {
  tests::TestEnvironment environment;
  const auto queue = serialQueue();
  const auto operation =
      SampleOperation::make([] { throw platform::Exception("Name", "no such printer"); });
  bool dependentRan = false;
  const auto dependent =
      platform::BlockOperation::blockOperationWithBlock([&] { dependentRan = true; });
  dependent->addDependency(operation);
  queue->addOperation(dependent);
  queue->addOperation(operation);
  queue->waitUntilAllOperationsAreFinished();
  operation->waitUntilFinished();
  EXPECT_EQ(environment.log().messages(0), (std::vector<std::string>{"no such printer"}));
  EXPECT_TRUE(dependentRan) << "what waits for it must not wait for ever";
  EXPECT_EQ(operation->flags(), "100") << "its own flags are its own affair";
}

TEST(ZEBOperation, inAQueueLettingGoInsideTheAnnouncementsIsHarmless) {
  // The queue holds the last reference while somebody who only borrowed the operation ends it.
  for (const bool byCancelling : {false, true}) {
    const auto queue = serialQueue();
    DispatchSemaphore returned(0);
    auto operation = SampleOperation::make();
    const std::shared_ptr<StateRecorder> recorder = StateRecorder::observing(operation);
    SampleOperation* const borrowed = operation.get();
    const std::weak_ptr<SampleOperation> weak = operation;
    queue->setMaxConcurrentOperationCount(0);
    queue->addOperation(operation);
    operation.reset();
    if (byCancelling) {
      borrowed->cancel();
    } else {
      borrowed->finishWithError(std::nullopt);
    }
    EXPECT_EQ(recorder->takeLines().size(), byCancelling ? 6U : 4U);
    EXPECT_TRUE(weak.expired());
  }
}

TEST(ZEBOperation, inAQueueManyFinishOnManyThreads) {
  const auto queue = OperationQueue::init();
  queue->setMaxConcurrentOperationCount(4);
  const auto callbacks = platform::DispatchQueue::concurrent("callbacks");
  std::atomic<int> completed = 0;
  constexpr int count = 200;
  for (int i = 0; i < count; ++i) {
    const auto operation = SampleOperation::make();
    operation->body = [&callbacks, self = operation.get(), i] {
      callbacks->async([operation = self->shared_from_this(), i] {
        auto& sample = static_cast<SampleOperation&>(*operation);
        if (i % 3 == 0) {
          sample.cancel();
        } else {
          sample.finishWithError(std::nullopt);
        }
      });
    };
    operation->setCompletionBlock([&] { ++completed; });
    queue->addOperation(operation);
  }
  queue->waitUntilAllOperationsAreFinished();
  callbacks->barrierSync([] {});
  EXPECT_EQ(completed, count);
}

}  // namespace
