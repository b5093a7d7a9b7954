#include "SearchKit/Tokenizer.h"

#include <unicode/utf8.h>

#include <algorithm>
#include <array>
#include <bit>
#include <cstring>

#include "SearchKit/ASCIIBlock.h"
#include "SearchKit/IndexFormat.h"

namespace searchkit {
namespace {

enum class ByteKind : uint8_t { separator, letter, beyondASCII };

struct ByteTable {
  std::array<ByteKind, 256> kind{};
  std::array<char, 256> folded{};
};

constexpr ByteTable makeByteTable() {
  ByteTable table;
  for (size_t byte = 0; byte < 256; ++byte) {
    const bool upper = byte >= 'A' && byte <= 'Z';
    const bool lower = byte >= 'a' && byte <= 'z';
    const bool digit = byte >= '0' && byte <= '9';
    table.kind[byte] = byte >= 0x80                ? ByteKind::beyondASCII
                       : (upper || lower || digit) ? ByteKind::letter
                                                   : ByteKind::separator;
    table.folded[byte] = static_cast<char>(upper ? byte + ('a' - 'A') : byte);
  }
  return table;
}

constexpr ByteTable bytes = makeByteTable();

// What a character of two bytes folds to when no mark follows it: letters of ASCII, or one letter.
// Folding looks beyond such a character for marks only, so that a table of them is exact.
struct Pair {
  enum class Kind : uint8_t { needsContext, separator, word };
  Kind kind = Kind::needsContext;
  uint8_t length = 0;
  char text[6] = {};
};

constexpr size_t firstPair = 0x80;
constexpr size_t pairCount = 0x800 - firstPair;

Pair makePair(char32_t character) {
  Pair pair;
  const char text[2] = {static_cast<char>(0xC0 | (character >> 6)),
                        static_cast<char>(0x80 | (character & 0x3F))};
  std::u16string folded;
  foldText({text, 2}, folded);
  std::vector<Run> runs;
  findRuns(folded, runs);
  if (folded.empty() || characterClass(character) == CharacterClass::mark) {
    return pair;
  }
  if (runs.empty()) {
    pair.kind = Pair::Kind::separator;
    return pair;
  }
  const std::string term = termFromFolded(folded);
  const bool isASCII = term.size() == folded.size();
  if (runs.size() == 1 && runs[0].end - runs[0].begin == folded.size() && !runs[0].unspaced &&
      (isASCII || folded.size() == 1) && term.size() <= sizeof pair.text) {
    pair.kind = Pair::Kind::word;
    pair.length = static_cast<uint8_t>(term.size());
    std::memcpy(pair.text, term.data(), term.size());
  }
  return pair;
}

const Pair& pairAt(uint8_t lead, uint8_t trail) {
  static const std::vector<Pair> pairs = [] {
    std::vector<Pair> made;
    made.reserve(pairCount);
    for (size_t i = 0; i < pairCount; ++i) {
      made.push_back(makePair(static_cast<char32_t>(firstPair + i)));
    }
    return made;
  }();
  return pairs[((static_cast<size_t>(lead & 0x1F) << 6) | (trail & 0x3F)) - firstPair];
}

bool isTrail(uint8_t byte) noexcept { return (byte & 0xC0) == 0x80; }

// The character of three bytes at a place; 0 when there is none.
char32_t characterOfThree(const uint8_t* at, const uint8_t* end) noexcept {
  if (end - at < 3 || (at[0] & 0xF0) != 0xE0 || !isTrail(at[1]) || !isTrail(at[2])) {
    return 0;
  }
  return static_cast<char32_t>((at[0] & 0x0F) << 12 | (at[1] & 0x3F) << 6 | (at[2] & 0x3F));
}

bool isWithin(char32_t character, char32_t first, char32_t last) noexcept {
  return character >= first && character <= last;
}

// Characters of three bytes that separate whatever is beside them: quotation marks, dashes, dots
// and spaces of the general punctuation (what lies between those is invisible and has no say), and
// the punctuation of Chinese and Japanese with the wide forms of that of ASCII.
bool isPunctuation(char32_t character) noexcept {
  if (character < 0x3000) {
    return isWithin(character, 0x2000, 0x200B) || isWithin(character, 0x2010, 0x2029) ||
           isWithin(character, 0x202F, 0x205F);
  }
  return isWithin(character, 0x3000, 0x3003) || isWithin(character, 0x3008, 0x3011) ||
         isWithin(character, 0x3014, 0x301B) || character == 0x30FB ||
         isWithin(character, 0xFF01, 0xFF0F) || isWithin(character, 0xFF1A, 0xFF20) ||
         isWithin(character, 0xFF3B, 0xFF40) || isWithin(character, 0xFF5B, 0xFF5E);
}

// Letters of three bytes that fold to themselves unless a mark or a conjoining letter follows, and
// that only a dictionary tells apart: Han, kana with its long sound, Hangul syllables.
bool isPlainUnspaced(char32_t character) noexcept {
  return isWithin(character, 0x4E00, 0x9FEF) || isWithin(character, 0x3041, 0x3096) ||
         isWithin(character, 0x30A1, 0x30FA) || character == 0x30FC || character == 0x3005 ||
         isWithin(character, 0xAC00, 0xD7A3);
}

// Only what is between separators is folded together, and no more than this of it: text without
// any blanks or punctuation of ASCII may be megabytes long.
constexpr size_t longestChunk = 16384;

const uint8_t* chunkEnd(const uint8_t* begin, const uint8_t* at, const uint8_t* end) noexcept {
  while (at < end && bytes.kind[*at] != ByteKind::separator) {
    if (static_cast<size_t>(at - begin) >= longestChunk && !isTrail(*at)) {
      break;
    }
    ++at;
  }
  return at;
}

size_t characterCount(std::string_view text) noexcept {
  return static_cast<size_t>(std::count_if(
      text.begin(), text.end(), [](char byte) { return !isTrail(static_cast<uint8_t>(byte)); }));
}

std::string_view viewOf(const uint8_t* begin, const uint8_t* end) noexcept {
  return {reinterpret_cast<const char*>(begin), static_cast<size_t>(end - begin)};
}

// A term under construction: what does not fit any more is cut off.
class TermBuffer {
 public:
  void clear() noexcept {
    _length = 0;
    _isFull = false;
  }
  void append(char byte) noexcept { append(&byte, 1); }
  void append(const char* text, size_t length) noexcept {
    if (_isFull || _length + length > format::maximumTermBytes) {
      _isFull = true;
      return;
    }
    std::memcpy(_text + _length, text, length);
    _length += length;
  }
  std::string_view view() const noexcept { return {_text, _length}; }

 private:
  size_t _length = 0;
  bool _isFull = false;
  char _text[format::maximumTermBytes + Tokenizer::readableLength];
};

void appendUTF8(std::u16string_view text, TermBuffer& term) noexcept {
  for (size_t at = 0; at < text.size(); ++at) {
    auto character = static_cast<char32_t>(text[at]);
    if ((character & 0xFC00) == 0xD800 && at + 1 < text.size()) {
      character = 0x10000 + ((character & 0x3FF) << 10) + (text[++at] & 0x3FFU);
    }
    char bytesOfCharacter[4];
    int32_t length = 0;
    U8_APPEND_UNSAFE(bytesOfCharacter, length, character);
    term.append(bytesOfCharacter, static_cast<size_t>(length));
  }
}

}  // namespace

std::string termFromFolded(std::u16string_view folded) {
  TermBuffer term;
  appendUTF8(folded, term);
  return std::string(term.view());
}

bool Tokenizer::isShort(std::string_view term, bool unspaced) const noexcept {
  return !unspaced && _minimumTermLength > 1 &&
         (term.size() < _minimumTermLength || characterCount(term) < _minimumTermLength);
}

void Tokenizer::_tokenize(std::string_view text, Receiver sink) {
  const auto* at = reinterpret_cast<const uint8_t*>(text.data());
  const auto* const end = at + text.size();
  while (at < end) {
    if (*at < 0x80) {
      at = _takeASCII(at, end, sink);
    }
    if (at < end) {
      at = isPlainUnspaced(characterOfThree(at, end)) ? _takeUnspaced(at, end, sink)
                                                      : _takeWord(at, end, sink);
    }
  }
}

// The words from `at` on up to one that other characters have part in, or that is very long.
// Returns where that begins; or where something beyond ASCII stands by itself, or the end.
const uint8_t* Tokenizer::_takeASCII(const uint8_t* at, const uint8_t* end, const Receiver& sink) {
  ASCIIBlock block;
  while (at < end) {
    const size_t length = std::min(static_cast<size_t>(end - at), ASCIIBlock::capacity);
    block.read(at, length);
    const auto limit = std::min(static_cast<size_t>(std::countr_zero(block.beyondASCII)), length);
    const bool endsText = limit == static_cast<size_t>(end - at);
    size_t next = limit;
    for (uint64_t letters = block.letters; letters != 0;) {
      const auto begin = static_cast<size_t>(std::countr_zero(letters));
      // The addition carries through the first run of ones, and out of one that ends the block.
      const uint64_t carried = letters + (uint64_t{1} << begin);
      const auto wordEnd = static_cast<size_t>(std::countr_zero(carried));
      if (begin >= limit) {
        break;
      }
      if (wordEnd >= limit && !endsText) {
        next = begin;
        break;
      }
      const std::string_view term(block.folded + begin, wordEnd - begin);
      sink(term, isShort(term, false));
      letters &= carried;
    }
    at += next;
    if (limit < length || next == 0) {
      return at;
    }
  }
  return at;
}

// One word, or one separator, of any characters.
const uint8_t* Tokenizer::_takeWord(const uint8_t* at, const uint8_t* end, const Receiver& sink) {
  TermBuffer term;
  const uint8_t* const begin = at;
  bool isWord = false;
  bool isBeforeRun = false;
  while (at < end) {
    const ByteKind kind = bytes.kind[*at];
    if (kind == ByteKind::letter) {
      term.append(bytes.folded[*at++]);
      isWord = true;
      continue;
    }
    if (kind == ByteKind::separator) {
      break;
    }
    if (const char32_t character = characterOfThree(at, end); character != 0) {
      isBeforeRun = isPlainUnspaced(character);
      if (isBeforeRun || isPunctuation(character)) {
        break;
      }
    }
    const bool isPair = *at >= 0xC2 && *at <= 0xDF && end - at >= 2 && isTrail(at[1]);
    const Pair* const pair = isPair ? &pairAt(at[0], at[1]) : nullptr;
    if (pair == nullptr || pair->kind == Pair::Kind::needsContext) {
      at = chunkEnd(begin, at, end);
      _tokenizeByLibrary(viewOf(begin, at), sink);
      return at;
    }
    if (pair->kind == Pair::Kind::separator) {
      break;
    }
    if (static_cast<uint8_t>(pair->text[0]) < 0x80) {
      // Letter by letter: a term is cut at the same place whichever way it was folded.
      for (size_t i = 0; i < pair->length; ++i) {
        term.append(pair->text[i]);
      }
    } else {
      term.append(pair->text, pair->length);
    }
    isWord = true;
    at += 2;
  }
  if (isWord) {
    sink(term.view(), isShort(term.view(), false));
  }
  // Over what ended the word: a separator of one, two or three bytes.
  if (at < end && !isBeforeRun) {
    at += *at < 0x80 ? 1 : *at < 0xE0 ? 2 : 3;
  }
  return at;
}

// A run of letters without blanks, all of which fold to themselves.
const uint8_t* Tokenizer::_takeUnspaced(const uint8_t* at, const uint8_t* end,
                                        const Receiver& sink) {
  const uint8_t* const begin = at;
  const size_t longest = longestDictionaryPiece * 3;
  while (at < end && static_cast<size_t>(at - begin) < longest &&
         isPlainUnspaced(characterOfThree(at, end))) {
    at += 3;
  }
  const char32_t next = characterOfThree(at, end);
  if (at < end && *at >= 0x80 && !isPunctuation(next) && !isPlainUnspaced(next)) {
    const bool isPair = *at >= 0xC2 && *at <= 0xDF && end - at >= 2 && isTrail(at[1]);
    if (!isPair || pairAt(at[0], at[1]).kind == Pair::Kind::needsContext) {
      at = chunkEnd(begin, at, end);
      _tokenizeByLibrary(viewOf(begin, at), sink);
      return at;
    }
  }
  _splitUnspaced(viewOf(begin, at), sink);
  return at;
}

void Tokenizer::_splitUnspaced(std::string_view run, const Receiver& sink) {
  TermBuffer term;
  const auto take = [&](size_t begin, size_t end) {
    term.clear();
    for (; begin < end; begin += 3) {
      term.append(run.data() + begin, 3);
    }
    sink(term.view(), false);
  };
  size_t begin = 0;
  if (const std::span<const uint8_t> known = _knownRuns.find(run); !known.empty()) {
    for (const size_t end : known) {
      take(begin, end);
      begin = end;
    }
    return;
  }
  _folded.clear();
  for (size_t at = 0; at < run.size(); at += 3) {
    const auto* const character = reinterpret_cast<const uint8_t*>(run.data()) + at;
    _folded.push_back(static_cast<char16_t>(characterOfThree(character, character + 3)));
  }
  _wordEnds.clear();
  findWordEnds(_folded, _wordEnds);
  for (size_t& end : _wordEnds) {
    end *= 3;
  }
  _knownRuns.put(run, _wordEnds);
  for (const size_t end : _wordEnds) {
    take(begin, end);
    begin = end;
  }
}

void Tokenizer::_tokenizeByLibrary(std::string_view text, const Receiver& sink) {
  _folded.clear();
  _runs.clear();
  foldText(text, _folded);
  findRuns(_folded, _runs);
  TermBuffer term;
  for (const Run& run : _runs) {
    const std::u16string_view letters =
        std::u16string_view(_folded).substr(run.begin, run.end - run.begin);
    _wordEnds.clear();
    if (run.unspaced) {
      findWordEnds(letters, _wordEnds);
    } else {
      _wordEnds.push_back(letters.size());
    }
    size_t begin = 0;
    for (const size_t wordEnd : _wordEnds) {
      term.clear();
      appendUTF8(letters.substr(begin, wordEnd - begin), term);
      sink(term.view(), isShort(term.view(), run.unspaced));
      begin = wordEnd;
    }
  }
}

}  // namespace searchkit
