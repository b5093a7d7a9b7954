// A host that is not the daemon: loads the plug-in's bundle by path and drives it through ZEBPlugin
// alone, its main loop on the main thread and its searches on another.
//
//     bundlehost BUNDLE BVMAKE BOOKS
//
// BOOKS is the folder of the shipped books. Prints each check that fails; exits with 1 if any did.
#include <dlfcn.h>

#include <algorithm>
#include <cstdio>
#include <thread>

#include "host/Zebrine/ZEBConstants.h"
#include "host/Zebrine/ZEBPlugin.h"
#include "host/Zebrine/ZEBPluginEntry.h"
#include "host/Zebrine/ZEBResult.h"
#include "platform/Bundle.h"
#include "platform/DistributedNotificationCenter.h"
#include "platform/Environment.h"
#include "platform/Processes.h"
#include "platform/PropertyList.h"
#include "platform/RunLoop.h"
#include "tests/platform/QuickClock.h"
#include "tests/platform/TemporaryFolder.h"
#include "tests/plugin/front/host/HostOwner.h"

namespace {

using platform::Value;
using Dictionary = Value::Dictionary;

std::atomic<int> failures{0};

void check(bool holds, const char* what) {
  if (!holds) {
    ++failures;
    std::fprintf(stderr, "FAILED: %s\n", what);
  }
}

/// A copy of the bundle under another identifier: what the plug-in says of itself must come from
/// the list beside its code.
std::string renamedBundle(const tests::TemporaryFolder& folder, const std::string& original,
                          const std::string& identifier) {
  const auto bundle = platform::Bundle::bundleWithPath(original);
  check(bundle && bundle->executablePath() && !bundle->bundleIdentifier().empty(),
        "the bundle has a list with an identifier and code");
  if (!bundle || !bundle->executablePath()) {
    return {};
  }
  const auto files = platform::Environment::current()->files;
  std::string copy = folder.path("Renamed.bundle");
  Dictionary information = *bundle->infoDictionary().dictionaryIf();
  information[platform::Bundle::identifierKey] = identifier;
  (void)files->createDirectoryWithParents(copy);
  (void)files->writeAtomically(
      copy + "/Info.plist",
      platform::dataFromPropertyList(information, platform::PropertyListFormat::xml));
  (void)files->copyItem(*bundle->executablePath(),
                        platform::stringByAppendingPathComponent(
                            copy, platform::lastPathComponent(*bundle->executablePath())));
  return copy;
}

/// Loads the bundle's code and has an instance of its principal class made. The code is never
/// unloaded.
std::shared_ptr<ZEBPlugin> loadPlugin(const std::string& path,
                                      const std::shared_ptr<ZEBPluginOwner>& owner) {
  const auto bundle = platform::Bundle::bundleWithPath(path);
  void* code = bundle && bundle->executablePath()
                   ? ::dlopen(bundle->executablePath()->c_str(), RTLD_NOW | RTLD_LOCAL)
                   : nullptr;
  if (code == nullptr) {
    const char* reason = ::dlerror();  // NOLINT(concurrency-mt-unsafe)
    std::fprintf(stderr, "%s\n", reason == nullptr ? "no bundle" : reason);
    return nullptr;
  }
  auto* const entry = reinterpret_cast<ZEBPluginEntry*>(::dlsym(code, ZEBPluginEntryName));
  check(entry != nullptr, "the code exports its entry");
  if (entry == nullptr) {
    return nullptr;
  }
  std::shared_ptr<ZEBPlugin> plugin;
  check(!entry("NoSuchClass", &owner, &plugin) && !plugin, "an unknown class is refused");
  check(entry(bundle->principalClass().c_str(), &owner, &plugin), "the principal class is made");
  return plugin;
}

std::shared_ptr<ZEBHelpBook> writeBook(const tests::TemporaryFolder& folder) {
  folder.write("kettle/Info.plist", platform::dataFromPropertyList(
                                        Dictionary{{"ZEBBookIdentifier", "org.example.kettle"},
                                                   {"ZEBBookTitle", "Kettle"}},
                                        platform::PropertyListFormat::xml)
                                        .view());
  folder.write("kettle/index.html",
               "<html><head><title>Kettle</title></head><body><p>Welcome.</p></body></html>");
  folder.write("kettle/boil.html",
               "<html><head><title>Boil water</title></head><body><a name=\"boiling\"></a>"
               "<p>Fill the kettle with water and wait until it whistles.</p></body></html>");
  return ZEBHelpBook::initWithPath(folder.path("kettle"));
}

/// What the host does, on a thread of its own, while the main thread runs the main loop.
class Host {
 public:
  Host(std::shared_ptr<ZEBPlugin> plugin, std::shared_ptr<tests::HostOwner> owner,
       std::string caches, platform::CapturingLogSink& log)
      : _plugin(std::move(plugin)),
        _owner(std::move(owner)),
        _caches(std::move(caches)),
        _log(log) {}

  void drive() {
    for (const auto& entry : _owner->knownBooks()) {
      _plugin->finishPopulatingBookWithID(entry.first);
    }
    _plugin->finishPopulatingKnownBooks();
    // The first search finds no index yet, and has them all made.
    _search("kettle", {}, {ZEBHelpArticleResult});
    _waitUntilQuiet();
    check(_owner->modifiedBooks().size() == _owner->knownBooks().size(),
          "every book's new index is reported to the bookshelf");

    _checkArticles();
    _checkAnchors();
    _checkLists();
    _checkException();
    _checkRemoval();
    _waitUntilQuiet();
    check(_owner->guards() == 0, "the shutdown guard is even");
    check(_exists(_caches + "/HelpindexCache.plist"), "the known indexes are written down");
  }

 private:
  std::shared_ptr<ZEBQuery> _search(const std::string& text, std::vector<std::string> scope,
                                    std::vector<std::string> kinds, Dictionary options = {}) {
    auto query = ZEBQuery::initWithQueryString(text);
    query->setScope(std::move(scope));
    query->setResultTypes(std::move(kinds));
    query->setOptions(std::move(options));
    _plugin->startSearchForQuery(query);
    _plugin->completeSearchForQuery(query);
    return query;
  }

  void _checkArticles() {
    const auto query = _search("whistles water", {}, {ZEBHelpArticleResult});
    check(_owner->finished(*query), "a search finishes");
    const auto records = _owner->records(*query);
    check(!records.empty() && records[0]->title() == "Boil water", "the page is found");
    check(!records.empty() && records[0]->bookID() == "org.example.kettle", "in its book");
    const auto url = records.empty()
                         ? std::nullopt
                         : records[0]->payloadValueForKey(ZEBResultURLKey).stringValue();
    check(url && url->starts_with("file:///") && url->ends_with("/kettle/boil.html"),
          "at the place where it lies");
    const auto manual = _search("search", {KROrvHelpbookID}, {ZEBHelpArticleResult});
    check(_owner->records(*manual).size() > 1, "the manual has pages about searching");
    const auto best = _owner->records(*manual);
    check(std::is_sorted(best.begin(), best.end(),
                         [](const auto& a, const auto& b) {
                           return a->relevance().doubleValue() > b->relevance().doubleValue();
                         }),
          "results come best first");
  }

  void _checkAnchors() {
    const auto query =
        _search("boiling", {}, {ZEBHelpArticleResult}, {{ZEBQueryAnchorSearchOptionKey, true}});
    const auto records = _owner->records(*query);
    check(records.size() == 1 && records[0]->title() == "Boil water", "an anchor is looked up");
  }

  void _checkLists() {
    const auto match = _search("No Internet", {KROfflineHelpbookID}, {ZEBHelpArticleResult});
    const auto records = _owner->records(*match);
    check(!records.empty() && records[0]->payloadValueForKey(ZEBResultIsExactMatchKey).boolValue(),
          "an exact match is marked and comes first");
    const auto typed = _search("c", {}, {ZEBHelpSuggestionResult});
    const auto other = _search("s", {}, {ZEBHelpSuggestionResult});
    check(!_owner->texts(*typed).empty() || !_owner->texts(*other).empty(),
          "the books' suggestions are delivered as plain texts");
  }

  void _checkException() {
    _owner->throwsWhenAskedForTheNetwork = true;
    const auto query = _search("water", {}, {ZEBHelpArticleResult});
    _owner->throwsWhenAskedForTheNetwork = false;
    check(!_owner->finished(*query), "an exception of the host ends the search");
    const auto caught = _log.messages(0);
    check(std::find(caught.begin(), caught.end(), "the host does not know") != caught.end(),
          "and is caught in the plug-in under its own type");
  }

  void _checkRemoval() {
    const std::string folder = platform::stringByAppendingPathComponent(
        platform::stringByAppendingPathComponent(*platform::Environment::current()->cachesDirectory,
                                                 ZEBDaemonBundleID),
        ZEBGeneratedIndexDirectory + "/org.example.kettle");
    check(_exists(folder), "a generated index lies among the caches");
    platform::RunLoop::main()->perform(
        [plugin = _plugin] { plugin->removeIndexForBookWithID("org.example.kettle"); });
    for (int i = 0; i < 1000 && _exists(folder); ++i) {
      std::this_thread::sleep_for(std::chrono::milliseconds(5));
    }
    check(!_exists(folder), "a removed book's generated index is deleted");
  }

  static bool _exists(const std::string& path) {
    return platform::Environment::current()->files->fileExistsAtPath(path);
  }

  /// Until nothing was going on for a while: work may beget work.
  void _waitUntilQuiet() const {
    const auto limit = std::chrono::steady_clock::now() + std::chrono::seconds(60);
    for (int quiet = 0; quiet < 30; ++quiet) {
      if (_owner->guards() != 0) {
        quiet = 0;
      }
      if (std::chrono::steady_clock::now() > limit) {
        check(false, "background work ends");
        return;
      }
      std::this_thread::sleep_for(std::chrono::milliseconds(10));
    }
  }

  const std::shared_ptr<ZEBPlugin> _plugin;
  const std::shared_ptr<tests::HostOwner> _owner;
  const std::string _caches;
  platform::CapturingLogSink& _log;
};

int runHost(const std::string& bundle, const std::string& tool, const std::string& books) {
  const tests::TemporaryFolder folder;
  const auto log = std::make_shared<platform::CapturingLogSink>();
  platform::Environment environment = platform::Environment::system();
  environment.clock = std::make_shared<tests::QuickClock>(50);
  environment.log = log;
  environment.processLauncher = platform::substitutingProcessLauncher("/usr/bin/bvmake", tool);
  environment.notificationCenter = platform::localNotificationCenter();
  environment.standardOutput = [](const std::string&) {};
  environment.preferredLanguages = {"en"};
  environment.cachesDirectory = folder.path("caches");
  const platform::EnvironmentOverride override(environment);

  const std::string caches = folder.path("caches/help");
  const auto owner = std::make_shared<tests::HostOwner>(caches);
  for (const auto& book : {ZEBHelpBook::initWithPath(books + "/manual"),
                           ZEBHelpBook::initWithPath(books + "/offline"), writeBook(folder)}) {
    check(book != nullptr, "a book can be read");
    if (book) {
      owner->addBook(book);
    }
  }
  const std::string identifier = "org.example.renamed";
  const auto plugin = loadPlugin(renamedBundle(folder, bundle, identifier), owner);
  if (!plugin) {
    return 1;
  }
  check(plugin->pluginID() == identifier, "the identifier is that of the information list");
  check(plugin->owner() == owner, "the plug-in keeps its owner");
  check(plugin->resultTypes() ==
            std::vector<std::string>{ZEBHelpArticleResult, ZEBHelpSuggestionResult,
                                     ZEBHelpSimilarSuggestionResult, ZEBHelpActionResult},
        "the plug-in names its kinds of result");
  check(plugin->supportsAnchorLookup(), "the host's defaults apply to what is left out");

  std::thread searching([&] {
    Host(plugin, owner, caches, *log).drive();
    platform::RunLoop::main()->stop();
  });
  platform::RunLoop::main()->run();
  searching.join();
  if (failures > 0) {
    for (const auto& entry : log->entries()) {
      if (entry.level < 3) {
        std::fprintf(stderr, "log %d: %s\n", entry.level, entry.message.c_str());
      }
    }
  }
  return failures > 0 ? 1 : 0;
}

}  // namespace

int main(int argc, char** argv) {
  if (argc != 4) {
    std::fprintf(stderr, "usage: %s BUNDLE BVMAKE BOOKS\n", argv[0]);
    return 2;
  }
  return runHost(argv[1], argv[2], argv[3]);
}
