// The two lists that a book may carry: queries with their one right page, and suggestions.
#pragma once

#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include "platform/Value.h"

// The lists are dictionaries read whole from a property list (docs/formats/help-book.md). What is
// not as the format has it (another kind of value, an absent list) yields nothing.

/// The anchor that the exact-match list `list` has for a query in lower case without whitespace.
std::optional<std::string> ZEBExactMatchAnchor(const platform::Value& list,
                                               std::string_view normalizedQuery);

/// The texts of every entry of the suggestions list `list` whose key begins with `prefix`, entry by
/// entry, repeated where they are repeated.
std::vector<std::string> ZEBSuggestionsWithPrefix(const platform::Value& list,
                                                  std::string_view prefix);

/// The anchor that the suggestions list `list` has for the text `query` in the entry of that name.
std::optional<std::string> ZEBSuggestionAnchor(const platform::Value& list, std::string_view query);
