// Numbers that steer search by meaning and that a person who measures may want to change.
#pragma once

#include <map>
#include <memory>
#include <string>
#include <string_view>

#include "platform/ThreadSafety.h"

/// Key of LUXDebugPreferences: the score that an article must be above to be shown. docs/quality.md
/// tells where the value without any setting comes from.
inline constexpr const char* LUXResultCutoffThresholdKey = "ResultCutoffThreshold";

/// Settings by name, in this order: one that was set here, one of that name in the user defaults of
/// the environment, the value that is built in. Not a place for what users are meant to choose.
/// Thread-safety: internally synchronised.
class LUXDebugPreferences {
 public:
  /// The preferences of the process.
  static const std::shared_ptr<LUXDebugPreferences>& defaultDebugPreferences();

  /// The number in force; 0 for a name that has none. A user default counts when it is a finite
  /// number or the whole text of one.
  float floatForKey(std::string_view key) const;

  /// Sets a number until removeValueForKey(), for this process alone.
  void setFloat(float value, std::string_view forKey);

  /// Takes back what was set here; nothing happens for what was not.
  void removeValueForKey(std::string_view key);

 private:
  LUXDebugPreferences() = default;

  mutable platform::Mutex _mutex;
  std::map<std::string, float, std::less<>> _values GUARDED_BY(_mutex);
};
