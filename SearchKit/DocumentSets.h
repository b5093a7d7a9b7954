// Sets of documents while a search is under way.
#pragma once

#include <bit>
#include <cstddef>
#include <cstdint>
#include <utility>
#include <vector>

namespace searchkit {

/// A document that was found, and how relevant it is so far.
struct Hit {
  uint32_t document = 0;
  float score = 0;
};

/// Hits in ascending order of the documents.
using HitList = std::vector<Hit>;

/// The documents of both lists in order, with the sums of their scores.
void unite(const HitList& a, const HitList& b, HitList& both);

/// One bit a document, all clear between uses: whoever sets bits clears them.
/// Thread-safety: confined to one thread.
class DocumentFilter {
 public:
  DocumentFilter() = default;
  explicit DocumentFilter(uint32_t documentCount) { fit(documentCount); }

  /// Makes room for an index's documents; there may be room for more.
  void fit(uint32_t documentCount) {
    const size_t count = (size_t{documentCount} + 63) / 64;
    if (count > _words.size()) {
      _words.resize(count);
    }
  }

  bool has(uint32_t document) const noexcept {
    return (_words[document / 64] >> (document % 64) & 1) != 0;
  }
  void insert(uint32_t document) noexcept { _words[document / 64] |= uint64_t{1} << document % 64; }
  void removeAround(uint32_t document) noexcept { _words[document / 64] = 0; }

  size_t wordCount() const noexcept { return _words.size(); }
  uint64_t takeWord(size_t word) noexcept {
    const uint64_t bits = _words[word];
    _words[word] = 0;
    return bits;
  }

 private:
  std::vector<uint64_t> _words;
};

/// Frequencies a document, summed as postings come in any order. Zero everywhere between uses.
/// Thread-safety: confined to one thread.
class Accumulator {
 public:
  Accumulator() = default;
  explicit Accumulator(uint32_t documentCount) { fit(documentCount); }

  /// Makes room for an index's documents; there may be room for more.
  void fit(uint32_t documentCount) {
    if (documentCount > _frequencies.size()) {
      _frequencies.resize(documentCount);
    }
    _touched.fit(documentCount);
  }

  /// For how many documents there is room.
  size_t size() const noexcept { return _frequencies.size(); }

  /// `frequency` is above zero.
  void add(uint32_t document, float frequency) noexcept {
    _frequencies[document] += frequency;
    _touched.insert(document);
  }

  float frequency(uint32_t document) const noexcept { return _frequencies[document]; }

  /// The same for all documents: whoever writes here clears what was written.
  float* data() noexcept { return _frequencies.data(); }

  /// Any number for a document, for those who take it back themselves: drain() does not see it.
  void put(uint32_t document, float number) noexcept { _frequencies[document] = number; }

  /// The frequency of a document, which is forgotten. What documents beside it are touched is
  /// forgotten as well: to be used for all of them, until none has a frequency.
  float take(uint32_t document) noexcept {
    const float frequency = _frequencies[document];
    _frequencies[document] = 0;
    _touched.removeAround(document);
    return frequency;
  }

  /// Calls `use(document, frequency)` for each document with a frequency, in ascending order, and
  /// forgets it.
  template <typename Use>
  void drain(Use&& use) {
    drainBelow(static_cast<uint32_t>(_frequencies.size()), std::forward<Use>(use));
  }

  /// The same where no document from `documentCount` on has a frequency.
  template <typename Use>
  void drainBelow(uint32_t documentCount, Use&& use) {
    const size_t wordCount = (size_t{documentCount} + 63) / 64;
    for (size_t word = 0; word < wordCount; ++word) {
      for (uint64_t bits = _touched.takeWord(word); bits != 0; bits &= bits - 1) {
        const auto document =
            static_cast<uint32_t>(word * 64) + static_cast<uint32_t>(std::countr_zero(bits));
        const float frequency = _frequencies[document];
        _frequencies[document] = 0;
        use(document, frequency);
      }
    }
  }

 private:
  std::vector<float> _frequencies;
  DocumentFilter _touched;
};

}  // namespace searchkit
