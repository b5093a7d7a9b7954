#include "host/Luxwell/LUXPhraseFinder.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <algorithm>
#include <cmath>
#include <map>
#include <numeric>
#include <random>
#include <set>

namespace {

using Words = std::vector<uint32_t>;

struct Found {
  uint64_t frequency = 0;
  uint32_t pageCount = 0;
  uint32_t titleCount = 0;
  uint32_t longerCount = 0;
  uint64_t longerFrequency = 0;
  // By page, in the title and elsewhere.
  std::map<size_t, std::pair<uint32_t, uint32_t>> counts;

  friend bool operator==(const Found&, const Found&) = default;
};

using Phrases = std::map<Words, Found>;

// The slow way: every group of words of every page.
Phrases countedByForce(const std::vector<LUXWordSequence>& pages,
                       const std::vector<bool>& mayStandAtEdge) {
  Phrases all;
  for (size_t page = 0; page < pages.size(); ++page) {
    const auto& words = pages[page].words;
    for (size_t begin = 0; begin < words.size(); ++begin) {
      Words group;
      for (size_t at = begin; at < words.size() && group.size() < LUXPhraseMaximumLength; ++at) {
        if (at > begin && words[at].breaksChain()) {
          break;
        }
        group.push_back(words[at].number());
        if (mayStandAtEdge[group.front()] && mayStandAtEdge[group.back()]) {
          auto& count = all[group].counts[page];
          ++(begin < pages[page].titleLength ? count.first : count.second);
        }
      }
    }
  }
  std::erase_if(all, [](const auto& entry) {
    return entry.first.size() > 1 && entry.second.counts.size() < LUXPhraseFinder::minimumPageCount;
  });
  for (auto& [words, found] : all) {
    found.pageCount = static_cast<uint32_t>(found.counts.size());
    for (const auto& [page, count] : found.counts) {
      found.frequency += count.first + count.second;
      found.titleCount += count.first > 0 ? 1 : 0;
    }
  }
  for (const auto& [longer, found] : all) {
    for (auto& [words, inner] : all) {
      if (words.size() < longer.size() &&
          std::search(longer.begin(), longer.end(), words.begin(), words.end()) != longer.end()) {
        ++inner.longerCount;
        inner.longerFrequency += found.frequency;
      }
    }
  }
  return all;
}

Phrases found(const std::vector<LUXWordSequence>& pages, const std::vector<bool>& mayStandAtEdge,
              size_t threadCount = 1) {
  std::vector<const LUXWordSequence*> sequences;
  sequences.reserve(pages.size());
  for (const LUXWordSequence& page : pages) {
    sequences.push_back(&page);
  }
  std::vector<uint32_t> words(mayStandAtEdge.size());
  std::iota(words.begin(), words.end(), 0);
  LUXPhraseFinder finder;
  finder.find(sequences, words, mayStandAtEdge, threadCount);
  Phrases all;
  std::vector<Words> names;
  for (const LUXPhrase& phrase : finder.phrases()) {
    const LUXPhraseStatistics& statistics = phrase.statistics;
    const Words group(phrase.words.begin(), phrase.words.begin() + statistics.length);
    EXPECT_EQ(statistics.totalPageCount, pages.size());
    EXPECT_EQ(all.count(group), 0U) << "a phrase comes twice";
    all[group] = {statistics.frequency,
                  statistics.pageCount,
                  statistics.titleCount,
                  statistics.longerPhraseCount,
                  statistics.longerPhraseFrequency,
                  {}};
    names.push_back(group);
  }
  for (size_t page = 0; page < pages.size(); ++page) {
    finder.forEachPhraseOfPage(page, pages[page], words, [&](uint32_t phrase, bool inTitle) {
      auto& count = all[names[phrase]].counts[page];
      ++(inTitle ? count.first : count.second);
    });
  }
  return all;
}

LUXWordSequence sequence(std::initializer_list<uint32_t> words, size_t titleLength = 0) {
  LUXWordSequence result;
  for (const uint32_t word : words) {
    result.words.push_back({word, result.words.empty() || result.words.size() == titleLength});
  }
  result.titleLength = titleLength;
  return result;
}

LUXPhraseStatistics statistics() {
  LUXPhraseStatistics result;
  result.length = 2;
  result.frequency = 10;
  result.pageCount = 5;
  result.totalPageCount = 100;
  return result;
}

}  // namespace

TEST(LUXPhraseFinder, FindsWhatBruteForceFinds) {
  std::mt19937 random(11);
  for (int round = 0; round < 60; ++round) {
    const auto wordCount = static_cast<uint32_t>(2 + random() % 9);
    std::vector<bool> mayStandAtEdge;
    for (uint32_t word = 0; word < wordCount; ++word) {
      mayStandAtEdge.push_back(random() % 4 != 0);
    }
    std::vector<LUXWordSequence> pages(random() % 7);
    for (LUXWordSequence& page : pages) {
      const size_t length = random() % 40;
      page.titleLength = std::min<size_t>(length, random() % 4);
      for (size_t at = 0; at < length; ++at) {
        page.words.push_back({static_cast<uint32_t>(random() % wordCount),
                              at == 0 || at == page.titleLength || random() % 6 == 0});
      }
    }
    const size_t threadCount = 1 + random() % 9;
    EXPECT_EQ(found(pages, mayStandAtEdge, threadCount), countedByForce(pages, mayStandAtEdge))
        << round << ", threads: " << threadCount;
  }
}

TEST(LUXPhraseFinder, NoPagesGiveNoPhrases) {
  LUXPhraseFinder finder;
  finder.find({}, {}, {});
  EXPECT_TRUE(finder.phrases().empty());
}

TEST(LUXPhraseFinder, SeveralNumbersMayBeOneWord) {
  const LUXWordSequence page = sequence({0, 1, 2});
  const LUXWordSequence other = sequence({3, 4, 2});
  LUXPhraseFinder finder;
  finder.find({&page, &other}, {0, 1, 2, 0, 1}, {true, true, true});
  ASSERT_EQ(finder.phrases().size(), 6U);
  EXPECT_EQ(finder.phrases()[0].statistics.pageCount, 2U);
  EXPECT_EQ(finder.phrases()[5].statistics.length, 3U);
}

TEST(LUXPhraseFinder, GroupsInOnePageAreNoPhrases) {
  const Phrases all = found({sequence({0, 1, 0, 1}), sequence({2})}, {true, true, true});
  EXPECT_EQ(all.size(), 3U);
  EXPECT_EQ(all.at({0}).frequency, 2U);
}

TEST(LUXPhraseFinder, PhrasesDoNotReachFromTitleToBody) {
  const Phrases all = found({sequence({0, 1}, 1), sequence({0, 1}, 1)}, {true, true});
  EXPECT_EQ(all.count({0, 1}), 0U);
  EXPECT_EQ(all.at({0}).titleCount, 2U);
  EXPECT_EQ(all.at({1}).titleCount, 0U);
}

TEST(LUXPhraseScore, IsTheProductOfItsThreeParts) {
  LUXPhraseStatistics phrase = statistics();
  const double residual = std::log2((1 - std::exp(-.1)) / .05);
  EXPECT_NEAR(LUXPhraseScore(phrase), 10 * (1 + residual), 1e-9);
  phrase.titleCount = 3;
  EXPECT_NEAR(LUXPhraseScore(phrase), 10 * (1 + residual) * 2, 1e-9);
  phrase.longerPhraseCount = 2;
  phrase.longerPhraseFrequency = 6;
  EXPECT_NEAR(LUXPhraseScore(phrase), 7 * (1 + residual) * 2, 1e-9);
  phrase.length = 4;
  EXPECT_NEAR(LUXPhraseScore(phrase), 14 * (1 + residual) * 2, 1e-9);
}

TEST(LUXPhraseScore, SingleWordsAreDamped) {
  LUXPhraseStatistics word = statistics();
  word.length = 1;
  EXPECT_NEAR(LUXPhraseScore(word), .15 * LUXPhraseScore(statistics()), 1e-9);
  word.longerPhraseCount = 1;
  word.longerPhraseFrequency = 9;
  EXPECT_NEAR(LUXPhraseScore(word), .15 * LUXPhraseScore(statistics()), 1e-9);
}

TEST(LUXPhraseScore, IsNeverNegativeOrNoNumber) {
  EXPECT_EQ(LUXPhraseScore({}), 0);
  LUXPhraseStatistics phrase = statistics();
  phrase.longerPhraseCount = 1;
  phrase.longerPhraseFrequency = 1000;
  EXPECT_EQ(LUXPhraseScore(phrase), 0);
  phrase = statistics();
  phrase.pageCount = phrase.totalPageCount = 1;
  phrase.frequency = 1;
  EXPECT_GT(LUXPhraseScore(phrase), 0);
  phrase.frequency = UINT64_MAX;
  EXPECT_TRUE(std::isfinite(LUXPhraseScore(phrase)));
}

TEST(LUXPhraseThreshold, IsTheScoreOfTheLastInTheBudget) {
  std::vector<LUXPhrase> phrases(5);
  for (size_t i = 0; i < phrases.size(); ++i) {
    phrases[i].statistics = statistics();
    phrases[i].statistics.frequency = 10 + i;
  }
  EXPECT_DOUBLE_EQ(LUXPhraseThreshold(phrases, 1, 2, 2), LUXPhraseScore(phrases[3].statistics));
  EXPECT_EQ(LUXPhraseThreshold(phrases, 1, 2, 5), 0) << "all get in";
  EXPECT_EQ(LUXPhraseThreshold(phrases, 3, 4, 2), 0) << "none is that long";
  EXPECT_EQ(LUXPhraseThreshold(phrases, 1, 2, 0), 0);
  phrases[4].statistics.pageCount = LUXPhraseMinimumPageCount - 1;
  EXPECT_DOUBLE_EQ(LUXPhraseThreshold(phrases, 1, 2, 2), LUXPhraseScore(phrases[2].statistics));
}
