#include "bvmake/HTMLPage.h"

#include <libxml/HTMLparser.h>

#include <cstring>
#include <exception>
#include <limits>
#include <memory>
#include <vector>

#include "bvmake/HTMLPageBuilder.h"
#include "bvmake/MarkupGuard.h"
#include "bvmake/PlainHTML.h"

namespace bvmake {

namespace {

/// What the parser's call-backs work on. Exceptions may not cross the parser, which is C: they wait
/// here until it has returned.
struct Session {
  htmlParserCtxtPtr parser = nullptr;
  HTMLPageBuilder builder;
  std::vector<HTMLAttribute> attributes;
  uint64_t nestingWork = 0;
  bool tooMuchWork = false;
  std::exception_ptr exception;

  bool stopped() const { return tooMuchWork || exception != nullptr; }

  template <typename Action>
  void guarded(Action action) noexcept {
    if (stopped()) {
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

std::string_view view(const xmlChar* text) {
  return text == nullptr ? std::string_view() : reinterpret_cast<const char*>(text);
}

void startElement(void* context, const xmlChar* name, const xmlChar** attributes) {
  auto& session = *static_cast<Session*>(context);
  session.guarded([&] {
    session.attributes.clear();
    for (; attributes != nullptr && *attributes != nullptr; attributes += 2) {
      session.attributes.push_back({view(attributes[0]), view(attributes[1])});
    }
    session.builder.startElement(traitsOfElement(view(name)), session.attributes);
  });
}

void endElement(void* context, const xmlChar*) {
  auto& session = *static_cast<Session*>(context);
  session.guarded([&] { session.builder.endElement(); });
}

void characters(void* context, const xmlChar* text, int length) {
  auto& session = *static_cast<Session*>(context);
  session.guarded([&] {
    session.builder.characters({reinterpret_cast<const char*>(text), static_cast<size_t>(length)});
  });
}

/// Called for each mistake in the page. The parser has then searched its stack of open elements.
void mistake(void* context, xmlErrorPtr) {
  auto& session = *static_cast<Session*>(context);
  session.nestingWork += session.builder.depth();
  if (session.nestingWork > maximumNestingWork && !session.stopped()) {
    session.tooMuchWork = true;
    xmlStopParser(session.parser);
  }
}

struct ParserDeleter {
  void operator()(htmlParserCtxtPtr parser) const {
    if (parser->myDoc != nullptr) {
      xmlFreeDoc(parser->myDoc);
    }
    htmlFreeParserCtxt(parser);
  }
};

}  // namespace

std::optional<Page> readHTMLPage(std::string text, platform::Error* error, HTMLParsing parsing) {
  const auto refuse = [error](std::string description) -> std::optional<Page> {
    if (error != nullptr) {
      *error = platform::formatError(std::move(description));
    }
    return std::nullopt;
  };
  if (text.size() > static_cast<size_t>(std::numeric_limits<int>::max())) {
    return refuse("too large");
  }
  if (parsing == HTMLParsing::whereNeeded) {
    HTMLPageBuilder builder;
    if (readPlainHTML(text, builder)) {
      return builder.finish();
    }
  }
  if (std::optional<std::string> problem = tameMarkup(text, Markup::html)) {
    return refuse(std::move(*problem));
  }
  Session session;
  if (!text.empty()) {
    const std::unique_ptr<htmlParserCtxt, ParserDeleter> parser(
        htmlCreateMemoryParserCtxt(text.data(), static_cast<int>(text.size())));
    if (parser == nullptr) {
      throw std::bad_alloc();
    }
    htmlCtxtUseOptions(parser.get(), HTML_PARSE_RECOVER | HTML_PARSE_NOERROR |
                                         HTML_PARSE_NOWARNING | HTML_PARSE_NONET |
                                         HTML_PARSE_IGNORE_ENC);
    // The text is UTF-8 whatever the page says of itself.
    parser->charset = XML_CHAR_ENCODING_UTF8;
    session.parser = parser.get();
    std::memset(parser->sax, 0, sizeof(*parser->sax));
    parser->sax->initialized = XML_SAX2_MAGIC;
    parser->sax->startElement = startElement;
    parser->sax->endElement = endElement;
    parser->sax->characters = characters;
    parser->sax->ignorableWhitespace = characters;
    parser->sax->serror = mistake;
    parser->userData = &session;
    htmlParseDocument(parser.get());
  }
  if (session.exception) {
    std::rethrow_exception(session.exception);
  }
  if (session.tooMuchWork) {
    return refuse("misnested tags too deep inside each other");
  }
  return session.builder.finish();
}

}  // namespace bvmake
