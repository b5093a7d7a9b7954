#include "host/Luxwell/LUXSimilar.h"

#include <gtest/gtest.h>

#include <algorithm>
#include <cmath>
#include <map>
#include <set>
#include <string>
#include <vector>

#include "host/Luxwell/LUXStemsKey.h"
#include "tests/Luxwell/LUXQueryWorld.h"

using tests::QueryPage;
using tests::QueryWorld;
using Strings = std::vector<std::string>;

namespace {

const QueryWorld& world() {
  static const QueryWorld made([] {
    std::vector<QueryPage> pages;
    for (int i = 0; i < 4; ++i) {
      const std::string number = std::to_string(i);
      pages.push_back({"net" + number,
                       "Wireless network",
                       {"The wireless network, or wi-fi, needs a password. Network settings. "
                        "Radio signal."}});
      pages.push_back({"print" + number,
                       "Print queue",
                       {"The print queue has a print preview. Office printer."}});
      pages.push_back({"soup" + number,
                       "Tomato soup",
                       {"The tomato soup has tomato paste. Soups of tomatoes."},
                       "org.zeb.kitchen"});
    }
    return pages;
  }());
  return made;
}

std::vector<LUXScoredPhrase> similar(std::string_view text, size_t count = 50,
                                     const LUXPageScope& scope = {},
                                     std::optional<uint32_t> book = std::nullopt) {
  return LUXSimilarPhrases(*world().view(), world().termsOf(text), count, scope, book, {});
}

Strings texts(const std::vector<LUXScoredPhrase>& phrases) {
  Strings found;
  for (const LUXScoredPhrase& phrase : phrases) {
    found.emplace_back(world().view()->phraseText(phrase.phrase));
  }
  return found;
}

bool contains(const Strings& strings, std::string_view string) {
  return std::find(strings.begin(), strings.end(), string) != strings.end();
}

}  // namespace

TEST(LUXSimilar, OffersPhrasesThatFindTheSamePagesWithOtherWords) {
  const Strings found = texts(similar("wireless network "));
  EXPECT_TRUE(contains(found, "Radio signal"));
  EXPECT_TRUE(contains(found, "network settings"));
  EXPECT_FALSE(contains(found, "tomato soup"));
  EXPECT_FALSE(contains(found, "print queue"));
}

TEST(LUXSimilar, LeavesOutPhrasesWithTheStemsOfTheText) {
  EXPECT_FALSE(contains(texts(similar("wireless network ")), "wireless network"));
  EXPECT_FALSE(contains(texts(similar("networks, wireless")), "wireless network"));
}

TEST(LUXSimilar, NoTwoPhrasesHaveTheSameStems) {
  const LUXModelView& view = *world().view();
  std::set<uint32_t> keys;
  const auto found = similar("tomato paste ");
  ASSERT_FALSE(found.empty());
  for (const LUXScoredPhrase& phrase : found) {
    EXPECT_TRUE(keys.insert(view.phraseStemsKey(phrase.phrase)).second)
        << view.phraseText(phrase.phrase);
  }
}

TEST(LUXSimilar, RanksByTheCosineOfProfiles) {
  const LUXModelView& view = *world().view();
  for (const std::string text :
       {"print preview ", "password ", "paste of tomatoes", "soup radio "}) {
    std::map<uint32_t, double> profile;
    double squares = 0;
    for (const LUXScoredPage& page :
         LUXScoring(view).bestPages(world().termsOf(text), LUXProfileLength)) {
      profile[page.page] = std::pow(static_cast<double>(page.score), 2);
      squares += std::pow(static_cast<double>(page.score), 4);
    }
    ASSERT_FALSE(profile.empty()) << text;
    std::map<uint32_t, double> cosines;
    for (uint32_t phrase = 0; phrase < view.phraseCount(); ++phrase) {
      for (const LUXModelView::Share& share : view.pagesOfPhrase(phrase)) {
        if (profile.contains(share.number)) {
          cosines[phrase] +=
              static_cast<double>(share.weight) * profile[share.number] / std::sqrt(squares);
        }
      }
    }
    const auto found = similar(text);
    ASSERT_FALSE(found.empty()) << text;
    for (size_t i = 0; i < found.size(); ++i) {
      EXPECT_NEAR(static_cast<double>(found[i].score), std::min(0.989, cosines.at(found[i].phrase)),
                  1e-4)
          << text;
      if (i > 0) {
        EXPECT_GE(found[i - 1].score, found[i].score) << text;
      }
    }
    EXPECT_LE(found.size(), cosines.size());
  }
}

TEST(LUXSimilar, AProfileIsOfUnitLength) {
  const auto profile = LUXProfile(*world().view(), world().termsOf("print queue"), {}, {});
  ASSERT_FALSE(profile.empty());
  EXPECT_LE(profile.size(), LUXProfileLength);
  double squares = 0;
  for (const LUXScoredPage& page : profile) {
    squares += static_cast<double>(page.score) * static_cast<double>(page.score);
  }
  EXPECT_NEAR(squares, 1, 1e-5);
}

TEST(LUXSimilar, OneBookOffersItsOwnPhrases) {
  const auto kitchen = world().view()->bookNumber("org.zeb.kitchen");
  ASSERT_TRUE(kitchen);
  const auto [first, end] = world().view()->pageRangeOfBook(*kitchen);
  EXPECT_TRUE(similar("wireless network ", 50, {first, end, 0, 0}, kitchen).empty());
  EXPECT_FALSE(similar("tomato paste ", 50, {first, end, 0, 0}, kitchen).empty());
}

TEST(LUXSimilar, NoMoreThanWanted) {
  const auto all = similar("print preview ");
  ASSERT_GT(all.size(), 1U);
  const auto one = similar("print preview ", 1);
  ASSERT_EQ(one.size(), 1U);
  EXPECT_EQ(one[0], all[0]);
  EXPECT_TRUE(similar("print preview ", 0).empty());
}

TEST(LUXSimilar, ATextThatFindsNothingHasNothingSimilar) {
  EXPECT_TRUE(similar("zygote entanglement ").empty());
  EXPECT_TRUE(similar("").empty());
}

TEST(LUXSimilar, ACancelledOneOffersNothing) {
  EXPECT_TRUE(LUXSimilarPhrases(*world().view(), world().termsOf("print preview "), 50, {},
                                std::nullopt, [] { return true; })
                  .empty());
}
