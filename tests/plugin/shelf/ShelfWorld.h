// What tests of the shelf need: an environment of which every part can be made to fail, an owner
// that checks its shutdown guard, and observers that remember.
#pragma once

#include <atomic>
#include <chrono>
#include <functional>
#include <map>
#include <memory>
#include <mutex>
#include <optional>
#include <string>
#include <thread>
#include <vector>

#include "host/Zebrine/ZEBLog.h"
#include "platform/Clock.h"
#include "platform/DistributedNotificationCenter.h"
#include "platform/Environment.h"
#include "platform/Files.h"
#include "platform/Log.h"
#include "platform/Processes.h"
#include "platform/Value.h"
#include "plugin/shelf/ZEBIndexshelf.h"
#include "tests/platform/TemporaryFolder.h"
#include "tests/plugin/HelpIndexWorld.h"

namespace tests {

using LogEntry = platform::CapturingLogSink::Entry;

/// A host that counts how its shutdown guard is used.
class ShelfOwner : public BookOwner {
 public:
  explicit ShelfOwner(std::optional<std::string> cachesDirectory)
      : _cachesDirectory(std::move(cachesDirectory)) {}

  void disableShutdown() override;
  void enableShutdown() override;
  void notifyBookshelfOfModificationsToBook(const std::shared_ptr<ZEBHelpBook>& book) override;
  std::optional<std::string> userHelpCachesDirectoryPath() const override {
    return _cachesDirectory;
  }

  int disableCount() const { return _disableCount; }
  /// How many calls of disableShutdown() wait for theirs of enableShutdown().
  int depth() const { return _depth; }
  bool everEnabledTooOften() const { return _everNegative; }
  /// The books of which it was told that they have changed.
  std::vector<std::shared_ptr<ZEBHelpBook>> modified() const;

 private:
  const std::optional<std::string> _cachesDirectory;
  std::atomic<int> _disableCount{0};
  std::atomic<int> _depth{0};
  std::atomic<bool> _everNegative{false};
  mutable std::mutex _mutex;
  std::vector<std::shared_ptr<ZEBHelpBook>> _modified;
};

/// Starts no process: notes what was asked for and does what the test says instead.
class RecordingLauncher : public platform::ProcessLauncher {
 public:
  struct Launch {
    std::string path;
    std::vector<std::string> arguments;
    /// What follows "--file".
    std::string outputPath;
  };
  using Behaviour = std::function<int(const Launch& launch)>;

  int launchAndWait(const std::string& path, const std::vector<std::string>& arguments) override;

  std::vector<Launch> launches() const;
  /// From now on; the first behaviour exits with 0 and writes nothing.
  void behave(Behaviour behaviour);

 private:
  mutable std::mutex _mutex;
  std::vector<Launch> _launches;
  Behaviour _behaviour = [](const Launch&) { return 0; };
};

/// A process table of the test's making.
class FakeProcessTable : public platform::ProcessTable {
 public:
  int readProcesses(std::vector<platform::ProcessEntry>& entries) const override;
  std::optional<size_t> maximumArgumentSize() const override { return maximumSize; }
  std::optional<platform::Data> argumentsOfProcess(int processID) const override;

  /// Adds a process; `arguments` begin with the program's own name.
  void add(int processID, const std::string& name, const std::vector<std::string>& arguments = {});

  std::vector<platform::ProcessEntry> processes;
  std::map<int, std::string> areas;
  std::optional<size_t> maximumSize = 4096;
  /// Answers of the first reads; 0 when they are used up.
  mutable std::vector<int> failures;
  mutable int reads = 0;
  mutable std::vector<int> asked;
};

/// Delivers within the process, and remembers what was posted.
class RecordingCenter : public platform::DistributedNotificationCenter {
 public:
  Observation addObserver(const std::string& name, Handler handler) override;
  void postNotification(const std::string& name, std::optional<std::string> object) override;

  std::vector<platform::DistributedNotification> posted() const;
  /// Called before each delivery.
  std::function<void()> onPost;
  std::vector<std::string> observedNames;

 private:
  const std::shared_ptr<platform::DistributedNotificationCenter> _center =
      platform::localNotificationCenter();
  mutable std::mutex _mutex;
  std::vector<platform::DistributedNotification> _posted;
};

/// Remembers every change that it is told of.
class RecordingObserver : public ZEBIndexshelfObserver {
 public:
  struct Change {
    std::shared_ptr<ZEBIndex> index;
    ZEBIndexChange kind;
    std::thread::id thread;
  };

  void indexDidChange(const std::shared_ptr<ZEBIndex>& index, ZEBIndexChange kind) override;

  std::vector<Change> changes() const;
  std::vector<ZEBIndexChange> kinds() const;
  /// Called after the change was noted.
  std::function<void(const Change&)> onChange;

 private:
  mutable std::mutex _mutex;
  std::vector<Change> _changes;
};

/// A simulated clock that notes for how long it was asked to sleep.
class RecordingClock : public platform::SimulatedClock {
 public:
  using SimulatedClock::SimulatedClock;
  void sleep(platform::Seconds duration) override;
  std::vector<double> sleeps() const;

 private:
  mutable std::mutex _mutex;
  std::vector<double> _sleeps;
};

/// A temporary folder, an environment over it, an owner and, once made, a shelf. On destruction it
/// finishes all work and checks that the guard is balanced and nobody holds the shelf.
class ShelfWorld {
 public:
  ShelfWorld();
  ~ShelfWorld();
  ShelfWorld(const ShelfWorld&) = delete;
  ShelfWorld& operator=(const ShelfWorld&) = delete;

  /// Puts a changed environment in force.
  void change(const std::function<void(platform::Environment&)>& edit);

  /// Makes the shelf, with an observer, dropping an earlier one.
  ZEBIndexshelf& makeShelf(bool userLoggedIn = true);
  void dropShelf();

  /// Runs the main loop until all queues are empty and their drain blocks have run. As long as
  /// registrations wait, the clock moves on.
  void finishWork();
  /// Runs the main loop until `done`; false after a minute of real time, which only a mistake
  /// takes.
  bool runMainLoopUntil(const std::function<bool()>& done) const;

  std::string cachePath() const { return helpCaches + "/HelpindexCache.plist"; }
  std::string generatedRoot() const;
  /// As the tool makes it for a book.
  std::string generatedPath(const std::string& bookID, const std::string& name) const;

  /// A help-index file with one page and what `more` adds; gives its path.
  std::string writeIndex(const std::string& path, platform::Value::Dictionary more = {}) const;
  static platform::Data indexBytes(platform::Value::Dictionary more = {});
  /// A book with a folder of its own.
  std::shared_ptr<ZEBHelpBook> makeBook(const std::string& bookID, int32_t type = 1) const;
  /// The same with an installed index.
  std::shared_ptr<ZEBHelpBook> makeBookWithIndex(const std::string& bookID, int32_t type = 1,
                                                 platform::Value::Dictionary more = {}) const;
  /// The only record of a book; null when it has none.
  std::shared_ptr<ZEBIndex> knownRecord(const std::string& bookID) const;

  /// Whether another thread than this one can have the shelf's lock now.
  bool othersGetTheLock() const;

  /// What was logged, but for what records say while they read their files.
  std::vector<LogEntry> logged() const;

  static bool exists(const std::string& path);
  static std::string contents(const std::string& path);

  TemporaryFolder folder;
  const std::string caches = folder.path("caches");
  const std::string helpCaches = folder.path("caches/help");
  const std::shared_ptr<RecordingClock> clock;
  const std::shared_ptr<platform::CapturingLogSink> log;
  const std::shared_ptr<platform::FailingFileManager> files;
  const std::shared_ptr<RecordingLauncher> launcher;
  const std::shared_ptr<FakeProcessTable> processes;
  const std::shared_ptr<RecordingCenter> center;
  const std::shared_ptr<ShelfOwner> owner;
  std::shared_ptr<RecordingObserver> observer;
  std::shared_ptr<ZEBIndexshelf> shelf;
  std::string printed;

 private:
  platform::Environment _environment;
  std::optional<platform::EnvironmentOverride> _override;
};

/// A behaviour of the tool: writes a real help-index file at the output path.
RecordingLauncher::Behaviour writesIndex(platform::Value::Dictionary more = {});

}  // namespace tests
