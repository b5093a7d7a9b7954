#include "zeb/HelpSearch.h"

#include <algorithm>
#include <set>
#include <utility>

#include "host/Zebrine/ZEBConstants.h"
#include "host/Zebrine/ZEBHelpBook.h"
#include "host/Zebrine/ZEBQuery.h"
#include "host/Zebrine/ZEBResult.h"
#include "platform/Environment.h"
#include "platform/Files.h"
#include "platform/Processes.h"
#include "platform/RunLoop.h"
#include "platform/Strings.h"
#include "platform/ThreadSafety.h"
#include "platform/URL.h"
#include "zeb/RemoteBooks.h"
#include "zebd/BookFolder.h"
#include "zebd/Host.h"

namespace zeb {

namespace {

using zebd::Host;

/// Work that follows from work does so within a few milliseconds; this is ample.
constexpr platform::Seconds quietSpan{0.2};
/// But language models follow a change of indexes after a second in which nothing else changes.
constexpr platform::Seconds modelSpan{1.2};
constexpr platform::Seconds removalLimit{10};
/// Searches bound their own waits.
constexpr platform::Seconds forever = platform::Seconds::max();

platform::Clock::Instant elapsedNow() { return platform::Environment::current()->clock->elapsed(); }

std::string nameOfPage(const std::string& url) {
  const std::optional<platform::URL> parsed = platform::URL::URLWithString(url);
  const std::string name = parsed ? parsed->lastPathComponent() : std::string();
  return name.empty() ? url : name;
}

/// Somebody's: whose it is, its command line does not say.
bool anIndexingToolIsRunning() {
  std::vector<platform::ProcessEntry> processes;
  return platform::Environment::current()->processTable->readProcesses(processes) == 0 &&
         std::any_of(processes.begin(), processes.end(),
                     [](const auto& process) { return process.commandName == "bvmake"; });
}

using Records = std::vector<std::shared_ptr<ZEBResult>>;

/// What one search delivered.
struct Delivery {
  Records records;
  std::vector<std::string> texts;
};

/// Keeps what one search delivers, and wakes the main loop at its end.
class Collector : public zebd::SearchReceiver {
 public:
  void foundResults(const ZEBResultBatch& batch) override {
    const platform::MutexLock lock(_mutex);
    if (const auto* records = std::get_if<Records>(&batch)) {
      _delivery.records.insert(_delivery.records.end(), records->begin(), records->end());
    } else if (const auto* texts = std::get_if<std::vector<std::string>>(&batch)) {
      _delivery.texts.insert(_delivery.texts.end(), texts->begin(), texts->end());
    }
  }
  void searchEnded(bool finished) override {
    {
      const platform::MutexLock lock(_mutex);
      _ended = true;
      _finished = finished;
    }
    platform::RunLoop::main()->stop();
  }

  bool ended() const {
    const platform::MutexLock lock(_mutex);
    return _ended;
  }
  Delivery deliverySoFar() const {
    const platform::MutexLock lock(_mutex);
    return _delivery;
  }
  /// Absent when the search broke off.
  std::optional<Delivery> delivery() const {
    const platform::MutexLock lock(_mutex);
    return _finished ? std::optional(_delivery) : std::nullopt;
  }

 private:
  mutable platform::Mutex _mutex;
  Delivery _delivery GUARDED_BY(_mutex);
  bool _ended GUARDED_BY(_mutex) = false;
  bool _finished GUARDED_BY(_mutex) = false;
};

std::shared_ptr<ZEBQuery> makeQuery(std::string_view text, const std::vector<std::string>& bookIDs,
                                    std::vector<std::string> kinds, size_t limit) {
  auto query = ZEBQuery::initWithQueryString(std::string(text));
  query->setScope(bookIDs);
  query->setResultTypes(std::move(kinds));
  query->setLimit(limit);
  if (bookIDs.empty()) {
    // Without that, models that do not have the system's own manual would be passed over.
    query->setOptions(platform::Value::Dictionary{{ZEBQuerySearchAllBooksOptionKey, true}});
  }
  return query;
}

/// Which books the plug-in has reported since it was last asked.
class Reports {
 public:
  void add(const std::string& bookID) {
    const platform::Clock::Instant now = elapsedNow();
    const platform::MutexLock lock(_mutex);
    _bookIDs.insert(bookID);
    _last = now;
  }
  /// Whether no report has come for `span`.
  bool areQuietFor(platform::Seconds span) const {
    const platform::Clock::Instant now = elapsedNow();
    const platform::MutexLock lock(_mutex);
    return !_last || now - *_last >= span;
  }
  std::set<std::string> take() {
    const platform::MutexLock lock(_mutex);
    return std::exchange(_bookIDs, {});
  }

 private:
  mutable platform::Mutex _mutex;
  std::set<std::string> _bookIDs GUARDED_BY(_mutex);
  std::optional<platform::Clock::Instant> _last GUARDED_BY(_mutex);
};

}  // namespace

struct HelpSearch::Implementation {
  std::unique_ptr<Host> host;
  std::shared_ptr<Reports> reports = std::make_shared<Reports>();

  bool lacksIndex(const std::string& bookID) const {
    const auto book = host->bookshelf().bookWithID(bookID);
    return book != nullptr && book->type() != ZEBHelpBookType4 && !zebd::indexPathOfBook(*book);
  }

  FoundPage pageOfResult(const ZEBResult& result) const {
    FoundPage page;
    page.bookID = result.bookID().value_or("");
    const auto book = host->bookshelf().bookWithID(page.bookID);
    page.bookTitle = book == nullptr ? page.bookID : book->title();
    page.url = result.payloadValueForKey(ZEBResultURLKey).stringValue().value_or("");
    page.abstract = result.payloadValueForKey(ZEBResultAbstractKey).stringValue();
    page.title = result.title().value_or("");
    if (page.title.empty()) {
      page.title = nameOfPage(page.url);
    }
    page.relevance = result.relevance().doubleValue();
    return page;
  }

  /// Absent when the search broke off.
  std::optional<Delivery> deliveryOfQuery(const std::shared_ptr<ZEBQuery>& query) {
    const auto collector = std::make_shared<Collector>();
    host->startSearch(query, collector);
    Host::runMainLoopUntil([&] { return collector->ended(); }, forever);
    return collector->delivery();
  }

  std::optional<Answer> answer(const std::shared_ptr<ZEBQuery>& query, size_t limit) {
    const std::optional<Delivery> delivery = deliveryOfQuery(query);
    if (!delivery) {
      return std::nullopt;
    }
    Answer answer;
    answer.pages = pagesOfRecords(delivery->records);
    answer.count = answer.pages.size();
    if (answer.pages.size() > limit) {
      answer.pages.resize(limit);
    }
    return answer;
  }

  std::vector<FoundPage> pagesOfRecords(const Records& records) const;
};

std::vector<FoundPage> HelpSearch::Implementation::pagesOfRecords(const Records& records) const {
  std::vector<FoundPage> pages;
  std::set<std::string> shown;
  for (const auto& record : records) {
    if (record->type() != ZEBHelpArticleResult) {
      continue;
    }
    FoundPage page = pageOfResult(*record);
    // A book may name one page for the words in several of its lists.
    if (shown.insert(page.url).second) {
      pages.push_back(std::move(page));
    }
  }
  return pages;
}

namespace {

std::vector<Suggestion> suggestionsOfDelivery(const Delivery& delivery, const std::string& kind,
                                              size_t limit) {
  std::vector<Suggestion> suggestions;
  std::set<std::string> shown;
  const auto add = [&](const std::string& text, double relevance) {
    if (suggestions.size() < limit && shown.insert(platform::lowercaseString(text)).second) {
      suggestions.push_back({text, relevance});
    }
  };
  for (const std::string& text : delivery.texts) {
    add(text, 0);
  }
  for (const auto& record : delivery.records) {
    if (record->type() == kind) {
      add(record->title().value_or(std::string()), record->relevance().doubleValue());
    }
  }
  return suggestions;
}

}  // namespace

class HelpSearch::Live : public LiveSearch {
 public:
  Live(const Implementation& implementation, std::shared_ptr<ZEBQuery> query)
      : _implementation(implementation),
        _query(std::move(query)),
        _collector(std::make_shared<Collector>()) {
    _implementation.host->startSearch(_query, _collector);
  }

  void cancel() override { _query->cancel(); }
  bool ended() const override { return _collector->ended(); }
  LiveAnswer answer(size_t limit) const override {
    const Delivery delivery = _collector->deliverySoFar();
    LiveAnswer answer;
    answer.completions = suggestionsOfDelivery(delivery, ZEBHelpSuggestionResult, limit);
    answer.pages = _implementation.pagesOfRecords(delivery.records);
    if (answer.pages.size() > limit) {
      answer.pages.resize(limit);
    }
    return answer;
  }

 private:
  const Implementation& _implementation;
  const std::shared_ptr<ZEBQuery> _query;
  const std::shared_ptr<Collector> _collector;
};

std::shared_ptr<LiveSearch> HelpSearch::beginLiveSearch(std::string_view text,
                                                        const std::vector<std::string>& bookIDs) {
  return std::make_shared<Live>(
      *_implementation,
      makeQuery(text, bookIDs, {ZEBHelpArticleResult, ZEBHelpSuggestionResult}, 0));
}

HelpSearch::HelpSearch(std::unique_ptr<Implementation> implementation)
    : _implementation(std::move(implementation)) {}

HelpSearch::~HelpSearch() = default;

std::unique_ptr<HelpSearch> HelpSearch::start(const std::vector<CatalogueEntry>& entries,
                                              const Installation& installation,
                                              platform::Error& error) {
  zebd::OwnerSettings settings;
  if (const auto caches = platform::Environment::current()->cachesDirectory) {
    settings.userHelpCachesDirectoryPath =
        platform::stringByAppendingPathComponent(*caches, ZEBDaemonBundleID);
  }
  forgetKnownIndicesWhenDue(entries);
  auto implementation = std::make_unique<Implementation>();
  implementation->host = Host::start(installation.pluginBundlePath, std::move(settings), error);
  if (implementation->host == nullptr) {
    return nullptr;
  }
  implementation->host->owner().setBookModifiedHandler(
      [reports = implementation->reports](const std::shared_ptr<ZEBHelpBook>& book) {
        if (book != nullptr) {
          reports->add(book->bookID());
        }
      });
  for (const CatalogueEntry& entry : entries) {
    implementation->host->bookshelf().addBook(zebd::bookOfEntry(entry));
  }
  return std::unique_ptr<HelpSearch>(new HelpSearch(std::move(implementation)));
}

std::vector<std::string> HelpSearch::booksWithoutIndex(
    const std::vector<std::string>& bookIDs) const {
  std::vector<std::string> missing;
  if (bookIDs.empty()) {
    for (const auto& entry : _implementation->host->bookshelf().books()) {
      if (_implementation->lacksIndex(entry.first)) {
        missing.push_back(entry.first);
      }
    }
    return missing;
  }
  std::copy_if(bookIDs.begin(), bookIDs.end(), std::back_inserter(missing),
               [&](const std::string& bookID) { return _implementation->lacksIndex(bookID); });
  return missing;
}

HelpSearch::Indexing HelpSearch::makeIndexes(const std::vector<std::string>& bookIDs,
                                             platform::Seconds limit, const Progress& progress) {
  std::set<std::string> waiting(bookIDs.begin(), bookIDs.end());
  size_t count = 0;
  const auto tell = [&](const std::string& bookID) {
    if (!_implementation->lacksIndex(bookID) && waiting.erase(bookID) > 0) {
      ++count;
      progress(bookID, count);
    }
  };
  // Not reported are books whose indexes were there before, and those that another process has made
  // meanwhile: the plug-in leaves them to it.
  const auto tellAll = [&] {
    for (const std::string& bookID : bookIDs) {
      tell(bookID);
    }
  };
  Indexing indexing;
  bool mayHaveBeenLeftToAnother = anIndexingToolIsRunning();
  bool isAnew = false;
  while (true) {
    (void)_implementation->reports->take();
    const auto collector = std::make_shared<Collector>();
    _implementation->host->registerBooks({waiting.begin(), waiting.end()}, collector);
    indexing.ended = Host::runMainLoopUntil(
        [&] {
          for (const std::string& bookID : _implementation->reports->take()) {
            tell(bookID);
          }
          return collector->ended() && _implementation->host->owner().isQuietFor(quietSpan) &&
                 _implementation->reports->areQuietFor(modelSpan);
        },
        limit);
    tellAll();
    if (!indexing.ended || waiting.empty()) {
      break;
    }
    Host::runMainLoopUntil(
        [&] {
          tellAll();
          const bool isLeftToAnother = !waiting.empty() && anIndexingToolIsRunning();
          mayHaveBeenLeftToAnother = mayHaveBeenLeftToAnother || isLeftToAnother;
          return !isLeftToAnother;
        },
        limit);
    tellAll();
    // What the other made may be what was just removed here.
    if (waiting.empty() || !mayHaveBeenLeftToAnother || std::exchange(isAnew, true)) {
      break;
    }
  }
  indexing.missing.assign(waiting.begin(), waiting.end());
  return indexing;
}

bool HelpSearch::fetchIndexes(const std::vector<std::string>& bookIDs, platform::Seconds limit) {
  const auto collector = std::make_shared<Collector>();
  _implementation->host->registerBooks(bookIDs, collector);
  return Host::runMainLoopUntil(
      [&] {
        return collector->ended() && _implementation->host->owner().isQuietFor(quietSpan) &&
               _implementation->reports->areQuietFor(modelSpan);
      },
      limit);
}

bool HelpSearch::removeIndexes(const std::vector<std::string>& bookIDs) {
  (void)_implementation->reports->take();
  std::set<std::string> waiting(bookIDs.begin(), bookIDs.end());
  for (const std::string& bookID : bookIDs) {
    _implementation->host->removeIndexOfBook(bookID);
  }
  return Host::runMainLoopUntil(
      [&] {
        for (const std::string& bookID : _implementation->reports->take()) {
          waiting.erase(bookID);
        }
        return waiting.empty();
      },
      removalLimit);
}

std::optional<Answer> HelpSearch::search(std::string_view words,
                                         const std::vector<std::string>& bookIDs, size_t limit) {
  return _implementation->answer(makeQuery(words, bookIDs, {ZEBHelpArticleResult}, limit), limit);
}

std::optional<Answer> HelpSearch::searchActions(std::string_view words,
                                                const std::vector<std::string>& bookIDs,
                                                size_t limit) {
  return _implementation->answer(
      makeQuery(words, bookIDs, {ZEBHelpArticleResult, ZEBHelpActionResult}, limit), limit);
}

std::optional<std::vector<Suggestion>> HelpSearch::suggestions(
    std::string_view text, const std::vector<std::string>& bookIDs, size_t limit) {
  const auto delivery =
      _implementation->deliveryOfQuery(makeQuery(text, bookIDs, {ZEBHelpSuggestionResult}, limit));
  return delivery ? std::optional(suggestionsOfDelivery(*delivery, ZEBHelpSuggestionResult, limit))
                  : std::nullopt;
}

std::optional<std::vector<Suggestion>> HelpSearch::similarSearches(
    std::string_view words, const std::vector<std::string>& bookIDs, size_t limit) {
  // With articles, whose titles are then not offered again.
  const auto delivery = _implementation->deliveryOfQuery(
      makeQuery(words, bookIDs, {ZEBHelpArticleResult, ZEBHelpSimilarSuggestionResult}, limit));
  return delivery ? std::optional(
                        suggestionsOfDelivery(*delivery, ZEBHelpSimilarSuggestionResult, limit))
                  : std::nullopt;
}

std::optional<Answer> HelpSearch::lookUpAnchor(std::string_view name,
                                               const std::vector<std::string>& bookIDs) {
  const auto query = makeQuery(name, bookIDs, {ZEBHelpArticleResult}, 0);
  query->setOptions(platform::Value::Dictionary{
      {ZEBQueryAnchorSearchOptionKey, true}, {ZEBQuerySearchAllBooksOptionKey, bookIDs.empty()}});
  return _implementation->answer(query, SIZE_MAX);
}

void HelpSearch::settle(platform::Seconds limit) {
  Host::runMainLoopUntil(
      [&] { return _implementation->host->owner().isQuietFor(platform::Seconds::zero()); }, limit);
}

}  // namespace zeb
