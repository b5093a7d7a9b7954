#include "tests/plugin/shelf/ModelSchedule.h"

#include <fmt/format.h>
#include <fmt/ranges.h>
#include <unistd.h>

#include <algorithm>
#include <array>
#include <filesystem>
#include <fstream>
#include <mutex>
#include <random>
#include <stdexcept>
#include <thread>

#include "host/Luxwell/HelpLUXModel.h"
#include "host/Zebrine/ZEBConstants.h"
#include "host/Zebrine/ZEBHelpBook.h"
#include "host/Zebrine/ZEBPlugin.h"
#include "host/Zebrine/ZEBQuery.h"
#include "platform/Applications.h"
#include "platform/DistributedNotificationCenter.h"
#include "platform/Environment.h"
#include "platform/OperationQueue.h"
#include "platform/RunLoop.h"
#include "platform/UserDefaults.h"
#include "platform/WorkerThreads.h"
#include "plugin/front/HelpPluginController.h"
#include "plugin/operations/ZEBOperationQueue.h"
#include "plugin/shelf/ZEBIndexGenerationOperation.h"
#include "tests/LUXPlugin/LUXWorld.h"
#include "tests/platform/OtherThreads.h"
#include "tests/plugin/shelf/ModelScheduleWorld.h"
#include "tests/plugin/shelf/ScheduleWorld.h"
#include "tests/plugin/shelf/ShelfWorld.h"

namespace tests {

namespace {

namespace fs = std::filesystem;
using Random = std::mt19937_64;

/// What a search may take: for its models and for its answers, and a poll of each.
constexpr double timeouts = 8.0 + 16.0;
constexpr double polls = 2 * 0.010;

struct BookPlan {
  const char* name;
  const char* group;
  /// Its index: its own, one that is to be generated, or half a one.
  enum class Index { own, none, half } index;
};

const std::array<BookPlan, 6> plans{{
    {"org.zeb.manual", "System", BookPlan::Index::own},
    {"org.second", "System", BookPlan::Index::own},
    {"org.kitchen", "Apps", BookPlan::Index::own},
    {"org.garden", "Apps", BookPlan::Index::own},
    {"org.made", "Apps", BookPlan::Index::none},
    {"org.half", "Apps", BookPlan::Index::half},
}};
const std::array<std::string, 2> groups{"Apps", "System"};
const std::array<std::string, 2> languages{"English", "German"};

/// Every book has a page of its own name.
std::string titleOf(const std::string& bookID) {
  return "Everything about " + bookID.substr(bookID.rfind('.') + 1);
}

platform::Data indexOf(const std::string& bookID) {
  auto pages = bookID == "org.zeb.manual" ? printerPages() : kitchenPages();
  const std::string name = bookID.substr(bookID.rfind('.') + 1);
  pages.push_back({"own.html", titleOf(bookID), {"The words of " + name + " and its soup."}});
  std::vector<searchkit::Document> documents;
  for (const LUXPage& each : pages) {
    documents.push_back(page("/" + each.key, each.title, each.blocks.front()));
  }
  return platform::classicArchiveWithRootObject(
      platform::Value::Dictionary{{"SKI_INDEX_DATA", keywordIndex(std::move(documents))},
                                  {"LUXIndexData", LUXWorld::semanticData(pages)}});
}

void setGroups() {
  platform::Value::Dictionary list;
  for (const std::string& group : groups) {
    platform::Value::Dictionary books;
    for (const BookPlan& plan : plans) {
      if (group == plan.group) {
        books[plan.name] = platform::Value::Dictionary{};
      }
    }
    list[group] = platform::Value::Dictionary{{"Books", std::move(books)}};
  }
  HelpLUXModel::setGroupList(
      platform::Value::Dictionary{{"DefaultGroup", "Apps"}, {"Groups", std::move(list)}});
}

std::shared_ptr<ZEBHelpBook> bookOf(const BookPlan& plan, const std::string& ground) {
  const std::string path = ground + "/books/" + plan.name;
  auto book = ZEBHelpBook::bookWithID(plan.name, ZEBHelpBookType1, path);
  if (plan.index != BookPlan::Index::none) {
    book->setIndexPaths({path + "/own.helpindex"});
  }
  return book;
}

platform::Environment environmentWith(const std::string& caches,
                                      const std::shared_ptr<ScheduleClock>& clock) {
  platform::Environment environment = platform::Environment::system();
  environment.clock = clock;
  environment.notificationCenter = platform::localNotificationCenter();
  environment.userDefaults = platform::userDefaultsFromDictionary({});
  environment.standardOutput = [](const std::string&) {};
  environment.processorCount = [] { return 1; };
  environment.preferredLanguages = {"en"};
  environment.cachesDirectory = caches;
  environment.runningApplications = [] { return std::vector<std::string>(); };
  return environment;
}

/// One run. The world is built, the threads have their way with it, and then it is looked at.
class Run {
 public:
  Run(uint64_t seed, const ModelScheduleGround& ground);
  ~Run();
  Run(const Run&) = delete;
  Run& operator=(const Run&) = delete;

  std::vector<std::string> go();

 private:
  struct Action {
    uint64_t kind;
    uint64_t choice;
  };

  void _perform(const Action& action);
  void _search(uint64_t choice);
  void _tearModel(uint64_t choice) const;
  void _tamper(uint64_t choice);
  void _changeLanguage(uint64_t choice);
  void _generate(const BookPlan& plan, bool onlyLUX) const;
  std::shared_ptr<ZEBIndex> _knownRecord(const std::string& bookID) const;
  void _tellOfChange(const std::string& bookID, ZEBIndexChange kind) const;

  void _letTimePass(double step);
  static void _nap();
  bool _isWorking() const;
  void _settle();
  void _expect(bool condition, const std::string& what);
  void _examine();
  void _examineModels();
  void _examineModel(const std::string& group, const std::set<std::string>& books);
  void _recover();
  void _searchAfterRecovery(const std::string& bookID, bool byMeaning);

  const std::shared_ptr<ZEBHelpBook>& _book(uint64_t choice) const {
    return _books[choice % _books.size()];
  }
  std::string _modelFolder(uint64_t choice) const {
    return HelpLUXModel::directoryPathForModelGroupName(groups[choice % 2],
                                                        languages[choice / 2 % 4 == 0 ? 1 : 0]);
  }

  const std::string _ground;
  const std::string _caches;
  Random _random;
  std::vector<std::vector<Action>> _actions;
  /// Whether time stands still while anybody works, as on a machine without limits.
  const bool _isPatient;
  const double _step;

  const std::shared_ptr<ScheduleClock> _clock;
  const std::shared_ptr<ScheduleFiles> _files;
  const std::shared_ptr<ModelScheduleLog> _log;
  const std::shared_ptr<ScheduleTool> _tool;
  const std::shared_ptr<ScheduleOwner> _owner;
  std::mutex _environmentsMutex;
  std::vector<std::unique_ptr<platform::EnvironmentOverride>> _environments;
  std::vector<std::shared_ptr<ZEBHelpBook>> _books;
  std::shared_ptr<HelpPluginController> _plugin;
  std::shared_ptr<ScheduleController> _controller;
  unsigned _stepCount = 0;
  OtherThreads _otherThreads;

  std::mutex _queriesMutex;
  std::vector<std::shared_ptr<ZEBQuery>> _queries;
  std::atomic<int> _searches{0};
  std::vector<std::string> _faults;
};

Run::Run(uint64_t seed, const ModelScheduleGround& ground)
    : _ground(ground.path()),
      _caches(ground.path() + "/caches" + std::to_string(seed)),
      _random(seed),
      _isPatient(_random() % 12 == 0),
      _step(std::array<double, 3>{0.02, 0.2, 1.0}[_random() % 3]),
      _clock(std::make_shared<ScheduleClock>(std::chrono::system_clock::now())),
      _files(std::make_shared<ScheduleFiles>(_caches + "/help/HelpindexCache.plist")),
      _log(std::make_shared<ModelScheduleLog>()),
      _tool(std::make_shared<ScheduleTool>(
          seed, _files, [&ground](const std::string& path) { return ground.indexAtPath(path); })),
      _owner(std::make_shared<ScheduleOwner>(_caches + "/help")) {
  fs::remove_all(_caches);
  platform::Environment environment = environmentWith(_caches, _clock);
  environment.files = _files;
  environment.log = _log;
  environment.processLauncher = _tool;
  environment.processTable = std::make_shared<ScheduleProcesses>(seed, "none");
  _environments.push_back(std::make_unique<platform::EnvironmentOverride>(std::move(environment)));
  for (const BookPlan& plan : plans) {
    _books.push_back(bookOf(plan, _ground));
    if (_random() % 8 != 0) {
      _owner->addBook(_books.back());
    }
  }
  if (_random() % 2 == 0) {
    fs::create_directories(_caches + "/org.zeb.zebd");
    fs::copy(_ground + "/past/org.zeb.zebd/Models", _caches + "/org.zeb.zebd/Models",
             fs::copy_options::recursive);
    for (uint64_t count = _random() % 3; count > 0; --count) {
      _tearModel(_random());
    }
  }
  _plugin = HelpPluginController::initWithOwner(_owner);
  _controller = std::make_shared<ScheduleController>(_owner);
  _controller->setIndexshelf(_plugin->_shelf());
  _plugin->_setLuxSearchController(_controller);
  _plugin->_shelf()->setUserLoggedIn(true);
  _owner->loggedIn = true;

  _actions.resize(2 + _random() % 2);
  for (auto& actions : _actions) {
    for (uint64_t count = 2 + _random() % 6; count > 0; --count) {
      actions.push_back({_random() % 32, _random()});
    }
  }
}

Run::~Run() {
  while (!_environments.empty()) {
    _environments.pop_back();
  }
  fs::remove_all(_caches);
}

void Run::_perform(const Action& action) {
  const uint64_t choice = action.choice;
  switch (action.kind) {
    case 0:
    case 1:
    case 2:
    case 3:
    case 4:
    case 5:
    case 6:
      _search(choice);
      break;
    case 7: {
      const std::lock_guard lock(_queriesMutex);
      if (!_queries.empty()) {
        _queries[choice % _queries.size()]->cancel();
      }
      break;
    }
    case 8:
    case 9:
      _plugin->finishPopulatingBookWithID(_book(choice)->bookID());
      break;
    case 10:
    case 11:
      _plugin->_shelf()->indicesForBook(_book(choice));
      break;
    case 12:
      _generate(plans[choice % plans.size()], choice % 16 < 8);
      break;
    case 13:
      _plugin->_shelf()->removeIndexForBookID(_book(choice)->bookID());
      break;
    case 14:
      _owner->forgetBook(_book(choice)->bookID());
      _plugin->_shelf()->removeIndexForBookID(_book(choice)->bookID());
      break;
    case 15:
      _owner->addBook(_book(choice));
      _plugin->finishPopulatingBookWithID(_book(choice)->bookID());
      break;
    case 16:
    case 17: {
      const auto build = _controller->startBuildingModelGroupName(
          groups[choice % 2], languages[choice % 8 == 0 ? 1 : 0]);
      if (choice % 5 == 0) {
        build->cancel();
      }
      break;
    }
    case 18:
    case 19:
      _plugin->finishPopulatingKnownBooks();
      break;
    case 20:
      _controller->loadLUXModels();
      break;
    case 21:
    case 22:
      _controller->processPendingIndexEvents();
      break;
    case 23:
    case 24:
      _tellOfChange(_book(choice)->bookID(),
                    choice % 2 == 0 ? ZEBIndexChangeUpdated : ZEBIndexChangeAdded);
      break;
    case 25:
    case 26:
      _tearModel(choice);
      break;
    case 27:
      _changeLanguage(choice);
      break;
    case 28:
      _owner->lazy = choice % 2 == 0;
      break;
    default:
      _tamper(choice);
      break;
  }
}

void Run::_search(uint64_t choice) {
  const std::array<const char*, 5> texts{"print the soup", "tray", "everything about kitchen",
                                         "pri", "garden"};
  const std::array<std::vector<std::string>, 6> kinds{
      {{ZEBHelpArticleResult},
       {ZEBHelpArticleResult},
       {ZEBHelpArticleResult, ZEBHelpSuggestionResult},
       {ZEBHelpArticleResult, ZEBHelpSimilarSuggestionResult},
       {ZEBHelpArticleResult, ZEBHelpActionResult},
       {ZEBHelpSuggestionResult}}};
  const auto query = ZEBQuery::initWithQueryString(texts[choice % texts.size()]);
  query->setResultTypes(kinds[choice / 8 % kinds.size()]);
  if (choice / 64 % 2 == 0) {
    query->setScope({_book(choice / 128)->bookID()});
    query->setOptions(
        platform::Value::Dictionary{{ZEBQuerySearchAllBooksOptionKey, choice / 1024 % 3 == 0}});
  }
  if (choice / 4096 % 5 == 0) {
    query->setPreferredLanguages({choice / 4096 % 2 == 0 ? "de" : "tlh"});
  }
  {
    const std::lock_guard lock(_queriesMutex);
    _queries.push_back(query);
  }
  ++_searches;
  _plugin->startSearchForQuery(query);
  _plugin->completeSearchForQuery(query);
}

/// As a failing disk, a careless user or an interrupted restore of a backup leaves it.
void Run::_tearModel(uint64_t choice) const {
  const std::string folder = _modelFolder(choice / 8);
  const std::string file = folder + "/LUXModel";
  std::error_code ignored;
  const uintmax_t size = fs::file_size(file, ignored);
  if (ignored) {
    return;
  }
  switch (choice % 4) {
    case 0:
      fs::remove(file, ignored);
      break;
    case 1:
      fs::remove_all(folder, ignored);
      break;
    case 2:
      fs::resize_file(file, choice / 64 % (size + 1), ignored);
      break;
    default: {
      std::fstream bytes(file, std::ios::binary | std::ios::in | std::ios::out);
      bytes.seekp(static_cast<std::streamoff>(choice / 64 % (size + 1)));
      bytes << "torn";
      break;
    }
  }
}

void Run::_tamper(uint64_t choice) {
  switch (choice % 8) {
    case 0:
      _files->diskIsFull = true;
      break;
    case 1:
      _files->readsFail = true;
      break;
    case 2:
      _files->foldersFail = true;
      break;
    case 3:
      _files->removalsFail = true;
      break;
    case 4:
      _tool->release();
      break;
    case 5:
      if (choice / 8 % 3 == 0) {
        _owner->breakNextBuild();
      }
      break;
    default:
      _files->diskIsFull = false;
      _files->readsFail = false;
      _files->foldersFail = false;
      _files->removalsFail = false;
      break;
  }
}

void Run::_changeLanguage(uint64_t choice) {
  const std::lock_guard lock(_environmentsMutex);
  platform::Environment environment = *platform::Environment::current();
  environment.preferredLanguages = {choice % 2 == 0 ? "de" : "en"};
  _environments.push_back(std::make_unique<platform::EnvironmentOverride>(std::move(environment)));
  _plugin->notifyEvent(ZEBPluginEventLanguageChanged, {});
}

void Run::_generate(const BookPlan& plan, bool onlyLUX) const {
  const auto& shelf = _plugin->_shelf();
  const auto book = _owner->bookWithID(plan.name);
  if (!book || plan.index != BookPlan::Index::none) {
    return;
  }
  const auto operation =
      ZEBIndexGenerationOperation::initWithBook(book, _knownRecord(plan.name), shelf, onlyLUX);
  const platform::MonitorLock lock(shelf->_shelfMonitor());
  shelf->indexGeneratingQueue()->addOperation(operation);
}

std::shared_ptr<ZEBIndex> Run::_knownRecord(const std::string& bookID) const {
  const auto known = _plugin->_shelf()->_knownIndices();
  const auto found = known.find(bookID);
  return found == known.end() || found->second.empty() ? nullptr : found->second.front();
}

void Run::_tellOfChange(const std::string& bookID, ZEBIndexChange kind) const {
  if (const auto record = _knownRecord(bookID)) {
    _controller->indexDidChange(record, kind);
  }
}

void Run::_letTimePass(double step) {
  platform::RunLoop::main()->runPending();
  if (_isPatient && !_otherThreads.areBlocked()) {
    _nap();
    return;
  }
  if (_clock->sleeperCount() > 0) {
    // In steps of all sizes, or long waits would take for ever.
    constexpr unsigned sizes = 8;
    const double length = step * static_cast<double>(1U << (_stepCount++ % sizes));
    _clock->advance(platform::Seconds(std::min(length, 1.0)));
  }
  std::this_thread::yield();
}

/// Leaves the processor to those who work.
void Run::_nap() { std::this_thread::sleep_for(std::chrono::microseconds(50)); }

bool Run::_isWorking() const {
  const auto& shelf = _plugin->_shelf();
  return _owner->guards() != 0 || _controller->_queryInProgress() || _controller->_loading() ||
         _controller->_modelUpdateQueue()->operationCount() != 0 ||
         shelf->indexRegistrationQueue()->operationCount() != 0 ||
         shelf->indexGeneratingQueue()->operationCount() != 0 ||
         shelf->indexFetchUpdateQueue()->operationCount() != 0 ||
         shelf->indexDownloadQueue()->operationCount() != 0 ||
         shelf->assetDownloadQueue()->operationCount() != 0;
}

/// Lets everything that was begun come to its end, timers too.
void Run::_settle() {
  constexpr double quietPeriod = 1.5;
  while (true) {
    _letTimePass(1.0);
    if (_isWorking()) {
      _nap();
      continue;
    }
    _clock->advance(platform::Seconds(quietPeriod));
    // What was handed to a thread that has not begun with it is seen by the thread's not resting.
    if (platform::RunLoop::main()->runPending() == 0 && _otherThreads.areBlocked() &&
        !_isWorking()) {
      return;
    }
  }
}

void Run::_expect(bool condition, const std::string& what) {
  if (!condition && std::find(_faults.begin(), _faults.end(), what) == _faults.end()) {
    _faults.push_back(what);
  }
}

std::vector<std::string> Run::go() {
  std::atomic<size_t> left{_actions.size()};
  std::vector<std::thread> threads;
  for (const auto& actions : _actions) {
    threads.emplace_back([&] {
      platform::setCurrentThreadName("searcher");
      for (const Action& action : actions) {
        _perform(action);
      }
      --left;
    });
  }
  while (left > 0) {
    _letTimePass(_step);
  }
  for (std::thread& thread : threads) {
    thread.join();
  }
  _tool->release();
  _settle();
  _examine();
  _recover();
  _examine();

  const std::weak_ptr<LUXSearchController> weak = _controller;
  _controller->setIndexshelf(nullptr);
  _controller.reset();
  _plugin.reset();
  // Threads that have done their work may still hold it for a moment.
  while (!weak.expired()) {
    std::this_thread::yield();
  }
  platform::RunLoop::main()->runPending();
  return _faults;
}

void Run::_examine() {
  _expect(_owner->guards() == 0, "disableShutdown and enableShutdown are not balanced");
  _expect(!_owner->everEnabledTooOften(), "enableShutdown without disableShutdown");
  _expect(_owner->finished() == _searches, "not every search told of its end once");
  for (const std::string& surprise : _log->surprises()) {
    _expect(false, "unexpected message: " + surprise);
  }
  _expect(!_controller->_queryInProgress(), "a query seems to run for ever");
  _expect(!_controller->_loading(), "a preload seems to run for ever");
  // Whoever waits looks again after each poll; how long that takes is the machine's affair, unless
  // time stands still meanwhile.
  _expect(_controller->longestSleep() <= timeouts + polls + 1e-6,
          "a search slept past its time-outs");
  _expect(
      !_isPatient || _controller->longestSearch() <= timeouts + 2 * std::max(_step, 1.0) + polls,
      "a search took longer than its time-outs");
  const int broken = _owner->brokenBuilds();
  _expect(broken <= 1, "a build was begun beside one that had broken off");
  int building = 0;
  for (const auto& [name, activity] : _controller->_registeredModels()) {
    building += activity == kLUXModelActivityBuilding ? 1 : 0;
    _expect(activity == kLUXModelActivityNone || activity == kLUXModelActivityBuilding,
            name + " is held by nobody for " + std::to_string(activity));
  }
  _expect(building == broken, "models marked as building and builds that broke off differ");
  _examineModels();
}

void Run::_examineModels() {
  const std::string root = _caches + "/org.zeb.zebd/Models";
  if (!fs::exists(root)) {
    return;
  }
  for (const auto& entry : fs::recursive_directory_iterator(root)) {
    const std::string name = entry.path().filename().string();
    const bool isBook =
        std::any_of(plans.begin(), plans.end(), [&](const BookPlan& p) { return name == p.name; });
    _expect(entry.is_directory() || name == "LUXModel" || isBook, "left behind: " + name);
  }
}

/// What has to be so once nothing fails any more: the models follow the books, and searches find
/// pages by keyword and, unless a build has broken off, by meaning.
void Run::_recover() {
  _tamper(7);  // everything works again
  _owner->mendBuilds();
  _owner->lazy = false;
  _changeLanguage(1);  // the language of the books
  const auto& shelf = _plugin->_shelf();
  for (const auto& book : _books) {
    _owner->addBook(book);
    shelf->ensureRegistrationForBook(book);
    shelf->indicesForBook(book);
  }
  _settle();
  const bool isBroken = _owner->brokenBuilds() > 0;
  if (!isBroken) {
    // Finds the damage that does not show when a model is opened.
    _plugin->finishPopulatingKnownBooks();
    _settle();
  }
  // Twice: a build may have an index generated, and the news of that is taken to be processed with
  // what the build was for.
  for (int round = 0; round < 2; ++round) {
    for (const BookPlan& plan : plans) {
      _tellOfChange(plan.name, ZEBIndexChangeUpdated);
    }
    _settle();
  }
  std::map<std::string, std::set<std::string>> books;
  for (const BookPlan& plan : plans) {
    const auto record = std::dynamic_pointer_cast<ZEBHelpindexIndex>(_knownRecord(plan.name));
    if (record && record->shouldUseLUXIndex()) {
      books[plan.group].insert(plan.name);
    }
  }
  _expect(isBroken || _controller->_pendingIndexEvents().empty(), "a change is left pending");
  for (const std::string& group : groups) {
    _expect(books[group].size() >= 2, "a book with an index of its own is lost");
    if (!isBroken) {
      _examineModel(group, books[group]);
    }
  }
  for (const size_t book : {0U, 2U}) {
    _searchAfterRecovery(plans[book].name, !isBroken);
  }
  _settle();
}

void Run::_examineModel(const std::string& group, const std::set<std::string>& books) {
  const std::string language = LUXSearchController::currentLanguageFolderName();
  const auto model = HelpLUXModel::initWithDirectoryPath(
      HelpLUXModel::directoryPathForModelGroupName(group, language), language);
  _expect(model != nullptr, "the model of " + group + " cannot be opened");
  if (model) {
    model->loadLSMMap();
    _expect(!model->needsBuild(), "the model of " + group + " is damaged");
    const auto names = model->allHelpbookIDs();
    _expect(std::set<std::string>(names.begin(), names.end()) == books,
            "the model of " + group + " has the books " +
                fmt::format("{}", fmt::join(names, ", ")) + " instead of " +
                fmt::format("{}", fmt::join(books, ", ")));
  }
}

void Run::_searchAfterRecovery(const std::string& bookID, bool byMeaning) {
  const auto query = ZEBQuery::initWithQueryString(titleOf(bookID));
  query->setScope({bookID});
  query->setResultTypes({ZEBHelpArticleResult});
  ++_searches;
  std::vector<std::string> found;
  std::atomic<bool> isOver{false};
  std::thread searcher([&] {
    platform::setCurrentThreadName("searcher");
    _plugin->startSearchForQuery(query);
    _plugin->completeSearchForQuery(query);
    if (byMeaning) {
      found = titlesOf(_controller->doSearchForQuery(query, ZEBHelpArticleResult, {}, {}, nullptr));
    }
    isOver = true;
  });
  double step = 0.01;
  while (!isOver) {
    // Not before all others have done what they can: this search is to find what there is.
    platform::RunLoop::main()->runPending();
    if (_clock->sleeperCount() > 0 && _otherThreads.areBlocked()) {
      _clock->advance(platform::Seconds(step));
      step = std::min(step * 2, 1.0);
    } else {
      _nap();
    }
  }
  searcher.join();
  const auto contains = [&](const std::vector<std::string>& titles) {
    return std::find(titles.begin(), titles.end(), titleOf(bookID)) != titles.end();
  };
  const auto delivered = _owner->titlesFor(query->queryID());
  _expect(contains(delivered),
          fmt::format("{} is not found, but {}", bookID, fmt::join(delivered, ", ")));
  _expect(!byMeaning || contains(found),
          fmt::format("{} is not found by meaning, but {}", bookID, fmt::join(found, ", ")));
}

/// The models that the ground's past leaves: built by a plug-in of that time.
void buildModelsOfThePast(const std::string& ground) {
  const auto clock = std::make_shared<ScheduleClock>(std::chrono::system_clock::now());
  const platform::EnvironmentOverride past(environmentWith(ground + "/past", clock));
  const auto owner = std::make_shared<ScheduleOwner>(ground + "/past/help");
  for (const BookPlan& plan : plans) {
    owner->addBook(bookOf(plan, ground));
  }
  const auto shelf = ZEBIndexshelf::initWithOwner(owner);
  const auto controller = std::make_shared<ScheduleController>(owner);
  controller->setIndexshelf(shelf);
  for (const std::string& group : groups) {
    for (const std::string& language : languages) {
      controller->startBuildingModelGroupName(group, language)->waitUntilFinished();
    }
  }
  // The past is over when its last pass of synchronisation is.
  while (!controller->_pendingIndexEvents().empty() || owner->guards() > 0) {
    clock->advance(platform::Seconds(1));
    platform::RunLoop::main()->runPending();
    std::this_thread::yield();
  }
  controller->setIndexshelf(nullptr);
}

}  // namespace

ModelScheduleGround::ModelScheduleGround() {
  // In memory where that can be had: replacing a file on a disk takes longer than a whole run.
  const fs::path memory = "/dev/shm";
  const bool inMemory = ::access(memory.c_str(), W_OK) == 0;
  std::string pattern =
      ((inMemory ? memory : fs::temp_directory_path()) / "zeb-models-XXXXXX").string();
  if (::mkdtemp(pattern.data()) == nullptr) {
    throw std::runtime_error("no temporary folder");
  }
  _path = pattern;
  setGroups();
  for (const BookPlan& plan : plans) {
    const std::string book = _path + "/books/" + plan.name;
    fs::create_directories(book);
    std::ofstream(book + "/own.html") << "<p>words</p>";
    const platform::Data index = indexOf(plan.name);
    _indexes[plan.name] = index;
    if (plan.index != BookPlan::Index::none) {
      const size_t length =
          plan.index == BookPlan::Index::half ? index.length() / 2 : index.length();
      std::ofstream(book + "/own.helpindex", std::ios::binary) << index.view().substr(0, length);
    }
  }
  buildModelsOfThePast(_path);
}

ModelScheduleGround::~ModelScheduleGround() {
  HelpLUXModel::setGroupList({});
  std::error_code ignored;
  fs::remove_all(_path, ignored);
}

platform::Data ModelScheduleGround::indexAtPath(const std::string& path) const {
  // Each book's in a folder of its name.
  return _indexes.at(
      platform::lastPathComponent(platform::stringByDeletingLastPathComponent(path)));
}

std::vector<std::string> runModelSchedule(uint64_t seed, const ModelScheduleGround& ground) {
  return Run(seed, ground).go();
}

}  // namespace tests
