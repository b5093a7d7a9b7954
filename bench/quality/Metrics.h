// How good a ranking is.
#pragma once

#include <map>
#include <vector>

#include "bench/quality/Collection.h"

namespace quality {

/// Means over queries, each within 0..1.
struct Metrics {
  /// Gain = grade, discount = 1/log2(rank + 1), divided by the best that the grades allow.
  double ndcg10 = 0;
  /// Mean average precision over the ranking as it was given.
  double map = 0;
  double recall100 = 0;
  /// Reciprocal rank of the first answer.
  double mrr = 0;
};

/// Document numbers of one query, best first.
using Ranking = std::vector<size_t>;

/// Measures of one ranking.
Metrics metricsOfRanking(const Ranking& ranking, const std::map<size_t, int>& answers);

/// Means over the collection's queries; `rankings` is in order of these. `perQuery`, when given,
/// receives nDCG@10 of each.
Metrics metricsOfRankings(const Collection& collection, const std::vector<Ranking>& rankings,
                          std::vector<double>* perQuery = nullptr);

/// Two-sided p of the paired randomisation test (10,000 sign flips, fixed seed) for the hypothesis
/// that both lists have the same mean.
double randomisationTest(const std::vector<double>& a, const std::vector<double>& b);

}  // namespace quality
