#include "host/Luxwell/LUXScoringBest.h"

#include <gtest/gtest.h>

#include <random>

namespace {

struct Item {
  int number = 0;
  float score = 0;
  friend bool operator==(const Item&, const Item&) = default;
};

struct BestFirst {
  bool operator()(const Item& a, const Item& b) const {
    return a.score != b.score ? a.score > b.score : a.number < b.number;
  }
};

using Best = LUXBest<Item, BestFirst>;

}  // namespace

TEST(LUXBest, KeepsWhatSortingEverythingWouldKeep) {
  std::mt19937 random(3);
  for (const size_t count : {size_t{1}, size_t{2}, size_t{50}, size_t{1000}, size_t{5000}}) {
    // Few different scores, so that there are many ties.
    std::uniform_int_distribution<int> score(0, 40);
    Best best(count, BestFirst());
    std::vector<Item> all;
    for (int i = 0; i < 3000; ++i) {
      all.push_back({i, static_cast<float>(score(random)) / 40});
      best.add(all.back());
    }
    std::sort(all.begin(), all.end(), BestFirst());
    all.resize(std::min(all.size(), count));
    EXPECT_EQ(best.sorted(), all);
  }
}

TEST(LUXBest, TheThresholdIsTheWorstThatIsKept) {
  Best best(2, BestFirst());
  best.add({1, 0.5F});
  best.settle();
  EXPECT_EQ(best.threshold(), 0);
  best.add({2, 0.7F});
  best.add({3, 0.6F});
  best.settle();
  EXPECT_EQ(best.threshold(), 0.6F);
  EXPECT_EQ(best.items().size(), 2U);
}

TEST(LUXBest, NothingIsWantedAndNothingKept) {
  Best best(0, BestFirst());
  best.add({1, 1});
  best.settle();
  EXPECT_TRUE(best.sorted().empty());
}
