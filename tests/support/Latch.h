// Waiting in tests for what other threads do: for the state itself, never for a time.
#pragma once

#include <chrono>
#include <condition_variable>
#include <mutex>

namespace tests {

/// How long a test waits for something that is bound to happen, before it fails. Only a mistake
/// ever waits that long.
inline constexpr std::chrono::seconds patience{60};

/// A count that only grows. Thread-safety: internally synchronised.
class Counter {
 public:
  void add() {
    // Notified under the lock: who waited may destroy the counter at once.
    const std::lock_guard lock(_mutex);
    ++_count;
    _changed.notify_all();
  }
  size_t count() const {
    const std::lock_guard lock(_mutex);
    return _count;
  }
  /// Waits until the count is at least `count`; false when patience is at its end.
  bool waitFor(size_t count) const {
    std::unique_lock lock(_mutex);
    return _changed.wait_for(lock, patience, [&] { return _count >= count; });
  }

 private:
  mutable std::mutex _mutex;
  mutable std::condition_variable _changed;
  size_t _count = 0;
};

/// Something that happens once. Thread-safety: internally synchronised.
class Latch {
 public:
  void open() { _counter.add(); }
  bool isOpen() const { return _counter.count() > 0; }
  /// False when patience is at its end.
  bool wait() const { return _counter.waitFor(1); }

 private:
  Counter _counter;
};

}  // namespace tests
