// Cuts a query into words, phrases and operators.
#pragma once

#include <cstdint>
#include <string_view>
#include <vector>

namespace searchkit {

struct QueryToken {
  enum class Kind : uint8_t { word, phrase, plus, minus, conjunction, disjunction, open, close };
  Kind kind;
  /// Of a word, its spelling with stars; of a phrase, what is between the quotation marks.
  std::string_view text;
  /// A star follows the closing quotation mark.
  bool isOpenAtEnd = false;
};

/// Only operators that have somewhere to apply come back: signs inside words are part of the words,
/// and stray ones are left out (see QueryParser.h). The views are into `text`.
std::vector<QueryToken> queryTokens(std::string_view text);

}  // namespace searchkit
