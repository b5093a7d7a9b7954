#include "platform/Clock.h"

#include <algorithm>
#include <set>
#include <thread>
#include <utility>

namespace platform {

namespace {

class SystemClock final : public Clock {
 public:
  std::chrono::system_clock::time_point now() const override {
    return std::chrono::system_clock::now();
  }

  Instant elapsed() const override { return std::chrono::steady_clock::now().time_since_epoch(); }

  void sleep(Seconds duration) override {
    // In pieces: the machine's clock cannot count to every number that a double holds.
    constexpr Seconds piece = std::chrono::hours(1);
    for (; duration > piece; duration -= piece) {
      std::this_thread::sleep_for(piece);
    }
    if (duration > Seconds::zero()) {
      std::this_thread::sleep_for(duration);
    }
  }

  std::optional<Seconds> realTimeUntil(Instant deadline) const override {
    return std::max(Seconds::zero(), deadline - elapsed());
  }

  void addListener(std::weak_ptr<ClockListener> /*listener*/) override {}
};

/// The identifiers of threads that slept and have ended, until another thread sleeps that has got
/// one of them: what was counted for the former is not the latter's. Thread-safety: internally
/// synchronised.
class EndedThreads {
 public:
  static EndedThreads& shared() {
    // Threads end after everything else.
    static auto* const threads = new EndedThreads;  // NOLINT(cppcoreguidelines-owning-memory)
    return *threads;
  }

  bool contains(std::thread::id thread) const {
    const std::lock_guard lock(_mutex);
    return _threads.contains(thread);
  }
  void add(std::thread::id thread) {
    const std::lock_guard lock(_mutex);
    _threads.insert(thread);
  }
  void remove(std::thread::id thread) {
    const std::lock_guard lock(_mutex);
    _threads.erase(thread);
  }

 private:
  mutable std::mutex _mutex;
  std::set<std::thread::id> _threads;
};

/// Lives as long as its thread.
struct LifeOfThread {
  LifeOfThread() { EndedThreads::shared().remove(std::this_thread::get_id()); }
  ~LifeOfThread() { EndedThreads::shared().add(std::this_thread::get_id()); }
  LifeOfThread(const LifeOfThread&) = delete;
  LifeOfThread& operator=(const LifeOfThread&) = delete;

  bool hasSlept = false;
};

}  // namespace

std::shared_ptr<Clock> systemClock() {
  static const auto clock = std::make_shared<SystemClock>();
  return clock;
}

SimulatedClock::SimulatedClock(std::chrono::system_clock::time_point start) : _now(start) {}

std::chrono::system_clock::time_point SimulatedClock::now() const {
  const std::lock_guard lock(_mutex);
  return _now;
}

Clock::Instant SimulatedClock::elapsed() const {
  const std::lock_guard lock(_mutex);
  return _elapsed;
}

void SimulatedClock::sleep(Seconds duration) {
  if (duration <= Seconds::zero()) {
    return;
  }
  std::unique_lock lock(_mutex);
  const Instant deadline = _elapsed + duration;
  _beginSleep();
  _moved.wait(lock, [&] { return _elapsed >= deadline; });
  --_sleepers;
}

std::optional<Seconds> SimulatedClock::realTimeUntil(Instant deadline) const {
  return elapsed() >= deadline ? std::optional<Seconds>(Seconds::zero()) : std::nullopt;
}

void SimulatedClock::addListener(std::weak_ptr<ClockListener> listener) {
  const std::lock_guard lock(_mutex);
  std::erase_if(_listeners, [&](const auto& known) {
    const bool same = !known.owner_before(listener) && !listener.owner_before(known);
    return same || known.expired();
  });
  _listeners.push_back(std::move(listener));
}

void SimulatedClock::timedWaitBegins() {
  const std::lock_guard lock(_mutex);
  _beginSleep();
}

void SimulatedClock::_beginSleep() {
  ++_sleepers;
  thread_local LifeOfThread life;
  size_t& count = _sleepsBegun[std::this_thread::get_id()];
  count = std::exchange(life.hasSlept, true) ? count + 1 : 1;
  _sleepersChanged.notify_all();
}

void SimulatedClock::timedWaitEnds() {
  const std::lock_guard lock(_mutex);
  --_sleepers;
}

void SimulatedClock::advance(Seconds duration) {
  std::vector<std::weak_ptr<ClockListener>> listeners;
  {
    const std::lock_guard lock(_mutex);
    _elapsed += duration;
    _now += std::chrono::duration_cast<std::chrono::system_clock::duration>(duration);
    _moved.notify_all();
    listeners = _listeners;
  }
  for (const auto& weak : listeners) {
    if (const auto listener = weak.lock()) {
      listener->clockMoved();
    }
  }
}

void SimulatedClock::setNow(std::chrono::system_clock::time_point now) {
  const std::lock_guard lock(_mutex);
  _now = now;
}

size_t SimulatedClock::sleeperCount() const {
  const std::lock_guard lock(_mutex);
  return _sleepers;
}

void SimulatedClock::waitForSleepers(size_t count) {
  std::unique_lock lock(_mutex);
  _sleepersChanged.wait(lock, [&] { return _sleepers >= count; });
}

void SimulatedClock::waitForSleepOf(std::thread::id thread, size_t count) {
  std::unique_lock lock(_mutex);
  _sleepersChanged.wait(lock, [&] {
    return _sleepsBegun[thread] >= count && !EndedThreads::shared().contains(thread);
  });
}

}  // namespace platform
