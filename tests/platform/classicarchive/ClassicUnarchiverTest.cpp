#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "ArchiveBytes.h"

namespace platform {
namespace {

const std::vector<std::string> allNames = {
    "NSObject", "NSString",       "NSData",       "NSMutableData",
    "NSArray",  "NSMutableArray", "NSDictionary", "NSMutableDictionary",
    "NSNumber", "NSValue"};

TEST(ClassicUnarchiver, DecodesAllTenClassesWithoutRestriction) {
  const Value value = Value::Dictionary{{"key", Value::Array{1, 0.5, true, Data::copy("d")}}};
  EXPECT_EQ(ClassicUnarchiver(classicArchiveWithRootObject(value)).decodeRootObject(), value);
}

TEST(ClassicUnarchiver, DecodesObjectsOfAllowedClasses) {
  ClassicUnarchiver unarchiver(classicArchiveWithRootObject(Value::Array{"text"}));
  unarchiver.setAllowedClassNames({"NSArray", "NSString"});
  EXPECT_EQ(unarchiver.decodeRootObject(), Value(Value::Array{"text"}));
  unarchiver.setAllowedClassNames(allNames);
  EXPECT_EQ(unarchiver.decodeRootObject(), Value(Value::Array{"text"}));
}

TEST(ClassicUnarchiver, RefusesObjectsOfEachClassThatIsLeftOut) {
  for (const std::string& leftOut : allNames) {
    ClassicArchive archive;
    archive.roots = {0};
    ClassicArchive::Node& node = archive.nodes.emplace_back();
    node.nodeClass = static_cast<ClassicArchive::Class>(&leftOut - allNames.data());
    node.scalars = leftOut == "NSNumber" || leftOut == "NSValue"
                       ? ClassicArchive::Scalars{"c", {int64_t{1}}}
                       : ClassicArchive::Scalars{};
    ClassicUnarchiver unarchiver(classicarchive::encode(archive));
    EXPECT_NO_THROW(unarchiver.decodeRootObject()) << leftOut;
    std::vector<std::string> names = allNames;
    std::erase(names, leftOut);
    unarchiver.setAllowedClassNames(names);
    try {
      unarchiver.decodeRootObject();
      ADD_FAILURE() << leftOut << " not refused";
    } catch (const ArchiveException& exception) {
      EXPECT_THAT(exception.reason(),
                  testing::HasSubstr("class \"" + leftOut + "\" is not allowed at byte 19"));
    }
  }
}

TEST(ClassicUnarchiver, ASuperclassNeedNotBeAllowed) {
  ClassicUnarchiver unarchiver(classicArchiveWithRootObject("text"));
  unarchiver.setAllowedClassNames({"NSString"});
  EXPECT_EQ(unarchiver.decodeRootObject(), Value("text"));
  unarchiver.setAllowedClassNames({"NSObject"});
  EXPECT_THROW(unarchiver.decodeRootObject(), ArchiveException);
}

TEST(ClassicUnarchiver, AllowedNamesOfOtherClassesMeanNothing) {
  ClassicUnarchiver unarchiver(classicArchiveWithRootObject("text"));
  unarchiver.setAllowedClassNames({"NSMutableString", ""});
  EXPECT_THROW(unarchiver.decodeRootObject(), ArchiveException);
  unarchiver.setAllowedClassNames({});
  EXPECT_THROW(unarchiver.decodeRootObject(), ArchiveException);
}

TEST(ClassicUnarchiver, DataAreSlicesOfTheArchiveAndKeepItAlive) {
  Value bytes;
  const uint8_t* end = nullptr;
  {
    const Data archive =
        classicArchiveWithRootObject(Value::Dictionary{{"d", Data::copy("0123456789")}});
    bytes = ClassicUnarchiver(archive).decodeRootObject()["d"];
    end = archive.bytes() + archive.length();
  }
  ASSERT_NE(bytes.dataIf(), nullptr);
  EXPECT_EQ(bytes.dataIf()->view(), "0123456789");
  EXPECT_EQ(bytes.dataIf()->bytes() + 10 + 2, end);
}

TEST(ClassicUnarchiver, MalformedArchivesThrow) {
  EXPECT_THROW(ClassicUnarchiver(Data()).decodeRootObject(), ArchiveException);
  EXPECT_THROW(ClassicUnarchiver(Data::copy("bplist00")).decodeRootObject(), ArchiveException);
}

TEST(ClassicUnarchiver, OfSeveralRootsTheFirstIsTheRootObject) {
  using namespace archivebytes;
  ClassicUnarchiver unarchiver(Data::copy(arrayOf(hex("00")) + hex("86 92 85")));
  EXPECT_EQ(unarchiver.decodeRootObject(), Value(Value::Array{}));
}

}  // namespace
}  // namespace platform
