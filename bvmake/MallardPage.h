// Mallard pages.
#pragma once

#include <cstddef>
#include <optional>
#include <string>

#include "bvmake/Page.h"
#include "platform/Error.h"

namespace bvmake {

inline constexpr const char* mallardNamespace = "http://projectmallard.org/1.0/";

/// Most bytes that the entities of one page may bring in.
inline constexpr size_t maximumEntityText = size_t{1} << 20;

/// Reads a page from its text (well-formed UTF-8, no NUL). Refused, with `error` set when given,
/// are texts that are no well-formed XML or whose root is not the element `page` of the Mallard
/// namespace, and those with attribute declarations or with far more attributes, name spaces or
/// nesting than pages have.
///
/// `title`, `info/desc` and `info/keywords` of the page are what their names say, titles of
/// sections are headings; all else in `info`, comments and the contents of `media` are left out.
/// Identifiers of all elements, the page's own first, are anchors. Entities that the page declares
/// itself are replaced where they stand for mere text; all others vanish.
std::optional<Page> readMallardPage(std::string text, platform::Error* error = nullptr);

}  // namespace bvmake
