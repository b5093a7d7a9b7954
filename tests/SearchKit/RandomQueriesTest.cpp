// The engine against the naive one, over random documents and queries.
#include <gtest/gtest.h>

#include <cmath>
#include <random>
#include <string>
#include <vector>

#include "SearchKit/IndexReader.h"
#include "SearchKit/SearchKit.h"
#include "tests/SearchKit/Indexes.h"
#include "tests/SearchKit/NaiveEngine.h"

namespace searchkit::testing {
namespace {

const std::vector<std::string> vocabulary{"a",      "ab",      "abc",   "abcdefgh",   "abcdefghi",
                                          "b",      "ba",      "bab",   "abcdefghij", "print",
                                          "prints", "printer", "queue", "z",          "zz9",
                                          "9",      "aab",     "abab",  "queues",     "grosse"};

class World {
 public:
  explicit World(uint32_t seed) : _random(seed) {}

  std::mt19937& random() { return _random; }
  size_t below(size_t limit) { return _random() % limit; }

  const std::string& word() {
    // Low numbers are more frequent, so that terms differ in how common they are.
    return vocabulary[std::min(below(vocabulary.size()), below(vocabulary.size()))];
  }

  Words words(size_t most) {
    Words all;
    for (size_t count = below(most + 1); count > 0; --count) {
      all.push_back(word());
    }
    return all;
  }

  NaiveDocument document() {
    NaiveDocument document{words(3), {}, {}};
    for (size_t count = below(3); count > 0; --count) {
      document.headings.push_back(words(3));
    }
    for (size_t count = below(4); count > 0; --count) {
      document.body.push_back(words(12));
    }
    return document;
  }

  // The words as a page might spell them.
  std::string spelled(const Words& words) {
    static const char* const separators[] = {" ",   "  ", ", ", "-",  "_",
                                             " … ", "'",  "\n", " (", "."};
    std::string text;
    for (std::string word : words) {
      if (word == "grosse" && below(2) == 0) {
        word = "Größe";
      } else if (below(3) == 0) {
        word[0] = static_cast<char>(std::toupper(word[0]));
      }
      text += word + separators[below(std::size(separators))];
    }
    return text;
  }

  std::string pattern() {
    std::string pattern = word();
    switch (below(8)) {
      case 0:
        return pattern.substr(0, below(pattern.size()) + 1) + "*";
      case 1:
        return pattern + "*";
      case 2:
        return "*" + pattern.substr(below(pattern.size()));
      case 3:
        return "*" + pattern.substr(below(pattern.size()), 1) + "*";
      case 4:
        return pattern.substr(0, 1) + "*" + pattern.substr(below(pattern.size()));
      default:
        return pattern;
    }
  }

  NaiveQuery query(size_t depth, bool blankMeansOr) {
    NaiveQuery query;
    if (depth == 0 || below(3) == 0) {
      query.patterns.push_back(pattern());
      if (below(4) == 0) {
        for (size_t more = below(3) + 1; more > 0; --more) {
          query.patterns.push_back(below(4) == 0 ? pattern() : word());
        }
      }
      return query;
    }
    for (size_t count = below(3) + 1; count > 0; --count) {
      std::vector<NaiveQuery::Item> items;
      for (size_t item = below(3) + 1; item > 0; --item) {
        const NaiveQuery::Sign signs[] = {NaiveQuery::Sign::none, NaiveQuery::Sign::none,
                                          NaiveQuery::Sign::plus, NaiveQuery::Sign::minus};
        items.push_back({signs[below(4)], {this->query(depth - 1, blankMeansOr)}});
      }
      query.alternatives.push_back(std::move(items));
    }
    while (query.separators.size() + 1 < query.alternatives.size()) {
      query.separators += blankMeansOr && below(2) == 0 ? ' ' : '|';
    }
    return query;
  }

 private:
  std::mt19937 _random;
};

std::string pathOf(size_t number) {
  std::string digits = std::to_string(number);
  return "/" + std::string(6 - digits.size(), '0') + digits;
}

struct Sample {
  NaiveEngine naive;
  SKIndexRef index;
};

Sample makeSample(World& world, size_t documentCount) {
  std::vector<NaiveDocument> documents;
  std::vector<Document> pages;
  for (size_t i = 0; i < documentCount; ++i) {
    documents.push_back(world.document());
    const NaiveDocument& document = documents.back();
    Document page;
    page.path = pathOf(i);
    page.title = world.spelled(document.title);
    for (const Words& heading : document.headings) {
      page.headings.push_back(world.spelled(heading));
    }
    for (const Words& block : document.body) {
      page.body.push_back(world.spelled(block));
    }
    pages.push_back(std::move(page));
  }
  std::shuffle(pages.begin(), pages.end(), world.random());
  return {NaiveEngine(documents), openIndex(pages)};
}

// Returns how many of the queries found some documents but not all.
int compareSearches(uint32_t seed, size_t documentCount, int queryCount) {
  int telling = 0;
  World world(seed);
  const Sample sample = makeSample(world, documentCount);
  for (int i = 0; i < queryCount; ++i) {
    const bool blankMeansOr = world.below(2) == 0;
    const NaiveQuery query = world.query(world.below(4), blankMeansOr);
    const std::string text = query.text(world.random(), blankMeansOr);
    DocumentNumbers numbers;
    for (const auto& [id, score] :
         scores(sample.index, text, blankMeansOr ? kSKSearchOptionSpaceMeansOR : 0)) {
      numbers.insert(id);
      EXPECT_TRUE(std::isfinite(score) && score > 0) << text;
    }
    EXPECT_EQ(numbers, sample.naive.find(query))
        << "seed " << seed << ", blank means " << (blankMeansOr ? "or" : "and") << ": " << text;
    telling += !numbers.empty() && numbers.size() < documentCount ? 1 : 0;
  }
  return telling;
}

TEST(RandomQueries, findWhatTheNaiveEngineFinds) {
  int telling = 0;
  for (uint32_t seed = 1; seed <= 60 && !HasFailure(); ++seed) {
    telling += compareSearches(seed, 1 + seed * seed % 97, 100);
  }
  // Queries that find nothing, or everything, prove little.
  EXPECT_GT(telling, 3000);
}

TEST(RandomQueries, findWhatTheNaiveEngineFindsAmongManyDocuments) {
  EXPECT_GT(compareSearches(1000, 700, 150), 75);
}

TEST(RandomQueries, scoreSingleTermsByTheFormula) {
  for (uint32_t seed = 1; seed <= 20; ++seed) {
    World world(seed);
    const Sample sample = makeSample(world, 40);
    for (int i = 0; i < 30; ++i) {
      const std::string pattern = world.pattern();
      for (const auto& [id, score] : scores(sample.index, pattern)) {
        const double expected = sample.naive.score(pattern, id);
        ASSERT_NEAR(score, expected, 1e-4 * expected) << "seed " << seed << ": " << pattern;
      }
    }
  }
}

TEST(RandomQueries, everyTermOfTheDictionaryFindsItsDocuments) {
  World world(5);
  const Sample sample = makeSample(world, 200);
  for (const std::string& word : vocabulary) {
    NaiveQuery query;
    query.patterns.push_back(word);
    DocumentNumbers numbers;
    for (const SKDocumentID id : indexDocumentsWithTerm(*sample.index, word)) {
      numbers.insert(id);
    }
    EXPECT_EQ(numbers, sample.naive.find(query)) << word;
  }
}

// Text of arbitrary characters is never refused, and never crashes.
TEST(RandomQueries, ofAnyCharactersAreAnswered) {
  World world(77);
  const Sample sample = makeSample(world, 30);
  static const char* const pieces[] = {"a",    "ab*", "\"", "(",    ")",  "-", "+",
                                       "!",    "&",   "|",  "*",    " ",  "é", "東",
                                       "\xFF", "“",   "9",  "zz9 ", "--", "? "};
  for (int i = 0; i < 20000; ++i) {
    std::string text;
    for (size_t count = world.below(16); count > 0; --count) {
      text += pieces[world.below(std::size(pieces))];
    }
    const SKSearchOptions options = world.below(2) == 0 ? 0 : kSKSearchOptionSpaceMeansOR;
    for (const auto& [id, score] : scores(sample.index, text, options)) {
      ASSERT_LT(id, 30U) << text;
      ASSERT_TRUE(std::isfinite(score) && score > 0) << text;
    }
  }
}

}  // namespace
}  // namespace searchkit::testing
