#include "host/Luxwell/LUXParallel.h"

#include <gtest/gtest.h>

#include <algorithm>
#include <atomic>
#include <stdexcept>
#include <utility>
#include <vector>

#include "platform/ThreadSafety.h"

namespace {

std::vector<std::pair<size_t, size_t>> piecesOf(size_t count, size_t length, size_t threads) {
  std::vector<std::pair<size_t, size_t>> pieces;
  platform::Mutex mutex;
  LUXInParallel(count, length, threads, [&](size_t from, size_t to) {
    const platform::MutexLock lock(mutex);
    pieces.emplace_back(from, to);
  });
  std::sort(pieces.begin(), pieces.end());
  return pieces;
}

}  // namespace

TEST(LUXParallel, ThePiecesAreTheSameWhateverTheNumberOfThreads) {
  const std::vector<std::pair<size_t, size_t>> expected = {{0, 4}, {4, 8}, {8, 10}};
  for (const size_t threads : {0U, 1U, 2U, 50U}) {
    EXPECT_EQ(piecesOf(10, 4, threads), expected);
  }
}

TEST(LUXParallel, NothingHasNoPieces) {
  EXPECT_TRUE(piecesOf(0, 4, 4).empty());
  EXPECT_EQ(piecesOf(3, 0, 2).size(), 3U) << "a piece has at least one";
}

TEST(LUXParallel, WhatThePieceThatComesFirstThrewIsThrownAgainAfterAllHaveEnded) {
  std::atomic<int> done{0};
  try {
    LUXInParallel(100, 1, 4, [&](size_t from, size_t) {
      ++done;
      if (from % 10 == 3) {
        throw std::runtime_error(std::to_string(from));
      }
    });
    FAIL() << "nothing was thrown";
  } catch (const std::runtime_error& error) {
    EXPECT_STREQ(error.what(), "3");
  }
  EXPECT_EQ(done, 100);
}
