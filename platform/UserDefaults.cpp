#include "platform/UserDefaults.h"

#include <algorithm>
#include <charconv>
#include <chrono>
#include <limits>
#include <optional>
#include <system_error>
#include <utility>

#include "platform/Environment.h"
#include "platform/PropertyList.h"
#include "platform/ThreadSafety.h"

namespace platform {

namespace {

class FileDefaults final : public UserDefaults {
 public:
  explicit FileDefaults(std::string path) : _path(std::move(path)) {}

  Value valueForKey(std::string_view key) const override {
    const auto environment = Environment::current();
    const auto now = environment->clock->now();
    const auto date = environment->files->modificationDate(_path);
    const MutexLock lock(_mutex);
    if (date != _date || !_settled) {
      _date = date;
      _settled = !date || now - *date > settlingTime;
      _settings = date ? dictionaryWithContentsOfFile(_path).value_or(Value()) : Value();
    }
    return _settings[key];
  }

 private:
  // A file that was changed just now may change again and keep its date, which file systems count
  // in coarse steps; until it has rested this long it is read each time.
  static constexpr std::chrono::seconds settlingTime{2};

  const std::string _path;
  mutable Mutex _mutex;
  mutable std::optional<std::chrono::system_clock::time_point> _date GUARDED_BY(_mutex);
  mutable bool _settled GUARDED_BY(_mutex) = false;
  mutable Value _settings GUARDED_BY(_mutex);
};

class FixedDefaults final : public UserDefaults {
 public:
  explicit FixedDefaults(Value::Dictionary settings) : _settings(std::move(settings)) {}
  Value valueForKey(std::string_view key) const override { return _settings[key]; }

 private:
  const Value _settings;
};

/// The number at the start of `text`, behind white space and a sign; 0 where there is none, the
/// nearest possible one where it is out of range.
int64_t leadingInteger(std::string_view text) {
  text.remove_prefix(std::min(text.find_first_not_of(" \t\n\v\f\r"), text.size()));
  if (text.starts_with('+') && !text.starts_with("+-")) {
    text.remove_prefix(1);
  }
  int64_t number = 0;
  const auto result = std::from_chars(text.data(), text.data() + text.size(), number);
  if (result.ec == std::errc::result_out_of_range) {
    return text.starts_with('-') ? std::numeric_limits<int64_t>::min()
                                 : std::numeric_limits<int64_t>::max();
  }
  return number;
}

}  // namespace

int64_t UserDefaults::integerForKey(std::string_view key) const {
  const Value value = valueForKey(key);
  const std::string* text = value.stringIf();
  return text == nullptr ? value.integerValue() : leadingInteger(*text);
}

std::shared_ptr<UserDefaults> userDefaultsFromFile(std::string path) {
  return std::make_shared<FileDefaults>(std::move(path));
}

std::shared_ptr<UserDefaults> userDefaultsFromDictionary(Value::Dictionary settings) {
  return std::make_shared<FixedDefaults>(std::move(settings));
}

}  // namespace platform
