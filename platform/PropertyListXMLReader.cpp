#include <fmt/format.h>
#include <libxml/parser.h>
#include <libxml/parserInternals.h>

#include <exception>
#include <memory>
#include <optional>
#include <utility>

#include "platform/Exception.h"
#include "platform/PropertyList.h"
#include "platform/PropertyListForms.h"
#include "platform/PropertyListXMLText.h"

namespace platform::propertylist {
namespace {

std::string_view viewOf(const xmlChar* text) { return reinterpret_cast<const char*>(text); }

// Builds the value from the parser's events. The events arrive through C, so that nothing may be
// thrown across them: the first failure is kept and the parser stopped.
class XMLReader {
 public:
  Value read(std::string_view text, bool ignoreDeclaredEncoding);

 private:
  enum class Element { plist, array, dictionary, key, leaf };

  struct Open {
    Element element;
    std::string name;
    Value::Array elements;
    Value::Dictionary entries;
    std::optional<std::string> key;
  };

  [[noreturn]] static void _fail(const std::string& reason);
  template <typename Body>
  void _guarded(Body body) noexcept;
  int _line() const;

  void _startDocument() const;
  void _startElement(std::string_view name);
  void _endElement();
  void _characters(std::string_view text);
  void _add(Value value);
  static Value _dictionary(Value::Dictionary entries);
  static xmlSAXHandler _handlers();
  static void _parserError(void* reader, xmlErrorPtr error);

  xmlParserCtxtPtr _parser = nullptr;
  std::vector<Open> _open;
  size_t _depth = 0;
  // The text of the key or leaf that is open.
  std::string _text;
  std::optional<Value> _root;
  std::exception_ptr _failure;
};

void XMLReader::_fail(const std::string& reason) {
  throw Exception(inconsistentArchiveException, reason);
}

int XMLReader::_line() const { return _parser->input ? _parser->input->line : 0; }

template <typename Body>
void XMLReader::_guarded(Body body) noexcept {
  if (_failure) {
    return;
  }
  try {
    try {
      body();
    } catch (const Exception& exception) {
      _fail(fmt::format("{} on line {}", exception.reason(), _line()));
    }
  } catch (...) {
    _failure = std::current_exception();
    xmlStopParser(_parser);
  }
}

// The parser would follow whatever encoding is declared, also one in which the check of the markup
// has seen something else than the parser does.
void XMLReader::_startDocument() const {
  // The one is set when the parser has switched, the other when it had no need to.
  const xmlChar* declared = _parser->input->encoding ? _parser->input->encoding : _parser->encoding;
  if (!declared) {
    return;
  }
  std::string name(viewOf(declared));
  for (char& character : name) {
    character =
        character >= 'a' && character <= 'z' ? static_cast<char>(character - 'a' + 'A') : character;
  }
  if (name != "UTF-8" && name != "UTF8" && name != "US-ASCII" && name != "ASCII") {
    _fail(fmt::format("encoding {} is not supported", quoted(viewOf(declared))));
  }
}

void XMLReader::_startElement(std::string_view name) {
  if (_open.empty()) {
    if (name != "plist") {
      _fail(fmt::format("the outermost element is {}, not \"plist\"", quoted(name)));
    }
    _open.push_back({Element::plist, "plist", {}, {}, {}});
    return;
  }
  const Open& parent = _open.back();
  if (parent.element == Element::key || parent.element == Element::leaf) {
    _fail(fmt::format("element {} inside {}", quoted(name), quoted(parent.name)));
  }
  const bool wantsKey = parent.element == Element::dictionary && !parent.key;
  if (name == "key") {
    if (!wantsKey) {
      _fail(parent.element == Element::dictionary
                ? fmt::format("key {} has no value", quoted(*parent.key))
                : "a key outside a dictionary");
    }
  } else if (wantsKey) {
    _fail(fmt::format("a value without a key: {}", quoted(name)));
  }
  if (parent.element == Element::plist && _root) {
    _fail("more than one value");
  }

  Element element = Element::leaf;
  if (name == "key") {
    element = Element::key;
  } else if (name == "array") {
    element = Element::array;
  } else if (name == "dict") {
    element = Element::dictionary;
  } else if (!isLeafElement(name)) {
    _fail(fmt::format("unknown element {}", quoted(name)));
  }
  if (element == Element::array || element == Element::dictionary) {
    if (_depth == propertyListMaximumDepth) {
      _fail(fmt::format("containers nest deeper than {}", propertyListMaximumDepth));
    }
    ++_depth;
  }
  _text.clear();
  _open.push_back({element, std::string(name), {}, {}, {}});
}

void XMLReader::_endElement() {
  Open closed = std::move(_open.back());
  _open.pop_back();
  switch (closed.element) {
    case Element::plist:
      if (!_root) {
        _fail("a property list without a value");
      }
      break;
    case Element::array:
      --_depth;
      _add(Value(std::move(closed.elements)));
      break;
    case Element::dictionary:
      --_depth;
      if (closed.key) {
        _fail(fmt::format("key {} has no value", quoted(*closed.key)));
      }
      _add(_dictionary(std::move(closed.entries)));
      break;
    case Element::key:
      _open.back().key = std::exchange(_text, {});
      break;
    case Element::leaf:
      _add(leafFromText(closed.name, std::exchange(_text, {})));
      break;
  }
}

void XMLReader::_characters(std::string_view text) {
  const bool inText = !_open.empty() && (_open.back().element == Element::key ||
                                         _open.back().element == Element::leaf);
  if (inText) {
    _text += text;
    return;
  }
  if (text.find_first_not_of(" \t\r\n") != std::string_view::npos) {
    _fail(fmt::format("text {} between elements", quoted(text)));
  }
}

void XMLReader::_add(Value value) {
  Open& parent = _open.back();
  switch (parent.element) {
    case Element::array:
      parent.elements.push_back(std::move(value));
      break;
    case Element::dictionary:
      parent.entries.insert_or_assign(*std::exchange(parent.key, std::nullopt), std::move(value));
      break;
    default:
      _root = std::move(value);
      break;
  }
}

Value XMLReader::_dictionary(Value::Dictionary entries) {
  if (entries.size() == 1 && entries.begin()->first == "CF$UID") {
    const Value& index = entries.begin()->second;
    if (index.kind() == Value::Kind::integer && index.integerValue() >= 0) {
      return UID{index.unsignedValue()};
    }
  }
  return Value(std::move(entries));
}

void XMLReader::_parserError(void* reader, xmlErrorPtr error) {
  if (error->level < XML_ERR_ERROR) {
    return;
  }
  auto& self = *static_cast<XMLReader*>(reader);
  self._guarded([&] {
    std::string_view message = error->message ? error->message : "malformed XML";
    while (!message.empty() && message.back() == '\n') {
      message.remove_suffix(1);
    }
    _fail(fmt::format("malformed XML: {}", quoted(message)));
  });
}

xmlSAXHandler XMLReader::_handlers() {
  xmlSAXHandler handlers{};
  handlers.initialized = XML_SAX2_MAGIC;
  handlers.startDocument = [](void* reader) {
    auto& self = *static_cast<XMLReader*>(reader);
    self._guarded([&] { self._startDocument(); });
  };
  handlers.startElementNs = [](void* reader, const xmlChar* name, const xmlChar* prefix,
                               const xmlChar*, int, const xmlChar**, int, int, const xmlChar**) {
    auto& self = *static_cast<XMLReader*>(reader);
    self._guarded([&] {
      if (prefix) {
        _fail(fmt::format("unknown element with prefix {}", quoted(viewOf(prefix))));
      }
      self._startElement(viewOf(name));
    });
  };
  handlers.endElementNs = [](void* reader, const xmlChar*, const xmlChar*, const xmlChar*) {
    auto& self = *static_cast<XMLReader*>(reader);
    self._guarded([&] { self._endElement(); });
  };
  handlers.characters = [](void* reader, const xmlChar* text, int length) {
    auto& self = *static_cast<XMLReader*>(reader);
    self._guarded([&] {
      self._characters({reinterpret_cast<const char*>(text), static_cast<size_t>(length)});
    });
  };
  handlers.ignorableWhitespace = handlers.characters;
  handlers.cdataBlock = handlers.characters;
  handlers.serror = &XMLReader::_parserError;
  return handlers;
}

Value XMLReader::read(std::string_view text, bool ignoreDeclaredEncoding) {
  [[maybe_unused]] static const bool initialized = (xmlInitParser(), true);
  const std::unique_ptr<xmlParserCtxt, decltype(&xmlFreeParserCtxt)> parser(
      xmlCreateMemoryParserCtxt(text.data(), static_cast<int>(text.size())), &xmlFreeParserCtxt);
  if (!parser) {
    throw std::bad_alloc();
  }
  _parser = parser.get();
  xmlSAXHandler handlers = _handlers();
  xmlSAXHandler* const own = std::exchange(_parser->sax, &handlers);
  _parser->userData = this;
  // Without the last one, text nodes of more than 10 MB would be refused; nesting is ours to limit.
  int options = XML_PARSE_NONET | XML_PARSE_HUGE;
  if (ignoreDeclaredEncoding) {
    options |= XML_PARSE_IGNORE_ENC;
  }
  xmlCtxtUseOptions(_parser, options);
  xmlParseDocument(_parser);
  _parser->sax = own;
  if (_failure) {
    std::rethrow_exception(_failure);
  }
  if (!_parser->wellFormed || !_root) {
    _fail("malformed XML");
  }
  return std::move(*_root);
}

}  // namespace

Value valueFromXML(const Data& data) {
  if (data.length() > propertyListMaximumXMLLength) {
    throw Exception(inconsistentArchiveException,
                    fmt::format("XML text is longer than {} bytes", propertyListMaximumXMLLength));
  }
  const std::optional<std::string> transcoded = utf8FromMarkedUTF16(data.view());
  const std::string_view text = transcoded ? std::string_view(*transcoded) : data.view();
  checkMarkup(text);
  return XMLReader().read(text, transcoded.has_value());
}

}  // namespace platform::propertylist
