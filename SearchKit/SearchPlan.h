// A query made ready for one index: which postings to read, in which order, and what to do with
// them.
#pragma once

#include <cstddef>
#include <cstdint>
#include <vector>

#include "SearchKit/Dictionary.h"
#include "SearchKit/Query.h"

namespace searchkit {

class IndexView;

/// The postings behind one term or phrase.
struct PlanLeaf {
  enum class Kind : uint8_t {
    /// All lists of a byte range, one after the other: a term or a prefix.
    range,
    /// The lists of those terms that a pattern matches: the dictionary is walked.
    pattern,
    /// Terms at given distances: positions are read.
    phrase,
  };
  Kind kind = Kind::range;
  /// range: the lists; beginsWithExactTerm says that the first is the typed word's own.
  PrefixRange range;
  /// pattern: one slot; phrase: all, that with the fewest postings first.
  std::vector<PhraseSlot> slots;
  /// An upper bound of the bytes of postings to read; 0 when there is nothing to find.
  uint64_t cost = 0;
};

/// One instruction for a stack of document sets.
struct PlanStep {
  enum class Action : uint8_t {
    // With the documents of a leaf:
    /// Pushes them.
    push,
    /// Adds them to the set on top.
    unite,
    /// Keeps of the set on top those that are among them.
    intersect,
    /// Takes them from the set on top.
    subtract,
    /// Adds their scores to the documents of the set on top.
    addScores,
    // With the set on top, which goes, and the one below it:
    uniteSets,
    intersectSets,
    subtractSets,
    addSetScores,
    /// Goes on at another step when the set on top is empty.
    skipIfEmpty,
  };
  Action action;
  /// The leaf's number, or the step to go on at.
  uint32_t operand = 0;
};

/// Straight-line code for a stack, so that it can stop anywhere and go on later; what is cheap and
/// excludes most comes first. Running it leaves one set; no steps at all mean that nothing can be
/// found. Thread-safety: immutable.
struct SearchPlan {
  std::vector<PlanLeaf> leaves;
  std::vector<PlanStep> steps;

  static SearchPlan make(const IndexView& view, const QueryNode& query);
};

}  // namespace searchkit
