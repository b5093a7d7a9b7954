// Walking through text character by character.
#pragma once

#include <unicode/umachine.h>

#include <cstddef>
#include <string>
#include <string_view>

namespace bvmake {

/// The character at `at`, which is moved behind it; negative where the bytes are ill-formed, and
/// then `at` still moves. `at` must be inside the text.
UChar32 nextCharacter(std::string_view text, size_t& at) noexcept;

/// A character, which must be one, as text.
std::string utf8OfCharacter(UChar32 character);

}  // namespace bvmake
