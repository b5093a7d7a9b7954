// What the reader makes of each construct of the format.
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <bit>
#include <cmath>
#include <limits>

#include "ArchiveBytes.h"

namespace platform {
namespace {

using namespace archivebytes;
using Class = ClassicArchive::Class;
using Scalar = std::variant<int64_t, double>;

int64_t integerIn(const std::string& bytes) {
  return std::get<int64_t>(decodeBytes(bytes).nodes.at(0).scalars.values.at(0));
}

double realIn(const std::string& bytes) {
  return std::get<double>(decodeBytes(bytes).nodes.at(0).scalars.values.at(0));
}

TEST(ClassicArchive, ReadsStreamerVersion3LikeVersion4) {
  std::string bytes = arrayOf(hex("00")) + hex("86");
  bytes[0] = 3;
  const ClassicArchive archive = decodeBytes(bytes);
  EXPECT_EQ(archive.streamerVersion, 3);
  EXPECT_EQ(archive.nodes.at(0).nodeClass, Class::array);
  EXPECT_EQ(classicarchive::encode(archive).view(), bytes);
}

TEST(ClassicArchive, KeepsTheSystemVersion) {
  const std::string bytes = hex("040b") + "streamtyped" + hex("05") + newString("@") + hex("85");
  const ClassicArchive archive = decodeBytes(bytes);
  EXPECT_EQ(archive.systemVersion, 5);
  EXPECT_EQ(classicarchive::encode(archive).view(), bytes);
}

TEST(ClassicArchive, ReadsANilRoot) {
  const ClassicArchive archive = decodeBytes(header() + newString("@") + hex("85"));
  EXPECT_THAT(archive.roots, testing::ElementsAre(ClassicArchive::nil));
  EXPECT_THAT(archive.nodes, testing::IsEmpty());
}

TEST(ClassicArchive, ReadsABareObject) {
  const std::string bytes =
      header() + newString("@") + hex("84") + newClass("NSObject", 0) + hex("85 86");
  const ClassicArchive archive = decodeBytes(bytes);
  EXPECT_EQ(archive.nodes.at(0).nodeClass, Class::object);
  EXPECT_EQ(classicarchive::encode(archive).view(), bytes);
}

TEST(ClassicArchive, ReadsSeveralGroupsAsSeveralRootsThatShareObjects) {
  const std::string bytes = arrayOf(hex("00")) + hex("86  92 92  92 84 93 95 00 86");
  const ClassicArchive archive = decodeBytes(bytes);
  EXPECT_THAT(archive.roots, testing::ElementsAre(0, 0, 1));
  EXPECT_EQ(archive.nodes.size(), 2U);
  EXPECT_EQ(classicarchive::encode(archive).view(), bytes);
}

TEST(ClassicArchive, KeepsNilElements) {
  const std::string bytes = arrayOf(hex("02")) + hex("92 85 92 85 86");
  const ClassicArchive archive = decodeBytes(bytes);
  EXPECT_THAT(archive.nodes.at(0).children,
              testing::ElementsAre(ClassicArchive::nil, ClassicArchive::nil));
  EXPECT_EQ(classicarchive::encode(archive).view(), bytes);
}

TEST(ClassicArchive, ReadsEmptyData) {
  const std::string bytes =
      objectOf("NSData", 0) + newString("i") + hex("00") + newString("[0c]") + hex("86");
  const ClassicArchive archive = decodeBytes(bytes);
  EXPECT_EQ(archive.nodes.at(0).nodeClass, Class::data);
  EXPECT_TRUE(archive.nodes.at(0).bytes.empty());
  EXPECT_EQ(classicarchive::encode(archive).view(), bytes);
}

TEST(ClassicArchive, ReadsMutableClassesWithTheirSuperclasses) {
  const std::string mutableData = header() + newString("@") + hex("84") +
                                  newClass("NSMutableData", 0) + newClass("NSData", 0) +
                                  newClass("NSObject", 0) + hex("85") + newString("i") + hex("01") +
                                  newString("[1c]") + hex("86 86");
  EXPECT_EQ(decodeBytes(mutableData).nodes.at(0).nodeClass, Class::mutableData);
  EXPECT_EQ(classicarchive::encode(decodeBytes(mutableData)).view(), mutableData);
  const std::string mutableDictionary = header() + newString("@") + hex("84") +
                                        newClass("NSMutableDictionary", 0) +
                                        newClass("NSDictionary", 0) + newClass("NSObject", 0) +
                                        hex("85") + newString("i") + hex("00 86");
  EXPECT_EQ(decodeBytes(mutableDictionary).nodes.at(0).nodeClass, Class::mutableDictionary);
  EXPECT_EQ(classicarchive::encode(decodeBytes(mutableDictionary)).view(), mutableDictionary);
}

TEST(ClassicArchive, DataAndStringsAreSlicesOfTheInput) {
  const Data input = Data::copy(objectOf("NSData", 0) + newString("i") + hex("03") +
                                newString("[3c]") + "xyz" + hex("86"));
  const ClassicArchive archive = classicarchive::decode(input);
  const Data& bytes = archive.nodes.at(0).bytes;
  EXPECT_EQ(bytes.view(), "xyz");
  EXPECT_EQ(bytes.bytes(), input.bytes() + input.length() - 4);
}

TEST(ClassicArchive, ReadsReferencesPast110And238InBothTables) {
  // Each data of a new length brings a new string and a new entity, then all come once more.
  std::string first = arrayOf(integer(600)) + hex("92 84") + newClass("NSData", 0) + reference(2) +
                      reference(3) + integer(0) + newString("[0c]") + hex("86");
  std::string second = hex("92") + reference(3);
  for (int i = 1; i < 300; ++i) {
    first += hex("92 84") + reference(4) + reference(3) + integer(i) +
             newString("[" + std::to_string(i) + "c]") + std::string(static_cast<size_t>(i), 'x') +
             hex("86");
    // Strings: 4 "NSData", 5 "[0c]", 6 "[1c]" ...; entities: 3 first data, 4 NSData, 5 next data.
    second += i % 2 == 0
                  ? hex("92") + reference(i + 4)
                  : hex("92 84") + reference(4) + reference(3) + integer(i) + reference(i + 5) +
                        std::string(static_cast<size_t>(i), 'y') + hex("86");
  }
  const std::string bytes = first + second + hex("86");
  const ClassicArchive archive = decodeBytes(bytes);
  const auto& children = archive.nodes.at(0).children;
  ASSERT_EQ(children.size(), 600U);
  for (size_t i = 0; i < 300; ++i) {
    const ClassicArchive::Node& again = archive.nodes.at(children[300 + i]);
    EXPECT_EQ(children[300 + i] == children[i], i % 2 == 0) << i;
    EXPECT_EQ(again.bytes.view(), std::string(i, i % 2 == 0 ? 'x' : 'y')) << i;
  }
  EXPECT_EQ(classicarchive::encode(archive).view(), bytes);
}

TEST(ClassicArchive, ReferencesHaveOneByteUpToEntry237AndThreeFrom238) {
  EXPECT_EQ(reference(0), hex("92"));
  EXPECT_EQ(reference(109), hex("ff"));
  EXPECT_EQ(reference(110), hex("00"));
  EXPECT_EQ(reference(237), hex("7f"));
  EXPECT_EQ(reference(238), hex("818000"));
}

TEST(ClassicArchive, ReadsIntegersOfAllWidths) {
  EXPECT_EQ(integerIn(numberOf("q", hex("81 80 00"))), 128);
  EXPECT_EQ(integerIn(numberOf("q", hex("82 40 9c 00 00"))), 40000);
  EXPECT_EQ(integerIn(numberOf("q", hex("ff"))), -1);
  EXPECT_EQ(integerIn(numberOf("q", hex("92"))), -110);
  EXPECT_EQ(integerIn(numberOf("q", hex("7f"))), 127);
  EXPECT_EQ(integerIn(numberOf("q", hex("87 00f2052a01000000"))), 5000000000);
  EXPECT_EQ(integerIn(numberOf("q", hex("87 0000000000000080"))),
            std::numeric_limits<int64_t>::min());
  EXPECT_EQ(integerIn(numberOf("s", hex("81 00 80"))), -32768);
  EXPECT_EQ(integerIn(numberOf("l", hex("82 ff ff ff 7f"))), 2147483647);
}

TEST(ClassicArchive, ReadsIntegersInLongerFormsThanNeeded) {
  EXPECT_EQ(integerIn(numberOf("q", hex("81 01 00"))), 1);
  EXPECT_EQ(integerIn(numberOf("i", hex("87 ffffffffffffffff"))), -1);
  EXPECT_EQ(integerIn(numberOf("s", hex("82 05 00 00 00"))), 5);
  const std::string bytes = arrayOf(hex("87 0100000000000000")) + hex("81 92 ff 85 86");
  EXPECT_THAT(decodeBytes(bytes).nodes.at(0).children, testing::ElementsAre(ClassicArchive::nil));
}

TEST(ClassicArchive, ReadsUnsignedIntegersAsTheSignedOnesOfTheSameBits) {
  EXPECT_EQ(static_cast<uint64_t>(integerIn(numberOf("Q", hex("fd")))), 18446744073709551613U);
  EXPECT_EQ(integerIn(numberOf("S", hex("fd"))), 65533);
  EXPECT_EQ(integerIn(numberOf("I", hex("fd"))), 4294967293);
  EXPECT_EQ(integerIn(numberOf("L", hex("fd"))), 4294967293);
  EXPECT_EQ(integerIn(numberOf("S", hex("82 40 9c 00 00"))), 40000);
  for (const char* code : {"S", "I", "L", "Q"}) {
    const std::string bytes = numberOf(code, hex("fd"));
    EXPECT_EQ(classicarchive::encode(decodeBytes(bytes)).view(), bytes) << code;
  }
}

TEST(ClassicArchive, ReadsSingleBytesWithoutTags) {
  EXPECT_EQ(integerIn(numberOf("c", hex("84"))), -124);
  EXPECT_EQ(integerIn(numberOf("C", hex("85"))), 133);
  EXPECT_EQ(integerIn(numberOf("B", hex("86"))), 134);
}

TEST(ClassicArchive, ReadsRealsWrittenAsIntegers) {
  EXPECT_EQ(realIn(numberOf("d", hex("fe"))), -2.0);
  EXPECT_EQ(realIn(numberOf("f", hex("81 2c 01"))), 300.0);
  EXPECT_EQ(realIn(numberOf("d", hex("82 ff ff ff 7f"))), 2147483647.0);
}

TEST(ClassicArchive, ReadsRealsOfEitherWidthAndByteOrder) {
  EXPECT_EQ(realIn(numberOf("d", hex("83 000000000000e03f"))), 0.5);
  EXPECT_EQ(realIn(numberOf("f", hex("83 0000003f"))), 0.5);
  std::string bytes = numberOf("f", hex("83 3f000000"));
  bytes.replace(2, 14, "typedstream" + hex("8103e8"));
  EXPECT_EQ(realIn(bytes), 0.5);
  EXPECT_EQ(classicarchive::encode(decodeBytes(bytes)).view(), bytes);
}

TEST(ClassicArchive, KeepsRealsThatAreNoNumbers) {
  const std::string infinity = numberOf("d", hex("83 000000000000f0ff"));
  EXPECT_EQ(realIn(infinity), -std::numeric_limits<double>::infinity());
  EXPECT_EQ(classicarchive::encode(decodeBytes(infinity)).view(), infinity);
  const std::string notANumber = numberOf("d", hex("83 010000000000f87f"));
  EXPECT_TRUE(std::isnan(realIn(notANumber)));
  EXPECT_EQ(classicarchive::encode(decodeBytes(notANumber)).view(), notANumber);
  const std::string minusZero = numberOf("d", hex("83 0000000000000080"));
  EXPECT_TRUE(std::signbit(realIn(minusZero)));
  EXPECT_EQ(classicarchive::encode(decodeBytes(minusZero)).view(), minusZero);
}

TEST(ClassicArchive, ReadsStructuresInValues) {
  const std::string bytes = valueOf("{_Point=ff}", hex("05 83 0000003f"));
  const ClassicArchive::Scalars scalars = decodeBytes(bytes).nodes.at(0).scalars;
  EXPECT_EQ(scalars.typeCode, "{_Point=ff}");
  EXPECT_THAT(scalars.values, testing::ElementsAre(Scalar(5.0), Scalar(0.5)));
  EXPECT_EQ(classicarchive::encode(decodeBytes(bytes)).view(), bytes);
}

TEST(ClassicArchive, ReadsArraysAndStructuresInEachOtherInOrder) {
  const std::string bytes =
      valueOf("{a=c[2{b=s[2[1C]]}]{=}[3d]}", hex("ff  01 91 92  02 93 94  03 04 05"));
  const ClassicArchive::Scalars scalars = decodeBytes(bytes).nodes.at(0).scalars;
  EXPECT_THAT(scalars.values,
              testing::ElementsAre(Scalar(int64_t{-1}), Scalar(int64_t{1}), Scalar(int64_t{0x91}),
                                   Scalar(int64_t{0x92}), Scalar(int64_t{2}), Scalar(int64_t{0x93}),
                                   Scalar(int64_t{0x94}), Scalar(3.0), Scalar(4.0), Scalar(5.0)));
  EXPECT_EQ(classicarchive::encode(decodeBytes(bytes)).view(), bytes);
}

TEST(ClassicArchive, ReadsTypesWithoutAnyContent) {
  for (const char* code :
       {"{x=}", "[0i]", "[281474976710656{x=}]", "[1000[0c]]", "{x=[0c][9{=}]}"}) {
    const std::string bytes = valueOf(code, "");
    EXPECT_THAT(decodeBytes(bytes).nodes.at(0).scalars.values, testing::IsEmpty()) << code;
    EXPECT_EQ(classicarchive::encode(decodeBytes(bytes)).view(), bytes) << code;
  }
}

TEST(ClassicArchive, ReadsATypeCodeWrittenTwiceAsLiteral) {
  const std::string bytes = objectOf("NSValue", 0) + newString("*") + hex("84") + newString("i") +
                            newString("i") + hex("07 86");
  EXPECT_EQ(integerIn(bytes), 7);
}

TEST(ClassicArchive, ReadsAClassWrittenTwiceAsLiteral) {
  const std::string bytes = arrayOf(hex("01")) + hex("92 84") + newClass("NSArray", 0) +
                            reference(2) + reference(3) + hex("00 86 86");
  EXPECT_THAT(decodeBytes(bytes).nodes.at(0).children, testing::ElementsAre(1));
}

TEST(ClassicArchive, KeepsStringBytesThatAreNoText) {
  const std::string bytes = objectOf("NSString", 1) + newString("+") + hex("03 ff 00 84 86");
  const ClassicArchive archive = decodeBytes(bytes);
  EXPECT_EQ(archive.nodes.at(0).bytes.view(), hex("ff0084"));
  EXPECT_EQ(classicarchive::encode(archive).view(), bytes);
}

}  // namespace
}  // namespace platform
