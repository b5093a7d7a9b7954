// What can go wrong with a transfer.
#pragma once

#include <string>
#include <string_view>

#include "platform/Error.h"

namespace platform {

/// Domain of the errors of URL sessions, URL protocols and what builds on them.
inline constexpr const char* URLErrorDomain = "NSURLErrorDomain";

/// Codes of that domain. Stored nowhere, but compared and logged: numbers are never given anew.
enum URLErrorCode : long {
  URLErrorUnknown = -1,
  URLErrorCancelled = -999,
  /// The URL, or the address that a server redirects to, cannot be used at all.
  URLErrorBadURL = -1000,
  URLErrorTimedOut = -1001,
  /// A scheme that no protocol takes.
  URLErrorUnsupportedURL = -1002,
  URLErrorCannotFindHost = -1003,
  URLErrorCannotConnectToHost = -1004,
  /// The connection ended before the answer did, a body shorter than announced included.
  URLErrorNetworkConnectionLost = -1005,
  URLErrorHTTPTooManyRedirects = -1007,
  /// Nothing to be had: not in the cache where only that was to be asked.
  URLErrorResourceUnavailable = -1008,
  URLErrorNotConnectedToInternet = -1009,
  /// A redirect that is not followed: from https to http, or to another scheme.
  URLErrorRedirectToNonExistentLocation = -1010,
  /// What came is no HTTP, or more head than anyone needs.
  URLErrorBadServerResponse = -1011,
  URLErrorUserAuthenticationRequired = -1013,
  URLErrorZeroByteResource = -1014,
  URLErrorCannotDecodeRawData = -1015,
  /// The body did not decode as its content encoding says.
  URLErrorCannotDecodeContentData = -1016,
  URLErrorCannotParseResponse = -1017,
  /// The body is longer than the session allows.
  URLErrorDataLengthExceedsMaximum = -1103,
  URLErrorSecureConnectionFailed = -1200,
  URLErrorServerCertificateHasBadDate = -1201,
  URLErrorServerCertificateUntrusted = -1202,
  URLErrorServerCertificateHasUnknownRoot = -1203,
  URLErrorServerCertificateNotYetValid = -1204,
  URLErrorClientCertificateRejected = -1205,
  URLErrorClientCertificateRequired = -1206,
};

/// An error of the domain with a text for people; `detail`, where there is one, follows it.
Error URLError(URLErrorCode code, std::string_view detail = {});

/// Whether the error is of the domain and has that code.
bool isURLError(const Error& error, URLErrorCode code);

}  // namespace platform
