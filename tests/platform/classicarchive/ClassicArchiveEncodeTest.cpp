// The writer's choices, and the graphs that it refuses.
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <cmath>
#include <limits>

#include "ArchiveBytes.h"

namespace platform {
namespace {

using namespace archivebytes;
using Class = ClassicArchive::Class;
using Scalar = std::variant<int64_t, double>;

ClassicArchive archiveOf(std::vector<ClassicArchive::Node> nodes) {
  ClassicArchive archive;
  archive.nodes = std::move(nodes);
  archive.roots = {0};
  return archive;
}

ClassicArchive::Node container(Class nodeClass, std::vector<ClassicArchive::NodeIndex> children) {
  ClassicArchive::Node node;
  node.nodeClass = nodeClass;
  node.children = std::move(children);
  return node;
}

ClassicArchive::Node scalars(Class nodeClass, std::string code, std::vector<Scalar> values) {
  ClassicArchive::Node node;
  node.nodeClass = nodeClass;
  node.scalars = {std::move(code), std::move(values)};
  return node;
}

std::string numberBytes(std::string code, Scalar value) {
  return std::string(
      classicarchive::encode(archiveOf({scalars(Class::number, std::move(code), {value})})).view());
}

void expectRefusal(const ClassicArchive& archive, const std::string& reason) {
  try {
    classicarchive::encode(archive);
    ADD_FAILURE() << "not refused: " << reason;
  } catch (const Exception& exception) {
    EXPECT_EQ(exception.name(), invalidArgumentException);
    EXPECT_THAT(exception.reason(), testing::HasSubstr(reason));
  }
}

TEST(ClassicArchive, WritesTheShortestFormOfAnInteger) {
  for (const int64_t value :
       {int64_t{0}, int64_t{127}, int64_t{128}, int64_t{-110}, int64_t{-111}, int64_t{32767},
        int64_t{32768}, int64_t{-32768}, int64_t{-32769}, int64_t{2147483647}, int64_t{2147483648},
        int64_t{-2147483648}, int64_t{-2147483649}, std::numeric_limits<int64_t>::max(),
        std::numeric_limits<int64_t>::min()}) {
    EXPECT_EQ(numberBytes("q", value), numberOf("q", integer(value))) << value;
  }
}

TEST(ClassicArchive, WritesUnsignedIntegersAsSignedOnesOfTheSameWidth) {
  EXPECT_EQ(numberBytes("S", int64_t{65535}), numberOf("S", hex("ff")));
  EXPECT_EQ(numberBytes("S", int64_t{32767}), numberOf("S", hex("81ff7f")));
  EXPECT_EQ(numberBytes("I", int64_t{4294967295}), numberOf("I", hex("ff")));
  EXPECT_EQ(numberBytes("I", int64_t{65535}), numberOf("I", hex("82ffff0000")));
  EXPECT_EQ(numberBytes("L", int64_t{4294967295}), numberOf("L", hex("ff")));
  EXPECT_EQ(numberBytes("L", int64_t{4294967296}), numberOf("L", hex("870000000001000000")));
  EXPECT_EQ(numberBytes("Q", int64_t{-3}), numberOf("Q", hex("fd")));
}

TEST(ClassicArchive, WritesWholeRealsAsIntegersAsFarAs32BitsGo) {
  EXPECT_EQ(numberBytes("d", 2147483647.0), numberOf("d", hex("82ffffff7f")));
  EXPECT_EQ(numberBytes("d", -2147483648.0), numberOf("d", hex("8200000080")));
  EXPECT_EQ(numberBytes("d", 2147483648.0), numberOf("d", hex("83 000000000000e041")));
  EXPECT_EQ(numberBytes("d", 0.0), numberOf("d", hex("00")));
  EXPECT_EQ(numberBytes("f", 3.0), numberOf("f", hex("03")));
}

TEST(ClassicArchive, WritesRealsOfTypeFloatRoundedToOne) {
  EXPECT_EQ(numberBytes("f", 0.1), numberOf("f", hex("83 cdcccc3d")));
  // Whole only as a float.
  EXPECT_EQ(numberBytes("f", 16777216.5), numberOf("f", hex("8200000001")));
}

TEST(ClassicArchive, SharesTypeCodesButNotEqualStrings) {
  ClassicArchive::Node text;
  text.nodeClass = Class::string;
  text.bytes = Data::copy("a");
  const std::string bytes(
      classicarchive::encode(archiveOf({container(Class::array, {1, 2, 1, 3, 4}), text, text,
                                        scalars(Class::number, "q", {int64_t{1}}),
                                        scalars(Class::value, "q", {int64_t{2}})}))
          .view());
  const std::string expected =
      arrayOf(hex("05")) +
      // Entity 3, with class 4; strings 4 "NSString", 5 "+".
      hex("92 84") + newClass("NSString", 1) + reference(2) + newString("+") + hex("01") + "a" +
      hex("86") +
      // Entity 5: a string of its own.
      hex("92 84") + reference(4) + reference(5) + hex("01") + "a" + hex("86") +
      // The first string again.
      hex("92") + reference(3) +
      // Entity 6, classes 7 and 8, type code 9; strings 6, 7, 8 "*", 9 "q".
      hex("92 84") + newClass("NSNumber", 0) + newClass("NSValue", 0) + reference(2) +
      newString("*") + hex("84") + newString("q") + reference(9) + hex("01 86") +
      // Entity 10.
      hex("92 84") + reference(8) + reference(8) + reference(9) + reference(9) + hex("02 86") +
      hex("86");
  EXPECT_EQ(bytes, expected);
}

TEST(ClassicArchive, WritesLargeDataOnce) {
  ClassicArchive::Node data;
  data.nodeClass = Class::data;
  data.bytes = Data::adopt(std::vector<uint8_t>(50'000'000, 'x'));
  const Data bytes = classicarchive::encode(archiveOf({container(Class::array, {1, 1}), data}));
  EXPECT_LT(bytes.length(), 50'000'200U);
  const ClassicArchive archive = classicarchive::decode(bytes);
  EXPECT_EQ(archive.nodes.at(1).bytes, data.bytes);
}

TEST(ClassicArchive, RefusesToWriteGraphsThatAreNone) {
  expectRefusal(ClassicArchive{}, "no root");
  expectRefusal(archiveOf({}), "out of range");
  expectRefusal(archiveOf({container(Class::array, {7})}), "out of range");
  expectRefusal(archiveOf({container(Class::array, {0})}), "contains itself");
  expectRefusal(archiveOf({container(Class::array, {1}), container(Class::dictionary, {2, 0}),
                           scalars(Class::number, "c", {int64_t{1}})}),
                "contains itself");
  expectRefusal(archiveOf({container(Class::dictionary, {1}), container(Class::array, {})}),
                "lacks its value");
  expectRefusal(archiveOf({container(Class::string, {1}), container(Class::array, {})}),
                "no container");
  ClassicArchive version2 = archiveOf({container(Class::array, {})});
  version2.streamerVersion = 2;
  expectRefusal(version2, "streamer version 2");
}

TEST(ClassicArchive, RefusesToWriteScalarsThatTheirTypeCannotHold) {
  const auto number = [](std::string code, std::vector<Scalar> values) {
    return archiveOf({scalars(Class::number, std::move(code), std::move(values))});
  };
  expectRefusal(number("c", {int64_t{128}}), "out of the range");
  expectRefusal(number("C", {int64_t{-1}}), "out of the range");
  expectRefusal(number("B", {int64_t{256}}), "out of the range");
  expectRefusal(number("s", {int64_t{32768}}), "out of the range");
  expectRefusal(number("S", {int64_t{-1}}), "out of the range");
  expectRefusal(number("I", {int64_t{4294967296}}), "out of the range");
  expectRefusal(number("L", {int64_t{-1}}), "out of the range");
  expectRefusal(number("f", {1e300}), "out of the range");
  expectRefusal(number("i", {1.0}), "real under a type code for integers");
  expectRefusal(number("c", {1.0}), "real under a type code for integers");
  expectRefusal(number("d", {int64_t{1}}), "integer under a type code for reals");
  expectRefusal(number("i", {}), "not as many scalars");
  expectRefusal(number("i", {int64_t{1}, int64_t{2}}), "not as many scalars");
  expectRefusal(number("{a=i}", {int64_t{1}}), "number of type");
  expectRefusal(number("@", {int64_t{1}}), "object or pointer code");
  expectRefusal(number("", {}), "not exactly one type");
}

TEST(ClassicArchive, WritesAsDeepAsItReads) {
  ClassicArchive archive;
  archive.roots = {0};
  const size_t depth = classicarchive::maximumDepth;
  for (uint32_t i = 1; i < depth; ++i) {
    archive.nodes.push_back(container(Class::array, {i}));
  }
  archive.nodes.push_back(container(Class::array, {}));
  EXPECT_EQ(classicarchive::encode(archive).view(), nestedArrays(depth));
  archive.nodes.back().children = {static_cast<uint32_t>(depth)};
  archive.nodes.push_back(container(Class::array, {}));
  expectRefusal(archive, "nested too deep");
}

TEST(ClassicArchive, RefusesToWriteHugeDepthWithoutUsingTheStack) {
  ClassicArchive archive;
  archive.roots = {0};
  for (uint32_t i = 1; i <= 200'000; ++i) {
    archive.nodes.push_back(container(Class::array, {i}));
  }
  archive.nodes.push_back(container(Class::array, {}));
  expectRefusal(archive, "nested too deep");
}

}  // namespace
}  // namespace platform
