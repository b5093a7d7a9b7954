#include "SearchKit/Tokenizer.h"

#include <unicode/utf8.h>

#include <algorithm>
#include <array>
#include <cstring>

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

// Quotation marks, dashes, dots and spaces of the general punctuation, which stand in much text
// that is otherwise ASCII and separate whatever is beside them: U+2000 to U+200B, U+2010 to
// U+2029, U+202F to U+205F. What lies between those is invisible and has no say.
bool isPunctuation(const uint8_t* at, const uint8_t* end) noexcept {
  if (end - at < 3 || at[0] != 0xE2 || !isTrail(at[2])) {
    return false;
  }
  if (at[1] == 0x80) {
    return at[2] <= 0x8B || (at[2] >= 0x90 && at[2] <= 0xA9) || at[2] >= 0xAF;
  }
  return at[1] == 0x81 && at[2] <= 0x9F;
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
    if (_isFull || _length + length > sizeof _text) {
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
  char _text[format::maximumTermBytes];
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
  TermBuffer term;
  while (at < end) {
    if (bytes.kind[*at] == ByteKind::separator) {
      ++at;
      continue;
    }
    const uint8_t* const begin = at;
    bool isWord = false;
    bool needsContext = false;
    term.clear();
    while (at < end) {
      const ByteKind kind = bytes.kind[*at];
      if (kind == ByteKind::letter) {
        term.append(bytes.folded[*at++]);
        isWord = true;
        continue;
      }
      if (kind == ByteKind::separator || isPunctuation(at, end)) {
        break;
      }
      if (*at < 0xC2 || *at > 0xDF || end - at < 2 || !isTrail(at[1])) {
        needsContext = true;
        break;
      }
      const Pair& pair = pairAt(at[0], at[1]);
      if (pair.kind == Pair::Kind::separator) {
        break;
      }
      if (pair.kind == Pair::Kind::needsContext) {
        needsContext = true;
        break;
      }
      if (static_cast<uint8_t>(pair.text[0]) < 0x80) {
        // Letter by letter: a term is cut at the same place whichever way it was folded.
        for (size_t i = 0; i < pair.length; ++i) {
          term.append(pair.text[i]);
        }
      } else {
        term.append(pair.text, pair.length);
      }
      isWord = true;
      at += 2;
    }
    if (needsContext) {
      at = chunkEnd(begin, at, end);
      _tokenizeByLibrary(viewOf(begin, at), sink);
    } else {
      if (isWord) {
        sink(term.view(), isShort(term.view(), false));
      }
      // Over what ended the word: a separator of one, two or three bytes.
      if (at < end) {
        at += *at < 0x80 ? 1 : *at < 0xE0 ? 2 : 3;
      }
    }
  }
}

void Tokenizer::_tokenizeByLibrary(std::string_view text, Receiver sink) {
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
