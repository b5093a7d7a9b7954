#include "SearchKit/SearchPlan.h"

#include <algorithm>
#include <limits>
#include <utility>

#include "SearchKit/SKIndex.h"

namespace searchkit {
namespace {

using Action = PlanStep::Action;

ByteRange exactRange(const IndexView& view, const std::string& term) {
  DictionaryCursor cursor(view);
  return cursor.seek(term) && cursor.term() == term ? cursor.postings() : ByteRange{};
}

PrefixRange rangeOfPattern(const IndexView& view, const TermPattern& pattern) {
  if (pattern.isExact()) {
    return {exactRange(view, pattern.pieces[0]), true};
  }
  return findPrefix(view, pattern.literalPrefix());
}

PlanLeaf planLeaf(const IndexView& view, const QueryNode& node) {
  PlanLeaf leaf;
  leaf.slots = node.slots;
  std::vector<std::pair<uint64_t, size_t>> costs;
  for (size_t i = 0; i < node.slots.size(); ++i) {
    leaf.range = rangeOfPattern(view, node.slots[i].pattern);
    costs.emplace_back(leaf.range.postings.length(), i);
  }
  std::sort(costs.begin(), costs.end());
  leaf.cost = costs.front().first;
  if (node.slots.size() > 1) {
    leaf.kind = PlanLeaf::Kind::phrase;
    for (size_t i = 0; i < costs.size(); ++i) {
      leaf.slots[i] = node.slots[costs[i].second];
    }
  } else if (const TermPattern& pattern = node.slots[0].pattern;
             pattern.isExact() || pattern.isPrefix()) {
    leaf.slots.clear();
  } else {
    leaf.kind = PlanLeaf::Kind::pattern;
  }
  return leaf;
}

// A node with its leaves already looked up, so that siblings can be put in order.
struct Costed {
  const QueryNode* node = nullptr;
  uint32_t leaf = 0;
  uint64_t cost = 0;
  std::vector<Costed> required;
  std::vector<Costed> optional;
  std::vector<Costed> excluded;
};

class Planner {
 public:
  Planner(const IndexView& view, SearchPlan& plan) : _view(view), _plan(plan) {}

  Costed estimate(const QueryNode& node) {
    Costed costed;
    costed.node = &node;
    if (node.isLeaf()) {
      costed.leaf = static_cast<uint32_t>(_plan.leaves.size());
      _plan.leaves.push_back(planLeaf(_view, node));
      costed.cost = _plan.leaves.back().cost;
      return costed;
    }
    const auto estimateAll = [this](const std::vector<QueryNode>& nodes) {
      std::vector<Costed> all;
      all.reserve(nodes.size());
      for (const QueryNode& child : nodes) {
        all.push_back(estimate(child));
      }
      return all;
    };
    costed.required = estimateAll(node.required);
    costed.optional = estimateAll(node.optional);
    costed.excluded = estimateAll(node.excluded);
    if (!costed.required.empty()) {
      std::stable_sort(costed.required.begin(), costed.required.end(),
                       [](const Costed& a, const Costed& b) { return a.cost < b.cost; });
      costed.cost = costed.required.front().cost;
    } else {
      for (const Costed& child : costed.optional) {
        costed.cost += std::min(child.cost, std::numeric_limits<uint64_t>::max() - costed.cost);
      }
    }
    return costed;
  }

  // Emits the steps that leave the node's documents on the stack, one set more than before.
  void emit(const Costed& costed) {
    if (costed.node->isLeaf()) {
      _step(Action::push, costed.leaf);
      return;
    }
    std::vector<size_t> skips;
    const bool isConjunction = !costed.required.empty();
    const std::vector<Costed>& chosen = isConjunction ? costed.required : costed.optional;
    emit(chosen.front());
    for (size_t i = 1; i < chosen.size(); ++i) {
      if (isConjunction) {
        skips.push_back(_step(Action::skipIfEmpty, 0));
        _combine(chosen[i], Action::intersect, Action::intersectSets);
      } else {
        _combine(chosen[i], Action::unite, Action::uniteSets);
      }
    }
    for (const Costed& child : costed.excluded) {
      skips.push_back(_step(Action::skipIfEmpty, 0));
      _combine(child, Action::subtract, Action::subtractSets);
    }
    for (const Costed& child : costed.optional) {
      if (isConjunction) {
        skips.push_back(_step(Action::skipIfEmpty, 0));
        _combine(child, Action::addScores, Action::addSetScores);
      }
    }
    for (const size_t skip : skips) {
      _plan.steps[skip].operand = static_cast<uint32_t>(_plan.steps.size());
    }
  }

 private:
  size_t _step(Action action, uint32_t operand) {
    _plan.steps.push_back({action, operand});
    return _plan.steps.size() - 1;
  }

  void _combine(const Costed& child, Action withLeaf, Action withSet) {
    if (child.node->isLeaf()) {
      _step(withLeaf, child.leaf);
    } else {
      emit(child);
      _step(withSet, 0);
    }
  }

  const IndexView& _view;
  SearchPlan& _plan;
};

}  // namespace

SearchPlan SearchPlan::make(const IndexView& view, const QueryNode& query) {
  SearchPlan plan;
  if (query.hasPositive() && view.documentCount() > 0) {
    Planner planner(view, plan);
    const Costed root = planner.estimate(query);
    if (root.cost > 0) {
      planner.emit(root);
    }
  }
  return plan;
}

}  // namespace searchkit
