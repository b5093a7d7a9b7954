// One randomised run of the shelf: many threads, a main loop, and a world in which things fail.
#pragma once

#include <cstdint>
#include <string>
#include <vector>

namespace tests {

/// Folders and files that all schedules read and none writes; made once.
class ScheduleGround {
 public:
  ScheduleGround();
  ~ScheduleGround();
  ScheduleGround(const ScheduleGround&) = delete;
  ScheduleGround& operator=(const ScheduleGround&) = delete;

  const std::string& path() const { return _path; }

 private:
  std::string _path;
};

/// Runs the schedule of a seed: what every thread does, what fails and when, what the tool and the
/// clock are up to. Only the interleaving of the threads is left to the machine. Returns what was
/// wrong afterwards, a line each; nothing is the rule.
std::vector<std::string> runSchedule(uint64_t seed, const ScheduleGround& ground);

}  // namespace tests
