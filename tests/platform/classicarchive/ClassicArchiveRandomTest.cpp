// Random graphs against a slow and obvious writer, and random damage to what was written.
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <algorithm>
#include <bit>
#include <cmath>
#include <limits>
#include <random>

#include "ArchiveBytes.h"

namespace platform {
namespace {

using archivebytes::byte;
using Class = ClassicArchive::Class;
using NodeIndex = ClassicArchive::NodeIndex;

/// Random graphs in the order that the reader gives: a node before those that it first names.
class RandomGraphs {
 public:
  explicit RandomGraphs(uint32_t seed) : _random(seed) {}

  ClassicArchive next() {
    ClassicArchive archive;
    archive.byteOrder = _below(2) == 0 ? ClassicArchive::ByteOrder::littleEndian
                                       : ClassicArchive::ByteOrder::bigEndian;
    archive.streamerVersion = static_cast<uint8_t>(3 + _below(2));
    archive.systemVersion = _below(3) == 0 ? 1000 : _below(100'000);
    _finished.clear();
    for (uint32_t i = _below(4) == 0 ? 3 : 1; i > 0; --i) {
      const NodeIndex root = _object(archive, 6);
      archive.roots.push_back(root);
    }
    return archive;
  }

 private:
  uint32_t _below(uint32_t limit) { return static_cast<uint32_t>(_random() % limit); }

  NodeIndex _object(ClassicArchive& archive, int depth) {
    if (_below(20) == 0) {
      return ClassicArchive::nil;
    }
    if (!_finished.empty() && _below(4) == 0) {
      return _finished[_below(static_cast<uint32_t>(_finished.size()))];
    }
    const auto index = static_cast<NodeIndex>(archive.nodes.size());
    archive.nodes.emplace_back();
    ClassicArchive::Node node;
    node.nodeClass = static_cast<Class>(_below(10));
    const auto isOneOf = [&](auto... classes) { return ((node.nodeClass == classes) || ...); };
    if (isOneOf(Class::string, Class::data, Class::mutableData)) {
      node.bytes = Data::adopt(std::string(_below(300), static_cast<char>(_below(256))));
    } else if (isOneOf(Class::array, Class::mutableArray, Class::dictionary,
                       Class::mutableDictionary)) {
      const bool isArray = isOneOf(Class::array, Class::mutableArray);
      const uint32_t count = depth > 0 ? _below(isArray ? 12 : 6) * (isArray ? 1 : 2) : 0;
      for (uint32_t i = 0; i < count; ++i) {
        node.children.push_back(_object(archive, depth - 1));
      }
    } else if (isOneOf(Class::number)) {
      node.scalars.typeCode = std::string(1, "cCBsSiIlLqQfd"[_below(13)]);
      node.scalars.values = {_scalar(node.scalars.typeCode[0])};
    } else if (isOneOf(Class::value)) {
      static const std::vector<std::pair<std::string, std::string>> types = {
          {"{_Point=ff}", "ff"},
          {"{_Rect={_Point=dd}{_Size=dd}}", "dddd"},
          {"i", "i"},
          {"[3{a=cQ}]", "cQcQcQ"},
          {"{e=}", ""},
          {"[2[2s]]", "ssss"}};
      const auto& [code, flat] = types[_below(static_cast<uint32_t>(types.size()))];
      node.scalars.typeCode = code;
      for (const char c : flat) {
        node.scalars.values.push_back(_scalar(c));
      }
    }
    archive.nodes[index] = std::move(node);
    _finished.push_back(index);
    return index;
  }

  std::variant<int64_t, double> _scalar(char code) {
    const auto bits = static_cast<uint64_t>(_random() >> (_below(8) * 8U));
    switch (code) {
      case 'c':
        return int64_t{static_cast<int8_t>(bits)};
      case 'C':
      case 'B':
        return int64_t{static_cast<uint8_t>(bits)};
      case 's':
        return int64_t{static_cast<int16_t>(bits)};
      case 'S':
        return int64_t{static_cast<uint16_t>(bits)};
      case 'i':
        return int64_t{static_cast<int32_t>(bits)};
      case 'I':
      case 'L':
        return int64_t{static_cast<uint32_t>(bits)};
      case 'f':
        return static_cast<double>(static_cast<float>(_real(bits)));
      case 'd':
        return _real(bits);
      default:
        return static_cast<int64_t>(bits);
    }
  }

  double _real(uint64_t bits) {
    switch (_below(5)) {
      case 0:
        return static_cast<double>(static_cast<int32_t>(bits));
      case 1:
        return std::numeric_limits<double>::infinity();
      case 2:
        return -0.0;
      default:
        return static_cast<double>(bits) / 3;
    }
  }

  std::mt19937_64 _random;
  std::vector<NodeIndex> _finished;
};

/// Writes an archive with nothing but recursion and lists that are searched from the front.
class ObviousWriter {
 public:
  explicit ObviousWriter(const ClassicArchive& archive) : _archive(archive) {}

  std::string write() {
    _bytes = byte(_archive.streamerVersion) + byte(11);
    _bytes += _isLittle() ? "streamtyped" : "typedstream";
    _integer(_archive.systemVersion);
    for (const NodeIndex root : _archive.roots) {
      _object(root);
    }
    return _bytes;
  }

 private:
  bool _isLittle() const { return _archive.byteOrder == ClassicArchive::ByteOrder::littleEndian; }

  void _fixed(uint64_t bits, int width) {
    std::string part;
    for (int i = 0; i < width; ++i) {
      part += static_cast<char>((bits >> (8 * i)) & 0xFFU);
    }
    if (!_isLittle()) {
      std::reverse(part.begin(), part.end());
    }
    _bytes += part;
  }

  void _integer(int64_t value) {
    const auto bits = static_cast<uint64_t>(value);
    if (value >= -110 && value < 128) {
      _bytes += static_cast<char>(value);
    } else if (value >= -(1LL << 15U) && value < (1LL << 15U)) {
      _bytes += byte(0x81);
      _fixed(bits, 2);
    } else if (value >= -(1LL << 31U) && value < (1LL << 31U)) {
      _bytes += byte(0x82);
      _fixed(bits, 4);
    } else {
      _bytes += byte(0x87);
      _fixed(bits, 8);
    }
  }

  void _sharedString(const std::string& text) {
    const auto found = std::find(_strings.begin(), _strings.end(), text);
    if (found != _strings.end()) {
      _integer(found - _strings.begin() - 110);
      return;
    }
    _strings.push_back(text);
    _bytes += byte(0x84);
    _integer(static_cast<int64_t>(text.size()));
    _bytes += text;
  }

  /// Writes a reference to an entity that is known by this name; otherwise adds it.
  bool _known(const std::string& name) {
    const auto found = std::find(_entities.begin(), _entities.end(), name);
    if (found != _entities.end()) {
      _integer(found - _entities.begin() - 110);
      return true;
    }
    _entities.push_back(name);
    _bytes += byte(0x84);
    return false;
  }

  void _classChain(const std::string& name) {
    static const std::vector<std::pair<std::string, std::string>> superclasses = {
        {"NSString", "NSObject"},      {"NSData", "NSObject"},
        {"NSMutableData", "NSData"},   {"NSArray", "NSObject"},
        {"NSMutableArray", "NSArray"}, {"NSDictionary", "NSObject"},
        {"NSNumber", "NSValue"},       {"NSMutableDictionary", "NSDictionary"},
        {"NSValue", "NSObject"}};
    if (_known("class " + name)) {
      return;
    }
    _sharedString(name);
    _integer(name == "NSString" ? 1 : 0);
    for (const auto& [subclass, superclass] : superclasses) {
      if (subclass == name) {
        _classChain(superclass);
        return;
      }
    }
    _bytes += byte(0x85);
  }

  void _object(NodeIndex index) {
    static const std::vector<std::string> names = {
        "NSObject", "NSString",       "NSData",       "NSMutableData",
        "NSArray",  "NSMutableArray", "NSDictionary", "NSMutableDictionary",
        "NSNumber", "NSValue"};
    _sharedString("@");
    if (index == ClassicArchive::nil) {
      _bytes += byte(0x85);
      return;
    }
    if (_known("object " + std::to_string(index))) {
      return;
    }
    const ClassicArchive::Node& node = _archive.nodes.at(index);
    const std::string& name = names.at(static_cast<size_t>(node.nodeClass));
    _classChain(name);
    if (name == "NSString") {
      _sharedString("+");
      _integer(static_cast<int64_t>(node.bytes.length()));
      _bytes += node.bytes.view();
    } else if (name.ends_with("Data")) {
      _sharedString("i");
      _integer(static_cast<int64_t>(node.bytes.length()));
      _sharedString("[" + std::to_string(node.bytes.length()) + "c]");
      _bytes += node.bytes.view();
    } else if (name.ends_with("Array") || name.ends_with("Dictionary")) {
      _sharedString("i");
      const size_t divisor = name.ends_with("Array") ? 1 : 2;
      _integer(static_cast<int64_t>(node.children.size() / divisor));
      for (const NodeIndex child : node.children) {
        _object(child);
      }
    } else if (name == "NSNumber" || name == "NSValue") {
      _scalars(node.scalars);
    }
    _bytes += byte(0x86);
  }

  void _scalars(const ClassicArchive::Scalars& scalars) {
    _sharedString("*");
    if (!_known("code " + scalars.typeCode)) {
      _sharedString(scalars.typeCode);
    }
    _sharedString(scalars.typeCode);
    // The codes of the types above stand in order; repetitions were written out as values.
    std::string flat = scalars.typeCode;
    if (flat == "[3{a=cQ}]") {
      flat = "cQcQcQ";
    } else if (flat == "[2[2s]]") {
      flat = "ssss";
    } else if (flat == "{e=}") {
      flat = "";
    } else if (flat.starts_with("{_")) {
      flat = std::string(scalars.values.size(), flat.find("dd") == std::string::npos ? 'f' : 'd');
    }
    ASSERT_EQ(flat.size(), scalars.values.size());
    for (size_t i = 0; i < flat.size(); ++i) {
      if (const auto* real = std::get_if<double>(&scalars.values[i])) {
        _real(flat[i], *real);
      } else {
        _scalar(flat[i], std::get<int64_t>(scalars.values[i]));
      }
    }
  }

  void _scalar(char code, int64_t value) {
    switch (code) {
      case 'c':
      case 'C':
      case 'B':
        _bytes += static_cast<char>(value);
        return;
      case 'S':
        _integer(static_cast<int16_t>(value));
        return;
      case 'I':
      case 'L':
        _integer(static_cast<int32_t>(value));
        return;
      default:
        _integer(value);
    }
  }

  void _real(char code, double value) {
    if (std::abs(value) < 2147483648.0 && std::floor(value) == value && !std::signbit(value)) {
      _integer(static_cast<int64_t>(value));
      return;
    }
    if (value < 0 && value >= -2147483648.0 && std::floor(value) == value) {
      _integer(static_cast<int64_t>(value));
      return;
    }
    _bytes += byte(0x83);
    if (code == 'f') {
      _fixed(std::bit_cast<uint32_t>(static_cast<float>(value)), 4);
    } else {
      _fixed(std::bit_cast<uint64_t>(value), 8);
    }
  }

  const ClassicArchive& _archive;
  std::string _bytes;
  std::vector<std::string> _strings;
  std::vector<std::string> _entities;
};

TEST(ClassicArchive, RandomGraphsComeBackFromTheirArchives) {
  for (uint32_t seed = 0; seed < 400; ++seed) {
    SCOPED_TRACE(seed);
    const ClassicArchive archive = RandomGraphs(seed).next();
    const Data bytes = classicarchive::encode(archive);
    const ClassicArchive again = classicarchive::decode(bytes);
    ASSERT_EQ(again, archive);
    ASSERT_EQ(classicarchive::encode(again), bytes);
  }
}

TEST(ClassicArchive, RandomGraphsAreWrittenAsByAnObviousWriter) {
  for (uint32_t seed = 1000; seed < 1200; ++seed) {
    SCOPED_TRACE(seed);
    const ClassicArchive archive = RandomGraphs(seed).next();
    ASSERT_EQ(classicarchive::encode(archive).view(), ObviousWriter(archive).write());
  }
}

struct Outcome {
  Value value;
  std::string failure;
  bool operator==(const Outcome&) const = default;
};

template <typename Decode>
Outcome outcomeOf(const Decode& decode) {
  try {
    return {decode(), {}};
  } catch (const Exception& exception) {
    return {{}, exception.name() + ": " + exception.reason()};
  }
}

/// The unarchiver, which makes no graph, has to come to the same value or the same exception.
void expectSameValueWithoutAGraph(const Data& data) {
  const Outcome expected =
      outcomeOf([&] { return classicarchive::value(classicarchive::decode(data)); });
  EXPECT_EQ(outcomeOf([&] { return ClassicUnarchiver(data).decodeRootObject(); }), expected)
      << expected.failure;
}

/// Decodes what may be broken: either a graph that lives, or an exception with an offset in range.
void expectGraphOrException(const std::string& bytes) {
  // A buffer of exactly this size, so that a sanitizer sees any read beyond it.
  const Data data = Data::adopt(std::vector<uint8_t>(bytes.begin(), bytes.end()));
  expectSameValueWithoutAGraph(data);
  try {
    const ClassicArchive archive = classicarchive::decode(data);
    const Data again = classicarchive::encode(archive);
    EXPECT_EQ(classicarchive::encode(classicarchive::decode(again)), again);
    for (size_t root = 0; root < archive.roots.size(); ++root) {
      try {
        classicarchive::value(archive, root);
      } catch (const Exception& exception) {
        EXPECT_EQ(exception.name(), inconsistentArchiveException);
      }
    }
  } catch (const ArchiveException& exception) {
    EXPECT_LE(exception.offset(), bytes.size()) << exception.reason();
    EXPECT_FALSE(exception.reason().empty());
  }
}

/// The archives of a few graphs, neither trivial nor long.
std::vector<std::string> sampleArchives() {
  std::vector<std::string> samples;
  for (uint32_t seed = 5000; samples.size() < 4; ++seed) {
    const Data bytes = classicarchive::encode(RandomGraphs(seed).next());
    if (bytes.length() >= 500 && bytes.length() <= 1500) {
      samples.emplace_back(bytes.view());
    }
  }
  return samples;
}

TEST(ClassicArchive, ValuesOfRandomGraphsAreTheSameWithoutAGraph) {
  size_t values = 0;
  for (uint32_t seed = 2000; seed < 3000; ++seed) {
    SCOPED_TRACE(seed);
    const Data data = classicarchive::encode(RandomGraphs(seed).next());
    expectSameValueWithoutAGraph(data);
    values += outcomeOf([&] { return ClassicUnarchiver(data).decodeRootObject(); }).failure.empty();
  }
  EXPECT_GT(values, 100U);
  EXPECT_LT(values, 900U);
}

TEST(ClassicArchive, EveryTruncationIsRefusedOrAShorterArchive) {
  for (const std::string& sample : sampleArchives()) {
    const size_t rootCount = archivebytes::decodeBytes(sample).roots.size();
    for (size_t length = 0; length < sample.size(); ++length) {
      const std::string cut = sample.substr(0, length);
      try {
        // Between two groups an archive may end.
        EXPECT_LT(archivebytes::decodeBytes(cut).roots.size(), rootCount) << length;
      } catch (const ArchiveException& exception) {
        EXPECT_LE(exception.offset(), length);
      }
    }
  }
}

TEST(ClassicArchive, EveryFlippedBitIsRefusedOrAnotherArchive) {
  for (const std::string& sample : sampleArchives()) {
    for (size_t i = 0; i < sample.size(); ++i) {
      for (unsigned bit = 0; bit < 8; ++bit) {
        std::string flipped = sample;
        flipped[i] = static_cast<char>(static_cast<unsigned char>(flipped[i]) ^ (1U << bit));
        expectGraphOrException(flipped);
      }
    }
  }
}

TEST(ClassicArchive, EveryTagInEveryPlaceIsRefusedOrAnotherArchive) {
  for (const std::string& sample : sampleArchives()) {
    for (size_t i = 0; i < sample.size(); ++i) {
      for (int tag = 0x80; tag <= 0x93; ++tag) {
        std::string changed = sample;
        changed[i] = static_cast<char>(tag);
        expectGraphOrException(changed);
      }
    }
  }
}

}  // namespace
}  // namespace platform
