// Is this dynamic value what the code expects it to be?
#pragma once

#include <memory>
#include <optional>
#include <type_traits>

#include "platform/Value.h"

/// The content of `value` if it is of kind `T`, else absent. `T` is std::string, platform::Data,
/// platform::URL, platform::Date, platform::UID, Value::Array, Value::Dictionary, or an arithmetic
/// type: booleans, integers and reals are all numbers and convert as Value's own getters do.
template <typename T>
std::optional<T> zebCheckClass(const platform::Value& value) {
  if constexpr (std::is_same_v<T, bool>) {
    return value.isNumber() ? std::optional<T>(value.boolValue()) : std::nullopt;
  } else if constexpr (std::is_floating_point_v<T>) {
    return value.isNumber() ? std::optional<T>(static_cast<T>(value.doubleValue())) : std::nullopt;
  } else if constexpr (std::is_same_v<T, int64_t>) {
    return value.isNumber() ? std::optional<T>(value.integerValue()) : std::nullopt;
  } else if constexpr (std::is_same_v<T, uint64_t>) {
    return value.isNumber() ? std::optional<T>(value.unsignedValue()) : std::nullopt;
  } else {
    const T* content = nullptr;
    if constexpr (std::is_same_v<T, std::string>) {
      content = value.stringIf();
    } else if constexpr (std::is_same_v<T, platform::Data>) {
      content = value.dataIf();
    } else if constexpr (std::is_same_v<T, platform::URL>) {
      content = value.urlIf();
    } else if constexpr (std::is_same_v<T, platform::Date>) {
      content = value.dateIf();
    } else if constexpr (std::is_same_v<T, platform::UID>) {
      content = value.uidIf();
    } else if constexpr (std::is_same_v<T, platform::Value::Array>) {
      content = value.arrayIf();
    } else {
      static_assert(std::is_same_v<T, platform::Value::Dictionary>, "no kind of platform::Value");
      content = value.dictionaryIf();
    }
    return content != nullptr ? std::optional<T>(*content) : std::nullopt;
  }
}

/// The object if it is a `T` or of a class derived from it, else null; null for null.
template <typename T, typename From>
std::shared_ptr<T> zebCheckClass(const std::shared_ptr<From>& object) {
  return std::dynamic_pointer_cast<T>(object);
}
