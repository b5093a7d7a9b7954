#include "host/Luxwell/LUXTokenCounts.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "platform/Exception.h"

using platform::Data;
using testing::ElementsAre;

namespace {

std::shared_ptr<const LUXTokenTable> example() {
  return LUXTokenTable::withTokens({std::vector<std::string>{"page", "print", "printer"},
                                    {"print page"},
                                    {"pages", "print", "\u00E9t\u00E9"},
                                    {},
                                    {"print page"}});
}

std::vector<std::pair<int, std::string>> all(const LUXTokenTable& table) {
  std::vector<std::pair<int, std::string>> result;
  for (size_t i = 0; i < table.size(); ++i) {
    const LUXTokenTable::Token token = table.tokenAt(i);
    result.emplace_back(static_cast<int>(token.kind), token.token);
  }
  return result;
}

std::shared_ptr<const LUXTokenTable> read(std::string_view bytes) {
  return LUXTokenTable::withSectionBytes(Data::copy(bytes));
}

// Five counts and whatever follows them.
std::string section(std::initializer_list<uint32_t> counts, std::string_view rest) {
  std::string bytes;
  for (const uint32_t count : counts) {
    for (int shift = 0; shift < 32; shift += 8) {
      bytes.push_back(static_cast<char>((count >> shift) & 0xFFU));
    }
  }
  return bytes + std::string(rest);
}

}  // namespace

TEST(LUXTokenTable, GivesTokensByNumber) {
  EXPECT_THAT(all(*example()),
              ElementsAre(std::pair(0, "page"), std::pair(0, "print"), std::pair(0, "printer"),
                          std::pair(1, "print page"), std::pair(2, "pages"), std::pair(2, "print"),
                          std::pair(2, "\u00E9t\u00E9"), std::pair(4, "print page")));
  EXPECT_EQ(example()->startOfKind(LUXTokenKind::form), 4U);
  EXPECT_EQ(example()->startOfKind(LUXTokenKind::title), 7U);
}

TEST(LUXTokenTable, ReadsWhatItWrote) {
  const Data bytes = example()->sectionBytes();
  const auto table = LUXTokenTable::withSectionBytes(bytes);
  ASSERT_NE(table, nullptr);
  EXPECT_EQ(all(*table), all(*example()));
  EXPECT_EQ(table->sectionBytes(), bytes);
  EXPECT_EQ(LUXTokenTable::withSectionBytes(LUXTokenTable::withTokens({})->sectionBytes())->size(),
            0U);
}

TEST(LUXTokenTable, HasTheDocumentedBytes) {
  const auto table = LUXTokenTable::withTokens(
      {std::vector<std::string>{"print", "printer"}, {"a b"}, {}, {}, {}});
  EXPECT_EQ(table->sectionBytes().view(),
            section({2, 1, 0, 0, 0}, std::string("\0\5print\5\2er\0\3a b", 16)));
}

TEST(LUXTokenTable, RefusesTruncationAndTrailingBytes) {
  const std::string bytes(example()->sectionBytes().view());
  for (size_t length = 0; length < bytes.size(); ++length) {
    EXPECT_EQ(read(bytes.substr(0, length)), nullptr) << length;
  }
  EXPECT_EQ(read(bytes + '\0'), nullptr);
}

TEST(LUXTokenTable, RefusesWhatNoWriterWrites) {
  EXPECT_NE(read(section({1, 0, 0, 0, 0}, std::string("\0\1a", 3))), nullptr);
  EXPECT_EQ(read(section({1, 0, 0, 0, 0}, std::string("\1\1a", 3))), nullptr)
      << "a beginning shared with nothing";
  EXPECT_EQ(read(section({1, 0, 0, 0, 0}, std::string("\0\0", 2))), nullptr) << "an empty token";
  EXPECT_EQ(read(section({2, 0, 0, 0, 0}, std::string("\0\1b\0\1a", 6))), nullptr)
      << "out of order";
  EXPECT_EQ(read(section({2, 0, 0, 0, 0}, std::string("\0\1a\0\1a", 6))), nullptr) << "twice";
  EXPECT_NE(read(section({1, 1, 0, 0, 0}, std::string("\0\1b\0\1a", 6))), nullptr)
      << "each kind begins anew";
  EXPECT_EQ(read(section({1, 0, 0, 0, 0}, std::string("\0\1\xFF", 3))), nullptr) << "no UTF-8";
  EXPECT_EQ(read(section({0xFFFFFFFF, 0xFFFFFFFF, 0, 0, 0}, "")), nullptr) << "too many";
  EXPECT_EQ(read(section({1, 0, 0, 0, 0}, std::string("\0\xFF\xFF\xFF\xFF\xFF\xFF", 7))), nullptr)
      << "a number without end";
}

TEST(LUXTokenTable, RefusesSharedBeginningsThatWouldMultiplyTheText) {
  // Each token is the one before it and one more byte.
  std::string rest("\0\1a", 3);
  uint32_t count = 1;
  for (; count < LUXTokenTable::maximumTokenLength + 10; ++count) {
    uint32_t shared = count;
    while (shared >= 0x80) {
      rest.push_back(static_cast<char>((shared & 0x7FU) | 0x80U));
      shared >>= 7U;
    }
    rest.push_back(static_cast<char>(shared));
    rest += "\1a";
  }
  EXPECT_EQ(read(section({count, 0, 0, 0, 0}, rest)), nullptr);
}

TEST(LUXTokenTable, SurvivesEveryFlippedBit) {
  const std::string bytes(example()->sectionBytes().view());
  for (size_t offset = 0; offset < bytes.size(); ++offset) {
    for (int bit = 0; bit < 8; ++bit) {
      std::string damaged = bytes;
      damaged[offset] = static_cast<char>(damaged[offset] ^ (1 << bit));
      if (const auto table = read(damaged)) {
        EXPECT_EQ(table->sectionBytes().length(), bytes.size());
        EXPECT_LE(all(*table).size(), bytes.size());
      }
    }
  }
}

TEST(LUXTokenCounts, NoneHasNoKeys) {
  const LUXTokenCounts counts;
  EXPECT_TRUE(counts.empty());
  EXPECT_EQ(counts.size(), 0U);
  ASSERT_NE(counts.table(), nullptr);
  EXPECT_EQ(counts.table()->size(), 0U);
}

TEST(LUXTokenCounts, WithCountsSortsAndAdds) {
  const LUXTokenCounts counts = LUXTokenCounts::withCounts({{"queue", LUXTokenKind::form, 0, 1},
                                                            {"print", LUXTokenKind::stem, 1, 2},
                                                            {"page", LUXTokenKind::stem, 0, 5},
                                                            {"print", LUXTokenKind::stem, 1, 1}});
  ASSERT_EQ(counts.size(), 3U);
  EXPECT_EQ(counts[0], (LUXTokenCount{"page", LUXTokenKind::stem, 0, 5}));
  EXPECT_EQ(counts[1], (LUXTokenCount{"print", LUXTokenKind::stem, 2, 3}));
  EXPECT_EQ(counts[2], (LUXTokenCount{"queue", LUXTokenKind::form, 0, 1}));
  EXPECT_EQ(counts.tokenNumber(2), 2U);
}

TEST(LUXTokenCounts, ATokenThatOccursTwiceBeginsWhereTheEarlierOneDoes) {
  const LUXTokenCounts counts = LUXTokenCounts::withCounts({{"print", LUXTokenKind::stem, 0, 1, 9},
                                                            {"print", LUXTokenKind::stem, 0, 1, 4},
                                                            {"queue", LUXTokenKind::stem, 0, 1}});
  EXPECT_EQ(counts[0].wordsBefore, 4);
  EXPECT_EQ(counts[1].wordsBefore, LUXTokenCount::farDown);
}

TEST(LUXTokenCounts, CopiesShareAndKeepTheTable) {
  LUXTokenCounts copy;
  {
    const LUXTokenCounts counts = LUXTokenCounts::withCounts({{"queue", LUXTokenKind::form, 0, 1}});
    copy = counts;
    EXPECT_EQ(copy.table(), counts.table());
  }
  EXPECT_EQ(copy[0].token, "queue");
}
