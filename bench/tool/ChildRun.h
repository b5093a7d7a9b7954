// Programs that are run to their end and measured.
#pragma once

#include <cstddef>
#include <cstdint>
#include <string>
#include <vector>

namespace bench {

struct Measured {
  double seconds = 0;
  /// Of all its threads.
  double processorSeconds = 0;
  uint64_t peakBytes = 0;
};

/// Runs a program on the first `cores` processors that this one may use, with its output thrown
/// away. Throws std::runtime_error when it cannot be run or fails.
Measured runToEnd(const std::vector<std::string>& words, size_t cores);

/// How many processors this program may use.
size_t availableCores();

}  // namespace bench
