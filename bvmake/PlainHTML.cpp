#include "bvmake/PlainHTML.h"

#include <libxml/HTMLparser.h>

#include <algorithm>
#include <array>
#include <atomic>
#include <cstdlib>
#include <deque>
#include <string>
#include <utility>
#include <vector>

#include "bvmake/ASCII.h"
#include "bvmake/HTMLElements.h"
#include "bvmake/MarkupGuard.h"
#include "bvmake/UTF8.h"

namespace bvmake {

namespace {

constexpr size_t longestName = 30;
constexpr size_t deepest = 256;
constexpr size_t npos = std::string_view::npos;

/// Blanks as the parser knows them; there is no form feed in a plain page.
constexpr std::string_view blanks = " \t\n\r";

bool isDigit(char character) noexcept { return character >= '0' && character <= '9'; }

constexpr std::array<bool, 256> makeNameCharacters() {
  std::array<bool, 256> are{};
  for (size_t byte = 0; byte < are.size(); ++byte) {
    const auto character = static_cast<char>(byte);
    are[byte] = isLetter(character) || (character >= '0' && character <= '9') || character == '-' ||
                character == '_' || character == ':' || character == '.';
  }
  return are;
}

constexpr std::array<bool, 256> nameCharacters = makeNameCharacters();

bool isNameCharacter(char character) noexcept {
  return nameCharacters[static_cast<unsigned char>(character)];
}

bool isCharacter(UChar32 character) noexcept {
  return character == '\t' || character == '\n' || character == '\r' ||
         (character >= 0x20 && character < 0xD800) || (character >= 0xE000 && character < 0xFFFE) ||
         (character >= 0x10000 && character < 0x110000);
}

/// Whether the text is free of characters that the parser drops.
bool hasOnlyCharacters(std::string_view text) noexcept {
  size_t dropped = 0;
  for (const char character : text) {
    const auto byte = static_cast<unsigned char>(character);
    dropped += byte < 0x20 && byte != '\t' && byte != '\n' && byte != '\r' ? 1U : 0U;
  }
  return dropped == 0 && text.find("\xEF\xBF\xBE") == npos && text.find("\xEF\xBF\xBF") == npos;
}

/// Any string as the parser takes it.
const xmlChar* parserText(const char* text) noexcept {
  return reinterpret_cast<const xmlChar*>(text);
}

/// Whether an element ends where another begins. libxml2 is asked once for each pair.
bool endsBefore(const HTMLElement& open, const HTMLElement& next) {
  if (&open == &next) {
    return (open.traits & elementtraits::endsBeforeItself) != 0;
  }
  enum class Answer : uint8_t { unknown, no, yes };
  static std::array<std::atomic<Answer>, maximumElementCount * maximumElementCount> answers{};
  std::atomic<Answer>& known = answers[open.number * maximumElementCount + next.number];
  Answer answer = known.load(std::memory_order_relaxed);
  if (answer == Answer::unknown) {
    xmlNode node{};
    node.name = parserText(next.name);
    answer =
        htmlAutoCloseTag(nullptr, parserText(open.name), &node) != 0 ? Answer::yes : Answer::no;
    known.store(answer, std::memory_order_relaxed);
  }
  return answer == Answer::yes;
}

/// The character that a reference stands for whose text, between "&" and ";", is given; 0 for one
/// that is not plain.
UChar32 characterOfReference(std::string_view reference) {
  if (reference.empty() || reference.size() > 10) {
    return 0;
  }
  if (reference.front() != '#') {
    if (!std::all_of(reference.begin(), reference.end(),
                     [](char character) { return isLetter(character) || isDigit(character); })) {
      return 0;
    }
    const std::string name(reference);
    const htmlEntityDesc* const entity = htmlEntityLookup(parserText(name.c_str()));
    return entity == nullptr ? 0 : static_cast<UChar32>(entity->value);
  }
  const bool isHexadecimal = reference.size() > 1 && lowercased(reference[1]) == 'x';
  const std::string digits(reference.substr(isHexadecimal ? 2 : 1));
  char* end = nullptr;
  const auto value = digits.empty() || !(isDigit(digits[0]) || isLetter(digits[0]))
                         ? 0
                         : std::strtol(digits.c_str(), &end, isHexadecimal ? 16 : 10);
  const bool isWhole = end != nullptr && *end == '\0' && digits.find_first_of("xX") == npos;
  return isWhole && value <= 0x10FFFF && isCharacter(static_cast<UChar32>(value))
             ? static_cast<UChar32>(value)
             : 0;
}

/// Gives `sink` the text with its references replaced, in pieces; false where one is not plain.
template <typename Sink>
bool forEachPiece(std::string_view text, Sink sink) {
  size_t at = 0;
  for (size_t mark = text.find('&'); mark != npos; mark = text.find('&', at)) {
    sink(text.substr(at, mark - at));
    at = mark + 1;
    if (at < text.size() && isBlank(text[at])) {
      sink(text.substr(mark, 1));
      continue;
    }
    const size_t end = text.find(';', at);
    const UChar32 character = end == npos ? 0 : characterOfReference(text.substr(at, end - at));
    if (character <= 0) {
      return false;
    }
    sink(utf8OfCharacter(character));
    at = end + 1;
  }
  sink(text.substr(at));
  return true;
}

class PlainReader {
 public:
  PlainReader(std::string_view text, HTMLPageBuilder& builder) : _text(text), _builder(builder) {}

  bool read() {
    if (!hasOnlyCharacters(_text)) {
      return false;
    }
    bool isPlain = true;
    while (isPlain && _at < _text.size()) {
      isPlain = _text[_at] != '<' ? _readText() : _readMarkup();
    }
    return isPlain && _sawBody;
  }

 private:
  struct Open {
    /// As it is written.
    std::string_view name;
    /// Null for an element that nobody knows.
    const HTMLElement* element;
  };

  bool _isAt(char character) const { return _at < _text.size() && _text[_at] == character; }
  bool _startsWith(std::string_view start) const {
    return _text.compare(_at, start.size(), start) == 0;
  }
  void _skipBlanks() {
    while (_at < _text.size() && isBlank(_text[_at])) {
      ++_at;
    }
  }

  /// A name that begins here; empty where none does.
  std::string_view _readName(size_t longest) {
    const size_t begin = _at;
    if (begin < _text.size() && isLetter(_text[begin])) {
      while (_at < _text.size() && isNameCharacter(_text[_at])) {
        ++_at;
      }
    }
    return _at - begin <= longest ? _text.substr(begin, _at - begin) : std::string_view();
  }

  bool _readText() {
    const size_t end = std::min(_text.find('<', _at), _text.size());
    const std::string_view text = _text.substr(_at, end - _at);
    _at = end;
    // Outside of the body the parser would begin a paragraph for it.
    if (!_takesText() && text.find_first_not_of(blanks) != npos) {
      return false;
    }
    return forEachPiece(text, [this](std::string_view piece) { _builder.characters(piece); });
  }

  bool _takesText() const {
    return !_open.empty() && (_open.back().element == nullptr ||
                              (_open.back().element->traits & elementtraits::noText) == 0);
  }

  bool _readMarkup() {
    switch (_at + 1 < _text.size() ? _text[_at + 1] : '\0') {
      case '/':
        return _readEndTag();
      case '!':
        return _startsWith("<!--") ? _skipComment() : _skipDeclaration();
      case '?':
        return _skipDeclaration();
      default:
        return _readStartTag();
    }
  }

  bool _skipComment() {
    const size_t begin = _at + 4;
    const size_t end = _text.find("-->", begin);
    // What browsers take for the end of a comment, and the parser too.
    if (end == npos || _text[begin] == '>' || _text[begin] == '-' ||
        _text.substr(begin, end - begin).find("--!>") != npos) {
      return false;
    }
    _at = end + 3;
    return true;
  }

  /// What is before the page: a declaration of XML or of a document type.
  bool _skipDeclaration() {
    const size_t end = _text.find_first_of("<>", _at + 1);
    if (_sawRoot || end == npos || _text[end] != '>') {
      return false;
    }
    const std::string_view declaration = _text.substr(_at, end - _at);
    const bool isDocumentType = equalsIgnoringCase(declaration.substr(0, 9), "<!doctype");
    if ((!isDocumentType && declaration.substr(0, 6) != "<?xml ") ||
        // The end may be in a quoted name.
        std::count(declaration.begin(), declaration.end(), '"') % 2 != 0 ||
        declaration.find('\'') != npos) {
      return false;
    }
    _at = end + 1;
    return true;
  }

  bool _readStartTag() {
    ++_at;
    const std::string_view name = _readName(longestName);
    if (name.empty()) {
      return false;
    }
    const HTMLElement* const element = elementOfName(name);
    if (element == nullptr) {
      // libxml2 knows it all the same, and may have rules for it.
      if (htmlTagLookup(parserText(lowercased(name).c_str())) != nullptr) {
        return false;
      }
    } else {
      while (!_open.empty() && _open.back().element != nullptr &&
             endsBefore(*_open.back().element, *element)) {
        _end();
      }
    }
    const ElementTraits traits = element == nullptr ? 0 : element->traits;
    bool isEmpty = (traits & elementtraits::noContent) != 0;
    if (!_mayBegin(name) || !_readAttributes(isEmpty)) {
      return false;
    }
    _builder.startElement(traits, _attributes);
    if (isEmpty) {
      _builder.endElement();
      return true;
    }
    _open.push_back({name, element});
    return (traits & elementtraits::rawText) == 0 || _skipRawText(name);
  }

  /// Whether the element is where the parser neither leaves it out nor puts others around it.
  bool _mayBegin(std::string_view name) {
    if (equalsIgnoringCase(name, "html")) {
      return !std::exchange(_sawRoot, true);
    }
    if (equalsIgnoringCase(name, "head")) {
      return _open.size() == 1 && !_sawBody && !std::exchange(_sawHead, true);
    }
    if (equalsIgnoringCase(name, "body")) {
      return _open.size() == 1 && !std::exchange(_sawBody, true);
    }
    return _open.size() > 1 && _open.size() < deepest;
  }

  /// Moves behind the tag. `isEmpty` is set where the tag is an end tag, too.
  bool _readAttributes(bool& isEmpty) {
    _attributes.clear();
    _valueCount = 0;
    for (size_t count = 0; count <= maximumAttributeCount; ++count) {
      const size_t begin = _at;
      _skipBlanks();
      if (_isAt('>')) {
        ++_at;
        return true;
      }
      if (_isAt('/') && _startsWith("/>")) {
        _at += 2;
        isEmpty = true;
        return true;
      }
      if (_at == begin || !_readAttribute()) {
        return false;
      }
    }
    return false;
  }

  bool _readAttribute() {
    const std::string_view name = _readName(longestName);
    if (name.empty()) {
      return false;
    }
    const size_t end = _at;
    _skipBlanks();
    std::string_view value;
    if (_isAt('=')) {
      ++_at;
      _skipBlanks();
      if (!_readValue(value)) {
        return false;
      }
    } else {
      _at = end;
    }
    if (!isAttributeRead(name)) {
      return true;
    }
    if (value.find('&') != npos) {
      // The deque keeps what the views look at where it is.
      std::string& decoded =
          _values.size() == _valueCount ? _values.emplace_back() : _values[_valueCount];
      ++_valueCount;
      decoded.clear();
      if (!forEachPiece(value, [&](std::string_view piece) { decoded += piece; })) {
        return false;
      }
      value = decoded;
    }
    _attributes.push_back({name, value});
    return true;
  }

  bool _readValue(std::string_view& value) {
    if (_at == _text.size()) {
      return false;
    }
    const char quote = _text[_at];
    if (quote == '"' || quote == '\'') {
      const size_t end = _text.find(quote, ++_at);
      if (end == npos) {
        return false;
      }
      value = _text.substr(_at, end - _at);
      _at = end + 1;
      return true;
    }
    const size_t end = std::min(_text.find_first_of(" \t\n\r>", _at), _text.size());
    value = _text.substr(_at, end - _at);
    _at = end;
    return !value.empty() && value.find_first_of("<\"'=`/&") == npos;
  }

  /// Scripts and styles, up to their end tags.
  bool _skipRawText(std::string_view name) {
    for (size_t end = _text.find("</", _at); end != npos; end = _text.find("</", end + 2)) {
      if (equalsIgnoringCase(_text.substr(end + 2, name.size()), name)) {
        _at = end;
        return true;
      }
    }
    return false;
  }

  bool _readEndTag() {
    _at += 2;
    const std::string_view name = _readName(longestName);
    _skipBlanks();
    if (name.empty() || !_isAt('>')) {
      return false;
    }
    ++_at;
    while (!_open.empty() && !equalsIgnoringCase(_open.back().name, name)) {
      const HTMLElement* const element = _open.back().element;
      if (element == nullptr || (element->traits & elementtraits::endsWithParent) == 0) {
        return false;
      }
      _end();
    }
    if (_open.empty()) {
      return false;
    }
    _end();
    return true;
  }

  void _end() {
    _builder.endElement();
    _open.pop_back();
  }

  const std::string_view _text;
  HTMLPageBuilder& _builder;
  size_t _at = 0;
  bool _sawRoot = false;
  bool _sawHead = false;
  bool _sawBody = false;
  std::vector<Open> _open;
  /// Of the tag that is being read.
  std::vector<HTMLAttribute> _attributes;
  std::deque<std::string> _values;
  size_t _valueCount = 0;
};

}  // namespace

bool readPlainHTML(std::string_view text, HTMLPageBuilder& builder) {
  return PlainReader(text, builder).read();
}

}  // namespace bvmake
