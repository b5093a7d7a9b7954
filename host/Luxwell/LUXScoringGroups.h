// Scores in groups of sixteen, of which most can be passed over together.
#pragma once

#include <algorithm>
#include <cstddef>
#include <cstdint>

#if defined(__SSE2__)
#include <emmintrin.h>
#endif

namespace luxscoring {

inline constexpr size_t groupLength = 16;

/// The highest score of each group. `groupCount` is a multiple of 4, and no score is NaN.
inline void findGroupMaxima(const float* scores, size_t groupCount, float* maxima) noexcept {
#if defined(__SSE2__)
  for (size_t group = 0; group < groupCount; group += 4) {
    __m128 rows[4];
    for (__m128& row : rows) {
      row = _mm_max_ps(_mm_max_ps(_mm_loadu_ps(scores), _mm_loadu_ps(scores + 4)),
                       _mm_max_ps(_mm_loadu_ps(scores + 8), _mm_loadu_ps(scores + 12)));
      scores += groupLength;
    }
    _MM_TRANSPOSE4_PS(rows[0], rows[1], rows[2], rows[3]);
    _mm_storeu_ps(maxima + group,
                  _mm_max_ps(_mm_max_ps(rows[0], rows[1]), _mm_max_ps(rows[2], rows[3])));
  }
#else
  for (size_t group = 0; group < groupCount; ++group, scores += groupLength) {
    maxima[group] = *std::max_element(scores, scores + groupLength);
  }
#endif
}

/// One bit for each score of a group, set for those from `least` to below `end`.
inline uint32_t scoresWithin(const float* scores, float least, float end) noexcept {
  uint32_t bits = 0;
#if defined(__SSE2__)
  const __m128 lower = _mm_set1_ps(least);
  const __m128 upper = _mm_set1_ps(end);
  for (uint32_t i = 0; i < groupLength; i += 4) {
    const __m128 four = _mm_loadu_ps(scores + i);
    const __m128 within = _mm_and_ps(_mm_cmpge_ps(four, lower), _mm_cmplt_ps(four, upper));
    bits |= static_cast<uint32_t>(_mm_movemask_ps(within)) << i;
  }
#else
  for (uint32_t i = 0; i < groupLength; ++i) {
    bits |= (scores[i] >= least && scores[i] < end ? 1U : 0U) << i;
  }
#endif
  return bits;
}

}  // namespace luxscoring
