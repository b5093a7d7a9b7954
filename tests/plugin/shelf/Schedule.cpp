#include "tests/plugin/shelf/Schedule.h"

#include <unistd.h>

#include <algorithm>
#include <chrono>
#include <filesystem>
#include <fstream>
#include <mutex>
#include <random>
#include <thread>

#include "host/Zebrine/ZEBConstants.h"
#include "host/Zebrine/ZEBLog.h"
#include "platform/Clock.h"
#include "platform/Environment.h"
#include "platform/RunLoop.h"
#include "platform/UserDefaults.h"
#include "plugin/operations/ZEBOperationQueue.h"
#include "plugin/records/ZEBHelpindexIndex.h"
#include "plugin/shelf/ZEBIndexGenerationOperation.h"
#include "tests/plugin/shelf/ScheduleWorld.h"
#include "tests/plugin/shelf/ShelfWorld.h"

namespace tests {

namespace {

namespace fs = std::filesystem;
using Random = std::mt19937_64;

constexpr int bookCount = 7;

std::string bookName(int number) { return "org.book" + std::to_string(number); }

void writeFile(const std::string& path, std::string_view bytes) {
  fs::create_directories(fs::path(path).parent_path());
  std::ofstream(path, std::ios::binary) << bytes;
}

std::string readFile(const std::string& path) {
  std::ostringstream bytes;
  bytes << std::ifstream(path, std::ios::binary).rdbuf();
  return bytes.str();
}

/// One run. The world is built, the threads have their way with it, and then it is looked at.
class Run {
 public:
  Run(uint64_t seed, const ScheduleGround& ground);
  ~Run() { fs::remove_all(_caches); }
  Run(const Run&) = delete;
  Run& operator=(const Run&) = delete;

  std::vector<std::string> go();

 private:
  struct Action {
    int kind;
    int book;
    uint64_t choice;
  };

  void _makeBooks();
  void _preparePast(Random& random);
  void _perform(const Action& action);
  void _generate(int book, bool onlyLUX);
  void _tamper(uint64_t choice);
  void _turnMainLoop();
  void _finishWork();
  void _expect(bool condition, const std::string& what);
  void _examine();
  void _examineBook(const std::string& bookID, const ZEBIndexshelf::Indices& records);
  void _examineCacheFile();
  int _broadcastCount() const;
  std::string _generatedRoot() const {
    return _caches + "/" + ZEBDaemonBundleID + "/" + ZEBGeneratedIndexDirectory;
  }

  const std::string _ground;
  const std::string _caches;
  const std::string _cachePath;
  std::vector<std::vector<Action>> _actions;

  const std::shared_ptr<platform::SimulatedClock> _clock;
  const std::shared_ptr<ScheduleFiles> _files;
  const std::shared_ptr<ScheduleLog> _log;
  const std::shared_ptr<ScheduleTool> _tool;
  const std::shared_ptr<RecordingCenter> _center;
  const std::shared_ptr<ShelfOwner> _owner;
  std::optional<platform::EnvironmentOverride> _override;
  std::vector<std::shared_ptr<ZEBHelpBook>> _books;
  std::shared_ptr<ZEBIndexshelf> _shelf;
  const std::shared_ptr<CountingObserver> _observer = std::make_shared<CountingObserver>();
  const std::shared_ptr<CountingObserver> _second = std::make_shared<CountingObserver>();
  std::set<std::string> _revived;
  int _earlierBroadcasts = 0;

  std::mutex _removalsMutex;
  std::map<std::string, int> _removals;
  std::atomic<bool> _wasReset{false};
  std::vector<std::string> _faults;
};

std::string uniqueCaches(const ScheduleGround& ground) {
  static std::atomic<int> counter{0};
  return ground.path() + "/caches" + std::to_string(counter++);
}

Run::Run(uint64_t seed, const ScheduleGround& ground)
    : _ground(ground.path()),
      _caches(uniqueCaches(ground)),
      _cachePath(_caches + "/help/HelpindexCache.plist"),
      _clock(std::make_shared<platform::SimulatedClock>(std::chrono::system_clock::now())),
      _files(std::make_shared<ScheduleFiles>(_cachePath)),
      _log(std::make_shared<ScheduleLog>()),
      _tool(std::make_shared<ScheduleTool>(
          seed, _files, [bytes = ShelfWorld::indexBytes()](const std::string&) { return bytes; })),
      _center(std::make_shared<RecordingCenter>()),
      _owner(std::make_shared<ShelfOwner>(_caches + "/help")) {
  Random random(seed);
  platform::Environment environment = platform::Environment::system();
  environment.clock = _clock;
  environment.files = _files;
  environment.log = _log;
  environment.processLauncher = _tool;
  environment.processTable = std::make_shared<ScheduleProcesses>(
      seed, _generatedRoot() + "/" + bookName(0) + "/" + bookName(0) + ".helpindex");
  environment.notificationCenter = _center;
  environment.userDefaults = platform::userDefaultsFromDictionary({});
  environment.standardOutput = [](const std::string&) {};
  environment.processorCount = [] { return 4; };
  environment.preferredLanguages = {"en"};
  environment.cachesDirectory = _caches;
  _override.emplace(std::move(environment));

  _makeBooks();
  _preparePast(random);
  _actions.resize(2 + random() % 3);
  for (auto& actions : _actions) {
    for (uint64_t count = 3 + random() % 8; count > 0; --count) {
      actions.push_back(
          {static_cast<int>(random() % 32), static_cast<int>(random() % bookCount), random()});
    }
  }
}

void Run::_makeBooks() {
  // Without an index; with one; a bundle of either kind; a remote one; a broken index; no folder.
  const int32_t types[bookCount] = {1, 1, 3, 2, 4, 1, 1};
  for (int i = 0; i < bookCount; ++i) {
    const std::string path = _ground + "/books/" + bookName(i);
    auto book = ZEBHelpBook::bookWithID(bookName(i), types[i], path);
    if (i == 1 || i == 2 || i == 5) {
      book->setIndexPaths({path + "/own.helpindex"});
    }
    if (i == 2 || i == 3) {
      book->setResourcesRootPath(path);
      book->setLocalization("de");
    }
    _books.push_back(std::move(book));
  }
}

/// What an earlier process left behind: generated indexes, and a cache file, perhaps broken.
void Run::_preparePast(Random& random) {
  const platform::Data index = ShelfWorld::indexBytes();
  for (int i = 0; i < bookCount; ++i) {
    if (random() % 4 == 0) {
      const std::string name = _books[static_cast<size_t>(i)]->localization();
      writeFile(_generatedRoot() + "/" + bookName(i) + "/" + (name.empty() ? bookName(i) : name) +
                    ".helpindex",
                index.view());
    }
  }
  const uint64_t past = random() % 4;
  if (past == 0) {
    return;
  }
  {
    const auto earlier = ZEBIndexshelf::initWithOwner(_owner);
    for (const auto& book : _books) {
      if (random() % 2 == 0) {
        earlier->indicesForBook(book);
      }
    }
    earlier->archiveKnownIndices();
  }
  if (past == 1) {
    std::string bytes = readFile(_cachePath);
    bytes[random() % bytes.size()] ^= static_cast<char>(1 + random() % 255);
    bytes.resize(bytes.size() - random() % 2 * (random() % bytes.size()));
    writeFile(_cachePath, bytes);
    _files->allow(std::move(bytes));
  }
}

void Run::_perform(const Action& action) {
  const auto& book = _books[static_cast<size_t>(action.book)];
  switch (action.kind) {
    case 0:
    case 1:
    case 2:
    case 3:
      _shelf->addRegistrationOperationForBook(book);
      break;
    case 4:
    case 5:
    case 6:
      _shelf->ensureRegistrationForBook(book);
      break;
    case 7:
    case 8:
    case 9:
    case 10:
    case 11:
    case 12:
      _shelf->indicesForBook(book);
      break;
    case 13:
    case 14:
    case 15:
      _generate(action.book, action.choice % 2 == 0);
      break;
    case 16:
    case 17:
    case 18:
    case 19: {
      {
        const std::lock_guard lock(_removalsMutex);
        ++_removals[book->bookID()];
      }
      if (action.choice % 3 == 0) {
        _center->postNotification(QWBookRegistrationNotification, book->bookID());
      } else {
        _shelf->removeIndexForBookID(book->bookID());
      }
      break;
    }
    case 20:
      if (action.choice % 3 == 0) {
        _wasReset = true;
        _shelf->_resetForLanguageChange();
      }
      break;
    case 21:
      _shelf->archiveKnownIndices();
      break;
    case 22:
    case 23:
      _shelf->setShouldBeLazy(action.choice % 2 == 0);
      break;
    case 24:
      _shelf->setUserLoggedIn(action.choice % 4 != 0);
      break;
    case 25:
      _shelf->isIndexDownloadingForBook(book);
      _shelf->waitForIndexDownloadCompletionForType4Book(book, 5);
      break;
    case 26:
      _clock->setNow(_clock->now() + std::chrono::hours(action.choice % 40) -
                     std::chrono::hours(20));
      break;
    default:
      _tamper(action.choice);
      break;
  }
}

void Run::_generate(int book, bool onlyLUX) {
  const auto known = _shelf->_knownIndices();
  const auto found = known.find(bookName(book));
  const auto existing =
      found == known.end() || found->second.empty() ? nullptr : found->second.front();
  const auto operation = ZEBIndexGenerationOperation::initWithBook(
      _books[static_cast<size_t>(book)], existing, _shelf, onlyLUX);
  const platform::MonitorLock lock(_shelf->_shelfMonitor());
  _shelf->indexGeneratingQueue()->addOperation(operation);
}

void Run::_tamper(uint64_t choice) {
  switch (choice % 8) {
    case 0:
      _files->diskIsFull = true;
      break;
    case 1:
      _files->readsFailedOnce = true;
      _files->readsFail = true;
      break;
    case 2:
      _files->foldersFail = true;
      break;
    case 3:
      _files->removalsFailedOnce = true;
      _files->removalsFail = true;
      break;
    case 4:
      _tool->release();
      break;
    default:
      _files->diskIsFull = false;
      _files->readsFail = false;
      _files->foldersFail = false;
      _files->removalsFail = false;
      break;
  }
}

void Run::_turnMainLoop() {
  platform::RunLoop::main()->runPending();
  if (_clock->sleeperCount() > 0) {
    _clock->advance(platform::Seconds(1));
  }
  _expect(_files->watchedFileIsWhole(), "the cache file is neither the old nor the new one");
  std::this_thread::yield();
}

void Run::_finishWork() {
  const std::vector<std::shared_ptr<ZEBOperationQueue>> queues = {
      _shelf->indexRegistrationQueue(), _shelf->indexFetchUpdateQueue(),
      _shelf->indexDownloadQueue(), _shelf->assetDownloadQueue(), _shelf->indexGeneratingQueue()};
  const auto areEmpty = [&] {
    return std::all_of(queues.begin(), queues.end(),
                       [](const auto& queue) { return queue->operationCount() == 0; });
  };
  // A download goes on from one queue to the next; its guard tells. One that is never given back is
  // a fault, and found out after a while.
  const auto patience = std::chrono::steady_clock::now() + std::chrono::seconds(60);
  while (!areEmpty() || (_owner->depth() != 0 && std::chrono::steady_clock::now() < patience)) {
    _turnMainLoop();
  }
  for (const auto& queue : queues) {
    queue->waitUntilAllOperationsAreFinished();
  }
  platform::RunLoop::main()->runPending();
}

void Run::_expect(bool condition, const std::string& what) {
  if (!condition && std::find(_faults.begin(), _faults.end(), what) == _faults.end()) {
    _faults.push_back(what);
  }
}

std::vector<std::string> Run::go() {
  if (fs::exists(_cachePath)) {
    _files->allow(readFile(_cachePath));
  }
  _shelf = ZEBIndexshelf::initWithOwner(_owner);
  for (const auto& [bookID, records] : _shelf->_knownIndices()) {
    if (!records.empty()) {
      _revived.insert(bookID);
    }
  }
  _earlierBroadcasts = _broadcastCount();
  _shelf->setUserLoggedIn(true);
  _shelf->addObserver(_observer);
  _shelf->addObserver(_second);

  std::atomic<size_t> left{_actions.size()};
  std::vector<std::thread> threads;
  for (const auto& actions : _actions) {
    threads.emplace_back([&] {
      for (const Action& action : actions) {
        _perform(action);
      }
      --left;
    });
  }
  while (left > 0) {
    _turnMainLoop();
  }
  for (std::thread& thread : threads) {
    thread.join();
  }
  _tool->release();
  // Notifications that are on their way remove books before the rest is waited for.
  platform::RunLoop::main()->runPending();
  _finishWork();
  _examine();

  const std::weak_ptr<ZEBIndexshelf> weak = _shelf;
  _shelf.reset();
  while (!weak.expired()) {
    std::this_thread::yield();
  }
  platform::RunLoop::main()->runPending();
  return _faults;
}

void Run::_examine() {
  _expect(_owner->depth() == 0, "disableShutdown and enableShutdown are not balanced");
  _expect(!_owner->everEnabledTooOften(), "enableShutdown without disableShutdown");
  for (const std::string& surprise : _log->surprises()) {
    _expect(false, "unexpected exception: " + surprise);
  }
  const int limit = _shelf->shouldBeLazy() ? 1 : 4;
  _expect(_shelf->indexGeneratingQueue()->maxConcurrentOperationCount() == limit,
          "the limit of the generating queue does not go with the lazy flag");
  _expect(_wasReset || _shelf->_pendingBookCount() == 0, "a book is left pending");

  const auto counts = _observer->counts();
  _expect(counts == _second->counts(), "two observers heard of different changes");
  const int broadcasts = _broadcastCount() - _earlierBroadcasts;
  _expect(broadcasts == _observer->total(), "changes and broadcasts differ in number");
  int updates = 0;
  int removals = 0;
  for (const auto& [change, count] : counts) {
    updates += change.second == ZEBIndexChangeUpdated ? count : 0;
    removals += change.second == ZEBIndexChangeRemoved ? count : 0;
  }
  int asked = 0;
  for (const auto& entry : _removals) {
    asked += entry.second;
  }
  _expect(removals == asked, "not every removal was told exactly once");
  _expect(updates <= _tool->successes(), "more updates than indexes made");
  if (asked == 0 && !_files->readsFailedOnce && _tool->kills() == 0) {
    _expect(updates == _tool->successes(), "an index that was made was not told of");
  }

  for (const auto& [bookID, records] : _shelf->_knownIndices()) {
    _examineBook(bookID, records);
  }
  for (const auto& book : _books) {
    const std::string& bookID = book->bookID();
    const auto count = [&](ZEBIndexChange kind) {
      const auto found = counts.find({bookID, kind});
      return found == counts.end() ? 0 : found->second;
    };
    const bool stored = count(ZEBIndexChangeAdded) + count(ZEBIndexChangeUpdated) > 0;
    const auto known = _shelf->_knownIndices();
    const bool isKnown = known.contains(bookID) && !known.at(bookID).empty();
    _expect(!isKnown || stored || _revived.contains(bookID), bookID + " came from nowhere");
    _expect(!isKnown || stored || !_removals.contains(bookID), bookID + " was not removed");
    const bool wasRemoved = _wasReset || _removals.contains(bookID);
    _expect(isKnown || wasRemoved || (!stored && !_revived.contains(bookID)), bookID + " is lost");
  }
  _examineCacheFile();
}

int Run::_broadcastCount() const {
  const auto posted = _center->posted();
  return static_cast<int>(std::count_if(posted.begin(), posted.end(), [](const auto& notification) {
    return notification.name == "ZEBIndexDidChangeNotification";
  }));
}

void Run::_examineBook(const std::string& bookID, const ZEBIndexshelf::Indices& records) {
  _expect(records.size() <= 1, bookID + " has several records");
  for (const auto& record : records) {
    _expect(record != nullptr, bookID + " has a null record");
    _expect(record->bookID() == bookID, bookID + " has the record of another book");
    _expect(_wasReset || !record->isRebuilding(), bookID + " seems to be rebuilt for ever");
    _expect(!record->isDownloading(), bookID + " seems to be downloaded for ever");
  }
}

void Run::_examineCacheFile() {
  _expect(_files->watchedFileIsWhole(), "the cache file is neither the old nor the new one");
  if (_wasReset) {
    _expect(_files->removalsFailedOnce || !fs::exists(_cachePath),
            "the cache file came back after a language change");
    return;
  }
  _tamper(7);  // everything works again
  _shelf->archiveKnownIndices();
  _clock->setNow(*_files->modificationDate(_cachePath));
  const auto revived = ZEBIndexshelf::initWithOwner(_owner)->_knownIndices();
  for (const auto& [bookID, records] : _shelf->_knownIndices()) {
    const bool readable = !records.empty() && ZEBIndex::indexWithPath(records.front()->path());
    const auto found = revived.find(bookID);
    _expect(found != revived.end(), bookID + " is not in the cache file");
    _expect(found == revived.end() || found->second.size() == (readable ? 1U : 0U),
            bookID + " is not revived as it was");
  }
  _expect(revived.size() == _shelf->_knownIndices().size(),
          "the cache file holds other books than the shelf");
}

}  // namespace

ScheduleGround::ScheduleGround() {
  // In memory where that can be had: replacing a file on a disk takes longer than a whole run.
  const fs::path memory = "/dev/shm";
  const bool inMemory = ::access(memory.c_str(), W_OK) == 0;
  std::string pattern =
      ((inMemory ? memory : fs::temp_directory_path()) / "zeb-schedules-XXXXXX").string();
  if (::mkdtemp(pattern.data()) == nullptr) {
    throw std::runtime_error("no temporary folder");
  }
  _path = pattern;
  const platform::Data index = ShelfWorld::indexBytes();
  for (int i = 0; i < bookCount; ++i) {
    const std::string book = _path + "/books/" + bookName(i);
    if (i != 6) {
      writeFile(book + "/page.html", "<p>words</p>");
    }
    if (i == 1 || i == 2) {
      writeFile(book + "/own.helpindex", index.view());
    }
    if (i == 5) {
      writeFile(book + "/own.helpindex", index.view().substr(0, index.length() / 2));
    }
  }
}

ScheduleGround::~ScheduleGround() {
  std::error_code ignored;
  fs::remove_all(_path, ignored);
}

std::vector<std::string> runSchedule(uint64_t seed, const ScheduleGround& ground) {
  return Run(seed, ground).go();
}

}  // namespace tests
