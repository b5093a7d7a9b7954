// Small readings of markup that is no help page.
#pragma once

#include <string>
#include <string_view>
#include <vector>

namespace quality {

/// Without white space at the ends, runs of it as one blank.
std::string collapsed(std::string_view text);

/// Without tags; the few entities that indexes use as characters; collapsed.
std::string plainText(std::string_view markup);

struct IndexTerm {
  /// The term, broader terms before it.
  std::string text;
  /// Where its links of the class "indexterm" lead.
  std::vector<std::string> links;
};

/// The terms of an index page as DocBook style sheets make it: `dl` of `dt`, narrower terms in a
/// `dl` inside the `dd` that follows.
std::vector<IndexTerm> termsOfIndexPage(std::string_view markup);

}  // namespace quality
