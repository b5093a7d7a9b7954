// Binary data as text (RFC 4648, section 4).
#pragma once

#include <optional>
#include <string>
#include <string_view>

namespace platform {

/// The text for some bytes, padded, without line breaks.
std::string base64FromBytes(std::string_view bytes);

/// The bytes of a text. Blanks, tabs and line breaks may stand anywhere; absent for any other
/// character outside the alphabet, a group that is not complete, and text after the padding.
std::optional<std::string> bytesFromBase64(std::string_view text);

}  // namespace platform
