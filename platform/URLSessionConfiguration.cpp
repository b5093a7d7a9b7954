#include "platform/URLSessionConfiguration.h"

#include <utility>

#include "platform/Environment.h"
#include "platform/URLCache.h"
#include "platform/UserDefaults.h"

namespace platform {

URLSessionConfiguration URLSessionConfiguration::ephemeralSessionConfiguration() { return {}; }

uint64_t URLSessionConfiguration::maximumBodyLength() const {
  if (_maximumBodyLength) {
    return *_maximumBodyLength;
  }
  const int64_t setting = Environment::current()->userDefaults->integerForKey(maximumBodyLengthKey);
  return setting > 0 ? static_cast<uint64_t>(setting) : standardMaximumBodyLength;
}

URLSessionConfiguration URLSessionConfiguration::defaultSessionConfiguration() {
  URLSessionConfiguration configuration = ephemeralSessionConfiguration();
  configuration._usesSharedCache = true;
  return configuration;
}

std::optional<std::string> URLSessionConfiguration::certificateAuthorityFile() const {
  return _authorityFile ? _authorityFile : Environment::current()->certificateAuthorityFile;
}

std::shared_ptr<platform::URLCache> URLSessionConfiguration::URLCache() const {
  return _usesSharedCache ? platform::URLCache::sharedURLCache() : _cache;
}

void URLSessionConfiguration::setURLCache(std::shared_ptr<platform::URLCache> cache) {
  _usesSharedCache = false;
  _cache = std::move(cache);
}

}  // namespace platform
