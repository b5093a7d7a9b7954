#include <algorithm>
#include <memory>
#include <optional>
#include <utility>

#include "SearchKit/CompiledQuery.h"
#include "SearchKit/Evaluation.h"
#include "SearchKit/SKIndex.h"
#include "SearchKit/SearchKit.h"
#include "SearchKit/SearchScratch.h"
#include "SearchKit/WordSearch.h"
#include "platform/Environment.h"

class SKSearch {
 public:
  SKSearch(SKIndexRef index, SKQueryRef query)
      : _index(std::move(index)),
        _query(std::move(query)),
        _compiled(_query->compiled(_index->view().minimumTermLength())) {}

  bool findMatches(size_t maximumCount, SKDocumentID* ids, float* scores, double maximumTime,
                   size_t& foundCount) {
    foundCount = 0;
    if (_isDirect) {
      foundCount = _words->deliver(maximumCount, ids, scores);
      return _words->mayHaveMore();
    }
    if (!_isEvaluated) {
      _isEvaluated = _compiled.isWords ? _evaluateWords(maximumTime) : _evaluate(maximumTime);
      if (!_isEvaluated) {
        return true;
      }
      if (_isDirect) {
        return findMatches(maximumCount, ids, scores, maximumTime, foundCount);
      }
    }
    if (_hits == nullptr) {
      return false;
    }
    const searchkit::HitList& hits = *_hits;
    foundCount = std::min(maximumCount, hits.size() - _delivered);
    const searchkit::Hit* const next = hits.data() + _delivered;
    for (size_t i = 0; i < foundCount; ++i) {
      ids[i] = next[i].document;
    }
    if (scores != nullptr) {
      for (size_t i = 0; i < foundCount; ++i) {
        scores[i] = next[i].score;
      }
    }
    _delivered += foundCount;
    return _delivered < hits.size();
  }

 private:
  bool _evaluateWords(double maximumTime) {
    if (!_words) {
      _words.emplace(_index->view(), _compiled);
      if (!_words->prepare()) {
        return true;
      }
      if (_words->isDirect()) {
        _isDirect = true;
        return true;
      }
      _scratch.take(_index->view().documentCount());
      _scratch.setIsClean(false);
    }
    if (!_runWords(maximumTime)) {
      return false;
    }
    _scratch.setIsClean(true);
    _hits = &_scratch->hits;
    return true;
  }

  bool _runWords(double maximumTime) {
    // What is done sooner than the clock would be asked needs no clock.
    if (_words->work() < searchkit::WorkBudget::unitsPerLook / 2) {
      searchkit::WorkBudget budget;
      return _words->run(budget, *_scratch);
    }
    const auto environment = platform::Environment::current();
    searchkit::WorkBudget budget(*environment->clock, maximumTime);
    return _words->run(budget, *_scratch);
  }

  bool _evaluate(double maximumTime) {
    if (!_evaluation) {
      const searchkit::IndexView& view = _index->view();
      _evaluation = std::make_unique<searchkit::Evaluation>(
          view, searchkit::SearchPlan::make(view, _compiled.root));
    }
    const auto environment = platform::Environment::current();
    searchkit::WorkBudget budget(*environment->clock, maximumTime);
    if (!_evaluation->run(budget)) {
      return false;
    }
    _hits = &_evaluation->hits();
    return true;
  }

  SKIndexRef _index;
  SKQueryRef _query;
  const searchkit::CompiledQuery& _compiled;
  // One of the two does the work.
  std::optional<searchkit::WordSearch> _words;
  searchkit::ScratchLease _scratch;
  std::unique_ptr<searchkit::Evaluation> _evaluation;
  bool _isEvaluated = false;
  // The words write their hits for the caller themselves.
  bool _isDirect = false;
  // Of the scratch or the evaluation, once evaluated; null when there are none.
  const searchkit::HitList* _hits = nullptr;
  size_t _delivered = 0;
};

SKQueryRef SKQueryCreate(std::string_view query, SKSearchOptions options) {
  return std::make_shared<const SKQuery>(query, options);
}

SKSearchRef SKSearchCreateWithQuery(const SKIndexRef& index, const SKQueryRef& query) {
  return index != nullptr && query != nullptr ? std::make_shared<SKSearch>(index, query) : nullptr;
}

SKSearchRef SKSearchCreate(const SKIndexRef& index, std::string_view query,
                           SKSearchOptions options) {
  if (index == nullptr) {
    return nullptr;
  }
  // One query is usually put to one book after the other.
  thread_local SKQueryRef last;
  if (last == nullptr || last->options() != options || last->text() != query) {
    last = SKQueryCreate(query, options);
  }
  return SKSearchCreateWithQuery(index, last);
}

bool SKSearchFindMatches(SKSearch& search, size_t maximumCount, SKDocumentID* ids, float* scores,
                         double maximumTime, size_t* foundCount) {
  size_t found = 0;
  const bool mayHaveMore = search.findMatches(maximumCount, ids, scores, maximumTime, found);
  if (foundCount != nullptr) {
    *foundCount = found;
  }
  return mayHaveMore;
}
