#include "zeb/Ranking.h"

#include <gtest/gtest.h>

#include <cmath>

namespace {

using zeb::relevances;

TEST(Ranking, NoPagesNoRelevances) { EXPECT_TRUE(relevances({}, {"word"}).empty()); }

TEST(Ranking, RelevancesAreAboveZeroAndAtMostOne) {
  const auto result = relevances({{5, 10, {"word"}}, {0.001, 100'000, {}}}, {"word"});
  EXPECT_DOUBLE_EQ(result[0], 1);
  EXPECT_GT(result[1], 0);
  EXPECT_LT(result[1], 0.01);
}

TEST(Ranking, WithinABookOfUntitledPagesScoresDecide) {
  const auto result = relevances({{2, 50, {}}, {3, 50, {}}, {1, 50, {}}}, {"word"});
  EXPECT_GT(result[1], result[0]);
  EXPECT_GT(result[0], result[2]);
}

TEST(Ranking, RarestWordOfASmallBookCountsAsMuchAsThatOfALargeOne) {
  // What a word on one page out of N is worth, as the keyword search has it.
  const auto rarest = [](double pages) { return std::log1p((pages - 0.5) / 1.5); };
  const auto result = relevances({{rarest(30), 30, {}}, {rarest(3000), 3000, {}}}, {"word"});
  EXPECT_NEAR(result[0], result[1], 0.06);
}

TEST(Ranking, TitleHelpsWhereTheBookIsAllAboutTheWord) {
  const auto result = relevances({{0.1, 20, {"half", "words"}}, {6, 2000, {"text", "functions"}}},
                                 {"half", "words"});
  EXPECT_GT(result[0], result[1]);
}

TEST(Ranking, HalfWordsCountInTitles) {
  const auto result =
      relevances({{1, 9, {"printer", "queue"}}, {1, 9, {"imprint", "barque"}}}, {"print", "qu"});
  EXPECT_DOUBLE_EQ(result[0], 1);
  EXPECT_DOUBLE_EQ(result[1], 0.5);
}

TEST(Ranking, TitleCountsByTheShareOfWordsThatItHas) {
  const auto result =
      relevances({{1, 9, {"a"}}, {1, 9, {"a", "b"}}, {1, 9, {"a", "a", "x"}}}, {"a", "b"});
  EXPECT_DOUBLE_EQ(result[0], 0.75);
  EXPECT_DOUBLE_EQ(result[1], 1);
  EXPECT_DOUBLE_EQ(result[2], 0.75);
}

TEST(Ranking, QueryWithoutWordsIsOrderedByScore) {
  const auto result = relevances({{1, 9, {"a"}}, {2, 9, {"b"}}}, {});
  EXPECT_DOUBLE_EQ(result[0], 0.25);
  EXPECT_DOUBLE_EQ(result[1], 0.5);
}

TEST(Ranking, BooksOfUnknownSizeAndScoresOfZeroGiveNumbers) {
  for (const double relevance : relevances({{0, 0, {}}, {0, 0, {"word"}}}, {"word"})) {
    EXPECT_TRUE(std::isfinite(relevance));
  }
}

}  // namespace
