#include "host/Luxwell/HelpLUXIndex.h"

#include <algorithm>
#include <mutex>
#include <optional>
#include <utility>

#include "host/Luxwell/LUXNumbers.h"
#include "host/Luxwell/LUXRecords.h"
#include "platform/Exception.h"
#include "platform/PropertyList.h"
#include "platform/Strings.h"
#include "platform/ThreadSafety.h"

using luxnumbers::readVarnumber;

namespace {

LUXRecords recordsOfSection(const LUXSectionedData& sections, uint32_t type) {
  const LUXSection* section = sections.sectionWithType(type);
  return section != nullptr && section->checksumMatches() ? LUXRecords(section->bytes)
                                                          : LUXRecords();
}

const uint8_t* bytesOf(std::string_view view) noexcept {
  return reinterpret_cast<const uint8_t*>(view.data());
}

// The counts of one page; absent for bytes that are none.
std::optional<std::vector<LUXTokenCounts::Entry>> entriesOfRecord(std::string_view record,
                                                                  size_t tokenCount) {
  std::vector<LUXTokenCounts::Entry> entries;
  const uint8_t* at = bytesOf(record);
  const uint8_t* const end = at + record.size();
  uint64_t next = 0;
  while (at < end) {
    uint64_t head = 0;
    uint64_t title = 0;
    uint64_t body = 1;
    if (!readVarnumber(at, end, head)) {
      return std::nullopt;
    }
    if ((head & 1U) != 0 && (!readVarnumber(at, end, title) || !readVarnumber(at, end, body))) {
      return std::nullopt;
    }
    const uint64_t number = next + (head >> 1U);
    if (number >= tokenCount || title > UINT32_MAX || body > UINT32_MAX) {
      return std::nullopt;
    }
    entries.push_back({static_cast<uint32_t>(number), static_cast<uint32_t>(title),
                       static_cast<uint32_t>(body), LUXTokenCount::farDown});
    next = number + 1;
  }
  return entries;
}

// Puts into the entries where they begin; leaves them as they are when the record is not theirs.
void addPlaces(std::string_view record, uint32_t firstWithoutPlace,
               std::vector<LUXTokenCounts::Entry>& entries) {
  const auto end = std::partition_point(entries.begin(), entries.end(), [&](const auto& entry) {
    return entry.number < firstWithoutPlace;
  });
  if (record.size() != static_cast<size_t>(end - entries.begin())) {
    return;
  }
  const uint8_t* place = bytesOf(record);
  for (auto entry = entries.begin(); entry != end; ++entry) {
    entry->wordsBefore = *place++;
  }
}

}  // namespace

struct HelpLUXIndex::Documents {
  LUXRecords keys;
  LUXRecords properties;

  std::optional<size_t> indexOfKey(std::string_view key) const {
    size_t low = 0;
    size_t high = keys.count();
    while (low < high) {
      const size_t middle = low + (high - low) / 2;
      if (keys[middle] < key) {
        low = middle + 1;
      } else {
        high = middle;
      }
    }
    return low < keys.count() && keys[low] == key ? std::optional<size_t>(low) : std::nullopt;
  }

  // Keys out of order, or that are no text, are no keys.
  bool keysAreSound() const {
    for (size_t i = 0; i < keys.count(); ++i) {
      if (!platform::isValidUTF8(keys[i]) || (i > 0 && keys[i - 1] >= keys[i])) {
        return false;
      }
    }
    return true;
  }
};

struct HelpLUXIndex::Lazy {
  std::once_flag documentsOnce;
  Documents documents;

  std::once_flag countsOnce;
  LUXRecords counts;
  LUXRecords places;

  platform::Mutex mutex;
  std::weak_ptr<const LUXTokenTable> table GUARDED_BY(mutex);
};

HelpLUXIndex::HelpLUXIndex(LUXSectionedData sections, platform::Value attributes)
    : _sections(std::move(sections)),
      _attributes(std::move(attributes)),
      _lazy(std::make_unique<Lazy>()) {}

HelpLUXIndex::~HelpLUXIndex() = default;

std::shared_ptr<HelpLUXIndex> HelpLUXIndex::initWithVersionedData(const platform::Data& data) {
  std::optional<LUXSectionedData> sections = LUXSectionedData::read(data);
  if (!sections) {
    return nullptr;
  }
  platform::Value attributes{platform::Value::Dictionary{}};
  if (const LUXSection* section = sections->sectionWithType(attributesSectionType)) {
    if (!section->checksumMatches()) {
      return nullptr;
    }
    platform::PropertyListFormat format{};
    std::optional<platform::Value> list =
        platform::propertyListFromData(section->bytes, nullptr, &format);
    if (!list || format != platform::PropertyListFormat::binary || !list->dictionaryIf()) {
      return nullptr;
    }
    attributes = std::move(*list);
  }
  return std::shared_ptr<HelpLUXIndex>(
      new HelpLUXIndex(std::move(*sections), std::move(attributes)));
}

platform::Data HelpLUXIndex::versionedDataWithAttributes(const platform::Value& attributes) {
  if (!attributes.dictionaryIf()) {
    throw platform::Exception(platform::invalidArgumentException,
                              "the attributes of an index are a dictionary");
  }
  LUXSection section = LUXSection::sectionWithBytes(
      attributesSectionType,
      platform::dataFromPropertyList(attributes, platform::PropertyListFormat::binary));
  std::vector<LUXSection> sections;
  sections.push_back(std::move(section));
  return LUXSectionedData(std::move(sections)).write();
}

platform::Data HelpLUXIndex::versionedData() const { return _sections.write(); }

const HelpLUXIndex::Documents& HelpLUXIndex::_documents() const {
  std::call_once(_lazy->documentsOnce, [this] {
    Documents documents;
    documents.keys = recordsOfSection(_sections, keysSectionType);
    documents.properties = recordsOfSection(_sections, propertiesSectionType);
    if (documents.keysAreSound()) {
      _lazy->documents = std::move(documents);
    }
  });
  return _lazy->documents;
}

std::vector<std::string> HelpLUXIndex::documentKeys() const {
  const LUXRecords& keys = _documents().keys;
  std::vector<std::string> result;
  result.reserve(keys.count());
  for (size_t i = 0; i < keys.count(); ++i) {
    result.emplace_back(keys[i]);
  }
  return result;
}

std::shared_ptr<const LUXTokenTable> HelpLUXIndex::_table() const {
  const platform::MutexLock lock(_lazy->mutex);
  std::shared_ptr<const LUXTokenTable> table = _lazy->table.lock();
  if (table == nullptr) {
    const LUXSection* section = _sections.sectionWithType(tokensSectionType);
    if (section != nullptr && section->checksumMatches()) {
      table = LUXTokenTable::withSectionBytes(section->bytes);
    }
    _lazy->table = table;
  }
  return table;
}

LUXTokenCounts HelpLUXIndex::tokenCountsForKey(std::string_view key) const {
  const std::optional<size_t> index = _documents().indexOfKey(key);
  std::call_once(_lazy->countsOnce, [this] {
    _lazy->counts = recordsOfSection(_sections, countsSectionType);
    _lazy->places = recordsOfSection(_sections, placesSectionType);
  });
  if (!index || *index >= _lazy->counts.count()) {
    return {};
  }
  std::shared_ptr<const LUXTokenTable> table = _table();
  if (table == nullptr) {
    return {};
  }
  auto entries = entriesOfRecord(_lazy->counts[*index], table->size());
  if (!entries) {
    return {};
  }
  if (*index < _lazy->places.count()) {
    addPlaces(_lazy->places[*index], table->startOfKind(LUXTokenKind::phrase), *entries);
  }
  return {std::move(table), std::move(*entries)};
}

platform::Value HelpLUXIndex::fileProperitesForKey(std::string_view key) const {
  const Documents& documents = _documents();
  const std::optional<size_t> index = documents.indexOfKey(key);
  if (!index) {
    return {};
  }
  platform::Value::Dictionary properties;
  if (*index >= documents.properties.count()) {
    return properties;
  }
  const std::string_view record = documents.properties[*index];
  const uint8_t* at = bytesOf(record);
  const uint8_t* const end = at + record.size();
  uint64_t flags = 0;
  uint64_t titleLength = 0;
  if (!readVarnumber(at, end, flags) || !readVarnumber(at, end, titleLength) ||
      titleLength > static_cast<uint64_t>(end - at)) {
    return properties;
  }
  const std::string_view texts = record.substr(static_cast<size_t>(at - bytesOf(record)));
  const std::string_view title = texts.substr(0, titleLength);
  const std::string_view description = texts.substr(titleLength);
  if (!platform::isValidUTF8(title) || !platform::isValidUTF8(description)) {
    return properties;
  }
  properties.emplace(HelpDocPropertyTitle, title);
  if ((flags & hasDescriptionFlag) != 0) {
    properties.emplace(HelpDocPropertyDescription, description);
  }
  if ((flags & excludedFlag) != 0) {
    properties.emplace(HelpDocPropertyExcludeFromSearch, true);
  }
  return properties;
}
