#include "SearchKit/PackedPositions.h"

#include <gtest/gtest.h>

#include <random>
#include <vector>

namespace searchkit {
namespace {

TEST(PackedPositions, comeBackAsTheyWereWritten) {
  std::mt19937 random(8);
  for (int round = 0; round < 300; ++round) {
    const uint32_t lowBits = random() % 32;
    std::vector<uint32_t> numbers;
    BitWriter writer;
    for (int i = 0; i < 50; ++i) {
      const uint32_t number = static_cast<uint32_t>(random()) >> random() % 32;
      numbers.push_back(number);
      writer.appendDistance(number, lowBits);
      writer.appendCount(number % (1U << maximumCountBits) + 1);
    }
    const uint64_t bitCount = writer.bitCount();
    const std::vector<uint8_t> bytes = writer.finish();
    BitReader reader(bytes.data(), bytes.data() + bytes.size());
    for (const uint32_t number : numbers) {
      uint32_t distance = 0;
      uint32_t count = 0;
      ASSERT_TRUE(reader.readDistance(lowBits, distance));
      ASSERT_TRUE(reader.readCount(count));
      ASSERT_EQ(distance, number);
      ASSERT_EQ(count, number % (1U << maximumCountBits) + 1);
    }
    EXPECT_EQ(reader.position(), bitCount);
    EXPECT_TRUE(reader.isAtEnd());
  }
}

TEST(PackedPositions, appendOneStreamToAnother) {
  BitWriter first;
  BitWriter second;
  first.append(5, 3);
  second.append(0x1234567, 29);
  first.append(second);
  EXPECT_EQ(first.bitCount(), 32U);
  EXPECT_EQ(first.finish(), (std::vector<uint8_t>{0x3D, 0x2B, 0x1A, 0x09}));
}

TEST(PackedPositions, endWhereTheBytesEnd) {
  const uint8_t ones[] = {0xFF, 0xFF};
  uint32_t number = 0;
  BitReader counts(ones, ones + 2);
  EXPECT_FALSE(counts.readCount(number));
  EXPECT_FALSE(counts.readCount(number));
  BitReader distances(ones, ones + 2);
  EXPECT_FALSE(distances.readDistance(3, number));
  BitReader none(ones, ones);
  EXPECT_FALSE(none.readDistance(0, number));
  EXPECT_FALSE(none.skip(1));
  BitReader skipped(ones, ones + 2);
  EXPECT_TRUE(skipped.skip(16));
  EXPECT_FALSE(skipped.skip(UINT32_MAX));
}

TEST(PackedPositions, haveAsManyLowBitsAsTheMeanDistance) {
  EXPECT_EQ(positionBits(0, 1), 0U);
  EXPECT_EQ(positionBits(1, 1), 0U);
  EXPECT_EQ(positionBits(512, 1), 9U);
  EXPECT_EQ(positionBits(1023, 2), 8U);
  EXPECT_EQ(positionBits(10, 20), 0U);
  EXPECT_EQ(positionBits(UINT32_MAX, 0), 31U);
}

}  // namespace
}  // namespace searchkit
