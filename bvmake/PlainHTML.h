// HTML that is written by the rules, read without a parser.
#pragma once

#include <string_view>

#include "bvmake/HTMLPageBuilder.h"

namespace bvmake {

/// Gives `builder` the tags and the text of a page (well-formed UTF-8, no NUL), as libxml2 would,
/// in a third of the time. That is so as long as nothing has to be mended: the page has `html` and
/// `body`, elements end where they should (those that may go without an end tag, where the next one
/// begins), and references end in semicolons. Programs write their pages like this, and most pages
/// of help are written by programs.
///
/// Stops and returns false at whatever else there is, a table of rules for which would be another
/// parser; the builder is then of no use, and the page is to be read by libxml2 from its beginning.
/// Which element ends where another begins, which have no content, and what references stand for
/// is asked of libxml2, so that both ways of reading a page agree. Thread-safety: any thread.
bool readPlainHTML(std::string_view text, HTMLPageBuilder& builder);

}  // namespace bvmake
