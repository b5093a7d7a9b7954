// One randomised run of the whole plug-in with its models: searches, builds, preload,
// synchronisation, books that come and go, and a world in which things fail.
#pragma once

#include <cstdint>
#include <map>
#include <string>
#include <vector>

#include "platform/Data.h"

namespace tests {

/// What all these schedules begin with: books' index files and the models of an earlier process;
/// made once.
class ModelScheduleGround {
 public:
  ModelScheduleGround();
  ~ModelScheduleGround();
  ModelScheduleGround(const ModelScheduleGround&) = delete;
  ModelScheduleGround& operator=(const ModelScheduleGround&) = delete;

  const std::string& path() const { return _path; }
  /// What the tool makes of a book, by the path of the index that it is to write.
  platform::Data indexAtPath(const std::string& path) const;

 private:
  std::string _path;
  std::map<std::string, platform::Data> _indexes;
};

/// Runs the schedule of a seed: what every thread does, what fails and when, and how time passes.
/// Only the interleaving of the threads is left to the machine. Returns what was wrong afterwards,
/// a line each; nothing is the rule.
std::vector<std::string> runModelSchedule(uint64_t seed, const ModelScheduleGround& ground);

}  // namespace tests
