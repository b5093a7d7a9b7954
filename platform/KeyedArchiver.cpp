#include <fmt/format.h>

#include <unordered_map>
#include <utility>

#include "platform/KeyedArchive.h"
#include "platform/KeyedArchiveClasses.h"
#include "platform/PropertyList.h"
#include "platform/PropertyListForms.h"

namespace platform {
namespace {

using namespace keyedarchive;
using propertylist::quoted;

[[noreturn]] void refuse(const std::string& reason) {
  throw Exception(invalidArgumentException, reason);
}

// A dictionary that remembers the order in which its entries came.
struct Content {
  Value::Dictionary entries;
  std::vector<std::string> order;

  void add(std::string key, const Value& value) {
    const auto [place, isNew] = entries.try_emplace(std::move(key), value);
    if (!isNew) {
      refuse(fmt::format("key {} is encoded twice", quoted(place->first)));
    }
    order.push_back(place->first);
  }
};

}  // namespace

class KeyedArchiver::Implementation {
 public:
  Implementation() : _objects{Value(nilEntry)}, _contents(1) {}

  void encodeObject(KeyedArchiver& archiver, const KeyedObject& object, std::string_view key);
  void encodeInline(const Value& value, std::string_view key);
  Data finish();

 private:
  // An object that has its place in the archive; while it is being encoded its height is 0.
  struct Known {
    UID uid;
    size_t height = 0;
  };

  UID _encode(KeyedArchiver& archiver, const KeyedObject& object);
  UID _encodeValue(KeyedArchiver& archiver, const Value& value);
  UID _encodeText(const std::string& text);
  UID _encodeData(const Value& data);
  template <typename Body>
  UID _encodeOnce(const void* address, const KeyedObject& kept, Body body);
  UID _encodeCodable(KeyedArchiver& archiver, const std::shared_ptr<const KeyedCodable>& object);
  template <typename Elements, typename Encode>
  static Value _references(const Elements& elements, Encode encode);
  UID _encodeElement(KeyedArchiver& archiver, const KeyedObject& element);
  UID _classRecord(const std::vector<std::string>& chain);
  UID _addEntry(Value value);
  Value _ordered(Content content);
  void _checkOpen() const;

  std::vector<Value> _objects;
  // The roots, then one for each object within whose encodeWithCoder() this is.
  std::vector<Content> _contents;
  // The height so far of each object and container that is being encoded.
  std::vector<size_t> _heights;
  std::unordered_map<const void*, Known> _known;
  // So that the address of something encoded cannot become that of something else.
  std::vector<KeyedObject> _kept;
  std::unordered_map<std::string, UID> _texts;
  std::unordered_map<std::string, UID> _classes;
  propertylist::KeyOrder _keyOrder;
  bool _finished = false;
  bool _failed = false;
};

void KeyedArchiver::Implementation::_checkOpen() const {
  if (_finished) {
    refuse("the archive is finished");
  }
  if (_failed) {
    refuse("encoding failed, the archive cannot go on");
  }
}

void KeyedArchiver::Implementation::encodeObject(KeyedArchiver& archiver, const KeyedObject& object,
                                                 std::string_view key) {
  _checkOpen();
  try {
    const UID uid = _encode(archiver, object);
    _contents.back().add(escapedKey(key), uid);
  } catch (...) {
    _failed = true;
    throw;
  }
}

void KeyedArchiver::Implementation::encodeInline(const Value& value, std::string_view key) {
  _checkOpen();
  try {
    _contents.back().add(escapedKey(key), value);
  } catch (...) {
    _failed = true;
    throw;
  }
}

UID KeyedArchiver::Implementation::_encode(KeyedArchiver& archiver, const KeyedObject& object) {
  if (object.isNil()) {
    return UID{0};
  }
  if (const auto codable = object.object()) {
    return _encodeCodable(archiver, codable);
  }
  const auto encodeElement = [&](const KeyedObject& element) {
    return _encodeElement(archiver, element);
  };
  if (const KeyedObject::Array* elements = object.arrayIf()) {
    return _encodeOnce(elements, object, [&](Content& content) {
      content.add(elementsKey, _references(*elements, encodeElement));
      return plainClassChain(object.isMutable() ? KeyedUnarchiver::mutableArrayClass
                                                : KeyedUnarchiver::arrayClass);
    });
  }
  if (const KeyedObject::Dictionary* entries = object.dictionaryIf()) {
    return _encodeOnce(entries, object, [&](Content& content) {
      content.add(keysKey, _references(*entries, [&](const auto& entry) {
                    return _encodeText(entry.first);
                  }));
      content.add(elementsKey, _references(*entries, [&](const auto& entry) {
                    return _encodeElement(archiver, entry.second);
                  }));
      return plainClassChain(object.isMutable() ? KeyedUnarchiver::mutableDictionaryClass
                                                : KeyedUnarchiver::dictionaryClass);
    });
  }
  return _encodeValue(archiver, object.value());
}

UID KeyedArchiver::Implementation::_encodeValue(KeyedArchiver& archiver, const Value& value) {
  switch (value.kind()) {
    case Value::Kind::string:
      return _encodeText(*value.stringIf());
    case Value::Kind::boolean:
    case Value::Kind::integer:
    case Value::Kind::real:
      return _addEntry(value);
    case Value::Kind::data:
      return _encodeData(value);
    case Value::Kind::array:
      return _encodeOnce(value.identity(), value, [&](Content& content) {
        content.add(elementsKey, _references(*value.arrayIf(), [&](const Value& element) {
                      return _encodeElement(archiver, element);
                    }));
        return plainClassChain(KeyedUnarchiver::arrayClass);
      });
    case Value::Kind::dictionary:
      return _encodeOnce(value.identity(), value, [&](Content& content) {
        const Value::Dictionary& entries = *value.dictionaryIf();
        content.add(keysKey, _references(entries, [&](const auto& entry) {
                      return _encodeText(entry.first);
                    }));
        content.add(elementsKey, _references(entries, [&](const auto& entry) {
                      return _encodeElement(archiver, entry.second);
                    }));
        return plainClassChain(KeyedUnarchiver::dictionaryClass);
      });
    default:
      refuse("a keyed archive cannot hold a date, a URL or a UID as an object");
  }
}

UID KeyedArchiver::Implementation::_encodeText(const std::string& text) {
  const auto known = _texts.find(text);
  if (known != _texts.end()) {
    return known->second;
  }
  // As an entry this text means nil.
  if (text == nilEntry) {
    Content content;
    content.add(classKey, UID{});
    content.add(textKey, text);
    const UID uid = _addEntry({});
    content.entries[classKey] = _classRecord(plainClassChain(KeyedUnarchiver::mutableStringClass));
    _objects[uid.index] = _ordered(std::move(content));
    _texts.emplace(text, uid);
    return uid;
  }
  const UID uid = _addEntry(text);
  _texts.emplace(text, uid);
  return uid;
}

UID KeyedArchiver::Implementation::_encodeData(const Value& data) {
  const auto known = _known.find(data.identity());
  if (known != _known.end()) {
    return known->second.uid;
  }
  const UID uid = _addEntry(data);
  _kept.emplace_back(data);
  _known.emplace(data.identity(), Known{uid, 1});
  return uid;
}

UID KeyedArchiver::Implementation::_encodeElement(KeyedArchiver& archiver,
                                                  const KeyedObject& element) {
  if (element.isNil()) {
    refuse("an array or dictionary cannot hold nil");
  }
  return _encode(archiver, element);
}

template <typename Elements, typename Encode>
Value KeyedArchiver::Implementation::_references(const Elements& elements, Encode encode) {
  Value::Array references;
  references.reserve(elements.size());
  for (const auto& element : elements) {
    references.emplace_back(encode(element));
  }
  return Value(std::move(references));
}

// Gives what lies at `address` its place and, unless it has one, its content from `body`, which
// returns the names of its class and those above it.
template <typename Body>
UID KeyedArchiver::Implementation::_encodeOnce(const void* address, const KeyedObject& kept,
                                               Body body) {
  const auto known = _known.find(address);
  const size_t height = known == _known.end() ? 1 : known->second.height;
  if (height == 0) {
    refuse("an object contains itself");
  }
  if (_heights.size() + height > propertyListMaximumDepth) {
    refuse(fmt::format("objects nest deeper than {}", propertyListMaximumDepth));
  }
  UID uid{0};
  size_t whole = height;
  if (known != _known.end()) {
    uid = known->second.uid;
  } else {
    uid = _addEntry({});
    _known.emplace(address, Known{uid, 0});
    _kept.push_back(kept);
    _heights.push_back(0);
    Content content;
    content.add(classKey, UID{0});
    const std::vector<std::string> chain = body(content);
    content.entries[classKey] = _classRecord(chain);
    _objects[uid.index] = _ordered(std::move(content));
    whole = _heights.back() + 1;
    _heights.pop_back();
    _known[address].height = whole;
  }
  if (!_heights.empty()) {
    _heights.back() = std::max(_heights.back(), whole);
  }
  return uid;
}

UID KeyedArchiver::Implementation::_encodeCodable(
    KeyedArchiver& archiver, const std::shared_ptr<const KeyedCodable>& object) {
  return _encodeOnce(object.get(), object, [&](Content& content) {
    std::string name = object->archiveClassName();
    if (name.empty() || name == rootClass || isPlainClass(name)) {
      refuse(fmt::format("{} cannot be the class of an object", quoted(name)));
    }
    _contents.push_back(std::move(content));
    object->encodeWithCoder(archiver);
    content = std::move(_contents.back());
    _contents.pop_back();
    std::vector<std::string> chain{std::move(name)};
    for (std::string& superclass : object->archiveSuperclassNames()) {
      chain.push_back(std::move(superclass));
    }
    chain.emplace_back(rootClass);
    return chain;
  });
}

UID KeyedArchiver::Implementation::_classRecord(const std::vector<std::string>& chain) {
  const auto known = _classes.find(chain.front());
  if (known != _classes.end()) {
    return known->second;
  }
  Content content;
  content.add(classNameKey, chain.front());
  content.add(superclassesKey, Value::Array(chain.begin(), chain.end()));
  const UID uid = _addEntry(_ordered(std::move(content)));
  _classes.emplace(chain.front(), uid);
  return uid;
}

UID KeyedArchiver::Implementation::_addEntry(Value value) {
  _objects.push_back(std::move(value));
  return UID{_objects.size() - 1};
}

Value KeyedArchiver::Implementation::_ordered(Content content) {
  Value dictionary(std::move(content.entries));
  _keyOrder.emplace(dictionary.identity(), std::move(content.order));
  return dictionary;
}

Data KeyedArchiver::Implementation::finish() {
  _checkOpen();
  if (_contents.size() != 1) {
    refuse("the archive cannot be finished inside an object");
  }
  _finished = true;
  Content top;
  top.add(versionKey, version);
  top.add(archiverKey, archiverName);
  top.add(rootsKey, _ordered(std::move(_contents.back())));
  top.add(objectsKey, std::move(_objects));
  const Value archive = _ordered(std::move(top));
  return propertylist::binaryFromValue(archive, _keyOrder);
}

KeyedArchiver::KeyedArchiver() : _implementation(std::make_unique<Implementation>()) {}

KeyedArchiver::~KeyedArchiver() = default;

void KeyedArchiver::encodeObject(const KeyedObject& object, std::string_view key) {
  _implementation->encodeObject(*this, object, key);
}

void KeyedArchiver::encodeBool(bool value, std::string_view key) {
  _implementation->encodeInline(value, key);
}

void KeyedArchiver::encodeInteger(int64_t value, std::string_view key) {
  _implementation->encodeInline(value, key);
}

void KeyedArchiver::encodeDouble(double value, std::string_view key) {
  _implementation->encodeInline(value, key);
}

void KeyedArchiver::encodeBytes(const Data& value, std::string_view key) {
  _implementation->encodeInline(value, key);
}

Data KeyedArchiver::finishEncoding() { return _implementation->finish(); }

}  // namespace platform
