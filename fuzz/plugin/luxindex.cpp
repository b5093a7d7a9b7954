// Versioned semantic index data: any bytes as the whole, any bytes with checksums that fit, and any
// bytes as the attributes or as the tokens.
#include <algorithm>
#include <cstdint>
#include <cstdlib>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

#include "host/Luxwell/HelpLUXIndex.h"
#include "platform/PropertyList.h"
#include "platform/Strings.h"

namespace {

void require(bool condition) {
  if (!condition) {
    std::abort();
  }
}

// Whatever is delivered must be text that can be written again.
void readPages(const HelpLUXIndex& index) {
  std::string before;
  bool isFirst = true;
  // The table lives as long as the counts of the page before.
  LUXTokenCounts counts;
  size_t pages = 0;
  for (const std::string& key : index.documentKeys()) {
    require(platform::isValidUTF8(key) && (isFirst || before < key));
    isFirst = false;
    before = key;
    if (++pages > 100) {
      break;
    }
    counts = index.tokenCountsForKey(key);
    for (size_t i = 0; i < counts.size(); ++i) {
      const LUXTokenCount count = counts[i];
      require(!count.token.empty() && platform::isValidUTF8(count.token));
      require(i == 0 || counts.tokenNumber(i - 1) < counts.tokenNumber(i));
    }
    const platform::Value properties = index.fileProperitesForKey(key);
    require(properties.dictionaryIf() != nullptr);
    platform::dataFromPropertyList(properties, platform::PropertyListFormat::binary);
  }
}

// Everything as it is, but with the checksums of the sections made right.
platform::Data withRightSections(const LUXSectionedData& data) {
  std::vector<LUXSection> sections;
  for (const LUXSection& section : data.sections()) {
    sections.push_back(LUXSection::sectionWithBytes(section.type, section.bytes));
  }
  return LUXSectionedData(std::move(sections)).write();
}

void read(const platform::Data& data) {
  const auto index = HelpLUXIndex::initWithVersionedData(data);
  if (!index) {
    return;
  }
  readPages(*index);
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
  const platform::Data whole = platform::Data::adopt(sealed(std::string(bytes)));
  read(whole);
  if (const auto sections = LUXSectionedData::read(whole)) {
    read(withRightSections(*sections));
  }
  if (const auto table = LUXTokenTable::withSectionBytes(platform::Data::copy(bytes))) {
    const auto again = LUXTokenTable::withSectionBytes(table->sectionBytes());
    require(again != nullptr && again->size() == table->size());
    require(again->sectionBytes() == table->sectionBytes());
  }
  read(LUXSectionedData({LUXSection::sectionWithBytes(HelpLUXIndex::attributesSectionType,
                                                      platform::Data::copy(bytes))})
           .write());
  return 0;
}
