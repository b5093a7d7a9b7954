// One malformed archive for each way in which one can be malformed.
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <ostream>

#include "ArchiveBytes.h"

namespace platform {
namespace {

using namespace archivebytes;

struct Refusal {
  std::string name;
  std::string bytes;
  std::string reason;
  size_t offset;
};

void PrintTo(const Refusal& refusal, std::ostream* out) { *out << refusal.name; }

class ClassicArchiveRefusal : public testing::TestWithParam<Refusal> {};

TEST_P(ClassicArchiveRefusal, TellsReasonAndOffset) {
  try {
    decodeBytes(GetParam().bytes);
    ADD_FAILURE() << "not refused";
  } catch (const ArchiveException& exception) {
    EXPECT_THAT(exception.reason(), testing::HasSubstr(GetParam().reason));
    EXPECT_THAT(exception.reason(),
                testing::EndsWith("at byte " + std::to_string(GetParam().offset)));
    EXPECT_EQ(exception.offset(), GetParam().offset);
  }
}

std::string replaced(std::string bytes, size_t offset, const std::string& by) {
  return bytes.replace(offset, by.size(), by);
}

std::vector<Refusal> headers() {
  const std::string good = arrayOf(hex("00")) + hex("86");
  return {
      {"EmptyInput", "", "ends in the middle", 0},
      {"Version2", replaced(good, 0, hex("02")), "streamer version 2", 0},
      {"Version5", replaced(good, 0, hex("05")), "streamer version 5", 0},
      {"SignatureLength", replaced(good, 1, hex("0c")), "length of the signature", 1},
      {"SignatureText", replaced(good, 2, "Streamtyped"), "unknown signature", 2},
      {"SignatureCut", good.substr(0, 9), "ends in the middle", 9},
      {"SystemVersionNil", hex("040b") + "streamtyped" + hex("85"), "tag 133", 13},
      {"SystemVersionReserved80", hex("040b") + "streamtyped" + hex("80"), "tag 128", 13},
      {"SystemVersionReserved88", hex("040b") + "streamtyped" + hex("88"), "tag 136", 13},
      {"SystemVersionReserved91", hex("040b") + "streamtyped" + hex("91"), "tag 145", 13},
      {"NoGroup", header(), "no value group", 16},
  };
}

std::vector<Refusal> groups() {
  const std::string emptyArray = arrayOf(hex("00"));
  return {
      {"NilType", header() + hex("85"), "nil where a group", 16},
      {"IntegerAtTheTop", header() + newString("i") + hex("05"), "group of type \"i\"", 16},
      {"TwoObjectsInOneGroup", header() + newString("@@") + hex("8585"), "group of type \"@@\"",
       16},
      {"TypeReferenceTooHigh", header() + hex("92"), "not there yet", 16},
      {"TypeReferenceNegative", emptyArray + hex("86 8191ff"), "not there yet", 49},
      {"TypeReferenceHuge", emptyArray + hex("86 87ffffffffffffff7f"), "not there yet", 49},
      {"TypeReferenceLowest", emptyArray + hex("86 870000000000000080"), "not there yet", 49},
      {"TypeNotPrintable", header() + newString(hex("00ff")), "group of type \"\\x00\\xff\"", 16},
      {"TypeNegativeLength", header() + hex("84ff"), "negative count -1", 17},
      {"TypeLengthBeyondTheEnd", header() + hex("840541"), "count 5 exceeds", 17},
      {"TypeLengthNil", header() + hex("8485"), "nil where a string", 17},
      {"BytesAfterTheLastGroup", emptyArray + hex("86 00"), "not there yet", 49},
      {"EndAfterTheLastGroup", emptyArray + hex("86 86"), "object ends where a group", 49},
      {"GroupCutAfterItsType", emptyArray + hex("86 92"), "ends in the middle", 50},
  };
}

std::vector<Refusal> classes() {
  const std::string root = header() + newString("@") + hex("84");
  return {
      {"UnknownClass", root + newClass("NSMutableString", 1) + hex("85"),
       "unknown class \"NSMutableString\"", 21},
      {"ClassNameCaseMatters", root + newClass("NSARRAY", 0) + hex("85"), "unknown class", 21},
      {"ClassNameNil", root + hex("8485"), "nil where a class name", 21},
      {"StringVersion0", root + newClass("NSString", 0), "version 0 of class \"NSString\"", 31},
      {"ArrayVersion1", root + newClass("NSArray", 1), "version 1 of class \"NSArray\"", 30},
      {"NegativeVersion", root + newClass("NSArray", -1), "version -1 of class", 30},
      {"ObjectWithoutClass", root + hex("85"), "object without a class", 20},
      {"ChainTooShort", root + newClass("NSArray", 0) + hex("85"), "wrong superclass nil", 31},
      {"ChainSkipsAClass",
       root + newClass("NSMutableArray", 0) + newClass("NSObject", 0) + hex("85"),
       "wrong superclass \"NSObject\"", 38},
      {"ChainTooLong", root + newClass("NSObject", 0) + newClass("NSObject", 0) + hex("85"),
       "wrong superclass \"NSObject\"", 32},
      {"ClassIsItsOwnSuperclass", root + newClass("NSArray", 0) + reference(1),
       "wrong superclass \"NSArray\"", 31},
      {"WrongSuperclassByReference",
       arrayOf(hex("01")) + hex("92 84") + newClass("NSString", 1) + reference(1),
       "wrong superclass \"NSArray\"", 62},
      {"ClassIsAnObject", arrayOf(hex("01")) + hex("92 84 92"), "where a class was expected", 50},
      {"SuperclassIsAnObject", root + newClass("NSArray", 0) + reference(0),
       "where a class was expected", 31},
      {"ClassNotThereYet", arrayOf(hex("01")) + hex("92 84") + reference(4), "not there yet", 50},
      {"EndInsteadOfClass", root + hex("86"), "object ends where an integer", 20},
  };
}

std::vector<Refusal> objects() {
  const std::string one = arrayOf(hex("01"));
  return {
      {"ArrayThatContainsItself", one + hex("92 92 86"), "contains itself", 49},
      {"ArrayThatContainsItselfFurtherIn", one + innerArrayOf(hex("02")) + hex("92 93 92 92 86 86"),
       "where an object was expected", 54},
      {"InnerArrayThatContainsTheOuter", one + innerArrayOf(hex("01")) + hex("92 92 86 86"),
       "contains itself", 54},
      {"DictionaryThatIsItsOwnKey",
       objectOf("NSDictionary", 0) + newString("i") + hex("01 92 92 92 85 86"), "contains itself",
       54},
      {"ReferenceToAClass", one + hex("92 93 86"), "where an object was expected", 49},
      {"ReferenceNotThereYet", one + hex("92 95 86"), "not there yet", 49},
      {"ReferenceBelowZero", one + hex("92 8191ff 86"), "not there yet", 49},
      {"ReservedTagAsObject", one + hex("92 88 86"), "tag 136", 49},
      {"RealTagAsObject", one + hex("92 83 86"), "tag 131", 49},
      {"EndInsteadOfElement", one + hex("92 86 86"), "object ends where another", 49},
      {"ElementOfAnotherType", one + hex("95 05 86"), "group of type \"i\" where \"@\"", 48},
      {"MissingElement", one + hex("86 92 85"), "object ends where a group", 48},
      {"ExtraElement", arrayOf(hex("00")) + hex("92 85 86"), "more in an object", 48},
      {"ExtraGroupInABareObject",
       header() + newString("@") + hex("84") + newClass("NSObject", 0) + hex("85") +
           newString("i") + hex("00 86"),
       "more in an object", 33},
      {"ExtraGroupInAString", objectOf("NSString", 1) + newString("+") + hex("01 61 92 85 86"),
       "more in an object", 50},
      {"StringWithoutGroup", objectOf("NSString", 1) + hex("86"), "object ends where a group", 45},
      {"StringOfAnotherType", objectOf("NSString", 1) + newString("*") + hex("85 86"),
       "group of type \"*\" where \"+\"", 45},
      {"StringNil", objectOf("NSString", 1) + newString("+") + hex("85 86"), "nil where a string",
       48},
      {"StringNegativeLength", objectOf("NSString", 1) + newString("+") + hex("fe 61 86"),
       "negative count -2", 48},
      {"StringTooLong", objectOf("NSString", 1) + newString("+") + hex("03 61 86"),
       "count 3 exceeds", 48},
      {"StringOfHugeLength",
       objectOf("NSString", 1) + newString("+") + hex("87ffffffffffffff7f 61 86"),
       "count 9223372036854775807 exceeds", 48},
      {"StringWithoutEnd", objectOf("NSString", 1) + newString("+") + hex("01 61"),
       "ends in the middle", 50},
      {"DataUnlikeItsType",
       objectOf("NSData", 0) + newString("i") + hex("02") + newString("[3c]") + "abc" + hex("86"),
       "group of type \"[3c]\" where \"[2c]\"", 47},
      {"DataOfUnsignedBytes",
       objectOf("NSData", 0) + newString("i") + hex("02") + newString("[2C]") + "ab" + hex("86"),
       "group of type \"[2C]\"", 47},
      {"DataNegativeCount",
       objectOf("NSData", 0) + newString("i") + hex("ff") + newString("[-1c]") + hex("86"),
       "negative count -1", 46},
      {"DataTooLong", objectOf("NSData", 0) + newString("i") + hex("82ffffff7f") + newString("x"),
       "count 2147483647 exceeds", 46},
      {"DataShorterThanItsCount",
       objectOf("NSData", 0) + newString("i") + hex("07") + newString("[7c]") + "abc",
       "ends in the middle", 56},
      {"DataWithoutBytesGroup", objectOf("NSData", 0) + newString("i") + hex("00 86"),
       "object ends where a group", 47},
      {"CountNegative", arrayOf(hex("ff")) + hex("86"), "negative count -1", 47},
      {"CountOversized", arrayOf(hex("82ffffff7f")) + hex("86"), "count 2147483647 exceeds", 47},
      {"CountWiderThanItsType", arrayOf(hex("870000000001000000")) + hex("86"),
       "out of the range of type \"i\"", 47},
      {"CountIsAReal", arrayOf(hex("83")) + hex("86"), "tag 131", 47},
      {"CountOfPairsOversized",
       objectOf("NSDictionary", 0) + newString("i") + hex("02 92 85 92 85 92 85 86"),
       "count 2 exceeds", 52},
      // Ten bytes are left, but the array around needs six of them.
      {"CountThatLeavesNoRoomForTheRest",
       arrayOf(hex("03")) + innerArrayOf(hex("03")) + std::string(10, '\x85'), "count 3 exceeds",
       52},
  };
}

std::string objectFollowedBy(const std::string& code) {
  return objectOf("NSValue", 0) + newString("*") + code;
}

std::vector<Refusal> scalars() {
  std::vector<Refusal> result = {
      {"TypeCodeNil", objectFollowedBy(hex("85")), "nil where a type code", 47},
      {"TypeCodeMissing", objectFollowedBy(hex("86")), "object ends where a type code", 47},
      {"TypeCodeIsAClass", objectFollowedBy(reference(1)), "where a C string was expected", 47},
      {"TypeCodeIsAnObject", objectFollowedBy(reference(0)), "where a C string was expected", 47},
      {"TypeCodeNotThereYet", objectFollowedBy(reference(3)), "not there yet", 47},
      {"TypeCodeTextNil", objectFollowedBy(hex("8485")), "nil where a type code", 48},
      {"ObjectIsATypeCode",
       arrayOf(hex("02")) + hex("92 84") + newClass("NSValue", 0) + reference(2) + newString("*") +
           hex("84") + reference(3) + reference(3) + hex("05 86 92") + reference(5) + hex("86"),
       "where an object was expected", 71},
      {"GroupUnlikeTheTypeCode",
       objectFollowedBy(hex("84") + newString("i")) + newString("s") + hex("05 86"),
       "group of type \"s\" in a value of type \"i\"", 51},
      {"ValueWithoutItsGroup", objectFollowedBy(hex("84") + newString("i")) + hex("86"),
       "object ends where a group", 51},
      {"ValueWithTwoGroups", valueOf("i", hex("05") + reference(4) + hex("05")),
       "more in an object", 53},
      {"NumberOfStructure", numberOf("{a=i}", hex("05")), "number of type \"{a=i}\"", 59},
      {"NumberOfArray", numberOf("[1i]", hex("05")), "number of type \"[1i]\"", 59},
      {"RealAsInteger", numberOf("i", hex("83 00000000 00000000")), "tag 131", 64},
      {"NilAsReal", numberOf("d", hex("85")), "tag 133", 64},
      {"EndAsInteger", numberOf("d", ""), "object ends where an integer", 64},
      {"RealCut", numberOf("d", hex("83 0000")), "ends in the middle", 68},
      {"ArrayLongerThanTheInput", valueOf("[100i]", hex("05")), "needs more bytes", 56},
      {"ArrayOfArraysLongerThanTheInput", valueOf("[1000000[1000000[100i]]]", hex("05")),
       "needs more bytes", 74},
  };
  for (const auto& [code, payload] : {std::pair{"s", "82 00 80 00 00"},
                                      {"s", "82 ff 7f ff ff"},
                                      {"S", "82 00 00 01 00"},
                                      {"S", "82 ff 7f ff ff"},
                                      {"i", "87 0000008000000000"},
                                      {"I", "87 0000000001000000"},
                                      {"I", "87 ffffff7fffffffff"},
                                      {"L", "87 ffffff7fffffffff"}}) {
    result.push_back({"OutOfRange" + std::to_string(result.size()), numberOf(code, hex(payload)),
                      "out of the range of type \"" + std::string(code) + "\"", 64});
  }
  return result;
}

std::vector<Refusal> typeStrings() {
  std::string nestedArrays;
  std::string nestedStructures;
  for (int i = 0; i < 33; ++i) {
    nestedArrays += "[1";
    nestedStructures += "{=";
  }
  const std::vector<std::pair<std::string, std::string>> problems = {
      {"@", "object or pointer code"},
      {"#", "object or pointer code"},
      {"*", "object or pointer code"},
      {"+", "object or pointer code"},
      {"%", "object or pointer code"},
      {":", "object or pointer code"},
      {"{a=i@}", "object or pointer code"},
      {"[2@]", "object or pointer code"},
      {"[0@]", "object or pointer code"},
      {"x", "unknown type code"},
      {"^i", "unknown type code"},
      {"(a=i)", "unknown type code"},
      {"", "not exactly one type"},
      {"ii", "not exactly one type"},
      {"{a=i}i", "not exactly one type"},
      {"[2i", "unclosed bracket"},
      {"{a=i", "unclosed bracket"},
      {"i]", "unexpected ']'"},
      {"i}", "unexpected '}'"},
      {"{a=[2i}", "unexpected '}'"},
      {"[2{a=i]", "unexpected ']'"},
      {"[i]", "array without a length"},
      {"[-1i]", "array without a length"},
      {"[2]", "array not of one type"},
      {"[2ii]", "array not of one type"},
      {"[2", "unclosed bracket"},
      {"{a}", "structure without fields"},
      {"{", "structure without fields"},
      {"{a{b=i}", "structure without fields"},
      {"[99999999999999999999999999i]", "array too large"},
      {"[18446744073709551617i]", "array too large"},
      {"[4294967296[4294967296i]]", "array too large"},
      {"[4294967296[4294967297i]]", "array too large"},
      {"{a=[281474976710656c]c}", "too many values"},
      {nestedArrays, "nested too deep"},
      {nestedStructures, "nested too deep"},
      {nestedArrays + "i" + std::string(33, ']'), "nested too deep"},
      {std::string(513, 'i'), "too long"},
      {std::string(100000, '['), "too long"},
  };
  std::vector<Refusal> result;
  result.reserve(problems.size());
  for (const auto& [code, reason] : problems) {
    result.push_back(
        {"Type" + std::to_string(result.size()), valueOf(code, hex("05")), reason, 47});
  }
  return result;
}

std::string nameOf(const testing::TestParamInfo<Refusal>& info) { return info.param.name; }

INSTANTIATE_TEST_SUITE_P(Headers, ClassicArchiveRefusal, testing::ValuesIn(headers()), nameOf);
INSTANTIATE_TEST_SUITE_P(Groups, ClassicArchiveRefusal, testing::ValuesIn(groups()), nameOf);
INSTANTIATE_TEST_SUITE_P(Classes, ClassicArchiveRefusal, testing::ValuesIn(classes()), nameOf);
INSTANTIATE_TEST_SUITE_P(Objects, ClassicArchiveRefusal, testing::ValuesIn(objects()), nameOf);
INSTANTIATE_TEST_SUITE_P(Scalars, ClassicArchiveRefusal, testing::ValuesIn(scalars()), nameOf);
INSTANTIATE_TEST_SUITE_P(TypeStrings, ClassicArchiveRefusal, testing::ValuesIn(typeStrings()),
                         nameOf);

}  // namespace
}  // namespace platform
