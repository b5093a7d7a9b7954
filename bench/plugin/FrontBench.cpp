// What the plug-in adds to the keyword engine: whole searches over 300 made-up books of 40 pages
// each, with every index open already (warm) and with none (cold), beside the engine alone over the
// same indexes; and the start of a plug-in whose cache file knows all 300.
//
// "ratio" is the time of the whole search divided by that of the engine, both taken in the same
// run, turn by turn.
#include <benchmark/benchmark.h>

#include <array>
#include <chrono>
#include <map>
#include <memory>
#include <optional>
#include <random>
#include <string>
#include <vector>

#include "SearchKit/IndexWriter.h"
#include "SearchKit/SearchKit.h"
#include "host/Zebrine/ZEBConstants.h"
#include "host/Zebrine/ZEBHelpBook.h"
#include "host/Zebrine/ZEBPluginOwner.h"
#include "host/Zebrine/ZEBQuery.h"
#include "platform/ClassicArchive.h"
#include "platform/DistributedNotificationCenter.h"
#include "platform/Environment.h"
#include "platform/RunLoop.h"
#include "plugin/front/HelpPluginController.h"
#include "plugin/records/ZEBHelpindexIndex.h"
#include "tests/platform/TemporaryFolder.h"

namespace {

constexpr size_t bookCount = 300;
constexpr size_t pageCount = 40;
constexpr size_t wordsPerPage = 300;
constexpr const char* queryText = "print queue";

class BenchOwner : public ZEBPluginOwner {
 public:
  bool userLoggedIn() const override { return false; }
  bool shouldBeLazy() const override { return true; }
  void setShouldBeLazy(bool) override {}
  bool isOnline() const override { return true; }
  std::map<std::string, std::shared_ptr<ZEBHelpBook>> knownBooks() const override { return books; }
  std::shared_ptr<ZEBHelpBook> bookWithID(const std::string& bookID) const override {
    const auto book = books.find(bookID);
    return book == books.end() ? nullptr : book->second;
  }
  void notifyBookshelfOfModificationsToBook(const std::shared_ptr<ZEBHelpBook>&) override {}
  void disableShutdown() override {}
  void enableShutdown() override {}
  void setIdleTimeOutDelay(const platform::Value&) override {}
  std::optional<std::string> userHelpCachesDirectoryPath() const override { return caches; }
  void pluginFoundResults(const std::shared_ptr<ZEBPlugin>&, const ZEBResultBatch& foundResults,
                          const std::shared_ptr<ZEBQuery>&) override {
    found += std::get<std::vector<std::shared_ptr<ZEBResult>>>(foundResults).size();
  }
  void pluginFinishedSearchingForQuery(const std::shared_ptr<ZEBPlugin>&,
                                       const std::shared_ptr<ZEBQuery>&) override {}

  std::map<std::string, std::shared_ptr<ZEBHelpBook>> books;
  std::string caches;
  size_t found = 0;
};

/// 300 books on the disk, made once.
class World {
 public:
  static World& shared() {
    static World world;
    return world;
  }

  std::shared_ptr<HelpPluginController> start() const {
    return HelpPluginController::initWithOwner(owner);
  }

  static void search(HelpPluginController& controller) {
    const auto query = ZEBQuery::initWithQueryString(queryText);
    query->setResultTypes({ZEBHelpArticleResult});
    controller.startSearchForQuery(query);
  }

  /// Both passes of a keyword search, every index opened anew, without making results.
  static size_t searchWithEngineAlone(
      const std::vector<std::shared_ptr<ZEBHelpindexIndex>>& records) {
    size_t hits = 0;
    for (const auto options : {kSKSearchOptionDefault, kSKSearchOptionSpaceMeansOR}) {
      for (const auto& record : records) {
        const SKIndexRef index = record->copyIndexRef();
        const SKSearchRef search = SKSearchCreate(index, "print* queue* ", options);
        std::array<SKDocumentID, 50> ids{};
        std::array<float, 50> scores{};
        size_t count = 0;
        bool more = true;
        while (more) {
          more = SKSearchFindMatches(*search, ids.size(), ids.data(), scores.data(), 1.0, &count);
          hits += count;
        }
      }
      if (hits >= 15) {
        break;
      }
    }
    return hits;
  }

  std::vector<std::shared_ptr<ZEBHelpindexIndex>> openRecords() const {
    std::vector<std::shared_ptr<ZEBHelpindexIndex>> records;
    for (const auto& entry : owner->books) {
      records.push_back(ZEBHelpindexIndex::initWithPath(entry.second->indexPaths().front()));
    }
    return records;
  }

  const std::shared_ptr<BenchOwner> owner = std::make_shared<BenchOwner>();

 private:
  World() : _override(_environment()) {
    owner->caches = _folder.path("caches");
    for (size_t i = 0; i < bookCount; ++i) {
      const std::string bookID = "org.example.book" + std::to_string(i);
      auto book = ZEBHelpBook::bookWithID(bookID, ZEBHelpBookType1, _folder.path(bookID));
      book->setIndexPaths({_folder.write(bookID + "/book.helpindex", _index().view())});
      owner->books[bookID] = book;
    }
  }

  platform::Environment _environment() const {
    platform::Environment environment = platform::Environment::system();
    environment.log = platform::standardErrorLogSink(1);
    environment.notificationCenter = platform::localNotificationCenter();
    environment.cachesDirectory = _folder.path("caches");
    return environment;
  }

  platform::Data _index() {
    static const std::array<const char*, 16> syllables = {
        "set", "ting", "net", "work", "fol", "der", "a",  "in",
        "er",  "con",  "ta",  "mo",   "lis", "pa",  "ge", "fi"};
    searchkit::IndexWriter writer;
    for (size_t i = 0; i < pageCount; ++i) {
      searchkit::Document page;
      page.path = "/page" + std::to_string(i) + ".html";
      page.title = "Page " + std::to_string(i);
      page.abstract = "What there is to know.";
      std::string text;
      for (size_t word = 0; word < wordsPerPage; ++word) {
        for (size_t count = _random() % 3 + 1; count > 0; --count) {
          text += syllables[_random() % syllables.size()];
        }
        text += ' ';
      }
      // A page in ten is about what is searched for.
      if (_random() % 10 == 0) {
        text += "the print queue of the printer";
      }
      page.body = {std::move(text)};
      writer.add(std::move(page));
    }
    return platform::classicArchiveWithRootObject(
        platform::Value::Dictionary{{"SKI_INDEX_DATA", writer.finish()}});
  }

  tests::TemporaryFolder _folder;
  platform::EnvironmentOverride _override;
  std::mt19937 _random{300};
};

double secondsOf(const std::chrono::steady_clock::duration duration) {
  return std::chrono::duration<double>(duration).count();
}

void wholeSearchWarm(benchmark::State& state) {
  const World& world = World::shared();
  const auto controller = world.start();
  World::search(*controller);
  const auto records = world.openRecords();
  world.owner->found = 0;
  double whole = 0;
  double engine = 0;
  for (auto _ : state) {
    const auto start = std::chrono::steady_clock::now();
    World::search(*controller);
    const auto middle = std::chrono::steady_clock::now();
    benchmark::DoNotOptimize(World::searchWithEngineAlone(records));
    const auto end = std::chrono::steady_clock::now();
    state.SetIterationTime(secondsOf(middle - start));
    whole += secondsOf(middle - start);
    engine += secondsOf(end - middle);
  }
  const auto rounds = static_cast<double>(state.iterations());
  state.counters["engine_ms"] = engine / rounds * 1000;
  state.counters["ratio"] = whole / engine;
  state.counters["results"] = static_cast<double>(world.owner->found) / rounds;
}
BENCHMARK(wholeSearchWarm)->UseManualTime()->Unit(benchmark::kMillisecond);

void wholeSearchCold(benchmark::State& state) {
  const World& world = World::shared();
  double whole = 0;
  double engine = 0;
  for (auto _ : state) {
    const auto controller = world.start();
    const auto start = std::chrono::steady_clock::now();
    World::search(*controller);
    const auto middle = std::chrono::steady_clock::now();
    benchmark::DoNotOptimize(World::searchWithEngineAlone(world.openRecords()));
    const auto end = std::chrono::steady_clock::now();
    platform::RunLoop::main()->runPending();
    state.SetIterationTime(secondsOf(middle - start));
    whole += secondsOf(middle - start);
    engine += secondsOf(end - middle);
  }
  state.counters["engine_ms"] = engine / static_cast<double>(state.iterations()) * 1000;
  state.counters["ratio"] = whole / engine;
}
BENCHMARK(wholeSearchCold)->UseManualTime()->Unit(benchmark::kMillisecond);

void engineAloneWarm(benchmark::State& state) {
  const auto records = World::shared().openRecords();
  for (auto _ : state) {
    benchmark::DoNotOptimize(World::searchWithEngineAlone(records));
  }
}
BENCHMARK(engineAloneWarm)->Unit(benchmark::kMillisecond);

void startFromACacheFile(benchmark::State& state) {
  const World& world = World::shared();
  {
    const auto controller = world.start();
    World::search(*controller);
    controller->_shelf()->archiveKnownIndices();
  }
  size_t known = 0;
  for (auto _ : state) {
    const auto controller = world.start();
    known = controller->_shelf()->_knownIndices().size();
  }
  if (known != bookCount) {
    state.SkipWithError("the cache file was not read");
  }
  // So that the cold searches of another repetition are cold.
  world.start()->_shelf()->clearIndexCache();
  platform::RunLoop::main()->runPending();
}
BENCHMARK(startFromACacheFile)->Unit(benchmark::kMillisecond);

}  // namespace
