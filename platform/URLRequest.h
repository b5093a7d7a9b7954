// What is asked of a server.
#pragma once

#include <optional>
#include <string>
#include <string_view>

#include "platform/Clock.h"
#include "platform/HTTPHeaderFields.h"
#include "platform/URL.h"
#include "platform/Value.h"

namespace platform {

/// What a request may take from the cache.
enum class URLRequestCachePolicy : int {
  /// The protocol's own rules (RFC 9111): what is fresh is taken, what is stale is asked about.
  useProtocolCachePolicy = 0,
  /// Nothing; the answer may be cached all the same.
  reloadIgnoringLocalCacheData = 1,
  /// Whatever is cached, fresh or not; the server is asked when nothing is.
  returnCacheDataElseLoad = 2,
  /// Whatever is cached, fresh or not; else the error URLErrorResourceUnavailable.
  returnCacheDataDontLoad = 3,
};

/// Who asks. Goes to the server that the request names (same scheme, host and port) and is left out
/// of redirects to any other.
struct URLCredential {
  enum class Scheme { basic, digest, bearer };

  Scheme scheme = Scheme::basic;
  /// Empty for a bearer token.
  std::string user;
  /// The password, or the token.
  std::string secret;

  friend bool operator==(const URLCredential&, const URLCredential&) = default;
};

/// A request: URL, method, header fields, how to use the cache, how long to wait, and properties
/// that programs attach for their own protocols (URLProtocol::setProperty). A value: copies are
/// independent. Thread-safety: as any value, confined to one thread while it is changed.
class URLRequest {
 public:
  /// A GET request. `timeoutInterval` is how long the transfer may go on without a byte of the
  /// answer coming in; the head of the answer must be complete within it. Absent for a URL that has
  /// no scheme, and for time-outs that are not positive numbers.
  static std::optional<URLRequest> requestWithURL(
      platform::URL url,
      URLRequestCachePolicy cachePolicy = URLRequestCachePolicy::useProtocolCachePolicy,
      Seconds timeoutInterval = Seconds(60));

  const platform::URL& URL() const { return _url; }
  /// Leaves the URL as it is, and returns false, when the new one has no scheme.
  bool setURL(platform::URL url);

  URLRequestCachePolicy cachePolicy() const { return _cachePolicy; }
  void setCachePolicy(URLRequestCachePolicy policy) { _cachePolicy = policy; }

  Seconds timeoutInterval() const { return _timeoutInterval; }
  /// Leaves it as it is, and returns false, for one that is not a positive number.
  bool setTimeoutInterval(Seconds interval);

  /// "GET" or "HEAD": this system only ever fetches.
  const std::string& HTTPMethod() const { return _method; }
  /// Throws Exception "InvalidArgumentException" for any other method.
  void setHTTPMethod(std::string_view method);

  const HTTPHeaderFields& allHTTPHeaderFields() const { return _headerFields; }
  std::optional<std::string> valueForHTTPHeaderField(std::string_view name) const;
  /// An absent value takes the field away. A request with a field "If-None-Match",
  /// "If-Modified-Since" or "Range" of its own bypasses the cache, and its 304 is passed on. Throws
  /// Exception "InvalidArgumentException" where isValidHTTPHeaderField() says no.
  void setValueForHTTPHeaderField(std::optional<std::string> value, std::string_view name);

  /// Whether cookies that a server set earlier may go with this request. On at first, but of no
  /// effect in sessions that keep no cookies, which are all that were not told otherwise
  /// (URLSessionConfiguration::setHTTPShouldSetCookies).
  bool HTTPShouldHandleCookies() const { return _shouldHandleCookies; }
  void setHTTPShouldHandleCookies(bool should) { _shouldHandleCookies = should; }

  const std::optional<URLCredential>& credential() const { return _credential; }
  void setCredential(std::optional<URLCredential> credential);

  /// The URL; what the log shows for "%@". Names neither header fields nor credentials.
  std::string description() const { return _url.absoluteString(); }

  /// Equal in everything, properties included.
  friend bool operator==(const URLRequest&, const URLRequest&) = default;

 private:
  friend class URLProtocol;

  URLRequest(platform::URL url, URLRequestCachePolicy cachePolicy, Seconds timeoutInterval);

  platform::URL _url;
  URLRequestCachePolicy _cachePolicy;
  Seconds _timeoutInterval;
  std::string _method = "GET";
  HTTPHeaderFields _headerFields;
  bool _shouldHandleCookies = true;
  std::optional<URLCredential> _credential;
  Value::Dictionary _properties;
};

}  // namespace platform
