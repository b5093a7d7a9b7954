// Threads for whoever has work: queues hand tasks over and never own a thread.
#pragma once

#include <functional>
#include <string>
#include <thread>

namespace platform {

enum class ThreadPriority { normal, background };

/// Runs `task` on a worker thread of its own choice, at once: an idle worker takes it, else a new
/// worker is started. So no task ever waits behind a task that blocks. Workers that stay idle for a
/// while end. A task that throws is logged at level 0 and ends alone.
void runOnWorkerThread(std::function<void()> task,
                       ThreadPriority priority = ThreadPriority::normal);

/// Starts a thread with a name (the kernel keeps its first 15 bytes) that nobody joins. An
/// exception that leaves `body` is logged at level 0 and ends the thread, not the process.
void startNamedThread(const std::string& name, std::function<void()> body);

/// Names the calling thread; a worker thread bears the name until its task ends.
void setCurrentThreadName(const std::string& name);

/// Name of the calling thread as given to startNamedThread(), whole; empty for other threads.
const std::string& currentThreadName();

/// Whether the calling thread is the one on which the process started.
bool isMainThread();

/// Runs `body`, logging at level 0 with "%@" whatever it throws. Returns whether it threw.
bool runLoggingExceptions(const std::function<void()>& body);

}  // namespace platform
