#include "host/Luxwell/LUXNumbering.h"

#include <cstring>
#include <limits>

#include "platform/Exception.h"

// Both are open tables of numbers, at most three quarters full, in which one looks on from the slot
// that the hash names.

namespace {

constexpr size_t smallestTable = 64;

bool isFull(size_t used, size_t slots) noexcept { return used + 1 > slots / 4 * 3; }

constexpr uint64_t factor = 0x9E3779B97F4A7C15ULL;

// Up to eight bytes, those of the same string always as the same number.
uint64_t wordOf(const char* bytes, size_t length) noexcept {
  uint64_t word = 0;
  if (length >= 4) {
    // The two may overlap.
    uint32_t first = 0;
    uint32_t last = 0;
    std::memcpy(&first, bytes, 4);
    std::memcpy(&last, bytes + length - 4, 4);
    return static_cast<uint64_t>(last) << 32U | first;
  }
  for (size_t i = 0; i < length; ++i) {
    word = word << 8U | static_cast<uint8_t>(bytes[i]);
  }
  return word;
}

size_t hashOf(uint64_t bytes, uint32_t length) noexcept {
  const uint64_t hash = (bytes ^ length) * factor;
  return static_cast<size_t>(hash ^ hash >> 32U);
}

uint64_t hashOf(LUXPairNumbering::Pair pair) noexcept {
  uint64_t hash = (static_cast<uint64_t>(pair.first) << 32U | pair.second) * 0x9E3779B97F4A7C15ULL;
  hash ^= hash >> 32U;
  return hash;
}

[[noreturn]] void throwTooMany() {
  throw platform::Exception(platform::invalidArgumentException, "too many tokens for a model");
}

}  // namespace

std::string_view LUXStringNumbering::operator[](size_t number) const noexcept {
  const uint32_t from = number == 0 ? 0 : _ends[number - 1];
  return std::string_view(_text).substr(from, _ends[number] - from);
}

LUXStringNumbering::Key LUXStringNumbering::keyOf(std::string_view string) noexcept {
  uint64_t bytes = 0;
  const char* at = string.data();
  size_t left = string.size();
  for (; left > 8; at += 8, left -= 8) {
    bytes = (bytes ^ wordOf(at, 8)) * factor;
    bytes ^= bytes >> 32U;
  }
  bytes ^= wordOf(at, left);
  // Sizes that do not fit are those of strings that do not, either.
  return {bytes, static_cast<uint32_t>(string.size())};
}

size_t LUXStringNumbering::_slotOf(std::string_view string, const Key& key) const noexcept {
  const size_t mask = _slots.size() - 1;
  size_t slot = hashOf(key.bytes, key.length) & mask;
  while (_slots[slot].number != none &&
         (_slots[slot].bytes != key.bytes || _slots[slot].length != key.length ||
          (string.size() > 8 && (*this)[_slots[slot].number] != string))) {
    slot = (slot + 1) & mask;
  }
  return slot;
}

void LUXStringNumbering::prefetch(const Key& key) const noexcept {
  if (!_slots.empty()) {
    __builtin_prefetch(&_slots[hashOf(key.bytes, key.length) & (_slots.size() - 1)]);
  }
}

uint32_t LUXStringNumbering::find(std::string_view string) const noexcept {
  return _slots.empty() ? none : _slots[_slotOf(string, keyOf(string))].number;
}

uint32_t LUXStringNumbering::numberOf(std::string_view string, const Key& key) {
  if (isFull(_ends.size(), _slots.size())) {
    _grow();
  }
  Slot& slot = _slots[_slotOf(string, key)];
  if (slot.number == none) {
    if (_text.size() + string.size() > std::numeric_limits<uint32_t>::max() ||
        _ends.size() + 2 >= none) {
      throwTooMany();
    }
    slot = {key.bytes, key.length, static_cast<uint32_t>(_ends.size())};
    _text += string;
    _ends.push_back(static_cast<uint32_t>(_text.size()));
  }
  return slot.number;
}

void LUXStringNumbering::_grow() {
  std::vector<Slot> former(_slots.empty() ? smallestTable : _slots.size() * 2);
  former.swap(_slots);
  const size_t mask = _slots.size() - 1;
  for (const Slot& moved : former) {
    if (moved.number == none) {
      continue;
    }
    size_t slot = hashOf(moved.bytes, moved.length) & mask;
    while (_slots[slot].number != none) {
      slot = (slot + 1) & mask;
    }
    _slots[slot] = moved;
  }
}

size_t LUXPairNumbering::_slotOf(Pair pair) const noexcept {
  const size_t mask = _slots.size() - 1;
  size_t slot = hashOf(pair) & mask;
  while (_slots[slot] != LUXStringNumbering::none && _pairs[_slots[slot]] != pair) {
    slot = (slot + 1) & mask;
  }
  return slot;
}

uint32_t LUXPairNumbering::numberOf(Pair pair) {
  if (isFull(_pairs.size(), _slots.size())) {
    _grow();
  }
  const size_t slot = _slotOf(pair);
  if (_slots[slot] == LUXStringNumbering::none) {
    if (_pairs.size() + 2 >= LUXStringNumbering::none) {
      throwTooMany();
    }
    _slots[slot] = static_cast<uint32_t>(_pairs.size());
    _pairs.push_back(pair);
  }
  return _slots[slot];
}

void LUXPairNumbering::_grow() {
  _slots.assign(_slots.empty() ? smallestTable : _slots.size() * 2, LUXStringNumbering::none);
  for (uint32_t number = 0; number < _pairs.size(); ++number) {
    _slots[_slotOf(_pairs[number])] = number;
  }
}
