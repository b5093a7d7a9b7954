#include "host/Zebrine/RNXConfig.h"

#include "platform/Environment.h"
#include "platform/UserDefaults.h"

const std::shared_ptr<RNXConfig>& RNXConfig::sharedConfig() {
  static const auto& shared = *new std::shared_ptr<RNXConfig>(std::make_shared<RNXConfig>());
  return shared;
}

std::string RNXConfig::serviceName() const {
  const auto defaults = platform::Environment::current()->userDefaults;
  const std::string name =
      defaults->valueForKey(serviceNameKey).stringValue().value_or(std::string());
  return name.empty() ? standardServiceName : name;
}
