#include "SearchKit/PackedPositions.h"

#include <gtest/gtest.h>

#include <random>
#include <span>
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
    const std::span<const uint8_t> bytes = writer.finish();
    BitReader reader(bytes.data(), bytes.data() + bytes.size());
    EXPECT_EQ(bytes.size(), (bitCount + 7) / 8);
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
  std::mt19937 random(3);
  for (uint32_t length = 0; length < 200; ++length) {
    std::vector<uint8_t> bits(length / 8 + 9);
    for (uint8_t& byte : bits) {
      byte = static_cast<uint8_t>(random());
    }
    BitWriter writer;
    writer.append(5, 3);
    writer.append(bits.data(), length);
    writer.append(1, 1);
    ASSERT_EQ(writer.bitCount(), length + 4);
    const std::span<const uint8_t> bytes = writer.finish();
    const auto bit = [&](size_t at) { return (bytes[at / 8] >> at % 8 & 1) != 0; };
    EXPECT_EQ(bytes[0] & 7, 5);
    for (size_t i = 0; i < length; ++i) {
      ASSERT_EQ(bit(i + 3), (bits[i / 8] >> i % 8 & 1) != 0) << length << " bits, bit " << i;
    }
    EXPECT_TRUE(bit(length + 3));
  }
}

TEST(PackedPositions, areNothingBeforeThereAreAny) {
  BitWriter writer;
  EXPECT_EQ(writer.bitCount(), 0U);
  EXPECT_TRUE(writer.finish().empty());
  writer.clear();
  writer.append(1, 1);
  EXPECT_EQ(writer.finish().size(), 1U);
}

TEST(PackedPositions, areTheSameAsCodesAndInAStream) {
  std::mt19937 random(9);
  for (int round = 0; round < 1000; ++round) {
    const uint32_t distance = static_cast<uint32_t>(random()) >> random() % 32;
    const uint32_t lowBits = random() % 32;
    const BitCode code = distanceCode(distance, lowBits);
    BitReader reader(reinterpret_cast<const uint8_t*>(&code.bits),
                     reinterpret_cast<const uint8_t*>(&code.bits + 1));
    uint32_t read = 0;
    ASSERT_TRUE(reader.readDistance(lowBits, read));
    EXPECT_EQ(read, distance);
    EXPECT_EQ(reader.position(), code.length);
    BitCode two = countCode(distance % 1000 + 1);
    const uint32_t firstLength = two.length;
    two.append(distanceCode(distance % 1000, 8));
    BitReader both(reinterpret_cast<const uint8_t*>(&two.bits),
                   reinterpret_cast<const uint8_t*>(&two.bits + 1));
    ASSERT_TRUE(both.readCount(read));
    EXPECT_EQ(read, distance % 1000 + 1);
    EXPECT_EQ(both.position(), firstLength);
    ASSERT_TRUE(both.readDistance(8, read));
    EXPECT_EQ(read, distance % 1000);
    EXPECT_EQ(both.position(), two.length);
  }
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
