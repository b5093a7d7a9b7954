// How long sessions wait: on a clock that stands still until it is told to move.
#include <gmock/gmock.h>

#include <thread>

#include "platform/URLProtocol.h"
#include "platform/URLSession.h"
#include "tests/platform/network/SessionFixture.h"
#include "tests/support/ScriptedServer.h"

namespace {

using namespace platform;
using namespace tests;
using ::testing::ElementsAre;

class URLSessionTimeoutTest : public SessionTest {
 protected:
  URLSessionTimeoutTest() : URLSessionTimeoutTest(std::make_shared<SimulatedClock>()) {}
  explicit URLSessionTimeoutTest(std::shared_ptr<SimulatedClock> simulated)
      : SessionTest(simulated), clock(std::move(simulated)) {}

  std::shared_ptr<URLSessionDataTask> start(const ScriptedServer& server, Seconds timeout) const {
    URLRequest request = requestOf(server.URL("/"));
    request.setTimeoutInterval(timeout);
    auto task = sessionWithDelegate(delegate)->dataTaskWithRequest(request);
    task->resume();
    return task;
  }

  const std::shared_ptr<SimulatedClock> clock;
  const std::shared_ptr<RecordingDelegate> delegate = std::make_shared<RecordingDelegate>();
};

TEST_F(URLSessionTimeoutTest, GivesUpASilentServerAfterTheTimeout) {
  ScriptedServer server([](const ScriptedRequest&, ScriptedConnection& connection) {
    connection.waitUntilClientIsGone();
  });
  start(server, Seconds(30));
  server.waitForRequests(1);
  clock->advance(Seconds(29.9));
  EXPECT_EQ(server.openConnections(), 1U);
  EXPECT_FALSE(delegate->completed.isOpen());
  clock->advance(Seconds(0.2));
  ASSERT_TRUE(delegate->completed.wait());
  EXPECT_EQ(delegate->code(), URLErrorTimedOut);
  server.waitUntilAllClientsAreGone();
}

TEST_F(URLSessionTimeoutTest, HearsOfTheClockWhenNothingElseWakesIt) {
  ScriptedServer silent([](const ScriptedRequest&, ScriptedConnection& connection) {
    connection.waitUntilClientIsGone();
  });
  start(silent, Seconds(1000));
  silent.waitForRequests(1);
  // The transfer library has timers of its own at the beginning of each transfer, by the machine's
  // clock. Where nobody told of this leap, they would; they have gone off with that, or are not
  // needed, and the end of another transfer takes its own along.
  const auto shorter = std::make_shared<RecordingDelegate>();
  URLRequest request = requestOf(silent.URL("/"));
  request.setTimeoutInterval(Seconds(30));
  sessionWithDelegate(shorter)->dataTaskWithRequest(request)->resume();
  silent.waitForRequests(2);
  clock->advance(Seconds(31));
  ASSERT_TRUE(shorter->completed.wait());
  const auto quick = ScriptedServer::sending(httpAnswer(200, "body"));
  EXPECT_EQ(fetch(URLSession::sharedSession(), requestOf(quick->URL("/"))).body(), "body");
  EXPECT_FALSE(delegate->completed.isOpen());
  clock->advance(Seconds(1000));
  ASSERT_TRUE(delegate->completed.wait());
  EXPECT_EQ(delegate->code(), URLErrorTimedOut);
}

TEST_F(URLSessionTimeoutTest, BeginsAnewWithEachPieceOfTheBody) {
  Counter wanted;
  constexpr size_t pieces = 5;
  ScriptedServer server([&](const ScriptedRequest&, ScriptedConnection& connection) {
    connection.send("HTTP/1.1 200 OK\r\nContent-Length: 5\r\n\r\n");
    for (size_t piece = 1; piece <= pieces; ++piece) {
      wanted.waitFor(piece);
      connection.send("x");
    }
    connection.waitUntilClientIsGone();
  });
  start(server, Seconds(30));
  ASSERT_TRUE(delegate->responded.wait());
  for (size_t piece = 1; piece <= pieces; ++piece) {
    clock->advance(Seconds(20));
    wanted.add();
    ASSERT_TRUE(delegate->pieces.waitFor(piece));
  }
  ASSERT_TRUE(delegate->completed.wait());
  EXPECT_EQ(delegate->code(), 0);
  EXPECT_EQ(delegate->body(), "xxxxx");
}

TEST_F(URLSessionTimeoutTest, GivesUpABodyThatStops) {
  ScriptedServer server([](const ScriptedRequest&, ScriptedConnection& connection) {
    connection.send("HTTP/1.1 200 OK\r\nContent-Length: 5\r\n\r\nx");
    connection.waitUntilClientIsGone();
  });
  start(server, Seconds(30));
  ASSERT_TRUE(delegate->pieces.waitFor(1));
  clock->advance(Seconds(31));
  ASSERT_TRUE(delegate->completed.wait());
  EXPECT_EQ(delegate->code(), URLErrorTimedOut);
}

TEST_F(URLSessionTimeoutTest, DoesNotBeginAnewWithEachLineOfTheHead) {
  Counter sent;
  Counter wanted;
  ScriptedServer server([&](const ScriptedRequest&, ScriptedConnection& connection) {
    connection.send("HTTP/1.1 200 OK\r\n");
    for (size_t line = 1; connection.send("X-Slow: 1\r\n"); ++line) {
      sent.add();
      wanted.waitFor(line);
    }
  });
  start(server, Seconds(30));
  for (size_t line = 1; line <= 3; ++line) {
    ASSERT_TRUE(sent.waitFor(line));
    EXPECT_FALSE(delegate->completed.isOpen());
    clock->advance(Seconds(11));
    wanted.add();
  }
  ASSERT_TRUE(delegate->completed.wait());
  EXPECT_EQ(delegate->code(), URLErrorTimedOut);
  EXPECT_THAT(delegate->events(), ElementsAre("completion"));
  // The server goes on until it notices.
  for (int line = 0; line < 10000; ++line) {
    wanted.add();
  }
}

TEST_F(URLSessionTimeoutTest, DoesNotCountTheTimeThatTheDelegateTakes) {
  constexpr uint64_t length = 64 << 20;
  Latch sentAll;
  ScriptedServer server([&](const ScriptedRequest&, ScriptedConnection& connection) {
    connection.send("HTTP/1.1 200 OK\r\nContent-Length: " + std::to_string(length) + "\r\n\r\n");
    connection.sendFiller(length);
    sentAll.open();
    connection.waitUntilClientIsGone();
  });
  Latch mayGoOn;
  delegate->keepsBody = false;
  delegate->onData = [&](const auto&, const auto&) { mayGoOn.wait(); };
  const auto task = start(server, Seconds(30));
  ASSERT_TRUE(delegate->responded.wait());
  // More than may wait for a delegate: from now on the transfer is held back.
  while (task->countOfBytesReceived() <= URLProtocol::backlogLimit) {
    std::this_thread::yield();
  }
  clock->advance(Seconds(1000));
  EXPECT_FALSE(delegate->completed.isOpen());
  mayGoOn.open();
  ASSERT_TRUE(delegate->completed.wait());
  EXPECT_EQ(delegate->code(), 0);
  EXPECT_TRUE(sentAll.wait());
}

TEST_F(URLSessionTimeoutTest, EndsATaskThatDripsOnForAnHour) {
  Counter wanted;
  ScriptedServer server([&](const ScriptedRequest&, ScriptedConnection& connection) {
    connection.send("HTTP/1.1 200 OK\r\n\r\n");
    for (size_t piece = 1; wanted.waitFor(piece) && connection.send("x"); ++piece) {
    }
  });
  start(server, Seconds(60));
  ASSERT_TRUE(delegate->responded.wait());
  for (size_t piece = 1; piece < 60; ++piece) {
    wanted.add();
    ASSERT_TRUE(delegate->pieces.waitFor(piece));
    EXPECT_FALSE(delegate->completed.isOpen());
    clock->advance(Seconds(59.9));
  }
  wanted.add();
  ASSERT_TRUE(delegate->pieces.waitFor(60));
  clock->advance(Seconds(59.9));
  wanted.add();
  ASSERT_TRUE(delegate->pieces.waitFor(61));
  clock->advance(Seconds(10));
  ASSERT_TRUE(delegate->completed.wait());
  EXPECT_EQ(delegate->code(), URLErrorTimedOut);
  for (int piece = 0; piece < 10000; ++piece) {
    wanted.add();
  }
}

TEST_F(URLSessionTimeoutTest, DoesNotCountTheTimeBeforeItsTurn) {
  Latch mayGoOn;
  ScriptedServer server([&](const ScriptedRequest&, ScriptedConnection& connection) {
    mayGoOn.wait();
    connection.send(httpAnswer(200, "body"));
  });
  const auto session = URLSession::sessionWithConfiguration(
      URLSessionConfiguration::ephemeralSessionConfiguration());
  Counter done;
  for (int i = 0; i < URLSession::maximumConnectionsPerHost; ++i) {
    URLRequest request = requestOf(server.URL("/"));
    request.setTimeoutInterval(Seconds(1000));
    session
        ->dataTaskWithRequest(request, [&](const auto&, const auto&, const auto&) { done.add(); })
        ->resume();
  }
  server.waitForRequests(URLSession::maximumConnectionsPerHost);
  start(server, Seconds(30));
  clock->advance(Seconds(100));
  mayGoOn.open();
  ASSERT_TRUE(delegate->completed.wait());
  EXPECT_EQ(delegate->code(), 0);
  EXPECT_TRUE(done.waitFor(URLSession::maximumConnectionsPerHost));
}

TEST_F(URLSessionTimeoutTest, CountsTheWholeTimeBeforeItsTurnToo) {
  Latch mayGoOn;
  ScriptedServer server([&](const ScriptedRequest&, ScriptedConnection& connection) {
    mayGoOn.wait();
    connection.send(httpAnswer(200, "body"));
  });
  URLSessionConfiguration configuration = URLSessionConfiguration::ephemeralSessionConfiguration();
  configuration.setTimeoutIntervalForResource(Seconds(10000));
  const auto session = URLSession::sessionWithConfiguration(configuration);
  Counter done;
  for (int i = 0; i < URLSession::maximumConnectionsPerHost; ++i) {
    URLRequest request = requestOf(server.URL("/"));
    request.setTimeoutInterval(Seconds(9000));
    session
        ->dataTaskWithRequest(request, [&](const auto&, const auto&, const auto&) { done.add(); })
        ->resume();
  }
  server.waitForRequests(URLSession::maximumConnectionsPerHost);
  start(server, Seconds(30));
  clock->advance(Seconds(3601));
  ASSERT_TRUE(delegate->completed.wait());
  EXPECT_EQ(delegate->code(), URLErrorTimedOut);
  mayGoOn.open();
  EXPECT_TRUE(done.waitFor(URLSession::maximumConnectionsPerHost));
}

TEST_F(SessionTest, TimesOutOnTheMachinesClock) {
  ScriptedServer server([](const ScriptedRequest&, ScriptedConnection& connection) {
    connection.waitUntilClientIsGone();
  });
  URLRequest request = requestOf(server.URL("/"));
  request.setTimeoutInterval(Seconds(0.05));
  const auto session = URLSession::sessionWithConfiguration(
      URLSessionConfiguration::ephemeralSessionConfiguration());
  EXPECT_EQ(fetch(session, request).code(), URLErrorTimedOut);
}

}  // namespace
