// The memory in which searches work, used again and again.
#pragma once

#include <cstdint>
#include <memory>
#include <vector>

#include "SearchKit/DocumentSets.h"

namespace searchkit {

/// One entry a document of the largest index searched with it, and lists of hits. The sets are
/// empty and the frequencies zero while nobody has it. Thread-safety: confined to one thread at a
/// time.
struct SearchScratch {
  /// Makes room for an index.
  void fit(uint32_t documentCount) {
    found.fit(documentCount);
    filter.fit(documentCount);
  }

  Accumulator found;
  DocumentFilter filter;
  HitList hits;
  HitList others;
  HitList merged;
};

/// Holds one for the time of a search. A thread keeps the one that was last given back on it, so
/// that searches that follow one another, book by book, allocate nothing.
/// Thread-safety: confined to one thread at a time.
class ScratchLease {
 public:
  ScratchLease() = default;
  ~ScratchLease() { giveBack(); }
  ScratchLease(const ScratchLease&) = delete;
  ScratchLease& operator=(const ScratchLease&) = delete;

  explicit operator bool() const noexcept { return _scratch != nullptr; }
  SearchScratch& operator*() const noexcept { return *_scratch; }
  SearchScratch* operator->() const noexcept { return _scratch.get(); }

  void take(uint32_t documentCount);
  /// What it is given back in the middle of something is not used again.
  void setIsClean(bool isClean) noexcept { _isClean = isClean; }
  void giveBack() noexcept;

 private:
  std::unique_ptr<SearchScratch> _scratch;
  bool _isClean = true;
};

}  // namespace searchkit
