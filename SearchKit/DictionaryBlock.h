// The parts of one block of the dictionary.
#pragma once

#include <cstddef>
#include <cstdint>
#include <span>

#include "SearchKit/IndexFormat.h"

namespace searchkit {

/// A block's entries, not one after the other but field by field, so that to look for a term is to
/// walk along one byte an entry, and to find its postings is to add up numbers that stand together
/// (docs/formats/keyword-index.md; the first two versions have no such blocks).
/// Thread-safety: immutable once read.
class DictionaryBlock {
 public:
  /// Finds the parts of the block of so many entries that begins at an offset; false, with nothing
  /// to be used, when they do not lie within the dictionary.
  bool read(std::span<const uint8_t> dictionary, size_t offset, uint32_t count) noexcept {
    const size_t length = dictionary.size();
    if (offset >= length) {
      return false;
    }
    const uint8_t* at = dictionary.data() + offset;
    _end = dictionary.data() + length;
    const uint32_t flags = *at++;
    const uint32_t width = uint32_t{1} << (flags & format::postingsWidthMask);
    uint32_t extraLength = 0;
    if (width > sizeof(uint32_t) || (flags & ~format::knownBlockFlags) != 0 ||
        ((flags & format::hasLongPositions) != 0 && !format::readNumber(at, _end, extraLength)) ||
        static_cast<uint64_t>(_end - at) < uint64_t{count} * (width + 2) + extraLength) {
      return false;
    }
    _count = count;
    _width = width;
    _heads = at;
    _postingsLengths = at + count;
    _positionsLengths = _postingsLengths + size_t{count} * width;
    _longPositions = _positionsLengths + count;
    _texts = _longPositions + extraLength;
    return true;
  }

  uint32_t count() const noexcept { return _count; }
  /// How many bytes an entry shares with the one before it (lowest four bits) and how many it adds.
  uint8_t head(uint32_t entry) const noexcept { return _heads[entry]; }

  uint32_t postingsLength(uint32_t entry) const noexcept {
    switch (_width) {
      case 1:
        return _postingsLengths[entry];
      case 2:
        return format::load<uint16_t>(_postingsLengths + size_t{entry} * 2);
      default:
        return format::load<uint32_t>(_postingsLengths + size_t{entry} * 4);
    }
  }

  /// Of all entries before this one.
  uint64_t postingsBefore(uint32_t entry) const noexcept {
    uint64_t sum = 0;
    uint32_t first = 0;
    // Of that many entries the lengths of positions follow, and can be read as well.
    if (_width == 1 && _count >= sizeof(uint64_t)) {
      sum = _sumOfBytes(_postingsLengths, entry) +
            _sumOfBytes(_postingsLengths + 8, entry < 8 ? 0 : entry - 8);
      first = 2 * sizeof(uint64_t);
    }
    for (uint32_t i = first; i < entry; ++i) {
      sum += postingsLength(i);
    }
    return sum;
  }

  /// Lengths of positions are read in turn; `extra` begins as longPositions(). False where the
  /// bytes are broken.
  bool readPositionsLength(uint32_t entry, const uint8_t*& extra, uint32_t& length) const noexcept {
    length = _positionsLengths[entry];
    return length != format::longPositionsFollow || format::readNumber(extra, _texts, length);
  }
  const uint8_t* longPositions() const noexcept { return _longPositions; }

  /// What the entries add, one after the other, up to end() at most.
  const uint8_t* texts() const noexcept { return _texts; }
  const uint8_t* end() const noexcept { return _end; }

  /// Takes an entry's numbers of bytes shared and added, of which those too high for its head are
  /// before its text. False when the text goes beyond the end.
  bool readHead(uint32_t entry, const uint8_t*& text, size_t& shared,
                size_t& added) const noexcept {
    shared = _heads[entry] & format::headMask;
    added = _heads[entry] >> format::headBits;
    if (shared == format::headMask || added == format::headMask) {
      if (_end - text < 2) {
        return false;
      }
      shared = shared == format::headMask ? *text++ : shared;
      added = added == format::headMask ? *text++ : added;
    }
    return static_cast<size_t>(_end - text) >= added;
  }

 private:
  // Of the first `count` of eight bytes, or of all when it is higher.
  static uint64_t _sumOfBytes(const uint8_t* bytes, uint32_t count) noexcept {
    constexpr uint64_t everySecond = 0x00FF00FF00FF00FF;
    const auto word = format::load<uint64_t>(bytes);
    const uint64_t kept = count >= 8 ? word : word & ((uint64_t{1} << count * 8) - 1);
    const uint64_t pairs = (kept & everySecond) + (kept >> 8 & everySecond);
    return pairs * 0x0001000100010001 >> 48;
  }

  const uint8_t* _heads = nullptr;
  const uint8_t* _postingsLengths = nullptr;
  const uint8_t* _positionsLengths = nullptr;
  const uint8_t* _longPositions = nullptr;
  const uint8_t* _texts = nullptr;
  const uint8_t* _end = nullptr;
  uint32_t _count = 0;
  uint32_t _width = 1;
};

}  // namespace searchkit
