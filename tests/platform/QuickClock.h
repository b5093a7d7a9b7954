// Time that passes more quickly, so that a program need not wait as long as a person would.
#pragma once

#include <algorithm>
#include <chrono>
#include <mutex>
#include <thread>

#include "platform/Clock.h"
#include "tests/platform/OtherThreads.h"

namespace tests {

/// The machine's time, `factor` times as fast; but it stands still while other threads have work to
/// do, or a busy machine would make a span of quiet of what is a wait for a processor.
/// Thread-safety: internally synchronised.
class QuickClock : public platform::Clock {
 public:
  explicit QuickClock(double factor) : _factor(factor), _last(_machine->elapsed()) {}

  std::chrono::system_clock::time_point now() const override { return _machine->now(); }

  Instant elapsed() const override {
    const std::lock_guard lock(_mutex);
    const Instant now = _machine->elapsed();
    if (now - _last >= shortestLook) {
      // Who is never at rest does not keep the time from passing for ever.
      const bool isPassing = _otherThreads.areBlocked() || now - _lastRest > patience;
      _elapsed += isPassing ? std::min<Instant>((now - _last) * _factor, longestStep) : Instant(0);
      _lastRest = isPassing ? now : _lastRest;
      _last = now;
    }
    return _elapsed;
  }

  void sleep(platform::Seconds duration) override {
    std::this_thread::sleep_for(duration / _factor);
  }

  std::optional<platform::Seconds> realTimeUntil(Instant deadline) const override {
    const Instant now = elapsed();
    return deadline > now ? std::max<platform::Seconds>((deadline - now) / _factor, shortestLook)
                          : platform::Seconds::zero();
  }

  void addListener(std::weak_ptr<platform::ClockListener>) override {}

 private:
  static constexpr Instant shortestLook{0.0005};
  /// What lies between two looks may have been work: so much time passes at most.
  static constexpr Instant longestStep{0.05};
  static constexpr Instant patience{0.5};

  const std::shared_ptr<platform::Clock> _machine = platform::systemClock();
  const double _factor;
  mutable std::mutex _mutex;
  mutable OtherThreads _otherThreads;
  mutable Instant _elapsed{0};
  mutable Instant _last;
  mutable Instant _lastRest{0};
};

}  // namespace tests
