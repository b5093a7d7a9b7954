// Other ways to rank the same documents.
#pragma once

#include <memory>
#include <string>
#include <vector>

#include "bench/quality/Collection.h"
#include "bench/quality/Metrics.h"

namespace quality {

/// A search engine over one collection's documents. Thread-safety: confined to one thread.
class Engine {
 public:
  virtual ~Engine() = default;
  /// At most `count` documents, best first.
  virtual Ranking search(const std::string& query, size_t count) = 0;
};

/// Xapian's BM25 with its own defaults, all terms stemmed where it has a stemmer for the language;
/// the query is the OR of its stems. `titleWeight` is how often a word of a title counts.
std::unique_ptr<Engine> xapianEngine(const Collection& collection, unsigned titleWeight);

/// SQLite FTS5, tokenizer porter over unicode61, rank bm25 with weight 4 for titles; the query is
/// the OR of its words.
std::unique_ptr<Engine> sqliteEngine(const Collection& collection);

}  // namespace quality
