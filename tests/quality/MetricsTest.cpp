#include "bench/quality/Metrics.h"

#include <gtest/gtest.h>

#include <cmath>
#include <vector>

using quality::Metrics;
using quality::metricsOfRanking;
using quality::Ranking;

namespace {

TEST(Metrics, aPerfectRankingHasOneThroughout) {
  const Metrics metrics = metricsOfRanking({7, 3, 5}, {{7, 2}, {3, 1}});
  EXPECT_DOUBLE_EQ(metrics.ndcg10, 1);
  EXPECT_DOUBLE_EQ(metrics.map, 1);
  EXPECT_DOUBLE_EQ(metrics.recall100, 1);
  EXPECT_DOUBLE_EQ(metrics.mrr, 1);
}

TEST(Metrics, anAnswerCountsLessTheLaterItComes) {
  const Metrics metrics = metricsOfRanking({1, 2, 9}, {{9, 1}});
  EXPECT_DOUBLE_EQ(metrics.ndcg10, 1 / std::log2(4.0));
  EXPECT_DOUBLE_EQ(metrics.map, 1.0 / 3);
  EXPECT_DOUBLE_EQ(metrics.mrr, 1.0 / 3);
}

TEST(Metrics, gradesWeighTheGain) {
  const Metrics metrics = metricsOfRanking({1, 2}, {{1, 1}, {2, 3}});
  const double best = 3 + 1 / std::log2(3.0);
  EXPECT_DOUBLE_EQ(metrics.ndcg10, (1 + 3 / std::log2(3.0)) / best);
}

TEST(Metrics, missingAnswersLowerPrecisionAndRecall) {
  const Metrics metrics = metricsOfRanking({4}, {{4, 1}, {5, 1}});
  EXPECT_DOUBLE_EQ(metrics.map, 0.5);
  EXPECT_DOUBLE_EQ(metrics.recall100, 0.5);
  EXPECT_LT(metrics.ndcg10, 1);
}

TEST(Metrics, whatComesAfterTheTenthAndTheHundredthPlaceIsLeftOut) {
  Ranking ranking;
  for (size_t i = 0; i < 101; ++i) {
    ranking.push_back(i);
  }
  const Metrics metrics = metricsOfRanking(ranking, {{10, 1}, {100, 1}});
  EXPECT_DOUBLE_EQ(metrics.ndcg10, 0);
  EXPECT_DOUBLE_EQ(metrics.recall100, 0.5);
}

TEST(Metrics, anEmptyRankingHasNothing) {
  const Metrics metrics = metricsOfRanking({}, {{1, 1}});
  EXPECT_DOUBLE_EQ(metrics.ndcg10 + metrics.map + metrics.recall100 + metrics.mrr, 0);
}

TEST(Metrics, theRandomisationTestTellsNoiseFromDifference) {
  const std::vector<double> base(40, 0.5);
  std::vector<double> better(40, 0.6);
  EXPECT_LT(quality::randomisationTest(better, base), 0.001);
  std::vector<double> mixed = base;
  for (size_t i = 0; i < mixed.size(); ++i) {
    mixed[i] += i % 2 == 0 ? 0.1 : -0.1;
  }
  EXPECT_GT(quality::randomisationTest(mixed, base), 0.5);
}

}  // namespace
