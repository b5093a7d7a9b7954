#include "bvmake/OrderedWork.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <atomic>
#include <numeric>
#include <stdexcept>
#include <string>

#include "tests/support/Latch.h"

namespace bvmake {
namespace {

using testing::ElementsAre;
using testing::IsEmpty;

using Work = OrderedWork<size_t>;

uint64_t one(size_t) { return 1; }

TEST(OrderedWork, resultsComeInOrderHoweverLongEachTakes) {
  for (const size_t workers : {size_t{1}, size_t{2}, size_t{3}, size_t{8}}) {
    std::vector<size_t> pieces;
    std::vector<size_t> results;
    Work::run(500, {workers, UINT64_MAX},
              {one,
               [](size_t piece, size_t) {
                 for (size_t i = 0; i < piece * 7919 % 13; ++i) {
                   std::this_thread::yield();
                 }
                 return piece * piece;
               },
               [&](size_t piece, size_t result) {
                 pieces.push_back(piece);
                 results.push_back(result);
               }});
    std::vector<size_t> wanted(500);
    std::iota(wanted.begin(), wanted.end(), size_t{0});
    EXPECT_EQ(pieces, wanted);
    EXPECT_EQ(results[499], 499U * 499U);
  }
}

TEST(OrderedWork, resultThatIsReadyEarlyWaitsForThoseBefore) {
  tests::Counter done;
  std::vector<size_t> results;
  Work::run(2, {2, UINT64_MAX},
            {one,
             [&](size_t piece, size_t) {
               if (piece == 0) {
                 EXPECT_TRUE(done.waitFor(1));
               }
               done.add();
               return piece;
             },
             [&](size_t, size_t result) { results.push_back(result); }});
  EXPECT_THAT(results, ElementsAre(0, 1));
}

TEST(OrderedWork, oneWorkerWorksOnTheCallingThread) {
  const std::thread::id caller = std::this_thread::get_id();
  Work::run(3, {1, UINT64_MAX},
            {one,
             [&](size_t piece, size_t worker) {
               EXPECT_EQ(std::this_thread::get_id(), caller);
               EXPECT_EQ(worker, 0U);
               return piece;
             },
             {}});
}

TEST(OrderedWork, resultsAreTakenOnTheCallingThread) {
  const std::thread::id caller = std::this_thread::get_id();
  size_t count = 0;
  Work::run(20, {4, UINT64_MAX},
            {one, [](size_t piece, size_t) { return piece; },
             [&](size_t, size_t) {
               EXPECT_EQ(std::this_thread::get_id(), caller);
               ++count;
             }});
  EXPECT_EQ(count, 20U);
}

TEST(OrderedWork, noWorkIsDoneTwiceByAWorkerAtATime) {
  std::atomic<int> busy[4]{};
  Work::run(400, {4, UINT64_MAX},
            {one,
             [&](size_t piece, size_t worker) {
               EXPECT_EQ(busy[worker].fetch_add(1), 0);
               std::this_thread::yield();
               busy[worker].fetch_sub(1);
               return piece;
             },
             {}});
}

TEST(OrderedWork, costOfWhatIsWorkedOnStaysWithinTheBound) {
  std::atomic<uint64_t> running{0};
  const auto cost = [](size_t piece) { return uint64_t{piece % 5 + 1}; };
  Work::run(300, {8, 10},
            {cost,
             [&](size_t piece, size_t) {
               EXPECT_LE(running.fetch_add(cost(piece)) + cost(piece), 10U);
               std::this_thread::yield();
               running.fetch_sub(cost(piece));
               return piece;
             },
             {}});
}

TEST(OrderedWork, pieceAboveTheBoundIsWorkedOnAlone) {
  std::atomic<int> running{0};
  size_t count = 0;
  Work::run(60, {4, 10},
            {[](size_t piece) { return piece % 3 == 0 ? uint64_t{1000} : uint64_t{1}; },
             [&](size_t piece, size_t) {
               const int others = running.fetch_add(1);
               if (piece % 3 == 0) {
                 EXPECT_EQ(others, 0);
               }
               std::this_thread::yield();
               running.fetch_sub(1);
               return piece;
             },
             [&](size_t, size_t) { ++count; }});
  EXPECT_EQ(count, 60U);
}

TEST(OrderedWork, failureOfAPieceEndsTheWorkAndIsThrownOn) {
  for (const size_t workers : {size_t{1}, size_t{4}}) {
    std::vector<size_t> results;
    EXPECT_THROW(Work::run(1000, {workers, UINT64_MAX},
                           {one,
                            [](size_t piece, size_t) {
                              if (piece == 10) {
                                throw std::runtime_error("ten");
                              }
                              return piece;
                            },
                            [&](size_t, size_t result) { results.push_back(result); }}),
                 std::runtime_error);
    EXPECT_LE(results.size(), 10U);
  }
}

TEST(OrderedWork, failureToTakeAResultEndsTheWorkAndIsThrownOn) {
  for (const size_t workers : {size_t{1}, size_t{4}}) {
    EXPECT_THROW(Work::run(1000, {workers, 3},
                           {one, [](size_t piece, size_t) { return piece; },
                            [](size_t, size_t) { throw std::runtime_error("no"); }}),
                 std::runtime_error);
  }
}

TEST(OrderedWork, nothingToDoIsDone) {
  std::vector<size_t> results;
  Work::run(0, {4, 1},
            {one, [](size_t piece, size_t) { return piece; },
             [&](size_t, size_t result) { results.push_back(result); }});
  EXPECT_THAT(results, IsEmpty());
}

}  // namespace
}  // namespace bvmake
