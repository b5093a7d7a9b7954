// Log messages with placeholders.
#pragma once

#include <algorithm>
#include <concepts>
#include <cstddef>
#include <cstdint>
#include <exception>
#include <initializer_list>
#include <map>
#include <memory>
#include <optional>
#include <span>
#include <string>
#include <string_view>
#include <type_traits>
#include <utility>
#include <variant>
#include <vector>

#include "host/Zebrine/ZEBDescription.h"
#include "platform/Value.h"

class ZEBDescriptionWriter;

namespace platform {
struct Error;
}

/// What fills one placeholder: an integer, a real, a text, or nothing ("(null)"). Made implicitly
/// from anything printable; a text that is referred to must outlive the call it is made for.
class ZEBLogArgument {
 public:
  ZEBLogArgument(std::nullptr_t) noexcept {}
  ZEBLogArgument(std::nullopt_t) noexcept {}
  template <typename Integer>
  requires(std::is_integral_v<Integer> || std::is_enum_v<Integer>) ZEBLogArgument(Integer integer)
  noexcept {
    if constexpr (std::is_enum_v<Integer> || std::is_signed_v<Integer>) {
      _content = static_cast<int64_t>(integer);
    } else {
      _content = static_cast<uint64_t>(integer);
    }
  }
  ZEBLogArgument(double real) noexcept : _content(real) {}
  /// Absent for a null pointer.
  ZEBLogArgument(const char* text) noexcept;
  ZEBLogArgument(std::string_view text) noexcept : _content(text) {}
  ZEBLogArgument(const std::string& text) noexcept : _content(std::string_view(text)) {}
  /// See ZEBDescription().
  ZEBLogArgument(const platform::Value& value);
  ZEBLogArgument(const platform::Value::Array& array);
  ZEBLogArgument(const platform::Value::Dictionary& dictionary);
  /// The absolute string.
  ZEBLogArgument(const platform::URL& url);
  /// Description, domain and code.
  ZEBLogArgument(const platform::Error& error);
  /// What it says of itself: for a platform::Exception its reason.
  ZEBLogArgument(const std::exception& exception);

  /// What is inside, or absent.
  template <typename T>
  ZEBLogArgument(const std::optional<T>& optional)
      : ZEBLogArgument(optional ? ZEBLogArgument(*optional) : ZEBLogArgument(nullptr)) {}
  /// An object that describes itself.
  template <typename T>
  requires requires(const T& object) {
    { object.description() } -> std::convertible_to<std::string>;
  }
  ZEBLogArgument(const T& object) : _content(std::string(object.description())) {}
  template <typename T>
  ZEBLogArgument(const std::shared_ptr<T>& object)
      : ZEBLogArgument(object ? ZEBLogArgument(*object) : ZEBLogArgument(nullptr)) {}
  /// Lists and dictionaries, shown as ZEBDescription() shows them.
  template <typename T>
  ZEBLogArgument(const std::vector<T>& list) {
    // No more elements than could be shown, however short they are.
    const size_t count = std::min(list.size(), ZEBDescriptionMaximumLength);
    const std::vector<ZEBLogArgument> elements(list.begin(),
                                               list.begin() + static_cast<std::ptrdiff_t>(count));
    _content = _listDescription(elements);
  }
  template <typename T, typename Order>
  ZEBLogArgument(const std::map<std::string, T, Order>& dictionary) {
    std::vector<std::pair<std::string_view, ZEBLogArgument>> entries;
    for (const auto& [key, value] : dictionary) {
      if (entries.size() == ZEBDescriptionMaximumLength) {
        break;
      }
      entries.emplace_back(key, value);
    }
    _content = _dictionaryDescription(entries);
  }

  /// Appends the argument as a placeholder shows it.
  void appendTo(std::string& message) const;

 private:
  static std::string _listDescription(std::span<const ZEBLogArgument> elements);
  static std::string _dictionaryDescription(
      std::span<const std::pair<std::string_view, ZEBLogArgument>> entries);
  bool _writeAsElementTo(ZEBDescriptionWriter& writer) const;

  // A string_view is text as someone wrote it, which lists show in quotes; a string is the picture
  // of something, made here, and goes into lists as it is.
  std::variant<std::monostate, int64_t, uint64_t, double, std::string_view, std::string> _content;
};

/// `format` with "%@" and "%d" replaced by the arguments in order and "%%" by one '%'; any other
/// '%' stands for itself. A placeholder without an argument stays empty, an argument without a
/// placeholder is left out. Both placeholders take any argument.
std::string ZEBStringWithArguments(std::string_view format,
                                   std::span<const ZEBLogArgument> arguments);

/// Whether the sink of the current environment wants messages of this level.
bool ZEBLogAccepts(int level);

/// Hands a finished message to the sink of the current environment.
void ZEBLogMessage(int level, std::string_view message);

template <typename... Arguments>
std::string ZEBStringWithFormat(std::string_view format, const Arguments&... arguments) {
  const std::initializer_list<ZEBLogArgument> list = {ZEBLogArgument(arguments)...};
  return ZEBStringWithArguments(format, std::span<const ZEBLogArgument>(list.begin(), list.size()));
}

/// Logs one message; see platform::LogSink for the levels and ZEBStringWithArguments() for the
/// format. Costs next to nothing for a level that the sink does not want.
/// Thread-safety: may be called from any thread.
template <typename... Arguments>
void ZEBLog(int level, std::string_view format, const Arguments&... arguments) {
  if (ZEBLogAccepts(level)) {
    ZEBLogMessage(level, ZEBStringWithFormat(format, arguments...));
  }
}
