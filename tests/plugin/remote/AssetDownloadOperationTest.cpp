// One file of a remote book on its way to this machine.
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <cerrno>

#include "host/Zebrine/RNXAssetURLProtocol.h"
#include "platform/URLError.h"
#include "platform/URLProtocol.h"
#include "plugin/operations/ZEBOperationQueue.h"
#include "plugin/remote/ZEBAssetDownloadOperation.h"
#include "plugin/remote/ZEBError.h"
#include "tests/plugin/remote/RemoteWorld.h"
#include "tests/support/Latch.h"
#include "tests/support/ScriptedServer.h"

using platform::FailingFileManager;
using testing::ElementsAre;
using testing::HasSubstr;
using testing::IsEmpty;
using tests::answering;
using tests::httpAnswer;
using tests::LogEntry;
using tests::RemoteWorld;
using tests::ScriptedServer;
using tests::ShelfWorld;
using tests::testURL;

namespace {

/// Counts announcements that an operation has finished, and keeps the errors it had then.
class FinishRecorder : public platform::KeyValueObserver {
 public:
  void observeValueForKeyPath(std::string_view, platform::KeyValueObservable& object,
                              const platform::KeyValueChange&, void*) override {
    const platform::MutexLock lock(_mutex);
    _errors.push_back(static_cast<const ZEBOperation&>(object).error());
  }
  std::vector<std::optional<platform::Error>> errors() const {
    const platform::MutexLock lock(_mutex);
    return _errors;
  }

 private:
  mutable platform::Mutex _mutex;
  std::vector<std::optional<platform::Error>> _errors GUARDED_BY(_mutex);
};

class AssetDownloadOperation : public testing::Test {
 protected:
  AssetDownloadOperation() { world.makeShelf(); }

  std::shared_ptr<ZEBAssetDownloadOperation> make(const std::string& url,
                                                  const std::string& destination) const {
    auto operation =
        ZEBAssetDownloadOperation::initWithBook(world.makeBook("org.remote", 4), world.shelf);
    operation->setRemoteURL(testURL(url));
    operation->setDestinationFilePath(destination);
    return operation;
  }

  /// Runs the operation to its end in the shelf's queue.
  void run(const std::shared_ptr<ZEBAssetDownloadOperation>& operation) const {
    world.shelf->assetDownloadQueue()->addOperation(operation);
    operation->waitUntilFinished();
  }

  RemoteWorld world;
  const std::string path = world.folder.path("asset");
};

TEST_F(AssetDownloadOperation, bringsTheFileToItsDestination) {
  const auto server = ScriptedServer::sending(httpAnswer(200, "new bytes"));
  const auto operation = make(server->URL("/index"), path);
  run(operation);
  EXPECT_EQ(operation->error(), std::nullopt);
  EXPECT_EQ(ShelfWorld::contents(path), "new bytes");
  EXPECT_TRUE(operation->isUpdated());
  EXPECT_EQ(operation->cachedData(), std::nullopt);
  EXPECT_FALSE(operation->isCancelled());
  EXPECT_EQ(operation->indexshelf(), world.shelf);
  EXPECT_EQ(operation->book()->bookID(), "org.remote");
}

TEST_F(AssetDownloadOperation, asksThroughTheAssetProtocolWithThirtySecondsAndSaysSo) {
  const auto server = ScriptedServer::sending(httpAnswer(200, "bytes"));
  const auto operation = make(server->URL("/index"), path);
  run(operation);
  const auto request = operation->request();
  ASSERT_TRUE(request);
  EXPECT_EQ(request->cachePolicy(), platform::URLRequestCachePolicy::useProtocolCachePolicy);
  EXPECT_EQ(request->timeoutInterval(), platform::Seconds(30.0));
  EXPECT_TRUE(
      platform::URLProtocol::propertyForKey(RNXAssetURLProtocolRequest, *request).boolValue());
  EXPECT_NE(operation->task(), nullptr);
  EXPECT_EQ(operation->session(), platform::URLSession::sharedSession());
  EXPECT_THAT(world.logged(),
              ElementsAre(LogEntry{3, "Requesting asset: " + server->URL("/index")}));
}

TEST_F(AssetDownloadOperation, equalBytesAreNoUpdateButAreWrittenAllTheSame) {
  world.folder.write("asset", "same bytes");
  const auto old = std::filesystem::file_time_type::clock::now() - std::chrono::hours(1);
  std::filesystem::last_write_time(path, old);
  const auto server = ScriptedServer::sending(httpAnswer(200, "same bytes"));
  const auto operation = make(server->URL("/index"), path);
  run(operation);
  EXPECT_EQ(operation->error(), std::nullopt);
  EXPECT_FALSE(operation->isUpdated());
  EXPECT_EQ(operation->cachedData()->view(), "same bytes");
  EXPECT_GT(std::filesystem::last_write_time(path), old);
}

TEST_F(AssetDownloadOperation, otherBytesAreAnUpdate) {
  world.folder.write("asset", "old bytes");
  const auto server = ScriptedServer::sending(httpAnswer(200, "new bytes"));
  const auto operation = make(server->URL("/index"), path);
  run(operation);
  EXPECT_TRUE(operation->isUpdated());
  EXPECT_EQ(operation->cachedData()->view(), "old bytes");
  EXPECT_EQ(ShelfWorld::contents(path), "new bytes");
}

TEST_F(AssetDownloadOperation, anEmptyFileIsAFile) {
  const auto server = ScriptedServer::sending(httpAnswer(200, ""));
  const auto operation = make(server->URL("/index"), path);
  run(operation);
  EXPECT_EQ(operation->error(), std::nullopt);
  EXPECT_TRUE(operation->isUpdated());
  EXPECT_TRUE(ShelfWorld::exists(path));
}

TEST_F(AssetDownloadOperation, makesAllFoldersAboveTheDestination) {
  const auto server = ScriptedServer::sending(httpAnswer(200, "bytes"));
  const std::string deep = world.folder.path("a/b/c/asset");
  run(make(server->URL("/index"), deep));
  EXPECT_EQ(ShelfWorld::contents(deep), "bytes");
}

TEST_F(AssetDownloadOperation, deletesWhatHostsLeftThatWereKilledWhileTheyWrote) {
  world.processes->add(77, "host");
  world.folder.write("book/.en.helpindex.76.0.tmp", "half");
  world.folder.write("book/.fr.exactmatch.plist.76.1.tmp", "half");
  world.folder.write("book/.en.helpindex.77.0.tmp", "being written");
  const auto server = ScriptedServer::sending(httpAnswer(200, "bytes"));
  run(make(server->URL("/index"), world.folder.path("book/en.helpindex")));
  EXPECT_EQ(world.files->namesInDirectory(world.folder.path("book")),
            (std::vector<std::string>{".en.helpindex.77.0.tmp", "en.helpindex"}));
}

TEST_F(AssetDownloadOperation, otherAnswersThan200EndInAnErrorAndLeaveTheFile) {
  for (const int status : {201, 204, 304, 403, 404, 500, 503}) {
    world.folder.write("asset", "old bytes");
    const auto server = ScriptedServer::sending(httpAnswer(status, status == 304 ? "" : "page"));
    const auto operation = make(server->URL("/index"), path);
    run(operation);
    ASSERT_TRUE(operation->error()) << status;
    EXPECT_EQ(operation->error()->domain, platform::URLErrorDomain);
    EXPECT_EQ(operation->error()->code, -1008) << status;
    EXPECT_FALSE(operation->isUpdated());
    EXPECT_EQ(ShelfWorld::contents(path), "old bytes") << status;
  }
}

TEST_F(AssetDownloadOperation, failuresOfTheTransportAreItsErrors) {
  world.folder.write("asset", "old bytes");
  const auto server = std::make_unique<ScriptedServer>(
      [](const auto&, tests::ScriptedConnection& connection) { connection.reset(); });
  const auto operation = make(server->URL("/index"), path);
  run(operation);
  ASSERT_TRUE(operation->error());
  EXPECT_EQ(operation->error()->domain, platform::URLErrorDomain);
  EXPECT_NE(operation->error()->code, -1008);
  EXPECT_EQ(ShelfWorld::contents(path), "old bytes");
}

TEST_F(AssetDownloadOperation, aTruncatedAnswerLeavesTheFile) {
  world.folder.write("asset", "old bytes");
  const auto server = ScriptedServer::sending("HTTP/1.1 200 OK\r\nContent-Length: 100\r\n\r\nhalf");
  const auto operation = make(server->URL("/index"), path);
  run(operation);
  ASSERT_TRUE(operation->error());
  EXPECT_TRUE(platform::isURLError(*operation->error(), platform::URLErrorNetworkConnectionLost));
  EXPECT_EQ(ShelfWorld::contents(path), "old bytes");
}

TEST_F(AssetDownloadOperation, withoutURLOrDestinationFailsWithoutAsking) {
  for (const bool hasURL : {true, false}) {
    const auto operation =
        ZEBAssetDownloadOperation::initWithBook(world.makeBook("org.remote", 4), world.shelf);
    if (hasURL) {
      operation->setRemoteURL(testURL("http://127.0.0.1:1/"));
    } else {
      operation->setDestinationFilePath(path);
    }
    run(operation);
    ASSERT_TRUE(operation->error());
    EXPECT_EQ(*operation->error(), (platform::Error{"NSURLErrorDomain", -1, ""}));
    EXPECT_EQ(operation->task(), nullptr);
  }
  EXPECT_THAT(world.logged(), IsEmpty());
}

TEST_F(AssetDownloadOperation, aURLThatMakesNoRequestFailsWithAText) {
  const auto operation = make("no/scheme", path);
  run(operation);
  ASSERT_TRUE(operation->error());
  EXPECT_EQ(*operation->error(),
            (platform::Error{"NSURLErrorDomain", -1000, "Failed to create download task"}));
  EXPECT_EQ(operation->request(), std::nullopt);
  EXPECT_THAT(world.logged(), IsEmpty());
}

TEST_F(AssetDownloadOperation, aFileThatCannotBeWrittenIsLoggedAndNoError) {
  world.files->fail(FailingFileManager::Operation::write, ENOSPC, "asset");
  const auto server = ScriptedServer::sending(httpAnswer(200, "bytes"));
  const auto operation = make(server->URL("/index"), path);
  run(operation);
  EXPECT_EQ(operation->error(), std::nullopt);
  EXPECT_TRUE(operation->isUpdated());
  EXPECT_FALSE(ShelfWorld::exists(path));
  EXPECT_THAT(world.messages(1), ElementsAre("Couldn't write updated asset data to " + path));
}

TEST_F(AssetDownloadOperation, cancellingEndsItAtOnceAndKeepsTheCancellation) {
  const auto server =
      std::make_unique<ScriptedServer>([](const auto&, tests::ScriptedConnection& connection) {
        connection.send("HTTP/1.1 200 OK\r\nContent-Length: 100\r\n\r\nhalf");
        connection.waitUntilClientIsGone();
      });
  const auto operation = make(server->URL("/index"), path);
  const auto recorder = std::make_shared<FinishRecorder>();
  operation->addObserver(recorder, platform::isFinishedKey);
  world.shelf->assetDownloadQueue()->addOperation(operation);
  server->waitForRequests(1);
  operation->cancel();
  EXPECT_TRUE(operation->isFinished());
  EXPECT_TRUE(operation->isCancelled());
  EXPECT_TRUE(world.runMainLoopUntil([&] { return operation->error().has_value(); }));
  EXPECT_TRUE(platform::isURLError(*operation->error(), platform::URLErrorCancelled));
  // The cancellation itself, the task's first finish without an error, its second with it.
  EXPECT_TRUE(world.runMainLoopUntil([&] { return recorder->errors().size() == 3; }));
  EXPECT_EQ(recorder->errors()[0], std::nullopt);
  EXPECT_EQ(recorder->errors()[1], std::nullopt);
  EXPECT_TRUE(recorder->errors()[2]);
  ASSERT_THAT(world.messages(3), testing::SizeIs(2));
  EXPECT_THAT(world.messages(3)[1], HasSubstr("Asset Download cancelled: "));
  EXPECT_FALSE(ShelfWorld::exists(path));
  server->waitUntilAllClientsAreGone();
}

TEST_F(AssetDownloadOperation, aTransferThatIsCancelledUnderItFinishesItTwice) {
  const auto server =
      std::make_unique<ScriptedServer>([](const auto&, tests::ScriptedConnection& connection) {
        connection.waitUntilClientIsGone();
      });
  const auto operation = make(server->URL("/index"), path);
  const auto recorder = std::make_shared<FinishRecorder>();
  operation->addObserver(recorder, platform::isFinishedKey);
  world.shelf->assetDownloadQueue()->addOperation(operation);
  server->waitForRequests(1);
  operation->task()->cancel();
  EXPECT_TRUE(world.runMainLoopUntil([&] { return recorder->errors().size() == 2; }));
  EXPECT_EQ(recorder->errors()[0], std::nullopt);
  ASSERT_TRUE(recorder->errors()[1]);
  EXPECT_TRUE(platform::isURLError(*recorder->errors()[1], platform::URLErrorCancelled));
  EXPECT_FALSE(operation->isCancelled());
  EXPECT_TRUE(platform::isURLError(*operation->error(), platform::URLErrorCancelled));
}

TEST_F(AssetDownloadOperation, cancelledBeforeItStartsAsksNobody) {
  const auto server = ScriptedServer::sending(httpAnswer(200, "bytes"));
  const auto operation = make(server->URL("/index"), path);
  operation->cancel();
  operation->start();
  EXPECT_TRUE(operation->isFinished());
  EXPECT_EQ(operation->error(), std::nullopt);
  EXPECT_EQ(operation->task(), nullptr);
  EXPECT_THAT(server->requests(), IsEmpty());
}

TEST_F(AssetDownloadOperation, isKeptByItsTaskUntilThatHasEndedAndNotAMomentLonger) {
  tests::Latch mayAnswer;
  const auto server =
      std::make_unique<ScriptedServer>([&](const auto&, tests::ScriptedConnection& connection) {
        mayAnswer.wait();
        connection.send(httpAnswer(200, "bytes"));
        connection.close();
      });
  std::shared_ptr<ZEBAssetDownloadOperation> operation = make(server->URL("/index"), path);
  const std::weak_ptr<ZEBAssetDownloadOperation> weak = operation;
  operation->start();
  const auto task = operation->task();
  operation.reset();
  EXPECT_FALSE(weak.expired());
  mayAnswer.open();
  EXPECT_TRUE(world.runMainLoopUntil([&] { return weak.expired(); }));
  EXPECT_EQ(ShelfWorld::contents(path), "bytes");
  EXPECT_NE(task, nullptr);
}

TEST_F(AssetDownloadOperation, doesNotKeepTheShelf) {
  const auto operation = make("http://127.0.0.1:1/", path);
  world.dropShelf();
  EXPECT_EQ(operation->indexshelf(), nullptr);
}

TEST(ZEBErrorTest, hasDomainCodeAndDescription) {
  EXPECT_EQ(zeb_errorWithDomain("Domain", -3, "text"), (platform::Error{"Domain", -3, "text"}));
}

}  // namespace
