#include "platform/URLResponse.h"

#include <algorithm>
#include <charconv>
#include <utility>

namespace platform {

std::shared_ptr<const URLResponse> URLResponse::initWithURL(platform::URL url, int statusCode,
                                                            std::string HTTPVersion,
                                                            HTTPHeaderFields headerFields) {
  return std::shared_ptr<const URLResponse>(
      new URLResponse(std::move(url), statusCode, std::move(HTTPVersion), std::move(headerFields)));
}

URLResponse::URLResponse(platform::URL url, int statusCode, std::string version,
                         HTTPHeaderFields fields)
    : _url(std::move(url)),
      _statusCode(statusCode),
      _version(std::move(version)),
      _headerFields(std::move(fields)) {}

std::optional<std::string> URLResponse::valueForHTTPHeaderField(std::string_view name) const {
  return platform::valueForHTTPHeaderField(_headerFields, name);
}

int64_t URLResponse::expectedContentLength() const {
  const std::optional<std::string> text = valueForHTTPHeaderField("Content-Length");
  if (!text || valueForHTTPHeaderField("Content-Encoding") ||
      valueForHTTPHeaderField("Transfer-Encoding")) {
    return -1;
  }
  int64_t length = -1;
  const char* const end = text->data() + text->size();
  const auto [rest, failure] = std::from_chars(text->data(), end, length);
  return failure == std::errc() && rest == end && length >= 0 ? length : -1;
}

std::string URLResponse::MIMEType() const {
  std::string type = valueForHTTPHeaderField("Content-Type").value_or("");
  type.resize(std::min(type.find(';'), type.size()));
  while (!type.empty() && (type.back() == ' ' || type.back() == '\t')) {
    type.pop_back();
  }
  std::transform(type.begin(), type.end(), type.begin(), [](char c) {
    return static_cast<char>(c >= 'A' && c <= 'Z' ? c - 'A' + 'a' : c);
  });
  return type;
}

std::string URLResponse::description() const {
  return std::to_string(_statusCode) + " " + _url.absoluteString();
}

}  // namespace platform
