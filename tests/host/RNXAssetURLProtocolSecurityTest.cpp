// Whom the asset protocol believes, and to whom it shows the user's credentials.
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <filesystem>

#include "host/Zebrine/RNXAssetURLProtocol.h"
#include "host/Zebrine/ZEBAuthChallengeHandler.h"
#include "tests/host/AssetLoading.h"
#include "tests/support/DigestGate.h"
#include "tests/support/NginxServer.h"
#include "tests/support/ScriptedServer.h"

using testing::IsEmpty;
using testing::SizeIs;
using tests::answering;
using tests::DigestGate;
using tests::httpAnswer;
using tests::loadAsset;
using tests::NginxServer;
using tests::ScriptedServer;
using tests::TestAuthority;
using Dictionary = platform::Value::Dictionary;

namespace {

/// Tells a client what credentials it has shown.
constexpr const char* echo =
    "location = /echo { default_type text/plain; return 200 '[$http_authorization]'; }";
/// What basic credentials of user "reader" with password "secret" look like.
constexpr const char* basicField = "[Basic cmVhZGVyOnNlY3JldA==]";

class RNXAssetURLProtocolSecurityTest : public testing::Test {
 protected:
  RNXAssetURLProtocolSecurityTest() {
    world.trustedAuthority = authority.certificateFile();
    world.setDefaults({});
    RNXAssetURLProtocol::registerProtocolWithAuthHandler(
        ZEBAuthChallengeHandler::initWithServiceName("org.zeb.help"));
  }

  static Dictionary reader(int port, const std::string& scheme = "basic",
                           const std::string& password = "secret") {
    return {{"Host", "127.0.0.1"}, {"Port", port},         {"Scheme", scheme},
            {"User", "reader"},    {"Password", password}, {"Token", "secret"}};
  }

  tests::RemoteHostWorld world;
  const TestAuthority& authority = TestAuthority::shared();
};

TEST_F(RNXAssetURLProtocolSecurityTest, showsABasicPasswordToASecureServerThatAsksForOne) {
  const tests::TemporaryFolder folder;
  const std::string passwords =
      folder.write("passwords", tests::nginxPasswordLine("reader", "secret"));
  std::filesystem::permissions(folder.path(), std::filesystem::perms(0755));
  const NginxServer server("auth_basic \"help\"; auth_basic_user_file " + passwords + ";",
                           authority.serverIdentity());
  server.write("index", "the index");
  EXPECT_EQ(loadAsset(server.URL("/index")).status(), 401);
  world.setCredential(reader(server.port(), "basic", "wrong"));
  EXPECT_EQ(loadAsset(server.URL("/index")).status(), 401);
  world.setCredential(reader(server.port()));
  EXPECT_EQ(loadAsset(server.URL("/index")).body(), "the index");
}

TEST_F(RNXAssetURLProtocolSecurityTest, provesADigestPasswordWithoutSendingIt) {
  for (const char* algorithm : {"MD5", "SHA-256"}) {
    const DigestGate gate(algorithm, "reader", "secret");
    const ScriptedServer server(gate.before(answering(httpAnswer(200, "the index"))));
    world.setDefaults({});
    EXPECT_EQ(loadAsset(server.URL("/index?a=b")).status(), 401);
    world.setCredential(reader(server.port(), "digest", "wrong"));
    EXPECT_EQ(loadAsset(server.URL("/index?a=b")).status(), 401);
    world.setCredential(reader(server.port(), "digest"));
    EXPECT_EQ(loadAsset(server.URL("/index?a=b")).body(), "the index") << algorithm;
    for (const tests::ScriptedRequest& request : server.requests()) {
      EXPECT_EQ(request.header("Authorization").value_or("").find("secret"), std::string::npos);
    }
  }
}

TEST_F(RNXAssetURLProtocolSecurityTest, provesADigestPasswordAlongRedirectsWithinItsServer) {
  const DigestGate gate("MD5", "reader", "secret");
  const auto server = ScriptedServer::routing(
      {{"/old", gate.before(answering(httpAnswer(302, "", {"Location: /new"})))},
       {"/new", gate.before(answering(httpAnswer(200, "the index")))}});
  world.setCredential(reader(server->port(), "digest"));
  EXPECT_EQ(loadAsset(server->URL("/old")).body(), "the index");
}

TEST_F(RNXAssetURLProtocolSecurityTest, provesADigestPasswordToNoOtherServerThatAsksForOne) {
  const DigestGate greedy("MD5", "reader", "secret");
  const ScriptedServer other(greedy.before(answering(httpAnswer(200, "got it"))));
  const DigestGate gate("MD5", "reader", "secret");
  const ScriptedServer server(
      gate.before(answering(httpAnswer(302, "", {"Location: " + other.URL("/there")}))));
  world.setCredential(reader(server.port(), "digest"));
  EXPECT_EQ(loadAsset(server.URL("/away")).status(), 401);
  EXPECT_EQ(loadAsset(other.URL("/there")).status(), 401);
  ASSERT_THAT(other.requests(), SizeIs(2));
  for (const tests::ScriptedRequest& request : other.requests()) {
    EXPECT_EQ(request.header("Authorization"), std::nullopt);
  }
}

TEST_F(RNXAssetURLProtocolSecurityTest, showsCredentialsToNoOtherServerOverTLSEither) {
  const NginxServer other(echo, authority.serverIdentity());
  const NginxServer server("location = /away { return 302 " + other.URL("/echo") +
                               "; } location = /within { return 307 /echo; } location = /alias "
                               "{ return 302 https://localhost:$server_port/echo; }" +
                               echo,
                           authority.serverIdentity());
  for (const auto& [scheme, shown] :
       {std::pair{"basic", basicField}, std::pair{"bearer", "[Bearer secret]"}}) {
    world.setCredential(reader(server.port(), scheme));
    EXPECT_EQ(loadAsset(server.URL("/echo")).body(), shown);
    EXPECT_EQ(loadAsset(server.URL("/within")).body(), shown);
    EXPECT_EQ(loadAsset(server.URL("/away")).body(), "[]") << scheme;
    // Another name of the same server is another server.
    EXPECT_EQ(loadAsset(server.URL("/alias")).body(), "[]") << scheme;
    EXPECT_EQ(loadAsset(other.URL("/echo")).body(), "[]") << scheme;
  }
}

TEST_F(RNXAssetURLProtocolSecurityTest, comesBackFromAnotherServerWithCredentialsForItsOwn) {
  NginxServer other("location = /back { return 302 $arg_to; }", authority.serverIdentity());
  const NginxServer server("location = /away { return 302 " + other.URL("/back?to=") +
                               "https://127.0.0.1:$server_port/echo; }" + echo,
                           authority.serverIdentity());
  world.setCredential(reader(server.port()));
  EXPECT_EQ(loadAsset(server.URL("/away")).body(), basicField);
}

TEST_F(RNXAssetURLProtocolSecurityTest, showsNothingToAServerWithAWrongCertificate) {
  const struct {
    const TestAuthority::Identity& identity;
    bool isTrusted;
    platform::URLErrorCode code;
  } cases[] = {
      {authority.expiredIdentity(), true, platform::URLErrorServerCertificateHasBadDate},
      {authority.foreignIdentity(), true, platform::URLErrorServerCertificateUntrusted},
      {authority.serverIdentity(), false, platform::URLErrorServerCertificateHasUnknownRoot},
  };
  for (const auto& wrong : cases) {
    const NginxServer server(echo, wrong.identity);
    server.write("index", "the index");
    world.trustedAuthority =
        wrong.isTrusted ? std::optional(authority.certificateFile()) : std::nullopt;
    for (const char* scheme : {"basic", "digest", "bearer"}) {
      world.setCredential(reader(server.port(), scheme));
      const tests::LoadedAsset result = loadAsset(server.URL("/index"));
      EXPECT_TRUE(result.failedWith(wrong.code)) << (result.error ? result.error->code : 0);
      EXPECT_EQ(result.data, std::nullopt);
    }
    EXPECT_THAT(server.accessLog(), IsEmpty());
  }
}

TEST_F(RNXAssetURLProtocolSecurityTest, isLedByARightCertificateToNoWrongOne) {
  const NginxServer other(echo, authority.foreignIdentity());
  const NginxServer server("location = /away { return 302 " + other.URL("/echo") + "; }",
                           authority.serverIdentity());
  world.setCredential(reader(server.port()));
  EXPECT_TRUE(
      loadAsset(server.URL("/away")).failedWith(platform::URLErrorServerCertificateUntrusted));
  EXPECT_THAT(other.accessLog(), IsEmpty());
}

TEST_F(RNXAssetURLProtocolSecurityTest, isLedFromASecureServerToNoOtherKind) {
  const NginxServer plain(echo);
  const NginxServer server("location = /down { return 302 " + plain.URL("/echo") + "; }",
                           authority.serverIdentity());
  world.setCredential(reader(server.port()));
  EXPECT_TRUE(
      loadAsset(server.URL("/down")).failedWith(platform::URLErrorRedirectToNonExistentLocation));
  EXPECT_THAT(plain.accessLog(), IsEmpty());
}

TEST_F(RNXAssetURLProtocolSecurityTest, showsCredentialsForCataloguesToNoFileOfABook) {
  const NginxServer server(echo);
  const auto handler = ZEBAuthChallengeHandler::initWithServiceName("org.zeb.help");
  handler->setResourceType(1);
  RNXAssetURLProtocol::registerProtocolWithAuthHandler(handler);
  Dictionary entry = reader(server.port());
  entry["ResourceTypes"] = platform::Value::Array{0};
  world.setCredential(entry);
  EXPECT_EQ(loadAsset(server.URL("/echo")).body(), "[]");
  entry["ResourceTypes"] = platform::Value::Array{0, 1};
  world.setCredential(entry);
  EXPECT_EQ(loadAsset(server.URL("/echo")).body(), basicField);
}

TEST_F(RNXAssetURLProtocolSecurityTest, whatWasAnsweredToAPasswordIsNotAnsweredWithoutIt) {
  const NginxServer server(
      "location = /echo { add_header Cache-Control 'max-age=1000'; add_header Vary "
      "Authorization; default_type text/plain; return 200 '[$http_authorization]'; }",
      authority.serverIdentity());
  world.setCredential(reader(server.port()));
  EXPECT_EQ(loadAsset(server.URL("/echo")).body(), basicField);
  world.setDefaults({});
  EXPECT_EQ(loadAsset(server.URL("/echo")).body(), "[]");
}

}  // namespace
