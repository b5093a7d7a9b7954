// One search from its first message to its last: order, empty queries, cancellation, exceptions.
#include "plugin/front/SearchRun.h"

#include <gtest/gtest.h>

#include "platform/Exception.h"
#include "plugin/keyword/ZEBHelpindexSearchController.h"
#include "tests/plugin/front/FrontWorld.h"

using platform::Value;
using testing::Contains;
using testing::ElementsAre;
using testing::IsEmpty;
using testing::Not;
using testing::SizeIs;
using tests::anchors;
using tests::FrontWorld;
using tests::page;
using tests::titlesOf;

namespace {

using Dictionary = Value::Dictionary;
using Entry = platform::CapturingLogSink::Entry;
using Results = std::vector<std::shared_ptr<ZEBResult>>;
using Strings = std::vector<std::string>;

/// Three books whose pages are found by keyword and by exact match alike.
class RunWorld : public FrontWorld {
 public:
  RunWorld() : semantics(addSemantics()) {
    for (const std::string bookID : {"a", "b", "c"}) {
      const auto book = addBook(bookID,
                                {page("/p.html", bookID + " prints", "print queue"),
                                 page("/q.html", bookID + " waits", "print paper")},
                                anchors({{"queue", {"/p.html"}}}));
      book->setExactMatchPath(writeList(bookID + "/em.plist", {{"print", "queue"}}));
    }
  }

  /// Everything that a query can ask for at once but suggestions, which shut out exact matches.
  static std::shared_ptr<ZEBQuery> fullQuery() {
    return query("print", {"a", "b", "c"}, {ZEBHelpArticleResult, ZEBHelpSimilarSuggestionResult},
                 {{ZEBQuerySkipShutdownDelayOptionKey, true}});
  }

  const std::shared_ptr<tests::ScriptedSemantics> semantics;
};

const Strings nothingButTheEnd{"disableShutdown", "finished", "enableShutdown"};

}  // namespace

TEST(SearchRun, ANilQueryIsLoggedAndFinished) {
  const RunWorld world;
  world.search(nullptr);
  EXPECT_EQ(world.owner->messages(), nothingButTheEnd);
  EXPECT_THAT(world.log->entries(),
              ElementsAre(Entry{3, "Starting help articles search for query: \"(null)\""}));
  EXPECT_EQ(world.owner->lastQuery(), nullptr);
  EXPECT_THAT(world.owner->questions(), IsEmpty());
}

TEST(SearchRun, AnEmptyQueryStringIsLoggedAndFinished) {
  const RunWorld world;
  const auto query = world.search(FrontWorld::query("", {"a"}));
  EXPECT_EQ(world.owner->messages(), nothingButTheEnd);
  EXPECT_THAT(world.log->entries(),
              ElementsAre(Entry{3, "Starting help articles search for query: \"\""}));
  EXPECT_EQ(world.owner->lastQuery(), query);
  EXPECT_THAT(world.semantics->steps, IsEmpty());
}

TEST(SearchRun, AQueryOfBlanksIsAQuery) {
  const RunWorld world;
  world.search(FrontWorld::query(" ", {"a"}));
  EXPECT_THAT(world.semantics->steps, Contains(ZEBHelpArticleResult));
}

TEST(SearchRun, TheGuardComesFirstAndLastAndTheStartIsLoggedBeforeAnyQuestion) {
  const RunWorld world;
  world.owner->onMessage = [&](const std::string& message) {
    if (message == "isOnline") {
      EXPECT_THAT(world.logged(3),
                  ElementsAre("Starting help articles search for query: \"print\""));
      EXPECT_GE(world.owner->guards(), 1);
    }
    if (message == "finished") {
      EXPECT_EQ(world.owner->guards(), 1);
    }
  };
  world.search(FrontWorld::query("print", {"a"}));
  const auto messages = world.owner->messages();
  EXPECT_EQ(messages.front(), "disableShutdown");
  EXPECT_EQ(messages.back(), "enableShutdown");
  EXPECT_EQ(messages[messages.size() - 2], "finished");
  EXPECT_EQ(messages[messages.size() - 3], "found");
}

TEST(SearchRun, TheSkippedShutdownDelayIsSetToOneJustBeforeTheGuardIsReleased) {
  const RunWorld world;
  world.search(
      FrontWorld::query("print", {"a"}, {ZEBHelpArticleResult}, {{"ZEBSkipShutdownDelay", true}}));
  const auto messages = world.owner->messages();
  ASSERT_GE(messages.size(), 3U);
  EXPECT_THAT(Strings(messages.end() - 3, messages.end()),
              ElementsAre("finished", "setIdleTimeOutDelay", "enableShutdown"));
  EXPECT_EQ(world.owner->idleTimeOutDelay(), Value(1));
  EXPECT_EQ(world.owner->idleTimeOutDelay().kind(), Value::Kind::integer);
}

TEST(SearchRun, TheShutdownDelayIsSkippedForAnEmptyQueryToo) {
  const RunWorld world;
  world.search(FrontWorld::query("", {}, {}, {{"ZEBSkipShutdownDelay", 1}}));
  EXPECT_THAT(world.owner->messages(),
              ElementsAre("disableShutdown", "finished", "setIdleTimeOutDelay", "enableShutdown"));
}

TEST(SearchRun, AnOptionForTheShutdownDelayThatIsFalseSetsNothing) {
  const RunWorld world;
  for (const Value& no : {Value(false), Value(0), Value("YES"), Value()}) {
    Dictionary options;
    if (!no.isAbsent()) {
      options["ZEBSkipShutdownDelay"] = no;
    }
    world.search(FrontWorld::query("print", {"a"}, {ZEBHelpArticleResult}, std::move(options)));
  }
  EXPECT_THAT(world.owner->messages(), Not(Contains("setIdleTimeOutDelay")));
}

TEST(SearchRun, AQueryThatWantsNothingFindsNothing) {
  const RunWorld world;
  world.search(FrontWorld::query("print", {"a"}, {}));
  EXPECT_EQ(world.owner->messages(), nothingButTheEnd);
}

TEST(SearchRun, NothingIsRememberedBetweenSearches) {
  const RunWorld world;
  for (size_t round = 0; round < 3; ++round) {
    world.search(RunWorld::fullQuery());
    EXPECT_THAT(world.semantics->calls[2 * round].ignoringItems, SizeIs(3));
    EXPECT_THAT(world.semantics->calls[2 * round + 1].ignoringItems, SizeIs(6));
    // Each round delivers the pages and the similar searches, of which there are none here.
    EXPECT_EQ(titlesOf(world.owner->records(2 * round)), titlesOf(world.owner->records(0)));
    EXPECT_THAT(world.owner->records(2 * round + 1), IsEmpty());
  }
}

TEST(SearchRun, RunsWithoutAControllerForMeaning) {
  const RunWorld world;
  const auto keyword = ZEBHelpindexSearchController::init();
  keyword->setPluginOwner(world.owner);
  SearchRun(world.controller, world.owner, *world.controller->_shelf(), *keyword, nullptr,
            FrontWorld::query("print", {"a"}))
      .run();
  EXPECT_THAT(world.semantics->steps, IsEmpty());
  EXPECT_THAT(world.owner->deliveries(), ElementsAre("found", "finished"));
}

// Cancellation.

TEST(SearchRun, ACancelledQueryVisitsOneBookAndDeliversNothing) {
  const RunWorld world;
  const auto query = RunWorld::fullQuery();
  query->cancel();
  world.search(query);
  EXPECT_THAT(world.owner->deliveries(), ElementsAre("finished", "setIdleTimeOutDelay"));
  EXPECT_THAT(world.controller->_shelf()->_knownIndices(), SizeIs(1));
  EXPECT_THAT(world.semantics->steps, IsEmpty());
}

TEST(SearchRun, CancelledWhileABookIsVisitedTheNextOneIsNot) {
  const RunWorld world;
  const auto query = RunWorld::fullQuery();
  size_t visits = 0;
  bool asked = false;
  world.owner->onMessage = [&](const std::string& message) {
    asked = asked || message == "isOnline";
    if (asked && message == "bookWithID b" && ++visits == 1) {
      query->cancel();
    }
  };
  world.search(query);
  // Exact matches were found by then, and are not delivered.
  EXPECT_THAT(world.owner->deliveries(), ElementsAre("finished", "setIdleTimeOutDelay"));
  EXPECT_FALSE(world.controller->_shelf()->_knownIndices().contains("c"));
  EXPECT_TRUE(world.controller->_shelf()->_knownIndices().contains("b"));
}

TEST(SearchRun, CancelledAfterASuggestionListTheListStands) {
  const RunWorld world;
  const auto a = world.owner->bookWithID("a");
  a->setSuggestionsPath(world.writeList("a/s.plist", {{"print", Dictionary{{"Print", ""}}}}));
  const auto query =
      FrontWorld::query("print", {"a", "b"}, {ZEBHelpArticleResult, ZEBHelpSuggestionResult});
  world.owner->onMessage = [&](const std::string& message) {
    if (message == "found texts") {
      query->cancel();
    }
  };
  world.search(query);
  EXPECT_THAT(world.owner->deliveries(), ElementsAre("found texts", "finished"));
  EXPECT_THAT(world.semantics->steps, IsEmpty());
}

TEST(SearchRun, CancelledDuringTheArticleSearchTheArticlesAreDeliveredAndNoSuggestionsSought) {
  const RunWorld world;
  const auto query = RunWorld::fullQuery();
  world.semantics->onSearch = [&](const std::shared_ptr<ZEBQuery>& asked) {
    EXPECT_EQ(asked, query);
    query->cancel();
  };
  world.search(query);
  EXPECT_THAT(world.owner->deliveries(), ElementsAre("found", "finished", "setIdleTimeOutDelay"));
  EXPECT_THAT(world.semantics->steps, ElementsAre("not shorter", ZEBHelpArticleResult));
}

TEST(SearchRun, CancelledDuringTheDeliveryOfArticlesNoSuggestionsAreSought) {
  const RunWorld world;
  const auto query = RunWorld::fullQuery();
  world.owner->onMessage = [&](const std::string& message) {
    if (message == "found") {
      query->cancel();
    }
  };
  world.search(query);
  EXPECT_THAT(world.semantics->steps, ElementsAre("not shorter", ZEBHelpArticleResult));
}

TEST(SearchRun, CancelledDuringTheSuggestionSearchTheSuggestionsAreDelivered) {
  const RunWorld world;
  const auto query = FrontWorld::query("print", {"a"}, {ZEBHelpSuggestionResult});
  world.semantics->answers[ZEBHelpSuggestionResult] = Results();
  world.semantics->onSearch = [&](const std::shared_ptr<ZEBQuery>&) { query->cancel(); };
  world.search(query);
  EXPECT_THAT(world.owner->deliveries(), ElementsAre("found", "finished"));
}

// Exceptions.

TEST(SearchRun, WhateverTheOwnerThrowsEndsTheSearchIsLoggedAndReleasesTheGuard) {
  for (const std::string message :
       {"isOnline", "bookWithID a", "bookWithID c", "found", "finished", "setIdleTimeOutDelay"}) {
    const RunWorld world;
    world.owner->onMessage = [&](const std::string& told) {
      if (told == message) {
        throw platform::Exception("HostException", "no more of this");
      }
    };
    EXPECT_NO_THROW(world.search(RunWorld::fullQuery()));
    EXPECT_THAT(world.logged(0), ElementsAre("no more of this")) << message;
    EXPECT_EQ(world.owner->messages().back(), "enableShutdown") << message;
    EXPECT_EQ(world.owner->guards(), 0) << message;
    if (message != "finished" && message != "setIdleTimeOutDelay") {
      EXPECT_THAT(world.owner->messages(), Not(Contains("finished"))) << message;
      EXPECT_THAT(world.owner->messages(), Not(Contains("setIdleTimeOutDelay"))) << message;
    }
  }
}

TEST(SearchRun, TheExceptionIsLoggedBeforeTheGuardIsReleased) {
  const RunWorld world;
  size_t releases = 0;
  world.owner->onMessage = [&](const std::string& told) {
    if (told == "found") {
      throw std::runtime_error("full");
    }
    if (told == "enableShutdown" && world.owner->guards() == 1) {
      ++releases;
      EXPECT_THAT(world.logged(0), ElementsAre("full"));
    }
  };
  world.search(RunWorld::fullQuery());
  EXPECT_EQ(releases, 1U);
}

TEST(SearchRun, BatchesDeliveredBeforeTheExceptionStand) {
  const RunWorld world;
  size_t searches = 0;
  world.semantics->onSearch = [&](const std::shared_ptr<ZEBQuery>&) {
    if (++searches == 2) {
      throw platform::Exception("SemanticException", "lost the meaning");
    }
  };
  world.search(RunWorld::fullQuery());
  EXPECT_THAT(world.owner->deliveries(), ElementsAre("found"));
  EXPECT_THAT(world.logged(0), ElementsAre("lost the meaning"));
  EXPECT_EQ(world.owner->messages().back(), "enableShutdown");
}

TEST(SearchRun, AnExceptionOfTheSemanticArticleSearchKeepsExactMatchesFromBeingDelivered) {
  const RunWorld world;
  world.semantics->onSearch = [](const std::shared_ptr<ZEBQuery>&) {
    throw std::runtime_error("model on fire");
  };
  world.search(RunWorld::fullQuery());
  EXPECT_THAT(world.owner->deliveries(), IsEmpty());
  EXPECT_THAT(world.log->entries(), Contains(Entry{0, "model on fire"}));
}

TEST(SearchRun, TheNextSearchIsNotTouchedByAnException) {
  const RunWorld world;
  bool broken = true;
  world.owner->onMessage = [&](const std::string& told) {
    if (broken && told == "isOnline") {
      throw std::runtime_error("offline and on fire");
    }
  };
  world.search(RunWorld::fullQuery());
  broken = false;
  world.search(RunWorld::fullQuery());
  EXPECT_THAT(world.owner->deliveries(),
              ElementsAre("found", "found", "finished", "setIdleTimeOutDelay"));
}
