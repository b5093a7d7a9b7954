// Turns one word or phrase of a query, as it was typed, into terms of the index.
#pragma once

#include <cstddef>
#include <string_view>

#include "SearchKit/Query.h"
#include "SearchKit/Tokenizer.h"

namespace searchkit {

/// The leaf, or the clause of alternative leaves, for `text`: stars stand for any letters, all else
/// is split and folded as pages are. Several words are a phrase. Empty when nothing is left to look
/// for. Takes at most `maximumSlots` terms and lowers it by what it took.
QueryNode queryTermsFromText(std::string_view text, bool isOpenAtEnd, const Tokenizer& tokenizer,
                             size_t& maximumSlots);

}  // namespace searchkit
