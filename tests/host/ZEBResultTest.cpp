#include "host/Zebrine/ZEBResult.h"

#include <gtest/gtest.h>

#include "host/Zebrine/ZEBConstants.h"
#include "platform/Exception.h"

namespace {

using platform::Value;
using Dictionary = platform::Value::Dictionary;
using Result = std::shared_ptr<ZEBResult>;

Result article(const std::string& title, const Value& url, const Value& book = "book") {
  auto result = ZEBResult::resultWithTitle(title, ZEBHelpArticleResult);
  Dictionary payload;
  if (!url.isAbsent()) {
    payload.emplace(ZEBResultURLKey, url);
  }
  if (!book.isAbsent()) {
    payload.emplace(ZEBResultBookIDKey, book);
  }
  result->setPayload(std::move(payload));
  return result;
}

// Counts how often it is asked.
class CountingSource : public ZEBResultSource {
 public:
  Content contentOfResult(uint32_t number) const override {
    ++asked;
    const std::string text = std::to_string(number);
    return {"Page " + text, {{ZEBResultURLKey, "file:///" + text}, {ZEBResultBookIDKey, "book"}}};
  }

  mutable int asked = 0;
};

void expectEqual(const Result& a, const Result& b) {
  EXPECT_TRUE(*a == *b);
  EXPECT_TRUE(*b == *a);
  EXPECT_EQ(a->hash(), b->hash());
}

void expectDifferent(const Result& a, const Result& b) {
  EXPECT_FALSE(*a == *b);
  EXPECT_FALSE(*b == *a);
}

TEST(ZEBResult, aNewRecordHasTitleAndKindOnly) {
  for (const Result& result : {ZEBResult::resultWithTitle("Printing", ZEBHelpArticleResult),
                               ZEBResult::initWithTitle("Printing", ZEBHelpArticleResult)}) {
    EXPECT_EQ(result->title(), "Printing");
    EXPECT_EQ(result->type(), ZEBHelpArticleResult);
    EXPECT_TRUE(result->relevance().isAbsent());
    EXPECT_TRUE(result->payload().empty());
    EXPECT_EQ(result->bookID(), std::nullopt);
  }
}

TEST(ZEBResult, anAbsentTitleStaysAbsent) {
  EXPECT_EQ(ZEBResult::resultWithTitle(std::nullopt, ZEBHelpArticleResult)->title(), std::nullopt);
  EXPECT_EQ(ZEBResult::resultWithTitle("", ZEBHelpArticleResult)->title(), "");
}

TEST(ZEBResult, relevanceKeepsTheKindOfNumberThatItIsGiven) {
  const auto result = ZEBResult::resultWithTitle("Printing", ZEBHelpArticleResult);
  result->setRelevance(1);
  EXPECT_EQ(result->relevance().kind(), Value::Kind::integer);
  result->setRelevance(0.5);
  EXPECT_EQ(result->relevance().kind(), Value::Kind::real);
  EXPECT_EQ(result->relevance().doubleValue(), 0.5);
}

TEST(ZEBResult, theBookIsTheOneOfThePayload) {
  EXPECT_EQ(article("Printing", "file:///a", "org.example.book")->bookID(), "org.example.book");
  EXPECT_EQ(article("Printing", "file:///a", {})->bookID(), std::nullopt);
  EXPECT_EQ(article("Printing", "file:///a", 3)->bookID(), std::nullopt);
}

TEST(ZEBResult, payloadEntriesAreFoundByKey) {
  const auto result = article("Printing", "file:///a");
  EXPECT_EQ(result->payloadValueForKey(ZEBResultURLKey), Value("file:///a"));
  EXPECT_TRUE(result->payloadValueForKey(ZEBResultAbstractKey).isAbsent());
}

TEST(ZEBResult, aMutablePayloadTakesFurtherKeys) {
  const auto result = ZEBResult::resultWithTitle("Printing", ZEBHelpArticleResult);
  result->setMutablePayload({{ZEBResultURLKey, "file:///a"}});
  ASSERT_TRUE(result->isPayloadMutable());
  result->setPayloadValue(true, ZEBResultIsExactMatchKey);
  EXPECT_EQ(result->payload(),
            (Dictionary{{ZEBResultURLKey, "file:///a"}, {ZEBResultIsExactMatchKey, true}}));
}

TEST(ZEBResult, anImmutablePayloadRefusesFurtherKeys) {
  const auto result = article("Printing", "file:///a");
  EXPECT_FALSE(result->isPayloadMutable());
  try {
    result->setPayloadValue(true, ZEBResultIsExactMatchKey);
    FAIL() << "no exception";
  } catch (const platform::Exception& exception) {
    EXPECT_EQ(exception.name(), platform::invalidArgumentException);
  }
  EXPECT_EQ(result->payload().size(), 2U);
}

TEST(ZEBResult, anAbsentValueIsNoEntry) {
  const auto result = ZEBResult::resultWithTitle("Printing", ZEBHelpArticleResult);
  result->setMutablePayload({});
  EXPECT_THROW(result->setPayloadValue({}, ZEBResultAbstractKey), platform::Exception);
  EXPECT_TRUE(result->payload().empty());
}

TEST(ZEBResult, replacingAPayloadReplacesItsKind) {
  const auto result = ZEBResult::resultWithTitle("Printing", ZEBHelpArticleResult);
  result->setMutablePayload({});
  result->setPayload({});
  EXPECT_FALSE(result->isPayloadMutable());
}

TEST(ZEBResult, recordsOfOneKindBookAndURLAreEqualWhateverElseTheyHold) {
  const auto a = article("Printing", "file:///a");
  const auto b = article("How to print", "file:///a");
  a->setRelevance(0.5);
  b->setRelevance(1);
  expectEqual(a, b);
}

TEST(ZEBResult, anotherKindBookOrURLMakesAnotherRecord) {
  const auto a = article("Printing", "file:///a");
  expectDifferent(a, article("Printing", "file:///b"));
  expectDifferent(a, article("Printing", "file:///a", "other book"));
  expectDifferent(a, article("Printing", "file:///a", {}));
  const auto action = ZEBResult::resultWithTitle("Printing", ZEBHelpActionResult);
  action->setPayload(a->payload());
  expectDifferent(a, action);
}

TEST(ZEBResult, aURLObjectAndItsStringAreTheSameURL) {
  expectEqual(article("Printing", "file:///a"),
              article("Printing", *platform::URL::URLWithString("file:///a")));
}

TEST(ZEBResult, withoutAURLTheTitleDecides) {
  const auto print = ZEBResult::resultWithTitle("print", ZEBHelpSuggestionResult);
  expectEqual(print, ZEBResult::resultWithTitle("print", ZEBHelpSuggestionResult));
  expectDifferent(print, ZEBResult::resultWithTitle("scan", ZEBHelpSuggestionResult));
  expectDifferent(print, ZEBResult::resultWithTitle(std::nullopt, ZEBHelpSuggestionResult));
  expectDifferent(print, ZEBResult::resultWithTitle("print", ZEBHelpSimilarSuggestionResult));
  expectDifferent(article("print", {}), article("print", {}, "other book"));
}

TEST(ZEBResult, aRecordWithAURLNeverEqualsOneWithout) {
  expectDifferent(article("Printing", "file:///a"), article("Printing", {}));
}

TEST(ZEBResult, aSetKeepsTheFirstOfEqualRecords) {
  const auto first = article("Printing", "file:///a");
  first->setRelevance(0.9);
  const auto second = article("Printing", "file:///a");
  ZEBResultSet set;
  EXPECT_TRUE(set.insert(first).second);
  EXPECT_FALSE(set.insert(second).second);
  EXPECT_TRUE(set.insert(article("Printing", "file:///b")).second);
  EXPECT_EQ(set.size(), 2U);
  EXPECT_EQ(*set.find(second), first);
}

TEST(ZEBResult, changingTheRelevanceLeavesARecordFindableInItsSet) {
  const auto result = article("Printing", "file:///a");
  const ZEBResultSet set = {result};
  result->setRelevance(0.1);
  EXPECT_EQ(set.count(article("Other", "file:///a")), 1U);
}

TEST(ZEBResult, nullEqualsNullOnly) {
  const ZEBResultSet set = {nullptr, article("Printing", "file:///a"), nullptr};
  EXPECT_EQ(set.size(), 2U);
  EXPECT_FALSE(ZEBResultEqual()(nullptr, article("Printing", "file:///a")));
}

}  // namespace

TEST(ZEBResult, OfASourceIsPutTogetherWhenSomebodyLooks) {
  const auto source = std::make_shared<CountingSource>();
  const ZEBResult::Sourced pages[] = {{7, 0.5}, {9, 0.25}};
  std::vector<Result> results;
  ZEBResult::appendResultsWithSource(source, pages, ZEBHelpArticleResult, results);
  ASSERT_EQ(results.size(), 2U);
  EXPECT_EQ(results[1]->relevance().doubleValue(), 0.25);
  EXPECT_EQ(results[1]->type(), ZEBHelpArticleResult);
  results[0]->setRelevance(2);
  EXPECT_EQ(source->asked, 0);
  EXPECT_EQ(results[1]->title(), "Page 9");
  EXPECT_EQ(results[1]->payloadValueForKey(ZEBResultURLKey).stringValue(), "file:///9");
  EXPECT_FALSE(results[1]->isPayloadMutable());
  EXPECT_EQ(results[1]->bookID(), "book");
  EXPECT_EQ(source->asked, 1);
  expectEqual(results[0], article("Other title", "file:///7"));
  EXPECT_EQ(source->asked, 2);
}

TEST(ZEBResult, OfASourceKeepsItAndMayBeGivenAnotherPayload) {
  auto source = std::make_shared<CountingSource>();
  const std::weak_ptr<CountingSource> watch = source;
  std::vector<Result> results;
  const ZEBResult::Sourced pages[] = {{1, 1}, {2, 1}};
  ZEBResult::appendResultsWithSource(source, pages, ZEBHelpArticleResult, results);
  source.reset();
  const Result kept = results[0];
  results.clear();
  EXPECT_FALSE(watch.expired());
  kept->setMutablePayload({{ZEBResultURLKey, "file:///other"}});
  EXPECT_EQ(kept->title(), "Page 1");
  EXPECT_EQ(kept->payload(), (Dictionary{{ZEBResultURLKey, "file:///other"}}));
}

TEST(ZEBResult, NoneComeOfASourceForNothing) {
  std::vector<Result> results;
  ZEBResult::appendResultsWithSource(std::make_shared<CountingSource>(), {}, ZEBHelpArticleResult,
                                     results);
  EXPECT_TRUE(results.empty());
}
