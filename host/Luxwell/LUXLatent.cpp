#include "host/Luxwell/LUXLatent.h"

#include <Eigen/Cholesky>
#include <Eigen/Core>
#include <Eigen/Eigenvalues>
#include <algorithm>
#include <cmath>

#include "host/Luxwell/LUXParallel.h"

namespace {

using RowMajor = Eigen::Matrix<float, Eigen::Dynamic, Eigen::Dynamic, Eigen::RowMajor>;
using RowBlock = Eigen::Map<const RowMajor>;
using MutableRowBlock = Eigen::Map<RowMajor>;

// Rows that are multiplied at once. Few, so that no product is divided further: how Eigen divides
// long sums depends on the machine's caches.
constexpr Eigen::Index blockLength = 128;
// Rows whose sum is one partial sum of a Gram matrix; there are never more than this many pieces.
constexpr size_t gramPieceCount = 16;
// Below this share of the largest, an eigenvalue of a Gram matrix of floats is noise.
constexpr double noise = 1e-6;
// A Cholesky factor with a smaller pivot than this loses too many digits.
constexpr double smallestPivot = 1e-4;

LUXDenseMatrix zeros(size_t rowCount, size_t columnCount) {
  return {rowCount, columnCount, std::vector<float>(rowCount * columnCount)};
}

void plainAddRow(float* sum, float factor, const float* row, size_t length) noexcept {
  for (size_t i = 0; i < length; ++i) {
    sum[i] += factor * row[i];
  }
}

#if defined(__x86_64__)
// Multiplies and adds in two steps, as the plain form does, so both give the same bits.
__attribute__((target("avx2"))) void wideAddRow(float* sum, float factor, const float* row,
                                                size_t length) noexcept {
  for (size_t i = 0; i < length; ++i) {
    sum[i] += factor * row[i];
  }
}

#endif

using AddRow = void (*)(float*, float, const float*, size_t) noexcept;

AddRow bestAddRow() noexcept {
#if defined(__x86_64__)
  if (__builtin_cpu_supports("avx2") != 0) {
    return wideAddRow;
  }
#endif
  return plainAddRow;
}

// matrix * dense.
LUXDenseMatrix product(const LUXSparseMatrix& matrix, const LUXDenseMatrix& dense,
                       size_t threadCount) {
  LUXDenseMatrix result = zeros(matrix.rowCount, dense.columnCount);
  const AddRow addRow = bestAddRow();
  LUXInParallel(matrix.rowCount, blockLength, threadCount, [&](size_t from, size_t to) {
    for (size_t row = from; row < to; ++row) {
      float* sum = result.row(row);
      for (size_t i = matrix.starts[row]; i < matrix.starts[row + 1]; ++i) {
        addRow(sum, matrix.values[i], dense.row(matrix.columns[i]), dense.columnCount);
      }
    }
  });
  return result;
}

// dense^T * dense. Partial sums of a fixed number of rows are added in their order.
Eigen::MatrixXd gram(const LUXDenseMatrix& dense, size_t threadCount) {
  const auto width = static_cast<Eigen::Index>(dense.columnCount);
  const size_t pieceLength = (dense.rowCount + gramPieceCount - 1) / gramPieceCount;
  std::vector<Eigen::MatrixXd> parts(gramPieceCount);
  LUXInParallel(dense.rowCount, pieceLength, threadCount, [&](size_t from, size_t to) {
    Eigen::MatrixXd& sum = parts[from / pieceLength];
    sum = Eigen::MatrixXd::Zero(width, width);
    Eigen::MatrixXf part(width, width);
    for (size_t row = from; row < to; row += blockLength) {
      const RowBlock block(dense.row(row),
                           std::min<Eigen::Index>(blockLength, static_cast<Eigen::Index>(to - row)),
                           width);
      part.setZero();
      part.selfadjointView<Eigen::Lower>().rankUpdate(block.transpose());
      sum.triangularView<Eigen::Lower>() += part.cast<double>();
    }
  });
  Eigen::MatrixXd sum = Eigen::MatrixXd::Zero(width, width);
  for (const Eigen::MatrixXd& part : parts) {
    if (part.size() != 0) {
      sum += part;
    }
  }
  return sum.selfadjointView<Eigen::Lower>();
}

// dense * small.
LUXDenseMatrix product(const LUXDenseMatrix& dense, const Eigen::MatrixXd& small,
                       size_t threadCount) {
  const RowMajor factor = small.cast<float>();
  LUXDenseMatrix result = zeros(dense.rowCount, static_cast<size_t>(factor.cols()));
  LUXInParallel(dense.rowCount, blockLength, threadCount, [&](size_t from, size_t to) {
    const auto count = static_cast<Eigen::Index>(to - from);
    MutableRowBlock(result.row(from), count, factor.cols()).noalias() =
        RowBlock(dense.row(from), count, factor.rows()) * factor;
  });
  return result;
}

// Eigenvalues above noise, falling, with their vectors.
struct Spectrum {
  Eigen::VectorXd values;
  Eigen::MatrixXd vectors;
};

Spectrum spectrumOf(const Eigen::MatrixXd& symmetric) {
  const Eigen::SelfAdjointEigenSolver<Eigen::MatrixXd> solver(symmetric);
  const Eigen::VectorXd& rising = solver.eigenvalues();
  const Eigen::Index size = rising.size();
  const double floor = noise * rising[size - 1];
  Eigen::Index count = 0;
  while (count < size && rising[size - 1 - count] > floor) {
    ++count;
  }
  return {rising.tail(count).reverse(), solver.eigenvectors().rightCols(count).rowwise().reverse()};
}

// Columns at right angles and of length 1 that span the same; fewer where the columns depend on one
// another.
LUXDenseMatrix orthogonal(const LUXDenseMatrix& dense, size_t threadCount) {
  if (dense.columnCount == 0) {
    return dense;
  }
  const Eigen::MatrixXd products = gram(dense, threadCount);
  const Eigen::LLT<Eigen::MatrixXd> factor(products);
  const Eigen::MatrixXd lower = factor.matrixL();
  if (factor.info() == Eigen::Success &&
      lower.diagonal().minCoeff() > smallestPivot * lower.diagonal().maxCoeff()) {
    const Eigen::MatrixXd identity = Eigen::MatrixXd::Identity(lower.rows(), lower.cols());
    return product(dense, lower.transpose().triangularView<Eigen::Upper>().solve(identity),
                   threadCount);
  }
  const Spectrum spectrum = spectrumOf(products);
  return product(dense, spectrum.vectors * spectrum.values.cwiseSqrt().cwiseInverse().asDiagonal(),
                 threadCount);
}

// SplitMix64 (G. Steele, D. Lea, C. Flood, "Fast splittable pseudorandom number generators", 2014).
uint64_t nextRandom(uint64_t& state) noexcept {
  state += 0x9E3779B97F4A7C15ULL;
  uint64_t value = state;
  value = (value ^ (value >> 30U)) * 0xBF58476D1CE4E5B9ULL;
  value = (value ^ (value >> 27U)) * 0x94D049BB133111EBULL;
  return value ^ (value >> 31U);
}

// Between -1 and 1. Even numbers serve as well as those of a bell curve, and need no function of
// the C library that rounds differently elsewhere; plain signs would often depend on one another in
// small matrices.
LUXDenseMatrix randomNumbers(size_t rowCount, size_t columnCount) {
  LUXDenseMatrix result = zeros(rowCount, columnCount);
  uint64_t state = luxlatent::seed;
  for (float& value : result.values) {
    value = static_cast<float>(nextRandom(state) >> 40U) / 8388608.0F - 1.0F;
  }
  return result;
}

}  // namespace

size_t luxlatent::rankForPageCount(size_t pageCount) noexcept {
  const double rank = 4 * std::sqrt(static_cast<double>(pageCount));
  return std::clamp(static_cast<size_t>(std::lround(rank)), smallestRank, largestRank);
}

LUXSparseMatrix LUXTranspose(const LUXSparseMatrix& matrix) {
  LUXSparseMatrix result;
  result.rowCount = matrix.columnCount;
  result.columnCount = matrix.rowCount;
  result.starts.assign(size_t{matrix.columnCount} + 1, 0);
  for (const uint32_t column : matrix.columns) {
    ++result.starts[size_t{column} + 1];
  }
  for (size_t i = 1; i < result.starts.size(); ++i) {
    result.starts[i] += result.starts[i - 1];
  }
  result.columns.resize(matrix.columns.size());
  result.values.resize(matrix.values.size());
  std::vector<size_t> next(result.starts.begin(), result.starts.end() - 1);
  for (uint32_t row = 0; row < matrix.rowCount; ++row) {
    for (size_t i = matrix.starts[row]; i < matrix.starts[row + 1]; ++i) {
      const size_t place = next[matrix.columns[i]]++;
      result.columns[place] = row;
      result.values[place] = matrix.values[i];
    }
  }
  return result;
}

LUXFactorisation LUXFactorise(const LUXSparseMatrix& matrix, size_t rank, size_t threadCount) {
  const size_t most = std::min<size_t>(matrix.rowCount, matrix.columnCount);
  const size_t width = std::min(rank + luxlatent::oversampling, most);
  if (width == 0 || matrix.values.empty()) {
    return {};
  }
  const LUXSparseMatrix transpose = LUXTranspose(matrix);
  LUXDenseMatrix basis = orthogonal(
      product(matrix, randomNumbers(matrix.columnCount, width), threadCount), threadCount);
  for (size_t i = 0; i < luxlatent::iterations; ++i) {
    const LUXDenseMatrix back = orthogonal(product(transpose, basis, threadCount), threadCount);
    basis = orthogonal(product(matrix, back, threadCount), threadCount);
  }
  if (basis.columnCount == 0) {
    return {};
  }
  // A^T Q is what is left: its Gram matrix has the squares of the singular values.
  const LUXDenseMatrix projected = product(transpose, basis, threadCount);
  Spectrum spectrum = spectrumOf(gram(projected, threadCount));
  const auto count = std::min(static_cast<Eigen::Index>(rank), spectrum.values.size());
  const Eigen::VectorXd values = spectrum.values.head(count).cwiseSqrt();
  const Eigen::MatrixXd vectors = spectrum.vectors.leftCols(count);

  LUXFactorisation result;
  result.singularValues.resize(static_cast<size_t>(count));
  for (Eigen::Index i = 0; i < count; ++i) {
    result.singularValues[static_cast<size_t>(i)] = static_cast<float>(values[i]);
  }
  result.rows = product(basis, vectors * values.asDiagonal(), threadCount);
  result.columns = product(projected, vectors * values.cwiseInverse().asDiagonal(), threadCount);
  return result;
}
