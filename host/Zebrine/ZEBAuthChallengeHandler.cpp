#include "host/Zebrine/ZEBAuthChallengeHandler.h"

#include <algorithm>

#include "host/Zebrine/ZEBStrings.h"
#include "platform/Environment.h"
#include "platform/UserDefaults.h"
#include "platform/Value.h"

namespace {

constexpr const char* hostKey = "Host";
constexpr const char* portKey = "Port";
constexpr const char* schemeKey = "Scheme";
constexpr const char* userKey = "User";
constexpr const char* passwordKey = "Password";
constexpr const char* tokenKey = "Token";
constexpr const char* resourceTypesKey = "ResourceTypes";

bool isForResourceType(const platform::Value& entry, int32_t resourceType) {
  const platform::Value::Array* types = entry[resourceTypesKey].arrayIf();
  return types == nullptr ||
         std::any_of(types->begin(), types->end(), [&](const platform::Value& type) {
           return type.kind() == platform::Value::Kind::integer &&
                  type.integerValue() == resourceType;
         });
}

bool isForServer(const platform::Value& entry, const platform::URL& url) {
  const std::optional<std::string> host = entry[hostKey].stringValue();
  if (!host || host->empty()) {
    return false;
  }
  const platform::Value& port = entry[portKey];
  if (!port.isAbsent() && port.kind() != platform::Value::Kind::integer) {
    return false;
  }
  const std::string server = url.scheme() + "://" + *host +
                             (port.isAbsent() ? "" : ":" + std::to_string(port.integerValue()));
  const auto configured = platform::URL::URLWithString(server);
  return configured && ZEBOriginOfURL(*configured) == ZEBOriginOfURL(url);
}

std::optional<platform::URLCredential> credentialOfEntry(const platform::Value& entry) {
  using Scheme = platform::URLCredential::Scheme;
  const std::string scheme = entry[schemeKey].stringValue().value_or("basic");
  const std::string user = entry[userKey].stringValue().value_or("");
  if (scheme == "bearer") {
    const std::string token = entry[tokenKey].stringValue().value_or("");
    return token.empty() ? std::nullopt
                         : std::optional(platform::URLCredential{Scheme::bearer, "", token});
  }
  if (user.empty() || (scheme != "basic" && scheme != "digest")) {
    return std::nullopt;
  }
  return platform::URLCredential{scheme == "basic" ? Scheme::basic : Scheme::digest, user,
                                 entry[passwordKey].stringValue().value_or("")};
}

}  // namespace

std::shared_ptr<ZEBAuthChallengeHandler> ZEBAuthChallengeHandler::initWithServiceName(
    std::string serviceName) {
  return std::shared_ptr<ZEBAuthChallengeHandler>(
      new ZEBAuthChallengeHandler(std::move(serviceName)));
}

std::optional<platform::URLCredential> ZEBAuthChallengeHandler::credentialForURL(
    const platform::URL& url) const {
  const std::string& address = url.absoluteString();
  const bool isSecure = url.scheme() == "https";
  const bool isLocal = url.scheme() == "http" && addSSLAsNecessary(address) == address;
  if (!isSecure && !isLocal) {
    return std::nullopt;
  }
  const platform::Value services =
      platform::Environment::current()->userDefaults->valueForKey(servicesKey);
  const platform::Value::Array* entries = services[_serviceName].arrayIf();
  if (entries == nullptr) {
    return std::nullopt;
  }
  for (const platform::Value& entry : *entries) {
    if (isForServer(entry, url) && isForResourceType(entry, _resourceType)) {
      return credentialOfEntry(entry);
    }
  }
  return std::nullopt;
}
