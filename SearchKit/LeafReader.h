// Gathers the documents of one leaf of a search, a slice of work at a time.
#pragma once

#include <cstdint>
#include <memory>

#include "SearchKit/DocumentSets.h"
#include "SearchKit/SearchPlan.h"
#include "SearchKit/WorkBudget.h"

namespace searchkit {

class IndexView;

/// Thread-safety: confined to one thread.
class LeafReader {
 public:
  virtual ~LeafReader() = default;

  /// Adds to `found` the frequency of each document of the leaf, in units of 1 / exactFactor; with
  /// a filter, only of documents in it. False when time ran out before the end: then it is to be
  /// called again with the same `found` and `filter`.
  virtual bool read(WorkBudget& budget, const DocumentFilter* filter, Accumulator& found) = 0;

  /// After the end: how many documents have the leaf's term or phrase, filter or not, or an upper
  /// bound of that.
  virtual uint64_t documentCount() const noexcept = 0;

  /// The view and the leaf must outlive the reader.
  static std::unique_ptr<LeafReader> make(const IndexView& view, const PlanLeaf& leaf);
};

}  // namespace searchkit
