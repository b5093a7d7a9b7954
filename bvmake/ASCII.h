// The letters and blanks of markup, which are ASCII whatever the language of the text.
#pragma once

#include <algorithm>
#include <string>
#include <string_view>

namespace bvmake {

constexpr bool isBlank(char character) noexcept {
  return character == ' ' || character == '\t' || character == '\n' || character == '\r' ||
         character == '\f';
}

constexpr char lowercased(char character) noexcept {
  return character >= 'A' && character <= 'Z' ? static_cast<char>(character + 32) : character;
}

constexpr bool isLetter(char character) noexcept {
  return lowercased(character) >= 'a' && lowercased(character) <= 'z';
}

inline std::string lowercased(std::string_view text) {
  std::string result(text);
  std::transform(result.begin(), result.end(), result.begin(),
                 [](char character) { return lowercased(character); });
  return result;
}

inline bool equalsIgnoringCase(std::string_view a, std::string_view b) noexcept {
  return a.size() == b.size() && std::equal(a.begin(), a.end(), b.begin(), [](char x, char y) {
           return lowercased(x) == lowercased(y);
         });
}

/// `text` without the `characters` at its ends.
inline std::string_view trimmed(std::string_view text,
                                std::string_view characters = " \t\n\f\r") noexcept {
  const size_t first = text.find_first_not_of(characters);
  if (first == std::string_view::npos) {
    return {};
  }
  return text.substr(first, text.find_last_not_of(characters) - first + 1);
}

}  // namespace bvmake
