// A host process that is killed in the middle of its work; see DoomedHost.h.
#include <sys/resource.h>

#include <algorithm>
#include <cstdio>
#include <cstdlib>
#include <memory>
#include <string>
#include <thread>
#include <vector>

#include "platform/DistributedNotificationCenter.h"
#include "platform/OperationQueue.h"
#include "platform/RunLoop.h"
#include "platform/UserDefaults.h"
#include "plugin/front/HelpPluginController.h"
#include "tests/LUXPlugin/DoomedHost.h"
#include "tests/LUXPlugin/LUXWorld.h"

namespace {

using tests::SharedSteps;

/// The real files, with a step at each thing that changes them and after it.
class SteppingFiles : public platform::FileManager {
 public:
  explicit SteppingFiles(SharedSteps& steps) : _steps(steps) {}

  std::optional<platform::Error> writeAtomically(const std::string& path,
                                                 const platform::Data& data) const override {
    return _between([&] { return FileManager::writeAtomically(path, data); });
  }
  std::optional<platform::Error> createDirectory(const std::string& path) const override {
    return _between([&] { return FileManager::createDirectory(path); });
  }
  std::optional<platform::Error> createDirectoryWithParents(
      const std::string& path) const override {
    return _between([&] { return FileManager::createDirectoryWithParents(path); });
  }
  std::optional<platform::Error> removeItem(const std::string& path) const override {
    return _between([&] { return FileManager::removeItem(path); });
  }

 private:
  template <typename Change>
  std::optional<platform::Error> _between(const Change& change) const {
    _steps.take();
    auto error = change();
    _steps.take();
    return error;
  }

  SharedSteps& _steps;
};

/// Every message is a step.
class SteppingLog : public platform::LogSink {
 public:
  explicit SteppingLog(SharedSteps& steps) : _steps(steps) {}
  void write(int /*level*/, std::string_view /*message*/) override { _steps.take(); }
  bool accepts(int) const noexcept override { return true; }

 private:
  SharedSteps& _steps;
};

class Host {
 public:
  Host(const std::string& folder, SharedSteps& steps)
      : _clock(std::make_shared<tests::LUXClock>(std::chrono::system_clock::now())),
        _owner(std::make_shared<tests::RecordingOwner>()),
        _override(_environment(folder, steps)) {
    _owner->caches = folder + "/caches/help";
    _owner->loggedIn = true;
    // What the plug-in asks and tells is a step, too.
    _owner->onMessage = [&steps](const std::string&) { steps.take(); };
    HelpLUXModel::setGroupList(platform::Value::Dictionary{
        {"DefaultGroup", "Apps"},
        {"Groups",
         platform::Value::Dictionary{
             {"System", platform::Value::Dictionary{
                            {"Books", platform::Value::Dictionary{
                                          {KROrvHelpbookID, platform::Value::Dictionary{}}}}}}}}});
    const std::vector<std::string> books{KROrvHelpbookID, tests::doomedHostKitchen};
    for (const std::string& bookID : books) {
      auto book = ZEBHelpBook::bookWithID(bookID, ZEBHelpBookType1, folder + "/books/" + bookID);
      book->setIndexPaths({folder + "/books/" + bookID + "/book.helpindex"});
      _owner->addBook(book);
    }
    _plugin = HelpPluginController::initWithOwner(_owner);
    _models = _plugin->_luxController();
  }

  [[noreturn]] void build() {
    while (true) {
      _buildBoth();
    }
  }

  [[noreturn]] void synchronise() {
    while (true) {
      for (const auto& entry : _owner->knownBooks()) {
        for (const auto& record : _plugin->_shelf()->indicesForBook(entry.second)) {
          _models->indexDidChange(record, ZEBIndexChangeUpdated);
        }
      }
      _models->_syncModelsWithIndexEvents();
    }
  }

  /// Returns whether all was well.
  bool serve() {
    const std::vector<std::pair<std::string, std::string>> wanted{
        {"printer", "Add a printer"}, {"tomato soup", "Cooking tomato soup"}};
    bool isWell = true;
    const auto expect = [&](bool condition, const std::string& what) {
      if (!condition) {
        std::printf("%s\n", what.c_str());
        isWell = false;
      }
    };
    const auto has = [](const std::vector<std::string>& titles, const std::string& title) {
      return std::find(titles.begin(), titles.end(), title) != titles.end();
    };
    // Nobody waits for models: what the first searches find, they find in the keyword indexes or in
    // models that are whole.
    _clock->onSleep = nullptr;
    for (const auto& [words, title] : wanted) {
      expect(has(_search(words), title), "not found at once: " + title);
    }
    _clock->onSleep = [this](size_t) { _clock->letOthersWork(); };
    _settle();
    for (const auto& [words, title] : wanted) {
      const auto query = tests::LUXWorld::query(words);
      expect(has(tests::titlesOf(
                     _models->doSearchForQuery(query, ZEBHelpArticleResult, {}, {}, nullptr)),
                 title),
             "not found by meaning: " + title);
      _models->completeSearchQuery(query);
    }
    _settle();
    _buildBoth();
    _settle();
    expect(_owner->guards() == 0, "the shutdown guard is held");
    for (const auto& [name, activity] : _models->_registeredModels()) {
      expect(activity == kLUXModelActivityNone, name + " is held");
    }
    return isWell;
  }

 private:
  platform::Environment _environment(const std::string& folder, SharedSteps& steps) const {
    platform::Environment environment = platform::Environment::system();
    environment.clock = _clock;
    environment.files = std::make_shared<SteppingFiles>(steps);
    environment.log = std::make_shared<SteppingLog>(steps);
    environment.notificationCenter = platform::localNotificationCenter();
    environment.userDefaults = platform::userDefaultsFromDictionary({});
    environment.standardOutput = [](const std::string&) {};
    environment.preferredLanguages = {"en"};
    environment.cachesDirectory = folder + "/caches";
    environment.runningApplications = [] { return std::vector<std::string>(); };
    return environment;
  }

  void _buildBoth() {
    for (const char* group : {"Apps", "System"}) {
      _models->startBuildingModelGroupName(group, "English")->waitUntilFinished();
    }
  }

  std::vector<std::string> _search(const std::string& words) {
    _owner->forgetMessages();
    const auto query = tests::LUXWorld::query(words);
    query->setResultTypes({ZEBHelpArticleResult});
    _plugin->startSearchForQuery(query);
    auto titles = tests::titlesOf(_owner->records(0));
    _plugin->completeSearchForQuery(query);
    return titles;
  }

  /// Lets the models catch up with the books.
  void _settle() {
    do {
      _clock->letOthersWork();
      _clock->advance(platform::Seconds(1.5));
    } while (platform::RunLoop::main()->runPending() > 0 ||
             !_models->_pendingIndexEvents().empty() || _owner->guards() > 0 ||
             _models->_modelUpdateQueue()->operationCount() > 0);
  }

  const std::shared_ptr<tests::LUXClock> _clock;
  const std::shared_ptr<tests::RecordingOwner> _owner;
  const platform::EnvironmentOverride _override;
  std::shared_ptr<HelpPluginController> _plugin;
  std::shared_ptr<LUXSearchController> _models;
};

void limitFiles(uint64_t size) {
  if (size > 0) {
    // The system writes as much as the limit allows, and then sends this signal.
    ::signal(SIGXFSZ, [](int) { tests::dieHere(); });
    const rlimit limits{size, size};
    ::setrlimit(RLIMIT_FSIZE, &limits);
  }
}

}  // namespace

int main(int count, char** arguments) {
  if (count != 6) {
    return 2;
  }
  const std::string work = arguments[1];
  SharedSteps steps(arguments[3]);
  if (!steps.areShared()) {
    return 2;
  }
  steps.dieAt(std::strtoull(arguments[4], nullptr, 10));
  limitFiles(std::strtoull(arguments[5], nullptr, 10));
  Host host(arguments[2], steps);
  if (work == tests::doomedHostBuilds) {
    host.build();
  }
  if (work == tests::doomedHostSynchronises) {
    host.synchronise();
  }
  const bool isWell = host.serve();
  std::fflush(stdout);
  // A host does not take its plug-in apart.
  ::_exit(isWell ? 0 : 1);
}
