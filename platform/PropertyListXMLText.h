// Pieces of the XML form of property lists that need no parser; for the platform's own use.
//
// All of these throw Exception "InconsistentArchiveException". Thread-safety: may be called from
// any thread.
#pragma once

#include <optional>
#include <string>
#include <string_view>

#include "platform/Value.h"

namespace platform::propertylist {

/// The text in UTF-8 when it begins with the byte-order mark of UTF-16, else absent.
std::optional<std::string> utf8FromMarkedUTF16(std::string_view bytes);

/// Refuses text that is plainly no XML, and markup that is legal but would make a general parser
/// work out of proportion: a document type with declarations of its own (entities above all), and
/// tags longer than any property list has (attributes are compared in pairs). `text` is UTF-8.
void checkMarkup(std::string_view text);

/// Whether this is the name of an element that holds text or nothing: string, integer, real, true,
/// false, date or data.
bool isLeafElement(std::string_view name);

/// The value of a leaf element.
Value leafFromText(std::string_view name, std::string text);

}  // namespace platform::propertylist
