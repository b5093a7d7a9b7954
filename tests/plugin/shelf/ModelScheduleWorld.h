// The parts of a world in which schedules with models run.
#pragma once

#include <atomic>
#include <map>
#include <memory>
#include <mutex>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include "LUXPlugin/LUXSearchController.h"
#include "host/Zebrine/ZEBPluginOwner.h"
#include "platform/Clock.h"
#include "platform/Log.h"

namespace tests {

/// A clock that also tells how long the calling thread has asked to sleep.
class ScheduleClock : public platform::SimulatedClock {
 public:
  using SimulatedClock::SimulatedClock;
  void sleep(platform::Seconds duration) override;
  static double sleptByThisThread();
};

/// A host whose books come and go, and that fails once in a build where it is told to.
class ScheduleOwner : public ZEBPluginOwner {
 public:
  explicit ScheduleOwner(std::string caches) : _caches(std::move(caches)) {}

  void addBook(const std::shared_ptr<ZEBHelpBook>& book);
  void forgetBook(const std::string& bookID);
  /// The next build breaks off, unless it runs for a thread whose name begins with "searcher".
  void breakNextBuild() { _breaksNextBuild = true; }
  void mendBuilds() { _breaksNextBuild = false; }
  int brokenBuilds() const { return _brokenBuilds; }
  int guards() const { return _guards; }
  bool everEnabledTooOften() const { return _everNegative; }
  /// How many searches have ended.
  int finished() const { return _finished; }

  std::atomic<bool> loggedIn{false};
  std::atomic<bool> lazy{false};

  bool userLoggedIn() const override { return loggedIn; }
  bool shouldBeLazy() const override { return lazy; }
  void setShouldBeLazy(bool shouldBeLazy) override { lazy = shouldBeLazy; }
  bool isOnline() const override { return true; }
  std::map<std::string, std::shared_ptr<ZEBHelpBook>> knownBooks() const override;
  std::shared_ptr<ZEBHelpBook> bookWithID(const std::string& bookID) const override;
  void notifyBookshelfOfModificationsToBook(const std::shared_ptr<ZEBHelpBook>&) override {}
  void disableShutdown() override { ++_guards; }
  void enableShutdown() override;
  void setIdleTimeOutDelay(const platform::Value&) override {}
  std::optional<std::string> userHelpCachesDirectoryPath() const override { return _caches; }
  void pluginFoundResults(const std::shared_ptr<ZEBPlugin>& plugin,
                          const ZEBResultBatch& foundResults,
                          const std::shared_ptr<ZEBQuery>& forQuery) override;
  void pluginFinishedSearchingForQuery(const std::shared_ptr<ZEBPlugin>& plugin,
                                       const std::shared_ptr<ZEBQuery>& query) override;

  /// The titles that a search has found.
  std::vector<std::string> titlesFor(const std::string& queryID) const;

 private:
  const std::string _caches;
  mutable std::mutex _mutex;
  std::map<std::string, std::shared_ptr<ZEBHelpBook>> _books;
  std::map<std::string, std::vector<std::string>> _titles;
  mutable std::atomic<bool> _breaksNextBuild{false};
  mutable std::atomic<int> _brokenBuilds{0};
  std::atomic<int> _guards{0};
  std::atomic<bool> _everNegative{false};
  std::atomic<int> _finished{0};
};

/// What a broken build says.
inline constexpr const char* brokenBuildReason = "the host fails in a build";

/// Keeps what no schedule should make the system say.
class ModelScheduleLog : public platform::LogSink {
 public:
  void write(int level, std::string_view message) override;
  bool accepts(int) const noexcept override { return true; }
  std::vector<std::string> surprises() const;

 private:
  mutable std::mutex _mutex;
  std::vector<std::string> _surprises;
};

/// Measures how long searches take, in simulated time and in what they ask to sleep.
class ScheduleController : public LUXSearchController {
 public:
  explicit ScheduleController(const std::shared_ptr<ZEBPluginOwner>& owner)
      : LUXSearchController(owner) {}

  Results doSearchForQuery(const std::shared_ptr<ZEBQuery>& query,
                           const std::string& requestedResultType, const Indices& inIndices,
                           const std::vector<std::string>& ignoringItems,
                           std::set<std::string>* passingBackSearchedHelpbookIDs) override;

  double longestSearch() const { return _longestSearch; }
  double longestSleep() const { return _longestSleep; }

 private:
  std::atomic<double> _longestSearch{0};
  std::atomic<double> _longestSleep{0};
};

}  // namespace tests
