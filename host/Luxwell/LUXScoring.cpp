#include "host/Luxwell/LUXScoring.h"

#include <algorithm>
#include <bit>
#include <functional>
#include <limits>
#include <span>
#include <utility>

#include "host/Luxwell/LUXModelView.h"
#include "host/Luxwell/LUXScoringBest.h"
#include "host/Luxwell/LUXScoringGroups.h"
#include "host/Luxwell/LUXScoringPlan.h"
#include "host/Luxwell/LUXScoringProduct.h"

namespace {

// How many postings or pages are worked on between two questions whether to give up.
constexpr size_t stepLength = 16384;

// Pages in the order in which they win ties: those of the focused book, then the others.
uint32_t rankOfPage(uint32_t page, const LUXPageScope& scope) {
  const bool isFocused = page >= scope.focusFirst && page < scope.focusEnd;
  return isFocused ? page : page | luxposting::maximumPageCount;
}

uint32_t pageOfRank(uint32_t rank) { return rank & (luxposting::maximumPageCount - 1); }

// One search: `_lexical` has a number for each page of the scope.
class Search {
 public:
  Search(const LUXModelView& view, const LUXScoringPlan& plan, size_t count,
         const LUXPageScope& scope, const LUXIsCancelled& isCancelled)
      : _view(view),
        _plan(plan),
        _scope(scope),
        _isCancelled(isCancelled),
        _count(std::min<size_t>(count, scope.end - scope.first)),
        _meaning(plan.latent.empty() ? 0 : plan.latentWeight),
        _wordShare(1 - plan.latentWeight),
        _best(_count),
        _lexical(_roundedUp(scope.end - scope.first)) {
    std::fill(_lexical.begin() + (scope.end - scope.first), _lexical.end(), filling);
  }

  // Best first, with the scores of the formula without `known`; empty when cancelled.
  std::vector<LUXScoredPage> run() {
    if (!_addLists()) {
      return {};
    }
    _findMaxima();
    const float lexicallyBest = _lowerBoundOfBest();
    if (!_takeBetween(lexicallyBest, everything)) {
      return {};
    }
    _best.settle();
    if (!_plan.latent.empty() &&
        !(lexicallyBest > leastScore ? _takeBetween(_leastWithinReach(), lexicallyBest)
          : _best.threshold() > 0    ? true
                                     : _takeThoseWithoutWords())) {
      return {};
    }
    std::vector<LUXScoredPage> pages;
    for (const LUXBest::Item& item : _best.sorted()) {
      pages.push_back({pageOfRank(item.number), item.score});
    }
    return pages;
  }

 private:
  // Groups are looked at four at a time.
  static size_t _roundedUp(size_t length) {
    constexpr size_t unit = 4 * luxscoring::groupLength;
    return (length + unit - 1) / unit * unit;
  }

  bool _cancelled() const { return _isCancelled && _isCancelled(); }

  static std::span<const uint32_t> _within(std::span<const uint32_t> postings,
                                           const LUXPageScope& scope) {
    const auto before = [](uint32_t posting, uint32_t page) {
      return luxposting::page(posting) < page;
    };
    const auto first = std::lower_bound(postings.begin(), postings.end(), scope.first, before);
    const auto end = std::lower_bound(first, postings.end(), scope.end, before);
    return {first, end};
  }

  bool _addLists() {
    float* const lexical = _lexical.data();
    const uint32_t first = _scope.first;
    const uint32_t size = _scope.end - first;
    for (const LUXScoringPlan::List& list : _plan.lists) {
      const float weight = list.weight;
      std::span<const uint32_t> rest = _within(list.postings, _scope);
      while (!rest.empty()) {
        if (_cancelled()) {
          return false;
        }
        const auto step = rest.first(std::min(rest.size(), stepLength));
        for (const uint32_t posting : step) {
          const uint32_t place = luxposting::page(posting) - first;
          if (place < size) {
            lexical[place] += weight * static_cast<float>(luxposting::impact(posting));
          }
        }
        rest = rest.subspan(step.size());
      }
    }
    return true;
  }

  void _findMaxima() {
    _maxima.resize(_lexical.size() / luxscoring::groupLength);
    luxscoring::findGroupMaxima(_lexical.data(), _maxima.size(), _maxima.data());
  }

  // A score that at least `_count` pages reach, and not many more; the least score that a page with
  // a word of the query has where there may be fewer. If so many groups have a page that reaches
  // it, so many pages do; and the best pages seldom share a group.
  float _lowerBoundOfBest() const {
    // Groups of groups, as long as they are enough to tell well.
    size_t stride = 1;
    while (_maxima.size() / (2 * stride) >= 4 * _count) {
      stride *= 2;
    }
    std::vector<float> highest((_maxima.size() + stride - 1) / stride);
    if (highest.size() < _count) {
      return leastScore;
    }
    for (size_t i = 0; i < _maxima.size(); ++i) {
      highest[i / stride] = std::max(highest[i / stride], _maxima[i]);
    }
    const auto last = highest.begin() + static_cast<ptrdiff_t>(_count) - 1;
    std::nth_element(highest.begin(), last, highest.end(), std::greater<>());
    return std::max(*last, leastScore);
  }

  float _cosine(uint32_t page) const {
    const int8_t* const vector = _plan.latent.empty() ? nullptr : _view.pageVector(page);
    if (vector == nullptr) {
      return 0;
    }
    const int32_t product = LUXInnerProduct(_plan.latent.data(), vector, _plan.latent.size());
    const float cosine = static_cast<float>(product) * _plan.latentScale * _view.pageScale(page);
    // Also for what is not a number.
    return cosine > 0 ? std::min(cosine, 1.0F) : 0;
  }

  void _take(size_t place, float lexical) {
    const uint32_t page = _scope.first + static_cast<uint32_t>(place);
    const float score = _wordShare * lexical + _meaning * _cosine(page);
    if (score > 0) {
      _best.add(rankOfPage(page, _scope), score);
    }
  }

  // Takes the pages with a lexical score from `least` to below `end`; `least` rises as better pages
  // are found. False when cancelled.
  bool _takeBetween(float least, float end) {
    using luxscoring::groupLength;
    float threshold = _best.threshold();
    for (size_t group = 0; group < _maxima.size(); ++group) {
      if (group % (stepLength / groupLength) == 0 && _cancelled()) {
        return false;
      }
      if (_maxima[group] < least) {
        continue;
      }
      const size_t first = group * groupLength;
      for (uint32_t bits = luxscoring::scoresWithin(_lexical.data() + first, least, end); bits != 0;
           bits &= bits - 1) {
        const size_t place = first + static_cast<size_t>(std::countr_zero(bits));
        _take(place, _lexical[place]);
      }
      if (_best.threshold() != threshold) {
        threshold = _best.threshold();
        least = std::max(least, _leastWithinReach());
      }
    }
    return true;
  }

  bool _takeThoseWithoutWords() {
    for (size_t place = 0; place < _lexical.size(); ++place) {
      if (place % stepLength == 0 && _cancelled()) {
        return false;
      }
      if (_lexical[place] == 0) {
        _take(place, 0);
      }
    }
    return true;
  }

  // What the words must make of a page that comes among the best if its meaning is the query's.
  float _leastWithinReach() const {
    return std::max((_best.threshold() - _meaning) / _wordShare - roundingReserve, leastScore);
  }

  static constexpr float everything = std::numeric_limits<float>::infinity();
  // Of a page that has any word of the query.
  static constexpr float leastScore = std::numeric_limits<float>::min();
  // Of those places that fill up the last group.
  static constexpr float filling = -1;
  static constexpr float roundingReserve = 1e-6F;

  const LUXModelView& _view;
  const LUXScoringPlan& _plan;
  const LUXPageScope& _scope;
  const LUXIsCancelled& _isCancelled;
  const size_t _count;
  // What the cosine and the words count for.
  const float _meaning;
  const float _wordShare;
  LUXBest _best;
  std::vector<float> _lexical;
  std::vector<float> _maxima;
};

float stretched(float score, size_t termCount) {
  using namespace luxscoring;
  if (termCount < longQueryTerms) {
    return score;
  }
  return score < longQueryCutoff
             ? score * (cutoff / longQueryCutoff)
             : cutoff + (score - longQueryCutoff) * ((1 - cutoff) / (1 - longQueryCutoff));
}

// Puts the pages whose title the query is before the others.
std::vector<LUXScoredPage> withTitlesFirst(std::span<const uint32_t> titles,
                                           const LUXPageScope& scope, size_t count,
                                           std::vector<LUXScoredPage> pages) {
  std::vector<LUXScoredPage> named;
  for (const uint32_t posting : titles) {
    const uint32_t page = luxposting::page(posting);
    if (page >= scope.first && page < scope.end) {
      named.push_back({page, luxscoring::exactTitleScore});
    }
  }
  if (named.empty()) {
    return pages;
  }
  const auto before = [](const LUXScoredPage& a, const LUXScoredPage& b) {
    return a.page < b.page;
  };
  // A damaged model may name a page twice.
  std::sort(named.begin(), named.end(), before);
  named.erase(std::unique(named.begin(), named.end()), named.end());
  std::erase_if(pages, [&](const LUXScoredPage& page) {
    return std::binary_search(named.begin(), named.end(), page, before);
  });
  std::sort(named.begin(), named.end(), [&](const LUXScoredPage& a, const LUXScoredPage& b) {
    return rankOfPage(a.page, scope) < rankOfPage(b.page, scope);
  });
  named.insert(named.end(), pages.begin(), pages.end());
  named.resize(std::min(named.size(), count));
  return named;
}

}  // namespace

std::vector<LUXScoredPage> LUXScoring::bestPages(const LUXQueryTerms& terms, size_t count,
                                                 const LUXPageScope& scope,
                                                 const LUXIsCancelled& isCancelled) const {
  LUXPageScope pages = scope;
  pages.end = std::min<uint32_t>(pages.end, static_cast<uint32_t>(_view.pageCount()));
  if (count == 0 || terms.stems.empty() || pages.first >= pages.end) {
    return {};
  }
  const LUXScoringPlan plan = LUXScoringPlan::planForTerms(_view, terms, isCancelled);
  std::vector<LUXScoredPage> found = Search(_view, plan, count, pages, isCancelled).run();
  if (isCancelled && isCancelled()) {
    return {};
  }
  for (LUXScoredPage& page : found) {
    page.score =
        std::min(stretched(plan.known * page.score, terms.stems.size()), luxscoring::highestScore);
  }
  // Pages of which the model knows no word that the query has are no answer.
  std::erase_if(found, [](const LUXScoredPage& page) { return !(page.score > 0); });
  return withTitlesFirst(plan.titlePages, pages, count, std::move(found));
}
