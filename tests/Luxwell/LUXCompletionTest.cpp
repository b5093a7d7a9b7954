#include "host/Luxwell/LUXCompletion.h"

#include <gtest/gtest.h>

#include <algorithm>
#include <string>
#include <vector>

#include "tests/Luxwell/LUXQueryWorld.h"

using tests::QueryPage;
using tests::QueryWorld;
using Strings = std::vector<std::string>;

namespace {

const QueryWorld& world() {
  static const QueryWorld made([] {
    std::vector<QueryPage> pages;
    for (int i = 0; i < 6; ++i) {
      const std::string number = std::to_string(i);
      pages.push_back({"net" + number,
                       "Wireless network",
                       {"The wireless network needs a password. Network printers, network "
                        "settings. Choose the print queue."}});
      pages.push_back({"print" + number,
                       "Print queue",
                       {"The print queue has a print preview. Printing needs paper."}});
      pages.push_back({"soup" + number,
                       "Tomato soup",
                       {"The tomato soup has tomato paste."},
                       "org.zeb.kitchen"});
    }
    return pages;
  }());
  return made;
}

Strings completions(const QueryWorld& in, std::string_view text, size_t count = 50,
                    std::optional<uint32_t> book = std::nullopt) {
  Strings found;
  for (const LUXScoredPhrase& phrase :
       LUXCompletions(*in.view(), in.termsOf(text), count, book, {})) {
    found.emplace_back(in.view()->phraseText(phrase.phrase));
  }
  return found;
}

Strings completions(std::string_view text, size_t count = 50,
                    std::optional<uint32_t> book = std::nullopt) {
  return completions(world(), text, count, book);
}

bool contains(const Strings& strings, std::string_view string) {
  return std::find(strings.begin(), strings.end(), string) != strings.end();
}

}  // namespace

TEST(LUXCompletion, HalfAWordBecomesPhrasesOfTheBooks) {
  const Strings found = completions("wire");
  EXPECT_TRUE(contains(found, "wireless network"));
  for (const std::string& phrase : found) {
    EXPECT_TRUE(phrase.starts_with("wire")) << phrase;
  }
}

TEST(LUXCompletion, GivesWhatLookingAtEveryPhraseGives) {
  const LUXModelView& view = *world().view();
  ASSERT_GT(view.phraseCount(), 5U);
  for (const std::string text : {"p", "pr", "print", "print ", "n", "t", "tomato s", "x"}) {
    std::vector<std::pair<float, std::string>> expected;
    for (uint32_t i = 0; i < view.phraseCount(); ++i) {
      if (view.phraseFoldedText(i).starts_with(text)) {
        expected.emplace_back(-view.phraseScores()[i], std::string(view.phraseText(i)));
      }
    }
    std::stable_sort(expected.begin(), expected.end(),
                     [](const auto& a, const auto& b) { return a.first < b.first; });
    Strings found = completions(text);
    // Those that complete less of the text come after.
    ASSERT_GE(found.size(), expected.size()) << text;
    for (size_t i = 0; i < expected.size(); ++i) {
      EXPECT_EQ(found[i], expected[i].second) << text;
    }
  }
}

TEST(LUXCompletion, CaseAndExtraBlanksDoNotMatter) {
  EXPECT_EQ(completions("  PRINT   q"), completions("print q"));
  EXPECT_TRUE(contains(completions("print q"), "print queue"));
}

TEST(LUXCompletion, AFinishedWordIsNotPartOfALongerOne) {
  for (const std::string& phrase : completions("print ")) {
    EXPECT_TRUE(phrase.starts_with("print ")) << phrase;
  }
  EXPECT_FALSE(completions("print ").empty());
}

TEST(LUXCompletion, HalfAQuestionCompletesItsLastWords) {
  EXPECT_TRUE(contains(completions("how do I cancel the print qu"), "print queue"));
}

TEST(LUXCompletion, WhatUsesMoreOfTheTextComesFirst) {
  const auto found = LUXCompletions(*world().view(), world().termsOf("tomato s"), 50, {}, {});
  ASSERT_GT(found.size(), 1U);
  EXPECT_EQ(world().view()->phraseText(found[0].phrase), "tomato soup");
  for (size_t i = 1; i < found.size(); ++i) {
    EXPECT_GE(found[i - 1].score, found[i].score);
    EXPECT_NE(found[i - 1].phrase, found[i].phrase);
  }
  EXPECT_LT(found[0].score, 0.99F);
  EXPECT_GT(found.back().score, 0);
}

TEST(LUXCompletion, NoPhraseIsOfferedTwice) {
  Strings found = completions("print print print");
  std::sort(found.begin(), found.end());
  EXPECT_EQ(std::adjacent_find(found.begin(), found.end()), found.end());
}

TEST(LUXCompletion, OneBookOffersItsOwnPhrases) {
  const auto kitchen = world().view()->bookNumber("org.zeb.kitchen");
  ASSERT_TRUE(kitchen);
  EXPECT_TRUE(contains(completions("tom", 50, kitchen), "tomato soup"));
  EXPECT_TRUE(completions("print", 50, kitchen).empty());
  const auto manual = world().view()->bookNumber("org.zeb.manual");
  EXPECT_TRUE(completions("tom", 50, manual).empty());
}

TEST(LUXCompletion, NoMoreThanWanted) {
  const Strings all = completions("p");
  ASSERT_GT(all.size(), 2U);
  EXPECT_EQ(completions("p", 2), Strings(all.begin(), all.begin() + 2));
  EXPECT_TRUE(completions("p", 0).empty());
}

TEST(LUXCompletion, NothingTypedCompletesNothing) {
  EXPECT_TRUE(completions("").empty());
  EXPECT_TRUE(completions("   ").empty());
  EXPECT_TRUE(completions("?").empty());
}

TEST(LUXCompletion, ALongTextCompletesNothing) {
  EXPECT_TRUE(completions(std::string(10000, 'p')).empty());
}

TEST(LUXCompletion, JapaneseIsCompletedHoweverItIsDivided) {
  std::vector<QueryPage> pages;
  pages.reserve(5);
  for (int i = 0; i < 5; ++i) {
    pages.push_back({"p" + std::to_string(i),
                     "\u5370\u5237\u8A2D\u5B9A",
                     {"\u5370\u5237\u8A2D\u5B9A\u3092\u5909\u66F4\u3057\u307E\u3059\u3002"}});
  }
  const QueryWorld japanese(pages, "Japanese");
  EXPECT_TRUE(contains(completions(japanese, "\u5370\u5237\u8A2D"), "\u5370\u5237\u8A2D\u5B9A"));
  EXPECT_TRUE(contains(completions(japanese, "\u5370"), "\u5370\u5237\u8A2D\u5B9A"));
}

TEST(LUXCompletion, HebrewIsCompleted) {
  std::vector<QueryPage> pages;
  pages.reserve(5);
  for (int i = 0; i < 5; ++i) {
    pages.push_back({"p" + std::to_string(i),
                     "\u05D4\u05D3\u05E4\u05E1\u05EA \u05DE\u05E1\u05DE\u05DB\u05D9\u05DD",
                     {"\u05D4\u05D3\u05E4\u05E1\u05EA \u05DE\u05E1\u05DE\u05DB\u05D9\u05DD."}});
  }
  const QueryWorld hebrew(pages, "Hebrew");
  EXPECT_TRUE(contains(completions(hebrew, "\u05D4\u05D3\u05E4"),
                       "\u05D4\u05D3\u05E4\u05E1\u05EA \u05DE\u05E1\u05DE\u05DB\u05D9\u05DD"));
}

TEST(LUXCompletion, ACancelledOneOffersNothing) {
  EXPECT_TRUE(
      LUXCompletions(*world().view(), world().termsOf("p"), 50, {}, [] { return true; }).empty());
}
