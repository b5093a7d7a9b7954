// The score of every page, computed from the pages themselves without any short cut.
#pragma once

#include <cstdint>
#include <map>
#include <set>
#include <string>
#include <utility>
#include <vector>

#include "host/Luxwell/LUXQueryTerms.h"
#include "tests/Luxwell/LUXQueryWorld.h"

namespace tests {

/// Slow and obvious: keeps the counts of all pages in maps and knows nothing of postings. Only the
/// vectors of meaning are the model's. Nothing is kept in small numbers, so its scores differ from
/// the engine's by rounding.
class NaiveScoring {
 public:
  explicit NaiveScoring(const QueryWorld& world);

  /// The score of each page that may be found, by its number in the view.
  std::map<uint32_t, double> scores(const LUXQueryTerms& terms) const;

  /// How many pages have a word of the query.
  size_t pagesWithWords(const LUXQueryTerms& terms) const;

 private:
  using Token = std::pair<LUXTokenKind, std::string>;
  struct Page {
    bool mayBeFound = false;
    uint32_t number = 0;
    std::map<Token, LUXTokenCount> counts;
    std::map<LUXTokenKind, std::pair<double, double>> lengths;
  };
  struct Scored {
    double lexical = 0;
    double cosine = 0;
    bool hasTitle = false;
  };

  double _frequency(const Token& token) const;
  double _weightOfFrequency(double frequency) const;
  double _weight(const Token& token) const;
  double _impact(const Page& page, const Token& token) const;
  std::set<std::string> _expansions(const LUXQueryTerms& terms, const std::string& stem) const;
  std::map<uint32_t, double> _pagesWithAny(const std::set<std::string>& forms) const;
  std::vector<double> _latent(const LUXQueryTerms& terms) const;

  const LUXModelView& _view;
  std::vector<Page> _pages;
  std::map<LUXTokenKind, std::pair<double, double>> _averages;
};

}  // namespace tests
