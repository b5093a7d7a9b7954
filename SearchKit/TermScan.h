// Finds one after the other the terms that a pattern matches.
#pragma once

#include <cstdint>

#include "SearchKit/Dictionary.h"
#include "SearchKit/Query.h"
#include "SearchKit/WorkBudget.h"

namespace searchkit {

/// A walk through that part of the dictionary in which matches can be. It can stop for want of time
/// and go on later. Thread-safety: confined to one thread.
class TermScan {
 public:
  /// Both must outlive the scan.
  TermScan(const IndexView& view, const TermPattern& pattern) noexcept
      : _cursor(view), _pattern(&pattern) {}

  enum class Outcome : uint8_t { found, finished, outOfTime };

  /// Goes to the next term that matches.
  Outcome next(WorkBudget& budget) noexcept;

  // Of the term found.
  ByteRange postings() const noexcept { return _cursor.postings(); }
  ByteRange positions() const noexcept { return _cursor.positions(); }
  /// The term is the typed word itself.
  bool isExact() const noexcept;

 private:
  enum class State : uint8_t { before, within, after };

  DictionaryCursor _cursor;
  const TermPattern* _pattern;
  State _state = State::before;
};

}  // namespace searchkit
