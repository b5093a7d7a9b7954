#include "host/Luxwell/HelpLUXIndex.h"

#include <gtest/gtest.h>

#include <string>

#include "platform/Exception.h"
#include "platform/PropertyList.h"

using platform::Data;
using platform::Value;

namespace {

Value attributes() {
  return Value::Dictionary{{HelpLUXIndexAttributeIgnoreLUXKey, true},
                           {HelpLUXIndexAttributeBigramThresholdKey, 0.25},
                           {HelpLUXIndexAttributeTrigramThresholdKey, 3},
                           {HelpLUXIndexAttributeLanguageKey, "pt-BR"}};
}

Data withAttributesSection(Data section) {
  return LUXSectionedData({LUXSection::sectionWithBytes(HelpLUXIndex::attributesSectionType,
                                                        std::move(section))})
      .write();
}

}  // namespace

TEST(HelpLUXIndex, GivesBackTheAttributesItWasWrittenWith) {
  const auto index =
      HelpLUXIndex::initWithVersionedData(HelpLUXIndex::versionedDataWithAttributes(attributes()));
  ASSERT_NE(index, nullptr);
  EXPECT_EQ(index->attributes(), attributes());
  EXPECT_TRUE(index->attributes()[HelpLUXIndexAttributeIgnoreLUXKey].boolValue());
}

TEST(HelpLUXIndex, VersionedDataMakesAnEqualIndex) {
  const Data data = HelpLUXIndex::versionedDataWithAttributes(attributes());
  const auto index = HelpLUXIndex::initWithVersionedData(data);
  ASSERT_NE(index, nullptr);
  EXPECT_EQ(index->versionedData(), data);
  EXPECT_NE(index->versionedData().bytes(), data.bytes());
}

TEST(HelpLUXIndex, DataWithoutAttributesHasAnEmptyDictionary) {
  const auto index =
      HelpLUXIndex::initWithVersionedData(LUXSectionedData(std::vector<LUXSection>{}).write());
  ASSERT_NE(index, nullptr);
  EXPECT_EQ(index->attributes(), Value(Value::Dictionary{}));
}

TEST(HelpLUXIndex, CarriesSectionsItDoesNotKnow) {
  const Data data =
      LUXSectionedData({LUXSection::sectionWithBytes(2, Data::copy("of a later version"))}).write();
  const auto index = HelpLUXIndex::initWithVersionedData(data);
  ASSERT_NE(index, nullptr);
  EXPECT_EQ(index->versionedData(), data);
}

TEST(HelpLUXIndex, RefusesWhatIsNoVersionedData) {
  EXPECT_EQ(HelpLUXIndex::initWithVersionedData(Data()), nullptr);
  EXPECT_EQ(HelpLUXIndex::initWithVersionedData(Data::copy("semantic data")), nullptr);
  EXPECT_EQ(HelpLUXIndex::initWithVersionedData(Data::copy(std::string(20000, 'x'))), nullptr);
}

TEST(HelpLUXIndex, RefusesAttributesThatAreNoBinaryPropertyListOfADictionary) {
  using platform::PropertyListFormat;
  EXPECT_EQ(HelpLUXIndex::initWithVersionedData(withAttributesSection(Data())), nullptr);
  EXPECT_EQ(HelpLUXIndex::initWithVersionedData(withAttributesSection(Data::copy("bplist00"))),
            nullptr);
  EXPECT_EQ(HelpLUXIndex::initWithVersionedData(withAttributesSection(
                dataFromPropertyList(Value::Array{}, PropertyListFormat::binary))),
            nullptr);
  EXPECT_EQ(HelpLUXIndex::initWithVersionedData(
                withAttributesSection(dataFromPropertyList(attributes(), PropertyListFormat::xml))),
            nullptr);
}

TEST(HelpLUXIndex, RefusesAttributesThatAreDamaged) {
  std::string bytes(HelpLUXIndex::versionedDataWithAttributes(attributes()).view());
  const size_t language = bytes.find("pt-BR");
  ASSERT_NE(language, std::string::npos);
  bytes[language] = 'x';
  EXPECT_EQ(HelpLUXIndex::initWithVersionedData(Data::copy(bytes)), nullptr);
}

TEST(HelpLUXIndex, TruncationAndFlipsNeverMakeAnIndexWithOtherAttributes) {
  const std::string bytes(HelpLUXIndex::versionedDataWithAttributes(attributes()).view());
  for (size_t i = 0; i < bytes.size(); ++i) {
    EXPECT_EQ(HelpLUXIndex::initWithVersionedData(Data::copy(bytes.substr(0, i))), nullptr);
    for (int bit = 0; bit < 8; ++bit) {
      std::string damaged = bytes;
      damaged[i] = static_cast<char>(damaged[i] ^ (1 << bit));
      const auto index = HelpLUXIndex::initWithVersionedData(Data::copy(damaged));
      EXPECT_TRUE(!index || index->attributes() == attributes()) << i;
    }
  }
}

TEST(HelpLUXIndex, WritesDictionariesOnly) {
  EXPECT_THROW(HelpLUXIndex::versionedDataWithAttributes(Value()), platform::Exception);
  EXPECT_THROW(HelpLUXIndex::versionedDataWithAttributes(Value::Array{}), platform::Exception);
}
