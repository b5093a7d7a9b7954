#include "host/Luxwell/LUXHit.h"

#include <gtest/gtest.h>

#include "host/Luxwell/LUXCompletion.h"
#include "host/Luxwell/LUXScoring.h"
#include "tests/Luxwell/LUXQueryWorld.h"

TEST(LUXHit, KnowsWhatItIsGiven) {
  const auto hit = LUXHit::hitWithTitle("print queue", 0.5F, "queue.html", "org.zeb.manual");
  EXPECT_EQ(hit->title(), "print queue");
  EXPECT_EQ(hit->score(), 0.5F);
  EXPECT_EQ(hit->path(), "queue.html");
  EXPECT_EQ(hit->book(), "org.zeb.manual");
}

TEST(LUXHit, AbsentIsNotEmpty) {
  const auto phrase = LUXHit::hitWithTitle("print queue", 0.5F);
  EXPECT_EQ(phrase->path(), std::nullopt);
  EXPECT_EQ(phrase->book(), "");
  const auto page = LUXHit::hitWithTitle(std::nullopt, 0.5F, "");
  EXPECT_EQ(page->title(), std::nullopt);
  EXPECT_EQ(page->path(), "");
}

TEST(LUXHit, TheScoreCanBeSet) {
  const auto hit = LUXHit::hitWithTitle("print queue", 0.5F);
  hit->setScore(1);
  EXPECT_EQ(hit->score(), 1);
}

TEST(LUXHit, PagesKeepTheirOrderAndOutliveEachOther) {
  const tests::QueryWorld world(tests::officePages());
  const std::vector<LUXScoredPage> pages{{2, 0.75F}, {0, 0.5F}};
  auto hits = LUXHit::hitsForPages(*world.view(), pages);
  ASSERT_EQ(hits.size(), 2U);
  EXPECT_EQ(hits[0]->score(), 0.75F);
  EXPECT_EQ(hits[0]->path(), world.view()->page(2).key);
  const auto second = hits[1];
  hits.clear();
  EXPECT_EQ(second->path(), world.view()->page(0).key);
  EXPECT_EQ(second->book(), world.view()->bookID(world.view()->page(0).book));
}

TEST(LUXHit, PhrasesHaveATitleAlone) {
  const tests::QueryWorld world(
      {{"a", "Print queue", {}}, {"b", "Print queue", {}}, {"c", "Print queue", {}}});
  ASSERT_GT(world.view()->phraseCount(), 0U);
  const std::vector<LUXScoredPhrase> phrases{{0, 0.25F}};
  const auto hits = LUXHit::hitsForPhrases(*world.view(), phrases);
  ASSERT_EQ(hits.size(), 1U);
  EXPECT_EQ(hits[0]->title(), world.view()->phraseText(0));
  EXPECT_EQ(hits[0]->path(), std::nullopt);
  EXPECT_EQ(hits[0]->book(), "");
  EXPECT_EQ(hits[0]->score(), 0.25F);
}

TEST(LUXHit, NoPagesAreNoHits) {
  const tests::QueryWorld world(tests::officePages());
  EXPECT_TRUE(LUXHit::hitsForPages(*world.view(), {}).empty());
  EXPECT_TRUE(LUXHit::hitsForPhrases(*world.view(), {}).empty());
}
