#include "host/Luxwell/LUXScoringPlan.h"

#include <algorithm>
#include <array>
#include <bit>
#include <cmath>
#include <limits>
#include <optional>
#include <utility>

#include "host/Luxwell/LUXModelView.h"
#include "host/Luxwell/LUXScoring.h"
#include "host/Luxwell/LUXScoringProduct.h"

namespace {

// A word that is being typed stands for those that begin with it from this many bytes on; another
// word, if no page has it. They are so many of the most frequent words at most, chosen among so
// many in order. Words that more than half of the pages have are not among them.
constexpr size_t shortestUnfinished = 2;
constexpr size_t shortestUnknown = 3;
// In texts of more terms than this, words that are not known are left alone: there are enough
// others, and each costs as much as a query.
constexpr size_t mostTermsExpanded = 32;
constexpr size_t mostExpansions = 32;
constexpr uint32_t mostConsidered = 4096;

// Postings and vectors are called for before they are needed, since memory is slow; of a list, its
// beginning.
constexpr size_t cacheLineLength = 64;
constexpr size_t calledFor = 8 * cacheLineLength;

class Planner {
 public:
  Planner(const LUXModelView& view, const LUXQueryTerms& terms) : _view(view), _terms(terms) {}

  LUXScoringPlan plan(const LUXIsCancelled& isCancelled) {
    _plan.lists.reserve(_terms.stems.size() + _terms.bigrams.size() + _terms.forms.size());
    _stemNumbers.reserve(_terms.stems.size());
    const auto& words = _terms.onlyStopWords ? _terms.forms : _terms.stems;
    const LUXTokenKind kind = _terms.onlyStopWords ? LUXTokenKind::form : LUXTokenKind::stem;
    for (const LUXQueryTerms::Term& word : words) {
      if (isCancelled && isCancelled()) {
        return {};
      }
      _addWord(word, kind);
    }
    if (!_terms.onlyStopWords) {
      for (const LUXQueryTerms::Pair& pair : _terms.bigrams) {
        const auto& first = _stemNumbers[pair.first];
        const auto& second = _stemNumbers[pair.second];
        if (first && second) {
          _addShare(LUXTokenKind::bigram, _view.pairNumber(*first, *second), pair.count,
                    luxscoring::bigramWeight);
        }
      }
      for (const LUXQueryTerms::Term& form : _terms.forms) {
        _addShare(LUXTokenKind::form, _view.termNumber(LUXTokenKind::form, form.token), form.count,
                  luxscoring::formWeight);
      }
      const auto count = static_cast<float>(words.size());
      _plan.latentWeight =
          luxscoring::latentWeight * (1 - std::exp(-count / luxscoring::latentTerms));
      for (size_t i = 0; i < _stemNumbers.size(); ++i) {
        if (_stemNumbers[i]) {
          _addLatent(*_stemNumbers[i], _terms.stems[i].count);
        }
      }
      _finishLatent();
    }
    if (!_terms.normalizedTitle.empty()) {
      if (const auto title = _view.termNumber(LUXTokenKind::title, _terms.normalizedTitle)) {
        _plan.titlePages = _view.postings(LUXTokenKind::title, *title);
      }
    }
    _plan.known = _allMass > 0 ? _knownMass / _allMass : 0;
    if (_bound > 0) {
      for (LUXScoringPlan::List& list : _plan.lists) {
        list.weight /= _bound * static_cast<float>(luxposting::maximumImpact);
      }
    }
    return std::move(_plan);
  }

 private:
  float _inverseFrequency(uint32_t documentFrequency) const {
    const auto all = static_cast<double>(_view.totalPageCount());
    const double having = std::min(static_cast<double>(documentFrequency), all);
    return static_cast<float>(std::log1p((all - having + 0.5) / (having + 0.5)));
  }

  void _addList(std::span<const uint32_t> postings, float weight) {
    _bound += weight;
    _addPostings(postings, weight);
  }

  void _addPostings(std::span<const uint32_t> postings, float weight) {
    if (!postings.empty()) {
      // The rest of the plan is made while they come.
      const auto* const bytes = reinterpret_cast<const char*>(postings.data());
      for (size_t i = 0; i < std::min(postings.size_bytes(), calledFor); i += cacheLineLength) {
        __builtin_prefetch(bytes + i);
      }
      _plan.lists.push_back({postings, weight});
    }
  }

  void _addWord(const LUXQueryTerms::Term& word, LUXTokenKind kind) {
    const std::optional<uint32_t> number = _view.termNumber(kind, word.token);
    const uint32_t frequency = number ? _view.documentFrequency(kind, *number) : 0;
    _stemNumbers.push_back(number);
    if (number && kind == LUXTokenKind::stem) {
      _callForVector(*number);
    }
    const auto postings = number ? _view.postings(kind, *number) : std::span<const uint32_t>();
    const auto count = static_cast<float>(word.count);
    const float weight = _inverseFrequency(frequency);
    const bool isUnfinished =
        word.token == _terms.unfinishedStem && _terms.unfinishedForm.size() >= shortestUnfinished;
    if (isUnfinished && frequency == 0) {
      const float expanded = _expand(_terms.unfinishedForm, count);
      if (expanded > 0) {
        _allMass += expanded;
        return;
      }
    } else if (frequency == 0 && kind == LUXTokenKind::stem &&
               _terms.stems.size() <= mostTermsExpanded && word.token.size() >= shortestUnknown &&
               _expand(word.token, count) > 0) {
      // It may be half a word, or one of another subject: then what it finds says little.
      _allMass += weight;
      return;
    }
    _allMass += weight;
    if (frequency > 0) {
      _knownMass += weight;
      _addList(postings, count * weight);
    }
    if (isUnfinished && frequency > 0) {
      _addContinuations(postings, frequency, count);
    }
  }

  // The words that begin with a half one, the most frequent ones where there are many, with the
  // number of pages that have each.
  std::vector<std::pair<uint32_t, uint32_t>> _wordsWithPrefix(const std::string& prefix,
                                                              bool longerOnly) const {
    const auto [first, end] = _view.termRangeWithPrefix(LUXTokenKind::form, prefix);
    std::vector<std::pair<uint32_t, uint32_t>> words;
    const bool isThere =
        longerOnly && first < end && _view.term(LUXTokenKind::form, first) == prefix;
    for (uint32_t number = first + (isThere ? 1 : 0);
         number < std::min(end, first + mostConsidered); ++number) {
      const uint32_t frequency = _view.documentFrequency(LUXTokenKind::form, number);
      if (frequency <= _view.totalPageCount() / 2) {
        words.emplace_back(frequency, number);
      }
    }
    if (words.size() > mostExpansions) {
      std::partial_sort(words.begin(), words.begin() + mostExpansions, words.end(),
                        [](const auto& a, const auto& b) {
                          return a.first != b.first ? a.first > b.first : a.second < b.second;
                        });
      words.resize(mostExpansions);
    }
    return words;
  }

  // One list of all pages that have any of the words: a page has of each posting the best. Pages
  // in `without` are left out.
  std::vector<uint32_t> _pagesWithAny(const std::vector<std::pair<uint32_t, uint32_t>>& words,
                                      std::span<const uint32_t> without) const {
    // In steps of four, most of which stay empty.
    std::vector<std::array<uint16_t, 4>> steps(_view.pageCount() / 4 + 1);
    const std::span<uint16_t> impacts(steps.front().data(), 4 * steps.size());
    for (const auto& [frequency, number] : words) {
      for (const uint32_t posting : _view.postings(LUXTokenKind::form, number)) {
        const uint32_t page = luxposting::page(posting);
        if (page < impacts.size()) {
          impacts[page] =
              std::max(impacts[page], static_cast<uint16_t>(luxposting::impact(posting)));
        }
      }
    }
    for (const uint32_t posting : without) {
      if (luxposting::page(posting) < impacts.size()) {
        impacts[luxposting::page(posting)] = 0;
      }
    }
    std::vector<uint32_t> all;
    for (uint32_t first = 0; first < impacts.size(); first += 4) {
      if (std::bit_cast<uint64_t>(steps[first / 4]) == 0) {
        continue;
      }
      for (uint32_t page = first; page < first + 4; ++page) {
        if (impacts[page] > 0) {
          all.push_back(luxposting::posting(page, impacts[page]));
        }
      }
    }
    return all;
  }

  // Puts in the place of a word that is not known those that begin with it. Returns their weight; 0
  // when there are none.
  float _expand(const std::string& prefix, float count) {
    std::vector<uint32_t> all = _pagesWithAny(_wordsWithPrefix(prefix, false), {});
    if (all.empty()) {
      return 0;
    }
    const float weight = _inverseFrequency(static_cast<uint32_t>(all.size()));
    _knownMass += weight;
    // The elements of the inner vector stay where they are when the outer one grows.
    _plan.unions.push_back(std::move(all));
    _addList(_plan.unions.back(), count * weight);
    return weight;
  }

  // A known word may still become a longer one: pages that have not the word but a longer one count
  // a part of what that one is worth, the more of them there are beside those that have the word.
  void _addContinuations(std::span<const uint32_t> own, uint32_t frequency, float count) {
    const auto words = _wordsWithPrefix(_terms.unfinishedForm, true);
    if (words.empty()) {
      return;
    }
    std::vector<uint32_t> others = _pagesWithAny(words, own);
    if (others.empty()) {
      return;
    }
    const auto having = static_cast<uint32_t>(others.size());
    const float share = luxscoring::continuationWeight * static_cast<float>(having) /
                        static_cast<float>(having + frequency);
    _plan.unions.push_back(std::move(others));
    // A page has either the word or a longer one, so that this raises no bound.
    _addPostings(_plan.unions.back(), count * share * _inverseFrequency(having));
  }

  void _addShare(LUXTokenKind kind, std::optional<uint32_t> number, uint32_t count, float share) {
    const uint32_t frequency = number ? _view.documentFrequency(kind, *number) : 0;
    if (frequency > 0) {
      _addList(_view.postings(kind, *number),
               share * static_cast<float>(count) * _inverseFrequency(frequency));
    }
  }

  void _callForVector(uint32_t stem) const {
    if (const int8_t* vector = _view.termVector(stem)) {
      for (size_t i = 0; i < _view.stride(); i += cacheLineLength) {
        __builtin_prefetch(vector + i);
      }
    }
  }

  void _addLatent(uint32_t stem, uint32_t count) {
    if (const int8_t* vector = _view.termVector(stem)) {
      _sum.resize(_view.stride());
      const float weight = std::log2(1 + static_cast<float>(count)) * _view.termScale(stem);
      LUXAddScaled(_sum.data(), vector, weight, _sum.size());
    }
  }

  void _finishLatent() {
    _plan.latent.resize(_sum.size());
    _plan.latentScale = LUXQuantize(_sum.data(), _plan.latent.data(), _sum.size());
    if (_plan.latentScale == 0) {
      _plan.latent.clear();
    }
  }

  const LUXModelView& _view;
  const LUXQueryTerms& _terms;
  LUXScoringPlan _plan;
  // Of the terms' stems, in their order.
  std::vector<std::optional<uint32_t>> _stemNumbers;
  std::vector<float> _sum;
  float _bound = 0;
  float _allMass = 0;
  float _knownMass = 0;
};

}  // namespace

LUXScoringPlan LUXScoringPlan::planForTerms(const LUXModelView& view, const LUXQueryTerms& terms,
                                            const LUXIsCancelled& isCancelled) {
  return Planner(view, terms).plan(isCancelled);
}
