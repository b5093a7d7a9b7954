#include "host/Luxwell/LUXScoring.h"

#include <algorithm>
#include <limits>
#include <span>
#include <utility>

#include "host/Luxwell/LUXModelView.h"
#include "host/Luxwell/LUXScoringBest.h"
#include "host/Luxwell/LUXScoringPlan.h"
#include "host/Luxwell/LUXScoringProduct.h"

namespace {

// How many postings or pages are worked on between two questions whether to give up.
constexpr size_t stepLength = 16384;

struct BestFirst {
  const LUXPageScope& scope;

  bool isFocused(uint32_t page) const { return page >= scope.focusFirst && page < scope.focusEnd; }
  bool operator()(const LUXScoredPage& a, const LUXScoredPage& b) const {
    if (a.score != b.score) {
      return a.score > b.score;
    }
    const bool aIsFocused = isFocused(a.page);
    return aIsFocused != isFocused(b.page) ? aIsFocused : a.page < b.page;
  }
};

using BestPages = LUXBest<LUXScoredPage, BestFirst>;

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
        _best(_count, BestFirst{scope}),
        _lexical(_paddedLength(scope.end - scope.first)) {
    std::fill(_lexical.begin() + (scope.end - scope.first), _lexical.end(), notOfInterest);
  }

  // Best first, with the scores of the formula without `known`; empty when cancelled.
  std::vector<LUXScoredPage> run() {
    if (!_addLists() || !_takeLexicallyBest() || !_takeOthersWithinReach() ||
        !_takeThoseWithoutWords()) {
      return {};
    }
    return _best.sorted();
  }

 private:
  static size_t _paddedLength(size_t length) {
    return (length + groupLength - 1) / groupLength * groupLength;
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

  float _score(uint32_t page, float lexical) const {
    return (1 - _plan.latentWeight) * lexical + _plan.latentWeight * _cosine(page);
  }

  // Calls visit(place, its lexical score), which gives the least score that is still of interest,
  // for those that reach it, `least` at first. False when cancelled.
  template <typename Visit>
  bool _forEachPlace(float least, Visit visit) {
    for (size_t from = 0; from < _lexical.size(); from += stepLength) {
      if (_cancelled()) {
        return false;
      }
      // Most scores do not reach it: whole groups are passed over by comparisons without a branch.
      for (size_t group = from; group < std::min(_lexical.size(), from + stepLength);
           group += groupLength) {
        const float* const scores = _lexical.data() + group;
        int reached = 0;
        for (size_t i = 0; i < groupLength; ++i) {
          reached |= scores[i] >= least ? 1 : 0;
        }
        if (reached == 0) {
          continue;
        }
        for (size_t i = 0; i < groupLength; ++i) {
          if (scores[i] >= least) {
            least = visit(group + i, scores[i]);
          }
        }
      }
    }
    return true;
  }

  uint32_t _page(size_t place) const { return _scope.first + static_cast<uint32_t>(place); }

  // The pages that the words alone would choose: they are looked at first, so that few others can
  // still reach them.
  bool _takeLexicallyBest() {
    BestPages chosen(_count, BestFirst{_scope});
    if (!_forEachPlace(leastScore, [&](size_t place, float lexical) {
          chosen.add({_page(place), lexical});
          return std::max(chosen.threshold(), leastScore);
        })) {
      return false;
    }
    for (const LUXScoredPage& page : chosen.items()) {
      _best.add({page.page, _score(page.page, page.score)});
      _lexical[page.page - _scope.first] = notOfInterest;
    }
    _isShort = chosen.items().size() < _count;
    _best.settle();
    return true;
  }

  // What the words must make of a page that comes among the best if its meaning is the query's.
  float _leastWithinReach() const {
    const float weight = _plan.latentWeight;
    return std::max((_best.threshold() - weight) / (1 - weight) - roundingReserve, leastScore);
  }

  bool _takeOthersWithinReach() {
    if (_isShort || _plan.latent.empty()) {
      return true;
    }
    return _forEachPlace(_leastWithinReach(), [&](size_t place, float lexical) {
      const uint32_t page = _page(place);
      _best.add({page, _score(page, lexical)});
      return _leastWithinReach();
    });
  }

  bool _takeThoseWithoutWords() {
    if (!_isShort || _plan.latent.empty()) {
      return true;
    }
    return _forEachPlace(0, [&](size_t place, float) {
      const uint32_t page = _page(place);
      if (const float score = _score(page, 0); score > 0) {
        _best.add({page, score});
      }
      return 0.0F;
    });
  }

  static constexpr size_t groupLength = 16;
  // Of a page that has any word of the query.
  static constexpr float leastScore = std::numeric_limits<float>::min();
  // Of pages that were looked at, and of those that fill up the last group.
  static constexpr float notOfInterest = -1;
  static constexpr float roundingReserve = 1e-6F;

  const LUXModelView& _view;
  const LUXScoringPlan& _plan;
  const LUXPageScope& _scope;
  const LUXIsCancelled& _isCancelled;
  const size_t _count;
  BestPages _best;
  std::vector<float> _lexical;
  // Fewer pages than wanted share a word with the query.
  bool _isShort = false;
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
  std::sort(named.begin(), named.end(), BestFirst{scope});
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
