// Runs operations on worker threads: by readiness, priority and order of arrival.
#pragma once

#include <functional>
#include <memory>
#include <string>
#include <vector>

#include "platform/KeyValueObserving.h"
#include "platform/Operation.h"

namespace platform {

inline constexpr const char* operationCountKey = "operationCount";

/// A queue of operations. Of those that are ready, the one of the highest priority starts first,
/// and among equals the one that was added first. An operation leaves the queue when it first
/// announces that it has finished, and only then.
///
/// "operationCount" can be observed: each change is announced to every observer, in the order of
/// the changes, on the thread that made the change or on one that was just announcing an earlier
/// change.
///
/// Thread-safety: internally synchronised. A queue that is dropped lets its operations run to their
/// end.
class OperationQueue : public KeyValueObservable,
                       public std::enable_shared_from_this<OperationQueue> {
 public:
  /// No fixed limit: as many operations run as there is work for.
  static constexpr long defaultMaxConcurrentOperationCount = -1;

  static std::shared_ptr<OperationQueue> init();
  ~OperationQueue() override;

  /// Throws Exception "InvalidArgumentException" for an operation that is in a queue, was in one,
  /// or has finished.
  void addOperation(const std::shared_ptr<Operation>& operation);
  void addOperationWithBlock(std::function<void()> block);

  /// Cancels every operation that is in the queue now.
  void cancelAllOperations();
  /// Blocks until the queue is empty and all observers heard of it, but for one that calls this
  /// when told that an operation has left. Never call it from an operation of the queue itself, nor
  /// from an observer that is told of an addition: what was added starts after that.
  void waitUntilAllOperationsAreFinished();

  /// Waiting and running operations, in the order in which they were added.
  std::vector<std::shared_ptr<Operation>> operations() const;
  size_t operationCount() const;

  /// How many operations wait or run in all queues of the process: zero where nothing is under way.
  static size_t unfinishedOperationCount() noexcept;

  /// How many may run at once from now on; running ones are not stopped.
  void setMaxConcurrentOperationCount(long count);
  long maxConcurrentOperationCount() const;

  void setName(std::string name);
  std::string name() const;

  Value valueForKey(std::string_view key) const override;

 protected:
  OperationQueue();
  /// Must follow the construction of the shared object; every init() calls it.
  void _attach();

 private:
  struct Implementation;
  std::shared_ptr<Implementation> _implementation;
};

}  // namespace platform
