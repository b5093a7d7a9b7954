// The classic (non-keyed) object archive: a graph of typed objects in a byte stream.
#pragma once

#include <cstdint>
#include <optional>
#include <span>
#include <string>
#include <string_view>
#include <variant>
#include <vector>

#include "platform/Data.h"
#include "platform/Exception.h"
#include "platform/Value.h"

namespace platform {

/// The object graph that an archive holds, node by node, with everything that a writer needs to
/// reproduce the archive: classes, number type codes, sharing, order of dictionary pairs.
///
/// Nodes name each other by their position in `nodes`, so that copying, comparing and freeing a
/// graph are linear and need no stack. A graph that was read from an archive has no cycles and no
/// unused nodes, and each node stands before those that it is the first to name.
///
/// Equality compares the graphs position by position, data and strings by their bytes.
struct ClassicArchive {
  using NodeIndex = uint32_t;
  /// The position that stands for nil.
  static constexpr NodeIndex nil = 0xFFFFFFFF;

  enum class Class : uint8_t {
    object,
    string,
    data,
    mutableData,
    array,
    mutableArray,
    dictionary,
    mutableDictionary,
    number,
    value,
  };

  /// The content of an NSNumber or NSValue: its type code and the scalars under it in order.
  struct Scalars {
    std::string typeCode;
    /// Integers under the codes for integers, reals under 'f' and 'd'. Unsigned integers are the
    /// number itself, except that those of 'Q' are the signed number of the same bits.
    std::vector<std::variant<int64_t, double>> values;
    friend bool operator==(const Scalars&, const Scalars&) = default;
  };

  struct Node {
    Class nodeClass = Class::object;
    /// string, data, mutableData. Data is a slice of the input; strings are the bytes as stored.
    Data bytes;
    /// array: elements; dictionary: key, value, key, value …
    std::vector<NodeIndex> children;
    /// number, value.
    Scalars scalars;
    friend bool operator==(const Node&, const Node&) = default;
  };

  enum class ByteOrder : uint8_t { littleEndian, bigEndian };

  ByteOrder byteOrder = ByteOrder::littleEndian;
  uint8_t streamerVersion = 4;
  int64_t systemVersion = 1000;
  std::vector<Node> nodes;
  /// One root for each '@' value group; a normal archive has one.
  std::vector<NodeIndex> roots;

  friend bool operator==(const ClassicArchive&, const ClassicArchive&) = default;
};

/// Reads and writes classic archives whose objects are of the ten classes of ClassicArchive::Class.
/// The format is described in docs/formats/classic-archive.md.
namespace classicarchive {

/// Deepest nesting of objects, counted from the root, that the reader accepts and the writer
/// writes. References to objects elsewhere do not count, so that paths through a graph may be
/// longer.
inline constexpr size_t maximumDepth = 512;

/// Reads an archive, of either byte order, streamer version 3 or 4.
/// Throws ArchiveException, with reason and byte offset, for everything else: unknown classes or
/// versions, cycles, counts beyond the bytes there, truncation, bytes after the last group, top
/// groups that hold no object. Time and memory are linear in the length of the input; what shares
/// bytes with `data` keeps it alive.
ClassicArchive decode(const Data& data);

/// Writes a graph with the writer's sharing rules; decode() followed by encode() gives back the
/// bytes of any archive that follows them. Throws Exception "InvalidArgumentException" for a graph
/// that is not one (a position out of range, a cycle, an odd number of dictionary children, scalars
/// that their type code cannot hold, no root) or that decode() would refuse for its depth.
Data encode(const ClassicArchive& archive);

/// The value under one root, nodes shared as in the graph. Strings must be UTF-8 and dictionary
/// keys strings; of two equal keys the later one wins. Throws Exception
/// "InconsistentArchiveException" otherwise. A nil element or value inside a container is refused
/// as well, and so are references by which dictionaries, which copy their keys, would multiply a
/// long one; a nil root is an absent Value. A root that is not there is a "RangeException", a
/// broken graph an "InvalidArgumentException". Linear in the size of the archive. NSNumber becomes
/// a boolean, integer or real: code 'c' and 'B' with the value 0 or 1 a boolean, 'f' and 'd' a
/// real, all else an integer. A NSValue of one scalar becomes that number, of several an array of
/// numbers; a bare NSObject an empty dictionary.
Value value(const ClassicArchive& archive, size_t root = 0);

/// The graph of a value: arrays, dictionaries, strings, data and numbers (booleans with code 'c',
/// integers 'q' or, above the signed range, 'Q', reals 'd'). Heap nodes that the value shares are
/// shared. Throws Exception "InvalidArgumentException" for absent values, dates, UIDs and URLs.
ClassicArchive graph(const Value& value);

}  // namespace classicarchive

/// Decodes one archive, restricted to the classes that the caller names.
/// Thread-safety: confined to one thread.
class ClassicUnarchiver {
 public:
  explicit ClassicUnarchiver(Data data);

  /// Class names from now on allowed; without this call, all ten are. It is the class of an object
  /// that must be among them, not its superclasses. Names of other classes mean nothing.
  void setAllowedClassNames(std::vector<std::string> names);

  /// The first root object. Throws ArchiveException or Exception as classicarchive::decode and
  /// classicarchive::value do, and ArchiveException for an object of a class that is not allowed.
  /// Data in it are slices of the data that is decoded.
  Value decodeRootObject();

 private:
  Data _data;
  std::optional<std::vector<std::string>> _allowedClassNames;
};

/// The archive of one value: classicarchive::encode(classicarchive::graph(value)).
Data classicArchiveWithRootObject(const Value& value);

}  // namespace platform
