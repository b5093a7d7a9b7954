#include "plugin/front/SearchMerging.h"

#include <gtest/gtest.h>

#include <cmath>
#include <random>

#include "plugin/keyword/ZEBHelpindexSearchController.h"
#include "tests/plugin/front/FrontWorld.h"

using platform::Value;
using testing::DoubleEq;
using testing::ElementsAre;
using testing::SizeIs;
using tests::FrontWorld;
using tests::page;
using tests::relevancesOf;
using tests::semanticResult;
using tests::titlesOf;

namespace {

using Results = std::vector<std::shared_ptr<ZEBResult>>;
using Dictionary = Value::Dictionary;

class SearchMerging : public testing::Test {
 protected:
  ~SearchMerging() override { HelpLUXModel::setGroupList({}); }

  static void setWeights(double book, double group) {
    HelpLUXModel::setGroupList(Dictionary{
        {"Groups",
         Dictionary{{"G", Dictionary{{"Weight", group},
                                     {"Books", Dictionary{{"book", Dictionary{{"Weight", book}}},
                                                          {"bare", Dictionary{}}}}}}}}});
  }

  static std::shared_ptr<ZEBResult> result(double relevance, const std::string& bookID = "book") {
    return semanticResult("t", relevance, bookID);
  }
};

/// A keyword result: its relevance is a 32-bit number, its payload may not grow.
std::shared_ptr<ZEBResult> keywordResult(const std::string& title, float relevance,
                                         const std::string& bookID) {
  auto made = ZEBResult::resultWithTitle(title, ZEBHelpArticleResult);
  made->setRelevance(static_cast<double>(relevance));
  made->setPayload({{ZEBResultURLKey, "file:///" + title}, {ZEBResultBookIDKey, bookID}});
  return made;
}

Results semanticResults(const std::vector<double>& relevances) {
  Results made;
  for (size_t i = 0; i < relevances.size(); ++i) {
    made.push_back(semanticResult("s" + std::to_string(i), relevances[i], "book"));
  }
  return made;
}

// The same arithmetic once more, as slowly and plainly as it can be written.
struct SlowModel {
  struct Item {
    std::string title;
    double relevance;
  };

  std::map<std::string, float> bookWeights;
  float groupWeight = 0;
  std::string primary;

  double factor(const std::string& bookID) const {
    if (bookID == primary) {
      return 1.0;
    }
    const auto found = bookWeights.find(bookID);
    if (found != bookWeights.end() && found->second != 0) {
      return static_cast<double>(found->second);
    }
    if (groupWeight != 0) {
      return static_cast<double>(groupWeight);
    }
    return 1.0;
  }

  std::vector<Item> merge(const Results& semantic, const Results& keyword) const {
    double top = -1;
    for (const auto& one : keyword) {
      if (one->relevance().doubleValue() > top) {
        top = one->relevance().doubleValue();
      }
    }
    double scale = 1.0;
    if (!semantic.empty()) {
      size_t place = 0;
      while (semantic[place]->relevance().doubleValue() >= 0.99 && place + 1 < semantic.size()) {
        place = place + 1;
      }
      scale = semantic[place]->relevance().doubleValue();
    }
    std::vector<Item> items;
    for (const auto& one : keyword) {
      double relevance = one->relevance().doubleValue();
      relevance = relevance / top;
      relevance = relevance * scale;
      relevance = relevance - 0.0001;
      relevance = relevance * factor(*one->bookID());
      items.push_back({*one->title(), relevance});
    }
    for (const auto& one : semantic) {
      items.push_back({*one->title(), one->relevance().doubleValue()});
    }
    // Bubble sort.
    for (size_t i = 0; i < items.size(); ++i) {
      for (size_t k = 0; k + 1 < items.size(); ++k) {
        if (items[k].relevance < items[k + 1].relevance) {
          std::swap(items[k], items[k + 1]);
        }
      }
    }
    return items;
  }
};

/// Equal relevances may come in any order, so titles are compared with their relevances alone.
void expectSame(const Results& found, const std::vector<SlowModel::Item>& expected) {
  ASSERT_EQ(found.size(), expected.size());
  std::multimap<std::string, double> foundByTitle;
  std::multimap<std::string, double> expectedByTitle;
  for (size_t i = 0; i < found.size(); ++i) {
    EXPECT_EQ(found[i]->relevance().doubleValue(), expected[i].relevance) << "at " << i;
    foundByTitle.emplace(*found[i]->title(), found[i]->relevance().doubleValue());
    expectedByTitle.emplace(expected[i].title, expected[i].relevance);
  }
  EXPECT_EQ(foundByTitle, expectedByTitle);
}

}  // namespace

TEST_F(SearchMerging, WithoutSemanticResultsTheBestKeywordResultGetsJustUnderOne) {
  EXPECT_EQ(keywordScale({}), 1.0);
  const Results merged =
      mergedResults({}, {keywordResult("a", 2.5F, "x"), keywordResult("b", 5, "x")}, "x");
  EXPECT_THAT(titlesOf(merged), ElementsAre("b", "a"));
  EXPECT_THAT(relevancesOf(merged), ElementsAre(0.9999, 0.4999));
}

TEST_F(SearchMerging, KeywordResultsGoBelowTheFirstSemanticOneThatIsNotNamedByTheUser) {
  EXPECT_EQ(keywordScale(semanticResults({1.0, 0.995, 0.8})), 0.8);
  const Results merged =
      mergedResults(semanticResults({1.0, 0.995, 0.8}), {keywordResult("k", 7, "x")}, "x");
  EXPECT_THAT(titlesOf(merged), ElementsAre("s0", "s1", "s2", "k"));
  EXPECT_THAT(relevancesOf(merged), ElementsAre(1.0, 0.995, 0.8, DoubleEq(0.7999)));
}

TEST_F(SearchMerging, AFirstSemanticResultBelowTheLimitGivesTheScaleWhateverFollows) {
  EXPECT_EQ(keywordScale(semanticResults({0.98})), 0.98);
  EXPECT_EQ(keywordScale(semanticResults({0.5, 0.9})), 0.5);
}

TEST_F(SearchMerging, WhenAllSemanticResultsAreAtOrAboveTheLimitTheLastOneGivesTheScale) {
  EXPECT_EQ(keywordScale(semanticResults({1.0})), 1.0);
  EXPECT_EQ(keywordScale(semanticResults({1.0, 0.995})), 0.995);
  EXPECT_EQ(keywordScale(semanticResults({1.0, 0.993, 0.99})), 0.99);
}

TEST_F(SearchMerging, TheLimitItselfCountsAsNamedByTheUser) {
  EXPECT_EQ(keywordScale(semanticResults({0.99, 0.7})), 0.7);
}

TEST_F(SearchMerging, ABestRelevanceOfZeroIsDividedByAsItStands) {
  const Results merged = mergedResults({}, {keywordResult("a", 0, "x")}, "x");
  ASSERT_THAT(merged, SizeIs(1));
  EXPECT_TRUE(std::isnan(merged[0]->relevance().doubleValue()));
}

TEST_F(SearchMerging, WhatIsNoNumberSortsLastAndSpoilsNoOrder) {
  Results results;
  for (const double relevance : {0.3, std::nan(""), 0.7, std::nan(""), 0.5}) {
    results.push_back(semanticResult("t", relevance, "x"));
  }
  sortByRelevance(results);
  EXPECT_THAT(relevancesOf(results),
              ElementsAre(0.7, 0.5, 0.3, testing::IsNan(), testing::IsNan()));
}

TEST_F(SearchMerging, SemanticResultsStayAsTheyAre) {
  setWeights(5, 0);
  const Results semantic = semanticResults({0.5});
  const Value before = semantic[0]->relevance();
  const Results merged = mergedResults(semantic, {keywordResult("k", 1, "book")}, "other");
  EXPECT_EQ(semantic[0]->relevance(), before);
  EXPECT_THAT(titlesOf(merged), ElementsAre("k", "s0"));
  EXPECT_THAT(relevancesOf(merged), ElementsAre((1.0 * 0.5 - 0.0001) * 5, 0.5));
}

TEST_F(SearchMerging, IntegersAndRealsAreComparedByNumber) {
  Results results{semanticResult("a", Value(1), "x"), semanticResult("b", Value(1.5), "x"),
                  semanticResult("c", Value(2), "x"), semanticResult("d", Value(-1), "x")};
  sortByRelevance(results);
  EXPECT_THAT(titlesOf(results), ElementsAre("c", "b", "a", "d"));
}

TEST_F(SearchMerging, ABooksWeightGoesBeforeThatOfItsGroup) {
  setWeights(3, 2);
  EXPECT_EQ(weightOfResult(*result(1), "other"), 3);
}

TEST_F(SearchMerging, WithoutAWeightOfTheBookThatOfTheGroupCounts) {
  setWeights(0, 2);
  const auto doubled = result(0.4);
  weightResult(*doubled, "other");
  EXPECT_EQ(doubled->relevance(), Value(0.8));
  EXPECT_EQ(weightOfResult(*result(1, "bare"), "other"), 2);
}

TEST_F(SearchMerging, WithNeitherWeightTheRelevanceStaysAsComputed) {
  setWeights(0, 0);
  const auto kept = result(0.4);
  weightResult(*kept, "other");
  EXPECT_EQ(kept->relevance(), Value(0.4));
}

TEST_F(SearchMerging, WeightsAreThirtyTwoBitNumbers) {
  setWeights(0.1, 0);
  EXPECT_EQ(weightOfResult(*result(1), "other"), static_cast<double>(0.1F));
}

TEST_F(SearchMerging, ResultsOfThePrimaryBookKeepFactorOneAndTheirVeryNumber) {
  setWeights(3, 2);
  EXPECT_EQ(weightOfResult(*result(1), "book"), 1);
  auto untouched = semanticResult("t", Value(1), "book");
  weightResult(*untouched, "book");
  EXPECT_EQ(untouched->relevance(), Value(1));
  EXPECT_EQ(untouched->relevance().kind(), Value::Kind::integer);
}

TEST_F(SearchMerging, WithoutAPrimaryBookEveryResultIsWeighted) {
  setWeights(3, 2);
  EXPECT_EQ(weightOfResult(*result(1), std::nullopt), 3);
}

TEST_F(SearchMerging, AResultWithoutABookIsNeverOfThePrimaryOne) {
  HelpLUXModel::setGroupList(
      Dictionary{{"DefaultGroup", "D"}, {"Groups", Dictionary{{"D", Dictionary{{"Weight", 4}}}}}});
  const auto homeless = ZEBResult::initWithTitle("t", ZEBHelpArticleResult);
  EXPECT_EQ(weightOfResult(*homeless, std::nullopt), 4);
}

TEST_F(SearchMerging, VersionedIdentifiersAreWeightedAsTheBookTheyAreVersionsOf) {
  setWeights(3, 2);
  EXPECT_EQ(weightOfResult(*result(1, "book*2.1"), "other"), 3);
  // But a version is not the primary book.
  EXPECT_EQ(weightOfResult(*result(1, "book*2.1"), "book"), 3);
}

TEST_F(SearchMerging, RandomListsMergeAsTheSlowModelSays) {
  std::mt19937 random(20240501);
  const auto below = [&](size_t limit) { return static_cast<size_t>(random() % limit); };
  const std::vector<double> edges{0, 0.98, 0.99, 0.995, 1, 1.0, 0.5, -0.25};
  for (int round = 0; round < 5000; ++round) {
    SlowModel model;
    Dictionary books;
    for (size_t i = 0; i < 4; ++i) {
      const std::string bookID = "b" + std::to_string(i);
      const double weight = below(3) == 0 ? 0 : static_cast<double>(below(4000)) / 1000.0;
      books[bookID] = Dictionary{{"Weight", weight}};
      model.bookWeights[bookID] = static_cast<float>(weight);
    }
    model.groupWeight = below(2) == 0 ? 0 : static_cast<float>(below(3000)) / 1000.0F;
    model.primary = "b" + std::to_string(below(6));
    HelpLUXModel::setGroupList(Dictionary{
        {"DefaultGroup", "G"},
        {"Groups", Dictionary{{"G", Dictionary{{"Weight", static_cast<double>(model.groupWeight)},
                                               {"Books", books}}}}}});
    Results semantic;
    for (size_t count = below(6), i = 0; i < count; ++i) {
      const double relevance =
          below(2) == 0 ? edges[below(edges.size())] : static_cast<double>(below(1001)) / 1000.0;
      semantic.push_back(
          semanticResult("s" + std::to_string(i), relevance, "b" + std::to_string(below(5))));
    }
    if (below(3) != 0) {
      sortByRelevance(semantic);
    }
    Results keyword;
    for (size_t count = below(8) + 1, i = 0; i < count; ++i) {
      // At least one above 0, so that there are numbers to compare.
      const float relevance = i == 0 ? 0.5F : static_cast<float>(below(100000)) / 1000.0F;
      keyword.push_back(
          keywordResult("k" + std::to_string(i), relevance, "b" + std::to_string(below(5))));
    }
    const auto expected = model.merge(semantic, keyword);
    expectSame(mergedResults(semantic, keyword, model.primary), expected);
    if (HasFailure()) {
      FAIL() << "in round " << round;
    }
  }
}

TEST_F(SearchMerging, WholeSearchesMergeAsTheSlowModelSays) {
  FrontWorld world;
  const auto semantics = world.addSemantics();
  const std::vector<std::string> words{"print", "queue", "page", "paper", "network", "folder"};
  std::mt19937 random(7);
  const auto below = [&](size_t limit) { return static_cast<size_t>(random() % limit); };
  const std::vector<std::string> bookIDs{"b0", "b1", "b2", "b3"};
  for (const std::string& bookID : bookIDs) {
    std::vector<searchkit::Document> pages;
    for (size_t i = 0; i < 6; ++i) {
      std::string text;
      for (size_t count = below(20) + 1; count > 0; --count) {
        text += words[below(words.size())] + " ";
      }
      pages.push_back(
          page("/" + std::to_string(i) + ".html", bookID + "-" + std::to_string(i), text));
    }
    world.addBook(bookID, std::move(pages));
  }
  const auto engine = ZEBHelpindexSearchController::init();
  engine->setPluginOwner(world.owner);

  for (int round = 0; round < 300; ++round) {
    SlowModel model;
    Dictionary books;
    for (const std::string& bookID : bookIDs) {
      const double weight = below(2) == 0 ? 0 : static_cast<double>(below(3000)) / 1000.0;
      books[bookID] = Dictionary{{"Weight", weight}};
      model.bookWeights[bookID] = static_cast<float>(weight);
    }
    HelpLUXModel::setGroupList(
        Dictionary{{"Groups", Dictionary{{"G", Dictionary{{"Books", books}}}}}});
    std::vector<std::string> scope;
    for (const std::string& bookID : bookIDs) {
      if (below(2) == 0) {
        scope.push_back(bookID);
      }
    }
    if (scope.empty()) {
      scope = {"b0"};
    }
    model.primary = scope.size() == 1 ? scope.front() : KROrvHelpbookID;
    Results semantic;
    for (size_t count = below(4), i = 0; i < count; ++i) {
      semantic.push_back(
          semanticResult("s" + std::to_string(i), static_cast<double>(below(1001)) / 1000.0, "b0"));
    }
    sortByRelevance(semantic);
    semantics->searchedBooks.clear();
    for (const std::string& bookID : bookIDs) {
      if (below(3) == 0) {
        semantics->searchedBooks.insert(bookID);
      }
    }
    semantics->answers[ZEBHelpArticleResult] = semantic;

    ZEBIndexshelf::Indices remaining;
    for (const std::string& bookID : scope) {
      if (semantic.empty() || !semantics->searchedBooks.contains(bookID)) {
        remaining.push_back(world.indices(world.owner->bookWithID(bookID)).front());
      }
    }
    const std::string text = words[below(words.size())] + " " + words[below(words.size())];
    const Results keyword = engine->doSearchForString(text, remaining, {});
    world.owner->forgetMessages();
    world.search(FrontWorld::query(text, scope));
    ASSERT_THAT(world.owner->batches(), SizeIs(1)) << "in round " << round;
    if (keyword.empty()) {
      EXPECT_EQ(world.owner->records(0), semantic);
    } else {
      expectSame(world.owner->records(0), model.merge(semantic, keyword));
    }
    if (HasFailure()) {
      FAIL() << "in round " << round;
    }
  }
}
