#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "tests/platform/keyedarchive/ArchiveSamples.h"

namespace platform {
namespace {

using test::card;
using ::testing::HasSubstr;

template <typename Body>
std::string reasonOf(Body body) {
  return test::reasonOf(invalidArgumentException, body);
}

// Encodes with a function.
struct Custom : KeyedCodable {
  std::function<void(KeyedArchiver&)> encode = [](KeyedArchiver&) {};
  std::string name = "Custom";
  std::vector<std::string> superclasses;

  std::string archiveClassName() const override { return name; }
  std::vector<std::string> archiveSuperclassNames() const override { return superclasses; }
  void encodeWithCoder(KeyedArchiver& coder) const override { encode(coder); }
};

// The archive's top dictionary.
Value finish(KeyedArchiver& archiver) {
  const std::optional<Value> value = propertyListFromData(archiver.finishEncoding());
  EXPECT_TRUE(value);
  return value.value_or(Value());
}

Value archive(const KeyedObject& object) {
  KeyedArchiver archiver;
  archiver.encodeObject(object, "root");
  return finish(archiver);
}

const Value& entry(const Value& archive, size_t index) {
  return archive["$objects"].arrayIf()->at(index);
}

TEST(KeyedArchiver, writesItsNameAndVersion) {
  KeyedArchiver archiver;
  EXPECT_EQ(finish(archiver), Value(Value::Dictionary{{"$archiver", "NSKeyedArchiver"},
                                                      {"$version", 100000},
                                                      {"$objects", Value::Array{"$null"}},
                                                      {"$top", Value::Dictionary{}}}));
}

TEST(KeyedArchiver, writesScalarsAndBytesInline) {
  KeyedArchiver archiver;
  archiver.encodeBool(true, "b");
  archiver.encodeInteger(-3, "i");
  archiver.encodeDouble(1.5, "d");
  archiver.encodeBytes(Data::copy("xy"), "y");
  archiver.encodeObject({}, "n");
  EXPECT_EQ(finish(archiver)["$top"],
            Value(Value::Dictionary{
                {"b", true}, {"i", -3}, {"d", 1.5}, {"y", Data::copy("xy")}, {"n", UID{0}}}));
}

TEST(KeyedArchiver, doublesADollarAtTheBeginningOfAKey) {
  KeyedArchiver archiver;
  archiver.encodeInteger(1, "$class");
  archiver.encodeInteger(2, "$$");
  archiver.encodeInteger(3, "a$");
  EXPECT_EQ(finish(archiver)["$top"],
            Value(Value::Dictionary{{"$$class", 1}, {"$$$", 2}, {"a$", 3}}));
}

TEST(KeyedArchiver, writesPlainValuesAsPlainEntries) {
  KeyedArchiver archiver;
  archiver.encodeObject(Value("text"), "a");
  archiver.encodeObject(Value(7), "b");
  archiver.encodeObject(Value(false), "c");
  archiver.encodeObject(Value(0.5), "d");
  archiver.encodeObject(Value(Data::copy("bytes")), "e");
  EXPECT_EQ(finish(archiver)["$objects"],
            Value(Value::Array{"$null", "text", 7, false, 0.5, Data::copy("bytes")}));
}

TEST(KeyedArchiver, namesTheClassOfEachContainer) {
  const auto classNames = [](const KeyedObject& object) {
    const Value written = archive(object);
    return entry(written, entry(written, 1)["$class"].uidIf()->index)["$classes"];
  };
  EXPECT_EQ(classNames(KeyedObject::Array{}), Value(Value::Array{"NSArray", "NSObject"}));
  EXPECT_EQ(classNames(KeyedObject::mutableArray({})),
            Value(Value::Array{"NSMutableArray", "NSArray", "NSObject"}));
  EXPECT_EQ(classNames(KeyedObject::Dictionary{}), Value(Value::Array{"NSDictionary", "NSObject"}));
  EXPECT_EQ(classNames(KeyedObject::mutableDictionary({})),
            Value(Value::Array{"NSMutableDictionary", "NSDictionary", "NSObject"}));
  EXPECT_EQ(classNames(Value(Value::Array{})), Value(Value::Array{"NSArray", "NSObject"}));
  EXPECT_EQ(classNames(Value(Value::Dictionary{})),
            Value(Value::Array{"NSDictionary", "NSObject"}));
  auto custom = std::make_shared<Custom>();
  custom->superclasses = {"Base"};
  EXPECT_EQ(classNames(KeyedObject(custom)), Value(Value::Array{"Custom", "Base", "NSObject"}));
}

TEST(KeyedArchiver, writesContainersWithinPlainValues) {
  const Value written = archive(Value(Value::Array{Value::Dictionary{{"k", Value::Array{1}}}}));
  const Value& dictionary = entry(written, 2);
  EXPECT_EQ(dictionary["NS.keys"], Value(Value::Array{UID{3}}));
  EXPECT_EQ(entry(written, 3), Value("k"));
  EXPECT_EQ(dictionary["NS.objects"], Value(Value::Array{UID{4}}));
  EXPECT_EQ(entry(written, 4)["NS.objects"], Value(Value::Array{UID{5}}));
  EXPECT_EQ(entry(written, 5), Value(1));
}

TEST(KeyedArchiver, writesWhatItMeetsTwiceOnce) {
  const auto object = card("x");
  const KeyedObject array(KeyedObject::Array{KeyedObject(object)});
  const Value data(Data::copy("d"));
  const Value plain(Value::Array{data});
  const KeyedObject all(KeyedObject::Array{KeyedObject(object), array, array, data, data, plain,
                                           plain, Value("same"), Value("same")});
  const Value written = archive(all);
  const Value::Array& uids = *entry(written, 1)["NS.objects"].arrayIf();
  EXPECT_EQ(uids[1], uids[2]);
  EXPECT_EQ(uids[3], uids[4]);
  EXPECT_EQ(uids[5], uids[6]);
  EXPECT_EQ(uids[7], uids[8]);
  EXPECT_EQ(entry(written, uids[1].uidIf()->index)["NS.objects"], Value(Value::Array{uids[0]}));
  EXPECT_EQ(entry(written, uids[5].uidIf()->index)["NS.objects"], Value(Value::Array{uids[3]}));
}

TEST(KeyedArchiver, keepsEqualObjectsApart) {
  const Value written = archive(KeyedObject::Array{KeyedObject(card("x")), KeyedObject(card("x"))});
  const Value::Array& uids = *entry(written, 1)["NS.objects"].arrayIf();
  EXPECT_NE(uids[0], uids[1]);
}

TEST(KeyedArchiver, keepsApartWhatLivesAtTheSameAddressInTurn) {
  auto custom = std::make_shared<Custom>();
  custom->encode = [](KeyedArchiver& coder) {
    for (int i = 0; i < 100; ++i) {
      coder.encodeObject(KeyedObject::Array{Value(i)}, std::to_string(i));
    }
  };
  const Value written = archive(KeyedObject(custom));
  for (int i = 0; i < 100; ++i) {
    const UID* array = entry(written, 1)[std::to_string(i)].uidIf();
    ASSERT_TRUE(array);
    const UID* number = entry(written, array->index)["NS.objects"].arrayIf()->at(0).uidIf();
    EXPECT_EQ(entry(written, number->index), Value(i));
  }
}

TEST(KeyedArchiver, writesTheSameBytesForTheSameContent) {
  const auto write = [] {
    KeyedArchiver archiver;
    archiver.encodeObject(
        KeyedObject::mutableDictionary(
            {{"b", KeyedObject::Array{KeyedObject(card("x", 1))}}, {"a", Value("y")}}),
        "root");
    return archiver.finishEncoding();
  };
  EXPECT_EQ(write(), write());
}

TEST(KeyedArchiver, refusesAKeyTwiceInOneObject) {
  KeyedArchiver archiver;
  archiver.encodeInteger(1, "k");
  EXPECT_THAT(reasonOf([&] { archiver.encodeBool(true, "k"); }),
              HasSubstr("\"k\" is encoded twice"));
  KeyedArchiver other;
  other.encodeObject({}, "k");
  EXPECT_THAT(reasonOf([&] { other.encodeObject({}, "k"); }), HasSubstr("encoded twice"));
}

TEST(KeyedArchiver, refusesCycles) {
  auto custom = std::make_shared<Custom>();
  const std::weak_ptr<Custom> self = custom;
  custom->encode = [self](KeyedArchiver& coder) {
    coder.encodeObject(KeyedObject::Array{KeyedObject(self.lock())}, "self");
  };
  EXPECT_THAT(reasonOf([&] { archive(KeyedObject(custom)); }), HasSubstr("contains itself"));
}

TEST(KeyedArchiver, refusesNestingBeyondTheLimit) {
  KeyedObject nested(KeyedObject::Array{});
  for (size_t i = 1; i < propertyListMaximumDepth; ++i) {
    nested = KeyedObject::Array{nested};
  }
  EXPECT_TRUE(archive(nested).dictionaryIf());
  const KeyedObject deeper(KeyedObject::Array{nested});
  EXPECT_THAT(reasonOf([&] { archive(deeper); }), HasSubstr("nest deeper"));
  // Met first at a shallow place, then at one that is too deep.
  EXPECT_THAT(reasonOf([&] {
                archive(KeyedObject::Array{nested.arrayIf()->front(), deeper});
              }),
              HasSubstr("nest deeper"));
  Value value = Value::Array{};
  for (size_t i = 0; i < 200000; ++i) {
    value = Value::Array{std::move(value)};
  }
  EXPECT_THAT(reasonOf([&] { archive(value); }), HasSubstr("nest deeper"));
}

TEST(KeyedArchiver, refusesWhatHasNoPlaceInAnArchive) {
  EXPECT_THAT(reasonOf([] { archive(KeyedObject::Array{KeyedObject()}); }),
              HasSubstr("cannot hold nil"));
  EXPECT_THAT(reasonOf([] {
                archive(KeyedObject::Dictionary{{"k", KeyedObject()}});
              }),
              HasSubstr("cannot hold nil"));
  EXPECT_THAT(reasonOf([] { archive(Value(Value::Array{Value()})); }),
              HasSubstr("cannot hold nil"));
  EXPECT_THAT(reasonOf([] { archive(Value(Date{1})); }), HasSubstr("cannot hold a date"));
  EXPECT_THAT(reasonOf([] { archive(Value(UID{1})); }), HasSubstr("cannot hold a date"));
  EXPECT_THAT(reasonOf([] { archive(Value("\xFF")); }), HasSubstr("not well-formed UTF-8"));
}

TEST(KeyedArchiver, refusesClassNamesOfItsOwn) {
  for (const char* name : {"", "NSObject", "NSString", "NSMutableDictionary"}) {
    auto custom = std::make_shared<Custom>();
    custom->name = name;
    EXPECT_THAT(reasonOf([&] { archive(KeyedObject(custom)); }),
                HasSubstr("cannot be the class of an object"));
  }
}

TEST(KeyedArchiver, finishesOnce) {
  KeyedArchiver archiver;
  archiver.finishEncoding();
  EXPECT_THAT(reasonOf([&] { archiver.finishEncoding(); }), HasSubstr("is finished"));
  EXPECT_THAT(reasonOf([&] { archiver.encodeBool(true, "k"); }), HasSubstr("is finished"));
  EXPECT_THAT(reasonOf([&] { archiver.encodeObject({}, "k"); }), HasSubstr("is finished"));
}

TEST(KeyedArchiver, doesNotFinishInsideAnObject) {
  auto custom = std::make_shared<Custom>();
  custom->encode = [](KeyedArchiver& coder) { coder.finishEncoding(); };
  EXPECT_THAT(reasonOf([&] { archive(KeyedObject(custom)); }), HasSubstr("inside an object"));
}

TEST(KeyedArchiver, doesNotFinishAfterAFailure) {
  auto custom = std::make_shared<Custom>();
  custom->encode = [](KeyedArchiver&) { throw Exception("Test", "boom"); };
  KeyedArchiver archiver;
  EXPECT_EQ(test::reasonOf("Test", [&] { archiver.encodeObject(KeyedObject(custom), "k"); }),
            "boom");
  EXPECT_THAT(reasonOf([&] { archiver.finishEncoding(); }), HasSubstr("encoding failed"));
}

TEST(KeyedArchiver, doesNotFinishAfterAFailureThatAnObjectSwallowed) {
  auto broken = std::make_shared<Custom>();
  broken->encode = [](KeyedArchiver&) { throw Exception("Test", "boom"); };
  auto custom = std::make_shared<Custom>();
  custom->encode = [&](KeyedArchiver& coder) {
    EXPECT_THROW(coder.encodeObject(KeyedObject(broken), "k"), Exception);
  };
  KeyedArchiver archiver;
  archiver.encodeObject(KeyedObject(custom), "k");
  EXPECT_THAT(reasonOf([&] { archiver.finishEncoding(); }), HasSubstr("encoding failed"));
}

}  // namespace
}  // namespace platform
