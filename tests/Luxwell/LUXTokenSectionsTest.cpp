#include "host/Luxwell/LUXTokenSections.h"

#include <gtest/gtest.h>

#include <map>
#include <random>
#include <string>

#include "host/Luxwell/LUXBigrams.h"
#include "host/Luxwell/LUXNumbers.h"
#include "host/Luxwell/LUXRecords.h"
#include "host/Luxwell/LUXTextOrder.h"
#include "host/Luxwell/LUXTokenSectionWriter.h"

namespace {

struct Count {
  uint32_t title = 0;
  uint32_t body = 0;
  uint8_t before = LUXTokenCount::farDown;
};
using Counts = std::map<uint32_t, Count>;

std::string record(const Counts& counts) {
  std::string bytes;
  uint32_t next = 0;
  for (const auto& [token, count] : counts) {
    const bool isPlain = count.title == 0 && count.body == 1;
    luxnumbers::appendVarnumber(bytes, 2 * uint64_t{token - next} + (isPlain ? 0 : 1));
    if (!isPlain) {
      luxnumbers::appendVarnumber(bytes, count.title);
      luxnumbers::appendVarnumber(bytes, count.body);
    }
    next = token + 1;
  }
  return bytes;
}

std::string places(const Counts& counts, uint32_t firstWithout) {
  std::string bytes;
  for (const auto& [token, count] : counts) {
    if (token < firstWithout) {
      bytes.push_back(static_cast<char>(count.before));
    }
  }
  return bytes;
}

}  // namespace

TEST(LUXTokenSections, PagesOfAnySizeHaveTheirTokensInOrderWithSumsAndFirstPlaces) {
  std::mt19937 random(5);
  for (const uint32_t tokenCount : {3U, 2000U, 3'000'000U}) {
    const uint32_t firstWithout = tokenCount / 2;
    LUXTokenSections sections(tokenCount, firstWithout);
    std::vector<Counts> pages;
    for (const size_t length : {0U, 1U, 7U, 255U, 256U, 5000U}) {
      Counts counts;
      // In two pieces, the second of greater numbers.
      for (const bool isSecond : {false, true}) {
        for (size_t i = 0; i < length; ++i) {
          const uint32_t token =
              static_cast<uint32_t>(random() % firstWithout) + (isSecond ? firstWithout : 0);
          Count& count = counts[token];
          if (random() % 4 == 0) {
            sections.addInTitle(token);
            ++count.title;
            count.before = 0;
          } else {
            const auto before = static_cast<uint8_t>(random());
            sections.addInBody(token, before);
            ++count.body;
            count.before = std::min(count.before, before);
          }
        }
        if (!isSecond) {
          sections.endKind();
        }
      }
      sections.endPage();
      pages.push_back(std::move(counts));
    }
    const LUXRecords records(sections.countBytes());
    const LUXRecords placeRecords(sections.placeBytes());
    ASSERT_EQ(records.count(), pages.size());
    ASSERT_EQ(placeRecords.count(), pages.size());
    for (size_t page = 0; page < pages.size(); ++page) {
      EXPECT_EQ(records[page], record(pages[page])) << tokenCount << ", page " << page;
      EXPECT_EQ(placeRecords[page], places(pages[page], firstWithout)) << tokenCount;
    }
  }
}

TEST(LUXTokenSections, PagesOfOtherPartsFollowInTheirOrder) {
  LUXTokenSections one(10, 10);
  one.addInBody(1, 0);
  one.endPage();
  std::vector<std::unique_ptr<LUXTokenSections>> parts;
  for (const uint32_t token : {2U, 3U}) {
    parts.push_back(std::make_unique<LUXTokenSections>(10, 10));
    parts.back()->addInBody(token, static_cast<uint8_t>(token));
    parts.back()->endPage();
  }
  one.append(std::move(parts));
  const LUXRecords records(one.countBytes());
  const LUXRecords placeRecords(one.placeBytes());
  ASSERT_EQ(records.count(), 3U);
  EXPECT_EQ(records[1], record({{2, {0, 1, 2}}}));
  EXPECT_EQ(records[2], record({{3, {0, 1, 3}}}));
  ASSERT_EQ(placeRecords.count(), 3U);
  EXPECT_EQ(placeRecords[2], "\3");
}

TEST(LUXTokenSectionWriter, ReaderFindsTheTokensOfEachKind) {
  LUXTokenSectionWriter writer;
  writer.add(LUXTokenKind::stem, "page");
  writer.add(LUXTokenKind::stem, "print");
  writer.add(LUXTokenKind::form, "print");
  writer.add(LUXTokenKind::form, "printing");
  const auto table = LUXTokenTable::withSectionBytes(writer.finish());
  ASSERT_NE(table, nullptr);
  ASSERT_EQ(table->size(), 4U);
  EXPECT_EQ(table->tokenAt(1).token, "print");
  EXPECT_EQ(table->tokenAt(2).kind, LUXTokenKind::form);
  EXPECT_EQ(table->tokenAt(3).token, "printing");
}

TEST(LUXTextOrder, IsThatOfTheBytes) {
  using namespace std::string_view_literals;
  const std::vector<std::string_view> texts = {
      "b"sv,         "a\0"sv,        "a"sv, "beginning with the same"sv, "\xC3\xA9t\xC3\xA9"sv,
      "beginning"sv, "beginning!"sv, ""sv,  "beginning with the"sv,      "a"sv};
  const std::vector<uint32_t> order =
      LUXOrderOfTexts(texts.size(), [&](uint32_t number) { return texts[number]; });
  EXPECT_EQ(order, (std::vector<uint32_t>{7, 2, 9, 1, 0, 5, 8, 3, 6, 4}));
}

TEST(LUXBigrams, AreThePairsOfNeighboursWhateverTheNumberOfThreads) {
  std::mt19937 random(3);
  for (int round = 0; round < 20; ++round) {
    const auto stemCount = static_cast<uint32_t>(1 + random() % 9);
    std::vector<uint32_t> stemOfNumber;
    for (uint32_t number = 0; number < stemCount * 2; ++number) {
      stemOfNumber.push_back(random() % 4 == 0 ? LUXBigrams::none : number % stemCount);
    }
    std::vector<LUXWordSequence> pages(random() % 5);
    std::map<std::pair<uint32_t, uint32_t>, uint32_t> expected;
    std::vector<std::vector<std::pair<uint32_t, uint32_t>>> ofPages;
    LUXBigrams::Pages sequences;
    for (LUXWordSequence& page : pages) {
      ofPages.emplace_back();
      for (size_t length = random() % 40; length > 0; --length) {
        page.words.emplace_back(static_cast<uint32_t>(random() % stemOfNumber.size()),
                                page.words.empty() || random() % 5 == 0);
        const size_t last = page.words.size() - 1;
        if (last > 0 && !page.words[last].breaksChain()) {
          const uint32_t first = stemOfNumber[page.words[last - 1].number()];
          const uint32_t second = stemOfNumber[page.words[last].number()];
          if (first != LUXBigrams::none && second != LUXBigrams::none) {
            expected[{first, second}] = 0;
            ofPages.back().emplace_back(first, second);
          }
        }
      }
      sequences.push_back(&page);
    }
    uint32_t number = 0;
    for (auto& [pair, itsNumber] : expected) {
      itsNumber = number++;
    }
    LUXBigrams bigrams;
    bigrams.find(sequences, stemOfNumber, stemCount, 1 + random() % 4);
    ASSERT_EQ(bigrams.size(), expected.size());
    auto next = expected.begin();
    bigrams.forEach([&](uint32_t first, uint32_t second) {
      EXPECT_EQ((std::pair{first, second}), (next++)->first);
    });
    for (size_t page = 0; page < pages.size(); ++page) {
      size_t at = 0;
      bigrams.forEachOfPage(page, pages[page], stemOfNumber, [&](uint32_t bigram, size_t) {
        EXPECT_EQ(bigram, expected.at(ofPages[page][at++]));
      });
      EXPECT_EQ(at, ofPages[page].size());
    }
  }
}
