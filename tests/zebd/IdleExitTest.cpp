#include "zebd/IdleExit.h"

#include <gmock/gmock.h>

#include <cmath>
#include <memory>
#include <random>
#include <vector>

#include "platform/RunLoop.h"
#include "platform/Value.h"
#include "tests/platform/TestEnvironment.h"
#include "zebd/Owner.h"

namespace {

using platform::Seconds;

/// A host without a plug-in whose time moves when it is told to.
class IdleExitTest : public testing::Test {
 protected:
  void begin(double delay) {
    exit = std::make_unique<zebd::IdleExit>(
        loop, owner, Seconds(delay), [this] { return isInUse; },
        [this] { leftAt.push_back(now()); });
  }
  double now() { return environment.clock().elapsed().count() - start; }
  /// Time passes in small steps, and the loop runs as it would.
  void pass(double seconds) {
    for (int64_t steps = std::llround(seconds * 10); steps > 0; --steps) {
      environment.clock().advance(Seconds(0.1));
      loop->runPending();
    }
  }

  tests::TestEnvironment environment;
  std::shared_ptr<platform::RunLoop> loop = std::make_shared<platform::RunLoop>();
  zebd::Owner owner{std::make_shared<zebd::Bookshelf>(), {}};
  double start = environment.clock().elapsed().count();
  bool isInUse = false;
  std::vector<double> leftAt;
  std::unique_ptr<zebd::IdleExit> exit;
};

TEST_F(IdleExitTest, HostThatNobodyEverAskedLeavesAfterTheDelay) {
  begin(30);
  pass(29.8);
  EXPECT_TRUE(leftAt.empty());
  pass(1.3);
  EXPECT_EQ(leftAt.size(), 1U);
}

TEST_F(IdleExitTest, RequestBeginsTheDelayAnew) {
  begin(30);
  pass(20);
  exit->noteActivity();
  pass(29.8);
  EXPECT_TRUE(leftAt.empty());
  pass(1.3);
  EXPECT_EQ(leftAt.size(), 1U);
}

TEST_F(IdleExitTest, HostDoesNotLeaveWhileAGuardIsHeldAndOnlyADelayAfterItWasGivenBack) {
  begin(5);
  owner.disableShutdown();
  pass(1000);
  EXPECT_TRUE(leftAt.empty());
  owner.enableShutdown();
  pass(4.8);
  EXPECT_TRUE(leftAt.empty());
  pass(1.3);
  EXPECT_EQ(leftAt.size(), 1U);
}

TEST_F(IdleExitTest, HostDoesNotLeaveOnANegativeCount) {
  begin(5);
  owner.enableShutdown();
  pass(1000);
  EXPECT_TRUE(leftAt.empty());
}

TEST_F(IdleExitTest, HostDoesNotLeaveWhileAClientUsesIt) {
  begin(5);
  isInUse = true;
  pass(1000);
  EXPECT_TRUE(leftAt.empty());
  isInUse = false;
  pass(6.3);
  EXPECT_EQ(leftAt.size(), 1U);
}

TEST_F(IdleExitTest, PlugInChangesTheDelay) {
  begin(1000);
  owner.setIdleTimeOutDelay(1);
  EXPECT_EQ(exit->delay(), Seconds(1));
  pass(1.5);
  EXPECT_EQ(leftAt.size(), 1U);
  owner.setIdleTimeOutDelay(0);
  EXPECT_EQ(exit->delay(), Seconds(1000)) << "no delay that could be kept";
}

TEST_F(IdleExitTest, HostThatStaysIsAskedToLeaveAgainAfterTheDelay) {
  begin(5);
  pass(30);
  EXPECT_GE(leftAt.size(), 4U);
  EXPECT_LE(leftAt.size(), 6U);
}

TEST_F(IdleExitTest, NothingIsLookedAtAfterTheEnd) {
  begin(5);
  exit.reset();
  pass(30);
  EXPECT_TRUE(leftAt.empty());
}

/// Guards, requests and searches come and go at random. What is under way, and since when nothing
/// has been, is kept beside the owner, and every exit is held against it.
TEST_F(IdleExitTest, NoExitIsMissedAndNoneHappensUnderWorkInTenThousandRuns) {
  constexpr double step = 0.25;
  for (uint32_t seed = 0; seed < 10'000; ++seed) {
    std::mt19937 random(seed);
    const auto chance = [&random](unsigned percent) { return random() % 100 < percent; };
    leftAt.clear();
    start = environment.clock().elapsed().count();
    isInUse = false;
    owner.setIdleTimeOutDelay(0);
    const double delay = 1.0 + static_cast<double>(random() % 4);
    begin(delay);
    int guards = 0;
    double quietSince = 0;
    for (int i = 0; i < 60; ++i) {
      if (chance(10)) {
        owner.disableShutdown();
        ++guards;
      }
      if (guards > 0 && chance(40)) {
        owner.enableShutdown();
        --guards;
        quietSince = now();
      }
      if (chance(5)) {
        isInUse = true;
      } else if (isInUse && chance(50)) {
        isInUse = false;
        exit->noteActivity();
        quietSince = now();
      }
      if (chance(3)) {
        exit->noteActivity();
        quietSince = now();
      }
      if (guards > 0 || isInUse) {
        quietSince = now() + step;
      }
      environment.clock().advance(Seconds(step));
      loop->runPending();
      if (!leftAt.empty()) {
        ASSERT_EQ(guards, 0) << "seed " << seed;
        ASSERT_FALSE(isInUse) << "seed " << seed;
        ASSERT_GE(now() - quietSince, delay - 2 * step) << "seed " << seed;
        break;
      }
      ASSERT_LE(now() - quietSince, delay + 2) << "missed, seed " << seed;
    }
    for (; guards > 0; --guards) {
      owner.enableShutdown();
    }
  }
}

}  // namespace
