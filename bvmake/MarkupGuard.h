// What is checked in a page before a markup parser sees it.
#pragma once

#include <optional>
#include <string>

#include "bvmake/CharacterSet.h"

namespace bvmake {

/// Most attributes that a tag may have. The parser compares each attribute of a tag with every
/// earlier one, so that its time grows with the square of their number; no honest page comes near.
inline constexpr size_t maximumAttributeCount = 256;

/// Walks once over the tags of a page. Returns what is wrong when a tag has too many attributes,
/// else nothing. In HTML, sections that only the XML rules know (`<![CDATA[…]]>`) and the
/// conditional marks of word processors (`<![if …]>`) are overwritten with blanks, the text of the
/// former kept, since the HTML parser would take them for text.
std::optional<std::string> tameMarkup(std::string& text, Markup markup);

}  // namespace bvmake
