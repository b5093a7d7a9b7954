// Which classes are let in: nothing that the caller did not name is ever made.
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "tests/platform/keyedarchive/ArchiveSamples.h"

namespace platform {
namespace {

using test::archiveOf;
using test::Card;
using test::classRecord;
using ::testing::HasSubstr;

using Array = Value::Array;
using Dictionary = Value::Dictionary;

int made = 0;

// Counts how often it is made.
struct Counted : KeyedCodable {
  std::string archiveClassName() const override { return "Counted"; }
  void encodeWithCoder(KeyedArchiver&) const override {}
  static std::shared_ptr<const KeyedCodable> make(KeyedUnarchiver&) {
    ++made;
    return std::make_shared<Counted>();
  }
};

KeyedObject decode(Array objects, const std::vector<std::string>& allowed) {
  KeyedUnarchiver unarchiver(archiveOf(std::move(objects), {{"root", UID{1}}}));
  return unarchiver.decodeObjectOfClasses(allowed, "root");
}

std::string reasonOf(Array objects, const std::vector<std::string>& allowed) {
  return test::reasonOf(inconsistentArchiveException, [&] { decode(std::move(objects), allowed); });
}

Array arrayOf(Value element) {
  return {"$null", Dictionary{{"$class", UID{2}}, {"NS.objects", Array{UID{3}}}},
          classRecord("NSArray"), std::move(element), classRecord("Counted")};
}

class KeyedUnarchiverSecurity : public ::testing::Test {
 protected:
  void SetUp() override {
    made = 0;
    Card::registerClass();
    KeyedUnarchiver::registerClass("Counted", Counted::make);
  }
};

TEST_F(KeyedUnarchiverSecurity, refusesRootsOfOtherClasses) {
  const std::vector<std::string> allowed = {KeyedUnarchiver::arrayClass};
  EXPECT_THAT(reasonOf({"$null", "x"}, allowed),
              HasSubstr("object 1 is of class \"NSString\", which is not allowed here"));
  EXPECT_THAT(reasonOf({"$null", 1}, allowed), HasSubstr("\"NSNumber\""));
  EXPECT_THAT(reasonOf({"$null", true}, allowed), HasSubstr("\"NSNumber\""));
  EXPECT_THAT(reasonOf({"$null", Data::copy("x")}, allowed), HasSubstr("\"NSData\""));
  EXPECT_THAT(reasonOf({"$null", "x"}, {}), HasSubstr("not allowed"));
  EXPECT_TRUE(decode({"$null", "$null"}, {}).isNil());
}

TEST_F(KeyedUnarchiverSecurity, refusesElementsOfOtherClasses) {
  EXPECT_THAT(reasonOf(arrayOf("x"), {KeyedUnarchiver::arrayClass}),
              HasSubstr("object 3 is of class \"NSString\""));
  EXPECT_NO_THROW(
      decode(arrayOf("x"), {KeyedUnarchiver::arrayClass, KeyedUnarchiver::stringClass}));
}

TEST_F(KeyedUnarchiverSecurity, makesNothingWhenALaterElementIsNotAllowed) {
  Array objects = {"$null",
                   Dictionary{{"$class", UID{2}}, {"NS.objects", Array{UID{3}, UID{5}}}},
                   classRecord("NSArray"),
                   Dictionary{{"$class", UID{4}}},
                   classRecord("Counted"),
                   Dictionary{{"$class", UID{2}}, {"NS.objects", Array{UID{6}}}},
                   "x"};
  const std::vector<std::string> allowed = {KeyedUnarchiver::arrayClass, "Counted"};
  EXPECT_THAT(reasonOf(objects, allowed), HasSubstr("object 6 is of class \"NSString\""));
  EXPECT_EQ(made, 0);
  objects[6] = Dictionary{{"$class", UID{4}}};
  EXPECT_EQ(decode(objects, allowed).arrayIf()->size(), 2U);
  EXPECT_EQ(made, 2);
}

TEST_F(KeyedUnarchiverSecurity, makesNothingWhenAContainerFurtherOnContainsItself) {
  const Array objects = {
      "$null", Dictionary{{"$class", UID{2}}, {"NS.objects", Array{UID{3}, UID{1}}}},
      classRecord("NSArray"), Dictionary{{"$class", UID{4}}}, classRecord("Counted")};
  EXPECT_THAT(reasonOf(objects, {KeyedUnarchiver::arrayClass, "Counted"}),
              HasSubstr("object 1 contains itself"));
  EXPECT_EQ(made, 0);
}

TEST_F(KeyedUnarchiverSecurity, makesNothingWhenAPathFurtherOnIsTooLong) {
  // The root names an object, the end of a chain of arrays, and then its beginning.
  Array objects = {"$null",
                   Dictionary{{"$class", UID{2}}, {"NS.objects", Array{UID{3}, UID{300}, UID{5}}}},
                   classRecord("NSArray"), Dictionary{{"$class", UID{4}}}, classRecord("Counted")};
  for (size_t i = 1; i < propertyListMaximumDepth; ++i) {
    objects.emplace_back(
        Dictionary{{"$class", UID{2}}, {"NS.objects", Array{UID{objects.size() + 1}}}});
  }
  objects.emplace_back(Dictionary{{"$class", UID{2}}, {"NS.objects", Array{}}});
  EXPECT_THAT(reasonOf(objects, {KeyedUnarchiver::arrayClass, "Counted"}),
              HasSubstr("nest deeper"));
  EXPECT_EQ(made, 0);
}

TEST_F(KeyedUnarchiverSecurity, checksAnObjectAgainForOtherCallers) {
  KeyedUnarchiver unarchiver(archiveOf(arrayOf("x"), {{"root", UID{1}}}));
  EXPECT_TRUE(unarchiver
                  .decodeObjectOfClasses(
                      {KeyedUnarchiver::arrayClass, KeyedUnarchiver::stringClass}, "root")
                  .arrayIf());
  EXPECT_THAT(test::reasonOf(
                  inconsistentArchiveException,
                  [&] { unarchiver.decodeObjectOfClasses({KeyedUnarchiver::arrayClass}, "root"); }),
              HasSubstr("object 3 is of class \"NSString\""));
}

TEST_F(KeyedUnarchiverSecurity, letsStringsBeDictionaryKeysButNotValues) {
  const auto dictionary = [](UID key, UID value) {
    return Array{
        "$null",
        Dictionary{{"$class", UID{2}}, {"NS.keys", Array{key}}, {"NS.objects", Array{value}}},
        classRecord("NSDictionary"), "k", 1};
  };
  const std::vector<std::string> allowed = {KeyedUnarchiver::dictionaryClass,
                                            KeyedUnarchiver::numberClass};
  EXPECT_EQ(decode(dictionary({3}, {4}), allowed).dictionaryIf()->at("k").value(), Value(1));
  EXPECT_THAT(reasonOf(dictionary({3}, {3}), allowed), HasSubstr("\"NSString\""));
}

TEST_F(KeyedUnarchiverSecurity, takesAMutableClassForItsImmutableOneOnly) {
  const auto container = [](const char* name) {
    return Array{"$null",
                 Dictionary{{"$class", UID{2}}, {"NS.keys", Array{}}, {"NS.objects", Array{}}},
                 classRecord(name)};
  };
  EXPECT_NO_THROW(decode(container("NSMutableDictionary"), {KeyedUnarchiver::dictionaryClass}));
  EXPECT_NO_THROW(decode(container("NSMutableArray"), {KeyedUnarchiver::arrayClass}));
  EXPECT_THAT(reasonOf(container("NSDictionary"), {KeyedUnarchiver::mutableDictionaryClass}),
              HasSubstr("\"NSDictionary\", which is not allowed"));
  EXPECT_THAT(reasonOf(container("NSArray"), {KeyedUnarchiver::mutableArrayClass}),
              HasSubstr("\"NSArray\", which is not allowed"));
}

TEST_F(KeyedUnarchiverSecurity, doesNotBelieveTheSuperclassesInTheFile) {
  const Value record = Dictionary{{"$classname", "Counted"},
                                  {"$classes", Array{"Counted", "NSArray", "NSObject"}},
                                  {"$classhints", Array{"NSArray"}}};
  EXPECT_THAT(
      reasonOf({"$null", Dictionary{{"$class", UID{2}}}, record}, {KeyedUnarchiver::arrayClass}),
      HasSubstr("\"Counted\", which is not allowed"));
  EXPECT_EQ(made, 0);
}

TEST_F(KeyedUnarchiverSecurity, takesAClassRecordWithoutSuperclasses) {
  EXPECT_TRUE(
      decode({"$null", Dictionary{{"$class", UID{2}}}, Dictionary{{"$classname", "Counted"}}},
             {"Counted"})
          .object());
}

TEST_F(KeyedUnarchiverSecurity, takesADeclaredDescendant) {
  KeyedUnarchiver::registerClass("CountedBelow", Counted::make, "Counted");
  KeyedUnarchiver::registerClass("CountedFurtherBelow", Counted::make, "CountedBelow");
  for (const char* name : {"CountedBelow", "CountedFurtherBelow"}) {
    EXPECT_TRUE(
        decode({"$null", Dictionary{{"$class", UID{2}}}, classRecord(name)}, {"Counted"}).object());
  }
  EXPECT_THAT(
      reasonOf({"$null", Dictionary{{"$class", UID{2}}}, classRecord("Counted")}, {"CountedBelow"}),
      HasSubstr("not allowed"));
}

TEST_F(KeyedUnarchiverSecurity, survivesSuperclassesDeclaredInACircle) {
  KeyedUnarchiver::registerClass("CircleA", Counted::make, "CircleB");
  KeyedUnarchiver::registerClass("CircleB", Counted::make, "CircleA");
  EXPECT_THAT(reasonOf({"$null", Dictionary{{"$class", UID{2}}}, classRecord("CircleA")}, {"Card"}),
              HasSubstr("not allowed"));
}

TEST_F(KeyedUnarchiverSecurity, refusesAnAllowedClassThatNobodyRegistered) {
  EXPECT_THAT(
      reasonOf({"$null", Dictionary{{"$class", UID{2}}}, classRecord("Stranger")}, {"Stranger"}),
      HasSubstr("\"Stranger\", which cannot be decoded"));
}

TEST_F(KeyedUnarchiverSecurity, refusesToRegisterPlainClasses) {
  for (const char* name : {"", "NSObject", "NSString", "NSMutableArray"}) {
    EXPECT_THROW(KeyedUnarchiver::registerClass(name, Counted::make), Exception) << name;
  }
  EXPECT_THROW(KeyedUnarchiver::registerClass("Null", nullptr), Exception);
}

TEST_F(KeyedUnarchiverSecurity, refusesObjectsWithoutAProperClass) {
  const std::vector<std::string> allowed = {"Counted"};
  EXPECT_THAT(reasonOf({"$null", Dictionary{}}, allowed), HasSubstr("object 1 has no class"));
  EXPECT_THAT(reasonOf({"$null", Dictionary{{"$class", "Counted"}}}, allowed),
              HasSubstr("object 1 has no class"));
  EXPECT_THAT(reasonOf({"$null", Dictionary{{"$class", UID{7}}}}, allowed),
              HasSubstr("object 1 has its class at 7 of 2"));
  for (const Value& record :
       {Value("Counted"), Value(Dictionary{}), Value(Dictionary{{"$classname", 1}}),
        Value(Dictionary{{"$classname", ""}}), Value(Array{"Counted"})}) {
    EXPECT_THAT(reasonOf({"$null", Dictionary{{"$class", UID{2}}}, record}, allowed),
                HasSubstr("object 2, the class of object 1, has no name"));
  }
  EXPECT_THAT(reasonOf({"$null", Dictionary{{"$class", UID{0}}}}, allowed),
              HasSubstr("object 0, the class of object 1, has no name"));
}

TEST_F(KeyedUnarchiverSecurity, showsHostileClassNamesShortAndHarmless) {
  const std::string reason = reasonOf({"$null", Dictionary{{"$class", UID{2}}},
                                       classRecord("evil\n\x1B[31m" + std::string(1000000, 'x'))},
                                      {"Card"});
  EXPECT_THAT(reason, HasSubstr("\"evil??[31mxxx"));
  EXPECT_LT(reason.size(), 300U);
  EXPECT_THAT(
      reasonOf({"$null", Dictionary{{"$class", UID{2}}}, classRecord(std::string("Card\0Evil", 9))},
               {"Card"}),
      HasSubstr("\"Card?Evil\""));
}

TEST_F(KeyedUnarchiverSecurity, checksWhatObjectsAskForWhenTheyAskForIt) {
  const Value holder = Dictionary{{"$class", UID{2}}, {"weight", 1}, {"label", UID{3}}};
  EXPECT_THAT(reasonOf({"$null", holder, classRecord("Card"), 1}, {"Card"}),
              HasSubstr("object 3 is of class \"NSNumber\""));
}

}  // namespace
}  // namespace platform
