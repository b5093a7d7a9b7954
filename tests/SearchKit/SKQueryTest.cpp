// A query that is put to several indexes.
#include <gtest/gtest.h>

#include <string>
#include <thread>
#include <vector>

#include "SearchKit/SearchKit.h"
#include "tests/SearchKit/Indexes.h"

namespace searchkit {
namespace {

using testing::openIndex;
using testing::page;

size_t hitCount(const SKIndexRef& index, const SKQueryRef& query) {
  const SKSearchRef search = SKSearchCreateWithQuery(index, query);
  SKDocumentID ids[10];
  size_t count = 0;
  SKSearchFindMatches(*search, 10, ids, nullptr, 1.0, &count);
  return count;
}

TEST(SKQuery, isReadForEachIndexByItsMinimumLength) {
  const std::vector<Document> pages{page("/a", "to print"), page("/b", "print"), page("/c", "to")};
  const SKQueryRef query = SKQueryCreate("to print", kSKSearchOptionDefault);
  // Where "to" was left out it cannot be required.
  EXPECT_EQ(hitCount(openIndex(pages), query), 1U);
  EXPECT_EQ(hitCount(openIndex(pages, 3), query), 2U);
  EXPECT_EQ(hitCount(openIndex(pages), query), 1U);
  EXPECT_EQ(hitCount(openIndex(pages, 1000000), query), 0U);
}

TEST(SKQuery, keepsItsOptions) {
  const SKIndexRef index = openIndex({page("/a", "one"), page("/b", "two"), page("/c", "one two")});
  EXPECT_EQ(hitCount(index, SKQueryCreate("one two", kSKSearchOptionDefault)), 1U);
  EXPECT_EQ(hitCount(index, SKQueryCreate("one two", kSKSearchOptionSpaceMeansOR)), 3U);
}

TEST(SKQuery, isNeededForASearchAsTheIndexIs) {
  EXPECT_EQ(SKSearchCreateWithQuery(nullptr, SKQueryCreate("a", 0)), nullptr);
  EXPECT_EQ(SKSearchCreateWithQuery(openIndex({}), nullptr), nullptr);
}

TEST(SKQuery, andItsIndexLiveAsLongAsTheSearch) {
  SKSearchRef search;
  {
    const SKIndexRef index = openIndex({page("/a", "one two"), page("/b", "two")});
    search = SKSearchCreateWithQuery(index, SKQueryCreate("two* | one", 0));
  }
  SKDocumentID ids[10];
  size_t count = 0;
  SKSearchFindMatches(*search, 10, ids, nullptr, 1.0, &count);
  EXPECT_EQ(count, 2U);
}

TEST(SKQuery, mayBeUsedByThreadsSideBySide) {
  const std::vector<Document> pages{page("/a", "to print"), page("/b", "print")};
  std::vector<SKIndexRef> indexes;
  for (size_t length = 1; length < 8; ++length) {
    indexes.push_back(openIndex(pages, length));
  }
  const SKQueryRef query = SKQueryCreate("to print*", kSKSearchOptionDefault);
  std::vector<std::thread> threads;
  for (int i = 0; i < 4; ++i) {
    threads.emplace_back([&] {
      for (const SKIndexRef& index : indexes) {
        hitCount(index, query);
      }
      EXPECT_EQ(hitCount(indexes[0], query), 1U);
    });
  }
  for (std::thread& thread : threads) {
    thread.join();
  }
}

TEST(SKSearchCreate, readsAnotherQueryThanTheLastOne) {
  const SKIndexRef index = openIndex({page("/a", "one"), page("/b", "two"), page("/c", "one two")});
  EXPECT_EQ(testing::found(index, "one two"), "/c ");
  EXPECT_EQ(testing::found(index, "one two", kSKSearchOptionSpaceMeansOR), "/a /b /c ");
  EXPECT_EQ(testing::found(index, "one"), "/a /c ");
  EXPECT_EQ(testing::found(index, "one two"), "/c ");
}

TEST(SKSearchFindMatches, goesOnBesideOtherSearchesOfTheThread) {
  std::vector<Document> pages;
  for (int i = 0; i < 30; ++i) {
    pages.push_back(page("/" + std::to_string(100 + i), i % 2 == 0 ? "even" : "odd"));
  }
  const SKIndexRef index = openIndex(pages);
  const SKSearchRef even = SKSearchCreate(index, "even*", 0);
  const SKSearchRef odd = SKSearchCreate(index, "odd*", 0);
  for (SKDocumentID i = 0; i < 15; ++i) {
    SKDocumentID id = 0;
    EXPECT_EQ(SKSearchFindMatches(*even, 1, &id, nullptr, 1.0, nullptr), i < 14);
    EXPECT_EQ(id, 2 * i);
    EXPECT_EQ(SKSearchFindMatches(*odd, 1, &id, nullptr, 1.0, nullptr), i < 14);
    EXPECT_EQ(id, 2 * i + 1);
  }
}

}  // namespace
}  // namespace searchkit
