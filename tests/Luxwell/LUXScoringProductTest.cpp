#include "host/Luxwell/LUXScoringProduct.h"

#include <gtest/gtest.h>

#include <random>
#include <vector>

namespace {

std::vector<int8_t> randomVector(size_t length, std::mt19937& random) {
  std::uniform_int_distribution<int> number(-127, 127);
  std::vector<int8_t> vector(length);
  for (int8_t& component : vector) {
    component = static_cast<int8_t>(number(random));
  }
  return vector;
}

}  // namespace

TEST(LUXInnerProduct, IsTheSameWithAndWithoutWideInstructions) {
  std::mt19937 random(1);
  for (size_t length = 0; length <= 320; length += LUXVectorBlock) {
    const auto a = randomVector(length, random);
    const auto b = randomVector(length, random);
    EXPECT_EQ(LUXInnerProduct(a.data(), b.data(), length),
              LUXPlainInnerProduct(a.data(), b.data(), length));
  }
}

TEST(LUXInnerProduct, OfManyVectorsIsThatOfEach) {
  std::mt19937 random(6);
  for (const size_t length : {size_t{32}, size_t{64}, size_t{320}}) {
    const auto vector = randomVector(length, random);
    for (size_t count = 0; count <= 9; ++count) {
      const auto others = randomVector(length * count, random);
      std::vector<int32_t> products(count);
      std::vector<int32_t> plain(count);
      LUXInnerProducts(vector.data(), others.data(), length, count, products.data());
      LUXPlainInnerProducts(vector.data(), others.data(), length, count, plain.data());
      for (size_t i = 0; i < count; ++i) {
        EXPECT_EQ(products[i],
                  LUXPlainInnerProduct(vector.data(), others.data() + i * length, length));
        EXPECT_EQ(products[i], plain[i]);
      }
    }
  }
}

TEST(LUXInnerProduct, HoldsTheLargestNumbers) {
  const std::vector<int8_t> high(320, 127);
  const std::vector<int8_t> low(320, -127);
  EXPECT_EQ(LUXInnerProduct(high.data(), high.data(), 320), 320 * 127 * 127);
  EXPECT_EQ(LUXInnerProduct(high.data(), low.data(), 320), -320 * 127 * 127);
  EXPECT_EQ(LUXInnerProduct(low.data(), high.data(), 320), -320 * 127 * 127);
  EXPECT_EQ(LUXInnerProduct(low.data(), low.data(), 320), 320 * 127 * 127);
}

TEST(LUXInnerProduct, NeedsNoAlignment) {
  std::mt19937 random(2);
  const auto a = randomVector(96, random);
  const auto b = randomVector(96, random);
  for (size_t offset = 0; offset < 32; ++offset) {
    EXPECT_EQ(LUXInnerProduct(a.data() + offset, b.data() + 31 - offset, 64),
              LUXPlainInnerProduct(a.data() + offset, b.data() + 31 - offset, 64));
  }
}

TEST(LUXInnerProduct, TakesAMinimumThatOnlyADamagedFileHolds) {
  const std::vector<int8_t> query(32, 127);
  const std::vector<int8_t> page(32, -128);
  EXPECT_EQ(LUXInnerProduct(query.data(), page.data(), 32), -32 * 127 * 128);
}
