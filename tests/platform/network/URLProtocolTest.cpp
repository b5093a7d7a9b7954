// Protocols of a program's own before the session's.
#include "platform/URLProtocol.h"

#include <gmock/gmock.h>

#include <atomic>
#include <thread>

#include "platform/URLSession.h"
#include "tests/platform/network/SessionFixture.h"
#include "tests/support/NginxServer.h"

namespace {

using namespace platform;
using namespace tests;
using ::testing::ElementsAre;

constexpr const char* mark = "TestMark";

/// A protocol that does what a test tells it.
class ScriptedProtocol : public URLProtocol {
 public:
  using Script = std::function<void(ScriptedProtocol&)>;
  struct Counts {
    std::atomic<int> started{0};
    Counter stopped;
    std::atomic<int> suspended{0};
    std::atomic<int> resumed{0};
  };

  static std::shared_ptr<const URLProtocolClass> kind(const std::shared_ptr<Counts>& counts,
                                                      const Script& script) {
    URLProtocolClass made;
    made.canInitWithRequest = [](const URLRequest& request) {
      return URLProtocol::propertyForKey(mark, request).boolValue();
    };
    made.initWithRequest = [counts, script](URLRequest request,
                                            std::shared_ptr<URLProtocolClient> client) {
      return std::shared_ptr<URLProtocol>(
          new ScriptedProtocol(std::move(request), std::move(client), counts, script));
    };
    return std::make_shared<const URLProtocolClass>(made);
  }

  void startLoading() override {
    ++_counts->started;
    _script(*this);
  }
  void stopLoading() override { _counts->stopped.add(); }
  void suspendLoading() override { ++_counts->suspended; }
  void resumeLoading() override { ++_counts->resumed; }

  void respond(int status = 200, URLCacheStoragePolicy policy = URLCacheStoragePolicy::notAllowed) {
    client().URLProtocolDidReceiveResponse(
        *this, URLResponse::initWithURL(request().URL(), status, "HTTP/1.1", {}), policy);
  }
  void load(const std::string& body) { client().URLProtocolDidLoadData(*this, Data::copy(body)); }
  void finish() { client().URLProtocolDidFinishLoading(*this); }

 private:
  ScriptedProtocol(URLRequest request, std::shared_ptr<URLProtocolClient> client,
                   std::shared_ptr<Counts> counts, Script script)
      : URLProtocol(std::move(request), std::move(client)),
        _counts(std::move(counts)),
        _script(std::move(script)) {}

  const std::shared_ptr<Counts> _counts;
  const Script _script;
};

class URLProtocolTest : public SessionTest {
 protected:
  ~URLProtocolTest() override {
    for (const auto& kind : _kinds) {
      URLProtocol::unregisterClass(kind);
    }
  }

  std::shared_ptr<const URLProtocolClass> registered(const ScriptedProtocol::Script& script) {
    auto kind = ScriptedProtocol::kind(counts, script);
    EXPECT_TRUE(URLProtocol::registerClass(kind));
    _kinds.push_back(kind);
    return kind;
  }

  static URLRequest markedRequest(const std::string& url = "http://books.example/a") {
    URLRequest request = requestOf(url);
    URLProtocol::setProperty(true, mark, request);
    return request;
  }

  const std::shared_ptr<ScriptedProtocol::Counts> counts =
      std::make_shared<ScriptedProtocol::Counts>();
  const std::shared_ptr<URLSession> session =
      URLSession::sessionWithConfiguration(URLSessionConfiguration::defaultSessionConfiguration());

 private:
  std::vector<std::shared_ptr<const URLProtocolClass>> _kinds;
};

TEST_F(URLProtocolTest, TakesOverMarkedRequests) {
  registered([](ScriptedProtocol& protocol) {
    protocol.respond();
    protocol.load("from the ");
    protocol.load("protocol");
    protocol.finish();
  });
  const NginxServer server;
  server.write("a", "from the server");
  EXPECT_EQ(fetch(session, markedRequest(server.URL("/a"))).body(), "from the protocol");
  EXPECT_EQ(fetch(URLSession::sharedSession(), markedRequest()).body(), "from the protocol");
  EXPECT_EQ(fetch(session, requestOf(server.URL("/a"))).body(), "from the server");
  EXPECT_EQ(counts->started, 2);
  EXPECT_TRUE(counts->stopped.waitFor(2));
}

TEST_F(URLProtocolTest, IsAskedLastRegisteredFirst) {
  registered([](ScriptedProtocol& protocol) {
    protocol.respond(201);
    protocol.finish();
  });
  const auto second = registered([](ScriptedProtocol& protocol) {
    protocol.respond(202);
    protocol.finish();
  });
  EXPECT_FALSE(URLProtocol::registerClass(second));
  EXPECT_EQ(fetch(session, markedRequest()).status(), 202);
  URLProtocol::unregisterClass(second);
  EXPECT_EQ(fetch(session, markedRequest()).status(), 201);
  URLSessionConfiguration configuration = URLSessionConfiguration::ephemeralSessionConfiguration();
  configuration.setProtocolClasses({second});
  EXPECT_EQ(fetch(URLSession::sessionWithConfiguration(configuration), markedRequest()).status(),
            202);
}

TEST_F(URLProtocolTest, MayLoadThroughASessionItself) {
  const NginxServer server("location = /old { return 302 /a; }");
  server.write("a", "checked");
  registered([inner = session](ScriptedProtocol& protocol) {
    URLRequest request = protocol.request();
    URLProtocol::removePropertyForKey(mark, request);
    const auto kept = std::static_pointer_cast<ScriptedProtocol>(protocol.shared_from_this());
    inner
        ->dataTaskWithRequest(request,
                              [kept](const std::optional<Data>& data,
                                     const std::shared_ptr<const URLResponse>& response,
                                     const std::optional<Error>& error) {
                                if (error) {
                                  kept->client().URLProtocolDidFailWithError(*kept, *error);
                                  return;
                                }
                                kept->client().URLProtocolDidReceiveResponse(
                                    *kept, response, URLCacheStoragePolicy::notAllowed);
                                kept->client().URLProtocolDidLoadData(*kept, *data);
                                kept->finish();
                              })
        ->resume();
  });
  EXPECT_EQ(fetch(session, markedRequest(server.URL("/old"))).body(), "checked");
  EXPECT_EQ(fetch(session, markedRequest("http://127.0.0.1:1/")).code(),
            URLErrorCannotConnectToHost);
}

TEST_F(URLProtocolTest, MayFailAtAnyPoint) {
  registered([](ScriptedProtocol& protocol) {
    protocol.respond();
    protocol.load("half");
    protocol.client().URLProtocolDidFailWithError(protocol,
                                                  URLError(URLErrorCannotDecodeRawData, "digest"));
    protocol.load("more");
    protocol.finish();
  });
  const Outcome outcome = fetch(session, markedRequest());
  EXPECT_EQ(outcome.code(), URLErrorCannotDecodeRawData);
  EXPECT_FALSE(outcome.data.has_value());
}

TEST_F(URLProtocolTest, IsHeardOnlyInOrder) {
  registered([](ScriptedProtocol& protocol) {
    if (protocol.request().URL().lastPathComponent() == "body") {
      protocol.load("without a head");
    } else if (protocol.request().URL().lastPathComponent() == "end") {
      protocol.finish();
    } else {
      throw std::runtime_error("no protocol at all");
    }
  });
  for (const char* name : {"body", "end", "throw"}) {
    EXPECT_EQ(fetch(session, markedRequest("http://books.example/" + std::string(name))).code(),
              URLErrorUnknown)
        << name;
  }
  EXPECT_THAT(log->messages(0), ElementsAre("no protocol at all"));
}

TEST_F(URLProtocolTest, IsStoppedWhenItsTaskIsCancelled) {
  Latch started;
  registered([&](ScriptedProtocol&) { started.open(); });
  const auto delegate = std::make_shared<RecordingDelegate>();
  const auto task = sessionWithDelegate(delegate)->dataTaskWithRequest(markedRequest());
  task->resume();
  ASSERT_TRUE(started.wait());
  task->cancel();
  ASSERT_TRUE(delegate->completed.wait());
  EXPECT_EQ(delegate->code(), URLErrorCancelled);
  EXPECT_TRUE(counts->stopped.waitFor(1));
}

TEST_F(URLProtocolTest, IsAskedAnewForARedirect) {
  const NginxServer server;
  server.write("a", "from the server");
  registered([target = server.URL("/a")](ScriptedProtocol& protocol) {
    URLRequest next = requestOf(target);
    protocol.client().URLProtocolWasRedirectedToRequest(
        protocol, next, URLResponse::initWithURL(protocol.request().URL(), 302, "HTTP/1.1", {}));
    protocol.respond(302);
    protocol.load("never delivered");
    protocol.finish();
  });
  const Outcome outcome = fetch(session, markedRequest());
  EXPECT_EQ(outcome.body(), "from the server");
  EXPECT_TRUE(counts->stopped.waitFor(1));
}

TEST_F(URLProtocolTest, HasItsAnswerCachedWhenItSaysSo) {
  registered([](ScriptedProtocol& protocol) {
    protocol.respond(200, URLCacheStoragePolicy::allowed);
    protocol.load("kept");
    protocol.finish();
  });
  fetch(session, markedRequest());
  const auto kept = URLCache::sharedURLCache()->cachedResponseForRequest(markedRequest());
  ASSERT_NE(kept, nullptr);
  EXPECT_EQ(kept->data().view(), "kept");
}

TEST_F(URLProtocolTest, IsAskedToHoldBackForASlowDelegate) {
  Latch toldAll;
  registered([&](ScriptedProtocol& protocol) {
    protocol.respond();
    const std::string piece(URLProtocol::backlogLimit / 4, 'x');
    for (int i = 0; i < 8; ++i) {
      protocol.load(piece);
    }
    EXPECT_EQ(counts->suspended, 1);
    EXPECT_EQ(counts->resumed, 0);
    protocol.finish();
    toldAll.open();
  });
  const auto delegate = std::make_shared<RecordingDelegate>();
  delegate->onResponse = [&](const auto&, const auto&, const auto& handler) {
    toldAll.wait();
    handler(URLSessionResponseDisposition::allow);
  };
  sessionWithDelegate(delegate)->dataTaskWithRequest(markedRequest())->resume();
  ASSERT_TRUE(delegate->completed.wait());
  EXPECT_EQ(delegate->body().size(), 2 * URLProtocol::backlogLimit);
  EXPECT_EQ(counts->suspended, 1);
  EXPECT_EQ(counts->resumed, 1);
}

TEST_F(URLProtocolTest, MayBringNoMoreThanTheSessionAllows) {
  registered([](ScriptedProtocol& protocol) {
    protocol.respond();
    protocol.load(std::string(2000, 'x'));
    protocol.finish();
  });
  URLSessionConfiguration configuration = URLSessionConfiguration::ephemeralSessionConfiguration();
  configuration.setMaximumBodyLength(1999);
  EXPECT_EQ(fetch(URLSession::sessionWithConfiguration(configuration), markedRequest()).code(),
            URLErrorDataLengthExceedsMaximum);
}

}  // namespace
