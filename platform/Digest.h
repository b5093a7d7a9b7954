// Check sums that nobody can forge.
#pragma once

#include <string>
#include <string_view>

namespace platform {

/// The SHA-256 (FIPS 180-4) of some bytes as 64 hexadecimal digits in lower case.
std::string sha256Digest(std::string_view bytes);

/// Whether a text is such a digest.
bool isSHA256Digest(std::string_view text);

}  // namespace platform
