// Numbers for things, in the order in which they come.
#pragma once

#include <cstddef>
#include <cstdint>
#include <string>
#include <string_view>
#include <vector>

/// Strings, each once, numbered from 0. Takes little more memory than the text.
/// Thread-safety: confined to one thread while strings are added; then immutable.
class LUXStringNumbering {
 public:
  static constexpr uint32_t none = 0xFFFFFFFF;

  /// What stands beside the number tells strings of up to eight bytes apart, so that looking for
  /// one of these, as most words are, reads no string.
  struct Key {
    /// The bytes of a string that has up to eight, else their hash.
    uint64_t bytes = 0;
    uint32_t length = 0;
    friend bool operator==(const Key&, const Key&) = default;
  };

  /// The number of a string, which is added when it is new. Throws platform::Exception
  /// "InvalidArgumentException" when there is no room: 4 GiB of text or as many strings as numbers.
  uint32_t numberOf(std::string_view string) { return numberOf(string, keyOf(string)); }

  /// The same for whoever has the key, and so can have the memory that is looked at fetched ahead.
  uint32_t numberOf(std::string_view string, const Key& key);
  static Key keyOf(std::string_view string) noexcept;
  void prefetch(const Key& key) const noexcept;

  /// none for a string that was not added.
  uint32_t find(std::string_view string) const noexcept;

  size_t size() const noexcept { return _ends.size(); }
  /// Valid until the next string is added.
  std::string_view operator[](size_t number) const noexcept;

 private:
  struct Slot {
    uint64_t bytes = 0;
    uint32_t length = 0;
    uint32_t number = none;
  };

  size_t _slotOf(std::string_view string, const Key& key) const noexcept;
  void _grow();

  std::string _text;
  std::vector<uint32_t> _ends;
  std::vector<Slot> _slots;
};

/// Pairs of numbers below LUXStringNumbering::none, in the same way.
class LUXPairNumbering {
 public:
  struct Pair {
    uint32_t first;
    uint32_t second;
    friend bool operator==(const Pair&, const Pair&) = default;
  };

  uint32_t numberOf(Pair pair);

  size_t size() const noexcept { return _pairs.size(); }
  Pair operator[](size_t number) const noexcept { return _pairs[number]; }

 private:
  size_t _slotOf(Pair pair) const noexcept;
  void _grow();

  std::vector<Pair> _pairs;
  std::vector<uint32_t> _slots;
};
