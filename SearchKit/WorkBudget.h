// How long a call may go on.
#pragma once

#include <cmath>
#include <cstddef>

#include "platform/Clock.h"

namespace searchkit {

/// Counts work and looks at the clock now and then. The first look comes only after some work, so
/// that a call gets on however little time it is given. Thread-safety: confined to one thread.
class WorkBudget {
 public:
  /// Postings, positions and dictionary entries between two looks at the clock: some ten to thirty
  /// microseconds.
  static constexpr size_t unitsPerLook = 4096;

  /// The clock must outlive the budget. What is no number is no time.
  WorkBudget(const platform::Clock& clock, double seconds)
      : _clock(&clock),
        _deadline(clock.elapsed() + platform::Seconds(std::isnan(seconds) ? 0 : seconds)) {}

  /// For work known to end before the first look: no clock is asked.
  WorkBudget() = default;

  /// Whether there is time for more after this.
  bool spend(size_t units) {
    _units += units;
    if (_units >= unitsPerLook) {
      _units = 0;
      _isSpent = _isSpent || (_clock != nullptr && _clock->elapsed() >= _deadline);
    }
    return !_isSpent;
  }

  bool isSpent() const noexcept { return _isSpent; }

 private:
  const platform::Clock* _clock = nullptr;
  platform::Clock::Instant _deadline{};
  size_t _units = 0;
  bool _isSpent = false;
};

}  // namespace searchkit
