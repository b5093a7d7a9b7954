// Merged lists of short prefixes: searches find the same with and without them, score by score.
#include <gtest/gtest.h>

#include <cmath>
#include <cstring>
#include <random>
#include <string>
#include <vector>

#include "SearchKit/IndexCheck.h"
#include "SearchKit/IndexFormat.h"
#include "SearchKit/IndexReader.h"
#include "SearchKit/SearchKit.h"
#include "tests/SearchKit/Indexes.h"

namespace searchkit {
namespace {

using testing::page;
using testing::scores;

std::vector<Document> manyPages(uint32_t seed) {
  static const char* const beginnings[] = {"a", "ab", "abc", "abcd", "é", "ö", "東", "z", "q"};
  std::mt19937 random(seed);
  std::vector<Document> pages;
  for (int i = 0; i < 120; ++i) {
    std::string text;
    for (int word = 0; word < 40; ++word) {
      text += beginnings[random() % std::size(beginnings)];
      for (auto length = random() % 4; length > 0; --length) {
        text += static_cast<char>('a' + random() % 5);
      }
      text += ' ';
    }
    Document document = page("/" + std::to_string(i), text);
    document.title = text.substr(0, text.find(' '));
    pages.push_back(std::move(document));
  }
  return pages;
}

std::vector<uint8_t> bytesOf(const platform::Data& data) {
  return {data.span().begin(), data.span().end()};
}

// Where the entry of the merged lists is in the section table; 0 when there is none.
size_t mergedEntry(const std::vector<uint8_t>& bytes) {
  const auto count = format::load<uint32_t>(bytes.data() + format::sectionCountAt);
  for (uint32_t i = 0; i < count; ++i) {
    const size_t at = format::headerLength + i * format::sectionEntryLength;
    if (format::load<uint32_t>(bytes.data() + at) ==
        static_cast<uint32_t>(format::Section::mergedLists)) {
      return at;
    }
  }
  return 0;
}

std::vector<uint8_t> withoutMergedLists(std::vector<uint8_t> bytes) {
  format::store(bytes.data() + mergedEntry(bytes), uint32_t{4711});
  return bytes;
}

std::string randomQuery(std::mt19937& random) {
  std::string query;
  for (auto words = random() % 3 + 1; words > 0; --words) {
    static const char* const beginnings[] = {"a",  "ab", "abc", "abcd", "abcda", "e",  "é",
                                             "oa", "ob", "東",  "z",    "za",    "zab"};
    static const char* const signs[] = {"", "", "", "+", "-", "| "};
    query += signs[random() % std::size(signs)];
    query += beginnings[random() % std::size(beginnings)];
    query += random() % 4 == 0 ? " " : "* ";
  }
  return query;
}

TEST(MergedLists, makeNoDifferenceToHitsAndScores) {
  for (uint32_t seed = 1; seed <= 8; ++seed) {
    const platform::Data data = testing::indexData(manyPages(seed));
    ASSERT_NE(mergedEntry(bytesOf(data)), 0U);
    const SKIndexRef with = SKIndexOpenWithData(data);
    const SKIndexRef without =
        SKIndexOpenWithData(platform::Data::adopt(withoutMergedLists(bytesOf(data))));
    ASSERT_NE(without, nullptr);
    std::mt19937 random(seed);
    for (int i = 0; i < 400; ++i) {
      const std::string query = randomQuery(random);
      for (const SKSearchOptions options : {kSKSearchOptionDefault, kSKSearchOptionSpaceMeansOR}) {
        const auto found = scores(with, query, options);
        const auto expected = scores(without, query, options);
        ASSERT_EQ(found.size(), expected.size()) << query;
        for (const auto& [id, score] : expected) {
          // Words are taken in the order of their postings' lengths, which differ: sums may differ
          // in their last place.
          ASSERT_NEAR(found.at(id), score, 1e-6 * score) << query;
        }
      }
    }
  }
}

TEST(MergedLists, giveTheVeryScoreOfASinglePrefix) {
  const platform::Data data = testing::indexData(manyPages(42));
  const SKIndexRef with = SKIndexOpenWithData(data);
  const SKIndexRef without =
      SKIndexOpenWithData(platform::Data::adopt(withoutMergedLists(bytesOf(data))));
  for (const char* query : {"a*", "ab*", "abc*", "abcd*", "e*", "o*", "z*", "q*", "東*"}) {
    EXPECT_FALSE(scores(with, query).empty()) << query;
    EXPECT_EQ(scores(with, query), scores(without, query)) << query;
  }
}

TEST(MergedLists, areNotInSmallIndexes) {
  const platform::Data data =
      testing::indexData({page("/a", "print prints printer printing"), page("/b", "print")});
  EXPECT_EQ(mergedEntry(bytesOf(data)), 0U);
}

TEST(MergedLists, areNamedAmongTheSections) {
  const SKIndexRef index = SKIndexOpenWithData(testing::indexData(manyPages(1)));
  bool isThere = false;
  for (const SectionInfo& section : indexSummary(*index).sections) {
    isThere = isThere || (section.id == 9 && section.name == "merged lists" && section.isIntact);
  }
  EXPECT_TRUE(isThere);
}

TEST(MergedLists, areComparedWithTheirTermsByTheCheck) {
  const std::vector<uint8_t> bytes = bytesOf(testing::indexData(manyPages(1)));
  const auto problems = [](const std::vector<uint8_t>& some) {
    return indexProblems(*SKIndexOpenWithData(platform::Data::adopt(some)));
  };
  EXPECT_TRUE(problems(bytes).empty());
  const auto offset =
      format::load<uint64_t>(bytes.data() + mergedEntry(bytes) + format::sectionOffsetAt);
  const auto length =
      format::load<uint64_t>(bytes.data() + mergedEntry(bytes) + format::sectionLengthAt);
  const auto count = format::load<uint32_t>(bytes.data() + offset);
  std::vector<uint8_t> changed = bytes;
  // The last posting of the last list.
  changed[offset + length - 1] ^= 1;
  const std::string wrong =
      "merged list " + std::to_string(count) + ": it is not that of its terms";
  EXPECT_EQ(problems(changed).back(), wrong);
}

void searchAll(const std::vector<uint8_t>& bytes) {
  const SKIndexRef index = SKIndexOpenWithData(platform::Data::adopt(bytes));
  if (index == nullptr) {
    return;
  }
  for (const char* query : {"a*", "ab*", "abc* z*", "a* b*", "e* | o*", "+a* q*"}) {
    for (const auto& [id, score] : scores(index, query)) {
      ASSERT_LT(id, indexDocumentCount(*index));
      ASSERT_TRUE(std::isfinite(score) && score > 0);
    }
  }
}

TEST(MergedLists, doNoHarmWithAnyByteChanged) {
  const std::vector<uint8_t> bytes = bytesOf(testing::indexData(manyPages(3)));
  const size_t entry = mergedEntry(bytes);
  const auto offset = format::load<uint64_t>(bytes.data() + entry + format::sectionOffsetAt);
  const auto length = format::load<uint64_t>(bytes.data() + entry + format::sectionLengthAt);
  for (size_t at = 0; at < length; ++at) {
    static constexpr uint8_t changes[] = {0x01, 0x80, 0xFF};
    std::vector<uint8_t> changed = bytes;
    changed[offset + at] ^= changes[at % std::size(changes)];
    searchAll(changed);
  }
}

TEST(MergedLists, areLeftAsideWhereTheirTablesDoNotFit) {
  const std::vector<uint8_t> bytes = bytesOf(testing::indexData(manyPages(3)));
  const size_t entry = mergedEntry(bytes);
  const auto offset = format::load<uint64_t>(bytes.data() + entry + format::sectionOffsetAt);
  const auto expected = scores(SKIndexOpenWithData(platform::Data::adopt(bytes)), "ab*");
  for (const uint32_t count : {uint32_t{0}, uint32_t{1000000}, UINT32_MAX}) {
    std::vector<uint8_t> changed = bytes;
    format::store(changed.data() + offset, count);
    EXPECT_EQ(scores(SKIndexOpenWithData(platform::Data::adopt(changed)), "ab*"), expected);
  }
  for (const uint64_t length : {uint64_t{0}, uint64_t{3}, uint64_t{8}, uint64_t{20}}) {
    std::vector<uint8_t> cut = bytes;
    format::store(cut.data() + entry + format::sectionLengthAt, length);
    EXPECT_EQ(scores(SKIndexOpenWithData(platform::Data::adopt(cut)), "ab*"), expected);
  }
}

}  // namespace
}  // namespace searchkit
