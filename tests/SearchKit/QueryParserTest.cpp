#include "SearchKit/QueryParser.h"

#include <gtest/gtest.h>

#include <algorithm>
#include <string>

namespace searchkit {
namespace {

std::string spelled(const TermPattern& pattern) {
  std::string text = pattern.isOpenAtStart ? "*" : "";
  for (size_t i = 0; i < pattern.pieces.size(); ++i) {
    text += (i > 0 ? "*" : "") + pattern.pieces[i];
  }
  return text + (pattern.isOpenAtEnd ? "*" : "");
}

// word, "two@0 words@1", or [required / optional / excluded].
std::string spelled(const QueryNode& node) {
  if (node.slots.size() == 1) {
    return spelled(node.slots[0].pattern);
  }
  std::string text;
  for (const PhraseSlot& slot : node.slots) {
    text += (text.empty() ? "\"" : " ") + spelled(slot.pattern) + "@" + std::to_string(slot.offset);
  }
  if (node.isLeaf()) {
    return text + "\"";
  }
  const auto list = [](const std::vector<QueryNode>& nodes) {
    std::string all;
    for (const QueryNode& child : nodes) {
      all += (all.empty() ? "" : " ") + spelled(child);
    }
    return all;
  };
  return "[" + list(node.required) + "/" + list(node.optional) + "/" + list(node.excluded) + "]";
}

std::string parsed(std::string_view text, bool blankMeansOr = false, size_t minimum = 1) {
  return spelled(parseQuery(text, blankMeansOr, minimum));
}

size_t depth(const QueryNode& node) {
  size_t deepest = 0;
  for (const auto* children : {&node.required, &node.optional, &node.excluded}) {
    for (const QueryNode& child : *children) {
      deepest = std::max(deepest, depth(child));
    }
  }
  return deepest + 1;
}

size_t leafCount(const QueryNode& node) {
  size_t count = node.slots.size();
  for (const auto* children : {&node.required, &node.optional, &node.excluded}) {
    for (const QueryNode& child : *children) {
      count += leafCount(child);
    }
  }
  return count;
}

TEST(QueryParser, readsWordsAndStars) {
  EXPECT_EQ(parsed("Print"), "print");
  EXPECT_EQ(parsed("print*"), "print*");
  EXPECT_EQ(parsed("*print*"), "*print*");
  EXPECT_EQ(parsed("w*d"), "w*d");
  EXPECT_EQ(parsed("*a**b*c"), "*a*b*c");
  EXPECT_EQ(parsed("print* queue* "), "[print* queue*//]");
}

TEST(QueryParser, starsThatTouchPunctuationBelongToNoWord) {
  EXPECT_EQ(parsed("a-* b"), "[a b//]");
  EXPECT_EQ(parsed("a*-b"), "\"a*@0 b@1\"");
  EXPECT_EQ(parsed("a*-*b"), "\"a*@0 *b@1\"");
}

TEST(QueryParser, readsPhrases) {
  EXPECT_EQ(parsed("\"one two\""), "\"one@0 two@1\"");
  EXPECT_EQ(parsed("\"one tw\"*"), "\"one@0 tw*@1\"");
  EXPECT_EQ(parsed("\"one & -two (three)\""), "\"one@0 two@1 three@2\"");
  EXPECT_EQ(parsed("x \"one two"), "[x \"one@0 two@1\"//]");
}

TEST(QueryParser, joinedWordsAreAPhrase) {
  EXPECT_EQ(parsed("wi-fi"), "\"wi@0 fi@1\"");
  EXPECT_EQ(parsed("file_name.tx*"), "\"file@0 name@1 tx*@2\"");
  EXPECT_EQ(parsed("don't"), "\"don@0 t@1\"");
  EXPECT_EQ(parsed("C++"), "c");
}

TEST(QueryParser, shortWordsLeaveGapsInPhrases) {
  EXPECT_EQ(parsed("\"how to print\"", false, 3), "\"how@0 print@2\"");
  EXPECT_EQ(parsed("\"to print it out\"", false, 3), "\"print@0 out@2\"");
  EXPECT_EQ(parsed("\"to it\"", false, 3), "[//]");
}

TEST(QueryParser, blankIsAsStrongAsItsMeaning) {
  EXPECT_EQ(parsed("a b | c"), "[/[a b//] c/]");
  EXPECT_EQ(parsed("a b & c", true), "[/a [b c//]/]");
  EXPECT_EQ(parsed("a b | c", true), "[/a b c/]");
}

TEST(QueryParser, signsApplyToWhatFollowsThem) {
  EXPECT_EQ(parsed("+a -b !c"), "[a//b c]");
  EXPECT_EQ(parsed("+a b -c", true), "[a/b/c]");
  EXPECT_EQ(parsed("a -(b c) -\"d e\""), "[a//[b c//] \"d@0 e@1\"]");
  EXPECT_EQ(parsed("a ! b"), "[a//b]");
  EXPECT_EQ(parsed("a - b"), "[a b//]");
}

TEST(QueryParser, requiredAmongAlternativesIsOneOfThem) {
  EXPECT_EQ(parsed("+a | b", true), "[/a b/]");
  EXPECT_EQ(parsed("+a | b"), "[/a b/]");
}

TEST(QueryParser, exclusionsRiseToWhereTheyApply) {
  EXPECT_EQ(parsed("a | -b"), "[/a/b]");
  EXPECT_EQ(parsed("(-b) a"), "[a//b]");
  EXPECT_EQ(parsed("-b"), "[//b]");
  EXPECT_EQ(parsed("a -(-b)"), "[a b//]");
}

TEST(QueryParser, dropsRepetitions) {
  EXPECT_EQ(parsed("a A a* a"), "[a a*//]");
  EXPECT_EQ(parsed("a a", true), "a");
}

TEST(QueryParser, unspacedWordsAreAlsoTakenWhole) {
  EXPECT_EQ(parsed("東京"), "東京*");
  EXPECT_EQ(parsed("東京に行く"), "[/東京に行く* \"東京@0 に@1 行く*@2\"/]");
  EXPECT_EQ(parsed("2023年"), "\"2023@0 年*@1\"");
}

TEST(QueryParser, boundsDepth) {
  std::string query;
  for (int i = 0; i < 10000; ++i) {
    query += "(a | b (";
  }
  EXPECT_LE(depth(parseQuery(query, false, 1)), 3 * maximumQueryDepth);
  std::string closed;
  for (int i = 0; i < 10000; ++i) {
    closed += "a | b) ";
  }
  EXPECT_LE(depth(parseQuery(closed, false, 1)), 3 * maximumQueryDepth);
}

TEST(QueryParser, boundsTerms) {
  std::string query;
  std::string phrase;
  for (int i = 0; i < 40000; ++i) {
    query += "w" + std::to_string(i) + " ";
    phrase += "w" + std::to_string(i) + "-";
  }
  EXPECT_EQ(leafCount(parseQuery(query, false, 1)), maximumQueryTerms);
  EXPECT_EQ(leafCount(parseQuery(phrase, false, 1)), maximumQueryTerms);
}

TEST(QueryParser, boundsWalksThroughTheDictionary) {
  std::string patterns;
  std::string phrase = "\"";
  for (int i = 0; i < 1000; ++i) {
    patterns += "*w" + std::to_string(i) + "* ";
    phrase += "w" + std::to_string(i) + "* ";
  }
  EXPECT_EQ(leafCount(parseQuery(patterns, false, 1)), maximumQueryScans);
  EXPECT_EQ(leafCount(parseQuery(phrase, false, 1)), maximumQueryScans);
  EXPECT_EQ(leafCount(parseQuery(patterns + "a* b", false, 1)), maximumQueryScans + 2);
}

TEST(TermPattern, matchesWhatItSays) {
  const auto matches = [](std::string_view pattern, std::string_view term) {
    return parseQuery(pattern, false, 1).slots.at(0).pattern.matches(term);
  };
  EXPECT_TRUE(matches("print", "print"));
  EXPECT_FALSE(matches("print", "printer"));
  EXPECT_TRUE(matches("print*", "print"));
  EXPECT_TRUE(matches("*print", "print"));
  EXPECT_TRUE(matches("*ri*", "printer"));
  EXPECT_TRUE(matches("p*r", "printer"));
  EXPECT_TRUE(matches("p*t*r", "printer"));
  EXPECT_FALSE(matches("p*r*r*r", "printer"));
  // The pieces must not overlap.
  EXPECT_FALSE(matches("ab*ba", "aba"));
  EXPECT_TRUE(matches("ab*ba", "abba"));
  EXPECT_TRUE(matches("*aa*aa", "aaaa"));
  EXPECT_FALSE(matches("*aa*aa", "aaa"));
}

}  // namespace
}  // namespace searchkit
