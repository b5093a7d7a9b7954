#include "bvmake/TextRun.h"

#include <unicode/uchar.h>

#include "bvmake/ASCII.h"
#include "bvmake/UTF8.h"
#include "platform/Strings.h"

namespace bvmake {

namespace {

constexpr UChar32 softHyphen = 0xAD;
constexpr UChar32 byteOrderMark = 0xFEFF;

bool isASCIIBlank(unsigned char byte) { return byte == ' ' || (byte >= 0x09 && byte <= 0x0D); }

bool isVisibleASCII(char character) { return character > ' ' && character < 0x7F; }

}  // namespace

void TextRun::append(std::string_view text) {
  size_t at = 0;
  while (at < text.size()) {
    const auto byte = static_cast<unsigned char>(text[at]);
    if (isASCIIBlank(byte)) {
      appendBlank();
      ++at;
      continue;
    }
    size_t end = at;
    if (byte >= 0x80) {
      const UChar32 character = nextCharacter(text, end);
      if (character == softHyphen || character == byteOrderMark) {
        at = end;
        continue;
      }
      if (character >= 0 && platform::isWhitespaceOrNewline(static_cast<char32_t>(character))) {
        appendBlank();
        at = end;
        continue;
      }
    } else {
      // As much as may be taken over as it stands: words with one blank between them.
      while (end < text.size() &&
             (isVisibleASCII(text[end]) ||
              (text[end] == ' ' && end + 1 < text.size() && isVisibleASCII(text[end + 1])))) {
        ++end;
      }
      // A control character, which belongs to the words.
      end += end == at ? 1 : 0;
    }
    if (_blankPending) {
      _text += ' ';
      _blankPending = false;
    }
    _text.append(text, at, end - at);
    at = end;
  }
}

void TextRun::truncate(size_t length) {
  if (length < _text.size()) {
    _text.resize(length);
    while (!_text.empty() && _text.back() == ' ') {
      _text.pop_back();
    }
    _blankPending = !_text.empty();
  }
}

std::string TextRun::take() {
  _blankPending = false;
  // What the run has grown to serves the next text, too.
  std::string text = _text;
  _text.clear();
  return text;
}

std::string collapsedText(std::string_view text) {
  TextRun run;
  run.append(text);
  return run.take();
}

bool hasLetterOrDigit(std::string_view text) noexcept {
  size_t at = 0;
  while (at < text.size()) {
    if (isVisibleASCII(text[at])) {
      if (isLetter(text[at]) || (text[at] >= '0' && text[at] <= '9')) {
        return true;
      }
      ++at;
      continue;
    }
    const UChar32 character = nextCharacter(text, at);
    if (character >= 0 && u_isalnum(character) != 0) {
      return true;
    }
  }
  return false;
}

}  // namespace bvmake
