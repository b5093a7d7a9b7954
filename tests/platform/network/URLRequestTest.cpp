#include "platform/URLRequest.h"

#include <gtest/gtest.h>

#include <cmath>

#include "platform/Exception.h"
#include "platform/URLError.h"
#include "platform/URLProtocol.h"
#include "platform/URLSessionConfiguration.h"
#include "platform/UserDefaults.h"
#include "tests/platform/network/SessionFixture.h"

namespace {

using namespace platform;
using namespace tests;

TEST(URLRequest, IsAGetWithTheProtocolsOwnPolicy) {
  const URLRequest request = requestOf("http://books.example/a");
  EXPECT_EQ(request.HTTPMethod(), "GET");
  EXPECT_EQ(request.cachePolicy(), URLRequestCachePolicy::useProtocolCachePolicy);
  EXPECT_EQ(request.timeoutInterval(), Seconds(60));
  EXPECT_TRUE(request.HTTPShouldHandleCookies());
  EXPECT_EQ(request.description(), "http://books.example/a");
}

TEST(URLRequest, TakesNoURLWithoutSchemeAndNoImpossibleTimeout) {
  const auto policy = URLRequestCachePolicy::useProtocolCachePolicy;
  EXPECT_FALSE(URLRequest::requestWithURL(urlOf("books/a")).has_value());
  for (const double timeout : {0.0, -1.0, std::nan(""), HUGE_VAL}) {
    EXPECT_FALSE(
        URLRequest::requestWithURL(urlOf("http://books.example"), policy, Seconds(timeout)));
  }
  URLRequest request = requestOf("http://books.example/a");
  const URLRequest before = request;
  EXPECT_FALSE(request.setURL(urlOf("books/a")));
  EXPECT_FALSE(request.setTimeoutInterval(Seconds(0)));
  EXPECT_EQ(request, before);
  EXPECT_TRUE(request.setURL(urlOf("http://books.example/b")));
  EXPECT_TRUE(request.setTimeoutInterval(Seconds(2)));
  EXPECT_FALSE(request == before);
}

TEST(URLRequest, SetsFieldsWithoutRegardToCase) {
  URLRequest request = requestOf("http://books.example/a");
  request.setValueForHTTPHeaderField("1", "X-Field");
  request.setValueForHTTPHeaderField("2", "x-field");
  EXPECT_EQ(request.allHTTPHeaderFields().size(), 1U);
  EXPECT_EQ(request.valueForHTTPHeaderField("X-FIELD"), "2");
  request.setValueForHTTPHeaderField(std::nullopt, "X-Field");
  EXPECT_EQ(request.valueForHTTPHeaderField("X-Field"), std::nullopt);
}

TEST(URLRequest, LetsNoFieldCarryAnother) {
  URLRequest request = requestOf("http://books.example/a");
  EXPECT_THROW(request.setValueForHTTPHeaderField("1\r\nX-Other: 2", "X"), Exception);
  EXPECT_THROW(request.setValueForHTTPHeaderField("1", "X: y"), Exception);
  EXPECT_THROW(request.setValueForHTTPHeaderField("1", ""), Exception);
  EXPECT_THROW(request.setHTTPMethod("POST"), Exception);
  EXPECT_TRUE(request.allHTTPHeaderFields().empty());
}

TEST(URLRequest, CarriesPropertiesForProtocols) {
  URLRequest request = requestOf("http://books.example/a");
  EXPECT_TRUE(URLProtocol::propertyForKey("mark", request).isAbsent());
  URLProtocol::setProperty(true, "mark", request);
  const URLRequest copy = request;
  EXPECT_TRUE(URLProtocol::propertyForKey("mark", copy).boolValue());
  URLProtocol::removePropertyForKey("mark", request);
  EXPECT_TRUE(URLProtocol::propertyForKey("mark", request).isAbsent());
  EXPECT_TRUE(URLProtocol::propertyForKey("mark", copy).boolValue());
}

std::shared_ptr<const URLResponse> responseWith(HTTPHeaderFields fields) {
  return URLResponse::initWithURL(urlOf("http://books.example/a"), 200, "HTTP/1.1",
                                  std::move(fields));
}

TEST(URLResponse, TellsLengthAndType) {
  EXPECT_EQ(responseWith({{"content-length", "12"}})->expectedContentLength(), 12);
  EXPECT_EQ(responseWith({})->expectedContentLength(), -1);
  EXPECT_EQ(responseWith({{"Content-Length", "12x"}})->expectedContentLength(), -1);
  EXPECT_EQ(responseWith({{"Content-Length", "-12"}})->expectedContentLength(), -1);
  EXPECT_EQ(responseWith({{"Content-Length", "12"}, {"Content-Encoding", "gzip"}})
                ->expectedContentLength(),
            -1);
  EXPECT_EQ(responseWith({{"Content-Type", "Text/HTML ; charset=x"}})->MIMEType(), "text/html");
  EXPECT_EQ(responseWith({})->MIMEType(), "");
  EXPECT_EQ(responseWith({})->description(), "200 http://books.example/a");
}

TEST(URLError, IsOfItsDomain) {
  const Error error = URLError(URLErrorTimedOut, "30 seconds");
  EXPECT_EQ(error.domain, "NSURLErrorDomain");
  EXPECT_EQ(error.code, -1001);
  EXPECT_EQ(error.description, "the transfer took too long: 30 seconds");
  EXPECT_TRUE(isURLError(error, URLErrorTimedOut));
  EXPECT_FALSE(isURLError(error, URLErrorCancelled));
  EXPECT_FALSE(isURLError(Error{"Other", -1001, ""}, URLErrorTimedOut));
}

TEST(URLSessionConfiguration, TakesTheGreatestBodyFromTheSettings) {
  EXPECT_EQ(URLSessionConfiguration::standardMaximumBodyLength, uint64_t{256} << 20);
  Environment environment = Environment::system();
  environment.userDefaults = userDefaultsFromDictionary({});
  {
    const EnvironmentOverride override(environment);
    EXPECT_EQ(URLSessionConfiguration::defaultSessionConfiguration().maximumBodyLength(),
              URLSessionConfiguration::standardMaximumBodyLength);
  }
  environment.userDefaults =
      userDefaultsFromDictionary({{URLSessionConfiguration::maximumBodyLengthKey, 5000}});
  const EnvironmentOverride override(environment);
  EXPECT_EQ(URLSessionConfiguration::defaultSessionConfiguration().maximumBodyLength(), 5000U);
  EXPECT_EQ(URLSessionConfiguration::ephemeralSessionConfiguration().URLCache(), nullptr);
}

}  // namespace
