#include "host/Zebrine/ZEBQuery.h"

#include <gtest/gtest.h>

#include <set>
#include <string>
#include <thread>
#include <vector>

#include "host/Zebrine/ZEBConstants.h"

namespace {

using Strings = std::vector<std::string>;

TEST(ZEBQuery, aNewQueryHasItsTextAndNothingElse) {
  const auto query = ZEBQuery::initWithQueryString("print queue");
  EXPECT_EQ(query->queryString(), "print queue");
  EXPECT_TRUE(query->options().isAbsent());
  EXPECT_TRUE(query->resultTypes().empty());
  EXPECT_TRUE(query->scope().empty());
  EXPECT_TRUE(query->preferredLanguages().empty());
  EXPECT_EQ(query->limit(), 0U);
  EXPECT_FALSE(query->cancelled());
}

TEST(ZEBQuery, missingOptionsAreFalse) {
  const auto query = ZEBQuery::initWithQueryString("print");
  EXPECT_FALSE(query->options()[ZEBQueryAnchorSearchOptionKey].boolValue());
  query->setOptions(platform::Value::Dictionary{{ZEBQueryAnchorSearchOptionKey, true}});
  EXPECT_TRUE(query->options()[ZEBQueryAnchorSearchOptionKey].boolValue());
  EXPECT_FALSE(query->options()[ZEBQuerySearchAllBooksOptionKey].boolValue());
}

TEST(ZEBQuery, everyQueryHasAnIdentifierOfItsOwn) {
  const auto first = ZEBQuery::initWithQueryString("a");
  const auto second = ZEBQuery::initWithQueryString("a");
  EXPECT_FALSE(first->queryID().empty());
  EXPECT_NE(second->queryID(), first->queryID());
}

TEST(ZEBQuery, queriesMadeOnManyThreadsHaveDifferentIdentifiers) {
  constexpr size_t threadCount = 4;
  constexpr size_t queriesPerThread = 500;
  std::vector<Strings> made(threadCount);
  std::vector<std::thread> threads;
  threads.reserve(threadCount);
  for (Strings& list : made) {
    threads.emplace_back([&list] {
      for (size_t i = 0; i < queriesPerThread; ++i) {
        list.push_back(ZEBQuery::initWithQueryString("a")->queryID());
      }
    });
  }
  std::set<std::string> different;
  for (size_t i = 0; i < threadCount; ++i) {
    threads[i].join();
    different.insert(made[i].begin(), made[i].end());
  }
  EXPECT_EQ(different.size(), threadCount * queriesPerThread);
}

TEST(ZEBQuery, aCopyHasTheSameContentAndIdentifier) {
  const auto query = ZEBQuery::initWithQueryString("print");
  query->setOptions(platform::Value::Dictionary{{ZEBQuerySearchAllBooksOptionKey, true}});
  query->setResultTypes({ZEBHelpArticleResult});
  query->setScope({"org.example.book"});
  query->setPreferredLanguages({"de", "en"});
  query->setLimit(12);
  const auto copy = query->copy();
  EXPECT_NE(copy, query);
  EXPECT_EQ(copy->queryString(), "print");
  EXPECT_EQ(copy->options(), query->options());
  EXPECT_EQ(copy->resultTypes(), Strings{ZEBHelpArticleResult});
  EXPECT_EQ(copy->scope(), Strings{"org.example.book"});
  EXPECT_EQ(copy->preferredLanguages(), (Strings{"de", "en"}));
  EXPECT_EQ(copy->limit(), 12U);
  EXPECT_EQ(copy->queryID(), query->queryID());
  EXPECT_EQ(copy->copy()->queryID(), query->queryID());
}

TEST(ZEBQuery, changingACopyLeavesTheOriginal) {
  const auto query = ZEBQuery::initWithQueryString("print");
  const auto copy = query->copy();
  copy->setQueryString("scan");
  copy->setScope({"org.example.book"});
  EXPECT_EQ(query->queryString(), "print");
  EXPECT_TRUE(query->scope().empty());
}

TEST(ZEBQuery, aCopyIsCancelledAsItsOriginalWasAndFromThenOnByItself) {
  const auto query = ZEBQuery::initWithQueryString("print");
  const auto early = query->copy();
  query->cancel();
  const auto late = query->copy();
  EXPECT_FALSE(early->isCancelled());
  EXPECT_TRUE(late->isCancelled());
  late->setCancelled(false);
  EXPECT_TRUE(query->isCancelled());
}

TEST(ZEBQuery, cancellationIsSeenByOtherThreads) {
  const auto query = ZEBQuery::initWithQueryString("print");
  std::thread waiter([&] {
    while (!query->cancelled()) {
      std::this_thread::yield();
    }
  });
  query->setCancelled(true);
  waiter.join();
  EXPECT_TRUE(query->isCancelled());
}

TEST(ZEBQuery, describesItselfForLogs) {
  const auto query = ZEBQuery::initWithQueryString("print");
  query->setScope({"org.example.book"});
  query->setResultTypes({"kind"});
  EXPECT_EQ(query->description(),
            "query " + query->queryID() + R"(: "print" in ["org.example.book"] for ["kind"])");
}

}  // namespace
