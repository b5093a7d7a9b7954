#include "platform/OperationQueue.h"

#include <algorithm>
#include <atomic>
#include <deque>
#include <thread>
#include <utility>

#include "platform/Exception.h"
#include "platform/WorkerThreads.h"

namespace platform {
namespace {

std::atomic<size_t> unfinishedOperations = 0;

}  // namespace

// Lock order: the queue's mutex, then an operation's. Handlers of operations run without either.
struct OperationQueue::Implementation : std::enable_shared_from_this<Implementation> {
  struct Entry {
    std::shared_ptr<Operation> operation;
    bool started = false;
  };

  mutable Mutex mutex;
  Condition changed;
  std::deque<Entry> entries GUARDED_BY(mutex);
  size_t running GUARDED_BY(mutex) = 0;
  long limit GUARDED_BY(mutex) = defaultMaxConcurrentOperationCount;
  std::string name GUARDED_BY(mutex);

  // Counts that observers have not heard of, oldest first. One thread at a time announces them, so
  // that no observer ever sees an older count after a newer one.
  std::deque<size_t> notices GUARDED_BY(mutex);
  bool announcing GUARDED_BY(mutex) = false;
  std::thread::id announcer GUARDED_BY(mutex);
  std::weak_ptr<OperationQueue> queue GUARDED_BY(mutex);

  void add(const std::shared_ptr<Operation>& operation) {
    {
      const MutexLock lock(mutex);
      entries.push_back({operation, false});
      ++unfinishedOperations;
      notices.push_back(entries.size());
    }
    announce();
  }

  void startWhatMayRun() {
    while (const std::shared_ptr<Operation> next = takeNext()) {
      runOnWorkerThread([next] {
        if (runLoggingExceptions([&] { next->start(); })) {
          next->_endAfterException();
        }
      });
    }
  }

  std::shared_ptr<Operation> takeNext() {
    const MutexLock lock(mutex);
    if (limit >= 0 && running >= static_cast<size_t>(limit)) {
      return nullptr;
    }
    Entry* best = nullptr;
    for (Entry& entry : entries) {
      const bool better =
          best == nullptr || entry.operation->queuePriority() > best->operation->queuePriority();
      if (!entry.started && better && entry.operation->isReady()) {
        best = &entry;
      }
    }
    if (best == nullptr) {
      return nullptr;
    }
    best->started = true;
    ++running;
    return best->operation;
  }

  void retire(const Operation* operation) {
    std::shared_ptr<Operation> retired;
    {
      const MutexLock lock(mutex);
      const auto found = std::find_if(entries.begin(), entries.end(), [&](const Entry& entry) {
        return entry.operation.get() == operation;
      });
      if (found == entries.end()) {
        return;
      }
      running -= found->started ? 1 : 0;
      retired = std::move(found->operation);
      entries.erase(found);
      --unfinishedOperations;
      notices.push_back(entries.size());
      // For an observer that waits in the midst of an announcement: its thread is the one that
      // would tell the others.
      changed.notifyAll();
    }
    announce();
    startWhatMayRun();
  }

  bool othersStillAnnounce() const REQUIRES(mutex) {
    const bool mine = announcing && announcer == std::this_thread::get_id();
    return !mine && (announcing || !notices.empty());
  }

  void announce() {
    {
      const MutexLock lock(mutex);
      if (announcing) {
        return;
      }
      announcing = true;
      announcer = std::this_thread::get_id();
    }
    while (true) {
      size_t count = 0;
      std::shared_ptr<OperationQueue> observed;
      {
        const MutexLock lock(mutex);
        if (notices.empty()) {
          announcing = false;
          changed.notifyAll();
          return;
        }
        count = notices.front();
        notices.pop_front();
        observed = queue.lock();
      }
      if (observed != nullptr) {
        runLoggingExceptions([&] {
          observed->willChangeValueForKey(operationCountKey);
          observed->_didChangeValueForKey(operationCountKey, count);
        });
      }
    }
  }
};

OperationQueue::OperationQueue() : _implementation(std::make_shared<Implementation>()) {}
OperationQueue::~OperationQueue() = default;

std::shared_ptr<OperationQueue> OperationQueue::init() {
  std::shared_ptr<OperationQueue> queue(new OperationQueue);
  queue->_attach();
  return queue;
}

void OperationQueue::_attach() {
  const MutexLock lock(_implementation->mutex);
  _implementation->queue = weak_from_this();
}

void OperationQueue::addOperation(const std::shared_ptr<Operation>& operation) {
  if (operation == nullptr) {
    throw Exception(invalidArgumentException, "no operation to add to a queue");
  }
  {
    const MutexLock lock(operation->_operationMutex);
    if (std::exchange(operation->_queued, true)) {
      throw Exception(invalidArgumentException, "an operation can be added to a queue only once");
    }
  }
  if (operation->isFinished()) {
    throw Exception(invalidArgumentException, "an operation that has finished cannot be queued");
  }
  const std::shared_ptr<Implementation> implementation = _implementation;
  implementation->add(operation);
  operation->_whenReadinessChanges([weak = std::weak_ptr(implementation)] {
    if (const auto owner = weak.lock()) {
      owner->startWhatMayRun();
    }
  });
  // The operation keeps the queue's innards alive until it is over: they must outlast a queue that
  // is dropped while it works.
  operation->_whenFinished(
      [implementation, identity = operation.get()] { implementation->retire(identity); });
  implementation->startWhatMayRun();
}

void OperationQueue::addOperationWithBlock(std::function<void()> block) {
  addOperation(BlockOperation::blockOperationWithBlock(std::move(block)));
}

void OperationQueue::cancelAllOperations() {
  for (const auto& operation : operations()) {
    operation->cancel();
  }
}

void OperationQueue::waitUntilAllOperationsAreFinished() {
  Implementation& implementation = *_implementation;
  const MutexLock lock(implementation.mutex);
  while (!implementation.entries.empty() || implementation.othersStillAnnounce()) {
    implementation.changed.wait(implementation.mutex);
  }
}

std::vector<std::shared_ptr<Operation>> OperationQueue::operations() const {
  const MutexLock lock(_implementation->mutex);
  std::vector<std::shared_ptr<Operation>> operations;
  for (const auto& entry : _implementation->entries) {
    operations.push_back(entry.operation);
  }
  return operations;
}

size_t OperationQueue::operationCount() const {
  const MutexLock lock(_implementation->mutex);
  return _implementation->entries.size();
}

size_t OperationQueue::unfinishedOperationCount() noexcept { return unfinishedOperations; }

void OperationQueue::setMaxConcurrentOperationCount(long count) {
  {
    const MutexLock lock(_implementation->mutex);
    _implementation->limit = count;
  }
  _implementation->startWhatMayRun();
}

long OperationQueue::maxConcurrentOperationCount() const {
  const MutexLock lock(_implementation->mutex);
  return _implementation->limit;
}

void OperationQueue::setName(std::string name) {
  const MutexLock lock(_implementation->mutex);
  _implementation->name = std::move(name);
}

std::string OperationQueue::name() const {
  const MutexLock lock(_implementation->mutex);
  return _implementation->name;
}

Value OperationQueue::valueForKey(std::string_view key) const {
  return key == operationCountKey ? Value(operationCount()) : Value();
}

}  // namespace platform
