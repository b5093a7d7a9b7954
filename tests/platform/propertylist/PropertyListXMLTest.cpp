#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <cmath>
#include <limits>
#include <thread>
#include <vector>

#include "platform/PropertyList.h"

namespace platform {
namespace {

using ::testing::AllOf;
using ::testing::HasSubstr;

constexpr const char* declaration = "<?xml version=\"1.0\" encoding=\"UTF-8\"?>\n";

std::optional<Value> read(const std::string& text) {
  return propertyListFromData(Data::copy(text));
}

// The value of the content of a plist element, which begins on line 1.
std::optional<Value> readContent(const std::string& content) {
  return read("<plist version=\"1.0\">" + content + "</plist>");
}

std::string errorOf(const std::string& text) {
  Error error;
  const std::optional<Value> value = propertyListFromData(Data::copy(text), &error);
  EXPECT_FALSE(value.has_value()) << text;
  EXPECT_EQ(error.domain, formatErrorDomain);
  return error.description;
}

std::string errorOfContent(const std::string& content) {
  return errorOf("<plist version=\"1.0\">" + content + "</plist>");
}

std::string utf16(const std::u16string& text, bool bigEndian) {
  std::string bytes;
  for (const char16_t unit : u"\uFEFF" + text) {
    const char high = static_cast<char>(unit >> 8);
    const char low = static_cast<char>(unit & 0xFF);
    bytes += bigEndian ? high : low;
    bytes += bigEndian ? low : high;
  }
  return bytes;
}

TEST(PropertyListXML, readsEveryKind) {
  const std::optional<Value> value = read(std::string(declaration) + R"(
<!DOCTYPE plist PUBLIC "-//Example//DTD LIST 1.0//EN" "http://list.example/list.dtd">
<!-- A comment. -->
<plist version="1.0">
<dict>
  <key>array</key> <array> <integer>1</integer> <string>two</string> </array>
  <key>data</key> <data>
    AQID
    BA==
  </data>
  <key>date</key> <date>2001-01-02T00:00:01Z</date>
  <key>dict</key> <dict/>
  <key>false</key> <false/>
  <key>integer</key> <integer>-7</integer>
  <key>real</key> <real>2.5</real>
  <key>string</key> <string>a &amp; b &lt;c&gt; &#233; <![CDATA[<&]]></string>
  <key>true</key> <true></true>
</dict>
</plist>
)");
  EXPECT_EQ(value, Value(Value::Dictionary{
                       {"array", Value::Array{1, "two"}},
                       {"data", Data::copy("\1\2\3\4")},
                       {"date", Date{86401}},
                       {"dict", Value::Dictionary{}},
                       {"false", false},
                       {"integer", -7},
                       {"real", 2.5},
                       {"string", "a & b <c> é <&"},
                       {"true", true},
                   }));
}

TEST(PropertyListXML, tellsTheFormat) {
  PropertyListFormat format = PropertyListFormat::binary;
  EXPECT_TRUE(propertyListFromData(Data::copy("<plist><true/></plist>"), nullptr, &format));
  EXPECT_EQ(format, PropertyListFormat::xml);
}

TEST(PropertyListXML, keepsBlanksInStringsAndKeys) {
  EXPECT_EQ(readContent("<dict><key> k\n</key><string>\t x </string></dict>"),
            Value(Value::Dictionary{{" k\n", "\t x "}}));
  EXPECT_EQ(readContent("<string/>"), Value(""));
  EXPECT_EQ(readContent("<string>a<!-- c -->b<?p i?>c</string>"), Value("abc"));
}

TEST(PropertyListXML, readsIntegers) {
  EXPECT_EQ(readContent("<integer> 42 </integer>"), Value(42));
  EXPECT_EQ(readContent("<integer>+42</integer>"), Value(42));
  EXPECT_EQ(readContent("<integer>0x1F</integer>"), Value(31));
  EXPECT_EQ(readContent("<integer>-0x10</integer>"), Value(-16));
  EXPECT_EQ(readContent("<integer>-0</integer>"), Value(0));
  EXPECT_EQ(readContent("<integer>-9223372036854775808</integer>"),
            Value(std::numeric_limits<int64_t>::min()));
  EXPECT_EQ(readContent("<integer>18446744073709551615</integer>"),
            Value(std::numeric_limits<uint64_t>::max()));
}

TEST(PropertyListXML, refusesWhatIsNoInteger) {
  for (const char* text : {"", " ", "1.0", "1e3", "0x", "--1", "+-1", "1 2", "12a", "１"}) {
    EXPECT_THAT(errorOfContent(std::string("<integer>") + text + "</integer>"),
                HasSubstr("is no integer"))
        << text;
  }
  for (const char* text : {"18446744073709551616", "-9223372036854775809", "0x10000000000000000"}) {
    EXPECT_THAT(errorOfContent(std::string("<integer>") + text + "</integer>"),
                HasSubstr("out of range"))
        << text;
  }
}

TEST(PropertyListXML, readsReals) {
  EXPECT_EQ(readContent("<real>1</real>"), Value(1.0));
  EXPECT_EQ(readContent("<real>+1.5e-3</real>"), Value(0.0015));
  EXPECT_EQ(readContent("<real>-infinity</real>"), Value(-std::numeric_limits<double>::infinity()));
  EXPECT_TRUE(std::isnan(readContent("<real>nan</real>")->doubleValue()));
  for (const char* text : {"", "x", "1,5", "+-1", "1.5 2"}) {
    EXPECT_THAT(errorOfContent(std::string("<real>") + text + "</real>"), HasSubstr("is no real"));
  }
  EXPECT_THAT(errorOfContent("<real>1e999</real>"), HasSubstr("out of range"));
}

TEST(PropertyListXML, readsDatesAndNothingLikeThem) {
  EXPECT_EQ(readContent("<date> 2001-01-01T00:00:00Z </date>"), Value(Date{0}));
  EXPECT_EQ(readContent("<date>1970-01-01T00:00:00Z</date>"), Value(Date{-978307200}));
  EXPECT_EQ(readContent("<date>2024-02-29T23:59:59Z</date>"), Value(Date{730943999}));
  for (const char* text :
       {"", "2001-01-01", "2001-01-01T00:00:00", "2001-02-29T00:00:00Z", "2001-13-01T00:00:00Z",
        "2001-00-01T00:00:00Z", "2001-01-00T00:00:00Z", "2001-01-01T24:00:00Z",
        "2001-01-01T00:60:00Z", "2001-01-01T00:00:60Z", "0000-01-01T00:00:00Z",
        "2001-01-01T00:00:00+01:00", "2001-01-01 00:00:00Z", "200a-01-01T00:00:00Z"}) {
    EXPECT_THAT(errorOfContent(std::string("<date>") + text + "</date>"), HasSubstr("is no date"))
        << text;
  }
}

TEST(PropertyListXML, refusesDataThatIsNotInBase64) {
  EXPECT_THAT(errorOfContent("\n<data>A*==</data>"), HasSubstr("not in base64 on line 2"));
  EXPECT_EQ(readContent("<data/>"), Value(Data()));
}

TEST(PropertyListXML, readsTheUIDFormOfKeyedArchives) {
  EXPECT_EQ(readContent("<dict><key>CF$UID</key><integer>7</integer></dict>"), Value(UID{7}));
}

TEST(PropertyListXML, leavesOtherDictionariesWithTheUIDKeyAlone) {
  for (const char* content :
       {"<key>CF$UID</key><integer>-1</integer>", "<key>CF$UID</key><string>1</string>",
        "<key>CF$UID</key><integer>1</integer><key>x</key><true/>"}) {
    const std::optional<Value> value = readContent(std::string("<dict>") + content + "</dict>");
    ASSERT_TRUE(value);
    EXPECT_EQ(value->kind(), Value::Kind::dictionary) << content;
  }
}

TEST(PropertyListXML, takesTheLaterOfTwoEqualKeys) {
  EXPECT_EQ(readContent("<dict><key>k</key><true/><key>k</key><integer>2</integer></dict>"),
            Value(Value::Dictionary{{"k", 2}}));
}

TEST(PropertyListXML, tellsWhereKeysAndValuesDoNotPair) {
  EXPECT_THAT(errorOfContent("<dict>\n<true/></dict>"),
              HasSubstr("a value without a key: \"true\" on line 2"));
  EXPECT_THAT(errorOfContent("<dict><key>a</key>\n\n<key>b</key><true/></dict>"),
              HasSubstr("key \"a\" has no value on line 3"));
  EXPECT_THAT(errorOfContent("<dict><key>a</key></dict>"), HasSubstr("key \"a\" has no value"));
  EXPECT_THAT(errorOfContent("<dict><key>a</key><true/><true/></dict>"),
              HasSubstr("a value without a key"));
  EXPECT_THAT(errorOfContent("<array><key>a</key></array>"),
              HasSubstr("a key outside a dictionary"));
  EXPECT_THAT(errorOfContent("<key>a</key>"), HasSubstr("a key outside a dictionary"));
}

TEST(PropertyListXML, refusesElementsOutOfPlace) {
  EXPECT_THAT(errorOf("<dict/>"), HasSubstr("the outermost element is \"dict\""));
  EXPECT_THAT(errorOfContent(""), HasSubstr("without a value"));
  EXPECT_THAT(errorOfContent("<true/><true/>"), HasSubstr("more than one value"));
  EXPECT_THAT(errorOfContent("<set/>"), HasSubstr("unknown element \"set\""));
  EXPECT_THAT(errorOfContent("<plist/>"), HasSubstr("unknown element \"plist\""));
  EXPECT_THAT(errorOfContent("<string><true/></string>"),
              HasSubstr("element \"true\" inside \"string\""));
  EXPECT_THAT(errorOfContent("<true>x</true>"), HasSubstr("\"true\" is not empty"));
  EXPECT_THAT(errorOfContent("<array>text</array>"), HasSubstr("text \"text\" between elements"));
  EXPECT_THAT(errorOfContent("text<true/>"), HasSubstr("between elements"));
  EXPECT_THAT(errorOfContent("<x:true xmlns:x='urn:x'/>"), HasSubstr("with prefix \"x\""));
}

TEST(PropertyListXML, refusesMalformedXMLWithItsLine) {
  EXPECT_THAT(errorOfContent("\n<string>a</strong>"),
              AllOf(HasSubstr("malformed XML"), HasSubstr("on line 2")));
  EXPECT_THAT(errorOf("<plist>"), HasSubstr("malformed XML"));
  EXPECT_THAT(errorOf("<plist><true/></plist><plist/>"), HasSubstr("malformed XML"));
  EXPECT_THAT(errorOfContent("<string>&#0;</string>"), HasSubstr("malformed XML"));
  EXPECT_THAT(errorOfContent("<string>\x01</string>"), HasSubstr("malformed XML"));
  EXPECT_THAT(errorOfContent("<string>\xC3(</string>"), HasSubstr("malformed XML"));
  EXPECT_THAT(errorOfContent("<string>\xED\xA0\x80</string>"), HasSubstr("malformed XML"));
  EXPECT_THAT(errorOfContent("<!-- x"), HasSubstr("\"<!--\" without \"-->\""));
  EXPECT_THAT(errorOf("<plist"), HasSubstr("a tag that does not end"));
}

TEST(PropertyListXML, refusesWhatIsNeitherForm) {
  EXPECT_THAT(errorOf(""), HasSubstr("neither a binary nor an XML"));
  EXPECT_THAT(errorOf(" \n"), HasSubstr("neither a binary nor an XML"));
  EXPECT_THAT(errorOf("{ a = b; }"), HasSubstr("neither a binary nor an XML"));
}

TEST(PropertyListXML, refusesDocumentsThatDeclareEntities) {
  EXPECT_THAT(
      errorOf("<!DOCTYPE plist [\n<!ENTITY a \"x\">\n]>\n<plist><string>&a;</string></plist>"),
      HasSubstr("declarations of its own, such as entities on line 1"));
  EXPECT_THAT(
      errorOf("<!DOCTYPE plist SYSTEM \"x[y\" [<!ENTITY % p SYSTEM \"file:///etc/passwd\"> %p;]>"
              "<plist><true/></plist>"),
      HasSubstr("declarations of its own"));
  EXPECT_THAT(errorOf("<!DOCTYPE plist [<!ATTLIST plist a CDATA 'x'>]><plist><true/></plist>"),
              HasSubstr("declarations of its own"));
}

TEST(PropertyListXML, refusesUndeclaredEntities) {
  EXPECT_FALSE(readContent("<string>&nbsp;</string>"));
  // With an outer document type the parser could believe that it is declared there.
  EXPECT_THAT(errorOf("<!DOCTYPE plist SYSTEM \"file:///dev/null\">"
                      "<plist><string>a&nbsp;b</string></plist>"),
              HasSubstr("'nbsp' not defined"));
}

TEST(PropertyListXML, neverReadsTheOuterDocumentType) {
  EXPECT_EQ(read("<!DOCTYPE plist SYSTEM \"/nowhere/at/all.dtd\"><plist><true/></plist>"),
            Value(true));
}

TEST(PropertyListXML, readsUTF8WithAMark) {
  EXPECT_EQ(read("\xEF\xBB\xBF" + std::string(declaration) + "<plist><string>é</string></plist>"),
            Value("é"));
}

TEST(PropertyListXML, readsUTF16WithAMark) {
  const std::u16string text =
      u"<?xml version=\"1.0\" encoding=\"UTF-16\"?><plist><string>é😀</string></plist>";
  EXPECT_EQ(read(utf16(text, true)), Value("é😀"));
  EXPECT_EQ(read(utf16(text, false)), Value("é😀"));
  EXPECT_THAT(errorOf(utf16(text, true) + "x"), HasSubstr("ends inside a character"));
  EXPECT_THAT(errorOf(utf16(u"<plist>\xD800</plist>", true)), HasSubstr("surrogate"));
}

TEST(PropertyListXML, refusesOtherEncodings) {
  EXPECT_THAT(errorOf("<?xml version=\"1.0\" encoding=\"ISO-8859-1\"?><plist><true/></plist>"),
              HasSubstr("encoding \"ISO-8859-1\" is not supported"));
  EXPECT_FALSE(read("<?xml version=\"1.0\" encoding=\"UTF-7\"?><plist>+ADw-true/></plist>"));
  EXPECT_THAT(errorOf(std::string("<\0p\0l\0", 6)), HasSubstr("a zero byte"));
  EXPECT_TRUE(read("<?xml version=\"1.0\" encoding=\"utf-8\"?><plist><true/></plist>"));
  EXPECT_TRUE(read("<?xml version=\"1.0\" encoding=\"us-ascii\"?><plist><true/></plist>"));
}

std::string nested(size_t depth) {
  std::string text;
  for (size_t i = 0; i < depth; ++i) {
    text += "<array>";
  }
  for (size_t i = 0; i < depth; ++i) {
    text += "</array>";
  }
  return text;
}

TEST(PropertyListXML, readsNestingUpToTheLimitAndNoDeeper) {
  EXPECT_TRUE(readContent(nested(propertyListMaximumDepth)));
  EXPECT_TRUE(readContent("<array>" + nested(propertyListMaximumDepth - 1) +
                          nested(propertyListMaximumDepth - 1) + "</array>"));
  EXPECT_THAT(errorOfContent(nested(propertyListMaximumDepth + 1)), HasSubstr("nest deeper"));
  EXPECT_THAT(errorOfContent(nested(200000)), HasSubstr("nest deeper"));
}

TEST(PropertyListXML, readsTextOfMoreThanTenMegabytes) {
  const std::string text(11U << 20U, 'A');
  const std::optional<Value> data = readContent("<data>" + text + "</data>");
  ASSERT_TRUE(data && data->dataIf());
  EXPECT_EQ(data->dataIf()->length(), text.size() / 4 * 3);
  EXPECT_EQ(readContent("<string>" + text + "</string>"), Value(text));
}

TEST(PropertyListXML, isReadByManyThreadsAtOnce) {
  std::vector<std::thread> threads;
  threads.reserve(4);
  for (int i = 0; i < 4; ++i) {
    threads.emplace_back([] {
      for (int j = 0; j < 200; ++j) {
        EXPECT_EQ(readContent("<array><integer>1</integer></array>"), Value(Value::Array{1}));
        EXPECT_FALSE(readContent("<array><integer>x</integer></array>"));
      }
    });
  }
  for (std::thread& thread : threads) {
    thread.join();
  }
}

TEST(PropertyListXML, refusesTagsOfManyAttributesAtOnce) {
  std::string tag = "<plist";
  for (int i = 0; i < 200000; ++i) {
    tag += " a" + std::to_string(i) + "=''";
  }
  EXPECT_THAT(errorOf(tag + "><true/></plist>"), HasSubstr("a tag that is too long"));
}

}  // namespace
}  // namespace platform
