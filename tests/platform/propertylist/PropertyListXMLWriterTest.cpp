#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <cmath>
#include <limits>

#include "platform/Exception.h"
#include "platform/PropertyList.h"

namespace platform {
namespace {

using ::testing::HasSubstr;

std::string write(const Value& value) {
  return std::string(dataFromPropertyList(value, PropertyListFormat::xml).view());
}

// What is written inside the plist element.
std::string contentOf(const Value& value) {
  const std::string begin = "<?xml version=\"1.0\" encoding=\"UTF-8\"?>\n<plist version=\"1.0\">\n";
  const std::string end = "</plist>\n";
  const std::string text = write(value);
  EXPECT_TRUE(text.starts_with(begin));
  EXPECT_TRUE(text.ends_with(end));
  return text.substr(begin.size(), text.size() - begin.size() - end.size());
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

std::optional<Value> readBack(const Value& value) {
  return propertyListFromData(dataFromPropertyList(value, PropertyListFormat::xml));
}

TEST(PropertyListXMLWriter, writesEveryKind) {
  EXPECT_EQ(contentOf(Value::Dictionary{{"a", Value::Array{1, -1, true, false}},
                                        {"d", Data::copy("foob")},
                                        {"e", Value::Array{}},
                                        {"f", Value::Dictionary{}},
                                        {"r", 0.1},
                                        {"s", "x"},
                                        {"t", Date{86401}},
                                        {"u", UID{3}}}),
            "<dict>\n"
            "\t<key>a</key>\n"
            "\t<array>\n"
            "\t\t<integer>1</integer>\n"
            "\t\t<integer>-1</integer>\n"
            "\t\t<true/>\n"
            "\t\t<false/>\n"
            "\t</array>\n"
            "\t<key>d</key>\n"
            "\t<data>Zm9vYg==</data>\n"
            "\t<key>e</key>\n"
            "\t<array/>\n"
            "\t<key>f</key>\n"
            "\t<dict/>\n"
            "\t<key>r</key>\n"
            "\t<real>0.1</real>\n"
            "\t<key>s</key>\n"
            "\t<string>x</string>\n"
            "\t<key>t</key>\n"
            "\t<date>2001-01-02T00:00:01Z</date>\n"
            "\t<key>u</key>\n"
            "\t<dict><key>CF$UID</key><integer>3</integer></dict>\n"
            "</dict>\n");
}

TEST(PropertyListXMLWriter, escapesMarkup) {
  EXPECT_EQ(contentOf("a<b>&c]]>\r\n\""), "<string>a&lt;b&gt;&amp;c]]&gt;&#13;\n\"</string>\n");
  for (const char* text : {"a<b>&c]]>", "\r", "\r\n\n\t", " x ", "&amp;", "é😀\u0085"}) {
    EXPECT_EQ(readBack(text), Value(text));
    EXPECT_EQ(readBack(Value::Dictionary{{text, 1}}), Value(Value::Dictionary{{text, 1}}));
  }
}

TEST(PropertyListXMLWriter, writesExtremeNumbers) {
  for (const Value& value :
       {Value(std::numeric_limits<uint64_t>::max()), Value(std::numeric_limits<int64_t>::min()),
        Value(std::numeric_limits<double>::max()), Value(std::numeric_limits<double>::denorm_min()),
        Value(std::numeric_limits<double>::infinity()),
        Value(-std::numeric_limits<double>::infinity()), Value(UID{uint64_t{1} << 63}),
        Value(std::numeric_limits<double>::quiet_NaN())}) {
    EXPECT_EQ(readBack(value), value);
  }
  EXPECT_TRUE(std::signbit(readBack(-0.0)->doubleValue()));
}

TEST(PropertyListXMLWriter, cutsDatesToWholeSecondsDownwards) {
  EXPECT_EQ(readBack(Date{1.75}), Value(Date{1}));
  EXPECT_EQ(readBack(Date{-1.25}), Value(Date{-2}));
}

TEST(PropertyListXMLWriter, writesTheYearsOneToNineThousandNineHundredNinetyNine) {
  constexpr double first = -63113904000;
  constexpr double last = 252423993599;
  EXPECT_EQ(contentOf(Date{first}), "<date>0001-01-01T00:00:00Z</date>\n");
  EXPECT_EQ(contentOf(Date{last}), "<date>9999-12-31T23:59:59Z</date>\n");
  EXPECT_EQ(readBack(Date{first}), Value(Date{first}));
  EXPECT_EQ(readBack(Date{last}), Value(Date{last}));
  for (const double seconds : {first - 1, last + 1, 1e300, std::nan("")}) {
    EXPECT_THAT(reasonOf(Date{seconds}), HasSubstr("outside the years"));
  }
}

TEST(PropertyListXMLWriter, refusesCharactersThatXMLCannotHold) {
  for (const char* text : {"\x01", "a\x1F", "\uFFFE", "x\uFFFF"}) {
    EXPECT_THAT(reasonOf(text), HasSubstr("a character that XML cannot hold"));
    EXPECT_THAT(reasonOf(Value::Dictionary{{text, 1}}),
                HasSubstr("a character that XML cannot hold"));
  }
  EXPECT_THAT(reasonOf(std::string("a\0b", 3)), HasSubstr("a character that XML cannot hold"));
  EXPECT_THAT(reasonOf("\xFF"), HasSubstr("not well-formed UTF-8"));
}

TEST(PropertyListXMLWriter, refusesWhatAPropertyListCannotHold) {
  EXPECT_THAT(reasonOf(Value()), HasSubstr("absent value"));
  EXPECT_THAT(reasonOf(*URL::URLWithString("http://a.example/")), HasSubstr("URL"));
}

TEST(PropertyListXMLWriter, refusesADictionaryThatWouldBeReadAsAUID) {
  EXPECT_THAT(reasonOf(Value::Dictionary{{"CF$UID", 1}}), HasSubstr("read as a UID"));
  const Value other = Value::Dictionary{{"CF$UID", -1}};
  EXPECT_EQ(readBack(other), other);
}

TEST(PropertyListXMLWriter, refusesNestingBeyondTheLimit) {
  Value value = Value::Array{};
  for (size_t i = 1; i < propertyListMaximumDepth; ++i) {
    value = i % 2 != 0 ? Value(Value::Array{value}) : Value(Value::Dictionary{{"k", value}});
  }
  EXPECT_EQ(readBack(value), value);
  EXPECT_THAT(reasonOf(Value::Array{value}), HasSubstr("nest deeper"));
  EXPECT_THAT(reasonOf(Value::Dictionary{{"k", value}}), HasSubstr("nest deeper"));
}

TEST(PropertyListXMLWriter, refusesAGraphWhoseTextWouldBeEndless) {
  Value value = "end";
  for (int i = 0; i < 60; ++i) {
    value = i % 2 == 0 ? Value(Value::Array{value, value})
                       : Value(Value::Dictionary{{"a", value}, {"b", value}});
  }
  EXPECT_THAT(reasonOf(value), HasSubstr("the XML text is longer"));
}

TEST(PropertyListXMLWriter, refusesTextBeyondTheLimit) {
  const std::string text(1000000, 'x');
  EXPECT_THAT(reasonOf(Value::Array(200, text)), HasSubstr("the XML text is longer"));
  EXPECT_THAT(reasonOf(Value::Array(200, Data::copy(text))), HasSubstr("the XML text is longer"));
  EXPECT_THAT(reasonOf(Value::Array(200, Value::Dictionary{{text, 1}})),
              HasSubstr("the XML text is longer"));
  EXPECT_TRUE(readBack(Value::Array(2, text)));
}

TEST(PropertyListXMLWriter, refusesTextThatEscapesLengthenBeyondTheLimit) {
  const Value text(std::string(1000000, '&'));
  EXPECT_THAT(reasonOf(Value::Array(100, text)), HasSubstr("the XML text is longer"));
}

}  // namespace
}  // namespace platform
