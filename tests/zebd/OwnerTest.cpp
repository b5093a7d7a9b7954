#include "zebd/Owner.h"

#include <gmock/gmock.h>

#include <string>
#include <vector>

#include "host/Zebrine/ZEBConstants.h"
#include "host/Zebrine/ZEBHelpBook.h"
#include "host/Zebrine/ZEBQuery.h"
#include "host/Zebrine/ZEBResult.h"
#include "tests/platform/TestEnvironment.h"

namespace {

using platform::Seconds;
using testing::ElementsAre;
using zebd::Bookshelf;
using zebd::Owner;

class Receiver : public zebd::SearchReceiver {
 public:
  void foundResults(const ZEBResultBatch& batch) override {
    if (const auto* texts = std::get_if<std::vector<std::string>>(&batch)) {
      events.insert(events.end(), texts->begin(), texts->end());
    } else {
      events.push_back(
          std::to_string(std::get<std::vector<std::shared_ptr<ZEBResult>>>(batch).size()) +
          " records");
    }
  }
  void searchEnded(bool finished) override { events.emplace_back(finished ? "end" : "broke off"); }

  std::vector<std::string> events;
};

class OwnerTest : public testing::Test {
 protected:
  using Texts = std::vector<std::string>;

  tests::TestEnvironment environment;
  std::shared_ptr<Bookshelf> shelf = std::make_shared<Bookshelf>();
  Owner owner{shelf, {}};
};

TEST_F(OwnerTest, AnswersWithTheBooksOfItsShelfAsTheyAreNow) {
  EXPECT_TRUE(owner.knownBooks().empty());
  const auto book = ZEBHelpBook::bookWithID("a", 1, "/a");
  shelf->addBook(book);
  EXPECT_EQ(owner.bookWithID("a"), book);
  EXPECT_EQ(owner.bookWithID("b"), nullptr);
  EXPECT_EQ(owner.knownBooks().at("a"), book);
}

TEST_F(OwnerTest, AnswersWithItsSettings) {
  EXPECT_TRUE(owner.userLoggedIn());
  EXPECT_FALSE(owner.shouldBeLazy());
  EXPECT_EQ(owner.userHelpCachesDirectoryPath(), std::nullopt);
  owner.setUserLoggedIn(false);
  owner.setShouldBeLazy(true);
  EXPECT_FALSE(owner.userLoggedIn());
  EXPECT_TRUE(owner.shouldBeLazy());
  const Owner other(shelf, {false, true, "/caches/help"});
  EXPECT_FALSE(other.userLoggedIn());
  EXPECT_TRUE(other.shouldBeLazy());
  EXPECT_EQ(other.userHelpCachesDirectoryPath(), "/caches/help");
}

TEST_F(OwnerTest, IsOnlineWhenTheNetworkCanBeReached) {
  for (const bool reachable : {true, false}) {
    platform::Environment changed = *platform::Environment::current();
    changed.networkIsReachable = [reachable] { return reachable; };
    const platform::EnvironmentOverride override(std::move(changed));
    EXPECT_EQ(owner.isOnline(), reachable);
  }
}

TEST_F(OwnerTest, ShutdownGuardsCount) {
  EXPECT_EQ(owner.shutdownGuardCount(), 0);
  owner.disableShutdown();
  owner.disableShutdown();
  EXPECT_EQ(owner.shutdownGuardCount(), 2);
  owner.enableShutdown();
  EXPECT_EQ(owner.shutdownGuardCount(), 1);
  EXPECT_FALSE(owner.isQuietFor(Seconds(0)));
  owner.enableShutdown();
  EXPECT_EQ(owner.shutdownGuardCount(), 0);
  EXPECT_TRUE(owner.isQuietFor(Seconds(0)));
}

TEST_F(OwnerTest, GuardThatWasNotTakenIsLoggedAndKeepsTheHostFromBeingQuiet) {
  owner.enableShutdown();
  EXPECT_EQ(owner.shutdownGuardCount(), -1);
  EXPECT_THAT(environment.log().messages(1), ElementsAre("enableShutdown without disableShutdown"));
  environment.clock().advance(Seconds(100));
  EXPECT_FALSE(owner.isQuietFor(Seconds(1)));
}

TEST_F(OwnerTest, GuardThatIsGivenBackBeforeItIsTakenCountsOnce) {
  owner.enableShutdown();
  owner.disableShutdown();
  EXPECT_EQ(owner.shutdownGuardCount(), 0);
  EXPECT_TRUE(owner.isQuietFor(Seconds(0)));
}

TEST_F(OwnerTest, IsQuietOnlyAfterASpanWithoutAnyGuard) {
  environment.clock().advance(Seconds(1));
  owner.disableShutdown();
  environment.clock().advance(Seconds(100));
  EXPECT_FALSE(owner.isQuietFor(Seconds(2)));
  owner.enableShutdown();
  environment.clock().advance(Seconds(1.5));
  EXPECT_FALSE(owner.isQuietFor(Seconds(2)));
  owner.disableShutdown();
  owner.enableShutdown();
  environment.clock().advance(Seconds(1.5));
  EXPECT_FALSE(owner.isQuietFor(Seconds(2)));
  environment.clock().advance(Seconds(0.5));
  EXPECT_TRUE(owner.isQuietFor(Seconds(2)));
}

TEST_F(OwnerTest, IdleTimeOutDelayIsWhatWasAskedForLast) {
  EXPECT_EQ(owner.idleTimeOutDelay(), std::nullopt);
  owner.setIdleTimeOutDelay(1);
  EXPECT_EQ(owner.idleTimeOutDelay(), Seconds(1));
  owner.setIdleTimeOutDelay(2.5);
  EXPECT_EQ(owner.idleTimeOutDelay(), Seconds(2.5));
  for (const platform::Value& useless :
       {platform::Value(0), platform::Value(-1), platform::Value("soon"), platform::Value()}) {
    owner.setIdleTimeOutDelay(1);
    owner.setIdleTimeOutDelay(useless);
    EXPECT_EQ(owner.idleTimeOutDelay(), std::nullopt);
  }
}

TEST_F(OwnerTest, ResultsOfEachSearchGoToItsReceiverInBatches) {
  const auto one = ZEBQuery::initWithQueryString("one");
  const auto two = ZEBQuery::initWithQueryString("two");
  const auto first = std::make_shared<Receiver>();
  const auto second = std::make_shared<Receiver>();
  owner.beginSearch(one->queryID(), first);
  owner.beginSearch(two->queryID(), second);
  owner.pluginFoundResults(nullptr, Texts{"a", "b"}, one);
  owner.pluginFoundResults(nullptr,
                           std::vector{ZEBResult::initWithTitle("t", ZEBHelpArticleResult)}, two);
  // Plug-ins may answer with a copy of the query.
  owner.pluginFoundResults(nullptr, Texts{"c"}, one->copy());
  owner.pluginFinishedSearchingForQuery(nullptr, one);
  owner.endSearch(one->queryID());
  owner.endSearch(two->queryID());
  EXPECT_THAT(first->events, ElementsAre("a", "b", "c", "end"));
  EXPECT_THAT(second->events, ElementsAre("1 records", "broke off"));
}

TEST_F(OwnerTest, ResultsThatNobodyWaitsForAreDropped) {
  const auto query = ZEBQuery::initWithQueryString("one");
  const auto receiver = std::make_shared<Receiver>();
  owner.pluginFoundResults(nullptr, Texts{"early"}, query);
  owner.beginSearch(query->queryID(), receiver);
  owner.endSearch(query->queryID());
  owner.endSearch(query->queryID());
  owner.pluginFoundResults(nullptr, Texts{"late"}, query);
  owner.pluginFinishedSearchingForQuery(nullptr, query);
  owner.pluginFoundResults(nullptr, Texts{"nothing asked"}, nullptr);
  owner.pluginFinishedSearchingForQuery(nullptr, nullptr);
  EXPECT_THAT(receiver->events, ElementsAre("broke off"));
  EXPECT_EQ(receiver.use_count(), 1);
}

TEST_F(OwnerTest, ReceiversAndHandlersMayCallTheOwner) {
  class Asking : public zebd::SearchReceiver {
   public:
    explicit Asking(Owner& owner) : _owner(owner) {}
    void foundResults(const ZEBResultBatch&) override { _owner.endSearch(queryID); }
    void searchEnded(bool) override { _owner.disableShutdown(); }
    std::string queryID;

   private:
    Owner& _owner;
  };
  const auto query = ZEBQuery::initWithQueryString("one");
  const auto receiver = std::make_shared<Asking>(owner);
  receiver->queryID = query->queryID();
  owner.beginSearch(query->queryID(), receiver);
  owner.pluginFoundResults(nullptr, Texts{"a"}, query);
  EXPECT_EQ(owner.shutdownGuardCount(), 1);

  owner.setBookModifiedHandler(
      [&](const auto& /*book*/) { owner.setBookModifiedHandler(nullptr); });
  owner.notifyBookshelfOfModificationsToBook(nullptr);
}

TEST_F(OwnerTest, ModifiedBooksAreToldToTheHandler) {
  std::vector<std::string> told;
  owner.notifyBookshelfOfModificationsToBook(ZEBHelpBook::bookWithID("early", 1, "/early"));
  owner.setBookModifiedHandler(
      [&](const auto& book) { told.push_back(book ? book->bookID() : "none"); });
  owner.notifyBookshelfOfModificationsToBook(ZEBHelpBook::bookWithID("a", 1, "/a"));
  owner.notifyBookshelfOfModificationsToBook(nullptr);
  owner.setBookModifiedHandler(nullptr);
  owner.notifyBookshelfOfModificationsToBook(ZEBHelpBook::bookWithID("late", 1, "/late"));
  EXPECT_THAT(told, ElementsAre("a", "none"));
}

}  // namespace
