// Work on several threads whose results come in order.
#pragma once

#include <algorithm>
#include <cstddef>
#include <cstdint>
#include <exception>
#include <functional>
#include <map>
#include <optional>
#include <system_error>
#include <thread>
#include <utility>
#include <vector>

#include "platform/Condition.h"
#include "platform/ThreadSafety.h"

namespace bvmake {

/// How much may be done at once.
struct WorkLimits {
  /// Threads; with one, everything is done on the calling thread.
  size_t workerCount = 1;
  /// Bound on the summed cost of the pieces that are being worked on. A piece that alone costs more
  /// is taken when no other is being worked on.
  uint64_t cost = UINT64_MAX;
};

/// Does the pieces of work 0 to `count` - 1, taken in this order by whichever worker is free, and
/// hands their results to the calling thread in the same order, however long each took.
/// Thread-safety: an object is confined to one thread; what it is given is called as told below.
template <typename Result>
class OrderedWork {
 public:
  struct Steps {
    /// What a piece costs. Called on any thread, by one at a time.
    std::function<uint64_t(size_t piece)> cost;
    /// Does a piece. Called on any thread, by several at a time, but by one for each `worker`,
    /// which is below WorkLimits::workerCount.
    std::function<Result(size_t piece, size_t worker)> work;
    /// Takes a result. Called on the thread of run(). It may be left empty.
    std::function<void(size_t piece, Result result)> deliver;
  };

  /// Returns when all is done and delivered. What a step throws ends the work, and is thrown again
  /// here when all threads have ended.
  static void run(size_t count, const WorkLimits& limits, const Steps& steps) {
    const size_t workerCount = std::min(limits.workerCount, count);
    if (workerCount > 1 && OrderedWork(count, limits.cost, steps)._run(workerCount)) {
      return;
    }
    for (size_t piece = 0; piece < count; ++piece) {
      Result result = steps.work(piece, 0);
      if (steps.deliver) {
        steps.deliver(piece, std::move(result));
      }
    }
  }

 private:
  OrderedWork(size_t count, uint64_t bound, const Steps& steps)
      : _count(count), _bound(bound), _steps(steps) {}

  /// False where no thread could be started.
  bool _run(size_t workerCount) {
    std::vector<std::thread> threads;
    for (size_t worker = 0; worker < workerCount; ++worker) {
      try {
        threads.emplace_back([this, worker] { _work(worker); });
      } catch (const std::system_error&) {
        // Fewer threads do as well.
        break;
      }
    }
    if (threads.empty()) {
      return false;
    }
    std::exception_ptr exception;
    try {
      _deliverAll();
    } catch (...) {
      exception = std::current_exception();
      _stop(nullptr);
    }
    for (std::thread& thread : threads) {
      thread.join();
    }
    if (exception) {
      std::rethrow_exception(exception);
    }
    return true;
  }

  void _work(size_t worker) {
    while (const std::optional<size_t> piece = _take()) {
      try {
        _finish(*piece, _steps.work(*piece, worker));
      } catch (...) {
        _stop(std::current_exception());
      }
    }
  }

  std::optional<size_t> _take() {
    const platform::MutexLock lock(_mutex);
    while (!_isStopped && _next < _count) {
      const uint64_t cost = _steps.cost(_next);
      if (_running.empty() || (cost <= _bound && _costOfRunning <= _bound - cost)) {
        _running.emplace(_next, cost);
        _costOfRunning += cost;
        return _next++;
      }
      _freed.wait(_mutex);
    }
    return std::nullopt;
  }

  void _finish(size_t piece, Result result) {
    const platform::MutexLock lock(_mutex);
    const auto running = _running.find(piece);
    _costOfRunning -= running->second;
    _running.erase(running);
    _freed.notifyAll();
    _finished.emplace(piece, std::move(result));
    if (piece == _wanted) {
      _arrived.notifyAll();
    }
  }

  void _stop(std::exception_ptr exception) {
    const platform::MutexLock lock(_mutex);
    _isStopped = true;
    if (!_exception) {
      _exception = std::move(exception);
    }
    _freed.notifyAll();
    _arrived.notifyAll();
  }

  Result _wait(size_t piece) {
    const platform::MutexLock lock(_mutex);
    _wanted = piece;
    while (true) {
      if (_exception) {
        std::rethrow_exception(_exception);
      }
      if (const auto found = _finished.find(piece); found != _finished.end()) {
        Result result = std::move(found->second);
        _finished.erase(found);
        return result;
      }
      _arrived.wait(_mutex);
    }
  }

  void _deliverAll() {
    for (size_t piece = 0; piece < _count; ++piece) {
      Result result = _wait(piece);
      if (_steps.deliver) {
        _steps.deliver(piece, std::move(result));
      }
    }
  }

  const size_t _count;
  const uint64_t _bound;
  const Steps& _steps;
  platform::Mutex _mutex;
  /// Work ended, or all work is to end.
  platform::Condition _freed;
  /// The result that the calling thread waits for is there.
  platform::Condition _arrived;
  size_t _next GUARDED_BY(_mutex) = 0;
  size_t _wanted GUARDED_BY(_mutex) = 0;
  bool _isStopped GUARDED_BY(_mutex) = false;
  std::exception_ptr _exception GUARDED_BY(_mutex);
  /// By piece, its cost.
  std::map<size_t, uint64_t> _running GUARDED_BY(_mutex);
  uint64_t _costOfRunning GUARDED_BY(_mutex) = 0;
  std::map<size_t, Result> _finished GUARDED_BY(_mutex);
};

}  // namespace bvmake
