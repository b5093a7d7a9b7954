// The writer's terms: each with the postings that it has gathered so far.
#pragma once

#include <cstddef>
#include <cstdint>
#include <cstring>
#include <memory>
#include <string_view>
#include <vector>

#include "SearchKit/TermHash.h"

namespace searchkit {

/// Memory that is only ever added to and freed as a whole. Thread-safety: confined to one thread.
class Arena {
 public:
  /// Bytes for any use up to eight-byte numbers; valid as long as the arena.
  uint8_t* allocate(size_t length) {
    length = (length + 7) / 8 * 8;
    if (length > _left) {
      _beginChunk(length);
    }
    uint8_t* const result = _at;
    _at += length;
    _left -= length;
    return result;
  }

 private:
  void _beginChunk(size_t length);

  std::vector<std::unique_ptr<uint8_t[]>> _chunks;
  uint8_t* _at = nullptr;
  size_t _left = 0;
};

/// Bytes that are appended in many small steps, kept in pieces that grow with the whole: most terms
/// are rare and take a few bytes, a few take megabytes. Thread-safety: confined to one thread.
class ByteStream {
 public:
  void append(Arena& arena, const uint8_t* bytes, size_t length) {
    while (length > _left) {
      if (const size_t step = _left; step > 0) {
        std::memcpy(_at, bytes, step);
        bytes += step;
        length -= step;
      }
      _beginPiece(arena);
    }
    if (length > 0) {
      std::memcpy(_at, bytes, length);
      _at += length;
      _left -= static_cast<uint32_t>(length);
    }
  }

  /// The same for the first `length` of the sixteen bytes of two numbers.
  void appendShort(Arena& arena, uint64_t low, uint64_t high, size_t length) {
    const uint64_t words[2] = {low, high};
    if (_left < sizeof words) {
      append(arena, reinterpret_cast<const uint8_t*>(words), length);
      return;
    }
    std::memcpy(_at, &low, sizeof low);
    std::memcpy(_at + sizeof low, &high, sizeof high);
    _at += length;
    _left -= static_cast<uint32_t>(length);
  }

  /// Appends all bytes so far to `out`.
  void copyTo(std::vector<uint8_t>& out) const;

  /// Has the place where the next bytes go brought near.
  void prefetch() const noexcept { __builtin_prefetch(_at, 1); }

 private:
  struct Piece;

  void _beginPiece(Arena& arena);

  // All pieces but the last are full, and each is twice as long as the one before, up to a limit.
  Piece* _first = nullptr;
  Piece* _last = nullptr;
  uint8_t* _at = nullptr;
  uint32_t _left = 0;
  uint32_t _lastCapacity = 0;
};

/// What has been seen of a term. The fields of the current document are the writer's.
struct TermEntry {
  /// The last document that has the term, in the order of adding, plus one; 0 for none yet.
  uint32_t lastDocument = 0;
  /// In the current document: summed weights, how many occurrences and which is the last.
  uint32_t weight = 0;
  uint32_t occurrenceCount = 0;
  uint32_t lastOccurrence = 0;
  ByteStream postings;
};

/// All terms by their text: a hash table with open addressing, in which a term of up to eight bytes
/// stands itself, so that a look-up touches one line of the table and one entry.
/// Thread-safety: confined to one thread.
class TermTable {
 public:
  TermTable();

  /// A term whose entry is to be looked for, with what the table needs to know of it.
  struct Key {
    uint64_t first;
    uint32_t hash;
    uint32_t length;
  };

  /// The term has from 1 to format::maximumTermBytes bytes, and eight can be read of shorter ones.
  static Key keyOf(std::string_view term) noexcept {
    const uint64_t first = firstBytes(term.data(), term.size());
    TermHash hash(term.size());
    hash.add(first);
    if (term.size() > sizeof first) {
      hash.addAfterFirst(term.data(), term.size());
    }
    return {first, hash.value(), static_cast<uint32_t>(term.size())};
  }

  /// Has the place where a term stands, if it does, brought near.
  void prefetch(const Key& key) const noexcept {
    __builtin_prefetch(&_slots[key.hash & (_slots.size() - 1)]);
  }

  /// The number of the entry for a term, made when there is none; valid until the table goes.
  uint32_t find(const Key& key, const char* text) {
    return _find(key, text, [&](uint32_t entry) {
      return key.length <= sizeof key.first ||
             std::memcmp(_texts[entry].data(), text, key.length) == 0;
    });
  }

  /// The same for a term of up to eight bytes, which are all in the key.
  uint32_t findShort(const Key& key) {
    return _find(key, reinterpret_cast<const char*>(&key.first), [](uint32_t) { return true; });
  }

  TermEntry& operator[](uint32_t entry) { return _entries[entry]; }
  std::string_view text(uint32_t entry) const { return _texts[entry]; }
  size_t size() const noexcept { return _entries.size(); }
  Arena& arena() noexcept { return _arena; }

  /// The numbers of all entries, in the order of their terms' bytes.
  std::vector<uint32_t> sortedEntries() const;

 private:
  struct Slot {
    // The first eight bytes of the term.
    uint64_t first = 0;
    // Most of the hash, and the term's length; 0 where there is none.
    uint32_t tag = 0;
    uint32_t entry = 0;
  };

  template <typename IsSame>
  uint32_t _find(const Key& key, const char* text, const IsSame& isSame) {
    const uint32_t tag = _tagOf(key);
    size_t at = key.hash & (_slots.size() - 1);
    for (; _slots[at].tag != 0; at = (at + 1) & (_slots.size() - 1)) {
      const Slot& slot = _slots[at];
      if (slot.first == key.first && slot.tag == tag && isSame(slot.entry)) {
        return slot.entry;
      }
    }
    return _insert(key, text, at);
  }

  static uint32_t _tagOf(const Key& key) noexcept {
    return (key.hash & ~uint32_t{0xFF}) | key.length;
  }
  uint32_t _insert(const Key& key, const char* text, size_t at);
  void _grow();

  Arena _arena;
  std::vector<TermEntry> _entries;
  std::vector<std::string_view> _texts;
  std::vector<Slot> _slots;
};

}  // namespace searchkit
