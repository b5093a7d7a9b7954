// Bytes that are no longer what was written: fewer or other hits, but nothing read or written where
// it should not be, no number that is none, and an end to everything. Means most under sanitizers.
#include <gtest/gtest.h>

#include <cmath>
#include <random>
#include <string>
#include <vector>

#include "SearchKit/IndexFormat.h"
#include "SearchKit/SearchKit.h"
#include "tests/SearchKit/Indexes.h"

namespace searchkit {
namespace {

using testing::indexData;
using testing::page;

std::vector<uint8_t> sampleBytes() {
  std::vector<Document> pages;
  for (int i = 0; i < 9; ++i) {
    Document document = page("/p" + std::to_string(i), "print the queue of printers number" +
                                                           std::to_string(i * 77) + " print again");
    document.title = "Print queue " + std::to_string(i);
    document.abstract = "About it";
    document.headings = {"The queue"};
    pages.push_back(document);
  }
  const platform::Data data = indexData(pages);
  return {data.span().begin(), data.span().end()};
}

constexpr const char* queries[] = {"print* queue* ", "\"the queue\" print -number77", "*um* | p*t",
                                   "number", "zzz* again"};

// Everything that can be asked of an index. In exactly sized memory, so that a read past its end is
// seen.
void useIndex(const std::vector<uint8_t>& bytes) {
  const SKIndexRef index = SKIndexOpenWithData(platform::Data::adopt(bytes));
  if (index == nullptr) {
    return;
  }
  const uint32_t documentCount = indexDocumentCount(*index);
  for (const char* query : queries) {
    for (const SKSearchOptions options : {0U, 4U}) {
      const SKSearchRef search = SKSearchCreate(index, query, options);
      bool mayHaveMore = true;
      std::vector<bool> seen(documentCount, false);
      while (mayHaveMore) {
        SKDocumentID ids[4];
        float scores[4];
        size_t count = 0;
        mayHaveMore = SKSearchFindMatches(*search, 4, ids, scores, 10.0, &count);
        for (size_t i = 0; i < count; ++i) {
          ASSERT_LT(ids[i], documentCount);
          ASSERT_FALSE(seen[ids[i]]);
          seen[ids[i]] = true;
          ASSERT_TRUE(std::isfinite(scores[i]));
          ASSERT_GT(scores[i], 0);
        }
        for (const auto& document :
             SKIndexCopyDocumentRefsForDocumentIDs(index, std::span(ids, count))) {
          if (document != nullptr) {
            SKDocumentGetName(*document);
            SKIndexCopyDocumentProperties(index, *document);
          }
        }
      }
    }
  }
  size_t terms = 0;
  for (TermIterator iterator(*index); iterator.next(); ++terms) {
    iterator.documentCount();
    indexDocumentsWithTerm(*index, iterator.term());
  }
  ASSERT_LE(terms, static_cast<size_t>(SKIndexGetMaximumTermID(index)));
  indexSummary(*index);
  indexDocumentPaths(*index);
  indexDocumentIDForPath(*index, "/p5");
}

TEST(HostileIndex, everyBitFlipped) {
  const std::vector<uint8_t> bytes = sampleBytes();
  for (size_t at = 0; at < bytes.size(); ++at) {
    for (int bit = 0; bit < 8; ++bit) {
      std::vector<uint8_t> changed = bytes;
      changed[at] ^= static_cast<uint8_t>(1U << bit);
      useIndex(changed);
    }
  }
}

TEST(HostileIndex, everyByteReplacedByExtremes) {
  const std::vector<uint8_t> bytes = sampleBytes();
  for (size_t at = 0; at < bytes.size(); ++at) {
    for (const uint8_t value : std::initializer_list<uint8_t>{0x00, 0x7F, 0x80, 0xFF}) {
      std::vector<uint8_t> changed = bytes;
      changed[at] = value;
      useIndex(changed);
    }
  }
}

// A truncated index is refused as such; this one says that it ends where it was cut.
TEST(HostileIndex, cutAtEveryByteWithSectionsMadeToFit) {
  const std::vector<uint8_t> bytes = sampleBytes();
  for (size_t length = 0; length < bytes.size(); ++length) {
    std::vector<uint8_t> cut(bytes.begin(), bytes.begin() + static_cast<ptrdiff_t>(length));
    useIndex(cut);
    if (length < 64 + 8 * 32) {
      continue;
    }
    format::store(cut.data() + format::totalLengthAt, uint64_t{length});
    for (size_t entry = 64; entry < 64 + 8 * 32; entry += 32) {
      const auto offset = format::load<uint64_t>(cut.data() + entry + format::sectionOffsetAt);
      const auto size = format::load<uint64_t>(cut.data() + entry + format::sectionLengthAt);
      const uint64_t newOffset = std::min<uint64_t>(offset, length);
      format::store(cut.data() + entry + format::sectionOffsetAt, newOffset);
      format::store(cut.data() + entry + format::sectionLengthAt,
                    std::min<uint64_t>(size, length - newOffset));
    }
    useIndex(cut);
  }
}

TEST(HostileIndex, manyBytesAtRandom) {
  const std::vector<uint8_t> bytes = sampleBytes();
  std::mt19937 random(99);
  for (int round = 0; round < 3000; ++round) {
    std::vector<uint8_t> changed = bytes;
    for (auto count = random() % 20 + 1; count > 0; --count) {
      changed[320 + random() % (changed.size() - 320)] = static_cast<uint8_t>(random());
    }
    useIndex(changed);
  }
}

}  // namespace
}  // namespace searchkit
