// The engine as one would write it without any thought of speed: sets of document numbers and
// words compared one by one. It shares no code with the real one; queries are trees that spell
// themselves, so that it needs no parser either.
#pragma once

#include <cstddef>
#include <random>
#include <set>
#include <string>
#include <string_view>
#include <vector>

#include "SearchKit/IndexWriter.h"

namespace searchkit::testing {

using Words = std::vector<std::string>;

struct NaiveDocument {
  /// Title, headings and body blocks, in words as an index has them.
  Words title;
  std::vector<Words> headings;
  std::vector<Words> body;
};

using DocumentNumbers = std::set<size_t>;

struct NaiveQuery {
  enum class Sign { none, plus, minus };
  struct Item {
    Sign sign;
    std::vector<NaiveQuery> query;  // one; a vector because the type is not complete here
  };
  /// A pattern, or several that make a phrase; none when this is a group.
  Words patterns;
  /// A group: alternatives, each of items that must all match.
  std::vector<std::vector<Item>> alternatives;
  /// What stands between an alternative and the next: '|' or a blank (which then means OR).
  std::string separators;

  std::string text(std::mt19937& random, bool blankMeansOr) const;
};

class NaiveEngine {
 public:
  explicit NaiveEngine(std::vector<NaiveDocument> documents) : _documents(std::move(documents)) {}

  DocumentNumbers find(const NaiveQuery& query) const;

  /// The score of a document for one pattern, by the formula.
  double score(const std::string& pattern, size_t document) const;

 private:
  struct Result {
    bool hasPositive = false;
    DocumentNumbers found;
    DocumentNumbers excluded;
  };
  Result _evaluate(const NaiveQuery& query) const;
  DocumentNumbers _documentsWith(const Words& patterns) const;

  std::vector<NaiveDocument> _documents;
};

bool naiveMatch(std::string_view pattern, std::string_view word);

}  // namespace searchkit::testing
