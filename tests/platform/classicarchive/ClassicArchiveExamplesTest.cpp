// Whole archives whose content is known, read and written back.
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <cmath>
#include <filesystem>
#include <fstream>
#include <iterator>
#include <limits>

#include <fmt/format.h>

#include "ArchiveBytes.h"

namespace platform {
namespace {

using archivebytes::hex;
using Class = ClassicArchive::Class;

std::string littleEndianDictionary() {
  return hex(
      "040b 73747265616d7479706564 81e803"
      "840140"
      "84"
      "84840c4e5344696374696f6e61727900"
      "8484084e534f626a65637400"
      "85"
      "840169 02"
      "92 84"
      "8484084e53537472696e6701 94"
      "84012b 057469746c65 86"
      "92 84 96 97 05436166c3a9 86"
      "92 84 96 97 05636f756e74 86"
      "92 84"
      "8484084e534e756d62657200"
      "8484074e5356616c756500 94"
      "84012a 84 95"
      "95 812c01"
      "86 86");
}

std::string bigEndianArray() {
  return hex(
      "040b 747970656473747265616d 8103e8"
      "840140 84"
      "84840e4e534d757461626c65417272617900"
      "8484074e53417272617900"
      "8484084e534f626a65637400 85"
      "840169 05"
      "92 84 8484084e53537472696e6701 95"
      "84012b 026869 86"
      "92 96"
      "92 84 8484064e534461746100 95"
      "96 02"
      "84045b32635d 00ff 86"
      "92 84 8484084e534e756d62657200"
      "8484074e5356616c756500 95"
      "84012a 84 840164"
      "9e 833fe0000000000000 86"
      "92 84 9b 9d 9d 9e fe 86"
      "86");
}

ClassicArchive::Node text(std::string_view content) {
  ClassicArchive::Node node;
  node.nodeClass = Class::string;
  node.bytes = Data::copy(content);
  return node;
}

ClassicArchive::Node number(std::string code, std::variant<int64_t, double> value) {
  ClassicArchive::Node node;
  node.nodeClass = Class::number;
  node.scalars = {std::move(code), {value}};
  return node;
}

ClassicArchive::Node container(Class nodeClass, std::vector<ClassicArchive::NodeIndex> children) {
  ClassicArchive::Node node;
  node.nodeClass = nodeClass;
  node.children = std::move(children);
  return node;
}

ClassicArchive dictionaryGraph() {
  ClassicArchive archive;
  archive.nodes = {container(Class::dictionary, {1, 2, 3, 4}), text("title"), text("Café"),
                   text("count"), number("i", int64_t{300})};
  archive.roots = {0};
  return archive;
}

ClassicArchive arrayGraph() {
  ClassicArchive::Node data;
  data.nodeClass = Class::data;
  data.bytes = Data::copy(hex("00ff"));
  ClassicArchive archive;
  archive.byteOrder = ClassicArchive::ByteOrder::bigEndian;
  archive.nodes = {container(Class::mutableArray, {1, 1, 2, 3, 4}), text("hi"), data,
                   number("d", 0.5), number("d", -2.0)};
  archive.roots = {0};
  return archive;
}

TEST(ClassicArchive, ReadsALittleEndianDictionary) {
  const std::string bytes = littleEndianDictionary();
  ASSERT_EQ(bytes.size(), 137U);
  EXPECT_EQ(archivebytes::decodeBytes(bytes), dictionaryGraph());
}

TEST(ClassicArchive, WritesALittleEndianDictionary) {
  EXPECT_EQ(classicarchive::encode(dictionaryGraph()).view(), littleEndianDictionary());
}

TEST(ClassicArchive, ReadsABigEndianMutableArrayWithASharedString) {
  const std::string bytes = bigEndianArray();
  ASSERT_EQ(bytes.size(), 167U);
  EXPECT_EQ(archivebytes::decodeBytes(bytes), arrayGraph());
}

TEST(ClassicArchive, WritesABigEndianMutableArrayWithASharedString) {
  EXPECT_EQ(classicarchive::encode(arrayGraph()).view(), bigEndianArray());
}

TEST(ClassicArchive, GivesTheValueOfADictionary) {
  const Value value = classicarchive::value(archivebytes::decodeBytes(littleEndianDictionary()));
  EXPECT_EQ(value, Value(Value::Dictionary{{"title", "Café"}, {"count", 300}}));
}

TEST(ClassicArchive, GivesTheValueOfAnArray) {
  const Value value = classicarchive::value(archivebytes::decodeBytes(bigEndianArray()));
  EXPECT_EQ(value, Value(Value::Array{"hi", "hi", Data::copy(hex("00ff")), 0.5, -2.0}));
  EXPECT_EQ((*value.arrayIf())[0].identity(), (*value.arrayIf())[1].identity());
}

TEST(ClassicArchive, TheExampleOfItsDescriptionIsRight) {
  const std::string bytes = hex("040b") + "streamtyped" + hex("81e803 8401") + "@" +
                            hex("84 848407") + "NSArray" + hex("00 848408") + "NSObject" +
                            hex("00 85 8401") + "i" + hex("02 9284 848408") + "NSNumber" +
                            hex("00 848407") + "NSValue" + hex("00 94 8401") + "*" +
                            hex("84 8401") + "c" + hex("99 01 86 92 95 86");
  const ClassicArchive archive = archivebytes::decodeBytes(bytes);
  EXPECT_EQ(classicarchive::value(archive), Value(Value::Array{true, true}));
  EXPECT_EQ(archive.nodes.size(), 2U);
  EXPECT_EQ(classicarchive::encode(archive).view(), bytes);
}

// ---- Archives by another writer, where they are at hand

/// A graph in the notation of the list that comes with the files. No recursion limit is needed:
/// those archives are small.
std::string rendered(const ClassicArchive& archive, ClassicArchive::NodeIndex index) {
  const ClassicArchive::Node& node = archive.nodes.at(index);
  std::string result;
  switch (node.nodeClass) {
    case Class::string:
      return fmt::format("\"{}\"", node.bytes.view());
    case Class::data:
      for (const uint8_t byte : node.bytes.span()) {
        result += fmt::format("{:02x}", byte);
      }
      return "data<" + result + ">";
    case Class::number: {
      const std::string& code = node.scalars.typeCode;
      if (const auto* real = std::get_if<double>(&node.scalars.values.at(0))) {
        return fmt::format("num({} {})", code, *real);
      }
      const int64_t integer = std::get<int64_t>(node.scalars.values.at(0));
      return code == "Q" ? fmt::format("num(Q {})", static_cast<uint64_t>(integer))
                         : fmt::format("num({} {})", code, integer);
    }
    case Class::array:
      for (const auto child : node.children) {
        result += (result.empty() ? "" : ", ") + rendered(archive, child);
      }
      return "[" + result + "]";
    case Class::dictionary:
      for (size_t i = 0; i < node.children.size(); i += 2) {
        result += (result.empty() ? "" : ", ") + rendered(archive, node.children[i]) + ": " +
                  rendered(archive, node.children[i + 1]);
      }
      return "{" + result + "}";
    default:
      return "?";
  }
}

std::string contentsOf(const std::filesystem::path& path) {
  std::ifstream file(path, std::ios::binary);
  return {std::istreambuf_iterator<char>(file), std::istreambuf_iterator<char>()};
}

TEST(ClassicArchive, ReadsAndReproducesTheArchivesOfAnotherWriter) {
  const std::filesystem::path folder = ZEB_SOURCE_DIR "/../shared/vectors/typedstream";
  if (!std::filesystem::is_directory(folder)) {
    GTEST_SKIP() << "no sample archives beside the project";
  }
  std::ifstream list(folder / "EXPECTED.tsv");
  std::string line;
  size_t count = 0;
  while (std::getline(list, line)) {
    if (line.empty() || line.starts_with('#') || line.starts_with("file\t")) {
      continue;
    }
    const size_t firstTab = line.find('\t');
    const size_t secondTab = line.find('\t', firstTab + 1);
    ASSERT_NE(secondTab, std::string::npos) << line;
    const std::string name = line.substr(0, firstTab);
    const std::string rootClass = line.substr(firstTab + 1, secondTab - firstTab - 1);
    const std::string content = line.substr(secondTab + 1);
    const std::string expected = rootClass == "NSString" ? fmt::format("\"{}\"", content) : content;
    SCOPED_TRACE(name);
    const std::string bytes = contentsOf(folder / name);
    const ClassicArchive archive = archivebytes::decodeBytes(bytes);
    ASSERT_THAT(archive.roots, testing::ElementsAre(0));
    EXPECT_EQ(rendered(archive, 0), expected);
    EXPECT_EQ(classicarchive::encode(archive).view(), bytes);
    EXPECT_NO_THROW(classicarchive::value(archive));
    ++count;
  }
  EXPECT_GE(count, 18U);
}

}  // namespace
}  // namespace platform
