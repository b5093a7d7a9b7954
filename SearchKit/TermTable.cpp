#include "SearchKit/TermTable.h"

#include <algorithm>
#include <cstring>

#include "SearchKit/IndexFormat.h"

namespace searchkit {
namespace {

constexpr size_t arenaChunkLength = size_t{1} << 20;
constexpr uint32_t firstPieceLength = 8;
constexpr uint32_t longestPieceLength = 8192;
constexpr size_t firstSlotCount = 1024;

}  // namespace

void Arena::_beginChunk(size_t length) {
  const size_t chunkLength = std::max(length, arenaChunkLength);
  _chunks.push_back(std::make_unique_for_overwrite<uint8_t[]>(chunkLength));
  _at = _chunks.back().get();
  _left = chunkLength;
}

struct ByteStream::Piece {
  Piece* next;

  uint8_t* bytes() noexcept { return reinterpret_cast<uint8_t*>(this + 1); }
};

void ByteStream::_beginPiece(Arena& arena) {
  _lastCapacity = _lastCapacity == 0 ? firstPieceLength
                                     : std::min<uint32_t>(_lastCapacity * 2, longestPieceLength);
  auto* const piece = new (arena.allocate(sizeof(Piece) + _lastCapacity)) Piece{nullptr};
  (_last == nullptr ? _first : _last->next) = piece;
  _last = piece;
  _at = piece->bytes();
  _left = _lastCapacity;
}

void ByteStream::copyTo(std::vector<uint8_t>& out) const {
  uint32_t capacity = firstPieceLength;
  for (Piece* piece = _first; piece != nullptr; piece = piece->next) {
    const uint32_t used = piece == _last ? _lastCapacity - _left : capacity;
    out.insert(out.end(), piece->bytes(), piece->bytes() + used);
    capacity = std::min<uint32_t>(capacity * 2, longestPieceLength);
  }
}

TermTable::TermTable() : _slots(firstSlotCount) {}

uint32_t TermTable::_insert(const Key& key, const char* text, size_t at) {
  // Eight bytes can be read of it, however short it is: the arena rounds up.
  auto* const kept = reinterpret_cast<char*>(_arena.allocate(key.length));
  std::memcpy(kept, text, key.length);
  const auto entry = static_cast<uint32_t>(_entries.size());
  _texts.emplace_back(kept, key.length);
  _entries.emplace_back();
  _slots[at] = {key.first, _tagOf(key), entry};
  if (_entries.size() * 2 > _slots.size()) {
    _grow();
  }
  return entry;
}

void TermTable::_grow() {
  std::vector<Slot> slots(_slots.size() * 2);
  for (const Slot& slot : _slots) {
    if (slot.tag == 0) {
      continue;
    }
    size_t at = keyOf(_texts[slot.entry]).hash & (slots.size() - 1);
    while (slots[at].tag != 0) {
      at = (at + 1) & (slots.size() - 1);
    }
    slots[at] = slot;
  }
  _slots.swap(slots);
}

std::vector<uint32_t> TermTable::sortedEntries() const {
  // Most terms are told apart by their first bytes.
  struct Place {
    uint64_t key;
    uint32_t entry;
  };
  std::vector<Place> places;
  places.reserve(_texts.size());
  for (const std::string_view text : _texts) {
    places.push_back({format::blockKey(text), static_cast<uint32_t>(places.size())});
  }
  std::sort(places.begin(), places.end(), [this](const Place& a, const Place& b) {
    return a.key != b.key ? a.key < b.key : _texts[a.entry] < _texts[b.entry];
  });
  std::vector<uint32_t> order;
  order.reserve(places.size());
  for (const Place& place : places) {
    order.push_back(place.entry);
  }
  return order;
}

}  // namespace searchkit
