#include "host/Luxwell/LUXScoringProduct.h"

#include <gtest/gtest.h>

#include <algorithm>
#include <cmath>
#include <limits>
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
      std::vector<std::vector<int8_t>> others;
      std::vector<const int8_t*> places;
      for (size_t i = 0; i < count; ++i) {
        others.push_back(randomVector(length, random));
        places.push_back(others.back().data());
      }
      std::vector<int32_t> products(count);
      LUXInnerProducts(vector.data(), places.data(), length, count, products.data());
      for (size_t i = 0; i < count; ++i) {
        EXPECT_EQ(products[i], LUXPlainInnerProduct(vector.data(), places[i], length));
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

TEST(LUXAddScaled, AddsEachProduct) {
  std::mt19937 random(8);
  const auto vector = randomVector(96, random);
  std::vector<float> sum(96, 1.5F);
  LUXAddScaled(sum.data(), vector.data(), -0.75F, sum.size());
  for (size_t i = 0; i < sum.size(); ++i) {
    EXPECT_EQ(sum[i], 1.5F + -0.75F * static_cast<float>(vector[i]));
  }
}

TEST(LUXQuantize, KeepsDirectionAndGivesTheLength) {
  std::mt19937 random(9);
  std::vector<float> sum(64);
  for (float& component : sum) {
    component = static_cast<float>(random() % 2001) / 1000 - 1;
  }
  sum[7] = -3;
  std::vector<int8_t> vector(64);
  const float scale = LUXQuantize(sum.data(), vector.data(), sum.size());
  EXPECT_EQ(vector[7], -127);
  float squares = 0;
  for (size_t i = 0; i < sum.size(); ++i) {
    EXPECT_NEAR(static_cast<float>(vector[i]), sum[i] * 127 / 3, 0.501F);
    squares += static_cast<float>(vector[i]) * scale * static_cast<float>(vector[i]) * scale;
  }
  EXPECT_NEAR(squares, 1, 1e-5);
}

TEST(LUXQuantize, HasNothingToSayOfNothing) {
  std::vector<int8_t> vector(32, 5);
  for (const float component :
       {0.0F, std::numeric_limits<float>::quiet_NaN(), std::numeric_limits<float>::infinity(),
        std::numeric_limits<float>::denorm_min()}) {
    const std::vector<float> sum(32, component);
    EXPECT_EQ(LUXQuantize(sum.data(), vector.data(), sum.size()), 0);
  }
  EXPECT_EQ(vector, std::vector<int8_t>(32, 5));
  EXPECT_EQ(LUXQuantize(nullptr, nullptr, 0), 0);
}

TEST(LUXQuantize, CountsWhatIsNoNumberAsZero) {
  std::vector<float> sum(32, 1);
  sum[3] = std::numeric_limits<float>::quiet_NaN();
  std::vector<int8_t> vector(32);
  EXPECT_GT(LUXQuantize(sum.data(), vector.data(), sum.size()), 0);
  EXPECT_EQ(vector[3], 0);
  EXPECT_EQ(vector[4], 127);
}
