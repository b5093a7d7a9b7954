#include "host/Luxwell/LUXScoringPlan.h"

#include <algorithm>
#include <cmath>
#include <functional>
#include <limits>
#include <optional>
#include <utility>

#include "host/Luxwell/LUXModelView.h"
#include "host/Luxwell/LUXScoring.h"
#include "host/Luxwell/LUXScoringProduct.h"

namespace {

// A word that is being typed is expanded from this many bytes on, if no more pages than this have
// the word itself; another word, if no page has it. It stands for so many of the most frequent
// words at most, chosen among so many in order.
constexpr size_t shortestUnfinished = 2;
constexpr size_t shortestUnknown = 3;
// In texts of more terms than this, words that are not known are left alone: there are enough
// others, and each costs as much as a query.
constexpr size_t mostTermsExpanded = 32;
constexpr uint32_t fewPages = 2;
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
    if (word.token == _terms.unfinishedStem) {
      if (frequency <= fewPages && _terms.unfinishedForm.size() >= shortestUnfinished) {
        const float expanded = _expand(_terms.unfinishedForm, postings, count);
        if (expanded > 0) {
          _allMass += expanded;
          return;
        }
      }
    } else if (frequency == 0 && kind == LUXTokenKind::stem &&
               _terms.stems.size() <= mostTermsExpanded && word.token.size() >= shortestUnknown &&
               _expand(word.token, postings, count) > 0) {
      // It may be half a word, or one of another subject: then what it finds says little.
      _allMass += weight;
      return;
    }
    _allMass += weight;
    if (frequency > 0) {
      _knownMass += weight;
      _addList(postings, count * weight);
    }
  }

  // Makes one list of all words that begin with a half one: a page has of each posting the best.
  // Returns its weight; 0 when there are no such words.
  float _expand(const std::string& prefix, std::span<const uint32_t> own, float count) {
    const auto [first, end] = _view.termRangeWithPrefix(LUXTokenKind::form, prefix);
    std::vector<std::pair<uint32_t, uint32_t>> expansions;
    for (uint32_t number = first; number < std::min(end, first + mostConsidered); ++number) {
      expansions.emplace_back(_view.documentFrequency(LUXTokenKind::form, number), number);
    }
    if (expansions.empty()) {
      return 0;
    }
    if (expansions.size() > mostExpansions) {
      std::partial_sort(expansions.begin(), expansions.begin() + mostExpansions, expansions.end(),
                        [](const auto& a, const auto& b) {
                          return a.first != b.first ? a.first > b.first : a.second < b.second;
                        });
      expansions.resize(mostExpansions);
    }
    std::vector<uint32_t> all(own.begin(), own.end());
    for (const auto& [frequency, number] : expansions) {
      const auto postings = _view.postings(LUXTokenKind::form, number);
      all.insert(all.end(), postings.begin(), postings.end());
    }
    // In descending order the best posting of a page comes before its others.
    std::sort(all.begin(), all.end(), std::greater<>());
    all.erase(std::unique(all.begin(), all.end(),
                          [](uint32_t a, uint32_t b) {
                            return luxposting::page(a) == luxposting::page(b);
                          }),
              all.end());
    std::reverse(all.begin(), all.end());
    const float weight = _inverseFrequency(static_cast<uint32_t>(all.size()));
    _knownMass += weight;
    // The elements of the inner vector stay where they are when the outer one grows.
    _plan.unions.push_back(std::move(all));
    _addList(_plan.unions.back(), count * weight);
    return weight;
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
