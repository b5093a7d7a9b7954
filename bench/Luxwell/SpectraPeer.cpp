#include <Spectra/contrib/PartialSVDSolver.h>
#include <Eigen/SparseCore>

#include <algorithm>
#include <chrono>
#include <cmath>
#include <limits>
#include <map>
#include <stdexcept>
#include <string>
#include <vector>

#include "bench/Luxwell/SpeedPeers.h"
#include "host/Luxwell/HelpLUXIndex.h"

namespace quality {

double spectraSeconds(const HelpLUXIndex& index) {
  struct Stem {
    int column = -1;
    uint32_t pages = 0;
    double total = 0;
    double entropy = 0;
  };
  struct Entry {
    int row;
    const std::string* stem;
    double count;
  };
  std::map<std::string, Stem> stems;
  std::vector<Entry> entries;
  LUXTokenCounts counts;
  int pageCount = 0;
  for (const std::string& key : index.documentKeys()) {
    counts = index.tokenCountsForKey(key);
    for (size_t i = 0; i < counts.size(); ++i) {
      const LUXTokenCount token = counts[i];
      if (token.kind == LUXTokenKind::stem) {
        const auto stem = stems.try_emplace(std::string(token.token)).first;
        const double count = static_cast<double>(token.titleCount) + token.bodyCount;
        ++stem->second.pages;
        stem->second.total += count;
        entries.push_back({pageCount, &stem->first, count});
      }
    }
    ++pageCount;
  }
  int columnCount = 0;
  for (auto& [text, stem] : stems) {
    stem.column = stem.pages >= 2 ? columnCount++ : -1;
  }
  for (const Entry& entry : entries) {
    Stem& stem = stems[*entry.stem];
    const double share = entry.count / stem.total;
    stem.entropy += share * std::log(share);
  }
  std::vector<double> squares(static_cast<size_t>(pageCount));
  std::vector<Eigen::Triplet<double>> triplets;
  for (const Entry& entry : entries) {
    const Stem& stem = stems[*entry.stem];
    if (stem.column >= 0) {
      const double weight = std::log2(1 + entry.count) *
                            (1 + stem.entropy / std::log(static_cast<double>(pageCount)));
      triplets.emplace_back(entry.row, stem.column, weight);
      squares[static_cast<size_t>(entry.row)] += weight * weight;
    }
  }
  for (Eigen::Triplet<double>& triplet : triplets) {
    const double length = std::sqrt(squares[static_cast<size_t>(triplet.row())]);
    triplet = {triplet.row(), triplet.col(), length > 0 ? triplet.value() / length : 0};
  }
  Eigen::SparseMatrix<double> matrix(pageCount, columnCount);
  matrix.setFromTriplets(triplets.begin(), triplets.end());
  const int rank =
      std::min({std::clamp(static_cast<int>(std::lround(4 * std::sqrt(pageCount))), 50, 300),
                pageCount - 1, columnCount - 1});
  const int basis = std::min({2 * rank + 1, pageCount, columnCount});

  // On a busy machine its products are slower on several processors than on one.
  double best = std::numeric_limits<double>::max();
  for (const int threads : {1, 0}) {
    Eigen::setNbThreads(threads);
    const auto start = std::chrono::steady_clock::now();
    Spectra::PartialSVDSolver<Eigen::SparseMatrix<double>> solver(matrix, rank, basis);
    if (solver.compute() < rank) {
      throw std::runtime_error("Spectra found no factorisation");
    }
    const Eigen::MatrixXd left = solver.matrix_U(rank);
    const Eigen::MatrixXd right = solver.matrix_V(rank);
    best = std::min(
        best, std::chrono::duration<double>(std::chrono::steady_clock::now() - start).count());
  }
  return best;
}

}  // namespace quality
