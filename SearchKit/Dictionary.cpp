#include "SearchKit/Dictionary.h"

#include <algorithm>
#include <cstring>
#include <string>

#include "SearchKit/SKIndex.h"

namespace searchkit {
namespace {

using format::Section;

ByteRange nextRange(uint64_t begin, uint32_t length, size_t sectionLength) noexcept {
  const uint64_t limit = sectionLength;
  return {std::min(begin, limit), std::min(begin + length, limit)};
}

// The first term of a block stands there in full. Broken entries read as empty.
std::string_view firstTerm(const IndexView& view, uint32_t block) noexcept {
  const std::span<const uint8_t> dictionary = view.section(Section::dictionary);
  const size_t at = view.blockOffset(block, format::blockDictionaryAt);
  if (view.hasBlocksOfFields()) {
    DictionaryBlock fields;
    size_t shared = 0;
    size_t added = 0;
    if (!fields.read(dictionary, at, view.entriesInBlock(block))) {
      return {};
    }
    const uint8_t* text = fields.texts();
    return fields.readHead(0, text, shared, added)
               ? std::string_view(reinterpret_cast<const char*>(text), added)
               : std::string_view();
  }
  if (at + 2 > dictionary.size() || dictionary.size() - at - 2 < dictionary[at + 1]) {
    return {};
  }
  return {reinterpret_cast<const char*>(dictionary.data()) + at + 2, dictionary[at + 1]};
}

}  // namespace

// Blocks are told apart by their keys; only where several keys are equal are the terms themselves
// compared.
uint32_t blockForTerm(const IndexView& view, std::string_view term) noexcept {
  const uint64_t key = format::blockKey(term);
  uint32_t low = 0;
  uint32_t high = view.blockCount();
  while (low < high) {
    const uint32_t middle = low + (high - low) / 2;
    const uint64_t blockKey = view.blockKey(middle);
    if (blockKey < key || (blockKey == key && firstTerm(view, middle) <= term)) {
      low = middle + 1;
    } else {
      high = middle;
    }
  }
  return low == 0 ? 0 : low - 1;
}

bool DictionaryCursor::seek(std::string_view term) noexcept {
  _termsPerBlock = _view->termsPerBlock();
  if (_view->blockCount() == 0 || !_enterBlock(blockForTerm(*_view, term))) {
    return _fail();
  }
  while (this->term() < term) {
    if (!next()) {
      return false;
    }
  }
  return true;
}

bool DictionaryCursor::next() noexcept {
  if (!_isValid) {
    return false;
  }
  if (_entry + 1 < _entriesInBlock) {
    ++_entry;
    return _readEntry();
  }
  if (_block + 1 >= _view->blockCount()) {
    return _fail();
  }
  return _enterBlock(_block + 1);
}

bool DictionaryCursor::_enterBlock(uint32_t block) noexcept {
  const std::span<const uint8_t> dictionary = _view->section(Section::dictionary);
  const size_t begin = _view->blockOffset(block, format::blockDictionaryAt);
  if (begin >= dictionary.size()) {
    return _fail();
  }
  _at = dictionary.data() + begin;
  _end = dictionary.data() + dictionary.size();
  _block = block;
  _entry = 0;
  _entriesInBlock = _view->entriesInBlock(block);
  if (_view->hasBlocksOfFields()) {
    if (!_fields.read(dictionary, begin, _entriesInBlock)) {
      return _fail();
    }
    _at = _fields.texts();
    _longPositions = _fields.longPositions();
  }
  _termLength = 0;
  const uint64_t postings = _view->blockOffset(block, format::blockPostingsAt);
  const uint64_t positions = _view->blockOffset(block, format::blockPositionsAt);
  _postings = {postings, postings};
  _positions = {positions, positions};
  return _readEntry();
}

bool DictionaryCursor::_readEntry() noexcept {
  size_t shared = 0;
  size_t added = 0;
  uint32_t postingsLength = 0;
  uint32_t positionsLength = 0;
  if (_view->hasBlocksOfFields()) {
    if (!_fields.readHead(_entry, _at, shared, added) || !_readText(shared, added) ||
        !_fields.readPositionsLength(_entry, _longPositions, positionsLength)) {
      return _fail();
    }
    postingsLength = _fields.postingsLength(_entry);
  } else {
    if (_end - _at < 2) {
      return _fail();
    }
    shared = _at[0];
    added = _at[1];
    _at += 2;
    if (!_readText(shared, added) || !format::readNumber(_at, _end, postingsLength) ||
        !format::readNumber(_at, _end, positionsLength)) {
      return _fail();
    }
  }
  _postings = nextRange(_postings.end, postingsLength, _view->section(Section::postings).size());
  _positions =
      nextRange(_positions.end, positionsLength, _view->section(Section::positions).size());
  _isValid = true;
  return true;
}

bool DictionaryCursor::_readText(size_t shared, size_t added) noexcept {
  if (shared > _termLength || shared + added > format::maximumTermBytes ||
      static_cast<size_t>(_end - _at) < added) {
    return false;
  }
  std::memcpy(_term + shared, _at, added);
  _at += added;
  _termLength = shared + added;
  return true;
}

PrefixRange findPrefix(const IndexView& view, std::string_view prefix) noexcept {
  PrefixRange range;
  DictionaryCursor cursor(view);
  if (!cursor.seek(prefix) || !cursor.term().starts_with(prefix)) {
    return range;
  }
  range.beginsWithExactTerm = cursor.term() == prefix;
  range.postings = cursor.postings();
  // No UTF-8 has the byte 0xFF, so this is above all terms with the prefix and below all others.
  // A prefix too long for room to be added has only itself.
  char above[format::maximumTermBytes + 1];
  if (prefix.size() > format::maximumTermBytes) {
    return range;
  }
  std::copy(prefix.begin(), prefix.end(), above);
  above[prefix.size()] = '\xFF';
  range.postings.end = cursor.seek({above, prefix.size() + 1})
                           ? cursor.postings().begin
                           : view.section(Section::postings).size();
  return range;
}

}  // namespace searchkit
