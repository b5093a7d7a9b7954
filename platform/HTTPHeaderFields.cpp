#include "platform/HTTPHeaderFields.h"

#include <algorithm>

namespace platform {

namespace {

constexpr unsigned char lowered(char c) {
  return static_cast<unsigned char>(c >= 'A' && c <= 'Z' ? c - 'A' + 'a' : c);
}

/// RFC 9110, section 5.6.2: what a token is made of.
bool isTokenCharacter(char c) {
  constexpr std::string_view marks = "!#$%&'*+-.^_`|~";
  return (c >= '0' && c <= '9') || (lowered(c) >= 'a' && lowered(c) <= 'z') ||
         marks.find(c) != std::string_view::npos;
}

bool isValueCharacter(char c) {
  return c == '\t' || (static_cast<unsigned char>(c) >= ' ' && c != '\x7F');
}

}  // namespace

bool HTTPFieldNameOrder::operator()(std::string_view a, std::string_view b) const noexcept {
  return std::lexicographical_compare(a.begin(), a.end(), b.begin(), b.end(),
                                      [](char x, char y) { return lowered(x) < lowered(y); });
}

std::optional<std::string> valueForHTTPHeaderField(const HTTPHeaderFields& fields,
                                                   std::string_view name) {
  const auto found = fields.find(name);
  return found == fields.end() ? std::nullopt : std::optional(found->second);
}

bool isSameHTTPFieldName(std::string_view a, std::string_view b) noexcept {
  constexpr HTTPFieldNameOrder before;
  return !before(a, b) && !before(b, a);
}

std::string_view trimmedHTTPFieldValue(std::string_view text) noexcept {
  constexpr std::string_view blanks = " \t\r\n";
  const size_t first = std::min(text.find_first_not_of(blanks), text.size());
  text.remove_prefix(first);
  return text.substr(0, text.find_last_not_of(blanks) + 1);
}

bool isValidHTTPHeaderField(std::string_view name, std::string_view value) noexcept {
  return !name.empty() && std::all_of(name.begin(), name.end(), isTokenCharacter) &&
         std::all_of(value.begin(), value.end(), isValueCharacter);
}

}  // namespace platform
