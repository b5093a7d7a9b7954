// The misbehaving server that other tests rely on.
#include "tests/support/ScriptedServer.h"

#include <gtest/gtest.h>

#include "tests/support/Sockets.h"

namespace {

using namespace tests;

TEST(ScriptedServer, SendsWhatItIsTold) {
  const auto server = ScriptedServer::sending("no HTTP at all");
  EXPECT_EQ(plainExchange(server->port(), "GET / HTTP/1.1\r\n\r\n"), "no HTTP at all");
}

TEST(ScriptedServer, KeepsTheRequests) {
  const auto server = ScriptedServer::sending("x");
  plainExchange(server->port(), "GET /page?q HTTP/1.1\r\nX-Field:  value \r\n\r\n");
  const std::vector<ScriptedRequest> requests = server->waitForRequests(1);
  ASSERT_EQ(requests.size(), 1U);
  EXPECT_EQ(requests[0].method, "GET");
  EXPECT_EQ(requests[0].target, "/page?q");
  EXPECT_EQ(requests[0].header("x-field"), "value");
}

TEST(ScriptedServer, RoutesByPath) {
  const auto server =
      ScriptedServer::routing({{"/a",
                                [](const ScriptedRequest&, ScriptedConnection& connection) {
                                  connection.send("A");
                                  connection.close();
                                }},
                               {"/b", [](const ScriptedRequest&, ScriptedConnection& connection) {
                                  connection.sendFiller(100000);
                                  connection.close();
                                }}});
  EXPECT_EQ(plainExchange(server->port(), "GET /a?x HTTP/1.1\r\n\r\n"), "A");
  EXPECT_EQ(plainExchange(server->port(), "GET /b HTTP/1.1\r\n\r\n").size(), 100000U);
}

TEST(ScriptedServer, SeesClientsGo) {
  ScriptedServer server([](const ScriptedRequest&, ScriptedConnection& connection) {
    connection.send("x");
    connection.waitUntilClientIsGone();
  });
  {
    const Descriptor client = connectedSocket(server.port());
    sendAll(client, "GET / HTTP/1.1\r\n\r\n");
    server.waitForRequests(1);
    EXPECT_EQ(server.openConnections(), 1U);
  }
  server.waitUntilAllClientsAreGone();
  EXPECT_EQ(server.openConnections(), 0U);
}

}  // namespace
