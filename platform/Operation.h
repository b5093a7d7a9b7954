// A unit of work that an operation queue can run, observe and cancel.
#pragma once

#include <atomic>
#include <functional>
#include <memory>
#include <string_view>
#include <vector>

#include "platform/Condition.h"
#include "platform/KeyValueObserving.h"
#include "platform/ThreadSafety.h"

namespace platform {

inline constexpr const char* isExecutingKey = "isExecuting";
inline constexpr const char* isFinishedKey = "isFinished";
inline constexpr const char* isCancelledKey = "isCancelled";

/// Base of all operations. As it stands it is a synchronous one: start() runs main() on the calling
/// thread and the operation is finished when main() returns. A subclass whose work goes on after
/// that overrides start() and the state functions and announces the changes of its state under the
/// key names above; a queue goes by these announcements. An exception that leaves main() is logged
/// at level 0 and the operation counts as finished. Thread-safety: internally synchronised.
class Operation : public KeyValueObservable, public std::enable_shared_from_this<Operation> {
 public:
  enum class Priority { veryLow = -8, low = -4, normal = 0, high = 4, veryHigh = 8 };

  ~Operation() override;

  /// Runs the operation; one that is cancelled already finishes without running main(). Does
  /// nothing on one that was started before.
  virtual void start();
  /// The work.
  virtual void main() {}
  /// Asks the operation to end early: one that has not started will not run; one that is running
  /// goes on unless its main() looks at isCancelled().
  virtual void cancel();

  virtual bool isExecuting() const;
  virtual bool isFinished() const;
  virtual bool isCancelled() const;
  virtual bool isAsynchronous() const { return false; }

  /// Whether nothing keeps it from starting: all dependencies have finished, or it is cancelled.
  bool isReady() const;
  /// From now on it waits for `operation` to finish, on whatever queue that is.
  void addDependency(const std::shared_ptr<Operation>& operation);
  std::vector<std::shared_ptr<Operation>> dependencies() const;

  Priority queuePriority() const { return _priority; }
  void setQueuePriority(Priority priority) { _priority = priority; }

  /// Runs once, on some thread, after the operation has finished.
  void setCompletionBlock(std::function<void()> block);

  /// Blocks until the operation has finished.
  void waitUntilFinished();

  Value valueForKey(std::string_view key) const override;

 protected:
  Operation();

 private:
  friend class OperationQueue;
  class StateObserver;

  /// Calls `handler` once the operation has finished; at once when it has already.
  void _whenFinished(std::function<void()> handler);
  /// Calls `handler` whenever isReady() may have become true.
  void _whenReadinessChanges(std::function<void()> handler);
  void _announceReadiness();
  void _stateDidChange(std::string_view key);
  void _finishWasSeen();
  /// Whether others need not wait for it any more: it says so, or the platform has ended it.
  bool _isOver() const;
  /// An operation whose start() threw never announces its end; this ends it for the platform,
  /// whatever its flags say.
  void _endAfterException() { _finishWasSeen(); }

  mutable Mutex _operationMutex;
  Condition _finishedCondition;
  bool _executing GUARDED_BY(_operationMutex) = false;
  bool _finished GUARDED_BY(_operationMutex) = false;
  bool _cancelled GUARDED_BY(_operationMutex) = false;
  bool _started GUARDED_BY(_operationMutex) = false;
  bool _finishSeen GUARDED_BY(_operationMutex) = false;
  std::vector<std::shared_ptr<Operation>> _dependencies GUARDED_BY(_operationMutex);
  std::function<void()> _completionBlock GUARDED_BY(_operationMutex);
  std::vector<std::function<void()>> _finishHandlers GUARDED_BY(_operationMutex);
  std::vector<std::function<void()>> _readinessHandlers GUARDED_BY(_operationMutex);
  bool _queued GUARDED_BY(_operationMutex) = false;
  std::atomic<Priority> _priority{Priority::normal};
  std::shared_ptr<StateObserver> _stateObserver;
};

/// An operation whose work is a block.
class BlockOperation : public Operation {
 public:
  static std::shared_ptr<BlockOperation> blockOperationWithBlock(std::function<void()> block);
  void main() override;

 protected:
  explicit BlockOperation(std::function<void()> block);

 private:
  std::function<void()> _block;
};

}  // namespace platform
