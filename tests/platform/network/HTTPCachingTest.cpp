#include "platform/HTTPCaching.h"

#include <gtest/gtest.h>

#include "tests/platform/network/SessionFixture.h"

namespace {

using namespace platform;
using namespace tests;
using std::chrono::seconds;

using TimePoint = std::chrono::system_clock::time_point;

constexpr const char* noon = "Sun, 06 Nov 1994 12:00:00 GMT";
constexpr const char* oneOClock = "Sun, 06 Nov 1994 13:00:00 GMT";

std::shared_ptr<const URLResponse> response(HTTPHeaderFields fields, int status = 200) {
  return URLResponse::initWithURL(urlOf("http://books.example/"), status, "HTTP/1.1",
                                  std::move(fields));
}

class HTTPCachingTest : public SessionTest {
 protected:
  HTTPCachingTest() : HTTPCachingTest(std::make_shared<SimulatedClock>()) {}
  explicit HTTPCachingTest(std::shared_ptr<SimulatedClock> simulated)
      : SessionTest(simulated), clock(std::move(simulated)) {
    clock->setNow(httpcaching::timeFromText(noon).value());
  }

  /// Whether an answer that came at noon is fresh some seconds later.
  bool isFreshAfter(long later, HTTPHeaderFields fields, const URLRequest& request) const {
    const auto cached = CachedURLResponse::initWithResponse(response(std::move(fields)), Data());
    return httpcaching::isFresh(*cached, request, clock->now() + seconds(later));
  }
  bool isFreshAfter(long later, HTTPHeaderFields fields) const {
    return isFreshAfter(later, std::move(fields), requestOf("http://books.example/"));
  }

  const std::shared_ptr<SimulatedClock> clock;
};

TEST_F(HTTPCachingTest, ReadsTimesInAllThreeForms) {
  const auto expected = TimePoint(seconds(784111777));
  for (const char* text : {"Sun, 06 Nov 1994 08:49:37 GMT", "Sunday, 06-Nov-94 08:49:37 GMT",
                           "Sun Nov  6 08:49:37 1994"}) {
    EXPECT_EQ(httpcaching::timeFromText(text), expected) << text;
  }
  for (const char* text : {"", "0", "-1", "soon", "Sun, 99 Nov 1994 08:49:37 GMT"}) {
    EXPECT_EQ(httpcaching::timeFromText(text), std::nullopt) << text;
  }
  EXPECT_TRUE(httpcaching::timeFromText("Fri, 31 Dec 9999 23:59:59 GMT").has_value());
}

TEST_F(HTTPCachingTest, IsFreshForItsMaximumAge) {
  const HTTPHeaderFields fields = {{"Cache-Control", "public, Max-Age=60"}, {"Date", noon}};
  EXPECT_TRUE(isFreshAfter(59, fields));
  EXPECT_FALSE(isFreshAfter(60, fields));
}

TEST_F(HTTPCachingTest, IsFreshUntilItExpires) {
  const HTTPHeaderFields fields = {{"Expires", oneOClock}, {"Date", noon}};
  EXPECT_TRUE(isFreshAfter(3599, fields));
  EXPECT_FALSE(isFreshAfter(3600, fields));
}

TEST_F(HTTPCachingTest, TakesTheMaximumAgeBeforeTheExpiry) {
  EXPECT_FALSE(
      isFreshAfter(10, {{"Cache-Control", "max-age=5"}, {"Expires", oneOClock}, {"Date", noon}}));
}

TEST_F(HTTPCachingTest, CountsTheAgeThatAnAnswerCameWith) {
  EXPECT_FALSE(isFreshAfter(20, {{"Cache-Control", "max-age=60"}, {"Age", "45"}}));
  EXPECT_TRUE(isFreshAfter(10, {{"Cache-Control", "max-age=60"}, {"Age", "45"}}));
  EXPECT_FALSE(isFreshAfter(
      0, {{"Cache-Control", "max-age=60"}, {"Date", "Sun, 06 Nov 1994 11:58:00 GMT"}}));
}

TEST_F(HTTPCachingTest, IsStaleWithoutWordOfFreshness) {
  EXPECT_FALSE(isFreshAfter(0, {}));
  EXPECT_FALSE(isFreshAfter(0, {{"Last-Modified", "Sun, 06 Nov 1904 12:00:00 GMT"}}));
  EXPECT_FALSE(isFreshAfter(0, {{"Expires", "0"}, {"Date", noon}}));
  EXPECT_FALSE(isFreshAfter(0, {{"Cache-Control", "max-age=x"}}));
  EXPECT_FALSE(isFreshAfter(0, {{"Cache-Control", "max-age"}}));
  EXPECT_FALSE(isFreshAfter(0, {{"Cache-Control", "max-age=60, max-age=0"}}));
}

TEST_F(HTTPCachingTest, AsksWhereTheServerOrTheRequestWantsIt) {
  EXPECT_FALSE(isFreshAfter(0, {{"Cache-Control", "max-age=60, no-cache"}}));
  EXPECT_FALSE(isFreshAfter(0, {{"Pragma", "no-cache"}, {"Expires", oneOClock}, {"Date", noon}}));
  URLRequest request = requestOf("http://books.example/");
  request.setValueForHTTPHeaderField("no-cache", "Cache-Control");
  EXPECT_FALSE(isFreshAfter(0, {{"Cache-Control", "max-age=60"}}, request));
  request.setValueForHTTPHeaderField("max-age=10", "Cache-Control");
  EXPECT_TRUE(isFreshAfter(9, {{"Cache-Control", "max-age=60"}}, request));
  EXPECT_FALSE(isFreshAfter(10, {{"Cache-Control", "max-age=60"}}, request));
}

TEST_F(HTTPCachingTest, BearsAnyLifetimeAndAnyClock) {
  EXPECT_TRUE(isFreshAfter(1000, {{"Cache-Control", "max-age=99999999999999999999999"}}));
  EXPECT_FALSE(isFreshAfter(1000, {{"Cache-Control", "max-age=-1"}}));
  EXPECT_FALSE(
      isFreshAfter(1000, {{"Cache-Control", "max-age=60"}, {"Age", "99999999999999999999"}}));
  // A clock that was set back.
  EXPECT_FALSE(isFreshAfter(-10, {{"Cache-Control", "max-age=60"}}));
}

TEST_F(HTTPCachingTest, StoresWholeAnswersToPlainRequests) {
  const URLRequest plain = requestOf("http://books.example/");
  EXPECT_TRUE(httpcaching::mayStore(plain, *response({})));
  EXPECT_FALSE(
      httpcaching::mayStore(plain, *response({{"Cache-Control", "a=\"b, c\", No-Store"}})));
  EXPECT_TRUE(httpcaching::mayStore(plain, *response({{"Cache-Control", "a=\"no-store\""}})));
  for (const int status : {206, 301, 304, 404, 500}) {
    EXPECT_FALSE(httpcaching::mayStore(plain, *response({}, status))) << status;
  }
  for (const char* field : {"Range", "If-None-Match", "If-Modified-Since", "If-Range"}) {
    URLRequest own = plain;
    own.setValueForHTTPHeaderField("x", field);
    EXPECT_FALSE(httpcaching::mayStore(own, *response({}))) << field;
  }
  URLRequest secret = plain;
  secret.setValueForHTTPHeaderField("no-store", "Cache-Control");
  EXPECT_FALSE(httpcaching::mayStore(secret, *response({})));
  URLRequest head = plain;
  head.setHTTPMethod("HEAD");
  EXPECT_FALSE(httpcaching::mayStore(head, *response({})));
}

TEST_F(HTTPCachingTest, StoresNoAnswerThatDependsOnCredentialsThatWereShown) {
  const URLRequest plain = requestOf("http://books.example/");
  const auto varying = response({{"Vary", "Accept-Encoding, authorization"}});
  URLRequest withCredential = plain;
  withCredential.setCredential(URLCredential{URLCredential::Scheme::basic, "reader", "secret"});
  URLRequest withField = plain;
  withField.setValueForHTTPHeaderField("Bearer token", "Authorization");
  EXPECT_TRUE(httpcaching::mayStore(plain, *varying));
  EXPECT_FALSE(httpcaching::mayStore(withCredential, *varying));
  EXPECT_FALSE(httpcaching::mayStore(withField, *varying));
  EXPECT_TRUE(httpcaching::mayStore(withCredential, *response({{"Vary", "Accept-Encoding"}})));
}

TEST_F(HTTPCachingTest, AsksByWhatTheAnswerHas) {
  URLRequest request = requestOf("http://books.example/");
  EXPECT_FALSE(httpcaching::makeConditional(request, *response({})));
  EXPECT_EQ(request, requestOf("http://books.example/"));
  EXPECT_TRUE(httpcaching::makeConditional(
      request, *response({{"ETag", "\"1\""}, {"Last-Modified", noon}})));
  EXPECT_EQ(request.valueForHTTPHeaderField("If-None-Match"), "\"1\"");
  EXPECT_EQ(request.valueForHTTPHeaderField("If-Modified-Since"), noon);
}

TEST_F(HTTPCachingTest, RenewsTheFieldsThatA304Brings) {
  const auto stored =
      response({{"ETag", "\"1\""}, {"Content-Length", "5"}, {"Age", "9"}, {"A", "1"}});
  const auto renewed = httpcaching::renewed(
      *stored,
      *response({{"Cache-Control", "max-age=5"}, {"Content-Length", "0"}, {"A", "2"}}, 304));
  EXPECT_EQ(renewed->statusCode(), 200);
  EXPECT_EQ(
      renewed->allHeaderFields(),
      (HTTPHeaderFields{
          {"ETag", "\"1\""}, {"Content-Length", "5"}, {"A", "2"}, {"Cache-Control", "max-age=5"}}));
}

TEST_F(HTTPCachingTest, ComparesTagsWithoutTheirWeakness) {
  const auto stored = response({{"ETag", "\"1\""}});
  EXPECT_TRUE(httpcaching::confirms(*response({{"ETag", "W/\"1\""}}, 304), *stored));
  EXPECT_TRUE(httpcaching::confirms(*response({}, 304), *stored));
  EXPECT_FALSE(httpcaching::confirms(*response({{"ETag", "\"2\""}}, 304), *stored));
}

TEST_F(HTTPCachingTest, KeepsARenewalThatMakesADifference) {
  const auto stored = response({{"ETag", "\"1\""}, {"Date", noon}});
  EXPECT_FALSE(
      httpcaching::isWorthKeeping(*response({{"ETag", "\"1\""}, {"Date", oneOClock}}), *stored));
  EXPECT_TRUE(httpcaching::isWorthKeeping(*response({{"ETag", "\"1\""}, {"A", "1"}}), *stored));
  EXPECT_TRUE(httpcaching::isWorthKeeping(
      *response({{"ETag", "\"1\""}, {"Cache-Control", "max-age=1"}}), *stored));
}

}  // namespace
