#include "platform/Condition.h"

#include <algorithm>
#include <condition_variable>
#include <mutex>

#include "platform/Environment.h"

namespace platform {

namespace {

// A deadline may lie further away than the machine's clock can count; it is looked at again then.
constexpr Seconds longestWait{3600};

}  // namespace

// The state has a lock of its own, taken after the caller's: a notification that comes between
// giving the caller's lock back and falling asleep is seen as a new generation. The clock's leaps
// are seen the same way, so none is lost either.
struct Condition::State : ClockListener {
  std::mutex mutex;
  std::condition_variable changed;
  uint64_t generation = 0;

  void advanceGeneration() {
    const std::lock_guard lock(mutex);
    ++generation;
    changed.notify_all();
  }

  void clockMoved() noexcept override { advanceGeneration(); }
};

Condition::Condition() : _state(std::make_shared<State>()) {}
Condition::~Condition() = default;

void Condition::notifyAll() { _state->advanceGeneration(); }

void Condition::wait(Mutex& mutex) {
  std::unique_lock lock(_state->mutex);
  const uint64_t before = _state->generation;
  mutex.unlock();
  _state->changed.wait(lock, [&] { return _state->generation != before; });
  lock.unlock();
  mutex.lock();
}

bool Condition::waitUntil(Mutex& mutex, Clock::Instant deadline) {
  const std::shared_ptr<Clock> clock = Environment::current()->clock;
  clock->addListener(_state);
  std::unique_lock lock(_state->mutex);
  const uint64_t before = _state->generation;
  mutex.unlock();
  clock->timedWaitBegins();
  const auto changed = [&] { return _state->generation != before; };
  while (!changed() && clock->elapsed() < deadline) {
    const std::optional<Seconds> limit = clock->realTimeUntil(deadline);
    if (limit) {
      _state->changed.wait_for(lock, std::min(*limit, longestWait), changed);
    } else {
      _state->changed.wait(lock, changed);
    }
  }
  clock->timedWaitEnds();
  lock.unlock();
  mutex.lock();
  return clock->elapsed() < deadline;
}

}  // namespace platform
