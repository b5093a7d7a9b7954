// The header fields of HTTP messages.
#pragma once

#include <map>
#include <optional>
#include <string>
#include <string_view>

namespace platform {

/// Orders the names of fields without regard to the case of ASCII letters.
struct HTTPFieldNameOrder {
  using is_transparent = void;
  bool operator()(std::string_view a, std::string_view b) const noexcept;
};

/// Values by name. A field that a message has several times stands here once, its values joined
/// with ", " in the order in which they came.
using HTTPHeaderFields = std::map<std::string, std::string, HTTPFieldNameOrder>;

/// The value of a field; absent where there is none.
std::optional<std::string> valueForHTTPHeaderField(const HTTPHeaderFields& fields,
                                                   std::string_view name);

/// Whether two names mean the same field.
bool isSameHTTPFieldName(std::string_view a, std::string_view b) noexcept;

/// The text without blanks, tabs and line ends around it.
std::string_view trimmedHTTPFieldValue(std::string_view text) noexcept;

/// Whether the name and the value may stand in a message: no control characters, a name without
/// separators.
bool isValidHTTPHeaderField(std::string_view name, std::string_view value) noexcept;

}  // namespace platform
