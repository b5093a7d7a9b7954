// Two archives known byte for byte: both are written as they stand and read back.
#include <gtest/gtest.h>

#include "tests/platform/keyedarchive/ArchiveSamples.h"
#include "tests/platform/propertylist/BinaryListBuilder.h"

namespace platform {
namespace {

using test::asCard;
using test::bytesFromHex;
using test::Card;

// The mutable dictionary {"name": "Ada"} under the name that the one-call archiver uses.
std::string dictionaryExample() {
  return "bplist00" + bytesFromHex(
                          "d401020304050607 0a"
                          "582476657273696f6e 59246172636869766572 5424746f70 58246f626a65637473"
                          "12000186a0 5f100f4e534b657965644172636869766572"
                          "d10809 54726f6f74 8001"
                          "a50b0c151617"
                          "55246e756c6c"
                          "d30d0e0f101113 5624636c617373 574e532e6b657973 5a4e532e6f626a65637473"
                          "8004 a112 8002 a114 8003"
                          "546e616d65 53416461"
                          "d218191a1b 5a24636c6173736e616d65 5824636c6173736573"
                          "5f10134e534d757461626c6544696374696f6e617279 a31a1c1d"
                          "5c4e5344696374696f6e617279 584e534f626a656374"
                          // Offsets, the first ones 8 17 26 36 41 50 55 73 76 81 83 89 95.
                          "08111a24293237494c5153595f666d7580828486888a8f9398a3acc2c6d3"
                          "000000000000 01 01 000000000000001e 0000000000000000 00000000000000dc");
}

// An array that holds one card twice, and a count beside it.
std::string namedRootsExample() {
  return "bplist00" +
         bytesFromHex(
             "d401020304050607 0c"
             "582476657273696f6e 59246172636869766572 5424746f70 58246f626a65637473"
             "12000186a0 5f100f4e534b657965644172636869766572"
             "d208090a0b 556974656d73 55636f756e74 8001 1002"
             "a60d0e141c1d23"
             "55246e756c6c"
             "d20f101112 5624636c617373 5a4e532e6f626a65637473 8005 a21313 8002"
             "d40f15161718191a1b 556c6162656c 56776569676874 5624246e6f7465"
             "8004 8003 1007 8000"
             "6400430061006600e9"
             "d21e1f2021 5a24636c6173736e616d65 5824636c6173736573 5443617264 a22022"
             "584e534f626a656374"
             "d21e1f2425 574e534172726179 a22422"
             // Offsets, the first ones 8 17 26 36 41 50 55 73 78 84 90 92 94 101 107 112.
             "08111a2429323749 4e545a5c5e656b70 778284878992989fa6a8aaacaeb7bcc7d0d5d8e1e6ee"
             "000000000000 01 01 0000000000000026 0000000000000000 00000000000000f1");
}

Data write(const std::function<void(KeyedArchiver&)>& encode) {
  KeyedArchiver archiver;
  encode(archiver);
  return archiver.finishEncoding();
}

TEST(KeyedArchiveExamples, aDictionaryIsWrittenByteForByte) {
  const Data data = write([](KeyedArchiver& archiver) {
    archiver.encodeObject(KeyedObject::mutableDictionary({{"name", Value("Ada")}}), "root");
  });
  EXPECT_EQ(data.length(), 282U);
  EXPECT_EQ(data.view(), dictionaryExample());
}

TEST(KeyedArchiveExamples, aDictionaryIsRead) {
  KeyedUnarchiver unarchiver(Data::adopt(dictionaryExample()));
  const KeyedObject root = unarchiver.decodeObjectOfClasses(
      {KeyedUnarchiver::mutableDictionaryClass, KeyedUnarchiver::stringClass}, "root");
  ASSERT_TRUE(root.dictionaryIf());
  EXPECT_TRUE(root.isMutable());
  ASSERT_EQ(root.dictionaryIf()->size(), 1U);
  EXPECT_EQ(root.dictionaryIf()->at("name").value(), Value("Ada"));
}

TEST(KeyedArchiveExamples, namedRootsAreWrittenByteForByte) {
  auto card = test::card("Café", 7);
  const Data data = write([&](KeyedArchiver& archiver) {
    archiver.encodeObject(KeyedObject::Array{KeyedObject(card), KeyedObject(card)}, "items");
    archiver.encodeInteger(2, "count");
  });
  EXPECT_EQ(data.length(), 311U);
  EXPECT_EQ(data.view(), namedRootsExample());
}

TEST(KeyedArchiveExamples, namedRootsHaveTheirBytesInTheirPlaces) {
  const std::string bytes = namedRootsExample();
  ASSERT_EQ(bytes.size(), 311U);
  EXPECT_EQ(bytes.substr(73, 5), bytesFromHex("d208090a0b"));
  EXPECT_EQ(bytes.substr(90, 4), bytesFromHex("8001 1002"));
  EXPECT_EQ(bytes.substr(130, 7), bytesFromHex("8005 a21313 8002"));
  EXPECT_EQ(bytes.substr(137, 9), bytesFromHex("d40f15161718191a1b"));
  EXPECT_EQ(bytes.substr(166, 8), bytesFromHex("8004 8003 1007 8000"));
  EXPECT_EQ(bytes.substr(174, 9), bytesFromHex("6400430061006600e9"));
}

TEST(KeyedArchiveExamples, namedRootsAreRead) {
  Card::registerClass();
  KeyedUnarchiver unarchiver(Data::adopt(namedRootsExample()));
  EXPECT_FALSE(unarchiver.containsValueForKey("root"));
  EXPECT_EQ(unarchiver.decodeInteger("count"), 2);
  const KeyedObject items =
      unarchiver.decodeObjectOfClasses({KeyedUnarchiver::arrayClass, "Card"}, "items");
  ASSERT_TRUE(items.arrayIf());
  EXPECT_FALSE(items.isMutable());
  ASSERT_EQ(items.arrayIf()->size(), 2U);
  const auto card = asCard((*items.arrayIf())[0]);
  ASSERT_TRUE(card);
  EXPECT_EQ(card, (*items.arrayIf())[1].object());
  EXPECT_EQ(card->label, "Café");
  EXPECT_EQ(card->weight, 7);
  EXPECT_TRUE(card->note.isNil());
}

}  // namespace
}  // namespace platform
