#include "platform/UserDefaults.h"

#include <charconv>
#include <chrono>
#include <optional>
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
    const auto date = Environment::current()->files->modificationDate(_path);
    const MutexLock lock(_mutex);
    if (date != _date) {
      _date = date;
      _settings = date ? dictionaryWithContentsOfFile(_path).value_or(Value()) : Value();
    }
    return _settings[key];
  }

 private:
  const std::string _path;
  mutable Mutex _mutex;
  mutable std::optional<std::chrono::system_clock::time_point> _date GUARDED_BY(_mutex);
  mutable Value _settings GUARDED_BY(_mutex);
};

class FixedDefaults final : public UserDefaults {
 public:
  explicit FixedDefaults(Value::Dictionary settings) : _settings(std::move(settings)) {}
  Value valueForKey(std::string_view key) const override { return _settings[key]; }

 private:
  const Value _settings;
};

}  // namespace

int64_t UserDefaults::integerForKey(std::string_view key) const {
  const Value value = valueForKey(key);
  const std::string* text = value.stringIf();
  if (text == nullptr) {
    return value.integerValue();
  }
  int64_t number = 0;
  std::from_chars(text->data(), text->data() + text->size(), number);
  return number;
}

std::shared_ptr<UserDefaults> userDefaultsFromFile(std::string path) {
  return std::make_shared<FileDefaults>(std::move(path));
}

std::shared_ptr<UserDefaults> userDefaultsFromDictionary(Value::Dictionary settings) {
  return std::make_shared<FixedDefaults>(std::move(settings));
}

}  // namespace platform
