// Finds terms in an index's dictionary, and walks them in order.
#pragma once

#include <cstddef>
#include <cstdint>
#include <string_view>

#include "SearchKit/DictionaryBlock.h"
#include "SearchKit/IndexFormat.h"

namespace searchkit {

class IndexView;

/// Bytes of a section: from `begin` up to `end`, offsets within the section.
struct ByteRange {
  uint64_t begin = 0;
  uint64_t end = 0;
  uint64_t length() const noexcept { return end > begin ? end - begin : 0; }
};

/// One place in the dictionary: a term and where its postings and positions are. The ranges lie
/// inside their sections, whatever the bytes. Thread-safety: confined to one thread.
class DictionaryCursor {
 public:
  /// The view must outlive the cursor. Stands nowhere until the first seek.
  explicit DictionaryCursor(const IndexView& view) noexcept : _view(&view) {}

  /// Goes to the first term that is not below `term`; false when there is none.
  bool seek(std::string_view term) noexcept;

  /// Goes to the next term; false when there is none or its bytes are broken.
  bool next() noexcept;

  bool isValid() const noexcept { return _isValid; }

  // Of the current term; only while the cursor is valid.
  std::string_view term() const noexcept { return {_term, _termLength}; }
  /// From 1.
  int64_t number() const noexcept {
    return int64_t{_block} * _termsPerBlock + static_cast<int64_t>(_entry) + 1;
  }
  ByteRange postings() const noexcept { return _postings; }
  ByteRange positions() const noexcept { return _positions; }

 private:
  bool _enterBlock(uint32_t block) noexcept;
  bool _readEntry() noexcept;
  bool _readText(size_t shared, size_t added) noexcept;
  bool _fail() noexcept {
    _isValid = false;
    return false;
  }

  const IndexView* _view;
  const uint8_t* _at = nullptr;
  const uint8_t* _end = nullptr;
  // Of the current block, but for the first two versions.
  DictionaryBlock _fields;
  const uint8_t* _longPositions = nullptr;
  uint32_t _block = 0;
  uint32_t _entry = 0;
  uint32_t _termsPerBlock = 0;
  uint32_t _entriesInBlock = 0;
  bool _isValid = false;
  size_t _termLength = 0;
  ByteRange _postings;
  ByteRange _positions;
  char _term[format::maximumTermBytes + 1] = {};
};

/// The last block whose first term is not above `term`, or the first block.
uint32_t blockForTerm(const IndexView& view, std::string_view term) noexcept;

/// The postings of all terms that begin with `prefix`: they follow one another.
struct PrefixRange {
  ByteRange postings;
  /// The first of the terms is the prefix itself.
  bool beginsWithExactTerm = false;
};
PrefixRange findPrefix(const IndexView& view, std::string_view prefix) noexcept;

}  // namespace searchkit
