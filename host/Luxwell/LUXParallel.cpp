#include "host/Luxwell/LUXParallel.h"

#include <algorithm>
#include <atomic>
#include <exception>
#include <limits>
#include <system_error>
#include <thread>
#include <vector>

#include "platform/Environment.h"
#include "platform/ThreadSafety.h"

namespace {

class Pieces {
 public:
  Pieces(size_t count, size_t pieceLength, const std::function<void(size_t, size_t)>& body)
      : _count(count), _pieceLength(pieceLength), _body(body) {}

  void run() {
    while (true) {
      const size_t from = _next.fetch_add(_pieceLength);
      if (from >= _count) {
        return;
      }
      try {
        _body(from, std::min(_count, from + _pieceLength));
      } catch (...) {
        _note(from, std::current_exception());
      }
    }
  }

  void rethrow() {
    const platform::MutexLock lock(_mutex);
    if (_exception) {
      std::rethrow_exception(_exception);
    }
  }

 private:
  void _note(size_t from, std::exception_ptr exception) {
    const platform::MutexLock lock(_mutex);
    if (from < _failed) {
      _failed = from;
      _exception = std::move(exception);
    }
  }

  const size_t _count;
  const size_t _pieceLength;
  const std::function<void(size_t, size_t)>& _body;
  std::atomic<size_t> _next{0};
  platform::Mutex _mutex;
  size_t _failed GUARDED_BY(_mutex) = std::numeric_limits<size_t>::max();
  std::exception_ptr _exception GUARDED_BY(_mutex);
};

}  // namespace

void LUXInParallel(size_t count, size_t pieceLength, size_t threadCount,
                   const std::function<void(size_t, size_t)>& body) {
  pieceLength = std::max<size_t>(pieceLength, 1);
  const size_t pieceCount = count / pieceLength + (count % pieceLength == 0 ? 0 : 1);
  Pieces pieces(count, pieceLength, body);
  std::vector<std::thread> threads;
  for (size_t i = 1; i < std::min(threadCount, pieceCount); ++i) {
    try {
      threads.emplace_back([&pieces] { pieces.run(); });
    } catch (const std::system_error&) {
      // Fewer threads do as well.
      break;
    }
  }
  pieces.run();
  for (std::thread& thread : threads) {
    thread.join();
  }
  pieces.rethrow();
}

size_t LUXThreadCount() {
  return static_cast<size_t>(std::max(1, platform::Environment::current()->processorCount()));
}
