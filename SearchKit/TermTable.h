// The writer's terms: each with the postings that it has gathered so far.
#pragma once

#include <cstddef>
#include <cstdint>
#include <memory>
#include <string_view>
#include <vector>

namespace searchkit {

/// Memory that is only ever added to and freed as a whole. Thread-safety: confined to one thread.
class Arena {
 public:
  /// Bytes for any use up to eight-byte numbers; valid as long as the arena.
  uint8_t* allocate(size_t length);

 private:
  std::vector<std::unique_ptr<uint8_t[]>> _chunks;
  uint8_t* _at = nullptr;
  size_t _left = 0;
};

/// Bytes that are appended in many small steps, kept in pieces that grow with the whole: most terms
/// are rare and take a few bytes, a few take megabytes. Thread-safety: confined to one thread.
class ByteStream {
 public:
  void append(Arena& arena, const uint8_t* bytes, size_t length);
  /// Appends all bytes so far to `out`.
  void copyTo(std::vector<uint8_t>& out) const;

 private:
  struct Piece;

  Piece* _first = nullptr;
  Piece* _last = nullptr;
};

/// A term and what has been seen of it. The fields of the current document are the writer's.
struct TermEntry {
  std::string_view text;
  /// The last document that has the term, in the order of adding, plus one; 0 for none yet.
  uint32_t lastDocument = 0;
  /// In the current document: summed weights, and the first and last of the occurrences.
  uint32_t weight = 0;
  uint32_t firstOccurrence = 0;
  uint32_t lastOccurrence = 0;
  ByteStream postings;
};

/// All terms by their text: a hash table with open addressing, so that a look-up touches one line
/// of the table and one entry. Thread-safety: confined to one thread.
class TermTable {
 public:
  TermTable();

  /// The number of the entry for a term, made when there is none; valid until the table goes.
  uint32_t find(std::string_view term);

  TermEntry& operator[](uint32_t entry) { return _entries[entry]; }
  size_t size() const noexcept { return _entries.size(); }
  Arena& arena() noexcept { return _arena; }

  /// The numbers of all entries, in the order of their terms' bytes.
  std::vector<uint32_t> sortedEntries() const;

 private:
  void _grow();

  Arena _arena;
  std::vector<TermEntry> _entries;
  // Entry number plus one, and the hash beside it so that a miss rarely looks at an entry.
  struct Slot {
    uint32_t entry = 0;
    uint32_t hash = 0;
  };
  std::vector<Slot> _slots;
};

}  // namespace searchkit
