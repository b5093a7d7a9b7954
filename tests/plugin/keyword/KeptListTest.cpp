#include "plugin/keyword/KeptList.h"

#include <gtest/gtest.h>

#include <algorithm>
#include <limits>
#include <random>
#include <set>

namespace {

constexpr float notANumber = std::numeric_limits<float>::quiet_NaN();

// 500 hits with the scores 1 to 500, the smallest first, numbered like their scores.
KeptList full() {
  KeptList list;
  for (uint32_t i = 1; i <= KeptList::limit; ++i) {
    list.add(i, static_cast<float>(i));
  }
  return list;
}

}  // namespace

TEST(KeptList, BeginsEmptyWithoutRoom) {
  const KeptList list;
  EXPECT_TRUE(list.empty());
  EXPECT_EQ(list.count(), 0U);
  EXPECT_EQ(list.capacity(), 0U);
}

TEST(KeptList, GrowsByHalfAndOne) {
  KeptList list;
  std::vector<size_t> capacities;
  for (uint32_t i = 0; i < 900; ++i) {
    list.add(i, 1.0F);
    if (capacities.empty() || capacities.back() != list.capacity()) {
      EXPECT_EQ(list.count(), capacities.empty() ? 1 : capacities.back() + 1);
      capacities.push_back(list.capacity());
    }
  }
  EXPECT_EQ(capacities, (std::vector<size_t>{50, 76, 115, 173, 260, 391, 587, 881, 1322}));
}

TEST(KeptList, KeepsHitsInTheOrderInWhichTheyCame) {
  KeptList list;
  list.add(7, 1.5F);
  list.add(3, 0.5F);
  list.add(9, 2.5F);
  EXPECT_EQ(list.ids(), (std::vector<SKDocumentID>{7, 3, 9}));
  EXPECT_EQ(list.scores(), (std::vector<float>{1.5F, 0.5F, 2.5F}));
  EXPECT_EQ(list.minimum(), 0.5F);
  EXPECT_EQ(list.minimumPosition(), 1U);
}

TEST(KeptList, TheFirstOfEqualScoresIsTheMinimum) {
  KeptList list;
  list.add(0, 2.0F);
  list.add(1, 1.0F);
  list.add(2, 1.0F);
  EXPECT_EQ(list.minimumPosition(), 1U);
}

TEST(KeptList, BetterHitTakesThePlaceOfTheMinimum) {
  KeptList list = full();
  list.add(1000, 250.5F);
  EXPECT_EQ(list.count(), 500U);
  EXPECT_EQ(list.ids()[0], 1000U);
  EXPECT_EQ(list.scores()[0], 250.5F);
  EXPECT_EQ(list.minimum(), 2.0F);
  EXPECT_EQ(list.minimumPosition(), 1U);
}

TEST(KeptList, AfterAReplacementTheFirstOfTheSmallestIsTheMinimum) {
  KeptList list;
  for (uint32_t i = 0; i < KeptList::limit; ++i) {
    list.add(i, i == 499 ? 1.0F : i % 10 == 7 ? 2.0F : 3.0F);
  }
  ASSERT_EQ(list.minimumPosition(), 499U);
  list.add(1000, 5.0F);
  EXPECT_EQ(list.minimum(), 2.0F);
  EXPECT_EQ(list.minimumPosition(), 7U);
}

TEST(KeptList, HitAsGoodAsTheMinimumIsAdded) {
  KeptList list = full();
  list.add(1000, 1.0F);
  EXPECT_EQ(list.count(), 501U);
  EXPECT_EQ(list.ids().back(), 1000U);
  EXPECT_EQ(list.minimumPosition(), 0U);
  list.add(1001, 1.0F);
  EXPECT_EQ(list.count(), 502U);
}

TEST(KeptList, ListAboveTheLimitStillReplacesItsMinimum) {
  KeptList list = full();
  list.add(1000, 1.0F);
  list.add(1001, 600.0F);
  EXPECT_EQ(list.count(), 501U);
  EXPECT_EQ(list.ids()[0], 1001U);
  EXPECT_EQ(list.minimum(), 1.0F);
  EXPECT_EQ(list.minimumPosition(), 500U);
}

TEST(KeptList, WorseHitIsDroppedOnceFull) {
  KeptList list = full();
  const auto ids = list.ids();
  list.add(1000, 0.5F);
  EXPECT_EQ(list.ids(), ids);
}

TEST(KeptList, ScoreThatIsNoNumberIsDroppedOnceFull) {
  KeptList list = full();
  const auto ids = list.ids();
  list.add(1000, notANumber);
  EXPECT_EQ(list.ids(), ids);
  list.add(1001, 700.0F);
  EXPECT_EQ(list.count(), 500U);
  EXPECT_EQ(list.ids()[0], 1001U);
}

TEST(KeptList, ScoreThatIsNoNumberIsKeptWhileThereIsRoom) {
  KeptList list;
  list.add(1, 2.0F);
  list.add(2, notANumber);
  list.add(3, 1.0F);
  EXPECT_EQ(list.count(), 3U);
  EXPECT_EQ(list.minimum(), 1.0F);
  EXPECT_EQ(list.minimumPosition(), 2U);
}

TEST(KeptList, OfManyHitsWithDifferentScoresTheBestFiveHundredStay) {
  std::mt19937 random(7);
  for (const uint32_t count : {499U, 500U, 501U, 600U, 5000U}) {
    std::vector<uint32_t> scores(count);
    for (uint32_t i = 0; i < count; ++i) {
      scores[i] = i;
    }
    std::shuffle(scores.begin(), scores.end(), random);
    KeptList list;
    for (const uint32_t score : scores) {
      list.add(score, static_cast<float>(score));
    }
    const std::set<SKDocumentID> kept(list.ids().begin(), list.ids().end());
    const uint32_t expected = std::min(count, 500U);
    ASSERT_EQ(kept.size(), expected);
    EXPECT_EQ(list.count(), expected);
    EXPECT_EQ(*kept.begin(), count - expected);
  }
}

TEST(KeptList, KeepsWhatTheRulesKeepWhenScoresTie) {
  // The rules once more, written the slow way.
  std::mt19937 random(11);
  for (int round = 0; round < 20; ++round) {
    KeptList list;
    std::vector<std::pair<SKDocumentID, float>> naive;
    for (uint32_t i = 0; i < 2000; ++i) {
      const float score = static_cast<float>(random() % 40);
      list.add(i, score);
      const auto minimum =
          std::min_element(naive.begin(), naive.end(),
                           [](const auto& a, const auto& b) { return a.second < b.second; });
      if (naive.size() < 500 || score == minimum->second) {
        naive.emplace_back(i, score);
      } else if (score > minimum->second) {
        *minimum = {i, score};
      }
    }
    ASSERT_EQ(list.count(), naive.size());
    for (size_t i = 0; i < naive.size(); ++i) {
      ASSERT_EQ(list.ids()[i], naive[i].first);
      ASSERT_EQ(list.scores()[i], naive[i].second);
    }
  }
}
