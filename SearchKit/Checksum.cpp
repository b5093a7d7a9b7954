#include "SearchKit/Checksum.h"

#include <array>
#include <cstddef>
#include <cstring>

namespace searchkit {
namespace {

constexpr uint32_t polynomial = 0x82F63B78;

using Table = std::array<std::array<uint32_t, 256>, 8>;

// table[k][b] is the checksum of the byte b followed by k zero bytes, so that eight bytes are
// taken at a time (M. E. Kounavis, F. L. Berry, "A Systematic Approach to Building High
// Performance Software-based CRC Generators", 2005).
constexpr Table makeTable() {
  Table table{};
  for (uint32_t byte = 0; byte < 256; ++byte) {
    uint32_t value = byte;
    for (int bit = 0; bit < 8; ++bit) {
      value = (value >> 1) ^ ((value & 1) != 0 ? polynomial : 0);
    }
    table[0][byte] = value;
  }
  for (size_t zeros = 1; zeros < table.size(); ++zeros) {
    for (size_t byte = 0; byte < 256; ++byte) {
      const uint32_t before = table[zeros - 1][byte];
      table[zeros][byte] = (before >> 8) ^ table[0][before & 0xFF];
    }
  }
  return table;
}

constexpr Table table = makeTable();

#if defined(__x86_64__)
// The processor's own instruction is for this very polynomial.
[[gnu::target("sse4.2")]] uint32_t byInstruction(const uint8_t* at, size_t length,
                                                 uint32_t value) noexcept {
  uint64_t wide = value;
  for (; length >= 8; at += 8, length -= 8) {
    uint64_t word;
    std::memcpy(&word, at, 8);
    wide = __builtin_ia32_crc32di(wide, word);
  }
  value = static_cast<uint32_t>(wide);
  for (; length > 0; --length) {
    value = __builtin_ia32_crc32qi(value, *at++);
  }
  return value;
}

const bool hasInstruction = __builtin_cpu_supports("sse4.2") != 0;
#endif

uint32_t byTable(const uint8_t* at, size_t length, uint32_t value) noexcept {
  while (length >= 8) {
    uint32_t low;
    uint32_t high;
    std::memcpy(&low, at, 4);
    std::memcpy(&high, at + 4, 4);
    low ^= value;
    value = table[7][low & 0xFF] ^ table[6][(low >> 8) & 0xFF] ^ table[5][(low >> 16) & 0xFF] ^
            table[4][low >> 24] ^ table[3][high & 0xFF] ^ table[2][(high >> 8) & 0xFF] ^
            table[1][(high >> 16) & 0xFF] ^ table[0][high >> 24];
    at += 8;
    length -= 8;
  }
  while (length-- > 0) {
    value = (value >> 8) ^ table[0][(value ^ *at++) & 0xFF];
  }
  return value;
}

}  // namespace

uint32_t crc32c(std::span<const uint8_t> bytes, uint32_t checksum) noexcept {
#if defined(__x86_64__)
  if (hasInstruction) {
    return ~byInstruction(bytes.data(), bytes.size(), ~checksum);
  }
#endif
  return ~byTable(bytes.data(), bytes.size(), ~checksum);
}

uint32_t crc32cByTable(std::span<const uint8_t> bytes, uint32_t checksum) noexcept {
  return ~byTable(bytes.data(), bytes.size(), ~checksum);
}

}  // namespace searchkit
