#include "platform/URLSessionConfiguration.h"

#include <utility>

#include "platform/Environment.h"
#include "platform/URLCache.h"
#include "platform/UserDefaults.h"

namespace platform {

URLSessionConfiguration URLSessionConfiguration::ephemeralSessionConfiguration() {
  URLSessionConfiguration configuration;
  const int64_t setting = Environment::current()->userDefaults->integerForKey(maximumBodyLengthKey);
  if (setting > 0) {
    configuration._maximumBodyLength = static_cast<uint64_t>(setting);
  }
  return configuration;
}

URLSessionConfiguration URLSessionConfiguration::defaultSessionConfiguration() {
  URLSessionConfiguration configuration = ephemeralSessionConfiguration();
  configuration._usesSharedCache = true;
  return configuration;
}

std::shared_ptr<platform::URLCache> URLSessionConfiguration::URLCache() const {
  return _usesSharedCache ? platform::URLCache::sharedURLCache() : _cache;
}

void URLSessionConfiguration::setURLCache(std::shared_ptr<platform::URLCache> cache) {
  _usesSharedCache = false;
  _cache = std::move(cache);
}

}  // namespace platform
