#include "platform/PropertyList.h"

#include <utility>

#include "platform/Environment.h"
#include "platform/Exception.h"
#include "platform/PropertyListForms.h"
#include "platform/Strings.h"

namespace platform {

std::optional<Value> propertyListFromData(const Data& data, Error* error,
                                          PropertyListFormat* format) {
  try {
    const bool binary = propertylist::isBinary(data);
    Value value = binary ? propertylist::valueFromBinary(data) : propertylist::valueFromXML(data);
    if (format) {
      *format = binary ? PropertyListFormat::binary : PropertyListFormat::xml;
    }
    return value;
  } catch (const Exception& exception) {
    if (error) {
      *error = formatError(exception.reason());
    }
    return std::nullopt;
  }
}

std::optional<Value> propertyListFromFile(const std::string& path, Error* error) {
  const std::optional<Data> data = Environment::current()->files->contentsAtPath(path, error);
  if (!data) {
    return std::nullopt;
  }
  return propertyListFromData(*data, error);
}

Data dataFromPropertyList(const Value& value, PropertyListFormat format) {
  return format == PropertyListFormat::binary ? propertylist::binaryFromValue(value)
                                              : propertylist::xmlFromValue(value);
}

std::optional<Value> dictionaryWithContentsOfFile(const std::string& path) {
  std::optional<Value> value = propertyListFromFile(path);
  if (!value || !value->dictionaryIf()) {
    return std::nullopt;
  }
  return value;
}

namespace propertylist {

std::string quoted(std::string_view text) {
  constexpr size_t longest = 80;
  const bool cut = text.size() > longest;
  std::string shown = stringByRepairingUTF8(text.substr(0, longest));
  for (char& character : shown) {
    if (static_cast<unsigned char>(character) < 0x20 || character == 0x7F) {
      character = '?';
    }
  }
  return '"' + shown + (cut ? "…\"" : "\"");
}

}  // namespace propertylist
}  // namespace platform
