// How a URL session goes about its transfers.
#pragma once

#include <cstdint>
#include <memory>
#include <optional>
#include <string>
#include <vector>

#include "platform/Clock.h"
#include "platform/HTTPHeaderFields.h"

namespace platform {

class URLCache;
struct URLProtocolClass;

/// Settings of a session. A value: a session takes a copy, later changes do not reach it.
/// Thread-safety: as any value, confined to one thread while it is changed.
class URLSessionConfiguration {
 public:
  /// A setting of the user defaults, in bytes: the greatest body that a transfer may have.
  static constexpr const char* maximumBodyLengthKey = "MaximumDownloadLength";
  static constexpr uint64_t standardMaximumBodyLength = uint64_t{256} << 20;

  /// With the shared cache, and no cookies.
  static URLSessionConfiguration defaultSessionConfiguration();
  /// The same without any cache.
  static URLSessionConfiguration ephemeralSessionConfiguration();

  /// Null for none. Each transfer of the default configuration asks for the shared one anew.
  std::shared_ptr<platform::URLCache> URLCache() const;
  void setURLCache(std::shared_ptr<platform::URLCache> cache);

  /// How long a transfer may take in all, redirects included; an hour unless told otherwise. The
  /// patience with a silent server is the request's own.
  Seconds timeoutIntervalForResource() const { return _timeoutIntervalForResource; }
  void setTimeoutIntervalForResource(Seconds interval) { _timeoutIntervalForResource = interval; }

  /// The greatest body in bytes, after its content encoding was undone; a transfer that brings more
  /// ends with URLErrorDataLengthExceedsMaximum. What the user's settings say at the time, or the
  /// standard, until it is set.
  uint64_t maximumBodyLength() const;
  void setMaximumBodyLength(uint64_t length) { _maximumBodyLength = length; }

  /// Fields for every request that has none of the name itself. They stay with the request's server
  /// where they would tell who asks: "Authorization" and "Cookie" do not follow it elsewhere.
  const HTTPHeaderFields& HTTPAdditionalHeaders() const { return _additionalHeaders; }
  void setHTTPAdditionalHeaders(HTTPHeaderFields fields) { _additionalHeaders = std::move(fields); }

  /// Whether the session keeps cookies, in memory, for requests that handle them. Off at first.
  bool HTTPShouldSetCookies() const { return _shouldSetCookies; }
  void setHTTPShouldSetCookies(bool should) { _shouldSetCookies = should; }

  /// Kinds that are asked before the registered ones, first to last.
  const std::vector<std::shared_ptr<const URLProtocolClass>>& protocolClasses() const {
    return _protocolClasses;
  }
  void setProtocolClasses(std::vector<std::shared_ptr<const URLProtocolClass>> classes) {
    _protocolClasses = std::move(classes);
  }

  /// A file of certificates (PEM) to trust in place of the system's store; what the environment
  /// says at the time until it is set. For tests.
  std::optional<std::string> certificateAuthorityFile() const;
  void setCertificateAuthorityFile(std::optional<std::string> path) {
    _authorityFile = std::move(path);
  }

 private:
  URLSessionConfiguration() = default;

  bool _usesSharedCache = false;
  std::shared_ptr<platform::URLCache> _cache;
  Seconds _timeoutIntervalForResource{3600};
  /// Absent for what the settings say.
  std::optional<uint64_t> _maximumBodyLength;
  HTTPHeaderFields _additionalHeaders;
  bool _shouldSetCookies = false;
  std::vector<std::shared_ptr<const URLProtocolClass>> _protocolClasses;
  std::optional<std::string> _authorityFile;
};

}  // namespace platform
