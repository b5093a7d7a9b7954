#include "bvmake/MallardPage.h"

#include <fmt/format.h>
#include <libxml/parser.h>
#include <libxml/parserInternals.h>
#include <libxml/valid.h>

#include <cstring>
#include <exception>
#include <limits>
#include <memory>
#include <unordered_map>
#include <vector>

#include "bvmake/ASCII.h"
#include "bvmake/MallardPageBuilder.h"
#include "bvmake/MarkupGuard.h"
#include "bvmake/PosedEntity.h"
#include "platform/Strings.h"

namespace bvmake {

namespace {

/// Name spaces in force at once; the parser searches them one by one for each element.
constexpr size_t maximumNamespaceCount = 256;

constexpr size_t longestEntity = 4096;

constexpr std::string_view xmlNamespace = "http://www.w3.org/XML/1998/namespace";

/// What the parser's call-backs work on. Exceptions may not cross the parser, which is C: they wait
/// here until it has returned.
struct Session {
  xmlParserCtxtPtr parser = nullptr;
  MallardPageBuilder builder;
  std::unordered_map<std::string, std::unique_ptr<PosedEntity>> entities;
  size_t entityText = 0;
  /// Name spaces that each open element declares, and their sum.
  std::vector<size_t> namespaces;
  size_t namespaceCount = 0;
  std::string problem;
  std::string firstMistake;
  std::exception_ptr exception;

  void stop(const char* why) {
    problem = why;
    xmlStopParser(parser);
  }

  template <typename Action>
  void guarded(Action action) noexcept {
    if (exception || !problem.empty()) {
      return;
    }
    try {
      action();
    } catch (...) {
      exception = std::current_exception();
      xmlStopParser(parser);
    }
  }
};

Session& sessionOf(void* context) { return *static_cast<Session*>(context); }

std::string_view view(const xmlChar* text) {
  return text == nullptr ? std::string_view() : reinterpret_cast<const char*>(text);
}

void startElement(void* context, const xmlChar* name, const xmlChar*, const xmlChar* namespaceURI,
                  int namespaceCount, const xmlChar**, int attributeCount, int,
                  const xmlChar** attributes) {
  Session& session = sessionOf(context);
  session.guarded([&] {
    session.namespaces.push_back(static_cast<size_t>(namespaceCount));
    session.namespaceCount += static_cast<size_t>(namespaceCount);
    if (session.namespaceCount > maximumNamespaceCount) {
      session.stop("too many name spaces");
      return;
    }
    const bool isRoot = session.namespaces.size() == 1;
    std::string_view id;
    std::string_view type;
    for (int i = 0; i < attributeCount; ++i, attributes += 5) {
      const char* begin = reinterpret_cast<const char*>(attributes[3]);
      const std::string_view value(
          begin, static_cast<size_t>(reinterpret_cast<const char*>(attributes[4]) - begin));
      if (attributes[2] == nullptr && view(attributes[0]) == "id") {
        // The parser takes a part only of entities that stand in attributes.
        id = platform::isValidUTF8(value) ? value : std::string_view();
      } else if (attributes[2] == nullptr && view(attributes[0]) == "type") {
        type = value;
      } else if (isRoot && view(attributes[2]) == xmlNamespace && view(attributes[0]) == "lang") {
        session.builder.setLanguage(value);
      }
    }
    session.builder.startElement(view(namespaceURI), view(name), id, type);
    if (isRoot && !session.builder.isMallardPage()) {
      session.stop("no Mallard page");
    }
  });
}

void endElement(void* context, const xmlChar*, const xmlChar*, const xmlChar*) {
  Session& session = sessionOf(context);
  session.guarded([&] {
    if (!session.namespaces.empty()) {
      session.namespaceCount -= session.namespaces.back();
      session.namespaces.pop_back();
    }
    session.builder.endElement();
  });
}

void characters(void* context, const xmlChar* text, int length) {
  Session& session = sessionOf(context);
  session.guarded([&] {
    session.builder.characters({reinterpret_cast<const char*>(text), static_cast<size_t>(length)});
  });
}

void declareEntity(void* context, const xmlChar* name, int type, const xmlChar*, const xmlChar*,
                   xmlChar* content) {
  Session& session = sessionOf(context);
  session.guarded([&] {
    std::string text;
    if (type == XML_INTERNAL_GENERAL_ENTITY && view(content).size() <= longestEntity &&
        view(content).find_first_of("&<") == std::string_view::npos) {
      text = view(content);
    }
    std::string key(view(name));
    // Of two declarations the first counts.
    if (session.entities.find(key) == session.entities.end()) {
      session.entities.emplace(key, std::make_unique<PosedEntity>(key, std::move(text)));
    }
  });
}

xmlEntityPtr findEntity(void* context, const xmlChar* name) {
  Session& session = sessionOf(context);
  xmlEntityPtr found = nullptr;
  session.guarded([&] {
    const auto entity = session.entities.find(std::string(view(name)));
    if (entity == session.entities.end()) {
      return;
    }
    session.entityText += entity->second->content.size();
    if (session.entityText > maximumEntityText) {
      session.stop("entities that stand for too much text");
      return;
    }
    found = &entity->second->node;
  });
  return found;
}

/// Declared attributes are added to every element by the parser: a short page can become an endless
/// one.
void refuseAttributeDeclaration(void* context, const xmlChar*, const xmlChar*, int, int,
                                const xmlChar*, xmlEnumerationPtr choices) {
  xmlFreeEnumeration(choices);
  Session& session = sessionOf(context);
  session.guarded([&] { session.stop("declarations of attributes are not taken"); });
}

void mistake(void* context, xmlErrorPtr error) {
  Session& session = sessionOf(context);
  session.guarded([&] {
    if (error->level == XML_ERR_FATAL && session.firstMistake.empty()) {
      const std::string_view message = error->message == nullptr ? "" : error->message;
      session.firstMistake = fmt::format("line {}: {}", error->line, trimmed(message));
    }
  });
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

void installCallBacks(xmlParserCtxtPtr parser, Session& session) {
  xmlSAXHandler& handler = *parser->sax;
  std::memset(&handler, 0, sizeof(handler));
  handler.initialized = XML_SAX2_MAGIC;
  handler.startElementNs = startElement;
  handler.endElementNs = endElement;
  handler.characters = characters;
  handler.ignorableWhitespace = characters;
  handler.cdataBlock = characters;
  handler.entityDecl = declareEntity;
  handler.getEntity = findEntity;
  handler.attributeDecl = refuseAttributeDeclaration;
  handler.serror = mistake;
  parser->userData = &session;
  session.parser = parser;
}

}  // namespace

std::optional<Page> readMallardPage(std::string text, platform::Error* error) {
  const auto refuse = [error](std::string description) -> std::optional<Page> {
    if (error != nullptr) {
      *error = platform::formatError(std::move(description));
    }
    return std::nullopt;
  };
  if (text.empty()) {
    return refuse("empty");
  }
  if (text.size() > static_cast<size_t>(std::numeric_limits<int>::max())) {
    return refuse("too large");
  }
  if (std::optional<std::string> problem = tameMarkup(text, Markup::xml)) {
    return refuse(std::move(*problem));
  }
  Session session;
  const std::unique_ptr<xmlParserCtxt, ParserDeleter> parser(
      xmlCreateMemoryParserCtxt(text.data(), static_cast<int>(text.size())));
  if (parser == nullptr) {
    // The only failure besides memory: fewer than the four bytes of the shortest document.
    return refuse("no Mallard page");
  }
  xmlCtxtUseOptions(parser.get(), XML_PARSE_NONET | XML_PARSE_NOERROR | XML_PARSE_NOWARNING |
                                      XML_PARSE_IGNORE_ENC);
  installCallBacks(parser.get(), session);
  xmlParseDocument(parser.get());
  if (session.exception) {
    std::rethrow_exception(session.exception);
  }
  if (!session.problem.empty()) {
    return refuse(std::move(session.problem));
  }
  if (parser->wellFormed == 0) {
    return refuse(session.firstMistake.empty() ? "no well-formed XML"
                                               : std::move(session.firstMistake));
  }
  return session.builder.finish();
}

}  // namespace bvmake
