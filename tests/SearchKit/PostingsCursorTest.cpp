#include "SearchKit/PostingsCursor.h"

#include <gtest/gtest.h>

#include <optional>
#include <random>
#include <string>
#include <tuple>
#include <vector>

#include "SearchKit/SKIndex.h"
#include "platform/Data.h"
#include "tests/SearchKit/Indexes.h"

namespace searchkit {
namespace {

// List, document, weight.
using Postings = std::vector<std::tuple<size_t, uint32_t, uint32_t>>;

// An index of so many empty pages: what a cursor takes the number of documents from.
platform::Data pages(uint32_t count) {
  std::vector<Document> documents;
  for (uint32_t i = 0; i < count; ++i) {
    documents.push_back(testing::page("/" + std::to_string(i), ""));
  }
  return testing::indexData(documents);
}

// The same bytes as an index of another version.
IndexView viewOfVersion(const platform::Data& data, uint16_t version, std::string& bytes) {
  bytes = std::string(data.view());
  format::store(reinterpret_cast<uint8_t*>(bytes.data()) + format::versionAt, version);
  const auto view = IndexView::make({reinterpret_cast<const uint8_t*>(bytes.data()), bytes.size()});
  EXPECT_TRUE(view.has_value());
  return *view;
}

Postings oneByOne(PostingsCursor cursor) {
  Postings postings;
  for (size_t list = 0; cursor.beginList(); ++list) {
    while (cursor.next()) {
      postings.emplace_back(list, cursor.document(), cursor.weight());
    }
  }
  return postings;
}

Postings inSlices(PostingsCursor cursor, size_t length) {
  Postings postings;
  for (size_t list = 0; cursor.beginList(); ++list) {
    while (cursor.isInList()) {
      const size_t before = postings.size();
      const size_t count = cursor.read(length, [&](uint32_t document, uint32_t weight) {
        postings.emplace_back(list, document, weight);
      });
      EXPECT_EQ(postings.size() - before, count);
      EXPECT_TRUE(count == length || !cursor.isInList());
    }
  }
  return postings;
}

PostingsCursor cursorOver(const IndexView& view, const std::vector<uint8_t>& bytes) {
  return PostingsCursor(view, bytes, {0, bytes.size()}, format::maximumWeight);
}

void append(std::vector<uint8_t>& bytes, uint32_t number) {
  uint8_t encoded[format::maximumNumberLength];
  bytes.insert(bytes.end(), encoded, format::writeNumber(encoded, number));
}

}  // namespace

TEST(PostingsCursor, readsNumbersAndWeightsOfAllLengths) {
  const platform::Data data = pages(40000);
  std::string bytesOfIndex;
  const IndexView view = viewOfVersion(data, format::version, bytesOfIndex);
  const Postings expected = {{0, 0, 1},      {0, 1, 3},        {0, 32, 4},   {0, 64, 127},
                             {0, 97, 128},   {0, 4000, 65535}, {0, 8095, 2}, {0, 12192, 4},
                             {0, 39999, 77}, {1, 31, 1},       {1, 63, 5}};
  std::vector<uint8_t> bytes;
  for (const size_t list : {0U, 1U}) {
    append(bytes, list == 0 ? 9 : 2);
    uint32_t next = 0;
    for (const auto& [itsList, document, weight] : expected) {
      if (itsList == list) {
        append(bytes, format::postingNumber(document - next, weight));
        if (format::weightFollows(weight)) {
          append(bytes, weight);
        }
        next = document + 1;
      }
    }
  }
  EXPECT_EQ(oneByOne(cursorOver(view, bytes)), expected);
  for (const size_t length : {1U, 2U, 5U, 100U}) {
    EXPECT_EQ(inSlices(cursorOver(view, bytes), length), expected) << length;
  }
  // Cut off anywhere, it has what is whole before the cut, up to the list that is not.
  for (size_t length = 0; length < bytes.size(); ++length) {
    const std::vector<uint8_t> cut(bytes.begin(), bytes.begin() + static_cast<ptrdiff_t>(length));
    EXPECT_EQ(inSlices(cursorOver(view, cut), 3), oneByOne(cursorOver(view, cut))) << length;
  }
}

TEST(PostingsCursor, readsAnyBytesInSlicesAsOneByOne) {
  const platform::Data data = pages(300);
  std::mt19937 random(7);
  size_t found = 0;
  for (const uint16_t version : {format::firstVersion, format::secondVersion}) {
    std::string bytesOfIndex;
    const IndexView view = viewOfVersion(data, version, bytesOfIndex);
    for (int round = 0; round < 3000; ++round) {
      // Mostly small numbers, as in an index, so that lists go on for a while.
      std::vector<uint8_t> bytes(random() % 40);
      for (uint8_t& byte : bytes) {
        byte = static_cast<uint8_t>(random() % (random() % 8 == 0 ? 256 : 32));
      }
      const Postings expected = oneByOne(cursorOver(view, bytes));
      found += expected.size();
      for (const auto& [list, document, weight] : expected) {
        ASSERT_LT(document, 300U);
        ASSERT_GE(weight, 1U);
        ASSERT_LE(weight, format::maximumWeight);
      }
      ASSERT_EQ(inSlices(cursorOver(view, bytes), 1 + random() % 9), expected);
    }
  }
  EXPECT_GT(found, 10000U);
}

}  // namespace searchkit
