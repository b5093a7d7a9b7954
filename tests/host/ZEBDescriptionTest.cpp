#include "host/Zebrine/ZEBDescription.h"

#include <gtest/gtest.h>

#include <cmath>
#include <limits>

namespace {

using platform::Value;
using Array = platform::Value::Array;
using Dictionary = platform::Value::Dictionary;

std::string arrays(int count) {
  Value value = "core";
  for (int i = 0; i < count; ++i) {
    value = Array{value};
  }
  return ZEBDescription(value);
}

TEST(ZEBDescription, scalarsReadAsWritten) {
  EXPECT_EQ(ZEBDescription("a \"b\"\nc"), "a \"b\"\nc");
  EXPECT_EQ(ZEBDescription(Value()), "(null)");
  EXPECT_EQ(ZEBDescription(true), "true");
  EXPECT_EQ(ZEBDescription(-3), "-3");
  EXPECT_EQ(ZEBDescription(UINT64_MAX), "18446744073709551615");
  EXPECT_EQ(ZEBDescription(0.25), "0.25");
  EXPECT_EQ(ZEBDescription(platform::UID{4}), "<uid 4>");
  EXPECT_EQ(ZEBDescription(*platform::URL::URLWithString("file:///a%20b")), "file:///a%20b");
}

TEST(ZEBDescription, containersAreOnOneLineWithStringsQuoted) {
  EXPECT_EQ(ZEBDescription(Array{}), "[]");
  EXPECT_EQ(ZEBDescription(Dictionary{}), "{}");
  EXPECT_EQ(ZEBDescription(Dictionary{{"b", Array{1, "two", Value()}}, {"a", false}}),
            R"({"a": false, "b": [1, "two", (null)]})");
  EXPECT_EQ(ZEBDescription(Array{"line\nbreak\t\"quoted\"\\ \r\x01\x7f"}),
            R"(["line\nbreak\t\"quoted\"\\ \r\u0001\u007f"])");
}

TEST(ZEBDescription, dataShowsItsLengthAndFirstBytes) {
  EXPECT_EQ(ZEBDescription(platform::Data()), "<0 bytes>");
  EXPECT_EQ(ZEBDescription(platform::Data::copy("h")), "<1 byte 68>");
  EXPECT_EQ(ZEBDescription(platform::Data::copy(std::string(17, 'h'))),
            "<17 bytes 68686868686868686868686868686868…>");
}

TEST(ZEBDescription, datesReadAsUniversalTime) {
  EXPECT_EQ(ZEBDescription(platform::Date{0}), "2001-01-01T00:00:00Z");
  EXPECT_EQ(ZEBDescription(platform::Date{-0.5}), "2000-12-31T23:59:59Z");
  EXPECT_EQ(ZEBDescription(platform::Date{-63113904000.0}), "0001-01-01T00:00:00Z");
  EXPECT_EQ(ZEBDescription(platform::Date{252423993599.0}), "9999-12-31T23:59:59Z");
}

TEST(ZEBDescription, datesBeyondTheCalendarShowTheirNumber) {
  EXPECT_EQ(ZEBDescription(platform::Date{1e300}), "<date 1e+300>");
  EXPECT_EQ(ZEBDescription(platform::Date{std::nan("")}), "<date nan>");
  EXPECT_EQ(ZEBDescription(platform::Date{-std::numeric_limits<double>::infinity()}),
            "<date -inf>");
}

TEST(ZEBDescription, nestingIsShownToTheMaximumDepth) {
  EXPECT_EQ(arrays(ZEBDescriptionMaximumDepth), R"([[[[[[[["core"]]]]]]]])");
  EXPECT_EQ(arrays(ZEBDescriptionMaximumDepth + 1), "[[[[[[[[…]]]]]]]]");
  EXPECT_EQ(arrays(100000), "[[[[[[[[…]]]]]]]]");
}

TEST(ZEBDescription, lengthIsBoundedHoweverManyPathsLeadThroughAGraph) {
  Value value = "leaf";
  for (int i = 0; i < 60; ++i) {
    value = Array{value, value, value, value, value, value, value, value};
  }
  EXPECT_LE(ZEBDescription(value).size(), ZEBDescriptionMaximumLength + 3);
  const std::string list = ZEBDescription(Array(1000000, Value("element")));
  EXPECT_EQ(list.size(), ZEBDescriptionMaximumLength + 3);
  EXPECT_TRUE(list.ends_with("…"));
}

TEST(ZEBDescription, longStringsAreCutBetweenCharacters) {
  std::string text;
  for (int i = 0; i < 5000; ++i) {
    text += "ü";
  }
  for (const std::string& lead : {std::string(), std::string("x")}) {
    const std::string description = ZEBDescription(Array{lead + text});
    EXPECT_LE(description.size(), ZEBDescriptionMaximumLength + 3);
    EXPECT_TRUE(description.ends_with("ü…")) << description.substr(description.size() - 8);
  }
}

}  // namespace
