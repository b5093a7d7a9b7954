#include "host/Luxwell/LUXLatent.h"

#include <gtest/gtest.h>

#include <Eigen/Core>
#include <Eigen/SVD>
#include <cmath>
#include <random>

namespace {

// Rows of unit length with a few words each, as pages are.
LUXSparseMatrix randomMatrix(uint32_t rows, uint32_t columns, unsigned perRow, unsigned seed) {
  // NOLINTNEXTLINE(cert-msc32-c,cert-msc51-cpp): the same matrix each time.
  std::mt19937 random(seed);
  LUXSparseMatrix matrix;
  matrix.rowCount = rows;
  matrix.columnCount = columns;
  for (uint32_t row = 0; row < rows; ++row) {
    double squares = 0;
    const size_t start = matrix.values.size();
    for (uint32_t column = 0; column < columns; ++column) {
      if (random() % columns < perRow) {
        matrix.columns.push_back(column);
        matrix.values.push_back(1.0F + static_cast<float>(random() % 4));
        squares += matrix.values.back() * matrix.values.back();
      }
    }
    for (size_t i = start; i < matrix.values.size(); ++i) {
      matrix.values[i] /= static_cast<float>(std::sqrt(squares));
    }
    matrix.starts.push_back(matrix.values.size());
  }
  return matrix;
}

Eigen::MatrixXd dense(const LUXSparseMatrix& matrix) {
  Eigen::MatrixXd result = Eigen::MatrixXd::Zero(matrix.rowCount, matrix.columnCount);
  for (uint32_t row = 0; row < matrix.rowCount; ++row) {
    for (size_t i = matrix.starts[row]; i < matrix.starts[row + 1]; ++i) {
      result(row, matrix.columns[i]) = matrix.values[i];
    }
  }
  return result;
}

Eigen::MatrixXd dense(const LUXDenseMatrix& matrix) {
  Eigen::MatrixXd result(matrix.rowCount, matrix.columnCount);
  for (Eigen::Index row = 0; row < result.rows(); ++row) {
    for (Eigen::Index column = 0; column < result.cols(); ++column) {
      result(row, column) = matrix.row(static_cast<size_t>(row))[column];
    }
  }
  return result;
}

bool isFinite(const LUXDenseMatrix& matrix) {
  return std::all_of(matrix.values.begin(), matrix.values.end(),
                     [](float value) { return std::isfinite(value); });
}

}  // namespace

TEST(LUXLatent, SmallMatricesAgreeWithTheWholeDecomposition) {
  for (const unsigned seed : {1U, 2U, 3U, 4U}) {
    const LUXSparseMatrix matrix = randomMatrix(40 + 10 * seed, 90 - 10 * seed, 7, seed);
    const Eigen::MatrixXd whole = dense(matrix);
    const Eigen::JacobiSVD<Eigen::MatrixXd> exact(whole, Eigen::ComputeThinU | Eigen::ComputeThinV);
    const size_t rank = 12;
    const LUXFactorisation found = LUXFactorise(matrix, rank, 2);
    ASSERT_EQ(found.singularValues.size(), rank);
    for (size_t i = 0; i < rank; ++i) {
      EXPECT_NEAR(found.singularValues[i], exact.singularValues()[static_cast<Eigen::Index>(i)],
                  0.02 * exact.singularValues()[0]);
    }
    // What the factors leave of the matrix is hardly more than what the best ones leave.
    const Eigen::MatrixXd left = whole - dense(found.rows) * dense(found.columns).transpose();
    double best = 0;
    for (Eigen::Index i = rank; i < exact.singularValues().size(); ++i) {
      best += exact.singularValues()[i] * exact.singularValues()[i];
    }
    EXPECT_LT(left.squaredNorm(), 1.02 * best);
  }
}

TEST(LUXLatent, AMatrixOfFewDimensionsIsGivenBackWhole) {
  const LUXSparseMatrix matrix = randomMatrix(30, 20, 5, 9);
  const LUXFactorisation found = LUXFactorise(matrix, 50, 2);
  EXPECT_LE(found.singularValues.size(), 20U);
  const Eigen::MatrixXd product = dense(found.rows) * dense(found.columns).transpose();
  EXPECT_LT((product - dense(matrix)).cwiseAbs().maxCoeff(), 1e-3);
}

TEST(LUXLatent, TheColumnsAreAtRightAnglesAndOfLengthOne) {
  const LUXFactorisation found = LUXFactorise(randomMatrix(300, 200, 12, 5), 40, 2);
  const Eigen::MatrixXd columns = dense(found.columns);
  const Eigen::MatrixXd products = columns.transpose() * columns;
  EXPECT_LT((products - Eigen::MatrixXd::Identity(40, 40)).cwiseAbs().maxCoeff(), 1e-3);
}

TEST(LUXLatent, SingularValuesFall) {
  const LUXFactorisation found = LUXFactorise(randomMatrix(300, 200, 12, 6), 40, 2);
  EXPECT_TRUE(std::is_sorted(found.singularValues.rbegin(), found.singularValues.rend()));
  EXPECT_GT(found.singularValues.back(), 0);
}

TEST(LUXLatent, TheBitsAreTheSameWhateverTheNumberOfThreads) {
  const LUXSparseMatrix matrix = randomMatrix(2500, 900, 30, 7);
  const LUXFactorisation one = LUXFactorise(matrix, 60, 1);
  for (const size_t threads : {2U, 3U, 8U}) {
    const LUXFactorisation other = LUXFactorise(matrix, 60, threads);
    EXPECT_EQ(one.singularValues, other.singularValues);
    EXPECT_EQ(one.rows.values, other.rows.values);
    EXPECT_EQ(one.columns.values, other.columns.values);
  }
}

TEST(LUXLatent, RowsThatAreAlikeMakeFewerDimensions) {
  LUXSparseMatrix matrix;
  matrix.rowCount = 100;
  matrix.columnCount = 60;
  for (uint32_t row = 0; row < 100; ++row) {
    matrix.columns.insert(matrix.columns.end(), {row % 3, 10 + row % 3});
    matrix.values.insert(matrix.values.end(), {0.6F, 0.8F});
    matrix.starts.push_back(matrix.values.size());
  }
  const LUXFactorisation found = LUXFactorise(matrix, 50, 2);
  EXPECT_EQ(found.singularValues.size(), 3U);
  EXPECT_TRUE(isFinite(found.rows));
  EXPECT_TRUE(isFinite(found.columns));
}

TEST(LUXLatent, RowsOfNothingStayNothing) {
  LUXSparseMatrix matrix = randomMatrix(20, 15, 4, 8);
  matrix.rowCount += 5;
  for (int i = 0; i < 5; ++i) {
    matrix.starts.push_back(matrix.values.size());
  }
  const LUXFactorisation found = LUXFactorise(matrix, 10, 2);
  for (size_t row = 20; row < 25; ++row) {
    for (size_t i = 0; i < found.rows.columnCount; ++i) {
      EXPECT_NEAR(found.rows.row(row)[i], 0, 1e-6);
    }
  }
}

TEST(LUXLatent, WhatHasNoEntriesHasNoDimensions) {
  EXPECT_TRUE(LUXFactorise({}, 50, 2).singularValues.empty());
  LUXSparseMatrix empty;
  empty.rowCount = 3;
  empty.columnCount = 4;
  empty.starts.assign(4, 0);
  EXPECT_TRUE(LUXFactorise(empty, 50, 2).singularValues.empty());
  // Entries that are zero, as a word has that is evenly everywhere.
  empty.columns = {0, 0, 0};
  empty.values = {0, 0, 0};
  empty.starts = {0, 1, 2, 3};
  EXPECT_TRUE(LUXFactorise(empty, 50, 2).singularValues.empty());
}

TEST(LUXLatent, OneEntryIsOneDimension) {
  LUXSparseMatrix matrix;
  matrix.rowCount = 1;
  matrix.columnCount = 1;
  matrix.columns = {0};
  matrix.values = {1};
  matrix.starts = {0, 1};
  const LUXFactorisation found = LUXFactorise(matrix, 50, 2);
  ASSERT_EQ(found.singularValues.size(), 1U);
  EXPECT_NEAR(found.singularValues[0], 1, 1e-5);
}

TEST(LUXLatent, TheRankGrowsWithTheRootOfThePagesWithinBounds) {
  EXPECT_EQ(luxlatent::rankForPageCount(0), 50U);
  EXPECT_EQ(luxlatent::rankForPageCount(156), 50U);
  EXPECT_EQ(luxlatent::rankForPageCount(2500), 200U);
  EXPECT_EQ(luxlatent::rankForPageCount(28000), 300U);
}

TEST(LUXLatent, TransposingTwiceGivesTheSame) {
  const LUXSparseMatrix matrix = randomMatrix(17, 23, 5, 3);
  const LUXSparseMatrix twice = LUXTranspose(LUXTranspose(matrix));
  EXPECT_EQ(twice.starts, matrix.starts);
  EXPECT_EQ(twice.columns, matrix.columns);
  EXPECT_EQ(twice.values, matrix.values);
  EXPECT_EQ(dense(LUXTranspose(matrix)), dense(matrix).transpose());
}
