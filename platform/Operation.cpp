#include "platform/Operation.h"

#include <algorithm>
#include <utility>

#include "platform/WorkerThreads.h"

namespace platform {

/// Goes by the announcements, as an outside observer would, so that subclasses which keep their own
/// state need to do nothing but announce it.
class Operation::StateObserver : public KeyValueObserver {
 public:
  void observeValueForKeyPath(std::string_view keyPath, KeyValueObservable& object,
                              const KeyValueChange&, void*) override {
    static_cast<Operation&>(object)._stateDidChange(keyPath);
  }
};

Operation::Operation() : _stateObserver(std::make_shared<StateObserver>()) {
  addObserver(_stateObserver, isFinishedKey);
  addObserver(_stateObserver, isCancelledKey);
}

Operation::~Operation() = default;

void Operation::start() {
  bool cancelled = false;
  {
    const MutexLock lock(_operationMutex);
    if (_started || _finished) {
      return;
    }
    _started = true;
    cancelled = _cancelled;
  }
  if (!cancelled) {
    willChangeValueForKey(isExecutingKey);
    {
      const MutexLock lock(_operationMutex);
      _executing = true;
    }
    didChangeValueForKey(isExecutingKey);
    runLoggingExceptions([this] { main(); });
  }
  willChangeValueForKey(isFinishedKey);
  willChangeValueForKey(isExecutingKey);
  {
    const MutexLock lock(_operationMutex);
    _executing = false;
    _finished = true;
  }
  didChangeValueForKey(isExecutingKey);
  didChangeValueForKey(isFinishedKey);
}

void Operation::cancel() {
  {
    const MutexLock lock(_operationMutex);
    if (_cancelled || _finished) {
      return;
    }
  }
  willChangeValueForKey(isCancelledKey);
  {
    const MutexLock lock(_operationMutex);
    _cancelled = true;
  }
  didChangeValueForKey(isCancelledKey);
}

bool Operation::isExecuting() const {
  const MutexLock lock(_operationMutex);
  return _executing;
}

bool Operation::isFinished() const {
  const MutexLock lock(_operationMutex);
  return _finished;
}

bool Operation::isCancelled() const {
  const MutexLock lock(_operationMutex);
  return _cancelled;
}

bool Operation::isReady() const {
  if (isCancelled()) {
    return true;
  }
  const std::vector<std::shared_ptr<Operation>> waitedFor = dependencies();
  return std::all_of(waitedFor.begin(), waitedFor.end(),
                     [](const auto& operation) { return operation->_isOver(); });
}

bool Operation::_isOver() const {
  {
    const MutexLock lock(_operationMutex);
    if (_finishSeen) {
      return true;
    }
  }
  return isFinished();
}

void Operation::addDependency(const std::shared_ptr<Operation>& operation) {
  if (operation == nullptr) {
    return;
  }
  {
    const MutexLock lock(_operationMutex);
    _dependencies.push_back(operation);
  }
  operation->_whenFinished([weak = weak_from_this()] {
    if (const auto self = weak.lock()) {
      self->_announceReadiness();
    }
  });
}

std::vector<std::shared_ptr<Operation>> Operation::dependencies() const {
  const MutexLock lock(_operationMutex);
  return _dependencies;
}

void Operation::setCompletionBlock(std::function<void()> block) {
  const MutexLock lock(_operationMutex);
  _completionBlock = std::move(block);
}

void Operation::waitUntilFinished() {
  const MutexLock lock(_operationMutex);
  while (!_finishSeen) {
    _finishedCondition.wait(_operationMutex);
  }
}

Value Operation::valueForKey(std::string_view key) const {
  if (key == isExecutingKey) {
    return isExecuting();
  }
  if (key == isFinishedKey) {
    return isFinished();
  }
  if (key == isCancelledKey) {
    return isCancelled();
  }
  return {};
}

void Operation::_whenFinished(std::function<void()> handler) {
  {
    const MutexLock lock(_operationMutex);
    if (!_finishSeen) {
      _finishHandlers.push_back(std::move(handler));
      return;
    }
  }
  handler();
}

void Operation::_whenReadinessChanges(std::function<void()> handler) {
  const MutexLock lock(_operationMutex);
  _readinessHandlers.push_back(std::move(handler));
}

void Operation::_announceReadiness() {
  std::vector<std::function<void()>> handlers;
  {
    const MutexLock lock(_operationMutex);
    handlers = _readinessHandlers;
  }
  for (const auto& handler : handlers) {
    handler();
  }
}

void Operation::_stateDidChange(std::string_view key) {
  const bool finished = isFinished();
  if (key == isFinishedKey && finished) {
    _finishWasSeen();
  } else if (!finished) {
    _announceReadiness();
  }
  // Else it was cancelled and finished in one step: the announcement of its end follows.
}

void Operation::_finishWasSeen() {
  // Held over the handlers: the last of them may be the last to know the operation.
  const auto self = weak_from_this().lock();
  std::vector<std::function<void()>> handlers;
  std::vector<std::function<void()>> dropped;
  std::vector<std::shared_ptr<Operation>> dependencies;
  std::function<void()> completion;
  {
    const MutexLock lock(_operationMutex);
    if (_finishSeen) {
      return;
    }
    _finishSeen = true;
    handlers.swap(_finishHandlers);
    dropped.swap(_readinessHandlers);
    // A finished operation waits for nothing; letting go also ends chains of finished operations.
    dependencies.swap(_dependencies);
    completion.swap(_completionBlock);
    _finishedCondition.notifyAll();
  }
  for (const auto& handler : handlers) {
    handler();
  }
  if (completion) {
    runLoggingExceptions(completion);
  }
}

BlockOperation::BlockOperation(std::function<void()> block) : _block(std::move(block)) {}

std::shared_ptr<BlockOperation> BlockOperation::blockOperationWithBlock(
    std::function<void()> block) {
  return std::shared_ptr<BlockOperation>(new BlockOperation(std::move(block)));
}

void BlockOperation::main() {
  if (_block) {
    _block();
  }
}

}  // namespace platform
