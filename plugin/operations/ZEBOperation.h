// Base of operations whose work finishes later than the call that starts it.
#pragma once

#include <functional>
#include <optional>

#include "platform/Error.h"
#include "platform/Operation.h"
#include "platform/ThreadSafety.h"

/// An operation that ends when somebody calls finishWithError() or cancel(), on whatever thread
/// that is. A subclass supplies main(), begins its asynchronous work there, and sees to it that
/// exactly one of the two is called when the work is over. It keeps its own flags behind one lock
/// and announces every change of them under the key names that an operation queue observes; the
/// lock is held around the assignments alone, never while an observer runs.
///
/// There is no guard against ending twice: the second call stores its error and repeats the
/// announcements.
/// Thread-safety: internally synchronised.
class ZEBOperation : public platform::Operation {
 public:
  /// Runs `block` under the operation's lock. The lock is not recursive: the block must not call
  /// anything of the operation.
  void lockExec(const std::function<void()>& block) const;

  /// Ends the operation with an outcome; absent is success.
  void finishWithError(std::optional<platform::Error> error);

  /// Marks the operation as cancelled and over, at once and in whatever state it is. It does not
  /// stop the work of a subclass; one that owns such work overrides this.
  void cancel() override;

  /// Finishes an operation that was cancelled before; otherwise marks it as executing and calls
  /// main() on this thread. The operation goes on after the return.
  void start() override;

  bool isAsynchronous() const override { return true; }
  bool isExecuting() const override;
  bool isFinished() const override;
  bool isCancelled() const override;

  std::optional<platform::Error> error() const;
  void setError(std::optional<platform::Error> error);

 protected:
  ZEBOperation() = default;

 private:
  // The innermost of all locks: nothing is called while it is held.
  mutable platform::Mutex _lock;
  std::optional<platform::Error> _error;
  bool _executing = false;
  bool _finished = false;
  bool _cancelled = false;
};
