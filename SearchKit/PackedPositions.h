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

/// Appends bits. Thread-safety: confined to one thread.
class BitWriter {
 public:
  void clear() noexcept {
    _bytes.clear();
    _pending = 0;
    _count = 0;
  }

  /// The lowest `count` bits of `bits`, all others being 0; at most 32.
  void append(uint32_t bits, uint32_t count) {
    _pending |= uint64_t{bits} << _count;
    _count += count;
    while (_count >= 8) {
      _bytes.push_back(static_cast<uint8_t>(_pending));
      _pending >>= 8;
      _count -= 8;
    }
  }

  /// As many ones, at most 32.
  void appendOnes(uint32_t count) {
    append(count == 32 ? UINT32_MAX : (uint32_t{1} << count) - 1, count);
  }

  /// A number of at least 1: in unary how many bits follow the highest, then these.
  void appendCount(uint32_t number) {
    const auto bits = static_cast<uint32_t>(std::bit_width(number)) - 1;
    appendOnes(bits);
    append(0, 1);
    append(number & ((uint32_t{1} << bits) - 1), bits);
  }

  void appendDistance(uint32_t distance, uint32_t lowBits) {
    const uint32_t high = distance >> lowBits;
    if (high >= longestUnary) {
      appendOnes(longestUnary);
      append(distance, 32);
      return;
    }
    appendOnes(high);
    append(0, 1);
    append(distance & ((uint32_t{1} << lowBits) - 1), lowBits);
  }

  uint64_t bitCount() const noexcept { return _bytes.size() * 8 + _count; }

  /// Fills the last byte up with zeros.
  const std::vector<uint8_t>& finish() {
    if (_count > 0) {
      append(0, 8 - _count);
    }
    return _bytes;
  }

  /// Appends what another one has.
  void append(const BitWriter& other) {
    for (const uint8_t byte : other._bytes) {
      append(byte, 8);
    }
    append(static_cast<uint32_t>(other._pending), other._count);
  }

 private:
  std::vector<uint8_t> _bytes;
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
