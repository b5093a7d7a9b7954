#include "host/Luxwell/HelpLUXIndex.h"

#include <optional>
#include <utility>

#include "platform/Exception.h"
#include "platform/PropertyList.h"

HelpLUXIndex::HelpLUXIndex(LUXSectionedData sections, platform::Value attributes)
    : _sections(std::move(sections)), _attributes(std::move(attributes)) {}

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
