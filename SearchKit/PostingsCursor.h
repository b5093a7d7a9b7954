// Reads postings: which documents have a term, and with what weight.
#pragma once

#include <algorithm>
#include <cstdint>
#include <span>

#include "SearchKit/Dictionary.h"
#include "SearchKit/IndexFormat.h"
#include "SearchKit/PackedPositions.h"
#include "SearchKit/SKIndex.h"

namespace searchkit {

/// Walks a range of lists, one list a term. Every document it gives is below the index's count and
/// above the one before in its list; where the bytes say otherwise the range ends there.
/// Cheap to copy: a loop keeps one in registers. Thread-safety: confined to one thread.
class PostingsCursor {
 public:
  PostingsCursor() = default;
  PostingsCursor(const IndexView& view, ByteRange range) noexcept
      : PostingsCursor(view, view.section(format::Section::postings), range,
                       format::maximumWeight) {}
  /// Lists of another section, whose weights may be higher.
  PostingsCursor(const IndexView& view, std::span<const uint8_t> section, ByteRange range,
                 uint32_t maximumWeight) noexcept
      : _documentCount(view.documentCount()),
        _maximumWeight(maximumWeight),
        _weightBits(view.weightBits()),
        _weightMask((uint32_t{1} << view.weightBits()) - 1) {
    const uint64_t end = std::min<uint64_t>(range.end, section.size());
    const uint64_t begin = std::min(range.begin, end);
    _at = section.data() + begin;
    _end = section.data() + end;
    // As long as three bytes can be read; never in the first version, which has other bits.
    _quickEnd = _weightBits == format::weightBits && end - begin > 2 ? _end - 2 : _at;
  }

  /// Goes to the next list; false when there is none. What is left of the current one must have
  /// been read.
  bool beginList() noexcept {
    if (!format::readNumber(_at, _end, _listCount)) {
      return false;
    }
    _left = _listCount;
    _next = 0;
    return true;
  }

  /// Whether the current list says that it has more documents.
  bool isInList() const noexcept { return _left > 0; }

  /// How many documents the current list says it has.
  uint32_t listDocumentCount() const noexcept { return std::min(_listCount, _documentCount); }

  /// Goes to the next document of the current list; false at its end. Inlined always: a call would
  /// keep the cursor of a loop in memory.
  [[gnu::always_inline]] bool next() noexcept {
    if (_left == 0) {
      return false;
    }
    --_left;
    // Nearly always one byte, or one and a weight of one byte: no branch on which of the two, which
    // no processor could predict.
    if (_end - _at >= 2) {
      const uint32_t first = _at[0];
      const uint32_t second = _at[1];
      const uint32_t low = first & _weightMask;
      const bool hasWeight = low == _weightMask;
      if (((first | (hasWeight ? second : 0)) & 0x80) == 0) {
        _at += hasWeight ? 2 : 1;
        _weight = hasWeight ? second + (second == 0 ? 1 : 0) : low + 1;
        return _take(first >> _weightBits);
      }
    }
    return _nextInMoreBytes();
  }

  /// Calls `use(document, weight)` for the next documents of the current list, so many at most.
  /// Returns how many there were; fewer only at the list's end. What document() gives afterwards is
  /// not said.
  template <typename Use>
  [[gnu::always_inline]] size_t read(size_t maximumCount, Use&& use) noexcept {
    const uint8_t* at = _at;
    const uint8_t* const quickEnd = _quickEnd;
    const uint32_t documentCount = _documentCount;
    uint32_t next = _next;
    const auto count = static_cast<uint32_t>(std::min<size_t>(_left, maximumCount));
    for (uint32_t left = count; left > 0; --left) {
      uint32_t difference;
      uint32_t weight;
      // A number of one or two bytes with a weight of one byte or none: no branch on which of the
      // last, which no processor could predict.
      const bool isQuick = at < quickEnd;
      const bool hasWeight = isQuick && (at[0] & quickWeightMask) == quickWeightMask;
      if (isQuick && ((at[0] | (hasWeight ? at[1] : 0)) & 0x80) == 0) {
        difference = at[0] >> format::weightBits;
        weight = hasWeight ? at[1] + (at[1] == 0 ? 1 : 0) : (at[0] & quickWeightMask) + 1;
        at += hasWeight ? 2 : 1;
      } else if (isQuick && ((at[1] | (hasWeight ? at[2] : 0)) & 0x80) == 0) {
        difference = ((at[0] & 0x7FU) | uint32_t{at[1]} << 7) >> format::weightBits;
        weight = hasWeight ? at[2] + (at[2] == 0 ? 1 : 0) : (at[0] & quickWeightMask) + 1;
        at += hasWeight ? 3 : 2;
      } else {
        const AnyPosting posting = _readAny(at);
        if (posting.end == nullptr) {
          _stop();
          return count - left;
        }
        at = posting.end;
        difference = posting.difference;
        weight = posting.weight;
      }
      const uint64_t document = uint64_t{next} + difference;
      if (document >= documentCount) {
        _stop();
        return count - left;
      }
      use(static_cast<uint32_t>(document), weight);
      next = static_cast<uint32_t>(document) + 1;
    }
    _at = at;
    _next = next;
    _left -= count;
    return count;
  }

  uint32_t document() const noexcept { return _document; }
  /// From 1 to format::maximumWeight, or to the limit given.
  uint32_t weight() const noexcept { return _weight; }

 private:
  static constexpr uint32_t quickWeightMask = (1U << format::weightBits) - 1;

  /// A posting of any length; no end where the bytes are broken.
  struct AnyPosting {
    const uint8_t* end;
    uint32_t difference;
    uint32_t weight;
  };
  AnyPosting _readAny(const uint8_t* at) const noexcept {
    uint32_t number;
    if (!format::readNumber(at, _end, number)) {
      return {nullptr, 0, 0};
    }
    uint32_t weight = (number & _weightMask) + 1;
    if (weight > _weightMask) {
      if (!format::readNumber(at, _end, weight)) {
        return {nullptr, 0, 0};
      }
      weight = std::clamp<uint32_t>(weight, 1, _maximumWeight);
    }
    return {at, number >> _weightBits, weight};
  }

  [[gnu::always_inline]] bool _take(uint32_t difference) noexcept {
    const uint64_t document = uint64_t{_next} + difference;
    if (document >= _documentCount) {
      return _stop();
    }
    _document = static_cast<uint32_t>(document);
    _next = _document + 1;
    return true;
  }

  [[gnu::always_inline]] bool _nextInMoreBytes() noexcept {
    const AnyPosting posting = _readAny(_at);
    if (posting.end == nullptr) {
      return _stop();
    }
    _at = posting.end;
    _weight = posting.weight;
    return _take(posting.difference);
  }

  bool _stop() noexcept {
    _at = _end;
    _left = 0;
    return false;
  }

  const uint8_t* _at = nullptr;
  const uint8_t* _end = nullptr;
  const uint8_t* _quickEnd = nullptr;
  uint32_t _documentCount = 0;
  uint32_t _maximumWeight = 0;
  uint32_t _weightBits = 1;
  uint32_t _weightMask = 1;
  uint32_t _listCount = 0;
  uint32_t _left = 0;
  uint32_t _next = 0;
  uint32_t _document = 0;
  uint32_t _weight = 0;
};

/// Reads the positions beside one list of postings, document by document.
/// Thread-safety: confined to one thread.
class PositionsCursor {
 public:
  PositionsCursor() = default;
  PositionsCursor(const IndexView& view, ByteRange range) noexcept
      : _isPacked(view.hasPackedPositions()) {
    const std::span<const uint8_t> section = view.section(format::Section::positions);
    const uint64_t end = std::min<uint64_t>(range.end, section.size());
    const uint64_t begin = std::min(range.begin, end);
    _next = section.data() + begin;
    _end = section.data() + end;
    _bits = BitReader(_next, _end);
  }

  /// Goes to the positions of the next document, which has so many words; false where there are
  /// none.
  bool nextDocument(uint32_t documentLength) noexcept {
    return _isPacked ? _nextPackedDocument(documentLength) : _nextDocumentInBytes();
  }

  /// Goes to the next position in the current document; false after the last.
  bool nextPosition() noexcept { return _isPacked ? _nextPackedPosition() : _nextInBytes(); }

  uint32_t position() const noexcept { return _position; }

 private:
  bool _nextPackedDocument(uint32_t documentLength) noexcept {
    if (_bitsOfRest > 0) {
      _bits.skip(_bitsOfRest);
    } else {
      while (_nextPackedPosition()) {
      }
    }
    _bitsOfRest = 0;
    _isFirst = true;
    _position = 0;
    if (!_bits.readCount(_left)) {
      _left = 0;
      return false;
    }
    _lowBits = positionBits(documentLength, _left);
    if (_left >= fewestPositionsWithLength && !_bits.readCount(_bitsOfRest)) {
      _left = 0;
      return false;
    }
    return true;
  }

  bool _nextPackedPosition() noexcept {
    uint32_t distance;
    if (_left == 0 || !_bits.readDistance(_lowBits, distance)) {
      _left = 0;
      return false;
    }
    // Once one is read, the others are what is left of the way to the next document.
    _bitsOfRest = 0;
    const uint64_t position = uint64_t{_position} + distance + (_isFirst ? 0 : 1);
    if (position > UINT32_MAX) {
      _left = 0;
      return false;
    }
    --_left;
    _isFirst = false;
    _position = static_cast<uint32_t>(position);
    return true;
  }

  bool _nextDocumentInBytes() noexcept {
    uint32_t length;
    _at = _next;
    if (!format::readNumber(_at, _end, length) || length > static_cast<size_t>(_end - _at)) {
      _at = _next = _end;
      return false;
    }
    _next = _at + length;
    _position = 0;
    return true;
  }

  bool _nextInBytes() noexcept {
    uint32_t difference;
    if (!format::readNumber(_at, _next, difference) || difference > UINT32_MAX - _position) {
      _at = _next;
      return false;
    }
    _position += difference;
    return true;
  }

  bool _isPacked = false;
  uint32_t _position = 0;
  // Packed.
  BitReader _bits;
  uint32_t _left = 0;
  uint32_t _lowBits = 0;
  uint32_t _bitsOfRest = 0;
  bool _isFirst = true;
  // In bytes.
  const uint8_t* _at = nullptr;
  const uint8_t* _next = nullptr;
  const uint8_t* _end = nullptr;
};

}  // namespace searchkit
