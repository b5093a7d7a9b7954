// Dispatch queues: blocks that run in order (serial), side by side (concurrent), or on the main
// thread; and a counting semaphore.
#pragma once

#include <functional>
#include <memory>
#include <string>

#include "platform/Clock.h"
#include "platform/Condition.h"
#include "platform/ThreadSafety.h"
#include "platform/WorkerThreads.h"

namespace platform {

/// A queue of blocks. Blocks start in the order in which they were submitted. On a serial queue
/// each one ends before the next starts; on a concurrent queue they overlap, but a barrier block
/// runs alone: after all that was submitted before it and before all that is submitted after it.
/// Queues run on worker threads of their own need, so a blocked queue never holds up another.
/// What an asynchronous block throws is logged at level 0; a synchronous one throws to its
/// submitter. Thread-safety: internally synchronised. A queue lives until its last block has run.
class DispatchQueue {
 public:
  using Block = std::function<void()>;

  static std::shared_ptr<DispatchQueue> serial(std::string label,
                                               ThreadPriority priority = ThreadPriority::normal);
  static std::shared_ptr<DispatchQueue> concurrent(std::string label);
  /// Runs blocks on RunLoop::main(), in order; they wait until the main thread runs its loop.
  static std::shared_ptr<DispatchQueue> main();
  /// A concurrent queue whose threads run at background priority.
  static std::shared_ptr<DispatchQueue> globalBackground();

  virtual ~DispatchQueue() = default;

  /// Submits and returns at once.
  virtual void async(Block block) = 0;
  /// Submits and waits until the block has run. Never call it on a serial queue from that queue.
  virtual void sync(const Block& block) = 0;
  virtual void barrierAsync(Block block) = 0;
  virtual void barrierSync(const Block& block) = 0;
  virtual const std::string& label() const = 0;
};

/// A counting semaphore whose timed waits go by Environment's clock.
/// Thread-safety: internally synchronised.
class DispatchSemaphore {
 public:
  explicit DispatchSemaphore(long count) : _count(count) {}

  /// Adds one, waking one waiter.
  void signal();
  /// Takes one, waiting for it as long as it takes.
  void wait();
  /// Takes one if that can be had within `timeout`; returns whether it was.
  bool wait(Seconds timeout);

 private:
  Mutex _mutex;
  Condition _signalled;
  long _count GUARDED_BY(_mutex);
};

}  // namespace platform
