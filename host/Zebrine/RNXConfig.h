// Settings of the remote content service.
#pragma once

#include <memory>
#include <string>

/// What the user has configured of the service. Reads the user's settings anew at each call.
/// Thread-safety: internally synchronised (it has no state of its own).
class RNXConfig {
 public:
  /// The setting that names the service; see serviceName().
  static constexpr const char* serviceNameKey = "RemoteServiceName";
  static constexpr const char* standardServiceName = "org.zeb.help";

  static const std::shared_ptr<RNXConfig>& sharedConfig();

  /// Under which name the user's settings have the credentials (ZEBAuthChallengeHandler).
  std::string serviceName() const;
};
