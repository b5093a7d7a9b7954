#include "platform/Condition.h"

#include <gtest/gtest.h>

#include <atomic>
#include <chrono>
#include <thread>

#include "tests/platform/TestEnvironment.h"

namespace platform {
namespace {

TEST(Condition, notifyWakesAWaiter) {
  Mutex mutex;
  Condition condition;
  bool ready = false;
  std::thread waiter([&] {
    const MutexLock lock(mutex);
    while (!ready) {
      condition.wait(mutex);
    }
  });
  {
    const MutexLock lock(mutex);
    ready = true;
  }
  condition.notifyAll();
  waiter.join();
}

TEST(Condition, timedWaitEndsWhenTheSimulatedClockReachesTheDeadline) {
  tests::TestEnvironment environment;
  Mutex mutex;
  Condition condition;
  std::atomic<int> wakes = 0;
  std::thread waiter([&] {
    const MutexLock lock(mutex);
    while (condition.waitUntil(mutex, Clock::Instant(5))) {
      ++wakes;
    }
  });
  environment.clock().waitForSleepers(1);
  environment.clock().advance(Seconds(4));
  while (wakes == 0) {
    std::this_thread::yield();
  }
  environment.clock().waitForSleepers(1);
  environment.clock().advance(Seconds(1));
  waiter.join();
  EXPECT_GE(wakes, 1);
}

TEST(Condition, timedWaitForThePastReturnsAtOnce) {
  tests::TestEnvironment environment;
  Mutex mutex;
  Condition condition;
  const MutexLock lock(mutex);
  EXPECT_FALSE(condition.waitUntil(mutex, Clock::Instant(0)));
}

TEST(Condition, notificationEndsATimedWaitEarly) {
  tests::TestEnvironment environment;
  Mutex mutex;
  Condition condition;
  bool ready = false;
  bool inTime = false;
  std::thread waiter([&] {
    const MutexLock lock(mutex);
    inTime = true;
    while (!ready && inTime) {
      inTime = condition.waitUntil(mutex, Clock::Instant(1000));
    }
  });
  {
    const MutexLock lock(mutex);
    ready = true;
  }
  condition.notifyAll();
  waiter.join();
  EXPECT_TRUE(inTime);
}

TEST(Condition, aDeadlineBeyondWhatTheMachineCanCountIsStillFarAway) {
  Mutex mutex;
  Condition condition;
  std::atomic<bool> waiting = false;
  bool inTime = false;
  std::thread waiter([&] {
    const MutexLock lock(mutex);
    waiting = true;
    inTime = condition.waitUntil(mutex, Clock::Instant(1e300));
  });
  while (!waiting) {
    std::this_thread::yield();
  }
  {
    // Free once the waiter has fallen asleep.
    const MutexLock lock(mutex);
  }
  std::this_thread::sleep_for(std::chrono::milliseconds(5));
  condition.notifyAll();
  waiter.join();
  EXPECT_TRUE(inTime);
}

TEST(Condition, timedWaitGoesByTheRealClockToo) {
  Mutex mutex;
  Condition condition;
  const auto clock = systemClock();
  const auto start = clock->elapsed();
  const MutexLock lock(mutex);
  while (condition.waitUntil(mutex, start + Seconds(0.02))) {
  }
  EXPECT_GE(clock->elapsed() - start, Seconds(0.02));
}

}  // namespace
}  // namespace platform
