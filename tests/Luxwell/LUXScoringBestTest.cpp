#include "host/Luxwell/LUXScoringBest.h"

#include <gtest/gtest.h>

#include <random>
#include <utility>

#include "host/Luxwell/LUXScoringGroups.h"

namespace {

using Pairs = std::vector<std::pair<uint32_t, float>>;

Pairs sorted(LUXBest& best) {
  Pairs pairs;
  for (const LUXBest::Item& item : best.sorted()) {
    pairs.emplace_back(item.number, item.score);
  }
  return pairs;
}

}  // namespace

TEST(LUXBest, KeepsWhatSortingEverythingWouldKeep) {
  std::mt19937 random(3);
  for (const size_t count : {size_t{1}, size_t{2}, size_t{50}, size_t{1000}, size_t{5000}}) {
    // Few different scores, so that there are many ties.
    std::uniform_int_distribution<int> score(0, 40);
    LUXBest best(count);
    Pairs all;
    for (uint32_t i = 0; i < 3000; ++i) {
      all.emplace_back((i * 7919U) % 3001U, static_cast<float>(score(random)) / 40);
      best.add(all.back().first, all.back().second);
    }
    std::sort(all.begin(), all.end(), [](const auto& a, const auto& b) {
      return a.second != b.second ? a.second > b.second : a.first < b.first;
    });
    all.resize(std::min(all.size(), count));
    EXPECT_EQ(sorted(best), all);
  }
}

TEST(LUXBest, KeepsTheBestWhateverTheirScoresAreLike) {
  std::mt19937 random(13);
  for (const size_t size : {size_t{20}, size_t{300}, size_t{6000}}) {
    for (const int kind : {0, 1, 2, 3}) {
      LUXBest best(100);
      Pairs all;
      for (uint32_t i = 0; i < size; ++i) {
        const float share = static_cast<float>(random() % 100000) / 100000;
        const float score = kind == 0   ? share
                            : kind == 1 ? share * share * share * 1e-4F
                            : kind == 2 ? 0.5F
                                        : 1 / (share + 1e-5F);
        all.emplace_back(i, score);
        best.add(i, score);
        if (i % 150 == 149) {
          best.raiseThreshold();
        }
      }
      std::sort(all.begin(), all.end(), [](const auto& a, const auto& b) {
        return a.second != b.second ? a.second > b.second : a.first < b.first;
      });
      all.resize(std::min(all.size(), size_t{100}));
      EXPECT_EQ(sorted(best), all) << size << ' ' << kind;
    }
  }
}

TEST(LUXBest, TheThresholdIsReachedByAllThatAreKept) {
  LUXBest best(2);
  best.add(1, 0.5F);
  best.raiseThreshold();
  EXPECT_EQ(best.threshold(), 0);
  best.add(2, 0.7F);
  best.add(3, 0.6F);
  best.raiseThreshold();
  EXPECT_LE(best.threshold(), 0.6F);
  EXPECT_GT(best.threshold(), 0.59F);
  best.add(4, 0.55F);
  EXPECT_EQ(sorted(best), (Pairs{{2, 0.7F}, {3, 0.6F}}));
}

TEST(LUXBest, TakesTheHighestAndTheLowestNumbers) {
  LUXBest best(3);
  best.add(0xFFFFFFFF, 1);
  best.add(0, 1);
  best.add(7, -0.0F);
  EXPECT_EQ(sorted(best), (Pairs{{0, 1.0F}, {0xFFFFFFFF, 1.0F}, {7, 0.0F}}));
}

TEST(LUXBest, NothingIsWantedAndNothingKept) {
  LUXBest best(0);
  best.add(1, 1);
  best.raiseThreshold();
  EXPECT_TRUE(best.sorted().empty());
}

TEST(LUXScoringGroups, FindsTheHighestOfEachGroup) {
  std::mt19937 random(4);
  std::vector<float> scores(8 * luxscoring::groupLength);
  for (float& score : scores) {
    score = static_cast<float>(random() % 1000) / 1000 - 0.2F;
  }
  std::vector<float> maxima(8);
  EXPECT_EQ(luxscoring::findGroupMaxima(scores.data(), maxima.size(), maxima.data()),
            *std::max_element(scores.begin(), scores.end()));
  for (size_t group = 0; group < maxima.size(); ++group) {
    const float* const first = scores.data() + group * luxscoring::groupLength;
    EXPECT_EQ(maxima[group], *std::max_element(first, first + luxscoring::groupLength));
  }
}

TEST(LUXScoringGroups, TellsWhichScoresReachAnother) {
  std::vector<float> scores(luxscoring::groupLength);
  for (size_t i = 0; i < scores.size(); ++i) {
    scores[i] = static_cast<float>((i * 5) % 16);
  }
  for (const float least : {-1.0F, 0.0F, 3.0F, 14.5F, 15.0F, 16.0F}) {
    uint32_t expected = 0;
    for (size_t i = 0; i < scores.size(); ++i) {
      expected |= (scores[i] >= least ? 1U : 0U) << i;
    }
    EXPECT_EQ(luxscoring::scoresReaching(scores.data(), least), expected);
  }
}

TEST(LUXScoringGroups, FourGroupsAreFourTimesOne) {
  std::mt19937 random(5);
  std::vector<float> scores(4 * luxscoring::groupLength);
  for (float& score : scores) {
    score = static_cast<float>(random() % 100) / 100;
  }
  std::vector<float> maxima(4);
  luxscoring::findGroupMaxima(scores.data(), maxima.size(), maxima.data());
  for (const float least : {0.0F, 0.5F, 0.9F, 1.5F}) {
    uint64_t bits = 0;
    for (size_t group = 0; group < 4; ++group) {
      bits |= static_cast<uint64_t>(luxscoring::scoresReaching(
                  scores.data() + group * luxscoring::groupLength, least))
              << (group * luxscoring::groupLength);
    }
    EXPECT_EQ(luxscoring::scoresReachingInFourGroups(scores.data(), maxima.data(), least), bits);
  }
}
