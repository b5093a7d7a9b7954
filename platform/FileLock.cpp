#include "platform/FileLock.h"

#include <fcntl.h>
#include <sys/file.h>
#include <unistd.h>

#include <cerrno>
#include <utility>

namespace platform {

std::optional<FileLock> FileLock::_take(const std::string& path, int operation, bool* isHeld) {
  if (isHeld != nullptr) {
    *isHeld = false;
  }
  int descriptor = -1;
  do {
    descriptor = ::open(path.c_str(), O_RDWR | O_CREAT | O_CLOEXEC, 0666);
  } while (descriptor < 0 && errno == EINTR);
  if (descriptor < 0) {
    return std::nullopt;
  }
  FileLock lock(descriptor);
  int result = -1;
  do {
    result = ::flock(descriptor, operation);
  } while (result < 0 && errno == EINTR);
  if (isHeld != nullptr) {
    *isHeld = result != 0 && errno == EWOULDBLOCK;
  }
  return result == 0 ? std::optional<FileLock>(std::move(lock)) : std::nullopt;
}

std::optional<FileLock> FileLock::tryLock(const std::string& path, bool* isHeld) {
  return _take(path, LOCK_EX | LOCK_NB, isHeld);
}

std::optional<FileLock> FileLock::lock(const std::string& path) {
  return _take(path, LOCK_EX, nullptr);
}

FileLock::FileLock(FileLock&& other) noexcept : _descriptor(std::exchange(other._descriptor, -1)) {}

FileLock& FileLock::operator=(FileLock&& other) noexcept {
  std::swap(_descriptor, other._descriptor);
  return *this;
}

FileLock::~FileLock() {
  if (_descriptor >= 0) {
    ::close(_descriptor);
  }
}

}  // namespace platform
