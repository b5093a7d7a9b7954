#include "host/Luxwell/LUXScoringProduct.h"

#if defined(__x86_64__)
#include <immintrin.h>
#endif

int32_t LUXPlainInnerProduct(const int8_t* a, const int8_t* b, size_t length) noexcept {
  int32_t sum = 0;
  for (size_t i = 0; i < length; ++i) {
    sum += static_cast<int32_t>(a[i]) * b[i];
  }
  return sum;
}

void LUXPlainInnerProducts(const int8_t* vector, const int8_t* others, size_t length, size_t count,
                           int32_t* products) noexcept {
  for (size_t i = 0; i < count; ++i) {
    products[i] = LUXPlainInnerProduct(vector, others + i * length, length);
  }
}

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
WITH_WIDE_INSTRUCTIONS void wideInnerProducts(const int8_t* vector, const int8_t* others,
                                              size_t length, size_t count,
                                              int32_t* products) noexcept {
  size_t done = 0;
  for (; done + 4 <= count; done += 4) {
    const int8_t* const other = others + done * length;
    __m256i sums[4] = {_mm256_setzero_si256(), _mm256_setzero_si256(), _mm256_setzero_si256(),
                       _mm256_setzero_si256()};
    for (size_t i = 0; i < length; i += LUXVectorBlock) {
      const __m256i block = _mm256_loadu_si256(reinterpret_cast<const __m256i*>(vector + i));
      const __m256i magnitudes = _mm256_abs_epi8(block);
      for (size_t row = 0; row < 4; ++row) {
        sums[row] =
            _mm256_add_epi32(sums[row], blockProduct(magnitudes, block, other + row * length + i));
      }
    }
    const __m256i four =
        _mm256_hadd_epi32(_mm256_hadd_epi32(sums[0], sums[1]), _mm256_hadd_epi32(sums[2], sums[3]));
    _mm_storeu_si128(
        reinterpret_cast<__m128i*>(products + done),
        _mm_add_epi32(_mm256_castsi256_si128(four), _mm256_extracti128_si256(four, 1)));
  }
  for (; done < count; ++done) {
    products[done] = wideInnerProduct(vector, others + done * length, length);
  }
}

bool hasWideInstructions() noexcept {
  static const bool has = __builtin_cpu_supports("avx2") != 0;
  return has;
}

}  // namespace

LUXInnerProductFunction LUXFastestInnerProduct() noexcept {
  return hasWideInstructions() ? wideInnerProduct : LUXPlainInnerProduct;
}

void LUXInnerProducts(const int8_t* vector, const int8_t* others, size_t length, size_t count,
                      int32_t* products) noexcept {
  if (hasWideInstructions()) {
    wideInnerProducts(vector, others, length, count, products);
  } else {
    LUXPlainInnerProducts(vector, others, length, count, products);
  }
}

#else

void LUXInnerProducts(const int8_t* vector, const int8_t* others, size_t length, size_t count,
                      int32_t* products) noexcept {
  LUXPlainInnerProducts(vector, others, length, count, products);
}

LUXInnerProductFunction LUXFastestInnerProduct() noexcept { return LUXPlainInnerProduct; }

#endif

int32_t LUXInnerProduct(const int8_t* a, const int8_t* b, size_t length) noexcept {
  return LUXFastestInnerProduct()(a, b, length);
}
