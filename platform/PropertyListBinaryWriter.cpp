#include <fmt/format.h>
#include <unicode/ustring.h>

#include <algorithm>
#include <bit>
#include <cmath>
#include <limits>
#include <span>
#include <utility>

#include "platform/Exception.h"
#include "platform/PropertyList.h"
#include "platform/PropertyListForms.h"

namespace platform::propertylist {
namespace {

constexpr std::string_view header = "bplist00";

[[noreturn]] void refuse(const std::string& reason) {
  throw Exception(invalidArgumentException, reason);
}

// Bytes that the number takes, at least one.
size_t byteCount(uint64_t number) {
  return number == 0 ? 1 : (static_cast<size_t>(std::bit_width(number)) + 7) / 8;
}

// A number, boolean, date or UID: what makes two of them the same object.
struct Scalar {
  Value::Kind kind;
  bool negative;
  uint64_t bits;
  friend bool operator==(const Scalar&, const Scalar&) = default;
};

struct ScalarHash {
  size_t operator()(const Scalar& scalar) const noexcept {
    const uint64_t mixed =
        (scalar.bits + static_cast<uint64_t>(scalar.kind)) * 0x9E3779B97F4A7C15ULL;
    return static_cast<size_t>(mixed ^ mixed >> 32);
  }
};

// First numbers the objects, a container before its keys, its keys before its values, then writes
// them in that order.
class BinaryWriter {
 public:
  explicit BinaryWriter(const KeyOrder& keyOrder) : _keyOrder(keyOrder) {}

  Data write(const Value& root);

 private:
  struct Object {
    // Null for a dictionary key, which is `text` alone.
    const Value* value = nullptr;
    std::string_view text;
    size_t firstReference = 0;
    size_t referenceCount = 0;
    uint16_t height = 0;
  };

  size_t _add(const Value& value, size_t depth);
  size_t _addObject(const Value* value, std::string_view text = {});
  size_t _addText(const Value* value, std::string_view text);
  size_t _addScalar(const Value& value);
  size_t _addContainer(const Value& value, size_t depth);
  void _addEntries(const Value& dictionary, size_t depth, std::vector<size_t>& references);

  void _putObject(const Object& object);
  void _putUnsigned(uint64_t number, size_t size);
  void _putMarker(int type, size_t low);
  void _putCount(int type, size_t count);
  void _putInteger(uint64_t number);
  void _putNumber(const Value& value);
  void _putText(std::string_view text);
  void _putReferences(const Object& object);
  void _putTrailer(size_t offsetSize, size_t table);

  const KeyOrder& _keyOrder;
  std::vector<Object> _objects;
  std::vector<size_t> _references;
  std::unordered_map<std::string_view, size_t> _texts;
  std::unordered_map<std::string_view, size_t> _datas;
  std::unordered_map<Scalar, size_t, ScalarHash> _scalars;
  std::unordered_map<const void*, size_t> _containers;
  size_t _referenceSize = 0;
  std::string _out;
};

Data BinaryWriter::write(const Value& root) {
  _add(root, 0);
  // The strictest readers want sizes that hold the number of objects and the table's own offset.
  _referenceSize = byteCount(_objects.size());
  _out = header;
  std::vector<size_t> offsets;
  offsets.reserve(_objects.size());
  for (const Object& object : _objects) {
    offsets.push_back(_out.size());
    _putObject(object);
  }
  const size_t table = _out.size();
  const size_t offsetSize = byteCount(table);
  for (const size_t offset : offsets) {
    _putUnsigned(offset, offsetSize);
  }
  _putTrailer(offsetSize, table);
  return Data::adopt(std::move(_out));
}

// `depth` is the number of containers around the value. Returns the object's number.
size_t BinaryWriter::_add(const Value& value, size_t depth) {
  switch (value.kind()) {
    case Value::Kind::absent:
      refuse("a property list cannot hold an absent value");
    case Value::Kind::url:
      refuse("a property list cannot hold a URL");
    case Value::Kind::string:
      return _addText(&value, *value.stringIf());
    case Value::Kind::data: {
      const auto [found, isNew] = _datas.try_emplace(value.dataIf()->view(), _objects.size());
      return isNew ? _addObject(&value) : found->second;
    }
    case Value::Kind::array:
    case Value::Kind::dictionary:
      return _addContainer(value, depth);
    default:
      return _addScalar(value);
  }
}

size_t BinaryWriter::_addObject(const Value* value, std::string_view text) {
  Object object;
  object.value = value;
  object.text = text;
  _objects.push_back(object);
  return _objects.size() - 1;
}

size_t BinaryWriter::_addText(const Value* value, std::string_view text) {
  const auto [found, isNew] = _texts.try_emplace(text, _objects.size());
  return isNew ? _addObject(value, text) : found->second;
}

size_t BinaryWriter::_addScalar(const Value& value) {
  Scalar scalar{value.kind(), false, 0};
  switch (value.kind()) {
    case Value::Kind::integer:
      scalar.negative = value.integerValue() < 0;
      scalar.bits =
          scalar.negative ? static_cast<uint64_t>(value.integerValue()) : value.unsignedValue();
      break;
    case Value::Kind::real:
      scalar.bits = std::bit_cast<uint64_t>(value.doubleValue());
      break;
    case Value::Kind::date:
      if (!std::isfinite(value.dateIf()->secondsSinceReference)) {
        refuse("a property list cannot hold a date that is no number");
      }
      scalar.bits = std::bit_cast<uint64_t>(value.dateIf()->secondsSinceReference);
      break;
    case Value::Kind::uid:
      scalar.bits = value.uidIf()->index;
      break;
    default:
      scalar.bits = value.boolValue() ? 1 : 0;
      break;
  }
  const auto [found, isNew] = _scalars.try_emplace(scalar, _objects.size());
  return isNew ? _addObject(&value) : found->second;
}

size_t BinaryWriter::_addContainer(const Value& value, size_t depth) {
  const auto [found, isNew] = _containers.try_emplace(value.identity(), _objects.size());
  const size_t height = isNew ? 1 : _objects[found->second].height;
  if (depth + height > propertyListMaximumDepth) {
    refuse(fmt::format("containers nest deeper than {}", propertyListMaximumDepth));
  }
  if (!isNew) {
    return found->second;
  }
  const size_t number = _addObject(&value);
  std::vector<size_t> references;
  if (const Value::Array* elements = value.arrayIf()) {
    references.reserve(elements->size());
    for (const Value& element : *elements) {
      references.push_back(_add(element, depth + 1));
    }
  } else {
    _addEntries(value, depth, references);
  }
  size_t below = 0;
  for (const size_t reference : references) {
    below = std::max<size_t>(below, _objects[reference].height);
  }
  Object& object = _objects[number];
  object.height = static_cast<uint16_t>(below + 1);
  object.firstReference = _references.size();
  object.referenceCount = references.size();
  _references.insert(_references.end(), references.begin(), references.end());
  return number;
}

void BinaryWriter::_addEntries(const Value& dictionary, size_t depth,
                               std::vector<size_t>& references) {
  const Value::Dictionary& entries = *dictionary.dictionaryIf();
  references.reserve(entries.size() * 2);
  std::vector<const Value::Dictionary::value_type*> ordered;
  ordered.reserve(entries.size());
  const auto order = _keyOrder.find(dictionary.identity());
  if (order == _keyOrder.end()) {
    for (const auto& entry : entries) {
      ordered.push_back(&entry);
    }
  } else {
    for (const std::string& key : order->second) {
      ordered.push_back(&*entries.find(key));
    }
  }
  for (const auto* entry : ordered) {
    references.push_back(_addText(nullptr, entry->first));
  }
  for (const auto* entry : ordered) {
    references.push_back(_add(entry->second, depth + 1));
  }
}

void BinaryWriter::_putObject(const Object& object) {
  if (!object.value) {
    _putText(object.text);
    return;
  }
  const Value& value = *object.value;
  switch (value.kind()) {
    case Value::Kind::string:
      _putText(object.text);
      break;
    case Value::Kind::data:
      _putCount(0x4, value.dataIf()->length());
      _out += value.dataIf()->view();
      break;
    case Value::Kind::array:
      _putCount(0xA, object.referenceCount);
      _putReferences(object);
      break;
    case Value::Kind::dictionary:
      _putCount(0xD, object.referenceCount / 2);
      _putReferences(object);
      break;
    default:
      _putNumber(value);
      break;
  }
}

void BinaryWriter::_putUnsigned(uint64_t number, size_t size) {
  for (size_t i = size; i-- > 0;) {
    _out += static_cast<char>(static_cast<uint8_t>(number >> (8 * i)));
  }
}

void BinaryWriter::_putMarker(int type, size_t low) {
  _putUnsigned(static_cast<uint64_t>(type) << 4 | low, 1);
}

void BinaryWriter::_putCount(int type, size_t count) {
  if (count < 0xF) {
    _putMarker(type, count);
    return;
  }
  _putMarker(type, 0xF);
  _putInteger(count);
}

// Numbers above the signed range take sixteen bytes, for eight are read as signed.
void BinaryWriter::_putInteger(uint64_t number) {
  if (number > static_cast<uint64_t>(std::numeric_limits<int64_t>::max())) {
    _putMarker(0x1, 4);
    _putUnsigned(0, 8);
    _putUnsigned(number, 8);
    return;
  }
  const auto exponent = static_cast<size_t>(std::bit_width(byteCount(number) - 1));
  _putMarker(0x1, exponent);
  _putUnsigned(number, size_t{1} << exponent);
}

void BinaryWriter::_putNumber(const Value& value) {
  switch (value.kind()) {
    case Value::Kind::integer:
      if (value.integerValue() < 0) {
        _putMarker(0x1, 3);
        _putUnsigned(static_cast<uint64_t>(value.integerValue()), 8);
      } else {
        _putInteger(value.unsignedValue());
      }
      break;
    case Value::Kind::real:
      _putMarker(0x2, 3);
      _putUnsigned(std::bit_cast<uint64_t>(value.doubleValue()), 8);
      break;
    case Value::Kind::date:
      _putMarker(0x3, 3);
      _putUnsigned(std::bit_cast<uint64_t>(value.dateIf()->secondsSinceReference), 8);
      break;
    case Value::Kind::uid: {
      const size_t size = std::bit_ceil(byteCount(value.uidIf()->index));
      _putMarker(0x8, size - 1);
      _putUnsigned(value.uidIf()->index, size);
      break;
    }
    default:
      _putMarker(0x0, value.boolValue() ? 0x9 : 0x8);
      break;
  }
}

void BinaryWriter::_putText(std::string_view text) {
  const bool ascii = std::all_of(text.begin(), text.end(), [](char character) {
    return static_cast<unsigned char>(character) < 0x80;
  });
  if (ascii) {
    _putCount(0x5, text.size());
    _out += text;
    return;
  }
  if (text.size() > std::numeric_limits<int32_t>::max()) {
    refuse("string is too long");
  }
  std::u16string wide(text.size(), u'\0');
  int32_t units = 0;
  UErrorCode status = U_ZERO_ERROR;
  u_strFromUTF8(wide.data(), static_cast<int32_t>(wide.size()), &units, text.data(),
                static_cast<int32_t>(text.size()), &status);
  if (U_FAILURE(status)) {
    refuse(fmt::format("string {} is not well-formed UTF-8", quoted(text)));
  }
  wide.resize(static_cast<size_t>(units));
  _putCount(0x6, wide.size());
  for (const char16_t unit : wide) {
    _putUnsigned(unit, 2);
  }
}

void BinaryWriter::_putReferences(const Object& object) {
  for (const size_t reference :
       std::span(_references).subspan(object.firstReference, object.referenceCount)) {
    _putUnsigned(reference, _referenceSize);
  }
}

void BinaryWriter::_putTrailer(size_t offsetSize, size_t table) {
  _out.append(6, '\0');
  _putUnsigned(offsetSize, 1);
  _putUnsigned(_referenceSize, 1);
  _putUnsigned(_objects.size(), 8);
  _putUnsigned(0, 8);
  _putUnsigned(table, 8);
}

}  // namespace

Data binaryFromValue(const Value& value, const KeyOrder& keyOrder) {
  return BinaryWriter(keyOrder).write(value);
}

}  // namespace platform::propertylist
