// Sessions and servers that misbehave.
#include <gmock/gmock.h>

#include <algorithm>
#include <atomic>
#include <fstream>
#include <iterator>
#include <thread>

#include "platform/URLProtocol.h"
#include "platform/URLSession.h"
#include "platform/UserDefaults.h"
#include "tests/platform/network/SessionFixture.h"
#include "tests/support/ChildProcess.h"
#include "tests/support/ScriptedServer.h"

namespace {

using namespace platform;
using namespace tests;
using ::testing::ElementsAre;

constexpr uint64_t twoGibibytes = uint64_t{2} << 30;

/// The process's memory that is in use, in bytes.
uint64_t residentMemory() {
  std::ifstream file("/proc/self/statm");
  uint64_t total = 0;
  uint64_t resident = 0;
  file >> total >> resident;
  return resident * 4096;
}

class URLSessionAdversityTest : public SessionTest {
 protected:
  Outcome fetchFrom(const std::string& bytes) const {
    const auto server = ScriptedServer::sending(bytes);
    return fetch(session, requestOf(server->URL("/")));
  }

  std::shared_ptr<URLSession> session = URLSession::sessionWithConfiguration(
      URLSessionConfiguration::ephemeralSessionConfiguration());
};

TEST_F(URLSessionAdversityTest, TakesATruncatedBodyForALostConnection) {
  const Outcome outcome = fetchFrom("HTTP/1.1 200 OK\r\nContent-Length: 100\r\n\r\nonly this");
  EXPECT_EQ(outcome.code(), URLErrorNetworkConnectionLost);
  EXPECT_FALSE(outcome.data.has_value());
}

TEST_F(URLSessionAdversityTest, TakesATruncatedChunkForALostConnection) {
  const Outcome outcome =
      fetchFrom("HTTP/1.1 200 OK\r\nTransfer-Encoding: chunked\r\n\r\n10\r\nonly this");
  EXPECT_EQ(outcome.code(), URLErrorNetworkConnectionLost);
}

TEST_F(URLSessionAdversityTest, ReadsNoFurtherThanTheLengthSays) {
  const Outcome outcome = fetchFrom("HTTP/1.1 200 OK\r\nContent-Length: 4\r\n\r\nbody and more");
  EXPECT_EQ(outcome.code(), 0);
  EXPECT_EQ(outcome.body(), "body");
}

TEST_F(URLSessionAdversityTest, ReadsToTheEndOfTheConnectionWithoutLength) {
  EXPECT_EQ(fetchFrom("HTTP/1.0 200 OK\r\n\r\nuntil the end").body(), "until the end");
}

TEST_F(URLSessionAdversityTest, RefusesTwoLengths) {
  EXPECT_EQ(
      fetchFrom("HTTP/1.1 200 OK\r\nContent-Length: 4\r\nContent-Length: 5\r\n\r\nbody!").code(),
      URLErrorBadServerResponse);
}

TEST_F(URLSessionAdversityTest, RefusesAnImpossibleLength) {
  for (const char* length : {"-1", "x", "99999999999999999999999"}) {
    const Outcome outcome =
        fetchFrom("HTTP/1.1 200 OK\r\nContent-Length: " + std::string(length) + "\r\n\r\nbody");
    EXPECT_NE(outcome.code(), 0) << length;
  }
}

TEST_F(URLSessionAdversityTest, RefusesWhatIsNotHTTP) {
  EXPECT_EQ(fetchFrom("<html>no head at all</html>\r\n\r\n").code(), URLErrorBadServerResponse);
  EXPECT_EQ(fetchFrom(std::string("\0\xFF\x80 binary", 10)).code(), URLErrorBadServerResponse);
  EXPECT_EQ(fetchFrom("HTTP/1.1 99x OK\r\n\r\n").code(), URLErrorBadServerResponse);
}

TEST_F(URLSessionAdversityTest, TakesNoAnswerForALostConnection) {
  EXPECT_EQ(fetchFrom("").code(), URLErrorNetworkConnectionLost);
}

TEST_F(URLSessionAdversityTest, TakesAResetInTheHeadForALostConnection) {
  ScriptedServer server([](const ScriptedRequest&, ScriptedConnection& connection) {
    connection.send("HTTP/1.1 200 OK\r\nContent-Len");
    connection.reset();
  });
  EXPECT_EQ(fetch(session, requestOf(server.URL("/"))).code(), URLErrorNetworkConnectionLost);
}

TEST_F(URLSessionAdversityTest, TakesAResetInTheBodyForALostConnection) {
  const auto delegate = std::make_shared<RecordingDelegate>();
  ScriptedServer server([&](const ScriptedRequest&, ScriptedConnection& connection) {
    connection.send("HTTP/1.1 200 OK\r\nContent-Length: 100\r\n\r\nonly this");
    delegate->pieces.waitFor(1);
    connection.reset();
  });
  sessionWithDelegate(delegate)->dataTaskWithRequest(requestOf(server.URL("/")))->resume();
  ASSERT_TRUE(delegate->completed.wait());
  EXPECT_THAT(delegate->events(), ElementsAre("response 200", "will cache", "data", "completion"));
  EXPECT_EQ(delegate->body(), "only this");
  EXPECT_EQ(delegate->code(), URLErrorNetworkConnectionLost);
}

TEST_F(URLSessionAdversityTest, RefusesGarbageInPlaceOfChunks) {
  EXPECT_EQ(
      fetchFrom("HTTP/1.1 200 OK\r\nTransfer-Encoding: chunked\r\n\r\nzz\r\ngarbage\r\n").code(),
      URLErrorCannotParseResponse);
}

TEST_F(URLSessionAdversityTest, RefusesWhatDoesNotDecode) {
  EXPECT_EQ(fetchFrom("HTTP/1.1 200 OK\r\nContent-Encoding: gzip\r\nContent-Length: 7\r\n\r\n"
                      "no gzip")
                .code(),
            URLErrorCannotDecodeContentData);
}

TEST_F(URLSessionAdversityTest, RefusesAHeadWithoutEnd) {
  std::string head = "HTTP/1.1 200 OK\r\n";
  for (int i = 0; i < 20000; ++i) {
    head += "X-" + std::to_string(i) + ": more and more\r\n";
  }
  EXPECT_EQ(fetchFrom(head + "\r\n").code(), URLErrorBadServerResponse);
}

TEST_F(URLSessionAdversityTest, SkipsInterimAnswersAndTrailers) {
  const Outcome outcome = fetchFrom(
      "HTTP/1.1 103 Early Hints\r\nLink: x\r\n\r\n"
      "HTTP/1.1 200 OK\r\nTransfer-Encoding: chunked\r\nX-Field: a\r\nx-field: b\r\n\r\n"
      "4\r\nbody\r\n0\r\nX-Late: c\r\n\r\n");
  EXPECT_EQ(outcome.body(), "body");
  EXPECT_EQ(outcome.response->valueForHTTPHeaderField("X-Field"), "a, b");
  EXPECT_FALSE(outcome.response->valueForHTTPHeaderField("Link").has_value());
  EXPECT_FALSE(outcome.response->valueForHTTPHeaderField("X-Late").has_value());
}

TEST_F(URLSessionAdversityTest, FollowsTwentyRedirectsAndNoMore) {
  ScriptedServer server([](const ScriptedRequest& request, ScriptedConnection& connection) {
    const int left = std::stoi(request.target.substr(1));
    connection.send(left == 0 ? httpAnswer(200, "arrived")
                              : httpAnswer(302, "", {"Location: /" + std::to_string(left - 1)}));
  });
  EXPECT_EQ(fetch(session, requestOf(server.URL("/20"))).body(), "arrived");
  EXPECT_EQ(fetch(session, requestOf(server.URL("/21"))).code(), URLErrorHTTPTooManyRedirects);
}

TEST_F(URLSessionAdversityTest, LeavesARedirectThatNeverEnds) {
  const auto server = ScriptedServer::routing(
      {{"/", answering(httpAnswer(307, "round and round", {"Location: /"}))}});
  EXPECT_EQ(fetch(session, requestOf(server->URL("/"))).code(), URLErrorHTTPTooManyRedirects);
  EXPECT_EQ(server->requests().size(), 21U);
}

TEST_F(URLSessionAdversityTest, RepairsCarelessRedirects) {
  const auto server = ScriptedServer::routing(
      {{"/", answering(httpAnswer(302, "", {"Location: /a b\xC3\xA4"}))},
       {"/a%20b%C3%A4", answering(httpAnswer(200, "found"))},
       {"/nowhere", answering(httpAnswer(302, "no address", {"Location: http://"}))},
       {"/silent", answering(httpAnswer(302, "no address"))}});
  EXPECT_EQ(fetch(session, requestOf(server->URL("/"))).body(), "found");
  EXPECT_NE(fetch(session, requestOf(server->URL("/nowhere"))).code(), 0);
  const Outcome silent = fetch(session, requestOf(server->URL("/silent")));
  EXPECT_EQ(silent.status(), 302);
  EXPECT_EQ(silent.body(), "no address");
}

TEST_F(URLSessionAdversityTest, TellsNoSuchHostFromNoNetwork) {
  // A name that no name server has to be asked about.
  const URLRequest request = requestOf("http://" + std::string(70, 'a') + "/");
  Environment environment = *Environment::current();
  for (const bool reachable : {true, false}) {
    environment.networkIsReachable = [reachable] { return reachable; };
    const EnvironmentOverride override(environment);
    EXPECT_EQ(fetch(session, request).code(),
              reachable ? URLErrorCannotFindHost : URLErrorNotConnectedToInternet);
  }
}

TEST_F(URLSessionAdversityTest, TakesTheGreatestBodyFromTheSettingsOfTheMoment) {
  const auto server = ScriptedServer::sending(httpAnswer(200, std::string(5000, 'x')));
  EXPECT_EQ(fetch(session, requestOf(server->URL("/"))).code(), 0);
  Environment environment = *Environment::current();
  environment.userDefaults =
      userDefaultsFromDictionary({{URLSessionConfiguration::maximumBodyLengthKey, 4999}});
  const EnvironmentOverride override(environment);
  EXPECT_EQ(fetch(session, requestOf(server->URL("/"))).code(), URLErrorDataLengthExceedsMaximum);
}

TEST_F(URLSessionAdversityTest, RefusesABodyThatIsAnnouncedTooLong) {
  const auto delegate = std::make_shared<RecordingDelegate>();
  ScriptedServer server([](const ScriptedRequest&, ScriptedConnection& connection) {
    connection.send("HTTP/1.1 200 OK\r\nContent-Length: " + std::to_string(twoGibibytes) +
                    "\r\n\r\n");
    connection.waitUntilClientIsGone();
  });
  sessionWithDelegate(delegate)->dataTaskWithRequest(requestOf(server.URL("/")))->resume();
  ASSERT_TRUE(delegate->completed.wait());
  EXPECT_EQ(delegate->code(), URLErrorDataLengthExceedsMaximum);
}

TEST_F(URLSessionAdversityTest, StopsABodyThatGrowsTooLong) {
  URLSessionConfiguration configuration = URLSessionConfiguration::ephemeralSessionConfiguration();
  configuration.setMaximumBodyLength(1 << 20);
  const auto limited = URLSession::sessionWithConfiguration(configuration);
  std::atomic<uint64_t> sent{0};
  ScriptedServer server([&](const ScriptedRequest&, ScriptedConnection& connection) {
    connection.send("HTTP/1.1 200 OK\r\n\r\n");
    sent = connection.sendFiller(twoGibibytes);
    connection.close();
  });
  EXPECT_EQ(fetch(limited, requestOf(server.URL("/"))).code(), URLErrorDataLengthExceedsMaximum);
  server.waitUntilAllClientsAreGone();
  EXPECT_LT(sent, uint64_t{64} << 20);
}

TEST_F(URLSessionAdversityTest, StopsAnEncodingThatUnpacksTooLong) {
  // 16 MiB of the same byte take some 16 KiB.
  const TemporaryFolder files;
  const std::string path = files.write("zeros", std::string(16 << 20, '\0'));
  runToEnd("/usr/bin/gzip", {path});
  std::ifstream packed(path + ".gz", std::ios::binary);
  const std::string bytes(std::istreambuf_iterator<char>(packed), {});
  ASSERT_GT(bytes.size(), 1000U);
  URLSessionConfiguration configuration = URLSessionConfiguration::ephemeralSessionConfiguration();
  configuration.setMaximumBodyLength(1 << 20);
  const auto server = ScriptedServer::sending(httpAnswer(200, bytes, {"Content-Encoding: gzip"}));
  EXPECT_EQ(fetch(URLSession::sessionWithConfiguration(configuration), requestOf(server->URL("/")))
                .code(),
            URLErrorDataLengthExceedsMaximum);
}

TEST_F(URLSessionAdversityTest, HoldsTheServerBackForASlowDelegate) {
  const auto delegate = std::make_shared<RecordingDelegate>();
  Latch mayGoOn;
  delegate->keepsBody = false;
  delegate->onData = [&](const auto&, const auto&) { mayGoOn.wait(); };
  constexpr uint64_t length = uint64_t{200} << 20;
  std::atomic<uint64_t> sent{0};
  ScriptedServer server([&](const ScriptedRequest&, ScriptedConnection& connection) {
    connection.send("HTTP/1.1 200 OK\r\nContent-Length: " + std::to_string(length) + "\r\n\r\n");
    for (uint64_t done = 0; done < length; done += 1 << 20) {
      if (connection.sendFiller(1 << 20) < (1 << 20)) {
        return;
      }
      sent += 1 << 20;
    }
  });
  const auto task = sessionWithDelegate(delegate)->dataTaskWithRequest(requestOf(server.URL("/")));
  task->resume();
  // What the sockets hold is the system's affair; it is far less than the whole.
  uint64_t before = 1;
  while (before != sent) {
    before = sent;
    std::this_thread::sleep_for(std::chrono::milliseconds(50));
  }
  EXPECT_LT(sent, uint64_t{64} << 20);
  mayGoOn.open();
  ASSERT_TRUE(delegate->completed.wait());
  EXPECT_EQ(delegate->code(), 0);
  EXPECT_EQ(task->countOfBytesReceived(), length);
}

TEST_F(URLSessionAdversityTest, StreamsTwoGibibytesInLittleMemory) {
  const auto delegate = std::make_shared<RecordingDelegate>();
  delegate->keepsBody = false;
  std::atomic<uint64_t> taken{0};
  std::atomic<uint64_t> highest{0};
  delegate->onData = [&](const auto&, const Data& data) {
    const uint64_t before = taken.fetch_add(data.length());
    if ((before >> 26) != ((before + data.length()) >> 26)) {
      highest = std::max<uint64_t>(highest, residentMemory());
    }
  };
  ScriptedServer server([](const ScriptedRequest&, ScriptedConnection& connection) {
    connection.send("HTTP/1.1 200 OK\r\nContent-Length: " + std::to_string(twoGibibytes) +
                    "\r\n\r\n");
    connection.sendFiller(twoGibibytes);
  });
  URLSessionConfiguration configuration = URLSessionConfiguration::defaultSessionConfiguration();
  configuration.setMaximumBodyLength(twoGibibytes);
  const uint64_t atFirst = residentMemory();
  URLSession::sessionWithConfiguration(configuration, delegate)
      ->dataTaskWithRequest(requestOf(server.URL("/")))
      ->resume();
  ASSERT_TRUE(delegate->completed.wait());
  EXPECT_EQ(delegate->code(), 0);
  EXPECT_EQ(taken, twoGibibytes);
  EXPECT_LT(highest, atFirst + (uint64_t{256} << 20));
}

class CancellationTest : public URLSessionAdversityTest {
 protected:
  /// Cancels a task when `stage` has been reached; it must complete so, and let its connection go.
  void cancelAt(const ScriptedServer& server, const std::function<bool()>& stage) {
    const auto delegated = sessionWithDelegate(delegate);
    const auto task = delegated->dataTaskWithRequest(requestOf(server.URL("/")));
    task->resume();
    ASSERT_TRUE(stage());
    task->cancel();
    ASSERT_TRUE(delegate->completed.wait());
    EXPECT_EQ(delegate->code(), URLErrorCancelled);
    EXPECT_EQ(task->state(), URLSessionDataTask::State::completed);
    delegated->finishTasksAndInvalidate();
    ASSERT_TRUE(delegate->invalid.wait());
    const std::vector<std::string> events = delegate->events();
    EXPECT_EQ(std::count(events.begin(), events.end(), "completion"), 1);
    server.waitUntilAllClientsAreGone();
  }

  const std::shared_ptr<RecordingDelegate> delegate = std::make_shared<RecordingDelegate>();
};

TEST_F(CancellationTest, BeforeItIsResumed) {
  const auto task =
      sessionWithDelegate(delegate)->dataTaskWithRequest(requestOf("http://127.0.0.1:1/"));
  task->cancel();
  ASSERT_TRUE(delegate->completed.wait());
  EXPECT_EQ(delegate->code(), URLErrorCancelled);
  task->resume();
  task->cancel();
  EXPECT_EQ(task->state(), URLSessionDataTask::State::completed);
  EXPECT_THAT(delegate->events(), ElementsAre("completion"));
}

TEST_F(CancellationTest, AtOnce) {
  // An answer might come before the cancellation does.
  ScriptedServer server([](const ScriptedRequest&, ScriptedConnection& connection) {
    connection.waitUntilClientIsGone();
  });
  cancelAt(server, [] { return true; });
}

TEST_F(CancellationTest, WhileTheServerThinks) {
  ScriptedServer server([](const ScriptedRequest&, ScriptedConnection& connection) {
    connection.waitUntilClientIsGone();
  });
  cancelAt(server, [&] { return !server.waitForRequests(1).empty(); });
  EXPECT_THAT(delegate->events(), ElementsAre("completion", "invalid"));
}

TEST_F(CancellationTest, InTheMiddleOfTheHead) {
  Latch sent;
  ScriptedServer server([&](const ScriptedRequest&, ScriptedConnection& connection) {
    connection.send("HTTP/1.1 200 OK\r\nContent-");
    sent.open();
    connection.waitUntilClientIsGone();
  });
  cancelAt(server, [&] { return sent.wait(); });
  EXPECT_THAT(delegate->events(), ElementsAre("completion", "invalid"));
}

TEST_F(CancellationTest, InTheMiddleOfTheBody) {
  ScriptedServer server([](const ScriptedRequest&, ScriptedConnection& connection) {
    connection.send("HTTP/1.1 200 OK\r\nContent-Length: 100\r\n\r\nonly this");
    connection.waitUntilClientIsGone();
  });
  cancelAt(server, [&] { return delegate->pieces.waitFor(1); });
}

TEST_F(CancellationTest, WhileItIsHeldBack) {
  Latch mayGoOn;
  Latch inside;
  delegate->onData = [&](const auto&, const auto&) {
    inside.open();
    mayGoOn.wait();
  };
  ScriptedServer server([](const ScriptedRequest&, ScriptedConnection& connection) {
    connection.send("HTTP/1.1 200 OK\r\nContent-Length: " + std::to_string(twoGibibytes / 16) +
                    "\r\n\r\n");
    connection.sendFiller(twoGibibytes / 16);
  });
  const auto task = sessionWithDelegate(delegate)->dataTaskWithRequest(requestOf(server.URL("/")));
  task->resume();
  ASSERT_TRUE(inside.wait());
  task->cancel();
  server.waitUntilAllClientsAreGone();
  mayGoOn.open();
  ASSERT_TRUE(delegate->completed.wait());
  EXPECT_EQ(delegate->code(), URLErrorCancelled);
  EXPECT_EQ(delegate->pieces.count(), 1U);
}

TEST_F(CancellationTest, WhileTheDelegateConsidersARedirect) {
  const auto server =
      ScriptedServer::routing({{"/", answering(httpAnswer(302, "", {"Location: /end"}))}});
  URLSessionDelegate::RedirectHandler kept;
  Latch asked;
  delegate->onRedirect = [&](const URLRequest&, const auto& handler) {
    kept = handler;
    asked.open();
  };
  const auto task = sessionWithDelegate(delegate)->dataTaskWithRequest(requestOf(server->URL("/")));
  task->resume();
  ASSERT_TRUE(asked.wait());
  task->cancel();
  ASSERT_TRUE(delegate->completed.wait());
  kept(requestOf(server->URL("/end")));
  EXPECT_THAT(delegate->events(), ElementsAre("redirect 302", "completion"));
  EXPECT_EQ(server->requests().size(), 1U);
}

TEST_F(CancellationTest, WhileTheDelegateConsidersTheResponse) {
  ScriptedServer server([](const ScriptedRequest&, ScriptedConnection& connection) {
    connection.send(httpAnswer(200, "body"));
  });
  URLSessionDelegate::DispositionHandler kept;
  Latch asked;
  delegate->onResponse = [&](const auto&, const auto&, const auto& handler) {
    kept = handler;
    asked.open();
  };
  const auto task = sessionWithDelegate(delegate)->dataTaskWithRequest(requestOf(server.URL("/")));
  task->resume();
  ASSERT_TRUE(asked.wait());
  task->cancel();
  ASSERT_TRUE(delegate->completed.wait());
  kept(URLSessionResponseDisposition::allow);
  EXPECT_THAT(delegate->events(), ElementsAre("response 200", "completion"));
}

TEST_F(CancellationTest, WithinACallOfTheDelegate) {
  ScriptedServer server([](const ScriptedRequest&, ScriptedConnection& connection) {
    connection.send(httpAnswer(200, std::string(5 << 20, 'x')));
  });
  delegate->onData = [](const RecordingDelegate::Task& task, const auto&) { task->cancel(); };
  sessionWithDelegate(delegate)->dataTaskWithRequest(requestOf(server.URL("/")))->resume();
  ASSERT_TRUE(delegate->completed.wait());
  EXPECT_EQ(delegate->code(), URLErrorCancelled);
  EXPECT_EQ(delegate->pieces.count(), 1U);
}

TEST_F(CancellationTest, WhileItWaitsForItsTurn) {
  Latch mayGoOn;
  ScriptedServer server([&](const ScriptedRequest&, ScriptedConnection& connection) {
    mayGoOn.wait();
    connection.send(httpAnswer(200, "body"));
  });
  Counter done;
  for (int i = 0; i < URLSession::maximumConnectionsPerHost; ++i) {
    session
        ->dataTaskWithRequest(requestOf(server.URL("/")),
                              [&](const auto&, const auto&, const auto&) { done.add(); })
        ->resume();
  }
  server.waitForRequests(URLSession::maximumConnectionsPerHost);
  const auto task = sessionWithDelegate(delegate)->dataTaskWithRequest(requestOf(server.URL("/")));
  task->resume();
  task->cancel();
  ASSERT_TRUE(delegate->completed.wait());
  EXPECT_EQ(delegate->code(), URLErrorCancelled);
  mayGoOn.open();
  EXPECT_TRUE(done.waitFor(URLSession::maximumConnectionsPerHost));
  EXPECT_EQ(server.requests().size(), size_t{URLSession::maximumConnectionsPerHost});
}

TEST_F(CancellationTest, AfterTheEndChangesNothing) {
  ScriptedServer server([](const ScriptedRequest&, ScriptedConnection& connection) {
    connection.send(httpAnswer(200, "body"));
  });
  const auto task = sessionWithDelegate(delegate)->dataTaskWithRequest(requestOf(server.URL("/")));
  task->resume();
  ASSERT_TRUE(delegate->completed.wait());
  task->cancel();
  EXPECT_EQ(task->state(), URLSessionDataTask::State::completed);
  EXPECT_EQ(delegate->code(), 0);
}

TEST_F(CancellationTest, FromManyThreadsAtManyMoments) {
  ScriptedServer server([](const ScriptedRequest&, ScriptedConnection& connection) {
    connection.send(httpAnswer(200, std::string(300000, 'x')));
  });
  constexpr int count = 200;
  Counter completions;
  std::vector<std::thread> threads;
  for (int thread = 0; thread < 4; ++thread) {
    threads.emplace_back([&, thread] {
      for (int i = thread; i < count; i += 4) {
        const auto task = session->dataTaskWithRequest(
            requestOf(server.URL("/")),
            [&](const auto&, const auto&, const auto&) { completions.add(); });
        task->resume();
        for (int spin = 0; spin < i * 500; ++spin) {
          std::atomic_signal_fence(std::memory_order_seq_cst);
        }
        task->cancel();
      }
    });
  }
  for (std::thread& thread : threads) {
    thread.join();
  }
  EXPECT_TRUE(completions.waitFor(count));
  session->finishTasksAndInvalidate();
  EXPECT_EQ(completions.count(), static_cast<size_t>(count));
}

}  // namespace
