#include "SearchKit/IndexReader.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <algorithm>
#include <string>
#include <vector>

#include "SearchKit/IndexFormat.h"
#include "tests/SearchKit/Indexes.h"

namespace searchkit {
namespace {

using ::testing::ElementsAre;
using ::testing::IsEmpty;
using testing::openIndex;
using testing::page;

SKIndexRef threePages() {
  Document first = page("/b.html", "applet banana");
  first.title = "First";
  Document second = page("/a.html", "banana cherry banana");
  second.abstract = "About cherries";
  second.title.reset();
  return openIndex({first, second, page("/c/d.html", "date")});
}

std::vector<std::string> allTerms(const SKIndex& index, std::string_view from = {}) {
  std::vector<std::string> terms;
  for (TermIterator iterator(index, from); iterator.next();) {
    terms.emplace_back(iterator.term());
  }
  return terms;
}

TEST(IndexReader, numbersDocumentsInTheOrderOfTheirPaths) {
  const SKIndexRef index = threePages();
  EXPECT_EQ(indexDocumentCount(*index), 3U);
  EXPECT_THAT(indexDocumentPaths(*index), ElementsAre("/a.html", "/b.html", "/c/d.html"));
  for (SKDocumentID id = 0; id < 3; ++id) {
    const auto document = indexDocument(*index, id);
    ASSERT_TRUE(document);
    EXPECT_EQ(document->id, id);
    EXPECT_EQ(indexDocumentIDForPath(*index, document->path), id);
  }
  EXPECT_FALSE(indexDocument(*index, 3));
  EXPECT_FALSE(indexDocumentIDForPath(*index, "/nowhere"));
}

TEST(IndexReader, tellsAbsentTextsFromEmptyOnes) {
  const SKIndexRef index = threePages();
  EXPECT_EQ(indexDocument(*index, 0)->title, std::nullopt);
  EXPECT_EQ(indexDocument(*index, 0)->abstract, "About cherries");
  EXPECT_EQ(indexDocument(*index, 1)->title, "First");
  EXPECT_EQ(indexDocument(*index, 1)->abstract, std::nullopt);
  EXPECT_EQ(indexDocument(*index, 2)->title, "");
}

TEST(IndexReader, findsTheDocumentsOfATerm) {
  const SKIndexRef index = threePages();
  EXPECT_THAT(indexDocumentsWithTerm(*index, "banana"), ElementsAre(0, 1));
  EXPECT_THAT(indexDocumentsWithTerm(*index, "first"), ElementsAre(1));
  EXPECT_THAT(indexDocumentsWithTerm(*index, "banan"), IsEmpty());
  EXPECT_THAT(indexDocumentsWithTerm(*index, ""), IsEmpty());
  EXPECT_THAT(indexDocumentsWithTerm(*index, "zzz"), IsEmpty());
}

TEST(IndexReader, numbersTermsFromOneInTheirOrder) {
  const SKIndexRef index = threePages();
  EXPECT_EQ(indexTermID(*index, "applet"), 1);
  EXPECT_EQ(indexTermID(*index, "first"), SKIndexGetMaximumTermID(index));
  EXPECT_FALSE(indexTermID(*index, "appl"));
}

TEST(TermIterator, walksAllTermsWithTheirNumbersAndCounts) {
  const SKIndexRef index = threePages();
  TermIterator terms(*index);
  const std::vector<std::string> expected{"applet", "banana", "cherry", "date", "first"};
  const std::vector<uint32_t> counts{1, 2, 1, 1, 1};
  for (size_t i = 0; i < expected.size(); ++i) {
    ASSERT_TRUE(terms.next());
    EXPECT_EQ(terms.term(), expected[i]);
    EXPECT_EQ(terms.termID(), static_cast<SKTermID>(i + 1));
    EXPECT_EQ(terms.documentCount(), counts[i]);
  }
  EXPECT_FALSE(terms.next());
  EXPECT_FALSE(terms.next());
}

TEST(TermIterator, startsAtTheFirstTermNotBelowTheOneGiven) {
  const SKIndexRef index = threePages();
  EXPECT_THAT(allTerms(*index, "banana"), ElementsAre("banana", "cherry", "date", "first"));
  EXPECT_THAT(allTerms(*index, "bananb"), ElementsAre("cherry", "date", "first"));
  EXPECT_THAT(allTerms(*index, "zebra"), IsEmpty());
}

// Terms that share more than a block key has, in more blocks than one.
TEST(TermIterator, findsEveryTermOfManyBlocks) {
  std::string text;
  std::vector<std::string> expected;
  for (int i = 0; i < 3000; ++i) {
    const std::string number = std::to_string(100000 + i * 7);
    expected.push_back((i % 3 == 0 ? "commonbeginning" : "w") + number);
    text += expected.back() + " ";
  }
  for (const char* word : {"a", "ab", "abc", "commonbe", "commonbeginning", "w", "wz"}) {
    expected.emplace_back(word);
    text += std::string(word) + " ";
  }
  std::sort(expected.begin(), expected.end());
  const SKIndexRef index = openIndex({page("/a", text)});
  EXPECT_EQ(allTerms(*index), expected);
  for (size_t i = 0; i < expected.size(); ++i) {
    ASSERT_EQ(indexTermID(*index, expected[i]), static_cast<SKTermID>(i + 1)) << expected[i];
    // Between this term and the next lies this one with a low byte after it.
    TermIterator after(*index, expected[i] + "\x01");
    ASSERT_EQ(after.next(), i + 1 < expected.size());
    if (i + 1 < expected.size()) {
      ASSERT_EQ(after.term(), expected[i + 1]);
    }
  }
}

TEST(IndexReader, summaryTellsWhatTheHeaderSays) {
  const SKIndexRef index = threePages();
  const IndexSummary summary = indexSummary(*index);
  EXPECT_EQ(summary.formatVersion, format::version);
  EXPECT_EQ(summary.documentCount, 3U);
  EXPECT_EQ(summary.termCount, 5U);
  EXPECT_EQ(summary.wordCount, 7U);
  EXPECT_EQ(summary.tokenizerRules, 1U);
  EXPECT_GT(summary.icuMajor, 0);
  EXPECT_EQ(summary.minimumTermLength, 1U);
  EXPECT_TRUE(summary.isIntact);
  ASSERT_EQ(summary.sections.size(), 8U);
  EXPECT_EQ(summary.sections.back().name, "positions");
  uint64_t end = 64 + 8 * 32;
  for (const SectionInfo& section : summary.sections) {
    EXPECT_TRUE(section.isIntact) << section.name;
    EXPECT_NE(section.name, "unknown");
    EXPECT_GE(section.offset, end);
    EXPECT_LT(section.offset, end + 8);
    EXPECT_EQ(section.offset % 8, 0U);
    end = section.offset + section.length;
  }
  EXPECT_EQ(summary.byteLength, end);
}

}  // namespace
}  // namespace searchkit
