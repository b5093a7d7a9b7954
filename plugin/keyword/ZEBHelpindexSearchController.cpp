#include "plugin/keyword/ZEBHelpindexSearchController.h"

#include <algorithm>
#include <array>
#include <functional>
#include <span>
#include <utility>

#include "SearchKit/IndexReader.h"
#include "SearchKit/SearchKit.h"
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

void findBestHits(SKSearch& search, KeptList& kept) {
  std::array<SKDocumentID, batchSize> ids;
  std::array<float, batchSize> scores;
  kept.clear();
  bool mayHaveMore = true;
  while (mayHaveMore) {
    size_t found = 0;
    mayHaveMore =
        SKSearchFindMatches(search, batchSize, ids.data(), scores.data(), batchSeconds, &found);
    for (size_t i = 0; i < found; ++i) {
      kept.add(ids[i], scores[i]);
    }
  }
}

std::optional<std::string> folderOf(const std::optional<std::string>& path) {
  return path ? std::optional(platform::stringByDeletingLastPathComponent(*path)) : std::nullopt;
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

Value::Dictionary payloadOfPage(const URL& url, std::string abstract, int32_t indexID,
                                std::string bookID) {
  return {{ZEBResultURLKey, url.absoluteString()},
          {ZEBResultAbstractKey, std::move(abstract)},
          {ZEBResultIndexIDKey, indexID},
          {ZEBResultBookIDKey, std::move(bookID)}};
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
  result->setPayload(payloadOfPage(*location.url, *abstract, index.indexID(), *bookID));
  return result;
}

// The plain pages of one index, as records that are put together when somebody looks at them.
class KeywordHits : public ZEBResultSource {
 public:
  /// `siblingPath` is that of a file in the folder that the index's documents lie under.
  KeywordHits(const SKIndexRef& index, std::optional<std::string> siblingPath, std::string bookID,
              int32_t indexID)
      : _bytes(searchkit::indexBytes(*index)),
        _siblingPath(std::move(siblingPath)),
        _bookID(std::move(bookID)),
        _indexID(indexID) {}

  Content contentOfResult(uint32_t number) const override {
    const SKIndexRef index = SKIndexOpenWithData(_bytes);
    const SKDocumentID id = number;
    const std::vector<SKDocumentRef> documents =
        SKIndexCopyDocumentRefsForDocumentIDs(index, std::span(&id, 1));
    const std::optional<Value> properties = SKIndexCopyDocumentProperties(index, *documents[0]);
    const PageLocation location = locationOfPage(*documents[0], nullptr, folderOf(_siblingPath));
    return {(*properties)["T"].stringValue(),
            payloadOfPage(*location.url, (*properties)["D"].stringValue().value_or(""), _indexID,
                          _bookID)};
  }

 private:
  platform::Data _bytes;
  std::optional<std::string> _siblingPath;
  std::string _bookID;
  int32_t _indexID;
};

}  // namespace

// One pass over the indices.
struct ZEBHelpindexSearchController::Pass {
  explicit Pass(std::string_view text) : queryString(text) {}

  /// Which page of which of the indices a record is.
  struct Origin {
    size_t index;
    SKDocumentID page;
  };

  std::string_view queryString;
  SKSearchOptions options = kSKSearchOptionDefault;
  std::vector<URL> ignoredURLs;
  std::shared_ptr<ZEBPluginOwner> owner;
  Results results;
  /// Of each result, as long as all are plain; then two records are equal only when their origins
  /// are, or when two of the indices are of one book.
  std::vector<Origin> origins;
  bool isPlain = true;
  /// Of the books of all indices.
  std::vector<size_t> bookHashes;

  // The index that is being searched, its number among them, and its book.
  size_t index = 0;
  std::optional<std::string> bookID;
  std::shared_ptr<ZEBHelpBook> book;

  /// The query as the engine takes it. What it is split into is the same for all indexes that the
  /// engine opens at all, so it is composed once.
  SKQueryRef query;
  // Used again from one index to the next.
  KeptList kept;
  std::vector<ZEBResult::Sourced> sourced;
};

std::shared_ptr<ZEBHelpindexSearchController> ZEBHelpindexSearchController::init() {
  return std::shared_ptr<ZEBHelpindexSearchController>(new ZEBHelpindexSearchController);
}

ZEBHelpindexSearchController::Results ZEBHelpindexSearchController::doSearchForString(
    std::string_view queryString, const Indices& inIndices, const IgnoredURLs& ignoringURLs) {
  Pass all = _runPass(queryString, inIndices, ignoringURLs, true);
  const bool booksAreDifferent = _areDifferent(std::move(all.bookHashes));
  if (all.isPlain && booksAreDifferent && all.results.size() >= enoughResults) {
    return std::move(all.results);
  }
  if (all.isPlain && booksAreDifferent) {
    Pass any = _runPass(queryString, inIndices, ignoringURLs, false);
    if (any.isPlain) {
      return _united(std::move(all), std::move(any));
    }
    return _distinct(std::move(all.results), std::move(any.results));
  }
  Results distinct = _distinct(std::move(all.results), {});
  if (distinct.size() >= enoughResults) {
    return distinct;
  }
  return _distinct(std::move(distinct),
                   _doSearchForString(queryString, inIndices, ignoringURLs, false));
}

// Without repetition, of two equal records the first.
ZEBHelpindexSearchController::Results ZEBHelpindexSearchController::_distinct(Results first,
                                                                              Results second) {
  ZEBResultSet found;
  Results results;
  for (Results* const some : {&first, &second}) {
    for (std::shared_ptr<ZEBResult>& result : *some) {
      if (found.insert(result).second) {
        results.push_back(std::move(result));
      }
    }
  }
  return results;
}

// The same for plain records of different books, of which `all` are few.
ZEBHelpindexSearchController::Results ZEBHelpindexSearchController::_united(Pass all, Pass any) {
  Results results = std::move(all.results);
  results.reserve(results.size() + any.results.size());
  for (size_t i = 0; i < any.results.size(); ++i) {
    const Pass::Origin origin = any.origins[i];
    const bool isThere =
        std::any_of(all.origins.begin(), all.origins.end(), [origin](const Pass::Origin& other) {
          return other.page == origin.page && other.index == origin.index;
        });
    if (!isThere) {
      results.push_back(std::move(any.results[i]));
    }
  }
  return results;
}

bool ZEBHelpindexSearchController::_areDifferent(std::vector<size_t> hashes) {
  std::sort(hashes.begin(), hashes.end());
  return std::adjacent_find(hashes.begin(), hashes.end()) == hashes.end();
}

ZEBHelpindexSearchController::Results ZEBHelpindexSearchController::_doSearchForString(
    std::string_view queryString, const Indices& inIndices, const IgnoredURLs& ignoringURLs,
    bool useAndSearch) {
  return _runPass(queryString, inIndices, ignoringURLs, useAndSearch).results;
}

ZEBHelpindexSearchController::Pass ZEBHelpindexSearchController::_runPass(
    std::string_view queryString, const Indices& inIndices, const IgnoredURLs& ignoringURLs,
    bool useAndSearch) {
  Pass pass(queryString);
  pass.options = useAndSearch ? kSKSearchOptionDefault : kSKSearchOptionSpaceMeansOR;
  pass.ignoredURLs = urlsOfStrings(ignoringURLs);
  pass.owner = pluginOwner();
  pass.bookHashes.reserve(inIndices.size());
  for (; pass.index < inIndices.size(); ++pass.index) {
    auto* const index = dynamic_cast<ZEBHelpindexIndex*>(inIndices[pass.index].get());
    if (index == nullptr) {
      continue;
    }
    pass.bookID = index->bookID();
    pass.bookHashes.push_back(std::hash<std::optional<std::string>>{}(pass.bookID));
    if (index->isSearchable()) {
      _searchIndex(*index, pass);
    }
  }
  return pass;
}

void ZEBHelpindexSearchController::_searchIndex(ZEBHelpindexIndex& index, Pass& pass) {
  pass.book = pass.owner && pass.bookID ? pass.owner->bookWithID(*pass.bookID) : nullptr;
  SKIndexRef indexRef = index.copyIndexRef();
  if (!indexRef) {
    return;
  }
  if (!pass.query) {
    pass.query = SKQueryCreate(
        _prepareQuery(pass.queryString, SKIndexCopyUniqueTerms(indexRef, pass.queryString)),
        pass.options);
  }
  SKSearchRef search = SKSearchCreateWithQuery(indexRef, pass.query);
  if (search) {
    findBestHits(*search, pass.kept);
    search.reset();
    if (!pass.kept.empty()) {
      _addResults(index, indexRef, pass);
    }
  }
  index.disposeIndexRef(indexRef);
}

// Records of the hits kept, in their order.
void ZEBHelpindexSearchController::_addResults(ZEBHelpindexIndex& index, const SKIndexRef& indexRef,
                                               Pass& pass) {
  std::optional<std::string> siblingPath = _siblingPath(index, pass.book);
  const bool isOnServer = pass.book && pass.book->type() == ZEBHelpBookType4;
  if (pass.ignoredURLs.empty() && pass.bookID && !isOnServer &&
      (!siblingPath || siblingPath->find('\0') == std::string::npos) &&
      index.hasPlainPages(indexRef)) {
    pass.sourced.clear();
    for (size_t i = 0; i < pass.kept.count(); ++i) {
      const SKDocumentID id = pass.kept.ids()[i];
      pass.sourced.push_back({id, static_cast<double>(pass.kept.scores()[i])});
      pass.origins.push_back({pass.index, id});
    }
    ZEBResult::appendResultsWithSource(
        std::make_shared<const KeywordHits>(indexRef, std::move(siblingPath),
                                            std::move(*pass.bookID), index.indexID()),
        pass.sourced, ZEBHelpArticleResult, pass.results);
    return;
  }
  const std::optional<std::string> parentPath = folderOf(siblingPath);
  pass.isPlain = false;
  const std::vector<SKDocumentRef> documents =
      SKIndexCopyDocumentRefsForDocumentIDs(indexRef, pass.kept.ids());
  for (size_t i = 0; i < documents.size(); ++i) {
    if (!documents[i]) {
      continue;
    }
    const PageLocation location = locationOfPage(*documents[i], pass.book, parentPath);
    if (!pass.ignoredURLs.empty() && location.url &&
        _arrayOfURLsContainsURL(pass.ignoredURLs, *location.url)) {
      continue;
    }
    if (auto result =
            resultForPage(index, indexRef, *documents[i], location, pass.kept.scores()[i])) {
      pass.results.push_back(std::move(result));
    }
  }
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

std::optional<std::string> ZEBHelpindexSearchController::_siblingPath(
    const ZEBHelpindexIndex& index, const std::shared_ptr<ZEBHelpBook>& book) {
  if (!index.loadedFromGeneratedCache()) {
    return index.path();
  }
  return book ? book->accessPagePath() : std::nullopt;
}

std::optional<std::string> ZEBHelpindexSearchController::_parentPath(
    const ZEBHelpindexIndex& index, const std::shared_ptr<ZEBHelpBook>& book) {
  return folderOf(_siblingPath(index, book));
}
