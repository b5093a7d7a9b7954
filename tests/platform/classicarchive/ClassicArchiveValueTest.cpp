// From graphs to values and back.
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <cmath>
#include <limits>
#include <map>
#include <random>
#include <set>

#include "ArchiveBytes.h"

namespace platform {
namespace {

using namespace archivebytes;
using Class = ClassicArchive::Class;

Value valueIn(const std::string& bytes) { return classicarchive::value(decodeBytes(bytes)); }

void expectInconsistent(const std::string& bytes, const std::string& reason) {
  const ClassicArchive archive = decodeBytes(bytes);
  try {
    classicarchive::value(archive);
    ADD_FAILURE() << "not refused: " << reason;
  } catch (const Exception& exception) {
    EXPECT_EQ(exception.name(), inconsistentArchiveException);
    EXPECT_THAT(exception.reason(), testing::HasSubstr(reason));
  }
}

std::string dictionaryOf(const std::string& count) {
  return objectOf("NSDictionary", 0) + newString("i") + count;
}

/// The first string in a dictionary as above; the string is entity 3, its class 4, its type 5.
std::string firstString(std::string_view text) {
  return hex("92 84") + newClass("NSString", 1) + reference(2) + newString("+") +
         integer(static_cast<int64_t>(text.size())) + std::string(text) + hex("86");
}

std::string laterString(std::string_view text) {
  return hex("92 84") + reference(4) + reference(5) + integer(static_cast<int64_t>(text.size())) +
         std::string(text) + hex("86");
}

TEST(ClassicArchive, CharactersAndBooleansThatAre0Or1BecomeBooleans) {
  EXPECT_EQ(valueIn(numberOf("c", hex("01"))), Value(true));
  EXPECT_EQ(valueIn(numberOf("c", hex("00"))), Value(false));
  EXPECT_EQ(valueIn(numberOf("B", hex("01"))), Value(true));
  EXPECT_EQ(valueIn(numberOf("c", hex("02"))), Value(2));
  EXPECT_EQ(valueIn(numberOf("c", hex("ff"))), Value(-1));
  EXPECT_EQ(valueIn(numberOf("C", hex("01"))), Value(1));
}

TEST(ClassicArchive, OtherNumbersBecomeIntegersAndReals) {
  EXPECT_EQ(valueIn(numberOf("i", hex("01"))), Value(1));
  EXPECT_EQ(valueIn(numberOf("Q", hex("fd"))), Value(18446744073709551613U));
  EXPECT_EQ(valueIn(numberOf("I", hex("fd"))), Value(4294967293));
  EXPECT_EQ(valueIn(numberOf("d", hex("02"))), Value(2.0));
  EXPECT_EQ(valueIn(numberOf("f", hex("83 0000003f"))), Value(0.5));
}

TEST(ClassicArchive, ValuesBecomeANumberOrAnArrayOfNumbers) {
  EXPECT_EQ(valueIn(valueOf("i", hex("07"))), Value(7));
  EXPECT_EQ(valueIn(valueOf("{a=i}", hex("07"))), Value(7));
  EXPECT_EQ(valueIn(valueOf("{a=dBQ}", hex("07 01 ff"))),
            Value(Value::Array{7.0, true, std::numeric_limits<uint64_t>::max()}));
  EXPECT_EQ(valueIn(valueOf("{a=}", "")), Value(Value::Array{}));
}

TEST(ClassicArchive, ABareObjectBecomesAnEmptyDictionary) {
  EXPECT_EQ(valueIn(header() + newString("@") + hex("84") + newClass("NSObject", 0) + hex("85 86")),
            Value(Value::Dictionary{}));
}

TEST(ClassicArchive, ANilRootIsAbsent) {
  EXPECT_TRUE(valueIn(header() + newString("@") + hex("85")).isAbsent());
}

TEST(ClassicArchive, EachRootHasItsValue) {
  const ClassicArchive archive =
      decodeBytes(arrayOf(hex("00")) + hex("86 92 84") + newClass("NSString", 1) + reference(2) +
                  newString("+") + hex("01 61 86"));
  EXPECT_EQ(classicarchive::value(archive, 0), Value(Value::Array{}));
  EXPECT_EQ(classicarchive::value(archive, 1), Value("a"));
  try {
    classicarchive::value(archive, 2);
    ADD_FAILURE() << "not refused";
  } catch (const Exception& exception) {
    EXPECT_EQ(exception.name(), rangeException);
  }
}

TEST(ClassicArchive, OfTwoEqualKeysTheLaterWins) {
  const Value value = valueIn(dictionaryOf(hex("02")) + firstString("k") + laterString("early") +
                              laterString("k") + laterString("late") + hex("86"));
  EXPECT_EQ(value, Value(Value::Dictionary{{"k", "late"}}));
}

TEST(ClassicArchive, RefusesStringsThatAreNotUTF8) {
  expectInconsistent(objectOf("NSString", 1) + newString("+") + hex("01 ff 86"), "not UTF-8");
}

TEST(ClassicArchive, RefusesKeysThatAreNoStrings) {
  expectInconsistent(dictionaryOf(hex("01")) + hex("92 84") + newClass("NSData", 0) + reference(2) +
                         reference(3) + hex("00") + newString("[0c]") + hex("86 92") +
                         reference(3) + hex("86"),
                     "key that is not a string");
}

TEST(ClassicArchive, RefusesNilInContainers) {
  expectInconsistent(arrayOf(hex("01")) + hex("92 85 86"), "nil in a container");
  expectInconsistent(dictionaryOf(hex("01")) + hex("92 85") + firstString("v") + hex("86"),
                     "nil in a container");
  expectInconsistent(dictionaryOf(hex("01")) + firstString("k") + hex("92 85 86"),
                     "nil in a container");
}

TEST(ClassicArchive, TheValueOfABrokenGraphIsRefused) {
  const auto expectRefusal = [](const ClassicArchive& archive) {
    try {
      classicarchive::value(archive);
      ADD_FAILURE() << "not refused";
    } catch (const Exception& exception) {
      EXPECT_EQ(exception.name(), invalidArgumentException);
    }
  };
  ClassicArchive archive;
  archive.roots = {0};
  expectRefusal(archive);
  archive.nodes.resize(1);
  archive.nodes[0].nodeClass = Class::array;
  archive.nodes[0].children = {0};
  expectRefusal(archive);
  archive.nodes[0].nodeClass = Class::number;
  archive.nodes[0].children = {};
  expectRefusal(archive);
  archive.nodes[0].scalars = {"i", {}};
  expectRefusal(archive);
}

TEST(ClassicArchive, TheGraphOfAValueHasOneTypeCodeForEachKindOfNumber) {
  const ClassicArchive archive = classicarchive::graph(
      Value::Array{true, -5, std::numeric_limits<uint64_t>::max(), 0.5, "text", Data::copy("bytes"),
                   Value::Dictionary{{"k", Value::Array{}}}});
  std::vector<std::string> codes;
  for (size_t i = 1; i <= 4; ++i) {
    EXPECT_EQ(archive.nodes.at(i).nodeClass, Class::number);
    codes.push_back(archive.nodes[i].scalars.typeCode);
  }
  EXPECT_THAT(codes, testing::ElementsAre("c", "q", "Q", "d"));
  EXPECT_EQ(archive.nodes.at(5).nodeClass, Class::string);
  EXPECT_EQ(archive.nodes.at(6).nodeClass, Class::data);
  EXPECT_EQ(archive.nodes.at(7).nodeClass, Class::dictionary);
  EXPECT_THAT(archive.nodes.at(7).children, testing::ElementsAre(8, 9));
}

TEST(ClassicArchive, ValuesWithoutAClassHaveNoGraph) {
  for (const Value& value :
       {Value(), Value(Date{1}), Value(UID{1}), Value(*URL::URLWithString("help:x"))}) {
    for (const Value& root : {value, Value(Value::Array{value})}) {
      try {
        classicarchive::graph(root);
        ADD_FAILURE() << "not refused";
      } catch (const Exception& exception) {
        EXPECT_EQ(exception.name(), invalidArgumentException);
      }
    }
  }
}

TEST(ClassicArchive, TheGraphOfAVeryDeepValueNeedsNoStack) {
  Value value = Value::Array{};
  for (int i = 0; i < 200'000; ++i) {
    value = Value(Value::Array{value});
  }
  const ClassicArchive archive = classicarchive::graph(value);
  EXPECT_EQ(archive.nodes.size(), 200'001U);
  EXPECT_EQ(classicarchive::value(archive), value);
}

/// Random values in which nodes are used more than once.
class RandomValues {
 public:
  explicit RandomValues(uint32_t seed) : _random(seed) {}

  Value next(int depth) {
    const uint32_t kind = _below(depth > 0 ? 9 : 6);
    if (kind == 8 && !_made.empty()) {
      return _made[_below(static_cast<uint32_t>(_made.size()))];
    }
    Value value = _new(kind, depth);
    if (value.identity() != nullptr) {
      _made.push_back(value);
    }
    return value;
  }

 private:
  uint32_t _below(uint32_t limit) { return static_cast<uint32_t>(_random() % limit); }

  Value _new(uint32_t kind, int depth) {
    switch (kind) {
      case 0:
        return _below(2) == 1;
      case 1:
        return static_cast<int64_t>(_random() << (_below(8) * 8U));
      case 2:
        return uint64_t{_random()} << (_below(8) * 8U);
      case 3:
        return static_cast<double>(_below(10000)) / (_below(2) == 0 ? 1 : 7);
      case 4:
        return std::string(_below(200), static_cast<char>('a' + _below(26)));
      case 5:
        return Data::adopt(std::string(_below(200), static_cast<char>(_below(256))));
      case 6: {
        Value::Dictionary dictionary;
        for (uint32_t i = _below(6); i > 0; --i) {
          dictionary.insert_or_assign(std::string(_below(5), static_cast<char>('k' + _below(3))),
                                      next(depth - 1));
        }
        return dictionary;
      }
      default: {
        Value::Array array;
        for (uint32_t i = _below(8); i > 0; --i) {
          array.push_back(next(depth - 1));
        }
        return array;
      }
    }
  }

  std::mt19937_64 _random;
  std::vector<Value> _made;
};

/// Gives each heap node a number in the order of a walk over everything; equal lists mean equal
/// sharing. The values of these tests are small, so the walk may be naive.
void listIdentities(const Value& value, std::map<const void*, size_t>& numbers,
                    std::vector<size_t>& list) {
  if (value.identity() != nullptr) {
    list.push_back(numbers.try_emplace(value.identity(), numbers.size()).first->second);
  }
  if (const Value::Array* array = value.arrayIf()) {
    for (const Value& element : *array) {
      listIdentities(element, numbers, list);
    }
  }
  if (const Value::Dictionary* dictionary = value.dictionaryIf()) {
    for (const auto& [key, entry] : *dictionary) {
      listIdentities(entry, numbers, list);
    }
  }
}

std::vector<size_t> sharingOf(const Value& value) {
  std::map<const void*, size_t> numbers;
  std::vector<size_t> list;
  listIdentities(value, numbers, list);
  return list;
}

TEST(ClassicArchive, ValuesComeBackFromTheirArchiveWithTheirSharing) {
  for (uint32_t seed = 0; seed < 300; ++seed) {
    SCOPED_TRACE(seed);
    RandomValues values(seed);
    const Value value = Value::Array{values.next(4), values.next(4), values.next(4)};
    const Data bytes = classicArchiveWithRootObject(value);
    const ClassicArchive archive = classicarchive::decode(bytes);
    const Value again = classicarchive::value(archive);
    EXPECT_EQ(again, value);
    EXPECT_EQ(sharingOf(again), sharingOf(value));
    EXPECT_EQ(classicarchive::graph(value), archive);
    EXPECT_EQ(classicArchiveWithRootObject(again), bytes);
  }
}

}  // namespace
}  // namespace platform
