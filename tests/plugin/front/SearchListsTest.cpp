// The lists that books carry: suggestions while the user types, exact matches, suggestion anchors.
#include <gtest/gtest.h>

#include "tests/plugin/front/FrontWorld.h"

using platform::Value;
using testing::ElementsAre;
using testing::IsEmpty;
using testing::SizeIs;
using tests::anchors;
using tests::FrontWorld;
using tests::page;
using tests::relevancesOf;
using tests::titlesOf;

namespace {

using Dictionary = Value::Dictionary;
using Strings = std::vector<std::string>;

const Strings suggestionsOnly{ZEBHelpSuggestionResult};

/// A book whose page "wifi" carries the anchor "network", beside pages about other things.
class ListWorld : public FrontWorld {
 public:
  ListWorld() : book(addNetworkBook("book")) {}

  std::shared_ptr<ZEBHelpBook> addNetworkBook(const std::string& bookID) const {
    return addBook(bookID,
                   {page("/wifi.html", "Wi-Fi in " + bookID, "wifi wireless network"),
                    page("/other.html", "Other in " + bookID, "wifi cable")},
                   anchors({{"network", {"/wifi.html"}}, {"both", {"/wifi.html", "/other.html"}}}));
  }

  void setExactMatches(const std::shared_ptr<ZEBHelpBook>& of, Dictionary list) const {
    of->setExactMatchPath(writeList(of->bookID() + "/exactmatch.plist", std::move(list)));
  }
  void setSuggestions(const std::shared_ptr<ZEBHelpBook>& of, Dictionary list) const {
    of->setSuggestionsPath(writeList(of->bookID() + "/suggestions.plist", std::move(list)));
  }

  const std::shared_ptr<ZEBHelpBook> book;
};

Dictionary texts(std::initializer_list<const char*> names) {
  Dictionary inner;
  for (const char* name : names) {
    inner[name] = "";
  }
  return inner;
}

bool isExactMatch(const std::shared_ptr<ZEBResult>& result) {
  return result->payloadValueForKey(ZEBResultIsExactMatchKey).boolValue();
}

}  // namespace

// Suggestion lists.

TEST(SuggestionList, EveryKeyThatBeginsWithTheLowerCasedQueryGivesItsTexts) {
  const ListWorld world;
  world.setSuggestions(world.book, {{"print", texts({"Print a page", "Print settings"})},
                                    {"printer", texts({"Add a printer"})},
                                    {"pri", texts({"Privacy"})},
                                    {"sprint", texts({"Sprint"})}});
  world.search(FrontWorld::query("PRINT", {}, suggestionsOnly));
  EXPECT_THAT(world.owner->deliveries(), ElementsAre("found texts", "finished"));
  EXPECT_THAT(world.owner->texts(0),
              ElementsAre("Add a printer", "Print a page", "Print settings"));
}

TEST(SuggestionList, TextsAreSortedByTheUsersLanguageWithoutRegardToCase) {
  const ListWorld world;
  world.setSuggestions(
      world.book, {{"z", texts({"zebra", "Äpfel", "applet", "Zoo", "Banana", "banana split"})}});
  world.search(FrontWorld::query("z", {}, suggestionsOnly));
  EXPECT_THAT(world.owner->texts(0),
              ElementsAre("Äpfel", "applet", "Banana", "banana split", "zebra", "Zoo"));
}

TEST(SuggestionList, AnotherLanguageOfTheUserMeansAnotherOrder) {
  const ListWorld world;
  world.setSuggestions(world.book, {{"a", texts({"Zebra", "Äpple", "Apelsin"})}});
  platform::Environment swedish = *platform::Environment::current();
  swedish.preferredLanguages = {"sv", "en"};
  const platform::EnvironmentOverride environment(swedish);
  world.search(FrontWorld::query("a", {}, suggestionsOnly));
  EXPECT_THAT(world.owner->texts(0), ElementsAre("Apelsin", "Zebra", "Äpple"));
}

TEST(SuggestionList, TextsThatSeveralKeysGiveAreKeptAsOftenAsTheyAreGiven) {
  const ListWorld world;
  world.setSuggestions(world.book, {{"print", texts({"Print queue", "Add"})},
                                    {"printer", texts({"Print queue"})},
                                    {"printing", texts({"Print queue"})}});
  world.search(FrontWorld::query("print", {}, suggestionsOnly));
  EXPECT_THAT(world.owner->texts(0),
              ElementsAre("Add", "Print queue", "Print queue", "Print queue"));
}

TEST(SuggestionList, EachBookGivesABatchOfItsOwn) {
  const ListWorld world;
  world.setSuggestions(world.book, {{"print", texts({"b"})}});
  world.setSuggestions(world.addNetworkBook("a"), {{"print", texts({"a"})}});
  world.setSuggestions(world.addNetworkBook("none"), {{"scan", texts({"c"})}});
  world.search(FrontWorld::query("print", {"book", "none", "a"}, suggestionsOnly));
  EXPECT_THAT(world.owner->deliveries(), ElementsAre("found texts", "found texts", "finished"));
  EXPECT_THAT(world.owner->texts(0), ElementsAre("b"));
  EXPECT_THAT(world.owner->texts(1), ElementsAre("a"));
}

TEST(SuggestionList, WithoutATextThereIsNoBatch) {
  const ListWorld world;
  world.setSuggestions(world.book, {{"print", Dictionary{}}, {"prince", "no dictionary"}});
  world.search(FrontWorld::query("pri", {}, suggestionsOnly));
  EXPECT_THAT(world.owner->deliveries(), ElementsAre("finished"));
}

TEST(SuggestionList, BlanksOfTheQueryCount) {
  const ListWorld world;
  world.setSuggestions(world.book,
                       {{"print queue", texts({"Queue"})}, {"printer", texts({"Printer"})}});
  world.search(FrontWorld::query("print q", {}, suggestionsOnly));
  EXPECT_THAT(world.owner->texts(0), ElementsAre("Queue"));
}

TEST(SuggestionList, IsLeftAloneWhenSuggestionsAreNotWanted) {
  const ListWorld world;
  world.setSuggestions(world.book, {{"wifi", texts({"Wi-Fi"})}});
  world.search(FrontWorld::query("wifi"));
  EXPECT_THAT(world.owner->deliveries(), ElementsAre("found", "finished"));
}

TEST(SuggestionList, IsReadAnewForEachSearch) {
  const ListWorld world;
  world.setSuggestions(world.book, {{"wifi", texts({"Old"})}});
  world.search(FrontWorld::query("wifi", {}, suggestionsOnly));
  world.setSuggestions(world.book, {{"wifi", texts({"New"})}});
  world.search(FrontWorld::query("wifi", {}, suggestionsOnly));
  EXPECT_THAT(world.owner->texts(0), ElementsAre("Old"));
  EXPECT_THAT(world.owner->texts(1), ElementsAre("New"));
}

TEST(SuggestionList, AFileThatIsMissingOrNoListGivesNothing) {
  const ListWorld world;
  world.book->setSuggestionsPath(world.folder.path("nowhere.plist"));
  world.search(FrontWorld::query("wifi", {}, suggestionsOnly));
  world.book->setSuggestionsPath(world.folder.write("broken.plist", "bplist00 but not really"));
  world.search(FrontWorld::query("wifi", {}, suggestionsOnly));
  EXPECT_THAT(world.owner->deliveries(), ElementsAre("finished", "finished"));
}

// Exact matches.

TEST(ExactMatch, WiFiWithABlankAndInOneWordAreTheSameQuery) {
  for (const std::string text : {"Wi Fi", "wifi", " WI\tFI\n"}) {
    const ListWorld world;
    world.setExactMatches(world.book, {{"wifi", "network"}});
    world.search(FrontWorld::query(text, {"book"}));
    ASSERT_THAT(world.owner->batches(), SizeIs(1)) << text;
    const auto records = world.owner->records(0);
    ASSERT_THAT(records, testing::Not(IsEmpty())) << text;
    EXPECT_EQ(records[0]->title(), "Wi-Fi in book") << text;
    EXPECT_TRUE(isExactMatch(records[0])) << text;
    EXPECT_EQ(records[0]->relevance(), Value(1)) << text;
  }
}

TEST(ExactMatch, ComesWithTheArticlesInOneBatchAndIsNotFoundAgain) {
  const ListWorld world;
  world.setExactMatches(world.book, {{"wifi", "network"}});
  world.search(FrontWorld::query("wifi", {"book"}));
  EXPECT_THAT(world.owner->deliveries(), ElementsAre("found", "finished"));
  const auto records = world.owner->records(0);
  EXPECT_THAT(titlesOf(records), ElementsAre("Wi-Fi in book", "Other in book"));
  EXPECT_THAT(relevancesOf(records), ElementsAre(1.0, 1.0 - 0.0001));
  EXPECT_TRUE(isExactMatch(records[0]));
  EXPECT_TRUE(records[1]->payloadValueForKey(ZEBResultIsExactMatchKey).isAbsent());
}

TEST(ExactMatch, IsWeightedByItsBookUnlessThatIsThePrimaryOne) {
  const ListWorld world;
  const auto other = world.addNetworkBook("other");
  world.setExactMatches(world.book, {{"wifi", "network"}});
  world.setExactMatches(other, {{"wifi", "network"}});
  FrontWorld::setBookWeights({{"book", 0.5}, {"other", 2}});
  world.search(FrontWorld::query("wifi", {"book"}, {ZEBHelpArticleResult},
                                 {{ZEBQuerySearchAllBooksOptionKey, true}}));
  std::map<std::string, Value> relevances;
  for (const auto& record : world.owner->records(0)) {
    if (isExactMatch(record)) {
      relevances[*record->bookID()] = record->relevance();
    }
  }
  EXPECT_EQ(relevances["book"], Value(1));
  EXPECT_EQ(relevances["other"], Value(2.0));
}

TEST(ExactMatch, WithoutAWeightIsStillANewNumber) {
  const ListWorld world;
  world.setExactMatches(world.book, {{"wifi", "network"}});
  world.search(FrontWorld::query("wifi"));
  const auto records = world.owner->records(0);
  ASSERT_THAT(records, SizeIs(2));
  EXPECT_EQ(records[0]->relevance(), Value(1.0));
}

TEST(ExactMatch, AnAnchorOnTwoPagesGivesBoth) {
  const ListWorld world;
  world.setExactMatches(world.book, {{"wifi", "both"}});
  world.search(FrontWorld::query("wifi", {"book"}));
  const auto records = world.owner->records(0);
  EXPECT_THAT(titlesOf(records), ElementsAre("Wi-Fi in book", "Other in book"));
  EXPECT_TRUE(isExactMatch(records[0]));
  EXPECT_TRUE(isExactMatch(records[1]));
}

TEST(ExactMatch, IsDeliveredAloneWhenNothingElseIsFound) {
  const ListWorld world;
  world.setExactMatches(world.book, {{"nothingelse", "network"}});
  world.search(FrontWorld::query("nothing else", {"book"}));
  EXPECT_THAT(world.owner->deliveries(), ElementsAre("found", "finished"));
  EXPECT_THAT(titlesOf(world.owner->records(0)), ElementsAre("Wi-Fi in book"));
}

TEST(ExactMatch, AMissingKeyAnUnknownAnchorOrAnotherKindOfValueGivesNothing) {
  for (const Dictionary& list : {Dictionary{{"other", "network"}}, Dictionary{{"wifi", "nowhere"}},
                                 Dictionary{{"wifi", 7}}}) {
    const ListWorld world;
    world.setExactMatches(world.book, list);
    world.search(FrontWorld::query("wifi", {"book"}));
    for (const auto& record : world.owner->records(0)) {
      EXPECT_FALSE(isExactMatch(record));
    }
    EXPECT_THAT(world.owner->records(0), SizeIs(2));
  }
}

TEST(ExactMatch, OfABookWithoutAnIndexIsNotLookedUp) {
  const ListWorld world;
  const auto empty = world.addBookWithoutIndex("empty");
  world.setExactMatches(empty, {{"wifi", "network"}});
  world.setSuggestions(empty, {{"wifi", Dictionary{{"wifi", "network"}}}});
  world.search(FrontWorld::query("wifi", {"empty"}));
  EXPECT_THAT(world.owner->deliveries(), ElementsAre("finished"));
}

TEST(ExactMatch, IsNotLookedUpForActionsSuggestionsOrAnchors) {
  const std::vector<std::shared_ptr<ZEBQuery>> queries = {
      FrontWorld::query("wifi", {"book"}, {ZEBHelpArticleResult, ZEBHelpActionResult}),
      FrontWorld::query("wifi", {"book"}, {ZEBHelpArticleResult, ZEBHelpSuggestionResult}),
      FrontWorld::query("wifi", {"book"}, {ZEBHelpArticleResult},
                        {{ZEBQueryAnchorSearchOptionKey, true}}),
      FrontWorld::query("wifi", {"book"}, {ZEBHelpSimilarSuggestionResult}),
  };
  for (const auto& query : queries) {
    const ListWorld world;
    world.setExactMatches(world.book, {{"wifi", "network"}});
    world.search(query);
    for (size_t i = 0; i < world.owner->batches().size(); ++i) {
      for (const auto& record : world.owner->records(i)) {
        EXPECT_FALSE(isExactMatch(record)) << query->description();
      }
    }
  }
}

// Suggestion anchors.

TEST(SuggestionAnchor, AQueryThatIsASuggestionAsTypedGivesItsPageUnweightedAndUnmarked) {
  const ListWorld world;
  world.setSuggestions(world.book, {{"wifi", Dictionary{{"wifi", "network"}}}});
  FrontWorld::setBookWeights({{"book", 3}});
  world.search(FrontWorld::query("wifi"));
  EXPECT_THAT(world.owner->deliveries(), ElementsAre("found", "finished"));
  const auto records = world.owner->records(0);
  ASSERT_THAT(records, SizeIs(2));
  // The other page was found by keyword and is weighted.
  EXPECT_EQ(records[1]->title(), "Wi-Fi in book");
  EXPECT_EQ(records[1]->relevance(), Value(1));
  EXPECT_TRUE(records[1]->payloadValueForKey(ZEBResultIsExactMatchKey).isAbsent());
}

TEST(SuggestionAnchor, IsLookedUpAsTypedNotInLowerCase) {
  const ListWorld world;
  world.setSuggestions(world.book, {{"wifi", Dictionary{{"wifi", "network"}}},
                                    {"Two Words", Dictionary{{"Two Words", "both"}}}});
  world.search(FrontWorld::query("WIFI", {"book"}));
  // Both pages are there, both by keyword.
  for (const auto& record : world.owner->records(0)) {
    EXPECT_FALSE(record->relevance() == Value(1));
  }
  world.search(FrontWorld::query("Two Words", {"book"}));
  EXPECT_THAT(world.owner->records(1), SizeIs(2));
  for (const auto& record : world.owner->records(1)) {
    EXPECT_EQ(record->relevance(), Value(1));
  }
}

TEST(SuggestionAnchor, TheKeyAloneIsNotEnough) {
  const ListWorld world;
  world.setSuggestions(world.book, {{"zzz", Dictionary{{"other text", "network"}}}});
  world.search(FrontWorld::query("zzz", {"book"}));
  EXPECT_THAT(world.owner->deliveries(), ElementsAre("finished"));
}

TEST(SuggestionAnchor, IsLookedUpBesideTheSuggestionListToo) {
  const ListWorld world;
  world.setSuggestions(world.book, {{"zzz", Dictionary{{"zzz", "network"}}}});
  world.search(FrontWorld::query("zzz", {"book"}, {ZEBHelpArticleResult, ZEBHelpSuggestionResult}));
  EXPECT_THAT(world.owner->deliveries(), ElementsAre("found texts", "found", "finished"));
  EXPECT_THAT(world.owner->texts(0), ElementsAre("zzz"));
  EXPECT_THAT(titlesOf(world.owner->records(1)), ElementsAre("Wi-Fi in book"));
}

TEST(SuggestionAnchor, IsNotLookedUpForActionsOrAnchors) {
  for (const bool actions : {true, false}) {
    const ListWorld world;
    world.setSuggestions(world.book, {{"zzz", Dictionary{{"zzz", "network"}}}});
    if (actions) {
      world.search(FrontWorld::query("zzz", {"book"}, {ZEBHelpArticleResult, ZEBHelpActionResult}));
      EXPECT_THAT(world.owner->deliveries(), ElementsAre("finished"));
    } else {
      world.search(FrontWorld::query("zzz", {"book"}, {ZEBHelpArticleResult},
                                     {{ZEBQueryAnchorSearchOptionKey, true}}));
      EXPECT_THAT(world.owner->records(0), IsEmpty());
    }
  }
}

TEST(SuggestionAnchor, ThatIsAnExactMatchTooGivesThePageTwice) {
  const ListWorld world;
  world.setExactMatches(world.book, {{"zzz", "network"}});
  world.setSuggestions(world.book, {{"zzz", Dictionary{{"zzz", "network"}}}});
  world.search(FrontWorld::query("zzz", {"book"}));
  const auto records = world.owner->records(0);
  ASSERT_THAT(records, SizeIs(2));
  EXPECT_TRUE(isExactMatch(records[0]));
  EXPECT_FALSE(isExactMatch(records[1]));
}

// Anchor mode.

TEST(AnchorMode, TheQueryIsTheNameOfAnAnchorInAllBooks) {
  const ListWorld world;
  world.addNetworkBook("other");
  const auto query = FrontWorld::query("network", {"book", "other"}, {ZEBHelpArticleResult},
                                       {{ZEBQueryAnchorSearchOptionKey, true}});
  world.search(query);
  EXPECT_THAT(titlesOf(world.owner->records(0)), ElementsAre("Wi-Fi in book", "Wi-Fi in other"));
  EXPECT_THAT(relevancesOf(world.owner->records(0)), ElementsAre(1, 1));
  auto all = world.indices(world.book);
  all.push_back(world.indices(world.owner->bookWithID("other")).front());
  EXPECT_THAT(world.logged(3), testing::Contains(ZEBStringWithFormat(
                                   "Looking up anchor \"%@\" in indexes: %@", "network", all)));
}

TEST(AnchorMode, AnAnchorNobodyHasIsAnsweredWithAnEmptyBatch) {
  const ListWorld world;
  world.search(FrontWorld::query("nowhere", {"book"}, {ZEBHelpArticleResult},
                                 {{ZEBQueryAnchorSearchOptionKey, true}}));
  EXPECT_THAT(world.owner->deliveries(), ElementsAre("found", "finished"));
  EXPECT_THAT(world.owner->records(0), IsEmpty());
}

TEST(AnchorMode, NothingIsSearchedByMeaning) {
  ListWorld world;
  const auto semantics = world.addSemantics();
  world.search(FrontWorld::query("network", {"book"}, {ZEBHelpArticleResult, ZEBHelpActionResult},
                                 {{ZEBQueryAnchorSearchOptionKey, true}}));
  EXPECT_THAT(semantics->steps, IsEmpty());
  EXPECT_THAT(titlesOf(world.owner->records(0)), ElementsAre("Wi-Fi in book"));
}

TEST(AnchorMode, WithoutArticlesWantedNothingIsLookedUp) {
  const ListWorld world;
  world.search(FrontWorld::query("network", {"book"}, {}, {{ZEBQueryAnchorSearchOptionKey, true}}));
  EXPECT_THAT(world.owner->deliveries(), ElementsAre("finished"));
}
