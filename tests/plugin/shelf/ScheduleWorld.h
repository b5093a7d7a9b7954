// The parts of a schedule's world: each fails on demand, from any thread.
#pragma once

#include <atomic>
#include <condition_variable>
#include <cstdint>
#include <functional>
#include <map>
#include <mutex>
#include <random>
#include <set>
#include <string>
#include <vector>

#include "platform/Files.h"
#include "platform/Log.h"
#include "platform/Processes.h"
#include "plugin/shelf/ZEBIndexshelf.h"

namespace tests {

/// A die that several threads may throw; what each gets depends on the order of their throws.
class SharedDie {
 public:
  explicit SharedDie(uint64_t seed) : _engine(seed) {}
  /// From 0 to `sides` - 1.
  uint64_t roll(uint64_t sides) {
    const std::lock_guard lock(_mutex);
    return _engine() % sides;
  }

 private:
  std::mutex _mutex;
  std::mt19937_64 _engine;
};

/// Files that fail while their faults are on. Writes do not wait for the disk: thousands of runs
/// would.
class ScheduleFiles : public platform::FileManager {
 public:
  explicit ScheduleFiles(std::string watchedPath) : _watchedPath(std::move(watchedPath)) {}

  std::atomic<bool> diskIsFull{false};
  std::atomic<bool> readsFail{false};
  std::atomic<bool> foldersFail{false};
  std::atomic<bool> removalsFail{false};
  // Whether it was ever so.
  std::atomic<bool> readsFailedOnce{false};
  std::atomic<bool> removalsFailedOnce{false};

  std::optional<platform::Data> contentsMappedAtPath(const std::string& path,
                                                     platform::Error* error) const override;
  std::optional<platform::Error> writeAtomically(const std::string& path,
                                                 const platform::Data& data) const override;
  std::optional<platform::Error> createDirectoryWithParents(const std::string& path) const override;
  std::optional<platform::Error> copyItem(const std::string& from,
                                          const std::string& to) const override;
  std::optional<platform::Error> removeItem(const std::string& path) const override;

  /// From now on the watched file may have these bytes too.
  void allow(std::string bytes) const;
  /// Whether the watched file is absent or has bytes that it was ever to have, whole.
  bool watchedFileIsWhole() const;

 private:
  const std::string _watchedPath;
  mutable std::mutex _mutex;
  mutable std::set<std::string> _allowed;
};

/// The tool as it behaves on bad days: it works, fails, cannot be started, is killed half way, or
/// hangs until it is released.
class ScheduleTool : public platform::ProcessLauncher {
 public:
  /// What it makes at a path.
  using Output = std::function<platform::Data(const std::string& path)>;

  ScheduleTool(uint64_t seed, std::shared_ptr<ScheduleFiles> files, Output output);

  int launchAndWait(const std::string& path, const std::vector<std::string>& arguments) override;

  /// Tools that hang go on; those that come later do not hang.
  void release();
  /// How often it made an index.
  int successes() const { return _successes; }
  /// How often it was killed and left half an index.
  int kills() const { return _kills; }

 private:
  int _write(const std::string& path, const platform::Data& bytes) const;

  SharedDie _die;
  const std::shared_ptr<ScheduleFiles> _files;
  const Output _output;
  std::mutex _mutex;
  std::condition_variable _releasedCondition;
  bool _released = false;
  std::atomic<int> _successes{0};
  std::atomic<int> _kills{0};
};

/// A process table that is mostly empty, at times unreadable or too large, and at times shows a
/// tool that writes one book's file.
class ScheduleProcesses : public platform::ProcessTable {
 public:
  ScheduleProcesses(uint64_t seed, std::string busyPath)
      : _die(seed), _busyPath(std::move(busyPath)) {}

  int readProcesses(std::vector<platform::ProcessEntry>& entries) const override;
  std::optional<size_t> maximumArgumentSize() const override { return 4096; }
  std::optional<platform::Data> argumentsOfProcess(int processID) const override;

 private:
  mutable SharedDie _die;
  const std::string _busyPath;
};

/// Keeps what no schedule should make the system say: exceptions that nothing in it throws.
class ScheduleLog : public platform::LogSink {
 public:
  void write(int level, std::string_view message) override;
  bool accepts(int) const noexcept override { return true; }
  std::vector<std::string> surprises() const;

 private:
  mutable std::mutex _mutex;
  std::vector<std::string> _surprises;
};

/// Counts changes by book and kind.
class CountingObserver : public ZEBIndexshelfObserver {
 public:
  using Counts = std::map<std::pair<std::string, ZEBIndexChange>, int>;

  void indexDidChange(const std::shared_ptr<ZEBIndex>& index, ZEBIndexChange kind) override;
  Counts counts() const;
  int total() const;

 private:
  mutable std::mutex _mutex;
  Counts _counts;
};

}  // namespace tests
