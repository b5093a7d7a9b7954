// An operation queue that tells when it has drained.
#pragma once

#include <functional>
#include <memory>

#include "platform/OperationQueue.h"
#include "platform/ThreadSafety.h"

class ZEBOperationQueue;

/// Watches a queue's operation count and calls a block on the main queue whenever the count falls
/// from another value to zero. It observes only while the queue has it do so, see
/// ZEBOperationQueue::setCompletionBlock().
/// Thread-safety: internally synchronised; lastOperationCount() belongs to the main queue.
class ZEBOperationQueueCountObserver
    : public platform::KeyValueObserver,
      public std::enable_shared_from_this<ZEBOperationQueueCountObserver> {
 public:
  using Block = std::function<void()>;

  static std::shared_ptr<ZEBOperationQueueCountObserver> init();
  static std::shared_ptr<ZEBOperationQueueCountObserver> initWithQueue(
      const std::shared_ptr<ZEBOperationQueue>& queue);
  ~ZEBOperationQueueCountObserver() override;

  Block completionBlock() const;
  void setCompletionBlock(Block block);

  /// The queue being watched, null once it is gone.
  std::shared_ptr<ZEBOperationQueue> operationQueue() const;
  void setOperationQueue(const std::shared_ptr<ZEBOperationQueue>& queue);

  /// The count of the latest notification that was processed.
  uint64_t lastOperationCount() const { return _lastOperationCount; }
  void setLastOperationCount(uint64_t count) { _lastOperationCount = count; }

  void observeValueForKeyPath(std::string_view keyPath, platform::KeyValueObservable& object,
                              const platform::KeyValueChange& change, void* context) override;

 private:
  ZEBOperationQueueCountObserver() = default;

  // A leaf lock; the block is copied out before it is called.
  mutable platform::Mutex _propertiesMutex;
  std::shared_ptr<const Block> _completionBlock GUARDED_BY(_propertiesMutex);
  std::weak_ptr<ZEBOperationQueue> _operationQueue GUARDED_BY(_propertiesMutex);
  uint64_t _lastOperationCount = 0;
};

/// An operation queue with a block that runs on the main queue each time the number of operations
/// falls to zero. The main thread must be running its loop for that. Thread-safety: internally
/// synchronised; the block is set by one thread at a time.
class ZEBOperationQueue : public platform::OperationQueue {
 public:
  using Block = ZEBOperationQueueCountObserver::Block;

  static std::shared_ptr<ZEBOperationQueue> init();
  ~ZEBOperationQueue() override;

  /// Made on first use.
  std::shared_ptr<ZEBOperationQueueCountObserver> observer();
  /// Replaces the observer and does nothing else: observation stays as it is.
  void setObserver(std::shared_ptr<ZEBOperationQueueCountObserver> observer);

  /// The observer's block.
  Block completionBlock();
  /// The queue is observed exactly while a block is set.
  void setCompletionBlock(Block block);

  /// The monitor under which others add operations to this queue.
  platform::Monitor& monitor() RETURN_CAPABILITY(_monitor) { return _monitor; }

 private:
  ZEBOperationQueue() = default;

  platform::Monitor _monitor;
  platform::Mutex _observerMutex;
  std::shared_ptr<ZEBOperationQueueCountObserver> _observer GUARDED_BY(_observerMutex);
};
