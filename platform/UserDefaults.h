// Settings of the user, by name.
#pragma once

#include <memory>
#include <optional>
#include <string>
#include <string_view>

#include "platform/Value.h"

namespace platform {

/// Settings that a user may make. Thread-safety: internally synchronised.
class UserDefaults {
 public:
  virtual ~UserDefaults() = default;

  /// The setting; absent when it was not made.
  virtual Value valueForKey(std::string_view key) const = 0;

  /// The setting as a whole number: 0 when it was not made or is none, the nearest one that fits
  /// where it is out of range. Numbers may also be written as strings; what follows the digits is
  /// left aside.
  int64_t integerForKey(std::string_view key) const;
};

/// The file of the user's settings: zeb/settings.plist under XDG_CONFIG_HOME or HOME, whether it is
/// there or not. Absent where there is neither folder.
std::optional<std::string> userDefaultsPath();

/// Settings in a property list file with a dictionary, read anew whenever the file has changed. A
/// file that is missing or no property list holds no settings.
std::shared_ptr<UserDefaults> userDefaultsFromFile(std::string path);

/// Fixed settings.
std::shared_ptr<UserDefaults> userDefaultsFromDictionary(Value::Dictionary settings);

}  // namespace platform
