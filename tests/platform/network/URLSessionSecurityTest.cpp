// TLS, credentials, and where redirects may lead.
#include <gmock/gmock.h>

#include <filesystem>

#include "platform/URLSession.h"
#include "tests/platform/network/SessionFixture.h"
#include "tests/support/NginxServer.h"
#include "tests/support/ScriptedServer.h"

namespace {

using namespace platform;
using namespace tests;

class URLSessionSecurityTest : public SessionTest {
 protected:
  static std::shared_ptr<URLSession> sessionTrusting(const std::string& authority) {
    URLSessionConfiguration configuration =
        URLSessionConfiguration::ephemeralSessionConfiguration();
    configuration.setCertificateAuthorityFile(authority);
    return URLSession::sessionWithConfiguration(configuration);
  }

  const TestAuthority& authority = TestAuthority::shared();
  std::shared_ptr<URLSession> session = URLSession::sessionWithConfiguration(
      URLSessionConfiguration::ephemeralSessionConfiguration());
  std::shared_ptr<URLSession> trusting = sessionTrusting(authority.certificateFile());
};

TEST_F(URLSessionSecurityTest, VerifiesTheServerAgainstTheAuthority) {
  const NginxServer server({}, authority.serverIdentity());
  server.write("index", "the index");
  EXPECT_EQ(fetch(trusting, requestOf(server.URL("/index"))).body(), "the index");
}

TEST_F(URLSessionSecurityTest, RefusesAnAuthorityThatTheSystemDoesNotKnow) {
  const NginxServer server({}, authority.serverIdentity());
  server.write("index", "the index");
  const Outcome outcome = fetch(session, requestOf(server.URL("/index")));
  EXPECT_EQ(outcome.code(), URLErrorServerCertificateHasUnknownRoot);
  EXPECT_FALSE(outcome.data.has_value());
  EXPECT_TRUE(server.accessLog().empty());
}

TEST_F(URLSessionSecurityTest, RefusesACertificateOfYesterday) {
  const NginxServer server({}, authority.expiredIdentity());
  EXPECT_EQ(fetch(trusting, requestOf(server.URL("/"))).code(),
            URLErrorServerCertificateHasBadDate);
}

TEST_F(URLSessionSecurityTest, RefusesACertificateForAnotherHost) {
  const NginxServer server({}, authority.foreignIdentity());
  EXPECT_EQ(fetch(trusting, requestOf(server.URL("/"))).code(), URLErrorServerCertificateUntrusted);
}

TEST_F(URLSessionSecurityTest, RefusesAServerThatSpeaksNoTLS) {
  const NginxServer server;
  EXPECT_EQ(fetch(trusting, requestOf("https://127.0.0.1:" + std::to_string(server.port()))).code(),
            URLErrorSecureConnectionFailed);
}

TEST_F(URLSessionSecurityTest, FollowsNoRedirectFromHTTPSToHTTP) {
  const NginxServer plain;
  plain.write("index", "read by everyone");
  const NginxServer secure("location = /down { return 302 " + plain.URL("/index") +
                               "; } location = /file { return 302 file:///etc/passwd; }",
                           authority.serverIdentity());
  EXPECT_EQ(fetch(trusting, requestOf(secure.URL("/down"))).code(),
            URLErrorRedirectToNonExistentLocation);
  EXPECT_EQ(fetch(trusting, requestOf(secure.URL("/file"))).code(),
            URLErrorRedirectToNonExistentLocation);
  EXPECT_TRUE(plain.accessLog().empty());
}

TEST_F(URLSessionSecurityTest, FollowsARedirectFromHTTPToHTTPS) {
  const NginxServer secure({}, authority.serverIdentity());
  secure.write("index", "the index");
  const NginxServer plain("location = /up { return 301 " + secure.URL("/index") + "; }");
  EXPECT_EQ(fetch(trusting, requestOf(plain.URL("/up"))).body(), "the index");
}

TEST_F(URLSessionSecurityTest, SendsBasicCredentials) {
  const TemporaryFolder passwords;
  const std::string file = passwords.write("passwords", nginxPasswordLine("reader", "secret"));
  std::filesystem::permissions(passwords.path(), std::filesystem::perms(0755));
  const NginxServer server("location /locked/ { auth_basic x; auth_basic_user_file " + file +
                           "; }");
  server.write("locked/index", "the index");
  URLRequest request = requestOf(server.URL("/locked/index"));
  EXPECT_EQ(fetch(session, request).status(), 401);
  request.setCredential(URLCredential{URLCredential::Scheme::basic, "reader", "wrong"});
  EXPECT_EQ(fetch(session, request).status(), 401);
  request.setCredential(URLCredential{URLCredential::Scheme::basic, "reader", "secret"});
  const Outcome outcome = fetch(session, request);
  EXPECT_EQ(outcome.status(), 200);
  EXPECT_EQ(outcome.body(), "the index");
}

TEST_F(URLSessionSecurityTest, SendsBearerCredentials) {
  const auto server = ScriptedServer::routing({{"/", answering(httpAnswer(200, "in"))}});
  URLRequest request = requestOf(server->URL("/"));
  request.setCredential(URLCredential{URLCredential::Scheme::bearer, "", "token"});
  EXPECT_EQ(fetch(session, request).body(), "in");
  EXPECT_EQ(server->requests().at(0).header("Authorization"), "Bearer token");
}

class DigestServer {
 public:
  explicit DigestServer(std::string refusal = "who are you?")
      : server([refusal](const ScriptedRequest& request, ScriptedConnection& connection) {
          const std::string field = request.header("Authorization").value_or("");
          if (field.find("username=\"reader\"") != std::string::npos &&
              field.find("response=") != std::string::npos) {
            connection.send(httpAnswer(200, "in"));
          } else {
            connection.send(httpAnswer(
                401, refusal, {"WWW-Authenticate: Digest realm=\"r\", nonce=\"n\", qop=\"auth\""}));
          }
        }) {}
  ScriptedServer server;
};

TEST_F(URLSessionSecurityTest, AnswersADigestChallenge) {
  const DigestServer digest;
  URLRequest request = requestOf(digest.server.URL("/"));
  request.setCredential(URLCredential{URLCredential::Scheme::digest, "reader", "secret"});
  const auto delegate = std::make_shared<RecordingDelegate>();
  sessionWithDelegate(delegate)->dataTaskWithRequest(request)->resume();
  ASSERT_TRUE(delegate->completed.wait());
  EXPECT_THAT(delegate->events(),
              ::testing::ElementsAre("response 200", "will cache", "data", "completion"));
  EXPECT_EQ(delegate->body(), "in");
}

TEST_F(URLSessionSecurityTest, GivesTheRefusalOfADigest) {
  const DigestServer digest;
  URLRequest request = requestOf(digest.server.URL("/"));
  request.setCredential(URLCredential{URLCredential::Scheme::digest, "stranger", "secret"});
  const Outcome outcome = fetch(session, request);
  EXPECT_EQ(outcome.status(), 401);
  EXPECT_EQ(outcome.body(), "who are you?");
  EXPECT_EQ(digest.server.requests().size(), 2U);
}

TEST_F(URLSessionSecurityTest, GivesARefusalWithoutBody) {
  const DigestServer digest("");
  URLRequest request = requestOf(digest.server.URL("/"));
  request.setCredential(URLCredential{URLCredential::Scheme::digest, "stranger", "secret"});
  const Outcome outcome = fetch(session, request);
  EXPECT_EQ(outcome.status(), 401);
  EXPECT_EQ(outcome.body(), "");
}

TEST_F(URLSessionSecurityTest, TakesNoCredentialsToAnotherServer) {
  const auto other = ScriptedServer::routing({{"/", answering(httpAnswer(200, "other"))}});
  const auto server = ScriptedServer::routing(
      {{"/away", answering(httpAnswer(302, "", {"Location: " + other->URL("/")}))},
       {"/near", answering(httpAnswer(302, "", {"Location: /end"}))},
       {"/end", answering(httpAnswer(200, "end"))}});
  URLSessionConfiguration configuration = URLSessionConfiguration::ephemeralSessionConfiguration();
  configuration.setHTTPAdditionalHeaders({{"Cookie", "mine"}, {"X-Kind", "reader"}});
  const auto configured = URLSession::sessionWithConfiguration(configuration);
  for (const bool asField : {false, true}) {
    URLRequest request = requestOf(server->URL("/away"));
    if (asField) {
      request.setValueForHTTPHeaderField("Bearer token", "Authorization");
    } else {
      request.setCredential(URLCredential{URLCredential::Scheme::bearer, "", "token"});
    }
    EXPECT_EQ(fetch(configured, request).body(), "other");
    EXPECT_EQ(server->requests().back().header("Authorization"), "Bearer token");
    EXPECT_EQ(server->requests().back().header("Cookie"), "mine");
    EXPECT_FALSE(other->requests().back().header("Authorization").has_value());
    EXPECT_FALSE(other->requests().back().header("Cookie").has_value());
    EXPECT_EQ(other->requests().back().header("X-Kind"), "reader");
  }
  URLRequest request = requestOf(server->URL("/near"));
  request.setCredential(URLCredential{URLCredential::Scheme::bearer, "", "token"});
  EXPECT_EQ(fetch(configured, request).body(), "end");
  EXPECT_EQ(server->requests().back().header("Authorization"), "Bearer token");
}

}  // namespace
