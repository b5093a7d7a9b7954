// CRC-32C, the checksum of the index's sections.
#pragma once

#include <cstdint>
#include <span>

namespace searchkit {

/// The CRC-32C (Castagnoli polynomial, reflected, as in RFC 3720 appendix B.4) of the bytes that
/// `checksum` stands for, with `bytes` after them. Thread-safety: may be called from any thread.
uint32_t crc32c(std::span<const uint8_t> bytes, uint32_t checksum = 0) noexcept;

/// The same where the processor has no instruction for it. For comparison.
uint32_t crc32cByTable(std::span<const uint8_t> bytes, uint32_t checksum = 0) noexcept;

}  // namespace searchkit
