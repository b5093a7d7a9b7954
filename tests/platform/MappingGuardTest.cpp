#include "platform/MappingGuard.h"

#include <gtest/gtest.h>

#include <algorithm>
#include <csignal>
#include <filesystem>
#include <numeric>
#include <string>
#include <vector>

#include "platform/Files.h"
#include "tests/platform/TemporaryFolder.h"

using platform::Data;

namespace {

constexpr size_t length = 100000;

class MappingGuard : public testing::Test {
 protected:
  MappingGuard() : path(folder.write("file", std::string(length, 'x'))) {}

  Data mapped() const { return platform::systemFileManager()->contentsMappedAtPath(path).value(); }
  void cutOff(size_t newLength) const { std::filesystem::resize_file(path, newLength); }

  tests::TemporaryFolder folder;
  const std::string path;
};

using MappingGuardDeathTest = MappingGuard;

size_t countOf(const Data& data, char byte) {
  return static_cast<size_t>(std::count(data.view().begin(), data.view().end(), byte));
}

}  // namespace

TEST_F(MappingGuard, TheBytesAreThoseOfTheFile) {
  const Data guarded = platform::dataGuardedAgainstTruncation(mapped());
  EXPECT_EQ(guarded, mapped());
}

TEST_F(MappingGuard, WhatIsCutOffReadsAsZeros) {
  const Data guarded = platform::dataGuardedAgainstTruncation(mapped());
  const Data slice = guarded.slice(length - 10, 10);
  cutOff(8192);
  EXPECT_EQ(countOf(guarded, 'x'), 8192U);
  EXPECT_EQ(countOf(guarded, '\0'), length - 8192);
  EXPECT_EQ(countOf(slice, '\0'), 10U);
}

TEST_F(MappingGuard, SeveralDataAreGuardedEachForItself) {
  const std::string otherPath = folder.write("other", std::string(length, 'y'));
  const Data other = platform::dataGuardedAgainstTruncation(
      platform::systemFileManager()->contentsMappedAtPath(otherPath).value());
  std::vector<Data> guarded;
  guarded.reserve(10);
  for (int i = 0; i < 10; ++i) {
    guarded.push_back(platform::dataGuardedAgainstTruncation(mapped()));
  }
  guarded.erase(guarded.begin(), guarded.begin() + 5);
  cutOff(0);
  for (const Data& data : guarded) {
    EXPECT_EQ(countOf(data, '\0'), length);
  }
  EXPECT_EQ(countOf(other, 'y'), length);
}

TEST_F(MappingGuard, RangesAreGivenBackWithTheData) {
  for (int i = 0; i < 1000; ++i) {
    EXPECT_EQ(platform::dataGuardedAgainstTruncation(mapped()).length(), length);
  }
  const Data guarded = platform::dataGuardedAgainstTruncation(mapped());
  cutOff(0);
  EXPECT_EQ(countOf(guarded, '\0'), length);
}

TEST_F(MappingGuard, MoreDataThanCanBeGuardedAreGivenBackAsTheyAre) {
  const Data copy = Data::copy("some bytes");
  const std::vector<Data> many(1000, copy);
  std::vector<Data> guarded;
  for (const Data& data : many) {
    guarded.push_back(platform::dataGuardedAgainstTruncation(data));
    EXPECT_EQ(guarded.back(), copy);
  }
}

TEST_F(MappingGuard, NoBytesAndBytesOfABufferMayBeGuarded) {
  EXPECT_EQ(platform::dataGuardedAgainstTruncation({}), Data());
  EXPECT_EQ(platform::dataGuardedAgainstTruncation(Data::copy("x")), Data::copy("x"));
}

TEST_F(MappingGuardDeathTest, OtherFaultsEndTheProcessAsBefore) {
  const Data guarded = platform::dataGuardedAgainstTruncation(mapped());
  const Data unguarded = mapped();
  cutOff(0);
  // The count must be wanted, or it is never made.
  volatile size_t count = 0;
  EXPECT_DEATH(count = countOf(unguarded, 'x'), "");
  EXPECT_EQ(count, 0U);
  EXPECT_DEATH(std::raise(SIGBUS), "");
}
