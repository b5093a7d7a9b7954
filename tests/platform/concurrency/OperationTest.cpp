#include "platform/Operation.h"

#include <gtest/gtest.h>

#include <thread>

#include "platform/Exception.h"
#include "tests/platform/TestEnvironment.h"

namespace platform {
namespace {

class StateRecorder : public KeyValueObserver {
 public:
  void observeValueForKeyPath(std::string_view keyPath, KeyValueObservable&,
                              const KeyValueChange& change, void*) override {
    record += (change.isPrior ? "will " : "did ") + std::string(keyPath) + "; ";
  }
  std::string record;
};

std::shared_ptr<StateRecorder> observe(Operation& operation) {
  auto recorder = std::make_shared<StateRecorder>();
  for (const char* key : {isExecutingKey, isFinishedKey, isCancelledKey}) {
    operation.addObserver(recorder, key, keyValueObservingOptionPrior);
  }
  return recorder;
}

TEST(Operation, startRunsMainAndAnnouncesEachState) {
  std::shared_ptr<BlockOperation> operation;
  bool executingInside = false;
  operation =
      BlockOperation::blockOperationWithBlock([&] { executingInside = operation->isExecuting(); });
  const auto recorder = observe(*operation);
  EXPECT_FALSE(operation->isFinished());
  operation->start();
  EXPECT_TRUE(executingInside);
  EXPECT_TRUE(operation->isFinished());
  EXPECT_FALSE(operation->isExecuting());
  EXPECT_EQ(recorder->record,
            "will isExecuting; did isExecuting; will isFinished; will isExecuting; "
            "did isExecuting; did isFinished; ");
}

TEST(Operation, aCancelledOperationFinishesWithoutRunning) {
  bool ran = false;
  const auto operation = BlockOperation::blockOperationWithBlock([&] { ran = true; });
  operation->cancel();
  EXPECT_TRUE(operation->isCancelled());
  EXPECT_FALSE(operation->isFinished());
  operation->start();
  EXPECT_FALSE(ran);
  EXPECT_TRUE(operation->isFinished());
}

TEST(Operation, startingTwiceRunsOnce) {
  int runs = 0;
  const auto operation = BlockOperation::blockOperationWithBlock([&] { ++runs; });
  operation->start();
  operation->start();
  EXPECT_EQ(runs, 1);
}

TEST(Operation, cancellingTwiceAnnouncesOnce) {
  const auto operation = BlockOperation::blockOperationWithBlock({});
  const auto recorder = observe(*operation);
  operation->cancel();
  operation->cancel();
  EXPECT_EQ(recorder->record, "will isCancelled; did isCancelled; ");
}

TEST(Operation, anExceptionEndsTheOperationAndIsLogged) {
  tests::TestEnvironment environment;
  const auto operation =
      BlockOperation::blockOperationWithBlock([] { throw Exception("Name", "out of paper"); });
  operation->start();
  EXPECT_TRUE(operation->isFinished());
  EXPECT_EQ(environment.log().messages(0), (std::vector<std::string>{"out of paper"}));
}

TEST(Operation, isReadyOnceItsDependenciesHaveFinished) {
  const auto first = BlockOperation::blockOperationWithBlock({});
  const auto second = BlockOperation::blockOperationWithBlock({});
  second->addDependency(first);
  second->addDependency(nullptr);
  EXPECT_EQ(second->dependencies().size(), 1U);
  EXPECT_FALSE(second->isReady());
  first->start();
  EXPECT_TRUE(second->isReady());
}

TEST(Operation, aCancelledOperationIsReadyWhateverItWaitedFor) {
  const auto first = BlockOperation::blockOperationWithBlock({});
  const auto second = BlockOperation::blockOperationWithBlock({});
  second->addDependency(first);
  second->cancel();
  EXPECT_TRUE(second->isReady());
}

TEST(Operation, completionBlockRunsOnceAfterTheEnd) {
  int completions = 0;
  const auto operation = BlockOperation::blockOperationWithBlock({});
  operation->setCompletionBlock([&] {
    EXPECT_TRUE(operation->isFinished());
    ++completions;
  });
  operation->start();
  operation->start();
  EXPECT_EQ(completions, 1);
}

TEST(Operation, waitUntilFinishedReturnsAfterTheEnd) {
  const auto operation = BlockOperation::blockOperationWithBlock({});
  std::thread runner([&] { operation->start(); });
  operation->waitUntilFinished();
  EXPECT_TRUE(operation->isFinished());
  runner.join();
  operation->waitUntilFinished();
}

}  // namespace
}  // namespace platform
