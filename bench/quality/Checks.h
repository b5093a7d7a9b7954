// What else a search has to do well, beside ranking.
#pragma once

#include <cstddef>
#include <string>
#include <vector>

#include "bench/quality/Collection.h"

namespace quality {

class IndexedBook;

/// A share of something, as counts.
struct Share {
  size_t count = 0;
  size_t total = 0;

  double percent() const {
    return total == 0 ? 0 : 100.0 * static_cast<double>(count) / static_cast<double>(total);
  }
};

/// The pages whose title, asked as a query, brings a page of this title first, with score 1.
/// Titles without a word are left out. `failures`, when given, receives the titles that fail.
Share exactTitles(const IndexedBook& book, std::vector<std::string>* failures = nullptr);

/// What the cut-off of the debug preferences does.
struct CutOff {
  /// Foreign queries that find something above it.
  Share foreign;
  /// Own queries that lose, of the answers among their first ten, all.
  Share lost;
};
CutOff cutOff(const IndexedBook& book, const std::vector<std::string>& foreignQueries);

/// nDCG@10 of the queries whose last word has four letters or more.
struct Typed {
  size_t count = 0;
  double whole = 0;
  /// When the query ends in the middle of its last word, and after two letters of it.
  double half = 0;
  double twoLetters = 0;
};
Typed unfinishedQueries(const IndexedBook& book);

/// Questions about cooking, gardens, sports, law, animals and so on, which no help book answers.
const std::vector<std::string>& everydayQuestions();

/// Mean reciprocal ranks over the collection's queries.
struct SuggestionRanks {
  size_t count = 0;
  double ours = 0;
  double other = 0;
};

/// A query is typed up to its fourth letter: at which rank is it among the completions? Only
/// queries that occur as a phrase in three pages or more. Other: as many phrases as the model has,
/// the most frequent ones, in order of their frequency.
SuggestionRanks completions(const IndexedBook& book);

/// A query is asked for similar searches: at which rank is the first suggestion that finds the
/// query's answer, as a search, at once? With `otherWords`, only suggestions count that share no
/// stem with the query. Other: phrases in order of the cosine between sums of the vectors of their
/// stems.
SuggestionRanks similarSearches(const IndexedBook& book, bool otherWords);

}  // namespace quality
