// Scores in groups of sixteen, of which most can be passed over together.
#pragma once

#include <algorithm>
#include <cstddef>
#include <cstdint>
#include <limits>

#if defined(__SSE2__)
#include <emmintrin.h>
#endif

namespace luxscoring {

inline constexpr size_t groupLength = 16;

/// The highest score of each group, and of all. `groupCount` is a multiple of 4, and no score is
/// NaN.
inline float findGroupMaxima(const float* scores, size_t groupCount, float* maxima) noexcept {
#if defined(__SSE2__)
  __m128 highest = _mm_set1_ps(-std::numeric_limits<float>::infinity());
  for (size_t group = 0; group < groupCount; group += 4) {
    __m128 rows[4];
    for (__m128& row : rows) {
      row = _mm_max_ps(_mm_max_ps(_mm_loadu_ps(scores), _mm_loadu_ps(scores + 4)),
                       _mm_max_ps(_mm_loadu_ps(scores + 8), _mm_loadu_ps(scores + 12)));
      scores += groupLength;
    }
    _MM_TRANSPOSE4_PS(rows[0], rows[1], rows[2], rows[3]);
    const __m128 four = _mm_max_ps(_mm_max_ps(rows[0], rows[1]), _mm_max_ps(rows[2], rows[3]));
    _mm_storeu_ps(maxima + group, four);
    highest = _mm_max_ps(highest, four);
  }
  float lanes[4];
  _mm_storeu_ps(lanes, highest);
  return *std::max_element(lanes, lanes + 4);
#else
  float highest = -std::numeric_limits<float>::infinity();
  for (size_t group = 0; group < groupCount; ++group, scores += groupLength) {
    maxima[group] = *std::max_element(scores, scores + groupLength);
    highest = std::max(highest, maxima[group]);
  }
  return highest;
#endif
}

/// One bit for each score of a group, set for those of at least `least`.
inline uint32_t scoresReaching(const float* scores, float least) noexcept {
#if defined(__SSE2__)
  const __m128 lower = _mm_set1_ps(least);
  const auto four = [lower](const float* place) {
    return _mm_castps_si128(_mm_cmpge_ps(_mm_loadu_ps(place), lower));
  };
  return static_cast<uint32_t>(
      _mm_movemask_epi8(_mm_packs_epi16(_mm_packs_epi32(four(scores), four(scores + 4)),
                                        _mm_packs_epi32(four(scores + 8), four(scores + 12)))));
#else
  uint32_t bits = 0;
  for (uint32_t i = 0; i < groupLength; ++i) {
    bits |= (scores[i] >= least ? 1U : 0U) << i;
  }
  return bits;
#endif
}

/// The same for four groups at once, whose highest scores `maxima` are.
inline uint64_t scoresReachingInFourGroups(const float* scores, const float* maxima,
                                           float least) noexcept {
#if defined(__SSE2__)
  if (_mm_movemask_ps(_mm_cmpge_ps(_mm_loadu_ps(maxima), _mm_set1_ps(least))) == 0) {
    return 0;
  }
#else
  if (*std::max_element(maxima, maxima + 4) < least) {
    return 0;
  }
#endif
  const auto bits = [scores, least](size_t group) {
    return static_cast<uint64_t>(scoresReaching(scores + group * groupLength, least))
           << (group * groupLength);
  };
  return bits(0) | bits(1) | bits(2) | bits(3);
}

}  // namespace luxscoring
