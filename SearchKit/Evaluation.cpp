#include "SearchKit/Evaluation.h"

#include <utility>

#include "SearchKit/SKIndex.h"

namespace searchkit {
namespace {

// Whether a leaf's documents matter only where the set on top has them.
bool isFiltered(PlanStep::Action action) noexcept {
  return action == PlanStep::Action::intersect || action == PlanStep::Action::subtract ||
         action == PlanStep::Action::addScores;
}

}  // namespace

Evaluation::Evaluation(const IndexView& view, SearchPlan plan)
    : _view(view), _plan(std::move(plan)), _scorer(view.documentCount(), view.wordCount()) {}

bool Evaluation::run(WorkBudget& budget) {
  while (_step < _plan.steps.size()) {
    const PlanStep& step = _plan.steps[_step];
    switch (step.action) {
      case Action::skipIfEmpty:
        if (_top().empty()) {
          _step = step.operand;
          continue;
        }
        break;
      case Action::push:
      case Action::unite:
      case Action::intersect:
      case Action::subtract:
      case Action::addScores:
        if (!_runLeaf(step, budget)) {
          return false;
        }
        break;
      case Action::uniteSets:
      case Action::intersectSets:
      case Action::subtractSets:
      case Action::addSetScores:
        budget.spend(_top().size());
        _combine(step.action);
        break;
    }
    ++_step;
    if (budget.isSpent()) {
      break;
    }
  }
  if (_step < _plan.steps.size()) {
    return false;
  }
  if (_depth > 0) {
    _hits = std::move(_top());
    _depth = 0;
    _workspace.reset();
  }
  return true;
}

bool Evaluation::_runLeaf(const PlanStep& step, WorkBudget& budget) {
  const PlanLeaf& leaf = _plan.leaves[step.operand];
  if (!_workspace) {
    _workspace = std::make_unique<Workspace>(_view.documentCount());
  }
  const bool filtered = isFiltered(step.action);
  if (!_reader) {
    _reader = LeafReader::make(_view, leaf);
    if (filtered) {
      for (const Hit& hit : _top()) {
        _workspace->filter.insert(hit.document);
      }
    }
  }
  if (!_reader->read(budget, filtered ? &_workspace->filter : nullptr, _workspace->found)) {
    return false;
  }
  if (filtered) {
    for (const Hit& hit : _top()) {
      _workspace->filter.removeAround(hit.document);
    }
  }
  budget.spend(_depth > 0 ? _top().size() : 0);
  _apply(step.action);
  _reader.reset();
  return true;
}

float Evaluation::_score(float inverseDocumentFrequency, uint32_t document,
                         float frequency) const noexcept {
  return _scorer.score(inverseDocumentFrequency, frequency, _view.documentLength(document));
}

HitList& Evaluation::_push() {
  if (_depth == _stack.size()) {
    _stack.emplace_back();
  }
  _stack[_depth].clear();
  return _stack[_depth++];
}

// Brings what the reader found and the set on top together.
void Evaluation::_apply(Action action) {
  const float idf = _scorer.inverseDocumentFrequency(_reader->documentCount());
  Accumulator& found = _workspace->found;
  if (action == Action::push || action == Action::unite) {
    HitList& hits = _push();
    found.drain([&](uint32_t document, float frequency) {
      hits.push_back({document, _score(idf, document, frequency)});
    });
    if (action == Action::unite) {
      _combine(Action::uniteSets);
    }
    return;
  }
  HitList& top = _top();
  size_t kept = 0;
  for (const Hit& hit : top) {
    const float frequency = found.frequency(hit.document);
    const bool isFound = frequency > 0;
    if (action == Action::subtract ? !isFound : isFound || action == Action::addScores) {
      const float added =
          isFound && action != Action::subtract ? _score(idf, hit.document, frequency) : 0;
      top[kept++] = {hit.document, hit.score + added};
    }
  }
  top.resize(kept);
  found.drain([](uint32_t, float) {});
}

void Evaluation::_combine(Action action) {
  const HitList& above = _stack[_depth - 1];
  HitList& below = _stack[_depth - 2];
  --_depth;
  if (action == Action::uniteSets) {
    unite(below, above, _merged);
    below.swap(_merged);
    return;
  }
  size_t kept = 0;
  auto other = above.begin();
  for (const Hit& hit : below) {
    while (other != above.end() && other->document < hit.document) {
      ++other;
    }
    const bool isFound = other != above.end() && other->document == hit.document;
    if (action == Action::subtractSets ? !isFound : isFound || action == Action::addSetScores) {
      const float added = isFound && action != Action::subtractSets ? other->score : 0;
      below[kept++] = {hit.document, hit.score + added};
    }
  }
  below.resize(kept);
}

}  // namespace searchkit
