// What the transfer thread keeps of an exchange that is under way. Private to HTTPTransfer.
#pragma once

#include <curl/curl.h>

#include <array>
#include <memory>
#include <optional>
#include <string>
#include <string_view>

#include "platform/HTTPHeaderFields.h"
#include "platform/HTTPTransfer.h"
#include "platform/URLError.h"

namespace platform {

/// Cookies of one session, in memory. Confined to the transfer thread, but may be made and dropped
/// anywhere.
class CookieJar {
 public:
  CookieJar() : _share(curl_share_init()) {
    curl_share_setopt(_share, CURLSHOPT_SHARE, CURL_LOCK_DATA_COOKIE);
  }
  ~CookieJar() { curl_share_cleanup(_share); }
  CookieJar(const CookieJar&) = delete;
  CookieJar& operator=(const CookieJar&) = delete;

  CURLSH* share() const { return _share; }

 private:
  CURLSH* const _share;
};

/// Confined to the transfer thread.
struct HTTPTransfer::Exchange {
  explicit Exchange(HTTPTransfer& transfer);
  ~Exchange();
  Exchange(const Exchange&) = delete;
  Exchange& operator=(const Exchange&) = delete;

  /// When it must be over unless something happens; absent while the client holds it back.
  std::optional<Clock::Instant> deadline() const;
  /// Lets the data come that were held back.
  void goOn();
  /// What the end that libcurl found means to the client, who is told of a response that was kept
  /// from it so far.
  std::optional<Error> outcome(CURLcode code);

  HTTPTransfer& transfer;
  CURL* const handle;
  /// What ended it from within a call of libcurl.
  std::optional<Error> failure;

 private:
  static size_t _headCallback(char* bytes, size_t one, size_t count, void* exchange);
  static size_t _bodyCallback(char* bytes, size_t one, size_t count, void* exchange);

  void _configure();
  void _configureCredential();
  bool _takeHeadLine(std::string_view line);
  bool _takeField(std::string_view line);
  bool _finishHead();
  void _deliverResponse();
  size_t _takeBody(std::string_view bytes);
  bool _fail(URLErrorCode code, std::string_view detail);
  void _renewDeadline();
  Error _errorOfCode(CURLcode code) const;
  Error _certificateError() const;

  curl_slist* _headers = nullptr;
  std::array<char, CURL_ERROR_SIZE> _message{};
  Clock::Instant _idleDeadline{0};
  bool _heldBack = false;

  bool _inHead = false;
  size_t _headLength = 0;
  HTTPHeaderFields _fields;
  std::string _lastField;
  /// Complete, but perhaps only a step of an authentication: not delivered yet.
  std::shared_ptr<const URLResponse> _response;
  bool _delivered = false;
  uint64_t _bodyLength = 0;
};

}  // namespace platform
