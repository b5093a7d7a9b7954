// Newer indexes of installed books, from the request to the record.
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "host/Luxwell/HelpLUXIndex.h"
#include "host/Zebrine/RNXObjectManager.h"
#include "platform/Digest.h"
#include "platform/RunLoop.h"
#include "platform/URLProtocol.h"
#include "plugin/operations/ZEBOperationQueue.h"
#include "plugin/records/ZEBHelpindexIndex.h"
#include "tests/plugin/remote/RemoteWorld.h"
#include "tests/support/Latch.h"
#include "tests/support/ScriptedServer.h"

using testing::Contains;
using testing::ElementsAre;
using testing::HasSubstr;
using testing::IsEmpty;
using testing::SizeIs;
using tests::answering;
using tests::httpAnswer;
using tests::RemoteWorld;
using tests::ScriptedServer;
using tests::ShelfWorld;
using tests::testURL;

namespace {

platform::Value::Dictionary luxData() {
  return {
      {"LUXIndexData", HelpLUXIndex::versionedDataWithAttributes(platform::Value::Dictionary{})}};
}

class IndexFetch : public testing::Test {
 protected:
  IndexFetch() {
    world.makeShelf();
    book->setLocalization("en");
    record->setBookID("org.one");
    world.log->clear();
  }

  bool finish() const {
    return world.runMainLoopUntil([&] { return !record->isDownloading(); });
  }
  bool start(const std::string& url) const {
    return world.shelf->_startIndexFetch(testURL(url), platform::Seconds(60), book, record);
  }
  /// A catalogue that says that the book's newer index is at "/index".
  static std::string catalogue() {
    return R"({"format": 1, "books": [{"identifier": "org.one", "version": "2", "locale": "en",
               "searchIndex": {"url": "index", "sha256": ")" +
           platform::sha256Digest("newer") + R"("}}]})";
  }

  RemoteWorld world;
  const std::shared_ptr<ZEBHelpBook> book =
      world.makeBookWithIndex("org.one", ZEBHelpBookType3, luxData());
  const std::shared_ptr<ZEBHelpindexIndex> record =
      ZEBHelpindexIndex::initWithPath(book->indexPaths().front());
};

TEST_F(IndexFetch, hasSixtySecondsOfPatience) {
  const auto server = ScriptedServer::routing(
      {{"/catalogue.json", answering(httpAnswer(200, catalogue()))},
       {"/index", [](const tests::ScriptedRequest&, tests::ScriptedConnection& connection) {
          connection.waitUntilClientIsGone();
        }}});
  book->setCatalogueURL(testURL(server->URL("/catalogue.json")));
  bool isKnown = false;
  RNXObjectManager::sharedObjectManager()->loadCatalogue(
      *book->catalogueURL(), [&](const auto&, const auto&) {
        platform::RunLoop::main()->perform([&] { isKnown = true; });
      });
  ASSERT_TRUE(world.runMainLoopUntil([&] { return isKnown; }));
  world.shelf->_startFetchingUpdatedIndexForType3BookWithParams({book, record});
  EXPECT_TRUE(record->isDownloading());
  server->waitForRequests(2);
  world.clock->advance(platform::Seconds(59.9));
  platform::RunLoop::main()->runPending();
  EXPECT_TRUE(record->isDownloading());
  world.clock->advance(platform::Seconds(0.2));
  EXPECT_TRUE(finish());
  EXPECT_THAT(world.messages(4), ElementsAre(HasSubstr("failed loading with error")));
  EXPECT_THAT(world.shelf->indexGeneratingQueue()->operations(), IsEmpty());
}

TEST_F(IndexFetch, asksWithoutCookiesAndByThePolicyOfTheProtocol) {
  std::optional<platform::URLRequest> asked;
  platform::URLProtocolClass watching;
  watching.canInitWithRequest = [&](const platform::URLRequest& request) {
    asked = request;
    return false;
  };
  const auto kind = std::make_shared<const platform::URLProtocolClass>(watching);
  ASSERT_TRUE(platform::URLProtocol::registerClass(kind));
  const auto server = ScriptedServer::sending(httpAnswer(404, ""));
  EXPECT_TRUE(start(server->URL("/index")));
  EXPECT_TRUE(finish());
  platform::URLProtocol::unregisterClass(kind);
  ASSERT_TRUE(asked);
  EXPECT_EQ(asked->URL().absoluteString(), server->URL("/index"));
  EXPECT_FALSE(asked->HTTPShouldHandleCookies());
  EXPECT_EQ(asked->cachePolicy(), platform::URLRequestCachePolicy::useProtocolCachePolicy);
  EXPECT_EQ(asked->timeoutInterval(), platform::Seconds(60));
}

TEST_F(IndexFetch, bytesThatARedirectLedToBeforeChangeNothing) {
  const auto server = ScriptedServer::routing(
      {{"/old", answering(httpAnswer(302, "", {"Location: /new"}))},
       {"/new", answering(httpAnswer(200, ShelfWorld::indexBytes(luxData()).view()))}});
  ASSERT_TRUE(start(server->URL("/old")));
  ASSERT_TRUE(finish());
  EXPECT_THAT(world.observer->kinds(), ElementsAre(ZEBIndexChangeUpdated));
  EXPECT_THAT(world.messages(4), Contains(HasSubstr("will send request for task")));
  EXPECT_THAT(world.messages(4), Contains("willCacheResponse: " + server->URL("/new")));
  EXPECT_THAT(world.messages(4), Contains(HasSubstr("response has been cached for task")));
  world.log->clear();
  ASSERT_TRUE(start(server->URL("/old")));
  ASSERT_TRUE(finish());
  EXPECT_THAT(world.observer->kinds(), SizeIs(1));
  EXPECT_THAT(world.messages(3), IsEmpty());
  EXPECT_THAT(world.messages(4), testing::Not(Contains(HasSubstr("has been cached"))));
}

TEST_F(IndexFetch, withoutARedirectTheSameBytesAreNewEachTime) {
  const auto server =
      ScriptedServer::sending(httpAnswer(200, ShelfWorld::indexBytes(luxData()).view()));
  for (size_t i = 1; i <= 2; ++i) {
    ASSERT_TRUE(start(server->URL("/index")));
    ASSERT_TRUE(finish());
    EXPECT_THAT(world.observer->kinds(), SizeIs(i));
  }
}

TEST_F(IndexFetch, ofAURLThatMakesNoRequestOrWithoutARecordIsNone) {
  EXPECT_FALSE(start("no/scheme"));
  EXPECT_FALSE(record->isDownloading());
  EXPECT_FALSE(world.shelf->_startIndexFetch(testURL("https://a.example/"), platform::Seconds(60),
                                             book, nullptr));
}

TEST_F(IndexFetch, keepsTheShelfUntilItHasEndedAndNotLonger) {
  tests::Latch mayAnswer;
  const ScriptedServer server(
      [&](const tests::ScriptedRequest&, tests::ScriptedConnection& connection) {
        mayAnswer.wait();
        connection.send(httpAnswer(404, ""));
      });
  ASSERT_TRUE(start(server.URL("/index")));
  const std::weak_ptr<ZEBIndexshelf> weak = world.shelf;
  world.shelf.reset();
  EXPECT_FALSE(weak.expired());
  mayAnswer.open();
  EXPECT_TRUE(world.runMainLoopUntil([&] { return weak.expired(); }));
  EXPECT_FALSE(record->isDownloading());
}

}  // namespace
