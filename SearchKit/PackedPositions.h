// The positions of words as a stream of bits.
//
// Distances between the occurrences of a word in a page are about as often short as chance would
// have it, so each is written with as many low bits as the mean distance has, and the rest in unary
// (R. F. Rice, "Some Practical Universal Noiseless Coding Techniques", 1979). The mean follows from
// what is known already: how long the page is and how often it has the word. Bits are taken from
// the lowest of each byte on.
#pragma once

#include <algorithm>
#include <bit>
#include <cstdint>
#include <cstring>
#include <span>
#include <vector>

namespace searchkit {

/// From this number of positions on, a page's positions say how many bits they have, so that they
/// can be passed over.
inline constexpr uint32_t fewestPositionsWithLength = 16;
/// Ones in unary before a distance is written in 32 bits instead.
inline constexpr uint32_t longestUnary = 24;
/// Counts and lengths are below two to the power of this.
inline constexpr uint32_t maximumCountBits = 28;

/// How many low bits the distances of `count` positions have in a page of `length` words.
inline uint32_t positionBits(uint32_t length, uint32_t count) noexcept {
  const uint32_t mean = length / std::max<uint32_t>(count, 1);
  return mean == 0 ? 0 : static_cast<uint32_t>(std::bit_width(mean)) - 1;
}

/// Bits one after the other, the lowest first; at most 64.
struct BitCode {
  uint64_t bits = 0;
  uint32_t length = 0;

  void append(const BitCode& other) noexcept {
    bits |= other.bits << length;
    length += other.length;
  }
};

/// A number of at least 1: in unary how many bits follow the highest, then these.
inline BitCode countCode(uint32_t number) noexcept {
  const uint32_t low = static_cast<uint32_t>(std::bit_width(number | 1)) - 1;
  const uint64_t ones = (uint64_t{1} << low) - 1;
  return {ones | (number & ones) << (low + 1), 2 * low + 1};
}

/// The distance's bits above the low ones in unary, then those.
inline BitCode distanceCode(uint32_t distance, uint32_t lowBits) noexcept {
  const uint32_t high = distance >> lowBits;
  if (high >= longestUnary) {
    return {((uint64_t{1} << longestUnary) - 1) | uint64_t{distance} << longestUnary,
            longestUnary + 32};
  }
  const uint64_t low = distance & ((uint64_t{1} << lowBits) - 1);
  return {((uint64_t{1} << high) - 1) | low << (high + 1), high + 1 + lowBits};
}

/// Appends bits, the lowest first. Thread-safety: confined to one thread.
class BitWriter {
 public:
  void clear() noexcept {
    _length = 0;
    _pending = 0;
    _count = 0;
  }

  /// The lowest `count` bits of `bits`, all others being 0; at most 32.
  void append(uint64_t bits, uint32_t count) {
    _pending |= bits << _count;
    _count += count;
    if (_count >= 32) {
      if (_length + sizeof(uint32_t) > _bytes.size()) {
        _bytes.resize(std::max<size_t>(_bytes.size() * 2, 256));
      }
      const auto low = static_cast<uint32_t>(_pending);
      std::memcpy(_bytes.data() + _length, &low, sizeof low);
      _length += sizeof low;
      _pending >>= 32;
      _count -= 32;
    }
  }

  void append(const BitCode& code) {
    if (code.length <= 32) {
      append(code.bits, code.length);
      return;
    }
    append(code.bits & _ones(32), 32);
    append(code.bits >> 32, code.length - 32);
  }

  void appendCount(uint32_t number) { append(countCode(number)); }
  void appendDistance(uint32_t distance, uint32_t lowBits) {
    append(distanceCode(distance, lowBits));
  }

  /// The first `count` bits of the bytes, after which eight more bytes can be read.
  void append(const uint8_t* bytes, uint64_t count) {
    for (; count > 32; count -= 32, bytes += sizeof(uint32_t)) {
      append(_word(bytes) & _ones(32), 32);
    }
    append(_word(bytes) & _ones(static_cast<uint32_t>(count)), static_cast<uint32_t>(count));
  }

  uint64_t bitCount() const noexcept { return uint64_t{_length} * 8 + _count; }

  /// The bits so far, the last byte filled up with zeros. Nothing is appended after that until
  /// clear(), which is when they go; there are some more bytes after them.
  std::span<const uint8_t> finish() {
    const uint32_t count = _count;
    append(0, 32 - count);
    const size_t length = _length - sizeof(uint32_t) + (count + 7) / 8;
    return std::span<const uint8_t>(_bytes).first(length);
  }

 private:
  static uint64_t _ones(uint32_t count) noexcept { return (uint64_t{1} << count) - 1; }
  static uint64_t _word(const uint8_t* bytes) noexcept {
    uint64_t word;
    std::memcpy(&word, bytes, sizeof word);
    return word;
  }

  // Room; so many bytes of it are written.
  std::vector<uint8_t> _bytes;
  size_t _length = 0;
  uint64_t _pending = 0;
  uint32_t _count = 0;
};

/// Reads bits; beyond the end there are none. Thread-safety: confined to one thread.
class BitReader {
 public:
  BitReader() = default;
  BitReader(const uint8_t* begin, const uint8_t* end) noexcept
      : _begin(begin), _byteCount(static_cast<size_t>(end - begin)) {}

  bool readCount(uint32_t& number) noexcept {
    const uint64_t window = _window();
    const auto bits = static_cast<uint32_t>(std::countr_one(window));
    if (bits > maximumCountBits) {
      return _fail();
    }
    number = uint32_t{1} << bits |
             (static_cast<uint32_t>(window >> (bits + 1)) & ((uint32_t{1} << bits) - 1));
    return skip(2 * bits + 1);
  }

  bool readDistance(uint32_t lowBits, uint32_t& distance) noexcept {
    const uint64_t window = _window();
    const auto high = static_cast<uint32_t>(std::countr_one(window));
    if (high >= longestUnary) {
      distance = static_cast<uint32_t>(window >> longestUnary);
      return skip(longestUnary + 32);
    }
    const uint64_t low = (window >> (high + 1)) & ((uint64_t{1} << lowBits) - 1);
    const uint64_t whole = (uint64_t{high} << lowBits) | low;
    if (whole > UINT32_MAX) {
      return _fail();
    }
    distance = static_cast<uint32_t>(whole);
    return skip(high + 1 + lowBits);
  }

  /// Bits read so far.
  uint64_t position() const noexcept { return _at; }
  /// Whether what is left is less than a byte, and zeros.
  bool isAtEnd() const noexcept { return _byteCount * 8 - _at < 8 && _window() == 0; }

  bool skip(uint64_t bits) noexcept {
    _at += bits;
    return _at <= _byteCount * 8 || _fail();
  }

 private:
  bool _fail() noexcept {
    _at = _byteCount * 8;
    return false;
  }

  // At least 57 bits from here on, zeros after the end.
  uint64_t _window() const noexcept {
    uint64_t bits = 0;
    const size_t byte = static_cast<size_t>(_at / 8);
    if (byte < _byteCount) {
      std::memcpy(&bits, _begin + byte, std::min<size_t>(sizeof bits, _byteCount - byte));
    }
    return bits >> (_at % 8);
  }

  const uint8_t* _begin = nullptr;
  size_t _byteCount = 0;
  uint64_t _at = 0;
};

}  // namespace searchkit
