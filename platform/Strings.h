// Text operations that must know Unicode or the user's language.
#pragma once

#include <string>
#include <string_view>
#include <vector>

namespace platform {

/// Space separators and line breaks: the blanks of Unicode (general category Z), the tab, U+000A
/// to U+000D, and U+0085.
bool isWhitespaceOrNewline(char32_t character) noexcept;

/// The string without any whitespace or newline character, wherever it stands.
std::string stringByRemovingWhitespace(std::string_view string);

/// The string without whitespace and newlines at its ends.
std::string stringByTrimmingWhitespace(std::string_view string);

/// Full Unicode lower-casing, independent of the user's language.
std::string lowercaseString(std::string_view string);

/// Below, equal to or above zero, ignoring case, independent of the user's language.
int caseInsensitiveCompare(std::string_view a, std::string_view b);

/// Order as a person who speaks `language` (a tag such as "de" or "pt-BR") expects it, letters of
/// either case together. An empty language means the first preferred one of the environment.
int localizedCaseInsensitiveCompare(std::string_view a, std::string_view b,
                                    std::string_view language = {});

/// Below, equal to or above zero; runs of ASCII digits compare by their value ("1.10" is above
/// "1.2"), all else by bytes.
int numericCompare(std::string_view a, std::string_view b);

/// As much of the beginning of the string as a terminal shows in `columns`: wide characters take
/// two columns, marks that sit on others none. A string that does not fit ends in "…". Meant for
/// single lines without control characters.
std::string stringByTruncatingToColumns(std::string_view string, size_t columns);

/// Whether the bytes are well-formed UTF-8.
bool isValidUTF8(std::string_view bytes) noexcept;

/// The same text with each ill-formed part replaced by U+FFFD.
std::string stringByRepairingUTF8(std::string_view bytes);

}  // namespace platform
