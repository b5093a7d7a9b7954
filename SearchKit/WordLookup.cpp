#include "SearchKit/WordLookup.h"

#include <algorithm>
#include <cstring>

#include "SearchKit/SKIndex.h"

namespace searchkit {
namespace {

using format::Section;

// Reads the entries of one block, keeping track of how each compares with the term sought.
class BlockScan {
 public:
  BlockScan(const IndexView& view, uint32_t block) noexcept {
    const std::span<const uint8_t> dictionary = view.section(Section::dictionary);
    const size_t begin =
        std::min<size_t>(view.blockOffset(block, format::blockDictionaryAt), dictionary.size());
    _at = dictionary.data() + begin;
    _end = dictionary.data() + dictionary.size();
    _left =
        std::min<uint32_t>(view.termsPerBlock(), view.termCount() - block * view.termsPerBlock());
    _postings = view.blockOffset(block, format::blockPostingsAt);
  }

  // Goes to the next entry; false at the block's end, and where the bytes are broken.
  bool next(std::string_view sought) noexcept {
    _postings += _length;
    _length = 0;
    if (_left == 0 || _end - _at < 2) {
      return false;
    }
    --_left;
    const size_t shared = _at[0];
    const size_t added = _at[1];
    const uint8_t* const text = _at + 2;
    if (shared > _termLength || shared + added > format::maximumTermBytes ||
        static_cast<size_t>(_end - text) < added) {
      _left = 0;
      return false;
    }
    _at = text + added;
    _termLength = shared + added;
    // With more bytes shared with the former term than that shared with the one sought, this one
    // compares as that did; with fewer, it is the first that is above.
    if (shared <= _common) {
      const size_t limit = std::min(added, sought.size() - std::min(shared, sought.size()));
      size_t same = 0;
      while (same < limit && text[same] == static_cast<uint8_t>(sought[shared + same])) {
        ++same;
      }
      _common = shared + same;
      _isBelow = _common < sought.size() &&
                 (same == added || text[same] < static_cast<uint8_t>(sought[_common]));
    }
    uint32_t positionsLength;
    if (!format::readNumber(_at, _end, _length) ||
        !format::readNumber(_at, _end, positionsLength)) {
      _left = 0;
      _length = 0;
      return false;
    }
    return true;
  }

  // Of the current entry; after the last one, where the postings of the block end.
  bool isBelow() const noexcept { return _isBelow; }
  bool startsWith(std::string_view sought) const noexcept { return _common == sought.size(); }
  bool is(std::string_view sought) const noexcept {
    return startsWith(sought) && _termLength == sought.size();
  }
  uint64_t postingsBegin() const noexcept { return _postings; }
  uint64_t postingsEnd() const noexcept { return _postings + _length; }

 private:
  const uint8_t* _at = nullptr;
  const uint8_t* _end = nullptr;
  uint32_t _left = 0;
  size_t _termLength = 0;
  size_t _common = 0;
  bool _isBelow = false;
  uint64_t _postings = 0;
  uint32_t _length = 0;
};

// The first block of `low` up to `high` whose key is above `key`, or `high`. Without a branch on
// what is compared: no processor could predict it.
uint32_t firstBlockAbove(const IndexView& view, uint64_t key, uint32_t low,
                         uint32_t high) noexcept {
  uint32_t count = high - low;
  while (count > 0) {
    const uint32_t half = count / 2;
    const bool isAbove = view.blockKey(low + half) > key;
    low = isAbove ? low : low + half + 1;
    count = isAbove ? half : count - half - 1;
  }
  return low;
}

WordPostings findByCursor(const IndexView& view, const QueryWord& word) noexcept {
  WordPostings found;
  const PrefixRange range = findPrefix(view, word.term);
  found.range = range.postings;
  found.beginsWithExactTerm = range.beginsWithExactTerm;
  if (!word.isPrefix) {
    DictionaryCursor cursor(view);
    found.range =
        cursor.seek(word.term) && cursor.term() == word.term ? cursor.postings() : ByteRange{};
    found.isOneList = true;
  }
  found.kind = found.range.length() > 0 ? WordPostings::Kind::lists : WordPostings::Kind::none;
  return found;
}

bool findMerged(const IndexView& view, uint64_t key, WordPostings& found) noexcept {
  uint32_t low = 0;
  for (uint32_t count = view.mergedCount(); count > 0;) {
    const uint32_t half = count / 2;
    const bool isBelow = view.mergedKey(low + half) < key;
    low = isBelow ? low + half + 1 : low;
    count = isBelow ? count - half - 1 : half;
  }
  if (low == view.mergedCount() || view.mergedKey(low) != key) {
    return false;
  }
  const uint64_t limit = view.section(Section::mergedLists).size();
  found.kind = WordPostings::Kind::merged;
  found.isOneList = true;
  found.range.begin = std::min<uint64_t>(view.mergedEntry(low, format::mergedOffsetAt), limit);
  // A list tells its own length; that of the next one is not needed.
  found.range.end = limit;
  if (low + 1 < view.mergedCount()) {
    found.range.end = std::clamp<uint64_t>(view.mergedEntry(low + 1, format::mergedOffsetAt),
                                           found.range.begin, limit);
  }
  found.documentSum = view.mergedEntry(low, format::mergedDocumentSumAt);
  return true;
}

}  // namespace

WordPostings findWord(const IndexView& view, const QueryWord& word) noexcept {
  WordPostings found;
  if (word.mergedKey != 0 && findMerged(view, word.mergedKey, found)) {
    return found;
  }
  const uint32_t blockCount = view.blockCount();
  uint32_t block = firstBlockAbove(view, word.firstKey, 0, blockCount);
  // Terms of eight bytes and more may have their key in common with the first terms of blocks.
  if (word.term.size() >= sizeof(uint64_t)) {
    if (block > 0 && view.blockKey(block - 1) == word.firstKey) {
      return findByCursor(view, word);
    }
  }
  // A shorter one can only be the very term that has its key.
  block -= block > 0 ? 1 : 0;
  if (blockCount == 0) {
    return found;
  }
  BlockScan scan(view, block);
  bool isThere = scan.next(word.term);
  while (isThere && scan.isBelow()) {
    isThere = scan.next(word.term);
  }
  if (!isThere) {
    // The first term of the next block is the first that is not below.
    if (++block >= blockCount) {
      return found;
    }
    scan = BlockScan(view, block);
    isThere = scan.next(word.term);
  }
  if (!isThere || !scan.startsWith(word.term) || (!word.isPrefix && !scan.is(word.term))) {
    return found;
  }
  const uint64_t limit = view.section(Section::postings).size();
  found.kind = WordPostings::Kind::lists;
  found.beginsWithExactTerm = scan.is(word.term);
  found.range = {std::min(scan.postingsBegin(), limit), std::min(scan.postingsEnd(), limit)};
  if (!word.isPrefix) {
    found.isOneList = true;
    return found;
  }
  found.isOneList = true;
  while ((isThere = scan.next(word.term)) && scan.startsWith(word.term)) {
    found.isOneList = false;
    found.range.end = std::min(scan.postingsEnd(), limit);
  }
  if (isThere || block + 1 >= blockCount || view.blockKey(block + 1) > word.lastKey) {
    return found;
  }
  if (word.term.size() >= sizeof(uint64_t)) {
    return findByCursor(view, word);
  }
  // The blocks between begin with the prefix; the last of them may end with other terms.
  found.isOneList = false;
  block = firstBlockAbove(view, word.lastKey, block + 1, blockCount) - 1;
  scan = BlockScan(view, block);
  while (scan.next(word.term) && scan.startsWith(word.term)) {
    found.range.end = std::min(scan.postingsEnd(), limit);
  }
  return found;
}

}  // namespace searchkit
