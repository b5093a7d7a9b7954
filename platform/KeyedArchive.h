// The keyed archive: objects that save themselves under keys of their own choosing, in a binary
// property list. The format is described in docs/formats/keyed-archive.md.
#pragma once

#include <cstdint>
#include <functional>
#include <map>
#include <memory>
#include <optional>
#include <string>
#include <string_view>
#include <variant>
#include <vector>

#include "platform/Data.h"
#include "platform/Exception.h"
#include "platform/Value.h"

namespace platform {

class KeyedArchiver;
class KeyedUnarchiver;

/// An object of a class of our own that can be written to a keyed archive. To be read back, its
/// class must be known to KeyedUnarchiver::registerClass.
class KeyedCodable {
 public:
  virtual ~KeyedCodable() = default;

  /// The class name that the archive records. May be none of the plain classes' names.
  virtual std::string archiveClassName() const = 0;

  /// The names that the archive records above it, nearest first, without the root class.
  virtual std::vector<std::string> archiveSuperclassNames() const { return {}; }

  /// Writes the object's content, by key, with the coder's encode… calls.
  virtual void encodeWithCoder(KeyedArchiver& coder) const = 0;
};

/// What an archive holds under a key: nothing, a plain value (string, number, data), an object of
/// a class of our own, or an array or dictionary of any of these.
///
/// Arrays and dictionaries are archived under the immutable class (NSArray, NSDictionary) unless
/// they are built by mutableArray() and mutableDictionary(), and remember which they were when they
/// are read back. A reader that asks for the mutable class gets only that one; a reader that asks
/// for the immutable class gets both.
///
/// Containers are shared by copies. Thread-safety: immutable once built.
class KeyedObject {
 public:
  using Array = std::vector<KeyedObject>;
  using Dictionary = std::map<std::string, KeyedObject, std::less<>>;

  KeyedObject() = default;
  /// A plain value; arrays and dictionaries inside it are written as such.
  KeyedObject(Value value);
  KeyedObject(std::shared_ptr<const KeyedCodable> object);
  KeyedObject(Array array);
  KeyedObject(Dictionary dictionary);

  /// An array and a dictionary of the mutable class.
  static KeyedObject mutableArray(Array array);
  static KeyedObject mutableDictionary(Dictionary dictionary);

  bool isNil() const noexcept;
  /// The plain value where this is one, else an absent one. What a KeyedUnarchiver gives has arrays
  /// and dictionaries as arrayIf() and dictionaryIf(), never as plain values.
  const Value& value() const noexcept;
  /// The object where this is one, else null.
  std::shared_ptr<const KeyedCodable> object() const noexcept;
  const Array* arrayIf() const noexcept;
  const Dictionary* dictionaryIf() const noexcept;
  /// Whether this is an array or dictionary of the mutable class.
  bool isMutable() const noexcept { return _mutable; }

 private:
  std::variant<std::monostate, Value, std::shared_ptr<const KeyedCodable>,
               std::shared_ptr<const Array>, std::shared_ptr<const Dictionary>>
      _content;
  bool _mutable = false;
};

/// Writes one archive. Keys are written in the order in which they are encoded (those of
/// dictionaries sorted), so that encoding the same content the same way gives the same bytes. An
/// object, container or data value that is met twice (by address) is written once, and so are equal
/// strings. What has been encoded is kept alive until the archiver is gone.
/// Thread-safety: confined to one thread.
class KeyedArchiver {
 public:
  KeyedArchiver();
  ~KeyedArchiver();
  KeyedArchiver(const KeyedArchiver&) = delete;
  KeyedArchiver& operator=(const KeyedArchiver&) = delete;

  // At top level these name the roots; within encodeWithCoder(), the values of that object.
  // Encoding a key twice in one object throws Exception "InvalidArgumentException", as does an
  // object that is being encoded already (a cycle), nesting beyond propertyListMaximumDepth, a nil
  // in an array or dictionary, a value that has no place in an archive (dates, URLs, UIDs), an
  // object whose class name is empty or a plain class's, text that is not UTF-8, and any call after
  // finishEncoding(). After an exception the archive cannot be finished.
  void encodeObject(const KeyedObject& object, std::string_view key);
  void encodeBool(bool value, std::string_view key);
  void encodeInteger(int64_t value, std::string_view key);
  void encodeDouble(double value, std::string_view key);
  void encodeBytes(const Data& value, std::string_view key);

  /// Ends the encoding and gives the archive. May be called once; throws Exception
  /// "InvalidArgumentException" the second time, inside encodeWithCoder() and after a failure.
  Data finishEncoding();

 private:
  class Implementation;
  std::unique_ptr<Implementation> _implementation;
};

/// Reads one archive, always in the secure way: the caller names the classes that may occur, and
/// anything else fails the whole decode before it is constructed: a container is checked with all
/// that it holds, down to the objects of classes of our own, before any of these is made (their
/// content is checked when they ask for it). Strings as dictionary keys are always allowed.
/// What an object is comes from its class name and what this program knows of that class, never
/// from the superclasses that the file claims.
///
/// An object that several places name is made once and shared. Time and memory are linear in the
/// archive's length. Thread-safety: confined to one thread.
class KeyedUnarchiver {
 public:
  /// Makes an object from its archived content, reading it with the coder's decode… calls; null
  /// when the content does not make one. A null element is left out of its array or dictionary.
  using Factory = std::function<std::shared_ptr<const KeyedCodable>(KeyedUnarchiver& coder)>;

  /// Declares a class of our own as decodable; with `superclassName`, also where that class is
  /// allowed. The latest declaration of a name holds. Throws Exception "InvalidArgumentException"
  /// for an empty name and the names of plain classes. Thread-safety: internally synchronised;
  /// usually called once at start-up.
  static void registerClass(const std::string& className, Factory factory,
                            const std::string& superclassName = {});

  /// Names of the plain classes for `allowedClasses` below. A mutable class is a kind of its
  /// immutable one: allowing "NSArray" allows "NSMutableArray", not the other way round.
  static constexpr const char* stringClass = "NSString";
  static constexpr const char* mutableStringClass = "NSMutableString";
  static constexpr const char* numberClass = "NSNumber";
  static constexpr const char* dataClass = "NSData";
  static constexpr const char* mutableDataClass = "NSMutableData";
  static constexpr const char* arrayClass = "NSArray";
  static constexpr const char* mutableArrayClass = "NSMutableArray";
  static constexpr const char* dictionaryClass = "NSDictionary";
  static constexpr const char* mutableDictionaryClass = "NSMutableDictionary";

  /// `data` is a property list of either form; data values come back as slices of it where it is a
  /// binary one. Throws Exception "InconsistentArchiveException" when it is no keyed archive.
  explicit KeyedUnarchiver(const Data& data);
  ~KeyedUnarchiver();
  KeyedUnarchiver(const KeyedUnarchiver&) = delete;
  KeyedUnarchiver& operator=(const KeyedUnarchiver&) = delete;

  // At top level keys name the roots; within a factory, the values of that object.

  bool containsValueForKey(std::string_view key) const;

  /// The object under `key`, nil when there is none. Throws Exception
  /// "InconsistentArchiveException" for an object of a class not named, a class not registered,
  /// a value that is no object, broken references, cycles and excessive depth. What a factory
  /// throws passes through. Strings and data of the mutable classes come back as plain values.
  KeyedObject decodeObjectOfClasses(const std::vector<std::string>& allowedClasses,
                                    std::string_view key);

  // Absent when there is no such key or its value is of another kind.
  std::optional<bool> decodeBool(std::string_view key) const;
  std::optional<int64_t> decodeInteger(std::string_view key) const;
  std::optional<double> decodeDouble(std::string_view key) const;
  std::optional<Data> decodeBytes(std::string_view key) const;

  /// Lets go of the archive; what has been decoded stays. From now on there is nothing under any
  /// key. Throws Exception "InvalidArgumentException" inside a factory.
  void finishDecoding();

 private:
  class Implementation;
  std::unique_ptr<Implementation> _implementation;
};

}  // namespace platform
