#include <gtest/gtest.h>

#include <atomic>
#include <map>
#include <string>
#include <thread>
#include <vector>

#include "SearchKit/SearchKit.h"
#include "tests/SearchKit/Indexes.h"

namespace searchkit {
namespace {

using testing::composed;
using testing::found;
using testing::openIndex;
using testing::page;

TEST(SKIndex, isSearchedByManyThreadsAtOnce) {
  std::vector<Document> pages;
  pages.reserve(500);
  for (int i = 0; i < 500; ++i) {
    pages.push_back(page("/" + std::to_string(i), "common word" + std::to_string(i % 37) +
                                                      " 東京都の印刷 ภาษาไทย Größe more words"));
  }
  const SKIndexRef index = openIndex(pages);
  const std::vector<std::string> queries{"common word1*", "\"more words\" -word5", "*ord3* | größe",
                                         composed(index, "印刷"), composed(index, "ไทย")};
  std::vector<std::string> expected;
  for (const std::string& query : queries) {
    expected.push_back(found(openIndex(pages), query));
    EXPECT_NE(expected.back(), "");
  }
  std::atomic<int> differences = 0;
  std::vector<std::thread> threads;
  for (size_t thread = 0; thread < 8; ++thread) {
    threads.emplace_back([&, thread] {
      for (size_t round = 0; round < 20; ++round) {
        const size_t which = (thread + round) % queries.size();
        if (found(index, queries[which]) != expected[which] ||
            SKIndexCopyUniqueTerms(index, "Größe 東京都").size() < 2 ||
            !SKIndexVerifyChecksums(index)) {
          ++differences;
        }
      }
    });
  }
  for (std::thread& thread : threads) {
    thread.join();
  }
  EXPECT_EQ(differences, 0);
}

}  // namespace
}  // namespace searchkit
