// Versioned semantic index data: any bytes as the whole, any bytes with a header checksum that
// fits, and any bytes as the attributes.
#include <algorithm>
#include <cstdint>
#include <cstdlib>
#include <string>
#include <string_view>

#include "host/Luxwell/HelpLUXIndex.h"

namespace {

void require(bool condition) {
  if (!condition) {
    std::abort();
  }
}

void read(const platform::Data& data) {
  const auto index = HelpLUXIndex::initWithVersionedData(data);
  if (!index) {
    return;
  }
  const platform::Data written = index->versionedData();
  const auto again = HelpLUXIndex::initWithVersionedData(written);
  require(again && again->attributes() == index->attributes());
  require(again->versionedData() == written);
}

// The bytes with the checksum of header and table made right.
std::string sealed(std::string bytes) {
  if (bytes.size() < 32) {
    return bytes;
  }
  const size_t count = static_cast<unsigned char>(bytes[12]);
  const std::string checked =
      bytes.substr(0, 24) + bytes.substr(32, std::min(count * 32, bytes.size() - 32));
  uint32_t checksum = 0xFFFFFFFF;
  for (const char c : checked) {
    checksum ^= static_cast<unsigned char>(c);
    for (int bit = 0; bit < 8; ++bit) {
      checksum = (checksum >> 1U) ^ ((checksum & 1U) != 0 ? 0xEDB88320U : 0U);
    }
  }
  for (size_t i = 0; i < 4; ++i) {
    bytes[24 + i] = static_cast<char>(~checksum >> (8 * i));
  }
  return bytes;
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
  const std::string_view bytes(reinterpret_cast<const char*>(data), size);
  read(platform::Data::copy(bytes));
  read(platform::Data::adopt(sealed(std::string(bytes))));
  read(LUXSectionedData({LUXSection::sectionWithBytes(HelpLUXIndex::attributesSectionType,
                                                      platform::Data::copy(bytes))})
           .write());
  return 0;
}
