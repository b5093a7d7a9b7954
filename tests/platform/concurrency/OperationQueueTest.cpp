#include "platform/OperationQueue.h"

#include <gtest/gtest.h>

#include <atomic>
#include <future>
#include <mutex>
#include <thread>

#include "platform/DispatchQueue.h"
#include "platform/Exception.h"
#include "tests/platform/TestEnvironment.h"

namespace platform {
namespace {

class CountRecorder : public KeyValueObserver {
 public:
  void observeValueForKeyPath(std::string_view, KeyValueObservable&, const KeyValueChange& change,
                              void*) override {
    const std::lock_guard lock(mutex);
    counts.push_back(change.newValue.integerValue());
  }
  std::mutex mutex;
  std::vector<int64_t> counts;
};

/// Finishes only when told to, on any thread, and keeps its own state.
class OpenEndedOperation : public Operation {
 public:
  static std::shared_ptr<OpenEndedOperation> make() {
    return std::shared_ptr<OpenEndedOperation>(new OpenEndedOperation);
  }
  void start() override { started.signal(); }
  bool isFinished() const override { return _over; }
  void finish() {
    willChangeValueForKey(isFinishedKey);
    _over = true;
    didChangeValueForKey(isFinishedKey);
  }
  DispatchSemaphore started{0};

 private:
  std::atomic<bool> _over = false;
};

TEST(OperationQueue, runsWhatIsAdded) {
  const auto queue = OperationQueue::init();
  std::atomic<int> runs = 0;
  for (int i = 0; i < 100; ++i) {
    queue->addOperationWithBlock([&] { ++runs; });
  }
  queue->waitUntilAllOperationsAreFinished();
  EXPECT_EQ(runs, 100);
  EXPECT_EQ(queue->operationCount(), 0U);
  EXPECT_TRUE(queue->operations().empty());
}

TEST(OperationQueue, withALimitOfOneOperationsRunInOrder) {
  const auto queue = OperationQueue::init();
  queue->setMaxConcurrentOperationCount(1);
  std::string order;
  for (char c = 'a'; c <= 'z'; ++c) {
    queue->addOperationWithBlock([&order, c] { order += c; });
  }
  queue->waitUntilAllOperationsAreFinished();
  EXPECT_EQ(order, "abcdefghijklmnopqrstuvwxyz");
}

TEST(OperationQueue, higherPriorityStartsFirst) {
  const auto queue = OperationQueue::init();
  queue->setMaxConcurrentOperationCount(0);
  std::string order;
  const auto add = [&](char c, Operation::Priority priority) {
    const auto operation = BlockOperation::blockOperationWithBlock([&order, c] { order += c; });
    operation->setQueuePriority(priority);
    queue->addOperation(operation);
  };
  add('c', Operation::Priority::normal);
  add('e', Operation::Priority::veryLow);
  add('a', Operation::Priority::veryHigh);
  add('d', Operation::Priority::normal);
  add('b', Operation::Priority::high);
  EXPECT_EQ(order, "");
  queue->setMaxConcurrentOperationCount(1);
  queue->waitUntilAllOperationsAreFinished();
  EXPECT_EQ(order, "abcde");
}

TEST(OperationQueue, neverRunsMoreThanItsLimit) {
  const auto queue = OperationQueue::init();
  queue->setMaxConcurrentOperationCount(3);
  std::atomic<int> running = 0;
  std::atomic<int> most = 0;
  for (int i = 0; i < 60; ++i) {
    queue->addOperationWithBlock([&] {
      const int now = ++running;
      int seen = most;
      while (now > seen && !most.compare_exchange_weak(seen, now)) {
      }
      std::this_thread::yield();
      --running;
    });
  }
  queue->waitUntilAllOperationsAreFinished();
  EXPECT_LE(most, 3);
  EXPECT_GE(most, 1);
}

TEST(OperationQueue, withoutALimitAllRunAtOnce) {
  const auto queue = OperationQueue::init();
  EXPECT_EQ(queue->maxConcurrentOperationCount(), -1);
  constexpr int count = 40;
  DispatchSemaphore arrived(0);
  DispatchSemaphore release(0);
  for (int i = 0; i < count; ++i) {
    queue->addOperationWithBlock([&] {
      arrived.signal();
      release.wait();
    });
  }
  for (int i = 0; i < count; ++i) {
    arrived.wait();
  }
  for (int i = 0; i < count; ++i) {
    release.signal();
  }
  queue->waitUntilAllOperationsAreFinished();
}

TEST(OperationQueue, aBlockedQueueNeverStarvesAnother) {
  const auto blocked = OperationQueue::init();
  const auto other = OperationQueue::init();
  DispatchSemaphore release(0);
  for (int i = 0; i < 20; ++i) {
    blocked->addOperationWithBlock([&] { release.wait(); });
  }
  other->addOperationWithBlock([] {});
  other->waitUntilAllOperationsAreFinished();
  for (int i = 0; i < 20; ++i) {
    release.signal();
  }
  blocked->waitUntilAllOperationsAreFinished();
}

TEST(OperationQueue, dependenciesHoldAcrossQueues) {
  const auto first = OperationQueue::init();
  const auto second = OperationQueue::init();
  std::string order;
  const auto a = BlockOperation::blockOperationWithBlock([&] { order += 'a'; });
  const auto b = BlockOperation::blockOperationWithBlock([&] { order += 'b'; });
  b->addDependency(a);
  second->addOperation(b);
  EXPECT_EQ(second->operationCount(), 1U);
  first->addOperation(a);
  second->waitUntilAllOperationsAreFinished();
  EXPECT_EQ(order, "ab");
}

TEST(OperationQueue, cancellingDropsWhatHasNotStarted) {
  const auto queue = OperationQueue::init();
  queue->setMaxConcurrentOperationCount(1);
  DispatchSemaphore started(0);
  DispatchSemaphore release(0);
  std::atomic<int> runs = 0;
  queue->addOperationWithBlock([&] {
    started.signal();
    release.wait();
    ++runs;
  });
  for (int i = 0; i < 5; ++i) {
    queue->addOperationWithBlock([&] { ++runs; });
  }
  started.wait();
  queue->cancelAllOperations();
  EXPECT_EQ(runs, 0);
  release.signal();
  queue->waitUntilAllOperationsAreFinished();
  EXPECT_EQ(runs, 1);
}

TEST(OperationQueue, cancellingAnOperationThatWaitsForAnotherLetsItGo) {
  const auto queue = OperationQueue::init();
  const auto never = BlockOperation::blockOperationWithBlock({});
  const auto waiting = BlockOperation::blockOperationWithBlock({});
  waiting->addDependency(never);
  queue->addOperation(waiting);
  waiting->cancel();
  queue->waitUntilAllOperationsAreFinished();
  EXPECT_TRUE(waiting->isFinished());
}

TEST(OperationQueue, countChangesAreAnnouncedInTheirOrder) {
  const auto queue = OperationQueue::init();
  const auto recorder = std::make_shared<CountRecorder>();
  queue->addObserver(recorder, operationCountKey, keyValueObservingOptionNew);
  for (int round = 0; round < 50; ++round) {
    for (int i = 0; i < 8; ++i) {
      queue->addOperationWithBlock([] {});
    }
  }
  queue->waitUntilAllOperationsAreFinished();
  const std::lock_guard lock(recorder->mutex);
  ASSERT_EQ(recorder->counts.size(), 800U);
  int64_t before = 0;
  for (const int64_t count : recorder->counts) {
    EXPECT_EQ(std::abs(count - before), 1);
    before = count;
  }
  EXPECT_EQ(before, 0);
}

TEST(OperationQueue, anOperationLeavesOnceHoweverOftenItFinishes) {
  const auto queue = OperationQueue::init();
  const auto recorder = std::make_shared<CountRecorder>();
  queue->addObserver(recorder, operationCountKey, keyValueObservingOptionNew);
  const auto operation = OpenEndedOperation::make();
  queue->addOperation(operation);
  operation->started.wait();
  EXPECT_EQ(queue->operationCount(), 1U);
  operation->finish();
  operation->finish();
  queue->waitUntilAllOperationsAreFinished();
  const std::lock_guard lock(recorder->mutex);
  EXPECT_EQ(recorder->counts, (std::vector<int64_t>{1, 0}));
}

TEST(OperationQueue, anAsynchronousOperationStaysUntilItAnnouncesItsEnd) {
  const auto queue = OperationQueue::init();
  queue->setMaxConcurrentOperationCount(1);
  const auto operation = OpenEndedOperation::make();
  bool ran = false;
  queue->addOperation(operation);
  queue->addOperationWithBlock([&] { ran = true; });
  operation->started.wait();
  EXPECT_EQ(queue->operationCount(), 2U);
  EXPECT_FALSE(ran);
  operation->finish();
  queue->waitUntilAllOperationsAreFinished();
  EXPECT_TRUE(ran);
}

TEST(OperationQueue, anOperationWhoseStartThrowsLeavesTheQueue) {
  class Thrower : public Operation {
   public:
    void start() override { throw Exception("Name", "cannot start"); }
    static std::shared_ptr<Thrower> make() { return std::shared_ptr<Thrower>(new Thrower); }
  };
  tests::TestEnvironment environment;
  const auto queue = OperationQueue::init();
  const auto operation = Thrower::make();
  queue->addOperation(operation);
  queue->waitUntilAllOperationsAreFinished();
  operation->waitUntilFinished();
  EXPECT_EQ(environment.log().messages(0), (std::vector<std::string>{"cannot start"}));
}

TEST(OperationQueue, anOperationThatThrewHoldsUpNobodyWhoWaitsForIt) {
  class Thrower : public OpenEndedOperation {
   public:
    void start() override { throw Exception("Name", "cannot start"); }
    static std::shared_ptr<Thrower> make() { return std::shared_ptr<Thrower>(new Thrower); }
  };
  tests::TestEnvironment environment;
  const auto queue = OperationQueue::init();
  const auto operation = Thrower::make();
  bool ran = false;
  const auto dependent = BlockOperation::blockOperationWithBlock([&] { ran = true; });
  dependent->addDependency(operation);
  queue->addOperation(dependent);
  queue->addOperation(operation);
  queue->waitUntilAllOperationsAreFinished();
  EXPECT_FALSE(operation->isFinished());
  EXPECT_TRUE(ran);
  const auto late = BlockOperation::blockOperationWithBlock({});
  late->addDependency(operation);
  EXPECT_TRUE(late->isReady());
}

TEST(OperationQueue, anObserverThatHearsOfAnEndMayWaitForTheRest) {
  class Waiter : public KeyValueObserver {
   public:
    void observeValueForKeyPath(std::string_view, KeyValueObservable& object,
                                const KeyValueChange& change, void*) override {
      const int64_t count = change.newValue.integerValue();
      if (before == 2 && count == 1) {
        release.signal();
        static_cast<OperationQueue&>(object).waitUntilAllOperationsAreFinished();
        waited = true;
      }
      before = count;
    }
    DispatchSemaphore release{0};
    int64_t before = 0;
    bool waited = false;
  };
  const auto queue = OperationQueue::init();
  const auto waiter = std::make_shared<Waiter>();
  queue->addObserver(waiter, operationCountKey, keyValueObservingOptionNew);
  DispatchSemaphore bothAdded(0);
  queue->addOperationWithBlock([&] { waiter->release.wait(); });
  queue->addOperationWithBlock([&] { bothAdded.wait(); });
  bothAdded.signal();
  queue->waitUntilAllOperationsAreFinished();
  EXPECT_TRUE(waiter->waited);
}

TEST(OperationQueue, waitingEndsOnlyAfterTheObserversHaveHeardOfIt) {
  const auto queue = OperationQueue::init();
  const auto recorder = std::make_shared<CountRecorder>();
  queue->addObserver(recorder, operationCountKey, keyValueObservingOptionNew);
  for (int i = 0; i < 200; ++i) {
    queue->addOperationWithBlock([] {});
    queue->waitUntilAllOperationsAreFinished();
    const std::lock_guard lock(recorder->mutex);
    ASSERT_EQ(recorder->counts.size(), static_cast<size_t>(2 * (i + 1)));
  }
}

TEST(OperationQueue, refusesWhatItCannotRun) {
  const auto queue = OperationQueue::init();
  EXPECT_THROW(queue->addOperation(nullptr), Exception);
  const auto operation = BlockOperation::blockOperationWithBlock({});
  queue->addOperation(operation);
  EXPECT_THROW(queue->addOperation(operation), Exception);
  queue->waitUntilAllOperationsAreFinished();
  const auto finished = BlockOperation::blockOperationWithBlock({});
  finished->start();
  EXPECT_THROW(queue->addOperation(finished), Exception);
}

TEST(OperationQueue, aDroppedQueueLetsItsOperationsEnd) {
  DispatchSemaphore release(0);
  DispatchSemaphore done(0);
  {
    const auto queue = OperationQueue::init();
    queue->setMaxConcurrentOperationCount(1);
    queue->addOperationWithBlock([&] { release.wait(); });
    queue->addOperationWithBlock([&] { done.signal(); });
  }
  release.signal();
  done.wait();
}

TEST(OperationQueue, manyThreadsMayAddWaitAndCancel) {
  const auto queue = OperationQueue::init();
  queue->setMaxConcurrentOperationCount(2);
  std::atomic<int> ended = 0;
  std::vector<std::thread> threads;
  threads.reserve(4);
  for (int t = 0; t < 4; ++t) {
    threads.emplace_back([&, t] {
      for (int i = 0; i < 100; ++i) {
        const auto operation = BlockOperation::blockOperationWithBlock({});
        operation->setCompletionBlock([&] { ++ended; });
        queue->addOperation(operation);
        if (i % 25 == t) {
          queue->cancelAllOperations();
        }
        if (i % 40 == 0) {
          queue->setMaxConcurrentOperationCount(1 + t);
        }
      }
      queue->waitUntilAllOperationsAreFinished();
    });
  }
  for (std::thread& thread : threads) {
    thread.join();
  }
  while (ended < 400) {
    std::this_thread::yield();
  }
  EXPECT_EQ(ended, 400);
}

TEST(OperationQueue, countsWhatWaitsAndRunsInAllQueuesOfTheProcess) {
  const auto first = OperationQueue::init();
  const auto second = OperationQueue::init();
  first->setMaxConcurrentOperationCount(1);
  std::promise<void> end;
  const std::shared_future<void> ended = end.get_future().share();
  const size_t before = OperationQueue::unfinishedOperationCount();
  for (const auto& queue : {first, first, second}) {
    queue->addOperationWithBlock([ended] { ended.wait(); });
  }
  EXPECT_EQ(OperationQueue::unfinishedOperationCount(), before + 3);
  end.set_value();
  first->waitUntilAllOperationsAreFinished();
  second->waitUntilAllOperationsAreFinished();
  EXPECT_EQ(OperationQueue::unfinishedOperationCount(), before);
}

TEST(OperationQueue, hasAName) {
  const auto queue = OperationQueue::init();
  queue->setName("generation");
  EXPECT_EQ(queue->name(), "generation");
  EXPECT_EQ(queue->valueForKey("operationCount"), Value(0U));
  EXPECT_TRUE(queue->valueForKey("other").isAbsent());
}

}  // namespace
}  // namespace platform
