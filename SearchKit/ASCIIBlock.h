// Up to 64 bytes of text at once: which are letters, and what they are folded to.
#pragma once

#include <cstddef>
#include <cstdint>
#include <cstring>

#if defined(__SSE2__)
#include <emmintrin.h>
#endif

namespace searchkit {

/// The words of a stretch of ASCII are the runs of ones in `letters`, and they stand in `folded`
/// already; nothing is looked at byte by byte. Thread-safety: confined to one thread.
struct ASCIIBlock {
  static constexpr size_t capacity = 64;
  /// Bytes after the last one that may be read, whatever they are.
  static constexpr size_t margin = 16;

  /// One bit a byte, the first being the lowest; zeros after the end.
  uint64_t letters;
  uint64_t beyondASCII;
  alignas(16) char folded[capacity + margin];

  /// `length` is from 1 to the capacity.
  void read(const uint8_t* bytes, size_t length) noexcept {
    if (length < capacity) {
      alignas(16) uint8_t padded[capacity] = {};
      std::memcpy(padded, bytes, length);
      _read(padded);
    } else {
      _read(bytes);
    }
  }

 private:
#if defined(__SSE2__)
  void _read(const uint8_t* bytes) noexcept {
    letters = 0;
    beyondASCII = 0;
    for (unsigned at = 0; at < capacity; at += 16) {
      const __m128i text = _mm_loadu_si128(reinterpret_cast<const __m128i*>(bytes + at));
      const __m128i caseBit = _mm_set1_epi8(0x20);
      // Letters, and only those, come to lie above a bound of signed bytes; so do digits.
      const __m128i isLetter =
          _mm_cmpgt_epi8(_mm_add_epi8(_mm_or_si128(text, caseBit), _mm_set1_epi8(127 - 'z')),
                         _mm_set1_epi8(127 - 26));
      const __m128i isDigit =
          _mm_cmpgt_epi8(_mm_add_epi8(text, _mm_set1_epi8(127 - '9')), _mm_set1_epi8(127 - 10));
      _mm_store_si128(reinterpret_cast<__m128i*>(folded + at),
                      _mm_or_si128(text, _mm_and_si128(isLetter, caseBit)));
      letters |= uint64_t{_mask(_mm_or_si128(isLetter, isDigit))} << at;
      beyondASCII |= uint64_t{_mask(text)} << at;
    }
  }

  static uint32_t _mask(__m128i bytes) noexcept {
    return static_cast<uint32_t>(_mm_movemask_epi8(bytes));
  }
#else
  void _read(const uint8_t* bytes) noexcept {
    letters = 0;
    beyondASCII = 0;
    for (unsigned at = 0; at < capacity; ++at) {
      const uint8_t byte = bytes[at];
      const bool isLetter = static_cast<uint8_t>((byte | 0x20) - 'a') < 26;
      const bool isDigit = static_cast<uint8_t>(byte - '0') < 10;
      folded[at] = static_cast<char>(isLetter ? byte | 0x20 : byte);
      letters |= uint64_t{isLetter || isDigit} << at;
      beyondASCII |= uint64_t{byte >= 0x80} << at;
    }
  }
#endif
};

}  // namespace searchkit
