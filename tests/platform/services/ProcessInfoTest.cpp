#include "platform/ProcessInfo.h"

#include <gtest/gtest.h>

#include <thread>

#include "tests/platform/TestEnvironment.h"

namespace {

TEST(ProcessInfo, isOneAProcess) {
  EXPECT_EQ(platform::ProcessInfo::processInfo(), platform::ProcessInfo::processInfo());
  EXPECT_EQ(platform::ProcessInfo::processInfo()->suddenTerminationCount(), 0);
}

TEST(ProcessInfo, countsWhoDoesNotWantTheProcessToEnd) {
  platform::ProcessInfo process;
  EXPECT_TRUE(process.waitUntilSuddenTerminationIsEnabled(platform::Seconds(0)));
  process.disableSuddenTermination();
  process.disableSuddenTermination();
  process.enableSuddenTermination();
  EXPECT_EQ(process.suddenTerminationCount(), 1);
  EXPECT_FALSE(process.waitUntilSuddenTerminationIsEnabled(platform::Seconds(0)));
  process.enableSuddenTermination();
  EXPECT_TRUE(process.waitUntilSuddenTerminationIsEnabled(platform::Seconds(0)));
}

TEST(ProcessInfo, oneEndTooManyIsLeftAlone) {
  platform::ProcessInfo process;
  process.enableSuddenTermination();
  EXPECT_EQ(process.suddenTerminationCount(), 0);
  process.disableSuddenTermination();
  EXPECT_EQ(process.suddenTerminationCount(), 1);
}

TEST(ProcessInfo, aWaitEndsWithTheLastOfThemOrWithItsTime) {
  tests::TestEnvironment environment;
  platform::ProcessInfo process;
  process.disableSuddenTermination();
  bool enabled = false;
  std::thread waiter(
      [&] { enabled = process.waitUntilSuddenTerminationIsEnabled(platform::Seconds(2)); });
  environment.clock().waitForSleepers(1);
  process.enableSuddenTermination();
  waiter.join();
  EXPECT_TRUE(enabled);
  process.disableSuddenTermination();
  std::thread other(
      [&] { enabled = process.waitUntilSuddenTerminationIsEnabled(platform::Seconds(2)); });
  environment.clock().waitForSleepers(1);
  environment.clock().advance(platform::Seconds(2));
  other.join();
  EXPECT_FALSE(enabled);
}

}  // namespace
