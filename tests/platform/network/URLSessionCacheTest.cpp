// Sessions and their cache.
#include <gmock/gmock.h>

#include <atomic>
#include <filesystem>

#include "platform/URLSession.h"
#include "tests/platform/network/SessionFixture.h"
#include "tests/support/NginxServer.h"
#include "tests/support/ScriptedServer.h"

namespace {

using namespace platform;
using namespace tests;
using ::testing::ElementsAre;
using Policy = URLRequestCachePolicy;

class URLSessionCacheTest : public SessionTest {
 protected:
  std::shared_ptr<URLSession> session =
      URLSession::sessionWithConfiguration(URLSessionConfiguration::defaultSessionConfiguration());
  std::shared_ptr<URLSession> uncached = URLSession::sessionWithConfiguration(
      URLSessionConfiguration::ephemeralSessionConfiguration());
};

TEST_F(URLSessionCacheTest, GivesARevalidatedAnswerAsTheCachedOne) {
  const NginxServer server;
  server.write("index", "the index");
  server.setModified("index", 1000000000);
  const Outcome first = fetch(session, requestOf(server.URL("/index")));
  const Outcome second = fetch(session, requestOf(server.URL("/index")));
  EXPECT_EQ(second.status(), 200);
  EXPECT_EQ(second.body(), "the index");
  EXPECT_EQ(second.response->valueForHTTPHeaderField("ETag"),
            first.response->valueForHTTPHeaderField("ETag"));
  EXPECT_THAT(server.waitForAccessLog(2), ElementsAre("GET /index 200 9", "GET /index 304 0"));
}

TEST_F(URLSessionCacheTest, RevalidatesInALaterProcess) {
  const NginxServer server;
  server.write("index", "the index");
  fetch(session, requestOf(server.URL("/index")));
  // Only the disk remembers.
  URLSessionConfiguration configuration = URLSessionConfiguration::ephemeralSessionConfiguration();
  configuration.setURLCache(
      URLCache::initWithMemoryCapacity(0, 1 << 20, folder.path("caches/zeb/URLCache")));
  const Outcome later =
      fetch(URLSession::sessionWithConfiguration(configuration), requestOf(server.URL("/index")));
  EXPECT_EQ(later.body(), "the index");
  EXPECT_EQ(server.waitForAccessLog(2).back(), "GET /index 304 0");
}

TEST_F(URLSessionCacheTest, PicksUpANewVersion) {
  const NginxServer server;
  server.write("index", "old");
  server.setModified("index", 1000000000);
  fetch(session, requestOf(server.URL("/index")));
  server.write("index", "newer");
  EXPECT_EQ(fetch(session, requestOf(server.URL("/index"))).body(), "newer");
  EXPECT_EQ(fetch(session, requestOf(server.URL("/index"))).body(), "newer");
  EXPECT_THAT(server.waitForAccessLog(3),
              ElementsAre("GET /index 200 3", "GET /index 200 5", "GET /index 304 0"));
}

TEST_F(URLSessionCacheTest, RevalidatesAnAnswerThatWasEncoded) {
  const NginxServer server("gzip on; gzip_types application/octet-stream; gzip_min_length 1;");
  const std::string body(50000, 'a');
  server.write("index", body);
  fetch(session, requestOf(server.URL("/index")));
  EXPECT_EQ(fetch(session, requestOf(server.URL("/index"))).body(), body);
  EXPECT_EQ(server.waitForAccessLog(2).back(), "GET /index 304 0");
}

TEST_F(URLSessionCacheTest, PassesABare304On) {
  const NginxServer server;
  server.write("index", "the index");
  const std::string tag = fetch(session, requestOf(server.URL("/index")))
                              .response->valueForHTTPHeaderField("ETag")
                              .value();
  URLRequest conditional = requestOf(server.URL("/index"));
  conditional.setValueForHTTPHeaderField(tag, "If-None-Match");
  for (const auto& any : {session, uncached}) {
    const Outcome outcome = fetch(any, conditional);
    EXPECT_EQ(outcome.status(), 304);
    EXPECT_EQ(outcome.body(), "");
    EXPECT_EQ(outcome.code(), 0);
  }
}

TEST_F(URLSessionCacheTest, AsksNobodyWhileAnAnswerIsFresh) {
  const NginxServer server("location /fresh/ { expires 1h; }");
  server.write("fresh/index", "the index");
  fetch(session, requestOf(server.URL("/fresh/index")));
  server.waitForAccessLog(1);
  const auto delegate = std::make_shared<RecordingDelegate>();
  sessionWithDelegate(delegate)
      ->dataTaskWithRequest(requestOf(server.URL("/fresh/index")))
      ->resume();
  ASSERT_TRUE(delegate->completed.wait());
  EXPECT_THAT(delegate->events(), ElementsAre("response 200", "data", "completion"));
  EXPECT_EQ(delegate->body(), "the index");
  EXPECT_EQ(server.accessLog().size(), 1U);
}

TEST_F(URLSessionCacheTest, KeepsARevalidatedAnswerFreshAgain) {
  ScriptedServer server([](const ScriptedRequest& request, ScriptedConnection& connection) {
    connection.send(request.header("If-None-Match")
                        ? httpAnswer(304, "", {"ETag: \"1\"", "Cache-Control: max-age=3600"})
                        : httpAnswer(200, "body", {"ETag: \"1\"", "Cache-Control: no-cache"}));
  });
  for (int i = 0; i < 4; ++i) {
    EXPECT_EQ(fetch(session, requestOf(server.URL("/"))).body(), "body");
  }
  EXPECT_EQ(server.requests().size(), 2U);
  URLSessionConfiguration configuration = URLSessionConfiguration::ephemeralSessionConfiguration();
  configuration.setURLCache(
      URLCache::initWithMemoryCapacity(0, 1 << 20, folder.path("caches/zeb/URLCache")));
  EXPECT_EQ(
      fetch(URLSession::sessionWithConfiguration(configuration), requestOf(server.URL("/"))).body(),
      "body");
  EXPECT_EQ(server.requests().size(), 2U);
}

TEST_F(URLSessionCacheTest, AsksAgainWhenA304SpeaksOfAnotherVersion) {
  ScriptedServer server([](const ScriptedRequest& request, ScriptedConnection& connection) {
    connection.send(request.header("If-None-Match") ? httpAnswer(304, "", {"ETag: \"2\""})
                                                    : httpAnswer(200, "body", {"ETag: \"1\""}));
  });
  fetch(session, requestOf(server.URL("/")));
  const Outcome outcome = fetch(session, requestOf(server.URL("/")));
  EXPECT_EQ(outcome.status(), 200);
  EXPECT_EQ(outcome.body(), "body");
  EXPECT_EQ(server.requests().size(), 3U);
}

TEST_F(URLSessionCacheTest, ReloadsWhenTheCacheIsToBeIgnored) {
  const NginxServer server("location /fresh/ { expires 1h; }");
  server.write("fresh/index", "old");
  const std::string url = server.URL("/fresh/index");
  fetch(session, requestOf(url));
  server.write("fresh/index", "new");
  EXPECT_EQ(fetch(session, requestOf(url)).body(), "old");
  EXPECT_EQ(fetch(session, requestOf(url, Policy::reloadIgnoringLocalCacheData)).body(), "new");
  EXPECT_EQ(fetch(session, requestOf(url)).body(), "new");
  EXPECT_THAT(server.waitForAccessLog(2),
              ElementsAre("GET /fresh/index 200 3", "GET /fresh/index 200 3"));
}

TEST_F(URLSessionCacheTest, ReturnsWhatIsCachedElseLoads) {
  const NginxServer server;
  server.write("index", "old");
  const URLRequest request = requestOf(server.URL("/index"), Policy::returnCacheDataElseLoad);
  EXPECT_EQ(fetch(session, request).body(), "old");
  server.write("index", "newer");
  EXPECT_EQ(fetch(session, request).body(), "old");
  EXPECT_EQ(server.waitForAccessLog(1).size(), 1U);
}

TEST_F(URLSessionCacheTest, ReturnsOnlyWhatIsCachedWhenNotToLoad) {
  const NginxServer server;
  server.write("index", "the index");
  const URLRequest request = requestOf(server.URL("/index"), Policy::returnCacheDataDontLoad);
  const Outcome nothing = fetch(session, request);
  EXPECT_EQ(nothing.error->domain, "NSURLErrorDomain");
  EXPECT_EQ(nothing.code(), -1008);
  EXPECT_EQ(fetch(uncached, request).code(), -1008);
  fetch(session, requestOf(server.URL("/index")));
  EXPECT_EQ(fetch(session, request).body(), "the index");
  EXPECT_EQ(server.waitForAccessLog(1).size(), 1U);
}

TEST_F(URLSessionCacheTest, StoresOnlyWhatTheDelegateLets) {
  const NginxServer server;
  server.write("index", "the index");
  const auto delegate = std::make_shared<RecordingDelegate>();
  delegate->onWillCache = [](const auto& proposed, const auto& handler) {
    EXPECT_TRUE(proposed->data().empty());
    EXPECT_EQ(proposed->response()->statusCode(), 200);
    handler(nullptr);
  };
  sessionWithDelegate(delegate)->dataTaskWithRequest(requestOf(server.URL("/index")))->resume();
  ASSERT_TRUE(delegate->completed.wait());
  EXPECT_EQ(delegate->body(), "the index");
  EXPECT_EQ(URLCache::sharedURLCache()->cachedResponseForRequest(requestOf(server.URL("/index"))),
            nullptr);
}

TEST_F(URLSessionCacheTest, StoresTheResponseThatTheDelegateChose) {
  const NginxServer server;
  server.write("index", "the index");
  const auto delegate = std::make_shared<RecordingDelegate>();
  delegate->onWillCache = [](const auto& proposed, const auto& handler) {
    HTTPHeaderFields fields = proposed->response()->allHeaderFields();
    fields["X-Seen"] = "yes";
    handler(CachedURLResponse::initWithResponse(
        URLResponse::initWithURL(proposed->response()->URL(), 200, "HTTP/1.1", fields), Data(),
        URLCacheStoragePolicy::allowedInMemoryOnly));
  };
  sessionWithDelegate(delegate)->dataTaskWithRequest(requestOf(server.URL("/index")))->resume();
  ASSERT_TRUE(delegate->completed.wait());
  const auto kept =
      URLCache::sharedURLCache()->cachedResponseForRequest(requestOf(server.URL("/index")));
  ASSERT_NE(kept, nullptr);
  EXPECT_EQ(kept->data().view(), "the index");
  EXPECT_EQ(kept->response()->valueForHTTPHeaderField("X-Seen"), "yes");
  EXPECT_EQ(URLCache::sharedURLCache()->currentDiskUsage(), 0U);
}

TEST_F(URLSessionCacheTest, StoresNothingThatIsNotWhole) {
  const auto isKept = [&](const std::string& bytes) {
    const auto server = ScriptedServer::sending(bytes);
    const URLRequest request = requestOf(server->URL("/"));
    fetch(session, request);
    return URLCache::sharedURLCache()->cachedResponseForRequest(request) != nullptr;
  };
  EXPECT_TRUE(isKept("HTTP/1.1 200 OK\r\nContent-Length: 4\r\n\r\nbody"));
  EXPECT_FALSE(isKept("HTTP/1.1 200 OK\r\nContent-Length: 9\r\n\r\nbody"));
  EXPECT_FALSE(isKept("HTTP/1.1 200 OK\r\nTransfer-Encoding: chunked\r\n\r\n4\r\nbody\r\n"));
  EXPECT_FALSE(isKept("HTTP/1.0 200 OK\r\n\r\nbody"));
  EXPECT_FALSE(isKept("HTTP/1.1 404 No\r\nContent-Length: 4\r\n\r\nbody"));
  EXPECT_FALSE(
      isKept("HTTP/1.1 200 OK\r\nCache-Control: no-store\r\nContent-Length: 4\r\n\r\nbody"));
}

TEST_F(URLSessionCacheTest, CollectsNothingThatTheCacheCannotHold) {
  URLSessionConfiguration configuration = URLSessionConfiguration::ephemeralSessionConfiguration();
  const auto small = URLCache::initWithMemoryCapacity(1000, 2000, folder.path("caches/small"));
  configuration.setURLCache(small);
  const NginxServer server;
  server.write("index", std::string(5000, 'x'));
  const Outcome outcome =
      fetch(URLSession::sessionWithConfiguration(configuration), requestOf(server.URL("/index")));
  EXPECT_EQ(outcome.body().size(), 5000U);
  EXPECT_EQ(small->currentMemoryUsage() + small->currentDiskUsage(), 0U);
}

TEST_F(URLSessionCacheTest, GivesTheErrorPageOfARevalidation) {
  std::atomic<bool> gone{false};
  ScriptedServer server([&](const ScriptedRequest&, ScriptedConnection& connection) {
    connection.send(gone ? httpAnswer(500, "broken") : httpAnswer(200, "body", {"ETag: \"1\""}));
  });
  fetch(session, requestOf(server.URL("/")));
  gone = true;
  EXPECT_EQ(fetch(session, requestOf(server.URL("/"))).status(), 500);
  gone = false;
  EXPECT_EQ(fetch(session, requestOf(server.URL("/"))).body(), "body");
}

TEST_F(URLSessionCacheTest, LoadsWhatTheCacheCannotRead) {
  const NginxServer server("location /fresh/ { expires 1h; }");
  server.write("fresh/index", "the index");
  fetch(session, requestOf(server.URL("/fresh/index")));
  for (const auto& file : std::filesystem::directory_iterator(folder.path("caches/zeb/URLCache"))) {
    std::filesystem::resize_file(file.path(), 40);
  }
  URLSessionConfiguration configuration = URLSessionConfiguration::ephemeralSessionConfiguration();
  configuration.setURLCache(
      URLCache::initWithMemoryCapacity(0, 1 << 20, folder.path("caches/zeb/URLCache")));
  EXPECT_EQ(fetch(URLSession::sessionWithConfiguration(configuration),
                  requestOf(server.URL("/fresh/index")))
                .body(),
            "the index");
  EXPECT_EQ(server.waitForAccessLog(2).size(), 2U);
}

}  // namespace
