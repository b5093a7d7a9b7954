#include "host/Luxwell/LUXScoringProduct.h"

#include <algorithm>
#include <cmath>

#if defined(__x86_64__)
#include <immintrin.h>
#endif

namespace {

// Nothing smaller is divided by.
constexpr float smallestSum = 1e-30F;
constexpr float largestSum = 1e30F;

}  // namespace

int32_t LUXPlainInnerProduct(const int8_t* a, const int8_t* b, size_t length) noexcept {
  int32_t sum = 0;
  for (size_t i = 0; i < length; ++i) {
    sum += static_cast<int32_t>(a[i]) * b[i];
  }
  return sum;
}

namespace {

void plainInnerProducts(const int8_t* vector, const int8_t* const* others, size_t length,
                        size_t count, int32_t* products) noexcept {
  for (size_t i = 0; i < count; ++i) {
    products[i] = LUXPlainInnerProduct(vector, others[i], length);
  }
}

}  // namespace

#if defined(__x86_64__)

namespace {

#define WITH_WIDE_INSTRUCTIONS __attribute__((target("avx2")))

// One instruction multiplies unsigned by signed bytes and adds pairs, so the sign of one vector
// moves to the other. A pair stays within 2 * 127 * 128, which sixteen bits hold.
WITH_WIDE_INSTRUCTIONS inline __m256i blockProduct(__m256i magnitudes, __m256i signs,
                                                   const int8_t* other) noexcept {
  const __m256i block = _mm256_loadu_si256(reinterpret_cast<const __m256i*>(other));
  const __m256i pairs = _mm256_maddubs_epi16(magnitudes, _mm256_sign_epi8(block, signs));
  return _mm256_madd_epi16(pairs, _mm256_set1_epi16(1));
}

WITH_WIDE_INSTRUCTIONS int32_t wideInnerProduct(const int8_t* a, const int8_t* b,
                                                size_t length) noexcept {
  __m256i sums = _mm256_setzero_si256();
  for (size_t i = 0; i < length; i += LUXVectorBlock) {
    const __m256i block = _mm256_loadu_si256(reinterpret_cast<const __m256i*>(a + i));
    sums = _mm256_add_epi32(sums, blockProduct(_mm256_abs_epi8(block), block, b + i));
  }
  __m128i half = _mm_add_epi32(_mm256_castsi256_si128(sums), _mm256_extracti128_si256(sums, 1));
  half = _mm_add_epi32(half, _mm_shuffle_epi32(half, 0x4E));
  half = _mm_add_epi32(half, _mm_shuffle_epi32(half, 0xB1));
  return _mm_cvtsi128_si32(half);
}

// Four at a time: the vector is read once for all, and their sums are finished together.
WITH_WIDE_INSTRUCTIONS void wideInnerProducts(const int8_t* vector, const int8_t* const* others,
                                              size_t length, size_t count,
                                              int32_t* products) noexcept {
  size_t done = 0;
  for (; done + 4 <= count; done += 4) {
    const int8_t* const first = others[done];
    const int8_t* const second = others[done + 1];
    const int8_t* const third = others[done + 2];
    const int8_t* const fourth = others[done + 3];
    __m256i sums = _mm256_setzero_si256();
    __m256i secondSums = sums;
    __m256i thirdSums = sums;
    __m256i fourthSums = sums;
    for (size_t i = 0; i < length; i += LUXVectorBlock) {
      const __m256i block = _mm256_loadu_si256(reinterpret_cast<const __m256i*>(vector + i));
      const __m256i magnitudes = _mm256_abs_epi8(block);
      sums = _mm256_add_epi32(sums, blockProduct(magnitudes, block, first + i));
      secondSums = _mm256_add_epi32(secondSums, blockProduct(magnitudes, block, second + i));
      thirdSums = _mm256_add_epi32(thirdSums, blockProduct(magnitudes, block, third + i));
      fourthSums = _mm256_add_epi32(fourthSums, blockProduct(magnitudes, block, fourth + i));
    }
    const __m256i four = _mm256_hadd_epi32(_mm256_hadd_epi32(sums, secondSums),
                                           _mm256_hadd_epi32(thirdSums, fourthSums));
    _mm_storeu_si128(
        reinterpret_cast<__m128i*>(products + done),
        _mm_add_epi32(_mm256_castsi256_si128(four), _mm256_extracti128_si256(four, 1)));
  }
  for (; done < count; ++done) {
    products[done] = wideInnerProduct(vector, others[done], length);
  }
}

bool hasWideInstructions() noexcept {
  static const bool has = __builtin_cpu_supports("avx2") != 0;
  return has;
}

}  // namespace

int32_t LUXInnerProduct(const int8_t* a, const int8_t* b, size_t length) noexcept {
  return hasWideInstructions() ? wideInnerProduct(a, b, length)
                               : LUXPlainInnerProduct(a, b, length);
}

void LUXInnerProducts(const int8_t* vector, const int8_t* const* others, size_t length,
                      size_t count, int32_t* products) noexcept {
  (hasWideInstructions() ? wideInnerProducts : plainInnerProducts)(vector, others, length, count,
                                                                   products);
}

#else

int32_t LUXInnerProduct(const int8_t* a, const int8_t* b, size_t length) noexcept {
  return LUXPlainInnerProduct(a, b, length);
}

void LUXInnerProducts(const int8_t* vector, const int8_t* const* others, size_t length,
                      size_t count, int32_t* products) noexcept {
  plainInnerProducts(vector, others, length, count, products);
}

#endif

// Both ways of these multiply first and add then, each rounded, and so give the same.

#if defined(__SSE2__)

namespace {

// Sixteen small integers as four times four numbers.
struct Sixteen {
  explicit Sixteen(const int8_t* bytes) {
    const __m128i all = _mm_loadu_si128(reinterpret_cast<const __m128i*>(bytes));
    const __m128i zero = _mm_setzero_si128();
    // Moved to the upper half of wider integers and back, which repeats the sign.
    const __m128i low = _mm_srai_epi16(_mm_unpacklo_epi8(zero, all), 8);
    const __m128i high = _mm_srai_epi16(_mm_unpackhi_epi8(zero, all), 8);
    numbers[0] = _mm_cvtepi32_ps(_mm_srai_epi32(_mm_unpacklo_epi16(zero, low), 16));
    numbers[1] = _mm_cvtepi32_ps(_mm_srai_epi32(_mm_unpackhi_epi16(zero, low), 16));
    numbers[2] = _mm_cvtepi32_ps(_mm_srai_epi32(_mm_unpacklo_epi16(zero, high), 16));
    numbers[3] = _mm_cvtepi32_ps(_mm_srai_epi32(_mm_unpackhi_epi16(zero, high), 16));
  }

  __m128 numbers[4];
};

float largestMagnitude(const float* sum, size_t length) noexcept {
  const __m128 sign = _mm_set1_ps(-0.0F);
  __m128 largest = _mm_setzero_ps();
  for (size_t i = 0; i < length; i += 4) {
    // In this order the maximum with what is no number is the other one.
    largest = _mm_max_ps(_mm_andnot_ps(sign, _mm_loadu_ps(sum + i)), largest);
  }
  float lanes[4];
  _mm_storeu_ps(lanes, largest);
  return *std::max_element(lanes, lanes + 4);
}

__m128i roundedProducts(const float* sum, __m128 scale) noexcept {
  const __m128 scaled = _mm_mul_ps(_mm_loadu_ps(sum), scale);
  const __m128 half = _mm_or_ps(_mm_and_ps(scaled, _mm_set1_ps(-0.0F)), _mm_set1_ps(0.5F));
  const __m128 isNumber = _mm_cmpord_ps(scaled, scaled);
  return _mm_cvttps_epi32(_mm_and_ps(isNumber, _mm_add_ps(scaled, half)));
}

void quantizeBy(float scale, const float* sum, int8_t* vector, size_t length) noexcept {
  const __m128 four = _mm_set1_ps(scale);
  for (size_t i = 0; i < length; i += 16) {
    const __m128i low =
        _mm_packs_epi32(roundedProducts(sum + i, four), roundedProducts(sum + i + 4, four));
    const __m128i high =
        _mm_packs_epi32(roundedProducts(sum + i + 8, four), roundedProducts(sum + i + 12, four));
    _mm_storeu_si128(reinterpret_cast<__m128i*>(vector + i), _mm_packs_epi16(low, high));
  }
}

}  // namespace

void LUXAddScaled(float* sum, const int8_t* vector, float weight, size_t length) noexcept {
  const __m128 factor = _mm_set1_ps(weight);
  for (size_t i = 0; i < length; i += 16) {
    const Sixteen sixteen(vector + i);
    for (size_t part = 0; part < 4; ++part) {
      float* const four = sum + i + 4 * part;
      _mm_storeu_ps(four,
                    _mm_add_ps(_mm_loadu_ps(four), _mm_mul_ps(factor, sixteen.numbers[part])));
    }
  }
}

#else

namespace {

float largestMagnitude(const float* sum, size_t length) noexcept {
  float largest = 0;
  for (size_t i = 0; i < length; ++i) {
    largest = std::max(largest, std::fabs(sum[i]));
  }
  return largest;
}

void quantizeBy(float scale, const float* sum, int8_t* vector, size_t length) noexcept {
  for (size_t i = 0; i < length; ++i) {
    const float scaled = sum[i] * scale;
    const float rounded = scaled + (scaled < 0 ? -0.5F : 0.5F);
    vector[i] = static_cast<int8_t>(scaled == scaled ? static_cast<int>(rounded) : 0);
  }
}

}  // namespace

void LUXAddScaled(float* sum, const int8_t* vector, float weight, size_t length) noexcept {
  for (size_t i = 0; i < length; ++i) {
    sum[i] += weight * static_cast<float>(vector[i]);
  }
}

#endif

float LUXQuantize(const float* sum, int8_t* vector, size_t length) noexcept {
  const float largest = largestMagnitude(sum, length);
  if (!(largest > smallestSum && largest < largestSum)) {
    return 0;
  }
  quantizeBy(127 / largest, sum, vector, length);
  return 1 / std::sqrt(static_cast<float>(LUXInnerProduct(vector, vector, length)));
}
