#include "bvmake/DocBookPages.h"

#include <fmt/format.h>
#include <libxml/HTMLparser.h>

#include <algorithm>
#include <memory>
#include <unordered_map>
#include <utility>

#include "bvmake/ASCII.h"
#include "bvmake/DocBookBuilder.h"
#include "bvmake/MallardPage.h"
#include "bvmake/PosedEntity.h"
#include "bvmake/UTF8.h"
#include "bvmake/XMLReader.h"

namespace bvmake {

namespace {

constexpr const char* refusal = "no DocBook document";
constexpr std::string_view inclusionNamespace = "http://www.w3.org/2001/XInclude";
constexpr std::string_view xmlNamespace = "http://www.w3.org/XML/1998/namespace";
constexpr size_t longestEntity = 65536;

/// The element around text that has none of its own.
constexpr std::string_view wrapperName = "included";

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

/// The attributes that matter.
struct Attributes {
  std::string id;
  std::string language;
  std::string reference;
  bool asText = false;
  bool hasPointer = false;

  Attributes(Document& document, const std::vector<XMLAttribute>& attributes) {
    for (const auto& [name, space, value] : attributes) {
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

/// Reads one file or entity of a document.
class DocBookReader : public XMLReader {
 public:
  DocBookReader(Document& document, const std::string& name, bool isFirst)
      : XMLReader(refusal), _document(document), _name(name), _isFirst(isFirst) {}

 private:
  void startElement(std::string_view name, std::string_view namespaceURI,
                    const std::vector<XMLAttribute>& attributes) override {
    const bool isRoot = depth() == 1;
    if (_inclusionDepth > 0 || namespaceURI == inclusionNamespace) {
      // What stands in for the file when it is not there is left out.
      const bool begins = ++_inclusionDepth == 1;
      const Attributes found(_document, attributes);
      if (begins && name == "include" && !found.hasPointer && !found.reference.empty()) {
        _document.include(_name, found.reference, found.asText);
      }
      return;
    }
    if (isRoot && !_isFirst && name == wrapperName) {
      return;
    }
    const bool isDocBook = namespaceURI.empty() || namespaceURI == docBookNamespace;
    const Attributes found(_document, attributes);
    if (isRoot && _isFirst) {
      if (!isDocBook || !isDocBookRoot(name)) {
        stop(refusal);
        return;
      }
      _document.builder.setLanguage(found.language);
    }
    _document.builder.startElement(name, isDocBook, found.id);
  }
  void endElement(std::string_view name) override {
    if (_inclusionDepth > 0) {
      --_inclusionDepth;
    } else if (depth() > 1 || _isFirst || name != wrapperName) {
      _document.builder.endElement();
    }
  }
  void characters(std::string_view text) override {
    if (_inclusionDepth == 0) {
      _document.builder.characters(text);
    }
  }

  void declareEntity(std::string_view name, XMLEntityKind kind, std::string_view content) override {
    if (kind == XMLEntityKind::other ||
        (kind == XMLEntityKind::text && content.size() > longestEntity)) {
      return;
    }
    Declaration declaration;
    declaration.isFile = kind == XMLEntityKind::file;
    declaration.from = _name;
    declaration.content = content;
    _document.declare(std::string(name), std::move(declaration));
  }
  xmlEntityPtr findEntity(std::string_view name) override {
    return _document.find(std::string(name), isInAttribute());
  }
  void enterEntity(std::string_view name) override {
    if (_inclusionDepth == 0) {
      _document.enter(std::string(name));
    }
  }
  void eventEnded() override {
    if (!_document.problem.empty()) {
      stop(_document.problem);
    }
  }

  Document& _document;
  const std::string& _name;
  const bool _isFirst;
  /// Elements open inside an XInclude element, that one counted.
  size_t _inclusionDepth = 0;
};

bool Document::_parse(std::string text, const std::string& name, bool isFirst, std::string& why) {
  return DocBookReader(*this, name, isFirst).read(std::move(text), why);
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
