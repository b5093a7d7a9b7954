// Archives into values, without the graph between: the archives of help indexes have tens of
// thousands of anchors, and every program that searches reads them as it starts.
#include <optional>
#include <utility>

#include "platform/ClassicArchiveReader.h"
#include "platform/Strings.h"

namespace platform::classicarchive {

namespace {

/// What value() refuses, it refuses for the first node that is wrong, children before parents and
/// only under the first root. That is the order in which objects finish; so the first failure is
/// kept, and counts when the rest of the archive has proved to be one.
class ValueSink {
 public:
  explicit ValueSink(const Data& data) : _data(data) {}

  void readHeader(ClassicArchive::ByteOrder /*byteOrder*/, uint8_t /*streamerVersion*/,
                  int64_t /*systemVersion*/) {}

  void addObject(Class /*nodeClass*/) {
    if (_isBuilding) {
      _values.emplace_back();
    }
  }

  void setBytes(NodeIndex index, Class nodeClass, size_t offset, size_t length) {
    _byteCount += length;
    if (!_isBuilding) {
      return;
    }
    if (nodeClass != Class::string) {
      _values[index] = _data.slice(offset, length);
      return;
    }
    const std::string_view text = _data.view().substr(offset, length);
    if (isValidUTF8(text)) {
      _values[index] = text;
    } else {
      _fail(notUTF8);
    }
  }

  void setScalars(NodeIndex index, std::string_view /*typeCode*/, const ScalarType& type,
                  std::vector<Scalar>&& values) {
    if (_isBuilding) {
      _values[index] = valueOfScalars(type, values);
    }
  }

  void openContainer(NodeIndex index, size_t childCount) {
    if (_isBuilding) {
      _open.push_back({index, _children.size(), childCount});
    }
  }

  void addChild(NodeIndex /*parent*/, NodeIndex child) {
    if (_isBuilding) {
      // Nothing but nil is absent: every object has a value.
      _children.push_back(child == ClassicArchive::nil ? Value() : _values[child]);
    }
  }

  void finishObject(NodeIndex index, Class nodeClass) {
    if (!_isBuilding) {
      return;
    }
    switch (nodeClass) {
      case Class::object:
        _values[index] = Value::Dictionary();
        break;
      case Class::array:
      case Class::mutableArray:
        _finishArray();
        break;
      case Class::dictionary:
      case Class::mutableDictionary:
        _finishDictionary();
        break;
      default:
        break;
    }
  }

  void addRoot(NodeIndex root) {
    if (_isBuilding && root != ClassicArchive::nil) {
      _root = _values[root];
    }
    _isBuilding = false;
  }

  /// To be called when all of the archive has been read.
  Value take() {
    if (_keyPrice > _byteCount) {
      failArchive(multipliesKeys);
    }
    if (_failure != nullptr) {
      failArchive(_failure);
    }
    return std::move(_root);
  }

 private:
  struct Container {
    NodeIndex index;
    size_t firstChild;
    size_t childCount;
  };

  void _fail(const char* reason) {
    _failure = reason;
    _isBuilding = false;
  }

  void _finishArray() {
    const Container container = _open.back();
    _open.pop_back();
    Value::Array array;
    array.reserve(container.childCount);
    for (size_t i = container.firstChild; i < _children.size(); ++i) {
      if (_children[i].isAbsent()) {
        _fail(nilInContainer);
        return;
      }
      array.push_back(std::move(_children[i]));
    }
    _children.resize(container.firstChild);
    _values[container.index] = std::move(array);
  }

  void _finishDictionary() {
    const Container container = _open.back();
    _open.pop_back();
    Value::Dictionary dictionary;
    for (size_t i = container.firstChild; i < _children.size(); i += 2) {
      if (_children[i].isAbsent()) {
        _fail(nilInContainer);
        return;
      }
      const std::string* key = _children[i].stringIf();
      if (key == nullptr) {
        _fail(keyIsNoString);
        return;
      }
      _keyPrice += priceOfKey(key->size());
      if (_keyPrice > _data.length()) {
        // Whatever follows, it is too much.
        _isBuilding = false;
        return;
      }
      if (_children[i + 1].isAbsent()) {
        _fail(nilInContainer);
        return;
      }
      // Writers sort the keys as a rule.
      dictionary.insert_or_assign(dictionary.end(), *key, std::move(_children[i + 1]));
    }
    _children.resize(container.firstChild);
    _values[container.index] = std::move(dictionary);
  }

  const Data& _data;
  bool _isBuilding = true;
  const char* _failure = nullptr;
  /// Of all strings and data.
  size_t _byteCount = 0;
  /// What the keys cost that were copied before the first failure.
  size_t _keyPrice = 0;
  /// By the number of the object.
  std::vector<Value> _values;
  std::vector<Container> _open;
  /// Those of all open containers, one after the other.
  std::vector<Value> _children;
  Value _root;
};

}  // namespace

Value decodeValueAllowing(const Data& data, ClassSet allowed) {
  ValueSink sink(data);
  Reader<ValueSink>(data, allowed, sink).read();
  return sink.take();
}

}  // namespace platform::classicarchive
