// Sessions and a real server.
#include "platform/URLSession.h"

#include <gmock/gmock.h>

#include <thread>

#include "platform/RunLoop.h"
#include "platform/WorkerThreads.h"
#include "tests/platform/network/SessionFixture.h"
#include "tests/support/NginxServer.h"

namespace {

using namespace platform;
using namespace tests;
using ::testing::ElementsAre;

class URLSessionTest : public SessionTest {
 protected:
  std::shared_ptr<URLSession> session =
      URLSession::sessionWithConfiguration(URLSessionConfiguration::defaultSessionConfiguration());
};

TEST_F(URLSessionTest, DownloadsAFile) {
  const NginxServer server;
  server.write("index", "the index");
  const Outcome outcome = fetch(session, requestOf(server.URL("/index")));
  EXPECT_EQ(outcome.code(), 0);
  EXPECT_EQ(outcome.status(), 200);
  EXPECT_EQ(outcome.body(), "the index");
  EXPECT_EQ(outcome.response->URL().absoluteString(), server.URL("/index"));
  EXPECT_EQ(outcome.response->expectedContentLength(), 9);
  EXPECT_EQ(outcome.response->MIMEType(), "application/octet-stream");
}

TEST_F(URLSessionTest, DownloadsAnEmptyFile) {
  const NginxServer server;
  server.write("empty", "");
  const Outcome outcome = fetch(session, requestOf(server.URL("/empty")));
  EXPECT_EQ(outcome.code(), 0);
  EXPECT_TRUE(outcome.data.has_value());
  EXPECT_EQ(outcome.body(), "");
}

TEST_F(URLSessionTest, GivesErrorPagesWithoutError) {
  const NginxServer server("location = /broken { return 500 'out of order'; }");
  const Outcome missing = fetch(session, requestOf(server.URL("/missing")));
  EXPECT_EQ(missing.code(), 0);
  EXPECT_EQ(missing.status(), 404);
  const Outcome broken = fetch(session, requestOf(server.URL("/broken")));
  EXPECT_EQ(broken.status(), 500);
  EXPECT_EQ(broken.body(), "out of order");
}

TEST_F(URLSessionTest, FollowsRedirects) {
  const NginxServer server(
      "location = /old { return 302 /new; } location = /older { return 301 /old; }");
  server.write("new", "here");
  const Outcome outcome = fetch(session, requestOf(server.URL("/older")));
  EXPECT_EQ(outcome.status(), 200);
  EXPECT_EQ(outcome.body(), "here");
  EXPECT_EQ(outcome.response->URL().absoluteString(), server.URL("/new"));
}

TEST_F(URLSessionTest, CallsItsDelegateInOrder) {
  const NginxServer server("location = /old { return 302 /new; }");
  server.write("new", std::string(100000, 'x'));
  const auto delegate = std::make_shared<RecordingDelegate>();
  const auto delegated = sessionWithDelegate(delegate);
  const auto task = delegated->dataTaskWithRequest(requestOf(server.URL("/old")));
  EXPECT_EQ(task->state(), URLSessionDataTask::State::suspended);
  task->resume();
  delegated->finishTasksAndInvalidate();
  ASSERT_TRUE(delegate->invalid.wait());
  EXPECT_THAT(delegate->events(), ElementsAre("redirect 302", "response 200", "will cache", "data",
                                              "completion", "invalid"));
  EXPECT_EQ(delegate->body(), std::string(100000, 'x'));
  EXPECT_EQ(task->state(), URLSessionDataTask::State::completed);
  EXPECT_EQ(task->countOfBytesReceived(), 100000U);
  EXPECT_EQ(task->originalRequest().URL().absoluteString(), server.URL("/old"));
  EXPECT_EQ(task->currentRequest().URL().absoluteString(), server.URL("/new"));
  EXPECT_EQ(delegated->delegate(), nullptr);
  EXPECT_EQ(delegated->dataTaskWithRequest(requestOf(server.URL("/new"))), nullptr);
}

TEST_F(URLSessionTest, CallsItsDelegateOnTheMainQueue) {
  const NginxServer server;
  server.write("index", "the index");
  const auto delegate = std::make_shared<RecordingDelegate>();
  bool onMainThread = false;
  bool done = false;
  delegate->onCompletion = [&](const RecordingDelegate::Task&) {
    onMainThread = isMainThread();
    done = true;
    RunLoop::main()->stop();
  };
  const auto delegated = URLSession::sessionWithConfiguration(
      URLSessionConfiguration::defaultSessionConfiguration(), delegate, DispatchQueue::main());
  delegated->dataTaskWithRequest(requestOf(server.URL("/index")))->resume();
  delegated->finishTasksAndInvalidate();
  RunLoop::main()->runFor(Seconds(patience));
  ASSERT_TRUE(done);
  EXPECT_TRUE(onMainThread);
  EXPECT_EQ(delegate->body(), "the index");
  while (!delegate->invalid.isOpen()) {
    RunLoop::main()->runPending();
  }
}

TEST_F(URLSessionTest, GivesTheRedirectItselfWhenNotToFollow) {
  const NginxServer server("location = /old { return 302 /new; }");
  const auto delegate = std::make_shared<RecordingDelegate>();
  delegate->onRedirect = [](const URLRequest&, const URLSessionDelegate::RedirectHandler& handler) {
    handler(std::nullopt);
  };
  sessionWithDelegate(delegate)->dataTaskWithRequest(requestOf(server.URL("/old")))->resume();
  ASSERT_TRUE(delegate->completed.wait());
  EXPECT_THAT(delegate->events(),
              ElementsAre("redirect 302", "response 302", "data", "completion"));
  EXPECT_NE(delegate->body().find("302 Found"), std::string::npos);
  EXPECT_EQ(delegate->code(), 0);
}

TEST_F(URLSessionTest, CancelsWhenTheResponseIsNotWanted) {
  const NginxServer server;
  const auto delegate = std::make_shared<RecordingDelegate>();
  delegate->onResponse = [](const RecordingDelegate::Task&,
                            const std::shared_ptr<const URLResponse>& response,
                            const URLSessionDelegate::DispositionHandler& handler) {
    handler(response->statusCode() >= 400 ? URLSessionResponseDisposition::cancel
                                          : URLSessionResponseDisposition::allow);
  };
  sessionWithDelegate(delegate)->dataTaskWithRequest(requestOf(server.URL("/missing")))->resume();
  ASSERT_TRUE(delegate->completed.wait());
  EXPECT_THAT(delegate->events(), ElementsAre("response 404", "completion"));
  EXPECT_EQ(delegate->code(), URLErrorCancelled);
}

TEST_F(URLSessionTest, CancelsWhenAHandlerIsDropped) {
  const NginxServer server;
  server.write("index", "the index");
  const auto delegate = std::make_shared<RecordingDelegate>();
  delegate->onResponse = [](const auto&, const auto&, const auto&) {};
  sessionWithDelegate(delegate)->dataTaskWithRequest(requestOf(server.URL("/index")))->resume();
  ASSERT_TRUE(delegate->completed.wait());
  EXPECT_EQ(delegate->code(), URLErrorCancelled);
}

TEST_F(URLSessionTest, OutlivesADelegateThatThrows) {
  const NginxServer server;
  server.write("index", "the index");
  const auto delegate = std::make_shared<RecordingDelegate>();
  delegate->onData = [](const auto&, const auto&) { throw std::runtime_error("no room"); };
  sessionWithDelegate(delegate)->dataTaskWithRequest(requestOf(server.URL("/index")))->resume();
  ASSERT_TRUE(delegate->completed.wait());
  EXPECT_EQ(delegate->code(), 0);
  EXPECT_THAT(log->messages(0), ElementsAre("no room"));
}

TEST_F(URLSessionTest, WaitsForAnAnswerGivenLaterAndElsewhere) {
  const NginxServer server;
  server.write("index", "the index");
  const auto delegate = std::make_shared<RecordingDelegate>();
  Latch asked;
  URLSessionDelegate::DispositionHandler kept;
  delegate->onResponse = [&](const auto&, const auto&, const auto& handler) {
    kept = handler;
    asked.open();
  };
  sessionWithDelegate(delegate)->dataTaskWithRequest(requestOf(server.URL("/index")))->resume();
  ASSERT_TRUE(asked.wait());
  EXPECT_THAT(delegate->events(), ElementsAre("response 200"));
  kept(URLSessionResponseDisposition::allow);
  kept(URLSessionResponseDisposition::cancel);
  ASSERT_TRUE(delegate->completed.wait());
  EXPECT_EQ(delegate->body(), "the index");
  EXPECT_EQ(delegate->code(), 0);
}

TEST_F(URLSessionTest, UndoesContentEncodings) {
  const NginxServer server("gzip on; gzip_types application/octet-stream; gzip_min_length 1;");
  const std::string body(50000, 'a');
  server.write("index", body);
  const Outcome outcome = fetch(session, requestOf(server.URL("/index")));
  EXPECT_EQ(outcome.body(), body);
  EXPECT_EQ(outcome.response->valueForHTTPHeaderField("Content-Encoding"), "gzip");
  EXPECT_EQ(outcome.response->expectedContentLength(), -1);
  const std::string line = server.waitForAccessLog(1).front();
  EXPECT_LT(std::stoul(line.substr(line.rfind(' '))), 1000U) << line;
}

TEST_F(URLSessionTest, AsksForTheHeadAlone) {
  const NginxServer server;
  server.write("index", "the index");
  URLRequest request = requestOf(server.URL("/index"));
  request.setHTTPMethod("HEAD");
  const Outcome outcome = fetch(session, request);
  EXPECT_EQ(outcome.status(), 200);
  EXPECT_EQ(outcome.response->expectedContentLength(), 9);
  EXPECT_EQ(outcome.body(), "");
}

TEST_F(URLSessionTest, RunsManyTransfersAtOnce) {
  const NginxServer server;
  constexpr int count = 60;
  for (int i = 0; i < count; ++i) {
    server.write("book" + std::to_string(i), std::string(20000, static_cast<char>('0' + i)));
  }
  Counter right;
  Counter done;
  for (int i = 0; i < count; ++i) {
    session
        ->dataTaskWithRequest(
            requestOf(server.URL("/book" + std::to_string(i))),
            [&, i](std::optional<Data> data, std::shared_ptr<const URLResponse>,
                   const std::optional<Error>&) {
              if (data && data->view() == std::string(20000, static_cast<char>('0' + i))) {
                right.add();
              }
              done.add();
            })
        ->resume();
  }
  ASSERT_TRUE(done.waitFor(count));
  EXPECT_EQ(right.count(), static_cast<size_t>(count));
}

TEST_F(URLSessionTest, SaysWhenNobodyListens) {
  NginxServer server;
  server.stop();
  const Outcome outcome = fetch(session, requestOf(server.URL("/index")));
  EXPECT_EQ(outcome.error->domain, "NSURLErrorDomain");
  EXPECT_EQ(outcome.code(), URLErrorCannotConnectToHost);
  EXPECT_FALSE(outcome.data.has_value());
  EXPECT_EQ(outcome.response, nullptr);
}

TEST_F(URLSessionTest, RefusesOtherSchemes) {
  folder.write("secret", "for nobody");
  EXPECT_EQ(fetch(session, requestOf("file://" + folder.path("secret"))).code(),
            URLErrorUnsupportedURL);
  EXPECT_EQ(fetch(session, requestOf("ftp://127.0.0.1/x")).code(), URLErrorUnsupportedURL);
  EXPECT_EQ(fetch(session, requestOf("http:nothing")).code(), URLErrorBadURL);
}

TEST_F(URLSessionTest, SharesOneSessionThatStaysValid) {
  const NginxServer server;
  server.write("index", "the index");
  const auto shared = URLSession::sharedSession();
  shared->finishTasksAndInvalidate();
  shared->invalidateAndCancel();
  EXPECT_EQ(shared, URLSession::sharedSession());
  EXPECT_EQ(fetch(shared, requestOf(server.URL("/index"))).body(), "the index");
}

TEST_F(URLSessionTest, CancelsAllTasksWhenInvalidatedAtOnce) {
  const auto delegate = std::make_shared<RecordingDelegate>();
  Latch held;
  delegate->onResponse = [&](const auto&, const auto&, const auto&) { held.wait(); };
  const NginxServer server;
  const auto delegated = sessionWithDelegate(delegate);
  delegated->dataTaskWithRequest(requestOf(server.URL("/a")))->resume();
  ASSERT_TRUE(delegate->responded.wait());
  delegated->invalidateAndCancel();
  held.open();
  ASSERT_TRUE(delegate->invalid.wait());
  EXPECT_THAT(delegate->events(), ElementsAre("response 404", "completion", "invalid"));
  EXPECT_EQ(delegate->code(), URLErrorCancelled);
}

TEST_F(URLSessionTest, CompletesATaskThatIsResumedTooLate) {
  const auto task = session->dataTaskWithRequest(requestOf("http://127.0.0.1:1/"),
                                                 [](const auto&, const auto&, const auto&) {});
  session->finishTasksAndInvalidate();
  const auto delegate = std::make_shared<RecordingDelegate>();
  const auto delegated = sessionWithDelegate(delegate);
  const auto late = delegated->dataTaskWithRequest(requestOf("http://127.0.0.1:1/"));
  late->cancel();
  ASSERT_TRUE(delegate->completed.wait());
  EXPECT_EQ(delegate->code(), URLErrorCancelled);
  task->resume();
  while (task->state() != URLSessionDataTask::State::completed) {
    std::this_thread::yield();
  }
  EXPECT_EQ(task->error()->code, URLErrorCancelled);
}

TEST_F(URLSessionTest, SendsTheFieldsOfRequestAndConfiguration) {
  const NginxServer server(
      "location = /echo { return 200 '$http_x_own|$http_x_all|$http_cookie'; }");
  URLSessionConfiguration configuration = URLSessionConfiguration::ephemeralSessionConfiguration();
  configuration.setHTTPAdditionalHeaders({{"X-All", "everywhere"}, {"X-Own", "not this"}});
  URLRequest request = requestOf(server.URL("/echo"));
  request.setValueForHTTPHeaderField("mine", "X-Own");
  EXPECT_EQ(fetch(URLSession::sessionWithConfiguration(configuration), request).body(),
            "mine|everywhere|");
}

TEST_F(URLSessionTest, KeepsCookiesOnlyWhenToldTo) {
  const NginxServer server(
      "location = /set { add_header Set-Cookie 'taste=sweet'; return 200; }"
      "location = /echo { return 200 '[$http_cookie]'; }");
  fetch(session, requestOf(server.URL("/set")));
  EXPECT_EQ(fetch(session, requestOf(server.URL("/echo"))).body(), "[]");

  URLSessionConfiguration configuration = URLSessionConfiguration::ephemeralSessionConfiguration();
  configuration.setHTTPShouldSetCookies(true);
  const auto keeping = URLSession::sessionWithConfiguration(configuration);
  fetch(keeping, requestOf(server.URL("/set")));
  EXPECT_EQ(fetch(keeping, requestOf(server.URL("/echo"))).body(), "[taste=sweet]");
  URLRequest without = requestOf(server.URL("/echo"));
  without.setHTTPShouldHandleCookies(false);
  EXPECT_EQ(fetch(keeping, without).body(), "[]");
}

TEST_F(URLSessionTest, ServesAgainAfterTheServerWasAway) {
  NginxServer server;
  server.write("index", "the index");
  EXPECT_EQ(fetch(session, requestOf(server.URL("/index"))).status(), 200);
  server.stop();
  EXPECT_EQ(fetch(session, requestOf(server.URL("/index"))).code(), URLErrorCannotConnectToHost);
  server.start();
  EXPECT_EQ(fetch(session, requestOf(server.URL("/index"))).status(), 200);
}

}  // namespace
