#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <cmath>
#include <limits>

#include "platform/Exception.h"
#include "platform/PropertyList.h"
#include "tests/platform/propertylist/BinaryListBuilder.h"

namespace platform {
namespace {

using test::bytesFromHex;
using ::testing::HasSubstr;

Data write(const Value& value) { return dataFromPropertyList(value, PropertyListFormat::binary); }

// The objects alone: what stands between the header and the offset table.
std::string objectsOf(const Value& value) {
  const std::string bytes(write(value).view());
  const auto table = static_cast<uint8_t>(bytes.back());
  return bytes.substr(8, table - 8U);
}

std::string reasonOf(const Value& value) {
  try {
    write(value);
  } catch (const Exception& exception) {
    EXPECT_EQ(exception.name(), invalidArgumentException);
    return exception.reason();
  }
  ADD_FAILURE() << "nothing was thrown";
  return {};
}

TEST(PropertyListBinaryWriter, writesHeaderTableAndTrailer) {
  EXPECT_EQ(write(Value(Value::Array{true})).view(),
            "bplist00" + bytesFromHex("a1 01 09  08 0a  000000000000 01 01 0000000000000002 "
                                      "0000000000000000 000000000000000b"));
}

TEST(PropertyListBinaryWriter, writesIntegersInTheFewestBytes) {
  EXPECT_EQ(objectsOf(0), bytesFromHex("10 00"));
  EXPECT_EQ(objectsOf(255), bytesFromHex("10 ff"));
  EXPECT_EQ(objectsOf(256), bytesFromHex("11 0100"));
  EXPECT_EQ(objectsOf(65536), bytesFromHex("12 00010000"));
  EXPECT_EQ(objectsOf(int64_t{1} << 32), bytesFromHex("13 0000000100000000"));
  EXPECT_EQ(objectsOf(-1), bytesFromHex("13 ffffffffffffffff"));
  EXPECT_EQ(objectsOf(std::numeric_limits<uint64_t>::max()),
            bytesFromHex("14 0000000000000000 ffffffffffffffff"));
}

TEST(PropertyListBinaryWriter, writesTheOtherLeaves) {
  EXPECT_EQ(objectsOf(false), bytesFromHex("08"));
  EXPECT_EQ(objectsOf(1.5), bytesFromHex("23 3ff8000000000000"));
  EXPECT_EQ(objectsOf(Date{-1}), bytesFromHex("33 bff0000000000000"));
  EXPECT_EQ(objectsOf(UID{1}), bytesFromHex("80 01"));
  EXPECT_EQ(objectsOf(UID{256}), bytesFromHex("81 0100"));
  EXPECT_EQ(objectsOf(UID{65536}), bytesFromHex("83 00010000"));
  EXPECT_EQ(objectsOf(UID{uint64_t{1} << 32}), bytesFromHex("87 0000000100000000"));
  EXPECT_EQ(objectsOf(Data::copy("ab")), bytesFromHex("42 6162"));
  EXPECT_EQ(objectsOf("Café"), bytesFromHex("64 0043 0061 0066 00e9"));
  EXPECT_EQ(objectsOf("😀"), bytesFromHex("62 d83d de00"));
  EXPECT_EQ(objectsOf(std::string("\0", 1)), bytesFromHex("51 00"));
  EXPECT_EQ(objectsOf("123456789012345"),
            bytesFromHex("5f 10 0f") + std::string("123456789012345"));
}

TEST(PropertyListBinaryWriter, writesSortedKeysBeforeTheirValues) {
  EXPECT_EQ(objectsOf(Value::Dictionary{{"b", 1}, {"a", Value::Array{2}}}),
            bytesFromHex("d2 01 02 03 05  51 61  51 62  a1 04  10 02  10 01"));
}

TEST(PropertyListBinaryWriter, writesEqualLeavesOnce) {
  const Value value = Value::Array{"x",
                                   "x",
                                   1,
                                   1,
                                   1.0,
                                   true,
                                   Date{1},
                                   Date{1},
                                   UID{1},
                                   UID{1},
                                   Data::copy("x"),
                                   Data::copy("x")};
  EXPECT_EQ(objectsOf(value),
            bytesFromHex("ac 01 01 02 02 03 04 05 05 06 06 07 07  51 78  10 01 "
                         "23 3ff0000000000000  09  33 3ff0000000000000  80 01  41 78"));
}

TEST(PropertyListBinaryWriter, keepsRealsApartThatCompareEqual) {
  const Value value = Value::Array{0.0, -0.0};
  const std::optional<Value> read = propertyListFromData(write(value));
  ASSERT_TRUE(read);
  EXPECT_FALSE(std::signbit((*read->arrayIf())[0].doubleValue()));
  EXPECT_TRUE(std::signbit((*read->arrayIf())[1].doubleValue()));
}

TEST(PropertyListBinaryWriter, usesAKeyThatIsAlsoAValueOnce) {
  EXPECT_EQ(objectsOf(Value::Dictionary{{"k", "k"}}), bytesFromHex("d1 01 01  51 6b"));
}

TEST(PropertyListBinaryWriter, writesSharedContainersOnce) {
  const Value shared = Value::Array{true};
  EXPECT_EQ(objectsOf(Value::Array{shared, shared}), bytesFromHex("a2 01 01  a1 02  09"));
}

TEST(PropertyListBinaryWriter, writesTheSameBytesForTheSameValue) {
  const auto make = [] {
    return Value(Value::Dictionary{{"z", Value::Array{1, "two", 3.0}}, {"a", Data::copy("d")}});
  };
  EXPECT_EQ(write(make()), write(make()));
}

TEST(PropertyListBinaryWriter, widensReferencesAndOffsetsWithTheList) {
  const auto sizesOf = [](size_t count) {
    Value::Array elements;
    for (size_t i = 0; i < count; ++i) {
      elements.emplace_back(i);
    }
    const Value value(std::move(elements));
    const Data data = write(value);
    EXPECT_EQ(propertyListFromData(data), value);
    const size_t sizes = data.length() - 26;
    return std::pair<int, int>(data.bytes()[sizes], data.bytes()[sizes + 1]);
  };
  EXPECT_EQ(sizesOf(10), (std::pair<int, int>(1, 1)));
  EXPECT_EQ(sizesOf(254), (std::pair<int, int>(2, 1)));
  EXPECT_EQ(sizesOf(255), (std::pair<int, int>(2, 2)));
  EXPECT_EQ(sizesOf(70000), (std::pair<int, int>(3, 3)));
}

TEST(PropertyListBinaryWriter, refusesWhatAPropertyListCannotHold) {
  EXPECT_THAT(reasonOf(Value()), HasSubstr("absent value"));
  EXPECT_THAT(reasonOf(Value::Array{Value()}), HasSubstr("absent value"));
  EXPECT_THAT(reasonOf(*URL::URLWithString("http://a.example/")), HasSubstr("URL"));
  EXPECT_THAT(reasonOf(Date{std::numeric_limits<double>::quiet_NaN()}), HasSubstr("date"));
  EXPECT_THAT(reasonOf("a\xFF"), HasSubstr("not well-formed UTF-8"));
  EXPECT_THAT(reasonOf("\xED\xA0\x80"), HasSubstr("not well-formed UTF-8"));
  EXPECT_THAT(reasonOf(Value::Dictionary{{"\xC3", 1}}), HasSubstr("not well-formed UTF-8"));
}

TEST(PropertyListBinaryWriter, refusesNestingBeyondTheLimit) {
  Value value = Value::Array{};
  for (size_t i = 1; i < propertyListMaximumDepth; ++i) {
    value = Value::Array{value};
  }
  EXPECT_EQ(propertyListFromData(write(value)), value);
  EXPECT_THAT(reasonOf(Value::Array{value}), HasSubstr("nest deeper"));
  // Met first at a shallow place, then at one that is too deep.
  EXPECT_THAT(reasonOf(Value::Array{value.arrayIf()->front(), Value::Array{value}}),
              HasSubstr("nest deeper"));
  for (size_t i = 0; i < 200000; ++i) {
    value = Value::Array{std::move(value)};
  }
  EXPECT_THAT(reasonOf(value), HasSubstr("nest deeper"));
}

}  // namespace
}  // namespace platform
