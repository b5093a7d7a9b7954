#include "SearchKit/Checksum.h"

#include <gtest/gtest.h>

#include <string_view>
#include <vector>

namespace searchkit {
namespace {

std::span<const uint8_t> bytesOf(std::string_view text) {
  return {reinterpret_cast<const uint8_t*>(text.data()), text.size()};
}

// The values of RFC 3720, appendix B.4, and the customary check value.
TEST(Checksum, hasThePublishedValues) {
  EXPECT_EQ(crc32c({}), 0U);
  EXPECT_EQ(crc32c(bytesOf("123456789")), 0xE3069283U);
  EXPECT_EQ(crc32c(std::vector<uint8_t>(32, 0x00)), 0x8A9136AAU);
  EXPECT_EQ(crc32c(std::vector<uint8_t>(32, 0xFF)), 0x62A8AB43U);
}

TEST(Checksum, ofPartsContinuesTheOneBefore) {
  const std::string_view text = "The same bytes in two parts of any length give the same number.";
  for (size_t cut = 0; cut <= text.size(); ++cut) {
    EXPECT_EQ(crc32c(bytesOf(text.substr(cut)), crc32c(bytesOf(text.substr(0, cut)))),
              crc32c(bytesOf(text)));
  }
}

TEST(Checksum, isTheSameByTableAndByInstruction) {
  std::vector<uint8_t> bytes;
  for (int i = 0; i < 100; ++i) {
    bytes.push_back(static_cast<uint8_t>(i * 37));
    EXPECT_EQ(crc32c(bytes, 77), crc32cByTable(bytes, 77));
  }
  EXPECT_EQ(crc32cByTable(bytesOf("123456789")), 0xE3069283U);
}

}  // namespace
}  // namespace searchkit
