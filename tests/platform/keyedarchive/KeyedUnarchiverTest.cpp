#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "tests/platform/keyedarchive/ArchiveSamples.h"

namespace platform {
namespace {

using test::archiveOf;
using test::asCard;
using test::card;
using test::Card;
using test::classRecord;
using ::testing::HasSubstr;

using Array = Value::Array;
using Dictionary = Value::Dictionary;

template <typename Body>
std::string reasonOf(Body body) {
  return test::reasonOf(inconsistentArchiveException, body);
}

std::string reasonOf(const Data& data) {
  return reasonOf([&] { const KeyedUnarchiver unarchiver(data); });
}

const std::vector<std::string> everything = {
    "Card",
    KeyedUnarchiver::stringClass,
    KeyedUnarchiver::numberClass,
    KeyedUnarchiver::dataClass,
    KeyedUnarchiver::arrayClass,
    KeyedUnarchiver::dictionaryClass,
};

// Decodes the root of an archive with the object table given.
KeyedObject decode(Array objects, const std::vector<std::string>& allowed = everything,
                   PropertyListFormat format = PropertyListFormat::binary) {
  KeyedUnarchiver unarchiver(archiveOf(std::move(objects), {{"root", UID{1}}}, format));
  return unarchiver.decodeObjectOfClasses(allowed, "root");
}

std::string reasonOf(Array objects) {
  return reasonOf([&] { decode(std::move(objects)); });
}

Data archived(const KeyedObject& object) {
  KeyedArchiver archiver;
  archiver.encodeObject(object, "root");
  return archiver.finishEncoding();
}

KeyedObject roundTrip(const KeyedObject& object) {
  KeyedUnarchiver unarchiver(archived(object));
  return unarchiver.decodeObjectOfClasses(everything, "root");
}

class KeyedUnarchiverTest : public ::testing::Test {
 protected:
  void SetUp() override { Card::registerClass(); }
};

TEST_F(KeyedUnarchiverTest, readsBackEveryKindOfObject) {
  const auto written = card("a card", 5);
  written->note = KeyedObject(card("within", 6));
  const KeyedObject root = roundTrip(KeyedObject::Dictionary{
      {"string", Value("text")},
      {"null", Value("$null")},
      {"true", Value(true)},
      {"integer", Value(-7)},
      {"real", Value(2.5)},
      {"data", Value(Data::copy("bytes"))},
      {"array", KeyedObject::mutableArray({Value(1), KeyedObject(written)})},
      {"$null", Value("as a key")},
      {"plain", Value(Array{Dictionary{{"k", "v"}}})},
  });
  ASSERT_TRUE(root.dictionaryIf());
  const KeyedObject::Dictionary& entries = *root.dictionaryIf();
  EXPECT_EQ(entries.size(), 9U);
  EXPECT_FALSE(root.isMutable());
  EXPECT_EQ(entries.at("string").value(), Value("text"));
  EXPECT_EQ(entries.at("null").value(), Value("$null"));
  EXPECT_EQ(entries.at("$null").value(), Value("as a key"));
  EXPECT_EQ(entries.at("true").value(), Value(true));
  EXPECT_EQ(entries.at("integer").value(), Value(-7));
  EXPECT_EQ(entries.at("real").value(), Value(2.5));
  EXPECT_EQ(entries.at("data").value(), Value(Data::copy("bytes")));
  ASSERT_TRUE(entries.at("array").arrayIf());
  EXPECT_TRUE(entries.at("array").isMutable());
  const auto read = asCard(entries.at("array").arrayIf()->at(1));
  EXPECT_EQ(read->label, "a card");
  EXPECT_EQ(asCard(read->note)->weight, 6);
  ASSERT_TRUE(entries.at("plain").arrayIf());
  EXPECT_EQ(entries.at("plain").arrayIf()->at(0).dictionaryIf()->at("k").value(), Value("v"));
}

TEST_F(KeyedUnarchiverTest, readsTheShapeOfTheIndexCache) {
  KeyedArchiver archiver;
  archiver.encodeObject(Value("en"), "CacheLanguage");
  archiver.encodeObject(
      KeyedObject::mutableDictionary(
          {{"book.one", KeyedObject::Array{KeyedObject(card("/one", 1))}},
           {"book.two", KeyedObject::mutableArray(
                            {KeyedObject(card("/two", 2)), KeyedObject(card("/gone", -1))})}}),
      "KnownIndices");
  archiver.encodeObject(Value("1.2"), "CacheVersion");

  KeyedUnarchiver unarchiver(archiver.finishEncoding());
  const std::vector<std::string> text = {KeyedUnarchiver::stringClass};
  EXPECT_EQ(unarchiver.decodeObjectOfClasses(text, "CacheVersion").value(), Value("1.2"));
  EXPECT_EQ(unarchiver.decodeObjectOfClasses(text, "CacheLanguage").value(), Value("en"));
  const KeyedObject indices = unarchiver.decodeObjectOfClasses(
      {KeyedUnarchiver::mutableDictionaryClass, KeyedUnarchiver::arrayClass, "Card"},
      "KnownIndices");
  unarchiver.finishDecoding();
  ASSERT_TRUE(indices.dictionaryIf());
  EXPECT_TRUE(indices.isMutable());
  EXPECT_EQ(asCard(indices.dictionaryIf()->at("book.one").arrayIf()->at(0))->label, "/one");
  EXPECT_EQ(indices.dictionaryIf()->at("book.two").arrayIf()->size(), 1U);
}

TEST_F(KeyedUnarchiverTest, decodesAnObjectMetTwiceOnce) {
  const auto shared = card("shared");
  shared->note = KeyedObject(KeyedObject::Array{});
  KeyedArchiver archiver;
  archiver.encodeObject(KeyedObject::Array{KeyedObject(shared), KeyedObject(shared)}, "a");
  archiver.encodeObject(KeyedObject(shared), "b");
  KeyedUnarchiver unarchiver(archiver.finishEncoding());
  const KeyedObject array = unarchiver.decodeObjectOfClasses(everything, "a");
  const KeyedObject alone = unarchiver.decodeObjectOfClasses({"Card"}, "b");
  EXPECT_TRUE(alone.object());
  EXPECT_EQ(array.arrayIf()->at(0).object(), alone.object());
  EXPECT_EQ(array.arrayIf()->at(1).object(), alone.object());
  EXPECT_EQ(unarchiver.decodeObjectOfClasses(everything, "a").arrayIf(), array.arrayIf());
}

TEST_F(KeyedUnarchiverTest, readsScalarsAndBytesOfTheirOwnKindOnly) {
  const Data bytes = Data::copy("xy");
  KeyedUnarchiver unarchiver(archiveOf({"$null"}, {{"b", true},
                                                   {"i", -3},
                                                   {"large", uint64_t{1} << 63},
                                                   {"d", 1.5},
                                                   {"y", bytes},
                                                   {"u", UID{0}},
                                                   {"$$x", 4}}));
  EXPECT_EQ(unarchiver.decodeBool("b"), true);
  EXPECT_EQ(unarchiver.decodeInteger("i"), -3);
  EXPECT_EQ(unarchiver.decodeDouble("d"), 1.5);
  EXPECT_EQ(unarchiver.decodeBytes("y"), bytes);
  EXPECT_EQ(unarchiver.decodeInteger("$x"), 4);
  for (const char* key : {"b", "d", "y", "u", "large", "missing", "$$x"}) {
    EXPECT_EQ(unarchiver.decodeInteger(key), std::nullopt) << key;
  }
  for (const char* key : {"i", "d", "y", "u", "missing"}) {
    EXPECT_EQ(unarchiver.decodeBool(key), std::nullopt) << key;
  }
  for (const char* key : {"b", "i", "y", "u", "missing"}) {
    EXPECT_EQ(unarchiver.decodeDouble(key), std::nullopt) << key;
  }
  for (const char* key : {"b", "i", "d", "u", "missing"}) {
    EXPECT_EQ(unarchiver.decodeBytes(key), std::nullopt) << key;
  }
  EXPECT_TRUE(unarchiver.containsValueForKey("u"));
  EXPECT_TRUE(unarchiver.containsValueForKey("$x"));
  EXPECT_FALSE(unarchiver.containsValueForKey("missing"));
}

TEST_F(KeyedUnarchiverTest, givesDataAsSlicesOfTheInput) {
  const Data data = archived(Value(Data::copy("some bytes")));
  KeyedUnarchiver unarchiver(data);
  const KeyedObject root = unarchiver.decodeObjectOfClasses(everything, "root");
  ASSERT_TRUE(root.value().dataIf());
  EXPECT_GE(root.value().dataIf()->bytes(), data.bytes());
  EXPECT_LT(root.value().dataIf()->bytes(), data.bytes() + data.length());
}

TEST_F(KeyedUnarchiverTest, readsTheXMLForm) {
  const Data xml = Data::copy(R"(<plist version="1.0"><dict>
    <key>$archiver</key><string>NSKeyedArchiver</string>
    <key>$version</key><integer>100000</integer>
    <key>$objects</key><array>
      <string>$null</string>
      <dict><key>$class</key><dict><key>CF$UID</key><integer>3</integer></dict>
            <key>NS.objects</key><array><dict><key>CF$UID</key><integer>2</integer></dict></array>
      </dict>
      <string>text</string>
      <dict><key>$classname</key><string>NSArray</string></dict>
    </array>
    <key>$top</key><dict><key>root</key><dict><key>CF$UID</key><integer>1</integer></dict></dict>
    </dict></plist>)");
  KeyedUnarchiver unarchiver(xml);
  const KeyedObject root = unarchiver.decodeObjectOfClasses(everything, "root");
  ASSERT_TRUE(root.arrayIf());
  EXPECT_EQ(root.arrayIf()->at(0).value(), Value("text"));
}

TEST_F(KeyedUnarchiverTest, readsTheMutableClassesOfTextAndBytes) {
  const Value text = Dictionary{{"$class", UID{2}}, {"NS.string", "text"}};
  EXPECT_EQ(decode({"$null", text, classRecord("NSMutableString")}).value(), Value("text"));
  EXPECT_EQ(decode({"$null", text, classRecord("NSString")}).value(), Value("text"));
  const Value bytes = Dictionary{{"$class", UID{2}}, {"NS.data", Data::copy("b")}};
  EXPECT_EQ(decode({"$null", bytes, classRecord("NSMutableData")}).value(), Value(Data::copy("b")));
  const Value elsewhere = Dictionary{{"$class", UID{2}}, {"NS.data", UID{3}}};
  EXPECT_EQ(decode({"$null", elsewhere, classRecord("NSMutableData"), Data::copy("c")}).value(),
            Value(Data::copy("c")));
}

TEST_F(KeyedUnarchiverTest, refusesTextAndBytesWithoutContent) {
  EXPECT_THAT(reasonOf(Array{"$null", Dictionary{{"$class", UID{2}}, {"NS.string", UID{0}}},
                             classRecord("NSMutableString")}),
              HasSubstr("object 1 of class NSMutableString has no text"));
  for (const Value& content : {Value("b"), Value(UID{0}), Value(UID{1})}) {
    EXPECT_THAT(reasonOf(Array{"$null", Dictionary{{"$class", UID{2}}, {"NS.data", content}},
                               classRecord("NSMutableData")}),
                HasSubstr("has no bytes"));
  }
  EXPECT_THAT(reasonOf(Array{"$null", Dictionary{{"$class", UID{2}}, {"NS.data", UID{9}}},
                             classRecord("NSMutableData")}),
              HasSubstr("object 1 refers to object 9 of 3"));
  EXPECT_THAT(reasonOf(Array{"$null", Dictionary{{"$class", UID{2}}}, classRecord("NSNumber")}),
              HasSubstr("has no number"));
}

TEST_F(KeyedUnarchiverTest, takesTheNilEntryAnywhereForNil) {
  EXPECT_TRUE(decode({"$null", "$null"}).isNil());
  const KeyedObject array = decode(
      {"$null", Dictionary{{"$class", UID{2}}, {"NS.objects", Array{UID{0}, UID{3}, UID{4}}}},
       classRecord("NSArray"), "$null", "x"});
  ASSERT_EQ(array.arrayIf()->size(), 1U);
  EXPECT_EQ(array.arrayIf()->at(0).value(), Value("x"));
  const KeyedObject dictionary = decode({"$null",
                                         Dictionary{{"$class", UID{2}},
                                                    {"NS.keys", Array{UID{3}, UID{4}}},
                                                    {"NS.objects", Array{UID{0}, UID{4}}}},
                                         classRecord("NSDictionary"), "a", "b"});
  EXPECT_EQ(dictionary.dictionaryIf()->size(), 1U);
  EXPECT_EQ(dictionary.dictionaryIf()->count("b"), 1U);
}

TEST_F(KeyedUnarchiverTest, leavesOutWhatDoesNotDecodeAndKeepsTheRest) {
  const KeyedObject root =
      roundTrip(KeyedObject::Array{KeyedObject(card("a", 1)), KeyedObject(card("b", -1)),
                                   KeyedObject::Dictionary{{"c", KeyedObject(card("c", -1))},
                                                           {"d", KeyedObject(card("d", 1))}}});
  ASSERT_EQ(root.arrayIf()->size(), 2U);
  EXPECT_EQ(asCard(root.arrayIf()->at(0))->label, "a");
  EXPECT_EQ(root.arrayIf()->at(1).dictionaryIf()->size(), 1U);
  EXPECT_TRUE(roundTrip(KeyedObject(card("e", -1))).isNil());
}

TEST_F(KeyedUnarchiverTest, takesTheLaterOfTwoEqualKeys) {
  const KeyedObject dictionary = decode({"$null",
                                         Dictionary{{"$class", UID{2}},
                                                    {"NS.keys", Array{UID{3}, UID{3}}},
                                                    {"NS.objects", Array{UID{3}, UID{4}}}},
                                         classRecord("NSDictionary"), "k", "v"});
  EXPECT_EQ(dictionary.dictionaryIf()->at("k").value(), Value("v"));
}

TEST_F(KeyedUnarchiverTest, refusesOtherArchiversAndVersions) {
  const auto top = [](const Dictionary& changes) {
    Dictionary entries{{"$archiver", "NSKeyedArchiver"},
                       {"$version", 100000},
                       {"$objects", Array{"$null"}},
                       {"$top", Dictionary{}}};
    for (const auto& [key, value] : changes) {
      if (value == Value("remove")) {
        entries.erase(key);
      } else {
        entries[key] = value;
      }
    }
    return dataFromPropertyList(entries, PropertyListFormat::binary);
  };
  EXPECT_NO_THROW(KeyedUnarchiver(top({})));
  EXPECT_THAT(reasonOf(top({{"$archiver", "nskeyedarchiver"}})), HasSubstr("unknown archiver"));
  EXPECT_THAT(reasonOf(top({{"$version", 100001}})), HasSubstr("unknown version"));
  for (const char* key : {"$archiver", "$version", "$objects", "$top"}) {
    EXPECT_THAT(reasonOf(top({{key, "remove"}})), HasSubstr("this one has nothing")) << key;
    EXPECT_THAT(reasonOf(top({{key, 1.5}})), HasSubstr("this one has something else")) << key;
  }
  EXPECT_THAT(reasonOf(top({{"$version", 100000.0}})), HasSubstr("something else"));
  EXPECT_THAT(reasonOf(top({{"$objects", Array{}}})), HasSubstr("object 0"));
  EXPECT_THAT(reasonOf(top({{"$objects", Array{"x"}}})), HasSubstr("object 0"));
  EXPECT_THAT(reasonOf(dataFromPropertyList(Array{}, PropertyListFormat::binary)),
              HasSubstr("is a dictionary"));
  EXPECT_THAT(reasonOf(Data::copy("hello")), HasSubstr("neither a binary nor an XML"));
  EXPECT_THAT(reasonOf(Data()), HasSubstr("neither a binary nor an XML"));
}

TEST_F(KeyedUnarchiverTest, refusesBrokenReferences) {
  const auto array = [](Value content) {
    return Array{"$null", Dictionary{{"$class", UID{2}}, {"NS.objects", std::move(content)}},
                 classRecord("NSArray")};
  };
  EXPECT_THAT(reasonOf(Array{"$null"}), HasSubstr("reference to object 1 of 1"));
  EXPECT_THAT(reasonOf(array(Array{UID{3}})), HasSubstr("object 1 refers to object 3 of 3"));
  EXPECT_THAT(reasonOf(array(Array{UID{~uint64_t{0}}})), HasSubstr("of 3"));
  EXPECT_THAT(reasonOf(array(Array{7})), HasSubstr("holds something that is no reference"));
  EXPECT_THAT(reasonOf(array("x")), HasSubstr("object 1 of class NSArray has no NS.objects"));
  EXPECT_THAT(reasonOf(Array{"$null", Array{}}), HasSubstr("a kind that an archive cannot have"));
  EXPECT_THAT(reasonOf(Array{"$null", Date{1}}), HasSubstr("a kind that an archive cannot have"));
  EXPECT_THAT(reasonOf(Array{"$null", UID{1}}), HasSubstr("a kind that an archive cannot have"));
}

TEST_F(KeyedUnarchiverTest, refusesARootThatIsNoObject) {
  KeyedUnarchiver unarchiver(archiveOf({"$null"}, {{"root", "inline"}}));
  EXPECT_THAT(reasonOf([&] { unarchiver.decodeObjectOfClasses(everything, "root"); }),
              HasSubstr("the value under \"root\" is no object"));
  EXPECT_TRUE(unarchiver.decodeObjectOfClasses(everything, "missing").isNil());
}

TEST_F(KeyedUnarchiverTest, refusesKeysAndValuesOfUnequalNumber) {
  EXPECT_THAT(
      reasonOf(
          Array{"$null",
                Dictionary{{"$class", UID{2}}, {"NS.keys", Array{UID{3}}}, {"NS.objects", Array{}}},
                classRecord("NSDictionary"), "k"}),
      HasSubstr("object 1 has 1 keys and 0 values"));
  EXPECT_THAT(reasonOf(Array{"$null", Dictionary{{"$class", UID{2}}, {"NS.objects", Array{}}},
                             classRecord("NSDictionary")}),
              HasSubstr("has no NS.keys"));
}

TEST_F(KeyedUnarchiverTest, refusesKeysThatAreNoStrings) {
  for (const Value& key : {Value(1), Value("$null"), Value(Data::copy("k"))}) {
    EXPECT_THAT(reasonOf(Array{"$null",
                               Dictionary{{"$class", UID{2}},
                                          {"NS.keys", Array{UID{3}}},
                                          {"NS.objects", Array{UID{3}}}},
                               classRecord("NSDictionary"), key}),
                HasSubstr("a key that is no string"));
  }
}

TEST_F(KeyedUnarchiverTest, refusesCyclesOfContainers) {
  EXPECT_THAT(reasonOf(Array{"$null", Dictionary{{"$class", UID{2}}, {"NS.objects", Array{UID{1}}}},
                             classRecord("NSArray")}),
              HasSubstr("object 1 contains itself"));
}

TEST_F(KeyedUnarchiverTest, refusesCyclesOfObjects) {
  EXPECT_THAT(
      reasonOf(Array{"$null", Dictionary{{"$class", UID{2}}, {"weight", 1}, {"$$note", UID{3}}},
                     classRecord("Card"),
                     Dictionary{{"$class", UID{2}}, {"weight", 1}, {"$$note", UID{1}}}}),
      HasSubstr("object 1 contains itself"));
}

TEST_F(KeyedUnarchiverTest, decodesOtherRootsAfterAFailure) {
  KeyedUnarchiver unarchiver(
      archiveOf({"$null", Dictionary{{"$class", UID{2}}, {"weight", 1}, {"$$note", UID{9}}},
                 classRecord("Card"), Dictionary{{"$class", UID{2}}, {"weight", 1}}},
                {{"bad", UID{1}}, {"good", UID{3}}}));
  for (int i = 0; i < 2; ++i) {
    EXPECT_THAT(reasonOf([&] { unarchiver.decodeObjectOfClasses({"Card"}, "bad"); }),
                HasSubstr("reference to object 9"));
  }
  EXPECT_TRUE(asCard(unarchiver.decodeObjectOfClasses({"Card"}, "good")));
}

TEST_F(KeyedUnarchiverTest, refusesNestingBeyondTheLimit) {
  // Every second level an object, every other one an array.
  const auto nested = [](size_t depth) {
    Array objects{"$null", classRecord("Card"), classRecord("NSArray")};
    for (size_t i = 0; i < depth; ++i) {
      const UID next{i + 1 == depth ? 0 : objects.size() + 1};
      objects.emplace_back(i % 2 == 0
                               ? Dictionary{{"$class", UID{1}}, {"weight", 1}, {"$$note", next}}
                               : Dictionary{{"$class", UID{2}}, {"NS.objects", Array{next}}});
    }
    return archiveOf(std::move(objects), {{"root", UID{3}}});
  };
  KeyedUnarchiver fits(nested(propertyListMaximumDepth));
  EXPECT_TRUE(asCard(fits.decodeObjectOfClasses({"Card"}, "root")));
  for (const size_t depth : {propertyListMaximumDepth + 1, size_t{20000}}) {
    KeyedUnarchiver unarchiver(nested(depth));
    EXPECT_THAT(reasonOf([&] { unarchiver.decodeObjectOfClasses({"Card"}, "root"); }),
                HasSubstr("nest deeper"));
  }
}

TEST_F(KeyedUnarchiverTest, countsTheLongestPathToASharedObject) {
  // The root names the end of a chain of arrays before its beginning.
  const auto chain = [](size_t first) {
    Array objects{"$null",
                  Dictionary{{"$class", UID{2}}, {"NS.objects", Array{UID{300}, UID{first}}}},
                  classRecord("NSArray")};
    for (size_t i = 3; i <= propertyListMaximumDepth + 2; ++i) {
      const bool last = i == propertyListMaximumDepth + 2;
      objects.emplace_back(
          Dictionary{{"$class", UID{2}}, {"NS.objects", last ? Array{} : Array{UID{i + 1}}}});
    }
    return objects;
  };
  EXPECT_THAT(reasonOf(chain(3)), HasSubstr("nest deeper"));
  EXPECT_TRUE(decode(chain(4)).arrayIf());
}

TEST_F(KeyedUnarchiverTest, decodesAGraphOfTwoToTheSixtyPathsAtOnce) {
  KeyedObject graph(KeyedObject::Array{Value("end")});
  for (int i = 0; i < 60; ++i) {
    graph = KeyedObject::Array{graph, graph};
  }
  const Data data = archived(graph);
  EXPECT_LT(data.length(), 2000U);
  KeyedUnarchiver unarchiver(data);
  const KeyedObject root = unarchiver.decodeObjectOfClasses(everything, "root");
  ASSERT_TRUE(root.arrayIf());
  EXPECT_EQ(root.arrayIf()->at(0).arrayIf(), root.arrayIf()->at(1).arrayIf());
}

TEST_F(KeyedUnarchiverTest, refusesManyContainersThatShareOneListOfElements) {
  // 2000 arrays over one list of 20,000 references: 40 million elements from some 60 KB.
  const Value list(Array(20000, UID{3}));
  Array objects{"$null", Value(), classRecord("NSArray"), "x"};
  Array holders;
  for (int i = 0; i < 2000; ++i) {
    holders.emplace_back(UID{objects.size()});
    objects.emplace_back(Dictionary{{"$class", UID{2}}, {"NS.objects", list}});
  }
  objects[1] = Dictionary{{"$class", UID{2}}, {"NS.objects", holders}};
  EXPECT_THAT(reasonOf(std::move(objects)), HasSubstr("shares its elements"));
}

TEST_F(KeyedUnarchiverTest, refusesALongKeySharedByManyDictionaries) {
  Array objects{"$null", Value(), classRecord("NSArray"), std::string(1000000, 'k'),
                classRecord("NSDictionary")};
  Array holders;
  for (int i = 0; i < 2000; ++i) {
    holders.emplace_back(UID{objects.size()});
    objects.emplace_back(
        Dictionary{{"$class", UID{4}}, {"NS.keys", Array{UID{3}}}, {"NS.objects", Array{UID{3}}}});
  }
  objects[1] = Dictionary{{"$class", UID{2}}, {"NS.objects", holders}};
  EXPECT_THAT(reasonOf(std::move(objects)), HasSubstr("long keys are shared"));
}

TEST_F(KeyedUnarchiverTest, holdsNothingOnceItIsFinished) {
  KeyedUnarchiver unarchiver(archiveOf({"$null", "x"}, {{"root", UID{1}}, {"b", true}}));
  const KeyedObject root = unarchiver.decodeObjectOfClasses(everything, "root");
  unarchiver.finishDecoding();
  unarchiver.finishDecoding();
  EXPECT_EQ(root.value(), Value("x"));
  EXPECT_TRUE(unarchiver.decodeObjectOfClasses(everything, "root").isNil());
  EXPECT_FALSE(unarchiver.containsValueForKey("root"));
  EXPECT_EQ(unarchiver.decodeBool("b"), std::nullopt);
}

TEST_F(KeyedUnarchiverTest, doesNotFinishInsideAnObject) {
  KeyedUnarchiver::registerClass("Finisher", [](KeyedUnarchiver& coder) {
    coder.finishDecoding();
    return std::shared_ptr<const KeyedCodable>();
  });
  EXPECT_THAT(
      test::reasonOf(invalidArgumentException,
                     [] {
                       decode({"$null", Dictionary{{"$class", UID{2}}}, classRecord("Finisher")},
                              {"Finisher"});
                     }),
      HasSubstr("inside an object"));
}

}  // namespace
}  // namespace platform
