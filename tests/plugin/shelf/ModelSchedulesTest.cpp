// Randomised runs of the plug-in with its models; see ScheduleRunner.h for how to replay one.
#include <gtest/gtest.h>

#include "tests/plugin/shelf/ModelSchedule.h"
#include "tests/plugin/shelf/ScheduleRunner.h"

TEST(ModelSchedules, leaveNoModelHeldABalancedGuardAndModelsThatAnswer) {
  const tests::ModelScheduleGround ground;
  tests::runSchedules(1000, std::chrono::seconds(8),
                      [&](uint64_t seed) { return tests::runModelSchedule(seed, ground); });
}
