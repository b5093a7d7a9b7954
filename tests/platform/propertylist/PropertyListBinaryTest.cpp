#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <cmath>
#include <limits>

#include "platform/PropertyList.h"
#include "tests/platform/propertylist/BinaryListBuilder.h"

namespace platform {
namespace {

using test::BinaryListBuilder;
using test::bytesFromHex;
using test::listOf;
using ::testing::HasSubstr;

std::optional<Value> read(const Data& data) { return propertyListFromData(data); }

std::optional<Value> readObject(std::string_view hex) { return read(listOf(bytesFromHex(hex))); }

std::string errorOf(const Data& data) {
  Error error;
  const std::optional<Value> value = propertyListFromData(data, &error);
  EXPECT_FALSE(value.has_value());
  EXPECT_EQ(error.domain, formatErrorDomain);
  EXPECT_EQ(error.code, 1);
  return error.description;
}

std::string errorOfObject(std::string_view hex) { return errorOf(listOf(bytesFromHex(hex))); }

TEST(PropertyListBinary, readsBooleans) {
  EXPECT_EQ(readObject("08"), Value(false));
  EXPECT_EQ(readObject("09"), Value(true));
}

TEST(PropertyListBinary, readsShortIntegersAsUnsigned) {
  EXPECT_EQ(readObject("10 ff"), Value(255));
  EXPECT_EQ(readObject("11 ffff"), Value(65535));
  EXPECT_EQ(readObject("12 ffffffff"), Value(int64_t{4294967295}));
}

TEST(PropertyListBinary, readsEightByteIntegersAsSigned) {
  EXPECT_EQ(readObject("13 ffffffffffffffff"), Value(-1));
  EXPECT_EQ(readObject("13 8000000000000000"), Value(std::numeric_limits<int64_t>::min()));
  EXPECT_EQ(readObject("13 7fffffffffffffff"), Value(std::numeric_limits<int64_t>::max()));
}

TEST(PropertyListBinary, readsSixteenByteIntegersThatFit) {
  EXPECT_EQ(readObject("14 0000000000000000 ffffffffffffffff"),
            Value(std::numeric_limits<uint64_t>::max()));
  EXPECT_EQ(readObject("14 ffffffffffffffff fffffffffffffffe"), Value(-2));
  EXPECT_THAT(errorOfObject("14 0000000000000001 0000000000000000"), HasSubstr("out of range"));
  EXPECT_THAT(errorOfObject("14 ffffffffffffffff 7fffffffffffffff"), HasSubstr("out of range"));
}

TEST(PropertyListBinary, readsRealsOfBothSizes) {
  EXPECT_EQ(readObject("22 3fc00000"), Value(1.5));
  EXPECT_EQ(readObject("23 c004000000000000"), Value(-2.5));
  EXPECT_TRUE(std::isnan(readObject("23 7ff8000000000000")->doubleValue()));
  EXPECT_THAT(errorOfObject("21 0000"), HasSubstr("real is not of 4 or 8 bytes"));
}

TEST(PropertyListBinary, readsDates) {
  EXPECT_EQ(readObject("33 3ff8000000000000"), Value(Date{1.5}));
  EXPECT_THAT(errorOfObject("32 00000000"), HasSubstr("date is not of 8 bytes"));
  EXPECT_THAT(errorOfObject("33 7ff8000000000000"), HasSubstr("date is no number"));
  EXPECT_THAT(errorOfObject("33 7ff0000000000000"), HasSubstr("date is no number"));
}

TEST(PropertyListBinary, readsDataAsSlicesOfTheInput) {
  const Data list = listOf(bytesFromHex("43 010203"));
  const std::optional<Value> value = read(list);
  ASSERT_TRUE(value && value->dataIf());
  EXPECT_EQ(value->dataIf()->bytes(), list.bytes() + 9);
  EXPECT_EQ(value->dataIf()->length(), 3U);
}

TEST(PropertyListBinary, readsStringsWithNULInside) {
  EXPECT_EQ(readObject("53 610062"), Value(std::string("a\0b", 3)));
  EXPECT_EQ(readObject("62 0000 00e9"), Value(std::string("\0é", 3)));
  EXPECT_EQ(readObject("50"), Value(""));
  EXPECT_EQ(readObject("60"), Value(""));
}

TEST(PropertyListBinary, readsSurrogatePairs) { EXPECT_EQ(readObject("62 d83d de00"), Value("😀")); }

TEST(PropertyListBinary, refusesLoneSurrogates) {
  EXPECT_THAT(errorOfObject("61 d83d"), HasSubstr("surrogate without its pair at byte 8"));
  EXPECT_THAT(errorOfObject("62 de00 d83d"), HasSubstr("surrogate"));
  EXPECT_THAT(errorOfObject("62 d83d 0041"), HasSubstr("surrogate"));
}

TEST(PropertyListBinary, refusesBytesAboveASCIIInASCIIStrings) {
  EXPECT_THAT(errorOfObject("52 61e9"), HasSubstr("string is not ASCII at byte 10"));
}

TEST(PropertyListBinary, readsUIDsOfOneToEightBytes) {
  EXPECT_EQ(readObject("80 05"), Value(UID{5}));
  EXPECT_EQ(readObject("82 010000"), Value(UID{65536}));
  EXPECT_EQ(readObject("87 ffffffffffffffff"), Value(UID{std::numeric_limits<uint64_t>::max()}));
  EXPECT_THAT(errorOfObject("88 000000000000000001"), HasSubstr("UID of more than 8 bytes"));
}

TEST(PropertyListBinary, readsCountsOfEveryIntegerSize) {
  const std::string text(16, 'x');
  for (const char* count : {"10 10", "11 0010", "12 00000010", "13 0000000000000010"}) {
    EXPECT_EQ(read(listOf(bytesFromHex(std::string("5f") + count) + text)), Value(text)) << count;
  }
  EXPECT_THAT(errorOf(listOf(bytesFromHex("5f 14 00000000000000000000000000000010") + text)),
              HasSubstr("count is no integer"));
  EXPECT_THAT(errorOf(listOf(bytesFromHex("5f 22 00000010") + text)),
              HasSubstr("count is no integer"));
}

TEST(PropertyListBinary, refusesCountsBeyondTheBytesThere) {
  for (const char* hex :
       {"4f 13 ffffffffffffffff", "5f 13 7fffffffffffffff", "6f 13 8000000000000000",
        "af 13 ffffffffffffffff", "df 13 4000000000000001", "44 000000", "53 6161", "62 00 61",
        "12 00", "23 00", "a2 0000", "80", "d1 0000"}) {
    EXPECT_THAT(errorOfObject(hex), HasSubstr("beyond the objects at byte 8")) << hex;
  }
  EXPECT_THAT(errorOfObject("5f 13 00"), HasSubstr("count runs beyond the objects"));
  EXPECT_THAT(errorOfObject("5f"), HasSubstr("count is no integer"));
}

TEST(PropertyListBinary, refusesNullSetsAndUnknownMarkers) {
  EXPECT_THAT(errorOfObject("00"), HasSubstr("null is no value"));
  EXPECT_THAT(errorOfObject("0f"), HasSubstr("unknown marker 0x0f"));
  EXPECT_THAT(errorOfObject("b0"), HasSubstr("sets are not supported"));
  EXPECT_THAT(errorOfObject("c0"), HasSubstr("sets are not supported"));
  EXPECT_THAT(errorOfObject("70"), HasSubstr("unknown marker 0x70"));
  EXPECT_THAT(errorOfObject("90"), HasSubstr("unknown marker 0x90"));
  EXPECT_THAT(errorOfObject("e0"), HasSubstr("unknown marker 0xe0"));
  EXPECT_THAT(errorOfObject("15 00"), HasSubstr("integer of more than 16 bytes"));
}

TEST(PropertyListBinary, readsArraysAndDictionaries) {
  BinaryListBuilder builder;
  builder.objects = {builder.array({1, 2}),
                     BinaryListBuilder::text("a"),
                     builder.dictionary({1, 3}, {4, 5}),
                     BinaryListBuilder::text("b"),
                     bytesFromHex("10 07"),
                     builder.array({})};
  EXPECT_EQ(read(builder.data()),
            Value(Value::Array{"a", Value::Dictionary{{"a", 7}, {"b", Value::Array{}}}}));
}

TEST(PropertyListBinary, readsEveryOffsetAndReferenceSize) {
  for (size_t offsetSize = 1; offsetSize <= 8; ++offsetSize) {
    for (size_t referenceSize = 1; referenceSize <= 8; ++referenceSize) {
      BinaryListBuilder builder;
      builder.offsetSize = offsetSize;
      builder.referenceSize = referenceSize;
      builder.objects = {builder.array({1}), BinaryListBuilder::text("x")};
      EXPECT_EQ(read(builder.data()), Value(Value::Array{"x"}))
          << offsetSize << " " << referenceSize;
    }
  }
}

TEST(PropertyListBinary, takesTheTopObjectFromTheTrailer) {
  BinaryListBuilder builder;
  builder.objects = {BinaryListBuilder::text("x"), builder.array({0})};
  builder.top = 1;
  EXPECT_EQ(read(builder.data()), Value(Value::Array{"x"}));
}

TEST(PropertyListBinary, givesSharedObjectsAsOneValue) {
  BinaryListBuilder builder;
  builder.objects = {builder.array({1, 1, 2}), builder.array({2}), BinaryListBuilder::text("x")};
  const std::optional<Value> value = read(builder.data());
  ASSERT_TRUE(value);
  const Value::Array& elements = *value->arrayIf();
  EXPECT_EQ(elements[0].identity(), elements[1].identity());
  EXPECT_EQ((*elements[0].arrayIf())[0].identity(), elements[2].identity());
}

TEST(PropertyListBinary, refusesKeysThatAreNoStrings) {
  BinaryListBuilder builder;
  for (const std::string& key : {bytesFromHex("10 01"), builder.array({})}) {
    builder.objects = {builder.dictionary({1}, {2}), key, bytesFromHex("08")};
    EXPECT_THAT(errorOf(builder.data()), HasSubstr("dictionary key is no string"));
    // Also when the key has been read as a value before.
    builder.objects = {builder.array({2, 1}), builder.dictionary({2}, {2}), key};
    EXPECT_THAT(errorOf(builder.data()), HasSubstr("dictionary key is no string"));
  }
}

TEST(PropertyListBinary, takesTheLaterOfTwoEqualKeys) {
  BinaryListBuilder builder;
  builder.objects = {builder.dictionary({1, 2}, {3, 4}), BinaryListBuilder::text("k"),
                     bytesFromHex("61 006b"), bytesFromHex("10 01"), bytesFromHex("10 02")};
  EXPECT_EQ(read(builder.data()), Value(Value::Dictionary{{"k", 2}}));
}

TEST(PropertyListBinary, refusesContainersThatContainThemselves) {
  BinaryListBuilder builder;
  builder.objects = {builder.array({0})};
  EXPECT_THAT(errorOf(builder.data()), HasSubstr("container contains itself at byte 9"));
  builder.objects = {builder.array({1}), builder.dictionary({2}, {0}),
                     BinaryListBuilder::text("k")};
  EXPECT_THAT(errorOf(builder.data()), HasSubstr("container contains itself"));
  builder.objects = {builder.dictionary({0}, {0})};
  EXPECT_FALSE(read(builder.data()));
}

TEST(PropertyListBinary, refusesReferencesBeyondTheObjects) {
  BinaryListBuilder builder;
  builder.objects = {builder.array({1})};
  EXPECT_THAT(errorOf(builder.data()), HasSubstr("reference to object 1 of 1 at byte 9"));
}

TEST(PropertyListBinary, refusesObjectsThatOverlap) {
  // Two entries of the table name the same array.
  BinaryListBuilder builder;
  builder.offsetSize = 1;
  builder.referenceSize = 1;
  std::string list = "bplist00" + bytesFromHex("a2 01 02  a1 03  08");
  const size_t table = list.size();
  list += bytesFromHex("08 0b 0b 0d");
  EXPECT_THAT(errorOf(Data::adopt(list + builder.trailer(4, table))), HasSubstr("overlaps"));
}

// Builds a chain of containers around one leaf, `depth` levels in all.
BinaryListBuilder nested(size_t depth) {
  BinaryListBuilder builder;
  builder.referenceSize = 4;
  for (size_t i = 0; i < depth; ++i) {
    builder.add(builder.array({i + 1}));
  }
  builder.add("\x08");
  return builder;
}

TEST(PropertyListBinary, readsNestingUpToTheLimitAndNoDeeper) {
  EXPECT_TRUE(read(nested(propertyListMaximumDepth).data()));
  EXPECT_THAT(errorOf(nested(propertyListMaximumDepth + 1).data()), HasSubstr("nest deeper"));
  EXPECT_THAT(errorOf(nested(200000).data()), HasSubstr("nest deeper"));
}

TEST(PropertyListBinary, countsTheLongestPathToASharedContainer) {
  // The root names the tail of a chain first, so that it is read at a shallow place.
  BinaryListBuilder builder = nested(propertyListMaximumDepth);
  const size_t shallow = builder.add(builder.array({propertyListMaximumDepth / 2, 0}));
  builder.top = shallow;
  EXPECT_THAT(errorOf(builder.data()), HasSubstr("nest deeper"));
  builder.objects[shallow] = builder.array({propertyListMaximumDepth / 2, 1});
  EXPECT_TRUE(read(builder.data()));
}

TEST(PropertyListBinary, readsAGraphOfTwoToTheSixtyPathsAtOnce) {
  BinaryListBuilder builder;
  builder.offsetSize = 2;
  builder.referenceSize = 1;
  for (size_t i = 0; i < 60; ++i) {
    builder.add(builder.array({i + 1, i + 1}));
  }
  builder.add(BinaryListBuilder::text("end"));
  const std::optional<Value> first = read(builder.data());
  const std::optional<Value> second = read(builder.data());
  ASSERT_TRUE(first && second);
  EXPECT_EQ(*first, *second);
  const Data written = dataFromPropertyList(*first, PropertyListFormat::binary);
  EXPECT_LT(written.length(), 512U);
  EXPECT_EQ(read(written), first);
}

TEST(PropertyListBinary, sharesOneLargeArrayAmongManyContainers) {
  BinaryListBuilder builder;
  builder.referenceSize = 4;
  const size_t leaf = builder.add("\x08");
  const size_t large = builder.add(builder.array(std::vector<size_t>(50000, leaf)));
  std::vector<size_t> holders;
  for (size_t i = 0; i < 50000; ++i) {
    holders.push_back(builder.add(builder.array({large})));
  }
  builder.top = builder.add(builder.array(holders));
  const std::optional<Value> value = read(builder.data());
  ASSERT_TRUE(value);
  const Value::Array& elements = *value->arrayIf();
  ASSERT_EQ(elements.size(), 50000U);
  EXPECT_EQ((*elements[0].arrayIf())[0].identity(), (*elements[49999].arrayIf())[0].identity());
}

TEST(PropertyListBinary, refusesALongKeySharedByManyDictionaries) {
  // Each dictionary needs its own copy: 20 GB from 1.2 MB.
  BinaryListBuilder builder;
  builder.referenceSize = 4;
  const size_t key = builder.add(BinaryListBuilder::text(std::string(1000000, 'k')));
  std::vector<size_t> holders;
  for (size_t i = 0; i < 20000; ++i) {
    holders.push_back(builder.add(builder.dictionary({key}, {key})));
  }
  builder.top = builder.add(builder.array(holders));
  EXPECT_THAT(errorOf(builder.data()), HasSubstr("long keys are shared"));
}

TEST(PropertyListBinary, takesShortKeysSharedByManyDictionaries) {
  BinaryListBuilder builder;
  builder.referenceSize = 4;
  const size_t key = builder.add(BinaryListBuilder::text(std::string(100, 'k')));
  std::vector<size_t> holders;
  for (size_t i = 0; i < 20000; ++i) {
    holders.push_back(builder.add(builder.dictionary({key}, {key})));
  }
  builder.top = builder.add(builder.array(holders));
  EXPECT_TRUE(read(builder.data()));
}

TEST(PropertyListBinary, refusesTrailersThatDoNotFit) {
  const std::string objects = "bplist00" + bytesFromHex("a1 00 01  08");
  BinaryListBuilder good;
  const auto list = [&](const BinaryListBuilder& builder, uint64_t count, uint64_t table) {
    return Data::adopt(objects + bytesFromHex("00000008 0000000b") + builder.trailer(count, table));
  };
  EXPECT_TRUE(read(list(good, 2, 12)));
  for (const size_t size : {size_t{0}, size_t{9}, size_t{255}}) {
    BinaryListBuilder bad;
    bad.offsetSize = size;
    EXPECT_THAT(errorOf(list(bad, 2, 12)), HasSubstr("offset size"));
    bad = {};
    bad.referenceSize = size;
    EXPECT_THAT(errorOf(list(bad, 2, 12)), HasSubstr("reference size"));
  }
  constexpr uint64_t huge = std::numeric_limits<uint64_t>::max();
  for (const uint64_t table : {uint64_t{0}, uint64_t{8}, uint64_t{20}, uint64_t{52}, huge}) {
    EXPECT_THAT(errorOf(list(good, 2, table)), HasSubstr("offset table at")) << table;
  }
  for (const uint64_t count : {uint64_t{0}, uint64_t{1}, uint64_t{3}, huge / 4 + 1, huge}) {
    EXPECT_THAT(errorOf(list(good, count, 12)), HasSubstr("offset table of 8 bytes")) << count;
  }
  EXPECT_THAT(errorOf(list(good, 2, 11)), HasSubstr("offset table of 9 bytes"));
  for (const uint64_t top : {uint64_t{2}, huge}) {
    BinaryListBuilder bad;
    bad.top = top;
    EXPECT_THAT(errorOf(list(bad, 2, 12)), HasSubstr("top object"));
  }
}

TEST(PropertyListBinary, refusesMoreObjectsThanBytesForThem) {
  BinaryListBuilder builder;
  builder.offsetSize = 1;
  EXPECT_THAT(
      errorOf(Data::adopt("bplist00\x08" + std::string(50, '\x08') + builder.trailer(50, 9))),
      HasSubstr("50 objects in 1 bytes"));
}

TEST(PropertyListBinary, refusesOffsetsOutsideTheObjects) {
  for (const char* offset : {"00000000", "00000007", "00000009", "ffffffff"}) {
    BinaryListBuilder builder;
    EXPECT_THAT(errorOf(Data::adopt("bplist00\x08" + bytesFromHex(offset) + builder.trailer(1, 9))),
                HasSubstr("outside the objects at byte 9"));
  }
}

TEST(PropertyListBinary, refusesOtherVersionsAndShortInput) {
  EXPECT_THAT(errorOf(Data::copy("bplist15" + std::string(64, '\0'))),
              HasSubstr("unknown version"));
  EXPECT_THAT(errorOf(Data::copy("bplist")), HasSubstr("unknown version"));
  EXPECT_THAT(errorOf(Data::copy("bplist00")), HasSubstr("too short at byte 8"));
}

TEST(PropertyListBinary, tellsTheFormatOnlyOnSuccess) {
  PropertyListFormat format = PropertyListFormat::xml;
  EXPECT_FALSE(propertyListFromData(listOf(std::string(1, '\0')), nullptr, &format));
  EXPECT_EQ(format, PropertyListFormat::xml);
  EXPECT_TRUE(propertyListFromData(listOf("\x08"), nullptr, &format));
  EXPECT_EQ(format, PropertyListFormat::binary);
}

}  // namespace
}  // namespace platform
