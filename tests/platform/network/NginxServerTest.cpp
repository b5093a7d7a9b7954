// The real server that other tests rely on.
#include "tests/support/NginxServer.h"

#include <gtest/gtest.h>

#include "tests/support/Sockets.h"

namespace {

using tests::NginxServer;
using tests::plainExchange;

TEST(NginxServer, ServesWrittenFiles) {
  const NginxServer server;
  server.write("folder/page.html", "hello");
  const std::string answer = plainExchange(server.port(), "GET /folder/page.html HTTP/1.0\r\n\r\n");
  EXPECT_TRUE(answer.starts_with("HTTP/1.1 200 OK"));
  EXPECT_TRUE(answer.ends_with("\r\n\r\nhello"));
  EXPECT_EQ(server.waitForAccessLog(1).front(), "GET /folder/page.html 200 5");
}

TEST(NginxServer, StopsAndStartsAgainOnTheSamePort) {
  NginxServer server;
  server.write("page.html", "hello");
  server.stop();
  EXPECT_EQ(plainExchange(server.port(), "GET /page.html HTTP/1.0\r\n\r\n"), "");
  server.start();
  EXPECT_TRUE(plainExchange(server.port(), "GET /page.html HTTP/1.0\r\n\r\n").ends_with("hello"));
}

TEST(NginxServer, SpeaksTLSWithAnIdentity) {
  const NginxServer server({}, tests::TestAuthority::shared().serverIdentity());
  EXPECT_TRUE(server.accessLog().empty());
  EXPECT_TRUE(server.URL("/x").starts_with("https://127.0.0.1:"));
}

}  // namespace
