// Who the user is to servers of remote books.
#pragma once

#include <atomic>
#include <cstdint>
#include <memory>
#include <optional>
#include <string>
#include <utility>

#include "platform/URL.h"
#include "platform/URLRequest.h"

/// Answers for a service with the credentials of the user's settings (docs/formats/settings.md): of
/// the list under the service's name, the first entry for the very server that is asked. A
/// credential leaves this machine over secure connections only.
/// Thread-safety: internally synchronised.
class ZEBAuthChallengeHandler {
 public:
  /// The setting that has the credentials: a dictionary from service name to array of dictionaries.
  static constexpr const char* servicesKey = "RemoteServices";

  static std::shared_ptr<ZEBAuthChallengeHandler> initWithServiceName(std::string serviceName);

  const std::string& serviceName() const noexcept { return _serviceName; }

  /// What is fetched: 0 catalogues, 1 files of books. An entry of the settings may be for some
  /// types only.
  int32_t resourceType() const noexcept { return _resourceType; }
  void setResourceType(int32_t resourceType) noexcept { _resourceType = resourceType; }

  /// The credential for a server; absent when the user has none for it. Reads the settings anew.
  std::optional<platform::URLCredential> credentialForURL(const platform::URL& url) const;

 private:
  explicit ZEBAuthChallengeHandler(std::string serviceName)
      : _serviceName(std::move(serviceName)) {}

  const std::string _serviceName;
  std::atomic<int32_t> _resourceType{0};
};
