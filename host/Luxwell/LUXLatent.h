// Pages and terms as vectors in a space of few dimensions: the factorisation behind meaning.
#pragma once

#include <cstddef>
#include <cstdint>
#include <vector>

/// A matrix of which only the entries that are not zero are kept, row by row.
struct LUXSparseMatrix {
  uint32_t rowCount = 0;
  uint32_t columnCount = 0;
  /// Where the entries of each row begin; one more than there are rows.
  std::vector<size_t> starts{0};
  std::vector<uint32_t> columns;
  std::vector<float> values;
};

/// Rows of numbers, one after the other.
struct LUXDenseMatrix {
  size_t rowCount = 0;
  size_t columnCount = 0;
  std::vector<float> values;

  const float* row(size_t i) const noexcept { return values.data() + i * columnCount; }
  float* row(size_t i) noexcept { return values.data() + i * columnCount; }
};

/// The largest singular values of a matrix A with their vectors: A is nearly U S V^T.
struct LUXFactorisation {
  /// Falling.
  std::vector<float> singularValues;
  /// U S, a row for each row of A.
  LUXDenseMatrix rows;
  /// V, a row for each column of A.
  LUXDenseMatrix columns;
};

namespace luxlatent {

/// Dimensions for so many pages: 4 * sqrt(pages), from 50 to 300.
size_t rankForPageCount(size_t pageCount) noexcept;

inline constexpr size_t smallestRank = 50;
inline constexpr size_t largestRank = 300;
inline constexpr size_t oversampling = 10;
inline constexpr size_t iterations = 3;
inline constexpr uint64_t seed = 0x5EED0FA11A6E5ULL;

}  // namespace luxlatent

/// Factorises by randomised subspace iteration (N. Halko, P. Martinsson, J. Tropp, "Finding
/// structure with randomness", 2011, algorithms 4.4 and 5.1): a product with random numbers, made
/// orthogonal after every product with A and its transpose, then the small problem that is left.
/// The sums are in a fixed order, so that the same matrix gives the same bits whatever the number
/// of threads. Gives fewer than `rank` dimensions for a matrix that does not have as many.
///
/// Products with A cost entries * (rank + oversampling), eight of them in all; making them
/// orthogonal costs (rows + columns) * (rank + oversampling)^2, seven times.
LUXFactorisation LUXFactorise(const LUXSparseMatrix& matrix, size_t rank, size_t threadCount);

/// The same entries, column by column.
LUXSparseMatrix LUXTranspose(const LUXSparseMatrix& matrix);
