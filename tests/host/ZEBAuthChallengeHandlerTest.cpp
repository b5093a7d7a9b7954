#include "host/Zebrine/ZEBAuthChallengeHandler.h"

#include <gtest/gtest.h>

#include "host/Zebrine/RNXConfig.h"
#include "host/Zebrine/ZEBStrings.h"
#include "tests/host/RemoteHostWorld.h"

using platform::Value;
using Dictionary = platform::Value::Dictionary;
using Scheme = platform::URLCredential::Scheme;
using tests::urlOf;

namespace {

class ZEBAuthChallengeHandlerTest : public testing::Test {
 protected:
  std::optional<platform::URLCredential> credential(const std::string& url) const {
    return handler->credentialForURL(urlOf(url));
  }

  tests::RemoteHostWorld world;
  const std::shared_ptr<ZEBAuthChallengeHandler> handler =
      ZEBAuthChallengeHandler::initWithServiceName("org.zeb.help");
};

TEST_F(ZEBAuthChallengeHandlerTest, hasNoneWithoutSettings) {
  EXPECT_EQ(handler->serviceName(), "org.zeb.help");
  EXPECT_EQ(handler->resourceType(), 0);
  EXPECT_EQ(credential("https://help.example.org/"), std::nullopt);
}

TEST_F(ZEBAuthChallengeHandlerTest, knowsThreeSchemes) {
  world.setCredential({{"Host", "a.example"}, {"User", "u"}, {"Password", "p"}});
  EXPECT_EQ(credential("https://a.example/x"), (platform::URLCredential{Scheme::basic, "u", "p"}));
  world.setCredential(
      {{"Host", "a.example"}, {"Scheme", "digest"}, {"User", "u"}, {"Password", "p"}});
  EXPECT_EQ(credential("https://a.example/x"), (platform::URLCredential{Scheme::digest, "u", "p"}));
  world.setCredential({{"Host", "a.example"}, {"Scheme", "bearer"}, {"Token", "t"}});
  EXPECT_EQ(credential("https://a.example/x"), (platform::URLCredential{Scheme::bearer, "", "t"}));
}

TEST_F(ZEBAuthChallengeHandlerTest, isForOneServerOnly) {
  world.setCredential({{"Host", "a.example"}, {"User", "u"}});
  EXPECT_TRUE(credential("https://A.Example:443/x"));
  for (const char* url : {"https://b.example/", "https://a.example:8443/", "https://x.a.example/",
                          "https://a.example.evil.org/", "https://evil.org/a.example",
                          "https://evil.org:443/?https://a.example/"}) {
    EXPECT_FALSE(credential(url)) << url;
  }
  world.setCredential({{"Host", "a.example"}, {"Port", 8443}, {"User", "u"}});
  EXPECT_TRUE(credential("https://a.example:8443/"));
  EXPECT_FALSE(credential("https://a.example/"));
}

TEST_F(ZEBAuthChallengeHandlerTest, leavesThisMachineOverSecureConnectionsOnly) {
  world.setCredential({{"Host", "a.example"}, {"User", "u"}});
  EXPECT_FALSE(credential("http://a.example/"));
  world.setCredential({{"Host", "127.0.0.1"}, {"Port", 8080}, {"User", "u"}});
  EXPECT_TRUE(credential("http://127.0.0.1:8080/"));
  EXPECT_FALSE(credential("ftp://127.0.0.1:8080/"));
}

TEST_F(ZEBAuthChallengeHandlerTest, mayBeForSomeResourceTypes) {
  world.setCredential({{"Host", "a.example"}, {"User", "u"}, {"ResourceTypes", Value::Array{1}}});
  EXPECT_FALSE(credential("https://a.example/"));
  handler->setResourceType(1);
  EXPECT_TRUE(credential("https://a.example/"));
}

TEST_F(ZEBAuthChallengeHandlerTest, isThatOfItsService) {
  world.setCredential({{"Host", "a.example"}, {"User", "u"}});
  const auto other = ZEBAuthChallengeHandler::initWithServiceName("org.other");
  EXPECT_FALSE(other->credentialForURL(urlOf("https://a.example/")));
}

TEST_F(ZEBAuthChallengeHandlerTest, settingsThatMakeNoSenseAreNone) {
  for (const Dictionary& entry :
       {Dictionary{}, Dictionary{{"Host", "a.example"}}, Dictionary{{"Host", 1}, {"User", "u"}},
        Dictionary{{"Host", "a.example"}, {"User", "u"}, {"Scheme", "secret"}},
        Dictionary{{"Host", "a.example"}, {"User", "u"}, {"Port", "x"}},
        Dictionary{{"Host", "a b"}, {"User", "u"}},
        Dictionary{{"Host", "a.example"}, {"Scheme", "bearer"}}}) {
    world.setCredential(entry);
    EXPECT_FALSE(credential("https://a.example/"));
  }
  world.setDefaults({{"RemoteServices", "text"}});
  EXPECT_FALSE(credential("https://a.example/"));
  world.setDefaults({{"RemoteServices", Dictionary{{"org.zeb.help", Value::Array{"text"}}}}});
  EXPECT_FALSE(credential("https://a.example/"));
}

TEST_F(ZEBAuthChallengeHandlerTest, theServiceHasANameThatTheUserMayChange) {
  EXPECT_EQ(RNXConfig::sharedConfig()->serviceName(), "org.zeb.help");
  world.setDefaults({{"RemoteServiceName", "org.other"}});
  EXPECT_EQ(RNXConfig::sharedConfig()->serviceName(), "org.other");
  world.setDefaults({{"RemoteServiceName", ""}});
  EXPECT_EQ(RNXConfig::sharedConfig()->serviceName(), "org.zeb.help");
}

TEST(ZEBOriginOfURLTest, isTheSameForAllURLsOfOneServer) {
  EXPECT_EQ(ZEBOriginOfURL(urlOf("https://A.example/x?y#z")), "https://a.example:443");
  EXPECT_EQ(ZEBOriginOfURL(urlOf("https://a.example:443")), "https://a.example:443");
  EXPECT_EQ(ZEBOriginOfURL(urlOf("https://a.example:0443/")), "https://a.example:443");
  EXPECT_EQ(ZEBOriginOfURL(urlOf("HTTP://a.example")), "http://a.example:80");
  EXPECT_EQ(ZEBOriginOfURL(urlOf("http://u:p@a.example:8080/")), "http://a.example:8080");
  EXPECT_EQ(ZEBOriginOfURL(urlOf("http://[::1]:8080/")), "http://[::1]:8080");
  EXPECT_EQ(ZEBOriginOfURL(urlOf("http://[::1]/")), "http://[::1]:80");
  EXPECT_EQ(ZEBOriginOfURL(urlOf("file:///a")), "");
  EXPECT_EQ(ZEBOriginOfURL(urlOf("a/b")), "");
}

}  // namespace
