// Numbers for pairs of numbers.
#pragma once

#include <cstddef>
#include <cstdint>
#include <utility>
#include <vector>

/// Gives each pair of numbers a number of its own, from 0 in the order in which they come. A hash
/// table with open addressing: what a book's words are counted by is looked up for every word, and
/// a look-up is one miss of the cache, or none for whoever looks ahead. Thread-safety: confined to
/// one thread; without changes, any.
class LUXPairTable {
 public:
  static constexpr uint32_t none = 0xFFFFFFFF;

  size_t size() const noexcept { return _count; }

  /// The pair's number; the second of the result tells that it is new.
  std::pair<uint32_t, bool> numberOf(uint32_t first, uint32_t second) {
    if (_count * 2 >= _slots.size()) {
      _grow();
    }
    const uint64_t key = _key(first, second);
    Slot& slot = _slots[_find(key)];
    if (slot.number != none) {
      return {slot.number, false};
    }
    slot = {key, static_cast<uint32_t>(_count++)};
    return {slot.number, true};
  }

  /// Has the memory that numberOf() will look at fetched ahead.
  void prefetch(uint32_t first, uint32_t second) const noexcept {
    if (!_slots.empty()) {
      __builtin_prefetch(&_slots[_hash(_key(first, second)) & (_slots.size() - 1)]);
    }
  }

  /// The number of a pair that may not be there.
  uint32_t at(uint32_t first, uint32_t second) const noexcept {
    return _slots.empty() ? none : _slots[_find(_key(first, second))].number;
  }

 private:
  struct Slot {
    uint64_t key = 0;
    uint32_t number = none;
  };

  static uint64_t _key(uint32_t first, uint32_t second) noexcept {
    return static_cast<uint64_t>(first) << 32U | second;
  }

  static size_t _hash(uint64_t key) noexcept {
    const uint64_t hash = (key ^ (key >> 32U)) * 0x9E3779B97F4A7C15U;
    return static_cast<size_t>(hash ^ (hash >> 29U));
  }

  /// The place of the key, or the free one where it belongs.
  size_t _find(uint64_t key) const noexcept {
    const size_t mask = _slots.size() - 1;
    size_t place = _hash(key) & mask;
    while (_slots[place].number != none && _slots[place].key != key) {
      place = (place + 1) & mask;
    }
    return place;
  }

  void _grow() {
    std::vector<Slot> former(_slots.empty() ? 1024 : _slots.size() * 2);
    former.swap(_slots);
    for (const Slot& slot : former) {
      if (slot.number != none) {
        _slots[_find(slot.key)] = slot;
      }
    }
  }

  std::vector<Slot> _slots;
  size_t _count = 0;
};
