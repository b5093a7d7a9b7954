#include <bit>
#include <cmath>
#include <limits>
#include <unordered_map>
#include <utility>

#include "platform/ClassicArchiveFormat.h"

namespace platform::classicarchive {

namespace {

[[noreturn]] void fail(const std::string& reason) {
  throw Exception(invalidArgumentException, "classic archive: " + reason);
}

/// Whether a real is written as an integer. Minus zero is not: it would lose its sign.
bool isWrittenAsInteger(double real) {
  return real >= -2147483648.0 && real <= 2147483647.0 && real == std::trunc(real) &&
         !(real == 0 && std::signbit(real));
}

class Writer {
 public:
  explicit Writer(const ClassicArchive& archive) : _archive(archive) {}

  Data write() {
    nodesChildrenFirst(_archive, _archive.roots);
    _writeHeader();
    _entityOfNode.assign(_archive.nodes.size(), noEntity);
    for (const NodeIndex root : _archive.roots) {
      _writeTree(root);
    }
    return Data::adopt(std::move(_out));
  }

 private:
  static constexpr uint64_t noEntity = std::numeric_limits<uint64_t>::max();

  /// A container whose children are being written.
  struct Frame {
    const ClassicArchive::Node* node;
    size_t next;
  };

  /// A type code that numbers or values have had: its C string, and the type itself.
  struct Code {
    uint64_t entity;
    ScalarType type;
  };

  // ---- Bytes and integers

  void _writeByte(uint8_t byte) { _out.push_back(static_cast<char>(byte)); }

  void _writeFixed(uint64_t bits, size_t width) {
    for (size_t i = 0; i < width; ++i) {
      const size_t significance = _isBigEndian ? width - 1 - i : i;
      _writeByte(static_cast<uint8_t>(bits >> (8 * significance)));
    }
  }

  void _writeInteger(int64_t integer) {
    const auto bits = static_cast<uint64_t>(integer);
    if (integer >= referenceBase && integer <= std::numeric_limits<int8_t>::max()) {
      _writeByte(static_cast<uint8_t>(bits));
    } else if (std::in_range<int16_t>(integer)) {
      _writeByte(int16Tag);
      _writeFixed(bits, 2);
    } else if (std::in_range<int32_t>(integer)) {
      _writeByte(int32Tag);
      _writeFixed(bits, 4);
    } else {
      _writeByte(int64Tag);
      _writeFixed(bits, 8);
    }
  }

  void _writeCount(size_t count) {
    if (!std::in_range<int32_t>(count)) {
      fail("more than 2^31 - 1 elements or bytes in one object");
    }
    _writeInteger(static_cast<int64_t>(count));
  }

  void _writeReal(char code, double real) {
    if (isWrittenAsInteger(real)) {
      _writeInteger(static_cast<int64_t>(real));
      return;
    }
    _writeByte(realTag);
    if (code == 'd') {
      _writeFixed(std::bit_cast<uint64_t>(real), 8);
      return;
    }
    if (std::isfinite(real) && std::abs(real) > std::numeric_limits<float>::max()) {
      fail("real out of the range of type \"f\"");
    }
    _writeFixed(std::bit_cast<uint32_t>(static_cast<float>(real)), 4);
  }

  void _writeScalar(char code, const Scalar& scalar) {
    if (code == 'f' || code == 'd') {
      const auto* real = std::get_if<double>(&scalar);
      if (real == nullptr) {
        fail("integer under a type code for reals");
      }
      // Rounded first, as a float that is whole only after rounding is written as an integer.
      _writeReal(code, code == 'f' ? _rounded(*real) : *real);
      return;
    }
    const auto* integer = std::get_if<int64_t>(&scalar);
    if (integer == nullptr) {
      fail("real under a type code for integers");
    }
    _writeIntegerOfCode(code, *integer);
  }

  static double _rounded(double real) {
    const bool fits = !std::isfinite(real) || std::abs(real) <= std::numeric_limits<float>::max();
    return fits ? static_cast<double>(static_cast<float>(real)) : real;
  }

  void _writeIntegerOfCode(char code, int64_t integer) {
    const std::optional<IntegerRange> range = integerRange(code);
    if (!range) {
      const int64_t minimum = code == 'c' ? -128 : 0;
      const int64_t maximum = code == 'c' ? 127 : 255;
      if (integer < minimum || integer > maximum) {
        fail("integer out of the range of type " + quoted({&code, 1}));
      }
      _writeByte(static_cast<uint8_t>(integer));
      return;
    }
    const int64_t minimum = range->wrap == 0 ? range->minimum : 0;
    if (integer < minimum || integer > range->maximum) {
      fail("integer out of the range of type " + quoted({&code, 1}));
    }
    // The upper half of an unsigned range is written as the negative number of the same bits.
    const bool wraps = range->wrap != 0 && integer >= range->wrap / 2 && integer < range->wrap;
    _writeInteger(wraps ? integer - range->wrap : integer);
  }

  // ---- Strings and the two tables

  void _writeReference(uint64_t entry) {
    _writeInteger(static_cast<int64_t>(entry) + referenceBase);
  }

  void _writeUnsharedString(std::string_view string) {
    _writeInteger(static_cast<int64_t>(string.size()));
    _out.append(string);
  }

  void _writeSharedString(std::string_view string) {
    const auto [entry, isNew] = _strings.try_emplace(std::string(string), _strings.size());
    if (!isNew) {
      _writeReference(entry->second);
      return;
    }
    _writeByte(newTag);
    _writeUnsharedString(string);
  }

  /// The C string of a type code; each distinct one is written once.
  const ScalarType& _writeCode(const std::string& text) {
    const auto found = _codes.find(text);
    if (found != _codes.end()) {
      _writeReference(found->second.entity);
      return found->second.type;
    }
    std::string problem;
    std::optional<ScalarType> type = ScalarType::parse(text, problem);
    if (!type) {
      fail(problem);
    }
    _writeByte(newTag);
    _writeSharedString(text);
    return _codes.emplace(text, Code{_entityCount++, std::move(*type)}).first->second.type;
  }

  // ---- Objects

  void _writeHeader() {
    if (_archive.streamerVersion != 3 && _archive.streamerVersion != 4) {
      fail("streamer version " + std::to_string(_archive.streamerVersion));
    }
    if (_archive.roots.empty()) {
      fail("no root");
    }
    // Enough for nearly every archive: no class takes more around its content.
    constexpr size_t bytesAroundNode = 24;
    size_t size = 256;
    for (const ClassicArchive::Node& node : _archive.nodes) {
      size += bytesAroundNode + node.bytes.length() + node.scalars.values.size();
    }
    _out.reserve(size);
    _isBigEndian = _archive.byteOrder == ClassicArchive::ByteOrder::bigEndian;
    _writeByte(_archive.streamerVersion);
    _writeUnsharedString(_isBigEndian ? bigEndianSignature : littleEndianSignature);
    _writeInteger(_archive.systemVersion);
  }

  void _writeTree(NodeIndex root) {
    _writeObject(root);
    while (!_frames.empty()) {
      Frame& frame = _frames.back();
      if (frame.next == frame.node->children.size()) {
        _writeByte(endTag);
        _frames.pop_back();
        continue;
      }
      _writeObject(frame.node->children[frame.next++]);
    }
  }

  /// Writes the group of an object; of a container only the beginning, and leaves it on _frames.
  void _writeObject(NodeIndex index) {
    _writeSharedString("@");
    if (index == ClassicArchive::nil) {
      _writeByte(nilTag);
      return;
    }
    if (_entityOfNode[index] != noEntity) {
      _writeReference(_entityOfNode[index]);
      return;
    }
    if (_frames.size() >= maximumDepth) {
      fail("objects nested too deep");
    }
    const ClassicArchive::Node& node = _archive.nodes[index];
    _entityOfNode[index] = _entityCount++;
    _writeByte(newTag);
    _writeClass(node.nodeClass);
    switch (node.nodeClass) {
      case Class::array:
      case Class::mutableArray:
      case Class::dictionary:
      case Class::mutableDictionary: {
        const bool isDictionary =
            node.nodeClass == Class::dictionary || node.nodeClass == Class::mutableDictionary;
        _writeSharedString("i");
        _writeCount(isDictionary ? node.children.size() / 2 : node.children.size());
        _frames.push_back({&node, 0});
        return;
      }
      case Class::string:
        _writeSharedString("+");
        _writeUnsharedString(node.bytes.view());
        break;
      case Class::data:
      case Class::mutableData:
        _writeSharedString("i");
        _writeCount(node.bytes.length());
        _writeSharedString("[" + std::to_string(node.bytes.length()) + "c]");
        _out.append(node.bytes.view());
        break;
      case Class::number:
      case Class::value:
        _writeScalars(node);
        break;
      case Class::object:
        break;
    }
    _writeByte(endTag);
  }

  void _writeClass(std::optional<Class> archivedClass) {
    for (; archivedClass; archivedClass = description(*archivedClass).superclass) {
      uint64_t& entity = _entityOfClass[static_cast<size_t>(*archivedClass)];
      if (entity != noEntity) {
        _writeReference(entity);
        return;
      }
      entity = _entityCount++;
      _writeByte(newTag);
      _writeSharedString(description(*archivedClass).name);
      _writeInteger(description(*archivedClass).version);
    }
    _writeByte(nilTag);
  }

  void _writeScalars(const ClassicArchive::Node& node) {
    const ClassicArchive::Scalars& scalars = node.scalars;
    _writeSharedString("*");
    const ScalarType& type = _writeCode(scalars.typeCode);
    if (node.nodeClass == Class::number && !type.isPlain()) {
      fail("number of type " + quoted(scalars.typeCode));
    }
    if (scalars.values.size() != type.scalarCount()) {
      fail("not as many scalars as type " + quoted(scalars.typeCode) + " has");
    }
    _writeSharedString(scalars.typeCode);
    size_t next = 0;
    type.forEachScalar([&](char code) { _writeScalar(code, scalars.values[next++]); });
  }

  const ClassicArchive& _archive;
  bool _isBigEndian = false;
  std::string _out;
  std::unordered_map<std::string, uint64_t> _strings;
  std::unordered_map<std::string, Code> _codes;
  std::vector<uint64_t> _entityOfNode;
  std::array<uint64_t, classCount> _entityOfClass = [] {
    std::array<uint64_t, classCount> none{};
    none.fill(noEntity);
    return none;
  }();
  uint64_t _entityCount = 0;
  std::vector<Frame> _frames;
};

}  // namespace

Data encode(const ClassicArchive& archive) { return Writer(archive).write(); }

}  // namespace platform::classicarchive
