#include <gtest/gtest.h>

#include <cmath>
#include <limits>
#include <set>
#include <string>
#include <vector>

#include "SearchKit/SearchKit.h"
#include "tests/SearchKit/Indexes.h"

namespace searchkit {
namespace {

using testing::composed;
using testing::found;
using testing::openIndex;
using testing::page;
using testing::scores;

constexpr SKSearchOptions orBlank = kSKSearchOptionSpaceMeansOR;

// /1 applique  /2 banana  /3 applique banana  /4 banana cherry  /5 applique banana cherry  /6 date
SKIndexRef fruits() {
  static const SKIndexRef index = openIndex(
      {page("/1", "applique"), page("/2", "banana"), page("/3", "applique banana"),
       page("/4", "banana cherry"), page("/5", "applique banana cherry"), page("/6", "date")});
  return index;
}

TEST(SKSearch, isNullWithoutAnIndex) { EXPECT_EQ(SKSearchCreate(nullptr, "a", 0), nullptr); }

TEST(SKSearch, blankMeansAnd) { EXPECT_EQ(found(fruits(), "applique banana"), "/3 /5 "); }

TEST(SKSearch, blankMeansOrWithTheOption) {
  EXPECT_EQ(found(fruits(), "applique cherry", orBlank), "/1 /3 /4 /5 ");
}

TEST(SKSearch, anUnknownTermEndsAnAndButNotAnOr) {
  EXPECT_EQ(found(fruits(), "applique unknown"), "");
  EXPECT_EQ(found(fruits(), "applique unknown", orBlank), "/1 /3 /5 ");
}

TEST(SKSearch, findsWordsBegunWithThePrefix) {
  EXPECT_EQ(found(fruits(), "ap*"), "/1 /3 /5 ");
  EXPECT_EQ(found(fruits(), "ap* che* "), "/5 ");
  EXPECT_EQ(found(fruits(), "applique*"), "/1 /3 /5 ");
  EXPECT_EQ(found(fruits(), "appliques*"), "");
}

TEST(SKSearch, findsWordsThatAPatternMatches) {
  EXPECT_EQ(found(fruits(), "*nan*"), "/2 /3 /4 /5 ");
  EXPECT_EQ(found(fruits(), "*e"), "/1 /3 /5 /6 ");
  EXPECT_EQ(found(fruits(), "b*a"), "/2 /3 /4 /5 ");
  EXPECT_EQ(found(fruits(), "d**t*"), "/6 ");
  EXPECT_EQ(found(fruits(), "b*n*n*n*a"), "");
  EXPECT_EQ(found(fruits(), "*an*an*an"), "");
  EXPECT_EQ(found(fruits(), "*applique*"), "/1 /3 /5 ");
}

TEST(SKSearch, findsPhrasesInTheirOrderOnly) {
  EXPECT_EQ(found(fruits(), "\"applique banana\""), "/3 /5 ");
  EXPECT_EQ(found(fruits(), "\"banana applique\""), "");
  EXPECT_EQ(found(fruits(), "\"applique banana cherry\""), "/5 ");
  EXPECT_EQ(found(fruits(), "\"applique cherry\""), "");
  EXPECT_EQ(found(fruits(), "\"BANANA, Cherry!\""), "/4 /5 ");
}

TEST(SKSearch, phraseOfOneWordIsTheWord) {
  EXPECT_EQ(found(fruits(), "\"date\""), "/6 ");
  EXPECT_EQ(found(fruits(), "\"dat\""), "");
}

TEST(SKSearch, phraseMayHaveStars) {
  EXPECT_EQ(found(fruits(), "\"applique ban*\""), "/3 /5 ");
  EXPECT_EQ(found(fruits(), "\"app* *nana\""), "/3 /5 ");
  EXPECT_EQ(found(fruits(), "\"applique ban\"*"), "/3 /5 ");
}

TEST(SKSearch, phraseOfARepeatedWordNeedsItRepeated) {
  const SKIndexRef index =
      openIndex({page("/1", "ha"), page("/2", "ha ha"), page("/3", "ha x ha")});
  EXPECT_EQ(found(index, "\"ha ha\""), "/2 ");
}

TEST(SKSearch, phraseDoesNotReachAcrossEntries) {
  Document document = page("/1", "first block");
  document.title = "Some title";
  document.headings = {"One heading", "another heading"};
  document.body.emplace_back("second block");
  const SKIndexRef index = openIndex({document});
  EXPECT_EQ(found(index, "\"title one\" | \"heading another\" | \"heading first\""), "");
  EXPECT_EQ(found(index, "\"block second\""), "");
  EXPECT_EQ(found(index, "\"another heading\" \"second block\" \"some title\""), "/1 ");
}

TEST(SKSearch, requiredTermMustBeThereAmongOptionalOnes) {
  EXPECT_EQ(found(fruits(), "applique +cherry", orBlank), "/4 /5 ");
  EXPECT_EQ(found(fruits(), "+applique +cherry date", orBlank), "/5 ");
  EXPECT_EQ(found(fruits(), "+applique banana"), "/3 /5 ");
}

TEST(SKSearch, optionalTermsAddToTheScoreOfRequiredOnes) {
  const auto hits = scores(fruits(), "+banana cherry", orBlank);
  EXPECT_EQ(hits.size(), 4U);
  EXPECT_GT(hits.at(3), hits.at(1));
}

TEST(SKSearch, excludedTermMustNotBeThere) {
  EXPECT_EQ(found(fruits(), "banana -applique"), "/2 /4 ");
  EXPECT_EQ(found(fruits(), "banana !applique"), "/2 /4 ");
  EXPECT_EQ(found(fruits(), "-applique banana -cherry"), "/2 ");
  EXPECT_EQ(found(fruits(), "applique date -banana", orBlank), "/1 /6 ");
  EXPECT_EQ(found(fruits(), "banana -\"applique banana\""), "/2 /4 ");
  EXPECT_EQ(found(fruits(), "banana -(applique | cherry)"), "/2 ");
  EXPECT_EQ(found(fruits(), "banana -che*"), "/2 /3 ");
}

TEST(SKSearch, exclusionsAloneFindNothing) {
  EXPECT_EQ(found(fruits(), "-applique"), "");
  EXPECT_EQ(found(fruits(), "-applique !banana", orBlank), "");
  EXPECT_EQ(found(fruits(), "(-applique)"), "");
}

TEST(SKSearch, exclusionsInParenthesesBelongToWhatIsAround) {
  EXPECT_EQ(found(fruits(), "(-applique) banana"), "/2 /4 ");
  EXPECT_EQ(found(fruits(), "banana | -applique"), "/2 /4 ");
  EXPECT_EQ(found(fruits(), "banana -(-applique)"), "/3 /5 ");
}

TEST(SKSearch, andBindsTighterThanOr) {
  EXPECT_EQ(found(fruits(), "date | applique & cherry"), "/5 /6 ");
  EXPECT_EQ(found(fruits(), "applique & cherry | date"), "/5 /6 ");
  EXPECT_EQ(found(fruits(), "date | applique cherry"), "/5 /6 ");
  EXPECT_EQ(found(fruits(), "date applique & cherry", orBlank), "/5 /6 ");
  EXPECT_EQ(found(fruits(), "applique & -banana | date"), "/1 /6 ");
}

TEST(SKSearch, parenthesesGroup) {
  EXPECT_EQ(found(fruits(), "(date | applique) & cherry"), "/5 ");
  EXPECT_EQ(found(fruits(), "(applique | cherry) banana"), "/3 /4 /5 ");
  EXPECT_EQ(found(fruits(), "((((applique))) ((banana)))"), "/3 /5 ");
  EXPECT_EQ(found(fruits(), "date | (applique (cherry | date))"), "/5 /6 ");
}

TEST(SKSearch, operatorsNeedNoBlanks) {
  EXPECT_EQ(found(fruits(), "applique&banana"), "/3 /5 ");
  EXPECT_EQ(found(fruits(), "date|applique&cherry"), "/5 /6 ");
  EXPECT_EQ(found(fruits(), "(applique)cherry"), "/5 ");
  EXPECT_EQ(found(fruits(), "\"applique\"\"cherry\""), "/5 ");
}

TEST(SKSearch, danglingOperatorsAreIgnored) {
  for (const char* query :
       {"applique cherry &",    "& applique cherry",     "applique & & cherry",
        "applique | & cherry",  "applique cherry |",     "| applique cherry",
        "applique cherry -",    "applique - cherry",     "applique + cherry",
        "applique cherry +",    "applique cherry !",     "applique -& cherry",
        "applique * cherry",    "applique cherry **",    "() applique cherry ()",
        "applique cherry \"\"", "applique cherry \"?\"", "applique cherry (-)",
        "applique && cherry",   "applique cherry ((",    "applique )( cherry"}) {
    EXPECT_EQ(found(fruits(), query), "/5 ") << query;
  }
  for (const char* query :
       {"",   " ",    "&",     "|",   "-",   "+",  "!",   "*",   "**",    "(",   ")",     "()",
        "\"", "\"\"", "- - -", "&|&", "+-!", ")(", "(((", ")))", "\"*\"", "-()", "-\"\"", "? ."}) {
    EXPECT_EQ(found(fruits(), query), "") << query;
    EXPECT_EQ(found(fruits(), query, orBlank), "") << query;
  }
}

TEST(SKSearch, unbalancedParenthesesAreClosedOrOpenedAtTheEnds) {
  EXPECT_EQ(found(fruits(), "cherry & (applique | date"), "/5 ");
  EXPECT_EQ(found(fruits(), "applique | date) cherry"), "/5 ");
  EXPECT_EQ(found(fruits(), "applique) cherry)"), "/5 ");
}

TEST(SKSearch, anUnclosedPhraseEndsAtTheEnd) {
  EXPECT_EQ(found(fruits(), "\"applique banana"), "/3 /5 ");
  EXPECT_EQ(found(fruits(), "cherry \"applique banana"), "/5 ");
}

TEST(SKSearch, aStrayQuotationMarkIsIgnored) {
  EXPECT_EQ(found(fruits(), "applique banana\""), "/3 /5 ");
  EXPECT_EQ(found(fruits(), "banana\" applique"), "/3 /5 ");
}

TEST(SKSearch, typographicQuotationMarksMakePhrases) {
  EXPECT_EQ(found(fruits(), "“applique banana” -cherry"), "/3 ");
  EXPECT_EQ(found(fruits(), "«banana cherry»"), "/4 /5 ");
}

TEST(SKSearch, hyphenInsideAWordJoinsAPhrase) {
  const SKIndexRef index = openIndex({page("/1", "wi-fi"), page("/2", "wi fi"), page("/3", "fi wi"),
                                      page("/4", "wi"), page("/5", "the wi-fi network")});
  EXPECT_EQ(found(index, "wi-fi"), "/1 /2 /5 ");
  EXPECT_EQ(found(index, "wi-fi network"), "/5 ");
  EXPECT_EQ(found(index, "wi-f*"), "/1 /2 /5 ");
  EXPECT_EQ(found(index, "-wi-fi wi"), "/3 /4 ");
}

TEST(SKSearch, signsAfterAWordArePartOfIt) {
  const SKIndexRef index =
      openIndex({page("/1", "C++ and more"), page("/2", "C"), page("/3", "more")});
  EXPECT_EQ(found(index, "C++ more"), "/1 ");
  EXPECT_EQ(found(index, "more!"), "/1 /3 ");
}

TEST(SKSearch, twoHyphensBeforeAWordExcludeNothing) {
  EXPECT_EQ(found(fruits(), "applique --cherry"), "/5 ");
  EXPECT_EQ(found(fruits(), "--date"), "/6 ");
}

TEST(SKSearch, ofSeveralSignsTheLastCounts) {
  EXPECT_EQ(found(fruits(), "banana +-applique"), "/2 /4 ");
  EXPECT_EQ(found(fruits(), "banana -+applique"), "/3 /5 ");
  EXPECT_EQ(found(fruits(), "banana ! applique"), "/2 /4 ");
}

TEST(SKSearch, foldsWhatWasTyped) {
  const SKIndexRef index = openIndex({page("/1", "Die Größe im Café"), page("/2", "grosse cafe")});
  EXPECT_EQ(found(index, "GRÖSSE CAFÉ"), "/1 /2 ");
  EXPECT_EQ(found(index, "größ* \"im Cafe\""), "/1 ");
}

TEST(SKSearch, findsWordsOfScriptsWithoutBlanksByTheirBeginning) {
  const SKIndexRef index =
      openIndex({page("/1", "東京都に行く"), page("/2", "印刷の設定"), page("/3", "京都の印刷")});
  EXPECT_EQ(found(index, "東京都"), "/1 ");
  EXPECT_EQ(found(index, "東 "), "/1 ");
  EXPECT_EQ(found(index, "印刷 -設定"), "/3 ");
  EXPECT_EQ(found(index, "\"印刷の設定\""), "/2 ");
  EXPECT_EQ(found(index, composed(index, "印刷の設")), "/2 ");
}

TEST(SKSearch, shortWordsThatTheIndexLeftOutDoNotEmptyTheResult) {
  const SKIndexRef index =
      openIndex({page("/1", "how to print a page"), page("/2", "print the total page"),
                 page("/3", "toner and queue")},
                3);
  EXPECT_EQ(found(index, "+how +to +print"), "/1 ");
  EXPECT_EQ(found(index, "\"how to print a page\""), "/1 ");
  EXPECT_EQ(found(index, "\"print a page\""), "/1 ");
  EXPECT_EQ(found(index, composed(index, "print to page")), "/1 /2 ");
  EXPECT_EQ(found(index, "to"), "");
}

TEST(SKSearch, aShortPrefixCountsForTheScore) {
  const SKIndexRef index = openIndex({page("/1", "print page"), page("/2", "print total page")}, 3);
  const auto without = scores(index, "print page");
  const auto with = scores(index, "to* print page");
  EXPECT_FLOAT_EQ(with.at(0), without.at(0));
  EXPECT_GT(with.at(1), without.at(1));
}

TEST(SKSearch, aShortPrefixAtTheEndIsAWordHalfTyped) {
  const SKIndexRef index =
      openIndex({page("/1", "print queue"), page("/2", "print page"), page("/3", "queue")}, 3);
  EXPECT_EQ(found(index, composed(index, "print qu")), "/1 ");
  EXPECT_EQ(found(index, composed(index, "qu print")), "/1 /2 ");
}

// Relevance.

TEST(SKSearch, titleCountsMoreThanHeadingAndHeadingMoreThanBody) {
  Document title = page("/title", "filler filler");
  title.title = "printer";
  Document heading = page("/heading", "filler filler");
  heading.headings = {"printer"};
  const SKIndexRef index = openIndex({title, heading, page("/body", "filler filler printer")});
  for (const char* query : {"printer", "print*", "*rinte*", "printer | unknown"}) {
    const auto hits = scores(index, query);
    ASSERT_EQ(hits.size(), 3U) << query;
    EXPECT_GT(hits.at(2), hits.at(1)) << query;
    EXPECT_GT(hits.at(1), hits.at(0)) << query;
  }
}

TEST(SKSearch, anExactTermCountsMoreThanAMerePrefix) {
  const SKIndexRef index = openIndex({page("/1", "print"), page("/2", "printer printer printer")});
  const auto hits = scores(index, "print*");
  EXPECT_GT(hits.at(0), hits.at(1));
}

TEST(SKSearch, frequenciesOfAPrefixAddUp) {
  const SKIndexRef index =
      openIndex({page("/1", "printer filler filler"), page("/2", "printer printing prints")});
  const auto hits = scores(index, "print*");
  EXPECT_GT(hits.at(1), hits.at(0));
}

TEST(SKSearch, rareWordsCountMoreThanCommonOnes) {
  const auto hits = scores(fruits(), "date | banana");
  EXPECT_GT(hits.at(5), hits.at(1));
}

TEST(SKSearch, moreOfTheWordsScoreHigher) {
  const auto hits = scores(fruits(), "applique banana cherry", orBlank);
  EXPECT_GT(hits.at(4), hits.at(2));
  EXPECT_GT(hits.at(4), hits.at(3));
}

TEST(SKSearch, aRepeatedWordScoresAsOne) {
  EXPECT_EQ(scores(fruits(), "applique applique APPLIQUE"), scores(fruits(), "applique"));
  EXPECT_EQ(scores(fruits(), "applique applique date", orBlank),
            scores(fruits(), "applique date", orBlank));
}

TEST(SKSearch, scoresOfACompleteMatchAreTheSameForBothMeaningsOfABlank) {
  EXPECT_FLOAT_EQ(scores(fruits(), "applique cherry").at(4),
                  scores(fruits(), "applique cherry", orBlank).at(4));
}

// Bounds.

TEST(SKSearch, takesTenThousandWords) {
  std::string query;
  for (int i = 0; i < 10000; ++i) {
    query += "word" + std::to_string(i) + "* ";
  }
  EXPECT_EQ(found(fruits(), query + "applique"), "");
  EXPECT_EQ(found(fruits(), query + "applique", orBlank), "/1 /3 /5 ");
  std::string same;
  for (int i = 0; i < 10000; ++i) {
    same += "applique ";
  }
  EXPECT_EQ(found(fruits(), same), "/1 /3 /5 ");
}

TEST(SKSearch, takesAHundredThousandParentheses) {
  const std::string open(100000, '(');
  const std::string close(100000, ')');
  EXPECT_EQ(found(fruits(), open + "date"), "/6 ");
  EXPECT_EQ(found(fruits(), open + "date" + close), "/6 ");
  EXPECT_EQ(found(fruits(), "date" + close), "/6 ");
  std::string nested;
  for (int i = 0; i < 100000; ++i) {
    nested += "(applique | -(";
  }
  EXPECT_NO_FATAL_FAILURE(found(fruits(), nested + "date"));
  std::string closing;
  for (int i = 0; i < 100000; ++i) {
    closing += "applique | date) ";
  }
  EXPECT_NO_FATAL_FAILURE(found(fruits(), closing));
}

TEST(SKSearch, takesMegabytesOfOperators) {
  for (const char* unit :
       {"-", "+", "!", "\"", "&", "|", "*", "a-", "\"a", "(a|", "-(", "*a", "\xFF"}) {
    std::string query;
    while (query.size() < 1000000) {
      query += unit;
    }
    EXPECT_NO_FATAL_FAILURE(found(fruits(), query)) << unit;
  }
}

TEST(SKSearch, phraseOfAHundredThousandWords) {
  std::string text;
  for (int i = 0; i < 100000; ++i) {
    text += "w" + std::to_string(i % 50) + " ";
  }
  const SKIndexRef index = openIndex({page("/1", text), page("/2", "w0 w1")});
  EXPECT_EQ(found(index, "\"" + text + "\""), "/1 ");
}

// Delivery.

std::vector<Document> manyPages(int count) {
  std::vector<Document> pages;
  pages.reserve(static_cast<size_t>(count));
  for (int i = 0; i < count; ++i) {
    pages.push_back(page("/" + std::to_string(i), "common word" + std::to_string(i % 10)));
  }
  return pages;
}

TEST(SKSearchFindMatches, deliversEveryHitOnceInBatchesOfAnySize) {
  const SKIndexRef index = openIndex(manyPages(257));
  for (const size_t batch : {1U, 2U, 50U, 256U, 257U, 258U, 1000U}) {
    const SKSearchRef search = SKSearchCreate(index, "common", 0);
    std::multiset<SKDocumentID> ids;
    bool mayHaveMore = true;
    size_t calls = 0;
    while (mayHaveMore) {
      std::vector<SKDocumentID> some(batch);
      size_t count = 0;
      mayHaveMore = SKSearchFindMatches(*search, batch, some.data(), nullptr, 1.0, &count);
      ASSERT_LE(count, batch);
      ids.insert(some.begin(), some.begin() + static_cast<ptrdiff_t>(count));
      ++calls;
    }
    EXPECT_EQ(ids.size(), 257U);
    EXPECT_EQ(std::set<SKDocumentID>(ids.begin(), ids.end()).size(), 257U);
    EXPECT_EQ(calls, (257 + batch - 1) / batch);
  }
}

TEST(SKSearchFindMatches, saysThatNothingFollowsWithTheLastHit) {
  const SKIndexRef index = openIndex(manyPages(50));
  const SKSearchRef search = SKSearchCreate(index, "common", 0);
  SKDocumentID ids[50];
  size_t count = 0;
  EXPECT_FALSE(SKSearchFindMatches(*search, 50, ids, nullptr, 1.0, &count));
  EXPECT_EQ(count, 50U);
  EXPECT_FALSE(SKSearchFindMatches(*search, 50, ids, nullptr, 1.0, &count));
  EXPECT_EQ(count, 0U);
}

TEST(SKSearchFindMatches, askedForNothingDeliversNothingAndLosesNothing) {
  const SKSearchRef search = SKSearchCreate(fruits(), "applique", 0);
  size_t count = 99;
  EXPECT_TRUE(SKSearchFindMatches(*search, 0, nullptr, nullptr, 1.0, &count));
  EXPECT_EQ(count, 0U);
  SKDocumentID ids[10];
  EXPECT_FALSE(SKSearchFindMatches(*search, 10, ids, nullptr, 1.0, &count));
  EXPECT_EQ(count, 3U);
  EXPECT_FALSE(SKSearchFindMatches(*search, 0, nullptr, nullptr, 1.0, &count));
}

TEST(SKSearchFindMatches, withoutAnyHitSaysSoAtOnce) {
  const SKSearchRef search = SKSearchCreate(fruits(), "unknown", 0);
  SKDocumentID ids[10];
  size_t count = 99;
  EXPECT_FALSE(SKSearchFindMatches(*search, 10, ids, nullptr, 1.0, &count));
  EXPECT_EQ(count, 0U);
}

TEST(SKSearchFindMatches, keepsTheIndexAlive) {
  SKIndexRef index = openIndex(manyPages(3));
  const SKSearchRef search = SKSearchCreate(index, "common", 0);
  index.reset();
  SKDocumentID ids[10];
  size_t count = 0;
  SKSearchFindMatches(*search, 10, ids, nullptr, 1.0, &count);
  EXPECT_EQ(count, 3U);
}

}  // namespace
}  // namespace searchkit
