// HTML and XHTML pages.
#pragma once

#include <optional>
#include <string>

#include "bvmake/Page.h"
#include "platform/Error.h"

namespace bvmake {

/// Which pages libxml2 parses: those that have to be mended, or all. It makes no difference to the
/// page.
enum class HTMLParsing { whereNeeded, always };

/// Reads a page from its text (well-formed UTF-8, no NUL). HTML of any quality is taken; what is
/// refused, with `error` set when given, are the few constructions that would cost the parser time
/// out of proportion: see maximumAttributeCount and maximumNestingWork.
///
/// Searched are the text and headings that a reader sees in the page itself. Left out are scripts,
/// styles, templates, form controls, media and their fallbacks; hidden elements (`hidden`,
/// `aria-hidden`, `display: none`); navigation (`nav` and the roles that mean it); and, outside the
/// main content, headers, footers and asides. Where a page marks its main content (`main`), only
/// that is read. Anchors are taken from everywhere.
std::optional<Page> readHTMLPage(std::string text, platform::Error* error = nullptr,
                                 HTMLParsing parsing = HTMLParsing::whereNeeded);

/// Bound on the work that misnested tags make for the parser: the sum over all of them of the depth
/// at which they stand.
inline constexpr uint64_t maximumNestingWork = 200'000'000;

}  // namespace bvmake
