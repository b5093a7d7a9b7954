#include <fmt/format.h>
#include <unicode/ustring.h>

#include <bit>
#include <cmath>
#include <limits>
#include <utility>

#include "platform/Exception.h"
#include "platform/PropertyList.h"
#include "platform/PropertyListForms.h"

namespace platform::propertylist {
namespace {

constexpr std::string_view magic = "bplist";
constexpr std::string_view header = "bplist00";
constexpr size_t trailerLength = 32;

// Each object is decoded once, when a container first names it, and kept by number; containers
// under construction lie on a stack of our own. An object's bytes are charged against those there,
// so that overlapping objects cannot stand for more than the file holds.
class BinaryReader {
 public:
  explicit BinaryReader(const Data& data);

  Value read();

 private:
  static constexpr uint16_t unread = 0xFFFF;
  static constexpr uint16_t open = 0xFFFE;

  // What the marker byte and the count behind it say.
  struct Object {
    size_t offset = 0;
    uint8_t type = 0;
    uint8_t low = 0;
    uint64_t count = 0;
    size_t payload = 0;
  };

  struct Container {
    size_t number = 0;
    bool isDictionary = false;
    size_t references = 0;
    size_t count = 0;
    size_t next = 0;
    size_t height = 0;
    Value::Array elements;
    Value::Dictionary entries;
  };

  uint64_t _unsignedAt(size_t offset, size_t size) const;
  size_t _referenceAt(const Container& container, size_t position) const;
  Object _object(size_t number) const;
  size_t _charge(const Object& object, uint64_t units, size_t unitSize);
  void _begin(size_t number);
  void _beginContainer(size_t number, const Object& object);
  void _advance();
  void _close();
  const std::string& _key(const Container& container, size_t position);
  Value _leaf(const Object& object);
  Value _simple(const Object& object) const;
  Value _integer(const Object& object);
  Value _real(const Object& object);
  Value _date(const Object& object);
  Value _asciiString(const Object& object);
  Value _utf16String(const Object& object);
  Value _uid(const Object& object);

  const Data& _data;
  const uint8_t* _bytes;
  size_t _offsetSize = 0;
  size_t _referenceSize = 0;
  size_t _objectCount = 0;
  size_t _top = 0;
  size_t _table = 0;
  size_t _unchargedBytes = 0;
  size_t _keyAllowance = 0;

  std::vector<Value> _values;
  // Nesting below each object that has been read: 0 for leaves.
  std::vector<uint16_t> _heights;
  std::vector<Container> _stack;
};

BinaryReader::BinaryReader(const Data& data) : _data(data), _bytes(data.bytes()) {
  if (data.view().substr(0, header.size()) != header) {
    throw ArchiveException("unknown version of the binary property list", magic.size());
  }
  if (data.length() < header.size() + 1 + trailerLength) {
    throw ArchiveException("binary property list is too short", data.length());
  }
  const size_t trailer = data.length() - trailerLength;
  _offsetSize = _bytes[trailer + 6];
  _referenceSize = _bytes[trailer + 7];
  if (_offsetSize < 1 || _offsetSize > 8) {
    throw ArchiveException(fmt::format("offset size {} is not 1 to 8", _offsetSize), trailer + 6);
  }
  if (_referenceSize < 1 || _referenceSize > 8) {
    throw ArchiveException(fmt::format("reference size {} is not 1 to 8", _referenceSize),
                           trailer + 7);
  }
  const uint64_t objectCount = _unsignedAt(trailer + 8, 8);
  const uint64_t top = _unsignedAt(trailer + 16, 8);
  const uint64_t table = _unsignedAt(trailer + 24, 8);
  if (table <= header.size() || table >= trailer) {
    throw ArchiveException(
        fmt::format("offset table at {} is not between objects and trailer", table), trailer + 24);
  }
  const uint64_t tableLength = trailer - table;
  if (tableLength % _offsetSize != 0 || objectCount != tableLength / _offsetSize) {
    throw ArchiveException(
        fmt::format("offset table of {} bytes does not hold {} offsets", tableLength, objectCount),
        trailer + 8);
  }
  if (objectCount > table - header.size()) {
    throw ArchiveException(
        fmt::format("{} objects in {} bytes", objectCount, table - header.size()), trailer + 8);
  }
  if (top >= objectCount) {
    throw ArchiveException(fmt::format("top object {} of {}", top, objectCount), trailer + 16);
  }
  _objectCount = objectCount;
  _top = top;
  _table = table;
  _unchargedBytes = table - header.size();
  _keyAllowance = keyCopyAllowance(data.length());
}

Value BinaryReader::read() {
  _values.resize(_objectCount);
  _heights.resize(_objectCount, unread);
  _begin(_top);
  while (!_stack.empty()) {
    _advance();
  }
  return _values[_top];
}

uint64_t BinaryReader::_unsignedAt(size_t offset, size_t size) const {
  uint64_t number = 0;
  for (size_t i = 0; i < size; ++i) {
    number = number << 8 | _bytes[offset + i];
  }
  return number;
}

size_t BinaryReader::_referenceAt(const Container& container, size_t position) const {
  const size_t offset = container.references + position * _referenceSize;
  const uint64_t number = _unsignedAt(offset, _referenceSize);
  if (number >= _objectCount) {
    throw ArchiveException(fmt::format("reference to object {} of {}", number, _objectCount),
                           offset);
  }
  return number;
}

BinaryReader::Object BinaryReader::_object(size_t number) const {
  const size_t entry = _table + number * _offsetSize;
  const uint64_t offset = _unsignedAt(entry, _offsetSize);
  if (offset < header.size() || offset >= _table) {
    throw ArchiveException(fmt::format("object {} lies at {}, outside the objects", number, offset),
                           entry);
  }
  Object object;
  object.offset = offset;
  object.type = _bytes[offset] >> 4;
  object.low = _bytes[offset] & 0xF;
  object.count = object.low;
  object.payload = object.offset + 1;

  const bool counted = (object.type >= 0x4 && object.type <= 0x6) || object.type >= 0xA;
  if (counted && object.low == 0xF) {
    const size_t marker = object.payload;
    if (marker >= _table || (_bytes[marker] & 0xFC) != 0x10) {
      throw ArchiveException("count is no integer of 1 to 8 bytes", marker);
    }
    const size_t size = size_t{1} << (_bytes[marker] & 0x3);
    if (size > _table - marker - 1) {
      throw ArchiveException("count runs beyond the objects", marker);
    }
    object.count = _unsignedAt(marker + 1, size);
    object.payload = marker + 1 + size;
  }
  return object;
}

// Checks that the payload is there and returns its length.
size_t BinaryReader::_charge(const Object& object, uint64_t units, size_t unitSize) {
  if (units > (_table - object.payload) / unitSize) {
    throw ArchiveException(
        fmt::format("object of {} times {} bytes runs beyond the objects", units, unitSize),
        object.offset);
  }
  const size_t length = units * unitSize;
  const size_t whole = object.payload - object.offset + length;
  if (whole > _unchargedBytes) {
    throw ArchiveException("object overlaps others", object.offset);
  }
  _unchargedBytes -= whole;
  return length;
}

void BinaryReader::_begin(size_t number) {
  const Object object = _object(number);
  if (object.type == 0xA || object.type == 0xD) {
    _beginContainer(number, object);
    return;
  }
  _values[number] = _leaf(object);
  _heights[number] = 0;
}

void BinaryReader::_beginContainer(size_t number, const Object& object) {
  if (_stack.size() == propertyListMaximumDepth) {
    throw ArchiveException(fmt::format("containers nest deeper than {}", propertyListMaximumDepth),
                           object.offset);
  }
  Container container;
  container.number = number;
  container.isDictionary = object.type == 0xD;
  _charge(object, object.count, _referenceSize * (container.isDictionary ? 2 : 1));
  container.references = object.payload;
  container.count = object.count;
  if (!container.isDictionary) {
    container.elements.reserve(container.count);
  }
  _heights[number] = open;
  _stack.push_back(std::move(container));
}

// Takes one step with the innermost container: adds an element that has been read, begins one that
// has not, or closes the container.
void BinaryReader::_advance() {
  Container& container = _stack.back();
  if (container.next == container.count) {
    _close();
    return;
  }
  const size_t position =
      container.isDictionary ? container.count + container.next : container.next;
  const size_t number = _referenceAt(container, position);
  const uint16_t height = _heights[number];
  if (height == open) {
    throw ArchiveException("container contains itself",
                           container.references + position * _referenceSize);
  }
  if (height == unread) {
    _begin(number);
    return;
  }
  container.height = std::max<size_t>(container.height, height);
  if (container.isDictionary) {
    container.entries.insert_or_assign(_key(container, container.next), _values[number]);
  } else {
    container.elements.push_back(_values[number]);
  }
  ++container.next;
}

void BinaryReader::_close() {
  Container container = std::move(_stack.back());
  _stack.pop_back();
  // The stack alone does not tell: a container may be reached again on a longer path.
  if (container.height + 1 > propertyListMaximumDepth) {
    throw ArchiveException(fmt::format("containers nest deeper than {}", propertyListMaximumDepth),
                           container.references);
  }
  _heights[container.number] = static_cast<uint16_t>(container.height + 1);
  _values[container.number] = container.isDictionary ? Value(std::move(container.entries))
                                                     : Value(std::move(container.elements));
}

const std::string& BinaryReader::_key(const Container& container, size_t position) {
  const size_t number = _referenceAt(container, position);
  const size_t offset = container.references + position * _referenceSize;
  if (_heights[number] == unread) {
    const Object object = _object(number);
    if (object.type != 0x5 && object.type != 0x6) {
      throw ArchiveException("dictionary key is no string", offset);
    }
    _values[number] = _leaf(object);
    _heights[number] = 0;
  }
  const std::string* key = _values[number].stringIf();
  if (!key) {
    throw ArchiveException("dictionary key is no string", offset);
  }
  if (key->size() > _keyAllowance) {
    throw ArchiveException("long keys are shared by too many dictionaries", offset);
  }
  _keyAllowance -= key->size();
  return *key;
}

Value BinaryReader::_leaf(const Object& object) {
  switch (object.type) {
    case 0x0:
      _charge(object, 0, 1);
      return _simple(object);
    case 0x1:
      return _integer(object);
    case 0x2:
      return _real(object);
    case 0x3:
      return _date(object);
    case 0x4: {
      const size_t length = _charge(object, object.count, 1);
      return _data.slice(object.payload, length);
    }
    case 0x5:
      return _asciiString(object);
    case 0x6:
      return _utf16String(object);
    case 0x8:
      return _uid(object);
    case 0xB:
    case 0xC:
      throw ArchiveException("sets are not supported", object.offset);
    default:
      throw ArchiveException(fmt::format("unknown marker 0x{:02x}", _bytes[object.offset]),
                             object.offset);
  }
}

Value BinaryReader::_simple(const Object& object) const {
  switch (object.low) {
    case 0x8:
      return false;
    case 0x9:
      return true;
    case 0x0:
      throw ArchiveException("null is no value of a property list", object.offset);
    default:
      throw ArchiveException(fmt::format("unknown marker 0x{:02x}", _bytes[object.offset]),
                             object.offset);
  }
}

// 1, 2 and 4 bytes are unsigned, 8 and 16 bytes are signed.
Value BinaryReader::_integer(const Object& object) {
  if (object.low > 4) {
    throw ArchiveException("integer of more than 16 bytes", object.offset);
  }
  const size_t size = size_t{1} << object.low;
  _charge(object, 1, size);
  if (size < 8) {
    return _unsignedAt(object.payload, size);
  }
  if (size == 8) {
    return static_cast<int64_t>(_unsignedAt(object.payload, 8));
  }
  const uint64_t high = _unsignedAt(object.payload, 8);
  const uint64_t low = _unsignedAt(object.payload + 8, 8);
  if (high == 0) {
    return low;
  }
  if (high == std::numeric_limits<uint64_t>::max() && low >> 63 != 0) {
    return static_cast<int64_t>(low);
  }
  throw ArchiveException("integer of 16 bytes is out of range", object.offset);
}

Value BinaryReader::_real(const Object& object) {
  if (object.low == 2) {
    _charge(object, 1, 4);
    const auto bits = static_cast<uint32_t>(_unsignedAt(object.payload, 4));
    return static_cast<double>(std::bit_cast<float>(bits));
  }
  if (object.low == 3) {
    _charge(object, 1, 8);
    return std::bit_cast<double>(_unsignedAt(object.payload, 8));
  }
  throw ArchiveException("real is not of 4 or 8 bytes", object.offset);
}

Value BinaryReader::_date(const Object& object) {
  if (object.low != 3) {
    throw ArchiveException("date is not of 8 bytes", object.offset);
  }
  _charge(object, 1, 8);
  const auto seconds = std::bit_cast<double>(_unsignedAt(object.payload, 8));
  if (!std::isfinite(seconds)) {
    throw ArchiveException("date is no number", object.offset);
  }
  return Date{seconds};
}

Value BinaryReader::_asciiString(const Object& object) {
  const size_t length = _charge(object, object.count, 1);
  std::string text(_data.view().substr(object.payload, length));
  for (size_t i = 0; i < length; ++i) {
    if (static_cast<unsigned char>(text[i]) >= 0x80) {
      throw ArchiveException("string is not ASCII", object.payload + i);
    }
  }
  return Value(std::move(text));
}

Value BinaryReader::_utf16String(const Object& object) {
  const size_t length = _charge(object, object.count, 2);
  const size_t units = length / 2;
  // A unit takes three bytes of UTF-8 at most, and ICU counts them as int32_t.
  if (units > std::numeric_limits<int32_t>::max() / 3) {
    throw ArchiveException("string is too long", object.offset);
  }
  std::u16string wide(units, u'\0');
  for (size_t i = 0; i < units; ++i) {
    wide[i] = static_cast<char16_t>(_unsignedAt(object.payload + 2 * i, 2));
  }
  std::string text(units * 3, '\0');
  int32_t written = 0;
  UErrorCode status = U_ZERO_ERROR;
  u_strToUTF8(text.data(), static_cast<int32_t>(text.size()), &written, wide.data(),
              static_cast<int32_t>(units), &status);
  if (U_FAILURE(status)) {
    throw ArchiveException("UTF-16 string has a surrogate without its pair", object.offset);
  }
  text.resize(static_cast<size_t>(written));
  text.shrink_to_fit();
  return Value(std::move(text));
}

Value BinaryReader::_uid(const Object& object) {
  if (object.low > 7) {
    throw ArchiveException("UID of more than 8 bytes", object.offset);
  }
  const size_t size = size_t{1} + object.low;
  _charge(object, 1, size);
  return UID{_unsignedAt(object.payload, size)};
}

}  // namespace

bool isBinary(const Data& data) { return data.view().substr(0, magic.size()) == magic; }

Value valueFromBinary(const Data& data) { return BinaryReader(data).read(); }

}  // namespace platform::propertylist
