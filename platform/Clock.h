// Time as a seam: everything that asks for the time or lets it pass goes through a Clock.
#pragma once

#include <chrono>
#include <condition_variable>
#include <map>
#include <memory>
#include <mutex>
#include <optional>
#include <thread>
#include <vector>

namespace platform {

/// Seconds, as a double: the unit of every interval and time-out in this system.
using Seconds = std::chrono::duration<double>;

/// Hears that time moved by leaps, which only a simulated clock's does: whoever waits for a point
/// in time looks at the clock again. Called on the thread that moves the clock, with no lock held.
class ClockListener {
 public:
  virtual ~ClockListener() = default;
  virtual void clockMoved() noexcept = 0;
};

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

  // For those who wait for a point in time or for something else, whichever comes first
  // (Condition, RunLoop); everybody else sleeps.

  /// The longest that a wait for `deadline` may block the machine before it looks at elapsed()
  /// again: the time that is left, or absent where only clockMoved() can end the wait.
  virtual std::optional<Seconds> realTimeUntil(Instant deadline) const = 0;

  /// From now on `listener` hears of leaps, as long as it lives.
  virtual void addListener(std::weak_ptr<ClockListener> listener) = 0;

  /// Bracket every such wait, so that a test can see that it has begun.
  virtual void timedWaitBegins() {}
  virtual void timedWaitEnds() {}
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
  std::optional<Seconds> realTimeUntil(Instant deadline) const override;
  void addListener(std::weak_ptr<ClockListener> listener) override;
  void timedWaitBegins() override;
  void timedWaitEnds() override;

  /// Moves the time of day and the elapsed time forward together and wakes who is due.
  void advance(Seconds duration);

  /// Moves only the time of day, forwards or backwards, as a user who sets the clock does.
  void setNow(std::chrono::system_clock::time_point now);

  /// How many threads are in sleep() or in a timed wait: lets a test advance at the right moment.
  size_t sleeperCount() const;

  /// Blocks, in real time, until at least `count` threads are in sleep() or in a timed wait.
  void waitForSleepers(size_t count);

  /// Blocks, in real time, until the thread has begun so many sleeps and timed waits in all. Others
  /// may sleep meanwhile. What advance() does from then on counts for the last of them.
  void waitForSleepOf(std::thread::id thread, size_t count);

 private:
  void _beginSleep();

  mutable std::mutex _mutex;
  std::condition_variable _moved;
  std::condition_variable _sleepersChanged;
  std::chrono::system_clock::time_point _now;
  Instant _elapsed{0};
  size_t _sleepers = 0;
  std::map<std::thread::id, size_t> _sleepsBegun;
  std::vector<std::weak_ptr<ClockListener>> _listeners;
};

}  // namespace platform
