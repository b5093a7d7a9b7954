#include "bvmake/XMLReader.h"

#include <fmt/format.h>
#include <libxml/parserInternals.h>
#include <libxml/valid.h>

#include <cstring>
#include <limits>
#include <memory>
#include <optional>
#include <utility>

#include "bvmake/ASCII.h"
#include "bvmake/MarkupGuard.h"

namespace bvmake {

namespace {

/// Name spaces in force at once; the parser searches them one by one for each element.
constexpr size_t maximumNamespaceCount = 256;

std::string_view view(const xmlChar* text) {
  return text == nullptr ? std::string_view() : reinterpret_cast<const char*>(text);
}

struct ParserDeleter {
  void operator()(xmlParserCtxtPtr parser) const {
    if (parser->myDoc != nullptr) {
      xmlFreeDoc(parser->myDoc);
      parser->myDoc = nullptr;
    }
    xmlFreeParserCtxt(parser);
  }
};

}  // namespace

struct XMLReader::CallBacks {
  template <typename Action>
  static void guarded(void* context, Action action) noexcept {
    auto& reader = *static_cast<XMLReader*>(context);
    if (reader._exception || !reader._problem.empty()) {
      return;
    }
    try {
      action(reader);
      reader.eventEnded();
    } catch (...) {
      reader._exception = std::current_exception();
      xmlStopParser(reader._parser);
    }
  }

  static void startElement(void* context, const xmlChar* name, const xmlChar* /*prefix*/,
                           const xmlChar* namespaceURI, int namespaceCount,
                           const xmlChar** /*namespaces*/, int attributeCount,
                           int /*defaultedCount*/, const xmlChar** attributes) {
    guarded(context, [&](XMLReader& reader) {
      reader._namespaces.push_back(static_cast<size_t>(namespaceCount));
      reader._namespaceCount += static_cast<size_t>(namespaceCount);
      if (reader._namespaceCount > maximumNamespaceCount) {
        reader.stop("too many name spaces");
        return;
      }
      reader._attributes.clear();
      // Name, prefix, name space, and where the value begins and ends.
      for (int i = 0; i < attributeCount; ++i, attributes += 5) {
        const char* const begin = reinterpret_cast<const char*>(attributes[3]);
        const char* const end = reinterpret_cast<const char*>(attributes[4]);
        reader._attributes.push_back(
            {view(attributes[0]), view(attributes[2]), {begin, static_cast<size_t>(end - begin)}});
      }
      reader.startElement(view(name), view(namespaceURI), reader._attributes);
    });
  }

  static void endElement(void* context, const xmlChar* name, const xmlChar* /*prefix*/,
                         const xmlChar* /*namespaceURI*/) {
    guarded(context, [&](XMLReader& reader) {
      reader.endElement(view(name));
      reader._namespaceCount -= reader._namespaces.back();
      reader._namespaces.pop_back();
    });
  }

  static void characters(void* context, const xmlChar* text, int length) {
    guarded(context, [&](XMLReader& reader) {
      reader.characters({reinterpret_cast<const char*>(text), static_cast<size_t>(length)});
    });
  }

  static void declareEntity(void* context, const xmlChar* name, int type,
                            const xmlChar* /*publicID*/, const xmlChar* systemID,
                            xmlChar* content) {
    guarded(context, [&](XMLReader& reader) {
      const XMLEntityKind kind = type == XML_INTERNAL_GENERAL_ENTITY ? XMLEntityKind::text
                                 : type == XML_EXTERNAL_GENERAL_PARSED_ENTITY
                                     ? XMLEntityKind::file
                                     : XMLEntityKind::other;
      reader.declareEntity(view(name), kind,
                           view(kind == XMLEntityKind::file ? systemID : content));
    });
  }

  static xmlEntityPtr findEntity(void* context, const xmlChar* name) {
    xmlEntityPtr found = nullptr;
    guarded(context, [&](XMLReader& reader) { found = reader.findEntity(view(name)); });
    return found;
  }

  static void enterEntity(void* context, const xmlChar* name) {
    guarded(context, [&](XMLReader& reader) { reader.enterEntity(view(name)); });
  }

  /// Declared attributes are added to every element by the parser: a short page can become an
  /// endless one.
  static void refuseAttributeDeclaration(void* context, const xmlChar* /*element*/,
                                         const xmlChar* /*name*/, int /*type*/, int /*default*/,
                                         const xmlChar* /*value*/, xmlEnumerationPtr choices) {
    xmlFreeEnumeration(choices);
    guarded(context,
            [](XMLReader& reader) { reader.stop("declarations of attributes are not taken"); });
  }

  static void mistake(void* context, xmlErrorPtr error) {
    guarded(context, [&](XMLReader& reader) {
      if (error->level == XML_ERR_FATAL && reader._firstMistake.empty()) {
        reader._firstMistake = fmt::format(
            "line {}: {}", error->line, trimmed(error->message == nullptr ? "" : error->message));
      }
    });
  }

  static void install(xmlSAXHandler& handler) {
    std::memset(&handler, 0, sizeof(handler));
    handler.initialized = XML_SAX2_MAGIC;
    handler.startElementNs = startElement;
    handler.endElementNs = endElement;
    handler.characters = characters;
    handler.ignorableWhitespace = characters;
    handler.cdataBlock = characters;
    handler.entityDecl = declareEntity;
    handler.getEntity = findEntity;
    handler.reference = enterEntity;
    handler.attributeDecl = refuseAttributeDeclaration;
    handler.serror = mistake;
  }
};

void XMLReader::stop(std::string why) {
  _problem = std::move(why);
  xmlStopParser(_parser);
}

bool XMLReader::isInAttribute() const noexcept {
  return _parser->instate == XML_PARSER_ATTRIBUTE_VALUE;
}

bool XMLReader::read(std::string text, std::string& why) {
  if (text.size() > static_cast<size_t>(std::numeric_limits<int>::max())) {
    why = "too large";
    return false;
  }
  if (std::optional<std::string> found = tameMarkup(text, Markup::xml)) {
    why = std::move(*found);
    return false;
  }
  const std::unique_ptr<xmlParserCtxt, ParserDeleter> parser(
      xmlCreateMemoryParserCtxt(text.data(), static_cast<int>(text.size())));
  if (parser == nullptr) {
    // The only failure besides memory: fewer than the four bytes of the shortest document.
    why = _refusal;
    return false;
  }
  xmlCtxtUseOptions(parser.get(), XML_PARSE_NONET | XML_PARSE_NOERROR | XML_PARSE_NOWARNING |
                                      XML_PARSE_IGNORE_ENC);
  CallBacks::install(*parser->sax);
  parser->userData = this;
  _parser = parser.get();
  xmlParseDocument(_parser);
  _parser = nullptr;
  if (_exception) {
    std::rethrow_exception(_exception);
  }
  if (!_problem.empty()) {
    why = std::move(_problem);
    return false;
  }
  if (parser->wellFormed == 0) {
    why = _firstMistake.empty() ? "no well-formed XML" : std::move(_firstMistake);
    return false;
  }
  return true;
}

}  // namespace bvmake
