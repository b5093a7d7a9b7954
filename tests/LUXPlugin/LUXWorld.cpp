#include "tests/LUXPlugin/LUXWorld.h"

#include <algorithm>
#include <chrono>
#include <filesystem>
#include <thread>

#include "host/Luxwell/HelpTokenizer.h"
#include "host/Luxwell/LUXIndexWriter.h"
#include "platform/DistributedNotificationCenter.h"
#include "platform/OperationQueue.h"
#include "platform/Processes.h"
#include "platform/RunLoop.h"
#include "platform/UserDefaults.h"
#include "plugin/operations/ZEBOperationQueue.h"

namespace tests {

namespace {

/// Starts nothing.
class NoLauncher : public platform::ProcessLauncher {
 public:
  int launchAndWait(const std::string&, const std::vector<std::string>&) override { return 1; }
};

class NoProcesses : public platform::ProcessTable {
 public:
  int readProcesses(std::vector<platform::ProcessEntry>& entries) const override {
    entries.clear();
    return 0;
  }
};

/// After that a thread that is not blocked is taken to wait all the same.
constexpr std::chrono::seconds patience{2};

}  // namespace

LUXClock::LUXClock(std::chrono::system_clock::time_point start) : SimulatedClock(start) {
  onSleep = [this](size_t) { letOthersWork(); };
}

void LUXClock::letOthersWork() {
  const std::lock_guard lock(_otherThreadsMutex);
  _otherThreads.waitUntilBlocked(patience);
}

void LUXClock::sleep(platform::Seconds duration) {
  size_t count = 0;
  {
    const std::lock_guard lock(_mutex);
    const std::string& thread = platform::currentThreadName();
    _sleeps.push_back({thread, duration.count()});
    count = static_cast<size_t>(std::count_if(_sleeps.begin(), _sleeps.end(),
                                              [&](const Sleep& s) { return s.thread == thread; }));
  }
  if (const auto hook = onSleep.get()) {
    hook(count);
  }
  advance(duration);
}

std::vector<LUXClock::Sleep> LUXClock::sleeps() const {
  const std::lock_guard lock(_mutex);
  return _sleeps;
}

std::vector<double> LUXClock::sleepsOf(const std::string& thread) const {
  std::vector<double> lengths;
  for (const Sleep& sleep : sleeps()) {
    if (sleep.thread == thread) {
      lengths.push_back(sleep.seconds);
    }
  }
  return lengths;
}

void LUXClock::forgetSleeps() {
  const std::lock_guard lock(_mutex);
  _sleeps.clear();
}

LUXWorld::LUXWorld()
    : clock(std::make_shared<LUXClock>(std::chrono::system_clock::now())),
      log(std::make_shared<platform::CapturingLogSink>()),
      files(std::make_shared<platform::FailingFileManager>()),
      owner(std::make_shared<RecordingOwner>()),
      _environment(platform::Environment::system()) {
  _environment.clock = clock;
  _environment.log = log;
  _environment.files = files;
  _environment.processLauncher = std::make_shared<NoLauncher>();
  _environment.processTable = std::make_shared<NoProcesses>();
  _environment.notificationCenter = platform::localNotificationCenter();
  _environment.userDefaults = platform::userDefaultsFromDictionary({});
  _environment.standardOutput = [](const std::string&) {};
  _environment.processorCount = [] { return 2; };
  _environment.preferredLanguages = {"en", "de"};
  _environment.cachesDirectory = folder.path("caches");
  _environment.runningApplications = [this] { return runningApplications; };
  _override.emplace(_environment);
  owner->caches = folder.path("caches/help");
  shelf = ZEBIndexshelf::initWithOwner(owner);
  controller = std::make_shared<LUXTestController>(owner);
  controller->setIndexshelf(shelf);
  owner->forgetMessages();
  log->clear();
}

LUXWorld::~LUXWorld() {
  owner->onMessage = nullptr;
  // Preloads run on threads of their own, and need the clock to go on.
  (void)waitUntil([&] { return owner->guards() == 0; });
  clock->onSleep = nullptr;
  finishWork();
  // What has just ended may have begun something else.
  EXPECT_TRUE(waitUntil([&] { return owner->guards() == 0; }))
      << "disableShutdown and enableShutdown are not balanced";
  EXPECT_FALSE(controller->_queryInProgress());
  // The shelf keeps its observers; who does not keep the shelf in turn is freed with it.
  controller->setIndexshelf(nullptr);
  const std::weak_ptr<LUXSearchController> weak = controller;
  controller.reset();
  shelf.reset();
  EXPECT_TRUE(waitUntil([&] { return weak.expired(); })) << "the controller is kept alive";
  // The run loop is the same for all tests: timers that were left fire here, and find nobody.
  clock->advance(std::chrono::hours(1));
  platform::RunLoop::main()->runPending();
  HelpLUXModel::setGroupList({});
}

void LUXWorld::change(const std::function<void(platform::Environment&)>& edit) {
  edit(_environment);
  _override.emplace(_environment);
}

platform::Data LUXWorld::semanticData(const std::vector<LUXPage>& pages) {
  LUXIndexWriter writer(HelpTokenizer::tokenizerForLanguage("English"));
  for (const LUXPage& page : pages) {
    writer.addDocument(
        {page.key, page.title, page.description, page.excludedFromSearch, page.blocks});
  }
  return writer.finish();
}

std::shared_ptr<ZEBHelpBook> LUXWorld::addBook(const std::string& bookID,
                                               const std::vector<LUXPage>& pages,
                                               const std::string& group, int32_t type) {
  _pages[bookID] = pages;
  return addBookWithData(bookID, semanticData(pages), group, type);
}

std::shared_ptr<ZEBHelpBook> LUXWorld::addBookWithData(const std::string& bookID,
                                                       const std::optional<platform::Data>& data,
                                                       const std::string& group, int32_t type) {
  auto book = ZEBHelpBook::bookWithID(bookID, type, folder.path("books/" + bookID));
  book->setIndexPaths({writeIndex(bookID, data)});
  owner->addBook(book);
  if (!group.empty()) {
    setBook(ZEBHelpBook::unversionedbookIDFromBookID(bookID), group);
  }
  return book;
}

std::string LUXWorld::writeIndex(const std::string& bookID,
                                 const std::optional<platform::Data>& data) const {
  std::vector<searchkit::Document> documents{page("/start.html", "Start", "words of " + bookID)};
  if (const auto pages = _pages.find(bookID); pages != _pages.end()) {
    for (const LUXPage& each : pages->second) {
      std::string text;
      for (const std::string& block : each.blocks) {
        text += block + "\n";
      }
      documents.push_back(page("/" + each.key, each.title, text));
    }
  }
  platform::Value::Dictionary content{{"SKI_INDEX_DATA", keywordIndex(std::move(documents))}};
  if (data) {
    content["LUXIndexData"] = *data;
  }
  std::string path = folder.path("books/" + bookID + "/book.helpindex");
  std::filesystem::create_directories(folder.path("books/" + bookID));
  // A new file in the old one's place: records keep a mapping of the old one.
  EXPECT_FALSE(platform::systemFileManager()->writeAtomically(
      path, platform::classicArchiveWithRootObject(std::move(content))));
  return path;
}

void LUXWorld::setBook(const std::string& bookID, const std::string& group,
                       platform::Value::Dictionary properties) {
  _books[group][bookID] = std::move(properties);
  _applyGroupList();
}

void LUXWorld::setGroupWeight(const std::string& group, double weight) {
  _weights[group] = weight;
  _applyGroupList();
}

void LUXWorld::_applyGroupList() const {
  platform::Value::Dictionary groups;
  for (const auto& [group, books] : _books) {
    platform::Value::Dictionary entry{{"Books", books}};
    if (const auto weight = _weights.find(group); weight != _weights.end()) {
      entry["Weight"] = weight->second;
    }
    groups[group] = std::move(entry);
  }
  HelpLUXModel::setGroupList(
      platform::Value::Dictionary{{"DefaultGroup", _books.begin()->first}, {"Groups", groups}});
}

void LUXWorld::build(const std::string& group, const std::string& language) const {
  const auto model =
      controller->aquiredModelWithGroupName(group, language, kLUXModelActivityBuilding, 5.0);
  ASSERT_TRUE(model) << group;
  EXPECT_TRUE(controller->updateExistingModel(model, language, group));
  log->clear();
  owner->forgetMessages();
  clock->forgetSleeps();
}

std::shared_ptr<ZEBQuery> LUXWorld::query(const std::string& text, std::vector<std::string> scope,
                                          platform::Value::Dictionary options) {
  auto made = ZEBQuery::initWithQueryString(text);
  made->setScope(std::move(scope));
  made->setOptions(std::move(options));
  return made;
}

std::vector<LogEntry> LUXWorld::loggedBeginningWith(
    const std::vector<std::string>& beginnings) const {
  std::vector<LogEntry> entries = log->entries();
  std::erase_if(entries, [&](const LogEntry& entry) {
    return std::none_of(beginnings.begin(), beginnings.end(), [&](const std::string& beginning) {
      return entry.message.starts_with(beginning);
    });
  });
  return entries;
}

bool LUXWorld::nothingIsHeld() const {
  const auto models = controller->_registeredModels();
  return std::all_of(models.begin(), models.end(),
                     [](const auto& model) { return model.second == kLUXModelActivityNone; });
}

bool LUXWorld::waitUntil(const std::function<bool()>& done) {
  const auto limit = std::chrono::steady_clock::now() + std::chrono::seconds(20);
  while (std::chrono::steady_clock::now() < limit) {
    if (done()) {
      return true;
    }
    std::this_thread::sleep_for(std::chrono::microseconds(100));
  }
  return false;
}

void LUXWorld::finishWork() const {
  controller->_modelUpdateQueue()->waitUntilAllOperationsAreFinished();
  const auto queues = {shelf->indexRegistrationQueue(), shelf->indexFetchUpdateQueue(),
                       shelf->indexDownloadQueue(), shelf->assetDownloadQueue(),
                       shelf->indexGeneratingQueue()};
  EXPECT_TRUE(waitUntil([&] {
    return std::all_of(queues.begin(), queues.end(),
                       [](const auto& queue) { return queue->operationCount() == 0; }) &&
           owner->guards() == 0;
  })) << "work did not end";
}

std::vector<std::string> titlesOf(const std::vector<std::shared_ptr<ZEBResult>>& results) {
  std::vector<std::string> titles;
  titles.reserve(results.size());
  for (const auto& result : results) {
    titles.push_back(result->title().value_or("(none)"));
  }
  return titles;
}

std::vector<double> relevancesOf(const std::vector<std::shared_ptr<ZEBResult>>& results) {
  std::vector<double> relevances;
  relevances.reserve(results.size());
  for (const auto& result : results) {
    relevances.push_back(result->relevance().doubleValue());
  }
  return relevances;
}

std::string urlOf(const std::shared_ptr<ZEBResult>& result) {
  return result->payloadValueForKey(ZEBResultURLKey).stringValue().value_or("(none)");
}

std::vector<LUXPage> printerPages() {
  return {
      {"add.html",
       "Add a printer",
       {"Connect the network printer and open the print settings.",
        "Choose the print queue of the network printer. Paper is loaded in the tray."},
       "How printers are added"},
      {"queue.html",
       "The print queue",
       {"Documents wait in the print queue until the printer has paper.",
        "A document can be removed from the print queue."}},
      {"jam.html",
       "Clear a paper jam",
       {"Open the tray of the printer and remove the paper.", "Then start the print queue again."}},
  };
}

std::vector<LUXPage> kitchenPages() {
  return {
      {"soup.html",
       "Cooking tomato soup",
       {"Chop tomatoes, add water and cook for an hour.", "Serve the tomato soup with bread."}},
      {"bread.html",
       "Baking bread",
       {"Mix flour with water and bake the bread for an hour.", "Serve with tomato soup."}},
      {"secret.html", "Secret recipes", {"Tomato soup with secret spices."}, {}, true},
  };
}

}  // namespace tests
