// A property that any thread may read and replace at any time.
#pragma once

#include <utility>

#include "platform/ThreadSafety.h"

/// One value behind a lock of its own. Getting copies, setting replaces the whole; what was
/// replaced is freed outside the lock, so that nothing but copying T ever runs under it and it can
/// be taken with any other lock held. Thread-safety: internally synchronised.
template <typename T>
class AtomicProperty {
 public:
  AtomicProperty() = default;

  T get() const EXCLUDES(_mutex) {
    const platform::MutexLock lock(_mutex);
    return _value;
  }

  void set(T value) EXCLUDES(_mutex) {
    const platform::MutexLock lock(_mutex);
    std::swap(_value, value);
  }

 private:
  mutable platform::Mutex _mutex;
  T _value GUARDED_BY(_mutex){};
};
