// Index bytes from anywhere: opened, searched and read to the end. What is found must be within
// the index, once each, with scores that are numbers.
#include <cmath>
#include <cstddef>
#include <cstdint>
#include <cstdlib>
#include <string_view>
#include <vector>

#include "SearchKit/IndexReader.h"
#include "SearchKit/SearchKit.h"
#include "platform/Value.h"

namespace {

void require(bool condition) {
  if (!condition) {
    std::abort();
  }
}

constexpr std::string_view queries[] = {
    "print* queue* ", "\"the queue\" -printer", "*e* | a*", "the",           "p* +q* !x",
    "\"t* q*\"",      "w* wo* p* a*",           "ma* +w*",  "\"many many\"",
};

void search(const SKIndexRef& index, std::string_view query, SKSearchOptions options) {
  const uint32_t documentCount = searchkit::indexDocumentCount(*index);
  std::vector<bool> seen(documentCount);
  const SKSearchRef run = SKSearchCreate(index, query, options);
  for (bool mayHaveMore = true; mayHaveMore;) {
    SKDocumentID ids[16];
    float scores[16];
    size_t count = 0;
    mayHaveMore = SKSearchFindMatches(*run, 16, ids, scores, 1.0, &count);
    for (size_t i = 0; i < count; ++i) {
      require(ids[i] < documentCount && !seen[ids[i]]);
      seen[ids[i]] = true;
      require(std::isfinite(scores[i]) && scores[i] > 0);
    }
    for (const SKDocumentRef& document :
         SKIndexCopyDocumentRefsForDocumentIDs(index, std::span(ids, count))) {
      if (document != nullptr) {
        SKDocumentGetName(*document);
        SKIndexCopyDocumentProperties(index, *document);
      }
    }
  }
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
  const SKIndexRef index =
      SKIndexOpenWithData(platform::Data::adopt(std::vector<uint8_t>(data, data + size)));
  if (index == nullptr) {
    return 0;
  }
  for (const std::string_view query : queries) {
    search(index, query, kSKSearchOptionDefault);
    search(index, query, kSKSearchOptionSpaceMeansOR);
  }
  size_t terms = 0;
  for (searchkit::TermIterator iterator(*index); iterator.next(); ++terms) {
    if (terms < 64) {
      searchkit::indexDocumentsWithTerm(*index, iterator.term());
    }
  }
  require(terms <= static_cast<size_t>(SKIndexGetMaximumTermID(index)));
  searchkit::indexSummary(*index);
  searchkit::indexDocumentPaths(*index);
  return 0;
}
