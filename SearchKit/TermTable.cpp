#include "SearchKit/TermTable.h"

#include <algorithm>
#include <cstring>
#include <numeric>

namespace searchkit {
namespace {

constexpr size_t arenaChunkLength = size_t{1} << 20;
constexpr size_t firstPieceLength = 16;
constexpr size_t longestPieceLength = 8192;
constexpr size_t firstSlotCount = 1024;

// Multiply and fold, eight bytes a step. Spreads words well; it need not withstand an attacker's
// choice of words, who can make a slow index only for himself.
uint32_t hashOf(std::string_view term) noexcept {
  constexpr uint64_t factor = 0x9E3779B97F4A7C15;
  uint64_t hash = term.size() * factor;
  const char* at = term.data();
  size_t left = term.size();
  while (left > 0) {
    uint64_t word = 0;
    const size_t step = std::min<size_t>(left, sizeof word);
    std::memcpy(&word, at, step);
    hash = (hash ^ word) * factor;
    hash ^= hash >> 29;
    at += step;
    left -= step;
  }
  return static_cast<uint32_t>(hash >> 16);
}

}  // namespace

uint8_t* Arena::allocate(size_t length) {
  length = (length + 7) / 8 * 8;
  if (length > _left) {
    const size_t chunkLength = std::max(length, arenaChunkLength);
    _chunks.push_back(std::make_unique<uint8_t[]>(chunkLength));
    _at = _chunks.back().get();
    _left = chunkLength;
  }
  uint8_t* const result = _at;
  _at += length;
  _left -= length;
  return result;
}

struct ByteStream::Piece {
  Piece* next;
  uint32_t used;
  uint32_t capacity;

  uint8_t* bytes() noexcept { return reinterpret_cast<uint8_t*>(this + 1); }
};

void ByteStream::append(Arena& arena, const uint8_t* bytes, size_t length) {
  while (length > 0) {
    if (_last == nullptr || _last->used == _last->capacity) {
      const size_t capacity =
          _last == nullptr ? firstPieceLength
                           : std::min<size_t>(size_t{_last->capacity} * 2, longestPieceLength);
      auto* const piece =
          new (arena.allocate(sizeof(Piece) + capacity)) Piece{nullptr, 0, uint32_t(capacity)};
      (_last == nullptr ? _first : _last->next) = piece;
      _last = piece;
    }
    const size_t step = std::min<size_t>(length, _last->capacity - _last->used);
    std::memcpy(_last->bytes() + _last->used, bytes, step);
    _last->used += static_cast<uint32_t>(step);
    bytes += step;
    length -= step;
  }
}

void ByteStream::copyTo(std::vector<uint8_t>& out) const {
  for (Piece* piece = _first; piece != nullptr; piece = piece->next) {
    out.insert(out.end(), piece->bytes(), piece->bytes() + piece->used);
  }
}

TermTable::TermTable() : _slots(firstSlotCount) {}

uint32_t TermTable::find(std::string_view term) {
  const uint32_t hash = hashOf(term);
  size_t at = hash & (_slots.size() - 1);
  for (; _slots[at].entry != 0; at = (at + 1) & (_slots.size() - 1)) {
    if (_slots[at].hash == hash && _entries[_slots[at].entry - 1].text == term) {
      return _slots[at].entry - 1;
    }
  }
  auto* const text = reinterpret_cast<char*>(_arena.allocate(term.size()));
  std::memcpy(text, term.data(), term.size());
  TermEntry entry;
  entry.text = {text, term.size()};
  _entries.push_back(entry);
  const auto number = static_cast<uint32_t>(_entries.size());
  _slots[at] = {number, hash};
  if (_entries.size() * 2 > _slots.size()) {
    _grow();
  }
  return number - 1;
}

void TermTable::_grow() {
  std::vector<Slot> slots(_slots.size() * 2);
  for (const Slot& slot : _slots) {
    if (slot.entry == 0) {
      continue;
    }
    size_t at = slot.hash & (slots.size() - 1);
    while (slots[at].entry != 0) {
      at = (at + 1) & (slots.size() - 1);
    }
    slots[at] = slot;
  }
  _slots.swap(slots);
}

std::vector<uint32_t> TermTable::sortedEntries() const {
  std::vector<uint32_t> order(_entries.size());
  std::iota(order.begin(), order.end(), 0U);
  std::sort(order.begin(), order.end(),
            [this](uint32_t a, uint32_t b) { return _entries[a].text < _entries[b].text; });
  return order;
}

}  // namespace searchkit
