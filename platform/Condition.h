// Waiting for something to become true, on the replaceable clock.
#pragma once

#include <functional>
#include <memory>

#include "platform/Clock.h"
#include "platform/ThreadSafety.h"

namespace platform {

/// A condition variable for a Mutex whose timed waits go by Environment's clock, so that a
/// simulated clock can end them. Thread-safety: internally synchronised.
class Condition {
 public:
  Condition();
  ~Condition();
  Condition(const Condition&) = delete;
  Condition& operator=(const Condition&) = delete;

  /// Gives `mutex` back while it waits and holds it again on return. Like every condition variable
  /// it may return early; callers test what they wait for in a loop.
  void wait(Mutex& mutex) REQUIRES(mutex);

  /// As wait(), until `deadline` of the clock at the latest. Returns false once that is reached.
  bool waitUntil(Mutex& mutex, Clock::Instant deadline) REQUIRES(mutex);

  void notifyAll();

 private:
  struct State;
  std::shared_ptr<State> _state;
};

}  // namespace platform
