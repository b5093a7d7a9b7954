#include <fmt/format.h>

#include <algorithm>
#include <chrono>
#include <cmath>
#include <unordered_map>
#include <utility>

#include "platform/Base64.h"
#include "platform/Exception.h"
#include "platform/PropertyList.h"
#include "platform/PropertyListForms.h"
#include "platform/Strings.h"

namespace platform::propertylist {
namespace {

[[noreturn]] void refuse(const std::string& reason) {
  throw Exception(invalidArgumentException, reason);
}

// Whether the text begins with a character that XML has no way to write. `text` is UTF-8.
bool isRefusedCharacter(std::string_view text) {
  const char first = text.front();
  if (static_cast<unsigned char>(first) < 0x20) {
    return first != '\t' && first != '\n' && first != '\r';
  }
  return first == '\xEF' && (text == "\xEF\xBF\xBE" || text == "\xEF\xBF\xBF");
}

class XMLWriter {
 public:
  Data write(const Value& root);

 private:
  size_t _leastLength(const Value& value, size_t depth);
  void _checkLength(size_t further) const;
  void _put(std::string_view text);
  void _indent(size_t depth);
  void _putElement(std::string_view name, std::string_view text);
  void _putText(std::string_view name, std::string_view text);
  void _putValue(const Value& value, size_t depth);
  void _putReal(double number);
  void _putDate(Date date);
  void _putArray(const Value::Array& elements, size_t depth);
  void _putDictionary(const Value::Dictionary& entries, size_t depth);

  std::string _out;
  std::unordered_map<const void*, size_t> _leastLengths;
};

Data XMLWriter::write(const Value& root) {
  _checkLength(_leastLength(root, 0));
  _put("<?xml version=\"1.0\" encoding=\"UTF-8\"?>\n<plist version=\"1.0\">\n");
  _putValue(root, 0);
  _put("</plist>\n");
  return Data::adopt(std::move(_out));
}

// What the value takes at the very least, each shared container looked at once: tells a text that
// would be endless before any of it is written. What nests too deep is left for the writing to
// find.
size_t XMLWriter::_leastLength(const Value& value, size_t depth) {
  constexpr size_t shortestElement = 8;
  if (const std::string* text = value.stringIf()) {
    return shortestElement + text->size();
  }
  if (const Data* bytes = value.dataIf()) {
    return shortestElement + bytes->length();
  }
  const bool isContainer = value.arrayIf() || value.dictionaryIf();
  if (!isContainer || depth == propertyListMaximumDepth) {
    return shortestElement;
  }
  const auto known = _leastLengths.find(value.identity());
  if (known != _leastLengths.end()) {
    return known->second;
  }
  size_t length = shortestElement;
  // Beyond the limit it makes no difference by how much.
  const auto add = [&](size_t further) {
    length = std::min(length + further, propertyListMaximumXMLLength + 1);
  };
  if (const Value::Array* elements = value.arrayIf()) {
    for (const Value& element : *elements) {
      add(_leastLength(element, depth + 1));
    }
  } else {
    for (const auto& [key, element] : *value.dictionaryIf()) {
      add(key.size());
      add(_leastLength(element, depth + 1));
    }
  }
  _leastLengths.emplace(value.identity(), length);
  return length;
}

void XMLWriter::_checkLength(size_t further) const {
  if (further > propertyListMaximumXMLLength - _out.size()) {
    refuse(fmt::format("the XML text is longer than {} bytes", propertyListMaximumXMLLength));
  }
}

void XMLWriter::_put(std::string_view text) {
  _checkLength(text.size());
  _out += text;
}

void XMLWriter::_indent(size_t depth) {
  for (size_t i = 0; i < depth; ++i) {
    _put("\t");
  }
}

void XMLWriter::_putElement(std::string_view name, std::string_view text) {
  _put("<");
  _put(name);
  _put(">");
  _put(text);
  _put("</");
  _put(name);
  _put(">\n");
}

void XMLWriter::_putText(std::string_view name, std::string_view text) {
  if (!isValidUTF8(text)) {
    refuse(fmt::format("string {} is not well-formed UTF-8", quoted(text)));
  }
  std::string escaped;
  escaped.reserve(text.size());
  for (size_t i = 0; i < text.size(); ++i) {
    const char character = text[i];
    if (isRefusedCharacter(text.substr(i, 3))) {
      refuse(fmt::format("string {} has a character that XML cannot hold", quoted(text)));
    }
    switch (character) {
      case '&':
        escaped += "&amp;";
        break;
      case '<':
        escaped += "&lt;";
        break;
      case '>':
        escaped += "&gt;";
        break;
      case '\r':
        // As it stands it would be read as a line feed.
        escaped += "&#13;";
        break;
      default:
        escaped += character;
        break;
    }
  }
  _putElement(name, escaped);
}

// `depth` is the number of containers around the value.
void XMLWriter::_putValue(const Value& value, size_t depth) {
  _indent(depth);
  switch (value.kind()) {
    case Value::Kind::absent:
      refuse("a property list cannot hold an absent value");
    case Value::Kind::url:
      refuse("a property list cannot hold a URL");
    case Value::Kind::boolean:
      _put(value.boolValue() ? "<true/>\n" : "<false/>\n");
      break;
    case Value::Kind::integer:
      _putElement("integer", value.isAboveSignedRange() ? fmt::format("{}", value.unsignedValue())
                                                        : fmt::format("{}", value.integerValue()));
      break;
    case Value::Kind::real:
      _putReal(value.doubleValue());
      break;
    case Value::Kind::date:
      _putDate(*value.dateIf());
      break;
    case Value::Kind::uid:
      _put(fmt::format("<dict><key>CF$UID</key><integer>{}</integer></dict>\n",
                       value.uidIf()->index));
      break;
    case Value::Kind::string:
      _putText("string", *value.stringIf());
      break;
    case Value::Kind::data:
      _putElement("data", base64FromBytes(value.dataIf()->view()));
      break;
    case Value::Kind::array:
      _putArray(*value.arrayIf(), depth);
      break;
    case Value::Kind::dictionary:
      _putDictionary(*value.dictionaryIf(), depth);
      break;
  }
}

void XMLWriter::_putReal(double number) {
  if (std::isnan(number)) {
    _putElement("real", "nan");
  } else if (std::isinf(number)) {
    _putElement("real", number > 0 ? "+infinity" : "-infinity");
  } else {
    _putElement("real", fmt::format("{}", number));
  }
}

void XMLWriter::_putDate(Date date) {
  using namespace std::chrono;
  constexpr sys_days reference = year{2001} / 1 / 1;
  constexpr double first = duration<double>(sys_days(year{1} / 1 / 1) - reference).count();
  constexpr double end = duration<double>(sys_days(year{10000} / 1 / 1) - reference).count();
  const double whole = std::floor(date.secondsSinceReference);
  if (!(whole >= first && whole < end)) {
    refuse("the XML form cannot hold a date outside the years 1 to 9999");
  }
  const sys_seconds time = reference + seconds(static_cast<int64_t>(whole));
  const sys_days day = floor<days>(time);
  const year_month_day calendar = day;
  const hh_mm_ss clock(time - day);
  _putElement(
      "date",
      fmt::format("{:04}-{:02}-{:02}T{:02}:{:02}:{:02}Z", static_cast<int>(calendar.year()),
                  static_cast<unsigned>(calendar.month()), static_cast<unsigned>(calendar.day()),
                  clock.hours().count(), clock.minutes().count(), clock.seconds().count()));
}

void XMLWriter::_putArray(const Value::Array& elements, size_t depth) {
  if (depth == propertyListMaximumDepth) {
    refuse(fmt::format("containers nest deeper than {}", propertyListMaximumDepth));
  }
  if (elements.empty()) {
    _put("<array/>\n");
    return;
  }
  _put("<array>\n");
  for (const Value& element : elements) {
    _putValue(element, depth + 1);
  }
  _indent(depth);
  _put("</array>\n");
}

void XMLWriter::_putDictionary(const Value::Dictionary& entries, size_t depth) {
  if (depth == propertyListMaximumDepth) {
    refuse(fmt::format("containers nest deeper than {}", propertyListMaximumDepth));
  }
  if (entries.empty()) {
    _put("<dict/>\n");
    return;
  }
  if (entries.size() == 1 && entries.begin()->first == "CF$UID" &&
      entries.begin()->second.kind() == Value::Kind::integer &&
      entries.begin()->second.integerValue() >= 0) {
    refuse("a dictionary of the single key \"CF$UID\" would be read as a UID");
  }
  _put("<dict>\n");
  for (const auto& [key, value] : entries) {
    _indent(depth + 1);
    _putText("key", key);
    _putValue(value, depth + 1);
  }
  _indent(depth);
  _put("</dict>\n");
}

}  // namespace

Data xmlFromValue(const Value& value) { return XMLWriter().write(value); }

}  // namespace platform::propertylist
