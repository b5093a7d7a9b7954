#include "plugin/operations/ZEBOperation.h"

#include <gtest/gtest.h>

#include <atomic>
#include <chrono>
#include <map>
#include <thread>

#include "platform/DispatchQueue.h"
#include "tests/plugin/operations/SampleOperation.h"

namespace {

using tests::SampleOperation;
using tests::StateRecorder;
using Lines = std::vector<std::string>;

platform::Error failure(int code) { return {"TestErrorDomain", code, "no paper"}; }

TEST(ZEBOperation, beginsWithAllFlagsDownAndNoError) {
  const auto operation = SampleOperation::make();
  EXPECT_EQ(operation->flags(), "000");
  EXPECT_EQ(operation->error(), std::nullopt);
}

TEST(ZEBOperation, isAlwaysAsynchronous) {
  const auto operation = SampleOperation::make();
  EXPECT_TRUE(operation->isAsynchronous());
  operation->cancel();
  EXPECT_TRUE(operation->isAsynchronous());
}

TEST(ZEBOperation, startAnnouncesExecutingAndThenRunsMainOnTheSameThread) {
  const auto operation = SampleOperation::make();
  const auto recorder = StateRecorder::observing(operation);
  std::thread::id thread;
  operation->body = [&] {
    recorder->note("main " + operation->flags());
    thread = std::this_thread::get_id();
  };
  operation->start();
  EXPECT_EQ(recorder->takeLines(),
            (Lines{"will isExecuting 000", "did isExecuting 100", "main 100"}));
  EXPECT_EQ(thread, std::this_thread::get_id());
}

TEST(ZEBOperation, staysExecutingAfterMainHasReturned) {
  const auto operation = SampleOperation::make();
  operation->start();
  EXPECT_EQ(operation->flags(), "100");
}

TEST(ZEBOperation, finishingAnnouncesExecutingInsideFinished) {
  const auto operation = SampleOperation::make();
  operation->start();
  const auto recorder = StateRecorder::observing(operation);
  operation->finishWithError(std::nullopt);
  EXPECT_EQ(recorder->takeLines(), (Lines{"will isFinished 100", "will isExecuting 100",
                                          "did isExecuting 010", "did isFinished 010"}));
  EXPECT_EQ(operation->error(), std::nullopt);
}

TEST(ZEBOperation, finishingWithAnErrorKeepsItAndLeavesCancelledAlone) {
  const auto operation = SampleOperation::make();
  operation->start();
  operation->finishWithError(failure(7));
  EXPECT_EQ(operation->error(), failure(7));
  EXPECT_EQ(operation->flags(), "010");

  const auto cancelled = SampleOperation::make();
  cancelled->cancel();
  cancelled->finishWithError(failure(8));
  EXPECT_EQ(cancelled->error(), failure(8));
  EXPECT_EQ(cancelled->flags(), "011");
}

TEST(ZEBOperation, anObserverOfTheEndReadsTheErrorInsideTheDidAnnouncementOnly) {
  class ErrorReader : public platform::KeyValueObserver {
   public:
    void observeValueForKeyPath(std::string_view, platform::KeyValueObservable& object,
                                const platform::KeyValueChange& change, void*) override {
      seen[change.isPrior] = static_cast<ZEBOperation&>(object).error();
    }
    std::map<bool, std::optional<platform::Error>> seen;
  };
  const auto operation = SampleOperation::make();
  const auto reader = std::make_shared<ErrorReader>();
  operation->addObserver(reader, platform::isFinishedKey, platform::keyValueObservingOptionPrior);
  operation->finishWithError(failure(3));
  ASSERT_EQ(reader->seen.size(), 2U);
  EXPECT_EQ(reader->seen[true], std::nullopt);
  EXPECT_EQ(reader->seen[false], failure(3));
}

TEST(ZEBOperation, cancellingAnnouncesCancelledInsideExecutingInsideFinished) {
  const auto operation = SampleOperation::make();
  operation->start();
  const auto recorder = StateRecorder::observing(operation);
  operation->cancel();
  EXPECT_EQ(recorder->takeLines(),
            (Lines{"will isFinished 100", "will isExecuting 100", "will isCancelled 100",
                   "did isCancelled 011", "did isExecuting 011", "did isFinished 011"}));
}

TEST(ZEBOperation, cancellingLeavesTheErrorAsItIs) {
  const auto operation = SampleOperation::make();
  operation->setError(failure(4));
  operation->cancel();
  EXPECT_EQ(operation->error(), failure(4));
}

TEST(ZEBOperation, cancelledBeforeItsStartItIsFinishedAtOnceAndFinishesAgainWhenStarted) {
  bool ran = false;
  const auto operation = SampleOperation::make([&] { ran = true; });
  operation->setError(failure(5));
  operation->cancel();
  EXPECT_EQ(operation->flags(), "011");

  const auto recorder = StateRecorder::observing(operation);
  operation->start();
  EXPECT_EQ(recorder->takeLines(), (Lines{"will isFinished 011", "will isExecuting 011",
                                          "did isExecuting 011", "did isFinished 011"}));
  EXPECT_EQ(operation->flags(), "011");
  EXPECT_EQ(operation->error(), std::nullopt) << "it finishes without an error";
  EXPECT_FALSE(ran);
}

TEST(ZEBOperation, cancelledWhileExecutingItIsFinishedBeforeItsWorkHasStopped) {
  platform::DispatchSemaphore working(0);
  platform::DispatchSemaphore goOn(0);
  std::atomic<bool> stopped = false;
  const auto operation = SampleOperation::make([&] {
    working.signal();
    goOn.wait();
    stopped = true;
  });
  std::thread runner([&] { operation->start(); });
  working.wait();
  operation->cancel();
  EXPECT_EQ(operation->flags(), "011");
  EXPECT_FALSE(stopped);
  goOn.signal();
  runner.join();
  EXPECT_EQ(operation->flags(), "011");
}

TEST(ZEBOperation, aSecondFinishStoresItsErrorAndRepeatsTheAnnouncements) {
  const auto operation = SampleOperation::make();
  operation->start();
  operation->finishWithError(failure(1));
  const auto recorder = StateRecorder::observing(operation);
  operation->finishWithError(failure(2));
  EXPECT_EQ(operation->error(), failure(2));
  EXPECT_EQ(recorder->takeLines(), (Lines{"will isFinished 010", "will isExecuting 010",
                                          "did isExecuting 010", "did isFinished 010"}));
  operation->finishWithError(std::nullopt);
  EXPECT_EQ(operation->error(), std::nullopt);
}

TEST(ZEBOperation, cancellingAFinishedOneMarksItCancelledAndRepeatsTheAnnouncements) {
  const auto operation = SampleOperation::make();
  operation->start();
  operation->finishWithError(failure(1));
  const auto recorder = StateRecorder::observing(operation);
  operation->cancel();
  EXPECT_EQ(recorder->takeLines(),
            (Lines{"will isFinished 010", "will isExecuting 010", "will isCancelled 010",
                   "did isCancelled 011", "did isExecuting 011", "did isFinished 011"}));
  EXPECT_EQ(operation->error(), failure(1));
}

TEST(ZEBOperation, startLooksAtNoFlagButCancelled) {
  int runs = 0;
  const auto operation = SampleOperation::make([&] { ++runs; });
  operation->finishWithError(failure(1));
  operation->start();
  EXPECT_EQ(runs, 1);
  EXPECT_EQ(operation->error(), failure(1));
}

TEST(ZEBOperation, startDoesNotRunTheMainOfTheBaseClass) {
  class Plain : public ZEBOperation {
   public:
    static std::shared_ptr<Plain> make() { return std::shared_ptr<Plain>(new Plain); }
    void main() override { finishWithError(std::nullopt); }
  };
  const auto operation = Plain::make();
  operation->start();
  EXPECT_TRUE(operation->isFinished());
  EXPECT_FALSE(operation->isExecuting()) << "nothing may raise the flag after main()";
}

TEST(ZEBOperation, cancellingReachesTheOverrideOfASubclass) {
  class Stoppable : public ZEBOperation {
   public:
    static std::shared_ptr<Stoppable> make() { return std::shared_ptr<Stoppable>(new Stoppable); }
    void cancel() override {
      workStopped = true;
      ZEBOperation::cancel();
    }
    bool workStopped = false;
  };
  const auto operation = Stoppable::make();
  const std::shared_ptr<platform::Operation> base = operation;
  base->cancel();
  EXPECT_TRUE(operation->workStopped);
  EXPECT_TRUE(operation->isCancelled());
}

TEST(ZEBOperation, lockExecRunsItsBlockWhileOthersWait) {
  const auto operation = SampleOperation::make();
  std::atomic<bool> asked = false;
  std::atomic<bool> answered = false;
  std::thread other;
  int runs = 0;
  operation->lockExec([&] {
    ++runs;
    other = std::thread([&] {
      asked = true;
      operation->isFinished();
      answered = true;
    });
    while (!asked) {
      std::this_thread::yield();
    }
    std::this_thread::sleep_for(std::chrono::milliseconds(10));
    EXPECT_FALSE(answered);
  });
  other.join();
  EXPECT_TRUE(answered);
  EXPECT_EQ(runs, 1);
}

TEST(ZEBOperation, lockExecGivesTheLockBackWhenItsBlockThrows) {
  const auto operation = SampleOperation::make();
  EXPECT_THROW(operation->lockExec([] { throw 1; }), int);
  EXPECT_FALSE(operation->isFinished());
}

TEST(ZEBOperation, anObserverMayEndTheOperationInsideAnAnnouncement) {
  class Canceller : public platform::KeyValueObserver {
   public:
    void observeValueForKeyPath(std::string_view, platform::KeyValueObservable& object,
                                const platform::KeyValueChange& change, void*) override {
      if (!change.isPrior && !std::exchange(cancelled, true)) {
        static_cast<ZEBOperation&>(object).cancel();
      }
    }
    bool cancelled = false;
  };
  const auto operation = SampleOperation::make();
  const auto canceller = std::make_shared<Canceller>();
  operation->addObserver(canceller, platform::isFinishedKey);
  operation->finishWithError(failure(1));
  EXPECT_EQ(operation->flags(), "011");
}

TEST(ZEBOperation, everyCallThatEndsItGivesOnePairOfFinishedAnnouncements) {
  class PairCounter : public platform::KeyValueObserver {
   public:
    void observeValueForKeyPath(std::string_view keyPath, platform::KeyValueObservable&,
                                const platform::KeyValueChange& change, void*) override {
      EXPECT_EQ(keyPath, platform::isFinishedKey);
      ++(change.isPrior ? wills : dids);
    }
    std::atomic<int> wills = 0;
    std::atomic<int> dids = 0;
  };
  const auto operation = SampleOperation::make();
  const auto counter = std::make_shared<PairCounter>();
  operation->addObserver(counter, platform::isFinishedKey, platform::keyValueObservingOptionPrior);
  operation->start();
  EXPECT_EQ(counter->wills, 0);

  constexpr int callsOfEach = 50;
  std::vector<std::thread> threads;
  threads.reserve(4);
  for (int t = 0; t < 3; ++t) {
    threads.emplace_back([&, t] {
      for (int i = 0; i < callsOfEach; ++i) {
        if (t == 0) {
          operation->cancel();
        } else {
          operation->finishWithError(failure(i));
        }
      }
    });
  }
  // Once up, a flag never comes down again, whoever reads it.
  threads.emplace_back([&] {
    while (!operation->isFinished()) {
      std::this_thread::yield();
    }
    for (int i = 0; i < callsOfEach; ++i) {
      EXPECT_TRUE(operation->isFinished());
      EXPECT_FALSE(operation->isExecuting());
      const auto error = operation->error();
      EXPECT_TRUE(!error || error->description == "no paper");
      operation->setError(failure(1000));
    }
  });
  for (std::thread& thread : threads) {
    thread.join();
  }
  EXPECT_EQ(counter->wills, 3 * callsOfEach);
  EXPECT_EQ(counter->dids, 3 * callsOfEach);
  EXPECT_EQ(operation->flags(), "011");
}

}  // namespace
