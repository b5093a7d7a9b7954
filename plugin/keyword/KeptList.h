// The best hits of one search, collected as they are found.
#pragma once

#include <cstddef>
#include <vector>

#include "SearchKit/SearchKit.h"

/// Keeps the 500 best of any number of hits in memory for 500, with one exception: hits that tie
/// with the worst one kept are kept as well, so that which of several equally good pages are shown
/// does not hang on the order in which the engine happens to deliver them.
///
/// Entries are not sorted. Thread-safety: confined to one thread.
class KeptList {
 public:
  /// From this many entries on, a hit must earn its place.
  static constexpr size_t limit = 500;
  static constexpr size_t initialCapacity = 50;

  /// Takes the next hit into account. Below the limit every hit is kept. From then on a hit better
  /// than the worst one takes that one's place, a hit as good as it is added, and any other,
  /// a score that is not a number included, is dropped.
  void add(SKDocumentID id, float score);

  /// As if new; keeps its memory for the next search.
  void clear() noexcept;

  bool empty() const noexcept { return _ids.empty(); }
  size_t count() const noexcept { return _ids.size(); }
  /// Entries for which there is room: 0, then 50, 76, 115, 173, …
  size_t capacity() const noexcept { return _capacity; }

  /// The kept hits; ids()[i] has scores()[i].
  const std::vector<SKDocumentID>& ids() const noexcept { return _ids; }
  const std::vector<float>& scores() const noexcept { return _scores; }

  /// The smallest score kept, and its first position. Meaningless for an empty list.
  float minimum() const noexcept { return _minimum; }
  size_t minimumPosition() const noexcept { return _minimumPosition; }

 private:
  void _append(SKDocumentID id, float score);
  void _replaceMinimum(SKDocumentID id, float score);

  std::vector<SKDocumentID> _ids;
  std::vector<float> _scores;
  size_t _capacity = 0;
  float _minimum = 0;
  size_t _minimumPosition = 0;
};
