// Runs schedules of many seeds. ZEB_SEED=n replays one seed, ZEB_REPEAT times (100 unless given);
// ZEB_SCHEDULES=n runs n seeds instead of the usual number.
#pragma once

#include <gtest/gtest.h>

#include <chrono>
#include <condition_variable>
#include <cstdint>
#include <cstdio>
#include <cstdlib>
#include <functional>
#include <mutex>
#include <optional>
#include <string>
#include <thread>
#include <vector>

namespace tests {

/// Stops the process, naming the seed, when a run takes so long that something must be stuck.
class Watchdog {
 public:
  Watchdog() : _thread([this] { _watch(); }) {}
  ~Watchdog() {
    {
      const std::lock_guard lock(_mutex);
      _over = true;
    }
    _changed.notify_all();
    _thread.join();
  }
  Watchdog(const Watchdog&) = delete;
  Watchdog& operator=(const Watchdog&) = delete;

  void begin(uint64_t seed) {
    const std::lock_guard lock(_mutex);
    _seed = seed;
    ++_runs;
  }

 private:
  void _watch() {
    constexpr std::chrono::seconds patience{60};
    std::unique_lock lock(_mutex);
    while (!_over) {
      const uint64_t before = _runs;
      _changed.wait_for(lock, patience, [&] { return _over; });
      if (!_over && _runs == before && _runs > 0) {
        std::fprintf(stderr, "the schedule of ZEB_SEED=%llu is stuck\n",
                     static_cast<unsigned long long>(_seed));
        std::abort();
      }
    }
  }

  std::mutex _mutex;
  std::condition_variable _changed;
  uint64_t _seed = 0;
  uint64_t _runs = 0;
  bool _over = false;
  std::thread _thread;
};

/// A run gives what was wrong afterwards, a line each; nothing is the rule. Where no number is
/// asked for, a slow machine runs as many as it can in `limit`.
inline void runSchedules(uint64_t usualCount, std::chrono::seconds limit,
                         const std::function<std::vector<std::string>(uint64_t seed)>& run) {
  const auto number = [](const char* variable) {
    // Read before any thread runs that could change it; none does.
    const char* const text = std::getenv(variable);  // NOLINT(concurrency-mt-unsafe)
    return text == nullptr ? std::nullopt
                           : std::optional<uint64_t>(std::strtoull(text, nullptr, 10));
  };
  Watchdog watchdog;
  const auto runAndReport = [&](uint64_t seed) {
    watchdog.begin(seed);
    for (const std::string& fault : run(seed)) {
      ADD_FAILURE() << "ZEB_SEED=" << seed << ": " << fault;
    }
  };
  if (const auto seed = number("ZEB_SEED")) {
    for (uint64_t left = number("ZEB_REPEAT").value_or(100); left > 0; --left) {
      runAndReport(*seed);
    }
    return;
  }
  const auto asked = number("ZEB_SCHEDULES");
  const uint64_t count = asked.value_or(usualCount);
  const auto end = std::chrono::steady_clock::now() + limit;
  for (uint64_t seed = 1; seed <= count && !testing::Test::HasFailure() &&
                          (asked || std::chrono::steady_clock::now() < end);
       ++seed) {
    runAndReport(seed);
  }
}

}  // namespace tests
