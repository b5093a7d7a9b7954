#include "platform/RunLoop.h"

#include <gtest/gtest.h>

#include <atomic>
#include <thread>

#include "platform/DispatchQueue.h"
#include "platform/Exception.h"
#include "tests/platform/TestEnvironment.h"

namespace platform {
namespace {

TEST(RunLoop, blocksRunInTheOrderGiven) {
  RunLoop loop;
  std::string order;
  loop.perform([&] { order += 'a'; });
  loop.perform([&] {
    order += 'b';
    loop.perform([&] { order += 'd'; });
  });
  loop.perform([&] { order += 'c'; });
  EXPECT_EQ(loop.runPending(), 4U);
  EXPECT_EQ(order, "abcd");
}

TEST(RunLoop, timersFireWhenDueInTheOrderOfTheirDueTimes) {
  tests::TestEnvironment environment;
  RunLoop loop;
  std::string order;
  loop.performAfterDelay(Seconds(2), [&] { order += 'c'; });
  loop.performAfterDelay(Seconds(1), [&] { order += 'a'; });
  loop.performAfterDelay(Seconds(1), [&] { order += 'b'; });
  EXPECT_EQ(loop.runPending(), 0U);
  environment.clock().advance(Seconds(0.999));
  EXPECT_EQ(loop.runPending(), 0U);
  environment.clock().advance(Seconds(0.002));
  EXPECT_EQ(loop.runPending(), 2U);
  environment.clock().advance(Seconds(5));
  EXPECT_EQ(loop.runPending(), 1U);
  EXPECT_EQ(order, "abc");
}

TEST(RunLoop, aLoopThatIsNeverRunNeverFiresItsTimers) {
  tests::TestEnvironment environment;
  bool fired = false;
  std::thread thread([&] {
    RunLoop::current()->performAfterDelay(Seconds(0.1), [&] { fired = true; });
    environment.clock().advance(Seconds(10));
  });
  thread.join();
  EXPECT_FALSE(fired);
}

TEST(RunLoop, aRunningLoopWakesWhenTheClockMoves) {
  tests::TestEnvironment environment;
  std::shared_ptr<RunLoop> loop;
  DispatchSemaphore ready(0);
  DispatchSemaphore fired(0);
  std::thread thread([&] {
    loop = RunLoop::current();
    loop->performAfterDelay(Seconds(1), [&] { fired.signal(); });
    ready.signal();
    loop->run();
  });
  ready.wait();
  environment.clock().advance(Seconds(1));
  fired.wait();
  loop->stop();
  thread.join();
}

TEST(RunLoop, anInvalidatedTimerNeverFires) {
  tests::TestEnvironment environment;
  RunLoop loop;
  bool fired = false;
  const auto timer = loop.performAfterDelay(Seconds(1), [&] { fired = true; });
  EXPECT_TRUE(timer->isValid());
  timer->invalidate();
  timer->invalidate();
  EXPECT_FALSE(timer->isValid());
  environment.clock().advance(Seconds(2));
  EXPECT_EQ(loop.runPending(), 0U);
  EXPECT_FALSE(fired);
}

TEST(RunLoop, aRepeatingTimerFiresOnceForManyMissedIntervals) {
  tests::TestEnvironment environment;
  RunLoop loop;
  int count = 0;
  const auto timer = loop.scheduleRepeatingTimer(Seconds(1), [&] { ++count; });
  environment.clock().advance(Seconds(1));
  loop.runPending();
  EXPECT_EQ(count, 1);
  environment.clock().advance(Seconds(3.5));
  loop.runPending();
  EXPECT_EQ(count, 2);
  environment.clock().advance(Seconds(0.5));
  loop.runPending();
  EXPECT_EQ(count, 3);
  timer->invalidate();
  environment.clock().advance(Seconds(9));
  EXPECT_EQ(loop.runPending(), 0U);
}

TEST(RunLoop, aTimerOutlivesItsLoopHarmlessly) {
  tests::TestEnvironment environment;
  std::shared_ptr<Timer> timer;
  {
    RunLoop loop;
    timer = loop.performAfterDelay(Seconds(1), [] {});
  }
  EXPECT_FALSE(timer->isValid());
  timer->invalidate();
}

TEST(RunLoop, runForEndsAtItsDeadline) {
  tests::TestEnvironment environment;
  DispatchSemaphore ready(0);
  std::atomic<int> count = 0;
  std::thread thread([&] {
    RunLoop loop;
    loop.performAfterDelay(Seconds(1), [&] { ++count; });
    loop.performAfterDelay(Seconds(3), [&] { ++count; });
    loop.perform([&] { ready.signal(); });
    loop.runFor(Seconds(2));
  });
  ready.wait();
  environment.clock().waitForSleepers(1);
  environment.clock().advance(Seconds(1));
  while (count == 0) {
    std::this_thread::yield();
  }
  environment.clock().waitForSleepers(1);
  environment.clock().advance(Seconds(1));
  thread.join();
  EXPECT_EQ(count, 1);
}

TEST(RunLoop, anExceptionEndsOneBlockOnly) {
  tests::TestEnvironment environment;
  RunLoop loop;
  bool ran = false;
  loop.perform([] { throw Exception("Name", "broken block"); });
  loop.perform([&] { ran = true; });
  EXPECT_EQ(loop.runPending(), 2U);
  EXPECT_TRUE(ran);
  EXPECT_EQ(environment.log().messages(0), (std::vector<std::string>{"broken block"}));
}

TEST(RunLoop, eachThreadHasItsOwnAndTheMainThreadTheMainOne) {
  EXPECT_EQ(RunLoop::current(), RunLoop::main());
  std::thread thread([] {
    EXPECT_NE(RunLoop::current(), RunLoop::main());
    EXPECT_EQ(RunLoop::current(), RunLoop::current());
  });
  thread.join();
}

TEST(RunLoop, stopBeforeRunEndsTheNextRun) {
  RunLoop loop;
  loop.stop();
  loop.run();
  loop.perform([&] { loop.stop(); });
  loop.run();
}

}  // namespace
}  // namespace platform
