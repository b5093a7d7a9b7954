// A host framework over a temporary caches folder, with settings of the test's choice.
#pragma once

#include <memory>
#include <optional>
#include <string>
#include <utility>
#include <vector>

#include "host/Zebrine/RNXObjectManager.h"
#include "platform/Digest.h"
#include "platform/Environment.h"
#include "platform/URL.h"
#include "platform/URLCache.h"
#include "platform/UserDefaults.h"
#include "platform/Value.h"
#include "tests/platform/TemporaryFolder.h"
#include "tests/support/Latch.h"

namespace tests {

class RemoteHostWorld {
 public:
  RemoteHostWorld() { setDefaults({}); }
  ~RemoteHostWorld() { RNXObjectManager::setSharedObjectManager(nullptr); }

  void setDefaults(platform::Value::Dictionary settings) {
    platform::Environment environment = platform::Environment::system();
    environment.clock = clock;
    environment.log = std::make_shared<platform::CapturingLogSink>();
    environment.cachesDirectory = folder.path("caches");
    environment.preferredLanguages = languages;
    environment.userDefaults = platform::userDefaultsFromDictionary(std::move(settings));
    environment.certificateAuthorityFile = trustedAuthority;
    _override.reset();
    _override.emplace(std::move(environment));
  }
  /// The user prefers these languages from now on.
  void speak(std::vector<std::string> preferred) {
    languages = std::move(preferred);
    setDefaults({});
  }
  /// Settings with one credential for the standard service.
  void setCredential(platform::Value::Dictionary entry) {
    setDefaults(
        {{"RemoteServices", platform::Value::Dictionary{
                                {"org.zeb.help", platform::Value::Array{std::move(entry)}}}}});
  }

  // In force from the next change of settings on.
  std::vector<std::string> languages = {"en"};
  /// The system's where there is none.
  std::optional<std::string> trustedAuthority;

  TemporaryFolder folder;
  const std::shared_ptr<platform::SimulatedClock> clock =
      std::make_shared<platform::SimulatedClock>(std::chrono::system_clock::now());

 private:
  std::optional<platform::EnvironmentOverride> _override;
};

inline platform::URL urlOf(const std::string& spelling) {
  return platform::URL::URLWithString(spelling).value();
}

}  // namespace tests
