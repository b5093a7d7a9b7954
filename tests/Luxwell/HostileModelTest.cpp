// Models that are not as they were written: other answers or none, but nothing read where it should
// not be, and an end to everything. Means most under sanitizers.
#include <gtest/gtest.h>

#include <algorithm>
#include <string>
#include <vector>

#include "host/Luxwell/LUXModelSections.h"
#include "tests/Luxwell/LUXModelUse.h"
#include "tests/Luxwell/LUXModelWorld.h"

namespace {

// A small model that has what only large ones have: neighbourhoods.
std::vector<LUXSection> sampleSections() {
  auto sections =
      LUXSectionedData::read(tests::modelOfPages(tests::samplePages()), LUXModelForm)->sections();
  const auto add = [&](uint32_t type, const std::vector<uint32_t>& numbers) {
    const std::string bytes(reinterpret_cast<const char*>(numbers.data()), 4 * numbers.size());
    sections.push_back(LUXSection::sectionWithBytes(type, platform::Data::copy(bytes)));
  };
  add(luxmodel::neighbourhoodCentresSection, {0, 2});
  add(luxmodel::neighbourhoodStartsSection, {0, 2, 4});
  add(luxmodel::pagesOfNeighbourhoodsSection, {0, 1, 2, 3});
  return sections;
}

std::string bytesOf(const std::vector<LUXSection>& sections) {
  return std::string(LUXSectionedData(sections, LUXModelForm).write().view());
}

// In exactly sized memory, so that a read past its end is seen.
std::shared_ptr<const LUXModelView> viewOf(std::string_view bytes) {
  return LUXModelView::viewWithData(
      platform::Data::adopt(std::vector<uint8_t>(bytes.begin(), bytes.end())));
}

}  // namespace

TEST(HostileModel, ATruncatedModelIsNone) {
  const std::string whole = bytesOf(sampleSections());
  ASSERT_NE(viewOf(whole), nullptr);
  for (size_t length = 0; length < whole.size(); ++length) {
    ASSERT_EQ(viewOf(std::string_view(whole).substr(0, length)), nullptr) << length;
  }
  EXPECT_EQ(viewOf(whole + 'x'), nullptr);
}

TEST(HostileModel, AFlippedByteIsFoundAndDoesNoHarmBefore) {
  const std::string whole = bytesOf(sampleSections());
  // What no checksum covers says nothing.
  std::vector<bool> isIdle(whole.size(), true);
  std::fill_n(isIdle.begin(), 28, false);
  const auto data = platform::Data::copy(whole);
  const auto sections = LUXSectionedData::read(data, LUXModelForm);
  ASSERT_TRUE(sections);
  const size_t tableEnd = 32 + 32 * sections->sections().size();
  std::fill(isIdle.begin() + 32, isIdle.begin() + static_cast<ptrdiff_t>(tableEnd), false);
  for (const LUXSection& section : sections->sections()) {
    std::fill_n(isIdle.begin() + (section.bytes.bytes() - data.bytes()), section.bytes.length(),
                false);
  }
  for (size_t i = 0; i < whole.size(); ++i) {
    for (const unsigned flip : {0xFFU, 1U << (i % 8)}) {
      std::string damaged = whole;
      damaged[i] = static_cast<char>(static_cast<uint8_t>(damaged[i]) ^ flip);
      const auto view = viewOf(damaged);
      if (view == nullptr) {
        continue;
      }
      ASSERT_EQ(view->checksumsMatch(), isIdle[i]) << "byte " << i;
      tests::useModel(*view);
    }
  }
}

TEST(HostileModel, NumbersOfAnySizeInAnySectionDoNoHarm) {
  const std::vector<LUXSection> sections = sampleSections();
  for (size_t i = 0; i < sections.size(); ++i) {
    for (const int filling : {0x00, 0x01, 0x7F, 0x80, 0xFF}) {
      auto changed = sections;
      std::string bytes(changed[i].bytes.view());
      // All of it, or all but its ends.
      const size_t margin = std::min<size_t>(filling % 2 == 0 ? 0 : 4, bytes.size() / 2);
      std::fill(bytes.begin() + static_cast<ptrdiff_t>(margin),
                bytes.end() - static_cast<ptrdiff_t>(margin), static_cast<char>(filling));
      changed[i] = LUXSection::sectionWithBytes(changed[i].type, platform::Data::copy(bytes));
      const auto view = viewOf(bytesOf(changed));
      if (view != nullptr) {
        tests::useModel(*view);
      }
    }
  }
}

TEST(HostileModel, MissingAndShorterSectionsDoNoHarm) {
  const std::vector<LUXSection> sections = sampleSections();
  for (size_t i = 0; i < sections.size(); ++i) {
    auto without = sections;
    without.erase(without.begin() + static_cast<ptrdiff_t>(i));
    if (const auto view = viewOf(bytesOf(without))) {
      tests::useModel(*view);
    }
    for (const size_t length : {size_t{1}, size_t{4}, sections[i].bytes.length() / 8 * 4}) {
      auto shorter = sections;
      const std::string bytes(sections[i].bytes.view().substr(0, length));
      shorter[i] = LUXSection::sectionWithBytes(sections[i].type, platform::Data::copy(bytes));
      if (const auto view = viewOf(bytesOf(shorter))) {
        tests::useModel(*view);
      }
    }
  }
}
