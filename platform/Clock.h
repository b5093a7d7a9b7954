// Time as a seam: everything that asks for the time or lets it pass goes through a Clock.
#pragma once

#include <chrono>
#include <condition_variable>
#include <memory>
#include <mutex>

namespace platform {

/// Seconds, as a double: the unit of every interval and time-out in this system.
using Seconds = std::chrono::duration<double>;

/// Gives the time of day, elapsed time, and sleep. Thread-safety: internally synchronised.
class Clock {
 public:
  /// A point in elapsed time; never goes backwards, has no relation to the time of day.
  using Instant = std::chrono::duration<double>;

  virtual ~Clock() = default;

  /// The time of day.
  virtual std::chrono::system_clock::time_point now() const = 0;

  /// Elapsed time since some fixed point.
  virtual Instant elapsed() const = 0;

  /// Blocks the calling thread until `duration` has passed.
  virtual void sleep(Seconds duration) = 0;
};

/// The machine's own clocks.
std::shared_ptr<Clock> systemClock();

/// A clock that stands still until it is told to move. Sleepers whose time has come wake
/// during advance(). For tests.
class SimulatedClock : public Clock {
 public:
  explicit SimulatedClock(std::chrono::system_clock::time_point start = {});

  std::chrono::system_clock::time_point now() const override;
  Instant elapsed() const override;
  void sleep(Seconds duration) override;

  /// Moves the time of day and the elapsed time forward together and wakes who is due.
  void advance(Seconds duration);

  /// Moves only the time of day, forwards or backwards, as a user who sets the clock does.
  void setNow(std::chrono::system_clock::time_point now);

  /// How many threads are in sleep(): lets a test advance at the right moment.
  size_t sleeperCount() const;

  /// Blocks, in real time, until at least `count` threads are in sleep().
  void waitForSleepers(size_t count);

 private:
  mutable std::mutex _mutex;
  std::condition_variable _moved;
  std::condition_variable _sleepersChanged;
  std::chrono::system_clock::time_point _now;
  Instant _elapsed{0};
  size_t _sleepers = 0;
};

}  // namespace platform
