#include "bvmake/UTF8.h"

#include <unicode/utf8.h>

namespace bvmake {

// The macro narrows bytes behind our back.
#pragma GCC diagnostic ignored "-Wconversion"
#pragma GCC diagnostic ignored "-Wsign-conversion"

UChar32 nextCharacter(std::string_view text, size_t& at) noexcept {
  const auto* bytes = reinterpret_cast<const uint8_t*>(text.data());
  const size_t length = text.size();
  UChar32 character = 0;
  U8_NEXT(bytes, at, length, character);
  return character;
}

std::string utf8OfCharacter(UChar32 character) {
  char bytes[U8_MAX_LENGTH];
  size_t length = 0;
  U8_APPEND_UNSAFE(bytes, length, character);
  return {bytes, length};
}

}  // namespace bvmake
