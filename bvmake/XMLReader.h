// XML, read event by event.
#pragma once

#include <libxml/parser.h>

#include <cstdint>
#include <exception>
#include <string>
#include <string_view>
#include <vector>

namespace bvmake {

struct XMLAttribute {
  std::string_view name;
  /// Empty where it has none.
  std::string_view namespaceURI;
  /// As the parser gives it; what findEntity() poses as a name is still a reference.
  std::string_view value;
};

enum class XMLEntityKind : uint8_t {
  /// Its content is text, or markup.
  text,
  /// Its content is the reference to a file.
  file,
  /// One that cannot stand in a document's content.
  other,
};

/// Reads a text with libxml2 and calls the functions that are overridden. Nothing is loaded from
/// anywhere, and no entity is expanded but by them. What a few bytes of hostile text could make
/// endless is refused: attribute declarations, and more name spaces than documents have. Exceptions
/// of overridden functions come out of read(). Thread-safety: confined to one thread.
class XMLReader {
 public:
  /// `refusal` is said of a text that is too short for any document.
  explicit XMLReader(const char* refusal) : _refusal(refusal) {}
  virtual ~XMLReader() = default;
  XMLReader(const XMLReader&) = delete;
  XMLReader& operator=(const XMLReader&) = delete;

  /// False, with `why` set, for a text (well-formed UTF-8, no NUL) that is not well-formed or at
  /// which stop() was called. May be called once.
  bool read(std::string text, std::string& why);

 protected:
  /// Ends reading; nothing else is called.
  void stop(std::string why);
  /// How many elements are open; one that begins or ends is counted.
  size_t depth() const noexcept { return _namespaces.size(); }
  /// Whether the value of an attribute is being read.
  bool isInAttribute() const noexcept;

 private:
  virtual void startElement(std::string_view name, std::string_view namespaceURI,
                            const std::vector<XMLAttribute>& attributes) = 0;
  virtual void endElement(std::string_view name) = 0;
  virtual void characters(std::string_view text) = 0;
  virtual void declareEntity(std::string_view name, XMLEntityKind kind,
                             std::string_view content) = 0;
  /// What stands for a reference (see PosedEntity.h); null for nothing. Belongs to the callee.
  virtual xmlEntityPtr findEntity(std::string_view name) = 0;
  /// An entity that was found as a reference stands here.
  virtual void enterEntity(std::string_view /*name*/) {}
  /// Called after each of these.
  virtual void eventEnded() {}

  struct CallBacks;

  const char* const _refusal;
  xmlParserCtxtPtr _parser = nullptr;
  std::vector<XMLAttribute> _attributes;
  /// Name spaces that each open element declares, and their sum.
  std::vector<size_t> _namespaces;
  size_t _namespaceCount = 0;
  std::string _problem;
  std::string _firstMistake;
  /// Exceptions may not cross the parser, which is C: they wait here until it has returned.
  std::exception_ptr _exception;
};

}  // namespace bvmake
