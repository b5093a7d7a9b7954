// The head of a server's answer.
#pragma once

#include <cstdint>
#include <memory>
#include <optional>
#include <string>
#include <string_view>

#include "platform/HTTPHeaderFields.h"
#include "platform/URL.h"

namespace platform {

/// Status and header fields of an answer, and the URL that gave it. Every answer here is one of
/// HTTP. Thread-safety: immutable.
class URLResponse {
 public:
  static std::shared_ptr<const URLResponse> initWithURL(platform::URL url, int statusCode,
                                                        std::string HTTPVersion,
                                                        HTTPHeaderFields headerFields);

  /// Where the answer came from: after redirects, the last URL.
  const platform::URL& URL() const { return _url; }
  int statusCode() const { return _statusCode; }
  /// Such as "HTTP/1.1".
  const std::string& HTTPVersion() const { return _version; }
  const HTTPHeaderFields& allHeaderFields() const { return _headerFields; }
  std::optional<std::string> valueForHTTPHeaderField(std::string_view name) const;

  /// Length of the body in bytes as announced, or -1 where it is not known beforehand: not said,
  /// or the body travels in a content encoding.
  int64_t expectedContentLength() const;
  /// Media type, in lower case, without parameters; empty when not said.
  std::string MIMEType() const;

  /// Status and URL; what the log shows for "%@".
  std::string description() const;

 private:
  URLResponse(platform::URL url, int statusCode, std::string version, HTTPHeaderFields fields);

  const platform::URL _url;
  const int _statusCode;
  const std::string _version;
  const HTTPHeaderFields _headerFields;
};

}  // namespace platform
