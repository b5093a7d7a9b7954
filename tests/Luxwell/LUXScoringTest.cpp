#include "host/Luxwell/LUXScoring.h"

#include <gtest/gtest.h>

#include <algorithm>
#include <cmath>
#include <functional>
#include <map>
#include <random>
#include <set>
#include <string>
#include <vector>

#include "tests/Luxwell/LUXNaiveScoring.h"
#include "tests/Luxwell/LUXQueryWorld.h"

using tests::NaiveScoring;
using tests::QueryWorld;

namespace {

const QueryWorld& office() {
  static const QueryWorld world(tests::officePages());
  return world;
}

const QueryWorld& randomWorld() {
  static const QueryWorld world(tests::randomPages(300, 7));
  return world;
}

// Large enough to have neighbourhoods.
const QueryWorld& largeWorld() {
  static const QueryWorld world(tests::randomPages(1300, 8));
  return world;
}

std::vector<LUXScoredPage> best(const QueryWorld& world, std::string_view text, size_t count = 50,
                                const LUXPageScope& scope = {}) {
  return LUXScoring(*world.view()).bestPages(world.termsOf(text), count, scope);
}

std::string keyOf(const QueryWorld& world, const LUXScoredPage& page) {
  return std::string(world.view()->page(page.page).key);
}

std::string firstKey(const QueryWorld& world, std::string_view text) {
  const auto pages = best(world, text);
  return pages.empty() ? "" : keyOf(world, pages.front());
}

std::set<std::string> keys(const QueryWorld& world, std::string_view text, size_t count = 50) {
  std::set<std::string> found;
  for (const LUXScoredPage& page : best(world, text, count)) {
    found.insert(keyOf(world, page));
  }
  return found;
}

std::string randomQuery(std::mt19937& random) {
  std::string text;
  for (size_t words = 1 + random() % 9; words > 0; --words) {
    const size_t kind = random() % 12;
    if (kind == 0) {
      text += "unheardof" + std::to_string(random() % 3);
    } else if (kind == 1) {
      text += tests::vocabularyWord(random() % tests::vocabularySize).substr(0, 4);
    } else {
      text += tests::vocabularyWord(random() % (kind < 7 ? 30 : tests::vocabularySize));
    }
    text += random() % 5 == 0 ? ", " : " ";
  }
  if (random() % 2 == 0) {
    text.pop_back();
  }
  return text;
}

}  // namespace

TEST(LUXScoring, GivesTheScoresOfTheNaiveTwin) {
  const NaiveScoring naive(randomWorld());
  std::mt19937 random(11);
  size_t compared = 0;
  for (int i = 0; i < 200; ++i) {
    const std::string text = randomQuery(random);
    const LUXQueryTerms terms = randomWorld().termsOf(text);
    const auto expected = naive.scores(terms);
    const auto found = best(randomWorld(), text, 1000);
    for (const LUXScoredPage& page : found) {
      EXPECT_NEAR(static_cast<double>(page.score), expected.at(page.page), 0.004) << text;
      ++compared;
    }
    for (size_t j = 1; j < found.size(); ++j) {
      EXPECT_GE(found[j - 1].score, found[j].score) << text;
    }
    // Whatever the twin gives a score to is found.
    const auto aboveNothing = std::count_if(expected.begin(), expected.end(),
                                            [](const auto& page) { return page.second > 0.005; });
    EXPECT_GE(found.size(), static_cast<size_t>(aboveNothing)) << text;
  }
  EXPECT_GT(compared, 10000U);
}

TEST(LUXScoring, TheBestFewAreTheFirstOfAll) {
  std::mt19937 random(12);
  const NaiveScoring naive(largeWorld());
  for (int i = 0; i < 150; ++i) {
    const std::string text = randomQuery(random);
    const auto all = best(largeWorld(), text, 2000);
    const size_t withWords = naive.pagesWithWords(largeWorld().termsOf(text));
    for (const size_t count : {size_t{1}, size_t{5}, size_t{20}, size_t{60}}) {
      // Only then are pages left out that share no word with the query.
      if (withWords < count) {
        continue;
      }
      const auto few = best(largeWorld(), text, count);
      ASSERT_EQ(few.size(), count) << text;
      size_t place = 0;
      for (const LUXScoredPage& page : few) {
        while (place < all.size() && !(all[place] == page)) {
          // What lies between them shares no word with the query.
          EXPECT_LE(all[place].score, 0.2F * 4 / 3) << text;
          ++place;
        }
        ASSERT_LT(place++, all.size()) << text;
      }
    }
  }
}

TEST(LUXScoring, WhereFewPagesHaveAWordTheNearestInMeaningFollow) {
  ASSERT_GT(largeWorld().view()->neighbourhoodCount(), 0U);
  const NaiveScoring naive(largeWorld());
  constexpr size_t count = 150;
  size_t asked = 0;
  size_t wanted = 0;
  size_t met = 0;
  for (size_t number = 300; number < tests::vocabularySize; number += 2) {
    const std::string text = tests::vocabularyWord(number) + ' ';
    const LUXQueryTerms terms = largeWorld().termsOf(text);
    const size_t withWords = naive.pagesWithWords(terms);
    if (withWords == 0 || withWords > 60) {
      continue;
    }
    ++asked;
    const auto found = best(largeWorld(), text, count);
    const auto expected = naive.scores(terms);
    for (const LUXScoredPage& page : found) {
      EXPECT_NEAR(static_cast<double>(page.score), expected.at(page.page), 0.004) << text;
    }
    std::vector<double> scores;
    scores.reserve(expected.size());
    for (const auto& [page, score] : expected) {
      scores.push_back(score);
    }
    std::sort(scores.begin(), scores.end(), std::greater<>());
    wanted += count;
    met += static_cast<size_t>(
        std::count_if(found.begin(), found.end(), [&](const LUXScoredPage& page) {
          return static_cast<double>(page.score) > scores[count - 1] - 0.004;
        }));
  }
  EXPECT_GT(asked, 10U);
  EXPECT_GT(met, wanted * 8 / 10);
}

TEST(LUXScoring, AnExactTitleHasOneAndNothingElseComesNear) {
  const auto pages = best(office(), "add a PRINTER");
  ASSERT_FALSE(pages.empty());
  EXPECT_EQ(keyOf(office(), pages[0]), "add-printer.html");
  EXPECT_EQ(pages[0].score, 1);
  ASSERT_GT(pages.size(), 1U);
  EXPECT_LT(pages[1].score, 0.99F);
}

TEST(LUXScoring, EveryExactTitleComesFirst) {
  for (const tests::QueryPage& page : tests::officePages()) {
    if (!page.excludedFromSearch) {
      const auto pages = best(office(), page.title);
      ASSERT_FALSE(pages.empty()) << page.title;
      EXPECT_EQ(keyOf(office(), pages[0]), page.key);
      EXPECT_EQ(pages[0].score, 1) << page.title;
    }
  }
}

TEST(LUXScoring, TheSameWordsInAnotherOrderAreNoExactTitle) {
  const auto pages = best(office(), "soup tomato cooking");
  ASSERT_FALSE(pages.empty());
  EXPECT_EQ(keyOf(office(), pages[0]), "soup.html");
  EXPECT_LT(pages[0].score, 0.99F);
}

TEST(LUXScoring, ScoresStayBetweenZeroAndWhatIsNotNamed) {
  std::mt19937 random(13);
  for (int i = 0; i < 100; ++i) {
    for (const LUXScoredPage& page : best(randomWorld(), randomQuery(random), 1000)) {
      EXPECT_GT(page.score, 0);
      EXPECT_TRUE(page.score < 0.99F || page.score == 1);
    }
  }
}

TEST(LUXScoring, WordsThatTheModelDoesNotKnowLowerTheScore) {
  const float known = best(office(), "wireless password ").at(0).score;
  const float foreign =
      best(office(), "wireless password zygote quantum entanglement ").at(0).score;
  EXPECT_LT(foreign, known / 2);
  EXPECT_GT(foreign, 0);
}

TEST(LUXScoring, ForeignWordsAloneFindNothing) {
  EXPECT_TRUE(best(office(), "zygote quantum entanglement ").empty());
  EXPECT_TRUE(best(office(), "xyz").empty());
}

TEST(LUXScoring, AWordBeingTypedFindsTheWordsThatBeginWithIt) {
  EXPECT_EQ(firstKey(office(), "wirele"), "wifi.html");
  EXPECT_TRUE(keys(office(), "change passw").contains("password.html"));
  EXPECT_EQ(firstKey(office(), "change passw"), "password.html");
}

TEST(LUXScoring, HalfAWordThatIsFinishedCountsForLess) {
  const auto typed = best(office(), "wirele");
  for (const char* text : {"wirele ", "wirele."}) {
    const auto finished = best(office(), text);
    ASSERT_FALSE(finished.empty()) << text;
    EXPECT_EQ(finished[0].page, typed[0].page) << text;
    EXPECT_LT(finished[0].score, typed[0].score) << text;
  }
}

TEST(LUXScoring, TwoLettersAreExpandedWhileTheyAreTyped) {
  EXPECT_EQ(firstKey(office(), "wi"), "wifi.html");
  EXPECT_TRUE(best(office(), "wi ").empty());
  EXPECT_TRUE(best(office(), "w").empty());
}

// "sh" is a word of its own, and the beginning of others.
const QueryWorld& shells() {
  static const QueryWorld world({
      {"shortcuts.html", "Keyboard shortcuts", {"Press a shortcut on the keyboard."}},
      {"layout.html", "Keyboard layout", {"Choose a layout for the keyboard."}},
      {"cleaning.html", "Keyboard care", {"Clean the keyboard, and clean the keyboard again."}},
      {"shell.html", "The command sh", {"Start sh from the command line."}},
      {"script.html", "Commands in files", {"Files of commands begin with the name of sh."}},
      {"mouse.html", "The mouse", {"Press a button of the mouse."}},
      {"screen.html", "The screen", {"Turn on the screen."}},
  });
  return world;
}

TEST(LUXScoring, AKnownWordThatIsStillBeingTypedFindsLongerOnesToo) {
  const auto pages = best(shells(), "keyboard sh");
  const auto rankOf = [&pages](const std::string& key) {
    return std::find_if(pages.begin(), pages.end(),
                        [&](const LUXScoredPage& page) { return keyOf(shells(), page) == key; }) -
           pages.begin();
  };
  EXPECT_LE(rankOf("shortcuts.html"), 1);
  EXPECT_LT(rankOf("shortcuts.html"), rankOf("layout.html"));
  EXPECT_LT(rankOf("shortcuts.html"), rankOf("cleaning.html"));
  EXPECT_TRUE(keys(shells(), "sh").contains("shortcuts.html"));
  const auto isShortcuts = [](const LUXScoredPage& page) {
    return keyOf(shells(), page) == "shortcuts.html";
  };
  const auto finished = best(shells(), "keyboard sh ");
  EXPECT_GT(std::find_if(pages.begin(), pages.end(), isShortcuts)->score,
            std::find_if(finished.begin(), finished.end(), isShortcuts)->score);
}

TEST(LUXScoring, PagesThatHaveTheWordItselfComeBeforeThoseWithLongerOnes) {
  const auto pages = best(shells(), "sh");
  ASSERT_GE(pages.size(), 3U);
  EXPECT_EQ(keyOf(shells(), pages[0]), "shell.html");
  EXPECT_EQ(keyOf(shells(), pages[1]), "script.html");
  EXPECT_LT(pages[2].score, pages[1].score);
  // Longer words take nothing from the pages that have the word.
  const auto finished = best(shells(), "sh ");
  EXPECT_EQ(finished[0], pages[0]);
  EXPECT_EQ(finished[1], pages[1]);
}

TEST(LUXScoring, InflectionsOfAKnownWordAreNoLongerWords) {
  const auto pages = best(office(), "wireless passwords");
  EXPECT_EQ(pages, best(office(), "wireless passwords "));
}

TEST(LUXScoring, HalfWordsDoNotStandForWordsThatMostPagesHave) {
  // "the" is in all pages and would bring them all.
  EXPECT_TRUE(best(shells(), "th").empty());
}

TEST(LUXScoring, PagesThatBeginWithAWordComeBeforeThoseThatNameItLater) {
  const std::string filling =
      "A page may say many things about windows, panels, menus, icons and other things, about "
      "files and folders and about people, before it comes to what comes last of all of it. ";
  const QueryWorld world({
      {"later.html", "One", {filling + filling + "Encryption of disks."}},
      {"first.html", "Two", {"Encryption of disks. " + filling + filling}},
      {"other.html", "Three", {filling + filling}},
  });
  EXPECT_EQ(firstKey(world, "encryption "), "first.html");
  const auto pages = best(world, "encryption ");
  ASSERT_EQ(pages.size(), 2U);
  EXPECT_GT(pages[0].score, pages[1].score);
}

TEST(LUXScoring, StopWordsAloneAreLookedUpAsTheyStand) {
  const auto found = keys(office(), "of its own");
  EXPECT_TRUE(found.contains("password.html"));
}

TEST(LUXScoring, ExcludedPagesAreNeverFound) {
  EXPECT_FALSE(keys(office(), "secret spices").contains("hidden.html"));
  EXPECT_FALSE(keys(office(), "Secret recipes").contains("hidden.html"));
  EXPECT_FALSE(keys(office(), "tomato soup", 1000).contains("hidden.html"));
}

TEST(LUXScoring, PagesOutsideTheScopeAreNotFound) {
  const auto book = office().view()->bookNumber("org.zeb.kitchen");
  ASSERT_TRUE(book);
  const auto [first, end] = office().view()->pageRangeOfBook(*book);
  const auto pages = best(office(), "open the tomato tray of the printer", 50, {first, end, 0, 0});
  ASSERT_FALSE(pages.empty());
  for (const LUXScoredPage& page : pages) {
    EXPECT_GE(page.page, first);
    EXPECT_LT(page.page, end);
  }
  EXPECT_TRUE(best(office(), "Add a printer", 50, {first, end, 0, 0}).empty() ||
              best(office(), "Add a printer", 50, {first, end, 0, 0})[0].score < 0.99F);
}

TEST(LUXScoring, TheScopeDoesNotChangeScores) {
  const auto everywhere = best(randomWorld(), "babrakbak fobrakbak", 1000);
  const auto second = randomWorld().view()->bookNumber("org.zeb.second");
  ASSERT_TRUE(second);
  const auto [first, end] = randomWorld().view()->pageRangeOfBook(*second);
  const auto within = best(randomWorld(), "babrakbak fobrakbak", 1000, {first, end, 0, 0});
  ASSERT_FALSE(within.empty());
  std::vector<LUXScoredPage> filtered;
  for (const LUXScoredPage& page : everywhere) {
    if (page.page >= first && page.page < end) {
      filtered.push_back(page);
    }
  }
  EXPECT_EQ(within, filtered);
}

TEST(LUXScoring, TheFocusedBookWinsTiesAndNothingMore) {
  std::vector<tests::QueryPage> pages;
  for (const char* book : {"org.zeb.a", "org.zeb.b", "org.zeb.c"}) {
    pages.push_back({"same.html", "Clouds", {"Water vapour rises."}, book});
    pages.push_back({"other.html", "Water", {"Water and clouds, clouds, clouds."}, book});
  }
  const QueryWorld world(pages);
  const LUXScoring scoring(*world.view());
  const auto terms = world.termsOf("vapour rises ");
  const auto plain = scoring.bestPages(terms, 3);
  const auto focus = world.view()->pageRangeOfBook(*world.view()->bookNumber("org.zeb.b"));
  LUXPageScope scope;
  scope.focusFirst = focus.first;
  scope.focusEnd = focus.second;
  const auto focused = scoring.bestPages(terms, 3, scope);
  ASSERT_EQ(plain.size(), 3U);
  ASSERT_EQ(focused.size(), 3U);
  EXPECT_EQ(plain[0].score, plain[1].score);
  EXPECT_EQ(world.view()->page(plain[0].page).book, 0U);
  EXPECT_EQ(world.view()->page(focused[0].page).book, 1U);
  EXPECT_EQ(world.view()->page(focused[1].page).book, 0U);
  // Among exact titles, too.
  EXPECT_EQ(world.view()->page(scoring.bestPages(world.termsOf("clouds"), 1, scope)[0].page).book,
            1U);
  // A page of another book that is better stays before it.
  const auto better = scoring.bestPages(world.termsOf("clouds water "), 6, scope);
  for (size_t i = 1; i < better.size(); ++i) {
    EXPECT_GE(better[i - 1].score, better[i].score);
  }
}

TEST(LUXScoring, PagesThatUseOtherWordsAreFoundByMeaning) {
  // Two subjects, each with many words of its own; in one, half of the pages say "car" and half
  // say "automobile".
  std::mt19937 random(5);
  std::vector<tests::QueryPage> pages;
  for (int i = 0; i < 200; ++i) {
    const bool driving = i % 2 == 0;
    std::string text = !driving ? "tea" : i % 4 == 0 ? "car" : "automobile";
    const std::string kind = driving ? (i % 4 == 0 ? "car" : "auto") : "tea";
    for (int words = 0; words < 12; ++words) {
      text += ' ' + tests::vocabularyWord((driving ? 0 : 100) + random() % 100);
    }
    pages.push_back({kind + std::to_string(i), "Page", {text}});
  }
  const QueryWorld world(pages);
  std::map<std::string, double> sums;
  for (const LUXScoredPage& page : best(world, "car ", 200)) {
    sums[keyOf(world, page).substr(0, 3)] += static_cast<double>(page.score);
  }
  EXPECT_GT(sums["car"], 4 * sums["aut"]);
  EXPECT_GT(sums["aut"], 0);
  EXPECT_GT(sums["aut"], 2 * sums["tea"]);
}

TEST(LUXScoring, NothingWantedIsNothingFound) {
  EXPECT_TRUE(best(office(), "printer", 0).empty());
  EXPECT_TRUE(best(office(), "", 50).empty());
  EXPECT_TRUE(best(office(), "printer", 50, {3, 3, 0, 0}).empty());
  EXPECT_TRUE(best(office(), "printer", 50, {1000, 2000, 0, 0}).empty());
}

TEST(LUXScoring, CountsAboveThePagesThereAreGiveAll) {
  EXPECT_LE(best(office(), "printer", SIZE_MAX).size(), tests::officePages().size());
  EXPECT_FALSE(best(office(), "printer", SIZE_MAX).empty());
}

TEST(LUXScoring, ACancelledSearchFindsNothing) {
  const LUXScoring scoring(*randomWorld().view());
  const auto terms = randomWorld().termsOf("babrakbak fobrakbak debrakbak");
  int questions = 0;
  ASSERT_FALSE(scoring.bestPages(terms, 50, {}, [&questions] { return ++questions < 0; }).empty());
  ASSERT_GT(questions, 3);
  for (int limit = 1; limit <= questions; ++limit) {
    int asked = 0;
    EXPECT_TRUE(scoring.bestPages(terms, 50, {}, [&] { return ++asked >= limit; }).empty());
  }
}

TEST(LUXScoring, SearchingTwiceGivesTheSame) {
  std::mt19937 random(14);
  for (int i = 0; i < 20; ++i) {
    const std::string text = randomQuery(random);
    EXPECT_EQ(best(randomWorld(), text), best(randomWorld(), text));
  }
}

namespace {

std::vector<float> lifted(const std::vector<float>& scores) {
  std::vector<LUXScoredPage> pages;
  for (const float score : scores) {
    pages.push_back({static_cast<uint32_t>(pages.size()), score});
  }
  LUXLiftAboveCutoff(pages);
  std::vector<float> result;
  for (const LUXScoredPage& page : pages) {
    EXPECT_EQ(page.page, result.size());
    result.push_back(page.score);
  }
  return result;
}

}  // namespace

TEST(LUXLiftAboveCutoff, PagesNotFarBelowAnAnswerAreAnswers) {
  const std::vector<float> scores = lifted({0.25F, 0.19F, 0.08F, 0.074F, 0.05F});
  EXPECT_FLOAT_EQ(scores[0], 0.25F);
  EXPECT_GT(scores[1], luxscoring::cutoff);
  EXPECT_GT(scores[2], luxscoring::cutoff);
  EXPECT_LE(scores[3], luxscoring::cutoff);
  EXPECT_LT(scores[4], luxscoring::cutoff);
}

TEST(LUXLiftAboveCutoff, WithoutAnAnswerNothingBecomesOne) {
  const std::vector<float> scores = {luxscoring::cutoff, 0.19F, 0.11F};
  EXPECT_EQ(lifted(scores), scores);
  EXPECT_TRUE(lifted({}).empty());
}

TEST(LUXLiftAboveCutoff, ScoresStayAsTheyAreWhereThatShareOfTheBestIsAboveTheCutOff) {
  const std::vector<float> scores = {0.8F, 0.31F, 0.29F, 0.21F, 0.05F};
  EXPECT_EQ(lifted(scores), scores);
  const std::vector<float> named = {1, 0.3F, 0.1F};
  EXPECT_EQ(lifted(named), named);
}

TEST(LUXLiftAboveCutoff, KeepsTheOrderTheBestScoreAndWhatIsEqual) {
  std::mt19937 random(15);
  std::uniform_real_distribution<float> score(0.001F, 0.45F);
  for (int i = 0; i < 2000; ++i) {
    std::vector<float> scores;
    for (size_t count = 1 + random() % 20; count > 0; --count) {
      scores.push_back(random() % 4 == 0 && !scores.empty() ? scores.back() : score(random));
    }
    std::sort(scores.rbegin(), scores.rend());
    const std::vector<float> moved = lifted(scores);
    EXPECT_EQ(moved[0], scores[0]);
    for (size_t j = 1; j < scores.size(); ++j) {
      EXPECT_GE(moved[j], scores[j]);
      EXPECT_LE(moved[j], moved[j - 1]);
      EXPECT_TRUE(scores[j] != scores[j - 1] || moved[j] == moved[j - 1] || j == 1);
    }
  }
}
