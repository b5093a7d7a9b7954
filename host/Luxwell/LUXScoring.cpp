#include "host/Luxwell/LUXScoring.h"

#include <algorithm>
#include <array>
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
        _vectors(view.pageVectors()),
        _scales(plan.latent.empty() ? std::span<const float>() : view.pageScales()),
        _count(std::min<size_t>(count, scope.end - scope.first)),
        _meaning(plan.latent.empty() ? 0 : plan.latentWeight),
        _wordShare(1 - plan.latentWeight),
        _best(_count),
        _lexical(_roundedUp(scope.end - scope.first)) {
    std::fill(_lexical.begin() + (scope.end - scope.first), _lexical.end(), notOfInterest);
  }

  // Best first, with the scores of the formula without `known`; empty when cancelled.
  std::vector<LUXScoredPage> run() {
    if (!_addLists()) {
      return {};
    }
    _findMaxima();
    const float lexicallyBest = _lowerBoundOfBest();
    if (!_takeFrom(lexicallyBest)) {
      return {};
    }
    _best.raiseThreshold();
    if (!_plan.latent.empty() && !(lexicallyBest > leastScore ? _takeFrom(_leastWithinReach())
                                   : _best.threshold() > 0    ? true
                                                              : _takeThoseWithoutWords())) {
      return {};
    }
    std::vector<LUXScoredPage> pages;
    pages.reserve(_count);
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
    _highest = luxscoring::findGroupMaxima(_lexical.data(), _maxima.size(), _maxima.data());
  }

  // A score that at least `_count` pages reach, and not many more; the least score that a page with
  // a word of the query has where there may be fewer. If so many groups have a page that reaches
  // it, so many pages do; and the best pages seldom share a group. Groups are counted by classes of
  // scores, which is quicker than putting them in order and good enough.
  float _lowerBoundOfBest() const {
    if (_maxima.size() < _count || !(_highest > leastScore && _highest < everything)) {
      return leastScore;
    }
    constexpr size_t classCount = 256;
    const float scale = static_cast<float>(classCount - 1) / _highest;
    // Two tables in turns: counting in the same place twice in a row is slow.
    std::array<std::array<uint32_t, classCount>, 2> groups{};
    for (size_t i = 0; i < _maxima.size(); i += 2) {
      ++groups[0][static_cast<size_t>(static_cast<int>(std::max(_maxima[i], 0.0F) * scale))];
      ++groups[1][static_cast<size_t>(static_cast<int>(std::max(_maxima[i + 1], 0.0F) * scale))];
    }
    size_t counted = 0;
    for (size_t i = classCount - 1; i > 0; --i) {
      counted += groups[0][i] + groups[1][i];
      if (counted >= _count) {
        return std::max(static_cast<float>(i) / scale * (1 - roundingReserve), leastScore);
      }
    }
    return leastScore;
  }

  // In this order it is 0 also where a damaged model makes it what is no number.
  static float _clamped(float cosine) { return std::min(std::max(0.0F, cosine), 1.0F); }

  // Takes a page, some time later: its vector is called for and used when some more pages have
  // followed, since memory is slow and the vectors of pages lie far apart.
  void _take(uint32_t page, float lexical) {
    const size_t length = _plan.latent.size();
    if (page < _scales.size()) {
      const int8_t* const vector = _vectors + page * length;
      for (size_t i = 0; i < length; i += cacheLineLength) {
        __builtin_prefetch(vector + i);
      }
      _waitingVectors[_waitingCount] = vector;
      _waitingScales[_waitingCount] = _scales[page] * _plan.latentScale;
    } else {
      _waitingVectors[_waitingCount] = _plan.latent.data();
      _waitingScales[_waitingCount] = 0;
    }
    _waiting[_waitingCount] = {page, lexical};
    if (++_waitingCount == waitingLength) {
      _takeWaiting();
    }
  }

  void _takeWaiting() {
    std::array<int32_t, waitingLength> products;
    LUXInnerProducts(_plan.latent.data(), _waitingVectors.data(), _plan.latent.size(),
                     _waitingCount, products.data());
    for (size_t i = 0; i < _waitingCount; ++i) {
      const float cosine = _clamped(static_cast<float>(products[i]) * _waitingScales[i]);
      _best.add(rankOfPage(_waiting[i].page, _scope),
                _wordShare * _waiting[i].score + _meaning * cosine);
    }
    _waitingCount = 0;
  }

  // Takes the pages with a lexical score of at least `least`, which rises as better pages are
  // found, but for those that were taken before. False when cancelled.
  bool _takeFrom(float least) {
    constexpr size_t unit = 4 * luxscoring::groupLength;
    float threshold = _best.threshold();
    for (size_t first = 0; first < _lexical.size(); first += unit) {
      if (first % stepLength == 0 && _cancelled()) {
        return false;
      }
      uint64_t bits = luxscoring::scoresReachingInFourGroups(
          _lexical.data() + first, _maxima.data() + first / luxscoring::groupLength, least);
      for (; bits != 0; bits &= bits - 1) {
        const size_t place = first + static_cast<size_t>(std::countr_zero(bits));
        _take(_scope.first + static_cast<uint32_t>(place), _lexical[place]);
        _lexical[place] = notOfInterest;
      }
      if (_best.threshold() != threshold) {
        threshold = _best.threshold();
        least = std::max(least, _leastWithinReach());
      }
    }
    _takeWaiting();
    return true;
  }

  bool _takeThoseWithoutWords() {
    const uint32_t size = _scope.end - _scope.first;
    if (size >= luxmodel::neighbourhoodPageCount && _view.neighbourhoodCount() > 0) {
      return _takeNeighbours();
    }
    using luxscoring::groupLength;
    constexpr size_t stretchLength = 16 * groupLength;
    std::array<const int8_t*, stretchLength> vectors;
    std::array<int32_t, stretchLength> products;
    std::array<float, stretchLength> cosines;
    const uint32_t end = std::min(_scope.end, static_cast<uint32_t>(_scales.size()));
    const size_t length = _plan.latent.size();
    for (uint32_t first = _scope.first; first < end; first += stretchLength) {
      if (_cancelled()) {
        return false;
      }
      const size_t count = std::min<size_t>(end - first, stretchLength);
      for (size_t i = 0; i < count; ++i) {
        vectors[i] = _vectors + (first + i) * length;
      }
      LUXInnerProducts(_plan.latent.data(), vectors.data(), length, count, products.data());
      cosines.fill(0);
      for (size_t i = 0; i < count; ++i) {
        cosines[i] = static_cast<float>(products[i]) * _plan.latentScale * _scales[first + i];
      }
      for (size_t group = 0; group < count; group += groupLength) {
        const float least = std::max(_best.threshold() / _meaning, leastScore);
        for (uint32_t bits = luxscoring::scoresReaching(cosines.data() + group, least); bits != 0;
             bits &= bits - 1) {
          const size_t i = group + static_cast<size_t>(std::countr_zero(bits));
          if (_lexical[first - _scope.first + i] == 0) {
            _best.add(rankOfPage(first + static_cast<uint32_t>(i), _scope),
                      _meaning * _clamped(cosines[i]));
          }
        }
      }
    }
    return true;
  }

  // Looks at the neighbourhoods whose centres are nearest to the query, until that are pages enough
  // to choose among.
  bool _takeNeighbours() {
    LUXBest nearest(_view.neighbourhoodCount());
    const size_t length = _plan.latent.size();
    for (uint32_t i = 0; i < _view.neighbourhoodCount(); ++i) {
      const uint32_t centre = _view.neighbourhoodCentre(i);
      if (centre < _scales.size()) {
        const int32_t product =
            LUXInnerProduct(_plan.latent.data(), _vectors + centre * length, length);
        nearest.add(i, _clamped(static_cast<float>(product) * _plan.latentScale * _scales[centre]));
      }
    }
    const size_t enough = std::max(neighboursWanted * _count, fewestNeighbours);
    size_t seen = 0;
    for (const LUXBest::Item& item : nearest.sorted()) {
      if (seen >= enough) {
        break;
      }
      if (_cancelled()) {
        return false;
      }
      for (const uint32_t page : _view.pagesOfNeighbourhood(item.number)) {
        const uint32_t place = page - _scope.first;
        if (place >= _scope.end - _scope.first || _lexical[place] != 0) {
          continue;
        }
        ++seen;
        _take(page, 0);
      }
    }
    _takeWaiting();
    return true;
  }

  // What the words must make of a page that comes among the best if its meaning is the query's.
  float _leastWithinReach() const {
    return std::max((_best.threshold() - _meaning) / _wordShare - roundingReserve, leastScore);
  }

  static constexpr float everything = std::numeric_limits<float>::infinity();
  // Of a page that has any word of the query.
  static constexpr float leastScore = std::numeric_limits<float>::min();
  // Of pages that were taken, and of those places that fill up the last group.
  static constexpr float notOfInterest = -1;
  static constexpr float roundingReserve = 1e-6F;
  static constexpr size_t cacheLineLength = 64;
  static constexpr size_t waitingLength = 16;
  // How many pages are looked at for each that is wanted, and at least.
  static constexpr size_t neighboursWanted = 8;
  static constexpr size_t fewestNeighbours = 256;

  const LUXModelView& _view;
  const LUXScoringPlan& _plan;
  const LUXPageScope& _scope;
  const LUXIsCancelled& _isCancelled;
  const int8_t* const _vectors;
  // Empty where the query or the model has no meaning, so that cosines are 0.
  const std::span<const float> _scales;
  const size_t _count;
  // What the cosine and the words count for.
  const float _meaning;
  const float _wordShare;
  LUXBest _best;
  // Pages with their lexical scores, their vectors, and what makes a cosine of the product.
  std::array<LUXScoredPage, waitingLength> _waiting;
  std::array<const int8_t*, waitingLength> _waitingVectors;
  std::array<float, waitingLength> _waitingScales;
  size_t _waitingCount = 0;
  std::vector<float> _lexical;
  std::vector<float> _maxima;
  float _highest = 0;
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
    page.score = std::min(stretched(plan.known * plan.known * page.score, terms.stems.size()),
                          luxscoring::highestScore);
  }
  // Pages of which the model knows no word that the query has are no answer.
  std::erase_if(found, [](const LUXScoredPage& page) { return !(page.score > 0); });
  return withTitlesFirst(plan.titlePages, pages, count, std::move(found));
}

void LUXLiftAboveCutoff(std::span<LUXScoredPage> pages) {
  using namespace luxscoring;
  if (pages.empty() || !(pages.front().score > cutoff)) {
    return;
  }
  const float best = pages.front().score;
  const float least = best * shareAboveCutoff;
  if (least > cutoff) {
    return;
  }
  for (LUXScoredPage& page : pages.subspan(1)) {
    const float lifted =
        page.score < least
            ? std::min(page.score * (cutoff / least), cutoff)
            : std::min(cutoff + (page.score - least) * ((best - cutoff) / (best - least)), best);
    // Rounding must not change the order.
    page.score = std::max(page.score, lifted);
  }
}
