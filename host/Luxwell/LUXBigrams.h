// The pairs of stems that follow one another in a book.
#pragma once

#include <cstddef>
#include <cstdint>
#include <vector>

#include "host/Luxwell/LUXWordSequence.h"

/// Numbers every pair of stems that follow one another, from 0 in the order of the first stem, then
/// of the second. Pairs are put into the drawer of their first stem and each drawer is sorted, some
/// drawers at a time: that takes less memory than a table of all pairs, most of which are there
/// once. Thread-safety: confined to one thread; once find() has returned, immutable.
class LUXBigrams {
 public:
  /// For what has no stem.
  static constexpr uint32_t none = 0xFFFFFFFF;

  using Pages = std::vector<const LUXWordSequence*>;

  /// `stemOfNumber` has the stem, or none, of each number in the pages; stems are below
  /// `stemCount`. What has no stem, and what breaks the chain, keeps its neighbours apart. May be
  /// called once. Up to `threadCount` threads take part; what is found does not depend on it.
  void find(const Pages& pages, const std::vector<uint32_t>& stemOfNumber, size_t stemCount,
            size_t threadCount);

  size_t size() const noexcept { return _seconds.size(); }

  /// Calls `sink(uint32_t first, uint32_t second)` for all of them, in order.
  template <typename Sink>
  void forEach(Sink sink) const {
    for (uint32_t first = 0; first + 1 < _starts.size(); ++first) {
      for (size_t at = _starts[first]; at < _starts[first + 1]; ++at) {
        sink(first, _seconds[at]);
      }
    }
  }

  /// Gives back what forEach() needs, which is not called any more.
  void forgetPairs() { std::vector<uint32_t>().swap(_seconds); }

  /// Calls `sink(uint32_t number, size_t at)` for each pair in a page, `at` being where its second
  /// word is. `sequence` and `stemOfNumber` are those that find() had.
  template <typename Sink>
  void forEachOfPage(size_t page, const LUXWordSequence& sequence,
                     const std::vector<uint32_t>& stemOfNumber, Sink sink) const {
    size_t pair = _pageStarts[page];
    forEachPair(sequence, stemOfNumber, [&](uint32_t first, uint32_t, size_t at) {
      sink(static_cast<uint32_t>(_starts[first]) + _places[pair++], at);
    });
  }

 private:
  struct Range {
    uint32_t from;
    uint32_t to;
    size_t pairCount;
  };

  template <typename Sink>
  static void forEachPair(const LUXWordSequence& sequence,
                          const std::vector<uint32_t>& stemOfNumber, Sink sink) {
    uint32_t before = none;
    for (size_t at = 0; at < sequence.words.size(); ++at) {
      const LUXWordSequence::Word word = sequence.words[at];
      const uint32_t stem = stemOfNumber[word.number()];
      if (before != none && stem != none && !word.breaksChain()) {
        sink(before, stem, at);
      }
      before = stem;
    }
  }

  static std::vector<Range> _ranges(const std::vector<uint32_t>& counts, size_t threadCount);
  void _fillRange(const Pages& pages, const std::vector<uint32_t>& stemOfNumber,
                  const std::vector<uint32_t>& counts, const Range& range,
                  std::vector<uint32_t>& seconds);

  /// By first stem, where its pairs begin; and where the last one's end.
  std::vector<size_t> _starts;
  std::vector<uint32_t> _seconds;
  /// By page, how many pairs come before it.
  std::vector<size_t> _pageStarts;
  /// Of each pair, page by page, its number less that of the first pair of its first stem.
  std::vector<uint32_t> _places;
};
