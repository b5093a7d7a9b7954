#include "bvmake/DocBookPages.h"

#include <fmt/format.h>
#include <libxml/HTMLparser.h>
#include <libxml/parser.h>
#include <libxml/parserInternals.h>
#include <libxml/valid.h>

#include <algorithm>
#include <cstring>
#include <exception>
#include <limits>
#include <memory>
#include <unordered_map>
#include <utility>

#include "bvmake/ASCII.h"
#include "bvmake/DocBookBuilder.h"
#include "bvmake/MallardPage.h"
#include "bvmake/MarkupGuard.h"
#include "bvmake/PosedEntity.h"
#include "bvmake/UTF8.h"

namespace bvmake {

namespace {

constexpr std::string_view inclusionNamespace = "http://www.w3.org/2001/XInclude";
constexpr std::string_view xmlNamespace = "http://www.w3.org/XML/1998/namespace";
constexpr size_t maximumNamespaceCount = 256;
constexpr size_t longestEntity = 65536;

/// The element around text that has none of its own.
constexpr std::string_view wrapperName = "included";

std::string_view view(const xmlChar* text) {
  return text == nullptr ? std::string_view() : reinterpret_cast<const char*>(text);
}

/// What an entity stands for that the document does not declare.
std::string textOfUndeclared(const std::string& name) {
  if (const htmlEntityDesc* known =
          htmlEntityLookup(reinterpret_cast<const xmlChar*>(name.c_str()))) {
    return utf8OfCharacter(static_cast<UChar32>(known->value));
  }
  return name;
}

std::string withoutTags(std::string_view markup) {
  std::string text;
  bool inTag = false;
  for (const char character : markup) {
    inTag = inTag || character == '<';
    if (!inTag) {
      text += character;
    }
    inTag = inTag && character != '>';
  }
  return text;
}

/// What an entity was declared as.
struct Declaration {
  bool isFile = false;
  /// The name of the file that declares it.
  std::string from;
  /// The text, or the reference to the file.
  std::string content;
  std::unique_ptr<PosedEntity> asText;
  std::unique_ptr<PosedEntity> asReference;
  std::unique_ptr<PosedEntity> asName;
};

/// What all files of a document have in common.
class Document {
 public:
  explicit Document(const DocBookLoader& load) : _load(load) {}

  /// Absent, with `why` set, for a first file that is none.
  std::optional<DocBookPages> read(const DocBookFile& file, std::string& why) {
    _active.push_back(file.name);
    if (!_parse(file.text, file.name, true, why)) {
      return std::nullopt;
    }
    return DocBookPages{builder.finish(), std::move(_notes)};
  }

  void declare(const std::string& name, Declaration declaration) {
    // Of two declarations the first counts.
    _entities.try_emplace(name, std::move(declaration));
  }

  xmlEntityPtr find(const std::string& name, bool inAttribute) {
    Declaration& entity = _entities[name];
    if (entity.content.empty() && !entity.isFile) {
      entity.content = textOfUndeclared(name);
    }
    if (inAttribute) {
      return _pose(entity.asName, name, {}, PosedEntity::Pose::name);
    }
    if (entity.isFile || entity.content.find('<') != std::string::npos) {
      return _pose(entity.asReference, name, {}, PosedEntity::Pose::reference);
    }
    const xmlEntityPtr node =
        _pose(entity.asText, name, entity.asText ? std::string() : flattened(entity.content),
              PosedEntity::Pose::text);
    _countEntityText(entity.asText->content.size());
    return problem.empty() ? node : nullptr;
  }

  /// Text with its entities replaced by theirs, and without tags.
  std::string flattened(std::string_view text) {
    std::string result;
    _flatten(text, 0, result);
    _countEntityText(result.size());
    return result;
  }

  /// Reads what an entity that is no mere text stands for.
  void enter(const std::string& name) {
    const auto found = _entities.find(name);
    if (found == _entities.end()) {
      return;
    }
    const std::string content = found->second.content;
    const std::string from = found->second.from;
    if (found->second.isFile) {
      include(from, content, false);
    } else if (_mayEnter("&" + name, content.size())) {
      _active.push_back("&" + name);
      _parseInner(content, from, "the entity " + name);
      _active.pop_back();
    }
  }

  void include(const std::string& from, const std::string& reference, bool asText) {
    std::string why;
    const std::optional<DocBookFile> file = _load(from, reference, why);
    if (!file) {
      _note(fmt::format("cannot include {}: {}", reference, why));
      return;
    }
    if (!_mayEnter(file->name, file->text.size())) {
      return;
    }
    if (asText) {
      builder.characters(file->text);
      return;
    }
    _active.push_back(file->name);
    _parseInner(file->text, file->name, reference);
    _active.pop_back();
  }

  DocBookBuilder builder;
  /// Why reading is to end.
  std::string problem;

 private:
  static constexpr size_t maximumNoteCount = 100;

  bool _parse(std::string text, const std::string& name, bool isFirst, std::string& why);

  void _parseInner(std::string_view content, const std::string& name, const std::string& what) {
    const size_t depth = builder.depth();
    std::string why;
    if (!_parse(_document(content), name, false, why) && problem.empty()) {
      _note(fmt::format("cannot include all of {}: {}", what, why));
    }
    // What was open where the parser gave up.
    while (builder.depth() > depth) {
      builder.endElement();
    }
  }

  /// Text that may hold several elements, or none, as a document of one.
  static std::string _document(std::string_view content) {
    if (content.starts_with("<?xml") && content.size() > 5 && isBlank(content[5])) {
      const size_t end = content.find("?>");
      content.remove_prefix(end == std::string_view::npos ? content.size() : end + 2);
    }
    if (content.find("<!DOCTYPE") != std::string_view::npos) {
      return std::string(trimmed(content));
    }
    return fmt::format("<{0}>{1}</{0}>", wrapperName, content);
  }

  void _countEntityText(size_t bytes) {
    _entityBytes += bytes;
    if (_entityBytes > maximumEntityText) {
      problem = "entities that stand for too much text";
    }
  }

  static xmlEntityPtr _pose(std::unique_ptr<PosedEntity>& posed, const std::string& name,
                            std::string text, PosedEntity::Pose pose) {
    if (!posed) {
      posed = std::make_unique<PosedEntity>(name, std::move(text), pose);
    }
    return &posed->node;
  }

  bool _mayEnter(const std::string& name, size_t bytes) {
    if (std::find(_active.begin(), _active.end(), name) != _active.end()) {
      _note(fmt::format("{} includes itself", name));
      return false;
    }
    _includedBytes += bytes;
    if (_active.size() > maximumInclusionDepth || ++_includedCount > maximumIncludedCount ||
        _includedBytes > maximumIncludedBytes) {
      problem = "includes too much";
      return false;
    }
    return true;
  }

  void _flatten(std::string_view content, size_t depth, std::string& text) {
    size_t at = 0;
    const std::string plain = withoutTags(content);
    while (at < plain.size() && text.size() < longestEntity) {
      const size_t reference = std::min(plain.find('&', at), plain.size());
      text.append(plain, at, reference - at);
      const size_t end = plain.find(';', reference);
      if (reference == plain.size() || end == std::string::npos) {
        return;
      }
      const std::string name = plain.substr(reference + 1, end - reference - 1);
      const auto found = _entities.find(name);
      if (name == "#38") {
        text += '&';
      } else if (found == _entities.end() || found->second.content.empty()) {
        text += textOfUndeclared(name);
      } else if (!found->second.isFile && depth < maximumInclusionDepth &&
                 ++_flattenedCount <= maximumIncludedCount) {
        _flatten(found->second.content, depth + 1, text);
      }
      at = end + 1;
    }
  }

  void _note(std::string text) {
    if (_notes.size() < maximumNoteCount) {
      _notes.push_back(std::move(text));
    }
  }

  const DocBookLoader& _load;
  std::unordered_map<std::string, Declaration> _entities;
  /// Files and entities that are being read, the outermost first.
  std::vector<std::string> _active;
  std::vector<std::string> _notes;
  size_t _entityBytes = 0;
  size_t _includedBytes = 0;
  size_t _includedCount = 0;
  /// References to entities in the text of others.
  size_t _flattenedCount = 0;
};

/// What the parser's call-backs work on, one for each file or entity. Exceptions may not cross the
/// parser, which is C: they wait here until it has returned.
struct Session {
  Session(Document& ofDocument, const std::string& fileName, bool isFirstFile)
      : document(ofDocument), name(fileName), isFirst(isFirstFile) {}

  Document& document;
  const std::string& name;
  bool isFirst;
  xmlParserCtxtPtr parser = nullptr;
  /// Name spaces that each open element declares, and their sum.
  std::vector<size_t> namespaces;
  size_t namespaceCount = 0;
  /// Elements open inside an XInclude element, that one counted.
  size_t inclusionDepth = 0;
  std::string problem;
  std::string firstMistake;
  std::exception_ptr exception;

  void stop(std::string why) {
    problem = std::move(why);
    xmlStopParser(parser);
  }

  template <typename Action>
  void guarded(Action action) noexcept {
    if (exception || !problem.empty()) {
      return;
    }
    try {
      action();
      if (!document.problem.empty()) {
        stop(document.problem);
      }
    } catch (...) {
      exception = std::current_exception();
      xmlStopParser(parser);
    }
  }
};

Session& sessionOf(void* context) { return *static_cast<Session*>(context); }

/// The attributes that matter.
struct Attributes {
  std::string id;
  std::string language;
  std::string reference;
  bool asText = false;
  bool hasPointer = false;

  Attributes(Document& document, int count, const xmlChar** attributes) {
    for (int i = 0; i < count; ++i, attributes += 5) {
      const char* const begin = reinterpret_cast<const char*>(attributes[3]);
      const std::string_view value(
          begin, static_cast<size_t>(reinterpret_cast<const char*>(attributes[4]) - begin));
      const std::string_view name = view(attributes[0]);
      const std::string_view space = view(attributes[2]);
      if (name == "id" && (space.empty() || space == xmlNamespace)) {
        id = _text(document, value);
      } else if (name == "lang" && (space.empty() || space == xmlNamespace)) {
        language = _text(document, value);
      } else if (name == "href" && space.empty()) {
        reference = _text(document, value);
      } else if (name == "parse" && space.empty()) {
        asText = value == "text";
      } else if (name == "xpointer" && space.empty()) {
        hasPointer = true;
      }
    }
  }

 private:
  static std::string _text(Document& document, std::string_view value) {
    return value.find('&') == std::string_view::npos ? std::string(value)
                                                     : document.flattened(value);
  }
};

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
    const std::string_view element = view(name);
    const std::string_view space = view(namespaceURI);
    if (session.inclusionDepth > 0 || space == inclusionNamespace) {
      // What stands in for the file when it is not there is left out.
      const bool begins = ++session.inclusionDepth == 1;
      const Attributes found(session.document, attributeCount, attributes);
      if (begins && element == "include" && !found.hasPointer && !found.reference.empty()) {
        session.document.include(session.name, found.reference, found.asText);
      }
      return;
    }
    if (isRoot && !session.isFirst && element == wrapperName) {
      return;
    }
    const bool isDocBook = space.empty() || space == docBookNamespace;
    const Attributes found(session.document, attributeCount, attributes);
    if (isRoot && session.isFirst) {
      if (!isDocBook || !isDocBookRoot(element)) {
        session.stop("no DocBook document");
        return;
      }
      session.document.builder.setLanguage(found.language);
    }
    session.document.builder.startElement(element, isDocBook, found.id);
  });
}

void endElement(void* context, const xmlChar* name, const xmlChar*, const xmlChar*) {
  Session& session = sessionOf(context);
  session.guarded([&] {
    if (session.namespaces.empty()) {
      return;
    }
    const bool isRoot = session.namespaces.size() == 1;
    session.namespaceCount -= session.namespaces.back();
    session.namespaces.pop_back();
    if (session.inclusionDepth > 0) {
      --session.inclusionDepth;
    } else if (!isRoot || session.isFirst || view(name) != wrapperName) {
      session.document.builder.endElement();
    }
  });
}

void characters(void* context, const xmlChar* text, int length) {
  Session& session = sessionOf(context);
  session.guarded([&] {
    if (session.inclusionDepth == 0) {
      session.document.builder.characters(
          {reinterpret_cast<const char*>(text), static_cast<size_t>(length)});
    }
  });
}

void declareEntity(void* context, const xmlChar* name, int type, const xmlChar*,
                   const xmlChar* systemID, xmlChar* content) {
  Session& session = sessionOf(context);
  session.guarded([&] {
    Declaration declaration;
    declaration.from = session.name;
    if (type == XML_INTERNAL_GENERAL_ENTITY && view(content).size() <= longestEntity) {
      declaration.content = view(content);
    } else if (type == XML_EXTERNAL_GENERAL_PARSED_ENTITY) {
      declaration.isFile = true;
      declaration.content = view(systemID);
    } else {
      return;
    }
    session.document.declare(std::string(view(name)), std::move(declaration));
  });
}

xmlEntityPtr findEntity(void* context, const xmlChar* name) {
  Session& session = sessionOf(context);
  xmlEntityPtr found = nullptr;
  session.guarded([&] {
    found = session.document.find(std::string(view(name)),
                                  session.parser->instate == XML_PARSER_ATTRIBUTE_VALUE);
  });
  return found;
}

void enterEntity(void* context, const xmlChar* name) {
  Session& session = sessionOf(context);
  session.guarded([&] {
    if (session.inclusionDepth == 0) {
      session.document.enter(std::string(view(name)));
    }
  });
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
  handler.reference = enterEntity;
  handler.attributeDecl = refuseAttributeDeclaration;
  handler.serror = mistake;
  parser->userData = &session;
  session.parser = parser;
}

bool Document::_parse(std::string text, const std::string& name, bool isFirst, std::string& why) {
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
    why = "no DocBook document";
    return false;
  }
  xmlCtxtUseOptions(parser.get(), XML_PARSE_NONET | XML_PARSE_NOERROR | XML_PARSE_NOWARNING |
                                      XML_PARSE_IGNORE_ENC);
  Session session(*this, name, isFirst);
  installCallBacks(parser.get(), session);
  xmlParseDocument(parser.get());
  if (session.exception) {
    std::rethrow_exception(session.exception);
  }
  if (!session.problem.empty()) {
    why = std::move(session.problem);
    return false;
  }
  if (parser->wellFormed == 0) {
    why = session.firstMistake.empty() ? "no well-formed XML" : std::move(session.firstMistake);
    return false;
  }
  return true;
}

}  // namespace

std::optional<DocBookPages> readDocBook(const DocBookFile& file, const DocBookLoader& load,
                                        platform::Error* error) {
  std::string problem;
  std::optional<DocBookPages> pages;
  if (file.text.empty()) {
    problem = "empty";
  } else {
    pages = Document(load).read(file, problem);
  }
  if (!pages && error != nullptr) {
    *error = platform::formatError(std::move(problem));
  }
  return pages;
}

}  // namespace bvmake
