// Puts documents and terms, handed over in their final order, into the bytes of an index.
#pragma once

#include <cstdint>
#include <optional>
#include <span>
#include <string>
#include <string_view>
#include <vector>

#include "SearchKit/IndexFormat.h"
#include "SearchKit/MergedLists.h"
#include "SearchKit/PackedPositions.h"
#include "platform/Data.h"

namespace searchkit {

/// What the index keeps of a document beside its words.
struct StoredTexts {
  std::string path;
  std::optional<std::string> title;
  std::optional<std::string> abstract;
  uint32_t wordCount = 0;
};

/// One document of a term.
struct Posting {
  uint32_t document = 0;
  uint32_t weight = 0;
  /// The positions as the index has them, with how many bits they take; eight more bytes can be
  /// read after them.
  const uint8_t* positions = nullptr;
  uint32_t positionBits = 0;
};

/// Builds the sections one entry at a time. Thread-safety: confined to one thread.
///
/// Throws platform::Exception "RangeException" when a section reaches the four gigabytes that its
/// offsets can tell.
class IndexAssembler {
 public:
  explicit IndexAssembler(uint32_t minimumTermLength) : _minimumTermLength(minimumTermLength) {}

  /// Documents come in the order of their paths' bytes, without repetition.
  void addDocument(const StoredTexts& texts);

  /// Terms come in the order of their bytes, without repetition; the postings of each in the order
  /// of the documents' numbers, at least one.
  void addTerm(std::string_view term, std::span<const Posting> postings);

  /// May be called once.
  platform::Data finish();

 private:
  std::vector<uint8_t>& _section(format::Section id) {
    return _sections[static_cast<uint32_t>(id)];
  }
  uint32_t _offset(format::Section id);
  void _beginBlock(std::string_view term);
  void _endBlock();

  uint32_t _minimumTermLength;
  uint32_t _documentCount = 0;
  uint32_t _termCount = 0;
  uint64_t _wordCount = 0;
  std::string _previousTerm;
  // Of the current block of the dictionary.
  uint32_t _entryCount = 0;
  uint8_t _heads[format::termsPerBlock] = {};
  uint32_t _postingsLengths[format::termsPerBlock] = {};
  uint32_t _positionsLengths[format::termsPerBlock] = {};
  std::vector<uint8_t> _texts;
  MergedListsBuilder _mergedLists;
  BitWriter _positions;
  std::vector<uint8_t> _sections[format::lastKnownSection + 1];
};

}  // namespace searchkit
