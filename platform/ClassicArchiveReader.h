// The parser of classic archives. Private to the two that read them: into a graph, and into a
// value.
#pragma once

#include <bit>
#include <cstring>
#include <limits>
#include <memory>
#include <optional>
#include <span>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

#include "platform/ClassicArchiveFormat.h"

namespace platform::classicarchive {

/// Reads an archive and tells a sink what is in it:
///
///     void readHeader(ClassicArchive::ByteOrder, uint8_t streamerVersion, int64_t systemVersion);
///     void addObject(Class);                      // the next number, from 0
///     void setBytes(NodeIndex, Class, size_t offset, size_t length);   // string, data
///     void setScalars(NodeIndex, std::string_view typeCode, const ScalarType&,
///                     std::vector<Scalar>&&);     // number, value
///     void openContainer(NodeIndex, size_t childCount);
///     void addChild(NodeIndex parent, NodeIndex child);   // finished, or ClassicArchive::nil
///     void finishObject(NodeIndex, Class);        // all of it has been told
///     void addRoot(NodeIndex);                    // finished, or ClassicArchive::nil
///
/// Offsets are into the data that is read. A sink is not told where reading fails: that is an
/// exception.
/// Thread-safety: confined to one thread.
template <typename Sink>
class Reader {
 public:
  Reader(const Data& data, ClassSet allowed, Sink& sink)
      : _data(data), _bytes(data.span()), _allowed(allowed), _sink(sink) {}

  void read() {
    _readHeader();
    do {
      _readRoot();
    } while (_position < _bytes.size());
  }

 private:
  /// A string of the first table, with the type that it describes once that was asked for.
  struct SharedString {
    std::string_view text;
    std::unique_ptr<const ScalarType> type;
  };

  /// An entry of the second table; the meaning of `index` depends on the kind.
  struct Entity {
    enum class Kind : uint8_t { unfinishedObject, object, archivedClass, cString };
    Kind kind;
    uint32_t index;
  };

  /// A container whose elements are still coming.
  struct Frame {
    NodeIndex node;
    Class nodeClass;
    size_t entity;
    size_t missingChildren;
  };

  [[noreturn]] static void _fail(const std::string& reason, size_t offset) {
    throw ArchiveException("classic archive: " + reason, offset);
  }

  size_t _remaining() const noexcept { return _bytes.size() - _position; }

  // ---- Bytes and integers

  void _need(size_t count) const {
    if (count > _remaining()) {
      _fail("ends in the middle of a value", _bytes.size());
    }
  }

  uint8_t _readByte() {
    _need(1);
    return _bytes[_position++];
  }

  uint8_t _peekByte() const {
    _need(1);
    return _bytes[_position];
  }

  uint64_t _readFixed(size_t width) {
    _need(width);
    uint64_t result = 0;
    for (size_t i = 0; i < width; ++i) {
      const size_t significance = _isBigEndian ? width - 1 - i : i;
      result |= uint64_t{_bytes[_position + i]} << (8 * significance);
    }
    _position += width;
    return result;
  }

  int64_t _readInteger() {
    const size_t start = _position;
    const uint8_t head = _readByte();
    if (head < firstTag || head > lastTag) {
      return static_cast<int8_t>(head);
    }
    switch (head) {
      case int16Tag:
        return static_cast<int16_t>(_readFixed(2));
      case int32Tag:
        return static_cast<int32_t>(_readFixed(4));
      case int64Tag:
        return static_cast<int64_t>(_readFixed(8));
      case endTag:
        _fail("object ends where an integer was expected", start);
      default:
        _fail("tag " + std::to_string(head) + " where an integer was expected", start);
    }
  }

  int64_t _readIntegerOfCode(char code) {
    const size_t start = _position;
    const IntegerRange range = *integerRange(code);
    const int64_t integer = _readInteger();
    if (integer < range.minimum || integer > range.maximum) {
      _fail(
          "integer " + std::to_string(integer) + " out of the range of type " + quoted({&code, 1}),
          start);
    }
    return integer < 0 ? integer + range.wrap : integer;
  }

  /// The number of things of at least `size` bytes each that are said to follow. Counts that the
  /// bytes left, less those that enclosing containers still need, cannot hold are refused, so that
  /// all memory reserved by count is bounded by the input.
  size_t _checkedCount(int64_t count, size_t size, size_t start) const {
    if (count < 0) {
      _fail("negative count " + std::to_string(count), start);
    }
    const size_t available = _remaining() > _promised ? _remaining() - _promised : 0;
    if (static_cast<uint64_t>(count) > available / size) {
      _fail("count " + std::to_string(count) + " exceeds the bytes left", start);
    }
    return static_cast<size_t>(count);
  }

  double _readReal(char code) {
    if (_peekByte() != realTag) {
      const auto integer = static_cast<double>(_readInteger());
      return code == 'f' ? static_cast<double>(static_cast<float>(integer)) : integer;
    }
    ++_position;
    if (code == 'f') {
      return static_cast<double>(std::bit_cast<float>(static_cast<uint32_t>(_readFixed(4))));
    }
    return std::bit_cast<double>(_readFixed(8));
  }

  Scalar _readScalar(char code) {
    switch (code) {
      case 'c':
        return int64_t{static_cast<int8_t>(_readByte())};
      case 'C':
      case 'B':
        return int64_t{_readByte()};
      case 'f':
      case 'd':
        return _readReal(code);
      default:
        return _readIntegerOfCode(code);
    }
  }

  // ---- Strings and the two tables

  /// Where the bytes of an unshared string lie.
  std::pair<size_t, size_t> _readUnsharedString() {
    const size_t start = _position;
    if (_peekByte() == nilTag) {
      _fail("nil where a string was expected", start);
    }
    const size_t length = _checkedCount(_readInteger(), 1, start);
    const size_t bytes = _position;
    _position += length;
    return {bytes, length};
  }

  size_t _readReference(size_t tableSize) {
    const size_t start = _position;
    const int64_t integer = _readInteger();
    if (integer < referenceBase || integer >= static_cast<int64_t>(tableSize) + referenceBase) {
      _fail("reference to an entry that is not there yet", start);
    }
    return static_cast<size_t>(integer - referenceBase);
  }

  /// The position in the table of strings.
  size_t _readSharedString(const char* what) {
    const size_t start = _position;
    switch (_peekByte()) {
      case nilTag:
        _fail(std::string("nil where ") + what + " was expected", start);
      case endTag:
        _fail(std::string("object ends where ") + what + " was expected", start);
      case newTag: {
        ++_position;
        const auto [offset, length] = _readUnsharedString();
        if (_strings.size() >= std::numeric_limits<uint32_t>::max()) {
          _fail("too many strings", start);
        }
        _strings.push_back({_data.view().substr(offset, length), nullptr});
        return _strings.size() - 1;
      }
      default:
        return _readReference(_strings.size());
    }
  }

  /// The text of a C string, as its position in the table of strings.
  size_t _readCString() {
    const size_t start = _position;
    switch (_peekByte()) {
      case nilTag:
        _fail("nil where a type code was expected", start);
      case endTag:
        _fail("object ends where a type code was expected", start);
      case newTag: {
        ++_position;
        const size_t string = _readSharedString("a type code");
        _entities.push_back({Entity::Kind::cString, static_cast<uint32_t>(string)});
        return string;
      }
      default: {
        const Entity& entity = _entities[_readReference(_entities.size())];
        if (entity.kind != Entity::Kind::cString) {
          _fail("reference to something else where a C string was expected", start);
        }
        return entity.index;
      }
    }
  }

  /// The head of a group that can only have one type.
  void _expectType(std::string_view type) {
    const size_t start = _position;
    const std::string_view found = _strings[_readSharedString("a group")].text;
    if (found != type) {
      _fail("group of type " + quoted(found) + " where " + quoted(type) + " was expected", start);
    }
  }

  void _expectEnd() {
    if (_peekByte() != endTag) {
      _fail("more in an object than its class has", _position);
    }
    ++_position;
  }

  // ---- Classes

  /// Reads a chain of classes; each must be the superclass of the one before.
  Class _readClass() {
    std::optional<Class> mostDerived;
    std::optional<Class> expected;
    while (true) {
      const size_t start = _position;
      const uint8_t head = _peekByte();
      std::optional<Class> found;
      if (head == nilTag) {
        ++_position;
      } else if (head == newTag) {
        ++_position;
        found = _readNewClass();
      } else {
        const Entity& entity = _entities[_readReference(_entities.size())];
        if (entity.kind != Entity::Kind::archivedClass) {
          _fail("reference to something else where a class was expected", start);
        }
        found = static_cast<Class>(entity.index);
      }
      if (!mostDerived) {
        if (!found) {
          _fail("object without a class", start);
        }
        mostDerived = found;
      } else if (found != expected) {
        _fail("wrong superclass " + (found ? quoted(description(*found).name) : "nil"), start);
      }
      if (head != newTag) {
        return *mostDerived;
      }
      expected = description(*found).superclass;
    }
  }

  /// What follows the tag of a literal class, up to its superclass.
  Class _readNewClass() {
    size_t start = _position;
    const size_t entity = _entities.size();
    _entities.push_back({Entity::Kind::archivedClass, 0});
    const std::string_view name = _strings[_readSharedString("a class name")].text;
    const std::optional<Class> found = classNamed(name);
    if (!found) {
      _fail("unknown class " + quoted(name), start);
    }
    start = _position;
    const int64_t version = _readInteger();
    if (version != description(*found).version) {
      _fail(
          "version " + std::to_string(version) + " of class " + quoted(name) + " is not supported",
          start);
    }
    _entities[entity].index = static_cast<uint32_t>(*found);
    return *found;
  }

  // ---- Objects

  void _readHeader() {
    const uint8_t version = _readByte();
    if (version != 3 && version != 4) {
      _fail("streamer version " + std::to_string(version) + " is not supported", 0);
    }
    if (_readByte() != littleEndianSignature.size()) {
      _fail("wrong length of the signature", 1);
    }
    _need(littleEndianSignature.size());
    const std::string_view signature = _data.view().substr(_position, littleEndianSignature.size());
    if (signature != littleEndianSignature && signature != bigEndianSignature) {
      _fail("unknown signature " + quoted(signature), _position);
    }
    _isBigEndian = signature == bigEndianSignature;
    _position += littleEndianSignature.size();
    _sink.readHeader(_isBigEndian ? ClassicArchive::ByteOrder::bigEndian
                                  : ClassicArchive::ByteOrder::littleEndian,
                     version, _readInteger());
    if (_remaining() == 0) {
      _fail("no value group", _position);
    }
  }

  void _readRoot() {
    _expectType("@");
    const NodeIndex root = _readObject();
    while (!_frames.empty()) {
      Frame& frame = _frames.back();
      if (frame.missingChildren == 0) {
        const NodeIndex node = frame.node;
        _promised -= bytesOfEnd;
        _expectEnd();
        _entities[frame.entity].kind = Entity::Kind::object;
        _sink.finishObject(node, frame.nodeClass);
        _frames.pop_back();
        if (!_frames.empty()) {
          _sink.addChild(_frames.back().node, node);
        }
        continue;
      }
      --frame.missingChildren;
      _promised -= bytesOfChild;
      const NodeIndex parent = frame.node;
      const size_t depth = _frames.size();
      _expectType("@");
      const NodeIndex child = _readObject();
      // A container that is open now is told of when it is finished.
      if (_frames.size() == depth) {
        _sink.addChild(parent, child);
      }
    }
    _sink.addRoot(root);
  }

  /// Reads an object as far as it does not consist of others; a container is left open on
  /// _frames.
  NodeIndex _readObject() {
    const size_t start = _position;
    switch (_peekByte()) {
      case nilTag:
        ++_position;
        return ClassicArchive::nil;
      case endTag:
        _fail("object ends where another was expected", start);
      case newTag:
        ++_position;
        return _readNewObject(start);
      default: {
        const Entity& entity = _entities[_readReference(_entities.size())];
        if (entity.kind == Entity::Kind::unfinishedObject) {
          _fail("object that contains itself", start);
        }
        if (entity.kind != Entity::Kind::object) {
          _fail("reference to something else where an object was expected", start);
        }
        return entity.index;
      }
    }
  }

  NodeIndex _readNewObject(size_t start) {
    if (_frames.size() >= maximumDepth) {
      _fail("objects nested too deep", start);
    }
    if (_objectCount >= ClassicArchive::nil) {
      _fail("too many objects", start);
    }
    const auto index = static_cast<NodeIndex>(_objectCount++);
    const size_t entity = _entities.size();
    _entities.push_back({Entity::Kind::unfinishedObject, index});
    const Class nodeClass = _readClass();
    if ((_allowed & classSetOf(nodeClass)) == 0) {
      _fail("class " + quoted(description(nodeClass).name) + " is not allowed", start);
    }
    _sink.addObject(nodeClass);
    switch (nodeClass) {
      case Class::array:
      case Class::mutableArray:
        _openContainer(nodeClass, index, entity, 1);
        return index;
      case Class::dictionary:
      case Class::mutableDictionary:
        _openContainer(nodeClass, index, entity, 2);
        return index;
      case Class::string:
        _readStringContent(index);
        break;
      case Class::data:
      case Class::mutableData:
        _readDataContent(index, nodeClass);
        break;
      case Class::number:
      case Class::value:
        _readScalars(index, nodeClass);
        break;
      case Class::object:
        break;
    }
    _expectEnd();
    _entities[entity].kind = Entity::Kind::object;
    _sink.finishObject(index, nodeClass);
    return index;
  }

  void _openContainer(Class nodeClass, NodeIndex index, size_t entity, size_t childrenPerEntry) {
    _expectType("i");
    const size_t start = _position;
    const int64_t entries = _readIntegerOfCode('i');
    const size_t children =
        _checkedCount(entries, bytesOfChild * childrenPerEntry, start) * childrenPerEntry;
    _sink.openContainer(index, children);
    _promised += children * bytesOfChild + bytesOfEnd;
    _frames.push_back({index, nodeClass, entity, children});
  }

  void _readStringContent(NodeIndex index) {
    _expectType("+");
    const auto [offset, length] = _readUnsharedString();
    _sink.setBytes(index, Class::string, offset, length);
  }

  void _readDataContent(NodeIndex index, Class nodeClass) {
    _expectType("i");
    const size_t start = _position;
    const int64_t count = _readIntegerOfCode('i');
    const size_t length = _checkedCount(count, 1, start);
    _expectType("[" + std::to_string(count) + "c]");
    _need(length);
    _sink.setBytes(index, nodeClass, _position, length);
    _position += length;
  }

  void _readScalars(NodeIndex index, Class nodeClass) {
    _expectType("*");
    const size_t codeStart = _position;
    const size_t code = _readCString();
    const ScalarType& type = _scalarType(code, codeStart);
    if (nodeClass == Class::number && !type.isPlain()) {
      _fail("number of type " + quoted(_strings[code].text), codeStart);
    }
    const size_t groupStart = _position;
    const size_t group = _readSharedString("a group");
    if (group != code && _strings[group].text != _strings[code].text) {
      _fail("group of type " + quoted(_strings[group].text) + " in a value of type " +
                quoted(_strings[code].text),
            groupStart);
    }
    if (type.scalarCount() > _remaining()) {
      _fail("type " + quoted(_strings[code].text) + " needs more bytes than are left", groupStart);
    }
    std::vector<Scalar> values;
    values.reserve(static_cast<size_t>(type.scalarCount()));
    type.forEachScalar([&](char scalar) { values.push_back(_readScalar(scalar)); });
    _sink.setScalars(index, _strings[code].text, type, std::move(values));
  }

  /// The type that a shared string describes, parsed once; stays valid while strings are added.
  const ScalarType& _scalarType(size_t string, size_t start) {
    SharedString& shared = _strings[string];
    if (!shared.type) {
      std::string problem;
      std::optional<ScalarType> type = ScalarType::parse(shared.text, problem);
      if (!type) {
        _fail(problem, start);
      }
      shared.type = std::make_unique<const ScalarType>(std::move(*type));
    }
    return *shared.type;
  }

  /// The least that the group of a child takes: its type and a reference or nil.
  static constexpr size_t bytesOfChild = 2;
  static constexpr size_t bytesOfEnd = 1;

  const Data& _data;
  std::span<const uint8_t> _bytes;
  ClassSet _allowed;
  bool _isBigEndian = false;
  size_t _position = 0;
  /// Bytes that the containers on _frames need at least for what they still miss.
  size_t _promised = 0;

  Sink& _sink;
  size_t _objectCount = 0;
  std::vector<SharedString> _strings;
  std::vector<Entity> _entities;
  std::vector<Frame> _frames;
};

}  // namespace platform::classicarchive
