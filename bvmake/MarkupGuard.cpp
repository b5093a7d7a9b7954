#include "bvmake/MarkupGuard.h"

#include <fmt/format.h>

#include <algorithm>
#include <array>
#include <cstring>
#include <string_view>

#include "bvmake/ASCII.h"
#include "bvmake/HTMLElements.h"

namespace bvmake {

namespace {

constexpr size_t attributeNamePiece = 100;

/// Elements that only mark the text in them: no other element ends where they begin, and a reader
/// of pages finds their text where they stand.
constexpr std::array<std::string_view, 23> textMarks = {
    "span",  "em",  "strong", "code", "tt",  "b",      "i",       "u",
    "var",   "kbd", "samp",   "cite", "dfn", "abbr",   "acronym", "big",
    "small", "sub", "sup",    "font", "s",   "strike", "q"};
constexpr size_t noMark = textMarks.size();

size_t markOfName(std::string_view name) {
  const auto found = std::find_if(textMarks.begin(), textMarks.end(), [&](std::string_view mark) {
    return equalsIgnoringCase(mark, name);
  });
  return static_cast<size_t>(found - textMarks.begin());
}

bool isAttributeNameCharacter(char character) {
  return isLetter(character) || (character >= '0' && character <= '9') || character == '-' ||
         character == '_' || character == ':' || character == '.';
}

/// Whether anybody asks for the attribute.
bool isRead(std::string_view name, std::string_view value) {
  switch (name.size()) {
    case 2:
      return equalsIgnoringCase(name, "id");
    case 4:
      return equalsIgnoringCase(name, "name") || equalsIgnoringCase(name, "role") ||
             equalsIgnoringCase(name, "lang") || equalsIgnoringCase(name, "open");
    case 5:
      // A character of the value may be written as an entity.
      return equalsIgnoringCase(name, "style") &&
             (value.find('&') != std::string_view::npos || styleHides(value));
    case 6:
      return equalsIgnoringCase(name, "hidden");
    case 7:
      return equalsIgnoringCase(name, "content");
    case 8:
      return equalsIgnoringCase(name, "xml:lang");
    case 11:
      return equalsIgnoringCase(name, "aria-hidden");
    default:
      return false;
  }
}

/// A cursor over the text that stops at each piece of markup. What is left out is written over by
/// what follows it.
class Walker {
 public:
  Walker(std::string& text, Markup markup, bool thins)
      // To the parser a form feed is no blank.
      : _text(text), _markup(markup), _thins(thins && text.find('\f') == std::string::npos) {}

  std::optional<std::string> walk() {
    while (true) {
      const size_t next = _text.find('<', _at);
      if (next == std::string::npos || next + 1 >= _text.size()) {
        _copyUpTo(_text.size());
        _text.resize(_written);
        return std::nullopt;
      }
      if (_thins) {
        _leaveOutBlanks(_at, next);
      }
      _at = next;
      if (_isAt("<!--")) {
        _walkComment();
      } else if (_isAt("<![")) {
        _openMarks = 0;
        _walkMarkedSection();
      } else if (_startsTag(_text[next + 1])) {
        if (_walkTag() > maximumAttributeCount) {
          return fmt::format("a tag with more than {} attributes", maximumAttributeCount);
        }
      } else if (_thins && _text[next + 1] == '/') {
        _walkEndTag();
      } else {
        _openMarks = 0;
        _thins = _thins && _isPlainSign(next + 1);
        ++_at;
      }
    }
  }

 private:
  /// A start tag of one of textMarks behind which there is text only, so far.
  struct OpenMark {
    size_t mark;
    /// In what is written.
    size_t begin;
    size_t length;
  };

  /// Marks around more text than this stay: leaving them out moves the text.
  static constexpr size_t longestMarked = 512;

  void _copyUpTo(size_t end) {
    if (_written != _copied) {
      std::memmove(_text.data() + _written, _text.data() + _copied, end - _copied);
    }
    _written += end - _copied;
    _copied = end;
  }

  void _leaveOut(size_t from, size_t to) {
    _copyUpTo(from);
    _copied = to;
  }

  /// Whether the parser takes a '<' before this, which begins no tag, for text or for a declaration
  /// that ends at the next '>'.
  bool _isPlainSign(size_t at) const {
    const char character = _text[at];
    if (character == '!' || character == '?') {
      const size_t end = _text.find_first_of("<>", at);
      if (end == std::string::npos || _text[end] != '>') {
        return false;
      }
      // The end may be in a quoted name.
      const std::string_view declaration = std::string_view(_text).substr(at, end - at);
      return std::count(declaration.begin(), declaration.end(), '"') % 2 == 0 &&
             declaration.find('\'') == std::string_view::npos;
    }
    return isBlank(character) || character == '=' || character == '>' ||
           (character >= '0' && character <= '9');
  }

  /// Of blanks right before `end`, and not before `from`, one stays.
  void _leaveOutBlanks(size_t from, size_t end) {
    size_t begin = end;
    while (begin > from && isBlank(_text[begin - 1])) {
      --begin;
    }
    if (end - begin > 1) {
      _leaveOut(begin + 1, end);
    }
  }

  bool _startsTag(char character) const {
    return isLetter(character) || character == '_' || character == ':' ||
           (_markup == Markup::xml && static_cast<unsigned char>(character) >= 0x80);
  }

  bool _isAt(std::string_view token) const {
    return std::string_view(_text).substr(_at, token.size()) == token;
  }

  void _skipPast(std::string_view token, size_t from) {
    const size_t found = _text.find(token, _at + from);
    _at = found == std::string::npos ? _text.size() : found + token.size();
  }

  /// A comment ends at "-->", and for the HTML parser at "--!>" too.
  void _walkComment() {
    const size_t begin = _at;
    size_t end = _text.find("--", _at + 4);
    while (end != std::string::npos) {
      const size_t mark = end + 2;
      if (mark < _text.size() && _text[mark] == '>') {
        _at = mark + 1;
        // "<!-->" is a whole comment for the parser.
        if (_thins && _text[begin + 4] != '>' && _text[begin + 4] != '-') {
          _leaveOut(begin, _at);
        }
        return;
      }
      if (_markup == Markup::html && std::string_view(_text).substr(mark, 2) == "!>") {
        _at = mark + 2;
        _openMarks = 0;
        return;
      }
      end = _text.find("--", end + 1);
    }
    _at = _text.size();
  }

  void _blankOut(size_t from, size_t to) {
    if (_markup == Markup::html) {
      std::fill(_text.begin() + static_cast<std::ptrdiff_t>(from),
                _text.begin() + static_cast<std::ptrdiff_t>(to), ' ');
    }
  }

  void _walkMarkedSection() {
    const size_t start = _at;
    if (_isAt("<![CDATA[")) {
      _skipPast("]]>", 9);
      _blankOut(start, start + 9);
      if (_at - start >= 12) {
        _blankOut(_at - 3, _at);
      }
      // Within the section a '<' is text; in HTML it must not look like a tag.
      if (_markup == Markup::html) {
        std::replace(_text.begin() + static_cast<std::ptrdiff_t>(start),
                     _text.begin() + static_cast<std::ptrdiff_t>(_at), '<', ' ');
      }
      return;
    }
    _skipPast(">", 3);
    _blankOut(start, _at);
  }

  /// Moves behind the tag, and behind the content where that is no markup; returns the number of
  /// attributes.
  size_t _walkTag() {
    const size_t begin = _at;
    const size_t nameStart = ++_at;
    while (_at < _text.size() && !isBlank(_text[_at]) && _text[_at] != '>' && _text[_at] != '/') {
      ++_at;
    }
    const auto name = [&, length = _at - nameStart] {
      return std::string_view(_text).substr(nameStart, length);
    };
    const std::string_view rawName = _rawName(name());
    size_t attributes = 0;
    // Whatever is not by the rules: from there on it is left to the parser what it makes of it.
    _thins =
        _thins && isLetter(_text[nameStart]) &&
        std::all_of(_text.begin() + static_cast<std::ptrdiff_t>(nameStart),
                    _text.begin() + static_cast<std::ptrdiff_t>(_at), isAttributeNameCharacter);
    if (_thins) {
      const size_t mark = _inBody ? markOfName(name()) : noMark;
      const bool isBody = equalsIgnoringCase(name(), "body");
      _inBody = isBody || (_inBody && !_beginsAnotherBody(name()));
      bool anyIsRead = false;
      // What stands before the tag is written first, so that one knows where the tag comes to be.
      _copyUpTo(begin);
      const size_t written = _written;
      attributes = _walkPlainAttributes(anyIsRead);
      if (mark != noMark && !anyIsRead && _at < _text.size() && _text[_at] == '>') {
        _openMark({mark, written, textMarks[mark].size() + 2});
        return attributes;
      }
      _openMarks = 0;
    }
    size_t nameLength = 0;
    while (_at < _text.size() && _text[_at] != '>') {
      const char character = _text[_at];
      ++_at;
      if (isBlank(character) || character == '/') {
        nameLength = 0;
      } else if (character == '=') {
        _skipValue();
        nameLength = 0;
      } else {
        _thins = _thins && isAttributeNameCharacter(character);
        // The HTML parser cuts long names into several.
        attributes += nameLength % attributeNamePiece == 0 ? 1 : 0;
        ++nameLength;
      }
    }
    const bool closed = _at > 0 && _text[_at - 1] == '/';
    if (!rawName.empty() && !closed) {
      const size_t content = _at + 1;
      _skipRawText(rawName);
      _thins = _thins && _endsAt(_at + rawName.size());
      if (_thins && content < _at - 2) {
        _leaveOut(content, _at - 2);
      }
    }
    return attributes;
  }

  /// Of an element whose content is no markup, its name.
  std::string_view _rawName(std::string_view name) const {
    for (const std::string_view raw : {"script", "style"}) {
      if (_markup == Markup::html && equalsIgnoringCase(name, raw)) {
        return raw;
      }
    }
    return {};
  }

  static bool _beginsAnotherBody(std::string_view name) {
    return equalsIgnoringCase(name, "html") || equalsIgnoringCase(name, "head") ||
           equalsIgnoringCase(name, "frameset") || equalsIgnoringCase(name, "noframes");
  }

  /// Whether an end tag has no more than its end here.
  bool _endsAt(size_t at) const {
    const size_t close = _text.find_first_not_of(" \t\n\r", at);
    return close != std::string::npos && _text[close] == '>';
  }

  void _openMark(const OpenMark& mark) {
    if (_openMarks == _marks.size()) {
      _openMarks = 0;
    }
    _marks[_openMarks++] = mark;
  }

  void _walkEndTag() {
    size_t end = _at + 2;
    while (end < _text.size() && isAttributeNameCharacter(_text[end])) {
      ++end;
    }
    const std::string_view name = std::string_view(_text).substr(_at + 2, end - _at - 2);
    _thins = !name.empty() && isLetter(name.front()) && _endsAt(end);
    if (_openMarks > 0 && end < _text.size() && _text[end] == '>' &&
        equalsIgnoringCase(name, textMarks[_marks[_openMarks - 1].mark])) {
      const OpenMark mark = _marks[--_openMarks];
      _copyUpTo(_at);
      const size_t marked = mark.begin + mark.length;
      if (_written - marked <= longestMarked) {
        std::memmove(_text.data() + mark.begin, _text.data() + marked, _written - marked);
        _written -= mark.length;
        _at = end + 1;
        _copied = _at;
        return;
      }
    }
    _openMarks = 0;
    if (_beginsAnotherBody(name) || equalsIgnoringCase(name, "body")) {
      _inBody = false;
    }
    ++_at;
  }

  /// Goes over the attributes of a tag as far as they are plain: a name, an equals sign and a value
  /// in quotes, and blanks around them. Returns how many these are.
  size_t _walkPlainAttributes(bool& anyIsRead) {
    for (size_t count = 0;; ++count) {
      size_t begin = _at;
      while (begin < _text.size() && isBlank(_text[begin])) {
        ++begin;
      }
      if (begin < _text.size() && _text[begin] == '>') {
        if (begin > _at) {
          _leaveOut(_at, begin);
          _at = begin;
        }
        return count;
      }
      size_t end = begin;
      while (end < _text.size() && isAttributeNameCharacter(_text[end])) {
        ++end;
      }
      if (begin == _at || end == begin || end - begin >= attributeNamePiece ||
          !isLetter(_text[begin]) || end + 1 >= _text.size() || _text[end] != '=' ||
          (_text[end + 1] != '"' && _text[end + 1] != '\'')) {
        return count;
      }
      const size_t quote = _text.find(_text[end + 1], end + 2);
      if (quote == std::string::npos || quote + 1 == _text.size() ||
          !(isBlank(_text[quote + 1]) || _text[quote + 1] == '>' || _text[quote + 1] == '/')) {
        return count;
      }
      const std::string_view all = _text;
      if (isRead(all.substr(begin, end - begin), all.substr(end + 2, quote - end - 2))) {
        anyIsRead = true;
      } else {
        _leaveOut(_at, quote + 1);
      }
      _at = quote + 1;
    }
  }

  void _skipValue() {
    while (_at < _text.size() && isBlank(_text[_at])) {
      ++_at;
    }
    if (_at < _text.size() && (_text[_at] == '"' || _text[_at] == '\'')) {
      const size_t end = _text.find(_text[_at], _at + 1);
      _at = end == std::string::npos ? _text.size() : end + 1;
      return;
    }
    while (_at < _text.size() && !isBlank(_text[_at]) && _text[_at] != '>') {
      _thins = _thins && _text[_at] != '<' && _text[_at] != '"' && _text[_at] != '\'';
      ++_at;
    }
  }

  void _skipRawText(std::string_view name) {
    while (_at < _text.size()) {
      const size_t end = _text.find("</", _at);
      if (end == std::string::npos) {
        _at = _text.size();
        return;
      }
      _at = end + 2;
      if (equalsIgnoringCase(std::string_view(_text).substr(_at, name.size()), name)) {
        return;
      }
    }
  }

  std::string& _text;
  Markup _markup;
  /// Until something comes that is not by the rules.
  bool _thins;
  size_t _at = 0;
  /// All before is as it stays.
  size_t _written = 0;
  /// What is written has what it should of all before this place.
  size_t _copied = 0;
  /// In the body of the page, where no text and no textMarks end another element.
  bool _inBody = false;
  std::array<OpenMark, 8> _marks{};
  size_t _openMarks = 0;
};

}  // namespace

std::optional<std::string> tameMarkup(std::string& text, Markup markup) {
  return Walker(text, markup, false).walk();
}

std::optional<std::string> tameAndThinHTML(std::string& text) {
  return Walker(text, Markup::html, true).walk();
}

}  // namespace bvmake
