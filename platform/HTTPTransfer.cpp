#include "platform/HTTPTransfer.h"

#include <algorithm>
#include <cerrno>
#include <charconv>
#include <utility>

#include "platform/Environment.h"
#include "platform/HTTPTransferExchange.h"
#include "platform/TransferThread.h"

namespace platform {

namespace {

/// Larger pieces would go faster by little, and what undoing a content encoding makes of one piece
/// has to be held while the client holds the transfer back.
constexpr long receiveBufferLength = 32 << 10;

/// Whether the host is this machine, which no proxy must be asked for.
bool isThisMachine(const std::string& host) {
  return host == "localhost" || host == "[::1]" || host == "::1" || host.starts_with("127.");
}

constexpr std::string_view lengthField = "Content-Length";

/// libcurl reads to the end of the connection where the length is too great for it.
bool isHonest(std::string_view name, std::string_view value) {
  int64_t length = -1;
  const char* const end = value.data() + value.size();
  const auto [rest, failure] = std::from_chars(value.data(), end, length);
  return !isSameHTTPFieldName(name, lengthField) ||
         (failure == std::errc() && rest == end && length >= 0);
}

}  // namespace

HTTPTransfer::HTTPTransfer(URLRequest request, HTTPTransferSettings settings,
                           std::shared_ptr<HTTPTransferClient> client)
    : _request(std::move(request)), _settings(std::move(settings)), _client(std::move(client)) {}

HTTPTransfer::~HTTPTransfer() = default;

void HTTPTransfer::start() { TransferThread::shared().start(shared_from_this()); }

void HTTPTransfer::cancel() {
  _cancelled = true;
  TransferThread::shared().cancel(shared_from_this());
}

void HTTPTransfer::suspend() { ++_holds; }

void HTTPTransfer::resume() { TransferThread::shared().resume(shared_from_this()); }

HTTPTransfer::Exchange::Exchange(HTTPTransfer& owner) : transfer(owner), handle(curl_easy_init()) {
  _renewDeadline();
  _configure();
}

HTTPTransfer::Exchange::~Exchange() {
  curl_easy_cleanup(handle);
  curl_slist_free_all(_headers);
}

void HTTPTransfer::Exchange::_configure() {
  const URLRequest& request = transfer._request;
  const auto set = [this](CURLoption option, auto value) {
    curl_easy_setopt(handle, option, value);
  };
  set(CURLOPT_URL, request.URL().absoluteString().c_str());
  set(CURLOPT_PROTOCOLS_STR, "http,https");
  set(CURLOPT_HTTP_VERSION, long{CURL_HTTP_VERSION_1_1});
  set(CURLOPT_FOLLOWLOCATION, 0L);
  set(CURLOPT_NOSIGNAL, 1L);
  // The answer of a slow name server must not hold up all other transfers when one is given up.
  set(CURLOPT_QUICK_EXIT, 1L);
  // Deadlines are kept by the transfer thread, on the replaceable clock; libcurl's own would be.
  set(CURLOPT_CONNECTTIMEOUT, 24L * 3600);
  set(CURLOPT_BUFFERSIZE, receiveBufferLength);
  set(CURLOPT_ERRORBUFFER, _message.data());
  set(CURLOPT_HEADERFUNCTION, &Exchange::_headCallback);
  set(CURLOPT_HEADERDATA, static_cast<void*>(this));
  set(CURLOPT_WRITEFUNCTION, &Exchange::_bodyCallback);
  set(CURLOPT_WRITEDATA, static_cast<void*>(this));
  if (request.HTTPMethod() == "HEAD") {
    set(CURLOPT_NOBODY, 1L);
  } else {
    set(CURLOPT_HTTPGET, 1L);
  }
  if (!request.valueForHTTPHeaderField("Accept-Encoding") &&
      !request.valueForHTTPHeaderField("Range")) {
    set(CURLOPT_ACCEPT_ENCODING, "gzip");
  }
  if (isThisMachine(request.URL().host())) {
    set(CURLOPT_PROXY, "");
  }
  set(CURLOPT_SSLVERSION, long{CURL_SSLVERSION_TLSv1_2});
  if (transfer._settings.authorityFile) {
    set(CURLOPT_CAINFO, transfer._settings.authorityFile->c_str());
  }
  if (transfer._settings.cookies != nullptr && request.HTTPShouldHandleCookies()) {
    set(CURLOPT_SHARE, transfer._settings.cookies->share());
    set(CURLOPT_COOKIEFILE, "");
  }
  for (const auto& [name, value] : request.allHTTPHeaderFields()) {
    // A field without a value is spelt differently, or libcurl would leave it out.
    std::string line = name;
    line.append(value.empty() ? ";" : ": ").append(value);
    _headers = curl_slist_append(_headers, line.c_str());
  }
  _configureCredential();
  set(CURLOPT_HTTPHEADER, _headers);
}

void HTTPTransfer::Exchange::_configureCredential() {
  const std::optional<URLCredential>& credential = transfer._request.credential();
  if (!credential) {
    return;
  }
  if (credential->scheme == URLCredential::Scheme::bearer) {
    curl_easy_setopt(handle, CURLOPT_HTTPAUTH, CURLAUTH_BEARER);
    curl_easy_setopt(handle, CURLOPT_XOAUTH2_BEARER, credential->secret.c_str());
    return;
  }
  curl_easy_setopt(
      handle, CURLOPT_HTTPAUTH,
      credential->scheme == URLCredential::Scheme::basic ? CURLAUTH_BASIC : CURLAUTH_DIGEST);
  curl_easy_setopt(handle, CURLOPT_USERNAME, credential->user.c_str());
  curl_easy_setopt(handle, CURLOPT_PASSWORD, credential->secret.c_str());
}

void HTTPTransfer::Exchange::_renewDeadline() {
  _idleDeadline = transfer._settings.clock->elapsed() + transfer._request.timeoutInterval();
}

std::optional<Clock::Instant> HTTPTransfer::Exchange::deadline() const {
  if (transfer._holds > 0) {
    return std::nullopt;
  }
  return std::min(_idleDeadline, transfer._settings.resourceDeadline);
}

void HTTPTransfer::Exchange::goOn() {
  _renewDeadline();
  if (std::exchange(_heldBack, false)) {
    curl_easy_pause(handle, CURLPAUSE_CONT);
  }
}

bool HTTPTransfer::Exchange::_fail(URLErrorCode code, std::string_view detail) {
  if (!failure) {
    failure = URLError(code, detail);
  }
  return false;
}

size_t HTTPTransfer::Exchange::_headCallback(char* bytes, size_t one, size_t count,
                                             void* exchange) {
  const size_t length = one * count;
  return static_cast<Exchange*>(exchange)->_takeHeadLine({bytes, length}) ? length : 0;
}

bool HTTPTransfer::Exchange::_takeHeadLine(std::string_view line) {
  if (transfer._cancelled) {
    return false;
  }
  _headLength += line.size();
  if (_headLength > maximumHeadLength) {
    return _fail(URLErrorBadServerResponse, "its head is too long");
  }
  if (!_inHead) {
    // What follows a body is of no use to anyone.
    if (!line.starts_with("HTTP/")) {
      return true;
    }
    _inHead = true;
    _fields.clear();
    _lastField.clear();
    // That was a step of an authentication.
    _response.reset();
    return true;
  }
  const std::string_view text = trimmedHTTPFieldValue(line);
  return text.empty() ? _finishHead() : _takeField(line);
}

bool HTTPTransfer::Exchange::_takeField(std::string_view line) {
  if (line.front() == ' ' || line.front() == '\t') {
    if (const auto field = _fields.find(_lastField); field != _fields.end()) {
      field->second.append(" ").append(trimmedHTTPFieldValue(line));
    }
    return true;
  }
  const size_t colon = std::min(line.find(':'), line.size());
  const std::string name(line.substr(0, colon));
  const std::string_view value =
      trimmedHTTPFieldValue(line.substr(std::min(colon + 1, line.size())));
  if (!isValidHTTPHeaderField(name, value)) {
    return true;
  }
  _lastField = name;
  const auto [field, isNew] = _fields.emplace(name, value);
  if (isNew) {
    return isHonest(name, value) || _fail(URLErrorBadServerResponse, "it gives no real length");
  }
  if (isSameHTTPFieldName(name, lengthField)) {
    // A length may be said twice, but not two lengths.
    return field->second == value || _fail(URLErrorBadServerResponse, "it gives two lengths");
  }
  field->second.append(", ").append(value);
  return true;
}

bool HTTPTransfer::Exchange::_finishHead() {
  _inHead = false;
  long status = 0;
  long version = 0;
  curl_easy_getinfo(handle, CURLINFO_RESPONSE_CODE, &status);
  curl_easy_getinfo(handle, CURLINFO_HTTP_VERSION, &version);
  if (status < 200) {
    return true;
  }
  _response = URLResponse::initWithURL(transfer._request.URL(), static_cast<int>(status),
                                       version == CURL_HTTP_VERSION_1_0 ? "HTTP/1.0" : "HTTP/1.1",
                                       std::move(_fields));
  _fields.clear();
  const bool mayBeAStep = status == 401 && transfer._request.credential() &&
                          transfer._request.credential()->scheme == URLCredential::Scheme::digest;
  if (!mayBeAStep) {
    _deliverResponse();
  }
  const int64_t expected = _response->expectedContentLength();
  const bool hasBody = transfer._request.HTTPMethod() == "GET" && status != 304 && status != 204;
  if (hasBody && expected > 0 &&
      static_cast<uint64_t>(expected) > transfer._settings.maximumBodyLength) {
    return _fail(URLErrorDataLengthExceedsMaximum, {});
  }
  return true;
}

void HTTPTransfer::Exchange::_deliverResponse() {
  if (_response != nullptr && !_delivered && transfer._client != nullptr) {
    _delivered = true;
    _renewDeadline();
    transfer._client->transferDidReceiveResponse(_response);
  }
}

size_t HTTPTransfer::Exchange::_bodyCallback(char* bytes, size_t one, size_t count,
                                             void* exchange) {
  return static_cast<Exchange*>(exchange)->_takeBody({bytes, one * count});
}

size_t HTTPTransfer::Exchange::_takeBody(std::string_view bytes) {
  if (transfer._cancelled) {
    return CURL_WRITEFUNC_ERROR;
  }
  _deliverResponse();
  if (transfer._holds > 0) {
    _heldBack = true;
    return CURL_WRITEFUNC_PAUSE;
  }
  _bodyLength += bytes.size();
  if (_bodyLength > transfer._settings.maximumBodyLength) {
    _fail(URLErrorDataLengthExceedsMaximum, {});
    return CURL_WRITEFUNC_ERROR;
  }
  _renewDeadline();
  if (transfer._client != nullptr) {
    transfer._client->transferDidReceiveData(Data::copy(bytes));
  }
  return bytes.size();
}

std::optional<Error> HTTPTransfer::Exchange::outcome(CURLcode code) {
  if (failure) {
    return failure;
  }
  if (!transfer._cancelled) {
    _deliverResponse();
  }
  if (code != CURLE_OK) {
    return _errorOfCode(code);
  }
  return _delivered ? std::nullopt : std::optional(URLError(URLErrorBadServerResponse));
}

Error HTTPTransfer::Exchange::_errorOfCode(CURLcode code) const {
  const std::string_view detail =
      _message[0] != '\0' ? std::string_view(_message.data()) : curl_easy_strerror(code);
  long systemError = 0;
  curl_easy_getinfo(handle, CURLINFO_OS_ERRNO, &systemError);
  const bool isOffline = !isThisMachine(transfer._request.URL().host()) &&
                         !Environment::current()->networkIsReachable();
  switch (code) {
    case CURLE_URL_MALFORMAT:
      return URLError(URLErrorBadURL, detail);
    case CURLE_OPERATION_TIMEDOUT:
      return URLError(URLErrorTimedOut, detail);
    case CURLE_COULDNT_RESOLVE_HOST:
    case CURLE_COULDNT_RESOLVE_PROXY:
      return URLError(isOffline ? URLErrorNotConnectedToInternet : URLErrorCannotFindHost, detail);
    case CURLE_COULDNT_CONNECT:
      return URLError(isOffline || systemError == ENETUNREACH ? URLErrorNotConnectedToInternet
                                                              : URLErrorCannotConnectToHost,
                      detail);
    // libcurl's word for an answer in the manner of HTTP/0.9: other schemes do not come this far.
    case CURLE_UNSUPPORTED_PROTOCOL:
    case CURLE_WEIRD_SERVER_REPLY:
      return URLError(URLErrorBadServerResponse, detail);
    case CURLE_RECV_ERROR:
      // Nothing was wrong with the connection, so it was what came through it.
      if (systemError == 0 && transfer._request.URL().scheme() == "http") {
        return URLError(URLErrorCannotParseResponse, detail);
      }
      return URLError(URLErrorNetworkConnectionLost, detail);
    case CURLE_PARTIAL_FILE:
    case CURLE_SEND_ERROR:
    case CURLE_GOT_NOTHING:
      return URLError(URLErrorNetworkConnectionLost, detail);
    case CURLE_BAD_CONTENT_ENCODING:
    case CURLE_WRITE_ERROR:
      return URLError(URLErrorCannotDecodeContentData, detail);
    case CURLE_PEER_FAILED_VERIFICATION:
      return _certificateError();
    case CURLE_SSL_CLIENTCERT:
      return URLError(URLErrorClientCertificateRequired, detail);
    case CURLE_SSL_CONNECT_ERROR:
    case CURLE_SSL_CERTPROBLEM:
    case CURLE_SSL_CIPHER:
    case CURLE_SSL_CACERT_BADFILE:
    case CURLE_SSL_ISSUER_ERROR:
    case CURLE_USE_SSL_FAILED:
      return URLError(URLErrorSecureConnectionFailed, detail);
    default:
      return URLError(URLErrorUnknown, detail);
  }
}

Error HTTPTransfer::Exchange::_certificateError() const {
  const std::string_view detail(_message.data());
  const std::string_view library = curl_version_info(CURLVERSION_NOW)->ssl_version;
  long verdict = 0;
  curl_easy_getinfo(handle, CURLINFO_SSL_VERIFYRESULT, &verdict);
  // What the number means is the TLS library's own business.
  if (!library.starts_with("GnuTLS")) {
    return URLError(URLErrorServerCertificateUntrusted, detail);
  }
  constexpr long signerNotFound = 1L << 6;
  constexpr long notActivated = 1L << 9;
  constexpr long expired = 1L << 10;
  if ((verdict & signerNotFound) != 0) {
    return URLError(URLErrorServerCertificateHasUnknownRoot, detail);
  }
  if ((verdict & notActivated) != 0) {
    return URLError(URLErrorServerCertificateNotYetValid, detail);
  }
  if ((verdict & expired) != 0) {
    return URLError(URLErrorServerCertificateHasBadDate, detail);
  }
  return URLError(URLErrorServerCertificateUntrusted, detail);
}

}  // namespace platform
