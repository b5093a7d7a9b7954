#include "plugin/front/SearchRun.h"

#include <algorithm>
#include <utility>

#include "LUXPlugin/LUXSearchController.h"
#include "host/Zebrine/ZEBBookLists.h"
#include "host/Zebrine/ZEBConstants.h"
#include "host/Zebrine/ZEBHelpBook.h"
#include "host/Zebrine/ZEBLog.h"
#include "host/Zebrine/ZEBPluginOwner.h"
#include "host/Zebrine/ZEBQuery.h"
#include "host/Zebrine/ZEBResult.h"
#include "platform/Environment.h"
#include "platform/PropertyList.h"
#include "platform/Strings.h"
#include "plugin/front/SearchMerging.h"
#include "plugin/keyword/ZEBHelpindexSearchController.h"
#include "plugin/records/ZEBHelpindexIndex.h"
#include "plugin/shelf/ShutdownGuard.h"
#include "plugin/shelf/ZEBIndexshelf.h"

namespace {

constexpr double downloadWait = 5.0;
constexpr platform::Seconds pollingBudget{5.0};
constexpr platform::Seconds pollingInterval{0.010};

/// The list at a path, read anew each time: lists are small, and a cache would be shared state.
platform::Value listAtPath(const std::string& path) {
  return platform::dictionaryWithContentsOfFile(path).value_or(platform::Value());
}

}  // namespace

SearchRun::SearchRun(std::shared_ptr<ZEBPlugin> plugin, std::shared_ptr<ZEBPluginOwner> owner,
                     ZEBIndexshelf& indexshelf, ZEBHelpindexSearchController& keywordController,
                     LUXSearchController* luxSearchController, std::shared_ptr<ZEBQuery> query)
    : _plugin(std::move(plugin)),
      _owner(std::move(owner)),
      _indexshelf(indexshelf),
      _keywordController(keywordController),
      _luxSearchController(luxSearchController),
      _query(std::move(query)) {}

void SearchRun::run() {
  const ShutdownGuard guard(_owner);
  try {
    ZEBLog(3, "Starting help articles search for query: \"%@\"",
           _query ? std::optional(_query->queryString()) : std::nullopt);
    // Without an owner there are no books, and nobody to tell.
    if (_owner) {
      if (_query && !_query->queryString().empty()) {
        _search();
      }
      _finish();
    }
  } catch (const std::exception& exception) {
    ZEBLog(0, "%@", exception);
  }
}

void SearchRun::_search() {
  _readRequest();
  _collectBookList();
  _answerOffline();
  for (const std::string& bookID : _bookList) {
    _visitBook(bookID);
    if (_cancelled()) {
      break;
    }
  }
  if (!_allIndices.empty() && !_cancelled()) {
    _findArticles();
  }
  if (_cancelled()) {
    return;
  }
  if (_wantsSuggestions) {
    _deliverSemantic(ZEBHelpSuggestionResult, {});
  } else if (_wantsSimilar) {
    _deliverSemantic(ZEBHelpSimilarSuggestionResult, _titles);
  }
}

void SearchRun::_finish() {
  _owner->pluginFinishedSearchingForQuery(_plugin, _query);
  if (_query && _query->options()[ZEBQuerySkipShutdownDelayOptionKey].boolValue()) {
    _owner->setIdleTimeOutDelay(1);
  }
}

void SearchRun::_readRequest() {
  _anchorMode = _query->options()[ZEBQueryAnchorSearchOptionKey].boolValue();
  _searchesAllBooks = _query->options()[ZEBQuerySearchAllBooksOptionKey].boolValue();
  const std::vector<std::string>& kinds = _query->resultTypes();
  const auto wants = [&](const std::string& kind) {
    return std::find(kinds.begin(), kinds.end(), kind) != kinds.end();
  };
  _wantsSuggestions = wants(ZEBHelpSuggestionResult);
  _wantsSimilar = wants(ZEBHelpSimilarSuggestionResult);
  _wantsActions = wants(ZEBHelpActionResult);
  _wantsArticles = wants(ZEBHelpArticleResult);
  _primaryBookID = KROrvHelpbookID;
}

void SearchRun::_collectBookList() {
  const std::vector<std::string>& scope = _query->scope();
  if (scope.empty() || _searchesAllBooks) {
    for (const auto& entry : _owner->knownBooks()) {
      _bookList.push_back(entry.first);
    }
  } else {
    for (const std::string& bookID : scope) {
      if (const auto book = _owner->bookWithID(bookID)) {
        _bookList.push_back(book->bookID());
      }
    }
  }
  if (scope.size() == 1) {
    const auto book = _owner->bookWithID(scope.front());
    _primaryBookID = book ? std::optional(book->bookID()) : std::nullopt;
  }
}

bool SearchRun::_isUnreachable() const {
  const bool online = _owner->isOnline();
  if (!_wantsArticles || online || _anchorMode || _query->scope().empty()) {
    return false;
  }
  // A scope of nothing but unknown books is not out of reach, it is empty.
  return !_bookList.empty() &&
         std::all_of(_bookList.begin(), _bookList.end(), [&](const std::string& bookID) {
           const auto book = _owner->bookWithID(bookID);
           return book && book->type() == ZEBHelpBookType4;
         });
}

void SearchRun::_answerOffline() {
  if (!_isUnreachable()) {
    return;
  }
  if (const auto book = _owner->bookWithID(KROfflineHelpbookID)) {
    _indexshelf.ensureRegistrationForBook(book);
    const Indices indices = _indexshelf.indicesForBook(book);
    ZEBLog(3, "Looking up anchor \"%@\" in indexes: %@", _query->queryString(), indices);
    Results topic = _keywordController.doLookupOfAnchor(KROfflineHelpTopicNotConnected, indices);
    if (!topic.empty()) {
      _deliver(std::move(topic));
    }
  }
  _bookList.clear();
}

void SearchRun::_visitBook(const std::string& bookID) {
  const std::shared_ptr<ZEBHelpBook> book = _owner->bookWithID(bookID);
  if (!book) {
    return;
  }
  if (_wantsSuggestions) {
    _deliverSuggestionList(*book);
  }
  if (!_wantsArticles) {
    return;
  }
  const std::optional<Indices> indices = _indicesOfBook(book);
  if (!_wantsActions && !_anchorMode) {
    if (!_wantsSuggestions) {
      _lookUpExactMatch(*book, indices);
    }
    _lookUpSuggestionAnchor(*book, indices);
  }
  if (indices) {
    _allIndices.insert(_allIndices.end(), indices->begin(), indices->end());
  }
}

void SearchRun::_deliverSuggestionList(const ZEBHelpBook& book) {
  const std::optional<std::string> path = book.suggestionsPath();
  if (!path) {
    return;
  }
  std::vector<std::string> texts =
      ZEBSuggestionsWithPrefix(listAtPath(*path), platform::lowercaseString(_query->queryString()));
  if (texts.empty()) {
    return;
  }
  std::stable_sort(texts.begin(), texts.end(), [](const std::string& a, const std::string& b) {
    return platform::localizedCaseInsensitiveCompare(a, b) < 0;
  });
  _owner->pluginFoundResults(_plugin, texts, _query);
}

std::optional<SearchRun::Indices> SearchRun::_indicesOfBook(
    const std::shared_ptr<ZEBHelpBook>& book) {
  _indexshelf.ensureRegistrationForBook(book);
  Indices records = _indexshelf.indicesForBook(book);
  if (records.empty() && book->type() == ZEBHelpBookType4 &&
      _indexshelf.waitForIndexDownloadCompletionForType4Book(book, downloadWait)) {
    records = _indexshelf.indicesForBook(book);
  }
  const std::shared_ptr<platform::Clock> clock = platform::Environment::current()->clock;
  const platform::Clock::Instant start = clock->elapsed();
  while (true) {
    std::optional<Indices> collected;
    bool downloading = false;
    for (const auto& record : records) {
      if (!std::dynamic_pointer_cast<ZEBHelpindexIndex>(record)) {
        continue;
      }
      if (!collected) {
        collected.emplace();
      }
      collected->push_back(record);
      if (record->isDownloading() || _indexshelf.isIndexDownloadingForBook(book)) {
        downloading = true;
      }
    }
    if (!downloading || clock->elapsed() - start >= pollingBudget) {
      return collected;
    }
    clock->sleep(pollingInterval);
  }
}

void SearchRun::_lookUpExactMatch(const ZEBHelpBook& book, const std::optional<Indices>& indices) {
  const std::optional<std::string> path = book.exactMatchPath();
  if (!path) {
    return;
  }
  const std::string key =
      platform::lowercaseString(platform::stringByRemovingWhitespace(_query->queryString()));
  const std::optional<std::string> anchor = ZEBExactMatchAnchor(listAtPath(*path), key);
  if (!anchor || !indices) {
    return;
  }
  for (const auto& result : _keywordController.doLookupOfAnchor(*anchor, *indices)) {
    weightResult(*result, _primaryBookID);
    result->setPayloadValue(true, ZEBResultIsExactMatchKey);
    if (result->title()) {
      _titles.push_back(*result->title());
    }
    _exactResults.push_back(result);
  }
}

void SearchRun::_lookUpSuggestionAnchor(const ZEBHelpBook& book,
                                        const std::optional<Indices>& indices) {
  const std::optional<std::string> path = book.suggestionsPath();
  if (!path) {
    return;
  }
  const std::optional<std::string> anchor =
      ZEBSuggestionAnchor(listAtPath(*path), _query->queryString());
  if (!anchor || !indices) {
    return;
  }
  const Results found = _keywordController.doLookupOfAnchor(*anchor, *indices);
  _exactResults.insert(_exactResults.end(), found.begin(), found.end());
}

void SearchRun::_findArticles() {
  if (_anchorMode) {
    ZEBLog(3, "Looking up anchor \"%@\" in indexes: %@", _query->queryString(), _allIndices);
    _deliverArticles(_keywordController.doLookupOfAnchor(_query->queryString(), _allIndices));
    return;
  }
  _deliverArticles(_searchBothWays());
}

std::optional<SearchRun::Results> SearchRun::_searchBothWays() {
  std::vector<std::string> ignoredURLs;
  for (const auto& result : _exactResults) {
    if (const auto url = result->payloadValueForKey(ZEBResultURLKey).stringValue()) {
      ignoredURLs.push_back(*url);
    }
  }
  std::optional<Results> semantic;
  std::set<std::string> searchedBookIDs;
  if (_luxSearchController != nullptr) {
    _luxSearchController->useShorterTimeouts(false);
    semantic = _luxSearchController->doSearchForQuery(
        _query, _wantsActions ? ZEBHelpActionResult : ZEBHelpArticleResult, _allIndices,
        ignoredURLs, &searchedBookIDs);
  }
  if (_wantsActions) {
    return semantic;
  }
  const bool semanticFoundNothing = !semantic || semantic->empty();
  Indices remaining;
  for (const auto& record : _allIndices) {
    const std::optional<std::string> bookID = record->bookID();
    const bool searched = bookID && searchedBookIDs.contains(*bookID);
    if (!searched || semanticFoundNothing) {
      remaining.push_back(record);
    }
  }
  const Results keyword = remaining.empty() ? Results()
                                            : _keywordController.doSearchForString(
                                                  _query->queryString(), remaining, ignoredURLs);
  return keyword.empty() ? semantic
                         : mergedResults(semantic.value_or(Results()), keyword, _primaryBookID);
}

void SearchRun::_deliverArticles(std::optional<Results> found) {
  if (!found) {
    if (!_exactResults.empty()) {
      sortByRelevance(_exactResults);
      _deliver(_exactResults);
    }
    return;
  }
  for (const auto& result : *found) {
    if (result->title()) {
      _titles.push_back(*result->title());
    }
  }
  if (!_exactResults.empty()) {
    found->insert(found->end(), _exactResults.begin(), _exactResults.end());
    sortByRelevance(*found);
  }
  _deliver(std::move(*found));
}

void SearchRun::_deliverSemantic(const std::string& resultType,
                                 const std::vector<std::string>& ignoring) {
  if (_luxSearchController == nullptr) {
    return;
  }
  std::optional<Results> found =
      _luxSearchController->doSearchForQuery(_query, resultType, _allIndices, ignoring, nullptr);
  if (found) {
    _deliver(std::move(*found));
  }
}

void SearchRun::_deliver(Results results) {
  _owner->pluginFoundResults(_plugin, std::move(results), _query);
}

bool SearchRun::_cancelled() const { return _query->cancelled(); }
