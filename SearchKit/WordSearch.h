// Searches for words and beginnings of words: what nearly every query is.
//
// Words are looked up one after the other, rare ones first, and one that nothing has ends a search
// for all at once. The shortest stretch of postings is read first; its pages are the list of hits,
// with their scores. Each further word is compared with that list. Where a word has one list of
// postings, the two lists run side by side and nothing else is written. Where it has many (the
// beginning of many words), the frequencies of those pages that are in the list are gathered page
// by page first. All memory is the thread's own and is used again.
#pragma once

#include <cstddef>
#include <cstdint>
#include <vector>

#include "SearchKit/CompiledQuery.h"
#include "SearchKit/PostingsCursor.h"
#include "SearchKit/Scoring.h"
#include "SearchKit/SearchScratch.h"
#include "SearchKit/WordLookup.h"
#include "SearchKit/WorkBudget.h"

namespace searchkit {

/// One such search in one index. It can stop for want of time and go on later.
/// Thread-safety: confined to one thread at a time.
class WordSearch {
 public:
  /// Both must outlive the search; the query is of words.
  WordSearch(const IndexView& view, const CompiledQuery& query) noexcept;

  /// Looks all words up, however long that takes: about a tenth of a microsecond a word. False when
  /// nothing can be found.
  bool prepare();

  /// An upper bound of the work that there is, once prepare() has been called.
  uint64_t work() const noexcept { return _work; }

  /// Whether all there is to do is to read one short list, once prepare() has been called. Then
  /// deliver() does it, instead of run().
  bool isDirect() const noexcept;

  /// Writes up to `maximumCount` further hits; returns how many. `scores` may be null.
  size_t deliver(size_t maximumCount, SKDocumentID* ids, float* scores);
  /// Whether deliver() may have more.
  bool mayHaveMore() const noexcept { return !_hasBegun || _cursor.isInList(); }

  /// Goes on until the end (true) or until time runs out (false). The hits are then in the
  /// scratch, which must be the same at each call.
  bool run(WorkBudget& budget, SearchScratch& scratch);

 private:
  enum class Action : uint8_t { push, intersect, addScores, unite };

  struct Step {
    WordPostings postings;
    Action action = Action::push;
  };

  void _openLists(const Step& step) noexcept;
  void _openList(const Step& step) noexcept;
  void _begin(const Step& step, SearchScratch& scratch);
  bool _read(const Step& step, WorkBudget& budget, SearchScratch& scratch);
  bool _readOneList(const Step& step, WorkBudget& budget, SearchScratch& scratch);
  bool _readLists(const Step& step, WorkBudget& budget, SearchScratch& scratch);
  void _finishLists(const Step& step, SearchScratch& scratch);

  void _finishDenseLists(const Step& step, SearchScratch& scratch);

  /// Which pages frequencies are gathered for: those with any, those in the filter, or all.
  enum class Gathering : uint8_t { sparse, filtered, dense };
  template <Gathering gathering>
  bool _accumulate(SearchScratch& scratch, size_t& units);
  bool _isNextOneListOfAll() const noexcept;
  float _scored(const Hit& hit) const noexcept;
  template <bool scores>
  size_t _append(HitList& hits);
  size_t _look(SearchScratch& scratch);
  template <bool keepsAll>
  size_t _compare(HitList& hits);

  const IndexView& _view;
  const CompiledQuery& _query;
  const Scorer& _scorer;
  uint64_t _work = 0;

  // The first few words have room here, so that most searches allocate nothing.
  static constexpr size_t inlineStepCount = 4;
  // Only those that the query has words for are ever made: to clear them all would take longer than
  // to look a word up.
  union {
    Step _inlineSteps[inlineStepCount];
  };
  std::vector<Step> _moreSteps;
  const Step* _steps() const noexcept {
    return _moreSteps.empty() ? _inlineSteps : _moreSteps.data();
  }
  size_t _stepCount = 0;

  // What is going on.
  size_t _step = 0;
  bool _hasBegun = false;
  bool _isInList = false;
  bool _isExactNext = false;
  bool _isDense = false;
  /// The hits' scores are scores; else still frequencies of the first word.
  bool _areHitsScored = true;
  float _pushedIdf = 0;
  float _factor = 1;
  float _idf = 0;
  uint64_t _documentSum = 0;
  PostingsCursor _cursor;
  size_t _readAt = 0;
  size_t _keptAt = 0;
};

}  // namespace searchkit
