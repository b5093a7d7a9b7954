#include "host/Luxwell/LUXDebugPreferences.h"

#include <charconv>
#include <cmath>
#include <optional>
#include <system_error>

#include "platform/Environment.h"
#include "platform/UserDefaults.h"

namespace {

constexpr float builtInCutoffThreshold = 0.20F;

// Overflow to infinity is no number either.
std::optional<float> finite(double number) {
  const auto value = static_cast<float>(number);
  return std::isfinite(value) ? std::optional<float>(value) : std::nullopt;
}

std::optional<float> userDefault(std::string_view key) {
  const auto environment = platform::Environment::current();
  if (!environment->userDefaults) {
    return std::nullopt;
  }
  const platform::Value value = environment->userDefaults->valueForKey(key);
  if (value.isNumber()) {
    return finite(value.doubleValue());
  }
  if (const std::string* text = value.stringIf()) {
    double number = 0;
    const char* end = text->data() + text->size();
    const auto [rest, error] = std::from_chars(text->data(), end, number);
    if (error == std::errc() && rest == end) {
      return finite(number);
    }
  }
  return std::nullopt;
}

}  // namespace

const std::shared_ptr<LUXDebugPreferences>& LUXDebugPreferences::defaultDebugPreferences() {
  // Never destroyed: queries may still ask while the process ends.
  static const auto& preferences =
      *new std::shared_ptr<LUXDebugPreferences>(new LUXDebugPreferences);
  return preferences;
}

float LUXDebugPreferences::floatForKey(std::string_view key) const {
  {
    const platform::MutexLock lock(_mutex);
    if (const auto found = _values.find(key); found != _values.end()) {
      return found->second;
    }
  }
  return userDefault(key).value_or(key == LUXResultCutoffThresholdKey ? builtInCutoffThreshold : 0);
}

void LUXDebugPreferences::setFloat(float value, std::string_view forKey) {
  const platform::MutexLock lock(_mutex);
  _values.insert_or_assign(std::string(forKey), value);
}

void LUXDebugPreferences::removeValueForKey(std::string_view key) {
  const platform::MutexLock lock(_mutex);
  if (const auto found = _values.find(key); found != _values.end()) {
    _values.erase(found);
  }
}
