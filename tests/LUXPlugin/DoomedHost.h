// What a test and the host process that it kills have in common.
#pragma once

#include <sys/mman.h>
#include <unistd.h>

#include <atomic>
#include <csignal>
#include <cstdint>
#include <string>

#include "platform/Files.h"

namespace tests {

/// How far a process has got, in memory that it shares with the test by way of a file. What counts
/// as a step is up to the process. Thread-safety: internally synchronised.
class SharedSteps {
 public:
  /// The file must be there.
  explicit SharedSteps(const std::string& path);
  ~SharedSteps();
  SharedSteps(const SharedSteps&) = delete;
  SharedSteps& operator=(const SharedSteps&) = delete;

  bool areShared() const { return _count != nullptr; }
  uint64_t count() const { return _count->load(); }
  void forget() { _count->store(0); }

  /// The process ends at that step, as if it was killed from outside. 0: at none.
  void dieAt(uint64_t step) { _last = step; }
  void take();

 private:
  std::atomic<uint64_t>* _count = nullptr;
  std::atomic<uint64_t> _last{0};
};

/// Ends this process like a signal from outside.
[[noreturn]] void dieHere();

// What the host does, its first argument. Further ones are the folder with the books and the
// caches, the file of the steps, the step at which it dies, and the size beyond which no file may
// grow, 0 for neither.

/// Builds both models again and again.
inline constexpr const char* doomedHostBuilds = "build";
/// Synchronises both models with books that change again and again.
inline constexpr const char* doomedHostSynchronises = "synchronise";
/// Is an ordinary host: searches, lets the models come back, searches again, and builds. Its exit
/// status is 0 when all was well; what was not it writes on standard output.
inline constexpr const char* doomedHostServes = "serve";

// The books that it has: "org.zeb.manual" in the group "System", the other one in "Apps".
inline constexpr const char* doomedHostKitchen = "org.kitchen";

}  // namespace tests
