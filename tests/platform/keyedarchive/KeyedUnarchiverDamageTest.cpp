// An archive damaged at every place: refused with a reason or read, never more.
#include <gtest/gtest.h>

#include "tests/platform/keyedarchive/ArchiveSamples.h"

namespace platform {
namespace {

using test::card;
using test::Card;

Data sample() {
  const auto first = card("Café", 7);
  const auto second = card("second", 1000);
  second->note = KeyedObject(KeyedObject::Array{KeyedObject(first)});
  KeyedArchiver archiver;
  archiver.encodeObject(Value("en"), "CacheLanguage");
  archiver.encodeObject(
      KeyedObject::mutableDictionary(
          {{"one", KeyedObject::Array{KeyedObject(first), KeyedObject(second)}},
           {"two", KeyedObject::mutableArray({KeyedObject(first), Value(Data::copy("bytes"))})}}),
      "KnownIndices");
  archiver.encodeInteger(3, "count");
  return archiver.finishEncoding();
}

// Whether the bytes were read whole.
bool readDamaged(std::string bytes) {
  try {
    KeyedUnarchiver unarchiver(Data::adopt(std::move(bytes)));
    unarchiver.decodeObjectOfClasses({KeyedUnarchiver::stringClass}, "CacheLanguage");
    unarchiver.decodeObjectOfClasses(
        {KeyedUnarchiver::mutableDictionaryClass, KeyedUnarchiver::arrayClass,
         KeyedUnarchiver::dataClass, "Card"},
        "KnownIndices");
    unarchiver.decodeInteger("count");
    unarchiver.finishDecoding();
    return true;
  } catch (const Exception& exception) {
    EXPECT_EQ(exception.name(), inconsistentArchiveException);
    EXPECT_FALSE(exception.reason().empty());
    return false;
  }
}

class KeyedUnarchiverDamage : public ::testing::Test {
 protected:
  void SetUp() override { Card::registerClass(); }

  std::string _bytes{sample().view()};
};

TEST_F(KeyedUnarchiverDamage, theSampleIsReadUndamaged) { EXPECT_TRUE(readDamaged(_bytes)); }

TEST_F(KeyedUnarchiverDamage, isRefusedWhereverItIsCut) {
  for (size_t length = 0; length < _bytes.size(); ++length) {
    EXPECT_FALSE(readDamaged(_bytes.substr(0, length))) << length;
  }
}

TEST_F(KeyedUnarchiverDamage, isReadOrRefusedWhateverBitIsFlipped) {
  for (size_t i = 0; i < _bytes.size(); ++i) {
    for (int bit = 0; bit < 8; ++bit) {
      std::string damaged = _bytes;
      damaged[i] = static_cast<char>(damaged[i] ^ (1 << bit));
      readDamaged(std::move(damaged));
    }
  }
}

TEST_F(KeyedUnarchiverDamage, isReadOrRefusedWhicheverReferenceIsTurned) {
  for (size_t i = 0; i + 1 < _bytes.size(); ++i) {
    if (static_cast<unsigned char>(_bytes[i]) != 0x80) {
      continue;
    }
    for (int target = 0; target < 40; ++target) {
      std::string damaged = _bytes;
      damaged[i + 1] = static_cast<char>(target);
      readDamaged(std::move(damaged));
    }
  }
}

}  // namespace
}  // namespace platform
