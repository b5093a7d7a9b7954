#include "host/Luxwell/LUXQueryTerms.h"

#include <gtest/gtest.h>

#include <string>
#include <vector>

namespace {

const HelpTokenizer& english() {
  static const auto tokenizer = HelpTokenizer::tokenizerForLanguage("English");
  return *tokenizer;
}

LUXQueryTerms termsOf(std::string_view text, const HelpTokenizer& tokenizer = english()) {
  return LUXQueryTerms::termsOfText(tokenizer, text, {});
}

std::vector<std::string> tokensOf(const std::vector<LUXQueryTerms::Term>& terms) {
  std::vector<std::string> tokens;
  for (const LUXQueryTerms::Term& term : terms) {
    tokens.push_back(term.token);
  }
  return tokens;
}

using Strings = std::vector<std::string>;

Strings pairsOf(const LUXQueryTerms& terms) {
  Strings pairs;
  for (const LUXQueryTerms::Pair& pair : terms.bigrams) {
    pairs.push_back(terms.stems.at(pair.first).token + ' ' + terms.stems.at(pair.second).token);
  }
  return pairs;
}

TEST(LUXQueryTerms, OperatorsOfKeywordSearchesAreKnownInShortTexts) {
  for (const char* text : {"\"half words\"", "print -fax", "print !fax", "+print fax", "a | b",
                           "prin* qu*", "x -\"a b\""}) {
    EXPECT_TRUE(LUXQueryHasOperators(text)) << text;
  }
  for (const char* text : {"", "print queue", "e-mail", "C++ templates", "what - if", "5 * 3",
                           "say \"hello", "a&b", "a & b", "sin(x)", "-5 degrees", "* * *", "-",
                           "why does the \"default printer\" forget its paper size every time"}) {
    EXPECT_FALSE(LUXQueryHasOperators(text)) << text;
  }
}

}  // namespace

TEST(LUXQueryTerms, KeepsStemsAndFormsOfWordsThatTellPagesApart) {
  const LUXQueryTerms terms = termsOf("the printers of the Networks");
  EXPECT_EQ(tokensOf(terms.stems), (Strings{"printer", "network"}));
  EXPECT_EQ(tokensOf(terms.forms), (Strings{"printers", "networks"}));
  EXPECT_FALSE(terms.onlyStopWords);
}

TEST(LUXQueryTerms, NamesMadeOfSeveralWordsAreFormsToo) {
  const LUXQueryTerms terms = termsOf("import os.path ");
  EXPECT_EQ(tokensOf(terms.stems), (Strings{"import", "os", "path"}));
  EXPECT_EQ(tokensOf(terms.forms), (Strings{"import", "os", "os.path", "path"}));
}

TEST(LUXQueryTerms, CountsWordsThatOccurAgain) {
  const LUXQueryTerms terms = termsOf("print, printing or printed?");
  ASSERT_EQ(terms.stems.size(), 1U);
  EXPECT_EQ(terms.stems[0].token, "print");
  EXPECT_EQ(terms.stems[0].count, 3U);
  EXPECT_EQ(terms.forms.size(), 3U);
}

TEST(LUXQueryTerms, PairsAreBrokenByStopWordsAndPunctuation) {
  EXPECT_EQ(pairsOf(termsOf("print queue of office, network")), (Strings{"print queue"}));
  EXPECT_EQ(pairsOf(termsOf("office network printer")),
            (Strings{"offic network", "network printer"}));
}

TEST(LUXQueryTerms, CountsPairsThatOccurAgain) {
  const LUXQueryTerms terms = termsOf("print queue, paper tray, print queues print queue");
  EXPECT_EQ(pairsOf(terms), (Strings{"print queue", "queue print", "paper tray"}));
  EXPECT_EQ(terms.bigrams[0].count, 3U);
  EXPECT_EQ(terms.bigrams[1].count, 1U);
}

TEST(LUXQueryTerms, StopWordsAloneAreKept) {
  const LUXQueryTerms terms = termsOf("who is there");
  EXPECT_TRUE(terms.onlyStopWords);
  EXPECT_EQ(tokensOf(terms.forms), (Strings{"who", "is", "there"}));
  EXPECT_TRUE(terms.bigrams.empty());
}

TEST(LUXQueryTerms, TheLastWordIsUnfinishedWhileNothingFollowsIt) {
  EXPECT_EQ(termsOf("print netwo").unfinishedForm, "netwo");
  EXPECT_EQ(termsOf("print networks").unfinishedStem, "network");
  EXPECT_EQ(termsOf("print netwo ").unfinishedForm, "");
  EXPECT_EQ(termsOf("print netwo?").unfinishedForm, "");
  EXPECT_EQ(termsOf("print the").unfinishedForm, "");
  EXPECT_EQ(termsOf("").unfinishedForm, "");
}

TEST(LUXQueryTerms, TheNormalizedTitleIsTheTokenizers) {
  for (const char* text :
       {"Print the queue", "Who is it", "Files, folders & more", "x", "os.path and more"}) {
    EXPECT_EQ(termsOf(text).normalizedTitle, english().tokenizedStringFromString(text)) << text;
  }
}

TEST(LUXQueryTerms, TheFoldedTextIsWhatIsTyped) {
  const LUXQueryTerms terms = termsOf("How to  Print");
  EXPECT_EQ(terms.foldedText, "how to print");
  EXPECT_EQ(terms.wordStarts, (std::vector<size_t>{0, 4, 7}));
  EXPECT_EQ(termsOf("How to ").foldedText, "how to ");
}

TEST(LUXQueryTerms, TheFoldedTextAloneIsThatOfAllTerms) {
  for (const char* text : {"How to  Print", "the users' os.path ", "", "?", "\xFFx", "caf\u00E9s",
                           "What's new", "\u6253\u5370 files"}) {
    const LUXQueryTerms terms = termsOf(text);
    const LUXQueryTerms folded = LUXQueryTerms::foldedTextOf(english(), text);
    EXPECT_EQ(folded.foldedText, terms.foldedText) << text;
    EXPECT_EQ(folded.wordStarts, terms.wordStarts) << text;
    EXPECT_TRUE(folded.stems.empty());
  }
  EXPECT_TRUE(LUXQueryTerms::foldedTextOf(english(), std::string(10000, 'a')).foldedText.empty());
}

TEST(LUXQueryTerms, TextWithoutWordsHasNoTerms) {
  for (const char* text : {"", "   ", "?!…", "\xFF\xFE", "\n\t"}) {
    const LUXQueryTerms terms = termsOf(text);
    EXPECT_TRUE(terms.stems.empty()) << text;
    EXPECT_FALSE(terms.onlyStopWords) << text;
    EXPECT_TRUE(terms.foldedText.empty()) << text;
    EXPECT_TRUE(terms.normalizedTitle.empty()) << text;
  }
}

TEST(LUXQueryTerms, TenThousandWordsAreCountedWithoutOneBeingLost) {
  std::string text;
  for (int i = 0; i < 10000; ++i) {
    text += "word" + std::to_string(i % 4000) + ' ';
  }
  const LUXQueryTerms terms = termsOf(text);
  EXPECT_EQ(terms.stems.size(), 4000U);
  uint32_t words = 0;
  for (const LUXQueryTerms::Term& term : terms.stems) {
    words += term.count;
  }
  EXPECT_EQ(words, 10000U);
  EXPECT_TRUE(terms.normalizedTitle.empty());
  EXPECT_TRUE(terms.foldedText.empty());
}

TEST(LUXQueryTerms, OneLongWordIsNoDanger) {
  const LUXQueryTerms latin = termsOf(std::string(100000, 'a'));
  EXPECT_LE(latin.stems.size(), 100U);
  std::string chinese;
  for (int i = 0; i < 20000; ++i) {
    chinese += "\u6253\u5370";
  }
  const auto tokenizer = HelpTokenizer::tokenizerForLanguage("Chinese");
  ASSERT_NE(tokenizer, nullptr);
  uint64_t words = 0;
  for (const LUXQueryTerms::Term& term : termsOf(chinese, *tokenizer).stems) {
    words += term.count;
  }
  EXPECT_GE(words, 19000U);
}

TEST(LUXQueryTerms, ACancelledTextIsGivenUp) {
  std::string text;
  for (int i = 0; i < 100000; ++i) {
    text += "word" + std::to_string(i) + ' ';
  }
  int asked = 0;
  const LUXQueryTerms terms =
      LUXQueryTerms::termsOfText(english(), text, [&asked] { return ++asked == 3; });
  EXPECT_EQ(asked, 3);
  EXPECT_TRUE(terms.stems.empty());
}
