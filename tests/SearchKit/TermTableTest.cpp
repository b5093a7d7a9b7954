#include "SearchKit/TermTable.h"

#include <gtest/gtest.h>

#include <algorithm>
#include <map>
#include <random>
#include <string>
#include <vector>

namespace searchkit {
namespace {

// As the tokenizer hands terms over: eight bytes can be read.
uint32_t find(TermTable& terms, std::string text) {
  const size_t length = text.size();
  text += "surplus!";
  return terms.find(TermTable::keyOf(std::string_view(text).substr(0, length)), text.data());
}

TEST(TermTable, hasOneEntryATerm) {
  TermTable terms;
  std::map<std::string, uint32_t> entries;
  std::mt19937 random(21);
  for (int i = 0; i < 30000; ++i) {
    std::string text;
    for (auto length = 1 + random() % (i % 10 == 0 ? 40 : 9); length > 0; --length) {
      text += static_cast<char>('a' + random() % 3);
    }
    const uint32_t entry = find(terms, text);
    const auto known = entries.emplace(text, entry);
    ASSERT_EQ(known.first->second, entry) << text;
  }
  ASSERT_EQ(terms.size(), entries.size());
  std::vector<uint32_t> sorted;
  for (const auto& [text, entry] : entries) {
    EXPECT_EQ(terms.text(entry), text);
    sorted.push_back(entry);
  }
  EXPECT_EQ(terms.sortedEntries(), sorted);
}

TEST(TermTable, tellsTermsApartThatBeginAlike) {
  TermTable terms;
  const std::string longest(255, 'x');
  const std::vector<std::string> texts{"function",   "functions", "functio",
                                       "functional", longest,     longest.substr(1)};
  for (uint32_t i = 0; i < texts.size(); ++i) {
    EXPECT_EQ(find(terms, texts[i]), i);
  }
  for (uint32_t i = 0; i < texts.size(); ++i) {
    EXPECT_EQ(find(terms, texts[i]), i);
  }
}

TEST(TermTable, sortsByBytesNotBySignedCharacters) {
  TermTable terms;
  find(terms, "\xD0\xB6");
  find(terms, "z");
  find(terms, "abcdefghz");
  find(terms, "abcdefgh\xC3\xA9");
  EXPECT_EQ(terms.sortedEntries(), (std::vector<uint32_t>{2, 3, 1, 0}));
}

TEST(ByteStream, hasWhatWasAppendedInWhateverSteps) {
  std::mt19937 random(4);
  for (int round = 0; round < 50; ++round) {
    Arena arena;
    ByteStream stream;
    std::vector<uint8_t> expected;
    for (int i = 0; i < 3000; ++i) {
      if (random() % 2 == 0) {
        const uint64_t words[2] = {uint64_t{random()} << 32 | random(), random()};
        const size_t length = random() % 17;
        stream.appendShort(arena, words[0], words[1], length);
        const auto* const bytes = reinterpret_cast<const uint8_t*>(words);
        expected.insert(expected.end(), bytes, bytes + length);
      } else {
        const std::vector<uint8_t> bytes(random() % 40, static_cast<uint8_t>(random()));
        stream.append(arena, bytes.data(), bytes.size());
        expected.insert(expected.end(), bytes.begin(), bytes.end());
      }
    }
    std::vector<uint8_t> copied;
    stream.copyTo(copied);
    ASSERT_EQ(copied, expected);
  }
}

}  // namespace
}  // namespace searchkit
