#include "SearchKit/Scoring.h"

#include <gtest/gtest.h>

#include <cmath>
#include <limits>

namespace searchkit {
namespace {

TEST(Scorer, rareTermsWeighMore) {
  const Scorer scorer(1000, 100000);
  float before = std::numeric_limits<float>::max();
  for (const uint64_t count : {1U, 2U, 10U, 100U, 999U, 1000U}) {
    const float idf = scorer.inverseDocumentFrequency(count);
    EXPECT_LT(idf, before);
    EXPECT_GT(idf, 0);
    before = idf;
  }
}

TEST(Scorer, frequencyHelpsButSaturates) {
  const Scorer scorer(1000, 100000);
  const float one = scorer.score(1, 4, 100);
  const float two = scorer.score(1, 8, 100);
  const float ten = scorer.score(1, 40, 100);
  const float eleven = scorer.score(1, 44, 100);
  EXPECT_LT(one, two);
  EXPECT_LT(ten, eleven);
  EXPECT_GT(two - one, eleven - ten);
  EXPECT_LE(scorer.score(1, 4e9F, 100), 1 + saturation);
}

TEST(Scorer, shortPagesScoreHigherThanLongOnes) {
  const Scorer scorer(1000, 100000);
  EXPECT_GT(scorer.score(1, 4, 10), scorer.score(1, 4, 1000));
}

TEST(Scorer, isAboveZeroAndFiniteWhateverTheIndexSays) {
  const uint32_t most = std::numeric_limits<uint32_t>::max();
  for (const uint32_t documents : {0U, 1U, 7U, most}) {
    for (const uint64_t words : {uint64_t{0}, uint64_t{1}, ~uint64_t{0}}) {
      const Scorer scorer(documents, words);
      for (const uint64_t count : {uint64_t{0}, uint64_t{1}, uint64_t{most}, ~uint64_t{0}}) {
        for (const float frequency : {1.0F, 4.0F, 1e15F}) {
          for (const uint32_t length : {0U, 1U, most}) {
            const float score =
                scorer.score(scorer.inverseDocumentFrequency(count), frequency, length);
            EXPECT_GT(score, 0);
            EXPECT_TRUE(std::isfinite(score));
          }
        }
      }
    }
  }
}

}  // namespace
}  // namespace searchkit
