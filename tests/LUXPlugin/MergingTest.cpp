// The arithmetic of merging, compared with a slow model of it: several groups into one answer, and
// that answer with the keyword search's.
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <algorithm>
#include <array>
#include <cctype>
#include <cmath>
#include <condition_variable>
#include <mutex>
#include <random>
#include <sstream>

#include "host/Luxwell/HelpTokenizer.h"
#include "host/Luxwell/LUXDebugPreferences.h"
#include "plugin/front/HelpPluginController.h"
#include "plugin/keyword/ZEBHelpindexSearchController.h"
#include "tests/LUXPlugin/LUXWorld.h"

using testing::ElementsAre;
using testing::SizeIs;
using tests::LUXWorld;
using tests::relevancesOf;
using tests::titlesOf;

namespace {

/// A result as far as merging is concerned: a page by its URL, a phrase by its title.
struct Found {
  std::string name;
  std::string title;
  std::string bookID;
  double relevance = 0;

  friend bool operator==(const Found&, const Found&) = default;
};
using List = std::vector<Found>;

void PrintTo(const Found& found, std::ostream* stream) {
  *stream << found.name << " " << found.relevance;
}

List listOf(const LUXWorld::Results& results) {
  List list;
  for (const auto& result : results) {
    const auto url = result->payloadValueForKey(ZEBResultURLKey).stringValue();
    list.push_back({url.value_or(result->title().value_or("")), result->title().value_or(""),
                    result->bookID().value_or(""), result->relevance().doubleValue()});
  }
  return list;
}

/// Relevances that are equal leave the order open.
List inOneOrder(List list) {
  std::stable_sort(list.begin(), list.end(), [](const Found& a, const Found& b) {
    return a.relevance != b.relevance ? a.relevance > b.relevance : a.name < b.name;
  });
  return list;
}

bool descends(const List& list) {
  return std::is_sorted(list.begin(), list.end(),
                        [](const Found& a, const Found& b) { return a.relevance > b.relevance; });
}

std::string lowerCase(std::string text) {
  for (char& byte : text) {
    byte = static_cast<char>(std::tolower(static_cast<unsigned char>(byte)));
  }
  return text;
}

struct ScriptedHit {
  std::string title;
  std::string path;
  std::string bookID;
  float score;
};

/// One search with everything that decides its outcome.
struct Case {
  std::string kind;
  std::string text;
  std::vector<std::string> scope;
  bool allBooks = false;
  size_t limit = 0;
  std::map<std::string, std::vector<ScriptedHit>> hits;
  /// Groups whose answer is lost.
  std::set<std::string> silent;
  std::vector<std::string> ignoring;
  std::map<std::string, double> groupWeights;
  std::map<std::string, double> bookWeights;
};

/// Three groups of two books, one of them the manual, and a book that no model has yet.
class Merging : public testing::Test {
 protected:
  Merging() {
    LUXDebugPreferences::defaultDebugPreferences()->setFloat(threshold,
                                                             LUXResultCutoffThresholdKey);
    for (const auto& [group, books] : booksOfGroups) {
      for (const std::string& bookID : books) {
        world.addBook(bookID, pagesOf(bookID), group);
      }
      world.build(group);
    }
    world.addBook(lateBook, pagesOf(lateBook), "A");
    world.owner->loggedIn = false;
    plugin = HelpPluginController::initWithOwner(world.owner);
    plugin->_setLuxSearchController(world.controller);
    keywords->setPluginOwner(world.owner);
    world.controller->onAnswer = [this](const auto& query, const auto&) { answer(query); };
    // Time goes on when everybody who was asked has answered.
    world.clock->onSleep = [this](size_t) {
      std::unique_lock lock(answersMutex);
      EXPECT_TRUE(answersChanged.wait_for(lock, std::chrono::minutes(1),
                                          [&] { return answers == expectedAnswers; }));
    };
  }
  ~Merging() override {
    LUXDebugPreferences::defaultDebugPreferences()->removeValueForKey(LUXResultCutoffThresholdKey);
  }

  static std::vector<tests::LUXPage> pagesOf(const std::string& bookID) {
    std::vector<tests::LUXPage> pages;
    const std::string name = bookID.substr(bookID.rfind('.') + 1);
    for (int i = 0; i < 5; ++i) {
      const std::string number = std::to_string(i);
      pages.push_back({"p" + number + ".html",
                       i == 0 ? "Shared title" : "Title " + name + number,
                       {"printing words " + name + " " + std::string(static_cast<size_t>(i), 'x') +
                        " printing and more words"}});
    }
    return pages;
  }
  std::string urlOfPage(const std::string& bookID, const std::string& path) const {
    return "file://" + world.folder.path("books/" + bookID) + "/" + path;
  }
  static std::string titleOfPage(const std::string& bookID, const std::string& path) {
    for (const auto& page : pagesOf(bookID)) {
      if (page.key == path) {
        return page.title;
      }
    }
    return {};
  }

  void answer(const std::shared_ptr<LUXQuery>& query) {
    const std::string group = query->groupName();
    if (!current.silent.contains(group)) {
      std::vector<std::shared_ptr<LUXHit>> hits;
      for (const ScriptedHit& hit : current.hits.at(group)) {
        hits.push_back(hit.path.empty()
                           ? LUXHit::hitWithTitle(hit.title, hit.score)
                           : LUXHit::hitWithTitle(std::nullopt, hit.score, hit.path, hit.bookID));
      }
      world.controller->answer(query, hits);
    }
    const std::lock_guard lock(answersMutex);
    ++answers;
    answersChanged.notify_all();
  }

  static bool isPhrases(const Case& one) {
    return one.kind == ZEBHelpSuggestionResult || one.kind == ZEBHelpSimilarSuggestionResult;
  }
  static float weight(const std::map<std::string, double>& weights, const std::string& name) {
    const auto found = weights.find(name);
    return found == weights.end() ? 0 : static_cast<float>(found->second);
  }
  static std::string groupOf(const std::string& bookID) {
    for (const auto& [group, books] : booksOfGroups) {
      if (std::find(books.begin(), books.end(), bookID) != books.end()) {
        return group;
      }
    }
    return "A";
  }
  static std::string focusedBook(const Case& one) {
    return one.scope.size() != 1                ? KROrvHelpbookID
           : one.scope.front() == "org.unknown" ? std::string("(none)")
                                                : one.scope.front();
  }
  static bool searchesOneGroup(const Case& one) {
    return one.scope.size() == 1 && one.scope.front() != "org.unknown" && !one.allBooks;
  }
  /// The groups in which a query runs.
  static std::vector<std::string> groupsOf(const Case& one) {
    if (!searchesOneGroup(one)) {
      return {"A", "B", "C"};
    }
    return one.scope.front() == lateBook ? std::vector<std::string>()
                                         : std::vector{groupOf(one.scope.front())};
  }

  /// The slow model: the semantic half.
  List expected(const Case& one) const {
    const std::string tokens =
        HelpTokenizer::tokenizerForLanguage("English")->tokenizedStringFromString(one.text);
    std::vector<std::pair<std::string, List>> answered;
    for (const std::string& group : groupsOf(one)) {
      if (one.silent.contains(group)) {
        continue;
      }
      List list;
      for (const ScriptedHit& hit : one.hits.at(group)) {
        const bool isPage = !isPhrases(one);
        const std::string title = isPage ? titleOfPage(hit.bookID, hit.path) : hit.title;
        float score = hit.score;
        if (isPage && (title.empty() || !(score > threshold))) {
          continue;
        }
        if (isPage && HelpTokenizer::tokenizerForLanguage("English")->tokenizedStringFromString(
                          title) == tokens) {
          score = 1;
        }
        if (one.kind == ZEBHelpSimilarSuggestionResult &&
            std::count(title.begin(), title.end(), ' ') >= 5) {
          continue;
        }
        const std::string name = isPage ? urlOfPage(hit.bookID, hit.path) : title;
        const bool ignored =
            std::any_of(one.ignoring.begin(), one.ignoring.end(), [&](const std::string& item) {
              return one.kind == ZEBHelpSimilarSuggestionResult
                         ? lowerCase(item) == lowerCase(title)
                         : isPage && item == name;
            });
        if (!ignored) {
          list.push_back({name, title, isPage ? hit.bookID : "", static_cast<double>(score)});
        }
      }
      answered.emplace_back(group, list);
    }
    if (answered.size() == 1) {
      return answered.front().second;
    }
    return isPhrases(one) ? summed(one, answered) : weighted(one, answered);
  }

  static List summed(const Case& one, const std::vector<std::pair<std::string, List>>& answered) {
    List merged;
    for (const auto& entry : answered) {
      if (merged.empty()) {
        merged = entry.second;
        continue;
      }
      for (const Found& found : entry.second) {
        bool known = false;
        for (Found& other : merged) {
          if (!known && other.title == found.title) {
            other.relevance = static_cast<double>(static_cast<float>(other.relevance) +
                                                  static_cast<float>(found.relevance));
            known = true;
          }
        }
        if (!known) {
          merged.push_back(found);
        }
      }
    }
    std::stable_sort(merged.begin(), merged.end(),
                     [](const Found& a, const Found& b) { return a.relevance > b.relevance; });
    const size_t limit = one.limit == 0 ? 20 : one.limit;
    while (merged.size() > limit) {
      merged.pop_back();
    }
    return merged;
  }

  static List weighted(const Case& one, const std::vector<std::pair<std::string, List>>& answered) {
    float top = 0;
    for (const auto& entry : answered) {
      if (!entry.second.empty()) {
        top = std::max(top, static_cast<float>(entry.second.front().relevance));
      }
    }
    List merged;
    for (const auto& entry : answered) {
      for (Found found : entry.second) {
        const bool isNamed =
            found.relevance >= static_cast<double>(0.99F) && found.bookID == focusedBook(one);
        if (!isNamed) {
          const float ofBook = weight(one.bookWeights, found.bookID);
          const float ofGroup = weight(one.groupWeights, entry.first);
          float relevance = static_cast<float>(found.relevance) / top;
          relevance *= ofBook != 0 ? ofBook : ofGroup != 0 ? ofGroup : 1;
          found.relevance = static_cast<double>(relevance);
        }
        merged.push_back(found);
      }
    }
    std::stable_sort(merged.begin(), merged.end(),
                     [](const Found& a, const Found& b) { return a.relevance > b.relevance; });
    return merged;
  }

  /// The slow model: what the keyword search found below what the semantic one found.
  static List below(const Case& one, const List& semantic, List keyword) {
    double top = -1;
    for (const Found& found : keyword) {
      top = std::max(top, found.relevance);
    }
    double scale = 1;
    if (!semantic.empty()) {
      scale = semantic.front().relevance;
      for (size_t i = 1; scale >= 0.99 && i < semantic.size(); ++i) {
        scale = semantic[i].relevance;
      }
    }
    const std::string primary = focusedBook(one);
    List merged = semantic;
    for (Found& found : keyword) {
      found.relevance = found.relevance / top * scale - 0.0001;
      if (found.bookID != primary) {
        const double ofBook = weight(one.bookWeights, found.bookID);
        const double ofGroup = weight(one.groupWeights, groupOf(found.bookID));
        found.relevance *= ofBook != 0 ? ofBook : ofGroup != 0 ? ofGroup : 1;
      }
      merged.push_back(found);
    }
    return merged;
  }

  Case randomCase() {
    const auto roll = [&](size_t sides) { return static_cast<size_t>(random() % sides); };
    Case one;
    one.kind =
        std::vector<std::string>{ZEBHelpArticleResult, ZEBHelpArticleResult, ZEBHelpActionResult,
                                 ZEBHelpSuggestionResult, ZEBHelpSimilarSuggestionResult}[roll(5)];
    one.text = std::vector<std::string>{"printing", "printing words", "shared titles", "xx",
                                        "title a12"}[roll(5)];
    switch (roll(6)) {
      case 0:
        one.scope = {allBooks()[roll(allBooks().size())]};
        break;
      case 1:
        one.scope = {allBooks()[roll(allBooks().size())]};
        one.allBooks = true;
        break;
      case 2:
        one.scope = {"org.unknown"};
        one.allBooks = true;
        break;
      case 3:
        one.scope = {"org.b1", "org.c2"};
        break;
      default:
        break;
    }
    one.limit = roll(3) == 0 ? 1 + roll(30) : 0;
    constexpr std::array<double, 6> weights{0, 0, 0.5, 1, 1.5, 3};
    for (const auto& [group, books] : booksOfGroups) {
      one.groupWeights[group] = weights[roll(weights.size())];
      auto& hits = one.hits[group];
      for (size_t count = roll(12); count > 0; --count) {
        constexpr std::array<float, 6> scores{0.1F, threshold, 0.99F, 0.989F, 0.995F, 1.0F};
        ScriptedHit hit{"phrase " + std::to_string(roll(24)), {}, {}, 0};
        hit.score = roll(3) == 0 ? scores[roll(scores.size())]
                                 : 0.15F + 0.0001F * static_cast<float>(roll(8000));
        if (roll(6) == 0) {
          hit.title += " of six words in all";
        }
        if (!isPhrases(one)) {
          hit.bookID = books[roll(books.size())];
          hit.path = "p" + std::to_string(roll(6)) + ".html";
        }
        hits.push_back(hit);
      }
      // In order of score, as models answer; now and then not.
      if (roll(8) != 0) {
        std::sort(hits.begin(), hits.end(),
                  [](const auto& a, const auto& b) { return a.score > b.score; });
      }
      if (roll(10) == 0) {
        one.silent.insert(group);
      }
    }
    for (const std::string& bookID : allBooks()) {
      one.bookWeights[bookID] = weights[roll(weights.size())];
    }
    for (size_t count = roll(2) * roll(5); count > 0; --count) {
      std::string title = "phrase " + std::to_string(roll(24));
      title[0] = roll(2) == 0 ? 'P' : 'p';
      one.ignoring.push_back(
          one.kind == ZEBHelpSimilarSuggestionResult
              ? title
              : urlOfPage(allBooks()[roll(6)], "p" + std::to_string(roll(5)) + ".html"));
    }
    return one;
  }

  static std::vector<std::string> allBooks() {
    std::vector<std::string> all;
    for (const auto& entry : booksOfGroups) {
      all.insert(all.end(), entry.second.begin(), entry.second.end());
    }
    all.emplace_back(lateBook);
    return all;
  }

  std::shared_ptr<ZEBQuery> prepare(const Case& one) {
    for (const std::string& bookID : allBooks()) {
      world.setBook(bookID, groupOf(bookID), {{"Weight", one.bookWeights.at(bookID)}});
    }
    for (const auto& entry : one.groupWeights) {
      world.setGroupWeight(entry.first, entry.second);
    }
    world.controller->useShorterTimeouts(true);
    current = one;
    {
      const std::lock_guard lock(answersMutex);
      answers = 0;
      expectedAnswers = groupsOf(one).size();
    }
    world.log->clear();
    world.clock->forgetSleeps();
    world.owner->forgetMessages();
    auto query =
        LUXWorld::query(one.text, one.scope, {{ZEBQuerySearchAllBooksOptionKey, one.allBooks}});
    query->setLimit(one.limit);
    return query;
  }

  static constexpr float threshold = 0.2F;
  static inline const std::string lateBook = "org.late";
  static inline const std::map<std::string, std::vector<std::string>> booksOfGroups{
      {"A", {"org.a1", KROrvHelpbookID}}, {"B", {"org.b1", "org.b2"}}, {"C", {"org.c1", "org.c2"}}};

  LUXWorld world;
  std::shared_ptr<HelpPluginController> plugin;
  const std::shared_ptr<ZEBHelpindexSearchController> keywords =
      ZEBHelpindexSearchController::init();
  std::mt19937_64 random{20240917};
  Case current;
  // The threads of the queries count.
  std::mutex answersMutex;
  std::condition_variable answersChanged;
  size_t answers = 0;
  size_t expectedAnswers = 0;
};

TEST_F(Merging, ofGroupsIsWhatASlowModelSays) {
  size_t merged = 0;
  for (int i = 0; i < 3000 && !HasFailure(); ++i) {
    const Case one = randomCase();
    const auto query = prepare(one);
    std::set<std::string> searched;
    const List found = listOf(world.search(query, one.kind, one.ignoring, &searched));
    EXPECT_EQ(found, expected(one)) << "case " << i;
    std::set<std::string> expectedBooks;
    for (const std::string& group : groupsOf(one)) {
      expectedBooks.insert(booksOfGroups.at(group).begin(), booksOfGroups.at(group).end());
    }
    EXPECT_EQ(searched, expectedBooks) << "case " << i;
    EXPECT_TRUE(world.nothingIsHeld());
    merged += found.empty() ? 0 : 1;
  }
  // Not for want of anything to compare.
  EXPECT_GT(merged, 2000U);
}

TEST_F(Merging, ofBothWaysToSearchIsWhatASlowModelSays) {
  size_t merged = 0;
  for (int i = 0; i < 2000 && !HasFailure(); ++i) {
    Case one = randomCase();
    if (isPhrases(one)) {
      one.kind = ZEBHelpArticleResult;
      for (auto& entry : one.hits) {
        entry.second.clear();
      }
    }
    one.ignoring.clear();
    const auto query = prepare(one);
    query->setResultTypes({one.kind, ZEBHelpArticleResult});
    plugin->startSearchForQuery(query);
    ASSERT_THAT(world.owner->batches(), SizeIs(testing::Le(1U)));
    const List found = listOf(world.owner->records(0));

    const List semantic = expected(one);
    List all = semantic;
    if (one.kind != ZEBHelpActionResult) {
      ZEBHelpindexSearchController::Results keyword;
      std::vector<std::shared_ptr<ZEBIndex>> remaining;
      std::set<std::string> searched;
      for (const std::string& group : groupsOf(one)) {
        searched.insert(booksOfGroups.at(group).begin(), booksOfGroups.at(group).end());
      }
      for (const std::string& bookID : allBooks()) {
        const bool inScope =
            one.scope.empty() || one.allBooks ||
            std::find(one.scope.begin(), one.scope.end(), bookID) != one.scope.end();
        if (inScope && (semantic.empty() || !searched.contains(bookID))) {
          for (const auto& record :
               plugin->_shelf()->indicesForBook(world.owner->bookWithID(bookID))) {
            remaining.push_back(record);
          }
        }
      }
      if (!remaining.empty()) {
        keyword = keywords->doSearchForString(one.text, remaining, {});
      }
      if (!keyword.empty()) {
        all = below(one, semantic, listOf(keyword));
        EXPECT_TRUE(descends(found)) << "case " << i;
        merged += semantic.empty() ? 0 : 1;
      }
    }
    const List sorted = inOneOrder(all);
    const List sortedFound = inOneOrder(found);
    ASSERT_EQ(sortedFound.size(), sorted.size()) << "case " << i;
    for (size_t k = 0; k < sorted.size(); ++k) {
      EXPECT_EQ(sortedFound[k].name, sorted[k].name) << "case " << i;
      EXPECT_DOUBLE_EQ(sortedFound[k].relevance, sorted[k].relevance) << "case " << i;
    }
  }
  EXPECT_GT(merged, 300U);
}

// The rules one by one.

TEST_F(Merging, dividesByTheLargerOfTheFirstRelevancesAndWeights) {
  Case one;
  one.kind = ZEBHelpArticleResult;
  one.text = "printing";
  one.hits = {{"A", {{"", "p1.html", "org.a1", 0.5F}, {"", "p2.html", "org.a1", 0.25F}}},
              {"B", {{"", "p1.html", "org.b1", 0.8F}, {"", "p2.html", "org.b2", 0.4F}}},
              {"C", {}}};
  for (const std::string& bookID : allBooks()) {
    one.bookWeights[bookID] = bookID == "org.b2" ? 3 : 0;
  }
  one.groupWeights = {{"A", 0}, {"B", 0.5}, {"C", 0}};
  const auto results = world.search(prepare(one));
  EXPECT_THAT(titlesOf(results), ElementsAre("Title b22", "Title a11", "Title b11", "Title a12"));
  const auto relevances = relevancesOf(results);
  EXPECT_NEAR(relevances[0], 1.5, 1e-6);
  EXPECT_NEAR(relevances[1], 0.625, 1e-6);
  EXPECT_NEAR(relevances[2], 0.5, 1e-6);
  EXPECT_NEAR(relevances[3], 0.3125, 1e-6);
}

TEST_F(Merging, leavesWhatWasNamedInTheFocusedBookAsItIs) {
  Case one;
  one.kind = ZEBHelpArticleResult;
  one.text = "printing";
  one.hits = {
      {"A", {{"", "p1.html", KROrvHelpbookID, 0.99F}, {"", "p2.html", KROrvHelpbookID, 0.5F}}},
      {"B", {{"", "p1.html", "org.b1", 1.0F}}},
      {"C", {}}};
  for (const std::string& bookID : allBooks()) {
    one.bookWeights[bookID] = 0;
  }
  one.groupWeights = {{"A", 2}, {"B", 2}, {"C", 2}};
  EXPECT_THAT(relevancesOf(world.search(prepare(one))),
              ElementsAre(2.0, 1.0, static_cast<double>(0.99F)));
}

TEST_F(Merging, addsTheRelevancesOfOnePhraseAndCutsToTwentyOrTheLimit) {
  Case one;
  one.kind = ZEBHelpSuggestionResult;
  one.text = "ph";
  for (const char* group : {"A", "B"}) {
    for (int i = 0; i < 15; ++i) {
      one.hits[group].push_back(
          {"phrase " + std::to_string(*group == 'A' ? i : i + 10), "", "", 0.25F});
    }
  }
  one.hits["C"] = {};
  for (const std::string& bookID : allBooks()) {
    one.bookWeights[bookID] = 0;
  }
  one.groupWeights = {{"A", 2}, {"B", 2}, {"C", 2}};
  const auto results = world.search(prepare(one), one.kind);
  EXPECT_THAT(results, SizeIs(20));
  const auto relevances = relevancesOf(results);
  EXPECT_EQ(std::count(relevances.begin(), relevances.end(), 0.5), 5);
  EXPECT_EQ(std::count(relevances.begin(), relevances.end(), 0.25), 15);
  EXPECT_TRUE(std::is_sorted(relevances.rbegin(), relevances.rend()));
  one.limit = 7;
  EXPECT_THAT(world.search(prepare(one), one.kind), SizeIs(7));
  one.limit = 100;
  EXPECT_THAT(world.search(prepare(one), one.kind), SizeIs(25));
}

}  // namespace
