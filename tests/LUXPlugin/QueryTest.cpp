// One semantic query: which models it gets hold of, how long it waits, and what it leaves behind.
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <atomic>
#include <set>

#include "host/Luxwell/HelpLUXIndex.h"
#include "platform/OperationQueue.h"
#include "tests/LUXPlugin/LUXWorld.h"

using testing::AllOf;
using testing::Contains;
using testing::Each;
using testing::ElementsAre;
using testing::IsEmpty;
using testing::Not;
using testing::SizeIs;
using testing::UnorderedElementsAre;
using tests::LogEntry;
using tests::LUXWorld;
using tests::titlesOf;

namespace {

using Hits = std::vector<std::shared_ptr<LUXHit>>;

const std::vector<std::string> flow{"Starting LUX",   "No query",      "Couldn't determine",
                                    "model exists",   "Timed out",     "Cancel model build",
                                    "Starting build", "Finished build"};

LogEntry started(const std::string& text, const std::string& scope = "[]",
                 const std::string& kind = ZEBHelpArticleResult) {
  return {5, "Starting LUX search for query: \"" + text + "\", scope: " + scope +
                 ", desired result: " + kind};
}

/// Two groups with a book each, and the system's own manual in one of them.
class Query : public testing::Test {
 protected:
  Query() {
    manual = world.addBook(KROrvHelpbookID, tests::printerPages(), "System");
    kitchen = world.addBook("org.kitchen", tests::kitchenPages(), "Apps");
  }

  void buildBoth() const {
    world.build("System");
    world.build("Apps");
  }
  /// Answers are lost from now on.
  void loseAnswers() const {
    world.controller->onAnswer = [](const auto&, const auto&) {};
  }
  void expectNothingLeft() const {
    EXPECT_TRUE(world.nothingIsHeld());
    EXPECT_FALSE(world.controller->_queryInProgress());
  }
  /// Nobody waits in earnest from now on.
  void hurry() const { world.clock->onSleep = nullptr; }

  LUXWorld world;
  std::shared_ptr<ZEBHelpBook> manual;
  std::shared_ptr<ZEBHelpBook> kitchen;
};

TEST_F(Query, findsPagesByMeaning) {
  buildBoth();
  const auto results = world.search(LUXWorld::query("network printer", {KROrvHelpbookID}));
  ASSERT_THAT(titlesOf(results), Not(IsEmpty()));
  EXPECT_EQ(results.front()->title(), "Add a printer");
  EXPECT_EQ(results.front()->type(), ZEBHelpArticleResult);
  EXPECT_THAT(titlesOf(world.search(LUXWorld::query("soup", {"org.kitchen"}))),
              Contains("Cooking tomato soup"));
  expectNothingLeft();
}

TEST_F(Query, completesAndFindsSimilarSearches) {
  buildBoth();
  const auto completions =
      world.search(LUXWorld::query("print qu", {KROrvHelpbookID}), ZEBHelpSuggestionResult);
  ASSERT_THAT(titlesOf(completions), Contains("print queue"));
  EXPECT_EQ(completions.front()->type(), ZEBHelpSuggestionResult);
  const auto similar =
      world.search(LUXWorld::query("tray", {KROrvHelpbookID}), ZEBHelpSimilarSuggestionResult);
  ASSERT_THAT(similar, Not(IsEmpty()));
  EXPECT_EQ(similar.front()->type(), ZEBHelpSimilarSuggestionResult);
  expectNothingLeft();
}

TEST_F(Query, withoutAQueryOrTextThereIsNothing) {
  EXPECT_THAT(world.search(nullptr), IsEmpty());
  EXPECT_THAT(world.search(LUXWorld::query("")), IsEmpty());
  EXPECT_THAT(world.loggedBeginningWith(flow),
              ElementsAre(LogEntry{5,
                                   "Starting LUX search for query: \"(null)\", scope: (null), "
                                   "desired result: " +
                                       ZEBHelpArticleResult},
                          LogEntry{5, "No query"}, started(""), LogEntry{5, "No query"}));
  expectNothingLeft();
}

TEST_F(Query, inALanguageWithoutModelsFindsNothing) {
  const auto query = LUXWorld::query("printer", {"org.one"});
  query->setPreferredLanguages({"tlh", "en"});
  EXPECT_THAT(world.search(query), IsEmpty());
  EXPECT_THAT(world.loggedBeginningWith(flow),
              ElementsAre(started("printer", "[\"org.one\"]"),
                          LogEntry{5, "Couldn't determine target language: [\"tlh\", \"en\"]"}));
  expectNothingLeft();
}

TEST_F(Query, leavesNoFlagWhereItStopsEarly) {
  for (const auto& query : {std::shared_ptr<ZEBQuery>(), LUXWorld::query("")}) {
    world.controller->_setQueryInProgress(true);
    world.search(query);
    EXPECT_FALSE(world.controller->_queryInProgress());
  }
  const auto query = LUXWorld::query("printer");
  query->setPreferredLanguages({"tlh"});
  world.controller->_setQueryInProgress(true);
  world.search(query);
  EXPECT_FALSE(world.controller->_queryInProgress());
}

TEST_F(Query, usesTheLanguageOfTheQueryOrElseOfTheUser) {
  world.build("System");
  world.build("System", "German");
  std::vector<std::string> languages;
  world.controller->onAnswer = [&](const auto& query, const auto& hits) {
    languages.push_back(query->language());
    world.controller->answer(query, hits);
  };
  auto query = LUXWorld::query("printer", {KROrvHelpbookID});
  world.search(query);
  query = LUXWorld::query("printer", {KROrvHelpbookID});
  query->setPreferredLanguages({"de-AT", "en"});
  world.search(query);
  EXPECT_THAT(languages, ElementsAre("English", "German"));
}

TEST_F(Query, isInProgressUnlessItCompletesWhatIsTyped) {
  buildBoth();
  std::map<std::string, bool> inProgress;
  std::string kind;
  world.controller->onAnswer = [&](const auto& query, const auto& hits) {
    inProgress[kind] = world.controller->_queryInProgress();
    world.controller->answer(query, hits);
  };
  for (const std::string& each : {ZEBHelpSuggestionResult, ZEBHelpSimilarSuggestionResult,
                                  ZEBHelpActionResult, ZEBHelpArticleResult}) {
    kind = each;
    world.search(LUXWorld::query("printer", {KROrvHelpbookID}), kind);
    EXPECT_FALSE(world.controller->_queryInProgress());
  }
  EXPECT_FALSE(inProgress.at(ZEBHelpSuggestionResult));
  EXPECT_TRUE(inProgress.at(ZEBHelpSimilarSuggestionResult));
  EXPECT_TRUE(inProgress.at(ZEBHelpActionResult));
  EXPECT_TRUE(inProgress.at(ZEBHelpArticleResult));
}

TEST_F(Query, asksForTheTypeAndNumberThatEachKindHas) {
  buildBoth();
  std::map<int, size_t> counts;
  std::set<std::string> threads;
  world.controller->onAnswer = [&](const auto& query, const auto& hits) {
    counts[query->queryType()] = query->requestedCount();
    threads.insert(platform::currentThreadName());
    world.controller->answer(query, hits);
  };
  for (const std::string& kind : {ZEBHelpSuggestionResult, ZEBHelpSimilarSuggestionResult,
                                  ZEBHelpActionResult, ZEBHelpArticleResult}) {
    world.search(LUXWorld::query("printer", {KROrvHelpbookID}), kind);
  }
  EXPECT_THAT(
      counts,
      ElementsAre(std::pair<const int, size_t>{1, 50}, std::pair<const int, size_t>{2, 1000},
                  std::pair<const int, size_t>{3, 50}, std::pair<const int, size_t>{4, 50}));
  EXPECT_THAT(threads, ElementsAre("query-run"));
}

TEST_F(Query, makesArticlesOfActions) {
  buildBoth();
  const auto results =
      world.search(LUXWorld::query("printer", {KROrvHelpbookID}), ZEBHelpActionResult);
  ASSERT_THAT(results, Not(IsEmpty()));
  EXPECT_EQ(results.front()->type(), ZEBHelpArticleResult);
}

TEST_F(Query, overOneBookGoesToItsGroupAlone) {
  buildBoth();
  std::shared_ptr<LUXQuery> asked;
  world.controller->onAnswer = [&](const auto& query, const auto& hits) {
    asked = query;
    world.controller->answer(query, hits);
  };
  const auto query = LUXWorld::query("soup", {"org.kitchen"});
  world.search(query);
  ASSERT_TRUE(asked);
  EXPECT_EQ(asked->groupName(), "Apps");
  EXPECT_EQ(asked->helpbookID(), "org.kitchen");
  EXPECT_EQ(asked->focusedHelpbookID(), "org.kitchen");
  EXPECT_EQ(asked->queryString(), "soup");
  EXPECT_NE(asked->outsideQuery(), query);
  EXPECT_EQ(asked->outsideQuery()->queryID(), query->queryID());
  // Set after the query's thread was started, but before the search is over.
  ASSERT_TRUE(asked->luxIndex());
  EXPECT_EQ(asked->luxIndex(), world.controller->_luxIndexForHelpbookIdentifier("org.kitchen"));
}

TEST_F(Query, givesTheBooksIndexToArticleQueriesOnly) {
  buildBoth();
  for (const std::string& kind : {ZEBHelpActionResult, ZEBHelpSuggestionResult}) {
    std::shared_ptr<LUXQuery> asked;
    world.controller->onAnswer = [&](const auto& query, const auto& hits) {
      asked = query;
      world.controller->answer(query, hits);
    };
    world.search(LUXWorld::query("soup", {"org.kitchen"}), kind);
    ASSERT_TRUE(asked);
    EXPECT_FALSE(asked->luxIndex());
  }
}

TEST_F(Query, overAllBooksGoesToEveryGroupWithTheManualInFocus) {
  buildBoth();
  std::mutex mutex;
  std::set<std::string> groups;
  for (const auto& scope : {std::vector<std::string>{}, {"org.kitchen", KROrvHelpbookID}}) {
    groups.clear();
    world.controller->onAnswer = [&](const auto& query, const auto& hits) {
      {
        const std::lock_guard lock(mutex);
        groups.insert(query->groupName());
        EXPECT_EQ(query->helpbookID(), std::nullopt);
        EXPECT_EQ(query->focusedHelpbookID(), KROrvHelpbookID);
        EXPECT_FALSE(query->luxIndex());
      }
      world.controller->answer(query, hits);
    };
    world.search(LUXWorld::query("printer", scope));
    EXPECT_THAT(groups, ElementsAre("Apps", "System"));
  }
  expectNothingLeft();
}

TEST_F(Query, overAllBooksByOptionKeepsTheOneBookInFocus) {
  buildBoth();
  std::mutex mutex;
  std::set<std::string> groups;
  world.controller->onAnswer = [&](const auto& query, const auto& hits) {
    {
      const std::lock_guard lock(mutex);
      groups.insert(query->groupName());
      EXPECT_EQ(query->helpbookID(), std::nullopt);
      EXPECT_EQ(query->focusedHelpbookID(), "org.kitchen");
    }
    world.controller->answer(query, hits);
  };
  world.search(LUXWorld::query("soup", {"org.kitchen"}, {{ZEBQuerySearchAllBooksOptionKey, true}}));
  EXPECT_THAT(groups, ElementsAre("Apps", "System"));
}

TEST_F(Query, overAnUnknownBookHasNoFocus) {
  buildBoth();
  std::atomic<int> answers{0};
  world.controller->onAnswer = [&](const auto& query, const auto& hits) {
    EXPECT_EQ(query->focusedHelpbookID(), std::nullopt);
    ++answers;
    world.controller->answer(query, hits);
  };
  world.search(LUXWorld::query("soup", {"org.unknown"}));
  EXPECT_EQ(answers, 2);
}

TEST_F(Query, leavesAGroupOutWhoseModelDoesNotHaveTheBook) {
  buildBoth();
  world.addBook("org.new", tests::kitchenPages(), "Apps");
  std::atomic<int> answers{0};
  world.controller->onAnswer = [&](const auto&, const auto&) { ++answers; };
  std::set<std::string> searched;
  EXPECT_THAT(
      world.search(LUXWorld::query("soup", {"org.new"}), ZEBHelpArticleResult, {}, &searched),
      IsEmpty());
  EXPECT_EQ(answers, 0);
  EXPECT_THAT(searched, IsEmpty());
  EXPECT_THAT(world.clock->sleeps(), IsEmpty());
  EXPECT_THAT(world.loggedBeginningWith(flow),
              ElementsAre(started("soup", "[\"org.new\"]"), LogEntry{4, "model exists: Apps"},
                          LogEntry{4, "model exists: Apps can be used"}));
  expectNothingLeft();
}

TEST_F(Query, searchesSuchAGroupWithTheOptionForAllBooks) {
  world.build("System");
  world.build("Apps");
  world.addBook("org.new", tests::kitchenPages(), "Apps");
  const auto results =
      world.search(LUXWorld::query("soup", {"org.new"}, {{ZEBQuerySearchAllBooksOptionKey, true}}));
  EXPECT_THAT(titlesOf(results), Contains("Cooking tomato soup"));
}

TEST_F(Query, passesBackEveryBookOfTheModelsThatItSearched) {
  world.addBook("org.second", tests::kitchenPages(), "Apps");
  buildBoth();
  std::set<std::string> searched{"org.before"};
  world.search(LUXWorld::query("soup"), ZEBHelpArticleResult, {}, &searched);
  EXPECT_THAT(searched, ElementsAre("org.before", "org.kitchen", "org.second", KROrvHelpbookID));
  searched.clear();
  world.search(LUXWorld::query("soup", {"org.second"}), ZEBHelpArticleResult, {}, &searched);
  EXPECT_THAT(searched, ElementsAre("org.kitchen", "org.second"));
}

TEST_F(Query, passesItsOwnersLazinessOnToTheShelf) {
  buildBoth();
  for (const bool lazy : {false, true}) {
    world.owner->lazy = lazy;
    world.search(LUXWorld::query("soup", {"org.kitchen"}));
    EXPECT_EQ(world.shelf->shouldBeLazy(), lazy);
  }
}

TEST_F(Query, buildsAModelThatIsNotThereAndUsesIt) {
  const auto results = world.search(LUXWorld::query("soup", {"org.kitchen"}));
  EXPECT_THAT(titlesOf(results), Contains("Cooking tomato soup"));
  const auto entries = world.loggedBeginningWith(flow);
  EXPECT_THAT(entries, Contains(LogEntry{4, "Starting build of Apps"}));
  EXPECT_THAT(entries, Contains(LogEntry{4, "Finished build of Apps"}));
  EXPECT_EQ(entries.back(), (LogEntry{4, "model exists: Apps can be used"}));
  EXPECT_THAT(world.logged(5), Not(Contains(testing::HasSubstr("Cancel model build"))));
  world.finishWork();
  expectNothingLeft();
}

TEST_F(Query, buildsAModelThatCannotBeReadAndUsesIt) {
  world.folder.write("caches/org.zeb.zebd/Models/Apps/English/LUXModel", "from another time");
  const auto results = world.search(LUXWorld::query("soup", {"org.kitchen"}));
  EXPECT_THAT(titlesOf(results), Contains("Cooking tomato soup"));
  const auto entries = world.loggedBeginningWith({"model exists"});
  ASSERT_GE(entries.size(), 4U);
  EXPECT_EQ(entries[0], (LogEntry{4, "model exists: Apps"}));
  EXPECT_EQ(entries[1], (LogEntry{4, "model exists: Apps needs build"}));
  EXPECT_EQ(entries.back(), (LogEntry{4, "model exists: Apps can be used"}));
  world.finishWork();
  expectNothingLeft();
}

TEST_F(Query, givesUpABusyModelAfterEightSeconds) {
  buildBoth();
  ASSERT_TRUE(
      world.controller->modelForGroupName("Apps", "English", true, kLUXModelActivityPreloading));
  hurry();
  EXPECT_THAT(world.search(LUXWorld::query("soup", {"org.kitchen"})), IsEmpty());
  EXPECT_NEAR(world.clock->elapsed().count(), 8.0, 0.011);
  EXPECT_THAT(world.clock->sleepsOf(""), AllOf(SizeIs(testing::AnyOf(800, 801)), Each(0.01)));
  EXPECT_THAT(world.loggedBeginningWith({"Timed out"}),
              ElementsAre(LogEntry{5, "Timed out waiting for [\"Apps\"] to include in search."}));
  EXPECT_EQ(world.activity("Apps"), kLUXModelActivityPreloading);
  EXPECT_FALSE(world.controller->_queryInProgress());
}

TEST_F(Query, givesUpABusyModelAfterOneSecondWithShorterTimeouts) {
  buildBoth();
  ASSERT_TRUE(
      world.controller->modelForGroupName("Apps", "English", true, kLUXModelActivityBuilding));
  world.controller->useShorterTimeouts(true);
  hurry();
  world.search(LUXWorld::query("soup", {"org.kitchen"}));
  EXPECT_NEAR(world.clock->elapsed().count(), 1.0, 0.011);
  EXPECT_THAT(world.loggedBeginningWith({"Timed out"}), SizeIs(1));
  EXPECT_EQ(world.activity("Apps"), kLUXModelActivityBuilding);
}

TEST_F(Query, usesABusyModelAsSoonAsItIsFree) {
  buildBoth();
  ASSERT_TRUE(
      world.controller->modelForGroupName("Apps", "English", true, kLUXModelActivityPreloading));
  const auto pause = world.clock->onSleep.get();
  world.clock->onSleep = [&](size_t count) {
    if (count == 300) {
      world.controller->finishedActivity(kLUXModelActivityPreloading, "Apps", "English");
    }
    if (count > 300) {
      pause(count);
    }
  };
  EXPECT_THAT(titlesOf(world.search(LUXWorld::query("soup", {"org.kitchen"}))),
              Contains("Cooking tomato soup"));
  EXPECT_THAT(world.loggedBeginningWith({"Timed out"}), IsEmpty());
}

TEST_F(Query, searchesTheOtherGroupsWhereOneStaysBusy) {
  buildBoth();
  ASSERT_TRUE(
      world.controller->modelForGroupName("Apps", "English", true, kLUXModelActivityPreloading));
  world.controller->useShorterTimeouts(true);
  std::atomic<bool> answered{false};
  world.controller->onAnswer = [&](const auto& query, const auto& hits) {
    world.controller->answer(query, hits);
    answered = true;
  };
  world.clock->onSleep = [&](size_t count) {
    // The busy group comes first; the other one is asked after the first pause.
    LUXWorld::waitUntil([&] { return count != 2 || answered; });
  };
  std::set<std::string> searched;
  const auto results =
      world.search(LUXWorld::query("printer"), ZEBHelpArticleResult, {}, &searched);
  EXPECT_THAT(titlesOf(results), Contains("Add a printer"));
  EXPECT_THAT(searched, ElementsAre(KROrvHelpbookID));
  EXPECT_THAT(world.logged(5), Contains("Timed out waiting for [\"Apps\"] to include in search."));
  EXPECT_EQ(world.activity("Apps"), kLUXModelActivityPreloading);
  EXPECT_EQ(world.activity("System"), kLUXModelActivityNone);
}

TEST_F(Query, waitsSixteenSecondsForAnswers) {
  buildBoth();
  loseAnswers();
  hurry();
  std::set<std::string> searched;
  EXPECT_THAT(world.search(LUXWorld::query("printer"), ZEBHelpArticleResult, {}, &searched),
              IsEmpty());
  EXPECT_NEAR(world.clock->elapsed().count(), 16.0, 0.011);
  EXPECT_THAT(world.clock->sleepsOf(""), AllOf(SizeIs(testing::AnyOf(1600, 1601)), Each(0.01)));
  // What was searched is told even where no answer came.
  EXPECT_THAT(searched, UnorderedElementsAre("org.kitchen", KROrvHelpbookID));
  expectNothingLeft();
}

TEST_F(Query, waitsOneSecondForAnswersWithShorterTimeouts) {
  buildBoth();
  loseAnswers();
  hurry();
  world.controller->useShorterTimeouts(true);
  world.search(LUXWorld::query("printer"));
  EXPECT_NEAR(world.clock->elapsed().count(), 1.0, 0.011);
  expectNothingLeft();
}

TEST_F(Query, assemblesWhatHasArrivedWhenTheTimeIsOver) {
  buildBoth();
  world.controller->useShorterTimeouts(true);
  std::atomic<bool> answered{false};
  world.controller->onAnswer = [&](const auto& query, const auto& hits) {
    if (query->groupName() == "System") {
      world.controller->answer(query, hits);
      answered = true;
    }
  };
  world.clock->onSleep = [&](size_t count) {
    LUXWorld::waitUntil([&] { return count > 1 || answered; });
  };
  EXPECT_THAT(titlesOf(world.search(LUXWorld::query("printer"))), Contains("Add a printer"));
  expectNothingLeft();
}

TEST_F(Query, cancelledBeforeItBeginsStartsNothing) {
  buildBoth();
  std::atomic<int> answers{0};
  world.controller->onAnswer = [&](const auto&, const auto&) { ++answers; };
  const auto query = LUXWorld::query("printer");
  query->cancel();
  std::set<std::string> searched;
  EXPECT_THAT(world.search(query, ZEBHelpArticleResult, {}, &searched), IsEmpty());
  EXPECT_THAT(world.clock->sleeps(), IsEmpty());
  EXPECT_THAT(searched, IsEmpty());
  EXPECT_EQ(answers, 0);
  expectNothingLeft();
}

TEST_F(Query, cancelledWhileItWaitsForAModelEndsAtTheNextPoll) {
  buildBoth();
  ASSERT_TRUE(
      world.controller->modelForGroupName("Apps", "English", true, kLUXModelActivityPreloading));
  const auto query = LUXWorld::query("soup", {"org.kitchen"});
  world.clock->onSleep = [&](size_t count) {
    if (count == 5) {
      query->cancel();
    }
  };
  EXPECT_THAT(world.search(query), IsEmpty());
  EXPECT_THAT(world.clock->sleepsOf(""), SizeIs(5));
  EXPECT_THAT(world.loggedBeginningWith({"Timed out"}), IsEmpty());
  EXPECT_EQ(world.activity("Apps"), kLUXModelActivityPreloading);
  EXPECT_FALSE(world.controller->_queryInProgress());
}

TEST_F(Query, cancelledWhileItWaitsForAnswersGivesItsModelsBack) {
  buildBoth();
  loseAnswers();
  const auto query = LUXWorld::query("printer");
  world.clock->onSleep = [&](size_t count) {
    EXPECT_EQ(world.activity("System"), kLUXModelActivityQuerying);
    EXPECT_EQ(world.activity("Apps"), kLUXModelActivityQuerying);
    if (count == 5) {
      query->cancel();
    }
  };
  std::set<std::string> searched;
  EXPECT_THAT(world.search(query, ZEBHelpArticleResult, {}, &searched), IsEmpty());
  EXPECT_THAT(world.clock->sleepsOf(""), SizeIs(5));
  EXPECT_THAT(searched, IsEmpty());
  expectNothingLeft();
}

TEST_F(Query, cancelledWhileItWaitsForAnswersCancelsTheQueriesOfTheGroups) {
  buildBoth();
  std::mutex mutex;
  std::vector<std::shared_ptr<LUXQuery>> asked;
  world.controller->onAnswer = [&](const auto& query, const auto&) {
    const std::lock_guard lock(mutex);
    asked.push_back(query);
  };
  const auto query = LUXWorld::query("printer");
  world.clock->onSleep = [&](size_t count) {
    world.clock->letOthersWork();
    if (count == 5) {
      query->cancel();
    }
  };
  world.search(query);
  EXPECT_THAT(world.clock->sleepsOf(""), AllOf(SizeIs(5), Each(0.01)));
  ASSERT_THAT(asked, SizeIs(2));
  for (const auto& each : asked) {
    EXPECT_NE(each->outsideQuery(), query);
    EXPECT_TRUE(each->isCancelled());
  }
}

TEST_F(Query, thatTimesOutLeavesTheQueriesOfTheGroupsRunning) {
  buildBoth();
  world.controller->useShorterTimeouts(true);
  std::mutex mutex;
  std::vector<std::shared_ptr<LUXQuery>> asked;
  world.controller->onAnswer = [&](const auto& query, const auto&) {
    const std::lock_guard lock(mutex);
    asked.push_back(query);
  };
  world.search(LUXWorld::query("printer"));
  ASSERT_THAT(asked, SizeIs(2));
  for (const auto& each : asked) {
    EXPECT_FALSE(each->isCancelled());
  }
}

TEST_F(Query, cancelsABuildThatHasNotFinished) {
  // The queue is busy with something else for as long as the query waits.
  platform::DispatchSemaphore release(0);
  world.controller->_modelUpdateQueue()->addOperationWithBlock([&] { release.wait(); });
  hurry();
  EXPECT_THAT(world.search(LUXWorld::query("soup", {"org.kitchen"})), IsEmpty());
  EXPECT_NEAR(world.clock->elapsed().count(), 8.0, 0.011);
  EXPECT_THAT(world.loggedBeginningWith(flow),
              ElementsAre(started("soup", "[\"org.kitchen\"]"),
                          LogEntry{5, "Timed out waiting for [\"Apps\"] to include in search."},
                          LogEntry{5, "Cancel model build task for group: Apps"}));
  release.signal();
  world.finishWork();
  EXPECT_FALSE(HelpLUXModel::modelExistsForGroupName("Apps", "English"));
  expectNothingLeft();
}

TEST_F(Query, dropsAnswersToTheQueryBeforeIt) {
  buildBoth();
  std::shared_ptr<LUXQuery> late;
  Hits lateHits;
  std::atomic<bool> answered{false};
  world.controller->onAnswer = [&](const auto& query, const auto& hits) {
    late = query;
    lateHits = hits;
    answered = true;
  };
  world.clock->onSleep = [&](size_t count) {
    LUXWorld::waitUntil([&] { return count > 1 || answered; });
  };
  EXPECT_THAT(titlesOf(world.search(LUXWorld::query("printer soup"))),
              Not(Contains("Add a printer")));
}

TEST_F(Query, leavesTheFlagInOrderWhenTheHostThrows) {
  buildBoth();
  world.owner->onMessage = [](const std::string& told) {
    if (told == "shouldBeLazy") {
      throw std::runtime_error("host on fire");
    }
  };
  EXPECT_THROW(world.search(LUXWorld::query("printer")), std::runtime_error);
  world.owner->onMessage = nullptr;
  expectNothingLeft();
}

}  // namespace
