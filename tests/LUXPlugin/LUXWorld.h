// What tests of the semantic search controller need: books with real semantic data, real models,
// time that passes when somebody sleeps, and a controller whose answers can be caught.
#pragma once

#include <gmock/gmock.h>

#include <atomic>
#include <functional>
#include <map>
#include <memory>
#include <mutex>
#include <optional>
#include <ostream>
#include <set>
#include <string>
#include <utility>
#include <vector>

#include "LUXPlugin/LUXSearchController.h"
#include "host/Luxwell/HelpLUXModel.h"
#include "host/Luxwell/LUXHit.h"
#include "host/Zebrine/ZEBConstants.h"
#include "host/Zebrine/ZEBHelpBook.h"
#include "host/Zebrine/ZEBLog.h"
#include "host/Zebrine/ZEBQuery.h"
#include "host/Zebrine/ZEBResult.h"
#include "platform/Environment.h"
#include "platform/Log.h"
#include "platform/WorkerThreads.h"
#include "plugin/records/ZEBHelpindexIndex.h"
#include "plugin/shelf/ZEBIndexshelf.h"
#include "tests/platform/OtherThreads.h"
#include "tests/platform/TemporaryFolder.h"
#include "tests/plugin/HelpIndexWorld.h"
#include "tests/plugin/Hook.h"
#include "tests/plugin/front/RecordingOwner.h"

namespace platform {

/// What failing tests print.
inline void PrintTo(const CapturingLogSink::Entry& entry, std::ostream* stream) {
  *stream << entry.level << ": " << entry.message;
}

}  // namespace platform

namespace tests {

using LogEntry = platform::CapturingLogSink::Entry;

/// A page of a book with semantic data.
struct LUXPage {
  std::string key;
  std::string title;
  std::vector<std::string> blocks;
  std::optional<std::string> description = std::nullopt;
  bool excludedFromSearch = false;
};

/// Simulated time that follows whoever sleeps, so that nobody waits longer than `onSleep` takes. At
/// first that is until all other threads are blocked: so nothing runs into a time-out because the
/// machine is slow.
class LUXClock : public platform::SimulatedClock {
 public:
  struct Sleep {
    std::string thread;
    double seconds;
    friend bool operator==(const Sleep&, const Sleep&) = default;
  };

  explicit LUXClock(std::chrono::system_clock::time_point start);

  void sleep(platform::Seconds duration) override;

  std::vector<Sleep> sleeps() const;
  /// The lengths of the sleeps of the threads of one name; the test's own has none.
  std::vector<double> sleepsOf(const std::string& thread) const;
  void forgetSleeps();

  /// Waits, in real time, until all other threads of the process are blocked.
  void letOthersWork();

  /// Called by every sleeper, with the number of its thread's sleeps, this one among them; the time
  /// moves on when it returns. Calls letOthersWork() until a test puts something else here.
  Hook<void(size_t count)> onSleep;

 private:
  mutable std::mutex _mutex;
  std::vector<Sleep> _sleeps;
  // Held while one looks whether the others are blocked; those who want to look too are, then.
  std::mutex _otherThreadsMutex;
  OtherThreads _otherThreads;
};

/// The controller as it is, but that a test may catch answers and starts of the preload.
class LUXTestController : public LUXSearchController {
 public:
  using Answer = std::function<void(const std::shared_ptr<LUXQuery>& query,
                                    const std::vector<std::shared_ptr<LUXHit>>& hits)>;

  explicit LUXTestController(const std::shared_ptr<ZEBPluginOwner>& owner)
      : LUXSearchController(owner) {}

  void queryDidFinishWithResults(const std::shared_ptr<LUXQuery>& query,
                                 const std::vector<std::shared_ptr<LUXHit>>& results) override {
    if (onAnswer) {
      onAnswer(query, results);
    } else {
      answer(query, results);
    }
  }
  /// What the controller does with an answer.
  void answer(const std::shared_ptr<LUXQuery>& query,
              const std::vector<std::shared_ptr<LUXHit>>& hits) {
    LUXSearchController::queryDidFinishWithResults(query, hits);
  }

  void loadLUXModels() override {
    if (onLoad) {
      onLoad();
    } else {
      LUXSearchController::loadLUXModels();
    }
  }

  /// Called on the query's thread in place of answer().
  Answer onAnswer;
  std::function<void()> onLoad;
};

/// When it ends, nobody may hold a model or the shutdown guard.
class LUXWorld {
 public:
  using Results = LUXSearchController::Results;

  LUXWorld();
  ~LUXWorld();
  LUXWorld(const LUXWorld&) = delete;
  LUXWorld& operator=(const LUXWorld&) = delete;

  /// Puts a changed environment in force.
  void change(const std::function<void(platform::Environment&)>& edit);

  /// A book with an index of its own, known to the host. With a group, the group list names it
  /// there.
  std::shared_ptr<ZEBHelpBook> addBook(const std::string& bookID, const std::vector<LUXPage>& pages,
                                       const std::string& group = {},
                                       int32_t type = ZEBHelpBookType1);
  /// The same with whatever the index file is to hold as semantic data.
  std::shared_ptr<ZEBHelpBook> addBookWithData(const std::string& bookID,
                                               const std::optional<platform::Data>& data,
                                               const std::string& group = {},
                                               int32_t type = ZEBHelpBookType1);
  /// Replaces the semantic data of a book's index file.
  std::string writeIndex(const std::string& bookID,
                         const std::optional<platform::Data>& data) const;
  static platform::Data semanticData(const std::vector<LUXPage>& pages);

  /// What the group list says of a book, and of a group. Every group but those is unknown; the
  /// default group is the first of them.
  void setBook(const std::string& bookID, const std::string& group,
               platform::Value::Dictionary properties = {});
  void setGroupWeight(const std::string& group, double weight);

  /// Builds a model on this thread.
  void build(const std::string& group, const std::string& language = "English") const;
  std::string modelFolder(const std::string& group, const std::string& language = "English") const {
    return HelpLUXModel::directoryPathForModelGroupName(group, language);
  }
  std::string modelPath(const std::string& group) const { return modelFolder(group) + "/LUXModel"; }

  static std::shared_ptr<ZEBQuery> query(const std::string& text,
                                         std::vector<std::string> scope = {},
                                         platform::Value::Dictionary options = {});
  Results search(const std::shared_ptr<ZEBQuery>& query,
                 const std::string& requestedResultType = ZEBHelpArticleResult,
                 const std::vector<std::string>& ignoringItems = {},
                 std::set<std::string>* searchedBookIDs = nullptr) const {
    return controller->doSearchForQuery(query, requestedResultType, {}, ignoringItems,
                                        searchedBookIDs);
  }

  /// Messages of one level, and of all levels as they came.
  std::vector<std::string> logged(int level) const { return log->messages(level); }
  /// The messages of all levels but 2, 3 of others, and 6, that begin with one of these.
  std::vector<LogEntry> loggedBeginningWith(const std::vector<std::string>& beginnings) const;

  int activity(const std::string& group, const std::string& language = "English") const {
    return controller->_activityForModelGroupName(group, language);
  }
  /// Whether no registered model is held.
  bool nothingIsHeld() const;

  /// Waits, in real time, until `done`; false after twenty seconds.
  static bool waitUntil(const std::function<bool()>& done);
  /// Lets background work of the controller end.
  void finishWork() const;

  TemporaryFolder folder;
  const std::shared_ptr<LUXClock> clock;
  const std::shared_ptr<platform::CapturingLogSink> log;
  const std::shared_ptr<platform::FailingFileManager> files;
  const std::shared_ptr<RecordingOwner> owner;
  std::vector<std::string> runningApplications;

 private:
  platform::Environment _environment;
  std::optional<platform::EnvironmentOverride> _override;
  std::map<std::string, platform::Value::Dictionary> _books;
  std::map<std::string, double> _weights;
  std::map<std::string, std::vector<LUXPage>> _pages;
  void _applyGroupList() const;

 public:
  std::shared_ptr<ZEBIndexshelf> shelf;
  std::shared_ptr<LUXTestController> controller;
};

std::vector<std::string> titlesOf(const std::vector<std::shared_ptr<ZEBResult>>& results);
std::vector<double> relevancesOf(const std::vector<std::shared_ptr<ZEBResult>>& results);
std::string urlOf(const std::shared_ptr<ZEBResult>& result);

/// Pages about printing and about cooking.
std::vector<LUXPage> printerPages();
std::vector<LUXPage> kitchenPages();

}  // namespace tests
