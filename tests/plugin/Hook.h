// What a test wants to be called at some point.
#pragma once

#include <functional>
#include <utility>

#include "platform/ThreadSafety.h"

namespace tests {

/// A function that a test may put in place and take away while other threads call it. A call that
/// is under way goes on. Thread-safety: internally synchronised.
template <typename Signature>
class Hook {
 public:
  Hook() = default;
  Hook(const Hook&) = delete;

  Hook& operator=(std::function<Signature> function) {
    const platform::MutexLock lock(_mutex);
    _function.swap(function);
    return *this;
  }
  Hook& operator=(const Hook&) = delete;

  /// Empty where there is none.
  std::function<Signature> get() const {
    const platform::MutexLock lock(_mutex);
    return _function;
  }

 private:
  mutable platform::Mutex _mutex;
  std::function<Signature> _function GUARDED_BY(_mutex);
};

}  // namespace tests
