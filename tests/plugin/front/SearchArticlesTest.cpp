// Search by meaning and by keyword side by side: who is asked what, in which order, and what the
// host gets of the answers.
#include <gtest/gtest.h>

#include "tests/plugin/front/FrontWorld.h"

using platform::Value;
using testing::Contains;
using testing::ElementsAre;
using testing::IsEmpty;
using testing::SizeIs;
using testing::UnorderedElementsAre;
using tests::anchors;
using tests::FrontWorld;
using tests::page;
using tests::relevancesOf;
using tests::semanticResult;
using tests::titlesOf;

namespace {

using Dictionary = Value::Dictionary;
using Results = std::vector<std::shared_ptr<ZEBResult>>;

/// Two books, each with a page about printing, and semantics that answer nothing unless told to.
class TwoWays : public FrontWorld {
 public:
  explicit TwoWays(bool withSemantics = true)
      : a(addBook("a", {page("/p.html", "A prints", "print queue")},
                  anchors({{"queue", {"/p.html"}}}))),
        b(addBook("b", {page("/p.html", "B prints", "print queue")},
                  anchors({{"queue", {"/p.html"}}}))),
        semantics(withSemantics ? addSemantics() : nullptr) {}

  void answerArticles(Results results, std::set<std::string> searched) const {
    semantics->answers[ZEBHelpArticleResult] = std::move(results);
    semantics->searchedBooks = std::move(searched);
  }

  const std::shared_ptr<ZEBHelpBook> a;
  const std::shared_ptr<ZEBHelpBook> b;
  const std::shared_ptr<tests::ScriptedSemantics> semantics;
};

}  // namespace

TEST(SearchArticles, WithoutSemanticsKeywordsFindEverything) {
  const TwoWays world(false);
  world.search(FrontWorld::query("print", {"a", "b"}));
  EXPECT_THAT(world.owner->deliveries(), ElementsAre("found", "finished"));
  EXPECT_THAT(titlesOf(world.owner->records(0)), UnorderedElementsAre("A prints", "B prints"));
  EXPECT_THAT(relevancesOf(world.owner->records(0)), ElementsAre(0.9999, 0.9999));
}

TEST(SearchArticles, AKeywordResultCarriesExactlyItsFourKeys) {
  const TwoWays world(false);
  world.search(FrontWorld::query("print", {"a"}));
  const auto records = world.owner->records(0);
  ASSERT_THAT(records, SizeIs(1));
  EXPECT_EQ(records[0]->payload(),
            (Dictionary{{ZEBResultURLKey, "file://" + world.folder.path("a/p.html")},
                        {ZEBResultAbstractKey, "About A prints"},
                        {ZEBResultIndexIDKey, world.indices(world.a).front()->indexID()},
                        {ZEBResultBookIDKey, "a"}}));
}

TEST(SearchArticles, NothingFoundAtAllIsNoBatch) {
  const TwoWays world(false);
  world.search(FrontWorld::query("zebra", {"a", "b"}));
  EXPECT_THAT(world.owner->deliveries(), ElementsAre("finished"));
}

TEST(SearchArticles, TheHostGetsThePluginAndItsOwnQuery) {
  const TwoWays world(false);
  const auto query = world.search(FrontWorld::query("print", {"a"}));
  EXPECT_EQ(world.owner->lastPlugin(), world.controller);
  EXPECT_EQ(world.owner->lastQuery(), query);
}

TEST(SearchArticles, SemanticsAreToldAboutTimeOutsFirstAndSearchAllIndexesOfTheBooks) {
  const TwoWays world;
  world.search(FrontWorld::query("print", {"b", "a"}));
  EXPECT_THAT(world.semantics->steps, ElementsAre("not shorter", ZEBHelpArticleResult));
  ASSERT_THAT(world.semantics->calls, SizeIs(1));
  EXPECT_THAT(world.semantics->calls[0].inIndices,
              ElementsAre(world.indices(world.b).front(), world.indices(world.a).front()));
  EXPECT_THAT(world.semantics->calls[0].ignoringItems, IsEmpty());
  EXPECT_TRUE(world.semantics->calls[0].passesBackSearchedBooks);
}

TEST(SearchArticles, KeywordsCoverOnlyTheBooksThatSemanticsDidNotSearch) {
  const TwoWays world;
  world.answerArticles(Results{semanticResult("Meant", 0.8, "a")}, {"a"});
  world.search(FrontWorld::query("print", {"a", "b"}));
  EXPECT_THAT(titlesOf(world.owner->records(0)), ElementsAre("Meant", "B prints"));
  EXPECT_THAT(relevancesOf(world.owner->records(0)), ElementsAre(0.8, testing::DoubleEq(0.7999)));
}

TEST(SearchArticles, WhenSemanticsFoundNothingKeywordsCoverTheSearchedBooksToo) {
  const TwoWays world;
  world.answerArticles({}, {"a", "b"});
  world.search(FrontWorld::query("print", {"a", "b"}));
  EXPECT_THAT(titlesOf(world.owner->records(0)), UnorderedElementsAre("A prints", "B prints"));
}

TEST(SearchArticles, WhenSemanticsSearchedAllBooksTheirAnswerIsDeliveredAsItStands) {
  const TwoWays world;
  // Not in order: nobody sorts what need not be merged.
  world.answerArticles(Results{semanticResult("Low", 0.2, "a"), semanticResult("High", 0.8, "b")},
                       {"a", "b"});
  world.search(FrontWorld::query("print", {"a", "b"}));
  EXPECT_THAT(titlesOf(world.owner->records(0)), ElementsAre("Low", "High"));
  EXPECT_THAT(relevancesOf(world.owner->records(0)), ElementsAre(0.2, 0.8));
}

TEST(SearchArticles, WhenKeywordsFindNothingTheSemanticAnswerIsDeliveredEvenIfEmpty) {
  const TwoWays world;
  world.answerArticles(Results(), {"a"});
  world.search(FrontWorld::query("zebra", {"a", "b"}));
  EXPECT_THAT(world.owner->deliveries(), ElementsAre("found", "finished"));
  EXPECT_THAT(world.owner->records(0), IsEmpty());
}

TEST(SearchArticles, ARecordWithoutABookIsAlwaysSearchedByKeyword) {
  const TwoWays world;
  const auto record = world.indices(world.a).front();
  record->setBookID(std::nullopt);
  world.answerArticles(Results{semanticResult("Meant", 0.8, "b")}, {"a", "b", ""});
  world.search(FrontWorld::query("print", {"a", "b"}));
  // Searched, but a page without a book makes no result.
  EXPECT_THAT(titlesOf(world.owner->records(0)), ElementsAre("Meant"));
  EXPECT_THAT(world.logged(1), Contains(testing::HasSubstr("Problems with creating the result")));
}

// Pages found by list.

TEST(SearchArticles, URLsOfExactMatchesAreToBeIgnoredByBothSearches) {
  const TwoWays world;
  world.a->setExactMatchPath(world.writeList("a/em.plist", {{"print", "queue"}}));
  world.search(FrontWorld::query("print", {"a", "b"}));
  ASSERT_THAT(world.semantics->calls, SizeIs(1));
  EXPECT_THAT(world.semantics->calls[0].ignoringItems,
              ElementsAre("file://" + world.folder.path("a/p.html")));
  EXPECT_THAT(titlesOf(world.owner->records(0)), ElementsAre("A prints", "B prints"));
  EXPECT_THAT(relevancesOf(world.owner->records(0)), ElementsAre(1, 0.9999));
}

TEST(SearchArticles, URLsOfSuggestionAnchorsAreIgnoredTooInTheOrderFound) {
  const TwoWays world;
  world.b->setExactMatchPath(world.writeList("b/em.plist", {{"print", "queue"}}));
  world.a->setSuggestionsPath(
      world.writeList("a/s.plist", {{"print", Dictionary{{"print", "queue"}}}}));
  world.search(FrontWorld::query("print", {"b", "a"}));
  EXPECT_THAT(world.semantics->calls[0].ignoringItems,
              ElementsAre("file://" + world.folder.path("b/p.html"),
                          "file://" + world.folder.path("a/p.html")));
}

TEST(SearchArticles, ExactMatchesAreMergedWithTheSemanticAnswerByRelevance) {
  const TwoWays world;
  FrontWorld::setBookWeights({{"a", 0.5}});
  world.a->setExactMatchPath(world.writeList("a/em.plist", {{"print", "queue"}}));
  world.answerArticles(Results{semanticResult("High", 0.9, "b"), semanticResult("Low", 0.1, "b")},
                       {"a", "b"});
  world.search(FrontWorld::query("print", {"a", "b"}));
  EXPECT_THAT(titlesOf(world.owner->records(0)), ElementsAre("High", "A prints", "Low"));
}

TEST(SearchArticles, ExactMatchesAloneAreDeliveredByRelevance) {
  const TwoWays world;
  FrontWorld::setBookWeights({{"a", 0.5}, {"b", 2}});
  world.a->setExactMatchPath(world.writeList("a/em.plist", {{"zebra", "queue"}}));
  world.b->setExactMatchPath(world.writeList("b/em.plist", {{"zebra", "queue"}}));
  world.search(FrontWorld::query("zebra", {"a", "b"}));
  EXPECT_THAT(titlesOf(world.owner->records(0)), ElementsAre("B prints", "A prints"));
  EXPECT_THAT(relevancesOf(world.owner->records(0)), ElementsAre(2, 0.5));
}

// Actions.

TEST(SearchArticles, WithActionsWantedOnlySemanticsAnswer) {
  const TwoWays world;
  world.a->setExactMatchPath(world.writeList("a/em.plist", {{"print", "queue"}}));
  world.semantics->answers[ZEBHelpActionResult] = Results{semanticResult("Do", 0.3, "a")};
  world.search(FrontWorld::query("print", {"a"}, {ZEBHelpArticleResult, ZEBHelpActionResult}));
  EXPECT_THAT(world.semantics->steps, ElementsAre("not shorter", ZEBHelpActionResult));
  EXPECT_THAT(titlesOf(world.owner->records(0)), ElementsAre("Do"));
  EXPECT_THAT(world.owner->deliveries(), ElementsAre("found", "finished"));
}

TEST(SearchArticles, WithActionsWantedAndNoSemanticsThereIsNothing) {
  const TwoWays world(false);
  world.search(FrontWorld::query("print", {"a"}, {ZEBHelpArticleResult, ZEBHelpActionResult}));
  EXPECT_THAT(world.owner->deliveries(), ElementsAre("finished"));
}

TEST(SearchArticles, ActionsAloneOpenNoBookAndAskNobody) {
  const TwoWays world;
  world.search(FrontWorld::query("print", {"a"}, {ZEBHelpActionResult}));
  EXPECT_THAT(world.semantics->steps, IsEmpty());
  EXPECT_THAT(world.owner->deliveries(), ElementsAre("finished"));
}

// Suggestions.

TEST(SearchArticles, SuggestionsFollowTheArticles) {
  const TwoWays world;
  world.semantics->answers[ZEBHelpSuggestionResult] =
      Results{semanticResult("print page", 0.5, "a", ZEBHelpSuggestionResult)};
  world.search(FrontWorld::query("print", {"a"}, {ZEBHelpSuggestionResult, ZEBHelpArticleResult}));
  EXPECT_THAT(world.semantics->steps,
              ElementsAre("not shorter", ZEBHelpArticleResult, ZEBHelpSuggestionResult));
  EXPECT_THAT(world.owner->deliveries(), ElementsAre("found", "found", "finished"));
  EXPECT_THAT(titlesOf(world.owner->records(1)), ElementsAre("print page"));
  EXPECT_THAT(world.semantics->calls[1].ignoringItems, IsEmpty());
  EXPECT_FALSE(world.semantics->calls[1].passesBackSearchedBooks);
  EXPECT_THAT(world.semantics->calls[1].inIndices, SizeIs(1));
}

TEST(SearchArticles, SuggestionsAloneAreSearchedInNoIndexAtAll) {
  const TwoWays world;
  world.semantics->answers[ZEBHelpSuggestionResult] = Results();
  world.search(FrontWorld::query("print", {"a"}, {ZEBHelpSuggestionResult}));
  EXPECT_THAT(world.semantics->steps, ElementsAre(ZEBHelpSuggestionResult));
  EXPECT_THAT(world.semantics->calls[0].inIndices, IsEmpty());
  // An empty answer is an answer.
  EXPECT_THAT(world.owner->deliveries(), ElementsAre("found", "finished"));
}

TEST(SearchArticles, AnEmptyAnswerForSuggestionsIsAnEmptyBatch) {
  for (const std::string& kind : {ZEBHelpSuggestionResult, ZEBHelpSimilarSuggestionResult}) {
    const TwoWays world;
    world.search(FrontWorld::query("print", {"a"}, {kind}));
    EXPECT_THAT(world.semantics->steps, ElementsAre(kind));
    EXPECT_THAT(world.owner->deliveries(), ElementsAre("found", "finished"));
    EXPECT_THAT(world.owner->records(0), IsEmpty());
  }
}

TEST(SearchArticles, WithoutSearchByMeaningThereIsNoBatchOfSuggestions) {
  for (const std::string& kind : {ZEBHelpSuggestionResult, ZEBHelpSimilarSuggestionResult}) {
    const FrontWorld world;
    world.addBook("a", {page("/p.html", "Printing", "print queue")});
    world.search(FrontWorld::query("print", {"a"}, {kind}));
    EXPECT_THAT(world.owner->deliveries(), ElementsAre("finished"));
  }
}

TEST(SearchArticles, WhoWantsSuggestionsAndSimilarOnesGetsOnlySuggestions) {
  const TwoWays world;
  world.semantics->answers[ZEBHelpSuggestionResult] = Results();
  world.semantics->answers[ZEBHelpSimilarSuggestionResult] = Results();
  world.search(
      FrontWorld::query("print", {"a"}, {ZEBHelpSimilarSuggestionResult, ZEBHelpSuggestionResult}));
  EXPECT_THAT(world.semantics->steps, ElementsAre(ZEBHelpSuggestionResult));
  EXPECT_THAT(world.owner->deliveries(), ElementsAre("found", "finished"));
}

TEST(SearchArticles, SimilarSuggestionsDoNotRepeatTheTitlesOfArticlesAndExactMatches) {
  const TwoWays world;
  world.a->setExactMatchPath(world.writeList("a/em.plist", {{"print", "queue"}}));
  world.semantics->answers[ZEBHelpSimilarSuggestionResult] = Results();
  world.search(FrontWorld::query("print", {"a", "b"},
                                 {ZEBHelpArticleResult, ZEBHelpSimilarSuggestionResult}));
  ASSERT_THAT(world.semantics->calls, SizeIs(2));
  EXPECT_EQ(world.semantics->calls[1].requestedResultType, ZEBHelpSimilarSuggestionResult);
  EXPECT_THAT(world.semantics->calls[1].ignoringItems, ElementsAre("A prints", "B prints"));
  EXPECT_THAT(world.semantics->calls[1].inIndices, SizeIs(2));
  EXPECT_FALSE(world.semantics->calls[1].passesBackSearchedBooks);
}

TEST(SearchArticles, TitlesOfPagesFoundBySuggestionAnchorMayBeSuggested) {
  const TwoWays world;
  world.a->setSuggestionsPath(
      world.writeList("a/s.plist", {{"zebra", Dictionary{{"zebra", "queue"}}}}));
  world.search(
      FrontWorld::query("zebra", {"a"}, {ZEBHelpArticleResult, ZEBHelpSimilarSuggestionResult}));
  EXPECT_THAT(titlesOf(world.owner->records(0)), ElementsAre("A prints"));
  EXPECT_THAT(world.semantics->calls[1].ignoringItems, IsEmpty());
}

TEST(SearchArticles, ArticlesWithoutATitleAddNoneToTheList) {
  const TwoWays world;
  auto untitled = ZEBResult::initWithTitle(std::nullopt, ZEBHelpArticleResult);
  untitled->setRelevance(0.5);
  world.answerArticles(Results{untitled, semanticResult("Titled", 0.4, "a")}, {"a"});
  world.search(
      FrontWorld::query("print", {"a"}, {ZEBHelpArticleResult, ZEBHelpSimilarSuggestionResult}));
  EXPECT_THAT(world.semantics->calls[1].ignoringItems, ElementsAre("Titled"));
}
