#include "platform/KeyedArchive.h"

#include <algorithm>
#include <array>
#include <utility>

#include "platform/KeyedArchiveClasses.h"
#include "platform/ThreadSafety.h"

namespace platform {

KeyedObject::KeyedObject(Value value) {
  if (!value.isAbsent()) {
    _content = std::move(value);
  }
}

KeyedObject::KeyedObject(std::shared_ptr<const KeyedCodable> object) {
  if (object) {
    _content = std::move(object);
  }
}

KeyedObject::KeyedObject(Array array) : _content(std::make_shared<const Array>(std::move(array))) {}

KeyedObject::KeyedObject(Dictionary dictionary)
    : _content(std::make_shared<const Dictionary>(std::move(dictionary))) {}

KeyedObject KeyedObject::mutableArray(Array array) {
  KeyedObject object(std::move(array));
  object._mutable = true;
  return object;
}

KeyedObject KeyedObject::mutableDictionary(Dictionary dictionary) {
  KeyedObject object(std::move(dictionary));
  object._mutable = true;
  return object;
}

bool KeyedObject::isNil() const noexcept { return _content.index() == 0; }

const Value& KeyedObject::value() const noexcept {
  static const Value absent;
  const Value* value = std::get_if<Value>(&_content);
  return value ? *value : absent;
}

std::shared_ptr<const KeyedCodable> KeyedObject::object() const noexcept {
  const auto* object = std::get_if<std::shared_ptr<const KeyedCodable>>(&_content);
  return object ? *object : nullptr;
}

const KeyedObject::Array* KeyedObject::arrayIf() const noexcept {
  const auto* array = std::get_if<std::shared_ptr<const Array>>(&_content);
  return array ? array->get() : nullptr;
}

const KeyedObject::Dictionary* KeyedObject::dictionaryIf() const noexcept {
  const auto* dictionary = std::get_if<std::shared_ptr<const Dictionary>>(&_content);
  return dictionary ? dictionary->get() : nullptr;
}

namespace keyedarchive {
namespace {

struct PlainClass {
  std::string_view name;
  std::string_view superclass;
};

constexpr std::array plainClasses{
    PlainClass{KeyedUnarchiver::stringClass, rootClass},
    PlainClass{KeyedUnarchiver::mutableStringClass, KeyedUnarchiver::stringClass},
    PlainClass{KeyedUnarchiver::numberClass, rootClass},
    PlainClass{KeyedUnarchiver::dataClass, rootClass},
    PlainClass{KeyedUnarchiver::mutableDataClass, KeyedUnarchiver::dataClass},
    PlainClass{KeyedUnarchiver::arrayClass, rootClass},
    PlainClass{KeyedUnarchiver::mutableArrayClass, KeyedUnarchiver::arrayClass},
    PlainClass{KeyedUnarchiver::dictionaryClass, rootClass},
    PlainClass{KeyedUnarchiver::mutableDictionaryClass, KeyedUnarchiver::dictionaryClass},
};

// More levels than any family of classes has: superclasses declared in a circle end here.
constexpr int longestChain = 32;

const PlainClass* plainClass(std::string_view name) {
  const auto* found = std::find_if(plainClasses.begin(), plainClasses.end(),
                                   [&](const PlainClass& entry) { return entry.name == name; });
  return found == plainClasses.end() ? nullptr : found;
}

struct Registration {
  KeyedUnarchiver::Factory factory;
  std::string superclass;
};

struct Registry {
  Mutex mutex;
  std::map<std::string, Registration> classes GUARDED_BY(mutex);
};

// Never destroyed: classes register from other files' initialisers and are used to the end.
Registry& registry() {
  static auto* const instance = new Registry;
  return *instance;
}

std::string superclassOf(const std::string& name) {
  if (const PlainClass* plain = plainClass(name)) {
    return std::string(plain->superclass);
  }
  Registry& classes = registry();
  const MutexLock lock(classes.mutex);
  const auto found = classes.classes.find(name);
  return found == classes.classes.end() ? std::string() : found->second.superclass;
}

}  // namespace

std::string escapedKey(std::string_view key) {
  return (key.starts_with('$') ? "$" : "") + std::string(key);
}

bool isPlainClass(std::string_view className) { return plainClass(className) != nullptr; }

std::vector<std::string> plainClassChain(std::string_view className) {
  std::vector<std::string> chain;
  for (const PlainClass* entry = plainClass(className); entry;
       entry = plainClass(entry->superclass)) {
    chain.emplace_back(entry->name);
  }
  chain.emplace_back(rootClass);
  return chain;
}

KeyedUnarchiver::Factory factoryOfClass(const std::string& className) {
  Registry& classes = registry();
  const MutexLock lock(classes.mutex);
  const auto found = classes.classes.find(className);
  return found == classes.classes.end() ? nullptr : found->second.factory;
}

bool isKindOf(const std::string& className, const std::vector<std::string>& allowed) {
  std::string name = className;
  for (int level = 0; level < longestChain && !name.empty(); ++level) {
    if (std::binary_search(allowed.begin(), allowed.end(), name)) {
      return true;
    }
    name = superclassOf(name);
  }
  return false;
}

}  // namespace keyedarchive

void KeyedUnarchiver::registerClass(const std::string& className, Factory factory,
                                    const std::string& superclassName) {
  if (className.empty() || !factory || className == keyedarchive::rootClass ||
      keyedarchive::isPlainClass(className)) {
    throw Exception(invalidArgumentException, "class \"" + className + "\" cannot be registered");
  }
  keyedarchive::Registry& classes = keyedarchive::registry();
  const MutexLock lock(classes.mutex);
  classes.classes[className] = {std::move(factory),
                                superclassName.empty() ? keyedarchive::rootClass : superclassName};
}

}  // namespace platform
