#include "platform/WorkerThreads.h"

#include <pthread.h>
#include <sched.h>
#include <sys/resource.h>
#include <unistd.h>

#include <algorithm>
#include <chrono>
#include <condition_variable>
#include <deque>
#include <exception>
#include <memory>
#include <mutex>
#include <system_error>
#include <utility>

#include "platform/Environment.h"

namespace platform {

namespace {

using Task = std::function<void()>;

/// Idle workers of one priority. Lives as long as the process: workers may outlast every static
/// object, and a detached thread must never find its pool destroyed.
class WorkerPool {
 public:
  explicit WorkerPool(ThreadPriority priority) : _priority(priority) {}

  void run(Task task) {
    std::unique_lock lock(_mutex);
    _tasks.push_back(std::move(task));
    if (_tasks.size() <= _idle) {
      _taskAdded.notify_one();
      return;
    }
    ++_workers;
    lock.unlock();
    try {
      std::thread([this] { _work(); }).detach();
    } catch (const std::system_error&) {
      // The machine gives no more threads. The first worker to become free takes the task; only
      // where there is none at all is it lost.
      lock.lock();
      if (--_workers == 0) {
        throw;
      }
    }
  }

 private:
  void _work() {
    if (_priority == ThreadPriority::background) {
      // Lowering one's own priority needs no rights; where it fails, the work is merely quicker.
      const sched_param parameters{};
      ::pthread_setschedparam(::pthread_self(), SCHED_BATCH, &parameters);
      const auto thread = static_cast<id_t>(::gettid());
      ::setpriority(PRIO_PROCESS, thread, std::max(::getpriority(PRIO_PROCESS, thread), 10));
    }
    std::unique_lock lock(_mutex);
    while (true) {
      while (!_tasks.empty()) {
        Task task = std::move(_tasks.front());
        _tasks.pop_front();
        lock.unlock();
        runLoggingExceptions(task);
        task = nullptr;
        if (!currentThreadName().empty()) {
          setCurrentThreadName({});
        }
        lock.lock();
      }
      ++_idle;
      // Real time on purpose: how long a spare thread lingers is no behaviour of the system.
      const bool woken =
          _taskAdded.wait_for(lock, std::chrono::seconds(5), [&] { return !_tasks.empty(); });
      --_idle;
      if (!woken) {
        --_workers;
        return;
      }
    }
  }

  const ThreadPriority _priority;
  std::mutex _mutex;
  std::condition_variable _taskAdded;
  std::deque<Task> _tasks;
  size_t _idle = 0;
  size_t _workers = 0;
};

std::string& threadName() {
  thread_local std::string name;
  return name;
}

}  // namespace

void runOnWorkerThread(std::function<void()> task, ThreadPriority priority) {
  static auto* const normal = new WorkerPool(ThreadPriority::normal);
  static auto* const background = new WorkerPool(ThreadPriority::background);
  (priority == ThreadPriority::background ? background : normal)->run(std::move(task));
}

void startNamedThread(const std::string& name, std::function<void()> body) {
  std::thread([name, body = std::move(body)]() mutable {
    setCurrentThreadName(name);
    runLoggingExceptions(body);
    body = nullptr;
  }).detach();
}

void setCurrentThreadName(const std::string& name) {
  threadName() = name;
  ::pthread_setname_np(::pthread_self(), name.substr(0, 15).c_str());
}

const std::string& currentThreadName() { return threadName(); }

bool isMainThread() { return ::gettid() == ::getpid(); }

bool runLoggingExceptions(const std::function<void()>& body) {
  const auto log = [](std::string_view text) { Environment::current()->log->write(0, text); };
  try {
    body();
    return false;
  } catch (const std::exception& exception) {
    log(exception.what());
  } catch (...) {
    log("an exception of unknown kind");
  }
  return true;
}

}  // namespace platform
