#include "host/Luxwell/LUXIndexCheck.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "host/Luxwell/HelpLUXIndex.h"
#include "host/Luxwell/HelpTokenizer.h"
#include "host/Luxwell/LUXIndexWriter.h"
#include "host/Luxwell/LUXRecords.h"
#include "host/Luxwell/LUXSectionedData.h"

using platform::Data;
using testing::Contains;
using testing::ElementsAre;
using testing::HasSubstr;
using testing::IsEmpty;
using testing::Not;

namespace {

Data sample() {
  LUXIndexWriter writer(HelpTokenizer::tokenizerForLanguage("English"));
  for (const char* const key : {"a.html", "b.html", "c.html"}) {
    LUXDocument document;
    document.key = key;
    document.title = std::string("Title of ") + key;
    document.description = "Described.";
    document.blocks = {"The print queue waits for paper.", "os.path is a name."};
    writer.addDocument(document);
  }
  return writer.finish();
}

/// The data with another section in the place of the one of that type, and right checksums.
Data withSection(uint32_t type, std::string bytes) {
  std::vector<LUXSection> sections = LUXSectionedData::read(sample())->sections();
  for (LUXSection& section : sections) {
    if (section.type == type) {
      section = LUXSection::sectionWithBytes(type, Data::copy(bytes));
    }
  }
  return LUXSectionedData(std::move(sections)).write();
}

std::string sectionBytes(uint32_t type) {
  return std::string(LUXSectionedData::read(sample())->sectionWithType(type)->bytes.view());
}

/// The records of that section with the second one replaced.
std::string withRecord(uint32_t type, std::string_view record) {
  const Data data = LUXSectionedData::read(sample())->sectionWithType(type)->bytes;
  const LUXRecords records(data);
  LUXRecordsWriter writer;
  for (size_t i = 0; i < records.count(); ++i) {
    writer.beginRecord() += i == 1 ? record : records[i];
  }
  return std::string(writer.finish().view());
}

std::vector<std::string> problemsWithRecord(uint32_t type, std::string_view record) {
  return LUXIndexProblems(withSection(type, withRecord(type, record)));
}

}  // namespace

TEST(LUXIndexCheck, whatTheWriterWritesIsSound) {
  EXPECT_THAT(LUXIndexProblems(sample()), IsEmpty());
  EXPECT_THAT(
      LUXIndexProblems(LUXIndexWriter(HelpTokenizer::tokenizerForLanguage("English")).finish()),
      IsEmpty());
  EXPECT_THAT(LUXIndexProblems(HelpLUXIndex::versionedDataWithAttributes(
                  platform::Value(platform::Value::Dictionary{}))),
              IsEmpty());
}

TEST(LUXIndexCheck, everyChangedByteIsFoundAndEveryCutToo) {
  const std::string bytes(sample().view());
  size_t unnoticed = 0;
  for (size_t at = 0; at < bytes.size(); ++at) {
    std::string changed = bytes;
    changed[at] = static_cast<char>(changed[at] ^ 0x20);
    unnoticed += LUXIndexProblems(Data::copy(changed)).empty() ? 1 : 0;
    EXPECT_THAT(LUXIndexProblems(Data::copy(bytes.substr(0, at))),
                ElementsAre("header, table or length are wrong"));
  }
  // The reserved field of the header, those of the six entries, and the bytes between sections.
  EXPECT_LE(unnoticed, 4U + 6 * 8 + 6 * 7);
}

TEST(LUXIndexCheck, checksumsAreNamed) {
  std::vector<LUXSection> sections = LUXSectionedData::read(sample())->sections();
  ++sections[4].checksum;
  EXPECT_THAT(LUXIndexProblems(LUXSectionedData(std::move(sections)).write()),
              ElementsAre("the checksum of section 5 is wrong"));
}

TEST(LUXIndexCheck, attributesAreLookedAt) {
  EXPECT_THAT(LUXIndexProblems(withSection(HelpLUXIndex::attributesSectionType, "no list")),
              ElementsAre("the attributes are no property list of a dictionary"));
}

TEST(LUXIndexCheck, keysAreLookedAt) {
  const uint32_t keys = HelpLUXIndex::keysSectionType;
  EXPECT_THAT(problemsWithRecord(keys, "z"),
              ElementsAre("page 2: its key is not above that of the page before"));
  EXPECT_THAT(problemsWithRecord(keys, "b\xFF"), ElementsAre("page 1: its key is not UTF-8"));
  EXPECT_THAT(LUXIndexProblems(withSection(keys, "nonsense")),
              Contains("section 3 is no list of records"));
}

TEST(LUXIndexCheck, propertiesAreLookedAt) {
  const uint32_t properties = HelpLUXIndex::propertiesSectionType;
  EXPECT_THAT(problemsWithRecord(properties, ""), ElementsAre("page 1: its properties are broken"));
  EXPECT_THAT(problemsWithRecord(properties, std::string_view("\0\x7Fx", 3)),
              ElementsAre("page 1: its properties are broken"));
  EXPECT_THAT(problemsWithRecord(properties, std::string_view("\0\0x", 3)),
              ElementsAre("page 1: it has no title"));
  EXPECT_THAT(problemsWithRecord(properties, std::string_view("\0\1\xFF", 3)),
              ElementsAre("page 1: its title or description is not UTF-8"));
}

TEST(LUXIndexCheck, countsAndPlacesAreLookedAt) {
  const uint32_t counts = HelpLUXIndex::countsSectionType;
  const uint32_t places = HelpLUXIndex::placesSectionType;
  EXPECT_THAT(problemsWithRecord(counts, "\xFF"), ElementsAre("page 1: its counts are broken"));
  EXPECT_THAT(problemsWithRecord(counts, "\xFF\xFF\xFF\xFF\x0F"),
              ElementsAre("page 1: its counts are broken"));
  EXPECT_THAT(problemsWithRecord(counts, std::string_view("\1\0\0", 3)),
              ElementsAre("page 1: its counts are broken"));
  EXPECT_THAT(problemsWithRecord(places, "12"),
              ElementsAre("page 1: its places are not those of its tokens"));
  LUXRecordsWriter one;
  one.beginRecord() += "x";
  EXPECT_THAT(LUXIndexProblems(withSection(places, std::string(one.finish().view()))),
              ElementsAre("section 6 has 1 records for 3 pages"));
}

TEST(LUXIndexCheck, tokensAreLookedAt) {
  std::string tokens = sectionBytes(HelpLUXIndex::tokensSectionType);
  tokens[21] = '\x7F';
  EXPECT_THAT(LUXIndexProblems(withSection(HelpLUXIndex::tokensSectionType, tokens)),
              ElementsAre("the tokens are broken"));
}

TEST(LUXIndexCheck, noMoreProblemsAreToldThanWanted) {
  LUXRecordsWriter records;
  for (int i = 0; i < 3; ++i) {
    records.beginRecord();
  }
  const Data data =
      withSection(HelpLUXIndex::propertiesSectionType, std::string(records.finish().view()));
  EXPECT_EQ(LUXIndexProblems(data).size(), 3U);
  EXPECT_EQ(LUXIndexProblems(data, 2).size(), 2U);
}
