#include "bench/pipeline/PluginWorld.h"

#include <atomic>
#include <chrono>
#include <cstdio>
#include <stdexcept>
#include <thread>
#include <utility>
#include <variant>

#include "bvmake/Report.h"
#include "bvmake/Run.h"
#include "host/Luxwell/HelpLUXModel.h"
#include "host/Luxwell/HelpTokenizer.h"
#include "host/Zebrine/ZEBConstants.h"
#include "host/Zebrine/ZEBHelpBook.h"
#include "host/Zebrine/ZEBPlugin.h"
#include "host/Zebrine/ZEBQuery.h"
#include "platform/DistributedNotificationCenter.h"
#include "platform/Error.h"
#include "platform/Log.h"
#include "zebd/Host.h"

namespace pipeline {

namespace {

namespace fs = std::filesystem;

constexpr const char* groupName = "Default";
/// The largest model takes half a minute on a slow machine.
constexpr platform::Seconds patience{600};

class Receiver : public zebd::SearchReceiver {
 public:
  void foundResults(const ZEBResultBatch& batch) override {
    if (const auto* found = std::get_if<std::vector<std::shared_ptr<ZEBResult>>>(&batch)) {
      records.insert(records.end(), found->begin(), found->end());
    }
  }
  void searchEnded(bool finished) override { (finished ? hasFinished : hasFailed) = true; }

  std::vector<std::shared_ptr<ZEBResult>> records;
  std::atomic<bool> hasFinished{false};
  std::atomic<bool> hasFailed{false};
};

std::string modelLanguage() {
  const std::string tag = platform::Environment::current()->preferredLanguages.front();
  return HelpTokenizer::luxLocalizationForLanguage(tag).value();
}

platform::Environment environmentIn(const fs::path& folder, const std::string& language) {
  platform::Environment environment = platform::Environment::system();
  environment.log = platform::standardErrorLogSink(1);
  environment.notificationCenter = platform::localNotificationCenter();
  environment.cachesDirectory = folder.string();
  environment.preferredLanguages = {language};
  return environment;
}

std::shared_ptr<HelpLUXModel> savedModel() {
  const std::string language = modelLanguage();
  return HelpLUXModel::initWithDirectoryPath(
      HelpLUXModel::directoryPathForModelGroupName(groupName, language), language);
}

bool hasModelOfBooks(size_t count) {
  if (!HelpLUXModel::modelExistsForGroupName(groupName, modelLanguage())) {
    return false;
  }
  const auto model = savedModel();
  return !model->needsBuild() && model->allHelpbookIDs().size() == count;
}

}  // namespace

void makeIndex(const fs::path& pages, const fs::path& indexFile, const std::string& language) {
  bvmake::CreateOptions options;
  options.folder = pages.string();
  options.outputPath = indexFile.string();
  options.anchors = true;
  options.generateSummaries = true;
  options.minimumTermLength = 3;
  options.language = language;
  bvmake::StreamReport report(stderr, "pipeline", 0);
  if (bvmake::run(options, report).exitCode != bvmake::ExitCode::success) {
    throw std::runtime_error("cannot index " + pages.string());
  }
}

PluginHost::PluginHost(const std::vector<Book>& books, bool byMeaning) {
  zebd::OwnerSettings settings;
  settings.userLoggedIn = byMeaning;
  settings.userHelpCachesDirectoryPath =
      platform::Environment::current()->cachesDirectory.value() + "/" + ZEBDaemonBundleID;
  platform::Error error;
  _host = zebd::Host::start(ZEB_PLUGIN_BUNDLE, std::move(settings), error);
  if (_host == nullptr) {
    throw std::runtime_error(error.description);
  }
  std::vector<std::string> bookIDs;
  for (const Book& book : books) {
    auto known = ZEBHelpBook::bookWithID(book.bookID, ZEBHelpBookType1,
                                         book.indexFile.parent_path().string());
    known->setIndexPaths({book.indexFile.string()});
    // Records that were remembered take the folder of the pages from here.
    known->setAccessPagePath((book.indexFile.parent_path() / "index.html").string());
    _host->bookshelf().addBook(std::move(known));
    bookIDs.push_back(book.bookID);
  }
  const auto registration = std::make_shared<Receiver>();
  _host->registerBooks(bookIDs, registration);
  const bool ready = zebd::Host::runMainLoopUntil(
      [&] { return registration->hasFinished && (!byMeaning || hasModelOfBooks(books.size())); },
      patience);
  if (!ready) {
    throw std::runtime_error("the plug-in did not get ready");
  }
  // The model is loaded after it was saved, and for a second every query opens it anew.
  zebd::Host::runMainLoopUntil([] { return false; }, platform::Seconds(byMeaning ? 2 : 0));
  zebd::Host::runMainLoopUntil([&] { return _host->owner().isQuietFor(platform::Seconds(0.5)); },
                               patience);
}

PluginHost::~PluginHost() = default;

Delivery PluginHost::search(const std::string& text, const std::vector<std::string>& kinds,
                            const std::vector<std::string>& scope) const {
  const auto query = ZEBQuery::initWithQueryString(text);
  query->setResultTypes(kinds);
  query->setScope(scope);
  if (scope.empty()) {
    query->setOptions(platform::Value::Dictionary{{ZEBQuerySearchAllBooksOptionKey, true}});
  }
  const auto receiver = std::make_shared<Receiver>();
  _host->owner().beginSearch(query->queryID(), receiver);
  const auto start = std::chrono::steady_clock::now();
  _host->plugin()->startSearchForQuery(query);
  const auto end = std::chrono::steady_clock::now();
  _host->owner().endSearch(query->queryID());
  _host->plugin()->completeSearchForQuery(query);
  if (!receiver->hasFinished) {
    throw std::runtime_error("a search broke off");
  }
  return {std::move(receiver->records), std::chrono::duration<double>(end - start).count()};
}

PluginWorld::PluginWorld(const fs::path& folder, const std::string& language)
    : _override((fs::create_directories(folder), environmentIn(folder, language))) {}

PluginWorld::~PluginWorld() = default;

std::shared_ptr<HelpLUXModel> PluginWorld::model() const { return savedModel(); }

}  // namespace pipeline
