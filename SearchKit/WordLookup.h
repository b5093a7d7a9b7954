// Finds where an index has the postings of a word or of all words that begin so.
#pragma once

#include <cstdint>

#include "SearchKit/CompiledQuery.h"
#include "SearchKit/Dictionary.h"

namespace searchkit {

class IndexView;

/// The postings of one word of a query.
struct WordPostings {
  enum class Kind : uint8_t {
    /// There are none.
    none,
    /// The lists of one or more terms, one after the other (postings section).
    lists,
    /// One list of the pages of all terms with a prefix (merged lists section).
    merged,
  };
  Kind kind = Kind::none;
  /// The first list is that of the word itself.
  bool beginsWithExactTerm = false;
  /// It is known that there is one list only.
  bool isOneList = false;
  ByteRange range;
  /// merged: the documents of all its terms, one document counted as often as it has terms.
  uint32_t documentSum = 0;
};

/// The same stretch of lists as the dictionary's cursor would find, without putting terms together:
/// while a block's terms are read, it is enough to know how many bytes each shares with the one
/// sought. Thread-safety: may be called from any thread.
WordPostings findWord(const IndexView& view, const QueryWord& word) noexcept;

}  // namespace searchkit
