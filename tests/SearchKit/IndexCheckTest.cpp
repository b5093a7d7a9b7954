#include "SearchKit/IndexCheck.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <algorithm>
#include <functional>

#include "SearchKit/Checksum.h"
#include "SearchKit/IndexFormat.h"
#include "tests/SearchKit/Indexes.h"

namespace searchkit {
namespace {

using format::Section;
using ::testing::Contains;
using ::testing::ElementsAre;
using ::testing::HasSubstr;
using testing::indexData;
using ::testing::IsEmpty;
using ::testing::Not;

/// The bytes of a small index, to be damaged, with checksums that can be made right again.
class IndexCheck : public ::testing::Test {
 protected:
  IndexCheck() {
    std::vector<Document> documents;
    for (int i = 0; i < 40; ++i) {
      Document document = testing::page("/page" + std::to_string(100 + i), "the queue prints");
      document.title = "Title " + std::to_string(i);
      document.abstract = "Abstract";
      document.headings = {"Words like word" + std::to_string(i)};
      documents.push_back(std::move(document));
    }
    const platform::Data data = indexData(documents);
    _bytes.assign(data.span().begin(), data.span().end());
  }

  uint8_t* header() { return _bytes.data(); }

  uint8_t* entry(Section id) {
    const auto count = format::load<uint32_t>(header() + format::sectionCountAt);
    for (uint32_t i = 0; i < count; ++i) {
      uint8_t* const at = header() + format::headerLength + i * format::sectionEntryLength;
      if (format::load<uint32_t>(at + format::sectionIDAt) == static_cast<uint32_t>(id)) {
        return at;
      }
    }
    return nullptr;
  }

  std::span<uint8_t> section(Section id) {
    const uint8_t* const at = entry(id);
    return std::span(_bytes).subspan(format::load<uint64_t>(at + format::sectionOffsetAt),
                                     format::load<uint64_t>(at + format::sectionLengthAt));
  }

  void makeChecksumsRight() {
    for (const Section id :
         {Section::documents, Section::documentLengths, Section::blockKeys, Section::blockOffsets,
          Section::dictionary, Section::postings, Section::storedText, Section::positions}) {
      format::store(entry(id) + format::sectionChecksumAt, crc32c(section(id)));
    }
    const auto length = format::load<uint32_t>(header() + format::headerLengthAt);
    format::store(header() + format::headerChecksumAt, uint32_t{0});
    format::store(header() + format::headerChecksumAt, crc32c({header(), length}));
  }

  std::vector<std::string> problems() {
    const SKIndexRef index = SKIndexOpenWithData(platform::Data::adopt(_bytes));
    return index == nullptr ? std::vector<std::string>{"not opened"} : indexProblems(*index);
  }

  /// Problems of an index of which only this is wrong.
  std::vector<std::string> problemsAfter(const std::function<void()>& change) {
    const std::vector<uint8_t> former = _bytes;
    change();
    makeChecksumsRight();
    std::vector<std::string> found = problems();
    _bytes = former;
    return found;
  }

  std::vector<uint8_t> _bytes;
};

TEST_F(IndexCheck, whatTheWriterWritesIsSound) {
  EXPECT_THAT(problems(), IsEmpty());
  makeChecksumsRight();
  EXPECT_THAT(problems(), IsEmpty());
  const SKIndexRef empty = SKIndexOpenWithData(indexData({}));
  EXPECT_THAT(indexProblems(*empty), IsEmpty());
}

TEST_F(IndexCheck, everyChangedByteIsFoundByTheChecksums) {
  for (size_t at = 0; at < _bytes.size(); ++at) {
    _bytes[at] ^= 0x40;
    // Bytes between sections mean nothing.
    const bool isBetween = [&] {
      size_t covered = format::load<uint32_t>(header() + format::headerLengthAt);
      if (at < covered) {
        return false;
      }
      for (const Section id :
           {Section::documents, Section::documentLengths, Section::blockKeys, Section::blockOffsets,
            Section::dictionary, Section::postings, Section::storedText, Section::positions}) {
        const std::span<uint8_t> bytes = section(id);
        const auto begin = static_cast<size_t>(bytes.data() - _bytes.data());
        if (at >= begin && at < begin + bytes.size()) {
          return false;
        }
      }
      return true;
    }();
    if (!isBetween) {
      EXPECT_THAT(problems(), Not(IsEmpty())) << at;
    }
    _bytes[at] ^= 0x40;
  }
}

TEST_F(IndexCheck, checksumsAreNamed) {
  section(Section::positions)[3] ^= 1;
  EXPECT_THAT(problems(), Contains("the checksum of section 8 (positions) is wrong"));
  section(Section::positions)[3] ^= 1;
  header()[format::icuMinorAt] ^= 1;
  EXPECT_THAT(problems(), ElementsAre("the checksum of the header is wrong"));
}

TEST_F(IndexCheck, storedTextsAreLookedAt) {
  const auto documents = [this] { return section(Section::documents).data(); };
  EXPECT_THAT(problemsAfter([&] { format::store(documents(), uint32_t{0xFFFFFF}); }),
              Contains("page 0: its texts lie outside the stored text"));
  EXPECT_THAT(problemsAfter([&] { section(Section::storedText)[0] = 'x'; }),
              Contains("page 0: its path does not begin with a slash"));
  EXPECT_THAT(problemsAfter([&] { section(Section::storedText)[1] = 'z'; }),
              Contains("page 1: its path is not above that of the page before"));
  // "/page100Title 0Abstract"
  EXPECT_THAT(problemsAfter([&] { section(Section::storedText)[8] = 0xFF; }),
              ElementsAre("page 0: its title is not UTF-8"));
  EXPECT_THAT(problemsAfter([&] { section(Section::storedText)[16] = 0xFF; }),
              ElementsAre("page 0: its abstract is not UTF-8"));
}

TEST_F(IndexCheck, blocksAreLookedAt) {
  EXPECT_THAT(problemsAfter([&] { section(Section::blockKeys)[0] ^= 1; }),
              ElementsAre("term 1: the key of its block is wrong"));
  EXPECT_THAT(
      problemsAfter([&] {
        section(Section::blockOffsets)[format::blockOffsetLength + format::blockPositionsAt] ^= 1;
      }),
      ElementsAre("block 1: its offsets are wrong"));
}

TEST_F(IndexCheck, termsAreLookedAt) {
  // The first block: flags, heads, lengths of postings and of positions, then texts.
  const auto block = [this] { return section(Section::dictionary).data(); };
  constexpr size_t heads = 1;
  constexpr size_t lengths = heads + format::termsPerBlock;
  constexpr size_t texts = lengths + 2 * size_t{format::termsPerBlock};
  const auto isBroken = Contains("term 1: its entry in the dictionary is broken");
  ASSERT_EQ(block()[0], 0);
  EXPECT_THAT(problemsAfter([&] { block()[0] = 3; }), isBroken);
  EXPECT_THAT(problemsAfter([&] { block()[0] = 8; }), isBroken);
  EXPECT_THAT(problemsAfter([&] { block()[0] = format::hasLongPositions; }), Not(IsEmpty()));
  // Something shared with no term before it, no bytes at all, and a number that fits the head.
  EXPECT_THAT(problemsAfter([&] { block()[heads] = 0x13; }), isBroken);
  EXPECT_THAT(problemsAfter([&] { block()[heads] = 0; }), isBroken);
  EXPECT_THAT(problemsAfter([&] {
                block()[heads] = 0xF0;
                block()[texts] = 1;
              }),
              isBroken);
  EXPECT_THAT(problemsAfter([&] { block()[texts] = 'z'; }),
              Contains(HasSubstr("is not above the term before")));
  EXPECT_THAT(problemsAfter([&] { block()[texts] = 0xFF; }), Contains("term 1: it is not UTF-8"));
  EXPECT_THAT(problemsAfter([&] { ++block()[lengths]; }), Not(IsEmpty()));
  EXPECT_THAT(problemsAfter([&] { ++block()[lengths + format::termsPerBlock]; }), Not(IsEmpty()));
}

TEST_F(IndexCheck, postingsAndPositionsAreLookedAt) {
  const auto broken = Contains(HasSubstr("its postings or positions are broken"));
  EXPECT_THAT(problemsAfter([&] { section(Section::postings)[0] = 0; }), broken);
  // No page has so high a number.
  EXPECT_THAT(problemsAfter([&] {
                const std::span<uint8_t> list = section(Section::postings).subspan(1, 4);
                std::fill(list.begin(), list.end(), uint8_t{0x7C});
              }),
              broken);
  EXPECT_THAT(problemsAfter([&] { section(Section::positions)[0] = 0xFF; }), broken);
}

TEST_F(IndexCheck, sumsAreLookedAt) {
  EXPECT_THAT(problemsAfter([&] { ++section(Section::documentLengths)[4]; }),
              Contains(HasSubstr("page 1: it has")));
  EXPECT_THAT(problemsAfter([&] { ++header()[format::wordCountAt]; }),
              ElementsAre(HasSubstr("but the header says")));
}

TEST_F(IndexCheck, noMoreProblemsAreToldThanWanted) {
  for (uint8_t& byte : section(Section::documents)) {
    byte = 0xFF;
  }
  const SKIndexRef index = SKIndexOpenWithData(platform::Data::adopt(_bytes));
  ASSERT_NE(index, nullptr);
  EXPECT_EQ(indexProblems(*index, 5).size(), 5U);
}

TEST_F(IndexCheck, anyChangedByteUnderRightChecksumsDoesNoHarm) {
  const std::vector<uint8_t> former = _bytes;
  size_t found = 0;
  for (size_t at = format::headerLength; at < _bytes.size(); ++at) {
    for (const int change : {0x01, 0x80, 0xFF}) {
      const uint8_t byte = _bytes[at];
      _bytes[at] = static_cast<uint8_t>(byte ^ change);
      const size_t tableEnd = format::load<uint32_t>(header() + format::headerLengthAt);
      if (at >= tableEnd) {
        makeChecksumsRight();
      }
      found += problems().empty() ? 0 : 1;
      _bytes = former;
      EXPECT_EQ(_bytes[at], byte);
    }
  }
  EXPECT_GT(found, _bytes.size());
}

}  // namespace
}  // namespace searchkit
