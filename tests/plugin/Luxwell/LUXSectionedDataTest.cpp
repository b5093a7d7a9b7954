#include "host/Luxwell/LUXSectionedData.h"

#include <gtest/gtest.h>

#include <string>

#include "platform/Exception.h"

using platform::Data;

namespace {

LUXSectionedData example() {
  return LUXSectionedData({LUXSection::sectionWithBytes(9, Data::copy("nine")),
                           LUXSection::sectionWithBytes(2, Data::copy("two, longer than a word")),
                           LUXSection::sectionWithBytes(5, Data())});
}

void put(std::string& bytes, size_t offset, uint64_t value, size_t width) {
  for (size_t i = 0; i < width; ++i) {
    bytes[offset + i] = static_cast<char>(value >> (8 * i));
  }
}

// Makes the header's checksum right again after a change, by a slow computation of its own.
std::string sealed(std::string bytes) {
  const auto count = static_cast<unsigned char>(bytes[12]);
  std::string checked = bytes.substr(0, 24) + bytes.substr(32, size_t{count} * 32);
  uint32_t crc = 0xFFFFFFFF;
  for (const char c : checked) {
    for (int bit = 0; bit < 8; ++bit) {
      const bool carry = ((crc ^ (static_cast<unsigned char>(c) >> bit)) & 1) != 0;
      crc = (crc >> 1) ^ (carry ? 0xEDB88320U : 0);
    }
  }
  put(bytes, 24, ~crc, 4);
  return bytes;
}

bool reads(const std::string& bytes) {
  return LUXSectionedData::read(Data::copy(bytes)).has_value();
}

}  // namespace

TEST(LUXSectionedData, ReadsWhatItWrote) {
  const auto read = LUXSectionedData::read(example().write());
  ASSERT_TRUE(read);
  ASSERT_NE(read->sectionWithType(2), nullptr);
  EXPECT_EQ(read->sectionWithType(2)->bytes.view(), "two, longer than a word");
  EXPECT_TRUE(read->sectionWithType(2)->checksumMatches());
  EXPECT_EQ(read->sectionWithType(9)->bytes.view(), "nine");
  EXPECT_TRUE(read->sectionWithType(5)->bytes.empty());
  EXPECT_TRUE(read->sectionWithType(5)->checksumMatches());
  EXPECT_EQ(read->sectionWithType(1), nullptr);
  EXPECT_EQ(read->write(), example().write());
}

TEST(LUXSectionedData, HasTheDocumentedBytes) {
  const LUXSectionedData data({LUXSection::sectionWithBytes(1, Data::copy("123456789"))});
  std::string expected = "LUXINDEX";
  expected.resize(32 + 32);
  put(expected, 8, 1, 2);
  put(expected, 10, 2, 2);
  put(expected, 12, 1, 4);
  put(expected, 16, 73, 8);
  put(expected, 32, 1, 4);
  put(expected, 36, 0xCBF43926, 4);  // the well-known check value of this CRC
  put(expected, 40, 64, 8);
  put(expected, 48, 9, 8);
  EXPECT_EQ(data.write().view(), sealed(expected + "123456789"));
}

TEST(LUXSectionedData, SectionsAreSlicesOfWhatWasRead) {
  const Data data = example().write();
  const auto read = LUXSectionedData::read(data);
  ASSERT_TRUE(read);
  const uint8_t* bytes = read->sectionWithType(9)->bytes.bytes();
  EXPECT_GE(bytes, data.bytes());
  EXPECT_LT(bytes, data.bytes() + data.length());
}

TEST(LUXSectionedData, ContentWithoutSectionsIsThirtyTwoBytes) {
  const Data data = LUXSectionedData(std::vector<LUXSection>{}).write();
  EXPECT_EQ(data.length(), 32U);
  EXPECT_TRUE(LUXSectionedData::read(data));
}

TEST(LUXSectionedData, RefusesATypeThatOccursTwiceAndTooManySections) {
  const LUXSection section = LUXSection::sectionWithBytes(3, Data());
  EXPECT_THROW(LUXSectionedData({section, section}), platform::Exception);
  std::vector<LUXSection> many;
  for (uint32_t type = 0; type <= LUXSectionedData::maximumSectionCount; ++type) {
    many.push_back(LUXSection::sectionWithBytes(type, Data()));
  }
  EXPECT_THROW(LUXSectionedData{many}, platform::Exception);
  many.pop_back();
  EXPECT_TRUE(LUXSectionedData::read(LUXSectionedData(many).write()));
}

TEST(LUXSectionedData, RefusesTruncationAtEveryByteAndTrailingBytes) {
  const std::string bytes(example().write().view());
  for (size_t length = 0; length < bytes.size(); ++length) {
    EXPECT_FALSE(reads(bytes.substr(0, length))) << length;
  }
  EXPECT_TRUE(reads(bytes));
  EXPECT_FALSE(reads(bytes + '\0'));
}

TEST(LUXSectionedData, NoticesEveryFlippedBitOfHeaderTableAndSections) {
  const std::string bytes(example().write().view());
  const auto original = LUXSectionedData::read(Data::copy(bytes));
  for (size_t offset = 0; offset < bytes.size(); ++offset) {
    for (int bit = 0; bit < 8; ++bit) {
      std::string damaged = bytes;
      damaged[offset] = static_cast<char>(damaged[offset] ^ (1 << bit));
      const auto read = LUXSectionedData::read(Data::copy(damaged));
      if (!read) {
        continue;
      }
      // What still opens has the same sections, or says that they are damaged; only bytes that
      // mean nothing may differ.
      for (const uint32_t type : {2U, 5U, 9U}) {
        const LUXSection* section = read->sectionWithType(type);
        ASSERT_NE(section, nullptr) << offset;
        EXPECT_TRUE(!section->checksumMatches() ||
                    section->bytes == original->sectionWithType(type)->bytes)
            << offset;
      }
    }
  }
}

TEST(LUXSectionedData, RefusesAnotherMajorVersionAndTakesAHigherMinorOne) {
  std::string bytes(example().write().view());
  put(bytes, 8, 2, 2);
  EXPECT_FALSE(reads(sealed(bytes)));
  put(bytes, 8, 0, 2);
  EXPECT_FALSE(reads(sealed(bytes)));
  put(bytes, 8, 1, 2);
  put(bytes, 10, 7, 2);
  const auto read = LUXSectionedData::read(Data::copy(sealed(bytes)));
  ASSERT_TRUE(read);
  EXPECT_EQ(read->write().view(), sealed(bytes)) << "the minor version is kept";
}

TEST(LUXSectionedData, RefusesACountBeyondTheLimitOrTheBytes) {
  std::string bytes(example().write().view());
  put(bytes, 12, 65, 4);
  EXPECT_FALSE(reads(bytes));
  put(bytes, 12, 0xFFFFFFFF, 4);
  EXPECT_FALSE(reads(bytes));
  put(bytes, 12, 60, 4);
  EXPECT_FALSE(reads(bytes));
}

TEST(LUXSectionedData, RefusesSectionsThatAreOutOfPlace) {
  const std::string good(example().write().view());
  const size_t firstOffset = 32 + 8;
  const size_t firstLength = 32 + 16;
  const size_t lastOffset = 32 + 2 * 32 + 8;
  ASSERT_TRUE(reads(sealed(good)));

  std::string bytes = good;
  put(bytes, firstOffset, 64, 8);
  EXPECT_FALSE(reads(sealed(bytes))) << "inside the table";
  bytes = good;
  put(bytes, firstOffset, 129, 8);
  EXPECT_FALSE(reads(sealed(bytes))) << "not aligned";
  bytes = good;
  put(bytes, firstLength, 1000, 8);
  EXPECT_FALSE(reads(sealed(bytes))) << "beyond the end";
  bytes = good;
  put(bytes, firstLength, ~uint64_t{0}, 8);
  EXPECT_FALSE(reads(sealed(bytes))) << "a length that overflows";
  bytes = good;
  put(bytes, firstOffset, ~uint64_t{7}, 8);
  EXPECT_FALSE(reads(sealed(bytes))) << "an offset that overflows";
  bytes = good;
  put(bytes, lastOffset, 128, 8);
  EXPECT_FALSE(reads(sealed(bytes))) << "two on the same bytes";
  bytes = good;
  put(bytes, 32, 5, 4);
  EXPECT_FALSE(reads(sealed(bytes))) << "a type twice";
  bytes = good;
  put(bytes, 32, 7, 4);
  EXPECT_FALSE(reads(sealed(bytes))) << "types out of order";
}

TEST(LUXSectionedData, ClosesGapsWhenItWrites) {
  std::string bytes(
      LUXSectionedData({LUXSection::sectionWithBytes(4, Data::copy("four"))}).write().view());
  const std::string tight = bytes;
  bytes.insert(64, 16, 'x');
  put(bytes, 16, bytes.size(), 8);
  put(bytes, 40, 80, 8);
  const auto read = LUXSectionedData::read(Data::copy(sealed(bytes)));
  ASSERT_TRUE(read);
  EXPECT_EQ(read->write().view(), tight);
}

TEST(LUXSectionedData, WritesTheChecksumOfDamagedBytesAsItWas) {
  std::string bytes(example().write().view());
  bytes.back() = '!';
  const auto read = LUXSectionedData::read(Data::copy(bytes));
  ASSERT_TRUE(read);
  EXPECT_FALSE(read->sectionWithType(9)->checksumMatches());
  const auto again = LUXSectionedData::read(read->write());
  ASSERT_TRUE(again);
  EXPECT_FALSE(again->sectionWithType(9)->checksumMatches());
}
