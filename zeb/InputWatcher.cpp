#include "zeb/InputWatcher.h"

#include <poll.h>
#include <sys/eventfd.h>
#include <unistd.h>

#include <array>
#include <cerrno>
#include <cstdint>
#include <utility>

namespace zeb {

InputWatcher::InputWatcher(int descriptor, std::function<void()> inputArrived)
    : _descriptor(descriptor),
      _inputArrived(std::move(inputArrived)),
      _wakeDescriptor(::eventfd(0, EFD_CLOEXEC)) {
  if (_wakeDescriptor >= 0) {
    _thread = std::thread([this] { _watch(); });
  }
}

InputWatcher::~InputWatcher() {
  if (_thread.joinable()) {
    _ends = true;
    _wake();
    _thread.join();
    ::close(_wakeDescriptor);
  }
}

void InputWatcher::_wake() const {
  const uint64_t one = 1;
  if (_wakeDescriptor >= 0) {
    // It cannot fail but by being full, and then the thread wakes as well.
    (void)!::write(_wakeDescriptor, &one, sizeof one);
  }
}

void InputWatcher::_watch() const {
  bool watches = true;
  while (!_ends) {
    // A negative descriptor is not waited for.
    std::array<pollfd, 2> waiting{
        {{_wakeDescriptor, POLLIN, 0}, {watches ? _descriptor : -1, POLLIN, 0}}};
    if (::poll(waiting.data(), waiting.size(), -1) < 0) {
      if (errno != EINTR) {
        return;
      }
      continue;
    }
    if (waiting[0].revents != 0) {
      uint64_t count = 0;
      (void)!::read(_wakeDescriptor, &count, sizeof count);
      watches = true;
    } else if (waiting[1].revents != 0) {
      watches = false;
      _inputArrived();
    }
  }
}

}  // namespace zeb
