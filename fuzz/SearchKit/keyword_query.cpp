// Queries of any text over a small index. Every query has an answer; a blank as OR never finds
// less than one as AND where there are no operators; terms come back as themselves.
#include <cmath>
#include <cstddef>
#include <cstdint>
#include <cstdlib>
#include <string>
#include <string_view>
#include <vector>

#include "SearchKit/IndexWriter.h"
#include "SearchKit/SearchKit.h"

namespace {

void require(bool condition) {
  if (!condition) {
    std::abort();
  }
}

SKIndexRef makeIndex(size_t minimumTermLength) {
  searchkit::IndexWriter writer({minimumTermLength});
  const char* const texts[] = {"print the queue", "a b c a b", "Größe und Café wi-fi",
                               "東京都の印刷 ภาษาไทย", "printer printing prints queues"};
  for (const char* text : texts) {
    searchkit::Document document;
    document.path = "/" + std::to_string(writer.documentCount());
    document.title = text;
    document.body = {text, "the end of the page"};
    writer.add(std::move(document));
  }
  return SKIndexOpenWithData(writer.finish());
}

size_t countHits(const SKIndexRef& index, std::string_view query, SKSearchOptions options) {
  const SKSearchRef search = SKSearchCreate(index, query, options);
  size_t total = 0;
  for (bool mayHaveMore = true; mayHaveMore;) {
    SKDocumentID ids[3];
    float scores[3];
    size_t count = 0;
    mayHaveMore = SKSearchFindMatches(*search, 3, ids, scores, 1.0, &count);
    for (size_t i = 0; i < count; ++i) {
      require(ids[i] < 5 && std::isfinite(scores[i]) && scores[i] > 0);
    }
    total += count;
  }
  require(total <= 5);
  return total;
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
  static const SKIndexRef all = makeIndex(1);
  static const SKIndexRef longTerms = makeIndex(3);
  const std::string_view query(reinterpret_cast<const char*>(data), size);
  for (const SKIndexRef& index : {all, longTerms}) {
    countHits(index, query, kSKSearchOptionDefault);
    countHits(index, query, kSKSearchOptionSpaceMeansOR);
    std::string composed;
    for (const std::string& term : SKIndexCopyUniqueTerms(index, query)) {
      require(!term.empty());
      composed += term + "* ";
    }
    require(countHits(index, composed, kSKSearchOptionDefault) <=
            countHits(index, composed, kSKSearchOptionSpaceMeansOR));
  }
  return 0;
}
