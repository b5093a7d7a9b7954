#include "host/Luxwell/LUXIndexCheck.h"

#include <fmt/format.h>

#include <cstdint>
#include <memory>
#include <optional>
#include <string_view>
#include <utility>

#include "host/Luxwell/HelpLUXIndex.h"
#include "host/Luxwell/LUXNumbers.h"
#include "host/Luxwell/LUXRecords.h"
#include "host/Luxwell/LUXSectionedData.h"
#include "host/Luxwell/LUXTokenCounts.h"
#include "platform/Strings.h"

using luxnumbers::readVarnumber;

namespace {

class Check {
 public:
  explicit Check(size_t maximumCount) : _maximumCount(maximumCount) {}

  void run(const platform::Data& data) {
    const std::optional<LUXSectionedData> sections = LUXSectionedData::read(data);
    if (!sections) {
      _add("header, table or length are wrong");
      return;
    }
    for (const LUXSection& section : sections->sections()) {
      if (!section.checksumMatches()) {
        _add("the checksum of section {} is wrong", section.type);
      }
    }
    if (_problems.empty() && HelpLUXIndex::initWithVersionedData(data) == nullptr) {
      _add("the attributes are no property list of a dictionary");
    }
    const std::optional<LUXRecords> keys = _records(*sections, HelpLUXIndex::keysSectionType);
    if (keys) {
      _checkKeys(*keys);
    }
    const size_t count = keys ? keys->count() : 0;
    if (const auto records = _records(*sections, HelpLUXIndex::propertiesSectionType, count)) {
      for (size_t i = 0; i < records->count(); ++i) {
        _checkProperties(i, (*records)[i]);
      }
    }
    _checkTokens(*sections, count);
  }

  std::vector<std::string> take() { return std::move(_problems); }

 private:
  template <typename... Arguments>
  void _add(fmt::format_string<Arguments...> format, Arguments&&... arguments) {
    if (_problems.size() < _maximumCount) {
      _problems.push_back(fmt::format(format, std::forward<Arguments>(arguments)...));
    }
  }

  /// Absent where there is no such section, or it is no list of records.
  std::optional<LUXRecords> _records(const LUXSectionedData& sections, uint32_t type) {
    const LUXSection* const section = sections.sectionWithType(type);
    if (section == nullptr) {
      return std::nullopt;
    }
    LUXRecords records(section->bytes);
    // Four zeros and one offset are a list of no records, and the only one.
    if (records.count() == 0 && section->bytes.view() != std::string_view("\0\0\0\0\0\0\0\0", 8)) {
      _add("section {} is no list of records", type);
      return std::nullopt;
    }
    return records;
  }

  std::optional<LUXRecords> _records(const LUXSectionedData& sections, uint32_t type,
                                     size_t count) {
    std::optional<LUXRecords> records = _records(sections, type);
    if (records && records->count() != count) {
      _add("section {} has {} records for {} pages", type, records->count(), count);
      return std::nullopt;
    }
    return records;
  }

  void _checkKeys(const LUXRecords& keys) {
    for (size_t i = 0; i < keys.count(); ++i) {
      if (!platform::isValidUTF8(keys[i])) {
        _add("page {}: its key is not UTF-8", i);
      }
      if (i > 0 && keys[i - 1] >= keys[i]) {
        _add("page {}: its key is not above that of the page before", i);
      }
    }
  }

  void _checkProperties(size_t page, std::string_view record) {
    const auto* at = reinterpret_cast<const uint8_t*>(record.data());
    const uint8_t* const begin = at;
    const uint8_t* const end = at + record.size();
    uint64_t flags = 0;
    uint64_t titleLength = 0;
    if (!readVarnumber(at, end, flags) || !readVarnumber(at, end, titleLength) ||
        titleLength > static_cast<uint64_t>(end - at)) {
      _add("page {}: its properties are broken", page);
      return;
    }
    const std::string_view texts = record.substr(static_cast<size_t>(at - begin));
    if (titleLength == 0) {
      _add("page {}: it has no title", page);
    }
    if (!platform::isValidUTF8(texts.substr(0, titleLength)) ||
        !platform::isValidUTF8(texts.substr(titleLength))) {
      _add("page {}: its title or description is not UTF-8", page);
    }
  }

  void _checkTokens(const LUXSectionedData& sections, size_t count) {
    const LUXSection* const section = sections.sectionWithType(HelpLUXIndex::tokensSectionType);
    const auto table =
        section == nullptr ? nullptr : LUXTokenTable::withSectionBytes(section->bytes);
    if (section != nullptr && table == nullptr) {
      _add("the tokens are broken");
    }
    const auto counts = _records(sections, HelpLUXIndex::countsSectionType, count);
    const auto places = _records(sections, HelpLUXIndex::placesSectionType, count);
    if (table == nullptr || !counts) {
      return;
    }
    for (size_t i = 0; i < counts->count(); ++i) {
      const std::optional<size_t> withPlace = _checkCounts((*counts)[i], *table);
      if (!withPlace) {
        _add("page {}: its counts are broken", i);
      } else if (places && (*places)[i].size() != *withPlace) {
        _add("page {}: its places are not those of its tokens", i);
      }
    }
  }

  /// How many of the tokens have a place; absent for bytes that are no counts.
  static std::optional<size_t> _checkCounts(std::string_view record, const LUXTokenTable& table) {
    const auto* at = reinterpret_cast<const uint8_t*>(record.data());
    const uint8_t* const end = at + record.size();
    const uint32_t firstWithoutPlace = table.startOfKind(LUXTokenKind::phrase);
    size_t withPlace = 0;
    uint64_t next = 0;
    while (at < end) {
      uint64_t head = 0;
      uint64_t title = 0;
      uint64_t body = 1;
      if (!readVarnumber(at, end, head) ||
          ((head & 1U) != 0 && (!readVarnumber(at, end, title) || !readVarnumber(at, end, body)))) {
        return std::nullopt;
      }
      const uint64_t number = next + (head >> 1U);
      if (number >= table.size() || title > UINT32_MAX || body > UINT32_MAX || title + body == 0) {
        return std::nullopt;
      }
      withPlace += number < firstWithoutPlace ? 1 : 0;
      next = number + 1;
    }
    return withPlace;
  }

  const size_t _maximumCount;
  std::vector<std::string> _problems;
};

}  // namespace

std::vector<std::string> LUXIndexProblems(const platform::Data& data, size_t maximumCount) {
  Check check(maximumCount);
  check.run(data);
  return check.take();
}
