#include "zeb/HelpSearch.h"

#include <algorithm>
#include <map>
#include <tuple>
#include <utility>

#include "SearchKit/SearchKit.h"
#include "host/Zebrine/ZEBConstants.h"
#include "host/Zebrine/ZEBResult.h"
#include "platform/URL.h"
#include "plugin/keyword/ZEBHelpindexSearchController.h"
#include "plugin/records/ZEBHelpindexIndex.h"
#include "zeb/BookOwner.h"
#include "zeb/Ranking.h"

namespace zeb {

struct HelpSearch::Implementation {
  explicit Implementation(const std::vector<CatalogueEntry>& entries);

  FoundPage pageOfResult(const ZEBResult& result) const;
  uint64_t pageCountOfBook(const std::string& bookID) const;
  std::vector<double> relevances(std::string_view words, const std::vector<FoundPage>& pages) const;

  std::map<std::string, CatalogueEntry> books;
  std::vector<CatalogueEntry> unreadableBooks;
  std::shared_ptr<ZEBHelpindexSearchController> controller;
  std::vector<std::shared_ptr<ZEBHelpindexIndex>> records;
  ZEBHelpindexSearchController::Indices indices;
};

namespace {

std::shared_ptr<ZEBHelpindexIndex> recordOfEntry(const CatalogueEntry& entry) {
  auto record = ZEBHelpindexIndex::initWithPath(entry.indexPath);
  if (record == nullptr) {
    return nullptr;
  }
  SKIndexRef index = record->copyIndexRef();
  if (index == nullptr) {
    return nullptr;
  }
  record->disposeIndexRef(index);
  record->setBookID(entry.bookID);
  record->setLoadedFromGeneratedCache(!entry.indexIsShipped);
  return record;
}

std::string nameOfPage(const std::string& url) {
  const std::optional<platform::URL> parsed = platform::URL::URLWithString(url);
  const std::string name = parsed ? parsed->lastPathComponent() : std::string();
  return name.empty() ? url : name;
}

Answer cutToLimit(std::vector<FoundPage> pages, size_t limit) {
  Answer answer;
  answer.count = pages.size();
  if (pages.size() > limit) {
    pages.resize(limit);
  }
  answer.pages = std::move(pages);
  return answer;
}

}  // namespace

HelpSearch::Implementation::Implementation(const std::vector<CatalogueEntry>& entries)
    : controller(ZEBHelpindexSearchController::init()) {
  std::vector<CatalogueEntry> readable;
  for (const CatalogueEntry& entry : entries) {
    if (std::shared_ptr<ZEBHelpindexIndex> record = recordOfEntry(entry)) {
      records.push_back(record);
      indices.push_back(std::move(record));
      readable.push_back(entry);
      books.emplace(entry.bookID, entry);
    } else {
      unreadableBooks.push_back(entry);
    }
  }
  controller->setPluginOwner(std::make_shared<BookOwner>(readable));
}

uint64_t HelpSearch::Implementation::pageCountOfBook(const std::string& bookID) const {
  const auto book = books.find(bookID);
  return book == books.end() ? 0 : book->second.pageCount;
}

std::vector<double> HelpSearch::Implementation::relevances(
    std::string_view words, const std::vector<FoundPage>& pages) const {
  // All indexes split and fold text alike, so any of them will do.
  SKIndexRef index = records.front()->copyIndexRef();
  std::vector<RankedPage> ranked;
  ranked.reserve(pages.size());
  for (const FoundPage& page : pages) {
    ranked.push_back(
        {page.relevance, pageCountOfBook(page.bookID), SKIndexCopyUniqueTerms(index, page.title)});
  }
  std::vector<double> result = zeb::relevances(ranked, SKIndexCopyUniqueTerms(index, words));
  records.front()->disposeIndexRef(index);
  return result;
}

FoundPage HelpSearch::Implementation::pageOfResult(const ZEBResult& result) const {
  FoundPage page;
  page.bookID = result.bookID().value_or("");
  const auto book = books.find(page.bookID);
  page.bookTitle = book == books.end() ? page.bookID : book->second.title;
  page.url = result.payloadValueForKey(ZEBResultURLKey).stringValue().value_or("");
  page.abstract = result.payloadValueForKey(ZEBResultAbstractKey).stringValue();
  page.title = result.title().value_or("");
  if (page.title.empty()) {
    page.title = nameOfPage(page.url);
  }
  page.relevance = result.relevance().doubleValue();
  return page;
}

HelpSearch::HelpSearch(const std::vector<CatalogueEntry>& books)
    : _implementation(std::make_unique<const Implementation>(books)) {}

HelpSearch::~HelpSearch() = default;

const std::vector<CatalogueEntry>& HelpSearch::unreadableBooks() const {
  return _implementation->unreadableBooks;
}

Answer HelpSearch::search(std::string_view words, size_t limit) const {
  std::vector<FoundPage> pages;
  for (const auto& result :
       _implementation->controller->doSearchForString(words, _implementation->indices, {})) {
    pages.push_back(_implementation->pageOfResult(*result));
  }
  if (!pages.empty()) {
    const std::vector<double> relevances = _implementation->relevances(words, pages);
    for (size_t i = 0; i < pages.size(); ++i) {
      pages[i].relevance = relevances[i];
    }
  }
  std::sort(pages.begin(), pages.end(), [](const FoundPage& a, const FoundPage& b) {
    return std::tie(b.relevance, a.bookID, a.url) < std::tie(a.relevance, b.bookID, b.url);
  });
  return cutToLimit(std::move(pages), limit);
}

Answer HelpSearch::lookUpAnchor(std::string_view name, size_t limit) const {
  std::vector<FoundPage> pages;
  for (const auto& result :
       _implementation->controller->doLookupOfAnchor(name, _implementation->indices)) {
    pages.push_back(_implementation->pageOfResult(*result));
  }
  return cutToLimit(std::move(pages), limit);
}

}  // namespace zeb
