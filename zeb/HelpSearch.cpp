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
#include "platform/RunLoop.h"
#include "platform/Strings.h"
#include "platform/ThreadSafety.h"
#include "platform/URL.h"
#include "zeb/DaemonClient.h"
#include "zeb/IndexingTools.h"
#include "zeb/SearchProvider.h"
#include "zebd/BookFolder.h"
#include "zebd/Host.h"
#include "zebd/Subscriptions.h"

namespace zeb {

namespace {

using zebd::Host;

/// Work that follows from work does so within a few milliseconds; this is ample.
constexpr platform::Seconds quietSpan{0.2};
/// But language models follow a change of indexes after a second in which nothing else changes.
constexpr platform::Seconds modelSpan{1.2};
constexpr platform::Seconds removalLimit{10};
/// How often the daemon is asked how far it is.
constexpr platform::Seconds daemonPace{0.2};
/// Searches bound their own waits.
constexpr platform::Seconds forever = platform::Seconds::max();

platform::Clock::Instant elapsedNow() { return platform::Environment::current()->clock->elapsed(); }

using Items = std::vector<zebd::FoundItem>;

/// A search of the host in this process. Wakes the main loop at its end.
class HostedSearch : public RunningSearch, public zebd::SearchReceiver {
 public:
  HostedSearch(std::shared_ptr<ZEBQuery> query, std::shared_ptr<const zebd::Bookshelf> bookshelf)
      : _query(std::move(query)), _bookshelf(std::move(bookshelf)) {}

  // zebd::SearchReceiver.
  void foundResults(const ZEBResultBatch& batch) override {
    Items items = zebd::itemsOfBatch(batch, *_bookshelf);
    const platform::MutexLock lock(_mutex);
    _items.insert(_items.end(), std::make_move_iterator(items.begin()),
                  std::make_move_iterator(items.end()));
  }
  void searchEnded(bool finished) override {
    {
      const platform::MutexLock lock(_mutex);
      _ended = true;
      _finished = finished;
    }
    platform::RunLoop::main()->stop();
  }

  // RunningSearch.
  void cancel() override { _query->cancel(); }
  bool ended() const override {
    const platform::MutexLock lock(_mutex);
    return _ended;
  }
  bool finished() const override {
    const platform::MutexLock lock(_mutex);
    return _finished;
  }
  Items items() const override {
    const platform::MutexLock lock(_mutex);
    return _items;
  }

 private:
  const std::shared_ptr<ZEBQuery> _query;
  const std::shared_ptr<const zebd::Bookshelf> _bookshelf;
  mutable platform::Mutex _mutex;
  Items _items GUARDED_BY(_mutex);
  bool _ended GUARDED_BY(_mutex) = false;
  bool _finished GUARDED_BY(_mutex) = false;
};

/// Searches of a host in this process.
class HostedSearches : public SearchProvider {
 public:
  explicit HostedSearches(Host& host) : _host(host) {}

  std::shared_ptr<RunningSearch> begin(const zebd::SearchRequest& request) override {
    const auto query = request.query();
    auto search = std::make_shared<HostedSearch>(query, _host.sharedBookshelf());
    _host.startSearch(query, search);
    return search;
  }

  bool lacksIndex(const std::string& bookID) const {
    const auto book = _host.bookshelf().bookWithID(bookID);
    return book != nullptr && book->type() != ZEBHelpBookType4 && !zebd::indexPathOfBook(*book);
  }
  std::vector<std::string> booksWithoutIndex(const std::vector<std::string>& bookIDs) override {
    std::vector<std::string> missing;
    if (bookIDs.empty()) {
      for (const auto& entry : _host.bookshelf().books()) {
        if (lacksIndex(entry.first)) {
          missing.push_back(entry.first);
        }
      }
      return missing;
    }
    std::copy_if(bookIDs.begin(), bookIDs.end(), std::back_inserter(missing),
                 [this](const std::string& bookID) { return lacksIndex(bookID); });
    return missing;
  }

 private:
  Host& _host;
};

zebd::SearchRequest requestFor(std::string_view text, const std::vector<std::string>& bookIDs,
                               std::vector<std::string> kinds, size_t limit) {
  zebd::SearchRequest request;
  request.text = std::string(text);
  request.bookIDs = bookIDs;
  request.kinds = std::move(kinds);
  request.limit = limit;
  return request;
}

/// Which books the plug-in has reported since it was last asked.
class Reports {
 public:
  void add(const std::string& bookID) {
    const platform::Clock::Instant now = elapsedNow();
    const platform::MutexLock lock(_mutex);
    _bookIDs.insert(bookID);
    _last = now;
    ++_count;
  }
  /// Whether no report has come for `span`.
  bool areQuietFor(platform::Seconds span) const {
    const platform::Clock::Instant now = elapsedNow();
    const platform::MutexLock lock(_mutex);
    return !_last || now - *_last >= span;
  }
  /// How many there were.
  uint64_t count() const {
    const platform::MutexLock lock(_mutex);
    return _count;
  }
  std::set<std::string> take() {
    const platform::MutexLock lock(_mutex);
    return std::exchange(_bookIDs, {});
  }

 private:
  mutable platform::Mutex _mutex;
  std::set<std::string> _bookIDs GUARDED_BY(_mutex);
  std::optional<platform::Clock::Instant> _last GUARDED_BY(_mutex);
  uint64_t _count GUARDED_BY(_mutex) = 0;
};

}  // namespace

struct HelpSearch::Implementation {
  /// Null where the daemon searches.
  std::unique_ptr<Host> host;
  std::unique_ptr<DaemonClient> daemon;
  std::unique_ptr<HostedSearches> hosted;
  std::shared_ptr<Reports> reports = std::make_shared<Reports>();

  SearchProvider& provider() const {
    return daemon != nullptr ? static_cast<SearchProvider&>(*daemon) : *hosted;
  }

  /// Absent when the search broke off.
  std::optional<Items> itemsOf(const zebd::SearchRequest& request) {
    const auto search = provider().begin(request);
    Host::runMainLoopUntil([&] { return search->ended(); }, forever);
    return search->finished() ? std::optional(search->items()) : std::nullopt;
  }

  std::optional<Answer> answer(const zebd::SearchRequest& request, size_t limit);
};

namespace {

std::vector<FoundPage> pagesOfItems(const Items& items) {
  std::vector<FoundPage> pages;
  std::set<std::string> shown;
  for (const zebd::FoundItem& item : items) {
    // A book may name one page for the words in several of its lists.
    if (item.kind == ZEBHelpArticleResult && shown.insert(item.url).second) {
      pages.push_back(
          {item.title, item.bookID, item.bookTitle, item.abstract, item.url, item.relevance});
    }
  }
  return pages;
}

std::vector<Suggestion> suggestionsOfItems(const Items& items, const std::string& kind,
                                           size_t limit) {
  std::vector<Suggestion> suggestions;
  std::set<std::string> shown;
  const auto add = [&](const zebd::FoundItem& item) {
    if (suggestions.size() < limit && shown.insert(platform::lowercaseString(item.title)).second) {
      suggestions.push_back({item.title, item.relevance});
    }
  };
  // Those of a book's own list have no relevance and no book, and come first.
  const auto isOfAList = [](const zebd::FoundItem& item) {
    return item.kind == ZEBHelpSuggestionResult && item.relevance == 0;
  };
  for (const zebd::FoundItem& item : items) {
    if (isOfAList(item)) {
      add(item);
    }
  }
  for (const zebd::FoundItem& item : items) {
    if (item.kind == kind && !isOfAList(item)) {
      add(item);
    }
  }
  return suggestions;
}

}  // namespace

std::optional<Answer> HelpSearch::Implementation::answer(const zebd::SearchRequest& request,
                                                         size_t limit) {
  const std::optional<Items> items = itemsOf(request);
  if (!items) {
    return std::nullopt;
  }
  Answer answer;
  answer.pages = pagesOfItems(*items);
  answer.count = answer.pages.size();
  if (answer.pages.size() > limit) {
    answer.pages.resize(limit);
  }
  return answer;
}

class HelpSearch::Live : public LiveSearch {
 public:
  explicit Live(std::shared_ptr<RunningSearch> search) : _search(std::move(search)) {}

  void cancel() override { _search->cancel(); }
  bool ended() const override { return _search->ended(); }
  bool finished() const override { return _search->finished(); }
  LiveAnswer answer(size_t limit) const override {
    const Items items = _search->items();
    LiveAnswer answer;
    answer.completions = suggestionsOfItems(items, ZEBHelpSuggestionResult, limit);
    answer.pages = pagesOfItems(items);
    if (answer.pages.size() > limit) {
      answer.pages.resize(limit);
    }
    return answer;
  }

 private:
  const std::shared_ptr<RunningSearch> _search;
};

std::shared_ptr<LiveSearch> HelpSearch::beginSearch(std::string_view words,
                                                    const std::vector<std::string>& bookIDs) {
  return std::make_shared<Live>(
      _implementation->provider().begin(requestFor(words, bookIDs, {ZEBHelpArticleResult}, 0)));
}

std::shared_ptr<LiveSearch> HelpSearch::beginLiveSearch(std::string_view text,
                                                        const std::vector<std::string>& bookIDs) {
  return std::make_shared<Live>(_implementation->provider().begin(
      requestFor(text, bookIDs, {ZEBHelpArticleResult, ZEBHelpSuggestionResult}, 0)));
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
  zebd::forgetKnownIndicesWhenDue(entries);
  auto implementation = std::make_unique<Implementation>();
  implementation->host = Host::start(installation.pluginBundlePath, std::move(settings), error);
  if (implementation->host == nullptr) {
    return nullptr;
  }
  implementation->hosted = std::make_unique<HostedSearches>(*implementation->host);
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

std::unique_ptr<HelpSearch> HelpSearch::withDaemon(std::unique_ptr<DaemonClient> daemon) {
  auto implementation = std::make_unique<Implementation>();
  implementation->daemon = std::move(daemon);
  return std::unique_ptr<HelpSearch>(new HelpSearch(std::move(implementation)));
}

DaemonClient* HelpSearch::daemon() const { return _implementation->daemon.get(); }

uint64_t HelpSearch::changeCount() const {
  return _implementation->daemon != nullptr ? _implementation->daemon->changeCount()
                                            : _implementation->reports->count();
}

std::vector<std::string> HelpSearch::booksWithoutIndex(
    const std::vector<std::string>& bookIDs) const {
  return _implementation->provider().booksWithoutIndex(bookIDs);
}

/// Left to itself the plug-in takes one book every two seconds; but those that a search needs, at
/// once. No page carries this anchor.
std::shared_ptr<RunningSearch> HelpSearch::_registerWithDaemon(std::vector<std::string> bookIDs) {
  bookIDs.resize(std::min(bookIDs.size(), zebd::HelpService::maximumBookCount));
  zebd::SearchRequest request = requestFor(" ", bookIDs, {ZEBHelpArticleResult}, 0);
  request.isAnchor = true;
  return _implementation->daemon->begin(request);
}

HelpSearch::Indexing HelpSearch::waitForIndexes(const std::vector<std::string>& bookIDs,
                                                platform::Seconds limit, const Progress& progress) {
  std::set<std::string> waiting(bookIDs.begin(), bookIDs.end());
  size_t count = 0;
  platform::Clock::Instant nextLook = elapsedNow();
  platform::Clock::Instant lastWork = elapsedNow();
  Indexing indexing;
  indexing.ended = Host::runMainLoopUntil(
      [&] {
        const platform::Clock::Instant now = elapsedNow();
        if (now < nextLook) {
          return false;
        }
        nextLook = now + daemonPace;
        const std::vector<std::string> listed = booksWithoutIndex(bookIDs);
        const std::set<std::string> missing(listed.begin(), listed.end());
        for (const std::string& bookID : bookIDs) {
          if (!missing.contains(bookID) && waiting.erase(bookID) > 0) {
            ++count;
            progress(bookID, count);
          }
        }
        if (_implementation->daemon->isBusy()) {
          lastWork = now;
        }
        // Work begets work, with gaps between.
        return waiting.empty() || now - lastWork > modelSpan;
      },
      limit);
  indexing.missing.assign(waiting.begin(), waiting.end());
  return indexing;
}

HelpSearch::Indexing HelpSearch::makeIndexes(const std::vector<std::string>& bookIDs,
                                             platform::Seconds limit, const Progress& progress) {
  if (_implementation->daemon != nullptr) {
    const auto registration = _registerWithDaemon(bookIDs);
    return waitForIndexes(bookIDs, limit, progress);
  }
  std::set<std::string> waiting(bookIDs.begin(), bookIDs.end());
  size_t count = 0;
  const auto tell = [&](const std::string& bookID) {
    if (!_implementation->hosted->lacksIndex(bookID) && waiting.erase(bookID) > 0) {
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
  bool mayHaveBeenLeftToAnother = runningIndexingToolCount() > 0;
  bool isAnew = false;
  while (true) {
    (void)_implementation->reports->take();
    const auto collector =
        std::make_shared<HostedSearch>(nullptr, _implementation->host->sharedBookshelf());
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
          const bool isLeftToAnother = !waiting.empty() && runningIndexingToolCount() > 0;
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
  if (_implementation->daemon != nullptr) {
    const auto lackingCount = [&] {
      const auto books = _implementation->daemon->books();
      return books ? std::count_if(books->begin(), books->end(),
                                   [&](const zebd::BookStatus& book) {
                                     return !book.indexPath &&
                                            std::find(bookIDs.begin(), bookIDs.end(),
                                                      book.bookID) != bookIDs.end();
                                   })
                   : 0;
    };
    // What comes anew can be seen; whether what is there is the newest cannot.
    const bool allAreNew = static_cast<size_t>(lackingCount()) == bookIDs.size();
    // The daemon may be busy for long with the books of this computer, one after the other.
    const auto registration = _registerWithDaemon(bookIDs);
    platform::Clock::Instant lastWork = elapsedNow();
    platform::Clock::Instant nextLook = lastWork;
    uint64_t seen = changeCount();
    return Host::runMainLoopUntil(
        [&] {
          const platform::Clock::Instant now = elapsedNow();
          if (now < nextLook) {
            return false;
          }
          nextLook = now + daemonPace;
          const bool hasChanged = std::exchange(seen, changeCount()) != seen;
          const bool allAreHere = lackingCount() == 0;
          const bool isAtWork = !registration->ended() || hasChanged ||
                                (!allAreHere && _implementation->daemon->isBusy());
          lastWork = isAtWork ? now : lastWork;
          return now - lastWork > modelSpan || (allAreNew && allAreHere);
        },
        limit);
  }
  const auto collector =
      std::make_shared<HostedSearch>(nullptr, _implementation->host->sharedBookshelf());
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
  return _implementation->answer(requestFor(words, bookIDs, {ZEBHelpArticleResult}, limit), limit);
}

std::optional<Answer> HelpSearch::searchActions(std::string_view words,
                                                const std::vector<std::string>& bookIDs,
                                                size_t limit) {
  return _implementation->answer(
      requestFor(words, bookIDs, {ZEBHelpArticleResult, ZEBHelpActionResult}, limit), limit);
}

std::optional<std::vector<Suggestion>> HelpSearch::suggestions(
    std::string_view text, const std::vector<std::string>& bookIDs, size_t limit) {
  const auto items =
      _implementation->itemsOf(requestFor(text, bookIDs, {ZEBHelpSuggestionResult}, limit));
  return items ? std::optional(suggestionsOfItems(*items, ZEBHelpSuggestionResult, limit))
               : std::nullopt;
}

std::optional<std::vector<Suggestion>> HelpSearch::similarSearches(
    std::string_view words, const std::vector<std::string>& bookIDs, size_t limit) {
  // With articles, whose titles are then not offered again.
  const auto items = _implementation->itemsOf(
      requestFor(words, bookIDs, {ZEBHelpArticleResult, ZEBHelpSimilarSuggestionResult}, limit));
  return items ? std::optional(suggestionsOfItems(*items, ZEBHelpSimilarSuggestionResult, limit))
               : std::nullopt;
}

std::optional<Answer> HelpSearch::lookUpAnchor(std::string_view name,
                                               const std::vector<std::string>& bookIDs) {
  zebd::SearchRequest request = requestFor(name, bookIDs, {ZEBHelpArticleResult}, 0);
  request.isAnchor = true;
  return _implementation->answer(request, SIZE_MAX);
}

void HelpSearch::settle(platform::Seconds limit) {
  // A daemon goes on by itself.
  if (_implementation->host != nullptr) {
    Host::runMainLoopUntil(
        [&] { return _implementation->host->owner().isQuietFor(platform::Seconds::zero()); },
        limit);
  }
}

}  // namespace zeb
