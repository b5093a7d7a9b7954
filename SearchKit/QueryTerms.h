// Turns one word or phrase of a query, as it was typed, into terms of the index.
#pragma once

#include <cstddef>
#include <string_view>

#include "SearchKit/Query.h"
#include "SearchKit/Tokenizer.h"

namespace searchkit {

/// What a query may still cost.
struct QueryAllowance {
  /// Terms of all kinds.
  size_t terms = 0;
  /// Those among them for which the dictionary is walked: patterns, and prefixes in phrases.
  size_t scans = 0;
};

/// The leaf, or the clause of alternative leaves, for `text`: stars stand for any letters, all else
/// is split and folded as pages are. Several words are a phrase. Empty when nothing is left to look
/// for. Terms beyond the allowance are left out; it is lowered by the others.
QueryNode queryTermsFromText(std::string_view text, bool isOpenAtEnd, const Tokenizer& tokenizer,
                             QueryAllowance& allowance);

}  // namespace searchkit
