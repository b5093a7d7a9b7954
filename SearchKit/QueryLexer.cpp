#include "SearchKit/QueryLexer.h"

#include <unicode/utf8.h>

#include <cstddef>

#include "platform/Strings.h"

namespace searchkit {
namespace {

using Kind = QueryToken::Kind;

enum class Role : uint8_t { blank, quote, sign, conjunction, disjunction, open, close, other };

struct Character {
  Role role = Role::blank;
  size_t length = 0;
};

Role roleOf(UChar32 character) {
  switch (character) {
    case '"':
    case 0x00AB:
    case 0x00BB:
    case 0x201C:
    case 0x201D:
    case 0x201E:
    case 0x201F:
    case 0xFF02:
      return Role::quote;
    case '+':
    case '-':
    case '!':
      return Role::sign;
    case '&':
      return Role::conjunction;
    case '|':
      return Role::disjunction;
    case '(':
      return Role::open;
    case ')':
      return Role::close;
    default:
      return platform::isWhitespaceOrNewline(static_cast<char32_t>(character)) ? Role::blank
                                                                               : Role::other;
  }
}

class Lexer {
 public:
  explicit Lexer(std::string_view text) : _text(text) {}

  std::vector<QueryToken> tokens() {
    while (_at < _text.size()) {
      const Character character = _characterAt(_at);
      switch (character.role) {
        case Role::blank:
          _skip(character);
          break;
        case Role::quote:
          _readPhrase(character);
          break;
        case Role::sign:
          _readSigns();
          break;
        case Role::conjunction:
          _readOperator(Kind::conjunction, character);
          break;
        case Role::disjunction:
          _readOperator(Kind::disjunction, character);
          break;
        case Role::open:
          _readOperator(Kind::open, character);
          break;
        case Role::close:
          _readOperator(Kind::close, character);
          break;
        case Role::other:
          _readWord();
          break;
      }
    }
    return std::move(_tokens);
  }

 private:
  // What stands at the end is as good as a blank.
  Character _characterAt(size_t at) const {
    if (at >= _text.size()) {
      return {};
    }
    UChar32 character;
    const auto* const bytes = reinterpret_cast<const uint8_t*>(_text.data());
    auto next = static_cast<int64_t>(at);
    U8_NEXT(bytes, next, static_cast<int64_t>(_text.size()), character);
    return {character < 0 ? Role::other : roleOf(character), static_cast<size_t>(next) - at};
  }

  void _skip(Character character) {
    _at += character.length;
    _isAfterBlank = character.role == Role::blank || character.role == Role::open;
  }

  void _readOperator(Kind kind, Character character) {
    _tokens.push_back({kind, {}, false});
    _skip(character);
    // What follows an operator begins a term as what follows a blank does.
    _isAfterBlank = kind != Kind::close;
  }

  void _readPhrase(Character quote) {
    const size_t begin = _at + quote.length;
    size_t end = begin;
    while (end < _text.size()) {
      const Character character = _characterAt(end);
      if (character.role == Role::quote) {
        break;
      }
      end += character.length;
    }
    if (end == _text.size() && !_isAfterBlank && _at > 0) {
      // An inch sign, or the rest of a phrase whose beginning was deleted.
      _skip(quote);
      return;
    }
    QueryToken token{Kind::phrase, _text.substr(begin, end - begin), false};
    _at = end;
    if (_at < _text.size()) {
      _at += _characterAt(_at).length;
    }
    if (_at < _text.size() && _text[_at] == '*') {
      token.isOpenAtEnd = true;
      ++_at;
    }
    _tokens.push_back(token);
    _isAfterBlank = false;
  }

  void _readSigns() {
    const size_t begin = _at;
    while (_at < _text.size() && _characterAt(_at).role == Role::sign) {
      ++_at;
    }
    const std::string_view signs = _text.substr(begin, _at - begin);
    const Role next = _characterAt(_at).role;
    _isAfterBlank = true;
    if (next == Role::other || next == Role::open || next == Role::quote) {
      if (!signs.ends_with("--")) {
        _tokens.push_back({signs.back() == '+' ? Kind::plus : Kind::minus, {}, false});
      }
    } else if (next == Role::blank && signs.back() == '!') {
      _tokens.push_back({Kind::minus, {}, false});
    }
  }

  void _readWord() {
    const size_t begin = _at;
    while (_at < _text.size()) {
      const Character character = _characterAt(_at);
      if (character.role != Role::other && character.role != Role::sign) {
        break;
      }
      _at += character.length;
    }
    _tokens.push_back({Kind::word, _text.substr(begin, _at - begin), false});
    _isAfterBlank = false;
  }

  std::string_view _text;
  size_t _at = 0;
  bool _isAfterBlank = true;
  std::vector<QueryToken> _tokens;
};

}  // namespace

std::vector<QueryToken> queryTokens(std::string_view text) { return Lexer(text).tokens(); }

}  // namespace searchkit
