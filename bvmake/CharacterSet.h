// From the bytes of a page to its text.
#pragma once

#include <optional>
#include <string>
#include <string_view>

namespace bvmake {

enum class Markup { html, xml };

/// The name of the character set that the page itself declares: by a byte order mark, by a `meta`
/// element near its start (HTML only), or by its XML declaration, in this order of trust. Empty
/// when it declares none. Names are returned in lower case, as written.
std::string declaredCharacterSet(std::string_view bytes, Markup markup);

/// The page as well-formed UTF-8 without byte order mark and without NUL characters. The character
/// set is the declared one where it is known; else UTF-8 when the bytes are well-formed as that,
/// else what ICU is sure of from how the bytes follow each other, else windows-1252. Names are read
/// as web pages mean them ("iso-8859-1" is windows-1252); what is ill-formed in the character set
/// becomes U+FFFD. Absent when the bytes are no text at all: more than a tenth of their beginning
/// are control characters that no text has.
std::optional<std::string> textFromBytes(std::string_view bytes, Markup markup);

}  // namespace bvmake
