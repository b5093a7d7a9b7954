// A hash of short texts, and their first bytes as a number.
#pragma once

#include <cstddef>
#include <cstdint>
#include <cstring>
#include <string_view>

namespace searchkit {

/// Multiplies and folds, eight bytes a step, the last step overlapping the one before it. Spreads
/// words well; it need not withstand an attacker's choice of words, who can make a slow index only
/// for himself.
class TermHash {
 public:
  explicit TermHash(size_t length) noexcept : _state(length * factor) {}

  void add(uint64_t word) noexcept {
    _state = (_state ^ word) * factor;
    _state ^= _state >> 29;
  }

  /// The bytes from the ninth on of a text that has more than eight.
  void addAfterFirst(const char* text, size_t length) noexcept {
    for (size_t at = sizeof(uint64_t); at + sizeof(uint64_t) < length; at += sizeof(uint64_t)) {
      add(load(text + at));
    }
    add(load(text + length - sizeof(uint64_t)));
  }

  uint32_t value() const noexcept { return static_cast<uint32_t>(_state >> 16); }

  static uint64_t load(const char* at) noexcept {
    uint64_t word;
    std::memcpy(&word, at, sizeof word);
    return word;
  }

 private:
  static constexpr uint64_t factor = 0x9E3779B97F4A7C15;

  uint64_t _state;
};

/// The first eight bytes as they lie in memory, zeros after a shorter text, of which eight bytes
/// can nevertheless be read.
inline uint64_t firstBytes(const char* text, size_t length) noexcept {
  const uint64_t word = TermHash::load(text);
  return length >= sizeof word ? word : word & ((uint64_t{1} << length * 8) - 1);
}

/// Of any bytes; not the hash that terms have.
inline uint32_t hashOfBytes(std::string_view text) noexcept {
  TermHash hash(text.size());
  if (text.size() > sizeof(uint64_t)) {
    hash.add(TermHash::load(text.data()));
    hash.addAfterFirst(text.data(), text.size());
  } else if (!text.empty()) {
    uint64_t word = 0;
    std::memcpy(&word, text.data(), text.size());
    hash.add(word);
  }
  return hash.value();
}

}  // namespace searchkit
