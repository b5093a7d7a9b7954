// Time that passes more quickly, so that a program need not wait as long as a person would.
#pragma once

#include <thread>

#include "platform/Clock.h"

namespace tests {

/// The machine's time, `factor` times as fast. Thread-safety: immutable.
class QuickClock : public platform::Clock {
 public:
  explicit QuickClock(double factor) : _factor(factor) {}

  std::chrono::system_clock::time_point now() const override { return _machine->now(); }
  Instant elapsed() const override { return _machine->elapsed() * _factor; }
  void sleep(platform::Seconds duration) override {
    std::this_thread::sleep_for(duration / _factor);
  }
  std::optional<platform::Seconds> realTimeUntil(Instant deadline) const override {
    return deadline > elapsed() ? (deadline - elapsed()) / _factor : platform::Seconds::zero();
  }
  void addListener(std::weak_ptr<platform::ClockListener>) override {}

 private:
  const std::shared_ptr<platform::Clock> _machine = platform::systemClock();
  const double _factor;
};

}  // namespace tests
