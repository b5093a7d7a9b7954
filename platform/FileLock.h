// One at a time among processes.
#pragma once

#include <optional>
#include <string>

namespace platform {

/// A lock that processes agree on by the path of a file, which is made where it is missing and
/// stays. It ends with the object, and with the process, however that ends. Two locks of one path
/// exclude each other within a process too. Thread-safety: confined to one thread.
class FileLock {
 public:
  /// Takes the lock if nobody holds it; absent if somebody does, which `isHeld` tells where it is
  /// given, or if the file cannot be opened.
  static std::optional<FileLock> tryLock(const std::string& path, bool* isHeld = nullptr);
  /// Waits for it; absent only if the file cannot be opened.
  static std::optional<FileLock> lock(const std::string& path);

  FileLock(FileLock&& other) noexcept;
  FileLock& operator=(FileLock&& other) noexcept;
  FileLock(const FileLock&) = delete;
  FileLock& operator=(const FileLock&) = delete;
  ~FileLock();

 private:
  explicit FileLock(int descriptor) noexcept : _descriptor(descriptor) {}
  static std::optional<FileLock> _take(const std::string& path, int operation, bool* isHeld);

  int _descriptor;
};

}  // namespace platform
