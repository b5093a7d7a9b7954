#include "platform/URLOrigin.h"

#include <curl/curl.h>

#include <memory>

namespace platform {

std::string originOfURL(const URL& url) {
  const std::unique_ptr<CURLU, decltype(&curl_url_cleanup)> parts(curl_url(), &curl_url_cleanup);
  char* port = nullptr;
  if (!parts ||
      curl_url_set(parts.get(), CURLUPART_URL, url.absoluteString().c_str(), 0) != CURLUE_OK ||
      curl_url_get(parts.get(), CURLUPART_PORT, &port, CURLU_DEFAULT_PORT) != CURLUE_OK) {
    return {};
  }
  std::string host = url.host();
  for (char& c : host) {
    c = static_cast<char>(c >= 'A' && c <= 'Z' ? c - 'A' + 'a' : c);
  }
  std::string origin = url.scheme() + "://" + host + ":" + port;
  curl_free(port);
  return origin;
}

}  // namespace platform
