#include "SearchKit/IndexCheck.h"

#include <fmt/format.h>

#include <algorithm>
#include <cstdint>
#include <span>
#include <string_view>
#include <utility>

#include "SearchKit/DictionaryBlock.h"
#include "SearchKit/IndexFormat.h"
#include "SearchKit/IndexReader.h"
#include "SearchKit/PackedPositions.h"
#include "SearchKit/PostingsCursor.h"
#include "SearchKit/SKIndex.h"
#include "SearchKit/Scoring.h"
#include "SearchKit/WordLookup.h"
#include "platform/Strings.h"

namespace searchkit {
namespace {

using format::Section;

class Problems {
 public:
  explicit Problems(size_t maximumCount) : _maximumCount(maximumCount) {}

  template <typename... Arguments>
  void add(fmt::format_string<Arguments...> format, Arguments&&... arguments) {
    if (!isFull()) {
      _lines.push_back(fmt::format(format, std::forward<Arguments>(arguments)...));
    }
  }
  bool isFull() const noexcept { return _lines.size() >= _maximumCount; }
  std::vector<std::string> take() { return std::move(_lines); }

 private:
  size_t _maximumCount;
  std::vector<std::string> _lines;
};

// Bytes of a section that are read from front to back.
struct Bytes {
  explicit Bytes(std::span<const uint8_t> section)
      : begin(section.data()), at(begin), end(begin + section.size()) {}

  size_t offset() const noexcept { return static_cast<size_t>(at - begin); }
  size_t left() const noexcept { return static_cast<size_t>(end - at); }
  bool number(uint32_t& value) noexcept { return format::readNumber(at, end, value); }

  const uint8_t* begin;
  const uint8_t* at;
  const uint8_t* end;
};

class Check {
 public:
  Check(const SKIndex& index, Problems& problems)
      : _index(index),
        _view(index.view()),
        _problems(problems),
        _dictionary(_view.section(Section::dictionary)),
        _postings(_view.section(Section::postings)),
        _positions(_view.section(Section::positions)),
        _words(_view.documentCount()) {}

  void run() {
    _checkSums();
    _checkDocuments();
    if (_checkTerms()) {
      _checkEnds();
      _checkLengths();
      _checkMergedLists();
    }
  }

 private:
  void _checkSums() {
    const IndexSummary summary = indexSummary(_index);
    bool sectionsAreIntact = true;
    for (const SectionInfo& section : summary.sections) {
      sectionsAreIntact = sectionsAreIntact && section.isIntact;
      if (!section.isIntact) {
        _problems.add("the checksum of section {} ({}) is wrong", section.id, section.name);
      }
    }
    if (sectionsAreIntact && !summary.isIntact) {
      _problems.add("the checksum of the header is wrong");
    }
  }

  void _checkDocuments() {
    std::string_view before;
    for (uint32_t id = 0; id < _view.documentCount() && !_problems.isFull(); ++id) {
      const auto texts = _view.documentTexts(id);
      if (!texts) {
        _problems.add("page {}: its texts lie outside the stored text", id);
        continue;
      }
      if (!texts->path.starts_with('/')) {
        _problems.add("page {}: its path does not begin with a slash", id);
      }
      if (id > 0 && texts->path <= before) {
        _problems.add("page {}: its path is not above that of the page before", id);
      }
      before = texts->path;
      if (texts->title && !platform::isValidUTF8(*texts->title)) {
        _problems.add("page {}: its title is not UTF-8", id);
      }
      if (texts->abstract && !platform::isValidUTF8(*texts->abstract)) {
        _problems.add("page {}: its abstract is not UTF-8", id);
      }
    }
  }

  // False where the bytes are broken so that what follows means nothing.
  bool _checkTerms() {
    std::string term;
    for (uint32_t number = 0; number < _view.termCount() && !_problems.isFull(); ++number) {
      const bool beginsBlock = number % _view.termsPerBlock() == 0;
      if (beginsBlock) {
        _checkBlock(number / _view.termsPerBlock());
      }
      uint32_t postingsLength = 0;
      uint32_t positionsLength = 0;
      if (!_readEntry(number, term, postingsLength, positionsLength)) {
        _problems.add("term {}: its entry in the dictionary is broken", number + 1);
        return false;
      }
      if (beginsBlock && _view.blockKey(number / _view.termsPerBlock()) != format::blockKey(term)) {
        _problems.add("term {}: the key of its block is wrong", number + 1);
      }
      if (postingsLength > _postings.left() || positionsLength > _positions.left()) {
        _problems.add("term {}: its postings or positions lie outside their section", number + 1);
        return false;
      }
      _checkLists(number, postingsLength, positionsLength);
    }
    return !_problems.isFull();
  }

  void _checkBlock(uint32_t block) {
    if (_view.blockOffset(block, format::blockDictionaryAt) != _dictionary.offset() ||
        _view.blockOffset(block, format::blockPostingsAt) != _postings.offset() ||
        _view.blockOffset(block, format::blockPositionsAt) != _positions.offset()) {
      _problems.add("block {}: its offsets are wrong", block);
    }
  }

  bool _readEntry(uint32_t number, std::string& term, uint32_t& postingsLength,
                  uint32_t& positionsLength) {
    const uint32_t entry = number % _view.termsPerBlock();
    size_t shared = 0;
    size_t added = 0;
    if (!_view.hasBlocksOfFields()) {
      if (_dictionary.left() < 2) {
        return false;
      }
      shared = *_dictionary.at++;
      added = *_dictionary.at++;
      return _readText(number, shared, added, term) && _dictionary.number(postingsLength) &&
             _dictionary.number(positionsLength);
    }
    if (entry == 0) {
      if (!_fields.read(_view.section(Section::dictionary), _dictionary.offset(),
                        _view.entriesInBlock(number / _view.termsPerBlock()))) {
        return false;
      }
      _dictionary.at = _fields.texts();
      _longPositions = _fields.longPositions();
    }
    if (!_fields.readHead(entry, _dictionary.at, shared, added) ||
        !_isShortestHead(_fields.head(entry), shared, added) ||
        !_readText(number, shared, added, term) ||
        !_fields.readPositionsLength(entry, _longPositions, positionsLength)) {
      return false;
    }
    postingsLength = _fields.postingsLength(entry);
    // The last of the longer lengths ends where the texts begin.
    return entry + 1 < _fields.count() || _longPositions == _fields.texts();
  }

  // Numbers that fit the head are in it.
  static bool _isShortestHead(uint8_t head, size_t shared, size_t added) {
    return ((head & format::headMask) != format::headMask || shared >= format::headMask) &&
           (head >> format::headBits != format::headMask || added >= format::headMask);
  }

  bool _readText(uint32_t number, size_t shared, size_t length, std::string& term) {
    const bool beginsBlock = number % _view.termsPerBlock() == 0;
    if (length > _dictionary.left() || shared > (beginsBlock ? 0 : term.size()) ||
        shared + length == 0 || shared + length > format::maximumTermBytes) {
      return false;
    }
    std::string next = term.substr(0, shared);
    next.append(reinterpret_cast<const char*>(_dictionary.at), length);
    _dictionary.at += length;
    if (number > 0 && next <= term) {
      _problems.add("term {}: it is not above the term before", number + 1);
    }
    if (!platform::isValidUTF8(next)) {
      _problems.add("term {}: it is not UTF-8", number + 1);
    }
    term = std::move(next);
    return true;
  }

  void _checkLists(uint32_t number, uint32_t postingsLength, uint32_t positionsLength) {
    Bytes postings({_postings.at, postingsLength});
    Bytes positions({_positions.at, positionsLength});
    BitReader packed(positions.at, positions.end);
    _postings.at += postingsLength;
    _positions.at += positionsLength;
    uint32_t count = 0;
    bool isSound = postings.number(count) && count > 0;
    uint64_t next = 0;
    for (uint32_t i = 0; isSound && i < count; ++i) {
      uint32_t weight = 0;
      isSound = _readPosting(postings, next, weight) && weight <= format::maximumWeight;
      if (isSound) {
        uint64_t& words = _words[static_cast<size_t>(next - 1)];
        isSound = _view.hasPackedPositions()
                      ? _checkPackedPositions(
                            packed, _view.documentLength(static_cast<uint32_t>(next - 1)), words)
                      : _checkPositions(positions, words);
      }
    }
    const bool isAtEnd = _view.hasPackedPositions() ? packed.isAtEnd() : positions.left() == 0;
    if (!isSound || postings.left() != 0 || !isAtEnd) {
      _problems.add("term {}: its postings or positions are broken", number + 1);
      _wordsAreKnown = false;
    }
  }

  // Raises `next` to the number above the document's.
  bool _readPosting(Bytes& postings, uint64_t& next, uint32_t& weight) const {
    const uint32_t mask = (uint32_t{1} << _view.weightBits()) - 1;
    uint32_t head = 0;
    if (!postings.number(head) || next + (head >> _view.weightBits()) >= _view.documentCount()) {
      return false;
    }
    next += (head >> _view.weightBits()) + 1;
    weight = (head & mask) + 1;
    return weight <= mask || (postings.number(weight) && weight > mask);
  }

  static bool _checkPackedPositions(BitReader& positions, uint32_t documentLength,
                                    uint64_t& words) {
    uint32_t count = 0;
    uint32_t length = 0;
    if (!positions.readCount(count) ||
        (count >= fewestPositionsWithLength && !positions.readCount(length))) {
      return false;
    }
    const uint64_t begin = positions.position();
    const uint32_t lowBits = positionBits(documentLength, count);
    uint64_t position = 0;
    for (uint32_t i = 0; i < count; ++i) {
      uint32_t distance = 0;
      if (!positions.readDistance(lowBits, distance)) {
        return false;
      }
      position += uint64_t{distance} + (i > 0 ? 1 : 0);
      if (position > UINT32_MAX) {
        return false;
      }
      ++words;
    }
    return length == 0 || positions.position() - begin == length;
  }

  // The positions of one document, which are counted.
  static bool _checkPositions(Bytes& positions, uint64_t& words) {
    uint32_t length = 0;
    if (!positions.number(length) || length == 0 || length > positions.left()) {
      return false;
    }
    Bytes list({positions.at, length});
    positions.at += length;
    uint64_t position = 0;
    for (bool isFirst = true; list.left() > 0; isFirst = false) {
      uint32_t difference = 0;
      if (!list.number(difference) || (difference == 0 && !isFirst)) {
        return false;
      }
      position += difference;
      if (position > UINT32_MAX) {
        return false;
      }
      ++words;
    }
    return true;
  }

  void _checkEnds() {
    if (_dictionary.left() != 0 || _postings.left() != 0 || _positions.left() != 0) {
      _problems.add("dictionary, postings or positions go on behind the last term");
    }
  }

  void _checkLengths() {
    uint64_t sum = 0;
    for (uint32_t id = 0; id < _view.documentCount(); ++id) {
      sum += _view.documentLength(id);
      if (_wordsAreKnown && _view.documentLength(id) != _words[id]) {
        _problems.add("page {}: it has {} words, but its length says {}", id, _words[id],
                      _view.documentLength(id));
      }
    }
    if (sum != _view.wordCount()) {
      _problems.add("the pages have {} words, but the header says {}", sum, _view.wordCount());
    }
  }

  // Each must say what the terms' own lists say.
  void _checkMergedLists() {
    const std::span<const uint8_t> section = _view.section(Section::mergedLists);
    if (_view.mergedCount() == 0 && !section.empty()) {
      _problems.add("the tables of the merged lists do not fit their section");
      return;
    }
    std::vector<uint64_t> frequencies(_view.documentCount());
    for (uint32_t list = 0; list < _view.mergedCount() && !_problems.isFull(); ++list) {
      const size_t begin = _view.mergedEntry(list, format::mergedOffsetAt);
      const bool isLast = list + 1 == _view.mergedCount();
      const size_t end =
          isLast ? section.size() : _view.mergedEntry(list + 1, format::mergedOffsetAt);
      const bool isInOrder = list == 0 || _view.mergedKey(list) > _view.mergedKey(list - 1);
      if (!isInOrder || begin > end || end > section.size() ||
          !_isMergedOfItsTerms(list, Bytes(section.subspan(begin, end - begin)), frequencies)) {
        _problems.add("merged list {}: it is not that of its terms", list + 1);
      }
    }
  }

  bool _isMergedOfItsTerms(uint32_t list, Bytes bytes, std::vector<uint64_t>& frequencies) const {
    QueryWord word;
    word.isPrefix = true;
    for (uint64_t key = _view.mergedKey(list); key != 0; key <<= 8) {
      word.term += static_cast<char>(key >> 56);
    }
    word.firstKey = format::blockKey(word.term);
    word.lastKey =
        word.firstKey | (word.term.size() < 8 ? ~uint64_t{0} >> word.term.size() * 8 : 0);
    const WordPostings terms = findWord(_view, word);
    PostingsCursor cursor(_view, terms.range);
    uint64_t factor = terms.beginsWithExactTerm ? static_cast<uint64_t>(exactFactor) : 1;
    uint64_t documentSum = 0;
    for (; cursor.beginList(); factor = 1) {
      documentSum += cursor.listDocumentCount();
      while (cursor.next()) {
        frequencies[cursor.document()] += factor * cursor.weight();
      }
    }
    uint32_t count = 0;
    bool isSound =
        documentSum == _view.mergedEntry(list, format::mergedDocumentSumAt) && bytes.number(count);
    uint64_t next = 0;
    for (uint32_t i = 0; isSound && i < count; ++i) {
      uint32_t weight = 0;
      isSound = _readPosting(bytes, next, weight) &&
                std::exchange(frequencies[static_cast<size_t>(next - 1)], 0) == weight;
    }
    const auto isZero = [](uint64_t frequency) { return frequency == 0; };
    isSound =
        isSound && bytes.left() == 0 && std::all_of(frequencies.begin(), frequencies.end(), isZero);
    std::fill(frequencies.begin(), frequencies.end(), 0);
    return isSound;
  }

  const SKIndex& _index;
  const IndexView& _view;
  Problems& _problems;
  Bytes _dictionary;
  Bytes _postings;
  Bytes _positions;
  // By document, how many positions its terms have.
  std::vector<uint64_t> _words;
  // Of the current block of the dictionary.
  DictionaryBlock _fields;
  const uint8_t* _longPositions = nullptr;
  bool _wordsAreKnown = true;
};

}  // namespace

std::vector<std::string> indexProblems(const SKIndex& index, size_t maximumCount) {
  Problems problems(maximumCount);
  Check(index, problems).run();
  return problems.take();
}

}  // namespace searchkit
