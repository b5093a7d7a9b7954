// The transfer of a newer index of an installed book, call by call.
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <cerrno>

#include "host/Luxwell/HelpLUXIndex.h"
#include "platform/ProcessInfo.h"
#include "platform/URLError.h"
#include "plugin/operations/ZEBOperationQueue.h"
#include "plugin/records/ZEBHelpindexIndex.h"
#include "plugin/remote/ZEBIndexConnectionDelegate.h"
#include "plugin/shelf/ZEBIndexGenerationOperation.h"
#include "tests/plugin/remote/RemoteWorld.h"
#include "tests/support/ScriptedServer.h"

using platform::FailingFileManager;
using platform::URLRequest;
using platform::URLSessionResponseDisposition;
using testing::ElementsAre;
using testing::HasSubstr;
using testing::IsEmpty;
using testing::SizeIs;
using tests::LogEntry;
using tests::RemoteWorld;
using tests::ShelfWorld;
using tests::testURL;

namespace {

const std::string bookID = "org.one";

platform::Value::Dictionary luxData() {
  return {
      {"LUXIndexData", HelpLUXIndex::versionedDataWithAttributes(platform::Value::Dictionary{})}};
}

class IndexConnectionDelegate : public testing::Test {
 protected:
  IndexConnectionDelegate()
      : _cache(platform::URLCache::initWithMemoryCapacity(1 << 20, 1 << 20, std::nullopt)) {
    // The capacities are those of the first cache; from here on it is this one.
    ZEBIndexConnectionDelegate::indexURLCache();
    platform::URLCache::setSharedURLCache(_cache);
    world.makeShelf();
    world.shelf->indexGeneratingQueue()->setMaxConcurrentOperationCount(0);
  }
  ~IndexConnectionDelegate() override {
    world.shelf->indexGeneratingQueue()->setMaxConcurrentOperationCount(1);
    platform::URLCache::setSharedURLCache(nullptr);
  }

  /// A delegate for a record with or without semantic data, which counts as being downloaded.
  std::shared_ptr<ZEBIndexConnectionDelegate> make(bool withSemanticData = true) {
    book = world.makeBookWithIndex(bookID, ZEBHelpBookType3,
                                   withSemanticData ? luxData() : platform::Value::Dictionary());
    book->setLocalization("fr");
    record = ZEBHelpindexIndex::initWithPath(book->indexPaths().front());
    record->setBookID(bookID);
    record->setIsDownloading(true);
    world.log->clear();
    return ZEBIndexConnectionDelegate::delegateWithIndex(record, world.shelf, book);
  }

  static std::shared_ptr<const platform::URLResponse> response(int status) {
    return platform::URLResponse::initWithURL(testURL("https://help.example.org/index"), status,
                                              "HTTP/1.1", {});
  }
  static URLRequest request(const std::string& url) {
    return *URLRequest::requestWithURL(testURL(url));
  }
  static void redirect(ZEBIndexConnectionDelegate& delegate, const std::string& url,
                       std::optional<URLRequest>* followed = nullptr) {
    delegate.URLSessionTaskWillPerformHTTPRedirection(nullptr, nullptr, response(302), request(url),
                                                      [&](std::optional<URLRequest> answer) {
                                                        if (followed != nullptr) {
                                                          *followed = std::move(answer);
                                                        }
                                                      });
  }
  static URLSessionResponseDisposition receive(ZEBIndexConnectionDelegate& delegate, int status) {
    auto disposition = URLSessionResponseDisposition::cancel;
    bool called = false;
    delegate.URLSessionDataTaskDidReceiveResponse(nullptr, nullptr, response(status),
                                                  [&](URLSessionResponseDisposition answer) {
                                                    disposition = answer;
                                                    called = true;
                                                  });
    EXPECT_TRUE(called);
    return disposition;
  }
  static void receive(ZEBIndexConnectionDelegate& delegate, const platform::Data& data) {
    delegate.URLSessionDataTaskDidReceiveData(nullptr, nullptr, data);
  }
  static void complete(ZEBIndexConnectionDelegate& delegate,
                       const std::optional<platform::Error>& error = std::nullopt) {
    delegate.URLSessionTaskDidCompleteWithError(nullptr, nullptr, error);
  }

  std::vector<std::shared_ptr<ZEBIndexGenerationOperation>> generations() const {
    std::vector<std::shared_ptr<ZEBIndexGenerationOperation>> found;
    for (const auto& operation : world.shelf->indexGeneratingQueue()->operations()) {
      found.push_back(std::dynamic_pointer_cast<ZEBIndexGenerationOperation>(operation));
    }
    return found;
  }
  /// That one generation of semantic data was queued for the record, and none other.
  void expectOneGeneration() const {
    ASSERT_THAT(generations(), SizeIs(1));
    EXPECT_EQ(generations()[0]->index(), record);
    EXPECT_EQ(generations()[0]->book(), book);
    EXPECT_TRUE(generations()[0]->onlyGenerateLUXIndex());
  }
  std::string generatedPath() const { return world.generatedPath(bookID, "fr"); }

  RemoteWorld world;
  std::shared_ptr<ZEBHelpBook> book;
  std::shared_ptr<ZEBHelpindexIndex> record;

 private:
  const std::shared_ptr<platform::URLCache> _cache;
};

// Redirects.

TEST_F(IndexConnectionDelegate, followsARedirectUnchangedAndKeepsItsRequest) {
  const auto delegate = make();
  EXPECT_EQ(delegate->request(), std::nullopt);
  std::optional<URLRequest> followed;
  redirect(*delegate, "https://other.example.org/index", &followed);
  EXPECT_EQ(followed, request("https://other.example.org/index"));
  EXPECT_EQ(delegate->request(), followed);
  EXPECT_THAT(world.logged(),
              ElementsAre(LogEntry{4,
                                   "Index download: will send request for task (null) "
                                   "(request: (null))"}));
}

TEST_F(IndexConnectionDelegate, looksIntoTheCacheWhereAnIndexWasKeptBefore) {
  const auto delegate = make();
  const URLRequest target = request("https://other.example.org/index");
  ZEBIndexConnectionDelegate::indexURLCache()->storeCachedResponse(
      platform::CachedURLResponse::initWithResponse(response(200), platform::Data::copy("former")),
      target);
  redirect(*delegate, "https://other.example.org/index");
  EXPECT_EQ(delegate->cachedData(), std::nullopt);
  world.writeIndex(generatedPath());
  redirect(*delegate, "https://other.example.org/index");
  ASSERT_TRUE(delegate->cachedData());
  EXPECT_EQ(delegate->cachedData()->view(), "former");
  redirect(*delegate, "https://other.example.org/another");
  EXPECT_EQ(delegate->cachedData(), std::nullopt);
}

TEST_F(IndexConnectionDelegate, givesTheCacheTwentyAndSixtyMebibytes) {
  platform::URLCache::setSharedURLCache(nullptr);
  const auto cache = ZEBIndexConnectionDelegate::indexURLCache();
  EXPECT_EQ(cache, platform::URLCache::sharedURLCache());
  EXPECT_EQ(cache->memoryCapacity(), 20971520U);
  EXPECT_EQ(cache->diskCapacity(), 62914560U);
}

// Responses.

TEST_F(IndexConnectionDelegate, letsTheAnswerBeCachedUnchanged) {
  const auto delegate = make();
  const auto proposed =
      platform::CachedURLResponse::initWithResponse(response(200), platform::Data());
  std::shared_ptr<const platform::CachedURLResponse> answer;
  delegate->URLSessionDataTaskWillCacheResponse(nullptr, nullptr, proposed,
                                                [&](auto cached) { answer = std::move(cached); });
  EXPECT_EQ(answer, proposed);
  EXPECT_THAT(world.logged(),
              ElementsAre(LogEntry{4, "willCacheResponse: https://help.example.org/index"}));
}

TEST_F(IndexConnectionDelegate, acceptsWhatIsNoErrorOfTheServer) {
  for (const int status : {200, 204, 304, 399, 600}) {
    const auto delegate = make();
    EXPECT_EQ(receive(*delegate, status), URLSessionResponseDisposition::allow) << status;
    ASSERT_NE(delegate->response(), nullptr);
    EXPECT_EQ(delegate->response()->statusCode(), status);
    EXPECT_TRUE(record->isDownloading());
    EXPECT_THAT(world.logged(), ElementsAre(LogEntry{4, "Index download: did receive response " +
                                                            std::to_string(status) +
                                                            " for task (null) (request: (null))"}));
  }
  EXPECT_THAT(generations(), IsEmpty());
}

TEST_F(IndexConnectionDelegate, anErrorOfTheServerEndsItAndQueuesOneGeneration) {
  for (const int status : {400, 404, 500, 599}) {
    const auto delegate = make(false);
    EXPECT_EQ(receive(*delegate, status), URLSessionResponseDisposition::cancel) << status;
    EXPECT_EQ(delegate->response(), nullptr);
    EXPECT_FALSE(record->isDownloading());
    expectOneGeneration();
    // The session then reports the cancellation.
    complete(*delegate, platform::URLError(platform::URLErrorCancelled));
    expectOneGeneration();
    world.shelf->indexGeneratingQueue()->cancelAllOperations();
    world.shelf->indexGeneratingQueue()->setMaxConcurrentOperationCount(1);
    world.shelf->indexGeneratingQueue()->waitUntilAllOperationsAreFinished();
    world.shelf->indexGeneratingQueue()->setMaxConcurrentOperationCount(0);
  }
}

TEST_F(IndexConnectionDelegate, anErrorOfTheServerGeneratesNothingWhereThereIsSemanticData) {
  const auto delegate = make();
  EXPECT_EQ(receive(*delegate, 404), URLSessionResponseDisposition::cancel);
  EXPECT_FALSE(record->isDownloading());
  EXPECT_THAT(generations(), IsEmpty());
}

TEST_F(IndexConnectionDelegate, appendsWhatComes) {
  const auto delegate = make();
  EXPECT_EQ(delegate->data(), std::nullopt);
  receive(*delegate, platform::Data::copy("one "));
  receive(*delegate, platform::Data::copy("two"));
  EXPECT_EQ(delegate->data()->view(), "one two");
}

// Failures.

TEST_F(IndexConnectionDelegate, aFailureIsLoggedAndQueuesAGeneration) {
  const auto delegate = make(false);
  const platform::Error error = platform::URLError(platform::URLErrorTimedOut);
  complete(*delegate, error);
  EXPECT_FALSE(record->isDownloading());
  expectOneGeneration();
  EXPECT_THAT(world.logged(),
              ElementsAre(LogEntry{4, ZEBStringWithFormat("Index download: task (null) ((null)) "
                                                          "failed loading with error: %@",
                                                          error)}));
}

TEST_F(IndexConnectionDelegate, aFailureGeneratesNothingWhereThereIsSemanticData) {
  const auto delegate = make();
  complete(*delegate, platform::URLError(platform::URLErrorTimedOut));
  EXPECT_FALSE(record->isDownloading());
  EXPECT_THAT(generations(), IsEmpty());
}

TEST_F(IndexConnectionDelegate, nothingInTheCacheIsTriedRemotelyWhereOnlyThatWasAsked) {
  tests::ScriptedServer server([](const tests::ScriptedRequest&, auto& connection) {
    connection.send(tests::httpAnswer(404, ""));
  });
  const auto delegate = make();
  URLRequest asked = request(server.URL("/index"));
  asked.setCachePolicy(platform::URLRequestCachePolicy::returnCacheDataDontLoad);
  delegate->setRequest(asked);
  record->setIsDownloading(false);
  complete(*delegate, platform::URLError(platform::URLErrorResourceUnavailable));
  EXPECT_TRUE(record->isDownloading());
  EXPECT_THAT(world.logged(), ElementsAre(LogEntry{4,
                                                   "Index wasn't in the cache; trying again "
                                                   "remotely: " +
                                                       server.URL("/index")}));
  server.waitForRequests(1);
  EXPECT_TRUE(world.runMainLoopUntil([&] { return !record->isDownloading(); }));
}

TEST_F(IndexConnectionDelegate, theSecondTryHasTwoSecondsOfPatience) {
  tests::ScriptedServer server(
      [](const tests::ScriptedRequest&, auto& connection) { connection.waitUntilClientIsGone(); });
  const auto delegate = make();
  URLRequest asked = request(server.URL("/index"));
  asked.setCachePolicy(platform::URLRequestCachePolicy::returnCacheDataDontLoad);
  delegate->setRequest(asked);
  complete(*delegate, platform::URLError(platform::URLErrorResourceUnavailable));
  server.waitForRequests(1);
  world.clock->advance(platform::Seconds(1.9));
  EXPECT_TRUE(record->isDownloading());
  world.clock->advance(platform::Seconds(0.2));
  EXPECT_TRUE(world.runMainLoopUntil([&] { return !record->isDownloading(); }));
  EXPECT_THAT(world.logged().back().message, HasSubstr("failed loading with error"));
}

TEST_F(IndexConnectionDelegate, nothingInTheCacheIsAnOrdinaryFailureForOtherRequests) {
  for (const bool hasRequest : {true, false}) {
    const auto delegate = make();
    if (hasRequest) {
      delegate->setRequest(request("https://other.example.org/index"));
    }
    complete(*delegate, platform::URLError(platform::URLErrorResourceUnavailable));
    EXPECT_FALSE(record->isDownloading());
    ASSERT_THAT(world.logged(), SizeIs(1));
    EXPECT_THAT(world.logged()[0].message, HasSubstr("failed loading with error"));
  }
}

// The end.

TEST_F(IndexConnectionDelegate, aNewIndexRefillsTheRecordAndIsTold) {
  const auto delegate = make();
  const platform::Data bytes = ShelfWorld::indexBytes(luxData());
  receive(*delegate, 200);
  receive(*delegate, bytes);
  world.log->clear();
  complete(*delegate);
  EXPECT_TRUE(record->isReinitialized());
  EXPECT_TRUE(record->loadedFromGeneratedCache());
  EXPECT_FALSE(record->isDownloading());
  EXPECT_EQ(record->path(), generatedPath());
  EXPECT_EQ(ShelfWorld::contents(generatedPath()), bytes.view());
  ASSERT_THAT(world.observer->kinds(), ElementsAre(ZEBIndexChangeUpdated));
  EXPECT_EQ(world.observer->changes()[0].index, record);
  EXPECT_THAT(generations(), IsEmpty());
  EXPECT_THAT(
      world.logged(),
      ElementsAre(
          LogEntry{3, "Finished downloading index - has lux data so adding it to book for (null)"},
          LogEntry{4, "Index download: response has been cached for task (null) ((null))"}));
}

TEST_F(IndexConnectionDelegate, aNewIndexIsTheOneThatIsRememberedOverARestart) {
  const auto delegate = make();
  world.shelf->_addIndex(record, bookID);
  world.shelf->archiveKnownIndices();
  receive(*delegate, ShelfWorld::indexBytes(luxData()));
  complete(*delegate);
  const auto known = world.shelf->unarchiveKnownIndices();
  ASSERT_TRUE(known);
  ASSERT_THAT(known->at(bookID), SizeIs(1));
  EXPECT_EQ(known->at(bookID).front()->path(), generatedPath());
}

TEST_F(IndexConnectionDelegate, aNewIndexGivesTheBookItsRemoteRoot) {
  const auto delegate = make();
  platform::Value::Dictionary content = luxData();
  content["SKI_USE_REMOTE_ROOT"] = true;
  content["SKI_REMOTE_ROOT"] = "https://help.example.org/pages/";
  world.shelf->_addIndex(record, bookID);
  receive(*delegate, ShelfWorld::indexBytes(content));
  complete(*delegate);
  ASSERT_TRUE(book->remoteURL());
  EXPECT_EQ(book->remoteURL()->absoluteString(), "https://help.example.org/pages/");
}

TEST_F(IndexConnectionDelegate, aNewIndexWithoutSemanticDataIsCompletedHere) {
  const auto delegate = make(false);
  redirect(*delegate, "https://other.example.org/index");
  receive(*delegate, 200);
  receive(*delegate, ShelfWorld::indexBytes());
  world.log->clear();
  complete(*delegate);
  expectOneGeneration();
  EXPECT_THAT(world.observer->kinds(), IsEmpty());
  EXPECT_THAT(
      world.logged(),
      ElementsAre(
          LogEntry{3,
                   "Finished downloading index - no lux data so creating lux operation for "
                   "https://other.example.org/index"},
          LogEntry{4, "Index download: response has been cached for task (null) ((null))"}));
}

TEST_F(IndexConnectionDelegate, anAnswerEqualToTheCachedOneChangesNothing) {
  const auto delegate = make();
  const platform::Data bytes = ShelfWorld::indexBytes();
  delegate->setCachedData(bytes);
  receive(*delegate, bytes);
  complete(*delegate);
  EXPECT_FALSE(record->isDownloading());
  EXPECT_FALSE(record->isReinitialized());
  EXPECT_FALSE(ShelfWorld::exists(generatedPath()));
  EXPECT_THAT(world.observer->kinds(), IsEmpty());
  EXPECT_THAT(world.logged(), IsEmpty());
}

TEST_F(IndexConnectionDelegate, anEqualAnswerStillCompletesARecordWithoutSemanticData) {
  const auto delegate = make(false);
  const platform::Data bytes = ShelfWorld::indexBytes();
  delegate->setCachedData(bytes);
  receive(*delegate, bytes);
  complete(*delegate);
  expectOneGeneration();
  EXPECT_THAT(world.messages(4), IsEmpty());
  EXPECT_FALSE(ShelfWorld::exists(generatedPath()));
}

TEST_F(IndexConnectionDelegate, anAnswerWithoutBytesChangesNothing) {
  const auto delegate = make();
  receive(*delegate, 304);
  world.log->clear();
  complete(*delegate);
  EXPECT_FALSE(record->isDownloading());
  EXPECT_FALSE(record->isReinitialized());
  EXPECT_THAT(world.logged(), IsEmpty());
}

TEST_F(IndexConnectionDelegate, aNewIndexIsStoredInTheCacheForTheRedirectedRequest) {
  const auto delegate = make();
  redirect(*delegate, "https://other.example.org/index");
  receive(*delegate, 200);
  const platform::Data bytes = ShelfWorld::indexBytes(luxData());
  receive(*delegate, bytes);
  complete(*delegate);
  const auto cached = ZEBIndexConnectionDelegate::indexURLCache()->cachedResponseForRequest(
      request("https://other.example.org/index"));
  ASSERT_NE(cached, nullptr);
  EXPECT_EQ(cached->data(), bytes);
  EXPECT_EQ(cached->response()->statusCode(), 200);
  EXPECT_THAT(world.messages(3),
              ElementsAre("Finished downloading index - has lux data so adding it to book for "
                          "https://other.example.org/index"));
  EXPECT_EQ(platform::ProcessInfo::processInfo()->suddenTerminationCount(), 0);
}

TEST_F(IndexConnectionDelegate, withoutARedirectNothingIsStoredInTheCache) {
  const auto delegate = make();
  receive(*delegate, 200);
  receive(*delegate, ShelfWorld::indexBytes(luxData()));
  complete(*delegate);
  EXPECT_EQ(ZEBIndexConnectionDelegate::indexURLCache()->currentMemoryUsage(), 0U);
}

TEST_F(IndexConnectionDelegate, anIndexThatCannotBeWrittenIsLoggedAndInUseAllTheSame) {
  const auto delegate = make();
  const auto former = record->path();
  world.files->fail(FailingFileManager::Operation::write, ENOSPC, "fr.helpindex");
  receive(*delegate, ShelfWorld::indexBytes(luxData()));
  complete(*delegate);
  EXPECT_TRUE(record->isReinitialized());
  EXPECT_EQ(record->path(), former);
  EXPECT_THAT(world.messages(1),
              ElementsAre("Couldn't write updated index data to " + generatedPath()));
  EXPECT_THAT(world.observer->kinds(), ElementsAre(ZEBIndexChangeUpdated));
}

TEST_F(IndexConnectionDelegate, deletesWhatHostsLeftThatWereKilledWhileTheyWrote) {
  const auto delegate = make();
  const std::string folder = platform::stringByDeletingLastPathComponent(generatedPath());
  ASSERT_EQ(world.files->createDirectoryWithParents(folder), std::nullopt);
  ASSERT_EQ(world.files->writeAtomically(folder + "/.fr.helpindex.76.0.tmp", {}), std::nullopt);
  receive(*delegate, ShelfWorld::indexBytes(luxData()));
  complete(*delegate);
  EXPECT_EQ(world.files->namesInDirectory(folder), std::vector<std::string>{"fr.helpindex"});
}

TEST_F(IndexConnectionDelegate, addsGenerationsUnderTheLockOfTheShelf) {
  const auto delegate = make(false);
  std::thread caller;
  {
    const platform::MonitorLock lock(world.shelf->_shelfMonitor());
    caller =
        std::thread([&] { complete(*delegate, platform::URLError(platform::URLErrorTimedOut)); });
    EXPECT_TRUE(world.runMainLoopUntil([&] { return record->isRebuilding(); }));
    EXPECT_THAT(generations(), IsEmpty());
  }
  caller.join();
  expectOneGeneration();
}

}  // namespace
