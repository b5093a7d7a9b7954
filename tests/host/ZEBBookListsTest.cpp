#include "host/Zebrine/ZEBBookLists.h"

#include <gtest/gtest.h>

namespace {

using platform::Value;
using Dictionary = platform::Value::Dictionary;

const Value exactMatch = Dictionary{{"wifi", "network-wireless"}, {"broken", 3}};

const Value suggestions = Dictionary{
    {"pr", Dictionary{{"print", "print-topics"}}},
    {"print", Dictionary{{"print", "print-topics"}, {"print both sides", "print-duplex"}}},
    {"print queue", Dictionary{{"print", "print-topics"}, {"print queue", 7}}},
    {"printer", "no dictionary"},
    {"scan", Dictionary{{"scan", "scan-topics"}}},
};

TEST(ZEBBookLists, exactMatchGivesTheAnchorOfTheQuery) {
  EXPECT_EQ(ZEBExactMatchAnchor(exactMatch, "wifi"), "network-wireless");
}

TEST(ZEBBookLists, exactMatchGivesNothingForAnotherQueryAndForAValueThatIsNoString) {
  EXPECT_EQ(ZEBExactMatchAnchor(exactMatch, "wi fi"), std::nullopt);
  EXPECT_EQ(ZEBExactMatchAnchor(exactMatch, "broken"), std::nullopt);
}

TEST(ZEBBookLists, suggestionsOfEveryKeyThatBeginsWithThePrefixComeKeyByKeyWithRepetitions) {
  EXPECT_EQ(ZEBSuggestionsWithPrefix(suggestions, "print"),
            (std::vector<std::string>{"print", "print both sides", "print", "print queue"}));
}

TEST(ZEBBookLists, emptyPrefixSuggestsEverything) {
  EXPECT_EQ(ZEBSuggestionsWithPrefix(suggestions, "").size(), 6U);
}

TEST(ZEBBookLists, aPrefixBeyondTheLastKeySuggestsNothing) {
  EXPECT_TRUE(ZEBSuggestionsWithPrefix(suggestions, "zoom").empty());
}

TEST(ZEBBookLists, suggestionAnchorNeedsTheQueryAsKeyAndAsText) {
  EXPECT_EQ(ZEBSuggestionAnchor(suggestions, "print"), "print-topics");
  EXPECT_EQ(ZEBSuggestionAnchor(suggestions, "pr"), std::nullopt);
  EXPECT_EQ(ZEBSuggestionAnchor(suggestions, "Print"), std::nullopt);
}

TEST(ZEBBookLists, suggestionAnchorIgnoresValuesOfAnotherKind) {
  EXPECT_EQ(ZEBSuggestionAnchor(suggestions, "print queue"), std::nullopt);
  EXPECT_EQ(ZEBSuggestionAnchor(suggestions, "printer"), std::nullopt);
}

TEST(ZEBBookLists, whatIsNoDictionaryYieldsNothing) {
  for (const Value& list : {Value(), Value("print"), Value(Value::Array{"print"}), Value(3)}) {
    EXPECT_EQ(ZEBExactMatchAnchor(list, "print"), std::nullopt);
    EXPECT_TRUE(ZEBSuggestionsWithPrefix(list, "print").empty());
    EXPECT_EQ(ZEBSuggestionAnchor(list, "print"), std::nullopt);
  }
}

}  // namespace
