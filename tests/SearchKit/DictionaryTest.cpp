#include "SearchKit/Dictionary.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <map>
#include <random>
#include <set>
#include <string>
#include <vector>

#include "SearchKit/DictionaryBlock.h"
#include "SearchKit/IndexCheck.h"
#include "SearchKit/SKIndex.h"
#include "tests/SearchKit/Indexes.h"

namespace searchkit {
namespace {

using ::testing::IsEmpty;
using Pages = std::set<SKDocumentID>;

// Terms that share much and little, of one letter to more than a head has room for; some on so many
// pages, and so often, that their lengths take more than a byte.
class Dictionary : public ::testing::Test {
 protected:
  Dictionary() {
    std::mt19937 random(31);
    std::vector<Document> documents;
    for (uint32_t i = 0; i < 700; ++i) {
      std::string text;
      const auto add = [&](const std::string& term) {
        text += term + " ";
        _pages[term].insert(i);
      };
      for (int word = 0; word < 12; ++word) {
        std::string term;
        for (auto length = 1 + random() % (word % 4 == 0 ? 40 : 6); length > 0; --length) {
          term += static_cast<char>('a' + random() % 2);
        }
        add(term);
        if (word == 0) {
          add(term.substr(0, term.size() / 2 + 1) + "b");
        }
      }
      add("everywhere");
      for (int again = 0; again < static_cast<int>(i % 40); ++again) {
        add("often");
      }
      documents.push_back(testing::page("/" + std::to_string(1000 + i), text));
    }
    _index = testing::openIndex(documents);
  }

  Pages found(const std::string& query) {
    Pages pages;
    for (const auto& [page, score] : testing::scores(_index, query)) {
      pages.insert(page);
    }
    return pages;
  }

  std::map<std::string, Pages> _pages;
  SKIndexRef _index;
};

TEST_F(Dictionary, hasAllTermsInOrder) {
  EXPECT_THAT(indexProblems(*_index), IsEmpty());
  auto expected = _pages.begin();
  int64_t number = 0;
  for (TermIterator terms(*_index); terms.next(); ++expected) {
    ASSERT_NE(expected, _pages.end());
    ASSERT_EQ(terms.term(), expected->first);
    EXPECT_EQ(terms.termID(), ++number);
    EXPECT_EQ(terms.documentCount(), expected->second.size());
  }
  EXPECT_EQ(expected, _pages.end());
}

TEST_F(Dictionary, findsEveryTermAndNoOther) {
  for (const auto& [term, pages] : _pages) {
    ASSERT_EQ(found(term), pages) << term;
    for (const std::string& other : {term + "a", "a" + term, term.substr(0, term.size() - 1)}) {
      const auto there = _pages.find(other);
      ASSERT_EQ(found(other), there == _pages.end() ? Pages() : there->second) << other;
    }
  }
}

TEST_F(Dictionary, findsAllTermsThatBeginAlike) {
  for (const auto& [term, pages] : _pages) {
    for (const size_t length : {size_t{1}, term.size() / 2 + 1, term.size()}) {
      const std::string prefix = term.substr(0, length);
      Pages expected;
      for (auto at = _pages.lower_bound(prefix);
           at != _pages.end() && at->first.starts_with(prefix); ++at) {
        expected.insert(at->second.begin(), at->second.end());
      }
      ASSERT_EQ(found(prefix + "*"), expected) << prefix;
    }
  }
  EXPECT_THAT(found("c*"), IsEmpty());
  EXPECT_THAT(found("zz*"), IsEmpty());
  EXPECT_EQ(found("\"often often\"").size(), _pages["often"].size() - 18);
}

std::vector<uint8_t> block(uint8_t flags, const std::vector<uint8_t>& rest) {
  std::vector<uint8_t> bytes{flags};
  bytes.insert(bytes.end(), rest.begin(), rest.end());
  return bytes;
}

TEST(DictionaryBlock, hasItsPartsFieldByField) {
  // Two terms, "ab" and "abc", with lengths of two bytes and one long one of positions.
  const std::vector<uint8_t> bytes =
      block(1 | format::hasLongPositions,
            {2, 0x20, 0x12, 0x01, 0x02, 0x03, 0x00, 7, 0xFF, 0x80, 0x02, 'a', 'b', 'c'});
  DictionaryBlock fields;
  ASSERT_TRUE(fields.read(bytes, 0, 2));
  EXPECT_EQ(fields.count(), 2U);
  EXPECT_EQ(fields.postingsLength(0), 0x201U);
  EXPECT_EQ(fields.postingsLength(1), 3U);
  EXPECT_EQ(fields.postingsBefore(0), 0U);
  EXPECT_EQ(fields.postingsBefore(2), 0x204U);
  const uint8_t* extra = fields.longPositions();
  uint32_t length = 0;
  ASSERT_TRUE(fields.readPositionsLength(0, extra, length));
  EXPECT_EQ(length, 7U);
  ASSERT_TRUE(fields.readPositionsLength(1, extra, length));
  EXPECT_EQ(length, 0x100U);
  EXPECT_FALSE(fields.readPositionsLength(1, extra, length));
  const uint8_t* text = fields.texts();
  size_t shared = 1;
  size_t added = 0;
  ASSERT_TRUE(fields.readHead(0, text, shared, added));
  EXPECT_EQ(shared, 0U);
  EXPECT_EQ(added, 2U);
  EXPECT_EQ(text + 3, bytes.data() + bytes.size());
}

TEST(DictionaryBlock, sumsLengthsOfAnyWidth) {
  std::mt19937 random(6);
  for (const uint32_t count : {1U, 7U, 8U, 9U, 15U, 16U, 17U, 100U}) {
    for (const uint8_t power : {uint8_t{0}, uint8_t{1}, uint8_t{2}}) {
      std::vector<uint8_t> bytes{power};
      bytes.resize(1 + count);
      std::vector<uint64_t> sums{0};
      for (uint32_t i = 0; i < count; ++i) {
        const auto length = static_cast<uint32_t>(random() >> (power == 0   ? 24
                                                               : power == 1 ? 16
                                                                            : 0));
        sums.push_back(sums.back() + length);
        for (uint32_t byte = 0; byte < 1U << power; ++byte) {
          bytes.push_back(static_cast<uint8_t>(length >> byte * 8));
        }
      }
      bytes.resize(bytes.size() + count);
      DictionaryBlock fields;
      ASSERT_TRUE(fields.read(bytes, 0, count));
      for (uint32_t i = 0; i <= count; ++i) {
        EXPECT_EQ(fields.postingsBefore(i), sums[i]) << i << " of " << count;
      }
    }
  }
}

TEST(DictionaryBlock, isRefusedWhereItDoesNotFit) {
  const std::vector<uint8_t> bytes = block(0, {0x10, 1, 1, 'a'});
  DictionaryBlock fields;
  EXPECT_TRUE(fields.read(bytes, 0, 1));
  EXPECT_FALSE(fields.read(bytes, bytes.size(), 1));
  EXPECT_FALSE(fields.read(bytes, SIZE_MAX, 1));
  EXPECT_FALSE(fields.read(bytes, 0, 2));
  EXPECT_FALSE(fields.read(bytes, 0, 4096));
  EXPECT_FALSE(fields.read(block(3, {0x10, 1, 1, 'a'}), 0, 1));
  EXPECT_FALSE(fields.read(block(8, {0x10, 1, 1, 'a'}), 0, 1));
  EXPECT_FALSE(fields.read(block(2, {0x10, 1, 1, 'a'}), 0, 1));
  EXPECT_FALSE(fields.read(block(format::hasLongPositions, {9, 0x10, 1, 1, 'a'}), 0, 1));
  EXPECT_FALSE(fields.read(block(format::hasLongPositions, {0x80}), 0, 1));
  EXPECT_FALSE(fields.read({}, 0, 1));
}

TEST(DictionaryBlock, refusesTextsThatGoBeyondTheEnd) {
  size_t shared = 0;
  size_t added = 0;
  for (const auto& [head, text] : std::map<uint8_t, std::vector<uint8_t>>{
           {0x20, {'a'}}, {0xF0, {}}, {0xF0, {15}}, {0x0F, {1}}, {0xFF, {15, 200, 'a'}}}) {
    std::vector<uint8_t> rest{head, 1, 1};
    rest.insert(rest.end(), text.begin(), text.end());
    const std::vector<uint8_t> bytes = block(0, rest);
    DictionaryBlock fields;
    ASSERT_TRUE(fields.read(bytes, 0, 1));
    const uint8_t* at = fields.texts();
    EXPECT_FALSE(fields.readHead(0, at, shared, added)) << int{head};
  }
}

}  // namespace
}  // namespace searchkit
