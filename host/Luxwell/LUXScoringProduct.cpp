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

#if defined(__x86_64__)

namespace {

// One instruction multiplies unsigned by signed bytes and adds pairs, so the sign of `a` moves to
// `b`. A pair stays within 2 * 127 * 127, which sixteen bits hold.
__attribute__((target("avx2"))) int32_t wideInnerProduct(const int8_t* a, const int8_t* b,
                                                         size_t length) noexcept {
  const __m256i ones = _mm256_set1_epi16(1);
  __m256i sums = _mm256_setzero_si256();
  for (size_t i = 0; i < length; i += LUXVectorBlock) {
    const __m256i left = _mm256_loadu_si256(reinterpret_cast<const __m256i*>(a + i));
    const __m256i right = _mm256_loadu_si256(reinterpret_cast<const __m256i*>(b + i));
    const __m256i pairs =
        _mm256_maddubs_epi16(_mm256_abs_epi8(left), _mm256_sign_epi8(right, left));
    sums = _mm256_add_epi32(sums, _mm256_madd_epi16(pairs, ones));
  }
  __m128i half = _mm_add_epi32(_mm256_castsi256_si128(sums), _mm256_extracti128_si256(sums, 1));
  half = _mm_add_epi32(half, _mm_shuffle_epi32(half, 0x4E));
  half = _mm_add_epi32(half, _mm_shuffle_epi32(half, 0xB1));
  return _mm_cvtsi128_si32(half);
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

#else

int32_t LUXInnerProduct(const int8_t* a, const int8_t* b, size_t length) noexcept {
  return LUXPlainInnerProduct(a, b, length);
}

#endif
