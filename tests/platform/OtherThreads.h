// Whether anybody else in the process is at work.
#pragma once

#include <dirent.h>
#include <fcntl.h>
#include <unistd.h>

#include <algorithm>
#include <array>
#include <cerrno>
#include <charconv>
#include <chrono>
#include <map>
#include <string>
#include <string_view>
#include <thread>
#include <utility>
#include <vector>

namespace tests {

/// Looks at the process's other threads as the system sees them. With simulated time this tells
/// when to let time pass: while somebody works, however slowly the machine does it, none has to.
/// Thread-safety: guarded by the user.
class OtherThreads {
 public:
  OtherThreads() = default;
  ~OtherThreads() { _forget(_files.begin(), _files.end()); }
  OtherThreads(const OtherThreads&) = delete;
  OtherThreads& operator=(const OtherThreads&) = delete;

  /// Whether all of them were blocked at one moment of this call, so that none goes on before this
  /// thread, the clock or the world outside does something. False where the system does not tell.
  bool areBlocked() {
    // A thread that was blocked twice and did not run in between was blocked all the time; for all
    // threads together that includes the moment between the two looks.
    return _look(_before) && _look(_after) && _before == _after;
  }

  /// Waits until they are, for `limit` at most: a thread may spin until something happens here.
  /// Where the system does not tell, that is a millisecond.
  void waitUntilBlocked(std::chrono::milliseconds limit) {
    if (!_systemTells) {
      std::this_thread::sleep_for(std::chrono::milliseconds(1));
      return;
    }
    const auto end = std::chrono::steady_clock::now() + limit;
    while (!areBlocked() && std::chrono::steady_clock::now() < end) {
      std::this_thread::yield();
    }
  }

 private:
  static constexpr size_t manyFiles = 64;

  /// Number of a thread, and how often it was given a processor.
  using Runs = std::vector<std::pair<int, std::string>>;

  /// What the system tells of a thread; opened once, as opening takes longer than reading.
  struct Files {
    int state = -1;
    int runs = -1;
  };

  /// False as soon as one is not blocked.
  bool _look(Runs& threads) {
    threads.clear();
    DIR* const folder = ::opendir("/proc/self/task");
    if (folder == nullptr) {
      return false;
    }
    const int own = ::gettid();
    bool allBlocked = true;
    // One stream, one thread: readdir is safe here.
    for (const dirent* entry = ::readdir(folder);  // NOLINT(concurrency-mt-unsafe)
         allBlocked && entry != nullptr;
         entry = ::readdir(folder)) {  // NOLINT(concurrency-mt-unsafe)
      const std::string_view name = entry->d_name;
      int number = 0;
      std::from_chars(name.data(), name.data() + name.size(), number);
      if (number != 0 && number != own) {
        threads.emplace_back(number, std::string());
        allBlocked = _isBlocked(number, threads.back().second);
      }
    }
    ::closedir(folder);
    if (_files.size() > threads.size() + manyFiles) {
      // Most are of threads that have ended.
      _forget(_files.begin(), _files.end());
    }
    return allBlocked;
  }

  bool _isBlocked(int number, std::string& runs) {
    const auto found = _files.find(number);
    if (found == _files.end()) {
      const std::string folder = "/proc/self/task/" + std::to_string(number);
      _files[number] = {::open((folder + "/stat").c_str(), O_RDONLY | O_CLOEXEC),
                        ::open((folder + "/schedstat").c_str(), O_RDONLY | O_CLOEXEC)};
      return false;
    }
    // "number (name) state …"; the name may hold anything.
    const std::string_view status = _read(found->second.state);
    const size_t end = status.rfind(')');
    const bool isBlocked = end != std::string_view::npos && status.substr(end, 3) == ") S";
    // "nanoseconds run, nanoseconds waited, times run".
    runs = _read(found->second.runs);
    if (end == std::string_view::npos || runs.empty()) {
      // Another thread had this number.
      _forget(found, std::next(found));
      return false;
    }
    return isBlocked;
  }

  std::string_view _read(int file) {
    const ssize_t count = ::pread(file, _buffer.data(), _buffer.size(), 0);
    return {_buffer.data(), static_cast<size_t>(std::max<ssize_t>(count, 0))};
  }

  void _forget(std::map<int, Files>::iterator from, std::map<int, Files>::iterator to) {
    for (auto each = from; each != to; ++each) {
      ::close(each->second.state);
      ::close(each->second.runs);
    }
    _files.erase(from, to);
  }

  const bool _systemTells = ::access("/proc/self/schedstat", R_OK) == 0;
  std::map<int, Files> _files;
  Runs _before;
  Runs _after;
  std::array<char, 512> _buffer{};
};

}  // namespace tests
