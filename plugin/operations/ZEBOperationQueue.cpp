#include "plugin/operations/ZEBOperationQueue.h"

#include <utility>

#include "platform/DispatchQueue.h"

using platform::operationCountKey;

std::shared_ptr<ZEBOperationQueueCountObserver> ZEBOperationQueueCountObserver::init() {
  return initWithQueue(nullptr);
}

std::shared_ptr<ZEBOperationQueueCountObserver> ZEBOperationQueueCountObserver::initWithQueue(
    const std::shared_ptr<ZEBOperationQueue>& queue) {
  std::shared_ptr<ZEBOperationQueueCountObserver> observer(new ZEBOperationQueueCountObserver);
  observer->setOperationQueue(queue);
  return observer;
}

ZEBOperationQueueCountObserver::~ZEBOperationQueueCountObserver() {
  const std::shared_ptr<ZEBOperationQueue> queue = operationQueue();
  if (completionBlock() && queue != nullptr) {
    queue->removeObserver(this, operationCountKey);
  }
}

ZEBOperationQueueCountObserver::Block ZEBOperationQueueCountObserver::completionBlock() const {
  const platform::MutexLock lock(_propertiesMutex);
  return _completionBlock == nullptr ? Block() : *_completionBlock;
}

void ZEBOperationQueueCountObserver::setCompletionBlock(Block block) {
  // The former block is destroyed outside the lock: what it captured may call back.
  auto replacement = block ? std::make_shared<const Block>(std::move(block)) : nullptr;
  const platform::MutexLock lock(_propertiesMutex);
  _completionBlock.swap(replacement);
}

std::shared_ptr<ZEBOperationQueue> ZEBOperationQueueCountObserver::operationQueue() const {
  const platform::MutexLock lock(_propertiesMutex);
  return _operationQueue.lock();
}

void ZEBOperationQueueCountObserver::setOperationQueue(
    const std::shared_ptr<ZEBOperationQueue>& queue) {
  const platform::MutexLock lock(_propertiesMutex);
  _operationQueue = queue;
}

void ZEBOperationQueueCountObserver::observeValueForKeyPath(std::string_view keyPath,
                                                            platform::KeyValueObservable& object,
                                                            const platform::KeyValueChange& change,
                                                            void* context) {
  if (keyPath != operationCountKey) {
    KeyValueObserver::observeValueForKeyPath(keyPath, object, change, context);
    return;
  }
  platform::DispatchQueue::main()->async([self = shared_from_this(), change] {
    const uint64_t count = change.newValue.unsignedValue();
    if (count == 0 && self->_lastOperationCount != 0) {
      if (const Block block = self->completionBlock()) {
        block();
      }
    }
    self->_lastOperationCount = count;
  });
}

std::shared_ptr<ZEBOperationQueue> ZEBOperationQueue::init() {
  std::shared_ptr<ZEBOperationQueue> queue(new ZEBOperationQueue);
  queue->_attach();
  return queue;
}

ZEBOperationQueue::~ZEBOperationQueue() = default;

std::shared_ptr<ZEBOperationQueueCountObserver> ZEBOperationQueue::observer() {
  const platform::MutexLock lock(_observerMutex);
  if (_observer == nullptr) {
    _observer = ZEBOperationQueueCountObserver::initWithQueue(
        std::static_pointer_cast<ZEBOperationQueue>(shared_from_this()));
  }
  return _observer;
}

void ZEBOperationQueue::setObserver(std::shared_ptr<ZEBOperationQueueCountObserver> observer) {
  const platform::MutexLock lock(_observerMutex);
  _observer.swap(observer);
}

ZEBOperationQueue::Block ZEBOperationQueue::completionBlock() {
  return observer()->completionBlock();
}

void ZEBOperationQueue::setCompletionBlock(Block block) {
  const std::shared_ptr<ZEBOperationQueueCountObserver> countObserver = observer();
  if (countObserver->completionBlock()) {
    removeObserver(countObserver.get(), operationCountKey);
  }
  if (block) {
    addObserver(countObserver, operationCountKey, platform::keyValueObservingOptionNew);
  }
  countObserver->setCompletionBlock(std::move(block));
}
