#include "host/Luxwell/LUXSectionedData.h"

#include <algorithm>
#include <array>
#include <cstring>
#include <string>
#include <string_view>
#include <utility>

#include "platform/Exception.h"

namespace {

constexpr size_t headerLength = 32;
constexpr size_t checkedHeaderLength = 24;
constexpr size_t entryLength = 32;
constexpr size_t alignment = 8;

using ChecksumTables = std::array<std::array<uint32_t, 256>, 8>;

constexpr ChecksumTables makeChecksumTables() {
  ChecksumTables tables{};
  for (uint32_t i = 0; i < 256; ++i) {
    uint32_t value = i;
    for (int bit = 0; bit < 8; ++bit) {
      value = (value & 1) != 0 ? (value >> 1) ^ 0xEDB88320U : value >> 1;
    }
    tables[0][i] = value;
  }
  for (size_t ahead = 1; ahead < tables.size(); ++ahead) {
    for (size_t i = 0; i < 256; ++i) {
      const uint32_t value = tables[ahead - 1][i];
      tables[ahead][i] = (value >> 8) ^ tables[0][value & 0xFF];
    }
  }
  return tables;
}

constexpr ChecksumTables checksumTables = makeChecksumTables();

// CRC-32 as in IEEE 802.3, eight bytes at a time (M. Kounavis, F. Berry, "A systematic approach to
// building high performance software-based CRC generators", 2005): models have many bytes.
// `former` continues an earlier stretch.
uint32_t checksumOf(const uint8_t* bytes, size_t length, uint32_t former = 0) noexcept {
  const ChecksumTables& tables = checksumTables;
  uint32_t value = ~former;
  for (; length >= 8; bytes += 8, length -= 8) {
    uint64_t word = 0;
    for (unsigned i = 0; i < 8; ++i) {
      word |= static_cast<uint64_t>(bytes[i]) << (8 * i);
    }
    word ^= value;
    value = 0;
    for (unsigned i = 0; i < 8; ++i) {
      value ^= tables[7 - i][(word >> (8 * i)) & 0xFF];
    }
  }
  for (size_t i = 0; i < length; ++i) {
    value = tables[0][(value ^ bytes[i]) & 0xFF] ^ (value >> 8);
  }
  return ~value;
}

// Little-endian, of any alignment.
template <typename Integer>
Integer readInteger(const uint8_t* bytes) noexcept {
  uint64_t value = 0;
  for (size_t i = 0; i < sizeof(Integer); ++i) {
    value |= static_cast<uint64_t>(bytes[i]) << (8 * i);
  }
  return static_cast<Integer>(value);
}

template <typename Integer>
void appendInteger(std::string& out, Integer value) {
  for (size_t i = 0; i < sizeof(Integer); ++i) {
    out.push_back(static_cast<char>((static_cast<uint64_t>(value) >> (8 * i)) & 0xFF));
  }
}

const uint8_t* bytesOf(const std::string& string) noexcept {
  return reinterpret_cast<const uint8_t*>(string.data());
}

uint64_t aligned(uint64_t offset) noexcept {
  return (offset + alignment - 1) / alignment * alignment;
}

struct Extent {
  uint64_t offset;
  uint64_t length;
};

// Whether two sections share bytes. Sections of no bytes share none.
bool anyOverlap(std::vector<Extent> extents) {
  std::erase_if(extents, [](const Extent& extent) { return extent.length == 0; });
  std::sort(extents.begin(), extents.end(),
            [](const Extent& a, const Extent& b) { return a.offset < b.offset; });
  for (size_t i = 1; i < extents.size(); ++i) {
    if (extents[i - 1].offset + extents[i - 1].length > extents[i].offset) {
      return true;
    }
  }
  return false;
}

}  // namespace

LUXSection LUXSection::sectionWithBytes(uint32_t type, platform::Data bytes) {
  const uint32_t checksum = checksumOf(bytes.bytes(), bytes.length());
  return {type, checksum, std::move(bytes)};
}

bool LUXSection::checksumMatches() const noexcept {
  return checksumOf(bytes.bytes(), bytes.length()) == checksum;
}

LUXSectionedData::LUXSectionedData(std::vector<LUXSection> sections, const LUXContainerForm& form)
    : _form(form), _sections(std::move(sections)) {
  if (_sections.size() > maximumSectionCount) {
    throw platform::Exception(platform::invalidArgumentException, "too many sections");
  }
  std::sort(_sections.begin(), _sections.end(),
            [](const LUXSection& a, const LUXSection& b) { return a.type < b.type; });
  const auto twice =
      std::adjacent_find(_sections.begin(), _sections.end(),
                         [](const LUXSection& a, const LUXSection& b) { return a.type == b.type; });
  if (twice != _sections.end()) {
    throw platform::Exception(platform::invalidArgumentException,
                              "section type " + std::to_string(twice->type) + " occurs twice");
  }
}

std::optional<LUXSectionedData> LUXSectionedData::read(const platform::Data& data,
                                                       const LUXContainerForm& form) {
  if (data.length() < headerLength || !data.view().starts_with(form.magic)) {
    return std::nullopt;
  }
  const uint8_t* bytes = data.bytes();
  LUXSectionedData result(form);
  result._form.minorVersion = readInteger<uint16_t>(bytes + 10);
  const auto count = readInteger<uint32_t>(bytes + 12);
  if (readInteger<uint16_t>(bytes + 8) != form.majorVersion || count > maximumSectionCount ||
      readInteger<uint64_t>(bytes + 16) != data.length()) {
    return std::nullopt;
  }
  const size_t tableEnd = headerLength + count * entryLength;
  if (tableEnd > data.length()) {
    return std::nullopt;
  }
  const uint32_t headerChecksum = checksumOf(bytes, checkedHeaderLength);
  if (checksumOf(bytes + headerLength, count * entryLength, headerChecksum) !=
      readInteger<uint32_t>(bytes + checkedHeaderLength)) {
    return std::nullopt;
  }
  std::vector<Extent> extents;
  for (size_t i = 0; i < count; ++i) {
    const uint8_t* entry = bytes + headerLength + i * entryLength;
    const Extent extent{readInteger<uint64_t>(entry + 8), readInteger<uint64_t>(entry + 16)};
    const auto type = readInteger<uint32_t>(entry);
    if (extent.offset < tableEnd || extent.offset > data.length() ||
        extent.length > data.length() - extent.offset || extent.offset % alignment != 0 ||
        (!result._sections.empty() && result._sections.back().type >= type)) {
      return std::nullopt;
    }
    result._sections.push_back(
        {type, readInteger<uint32_t>(entry + 4), data.slice(extent.offset, extent.length)});
    extents.push_back(extent);
  }
  if (anyOverlap(std::move(extents))) {
    return std::nullopt;
  }
  return result;
}

const LUXSection* LUXSectionedData::sectionWithType(uint32_t type) const noexcept {
  for (const LUXSection& section : _sections) {
    if (section.type == type) {
      return &section;
    }
  }
  return nullptr;
}

platform::Data LUXSectionedData::write() const {
  uint64_t end = headerLength + _sections.size() * entryLength;
  std::string table;
  for (const LUXSection& section : _sections) {
    const uint64_t offset = aligned(end);
    appendInteger(table, section.type);
    appendInteger(table, section.checksum);
    appendInteger(table, offset);
    appendInteger(table, static_cast<uint64_t>(section.bytes.length()));
    appendInteger(table, uint64_t{0});
    end = offset + section.bytes.length();
  }
  std::string out{_form.magic};
  out.reserve(end);
  appendInteger(out, _form.majorVersion);
  appendInteger(out, _form.minorVersion);
  appendInteger(out, static_cast<uint32_t>(_sections.size()));
  appendInteger(out, end);
  const uint32_t headerChecksum = checksumOf(bytesOf(out), out.size());
  appendInteger(out, checksumOf(bytesOf(table), table.size(), headerChecksum));
  appendInteger(out, uint32_t{0});
  out += table;
  for (const LUXSection& section : _sections) {
    out.resize(aligned(out.size()), '\0');
    out.append(section.bytes.view());
  }
  return platform::Data::adopt(std::move(out));
}
