#include "platform/RunLoop.h"

#include <deque>
#include <map>
#include <utility>

#include "platform/Condition.h"
#include "platform/Environment.h"
#include "platform/WorkerThreads.h"

namespace platform {

namespace {

Clock::Instant elapsedNow() { return Environment::current()->clock->elapsed(); }

}  // namespace

struct RunLoop::Implementation : std::enable_shared_from_this<Implementation> {
  struct LoopTimer;
  using Due = std::multimap<Clock::Instant, std::shared_ptr<LoopTimer>>;

  struct LoopTimer : Timer {
    std::weak_ptr<Implementation> loop;
    Block block;
    Seconds interval{0};  // zero: once
    bool valid = true;    // guarded by the loop's mutex

    void invalidate() override {
      if (const auto owner = loop.lock()) {
        owner->forget(*this);
      }
    }

    bool isValid() const override {
      const auto owner = loop.lock();
      if (owner == nullptr) {
        return false;
      }
      const MutexLock lock(owner->mutex);
      return valid;
    }
  };

  Mutex mutex;
  Condition changed;
  std::deque<Block> blocks GUARDED_BY(mutex);
  Due timers GUARDED_BY(mutex);
  bool stopRequested GUARDED_BY(mutex) = false;

  std::shared_ptr<Timer> schedule(Seconds delay, Seconds interval, Block block) {
    auto timer = std::make_shared<LoopTimer>();
    timer->loop = weak_from_this();
    timer->block = std::move(block);
    timer->interval = interval;
    const Clock::Instant due = elapsedNow() + delay;
    {
      const MutexLock lock(mutex);
      timers.emplace(due, timer);
    }
    changed.notifyAll();
    return timer;
  }

  void forget(LoopTimer& timer) {
    const MutexLock lock(mutex);
    timer.valid = false;
    for (auto entry = timers.begin(); entry != timers.end(); ++entry) {
      if (entry->second.get() == &timer) {
        timers.erase(entry);
        break;
      }
    }
  }

  /// Takes the next block or timer that is due. Blocks come first: they are due at once.
  bool takeDue(Block& work) REQUIRES(mutex) {
    if (!blocks.empty()) {
      work = std::move(blocks.front());
      blocks.pop_front();
      return true;
    }
    const auto first = timers.begin();
    if (first == timers.end() || first->first > elapsedNow()) {
      return false;
    }
    const std::shared_ptr<LoopTimer> timer = first->second;
    const Clock::Instant due = first->first;
    timers.erase(first);
    work = timer->block;
    if (timer->interval > Seconds::zero()) {
      // A loop that was kept busy for several intervals fires once, not once for each.
      const double missed = (elapsedNow() - due) / timer->interval;
      timers.emplace(
          due + timer->interval * (1 + static_cast<double>(static_cast<int64_t>(missed))), timer);
    } else {
      timer->valid = false;
    }
    return true;
  }

  bool runOne() {
    Block work;
    {
      const MutexLock lock(mutex);
      if (!takeDue(work)) {
        return false;
      }
    }
    runLoggingExceptions(work);
    return true;
  }

  /// Waits until something may be due, `deadline` is reached, or a stop is asked for.
  void waitForWork(const Clock::Instant* deadline) {
    const MutexLock lock(mutex);
    if (!blocks.empty() || stopRequested) {
      return;
    }
    if (timers.empty() && deadline == nullptr) {
      changed.wait(mutex);
      return;
    }
    Clock::Instant until = timers.empty() ? *deadline : timers.begin()->first;
    if (deadline != nullptr) {
      until = std::min(until, *deadline);
    }
    changed.waitUntil(mutex, until);
  }

  bool takeStopRequest() {
    const MutexLock lock(mutex);
    return std::exchange(stopRequested, false);
  }
};

RunLoop::RunLoop() : _implementation(std::make_shared<Implementation>()) {}
RunLoop::~RunLoop() = default;

std::shared_ptr<RunLoop> RunLoop::main() {
  // Never destroyed: worker threads may hand it blocks while the process ends.
  static const auto& loop = *new auto(std::make_shared<RunLoop>());
  return loop;
}

std::shared_ptr<RunLoop> RunLoop::current() {
  if (isMainThread()) {
    return main();
  }
  thread_local const auto loop = std::make_shared<RunLoop>();
  return loop;
}

void RunLoop::perform(Block block) {
  {
    const MutexLock lock(_implementation->mutex);
    _implementation->blocks.push_back(std::move(block));
  }
  _implementation->changed.notifyAll();
}

std::shared_ptr<Timer> RunLoop::performAfterDelay(Seconds delay, Block block) {
  return _implementation->schedule(delay, Seconds::zero(), std::move(block));
}

std::shared_ptr<Timer> RunLoop::scheduleRepeatingTimer(Seconds interval, Block block) {
  return _implementation->schedule(interval, interval, std::move(block));
}

void RunLoop::run() {
  while (!_implementation->takeStopRequest()) {
    if (!_implementation->runOne()) {
      _implementation->waitForWork(nullptr);
    }
  }
}

void RunLoop::runFor(Seconds duration) {
  const Clock::Instant deadline = elapsedNow() + duration;
  while (!_implementation->takeStopRequest() && elapsedNow() < deadline) {
    if (!_implementation->runOne()) {
      _implementation->waitForWork(&deadline);
    }
  }
}

size_t RunLoop::runPending() {
  size_t count = 0;
  while (_implementation->runOne()) {
    ++count;
  }
  return count;
}

void RunLoop::stop() {
  {
    const MutexLock lock(_implementation->mutex);
    _implementation->stopRequested = true;
  }
  _implementation->changed.notifyAll();
}

}  // namespace platform
