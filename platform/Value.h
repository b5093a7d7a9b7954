// The dynamic value of property lists, payloads, options, attributes and archives.
#pragma once

#include <chrono>
#include <cstdint>
#include <map>
#include <optional>
#include <string>
#include <string_view>
#include <type_traits>
#include <utility>
#include <vector>

#include "platform/Data.h"
#include "platform/URL.h"

namespace platform {

/// A point in time as property lists keep it: seconds since 2001-01-01 00:00 UTC.
struct Date {
  double secondsSinceReference;

  static Date fromTimePoint(std::chrono::system_clock::time_point time);

  friend bool operator==(const Date&, const Date&) = default;
};

/// A reference into the object table of a keyed archive; occurs in property lists only.
struct UID {
  uint64_t index;

  friend bool operator==(const UID&, const UID&) = default;
};

/// One value of any of the kinds below, or absent.
///
/// Strings, data, URLs, arrays and dictionaries are heap nodes that copies share: copying a value
/// is a reference count, whatever hangs below it, and a graph in which nodes are shared stays that
/// graph. Two copies are the same object (identity()); equality compares contents. Copying,
/// comparing and freeing take time linear in the number of nodes, however many paths lead to them,
/// and need no stack however deep they nest.
///
/// Values are trees or acyclic graphs: a container cannot hold itself.
/// Thread-safety: immutable once built; copies may be used from any thread.
class Value {
 public:
  enum class Kind : uint8_t {
    absent,
    boolean,
    integer,
    real,
    date,
    uid,
    string,
    data,
    url,
    array,
    dictionary,
  };

  using Array = std::vector<Value>;
  /// Ordered by key, so that everything that walks one does so the same way each time.
  using Dictionary = std::map<std::string, Value, std::less<>>;

  Value() noexcept : _bits(0) {}
  Value(bool boolean) noexcept;
  template <typename Integer>
  requires(std::is_integral_v<Integer> && !std::is_same_v<Integer, bool>) Value(Integer integer)
  noexcept
      : Value(static_cast<uint64_t>(integer), std::is_signed_v<Integer> && integer < Integer{0}) {}
  Value(double real) noexcept;
  Value(Date date) noexcept;
  Value(UID uid) noexcept;
  Value(std::string string);
  Value(std::string_view string);
  Value(const char* string);
  Value(Data data);
  Value(URL url);
  Value(Array array);
  Value(Dictionary dictionary);

  Value(const Value& other) noexcept;
  Value(Value&& other) noexcept;
  Value& operator=(Value other) noexcept;
  ~Value();

  Kind kind() const noexcept { return _kind; }
  bool isAbsent() const noexcept { return _kind == Kind::absent; }
  bool isNumber() const noexcept {
    return _kind == Kind::boolean || _kind == Kind::integer || _kind == Kind::real;
  }

  /// The number as a boolean: not zero. False for strings and all that is no number, absent too.
  bool boolValue() const noexcept;
  /// The number, reals cut towards zero and clamped, integers above the signed range clamped; 0
  /// for all that is no number.
  int64_t integerValue() const noexcept;
  /// As integerValue() over the unsigned range; negative numbers give 0.
  uint64_t unsignedValue() const noexcept;
  double doubleValue() const noexcept;
  /// Whether an integer lies above the range of int64_t.
  bool isAboveSignedRange() const noexcept;

  // The content where the value is of that kind, else null. Valid as long as any copy lives.
  const std::string* stringIf() const noexcept;
  const Data* dataIf() const noexcept;
  const URL* urlIf() const noexcept;
  const Array* arrayIf() const noexcept;
  const Dictionary* dictionaryIf() const noexcept;
  const Date* dateIf() const noexcept;
  const UID* uidIf() const noexcept;

  /// The string, or absent for another kind.
  std::optional<std::string> stringValue() const;

  /// The entry of a dictionary; absent when there is none or this is no dictionary.
  const Value& operator[](std::string_view key) const noexcept;

  /// Equal for two values exactly when they are copies of one heap node; null for kinds that have
  /// none (absent, numbers, dates, UIDs).
  const void* identity() const noexcept;

  /// Same kind and same content; integers compare by number, a NaN equals itself.
  friend bool operator==(const Value& a, const Value& b);

 private:
  struct Node;
  struct StringNode;
  struct DataNode;
  struct URLNode;
  struct ArrayNode;
  struct DictionaryNode;
  friend struct ValueInternals;

  Value(uint64_t bits, bool negative) noexcept;
  Value(Kind kind, Node* node) noexcept;
  bool _hasNode() const noexcept { return _kind >= Kind::string; }
  void _swap(Value& other) noexcept;
  static void _release(Node* node) noexcept;

  Kind _kind = Kind::absent;
  bool _negative = false;
  union {
    bool _boolean;
    uint64_t _bits;
    double _real;
    Date _date;
    UID _uid;
    Node* _node;
  };
};

}  // namespace platform
