// Model files: any bytes as the whole, and a small model with any bytes put over its sections.
//
// The same input is read twice. As edits, each is: number of the section, where (two bytes), how
// many bytes (up to 31; the upper bits: 0x80 also cuts the section off after them), the bytes.
#include <algorithm>
#include <cstdint>
#include <string>
#include <string_view>
#include <vector>

#include "host/Luxwell/LUXModelSections.h"
#include "host/Luxwell/LUXModelView.h"
#include "tests/Luxwell/LUXModelUse.h"
#include "tests/Luxwell/LUXModelWorld.h"

namespace {

void read(const platform::Data& data) {
  if (const auto view = LUXModelView::viewWithData(data)) {
    tests::useModel(*view);
  }
}

struct Section {
  uint32_t type;
  std::string bytes;
};

const std::vector<Section>& sampleSections() {
  static const std::vector<Section> sections = [] {
    std::vector<Section> result;
    const platform::Data data = tests::modelOfPages(tests::samplePages());
    const auto model = LUXSectionedData::read(data, LUXModelForm);
    for (const LUXSection& section : model->sections()) {
      result.push_back({section.type, std::string(section.bytes.view())});
    }
    const auto add = [&](uint32_t type, const std::vector<uint32_t>& numbers) {
      result.push_back(
          {type, std::string(reinterpret_cast<const char*>(numbers.data()), 4 * numbers.size())});
    };
    // What only large models have.
    add(luxmodel::neighbourhoodCentresSection, {0, 2});
    add(luxmodel::neighbourhoodStartsSection, {0, 2, 4});
    add(luxmodel::pagesOfNeighbourhoodsSection, {0, 1, 2, 3});
    return result;
  }();
  return sections;
}

platform::Data edited(std::string_view edits) {
  std::vector<Section> sections = sampleSections();
  while (edits.size() >= 4) {
    Section& section = sections[static_cast<uint8_t>(edits[0]) % sections.size()];
    const size_t place = static_cast<uint8_t>(edits[1]) + 256U * static_cast<uint8_t>(edits[2]);
    const auto how = static_cast<uint8_t>(edits[3]);
    const std::string_view bytes = edits.substr(4, how & 31U);
    const size_t at = std::min(place, section.bytes.size());
    section.bytes.replace(at, std::min(bytes.size(), section.bytes.size() - at), bytes);
    if ((how & 0x80U) != 0) {
      section.bytes.resize(at + bytes.size());
    }
    edits.remove_prefix(4 + bytes.size());
  }
  std::vector<LUXSection> made;
  made.reserve(sections.size());
  for (const Section& section : sections) {
    made.push_back(LUXSection::sectionWithBytes(section.type, platform::Data::copy(section.bytes)));
  }
  return LUXSectionedData(std::move(made), LUXModelForm).write();
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
  const std::string_view input(reinterpret_cast<const char*>(data), size);
  read(platform::Data::copy(input));
  read(edited(input));
  return 0;
}
