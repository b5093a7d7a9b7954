#include "platform/Clock.h"

#include <gtest/gtest.h>

#include <atomic>
#include <thread>

#include "tests/platform/OtherThreads.h"

namespace platform {
namespace {

using namespace std::chrono_literals;

TEST(SystemClock, elapsedTimeGrows) {
  const auto clock = systemClock();
  const auto before = clock->elapsed();
  clock->sleep(Seconds(0.001));
  EXPECT_GE(clock->elapsed() - before, Seconds(0.001));
}

TEST(SystemClock, nowIsTheTimeOfDay) {
  const auto difference = systemClock()->now() - std::chrono::system_clock::now();
  EXPECT_LT(std::chrono::abs(difference), 5s);
}

TEST(SystemClock, negativeSleepReturnsAtOnce) { systemClock()->sleep(Seconds(-1)); }

TEST(SimulatedClock, standsStillUntilItIsAdvanced) {
  SimulatedClock clock(std::chrono::system_clock::time_point(100s));
  EXPECT_EQ(clock.now(), std::chrono::system_clock::time_point(100s));
  EXPECT_EQ(clock.elapsed(), Seconds(0));
  clock.advance(Seconds(2.5));
  EXPECT_EQ(clock.elapsed(), Seconds(2.5));
  EXPECT_EQ(clock.now(), std::chrono::system_clock::time_point(102500ms));
}

TEST(SimulatedClock, setNowLeavesElapsedTimeAlone) {
  SimulatedClock clock;
  clock.advance(Seconds(1));
  clock.setNow(std::chrono::system_clock::time_point(7s));
  EXPECT_EQ(clock.now(), std::chrono::system_clock::time_point(7s));
  EXPECT_EQ(clock.elapsed(), Seconds(1));
}

TEST(SimulatedClock, sleeperWakesWhenItsTimeHasCome) {
  SimulatedClock clock;
  std::atomic<bool> awake = false;
  std::thread sleeper([&] {
    clock.sleep(Seconds(2));
    awake = true;
  });
  clock.waitForSleepers(1);
  clock.advance(Seconds(1.5));
  EXPECT_FALSE(awake);
  EXPECT_EQ(clock.sleeperCount(), 1U);
  clock.advance(Seconds(0.5));
  sleeper.join();
  EXPECT_TRUE(awake);
  EXPECT_EQ(clock.sleeperCount(), 0U);
}

TEST(SimulatedClock, zeroSleepReturnsAtOnce) {
  SimulatedClock clock;
  clock.sleep(Seconds(0));
  clock.sleep(Seconds(-3));
  EXPECT_EQ(clock.elapsed(), Seconds(0));
}

TEST(SimulatedClock, tellsWhenAThreadHasGoneToSleepWhateverOthersDo) {
  SimulatedClock clock;
  std::thread other([&] { clock.sleep(Seconds(1000)); });
  clock.waitForSleepers(1);
  int naps = 0;
  std::thread sleeper([&] {
    for (; naps < 100; ++naps) {
      clock.sleep(Seconds(1));
    }
  });
  // A step too early would be lost, and the last nap never end.
  for (size_t nap = 1; nap <= 100; ++nap) {
    clock.waitForSleepOf(sleeper.get_id(), nap);
    clock.advance(Seconds(1));
  }
  sleeper.join();
  EXPECT_EQ(naps, 100);
  EXPECT_EQ(clock.elapsed(), Seconds(100));
  clock.advance(Seconds(900));
  other.join();
}

TEST(SimulatedClock, sleepsOfAThreadThatHasEndedAreNotThoseOfTheNextOneOfItsName) {
  SimulatedClock clock;
  std::thread former([&] { clock.sleep(Seconds(1)); });
  const std::thread::id name = former.get_id();
  clock.waitForSleepOf(name, 1);
  clock.advance(Seconds(1));
  former.join();
  std::atomic<bool> maySleep{false};
  std::atomic<bool> goesToSleep{false};
  std::thread latter([&] {
    maySleep.wait(false);
    goesToSleep = true;
    clock.sleep(Seconds(1));
  });
  if (latter.get_id() != name) {
    // Nothing says that names are used again, but they are.
    maySleep = true;
    maySleep.notify_all();
    clock.waitForSleepOf(latter.get_id(), 1);
    clock.advance(Seconds(1));
    latter.join();
    GTEST_SKIP() << "the system has found another name";
  }
  bool wasAsleep = false;
  std::thread observer([&] {
    clock.waitForSleepOf(name, 1);
    wasAsleep = goesToSleep;
  });
  tests::OtherThreads().waitUntilBlocked(std::chrono::seconds(5));
  maySleep = true;
  maySleep.notify_all();
  observer.join();
  EXPECT_TRUE(wasAsleep);
  clock.advance(Seconds(1));
  latter.join();
}

}  // namespace
}  // namespace platform
