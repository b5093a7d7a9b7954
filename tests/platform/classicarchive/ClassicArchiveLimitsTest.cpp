// Input that is small to write down and large to follow.
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <set>

#include <fmt/format.h>

#include "ArchiveBytes.h"

namespace platform {
namespace {

using namespace archivebytes;
using classicarchive::maximumDepth;

std::string reasonOf(const std::string& bytes) {
  try {
    decodeBytes(bytes);
  } catch (const ArchiveException& exception) {
    return exception.reason();
  }
  return "not refused";
}

TEST(ClassicArchive, ReadsObjectsAsDeepAsTheLimit) {
  const ClassicArchive archive = decodeBytes(nestedArrays(maximumDepth));
  EXPECT_EQ(archive.nodes.size(), maximumDepth);
  EXPECT_EQ(classicarchive::encode(archive).view(), nestedArrays(maximumDepth));
}

TEST(ClassicArchive, RefusesObjectsOneDeeperThanTheLimit) {
  EXPECT_THAT(reasonOf(nestedArrays(maximumDepth + 1)), testing::HasSubstr("nested too deep"));
}

TEST(ClassicArchive, RefusesANestingOf200000) {
  EXPECT_THAT(reasonOf(nestedArrays(200'000)), testing::HasSubstr("nested too deep"));
  EXPECT_THAT(reasonOf(nestedArrays(200'000, false)), testing::HasSubstr("nested too deep"));
}

TEST(ClassicArchive, PathsThroughReferencesMayBeLongerThanTheNestingLimit) {
  // Each array holds the one before it: none is nested, and the last is 100,000 away from the
  // first.
  constexpr int length = 100'000;
  std::string bytes = arrayOf(integer(length)) + innerArrayOf(hex("00")) + hex("86");
  for (int i = 1; i < length; ++i) {
    bytes += innerArrayOf(hex("01")) + hex("92") + reference(i + 2) + hex("86");
  }
  bytes += hex("86");
  const ClassicArchive archive = decodeBytes(bytes);
  EXPECT_EQ(classicarchive::encode(archive).view(), bytes);
  const Value value = classicarchive::value(archive);
  EXPECT_EQ(value.arrayIf()->size(), static_cast<size_t>(length));
  EXPECT_EQ(value, classicarchive::value(archive));
  EXPECT_EQ(classicarchive::graph(value).nodes.size(), static_cast<size_t>(length) + 1);
}

TEST(ClassicArchive, AGraphOf2To60PathsStaysLinear) {
  const std::string bytes = doublingArrays(61);
  EXPECT_EQ(bytes.size(), 16U + 32 + 60 * 5 + 61 + 60 * 2);
  const ClassicArchive archive = decodeBytes(bytes);
  EXPECT_EQ(archive.nodes.size(), 61U);
  const ClassicArchive copy = archive;
  EXPECT_EQ(copy, archive);
  EXPECT_EQ(classicarchive::encode(copy).view(), bytes);

  const Value value = classicarchive::value(archive);
  const Value other = classicarchive::value(copy);
  EXPECT_NE(value.identity(), other.identity());
  EXPECT_EQ(value, other);
  EXPECT_EQ((*value.arrayIf())[0].identity(), (*value.arrayIf())[1].identity());
  EXPECT_EQ(classicarchive::graph(value), archive);
}

TEST(ClassicArchive, CountsAreHeldAgainstTheBytesThatEnclosingArraysLeave) {
  // Each of the arrays claims nearly all bytes that follow; together they would reserve far more.
  std::string bytes = arrayOf(integer(90'000));
  for (int i = 0; i < 200; ++i) {
    bytes += innerArrayOf(integer(90'000));
  }
  bytes += std::string(200'000, '\x92');
  EXPECT_THAT(reasonOf(bytes), testing::HasSubstr("count 90000 exceeds"));
}

TEST(ClassicArchive, TypesOfManyEmptyPartsTakeNoTime) {
  // Without dropping the empty parts this would be 2^40 steps.
  std::string parts;
  for (int i = 0; i < 100; ++i) {
    parts += "[0c]";
  }
  EXPECT_EQ(decodeBytes(valueOf("[281474976710656{x=" + parts + "}]", "")).nodes.size(), 1U);
  const std::string content(100'000, 'x');
  const auto archive = decodeBytes(valueOf("[100000{x=" + parts + "c}]", content));
  EXPECT_EQ(archive.nodes.at(0).scalars.values.size(), content.size());
}

TEST(ClassicArchive, ALongTypeStringUsedOftenIsParsedOnce) {
  const std::string code = "{" + std::string(500, 'a') + "=}";
  constexpr int count = 100'000;
  std::string bytes = arrayOf(integer(count)) + hex("92 84") + newClass("NSValue", 0) +
                      reference(2) + newString("*") + hex("84") + newString(code) + reference(6) +
                      hex("86");
  for (int i = 1; i < count; ++i) {
    bytes += hex("92 84") + reference(4) + reference(5) + reference(5) + reference(6) + hex("86");
  }
  bytes += hex("86");
  EXPECT_EQ(decodeBytes(bytes).nodes.size(), static_cast<size_t>(count) + 1);
}

TEST(ClassicArchive, ReferencesToALongKeyDoNotMultiplyIt) {
  // 20,000 dictionaries of one entry, all with the same key of 100,000 bytes: 2 GB if copied.
  constexpr int count = 20'000;
  const std::string key(100'000, 'k');
  std::string bytes = arrayOf(integer(count)) + hex("92 84") + newClass("NSDictionary", 0) +
                      reference(2) + reference(3) + hex("01 92 84") + newClass("NSString", 1) +
                      reference(2) + newString("+") + integer(static_cast<int64_t>(key.size())) +
                      key + hex("86") + hex("92") + reference(5) + hex("86");
  for (int i = 1; i < count; ++i) {
    bytes += hex("92 84") + reference(4) + reference(3) + hex("01") + hex("92") + reference(5) +
             hex("92") + reference(5) + hex("86");
  }
  bytes += hex("86");
  const ClassicArchive archive = decodeBytes(bytes);
  EXPECT_EQ(archive.nodes.size(), static_cast<size_t>(count) + 2);
  try {
    classicarchive::value(archive);
    ADD_FAILURE() << "not refused";
  } catch (const Exception& exception) {
    EXPECT_EQ(exception.name(), inconsistentArchiveException);
    EXPECT_THAT(exception.reason(), testing::HasSubstr("multiply"));
  }
}

TEST(ClassicArchive, ALongKeyThatIsWrittenForEachUseIsFine) {
  ClassicArchive archive =
      classicarchive::graph(Value::Array{Value::Dictionary{{std::string(100'000, 'k'), 1}},
                                         Value::Dictionary{{std::string(100'000, 'k'), 2}}});
  const Value value = classicarchive::value(archive);
  EXPECT_EQ((*value.arrayIf())[1].dictionaryIf()->begin()->second, Value(2));
}

TEST(ClassicArchive, ADictionaryOf100000EntriesIsReadAndWrittenQuickly) {
  Value::Dictionary anchors;
  for (int i = 0; i < 100'000; ++i) {
    anchors.emplace(fmt::format("anchor-{:06}", i),
                    Value::Array{fmt::format("pages/page{}.html", i % 5000)});
  }
  const Value value = Value::Dictionary{{"SKI_ANCHOR_DATA", std::move(anchors)}};
  // Tenths of a second where nothing is quadratic; else the time-out of the suite ends it.
  const Data bytes = classicArchiveWithRootObject(value);
  EXPECT_EQ(ClassicUnarchiver(bytes).decodeRootObject(), value);
}

}  // namespace
}  // namespace platform
