// Figures as Markdown.
#pragma once

#include <cstddef>
#include <map>
#include <string>
#include <vector>

#include "bench/quality/Checks.h"
#include "bench/quality/Metrics.h"

namespace quality {

inline constexpr const char* ours = "Luxwell";
inline constexpr const char* xapian = "Xapian";
inline constexpr const char* xapianTitles = "Xapian, titles ×4";
inline constexpr const char* sqlite = "SQLite FTS5";
inline constexpr const char* bm25 = "BM25";

struct Measured {
  Metrics metrics;
  /// nDCG@10 of each query.
  std::vector<double> perQuery;
};

/// Everything that was measured over one collection.
struct Result {
  std::string name;
  std::string origin;
  std::string language;
  std::string detectedLanguage;
  size_t documentCount = 0;
  size_t queryCount = 0;
  std::map<std::string, Measured> engines;
  Share titles;
  Typed typed;
  CutOff everyday;
  CutOff foreign;
  SuggestionRanks completions;
  SuggestionRanks similar;
  SuggestionRanks similarOtherWords;
};

/// The tables of docs/quality.md.
std::string tables(const std::vector<Result>& results, bool withChecks);

}  // namespace quality
