// Which books a search covers, and how long it waits for their indexes.
#include <gtest/gtest.h>

#include "bvmake/Report.h"
#include "bvmake/Run.h"
#include "tests/plugin/front/FrontWorld.h"

using testing::Contains;
using testing::ElementsAre;
using testing::IsEmpty;
using testing::Not;
using testing::SizeIs;
using testing::UnorderedElementsAre;
using tests::anchors;
using tests::FrontWorld;
using tests::page;
using tests::titlesOf;

namespace {

using Strings = std::vector<std::string>;

const std::string allBooks = ZEBQuerySearchAllBooksOptionKey;

/// Three books with one page each about printing.
class ThreeBooks : public FrontWorld {
 public:
  ThreeBooks() {
    for (const std::string bookID : {"a", "b", "c"}) {
      addBook(bookID, {page("/p.html", "Printing in " + bookID, "print queue")});
    }
  }
};

/// The shipped book for being offline, indexed as it ships.
std::shared_ptr<ZEBHelpBook> addOfflineBook(const FrontWorld& world) {
  bvmake::CreateOptions options;
  options.folder = std::string(ZEB_SOURCE_DIR) + "/books/offline";
  options.outputPath = world.folder.path("offline/offline.helpindex");
  options.anchors = true;
  bvmake::StreamReport report(stderr, "test", 0);
  EXPECT_EQ(bvmake::run(options, report).exitCode, bvmake::ExitCode::success);
  auto book = ZEBHelpBook::bookWithID(KROfflineHelpbookID, ZEBHelpBookType1, options.folder);
  book->setIndexPaths({options.outputPath});
  world.owner->addBook(book);
  world.log->clear();
  return book;
}

Strings booksOf(const std::vector<std::shared_ptr<ZEBResult>>& results) {
  Strings books;
  for (const auto& result : results) {
    books.push_back(result->bookID().value_or("(none)"));
  }
  return books;
}

}  // namespace

TEST(SearchBooks, AnEmptyScopeSearchesEveryKnownBook) {
  const ThreeBooks world;
  world.search(FrontWorld::query("print"));
  EXPECT_THAT(world.owner->deliveries(), ElementsAre("found", "finished"));
  EXPECT_THAT(booksOf(world.owner->records(0)), UnorderedElementsAre("a", "b", "c"));
}

TEST(SearchBooks, AScopeSearchesItsBooksAndUnknownOnesDropOut) {
  const ThreeBooks world;
  world.search(FrontWorld::query("print", {"c", "nobody", "a"}));
  EXPECT_THAT(booksOf(world.owner->records(0)), UnorderedElementsAre("a", "c"));
  EXPECT_THAT(world.owner->questions(), Not(Contains("knownBooks")));
}

TEST(SearchBooks, TheOptionForAllBooksOverrulesTheScope) {
  const ThreeBooks world;
  world.search(FrontWorld::query("print", {"c"}, {ZEBHelpArticleResult}, {{allBooks, true}}));
  EXPECT_THAT(booksOf(world.owner->records(0)), UnorderedElementsAre("a", "b", "c"));
}

TEST(SearchBooks, AnOptionThatIsFalseIsNoOption) {
  const ThreeBooks world;
  world.search(FrontWorld::query("print", {"c"}, {ZEBHelpArticleResult}, {{allBooks, false}}));
  EXPECT_THAT(booksOf(world.owner->records(0)), ElementsAre("c"));
}

TEST(SearchBooks, AScopeOfOneUnknownBookSendsTheFinishMessagesOnly) {
  const ThreeBooks world;
  for (const bool online : {true, false}) {
    world.owner->online = online;
    world.owner->forgetMessages();
    world.search(FrontWorld::query("print", {"nobody"}));
    EXPECT_THAT(world.owner->messages(),
                ElementsAre("disableShutdown", "finished", "enableShutdown"));
  }
}

TEST(SearchBooks, TheOnlyBookOfTheScopeIsThePrimaryOneWhoseResultsKeepTheirWeight) {
  const ThreeBooks world;
  FrontWorld::setBookWeights({{"a", 0.5}, {"b", 0.5}, {"c", 0.5}});
  world.search(FrontWorld::query("print", {"c"}));
  EXPECT_THAT(tests::relevancesOf(world.owner->records(0)), ElementsAre(1.0 - 0.0001));
  // With all books searched it still is.
  world.search(FrontWorld::query("print", {"c"}, {ZEBHelpArticleResult}, {{allBooks, true}}));
  const auto records = world.owner->records(1);
  ASSERT_THAT(records, SizeIs(3));
  EXPECT_EQ(booksOf(records).front(), "c");
  EXPECT_EQ(records[0]->relevance().doubleValue(), 1.0 - 0.0001);
  EXPECT_EQ(records[1]->relevance().doubleValue(), (1.0 - 0.0001) * 0.5);
}

TEST(SearchBooks, WithoutAScopeTheSystemsManualIsThePrimaryBook) {
  const FrontWorld world;
  world.addBook(KROrvHelpbookID, {page("/p.html", "Printing", "print queue")});
  world.addBook("other", {page("/p.html", "Printing", "print queue")});
  FrontWorld::setBookWeights({{KROrvHelpbookID, 0.25}, {"other", 0.5}});
  world.search(FrontWorld::query("print"));
  EXPECT_THAT(tests::relevancesOf(world.owner->records(0)),
              ElementsAre(1.0 - 0.0001, (1.0 - 0.0001) * 0.5));
}

TEST(SearchBooks, WhenTheOnlyBookOfTheScopeIsUnknownEveryResultIsWeighted) {
  const ThreeBooks world;
  world.addBook(KROrvHelpbookID, {page("/p.html", "Printing", "print queue")});
  FrontWorld::setBookWeights({{"a", 0.5}, {"b", 0.5}, {"c", 0.5}, {KROrvHelpbookID, 0.5}});
  world.search(FrontWorld::query("print", {"nobody"}, {ZEBHelpArticleResult}, {{allBooks, true}}));
  const auto records = world.owner->records(0);
  ASSERT_THAT(records, SizeIs(4));
  for (const auto& record : records) {
    EXPECT_EQ(record->relevance().doubleValue(), (1.0 - 0.0001) * 0.5);
  }
}

TEST(SearchBooks, ABookThatWaitsForRegistrationIsRegisteredByTheSearch) {
  const FrontWorld world;
  world.addBook("book", {page("/p.html", "Printing", "print queue")});
  world.controller->finishPopulatingBookWithID("book");
  ASSERT_EQ(world.controller->_shelf()->_pendingBookCount(), 1U);
  world.search(FrontWorld::query("print"));
  EXPECT_EQ(world.controller->_shelf()->_pendingBookCount(), 0U);
  EXPECT_THAT(world.owner->records(0), SizeIs(1));
}

TEST(SearchBooks, WhoWantsNoArticlesHasNoBookRegisteredOrOpened) {
  const FrontWorld world;
  world.addBook("book", {page("/p.html", "Printing", "print queue")});
  world.search(FrontWorld::query("print", {}, {ZEBHelpSuggestionResult}));
  EXPECT_THAT(world.controller->_shelf()->_knownIndices(), IsEmpty());
  EXPECT_THAT(world.owner->messages(),
              ElementsAre("disableShutdown", "finished", "enableShutdown"));
}

TEST(SearchBooks, ABookThatVanishesBetweenTheListAndTheVisitDropsOut) {
  const ThreeBooks world;
  world.owner->onMessage = [&](const std::string& message) {
    if (message == "isOnline") {
      world.owner->forgetBook("b");
    }
  };
  world.search(FrontWorld::query("print", {"a", "b", "c"}));
  EXPECT_THAT(booksOf(world.owner->records(0)), UnorderedElementsAre("a", "c"));
}

// Offline.

TEST(SearchBooks, OfflineWithNothingButRemoteBooksInScopeTheTopicThatSaysSoIsAllThereIs) {
  const FrontWorld world;
  const auto offline = addOfflineBook(world);
  world.addRemoteBook("r1", {page("/p.html", "Printing", "print queue")});
  world.addRemoteBook("r2", {page("/p.html", "Printing", "print queue")});
  world.owner->online = false;
  world.search(FrontWorld::query("print", {"r1", "r2"}));
  EXPECT_THAT(world.owner->deliveries(), ElementsAre("found", "finished"));
  const auto records = world.owner->records(0);
  ASSERT_THAT(records, SizeIs(1));
  EXPECT_EQ(records[0]->bookID(), KROfflineHelpbookID);
  EXPECT_THAT(records[0]->payloadValueForKey(ZEBResultURLKey).stringValue().value_or(""),
              testing::EndsWith("/not-connected.html"));
  const std::string expected = ZEBStringWithFormat("Looking up anchor \"%@\" in indexes: %@",
                                                   "print", world.indices(offline));
  EXPECT_THAT(world.logged(3), Contains(expected));
}

TEST(SearchBooks, OfflineAScopeOfNothingButUnknownBooksIsEmptyNotOutOfReach) {
  const FrontWorld world;
  addOfflineBook(world);
  world.owner->online = false;
  for (const Strings& scope : {Strings{"nobody"}, Strings{"nobody", "no one"}}) {
    world.owner->forgetMessages();
    world.search(FrontWorld::query("print", scope));
    EXPECT_THAT(world.owner->messages(),
                ElementsAre("disableShutdown", "finished", "enableShutdown"));
  }
}

TEST(SearchBooks, OfflineUnknownBooksBesideRemoteOnesDropOutFirst) {
  const FrontWorld world;
  addOfflineBook(world);
  world.addRemoteBook("r1", {page("/p.html", "Printing", "print queue")});
  world.owner->online = false;
  world.search(FrontWorld::query("print", {"nobody", "r1"}));
  EXPECT_THAT(booksOf(world.owner->records(0)), ElementsAre(KROfflineHelpbookID));
}

TEST(SearchBooks, OfflineWithoutTheOfflineBookNothingIsFound) {
  const FrontWorld world;
  world.addRemoteBook("r1", {page("/p.html", "Printing", "print queue")});
  world.owner->online = false;
  world.search(FrontWorld::query("print", {"r1"}));
  EXPECT_THAT(world.owner->messages(),
              ElementsAre("disableShutdown", "finished", "enableShutdown"));
}

TEST(SearchBooks, OfflineWithAnOfflineBookThatLacksTheTopicNothingIsDelivered) {
  const FrontWorld world;
  world.addBook(KROfflineHelpbookID, {page("/p.html", "Printing", "print queue")});
  world.addRemoteBook("r1", {page("/p.html", "Printing", "print queue")});
  world.owner->online = false;
  world.search(FrontWorld::query("print", {"r1"}));
  EXPECT_THAT(world.owner->deliveries(), ElementsAre("finished"));
}

TEST(SearchBooks, OfflineTheOfflineBookIsRegisteredIfItWaits) {
  const FrontWorld world;
  addOfflineBook(world);
  world.controller->finishPopulatingBookWithID(KROfflineHelpbookID);
  world.addRemoteBook("r1", {page("/p.html", "Printing", "print queue")});
  world.owner->online = false;
  world.search(FrontWorld::query("print", {"r1"}));
  EXPECT_EQ(world.controller->_shelf()->_pendingBookCount(), 0U);
  EXPECT_THAT(world.owner->deliveries(), ElementsAre("found", "finished"));
}

TEST(SearchBooks, OfflineOneBookOfAnotherTypeInScopeMeansAnOrdinarySearch) {
  const FrontWorld world;
  addOfflineBook(world);
  world.addRemoteBook("r1", {page("/p.html", "Printing", "print queue")});
  world.addBook("local", {page("/p.html", "Printing", "print queue")});
  world.owner->online = false;
  world.search(FrontWorld::query("print", {"r1", "local"}));
  EXPECT_THAT(booksOf(world.owner->records(0)), UnorderedElementsAre("r1", "local"));
}

TEST(SearchBooks, OfflineTheExaminationStopsAtTheFirstBookThatIsNotRemote) {
  const FrontWorld world;
  world.addBook("local", {page("/p.html", "Printing", "print queue")});
  world.addRemoteBook("r1", {page("/p.html", "Printing", "print queue")});
  world.owner->online = false;
  world.search(FrontWorld::query("nothing", {"local", "r1"}, {ZEBHelpArticleResult}));
  // Asked for once for the list, and once to be visited; "local" once more to be examined.
  const auto questions = world.owner->questions();
  const auto online = std::find(questions.begin(), questions.end(), "isOnline");
  ASSERT_NE(online, questions.end());
  EXPECT_EQ(*(online + 1), "bookWithID local");
  EXPECT_EQ(*(online + 2), "bookWithID local");
}

TEST(SearchBooks, OfflineWithoutAScopeIsAnOrdinarySearch) {
  const FrontWorld world;
  world.addRemoteBook("r1", {page("/p.html", "Printing", "print queue")});
  world.owner->online = false;
  world.search(FrontWorld::query("print"));
  EXPECT_THAT(booksOf(world.owner->records(0)), ElementsAre("r1"));
}

TEST(SearchBooks, OfflineInAnchorModeIsAnOrdinaryLookUp) {
  const FrontWorld world;
  addOfflineBook(world);
  world.addRemoteBook("r1", {page("/p.html", "Printing", "print queue")},
                      anchors({{"top", {"/p.html"}}}));
  world.owner->online = false;
  world.search(FrontWorld::query("top", {"r1"}, {ZEBHelpArticleResult},
                                 {{ZEBQueryAnchorSearchOptionKey, true}}));
  EXPECT_THAT(booksOf(world.owner->records(0)), ElementsAre("r1"));
}

TEST(SearchBooks, OfflineWhoWantsNoArticlesGetsNoTopic) {
  FrontWorld world;
  addOfflineBook(world);
  const auto semantics = world.addSemantics();
  world.addRemoteBook("r1", {page("/p.html", "Printing", "print queue")});
  world.owner->online = false;
  world.search(FrontWorld::query("print", {"r1"}, {ZEBHelpSuggestionResult}));
  EXPECT_THAT(world.owner->deliveries(), ElementsAre("found", "finished"));
  EXPECT_THAT(world.owner->records(0), IsEmpty());
  EXPECT_THAT(semantics->steps, ElementsAre(ZEBHelpSuggestionResult));
}

TEST(SearchBooks, OfflineWithAllBooksAskedForAndAnUnknownOneAmongThemIsAnOrdinarySearch) {
  const FrontWorld world;
  addOfflineBook(world);
  world.addRemoteBook("r1", {page("/p.html", "Printing", "print queue")});
  world.owner->online = false;
  // Every known book is looked at, and the offline book is not remote.
  world.search(FrontWorld::query("print", {"r1"}, {ZEBHelpArticleResult}, {{allBooks, true}}));
  EXPECT_THAT(world.owner->records(0), Not(IsEmpty()));
  EXPECT_THAT(booksOf(world.owner->records(0)), Contains("r1"));
}

TEST(SearchBooks, OfflineNothingIsSearchedByMeaningForArticlesButSuggestionsStillAre) {
  FrontWorld world;
  addOfflineBook(world);
  const auto semantics = world.addSemantics();
  semantics->answers[ZEBHelpSimilarSuggestionResult] = std::vector<std::shared_ptr<ZEBResult>>();
  world.addRemoteBook("r1", {page("/p.html", "Printing", "print queue")});
  world.owner->online = false;
  world.search(
      FrontWorld::query("print", {"r1"}, {ZEBHelpArticleResult, ZEBHelpSimilarSuggestionResult}));
  EXPECT_THAT(semantics->steps, ElementsAre(ZEBHelpSimilarSuggestionResult));
  ASSERT_THAT(semantics->calls, SizeIs(1));
  EXPECT_THAT(semantics->calls[0].inIndices, IsEmpty());
  EXPECT_THAT(semantics->calls[0].ignoringItems, IsEmpty());
}

TEST(SearchBooks, OnlineRemoteBooksAreSearchedAsOthersAre) {
  const FrontWorld world;
  addOfflineBook(world);
  world.addRemoteBook("r1", {page("/p.html", "Printing", "print queue")});
  world.search(FrontWorld::query("print", {"r1"}));
  EXPECT_THAT(booksOf(world.owner->records(0)), ElementsAre("r1"));
}

// Waiting for downloads.

TEST(SearchBooks, ARemoteBookWithoutIndexAndWithoutDownloadIsNotWaitedFor) {
  const FrontWorld world;
  world.addBookWithoutIndex("r1", ZEBHelpBookType4);
  world.search(FrontWorld::query("print", {"r1"}));
  EXPECT_THAT(world.owner->deliveries(), ElementsAre("finished"));
}

TEST(SearchBooks, ARecordBeingDownloadedIsPolledEveryTenMillisecondsUntilItIsThere) {
  const FrontWorld world;
  const auto book = world.addRemoteBook("r1", {page("/p.html", "Printing", "print queue")});
  const auto record = world.indices(book).front();
  record->setIsDownloading(true);
  world.clock->follows = true;
  world.clock->onSleep = [&] { record->setIsDownloading(world.clock->sleeps.size() < 3); };
  world.search(FrontWorld::query("print", {"r1"}));
  EXPECT_THAT(world.clock->sleeps, ElementsAre(0.010, 0.010, 0.010));
  EXPECT_THAT(titlesOf(world.owner->records(0)), ElementsAre("Printing"));
}

TEST(SearchBooks, AfterFiveSecondsARecordStillBeingDownloadedIsSearchedAsItStands) {
  const FrontWorld world;
  const auto book = world.addRemoteBook("r1", {page("/p.html", "Printing", "print queue")});
  world.indices(book).front()->setIsDownloading(true);
  world.clock->follows = true;
  const auto start = world.clock->elapsed();
  world.search(FrontWorld::query("print", {"r1"}));
  EXPECT_GE((world.clock->elapsed() - start).count(), 5.0);
  EXPECT_LT((world.clock->elapsed() - start).count(), 5.0101);
  EXPECT_THAT(world.clock->sleeps, testing::Each(0.010));
  EXPECT_THAT(booksOf(world.owner->records(0)), ElementsAre("r1"));
}

TEST(SearchBooks, EachBookHasABudgetOfItsOwn) {
  const FrontWorld world;
  for (const std::string bookID : {"r1", "r2"}) {
    const auto book = world.addRemoteBook(bookID, {page("/p.html", "Printing", "print queue")});
    world.indices(book).front()->setIsDownloading(true);
  }
  world.clock->follows = true;
  const auto start = world.clock->elapsed();
  world.search(FrontWorld::query("print", {"r1", "r2"}));
  EXPECT_GE((world.clock->elapsed() - start).count(), 10.0);
  EXPECT_LT((world.clock->elapsed() - start).count(), 10.021);
  EXPECT_THAT(booksOf(world.owner->records(0)), UnorderedElementsAre("r1", "r2"));
}

TEST(SearchBooks, ALeapOfTheWallClockDoesNotChangeTheBudget) {
  const FrontWorld world;
  const auto book = world.addRemoteBook("r1", {page("/p.html", "Printing", "print queue")});
  const auto record = world.indices(book).front();
  record->setIsDownloading(true);
  world.clock->follows = true;
  world.clock->onSleep = [&] {
    world.clock->setNow(world.clock->now() + std::chrono::hours(1));
    record->setIsDownloading(world.clock->sleeps.size() < 100);
  };
  world.search(FrontWorld::query("print", {"r1"}));
  EXPECT_THAT(world.clock->sleeps, SizeIs(100));
}

TEST(SearchBooks, AnIndexThatIsNotBeingDownloadedIsNotWaitedFor) {
  const FrontWorld world;
  world.addBook("book", {page("/p.html", "Printing", "print queue")});
  world.clock->follows = true;
  world.search(FrontWorld::query("print"));
  EXPECT_THAT(world.clock->sleeps, IsEmpty());
}

TEST(SearchBooks, ARecordOfAnotherKindIsNeitherSearchedNorWaitedFor) {
  const FrontWorld world;
  const auto book = world.addBookWithoutIndex("plain");
  const auto record = ZEBIndex::init();
  record->setBookID("plain");
  record->setIsDownloading(true);
  world.controller->_shelf()->_addIndex(record, "plain");
  world.search(FrontWorld::query("print", {"plain"}));
  EXPECT_THAT(world.owner->deliveries(), ElementsAre("finished"));
}

TEST(SearchBooks, TheIndexListIsNotFetchedAgainWhileADownloadIsPolled) {
  const FrontWorld world;
  const auto book = world.addRemoteBook("r1", {page("/p.html", "Printing", "print queue")});
  const auto record = world.indices(book).front();
  record->setIsDownloading(true);
  world.clock->follows = true;
  world.clock->onSleep = [&] {
    // The shelf has another record by now; the search goes on with the one that it began with.
    const auto other = ZEBHelpindexIndex::initWithPath(
        world.writeIndex("other", {page("/q.html", "Other", "print queue")}, {}));
    other->setBookID("r1");
    world.controller->_shelf()->_addIndex(other, "r1");
    record->setIsDownloading(false);
  };
  world.search(FrontWorld::query("print", {"r1"}));
  EXPECT_THAT(world.clock->sleeps, SizeIs(1));
  EXPECT_THAT(titlesOf(world.owner->records(0)), ElementsAre("Printing"));
}
