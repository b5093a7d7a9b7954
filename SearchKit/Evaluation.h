// Runs a search plan over an index, a slice of time at a time.
#pragma once

#include <cstddef>
#include <memory>
#include <vector>

#include "SearchKit/DocumentSets.h"
#include "SearchKit/LeafReader.h"
#include "SearchKit/Scoring.h"
#include "SearchKit/SearchPlan.h"
#include "SearchKit/WorkBudget.h"

namespace searchkit {

class IndexView;

/// A small machine with a stack of hit lists. What it is doing when time runs out is all in its
/// fields. Thread-safety: confined to one thread.
class Evaluation {
 public:
  /// The view must outlive the evaluation.
  Evaluation(const IndexView& view, SearchPlan plan);

  /// Goes on until the end (true) or until time runs out (false).
  bool run(WorkBudget& budget);

  /// The documents found, once run() has come to the end.
  const HitList& hits() const noexcept { return _hits; }

 private:
  using Action = PlanStep::Action;

  // What is needed only when there is something to read: one entry a document.
  struct Workspace {
    explicit Workspace(uint32_t documentCount) : found(documentCount), filter(documentCount) {}

    Accumulator found;
    DocumentFilter filter;
  };

  bool _runLeaf(const PlanStep& step, WorkBudget& budget);
  void _apply(Action action);
  void _combine(Action action);
  float _score(float inverseDocumentFrequency, uint32_t document, float frequency) const noexcept;
  HitList& _top() noexcept { return _stack[_depth - 1]; }
  HitList& _push();

  const IndexView& _view;
  SearchPlan _plan;
  Scorer _scorer;
  size_t _step = 0;
  std::unique_ptr<LeafReader> _reader;
  std::unique_ptr<Workspace> _workspace;
  // Lists above the depth are empty and keep their memory for the next push.
  std::vector<HitList> _stack;
  size_t _depth = 0;
  HitList _merged;
  HitList _hits;
};

}  // namespace searchkit
