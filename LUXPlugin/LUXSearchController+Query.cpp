#include <utility>

#include "LUXPlugin/LUXSearchController.h"
#include "LUXPlugin/LUXSearchRun.h"
#include "host/Luxwell/HelpLUXIndex.h"
#include "host/Luxwell/HelpLUXModel.h"
#include "host/Luxwell/HelpTokenizer.h"
#include "host/Luxwell/LUXDebugPreferences.h"
#include "host/Luxwell/LUXHit.h"
#include "host/Zebrine/ZEBConstants.h"
#include "host/Zebrine/ZEBHelpBook.h"
#include "host/Zebrine/ZEBLog.h"
#include "host/Zebrine/ZEBPluginOwner.h"
#include "host/Zebrine/ZEBQuery.h"
#include "host/Zebrine/ZEBResult.h"
#include "host/Zebrine/ZEBStrings.h"
#include "platform/Files.h"

namespace {

using Results = LUXSearchController::Results;

/// Similar searches of this many words read like sentences, and are not offered.
constexpr size_t tooManyGrams = 6;

/// The query that runs is over at every way out, also by an exception.
class QueryFlag {
 public:
  explicit QueryFlag(LUXSearchController& controller) : _controller(controller) {}
  ~QueryFlag() { _controller._setQueryInProgress(false); }
  QueryFlag(const QueryFlag&) = delete;
  QueryFlag& operator=(const QueryFlag&) = delete;

 private:
  LUXSearchController& _controller;
};

/// A page as the book's own index data has it.
struct PageProperties {
  std::string title;
  std::optional<std::string> abstract;
};

struct PageAddress {
  std::string url;
  bool usesExternalViewer = false;
};

std::optional<PageAddress> addressOfPage(const ZEBHelpBook& book, const std::string& path,
                                         const std::string& bookID) {
  if (book.type() == ZEBHelpBookType4) {
    const auto url = ZEBHelpBook::_urlForType4HelpBookResult(path, bookID);
    return url ? std::optional(PageAddress{url->absoluteString(), false}) : std::nullopt;
  }
  PageAddress address;
  std::string location;
  if (book.usesExternalViewer()) {
    address.usesExternalViewer = true;
    const auto remoteURL = book.remoteURL();
    if (!remoteURL) {
      return std::nullopt;
    }
    const std::string base = remoteURL->absoluteString();
    location = base.ends_with('/') ? base + path : base + "/" + path;
  } else {
    const std::vector<std::string> indexPaths = book.indexPaths();
    const std::optional<std::string> file =
        indexPaths.empty() ? book.accessPagePath() : std::optional(indexPaths.front());
    if (!file) {
      return std::nullopt;
    }
    location = "file://" + platform::stringByDeletingLastPathComponent(*file) + "/" + path;
  }
  const auto url = URLByEscapingString(location);
  if (!url) {
    return std::nullopt;
  }
  address.url = url->absoluteString();
  return address;
}

/// Makes the records of one answer.
class ResultMaker {
 public:
  ResultMaker(LUXSearchController& controller, const LUXQuery& query)
      : _controller(controller),
        _owner(controller.owner()),
        _queryType(query.queryType()),
        _tokenizer(HelpTokenizer::tokenizerForLanguage(query.language())),
        _tokenizedQuery(_tokenized(query.queryString())),
        _threshold(LUXDebugPreferences::defaultDebugPreferences()->floatForKey(
            LUXResultCutoffThresholdKey)) {}

  /// Null for a hit that is not to be shown.
  std::shared_ptr<ZEBResult> resultOfHit(LUXHit& hit) {
    if (_queryType == LUXQueryTypeCompletions) {
      return _suggestion(hit, ZEBHelpSuggestionResult);
    }
    if (_queryType == LUXQueryTypeSimilar) {
      const bool isShort = HelpTokenizer::countOfGramsInTokenString(
                               hit.title().value_or(std::string()), " ") < tooManyGrams;
      return isShort ? _suggestion(hit, ZEBHelpSimilarSuggestionResult) : nullptr;
    }
    return _article(hit);
  }

 private:
  std::string _tokenized(const std::string& text) const {
    return _tokenizer ? _tokenizer->tokenizedStringFromString(text) : std::string();
  }

  static std::shared_ptr<ZEBResult> _suggestion(const LUXHit& hit, const std::string& kind) {
    auto result = ZEBResult::initWithTitle(hit.title(), kind);
    result->setRelevance(static_cast<double>(hit.score()));
    return result;
  }

  std::optional<PageProperties> _properties(const std::string& bookID,
                                            const std::string& path) const {
    const auto index = _controller._luxIndexForHelpbookIdentifier(bookID);
    if (!index) {
      return std::nullopt;
    }
    const platform::Value properties = index->fileProperitesForKey(path);
    std::optional<std::string> title = properties[HelpDocPropertyTitle].stringValue();
    if (!title || title->empty()) {
      return std::nullopt;
    }
    return PageProperties{std::move(*title), properties[HelpDocPropertyDescription].stringValue()};
  }

  std::shared_ptr<ZEBResult> _article(LUXHit& hit) {
    const std::optional<std::string> path = hit.path();
    // Not "at or below": a score that is no number is not to be shown either.
    if (!(hit.score() > _threshold) || !path) {
      return nullptr;
    }
    const std::string bookID = hit.book();
    const std::optional<PageProperties> page = _properties(bookID, *path);
    if (!page) {
      return nullptr;
    }
    if (_tokenized(page->title) == _tokenizedQuery) {
      hit.setScore(1.0F);
    }
    const std::shared_ptr<ZEBHelpBook> book = _owner ? _owner->bookWithID(bookID) : nullptr;
    if (!book) {
      ZEBLog(6,
             "No registered help book found for LUX Article: %@, Book: %@, Title: %@, Abstract: %@",
             *path, bookID, page->title, page->abstract);
      return nullptr;
    }
    const std::optional<PageAddress> address = addressOfPage(*book, *path, bookID);
    if (!address) {
      ZEBLog(6,
             "No registered help book path found for LUX Article: %@, Book: %@, Title: %@, "
             "Abstract: %@",
             *path, bookID, page->title, page->abstract);
      return nullptr;
    }
    auto result = ZEBResult::initWithTitle(page->title, ZEBHelpArticleResult);
    result->setRelevance(static_cast<double>(hit.score()));
    result->setMutablePayload({{ZEBResultURLKey, address->url},
                               {ZEBResultBookIDKey, bookID},
                               {ZEBResultUsesExternalViewerKey, address->usesExternalViewer}});
    if (page->abstract) {
      result->setPayloadValue(*page->abstract, ZEBResultAbstractKey);
    }
    _markDuplicates(*book, result);
    return result;
  }

  /// Pages of one title in several books of one application: usually versions of the same book.
  void _markDuplicates(const ZEBHelpBook& book, const std::shared_ptr<ZEBResult>& result) {
    const std::optional<std::string> version = book.appBundleVersion();
    const std::optional<std::string> application = book.appBundleID();
    if (!version) {
      return;
    }
    result->setPayloadValue(*version, ZEBResultAppVersionKey);
    if (!application) {
      return;
    }
    Results& earlier = _resultsOfApplications[*application];
    for (const auto& other : earlier) {
      if (other->title() == result->title()) {
        other->setPayloadValue(true, ZEBResultIsDuplicateAppKey);
        result->setPayloadValue(true, ZEBResultIsDuplicateAppKey);
      }
    }
    earlier.push_back(result);
  }

  LUXSearchController& _controller;
  const std::shared_ptr<ZEBPluginOwner> _owner;
  const int _queryType;
  const std::shared_ptr<const HelpTokenizer> _tokenizer;
  const std::string _tokenizedQuery;
  const float _threshold;
  std::map<std::string, Results> _resultsOfApplications;
};

}  // namespace

Results LUXSearchController::doSearchForQuery(
    const std::shared_ptr<ZEBQuery>& query, const std::string& requestedResultType,
    const Indices& /*inIndices*/, const std::vector<std::string>& ignoringItems,
    std::set<std::string>* passingBackSearchedHelpbookIDs) {
  const QueryFlag flag(*this);
  return LUXSearchRun(shared_from_this(), query, requestedResultType)
      .run(ignoringItems, passingBackSearchedHelpbookIDs);
}

void LUXSearchController::_beginQuery(const std::string& queryID) {
  const platform::MonitorLock lock(_monitor);
  _searchResults.clear();
  _currentQueryID = queryID;
}

std::map<std::string, Results> LUXSearchController::_answersOfQuery(
    const std::string& queryID) const {
  const platform::MonitorLock lock(_monitor);
  // The answers to another query are no answers to this one, and its records are not to be touched.
  return _currentQueryID == queryID ? _searchResults : std::map<std::string, Results>();
}

size_t LUXSearchController::_answerCount() const {
  const platform::MonitorLock lock(_monitor);
  return _searchResults.size();
}

void LUXSearchController::queryDidFinishWithResults(
    const std::shared_ptr<LUXQuery>& query, const std::vector<std::shared_ptr<LUXHit>>& results) {
  const std::shared_ptr<ZEBQuery> outside = query->outsideQuery();
  {
    const platform::MonitorLock lock(_monitor);
    if (!outside || _currentQueryID != outside->queryID()) {
      return;
    }
  }
  Results records;
  if (!query->isCancelled()) {
    records = _resultsOfHits(*query, results);
  }
  ZEBLog(5, "Returning %d results from %@", records.size(),
         query->luxModel()->modelDirectoryPath());
  if (query->isCancelled()) {
    return;
  }
  const platform::MonitorLock lock(_monitor);
  // Another query may have begun meanwhile: this answer is not its.
  if (_currentQueryID == outside->queryID()) {
    _searchResults[query->groupName()] = std::move(records);
  }
}

Results LUXSearchController::_resultsOfHits(const LUXQuery& query,
                                            const std::vector<std::shared_ptr<LUXHit>>& hits) {
  ResultMaker maker(*this, query);
  Results records;
  for (const auto& hit : hits) {
    if (auto record = maker.resultOfHit(*hit)) {
      records.push_back(std::move(record));
    }
    if (query.isCancelled()) {
      break;
    }
  }
  return records;
}
