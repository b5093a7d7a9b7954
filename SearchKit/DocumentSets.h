// Sets of documents while a search is under way.
#pragma once

#include <bit>
#include <cstddef>
#include <cstdint>
#include <vector>

namespace searchkit {

/// A document that was found, and how relevant it is so far.
struct Hit {
  uint32_t document = 0;
  float score = 0;
};

/// Hits in ascending order of the documents.
using HitList = std::vector<Hit>;

/// One bit a document, all clear between uses: whoever sets bits clears them.
/// Thread-safety: confined to one thread.
class DocumentFilter {
 public:
  explicit DocumentFilter(uint32_t documentCount) : _words((size_t{documentCount} + 63) / 64) {}

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
  explicit Accumulator(uint32_t documentCount)
      : _frequencies(documentCount), _touched(documentCount) {}

  /// `frequency` is above zero.
  void add(uint32_t document, float frequency) noexcept {
    float& sum = _frequencies[document];
    if (sum == 0) {
      _touched.insert(document);
    }
    sum += frequency;
  }

  float frequency(uint32_t document) const noexcept { return _frequencies[document]; }

  /// Calls `use(document, frequency)` for each document with a frequency, in ascending order, and
  /// forgets it.
  template <typename Use>
  void drain(Use&& use) {
    for (size_t word = 0; word < _touched.wordCount(); ++word) {
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
