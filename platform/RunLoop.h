// Event loops: blocks and timers that run on one thread, in order.
#pragma once

#include <functional>
#include <memory>

#include "platform/Clock.h"

namespace platform {

/// A timer of one run loop. Dropping the last reference does not stop it: the loop keeps it until
/// it has fired (or, repeating, until it is invalidated).
class Timer {
 public:
  virtual ~Timer() = default;
  /// It never fires again. From any thread; a firing under way on the loop's thread is not waited
  /// for.
  virtual void invalidate() = 0;
  virtual bool isValid() const = 0;
};

/// The event loop of one thread. Blocks handed to perform() run in the order given; timers fire, on
/// Environment's clock, in the order of their due times, no earlier than due. Nothing ever runs
/// unless the thread runs its loop: a loop that is never run never fires its timers. What a block
/// or timer throws is logged at level 0 and ends that block only. Thread-safety: internally
/// synchronised, but the run… calls belong to the loop's thread.
class RunLoop {
 public:
  using Block = std::function<void()>;

  /// The loop of the calling thread, made on first use; main() on the main thread.
  static std::shared_ptr<RunLoop> current();
  /// The loop of the thread on which the process started; it also serves DispatchQueue::main().
  static std::shared_ptr<RunLoop> main();

  RunLoop();
  ~RunLoop();
  RunLoop(const RunLoop&) = delete;
  RunLoop& operator=(const RunLoop&) = delete;

  void perform(Block block);

  /// Runs `block` once, `delay` seconds from now.
  std::shared_ptr<Timer> performAfterDelay(Seconds delay, Block block);
  /// Runs `block` every `interval` seconds, first after one interval.
  std::shared_ptr<Timer> scheduleRepeatingTimer(Seconds interval, Block block);

  /// Runs blocks and timers as they come due, until stop().
  void run();
  /// As run(), for `duration` of the clock at most.
  void runFor(Seconds duration);
  /// Runs what is due now and returns how many blocks and timers that were.
  size_t runPending();
  /// Makes the run() under way, or else the next one, return after the block it is in.
  void stop();

 private:
  struct Implementation;
  std::shared_ptr<Implementation> _implementation;
};

}  // namespace platform
