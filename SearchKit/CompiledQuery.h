// A query read once, for any number of indexes.
#pragma once

#include <atomic>
#include <cstddef>
#include <cstdint>
#include <string>
#include <string_view>
#include <vector>

#include "SearchKit/Query.h"
#include "SearchKit/SearchKit.h"

namespace searchkit {

/// A term, or the beginning of terms, with what a dictionary is searched by.
struct QueryWord {
  std::string term;
  bool isPrefix = false;
  /// The block key of the term, and the highest that a term beginning so can have.
  uint64_t firstKey = 0;
  uint64_t lastKey = 0;
  /// For the beginnings of terms that may have lists of their own, their key there; else 0.
  uint64_t mergedKey = 0;
};

/// A query as indexes with one minimum term length understand it.
/// Thread-safety: immutable.
struct CompiledQuery {
  QueryNode root;
  /// The query is nothing but words: all of the first `requiredCount`, the others adding to the
  /// score; or any of them, where none is required. Then `words` says all. Longer words, which are
  /// rarer, come first.
  bool isWords = false;
  size_t requiredCount = 0;
  std::vector<QueryWord> words;

  static CompiledQuery make(std::string_view text, bool blankMeansOr, size_t minimumTermLength);
};

}  // namespace searchkit

/// See SearchKit.h. What depends on an index's minimum term length is made when first needed and
/// kept. Thread-safety: internally synchronised.
class SKQuery {
 public:
  SKQuery(std::string_view text, SKSearchOptions options) : _text(text), _options(options) {}
  ~SKQuery();
  SKQuery(const SKQuery&) = delete;
  SKQuery& operator=(const SKQuery&) = delete;

  const std::string& text() const noexcept { return _text; }
  SKSearchOptions options() const noexcept { return _options; }

  /// Valid as long as the query.
  const searchkit::CompiledQuery& compiled(size_t minimumTermLength) const;

 private:
  struct Form {
    size_t minimumTermLength;
    searchkit::CompiledQuery query;
    Form* next;
  };

  std::string _text;
  SKSearchOptions _options;
  /// Forms are only ever added, at the front; two threads may make the same one twice.
  mutable std::atomic<Form*> _forms{nullptr};
};
