// The time limit of a call, with a clock that moves by as much as a test says at each look.
#include <gtest/gtest.h>

#include <limits>
#include <map>
#include <memory>
#include <string>
#include <vector>

#include "SearchKit/SearchKit.h"
#include "platform/Environment.h"
#include "tests/SearchKit/Indexes.h"

namespace searchkit {
namespace {

using testing::openIndex;
using testing::page;

class TickingClock : public platform::SimulatedClock {
 public:
  explicit TickingClock(double secondsPerLook) : _step(secondsPerLook) {}

  Instant elapsed() const override { return Instant(_step * static_cast<double>(_looks++)); }

  int looks() const { return _looks; }

 private:
  double _step;
  mutable int _looks = 0;
};

// Enough postings, positions and terms that every kind of search takes many looks at the clock.
SKIndexRef largeIndex() {
  static const SKIndexRef index = [] {
    std::vector<Document> pages;
    for (int i = 0; i < 12000; ++i) {
      const std::string number = std::to_string(i);
      pages.push_back(page("/" + number, "common phrase of words common rare" +
                                             std::to_string(i % 4000) + " x" + number + "y"));
    }
    return openIndex(pages);
  }();
  return index;
}

struct Search {
  std::map<SKDocumentID, float> hits;
  int calls = 0;
  int emptyCalls = 0;
};

Search runSearch(const char* query, double secondsPerLook, double maximumTime,
                 SKSearchOptions options = 0) {
  platform::Environment environment = *platform::Environment::current();
  environment.clock = std::make_shared<TickingClock>(secondsPerLook);
  const platform::EnvironmentOverride override(environment);
  const SKSearchRef search = SKSearchCreate(largeIndex(), query, options);
  Search result;
  bool mayHaveMore = true;
  while (mayHaveMore && result.calls < 1000000) {
    SKDocumentID ids[50];
    float scores[50];
    size_t count = 0;
    mayHaveMore = SKSearchFindMatches(*search, 50, ids, scores, maximumTime, &count);
    ++result.calls;
    result.emptyCalls += count == 0 && mayHaveMore ? 1 : 0;
    for (size_t i = 0; i < count; ++i) {
      EXPECT_TRUE(result.hits.emplace(ids[i], scores[i]).second);
    }
  }
  return result;
}

constexpr const char* slowQueries[] = {"common*",
                                       "*mm*",
                                       "c* w* p*",
                                       "\"common phrase of words\"",
                                       "\"co* ph*\"",
                                       "*9y -common",
                                       "(common | words) (phrase | of)",
                                       "x*5y | rare1*",
                                       "words -rare1* ",
                                       "\"words common\" rare*"};

TEST(SKSearchFindMatches, stopsWhenItsTimeIsUpAndGoesOnInTheNextCall) {
  for (const char* query : slowQueries) {
    const Search whole = runSearch(query, 0, 1.0);
    EXPECT_EQ(whole.emptyCalls, 0) << query;
    const Search pieces = runSearch(query, 10.0, 1.0);
    EXPECT_GT(pieces.emptyCalls, 0) << query;
    EXPECT_EQ(pieces.hits, whole.hits) << query;
  }
}

TEST(SKSearchFindMatches, looksAtTheClockOftenEnoughForAnyPartOfASearch) {
  for (const char* query : slowQueries) {
    // A tick of a tenth of the limit: it may overrun by no more than one look.
    platform::Environment environment = *platform::Environment::current();
    const auto clock = std::make_shared<TickingClock>(0.1);
    environment.clock = clock;
    const platform::EnvironmentOverride override(environment);
    const SKSearchRef search = SKSearchCreate(largeIndex(), query, 0);
    for (bool mayHaveMore = true; mayHaveMore;) {
      SKDocumentID ids[50];
      size_t count = 0;
      const int before = clock->looks();
      mayHaveMore = SKSearchFindMatches(*search, 50, ids, nullptr, 1.0, &count);
      EXPECT_LE(clock->looks() - before, 13) << query;
    }
  }
}

TEST(SKSearchFindMatches, getsOnEvenWithoutAnyTime) {
  for (const double time : {0.0, -5.0, std::numeric_limits<double>::quiet_NaN(),
                            -std::numeric_limits<double>::infinity()}) {
    const Search result = runSearch("common -words | phrase", 0.001, time);
    EXPECT_EQ(result.hits.size(), 12000U);
  }
}

TEST(SKSearchFindMatches, takesAllTheTimeThereIs) {
  const Search result = runSearch("common*", 1.0, std::numeric_limits<double>::infinity());
  EXPECT_EQ(result.emptyCalls, 0);
  EXPECT_EQ(result.hits.size(), 12000U);
}

}  // namespace
}  // namespace searchkit
