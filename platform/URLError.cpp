#include "platform/URLError.h"

namespace platform {

namespace {

std::string_view textOfCode(URLErrorCode code) {
  switch (code) {
    case URLErrorUnknown:
      return "the transfer failed";
    case URLErrorCancelled:
      return "the transfer was cancelled";
    case URLErrorBadURL:
      return "the URL cannot be used";
    case URLErrorTimedOut:
      return "the transfer took too long";
    case URLErrorUnsupportedURL:
      return "the URL's scheme is not supported";
    case URLErrorCannotFindHost:
      return "the server cannot be found";
    case URLErrorCannotConnectToHost:
      return "the server cannot be connected to";
    case URLErrorNetworkConnectionLost:
      return "the connection was lost";
    case URLErrorHTTPTooManyRedirects:
      return "there are too many redirects";
    case URLErrorResourceUnavailable:
      return "the resource is not available";
    case URLErrorNotConnectedToInternet:
      return "there is no network";
    case URLErrorRedirectToNonExistentLocation:
      return "the redirect leads where it must not be followed";
    case URLErrorBadServerResponse:
      return "the server's answer makes no sense";
    case URLErrorUserAuthenticationRequired:
      return "the server asks who the user is";
    case URLErrorZeroByteResource:
      return "the server sent nothing";
    case URLErrorCannotDecodeRawData:
      return "the data cannot be decoded";
    case URLErrorCannotDecodeContentData:
      return "the content encoding cannot be undone";
    case URLErrorCannotParseResponse:
      return "the server's answer cannot be read";
    case URLErrorDataLengthExceedsMaximum:
      return "the resource is longer than allowed";
    case URLErrorSecureConnectionFailed:
      return "no secure connection came about";
    case URLErrorServerCertificateHasBadDate:
      return "the server's certificate is out of date";
    case URLErrorServerCertificateUntrusted:
      return "the server's certificate is not trusted";
    case URLErrorServerCertificateHasUnknownRoot:
      return "the server's certificate comes from an unknown authority";
    case URLErrorServerCertificateNotYetValid:
      return "the server's certificate is not valid yet";
    case URLErrorClientCertificateRejected:
      return "the server refuses the client's certificate";
    case URLErrorClientCertificateRequired:
      return "the server asks for a certificate of the client";
  }
  return "the transfer failed";
}

}  // namespace

Error URLError(URLErrorCode code, std::string_view detail) {
  std::string description(textOfCode(code));
  if (!detail.empty()) {
    description.append(": ").append(detail);
  }
  return {URLErrorDomain, code, std::move(description)};
}

bool isURLError(const Error& error, URLErrorCode code) {
  return error.domain == URLErrorDomain && error.code == code;
}

}  // namespace platform
