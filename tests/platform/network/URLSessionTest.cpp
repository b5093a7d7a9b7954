// Sessions and a real server.
#include "platform/URLSession.h"

#include <gmock/gmock.h>

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
}

}  // namespace
