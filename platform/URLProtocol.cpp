#include "platform/URLProtocol.h"

#include <algorithm>
#include <utility>
#include <vector>

#include "platform/ThreadSafety.h"
#include "platform/URLProtocolRegistry.h"

namespace platform {

namespace {

using Kind = std::shared_ptr<const URLProtocolClass>;

struct Registry {
  Mutex mutex;
  std::vector<Kind> kinds GUARDED_BY(mutex);
};

Registry& registry() {
  // Never destroyed: transfers may go on while the process ends.
  static auto& registry = *new Registry;
  return registry;
}

}  // namespace

URLProtocol::URLProtocol(URLRequest request, std::shared_ptr<URLProtocolClient> client)
    : _request(std::move(request)), _client(std::move(client)) {}

URLProtocol::~URLProtocol() = default;

bool URLProtocol::registerClass(const Kind& protocolClass) {
  Registry& all = registry();
  const MutexLock lock(all.mutex);
  if (std::find(all.kinds.begin(), all.kinds.end(), protocolClass) != all.kinds.end()) {
    return false;
  }
  all.kinds.push_back(protocolClass);
  return true;
}

void URLProtocol::unregisterClass(const Kind& protocolClass) {
  Registry& all = registry();
  const MutexLock lock(all.mutex);
  all.kinds.erase(std::remove(all.kinds.begin(), all.kinds.end(), protocolClass), all.kinds.end());
}

std::vector<Kind> registeredProtocolClasses() {
  Registry& all = registry();
  const MutexLock lock(all.mutex);
  return {all.kinds.rbegin(), all.kinds.rend()};
}

Value URLProtocol::propertyForKey(std::string_view key, const URLRequest& inRequest) {
  const auto found = inRequest._properties.find(key);
  return found == inRequest._properties.end() ? Value() : found->second;
}

void URLProtocol::setProperty(Value value, std::string_view forKey, URLRequest& inRequest) {
  inRequest._properties.insert_or_assign(std::string(forKey), std::move(value));
}

void URLProtocol::removePropertyForKey(std::string_view key, URLRequest& inRequest) {
  if (const auto found = inRequest._properties.find(key); found != inRequest._properties.end()) {
    inRequest._properties.erase(found);
  }
}

}  // namespace platform
