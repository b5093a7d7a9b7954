#include "platform/DispatchQueue.h"

#include <deque>
#include <exception>
#include <utility>

#include "platform/Environment.h"
#include "platform/RunLoop.h"

namespace platform {

namespace {

/// Runs `block` through `submit` and waits for it; what it throws comes out here.
template <typename Submit>
void submitAndWait(const DispatchQueue::Block& block, Submit submit) {
  DispatchSemaphore done(0);
  std::exception_ptr thrown;
  submit([&] {
    try {
      block();
    } catch (...) {
      thrown = std::current_exception();
    }
    done.signal();
  });
  done.wait();
  if (thrown) {
    std::rethrow_exception(thrown);
  }
}

class WorkerQueue final : public DispatchQueue, public std::enable_shared_from_this<WorkerQueue> {
 public:
  WorkerQueue(std::string label, bool concurrent, ThreadPriority priority)
      : _label(std::move(label)), _concurrent(concurrent), _priority(priority) {}

  void async(Block block) override { _submit(std::move(block), !_concurrent); }

  void sync(const Block& block) override {
    submitAndWait(block, [this](Block wrapped) { async(std::move(wrapped)); });
  }

  void barrierAsync(Block block) override { _submit(std::move(block), true); }

  void barrierSync(const Block& block) override {
    submitAndWait(block, [this](Block wrapped) { barrierAsync(std::move(wrapped)); });
  }

  const std::string& label() const override { return _label; }

 private:
  struct Entry {
    Block block;
    bool alone;
  };

  void _submit(Block block, bool alone) {
    const MutexLock lock(_mutex);
    _entries.push_back({std::move(block), alone});
    _startWhatMayRun();
  }

  void _startWhatMayRun() REQUIRES(_mutex) {
    while (!_entries.empty() && !_aloneRunning && (!_entries.front().alone || _running == 0)) {
      Entry entry = std::move(_entries.front());
      _entries.pop_front();
      ++_running;
      _aloneRunning = entry.alone;
      runOnWorkerThread(
          [self = shared_from_this(), block = std::move(entry.block)]() mutable {
            runLoggingExceptions(block);
            // What the block captured goes before the next one starts.
            block = nullptr;
            self->_finished();
          },
          _priority);
    }
  }

  void _finished() {
    const MutexLock lock(_mutex);
    --_running;
    _aloneRunning = false;
    _startWhatMayRun();
  }

  const std::string _label;
  const bool _concurrent;
  const ThreadPriority _priority;
  Mutex _mutex;
  std::deque<Entry> _entries GUARDED_BY(_mutex);
  size_t _running GUARDED_BY(_mutex) = 0;
  bool _aloneRunning GUARDED_BY(_mutex) = false;
};

/// The main run loop runs one block at a time, so every block there is its own barrier.
class MainQueue final : public DispatchQueue {
 public:
  void async(Block block) override { RunLoop::main()->perform(std::move(block)); }
  void sync(const Block& block) override {
    submitAndWait(block, [this](Block wrapped) { async(std::move(wrapped)); });
  }
  void barrierAsync(Block block) override { async(std::move(block)); }
  void barrierSync(const Block& block) override { sync(block); }
  const std::string& label() const override { return _label; }

 private:
  const std::string _label = "main";
};

}  // namespace

std::shared_ptr<DispatchQueue> DispatchQueue::serial(std::string label, ThreadPriority priority) {
  return std::make_shared<WorkerQueue>(std::move(label), false, priority);
}

std::shared_ptr<DispatchQueue> DispatchQueue::concurrent(std::string label) {
  return std::make_shared<WorkerQueue>(std::move(label), true, ThreadPriority::normal);
}

std::shared_ptr<DispatchQueue> DispatchQueue::main() {
  // Neither this queue nor the next is ever destroyed: worker threads may outlast every static
  // object.
  static const auto& queue = *new auto(std::make_shared<MainQueue>());
  return queue;
}

std::shared_ptr<DispatchQueue> DispatchQueue::globalBackground() {
  static const auto& queue =
      *new auto(std::make_shared<WorkerQueue>("background", true, ThreadPriority::background));
  return queue;
}

void DispatchSemaphore::signal() {
  const MutexLock lock(_mutex);
  ++_count;
  // Notified under the lock: a waiter may destroy the semaphore as soon as it can take the lock.
  _signalled.notifyAll();
}

void DispatchSemaphore::wait() {
  const MutexLock lock(_mutex);
  while (_count == 0) {
    _signalled.wait(_mutex);
  }
  --_count;
}

bool DispatchSemaphore::wait(Seconds timeout) {
  const Clock::Instant deadline = Environment::current()->clock->elapsed() + timeout;
  const MutexLock lock(_mutex);
  while (_count == 0) {
    if (!_signalled.waitUntil(_mutex, deadline) && _count == 0) {
      return false;
    }
  }
  --_count;
  return true;
}

}  // namespace platform
