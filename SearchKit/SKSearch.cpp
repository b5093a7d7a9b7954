#include <algorithm>
#include <utility>

#include "SearchKit/Evaluation.h"
#include "SearchKit/QueryParser.h"
#include "SearchKit/SKIndex.h"
#include "SearchKit/SearchKit.h"
#include "platform/Environment.h"

class SKSearch {
 public:
  SKSearch(SKIndexRef index, searchkit::SearchPlan plan)
      : _index(std::move(index)), _evaluation(_index->view(), std::move(plan)) {}

  bool findMatches(size_t maximumCount, SKDocumentID* ids, float* scores, double maximumTime,
                   size_t& foundCount) {
    foundCount = 0;
    if (!_isEvaluated) {
      const auto environment = platform::Environment::current();
      searchkit::WorkBudget budget(*environment->clock, maximumTime);
      _isEvaluated = _evaluation.run(budget);
      if (!_isEvaluated) {
        return true;
      }
    }
    const searchkit::HitList& hits = _evaluation.hits();
    foundCount = std::min(maximumCount, hits.size() - _delivered);
    for (size_t i = 0; i < foundCount; ++i) {
      const searchkit::Hit& hit = hits[_delivered + i];
      ids[i] = hit.document;
      if (scores != nullptr) {
        scores[i] = hit.score;
      }
    }
    _delivered += foundCount;
    return _delivered < hits.size();
  }

 private:
  SKIndexRef _index;
  searchkit::Evaluation _evaluation;
  bool _isEvaluated = false;
  size_t _delivered = 0;
};

SKSearchRef SKSearchCreate(const SKIndexRef& index, std::string_view query,
                           SKSearchOptions options) {
  if (index == nullptr) {
    return nullptr;
  }
  const bool blankMeansOr = (options & kSKSearchOptionSpaceMeansOR) != 0;
  const searchkit::IndexView& view = index->view();
  const searchkit::QueryNode node =
      searchkit::parseQuery(query, blankMeansOr, view.minimumTermLength());
  return std::make_shared<SKSearch>(index, searchkit::SearchPlan::make(view, node));
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
