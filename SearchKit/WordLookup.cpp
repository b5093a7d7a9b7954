#include "SearchKit/WordLookup.h"

#include <algorithm>
#include <cstring>

#include "SearchKit/MergedLists.h"
#include "SearchKit/SKIndex.h"

namespace searchkit {
namespace {

using format::Section;

constexpr uint32_t fewestBlocksWithManyLists = 256;

// Looks for the first term of a block that is not below the one sought. Terms are not put together:
// it is enough to know how many bytes each shares with the one sought.
class BlockSearch {
 public:
  BlockSearch(const IndexView& view, uint32_t block) noexcept
      : _postings(view.blockOffset(block, format::blockPostingsAt)) {
    // The postings are on their way while the block is searched.
    const std::span<const uint8_t> postings = view.section(Section::postings);
    __builtin_prefetch(postings.data() + std::min<uint64_t>(_postings, postings.size()));
    if (!_fields.read(view.section(Section::dictionary),
                      view.blockOffset(block, format::blockDictionaryAt),
                      view.entriesInBlock(block))) {
      _fields = DictionaryBlock();
    }
  }

  // False when all are below, and where the bytes are broken.
  bool find(std::string_view sought) noexcept {
    const uint8_t* text = _fields.texts();
    size_t common = 0;
    for (_entry = 0; _entry < _fields.count(); ++_entry) {
      size_t shared = 0;
      size_t added = 0;
      if (!_fields.readHead(_entry, text, shared, added)) {
        return false;
      }
      // With more bytes shared with the former term than that shared with the one sought, this one
      // compares as that did; with fewer, it is the first that is above.
      if (shared < common) {
        return true;
      }
      if (shared == common) {
        const size_t limit = std::min(added, sought.size() - common);
        size_t same = 0;
        while (same < limit && text[same] == static_cast<uint8_t>(sought[common + same])) {
          ++same;
        }
        common += same;
        if (common == sought.size() ||
            (same < added && text[same] > static_cast<uint8_t>(sought[common]))) {
          _startsWith = common == sought.size();
          _isExact = _startsWith && same == added;
          return true;
        }
      }
      text += added;
    }
    return false;
  }

  // Of the term found.
  bool startsWith() const noexcept { return _startsWith; }
  bool isExact() const noexcept { return _isExact; }
  uint64_t postingsBegin() const noexcept { return _postings + _fields.postingsBefore(_entry); }
  uint64_t postingsEnd() const noexcept { return postingsBegin() + _fields.postingsLength(_entry); }

  // Where the postings of the terms end that begin like the one found, as far as they are in the
  // block. `length` is that of the beginning, and less than an entry's head has room for.
  uint64_t prefixEnd(size_t length, bool& isWholeRest) const noexcept {
    uint32_t entry = _entry + 1;
    while (entry < _fields.count() && (_fields.head(entry) & format::headMask) >= length) {
      ++entry;
    }
    isWholeRest = entry == _fields.count();
    return _postings + _fields.postingsBefore(entry);
  }
  // The same where all terms from the first on begin so.
  uint64_t prefixEndFromStart(size_t length) noexcept {
    _entry = 0;
    bool isWholeRest = false;
    return _fields.count() > 0 ? prefixEnd(length, isWholeRest) : _postings;
  }

 private:
  DictionaryBlock _fields;
  uint64_t _postings;
  uint32_t _entry = 0;
  bool _startsWith = false;
  bool _isExact = false;
};

// The same in the first two versions: reads the entries of one block one by one.
class BlockScan {
 public:
  BlockScan(const IndexView& view, uint32_t block) noexcept {
    const std::span<const uint8_t> dictionary = view.section(Section::dictionary);
    const size_t begin =
        std::min<size_t>(view.blockOffset(block, format::blockDictionaryAt), dictionary.size());
    _at = dictionary.data() + begin;
    _end = dictionary.data() + dictionary.size();
    _left = view.entriesInBlock(block);
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

// How many of the keys, which ascend, are not above this one. The processor guesses on and has the
// next keys on their way; arithmetic in place of the branch took somewhat longer.
uint32_t countUpTo(const uint8_t* keys, uint32_t count, uint64_t key) noexcept {
  uint32_t low = 0;
  while (count > 0) {
    const uint32_t half = count / 2;
    if (format::load<uint64_t>(keys + size_t{low + half} * sizeof key) <= key) {
      low += half + 1;
      count -= half + 1;
    } else {
      count = half;
    }
  }
  return low;
}

// The first block of `low` up to `high` whose key is above `key`, or `high`.
uint32_t firstBlockAbove(const IndexView& view, uint64_t key, uint32_t low,
                         uint32_t high) noexcept {
  static_assert(format::blockKeyLength == sizeof key);
  const uint8_t* const keys = view.section(Section::blockKeys).data();
  return low + countUpTo(keys + size_t{low} * format::blockKeyLength, high - low, key);
}

// Any term, in any version: by putting terms together and comparing them.
WordPostings findByCursor(const IndexView& view, const QueryWord& word) noexcept {
  WordPostings found;
  if (word.isPrefix) {
    const PrefixRange range = findPrefix(view, word.term);
    found.range = range.postings;
    found.beginsWithExactTerm = range.beginsWithExactTerm;
  } else {
    DictionaryCursor cursor(view);
    found.isOneList = true;
    found.beginsWithExactTerm = cursor.seek(word.term) && cursor.term() == word.term;
    found.range = found.beginsWithExactTerm ? cursor.postings() : ByteRange{};
  }
  found.kind = found.range.length() > 0 ? WordPostings::Kind::lists : WordPostings::Kind::none;
  return found;
}

bool findMerged(const IndexView& view, uint64_t key, WordPostings& found) noexcept {
  static_assert(format::mergedKeyLength == sizeof key);
  const uint32_t count = view.mergedCount();
  if (count == 0) {
    return false;
  }
  const uint32_t above =
      countUpTo(view.section(Section::mergedLists).data() + format::mergedHeaderLength, count, key);
  if (above == 0 || view.mergedKey(above - 1) != key) {
    return false;
  }
  const uint32_t low = above - 1;
  const uint64_t limit = view.section(Section::mergedLists).size();
  found.kind = WordPostings::Kind::merged;
  found.isOneList = true;
  found.range.begin = std::min<uint64_t>(view.mergedEntry(low, format::mergedOffsetAt), limit);
  // A list tells its own length; that of the next one is not needed.
  found.range.end = limit;
  if (low + 1 < count) {
    found.range.end = std::clamp<uint64_t>(view.mergedEntry(low + 1, format::mergedOffsetAt),
                                           found.range.begin, limit);
  }
  found.documentSum = view.mergedEntry(low, format::mergedDocumentSumAt);
  return true;
}

// Terms of eight bytes and more may have their key in common with the first terms of blocks, of
// which there may be several.
bool hasKeyOfBlock(const IndexView& view, const QueryWord& word, uint32_t blockAbove) noexcept {
  return word.term.size() >= sizeof(uint64_t) && blockAbove > 0 &&
         view.blockKey(blockAbove - 1) == word.firstKey;
}

WordPostings findInFields(const IndexView& view, const QueryWord& word) noexcept {
  WordPostings found;
  const uint32_t blockCount = view.blockCount();
  if (blockCount == 0) {
    return found;
  }
  if (word.isPrefix && word.term.size() >= format::headMask) {
    return findByCursor(view, word);
  }
  uint32_t block = firstBlockAbove(view, word.firstKey, 0, blockCount);
  if (hasKeyOfBlock(view, word, block)) {
    block = blockForTerm(view, word.term);
  } else {
    // A shorter one can only be the very term that has its key.
    block -= block > 0 ? 1 : 0;
  }
  BlockSearch search(view, block);
  if (!search.find(word.term)) {
    // The first term of the next block is the first that is not below.
    if (!word.isPrefix || ++block >= blockCount || view.blockKey(block) > word.lastKey) {
      return found;
    }
    search = BlockSearch(view, block);
    if (!search.find(word.term)) {
      return found;
    }
  }
  if (!search.startsWith() || (!word.isPrefix && !search.isExact())) {
    return found;
  }
  found.beginsWithExactTerm = search.isExact();
  found.range.begin = search.postingsBegin();
  if (!word.isPrefix) {
    found.range.end = search.postingsEnd();
    found.isOneList = true;
  } else {
    bool isWholeRest = false;
    found.range.end = search.prefixEnd(word.term.size(), isWholeRest);
    found.isOneList = found.range.end == search.postingsEnd();
    if (isWholeRest && block + 1 < blockCount && view.blockKey(block + 1) <= word.lastKey) {
      if (word.term.size() >= sizeof(uint64_t)) {
        return findByCursor(view, word);
      }
      // The blocks between begin with the prefix; the last of them may end with other terms.
      found.isOneList = false;
      const uint32_t last = firstBlockAbove(view, word.lastKey, block + 1, blockCount) - 1;
      found.range.end = BlockSearch(view, last).prefixEndFromStart(word.term.size());
    }
  }
  const uint64_t limit = view.section(Section::postings).size();
  found.range = {std::min(found.range.begin, limit), std::min(found.range.end, limit)};
  found.kind = WordPostings::Kind::lists;
  return found;
}

WordPostings findInEntries(const IndexView& view, const QueryWord& word) noexcept {
  WordPostings found;
  const uint32_t blockCount = view.blockCount();
  uint32_t block = firstBlockAbove(view, word.firstKey, 0, blockCount);
  if (hasKeyOfBlock(view, word, block)) {
    return findByCursor(view, word);
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

}  // namespace

WordPostings findWord(const IndexView& view, const QueryWord& word) noexcept {
  const auto find = [&] {
    return view.hasBlocksOfFields() ? findInFields(view, word) : findInEntries(view, word);
  };
  WordPostings found;
  if (word.mergedKey == 0) {
    return find();
  }
  // In a small book hardly any prefix has a list, and whether it may have one is known soon.
  const bool isSmall = view.blockCount() < fewestBlocksWithManyLists;
  if (isSmall) {
    found = find();
    if (found.range.length() < MergedListsBuilder::fewestPostings) {
      return found;
    }
  }
  WordPostings merged;
  return findMerged(view, word.mergedKey, merged) ? merged : isSmall ? found : find();
}

}  // namespace searchkit
