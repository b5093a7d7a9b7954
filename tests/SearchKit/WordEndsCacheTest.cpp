#include "SearchKit/WordEndsCache.h"

#include <gtest/gtest.h>

#include <string>
#include <vector>

namespace searchkit {
namespace {

std::vector<size_t> found(WordEndsCache& cache, std::string_view run) {
  const std::span<const uint8_t> ends = cache.find(run);
  return {ends.begin(), ends.end()};
}

TEST(WordEndsCache, knowsWhatWasPutIn) {
  WordEndsCache cache;
  EXPECT_TRUE(cache.find("one").empty());
  for (size_t i = 0; i < 5000; ++i) {
    const std::string run = "run" + std::to_string(i);
    const std::vector<size_t> ends{i % 200 + 1, run.size()};
    cache.put(run, ends);
  }
  for (size_t i = 0; i < 5000; ++i) {
    const std::string run = "run" + std::to_string(i);
    EXPECT_EQ(found(cache, run), (std::vector<size_t>{i % 200 + 1, run.size()}));
  }
  EXPECT_TRUE(cache.find("run5000").empty());
}

TEST(WordEndsCache, leavesLongRunsOut) {
  WordEndsCache cache;
  const std::string longest(WordEndsCache::longestRun, 'a');
  const std::string longer = longest + "a";
  cache.put(longest, std::vector<size_t>{longest.size()});
  cache.put(longer, std::vector<size_t>{longer.size()});
  EXPECT_EQ(found(cache, longest), std::vector<size_t>{longest.size()});
  EXPECT_TRUE(cache.find(longer).empty());
}

TEST(WordEndsCache, beginsAnewWhenItIsFull) {
  WordEndsCache cache;
  std::string last;
  for (size_t i = 0; i < 60000; ++i) {
    last = std::to_string(i) + std::string(200, 'x');
    cache.put(last, std::vector<size_t>{1, last.size()});
    ASSERT_EQ(found(cache, last), (std::vector<size_t>{1, last.size()}));
  }
  EXPECT_TRUE(cache.find("0" + std::string(200, 'x')).empty());
}

}  // namespace
}  // namespace searchkit
