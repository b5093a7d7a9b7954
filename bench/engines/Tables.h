// The measurements, each a table of Markdown on standard output.
#pragma once

#include <string>
#include <vector>

#include "bench/engines/Questions.h"

namespace engines {

struct Settings {
  std::string corpus;
  /// For the files of indexes; made and reused.
  std::string folder;
  size_t questionCount = 200;
  uint32_t seed = 1;
  /// Which of "engine", "plugin", "letters", "opening", "size", "building", "memory"; all when
  /// empty.
  std::vector<std::string> tables;
};

void printTables(const Settings& settings);

}  // namespace engines
