// Reads postings: which documents have a term, and with what weight.
#pragma once

#include <algorithm>
#include <cstdint>

#include "SearchKit/Dictionary.h"
#include "SearchKit/IndexFormat.h"
#include "SearchKit/SKIndex.h"

namespace searchkit {

/// Walks a range of lists, one list a term. Every document it gives is below the index's count and
/// above the one before in its list; where the bytes say otherwise the range ends there.
/// Cheap to copy: a loop keeps one in registers. Thread-safety: confined to one thread.
class PostingsCursor {
 public:
  PostingsCursor() = default;
  PostingsCursor(const IndexView& view, ByteRange range) noexcept
      : _documentCount(view.documentCount()) {
    const std::span<const uint8_t> section = view.section(format::Section::postings);
    const uint64_t end = std::min<uint64_t>(range.end, section.size());
    const uint64_t begin = std::min(range.begin, end);
    _at = section.data() + begin;
    _end = section.data() + end;
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

  /// How many documents the current list says it has.
  uint32_t listDocumentCount() const noexcept { return std::min(_listCount, _documentCount); }

  /// Goes to the next document of the current list; false at its end.
  bool next() noexcept {
    if (_left == 0) {
      return false;
    }
    --_left;
    uint32_t number;
    if (!format::readNumber(_at, _end, number)) {
      return _stop();
    }
    const uint64_t document = uint64_t{_next} + (number >> 1);
    if (document >= _documentCount) {
      return _stop();
    }
    _document = static_cast<uint32_t>(document);
    _next = _document + 1;
    _weight = 1;
    if ((number & 1) != 0) {
      if (!format::readNumber(_at, _end, _weight)) {
        return _stop();
      }
      _weight = std::clamp<uint32_t>(_weight, 1, format::maximumWeight);
    }
    return true;
  }

  uint32_t document() const noexcept { return _document; }
  /// From 1 to format::maximumWeight.
  uint32_t weight() const noexcept { return _weight; }

 private:
  bool _stop() noexcept {
    _at = _end;
    _left = 0;
    return false;
  }

  const uint8_t* _at = nullptr;
  const uint8_t* _end = nullptr;
  uint32_t _documentCount = 0;
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
  PositionsCursor(const IndexView& view, ByteRange range) noexcept {
    const std::span<const uint8_t> section = view.section(format::Section::positions);
    const uint64_t end = std::min<uint64_t>(range.end, section.size());
    const uint64_t begin = std::min(range.begin, end);
    _next = section.data() + begin;
    _end = section.data() + end;
  }

  /// Goes to the positions of the next document; false where there are none.
  bool nextDocument() noexcept {
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

  /// Goes to the next position in the current document; false after the last.
  bool nextPosition() noexcept {
    uint32_t difference;
    if (!format::readNumber(_at, _next, difference) || difference > UINT32_MAX - _position) {
      _at = _next;
      return false;
    }
    _position += difference;
    return true;
  }

  uint32_t position() const noexcept { return _position; }

 private:
  const uint8_t* _at = nullptr;
  const uint8_t* _next = nullptr;
  const uint8_t* _end = nullptr;
  uint32_t _position = 0;
};

}  // namespace searchkit
