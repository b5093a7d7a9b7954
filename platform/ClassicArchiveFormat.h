// What the reader and the writer of classic archives share: tags, classes, type strings. Private
// to those; everyone else includes platform/ClassicArchive.h.
#pragma once

#include <array>
#include <cstddef>
#include <cstdint>
#include <limits>
#include <optional>
#include <span>
#include <string>
#include <string_view>
#include <vector>

#include "platform/ClassicArchive.h"

namespace platform::classicarchive {

/// Head bytes from firstTag to lastTag say what follows; every other one is an integer by itself.
enum Tag : uint8_t {
  firstTag = 0x80,
  int16Tag = 0x81,
  int32Tag = 0x82,
  realTag = 0x83,
  newTag = 0x84,
  nilTag = 0x85,
  endTag = 0x86,
  int64Tag = 0x87,
  lastTag = 0x91,
};

/// Entry n of either table is named by the integer n + referenceBase.
inline constexpr int64_t referenceBase = -110;

inline constexpr std::string_view littleEndianSignature = "streamtyped";
inline constexpr std::string_view bigEndianSignature = "typedstream";

using Class = ClassicArchive::Class;
using NodeIndex = ClassicArchive::NodeIndex;
using Scalar = std::variant<int64_t, double>;

struct ClassDescription {
  std::string_view name;
  int64_t version;
  std::optional<Class> superclass;
};

inline constexpr size_t classCount = 10;
/// By the number of the class.
extern const std::array<ClassDescription, classCount> classDescriptions;

const ClassDescription& description(Class archivedClass);
std::optional<Class> classNamed(std::string_view name);

/// A set of classes, one bit for each by its number.
using ClassSet = uint32_t;
inline constexpr ClassSet allClasses = (1U << classCount) - 1;
inline constexpr ClassSet classSetOf(Class archivedClass) {
  return 1U << static_cast<uint32_t>(archivedClass);
}

/// The same as value(decode(data)), exceptions too, but that an object of a class outside `allowed`
/// is an error as well.
Value decodeValueAllowing(const Data& data, ClassSet allowed);

/// The nodes that `roots` lead to, each once and after all its children. Throws Exception
/// "InvalidArgumentException" for positions out of range, cycles, and dictionaries with a key that
/// lacks its value. Linear, whatever is shared; needs no stack.
std::vector<NodeIndex> nodesChildrenFirst(const ClassicArchive& archive,
                                          std::span<const NodeIndex> roots);

/// Bytes from an archive as a message may show them: quoted, escaped, cut when long.
std::string quoted(std::string_view bytes);

/// The integers that a type code can hold, and those that its written form may show.
struct IntegerRange {
  int64_t minimum;
  int64_t maximum;
  /// What to add to a written negative number to have the number; 0 for signed codes and for 'Q',
  /// whose numbers are kept as their bit pattern.
  int64_t wrap;
};

/// Absent for codes that are not written as integers.
std::optional<IntegerRange> integerRange(char code);

/// A type string that describes nothing but numbers, prepared for walking over the numbers.
///
/// The walk takes time linear in the number of scalars, however the type nests: structures are
/// flattened, parts without scalars are dropped, and every loop that remains goes round at least
/// twice.
///
/// Thread-safety: immutable.
class ScalarType {
 public:
  /// Longest type string and deepest nesting of brackets in one.
  static constexpr size_t maximumLength = 512;
  static constexpr size_t maximumNesting = 32;

  /// Takes exactly one type. Absent for anything else, with the reason in `problem`.
  static std::optional<ScalarType> parse(std::string_view text, std::string& problem);

  uint64_t scalarCount() const noexcept { return _scalarCount; }

  /// Whether this is one number, not in brackets.
  bool isPlain() const noexcept { return _isPlain; }

  /// Calls visit(code) for each scalar in order. The caller has checked scalarCount() before.
  template <typename Visit>
  void forEachScalar(Visit visit) const;

 private:
  friend class ScalarTypeParser;

  /// `count` scalars of a code in a row; or, with code '[', as many rounds over the `bodyLength`
  /// steps that follow.
  struct Step {
    char code = 0;
    uint64_t count = 0;
    size_t bodyLength = 0;
  };

  std::vector<Step> _steps;
  uint64_t _scalarCount = 0;
  bool _isPlain = false;
};

template <typename Visit>
void ScalarType::forEachScalar(Visit visit) const {
  struct Loop {
    size_t begin = 0;
    size_t end = 0;
    uint64_t roundsLeft = 0;
  };
  std::array<Loop, maximumNesting> loops;
  size_t depth = 0;
  size_t next = 0;
  while (true) {
    while (depth > 0 && next == loops[depth - 1].end) {
      Loop& loop = loops[depth - 1];
      if (--loop.roundsLeft == 0) {
        --depth;
      } else {
        next = loop.begin;
      }
    }
    if (next == _steps.size()) {
      return;
    }
    const Step& step = _steps[next++];
    if (step.code == '[') {
      loops[depth++] = {next, next + step.bodyLength, step.count};
      continue;
    }
    for (uint64_t i = 0; i < step.count; ++i) {
      visit(step.code);
    }
  }
}

// What the two ways to a value have in common.

/// Why a graph is no value.
inline constexpr const char* notUTF8 = "string that is not UTF-8";
inline constexpr const char* nilInContainer = "nil in a container";
inline constexpr const char* keyIsNoString = "dictionary key that is not a string";
inline constexpr const char* multipliesKeys = "dictionary keys that multiply a long string";

/// Throws Exception "InconsistentArchiveException".
[[noreturn]] void failArchive(const char* reason);

/// Dictionaries copy their keys, so references to one long string would multiply it. A key costs
/// what it has more than a little; all keys together may cost as much as all strings and data of
/// the archive have.
inline constexpr size_t priceOfKey(size_t length) {
  constexpr size_t freeBytes = 256;
  return length > freeBytes ? length - freeBytes : 0;
}

/// One value, or an array of several; there are as many scalars as the type says.
Value valueOfScalars(const ScalarType& type, const std::vector<Scalar>& scalars);

}  // namespace platform::classicarchive
