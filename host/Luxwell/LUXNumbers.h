// Numbers in the bytes of the semantic formats.
#pragma once

#include <cstddef>
#include <cstdint>
#include <string>

namespace luxnumbers {

inline void appendUInt32(std::string& out, uint32_t value) {
  for (int shift = 0; shift < 32; shift += 8) {
    out.push_back(static_cast<char>((value >> shift) & 0xFFU));
  }
}

/// Little-endian, of any alignment.
inline uint32_t readUInt32(const uint8_t* bytes) noexcept {
  return static_cast<uint32_t>(bytes[0]) | static_cast<uint32_t>(bytes[1]) << 8U |
         static_cast<uint32_t>(bytes[2]) << 16U | static_cast<uint32_t>(bytes[3]) << 24U;
}

/// Seven bits a byte, lowest first; the high bit is set in all bytes but the last.
inline void appendVarnumber(std::string& out, uint64_t value) {
  while (value >= 0x80) {
    out.push_back(static_cast<char>((value & 0x7FU) | 0x80U));
    value >>= 7U;
  }
  out.push_back(static_cast<char>(value));
}

/// Reads a number of up to 35 bits at `at`, which moves on. False, with `at` anywhere up to the
/// end, for bytes that end too early or a number that is longer.
inline bool readVarnumber(const uint8_t*& at, const uint8_t* end, uint64_t& value) noexcept {
  value = 0;
  for (unsigned shift = 0; shift < 35 && at < end; shift += 7) {
    const uint8_t byte = *at++;
    value |= static_cast<uint64_t>(byte & 0x7FU) << shift;
    if (byte < 0x80) {
      return true;
    }
  }
  return false;
}

}  // namespace luxnumbers
