// Text from files and file names on its way to a terminal.
#pragma once

#include <algorithm>
#include <string>
#include <string_view>

namespace bvmake {

/// Strings from files may hold anything; a terminal must not obey them: control characters come out
/// as '?'.
inline std::string printable(std::string_view text) {
  std::string result(text);
  std::replace_if(
      result.begin(), result.end(),
      [](char character) {
        const auto byte = static_cast<unsigned char>(character);
        return byte < 0x20 || byte == 0x7F;
      },
      '?');
  return result;
}

}  // namespace bvmake
