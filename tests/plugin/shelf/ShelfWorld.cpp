#include "tests/plugin/shelf/ShelfWorld.h"

#include <gtest/gtest.h>

#include <algorithm>
#include <filesystem>
#include <sstream>

#include "host/Zebrine/ZEBConstants.h"
#include "platform/RunLoop.h"
#include "platform/UserDefaults.h"
#include "plugin/operations/ZEBOperationQueue.h"
#include "plugin/records/ZEBHelpindexIndex.h"

namespace tests {

void ShelfOwner::disableShutdown() {
  ++_depth;
  ++_disableCount;
}

void ShelfOwner::enableShutdown() {
  if (--_depth < 0) {
    _everNegative = true;
  }
}

void ShelfOwner::notifyBookshelfOfModificationsToBook(const std::shared_ptr<ZEBHelpBook>& book) {
  const std::lock_guard lock(_mutex);
  _modified.push_back(book);
}

std::vector<std::shared_ptr<ZEBHelpBook>> ShelfOwner::modified() const {
  const std::lock_guard lock(_mutex);
  return _modified;
}

int RecordingLauncher::launchAndWait(const std::string& path,
                                     const std::vector<std::string>& arguments) {
  Launch launch{path, arguments, {}};
  const auto option = std::find(arguments.begin(), arguments.end(), "--file");
  if (option != arguments.end() && option + 1 != arguments.end()) {
    launch.outputPath = *(option + 1);
  }
  Behaviour behaviour;
  {
    const std::lock_guard lock(_mutex);
    _launches.push_back(launch);
    behaviour = _behaviour;
  }
  return behaviour(launch);
}

std::vector<RecordingLauncher::Launch> RecordingLauncher::launches() const {
  const std::lock_guard lock(_mutex);
  return _launches;
}

void RecordingLauncher::behave(Behaviour behaviour) {
  const std::lock_guard lock(_mutex);
  _behaviour = std::move(behaviour);
}

int FakeProcessTable::readProcesses(std::vector<platform::ProcessEntry>& entries) const {
  ++reads;
  if (!failures.empty()) {
    const int failure = failures.front();
    failures.erase(failures.begin());
    if (failure != 0) {
      return failure;
    }
  }
  entries = processes;
  return 0;
}

std::optional<platform::Data> FakeProcessTable::argumentsOfProcess(int processID) const {
  asked.push_back(processID);
  const auto found = areas.find(processID);
  return found == areas.end() ? std::nullopt : std::optional(platform::Data::copy(found->second));
}

void FakeProcessTable::add(int processID, const std::string& name,
                           const std::vector<std::string>& arguments) {
  processes.push_back({processID, name});
  std::string area;
  for (const std::string& argument : arguments) {
    area += argument + '\0';
  }
  areas[processID] = area;
}

RecordingCenter::Observation RecordingCenter::addObserver(const std::string& name,
                                                          Handler handler) {
  observedNames.push_back(name);
  return _center->addObserver(name, std::move(handler));
}

void RecordingCenter::postNotification(const std::string& name, std::optional<std::string> object) {
  {
    const std::lock_guard lock(_mutex);
    _posted.push_back({name, object});
  }
  if (onPost) {
    onPost();
  }
  _center->postNotification(name, std::move(object));
}

std::vector<platform::DistributedNotification> RecordingCenter::posted() const {
  const std::lock_guard lock(_mutex);
  return _posted;
}

void RecordingObserver::indexDidChange(const std::shared_ptr<ZEBIndex>& index,
                                       ZEBIndexChange kind) {
  const Change change{index, kind, std::this_thread::get_id()};
  {
    const std::lock_guard lock(_mutex);
    _changes.push_back(change);
  }
  if (onChange) {
    onChange(change);
  }
}

std::vector<RecordingObserver::Change> RecordingObserver::changes() const {
  const std::lock_guard lock(_mutex);
  return _changes;
}

std::vector<ZEBIndexChange> RecordingObserver::kinds() const {
  std::vector<ZEBIndexChange> kinds;
  for (const Change& change : changes()) {
    kinds.push_back(change.kind);
  }
  return kinds;
}

void RecordingClock::sleep(platform::Seconds duration) {
  {
    const std::lock_guard lock(_mutex);
    _sleeps.push_back(duration.count());
  }
  SimulatedClock::sleep(duration);
}

std::vector<double> RecordingClock::sleeps() const {
  const std::lock_guard lock(_mutex);
  return _sleeps;
}

ShelfWorld::ShelfWorld()
    : clock(std::make_shared<RecordingClock>(std::chrono::system_clock::now())),
      log(std::make_shared<platform::CapturingLogSink>()),
      files(std::make_shared<platform::FailingFileManager>()),
      launcher(std::make_shared<RecordingLauncher>()),
      processes(std::make_shared<FakeProcessTable>()),
      center(std::make_shared<RecordingCenter>()),
      owner(std::make_shared<ShelfOwner>(helpCaches)),
      observer(std::make_shared<RecordingObserver>()),
      _environment(platform::Environment::system()) {
  _environment.clock = clock;
  _environment.log = log;
  _environment.files = files;
  _environment.processLauncher = launcher;
  _environment.processTable = processes;
  _environment.notificationCenter = center;
  _environment.userDefaults = platform::userDefaultsFromDictionary({});
  _environment.standardOutput = [this](const std::string& text) { printed += text; };
  _environment.processorCount = [] { return 8; };
  _environment.preferredLanguages = {"en", "de"};
  _environment.cachesDirectory = caches;
  _override.emplace(_environment);
}

ShelfWorld::~ShelfWorld() {
  dropShelf();
  platform::RunLoop::main()->runPending();
  EXPECT_EQ(owner->depth(), 0) << "disableShutdown and enableShutdown are not balanced";
  EXPECT_FALSE(owner->everEnabledTooOften());
}

void ShelfWorld::change(const std::function<void(platform::Environment&)>& edit) {
  edit(_environment);
  _override.emplace(_environment);
}

ZEBIndexshelf& ShelfWorld::makeShelf(bool userLoggedIn) {
  dropShelf();
  shelf = ZEBIndexshelf::initWithOwner(owner);
  shelf->setUserLoggedIn(userLoggedIn);
  observer = std::make_shared<RecordingObserver>();
  shelf->addObserver(observer);
  return *shelf;
}

void ShelfWorld::dropShelf() {
  if (!shelf) {
    return;
  }
  finishWork();
  const std::weak_ptr<ZEBIndexshelf> weak = shelf;
  shelf.reset();
  EXPECT_TRUE(runMainLoopUntil([&] { return weak.expired(); })) << "the shelf is kept alive";
}

void ShelfWorld::finishWork() {
  // In the order in which work makes more work: a queue is looked at after those that feed it.
  const std::vector<std::shared_ptr<ZEBOperationQueue>> queues = {
      shelf->indexRegistrationQueue(), shelf->indexFetchUpdateQueue(), shelf->indexDownloadQueue(),
      shelf->assetDownloadQueue(), shelf->indexGeneratingQueue()};
  const bool finished = runMainLoopUntil([&] {
    if (shelf->indexRegistrationQueue()->operationCount() > 0) {
      clock->advance(platform::Seconds(2));
    }
    return std::all_of(queues.begin(), queues.end(),
                       [](const auto& queue) { return queue->operationCount() == 0; });
  });
  EXPECT_TRUE(finished) << "work did not end";
  for (const auto& queue : queues) {
    queue->waitUntilAllOperationsAreFinished();
  }
  platform::RunLoop::main()->runPending();
}

bool ShelfWorld::runMainLoopUntil(const std::function<bool()>& done) const {
  const auto limit = std::chrono::steady_clock::now() + std::chrono::seconds(60);
  while (std::chrono::steady_clock::now() < limit) {
    platform::RunLoop::main()->runPending();
    if (done()) {
      return true;
    }
    std::this_thread::sleep_for(std::chrono::microseconds(50));
  }
  return false;
}

std::string ShelfWorld::generatedRoot() const {
  return caches + "/" + ZEBDaemonBundleID + "/" + ZEBGeneratedIndexDirectory;
}

std::string ShelfWorld::generatedPath(const std::string& bookID, const std::string& name) const {
  return generatedRoot() + "/" + bookID + "/" + name + "." + ZEBHelpindexExtension;
}

platform::Data ShelfWorld::indexBytes(platform::Value::Dictionary more) {
  more.try_emplace("SKI_INDEX_DATA", keywordIndex({page("/a.html", "A", "applet")}));
  return platform::classicArchiveWithRootObject(std::move(more));
}

std::string ShelfWorld::writeIndex(const std::string& path,
                                   platform::Value::Dictionary more) const {
  std::filesystem::create_directories(std::filesystem::path(path).parent_path());
  std::ofstream(path, std::ios::binary) << indexBytes(std::move(more)).view();
  return path;
}

std::shared_ptr<ZEBHelpBook> ShelfWorld::makeBook(const std::string& bookID, int32_t type) const {
  const std::string path = folder.path("books/" + bookID);
  folder.write("books/" + bookID + "/page.html",
               "<html><head><title>Page of " + bookID + "</title></head>" +
                   "<body><a name=\"top\"></a><p>Some words about " + bookID +
                   ".</p></body></html>");
  return ZEBHelpBook::bookWithID(bookID, type, path);
}

std::shared_ptr<ZEBHelpBook> ShelfWorld::makeBookWithIndex(const std::string& bookID, int32_t type,
                                                           platform::Value::Dictionary more) const {
  std::shared_ptr<ZEBHelpBook> book = makeBook(bookID, type);
  book->setIndexPaths(
      {writeIndex(book->path() + "/" + bookID + "." + ZEBHelpindexExtension, std::move(more))});
  return book;
}

std::shared_ptr<ZEBIndex> ShelfWorld::knownRecord(const std::string& bookID) const {
  const auto known = shelf->_knownIndices();
  const auto found = known.find(bookID);
  return found == known.end() || found->second.size() != 1 ? nullptr : found->second.front();
}

bool ShelfWorld::othersGetTheLock() const {
  bool got = false;
  std::thread([&] {
    if (shelf->_shelfMonitor().try_lock()) {
      got = true;
      shelf->_shelfMonitor().unlock();
    }
  }).join();
  return got;
}

std::vector<LogEntry> ShelfWorld::logged() const {
  std::vector<LogEntry> entries = log->entries();
  std::erase_if(entries, [](const LogEntry& entry) {
    return entry.message.starts_with("Loading anchor dict") ||
           entry.message == "anchor dict loaded";
  });
  return entries;
}

bool ShelfWorld::exists(const std::string& path) { return std::filesystem::exists(path); }

std::string ShelfWorld::contents(const std::string& path) {
  std::ostringstream bytes;
  bytes << std::ifstream(path, std::ios::binary).rdbuf();
  return bytes.str();
}

RecordingLauncher::Behaviour writesIndex(platform::Value::Dictionary more) {
  return
      [bytes = ShelfWorld::indexBytes(std::move(more))](const RecordingLauncher::Launch& launch) {
        return platform::systemFileManager()->writeAtomically(launch.outputPath, bytes) ? 1 : 0;
      };
}

}  // namespace tests
