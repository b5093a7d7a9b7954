#include "SearchKit/WordSearch.h"

#include <algorithm>
#include <new>
#include <span>
#include <type_traits>
#include <utility>

#include "SearchKit/SKIndex.h"

namespace searchkit {
namespace {

constexpr size_t postingsPerSlice = 1024;
constexpr uint64_t mostPagesAByte = 4;
constexpr uint64_t densest = 16;

// Stable, and for a few steps without the memory that the library's algorithm takes.
template <typename Step, typename Length>
void sortByLength(std::span<Step> steps, const Length& length) {
  constexpr size_t few = 8;
  if (steps.size() > few) {
    std::stable_sort(steps.begin(), steps.end(),
                     [&](const Step& a, const Step& b) { return length(a) < length(b); });
    return;
  }
  for (size_t i = 1; i < steps.size(); ++i) {
    for (size_t at = i; at > 0 && length(steps[at]) < length(steps[at - 1]); --at) {
      std::swap(steps[at], steps[at - 1]);
    }
  }
}

}  // namespace

WordSearch::WordSearch(const IndexView& view, const CompiledQuery& query) noexcept
    : _view(view), _query(query), _scorer(view.scorer()) {}

bool WordSearch::prepare() {
  static_assert(std::is_trivially_destructible_v<Step>);
  if (_view.documentCount() == 0) {
    return false;
  }
  const bool isAny = _query.requiredCount == 0;
  Step* steps = _inlineSteps;
  if (_query.words.size() > inlineStepCount) {
    _moreSteps.resize(_query.words.size());
    steps = _moreSteps.data();
  }
  size_t required = 0;
  for (size_t i = 0; i < _query.words.size(); ++i) {
    // Made in its place: a copy would wait for what has only just been written.
    const Step& step = *new (&steps[_stepCount]) Step{findWord(_view, _query.words[i])};
    if (step.postings.kind == WordPostings::Kind::none) {
      if (i < _query.requiredCount) {
        return false;
      }
      continue;
    }
    ++_stepCount;
    required += i < _query.requiredCount ? 1 : 0;
    _work += step.postings.range.length();
  }
  sortByLength(std::span(steps, isAny ? _stepCount : required),
               [](const Step& step) { return step.postings.range.length(); });
  for (size_t i = 0; i < _stepCount; ++i) {
    steps[i].action = i == 0         ? Action::push
                      : isAny        ? Action::unite
                      : i < required ? Action::intersect
                                     : Action::addScores;
  }
  return _stepCount > 0;
}

bool WordSearch::isDirect() const noexcept {
  return _stepCount == 1 && _moreSteps.empty() && _inlineSteps[0].postings.isOneList &&
         _work < WorkBudget::unitsPerLook / 2;
}

size_t WordSearch::deliver(size_t maximumCount, SKDocumentID* ids, float* scores) {
  if (!_hasBegun) {
    _hasBegun = true;
    _openList(_inlineSteps[0]);
  }
  size_t count = 0;
  _cursor.read(maximumCount, [&](uint32_t document, uint32_t weight) {
    ids[count] = document;
    if (scores != nullptr) {
      scores[count] =
          _scorer.score(_idf, _factor * static_cast<float>(weight), _view.documentLength(document));
    }
    ++count;
  });
  return count;
}

// Whether most hits are about to be left out again: it would be a waste to score them first.
bool WordSearch::_isNextOneListOfAll() const noexcept {
  const Step* const next = _steps() + _step + 1;
  return _step + 1 < _stepCount && next->action == Action::intersect && next->postings.isOneList;
}

bool WordSearch::run(WorkBudget& budget, SearchScratch& scratch) {
  const Step* const steps = _steps();
  for (; _step < _stepCount; ++_step) {
    const Step& step = steps[_step];
    if (!_hasBegun) {
      if (_step > 0 && step.action != Action::unite && scratch.hits.empty()) {
        break;
      }
      _begin(step, scratch);
    }
    if (!_read(step, budget, scratch)) {
      return false;
    }
    _hasBegun = false;
    if (budget.isSpent() && _step + 1 < _stepCount) {
      ++_step;
      return false;
    }
  }
  return true;
}

void WordSearch::_openLists(const Step& step) noexcept {
  const bool isMerged = step.postings.kind == WordPostings::Kind::merged;
  _cursor = PostingsCursor(
      _view, _view.section(isMerged ? format::Section::mergedLists : format::Section::postings),
      step.postings.range, isMerged ? format::mergedFrequencyLimit - 1 : format::maximumWeight);
}

// The only list of a step: what every posting's score depends on is known beforehand.
void WordSearch::_openList(const Step& step) noexcept {
  _openLists(step);
  _isInList = _cursor.beginList();
  const bool isMerged = step.postings.kind == WordPostings::Kind::merged;
  _factor = !isMerged && step.postings.beginsWithExactTerm ? exactFactor : 1;
  _idf = _scorer.inverseDocumentFrequency(isMerged ? step.postings.documentSum
                                                   : _cursor.listDocumentCount());
}

void WordSearch::_begin(const Step& step, SearchScratch& scratch) {
  _hasBegun = true;
  _isInList = false;
  _isExactNext = step.postings.beginsWithExactTerm;
  _documentSum = 0;
  _readAt = 0;
  _keptAt = 0;
  _openLists(step);
  if (step.action == Action::push) {
    scratch.hits.clear();
    _areHitsScored = !step.postings.isOneList || !_isNextOneListOfAll();
  } else if (step.action == Action::unite) {
    scratch.others.clear();
  }
  // With many postings for the number of pages it takes less to write to all places than to look
  // which are wanted, and to clear them all than to know which were used. Where all that have any
  // are wanted, to look at all of them takes longer than to clear them.
  const bool isFiltered = step.action == Action::intersect || step.action == Action::addScores;
  _isDense =
      !step.postings.isOneList &&
      step.postings.range.length() * (isFiltered ? mostPagesAByte : 1) > _view.documentCount();
  if (!step.postings.isOneList && !_isDense && isFiltered) {
    for (const Hit& hit : scratch.hits) {
      scratch.filter.insert(hit.document);
    }
  }
}

bool WordSearch::_read(const Step& step, WorkBudget& budget, SearchScratch& scratch) {
  if (!(step.postings.isOneList ? _readOneList(step, budget, scratch)
                                : _readLists(step, budget, scratch))) {
    return false;
  }
  if (step.action == Action::unite) {
    unite(scratch.hits, scratch.others, scratch.merged);
    scratch.hits.swap(scratch.merged);
    budget.spend(scratch.hits.size());
  }
  return true;
}

bool WordSearch::_readOneList(const Step& step, WorkBudget& budget, SearchScratch& scratch) {
  if (!_isInList) {
    _openList(step);
    if (step.action == Action::push) {
      scratch.hits.reserve(_cursor.listDocumentCount());
    }
    // Side by side where one list is much longer; else page by page.
    _isDense = step.action == Action::intersect &&
               _cursor.listDocumentCount() < densest * uint64_t{scratch.hits.size()};
    if (_isDense) {
      for (const Hit& hit : scratch.hits) {
        scratch.found.put(hit.document, hit.score);
      }
      // Of the list's pages only those are kept, and one is written that is not.
      scratch.others.resize(scratch.hits.size() + 1);
    }
  }
  while (_isInList) {
    size_t count = 0;
    switch (step.action) {
      case Action::push:
        count = _areHitsScored ? _append<true>(scratch.hits) : _append<false>(scratch.hits);
        break;
      case Action::unite:
        count = _append<true>(scratch.others);
        break;
      case Action::intersect:
        count = _isDense ? _look(scratch) : _compare<false>(scratch.hits);
        break;
      case Action::addScores:
        count = _compare<true>(scratch.hits);
        break;
    }
    if (!budget.spend(count + 1) && _isInList) {
      return false;
    }
  }
  if (_isDense) {
    for (const Hit& hit : scratch.hits) {
      scratch.found.put(hit.document, 0);
    }
    scratch.others.resize(_keptAt);
    scratch.hits.swap(scratch.others);
  } else if (step.action == Action::intersect) {
    scratch.hits.resize(_keptAt);
  }
  if (step.action == Action::push) {
    _pushedIdf = _idf;
  } else {
    _areHitsScored = true;
  }
  return true;
}

// The next slice of the list; the hits so far are in the accumulator. Every page is written, and
// only kept when it is one of them: no branch that could not be predicted. What is kept is scored.
size_t WordSearch::_look(SearchScratch& scratch) {
  size_t kept = _keptAt;
  Hit* const others = scratch.others.data();
  const float* const found = scratch.found.data();
  const size_t count =
      _cursor.read(postingsPerSlice, [&kept, others, found](uint32_t document, uint32_t weight) {
        others[kept] = {document, static_cast<float>(weight)};
        kept += found[document] > 0 ? 1 : 0;
      });
  for (size_t i = _keptAt; i < kept; ++i) {
    const uint32_t document = others[i].document;
    others[i].score =
        _scored({document, found[document]}) +
        _scorer.score(_idf, _factor * others[i].score, _view.documentLength(document));
  }
  _keptAt = kept;
  _isInList = _cursor.isInList();
  return count;
}

// A hit's score so far.
float WordSearch::_scored(const Hit& hit) const noexcept {
  return _areHitsScored ? hit.score
                        : _scorer.score(_pushedIdf, hit.score, _view.documentLength(hit.document));
}

// The next slice of the list, at the end of the hits.
template <bool scores>
size_t WordSearch::_append(HitList& hits) {
  const size_t count = _cursor.read(postingsPerSlice, [&](uint32_t document, uint32_t weight) {
    const float frequency = _factor * static_cast<float>(weight);
    hits.push_back({document, scores
                                  ? _scorer.score(_idf, frequency, _view.documentLength(document))
                                  : frequency});
  });
  _isInList = _cursor.isInList();
  return count;
}

// The next slice of the list, beside the hits. Those that are to be kept move forward.
template <bool keepsAll>
size_t WordSearch::_compare(HitList& hits) {
  PostingsCursor at = _cursor;
  size_t left = postingsPerSlice;
  size_t read = _readAt;
  size_t kept = _keptAt;
  const size_t count = hits.size();
  while (left > 0) {
    if (read == count || !at.next()) {
      _isInList = false;
      break;
    }
    --left;
    const uint32_t document = at.document();
    while (read < count && hits[read].document < document) {
      ++read;
    }
    if (read < count && hits[read].document == document) {
      const float score = _scorer.score(_idf, _factor * static_cast<float>(at.weight()),
                                        _view.documentLength(document));
      Hit& to = keepsAll ? hits[read] : hits[kept++];
      to = {document, _scored(hits[read]) + score};
      ++read;
    }
  }
  _cursor = at;
  _readAt = read;
  _keptAt = kept;
  return postingsPerSlice - left;
}

bool WordSearch::_readLists(const Step& step, WorkBudget& budget, SearchScratch& scratch) {
  const bool isFiltered = step.action == Action::intersect || step.action == Action::addScores;
  for (bool hasMore = true; hasMore;) {
    size_t units = 0;
    hasMore = _isDense     ? _accumulate<Gathering::dense>(scratch, units)
              : isFiltered ? _accumulate<Gathering::filtered>(scratch, units)
                           : _accumulate<Gathering::sparse>(scratch, units);
    if (!budget.spend(units) && hasMore) {
      return false;
    }
  }
  if (_isDense) {
    _finishDenseLists(step, scratch);
  } else {
    _finishLists(step, scratch);
  }
  return true;
}

// The next slice of the lists; false at the end of the last.
template <WordSearch::Gathering gathering>
bool WordSearch::_accumulate(SearchScratch& scratch, size_t& units) {
  PostingsCursor at = _cursor;
  size_t left = postingsPerSlice;
  bool hasMore = true;
  float factor = _factor;
  uint64_t documentSum = _documentSum;
  float* const frequencies = scratch.found.data();
  while (left > 0) {
    if (!at.isInList()) {
      if (!at.beginList()) {
        hasMore = false;
        break;
      }
      --left;
      documentSum += at.listDocumentCount();
      factor = _isExactNext ? exactFactor : 1;
      _isExactNext = false;
    }
    left -= at.read(left, [&](uint32_t document, uint32_t weight) {
      const float frequency = factor * static_cast<float>(weight);
      if (gathering == Gathering::dense) {
        frequencies[document] += frequency;
      } else if (gathering == Gathering::sparse || scratch.filter.has(document)) {
        scratch.found.add(document, frequency);
      }
    });
  }
  units = postingsPerSlice - left;
  _cursor = at;
  _factor = factor;
  _documentSum = documentSum;
  return hasMore;
}

// Every page has a place, empty or not.
void WordSearch::_finishDenseLists(const Step& step, SearchScratch& scratch) {
  const float idf = _scorer.inverseDocumentFrequency(_documentSum);
  const uint32_t documentCount = _view.documentCount();
  float* const frequencies = scratch.found.data();
  if (step.action == Action::push || step.action == Action::unite) {
    HitList& hits = step.action == Action::push ? scratch.hits : scratch.others;
    hits.resize(documentCount);
    size_t kept = 0;
    for (uint32_t document = 0; document < documentCount; ++document) {
      hits[kept] = {document, frequencies[document]};
      kept += frequencies[document] > 0 ? 1 : 0;
    }
    hits.resize(kept);
    for (Hit& hit : hits) {
      hit.score = _scorer.score(idf, hit.score, _view.documentLength(hit.document));
    }
  } else {
    size_t kept = 0;
    for (const Hit& hit : scratch.hits) {
      const float frequency = frequencies[hit.document];
      const float score =
          hit.score + _scorer.score(idf, frequency, _view.documentLength(hit.document));
      scratch.hits[kept] = {hit.document, score};
      kept += frequency > 0 || step.action == Action::addScores ? 1 : 0;
    }
    scratch.hits.resize(kept);
  }
  std::fill_n(frequencies, documentCount, 0.0F);
}

void WordSearch::_finishLists(const Step& step, SearchScratch& scratch) {
  const float idf = _scorer.inverseDocumentFrequency(_documentSum);
  const auto scored = [&](uint32_t document, float frequency) {
    return _scorer.score(idf, frequency, _view.documentLength(document));
  };
  if (step.action == Action::push || step.action == Action::unite) {
    HitList& hits = step.action == Action::push ? scratch.hits : scratch.others;
    scratch.found.drainBelow(_view.documentCount(), [&](uint32_t document, float frequency) {
      hits.push_back({document, scored(document, frequency)});
    });
    return;
  }
  size_t kept = 0;
  for (const Hit& hit : scratch.hits) {
    scratch.filter.removeAround(hit.document);
    const float frequency = scratch.found.take(hit.document);
    if (frequency > 0) {
      scratch.hits[kept++] = {hit.document, hit.score + scored(hit.document, frequency)};
    } else if (step.action == Action::addScores) {
      scratch.hits[kept++] = hit;
    }
  }
  scratch.hits.resize(kept);
}

}  // namespace searchkit
