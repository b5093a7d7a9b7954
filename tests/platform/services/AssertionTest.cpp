#include "platform/Assertion.h"

#include <gtest/gtest.h>
#include <signal.h>

namespace platform {
namespace {

TEST(AssertionDeathTest, aBrokenConditionPrintsItsTextAndStopsTheProcess) {
  GTEST_FLAG_SET(death_test_style, "threadsafe");
  EXPECT_EXIT(assertCondition(false, "sema != NULL"), ::testing::KilledBySignal(SIGABRT),
              "^Assertion failed: sema != NULL\n");
}

TEST(AssertionDeathTest, failingPrintsPercentSignsAsTheyAre) {
  GTEST_FLAG_SET(death_test_style, "threadsafe");
  EXPECT_EXIT(failAssertion("100%n %s"), ::testing::KilledBySignal(SIGABRT),
              "Assertion failed: 100%n %s\n");
}

TEST(Assertion, aConditionThatHoldsDoesNothing) { assertCondition(true, "never printed"); }

}  // namespace
}  // namespace platform
