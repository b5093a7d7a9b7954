#include "plugin/keyword/ZEBHelpindexSearchController.h"

#include <algorithm>
#include <array>
#include <utility>

#include "SearchKit/SearchKit.h"
#include "host/Zebrine/ZEBCheckClass.h"
#include "host/Zebrine/ZEBConstants.h"
#include "host/Zebrine/ZEBHelpBook.h"
#include "host/Zebrine/ZEBLog.h"
#include "host/Zebrine/ZEBPluginOwner.h"
#include "host/Zebrine/ZEBResult.h"
#include "host/Zebrine/ZEBStrings.h"
#include "platform/Files.h"
#include "plugin/keyword/KeptList.h"
#include "plugin/records/ZEBHelpindexIndex.h"

using platform::URL;
using platform::Value;

namespace {

constexpr std::string_view operatorCharacters = "-+*()&|!\"";
/// With fewer results than this, the query is widened to any of its words.
constexpr size_t enoughResults = 15;
constexpr size_t batchSize = 50;
constexpr double batchSeconds = 1.0;

std::vector<URL> urlsOfStrings(const std::vector<std::string>& strings) {
  std::vector<URL> urls;
  for (const std::string& string : strings) {
    std::optional<URL> url = URL::URLWithString(string);
    if (!url) {
      url = URLByEscapingString(string);
    }
    if (url) {
      urls.push_back(std::move(*url));
    }
  }
  return urls;
}

KeptList bestHits(SKSearch& search) {
  KeptList kept;
  std::array<SKDocumentID, batchSize> ids{};
  std::array<float, batchSize> scores{};
  bool mayHaveMore = true;
  while (mayHaveMore) {
    size_t found = 0;
    mayHaveMore =
        SKSearchFindMatches(search, batchSize, ids.data(), scores.data(), batchSeconds, &found);
    for (size_t i = 0; i < found; ++i) {
      kept.add(ids[i], scores[i]);
    }
  }
  return kept;
}

struct PageLocation {
  /// The URL before it was escaped; absent for pages on a server.
  std::optional<std::string> fileURLString;
  std::optional<URL> url;
};

PageLocation locationOfPage(const SKDocument& document, const std::shared_ptr<ZEBHelpBook>& book,
                            const std::optional<std::string>& parentPath) {
  const std::optional<URL> documentURL = SKDocumentCopyURL(document);
  const std::string path = documentURL ? documentURL->path() : std::string();
  if (book && book->type() == ZEBHelpBookType4) {
    return {std::nullopt, ZEBHelpBook::_urlForType4HelpBookResult(path, book->bookID())};
  }
  std::string string = ZEBStringWithFormat("file://%@%@", parentPath, path);
  std::optional<URL> url = URLByEscapingString(string);
  return {std::move(string), std::move(url)};
}

// The record for a hit; null, and logged, when the index does not have all that belongs to one.
std::shared_ptr<ZEBResult> resultForPage(const ZEBHelpindexIndex& index, const SKIndexRef& indexRef,
                                         const SKDocument& document, const PageLocation& location,
                                         float score) {
  const std::optional<Value> properties = SKIndexCopyDocumentProperties(indexRef, document);
  if (!properties) {
    ZEBLog(1, "No properties for document %@", SKDocumentGetName(document));
    return nullptr;
  }
  std::shared_ptr<ZEBResult> result =
      ZEBResult::resultWithTitle((*properties)["T"].stringValue(), ZEBHelpArticleResult);
  result->setRelevance(static_cast<double>(score));
  const std::optional<std::string> abstract = (*properties)["D"].stringValue();
  const std::optional<std::string> bookID = index.bookID();
  if (!location.url || !abstract || !bookID) {
    ZEBLog(1, "Problems with creating the result dictionary for %@:\nurl: %@\nabstract: %@",
           location.fileURLString, location.url, abstract);
    return nullptr;
  }
  result->setPayload({{ZEBResultURLKey, location.url->absoluteString()},
                      {ZEBResultAbstractKey, *abstract},
                      {ZEBResultIndexIDKey, index.indexID()},
                      {ZEBResultBookIDKey, *bookID}});
  return result;
}

}  // namespace

std::shared_ptr<ZEBHelpindexSearchController> ZEBHelpindexSearchController::init() {
  return std::shared_ptr<ZEBHelpindexSearchController>(new ZEBHelpindexSearchController);
}

ZEBHelpindexSearchController::Results ZEBHelpindexSearchController::doSearchForString(
    std::string_view queryString, const Indices& inIndices, const IgnoredURLs& ignoringURLs) {
  ZEBResultSet found;
  Results results;
  const auto search = [&](bool useAndSearch) {
    for (auto& result : _doSearchForString(queryString, inIndices, ignoringURLs, useAndSearch)) {
      if (found.insert(result).second) {
        results.push_back(std::move(result));
      }
    }
  };
  search(true);
  if (found.size() < enoughResults) {
    search(false);
  }
  return results;
}

ZEBHelpindexSearchController::Results ZEBHelpindexSearchController::_doSearchForString(
    std::string_view queryString, const Indices& inIndices, const IgnoredURLs& ignoringURLs,
    bool useAndSearch) {
  const std::vector<URL> ignoredURLs = urlsOfStrings(ignoringURLs);
  Results results;
  for (const std::shared_ptr<ZEBIndex>& candidate : inIndices) {
    const auto index = zebCheckClass<ZEBHelpindexIndex>(candidate);
    if (index && index->isSearchable()) {
      _searchIndex(*index, queryString, ignoredURLs, useAndSearch, results);
    }
  }
  return results;
}

void ZEBHelpindexSearchController::_searchIndex(ZEBHelpindexIndex& index,
                                                std::string_view queryString,
                                                const std::vector<URL>& ignoredURLs,
                                                bool useAndSearch, Results& results) {
  const std::shared_ptr<ZEBHelpBook> book = _bookOfIndex(index);
  const std::optional<std::string> parentPath = _parentPath(index, book);
  SKIndexRef indexRef = index.copyIndexRef();
  if (!indexRef) {
    return;
  }
  const std::string query =
      _prepareQuery(queryString, SKIndexCopyUniqueTerms(indexRef, queryString));
  SKSearchRef search = SKSearchCreate(
      indexRef, query, useAndSearch ? kSKSearchOptionDefault : kSKSearchOptionSpaceMeansOR);
  if (search) {
    const KeptList kept = bestHits(*search);
    std::vector<SKDocumentRef> documents =
        SKIndexCopyDocumentRefsForDocumentIDs(indexRef, kept.ids());
    for (size_t i = 0; i < documents.size(); ++i) {
      const SKDocumentRef document = std::exchange(documents[i], nullptr);
      if (!document) {
        continue;
      }
      const PageLocation location = locationOfPage(*document, book, parentPath);
      if (!ignoredURLs.empty() && location.url &&
          _arrayOfURLsContainsURL(ignoredURLs, *location.url)) {
        continue;
      }
      if (auto result = resultForPage(index, indexRef, *document, location, kept.scores()[i])) {
        results.push_back(std::move(result));
      }
    }
  }
  search.reset();
  index.disposeIndexRef(indexRef);
}

std::string ZEBHelpindexSearchController::_prepareQuery(
    std::string_view query, const std::vector<std::string>& composedOfTerms) {
  std::shared_ptr<const OperatorSet> operators = _skOperators.get();
  if (!operators) {
    auto made = std::make_shared<OperatorSet>();
    for (const char c : operatorCharacters) {
      made->set(static_cast<unsigned char>(c));
    }
    operators = made;
    _skOperators.set(operators);
  }
  const bool usesSyntax = std::any_of(query.begin(), query.end(), [&](char c) {
    return operators->test(static_cast<unsigned char>(c));
  });
  if (usesSyntax) {
    return std::string(query);
  }
  std::string prepared;
  for (const std::string& term : composedOfTerms) {
    prepared += term;
    prepared += "* ";
  }
  return prepared;
}

bool ZEBHelpindexSearchController::_arrayOfURLsContainsURL(const std::vector<URL>& urls,
                                                           const URL& url) {
  return std::any_of(urls.begin(), urls.end(),
                     [&](const URL& element) { return _urlIsEqualToURL(element, url); });
}

bool ZEBHelpindexSearchController::_urlIsEqualToURL(const URL& url, const URL& isEqualToURL) {
  if (url.absoluteString() == isEqualToURL.absoluteString()) {
    return true;
  }
  return url.isFileURL() && isEqualToURL.isFileURL() && url.path() == isEqualToURL.path();
}

std::shared_ptr<ZEBHelpBook> ZEBHelpindexSearchController::_bookOfIndex(
    const ZEBHelpindexIndex& index) const {
  const std::shared_ptr<ZEBPluginOwner> owner = pluginOwner();
  const std::optional<std::string> bookID = index.bookID();
  return owner && bookID ? owner->bookWithID(*bookID) : nullptr;
}

std::optional<std::string> ZEBHelpindexSearchController::_parentPath(
    const ZEBHelpindexIndex& index, const std::shared_ptr<ZEBHelpBook>& book) {
  std::optional<std::string> path;
  if (!index.loadedFromGeneratedCache()) {
    path = index.path();
  } else if (book) {
    path = book->accessPagePath();
  }
  return path ? std::optional(platform::stringByDeletingLastPathComponent(*path)) : std::nullopt;
}
