#include "platform/SuddenTermination.h"

#include <gtest/gtest.h>

#include <thread>

#include "tests/platform/TestEnvironment.h"
#include "tests/support/Latch.h"

namespace {

using namespace platform;

TEST(SuddenTermination, CountsAllThatForbidIt) {
  EXPECT_EQ(suddenTerminationDisableCount(), 0);
  disableSuddenTermination();
  disableSuddenTermination();
  EXPECT_EQ(suddenTerminationDisableCount(), 2);
  enableSuddenTermination();
  enableSuddenTermination();
  EXPECT_EQ(suddenTerminationDisableCount(), 0);
}

TEST(SuddenTerminationDeathTest, StopsWhoCountsWrongly) {
  ::testing::FLAGS_gtest_death_test_style = "threadsafe";
  EXPECT_DEATH(enableSuddenTermination(), "suddenTerminationDisableCount > 0");
}

TEST(SuddenTermination, IsWaitedForByWhoEndsTheProcess) {
  tests::TestEnvironment environment;
  EXPECT_TRUE(waitUntilSuddenTerminationIsEnabled(Seconds(5)));
  disableSuddenTermination();
  tests::Latch done;
  bool enabled = false;
  std::thread waiter([&] {
    enabled = waitUntilSuddenTerminationIsEnabled(Seconds(5));
    done.open();
  });
  environment.clock().waitForSleepers(1);
  enableSuddenTermination();
  waiter.join();
  EXPECT_TRUE(enabled);
}

TEST(SuddenTermination, IsWaitedForNoLongerThanAllowed) {
  tests::TestEnvironment environment;
  disableSuddenTermination();
  bool enabled = true;
  std::thread waiter([&] { enabled = waitUntilSuddenTerminationIsEnabled(Seconds(5)); });
  environment.clock().waitForSleepers(1);
  environment.clock().advance(Seconds(6));
  waiter.join();
  EXPECT_FALSE(enabled);
  enableSuddenTermination();
}

}  // namespace
