// From hits to results.
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "host/Luxwell/LUXDebugPreferences.h"
#include "tests/LUXPlugin/LUXWorld.h"

using testing::AllOf;
using testing::Contains;
using testing::ElementsAre;
using testing::IsEmpty;
using testing::Not;
using testing::SizeIs;
using tests::LogEntry;
using tests::LUXWorld;
using tests::relevancesOf;
using tests::titlesOf;
using tests::urlOf;

namespace {

using Hits = std::vector<std::shared_ptr<LUXHit>>;
using Keys = std::vector<std::string>;

std::shared_ptr<LUXHit> pageHit(const std::string& path, float score,
                                const std::string& book = "org.one") {
  return LUXHit::hitWithTitle(std::nullopt, score, path, book);
}
std::shared_ptr<LUXHit> phraseHit(const std::string& title, float score) {
  return LUXHit::hitWithTitle(title, score);
}

/// A book in a model of its own, and queries whose hits the test chooses.
class ResultMaking : public testing::Test {
 protected:
  ResultMaking() {
    LUXDebugPreferences::defaultDebugPreferences()->setFloat(0.2F, LUXResultCutoffThresholdKey);
    book = world.addBook("org.one", tests::printerPages(), "Apps");
    world.build("Apps");
  }
  ~ResultMaking() override {
    LUXDebugPreferences::defaultDebugPreferences()->removeValueForKey(LUXResultCutoffThresholdKey);
  }

  /// What a search comes to when the model answers with these hits.
  LUXWorld::Results resultsOf(Hits hits, const std::string& kind = ZEBHelpArticleResult,
                              const std::string& text = "words") const {
    const auto query = LUXWorld::query(text, {"org.one"});
    query->setOptions(platform::Value::Dictionary{{ZEBQuerySearchAllBooksOptionKey, true}});
    world.controller->onAnswer = [this, &hits](const auto& asked, const auto&) {
      world.controller->answer(asked, hits);
    };
    auto results = world.search(query, kind);
    world.controller->onAnswer = nullptr;
    return results;
  }
  std::vector<LogEntry> returned(size_t count) const {
    return {
        {5, "Returning " + std::to_string(count) + " results from " + world.modelFolder("Apps")}};
  }
  static Keys keysOf(const std::shared_ptr<ZEBResult>& result) {
    Keys keys;
    for (const auto& entry : result->payload()) {
      keys.push_back(entry.first);
    }
    return keys;
  }
  static bool isDuplicate(const std::shared_ptr<ZEBResult>& result) {
    return result->payloadValueForKey(ZEBResultIsDuplicateAppKey).boolValue();
  }

  LUXWorld world;
  std::shared_ptr<ZEBHelpBook> book;
};

// Articles.

TEST_F(ResultMaking, makesARecordOfAPage) {
  const auto results = resultsOf({pageHit("add.html", 0.5F)});
  ASSERT_THAT(results, SizeIs(1));
  const auto& result = results.front();
  EXPECT_EQ(result->title(), "Add a printer");
  EXPECT_EQ(result->type(), ZEBHelpArticleResult);
  EXPECT_EQ(result->relevance(), platform::Value(0.5));
  EXPECT_EQ(urlOf(result), "file://" + book->path() + "/add.html");
  EXPECT_EQ(result->bookID(), "org.one");
  EXPECT_EQ(result->payloadValueForKey(ZEBResultUsesExternalViewerKey), platform::Value(false));
  EXPECT_EQ(result->payloadValueForKey(ZEBResultAbstractKey).stringValue(),
            "How printers are added");
  EXPECT_THAT(result->payload(), SizeIs(4));
  EXPECT_TRUE(result->isPayloadMutable());
  EXPECT_EQ(world.loggedBeginningWith({"Returning"}), returned(1));
}

TEST_F(ResultMaking, makesARecordWithoutAbstractOfAPageWithoutDescription) {
  const auto results = resultsOf({pageHit("queue.html", 0.5F)});
  ASSERT_THAT(results, SizeIs(1));
  EXPECT_THAT(keysOf(results.front()), Not(Contains(ZEBResultAbstractKey)));
  EXPECT_THAT(results.front()->payload(), SizeIs(3));
}

TEST_F(ResultMaking, keepsTheOrderOfOneAnswerAndAllOfIt) {
  Hits hits;
  for (int i = 0; i < 100; ++i) {
    hits.push_back(pageHit(i % 2 == 0 ? "add.html" : "queue.html",
                           0.3F + 0.005F * static_cast<float>(i * 37 % 100)));
  }
  const auto results = resultsOf(hits);
  ASSERT_THAT(results, SizeIs(100));
  for (size_t i = 0; i < hits.size(); ++i) {
    EXPECT_EQ(relevancesOf(results)[i], static_cast<double>(hits[i]->score()));
  }
}

TEST_F(ResultMaking, leavesOutWhatScoresNoHigherThanTheThreshold) {
  EXPECT_THAT(titlesOf(resultsOf({pageHit("add.html", 0.2F), pageHit("queue.html", 0.21F),
                                  pageHit("jam.html", 0.0F)})),
              ElementsAre("The print queue"));
  LUXDebugPreferences::defaultDebugPreferences()->setFloat(0.6F, LUXResultCutoffThresholdKey);
  EXPECT_THAT(resultsOf({pageHit("queue.html", 0.6F)}), IsEmpty());
  EXPECT_EQ(world.loggedBeginningWith({"Returning"}).back(), returned(0).front());
}

TEST_F(ResultMaking, leavesOutWhatIsNoPageOfTheBook) {
  EXPECT_THAT(resultsOf({LUXHit::hitWithTitle("A title", 0.5F, std::nullopt, "org.one"),
                         pageHit("unknown.html", 0.5F), pageHit("add.html", 0.5F, "org.unknown")}),
              IsEmpty());
  EXPECT_THAT(world.loggedBeginningWith({"Didn't find", "No registered"}),
              ElementsAre(LogEntry{5, "Didn't find lux index for book ID: org.unknown"}));
}

TEST_F(ResultMaking, givesTheScoreOneToThePageThatIsNamed) {
  const auto results = resultsOf({pageHit("add.html", 0.3F), pageHit("queue.html", 0.5F)},
                                 ZEBHelpArticleResult, "add PRINTERS");
  EXPECT_THAT(relevancesOf(results), ElementsAre(1.0, 0.5));
}

TEST_F(ResultMaking, doesNotRaiseANamedPageAboveTheThreshold) {
  EXPECT_THAT(resultsOf({pageHit("add.html", 0.1F)}, ZEBHelpArticleResult, "add a printer"),
              IsEmpty());
}

TEST_F(ResultMaking, tellsOfABookThatTheHostDoesNotKnow) {
  ASSERT_TRUE(world.controller->_luxIndexForHelpbookIdentifier("org.one"));
  world.owner->forgetBook("org.one");
  EXPECT_THAT(resultsOf({pageHit("add.html", 0.5F), pageHit("queue.html", 0.5F)}), IsEmpty());
  EXPECT_THAT(
      world.logged(6),
      ElementsAre("No registered help book found for LUX Article: add.html, Book: org.one, Title: "
                  "Add a printer, Abstract: How printers are added",
                  "No registered help book found for LUX Article: queue.html, Book: org.one, "
                  "Title: The print queue, Abstract: (null)"));
}

TEST_F(ResultMaking, tellsOfAPageWithoutAnAddress) {
  ASSERT_TRUE(world.controller->_luxIndexForHelpbookIdentifier("org.one"));
  const std::vector<std::string> complaint{
      "No registered help book path found for LUX Article: add.html, Book: org.one, Title: Add a "
      "printer, Abstract: How printers are added"};
  // No index and no page to open it with; no server for its viewer; no server for its pages.
  for (const int32_t type : {ZEBHelpBookType1, ZEBHelpBookType2, ZEBHelpBookType4}) {
    world.log->clear();
    const auto poor = ZEBHelpBook::bookWithID("org.one", type, "/poor");
    poor->setUsesExternalViewer(type == ZEBHelpBookType2);
    world.owner->addBook(poor);
    EXPECT_THAT(resultsOf({pageHit("add.html", 0.5F)}), IsEmpty());
    EXPECT_EQ(world.logged(6), complaint) << type;
  }
}

TEST_F(ResultMaking, addressesPagesOfABookWithoutIndexFromItsAccessPage) {
  ASSERT_TRUE(world.controller->_luxIndexForHelpbookIdentifier("org.one"));
  book->setIndexPaths({});
  book->setAccessPagePath("/help/pages/index.html");
  EXPECT_EQ(urlOf(resultsOf({pageHit("add.html", 0.5F)}).at(0)), "file:///help/pages/add.html");
}

TEST_F(ResultMaking, addressesPagesBesideTheFirstIndex) {
  ASSERT_TRUE(world.controller->_luxIndexForHelpbookIdentifier("org.one"));
  book->setIndexPaths({"/first here/a.helpindex", "/second/b.helpindex"});
  book->setAccessPagePath("/help/index.html");
  EXPECT_EQ(urlOf(resultsOf({pageHit("add.html", 0.5F)}).at(0)), "file:///first%20here/add.html");
}

TEST_F(ResultMaking, addressesPagesOfAnExternalViewerOnItsServer) {
  for (const char* root : {"https://help.example.org/app", "https://help.example.org/app/"}) {
    book->setUsesExternalViewer(true);
    book->setRemoteURL(platform::URL::URLWithString(root));
    const auto results = resultsOf({pageHit("add.html", 0.5F)});
    ASSERT_THAT(results, SizeIs(1));
    EXPECT_EQ(urlOf(results.front()), "https://help.example.org/app/add.html");
    EXPECT_EQ(results.front()->payloadValueForKey(ZEBResultUsesExternalViewerKey),
              platform::Value(true));
  }
}

TEST_F(ResultMaking, addressesPagesOfARemoteBookOnItsServer) {
  ASSERT_TRUE(world.controller->_luxIndexForHelpbookIdentifier("org.one"));
  const auto remote = ZEBHelpBook::bookWithID("org.one", ZEBHelpBookType4, "/remote");
  remote->setRemoteURL(platform::URL::URLWithString("https://help.example.org/one"));
  remote->setUsesExternalViewer(true);
  world.owner->addBook(remote);
  const auto results = resultsOf({pageHit("add.html", 0.5F)});
  ASSERT_THAT(results, SizeIs(1));
  EXPECT_EQ(urlOf(results.front()), "https://help.example.org/one/add.html");
  EXPECT_EQ(results.front()->payloadValueForKey(ZEBResultUsesExternalViewerKey),
            platform::Value(false));
}

TEST_F(ResultMaking, spellsAPageAsTheKeywordSearchDoes) {
  world.addBook("org.odd", {{"a b/50% #1?.html", "Odd", {"odd words"}}}, "Apps");
  EXPECT_EQ(urlOf(resultsOf({pageHit("a b/50% #1?.html", 0.5F, "org.odd")}).at(0)),
            "file://" + world.folder.path("books/org.odd") + "/a%20b/50%25%20%231%3F.html");
}

TEST_F(ResultMaking, marksPagesOfOneTitleInBooksOfOneApplication) {
  const auto second = world.addBook("org.two", tests::printerPages(), "Apps");
  const auto third = world.addBook("org.three", tests::printerPages(), "Apps");
  for (const auto& each : {book, second, third}) {
    each->setAppBundleID("org.app");
    each->setAppBundleVersion(each == book ? "1.0" : "2.0");
  }
  third->setAppBundleID("org.other");
  const auto results =
      resultsOf({pageHit("add.html", 0.5F), pageHit("queue.html", 0.5F, "org.two"),
                 pageHit("add.html", 0.5F, "org.three"), pageHit("add.html", 0.5F, "org.two")});
  ASSERT_THAT(results, SizeIs(4));
  EXPECT_TRUE(isDuplicate(results[0]));
  EXPECT_FALSE(isDuplicate(results[1]));
  EXPECT_FALSE(isDuplicate(results[2]));
  EXPECT_TRUE(isDuplicate(results[3]));
  EXPECT_EQ(results[0]->payloadValueForKey(ZEBResultAppVersionKey).stringValue(), "1.0");
  EXPECT_EQ(results[3]->payloadValueForKey(ZEBResultAppVersionKey).stringValue(), "2.0");
  EXPECT_THAT(keysOf(results[1]), Not(Contains(ZEBResultIsDuplicateAppKey)));
}

TEST_F(ResultMaking, doesNotCompareBooksWithoutVersion) {
  const auto second = world.addBook("org.two", tests::printerPages(), "Apps");
  book->setAppBundleID("org.app");
  second->setAppBundleID("org.app");
  const auto results = resultsOf({pageHit("add.html", 0.5F), pageHit("add.html", 0.5F, "org.two")});
  for (const auto& result : results) {
    EXPECT_FALSE(isDuplicate(result));
    EXPECT_THAT(keysOf(result), Not(Contains(ZEBResultAppVersionKey)));
  }
}

// Suggestions.

TEST_F(ResultMaking, makesSuggestionsOfPhrases) {
  const auto results =
      resultsOf({phraseHit("print queue", 0.01F), phraseHit("a b c d e f g h", 0.5F)},
                ZEBHelpSuggestionResult);
  EXPECT_THAT(titlesOf(results), ElementsAre("print queue", "a b c d e f g h"));
  EXPECT_THAT(relevancesOf(results), ElementsAre(static_cast<double>(0.01F), 0.5));
  EXPECT_EQ(results.front()->type(), ZEBHelpSuggestionResult);
  EXPECT_THAT(results.front()->payload(), IsEmpty());
}

TEST_F(ResultMaking, offersNoSimilarSearchOfSixWords) {
  const auto results =
      resultsOf({phraseHit("one two three four five", 0.5F),
                 phraseHit("one two three four five six", 0.5F), phraseHit("one", 0.1F)},
                ZEBHelpSimilarSuggestionResult);
  EXPECT_THAT(titlesOf(results), ElementsAre("one two three four five", "one"));
  EXPECT_EQ(results.front()->type(), ZEBHelpSimilarSuggestionResult);
}

// Cancelled and late.

TEST_F(ResultMaking, stopsAfterTheHitAtWhichItIsCancelled) {
  std::shared_ptr<LUXQuery> asked;
  int looks = 0;
  world.owner->onMessage = [&](const std::string& told) {
    if (told == "bookWithID org.one" && asked && ++looks == 1) {
      asked->cancel();
    }
  };
  ASSERT_TRUE(world.controller->_luxIndexForHelpbookIdentifier("org.one"));
  world.controller->useShorterTimeouts(true);
  world.controller->onAnswer = [&](const auto& query, const auto&) {
    asked = query;
    world.controller->answer(query, {pageHit("add.html", 0.5F), pageHit("queue.html", 0.5F)});
  };
  EXPECT_THAT(world.search(LUXWorld::query("words", {"org.one"})), IsEmpty());
  EXPECT_EQ(looks, 1);
  EXPECT_EQ(world.loggedBeginningWith({"Returning"}), returned(1));
}

TEST_F(ResultMaking, makesNothingOfACancelledQuery) {
  world.controller->useShorterTimeouts(true);
  world.controller->onAnswer = [&](const auto& query, const auto&) {
    query->cancel();
    world.controller->answer(query, {pageHit("add.html", 0.5F)});
  };
  EXPECT_THAT(world.search(LUXWorld::query("words", {"org.one"})), IsEmpty());
  EXPECT_EQ(world.loggedBeginningWith({"Returning"}), returned(0));
}

TEST_F(ResultMaking, dropsAnAnswerThatWasOvertakenWhileItWasMade) {
  // The next query begins while the results of this one are being made.
  bool begun = false;
  world.controller->useShorterTimeouts(true);
  world.owner->onMessage = [&](const std::string& told) {
    if (told == "bookWithID org.one" && platform::currentThreadName() == "query-run" && !begun) {
      begun = true;
      const auto next = LUXWorld::query("next");
      next->cancel();
      world.search(next);
    }
  };
  world.controller->onAnswer = [&](const auto& query, const auto&) {
    world.controller->answer(query, {pageHit("add.html", 0.5F)});
  };
  EXPECT_THAT(world.search(LUXWorld::query("words", {"org.one"})), IsEmpty());
  EXPECT_TRUE(begun);
}

TEST_F(ResultMaking, ignoresAnAnswerToNoQuery) {
  const auto model =
      world.controller->modelForGroupName("Apps", "English", true, kLUXModelActivityQuerying);
  const auto orphan =
      LUXQuery::initWithString("words", std::nullopt, 50, world.controller, model, nullptr);
  world.controller->queryDidFinishWithResults(orphan, {pageHit("add.html", 0.5F)});
  EXPECT_THAT(world.loggedBeginningWith({"Returning"}), IsEmpty());
  world.controller->finishedActivity(kLUXModelActivityQuerying, "Apps", "English");
}

}  // namespace
