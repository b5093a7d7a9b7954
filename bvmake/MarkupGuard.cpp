#include "bvmake/MarkupGuard.h"

#include <fmt/format.h>

#include <algorithm>
#include <string_view>

#include "bvmake/ASCII.h"

namespace bvmake {

namespace {

constexpr size_t attributeNamePiece = 100;

/// A cursor over the text that stops at each piece of markup.
class Walker {
 public:
  Walker(std::string& text, Markup markup) : _text(text), _markup(markup) {}

  std::optional<std::string> walk() {
    while (true) {
      const size_t next = _text.find('<', _at);
      if (next == std::string::npos || next + 1 >= _text.size()) {
        return std::nullopt;
      }
      _at = next;
      if (_isAt("<!--")) {
        _skipComment();
      } else if (_isAt("<![")) {
        _walkMarkedSection();
      } else if (_startsTag(_text[next + 1])) {
        if (_walkTag() > maximumAttributeCount) {
          return fmt::format("a tag with more than {} attributes", maximumAttributeCount);
        }
      } else {
        ++_at;
      }
    }
  }

 private:
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
  void _skipComment() {
    size_t end = _text.find("--", _at + 4);
    while (end != std::string::npos) {
      const size_t mark = end + 2;
      if (mark < _text.size() && _text[mark] == '>') {
        _at = mark + 1;
        return;
      }
      if (_markup == Markup::html && std::string_view(_text).substr(mark, 2) == "!>") {
        _at = mark + 2;
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
    const size_t nameStart = ++_at;
    while (_at < _text.size() && !isBlank(_text[_at]) && _text[_at] != '>' && _text[_at] != '/') {
      ++_at;
    }
    const std::string name = lowercased(std::string_view(_text).substr(nameStart, _at - nameStart));
    size_t attributes = 0;
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
        // The HTML parser cuts long names into several.
        attributes += nameLength % attributeNamePiece == 0 ? 1 : 0;
        ++nameLength;
      }
    }
    const bool closed = _at > 0 && _text[_at - 1] == '/';
    if (_markup == Markup::html && !closed && (name == "script" || name == "style")) {
      _skipRawText(name);
    }
    return attributes;
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
  size_t _at = 0;
};

}  // namespace

std::optional<std::string> tameMarkup(std::string& text, Markup markup) {
  return Walker(text, markup).walk();
}

}  // namespace bvmake
