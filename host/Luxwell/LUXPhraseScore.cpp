#include "host/Luxwell/LUXPhraseScore.h"

#include <algorithm>
#include <cmath>

namespace {

constexpr double singleWordDamping = .15;

double cValue(const LUXPhraseStatistics& statistics) noexcept {
  const auto frequency = static_cast<double>(statistics.frequency);
  if (statistics.length < 2) {
    return singleWordDamping * frequency;
  }
  const double owed = statistics.longerPhraseCount == 0
                          ? 0
                          : static_cast<double>(statistics.longerPhraseFrequency) /
                                static_cast<double>(statistics.longerPhraseCount);
  return std::log2(static_cast<double>(statistics.length)) * (frequency - owed);
}

// The inverse document frequency above that of words strewn at random (by Poisson).
double residualInverseDocumentFrequency(const LUXPhraseStatistics& statistics) noexcept {
  const auto total = static_cast<double>(statistics.totalPageCount);
  const double rate = static_cast<double>(statistics.frequency) / total;
  return std::log2(-std::expm1(-rate) * total / static_cast<double>(statistics.pageCount));
}

}  // namespace

double LUXPhraseScore(const LUXPhraseStatistics& statistics) noexcept {
  if (statistics.frequency == 0 || statistics.pageCount == 0 || statistics.totalPageCount == 0) {
    return 0;
  }
  const double score = cValue(statistics) * (1 + residualInverseDocumentFrequency(statistics)) *
                       std::sqrt(1 + static_cast<double>(statistics.titleCount));
  return std::max(0.0, score);
}
