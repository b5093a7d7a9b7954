// Thousands of randomised runs of the shelf; see ScheduleRunner.h for how to replay one.
#include <gtest/gtest.h>

#include "tests/plugin/shelf/Schedule.h"
#include "tests/plugin/shelf/ScheduleRunner.h"

TEST(Schedules, leaveAWholeShelfABalancedGuardAndAReadableCacheFile) {
  const tests::ScheduleGround ground;
  tests::runSchedules(2000, std::chrono::seconds(15),
                      [&](uint64_t seed) { return tests::runSchedule(seed, ground); });
}
