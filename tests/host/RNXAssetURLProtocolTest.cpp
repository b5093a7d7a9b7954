#include "host/Zebrine/RNXAssetURLProtocol.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "SearchKit/IndexWriter.h"
#include "host/Zebrine/RNXExpectedAssets.h"
#include "host/Zebrine/ZEBAuthChallengeHandler.h"
#include "platform/ClassicArchive.h"
#include "platform/PropertyList.h"
#include "tests/host/AssetLoading.h"
#include "tests/support/ScriptedServer.h"

using testing::IsEmpty;
using testing::SizeIs;
using tests::answering;
using tests::httpAnswer;
using tests::ScriptedServer;
using tests::urlOf;
using Kind = RNXExpectedAsset::Kind;

namespace {

std::string indexBytes(const std::string& word) {
  searchkit::IndexWriter writer;
  searchkit::Document page;
  page.path = "/a.html";
  page.title = "A";
  page.abstract = "About A";
  page.body = {word};
  writer.add(std::move(page));
  return std::string(platform::classicArchiveWithRootObject(
                         platform::Value::Dictionary{{"SKI_INDEX_DATA", writer.finish()}})
                         .view());
}

std::string listBytes() {
  return std::string(
      platform::dataFromPropertyList(platform::Value::Dictionary{{"wifi", "network"}},
                                     platform::PropertyListFormat::xml)
          .view());
}

class RNXAssetURLProtocolTest : public testing::Test {
 protected:
  RNXAssetURLProtocolTest() {
    RNXAssetURLProtocol::registerProtocolWithAuthHandler(
        ZEBAuthChallengeHandler::initWithServiceName("org.zeb.help"));
  }

  static tests::LoadedAsset load(const std::string& url, bool marked = true) {
    return tests::loadAsset(url, marked);
  }

  static void expect(const std::string& url, const std::string& bytes,
                     Kind kind = Kind::searchIndex,
                     std::optional<std::string> localPath = std::nullopt) {
    RNXExpectedAssets::shared().expect(urlOf(url),
                                       {kind, platform::sha256Digest(bytes), std::move(localPath)});
  }

  static void expectFailure(const tests::LoadedAsset& result, platform::URLErrorCode code) {
    EXPECT_EQ(result.data, std::nullopt);
    ASSERT_TRUE(result.error);
    EXPECT_TRUE(platform::isURLError(*result.error, code)) << result.error->description;
  }

  tests::RemoteHostWorld world;
  const std::string index = indexBytes("applet");
};

TEST_F(RNXAssetURLProtocolTest, passesOnTheFileThatTheCatalogueNames) {
  const auto server = ScriptedServer::sending(httpAnswer(200, index));
  expect(server->URL("/i"), index);
  const tests::LoadedAsset result = load(server->URL("/i"));
  EXPECT_EQ(result.error, std::nullopt);
  ASSERT_TRUE(result.data);
  EXPECT_EQ(result.data->view(), index);
  EXPECT_EQ(result.response->statusCode(), 200);
}

TEST_F(RNXAssetURLProtocolTest, passesNothingOnOfAFileWithAnotherDigest) {
  const auto server = ScriptedServer::sending(httpAnswer(200, indexBytes("gadget")));
  expect(server->URL("/i"), index);
  expectFailure(load(server->URL("/i")), platform::URLErrorBadServerResponse);
}

TEST_F(RNXAssetURLProtocolTest, passesNothingOnOfATruncatedFile) {
  for (const std::string& answer :
       {"HTTP/1.1 200 OK\r\nContent-Length: " + std::to_string(index.size()) + "\r\n\r\n" +
            index.substr(0, 100),
        // Whose end only the connection's end tells.
        "HTTP/1.1 200 OK\r\nConnection: close\r\n\r\n" + index.substr(0, 100)}) {
    const auto server = ScriptedServer::sending(answer);
    expect(server->URL("/i"), index);
    const tests::LoadedAsset result = load(server->URL("/i"));
    EXPECT_EQ(result.data, std::nullopt);
    EXPECT_TRUE(result.error);
  }
}

TEST_F(RNXAssetURLProtocolTest, passesNothingOnOfAnIndexThatDoesNotOpen) {
  const std::string broken = std::string(
      platform::classicArchiveWithRootObject(
          platform::Value::Dictionary{{"SKI_INDEX_DATA", platform::Data::copy("no index")}})
          .view());
  for (const std::string& bytes : {std::string("no archive"), std::string(), broken}) {
    const auto server = ScriptedServer::sending(httpAnswer(200, bytes));
    expect(server->URL("/i"), bytes);
    expectFailure(load(server->URL("/i")), platform::URLErrorCannotParseResponse);
  }
}

TEST_F(RNXAssetURLProtocolTest, passesNothingOnOfAListThatIsNone) {
  const std::string list = listBytes();
  const auto server = ScriptedServer::routing({{"/good", answering(httpAnswer(200, list))},
                                               {"/bad", answering(httpAnswer(200, "no list"))}});
  expect(server->URL("/good"), list, Kind::exactMatch);
  expect(server->URL("/bad"), "no list", Kind::exactMatch);
  EXPECT_EQ(load(server->URL("/good")).data->view(), list);
  expectFailure(load(server->URL("/bad")), platform::URLErrorCannotParseResponse);
}

TEST_F(RNXAssetURLProtocolTest, checksRequestsThatAreNotMarkedToo) {
  const auto server = ScriptedServer::sending(httpAnswer(200, "other bytes"));
  expect(server->URL("/i"), index);
  expectFailure(load(server->URL("/i"), false), platform::URLErrorBadServerResponse);
}

TEST_F(RNXAssetURLProtocolTest, passesOnWhatNoCatalogueNamesAsItIs) {
  const auto server = ScriptedServer::sending(httpAnswer(200, "anything"));
  EXPECT_EQ(load(server->URL("/other")).data->view(), "anything");
}

TEST_F(RNXAssetURLProtocolTest, leavesUnmarkedRequestsOfNoCatalogueAlone) {
  const auto request = *platform::URLRequest::requestWithURL(urlOf("https://a.example/unknown"));
  EXPECT_FALSE(RNXAssetURLProtocol::canInitWithRequest(request));
}

TEST_F(RNXAssetURLProtocolTest, passesOnAnswersOfOtherStatusesAsTheyAre) {
  for (const int status : {304, 404, 500}) {
    const auto server = ScriptedServer::sending(httpAnswer(status, status == 304 ? "" : "page"));
    expect(server->URL("/i"), index);
    const tests::LoadedAsset result = load(server->URL("/i"));
    EXPECT_EQ(result.error, std::nullopt);
    ASSERT_NE(result.response, nullptr);
    EXPECT_EQ(result.response->statusCode(), status);
    EXPECT_EQ(result.data->view(), status == 304 ? "" : "page");
  }
}

TEST_F(RNXAssetURLProtocolTest, aFileThatIsHereAlreadyIsNotAskedFor) {
  const auto server = ScriptedServer::sending(httpAnswer(500, ""));
  const std::string path = world.folder.write("kept", index);
  expect(server->URL("/i"), index, Kind::searchIndex, path);
  const tests::LoadedAsset result = load(server->URL("/i"));
  EXPECT_EQ(result.response->statusCode(), 200);
  EXPECT_EQ(result.data->view(), index);
  EXPECT_THAT(server->requests(), IsEmpty());
}

TEST_F(RNXAssetURLProtocolTest, anotherFileInItsPlaceIsAskedFor) {
  const auto server = ScriptedServer::sending(httpAnswer(200, index));
  const std::string path = world.folder.write("kept", indexBytes("gadget"));
  expect(server->URL("/i"), index, Kind::searchIndex, path);
  EXPECT_EQ(load(server->URL("/i")).data->view(), index);
  EXPECT_THAT(server->requests(), SizeIs(1));
}

TEST_F(RNXAssetURLProtocolTest, whatTheCacheHasRevalidatedComesAsTheCachedAnswer) {
  const auto server = std::make_unique<ScriptedServer>(
      [this](const tests::ScriptedRequest& request, tests::ScriptedConnection& connection) {
        const bool isConditional = request.header("If-None-Match") == "\"tag\"";
        connection.send(isConditional
                            ? httpAnswer(304, "", {"ETag: \"tag\""})
                            : httpAnswer(200, index, {"ETag: \"tag\"", "Cache-Control: no-cache"}));
      });
  expect(server->URL("/i"), index);
  for (int i = 0; i < 3; ++i) {
    const tests::LoadedAsset result = load(server->URL("/i"));
    ASSERT_TRUE(result.data);
    EXPECT_EQ(result.response->statusCode(), 200);
    EXPECT_EQ(result.data->view(), index);
  }
  const auto requests = server->requests();
  ASSERT_THAT(requests, SizeIs(3));
  EXPECT_EQ(requests[0].header("If-None-Match"), std::nullopt);
  EXPECT_EQ(requests[2].header("If-None-Match"), "\"tag\"");
}

TEST_F(RNXAssetURLProtocolTest, aWrongFileIsNotKeptInTheCache) {
  std::atomic<bool> isRight{false};
  const auto server = std::make_unique<ScriptedServer>([&](const tests::ScriptedRequest&,
                                                           tests::ScriptedConnection& connection) {
    connection.send(httpAnswer(200, isRight ? index : "wrong", {"Cache-Control: max-age=1000"}));
  });
  expect(server->URL("/i"), index);
  expectFailure(load(server->URL("/i")), platform::URLErrorBadServerResponse);
  isRight = true;
  EXPECT_EQ(load(server->URL("/i")).data->view(), index);
}

TEST_F(RNXAssetURLProtocolTest, checksWhatARedirectLeadsTo) {
  const auto server =
      ScriptedServer::routing({{"/i", answering(httpAnswer(302, "", {"Location: /right"}))},
                               {"/j", answering(httpAnswer(302, "", {"Location: /wrong"}))},
                               {"/right", answering(httpAnswer(200, index))},
                               {"/wrong", answering(httpAnswer(200, "wrong"))}});
  expect(server->URL("/i"), index);
  expect(server->URL("/j"), index);
  EXPECT_EQ(load(server->URL("/i")).data->view(), index);
  expectFailure(load(server->URL("/j")), platform::URLErrorBadServerResponse);
}

TEST_F(RNXAssetURLProtocolTest, sendsCredentialsToTheServerThatTheyAreForAndToNoOther) {
  ScriptedServer other([](const tests::ScriptedRequest&, tests::ScriptedConnection& connection) {
    connection.send(httpAnswer(200, "from the other"));
  });
  const auto server = ScriptedServer::routing(
      {{"/here", answering(httpAnswer(200, "from here"))},
       {"/within", answering(httpAnswer(302, "", {"Location: /here"}))},
       {"/away", answering(httpAnswer(302, "", {"Location: " + other.URL("/there")}))}});
  world.setCredential(
      {{"Host", "127.0.0.1"}, {"Port", server->port()}, {"Scheme", "bearer"}, {"Token", "secret"}});
  EXPECT_EQ(load(server->URL("/within")).data->view(), "from here");
  EXPECT_EQ(load(server->URL("/away")).data->view(), "from the other");
  EXPECT_EQ(load(other.URL("/there")).data->view(), "from the other");
  for (const tests::ScriptedRequest& request : server->requests()) {
    EXPECT_EQ(request.header("Authorization"), "Bearer secret") << request.target;
  }
  for (const tests::ScriptedRequest& request : other.requests()) {
    EXPECT_EQ(request.header("Authorization"), std::nullopt);
  }
}

TEST_F(RNXAssetURLProtocolTest, aServerReachedByRedirectGetsNoCredentialsOfItsOwnEither) {
  ScriptedServer other([](const tests::ScriptedRequest&, tests::ScriptedConnection& connection) {
    connection.send(httpAnswer(200, "from the other"));
  });
  const auto server =
      ScriptedServer::sending(httpAnswer(302, "", {"Location: " + other.URL("/there")}));
  world.setCredential(
      {{"Host", "127.0.0.1"}, {"Port", other.port()}, {"Scheme", "bearer"}, {"Token", "secret"}});
  EXPECT_EQ(load(server->URL("/away")).data->view(), "from the other");
  ASSERT_THAT(other.requests(), SizeIs(1));
  EXPECT_EQ(other.requests()[0].header("Authorization"), std::nullopt);
}

TEST_F(RNXAssetURLProtocolTest, cancellingATaskEndsTheTransfer) {
  ScriptedServer server([](const auto&, tests::ScriptedConnection& connection) {
    connection.send("HTTP/1.1 200 OK\r\nContent-Length: 100\r\n\r\nhalf");
    connection.waitUntilClientIsGone();
  });
  expect(server.URL("/i"), index);
  auto request = *platform::URLRequest::requestWithURL(urlOf(server.URL("/i")));
  tests::Latch done;
  std::optional<platform::Error> failure;
  const auto task = platform::URLSession::sharedSession()->dataTaskWithRequest(
      request, [&](auto, auto, auto error) {
        failure = std::move(error);
        done.open();
      });
  task->resume();
  server.waitForRequests(1);
  task->cancel();
  EXPECT_TRUE(done.wait());
  EXPECT_TRUE(failure && platform::isURLError(*failure, platform::URLErrorCancelled));
  server.waitUntilAllClientsAreGone();
}

}  // namespace
