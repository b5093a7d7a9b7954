#include "platform/URLRequest.h"

#include <cmath>
#include <utility>

#include "platform/Exception.h"

namespace platform {

namespace {

bool isUsable(Seconds interval) {
  return std::isfinite(interval.count()) && interval > Seconds::zero();
}

}  // namespace

std::optional<URLRequest> URLRequest::requestWithURL(platform::URL url,
                                                     URLRequestCachePolicy cachePolicy,
                                                     Seconds timeoutInterval) {
  if (url.scheme().empty() || !isUsable(timeoutInterval)) {
    return std::nullopt;
  }
  return URLRequest(std::move(url), cachePolicy, timeoutInterval);
}

URLRequest::URLRequest(platform::URL url, URLRequestCachePolicy cachePolicy,
                       Seconds timeoutInterval)
    : _url(std::move(url)), _cachePolicy(cachePolicy), _timeoutInterval(timeoutInterval) {}

bool URLRequest::setURL(platform::URL url) {
  if (url.scheme().empty()) {
    return false;
  }
  _url = std::move(url);
  return true;
}

bool URLRequest::setTimeoutInterval(Seconds interval) {
  if (!isUsable(interval)) {
    return false;
  }
  _timeoutInterval = interval;
  return true;
}

void URLRequest::setHTTPMethod(std::string_view method) {
  if (method != "GET" && method != "HEAD") {
    throw Exception(invalidArgumentException, "a request either gets or asks for the head");
  }
  _method = method;
}

std::optional<std::string> URLRequest::valueForHTTPHeaderField(std::string_view name) const {
  return platform::valueForHTTPHeaderField(_headerFields, name);
}

void URLRequest::setValueForHTTPHeaderField(std::optional<std::string> value,
                                            std::string_view name) {
  if (!isValidHTTPHeaderField(name, value ? *value : std::string_view())) {
    throw Exception(invalidArgumentException, "no header field may read like this");
  }
  if (const auto earlier = _headerFields.find(name); earlier != _headerFields.end()) {
    _headerFields.erase(earlier);
  }
  if (value) {
    _headerFields.emplace(name, *std::move(value));
  }
}

void URLRequest::setCredential(std::optional<URLCredential> credential) {
  _credential = std::move(credential);
}

}  // namespace platform
