// Asking the content service for a book.
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "plugin/remote/ZEBBookInfoDiscoveryOperation.h"
#include "tests/plugin/remote/RemoteWorld.h"

using testing::ElementsAre;
using testing::IsEmpty;
using tests::LogEntry;
using tests::RemoteWorld;

namespace {

class BookInfoDiscoveryOperation : public testing::Test {
 protected:
  RemoteWorld world;
};

TEST_F(BookInfoDiscoveryOperation, keepsTheBookThatTheServiceHas) {
  const auto book = world.makeRemoteBook("org.remote", "https://a.example/i");
  const auto operation = ZEBBookInfoDiscoveryOperation::initWithBook(book);
  EXPECT_EQ(operation->rnxBook(), nullptr);
  operation->start();
  EXPECT_TRUE(operation->isFinished());
  EXPECT_EQ(operation->error(), std::nullopt);
  ASSERT_NE(operation->rnxBook(), nullptr);
  EXPECT_EQ(operation->rnxBook()->locale(), "en");
  EXPECT_EQ(operation->book(), book);
  EXPECT_THAT(world.logged(),
              ElementsAre(LogEntry{3, "Making book request to TVO for org.remote"}));
}

TEST_F(BookInfoDiscoveryOperation, isFinishedOnlyWhenTheServiceHasAnswered) {
  const auto book = world.makeRemoteBook("org.remote", "");
  world.manager->hold();
  const auto operation = ZEBBookInfoDiscoveryOperation::initWithBook(book);
  operation->start();
  EXPECT_TRUE(operation->isExecuting());
  EXPECT_FALSE(operation->isFinished());
  world.manager->release();
  EXPECT_TRUE(operation->isFinished());
}

TEST_F(BookInfoDiscoveryOperation, endsWithTheErrorOfTheServiceAndWithoutABook) {
  const auto book = world.makeRemoteBook("org.remote", "");
  const platform::Error error{"Domain", 7, "unwell"};
  world.manager->setAnswer("org.remote", {RNXBook::bookWithID("org.remote", "1", "en", {}), error});
  const auto operation = ZEBBookInfoDiscoveryOperation::initWithBook(book);
  operation->start();
  EXPECT_EQ(operation->error(), error);
  EXPECT_EQ(operation->rnxBook(), nullptr);
}

TEST_F(BookInfoDiscoveryOperation, ofABookWhoseLocalizationIsKnownAsksNobody) {
  const auto book = world.makeRemoteBook("org.remote", "https://a.example/i");
  book->setRemoteBookInfo(platform::Value::Dictionary{{ZEBBookLocalizationKey, "en"}});
  const auto operation = ZEBBookInfoDiscoveryOperation::initWithBook(book);
  operation->start();
  EXPECT_TRUE(operation->isFinished());
  EXPECT_EQ(operation->error(), std::nullopt);
  EXPECT_EQ(operation->rnxBook(), nullptr);
  EXPECT_EQ(world.manager->requestCount(), 0U);
  EXPECT_THAT(world.logged(), IsEmpty());
}

TEST_F(BookInfoDiscoveryOperation, ofABookOfWhichOnlyURLsAreKnownAsks) {
  const auto book = world.makeRemoteBook("org.remote", "https://a.example/i");
  book->setRemoteBookInfo(platform::Value::Dictionary{
      {ZEBBookIndexRemoteURLKey, tests::testURL("https://b.example/i")}});
  ZEBBookInfoDiscoveryOperation::initWithBook(book)->start();
  EXPECT_EQ(world.manager->requestCount(), 1U);
}

TEST_F(BookInfoDiscoveryOperation, cancelledMeanwhileFinishesOnceMoreWithTheAnswer) {
  const auto book = world.makeRemoteBook("org.remote", "https://a.example/i");
  world.manager->hold();
  const auto operation = ZEBBookInfoDiscoveryOperation::initWithBook(book);
  int completions = 0;
  operation->setCompletionBlock([&] { ++completions; });
  operation->start();
  operation->cancel();
  EXPECT_TRUE(operation->isFinished());
  EXPECT_EQ(completions, 1);
  world.manager->release();
  EXPECT_NE(operation->rnxBook(), nullptr);
  EXPECT_TRUE(operation->isCancelled());
  EXPECT_EQ(completions, 1);
}

}  // namespace
