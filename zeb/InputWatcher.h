// Word of keys that arrive, for programs that wait for other things too.
#pragma once

#include <atomic>
#include <functional>
#include <thread>

namespace zeb {

/// Watches a file descriptor on a thread of its own, so that whoever runs a loop need not look for
/// input again and again. Where the system has no descriptors left for it, it never tells.
/// Thread-safety: confined to one thread; the handler is called on the watcher's.
class InputWatcher {
 public:
  /// `inputArrived` is called when there is something to read, or nothing more will come; once, and
  /// again only after resume(). The descriptor has to stay open as long as the watcher lives.
  InputWatcher(int descriptor, std::function<void()> inputArrived);
  /// Waits for a call of the handler to return.
  ~InputWatcher();
  InputWatcher(const InputWatcher&) = delete;
  InputWatcher& operator=(const InputWatcher&) = delete;

  /// What there was has been read.
  void resume() { _wake(); }

 private:
  void _wake() const;
  void _watch() const;

  const int _descriptor;
  const std::function<void()> _inputArrived;
  const int _wakeDescriptor;
  std::atomic<bool> _ends{false};
  std::thread _thread;
};

}  // namespace zeb
