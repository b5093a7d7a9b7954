// Locks that clang's thread-safety analysis can follow.
#pragma once

#include <mutex>

#if defined(__clang__)
#define ZEB_THREAD_ANNOTATION(x) __attribute__((x))
#else
#define ZEB_THREAD_ANNOTATION(x)
#endif

#define CAPABILITY(x) ZEB_THREAD_ANNOTATION(capability(x))
#define SCOPED_CAPABILITY ZEB_THREAD_ANNOTATION(scoped_lockable)
#define GUARDED_BY(x) ZEB_THREAD_ANNOTATION(guarded_by(x))
#define PT_GUARDED_BY(x) ZEB_THREAD_ANNOTATION(pt_guarded_by(x))
#define ACQUIRED_BEFORE(...) ZEB_THREAD_ANNOTATION(acquired_before(__VA_ARGS__))
#define ACQUIRED_AFTER(...) ZEB_THREAD_ANNOTATION(acquired_after(__VA_ARGS__))
#define REQUIRES(...) ZEB_THREAD_ANNOTATION(requires_capability(__VA_ARGS__))
#define EXCLUDES(...) ZEB_THREAD_ANNOTATION(locks_excluded(__VA_ARGS__))
#define ACQUIRE(...) ZEB_THREAD_ANNOTATION(acquire_capability(__VA_ARGS__))
#define RELEASE(...) ZEB_THREAD_ANNOTATION(release_capability(__VA_ARGS__))
#define TRY_ACQUIRE(...) ZEB_THREAD_ANNOTATION(try_acquire_capability(__VA_ARGS__))
#define RETURN_CAPABILITY(x) ZEB_THREAD_ANNOTATION(lock_returned(x))
#define NO_THREAD_SAFETY_ANALYSIS ZEB_THREAD_ANNOTATION(no_thread_safety_analysis)

namespace platform {

/// A plain mutual exclusion lock: for state of our own that no callback can reach.
class CAPABILITY("mutex") Mutex {
 public:
  void lock() ACQUIRE() { _mutex.lock(); }
  void unlock() RELEASE() { _mutex.unlock(); }
  bool try_lock() TRY_ACQUIRE(true) { return _mutex.try_lock(); }

 private:
  std::mutex _mutex;
};

/// Holds a Mutex for a scope.
class SCOPED_CAPABILITY MutexLock {
 public:
  explicit MutexLock(Mutex& mutex) ACQUIRE(mutex) : _mutex(mutex) { _mutex.lock(); }
  ~MutexLock() RELEASE() { _mutex.unlock(); }
  MutexLock(const MutexLock&) = delete;
  MutexLock& operator=(const MutexLock&) = delete;

 private:
  Mutex& _mutex;
};

/// The recursive lock that belongs to one object: the thread that holds it may enter again. The
/// analysis sees each function alone, so entering again from a called function is no error to it.
class CAPABILITY("monitor") Monitor {
 public:
  void lock() ACQUIRE() { _mutex.lock(); }
  void unlock() RELEASE() { _mutex.unlock(); }
  bool try_lock() TRY_ACQUIRE(true) { return _mutex.try_lock(); }

 private:
  std::recursive_mutex _mutex;
};

/// Holds a Monitor for a scope.
class SCOPED_CAPABILITY MonitorLock {
 public:
  explicit MonitorLock(Monitor& monitor) ACQUIRE(monitor) : _monitor(monitor) { _monitor.lock(); }
  ~MonitorLock() RELEASE() { _monitor.unlock(); }
  MonitorLock(const MonitorLock&) = delete;
  MonitorLock& operator=(const MonitorLock&) = delete;

 private:
  Monitor& _monitor;
};

}  // namespace platform
