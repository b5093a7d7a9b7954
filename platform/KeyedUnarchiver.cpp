#include <fmt/format.h>

#include <algorithm>
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

[[noreturn]] void fail(const std::string& reason) {
  throw Exception(inconsistentArchiveException, reason);
}

// The levels of objects and containers from one entry downwards: 0 for plain values, 1 for an
// empty container. It is not known while the entry is being worked on.
struct Height {
  static constexpr size_t open = static_cast<size_t>(-1);
  size_t levels = open;
};

void checkDepth(Height height, uint64_t index, size_t depth) {
  if (height.levels == Height::open) {
    fail(fmt::format("object {} contains itself", index));
  }
  if (depth + height.levels > propertyListMaximumDepth) {
    fail(fmt::format("objects nest deeper than {}", propertyListMaximumDepth));
  }
}

// Marks a place as being worked on, and takes the mark back should the work fail.
template <typename Table>
class OpenMark {
 public:
  OpenMark(Table& table, uint64_t index) : _table(table), _index(index) { _table[index]; }
  ~OpenMark() {
    if (!_done) {
      _table.erase(_index);
    }
  }
  OpenMark(const OpenMark&) = delete;
  OpenMark& operator=(const OpenMark&) = delete;
  void done() { _done = true; }

 private:
  Table& _table;
  uint64_t _index;
  bool _done = false;
};

}  // namespace

class KeyedUnarchiver::Implementation {
 public:
  explicit Implementation(const Data& data);

  // The value under a key of what is being decoded; null when there is none.
  const Value* valueForKey(std::string_view key) const;
  KeyedObject decodeObject(KeyedUnarchiver& coder, std::vector<std::string> allowedClasses,
                           std::string_view key);
  void finish();

 private:
  // An entry of the object table once its class is known.
  struct Entry {
    uint64_t index = 0;
    const Value* value = nullptr;
    // Empty for nil.
    std::string className;
  };

  // One set of allowed classes, and the entries that keep to it.
  struct Permission {
    std::vector<std::string> classes;
    std::unordered_map<uint64_t, Height> heights;
    size_t elementAllowance = 0;
    size_t keyAllowance = 0;
  };

  // An object that has been made or is being made.
  struct Made {
    KeyedObject object;
    Height height;
  };

  // An object or container that is being made; `content` is what a factory's calls read.
  struct Frame {
    const Value::Dictionary* content = nullptr;
    // Of what it holds, as far as that is known.
    size_t levels = 0;
  };

  static const Value& _require(const Value& archive, const char* key, Value::Kind kind);
  const Value::Dictionary& _current() const;
  Entry _entry(uint64_t index) const;
  std::string _classNameOf(uint64_t index, const Value& entry) const;
  uint64_t _reference(const Value& value, uint64_t holder) const;
  const Value::Array& _elements(const Entry& entry, const char* key) const;
  static bool _isArray(const Entry& entry);
  static bool _isDictionary(const Entry& entry);
  static bool _isText(const Entry& entry);
  const std::string& _textOf(const Entry& entry) const;
  Value _dataOf(const Entry& entry) const;

  Permission& _permission(std::vector<std::string> allowedClasses);
  size_t _check(Permission& permission, uint64_t index, size_t depth);
  size_t _checkContainer(Permission& permission, const Entry& entry, size_t depth);

  const Made& _make(KeyedUnarchiver& coder, uint64_t index);
  KeyedObject _construct(KeyedUnarchiver& coder, const Entry& entry);
  KeyedObject _makeArray(KeyedUnarchiver& coder, const Entry& entry);
  KeyedObject _makeDictionary(KeyedUnarchiver& coder, const Entry& entry);

  size_t _length;
  Value _archive;
  const Value::Array* _objects = nullptr;
  const Value::Dictionary* _roots = nullptr;
  std::vector<std::unique_ptr<Permission>> _permissions;
  std::unordered_map<uint64_t, Made> _made;
  std::vector<Frame> _frames;
};

KeyedUnarchiver::Implementation::Implementation(const Data& data) : _length(data.length()) {
  Error error;
  std::optional<Value> archive = propertyListFromData(data, &error);
  if (!archive) {
    fail(error.description);
  }
  _archive = std::move(*archive);
  if (!_archive.dictionaryIf()) {
    fail("a keyed archive is a dictionary, this property list is none");
  }
  const Value& archiver = _require(_archive, archiverKey, Value::Kind::string);
  if (*archiver.stringIf() != archiverName) {
    fail(fmt::format("unknown archiver {}", quoted(*archiver.stringIf())));
  }
  const Value& number = _require(_archive, versionKey, Value::Kind::integer);
  if (number != Value(version)) {
    fail(fmt::format("unknown version of the keyed archive, not {}", version));
  }
  _objects = _require(_archive, objectsKey, Value::Kind::array).arrayIf();
  _roots = _require(_archive, rootsKey, Value::Kind::dictionary).dictionaryIf();
  if (_objects->empty() || _objects->front() != Value(nilEntry)) {
    fail(fmt::format("object 0 of the keyed archive is not {}", nilEntry));
  }
}

const Value& KeyedUnarchiver::Implementation::_require(const Value& archive, const char* key,
                                                       Value::Kind kind) {
  const Value& value = archive[key];
  if (value.kind() != kind) {
    fail(fmt::format("a keyed archive has a {} under {}, this one has {}",
                     kind == Value::Kind::string       ? "string"
                     : kind == Value::Kind::integer    ? "integer"
                     : kind == Value::Kind::dictionary ? "dictionary"
                                                       : "array",
                     quoted(key), value.isAbsent() ? "nothing" : "something else"));
  }
  return value;
}

const Value::Dictionary& KeyedUnarchiver::Implementation::_current() const {
  return _frames.empty() ? *_roots : *_frames.back().content;
}

const Value* KeyedUnarchiver::Implementation::valueForKey(std::string_view key) const {
  if (!_roots) {
    return nullptr;
  }
  const Value::Dictionary& content = _current();
  const auto found = content.find(escapedKey(key));
  return found == content.end() ? nullptr : &found->second;
}

KeyedObject KeyedUnarchiver::Implementation::decodeObject(KeyedUnarchiver& coder,
                                                          std::vector<std::string> allowedClasses,
                                                          std::string_view key) {
  const Value* value = valueForKey(key);
  if (!value) {
    return {};
  }
  const UID* uid = value->uidIf();
  if (!uid) {
    fail(fmt::format("the value under {} is no object", quoted(key)));
  }
  _check(_permission(std::move(allowedClasses)), uid->index, _frames.size());
  const Made& made = _make(coder, uid->index);
  if (!_frames.empty()) {
    _frames.back().levels = std::max(_frames.back().levels, made.height.levels);
  }
  return made.object;
}

KeyedUnarchiver::Implementation::Entry KeyedUnarchiver::Implementation::_entry(
    uint64_t index) const {
  if (index >= _objects->size()) {
    fail(fmt::format("reference to object {} of {}", index, _objects->size()));
  }
  Entry entry;
  entry.index = index;
  entry.value = &(*_objects)[index];
  switch (entry.value->kind()) {
    case Value::Kind::string:
      entry.className = *entry.value->stringIf() == nilEntry ? "" : stringClass;
      break;
    case Value::Kind::boolean:
    case Value::Kind::integer:
    case Value::Kind::real:
      entry.className = numberClass;
      break;
    case Value::Kind::data:
      entry.className = dataClass;
      break;
    case Value::Kind::dictionary:
      entry.className = _classNameOf(index, *entry.value);
      break;
    default:
      fail(fmt::format("object {} is of a kind that an archive cannot have", index));
  }
  return entry;
}

std::string KeyedUnarchiver::Implementation::_classNameOf(uint64_t index,
                                                          const Value& entry) const {
  const UID* uid = entry[classKey].uidIf();
  if (!uid) {
    fail(fmt::format("object {} has no class", index));
  }
  if (uid->index >= _objects->size()) {
    fail(fmt::format("object {} has its class at {} of {}", index, uid->index, _objects->size()));
  }
  const Value& record = (*_objects)[uid->index];
  const std::string* name = record[classNameKey].stringIf();
  if (!name || name->empty()) {
    fail(fmt::format("object {}, the class of object {}, has no name", uid->index, index));
  }
  return *name;
}

uint64_t KeyedUnarchiver::Implementation::_reference(const Value& value, uint64_t holder) const {
  const UID* uid = value.uidIf();
  if (!uid) {
    fail(fmt::format("object {} holds something that is no reference", holder));
  }
  if (uid->index >= _objects->size()) {
    fail(fmt::format("object {} refers to object {} of {}", holder, uid->index, _objects->size()));
  }
  return uid->index;
}

const Value::Array& KeyedUnarchiver::Implementation::_elements(const Entry& entry,
                                                               const char* key) const {
  const Value::Array* elements = (*entry.value)[key].arrayIf();
  if (!elements) {
    fail(fmt::format("object {} of class {} has no {}", entry.index, entry.className, key));
  }
  return *elements;
}

bool KeyedUnarchiver::Implementation::_isArray(const Entry& entry) {
  return entry.className == arrayClass || entry.className == mutableArrayClass;
}

bool KeyedUnarchiver::Implementation::_isDictionary(const Entry& entry) {
  return entry.className == dictionaryClass || entry.className == mutableDictionaryClass;
}

bool KeyedUnarchiver::Implementation::_isText(const Entry& entry) {
  return entry.className == stringClass || entry.className == mutableStringClass;
}

const std::string& KeyedUnarchiver::Implementation::_textOf(const Entry& entry) const {
  const Value& text = entry.value->dictionaryIf() ? (*entry.value)[textKey] : *entry.value;
  if (!text.stringIf()) {
    fail(fmt::format("object {} of class {} has no text", entry.index, entry.className));
  }
  return *text.stringIf();
}

Value KeyedUnarchiver::Implementation::_dataOf(const Entry& entry) const {
  if (!entry.value->dictionaryIf()) {
    return *entry.value;
  }
  const Value* bytes = &(*entry.value)[bytesKey];
  if (bytes->uidIf()) {
    bytes = &(*_objects)[_reference(*bytes, entry.index)];
  }
  if (!bytes->dataIf()) {
    fail(fmt::format("object {} of class {} has no bytes", entry.index, entry.className));
  }
  return *bytes;
}

KeyedUnarchiver::Implementation::Permission& KeyedUnarchiver::Implementation::_permission(
    std::vector<std::string> allowedClasses) {
  std::sort(allowedClasses.begin(), allowedClasses.end());
  for (const std::unique_ptr<Permission>& known : _permissions) {
    if (known->classes == allowedClasses) {
      return *known;
    }
  }
  auto permission = std::make_unique<Permission>();
  permission->classes = std::move(allowedClasses);
  // Each reference takes a byte at least. More elements than that are in the archive only if
  // containers share their lists, which no writer does, to stand for more than is there.
  permission->elementAllowance = _length;
  permission->keyAllowance = propertylist::keyCopyAllowance(_length);
  _permissions.push_back(std::move(permission));
  return *_permissions.back();
}

// Checks an entry with all containers and elements below it and returns its levels. An object of a
// class of our own counts as none: what it holds is not known yet.
size_t KeyedUnarchiver::Implementation::_check(Permission& permission, uint64_t index,
                                               size_t depth) {
  const auto known = permission.heights.find(index);
  if (known != permission.heights.end()) {
    checkDepth(known->second, index, depth);
    return known->second.levels;
  }
  const Entry entry = _entry(index);
  if (entry.className.empty()) {
    return 0;
  }
  if (!isKindOf(entry.className, permission.classes)) {
    fail(fmt::format("object {} is of class {}, which is not allowed here", index,
                     quoted(entry.className)));
  }
  if (!isPlainClass(entry.className) && !factoryOfClass(entry.className)) {
    fail(fmt::format("object {} is of class {}, which cannot be decoded", index,
                     quoted(entry.className)));
  }
  OpenMark mark(permission.heights, index);
  const bool isContainer = _isArray(entry) || _isDictionary(entry);
  const size_t levels = isContainer ? _checkContainer(permission, entry, depth) : 0;
  permission.heights[index].levels = levels;
  mark.done();
  return levels;
}

size_t KeyedUnarchiver::Implementation::_checkContainer(Permission& permission, const Entry& entry,
                                                        size_t depth) {
  if (depth >= propertyListMaximumDepth) {
    fail(fmt::format("objects nest deeper than {}", propertyListMaximumDepth));
  }
  const Value::Array& elements = _elements(entry, elementsKey);
  if (elements.size() > permission.elementAllowance) {
    fail(fmt::format("object {} shares its elements with other containers", entry.index));
  }
  permission.elementAllowance -= elements.size();
  if (_isDictionary(entry)) {
    const Value::Array& keys = _elements(entry, keysKey);
    if (keys.size() != elements.size()) {
      fail(fmt::format("object {} has {} keys and {} values", entry.index, keys.size(),
                       elements.size()));
    }
    for (const Value& key : keys) {
      const Entry keyEntry = _entry(_reference(key, entry.index));
      if (!_isText(keyEntry)) {
        fail(fmt::format("object {} has a key that is no string", entry.index));
      }
      const size_t length = _textOf(keyEntry).size();
      if (length > permission.keyAllowance) {
        fail("long keys are shared by too many dictionaries");
      }
      permission.keyAllowance -= length;
    }
  }
  size_t below = 0;
  for (const Value& element : elements) {
    below = std::max(below, _check(permission, _reference(element, entry.index), depth + 1));
  }
  return below + 1;
}

// Makes what has been checked.
const KeyedUnarchiver::Implementation::Made& KeyedUnarchiver::Implementation::_make(
    KeyedUnarchiver& coder, uint64_t index) {
  const auto known = _made.find(index);
  if (known != _made.end()) {
    checkDepth(known->second.height, index, _frames.size());
    return known->second;
  }
  const Entry entry = _entry(index);
  OpenMark mark(_made, index);
  Made made;
  made.height.levels = 0;
  if (_isText(entry)) {
    made.object = entry.value->stringIf() ? *entry.value : (*entry.value)[textKey];
    _textOf(entry);
  } else if (entry.className == numberClass) {
    if (!entry.value->isNumber()) {
      fail(fmt::format("object {} of class {} has no number", index, entry.className));
    }
    made.object = *entry.value;
  } else if (entry.className == dataClass || entry.className == mutableDataClass) {
    made.object = _dataOf(entry);
  } else if (!entry.className.empty()) {
    if (_frames.size() >= propertyListMaximumDepth) {
      fail(fmt::format("objects nest deeper than {}", propertyListMaximumDepth));
    }
    struct FrameScope {
      std::vector<Frame>& frames;
      ~FrameScope() { frames.pop_back(); }
    };
    _frames.push_back({entry.value->dictionaryIf(), 0});
    const FrameScope scope{_frames};
    made.object = _construct(coder, entry);
    made.height.levels = _frames.back().levels + 1;
  }
  mark.done();
  return _made[index] = std::move(made);
}

KeyedObject KeyedUnarchiver::Implementation::_construct(KeyedUnarchiver& coder,
                                                        const Entry& entry) {
  if (_isArray(entry)) {
    return _makeArray(coder, entry);
  }
  if (_isDictionary(entry)) {
    return _makeDictionary(coder, entry);
  }
  const Factory factory = factoryOfClass(entry.className);
  if (!factory) {
    fail(fmt::format("object {} is of class {}, which cannot be decoded", entry.index,
                     quoted(entry.className)));
  }
  return factory(coder);
}

KeyedObject KeyedUnarchiver::Implementation::_makeArray(KeyedUnarchiver& coder,
                                                        const Entry& entry) {
  const Value::Array& references = _elements(entry, elementsKey);
  KeyedObject::Array elements;
  elements.reserve(references.size());
  for (const Value& reference : references) {
    const Made& made = _make(coder, _reference(reference, entry.index));
    _frames.back().levels = std::max(_frames.back().levels, made.height.levels);
    if (!made.object.isNil()) {
      elements.push_back(made.object);
    }
  }
  return entry.className == mutableArrayClass ? KeyedObject::mutableArray(std::move(elements))
                                              : KeyedObject(std::move(elements));
}

KeyedObject KeyedUnarchiver::Implementation::_makeDictionary(KeyedUnarchiver& coder,
                                                             const Entry& entry) {
  const Value::Array& keys = _elements(entry, keysKey);
  const Value::Array& references = _elements(entry, elementsKey);
  KeyedObject::Dictionary entries;
  for (size_t i = 0; i < keys.size(); ++i) {
    const Made& made = _make(coder, _reference(references[i], entry.index));
    _frames.back().levels = std::max(_frames.back().levels, made.height.levels);
    if (!made.object.isNil()) {
      const Entry key = _entry(_reference(keys[i], entry.index));
      entries.insert_or_assign(_textOf(key), made.object);
    }
  }
  return entry.className == mutableDictionaryClass
             ? KeyedObject::mutableDictionary(std::move(entries))
             : KeyedObject(std::move(entries));
}

void KeyedUnarchiver::Implementation::finish() {
  if (!_frames.empty()) {
    throw Exception(invalidArgumentException, "decoding cannot be finished inside an object");
  }
  _roots = nullptr;
  _objects = nullptr;
  _permissions.clear();
  _made.clear();
  _archive = {};
}

KeyedUnarchiver::KeyedUnarchiver(const Data& data)
    : _implementation(std::make_unique<Implementation>(data)) {}

KeyedUnarchiver::~KeyedUnarchiver() = default;

bool KeyedUnarchiver::containsValueForKey(std::string_view key) const {
  return _implementation->valueForKey(key) != nullptr;
}

KeyedObject KeyedUnarchiver::decodeObjectOfClasses(const std::vector<std::string>& allowedClasses,
                                                   std::string_view key) {
  return _implementation->decodeObject(*this, allowedClasses, key);
}

std::optional<bool> KeyedUnarchiver::decodeBool(std::string_view key) const {
  const Value* value = _implementation->valueForKey(key);
  if (!value || value->kind() != Value::Kind::boolean) {
    return std::nullopt;
  }
  return value->boolValue();
}

std::optional<int64_t> KeyedUnarchiver::decodeInteger(std::string_view key) const {
  const Value* value = _implementation->valueForKey(key);
  if (!value || value->kind() != Value::Kind::integer || value->isAboveSignedRange()) {
    return std::nullopt;
  }
  return value->integerValue();
}

std::optional<double> KeyedUnarchiver::decodeDouble(std::string_view key) const {
  const Value* value = _implementation->valueForKey(key);
  if (!value || value->kind() != Value::Kind::real) {
    return std::nullopt;
  }
  return value->doubleValue();
}

std::optional<Data> KeyedUnarchiver::decodeBytes(std::string_view key) const {
  const Value* value = _implementation->valueForKey(key);
  if (!value || !value->dataIf()) {
    return std::nullopt;
  }
  return *value->dataIf();
}

void KeyedUnarchiver::finishDecoding() { _implementation->finish(); }

}  // namespace platform
