#include "bench/quality/Metrics.h"

#include <algorithm>
#include <cmath>
#include <functional>
#include <random>

namespace quality {

Metrics metricsOfRanking(const Ranking& ranking, const std::map<size_t, int>& answers) {
  Metrics metrics;
  if (answers.empty()) {
    return metrics;
  }
  double gain = 0;
  double precisions = 0;
  size_t found = 0;
  size_t foundIn100 = 0;
  for (size_t i = 0; i < ranking.size(); ++i) {
    const auto answer = answers.find(ranking[i]);
    if (answer == answers.end()) {
      continue;
    }
    const auto rank = static_cast<double>(i + 1);
    ++found;
    if (found == 1) {
      metrics.mrr = 1 / rank;
    }
    precisions += static_cast<double>(found) / rank;
    if (i < 10) {
      gain += answer->second / std::log2(rank + 1);
    }
    if (i < 100) {
      ++foundIn100;
    }
  }
  std::vector<int> grades;
  for (const auto& [document, grade] : answers) {
    grades.push_back(grade);
  }
  std::sort(grades.begin(), grades.end(), std::greater<>());
  double ideal = 0;
  for (size_t i = 0; i < std::min<size_t>(10, grades.size()); ++i) {
    ideal += grades[i] / std::log2(static_cast<double>(i + 2));
  }
  const auto wanted = static_cast<double>(answers.size());
  metrics.ndcg10 = gain / ideal;
  metrics.map = precisions / wanted;
  metrics.recall100 = static_cast<double>(foundIn100) / wanted;
  return metrics;
}

Metrics metricsOfRankings(const Collection& collection, const std::vector<Ranking>& rankings,
                          std::vector<double>* perQuery) {
  Metrics mean;
  for (size_t i = 0; i < rankings.size(); ++i) {
    const Metrics one =
        metricsOfRanking(rankings[i], collection.answers.at(collection.queries[i].id));
    mean.ndcg10 += one.ndcg10;
    mean.map += one.map;
    mean.recall100 += one.recall100;
    mean.mrr += one.mrr;
    if (perQuery != nullptr) {
      perQuery->push_back(one.ndcg10);
    }
  }
  const auto count = static_cast<double>(std::max<size_t>(1, rankings.size()));
  mean.ndcg10 /= count;
  mean.map /= count;
  mean.recall100 /= count;
  mean.mrr /= count;
  return mean;
}

double randomisationTest(const std::vector<double>& a, const std::vector<double>& b) {
  std::vector<double> differences;
  double sum = 0;
  for (size_t i = 0; i < a.size(); ++i) {
    differences.push_back(a[i] - b[i]);
    sum += a[i] - b[i];
  }
  constexpr int rounds = 10000;
  std::mt19937_64 random(1);
  int asExtreme = 0;
  for (int round = 0; round < rounds; ++round) {
    double flipped = 0;
    uint64_t bits = 0;
    for (size_t i = 0; i < differences.size(); ++i) {
      if (i % 64 == 0) {
        bits = random();
      }
      flipped += (bits >> (i % 64) & 1) != 0 ? differences[i] : -differences[i];
    }
    asExtreme += std::abs(flipped) >= std::abs(sum) - 1e-12 ? 1 : 0;
  }
  return static_cast<double>(asExtreme + 1) / (rounds + 1);
}

}  // namespace quality
