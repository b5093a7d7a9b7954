#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <cstring>
#include <filesystem>
#include <string>
#include <vector>

#include "SearchKit/IndexCheck.h"
#include "SearchKit/IndexFormat.h"
#include "SearchKit/SearchKit.h"
#include "platform/Files.h"
#include "tests/SearchKit/Indexes.h"

namespace searchkit {
namespace {

using testing::composed;
using ::testing::ElementsAre;
using testing::found;
using testing::indexData;
using ::testing::IsEmpty;
using testing::openIndex;
using testing::page;

std::vector<uint8_t> smallIndexBytes() {
  const platform::Data data = indexData({page("/a", "one two"), page("/b", "two three")});
  return {data.span().begin(), data.span().end()};
}

SKIndexRef open(const std::vector<uint8_t>& bytes) {
  return SKIndexOpenWithData(platform::Data::adopt(bytes));
}

template <typename Integer>
void put(std::vector<uint8_t>& bytes, size_t at, Integer value) {
  format::store(bytes.data() + at, value);
}

size_t entryOfSection(const std::vector<uint8_t>& bytes, format::Section id) {
  size_t at = format::headerLength;
  while (format::load<uint32_t>(bytes.data() + at) != static_cast<uint32_t>(id)) {
    at += format::sectionEntryLength;
  }
  return at;
}

TEST(SKIndex, opensOnAnySliceOfBytesAndKeepsThemAlive) {
  const std::vector<uint8_t> bytes = smallIndexBytes();
  for (size_t shift = 0; shift < 9; ++shift) {
    std::vector<uint8_t> shifted(shift, 0xAA);
    shifted.insert(shifted.end(), bytes.begin(), bytes.end());
    SKIndexRef index;
    {
      const platform::Data whole = platform::Data::adopt(shifted);
      index = SKIndexOpenWithData(whole.slice(shift, bytes.size()));
    }
    ASSERT_NE(index, nullptr);
    EXPECT_EQ(found(index, "two"), "/a /b ");
  }
}

TEST(SKIndex, ignoresBytesAfterItsEnd) {
  std::vector<uint8_t> bytes = smallIndexBytes();
  bytes.resize(bytes.size() + 100, 0xEE);
  EXPECT_EQ(found(open(bytes), "three"), "/b ");
}

TEST(SKIndex, hasNoNamedIndexes) {
  const platform::Data data = indexData({page("/a", "one")});
  EXPECT_EQ(SKIndexOpenWithData(data, "other"), nullptr);
}

TEST(SKIndex, isNotOpenedFromOtherBytes) {
  EXPECT_EQ(SKIndexOpenWithData({}), nullptr);
  EXPECT_EQ(SKIndexOpenWithData(platform::Data::copy("no index at all")), nullptr);
  EXPECT_EQ(SKIndexOpenWithData(platform::Data::copy(std::string(1000, '\0'))), nullptr);
}

TEST(SKIndex, isNotOpenedWhenTruncatedAnywhere) {
  const std::vector<uint8_t> bytes = smallIndexBytes();
  for (size_t length = 0; length < bytes.size(); ++length) {
    EXPECT_EQ(open({bytes.begin(), bytes.begin() + static_cast<ptrdiff_t>(length)}), nullptr);
  }
}

TEST(SKIndex, isNotOpenedInAnotherVersion) {
  for (const uint16_t version : std::initializer_list<uint16_t>{0, format::version + 1, 0xFFFF}) {
    std::vector<uint8_t> bytes = smallIndexBytes();
    put<uint16_t>(bytes, format::versionAt, version);
    EXPECT_EQ(open(bytes), nullptr);
  }
}

TEST(SKIndex, isOpenedInALaterRevision) {
  std::vector<uint8_t> bytes = smallIndexBytes();
  put<uint16_t>(bytes, format::revisionAt, 9);
  EXPECT_NE(open(bytes), nullptr);
}

TEST(SKIndex, isNotOpenedWithRulesOfSplittingThatAreUnknown) {
  std::vector<uint8_t> bytes = smallIndexBytes();
  put<uint32_t>(bytes, format::tokenizerRulesAt, 2);
  EXPECT_EQ(open(bytes), nullptr);
}

TEST(SKIndex, skipsSectionsThatItDoesNotKnow) {
  std::vector<uint8_t> bytes = smallIndexBytes();
  // One more entry of the table, and its section after all others.
  const auto headerLength = format::load<uint32_t>(bytes.data() + format::headerLengthAt);
  const auto count = format::load<uint32_t>(bytes.data() + format::sectionCountAt);
  const size_t added = format::sectionEntryLength;
  bytes.insert(bytes.begin() + headerLength, added, 0);
  for (uint32_t i = 0; i < count; ++i) {
    const size_t at = format::headerLength + i * added + format::sectionOffsetAt;
    put(bytes, at, format::load<uint64_t>(bytes.data() + at) + added);
  }
  const uint64_t offset = bytes.size();
  bytes.resize(bytes.size() + 5);
  put<uint32_t>(bytes, headerLength + format::sectionIDAt, 4711);
  put<uint64_t>(bytes, headerLength + format::sectionOffsetAt, offset);
  put<uint64_t>(bytes, headerLength + format::sectionLengthAt, 5);
  put<uint32_t>(bytes, format::sectionCountAt, count + 1);
  put<uint32_t>(bytes, format::headerLengthAt, static_cast<uint32_t>(headerLength + added));
  put<uint64_t>(bytes, format::totalLengthAt, bytes.size());
  const SKIndexRef index = open(bytes);
  ASSERT_NE(index, nullptr);
  EXPECT_EQ(found(index, "two"), "/a /b ");
  EXPECT_EQ(indexSummary(*index).sections.back().name, "unknown");
}

TEST(SKIndex, isNotOpenedWithoutASection) {
  for (uint32_t id = 1; id <= format::lastRequiredSection; ++id) {
    std::vector<uint8_t> bytes = smallIndexBytes();
    put<uint32_t>(bytes, entryOfSection(bytes, static_cast<format::Section>(id)), 4711);
    EXPECT_EQ(open(bytes), nullptr) << id;
  }
}

TEST(SKIndex, isNotOpenedWithASectionTwice) {
  std::vector<uint8_t> bytes = smallIndexBytes();

  const size_t positions = entryOfSection(bytes, format::Section::positions);
  std::vector<uint8_t> twice = bytes;
  put<uint32_t>(twice, positions, static_cast<uint32_t>(format::Section::postings));
  EXPECT_EQ(open(twice), nullptr);
}

TEST(SKIndex, isNotOpenedWhenAnExtentDoesNotFit) {
  const std::vector<uint8_t> bytes = smallIndexBytes();
  for (uint32_t id = 1; id <= format::lastRequiredSection; ++id) {
    const size_t entry = entryOfSection(bytes, static_cast<format::Section>(id));
    for (const uint64_t wrong :
         {uint64_t{0}, uint64_t{8}, uint64_t{bytes.size() + 1}, ~uint64_t{0}, ~uint64_t{7}}) {
      std::vector<uint8_t> moved = bytes;
      put<uint64_t>(moved, entry + format::sectionOffsetAt, wrong);
      EXPECT_EQ(open(moved), nullptr) << id << " at " << wrong;
    }
    std::vector<uint8_t> longer = bytes;
    put<uint64_t>(longer, entry + format::sectionLengthAt, bytes.size());
    EXPECT_EQ(open(longer), nullptr) << id;
    put<uint64_t>(longer, entry + format::sectionLengthAt, ~uint64_t{0});
    EXPECT_EQ(open(longer), nullptr) << id;
  }
}

TEST(SKIndex, isNotOpenedWhenACountDoesNotFitItsTable) {
  for (const size_t field : {format::documentCountAt, format::termCountAt, format::sectionCountAt,
                             format::headerLengthAt, format::totalLengthAt}) {
    std::vector<uint8_t> bytes = smallIndexBytes();
    put<uint32_t>(bytes, field, 0x7FFFFFFF);
    EXPECT_EQ(open(bytes), nullptr) << field;
  }
  std::vector<uint8_t> bytes = smallIndexBytes();
  put<uint32_t>(bytes, format::termsPerBlockAt, 0);
  EXPECT_EQ(open(bytes), nullptr);
}

TEST(SKIndex, verifyChecksumsSeesEveryChangedByteThatMatters) {
  const std::vector<uint8_t> bytes = smallIndexBytes();
  EXPECT_TRUE(SKIndexVerifyChecksums(open(bytes)));
  EXPECT_FALSE(SKIndexVerifyChecksums(nullptr));
  std::vector<bool> isCovered(bytes.size(), false);
  const SKIndexRef intact = open(bytes);
  std::fill_n(isCovered.begin(), format::load<uint32_t>(bytes.data() + format::headerLengthAt),
              true);
  for (const SectionInfo& section : indexSummary(*intact).sections) {
    std::fill_n(isCovered.begin() + static_cast<ptrdiff_t>(section.offset), section.length, true);
  }
  for (size_t at = 0; at < bytes.size(); ++at) {
    std::vector<uint8_t> changed = bytes;
    changed[at] ^= 0x10;
    if (const SKIndexRef index = open(changed)) {
      EXPECT_NE(SKIndexVerifyChecksums(index), isCovered[at]) << at;
    }
  }
}

TEST(SKIndex, termNumbersEndAtTheNumberOfTerms) {
  EXPECT_EQ(SKIndexGetMaximumTermID(openIndex({page("/a", "one two two")})), 2);
  EXPECT_EQ(SKIndexGetMaximumTermID(nullptr), 0);
}

TEST(SKIndexCopyUniqueTerms, givesTheDistinctTermsInOrder) {
  const SKIndexRef index = openIndex({page("/a", "one")});
  EXPECT_THAT(SKIndexCopyUniqueTerms(index, "Print the Print QUEUE, the Café!"),
              ElementsAre("print", "the", "queue", "cafe"));
  EXPECT_THAT(SKIndexCopyUniqueTerms(index, "?! …"), IsEmpty());
  EXPECT_THAT(SKIndexCopyUniqueTerms(index, ""), IsEmpty());
  EXPECT_THAT(SKIndexCopyUniqueTerms(nullptr, "print"), IsEmpty());
}

TEST(SKIndexCopyUniqueTerms, keepsHalfWordsShorterThanTheMinimum) {
  const SKIndexRef index = openIndex({page("/a", "print queue")}, 3);
  EXPECT_THAT(SKIndexCopyUniqueTerms(index, "print qu"), ElementsAre("print", "qu"));
  EXPECT_EQ(found(index, composed(index, "print qu")), "/a ");
}

TEST(SKIndexCopyUniqueTerms, roundTripsThroughAComposedQueryInEveryScript) {
  const std::vector<std::string> texts{"Print the queue",     "Größe der Warteschlange",
                                       "Печать документов",   "طباعة المستند",
                                       "छपाई की कतार",        "東京都に行く印刷の設定",
                                       "打印机队列设置文件",  "ภาษาไทยง่ายมากพิมพ์เอกสาร",
                                       "ភាសាខ្មែរបោះពុម្ព",      "ພາສາລາວພິມ",
                                       "မြန်မာဘာသာစကား",       "프린터를 설치하고 인쇄",
                                       "2023年PDF印刷 ﬁle x²"};
  for (const std::string& text : texts) {
    const SKIndexRef index = openIndex({page("/a", text), page("/b", "other")});
    EXPECT_EQ(found(index, composed(index, text)), "/a ") << text;
    // Each word as the index has it is found, however it would be split by itself.
    for (TermIterator terms(*index); terms.next();) {
      EXPECT_NE(found(index, std::string(terms.term()) + "* "), "") << terms.term();
      EXPECT_NE(found(index, terms.term()), "") << terms.term();
    }
  }
}

TEST(SKIndexCopyDocumentRefs, givesOneReferenceAnIDAndNullForUnknownOnes) {
  const SKIndexRef index = openIndex({page("/a/x.html", "one"), page("/b.html", "two")});
  const std::vector<SKDocumentID> ids{1, 7, 0, 1};
  const auto references = SKIndexCopyDocumentRefsForDocumentIDs(index, ids);
  ASSERT_EQ(references.size(), 4U);
  EXPECT_EQ(SKDocumentGetName(*references[0]), "b.html");
  EXPECT_EQ(references[1], nullptr);
  EXPECT_EQ(SKDocumentGetName(*references[2]), "x.html");
  EXPECT_EQ(SKDocumentCopyURL(*references[2])->path(), "/a/x.html");
  EXPECT_TRUE(SKDocumentCopyURL(*references[2])->isFileURL());
  EXPECT_EQ(SKIndexCopyDocumentRefsForDocumentIDs(nullptr, ids)[0], nullptr);
  EXPECT_THAT(SKIndexCopyDocumentRefsForDocumentIDs(index, {}), IsEmpty());
}

TEST(SKDocument, isMadeOfAFileURLOnly) {
  const auto file = platform::URL::fileURLWithPath("/Ü b/ñ.html");
  const SKDocumentRef document = SKDocumentCreateWithURL(file);
  ASSERT_NE(document, nullptr);
  EXPECT_EQ(SKDocumentGetName(*document), "ñ.html");
  EXPECT_EQ(*SKDocumentCopyURL(*document), file);
  EXPECT_EQ(SKDocumentCreateWithURL(*platform::URL::URLWithString("https://example.org/a")),
            nullptr);
}

TEST(SKDocument, keepsPathsThatAreNoText) {
  const SKIndexRef index = openIndex({page("/caf\xE9 100%.html", "one")});
  const auto references = SKIndexCopyDocumentRefsForDocumentIDs(index, std::vector<uint32_t>{0});
  const SKDocumentRef again = SKDocumentCreateWithURL(*SKDocumentCopyURL(*references[0]));
  EXPECT_EQ(SKDocumentGetName(*again), "caf\xE9 100%.html");
  EXPECT_TRUE(SKIndexCopyDocumentProperties(index, *again));
}

TEST(SKIndexCopyDocumentProperties, hasTitleAndAbstractWhereThePageHas) {
  Document both = page("/both", "x");
  both.title = "Title";
  both.abstract = "Abstract";
  Document untitled = page("/untitled", "x");
  untitled.title.reset();
  untitled.abstract = "";
  Document none = page("/none", "x");
  none.title.reset();
  const SKIndexRef index = openIndex({both, untitled, none});
  const auto properties = [&](const char* path) {
    return SKIndexCopyDocumentProperties(
        index, *SKDocumentCreateWithURL(platform::URL::fileURLWithPath(path)));
  };
  EXPECT_EQ(*properties("/both"),
            platform::Value(platform::Value::Dictionary{{"T", "Title"}, {"D", "Abstract"}}));
  EXPECT_EQ(*properties("/untitled"), platform::Value(platform::Value::Dictionary{{"D", ""}}));
  EXPECT_FALSE(properties("/none"));
  EXPECT_FALSE(properties("/unknown"));
}

TEST(SKIndexCopyDocumentProperties, repairsTextsOfAnIndexFromElsewhere) {
  Document document = page("/a", "x");
  document.title = "TITLE";
  const platform::Data data = indexData({document});
  std::string bytes(data.view());
  bytes[bytes.find("TITLE") + 2] = '\xFF';
  const SKIndexRef index = SKIndexOpenWithData(platform::Data::adopt(bytes));
  const auto properties = SKIndexCopyDocumentProperties(
      index, *SKDocumentCreateWithURL(platform::URL::fileURLWithPath("/a")));
  EXPECT_EQ((*properties)["T"].stringValue(), "TI\uFFFDLE");
}

// An index of each version that was ever written is kept and must go on being read.
SKIndexRef indexOfVersion(int version) {
  const std::string path = std::string(ZEB_SOURCE_DIR) + "/tests/SearchKit/indexes/version-" +
                           std::to_string(version) + ".skindex";
  const auto data = platform::systemFileManager()->contentsAtPath(path);
  SKIndexRef index = data ? SKIndexOpenWithData(*data) : nullptr;
  EXPECT_TRUE(SKIndexVerifyChecksums(index));
  return index;
}

TEST(SKIndex, opensIndexesOfTheFirstVersion) {
  const SKIndexRef index = indexOfVersion(1);
  ASSERT_NE(index, nullptr);
  EXPECT_THAT(indexProblems(*index), ::testing::IsEmpty());
  EXPECT_EQ(found(index, "print* queue* "), "/printing.html ");
  EXPECT_EQ(found(index, "\"the cafe\" | 印刷"), "/cafe.html /japanese.html ");
  EXPECT_EQ(found(index, "*et* -printer"), "/cafe.html ");
  const auto properties = SKIndexCopyDocumentProperties(
      index, *SKDocumentCreateWithURL(platform::URL::fileURLWithPath("/cafe.html")));
  ASSERT_TRUE(properties);
  EXPECT_EQ((*properties)["T"].stringValue(), "Networks in the Café");
}

TEST(SKIndex, opensIndexesOfTheSecondVersion) {
  const SKIndexRef index = indexOfVersion(2);
  ASSERT_NE(index, nullptr);
  EXPECT_THAT(indexProblems(*index), ::testing::IsEmpty());
  EXPECT_EQ(indexSummary(*index).sections.size(), 9U);
  EXPECT_EQ(found(index, "print* queue* "), "/printing.html ");
  EXPECT_EQ(found(index, "\"the cafe\" | 印刷"), "/cafe.html /japanese.html ");
  EXPECT_EQ(found(index, "\"the print queue\""), "/printing.html ");
  EXPECT_EQ(found(index, "\"queue the\""), "");
  // Pages with three words "many" in a row, but for the three pages that have "woab".
  EXPECT_EQ(found(index, "\"many many many\" word -woab*"),
            "/words/12.html /words/13.html /words/15.html /words/17.html /words/18.html "
            "/words/19.html /words/20.html /words/21.html /words/22.html /words/23.html "
            "/words/24.html ");
  // With a merged list: all pages of words, and one with "worked".
  EXPECT_EQ(testing::scores(index, "wo*").size(), 17U);
}

TEST(SKIndex, opensIndexesOfTheThirdVersion) {
  const SKIndexRef index = indexOfVersion(3);
  ASSERT_NE(index, nullptr);
  EXPECT_EQ(indexSummary(*index).formatVersion, 3U);
  EXPECT_THAT(indexProblems(*index), ::testing::IsEmpty());
  EXPECT_EQ(found(index, "print* queue* "), "/printing.html ");
  EXPECT_EQ(found(index, "\"the cafe\" | 印刷"), "/cafe.html /japanese.html ");
  EXPECT_EQ(found(index, "\"the print queue\""), "/printing.html ");
  EXPECT_EQ(found(index, "*et* -printer"), "/cafe.html ");
  // Terms with more in common, and longer, than an entry's head has room for.
  EXPECT_EQ(found(index, "incomprehensibilities*"), "/words/100.html ");
  EXPECT_EQ(found(index, "incomprehensibility"), "/words/101.html ");
  // Postings and positions of more than 255 bytes.
  EXPECT_EQ(testing::scores(index, "many").size(), 300U);
  EXPECT_EQ(testing::scores(index, "\"many many\"").size(), 300U);
  // With a merged list.
  EXPECT_EQ(testing::scores(index, "wo*").size(), 300U);
}

}  // namespace
}  // namespace searchkit
