#include "bvmake/MallardPage.h"

#include <memory>
#include <unordered_map>
#include <utility>

#include "bvmake/MallardPageBuilder.h"
#include "bvmake/PosedEntity.h"
#include "bvmake/XMLReader.h"
#include "platform/Strings.h"

namespace bvmake {

namespace {

constexpr const char* refusal = "no Mallard page";
constexpr size_t longestEntity = 4096;
constexpr std::string_view xmlNamespace = "http://www.w3.org/XML/1998/namespace";

class MallardReader : public XMLReader {
 public:
  MallardReader() : XMLReader(refusal) {}

  Page finish() { return _builder.finish(); }

 private:
  void startElement(std::string_view name, std::string_view namespaceURI,
                    const std::vector<XMLAttribute>& attributes) override {
    const bool isRoot = depth() == 1;
    std::string_view id;
    std::string_view type;
    for (const XMLAttribute& attribute : attributes) {
      const bool isMallards = attribute.namespaceURI.empty();
      if (isMallards && attribute.name == "id") {
        // The parser takes a part only of entities that stand in attributes.
        id = platform::isValidUTF8(attribute.value) ? attribute.value : std::string_view();
      } else if (isMallards && attribute.name == "type") {
        type = attribute.value;
      } else if (isRoot && attribute.namespaceURI == xmlNamespace && attribute.name == "lang") {
        _builder.setLanguage(attribute.value);
      }
    }
    _builder.startElement(namespaceURI, name, id, type);
    if (isRoot && !_builder.isMallardPage()) {
      stop(refusal);
    }
  }
  void endElement(std::string_view /*name*/) override { _builder.endElement(); }
  void characters(std::string_view text) override { _builder.characters(text); }

  void declareEntity(std::string_view name, XMLEntityKind kind, std::string_view content) override {
    std::string text;
    if (kind == XMLEntityKind::text && content.size() <= longestEntity &&
        content.find_first_of("&<") == std::string_view::npos) {
      text = content;
    }
    std::string key(name);
    // Of two declarations the first counts.
    if (_entities.find(key) == _entities.end()) {
      _entities.emplace(key, std::make_unique<PosedEntity>(key, std::move(text)));
    }
  }
  xmlEntityPtr findEntity(std::string_view name) override {
    const auto entity = _entities.find(std::string(name));
    if (entity == _entities.end()) {
      return nullptr;
    }
    _entityText += entity->second->content.size();
    if (_entityText > maximumEntityText) {
      stop("entities that stand for too much text");
      return nullptr;
    }
    return &entity->second->node;
  }

  MallardPageBuilder _builder;
  std::unordered_map<std::string, std::unique_ptr<PosedEntity>> _entities;
  size_t _entityText = 0;
};

}  // namespace

std::optional<Page> readMallardPage(std::string text, platform::Error* error) {
  MallardReader reader;
  std::string why = "empty";
  if (!text.empty() && reader.read(std::move(text), why)) {
    return reader.finish();
  }
  if (error != nullptr) {
    *error = platform::formatError(std::move(why));
  }
  return std::nullopt;
}

}  // namespace bvmake
