#include "bvmake/Summary.h"

#include <gtest/gtest.h>

#include <string>

#include "platform/Strings.h"

namespace bvmake {
namespace {

Page pageOf(std::vector<TextBlock> body) {
  Page page;
  page.title = "Title";
  page.headings = {"Heading"};
  page.body = std::move(body);
  return page;
}

TextBlock prose(std::string text) { return {TextBlock::Kind::prose, std::move(text)}; }
TextBlock other(std::string text) { return {TextBlock::Kind::other, std::move(text)}; }

std::string summary(const Page& page) { return Summarizer().summary(page); }

size_t characters(const std::string& text) {
  size_t count = 0;
  for (const char byte : text) {
    count += (static_cast<unsigned char>(byte) & 0xC0U) != 0x80U ? 1 : 0;
  }
  return count;
}

TEST(Summarizer, takesTheFirstSentences) {
  EXPECT_EQ(summary(pageOf({prose("One is first. Two is second."), prose("Three is third.")})),
            "One is first. Two is second. Three is third.");
}

TEST(Summarizer, stopsWhenThereIsEnough) {
  const std::string sentence = "A" + std::string(150, 'a');
  const std::string text = summary(pageOf({prose(sentence + ". Bb. " + sentence + ". Cc.")}));
  EXPECT_EQ(text, sentence + ". Bb.");
}

TEST(Summarizer, sentencesAreNeverCutWhereOneFits) {
  std::string text;
  for (int i = 0; i < 20; ++i) {
    text += "This sentence has about fifty characters in it all. ";
  }
  const std::string result = summary(pageOf({prose(text)}));
  EXPECT_GE(characters(result), wantedSummaryLength);
  EXPECT_LE(characters(result), maximumSummaryLength);
  EXPECT_EQ(result.back(), '.');
}

TEST(Summarizer, endlessSentencesAreCutBetweenWords) {
  std::string text;
  for (int i = 0; i < 200; ++i) {
    text += "word ";
  }
  const std::string result = summary(pageOf({prose(text + "end.")}));
  EXPECT_LE(characters(result), maximumSummaryLength);
  EXPECT_GT(characters(result), wantedSummaryLength);
  EXPECT_EQ(result.substr(result.size() - 7), "word\u2026");
}

TEST(Summarizer, scriptsWithoutBlanksAreCutBetweenCharacters) {
  std::string text;
  for (int i = 0; i < 1000; ++i) {
    text += "字";
  }
  const std::string result = summary(pageOf({prose(text)}));
  EXPECT_EQ(characters(result), maximumSummaryLength);
  EXPECT_TRUE(platform::isValidUTF8(result));
}

TEST(Summarizer, dividesSentencesOfOtherScripts) {
  EXPECT_EQ(summary(pageOf({prose("最初の文です。次の文です。")})), "最初の文です。 次の文です。");
}

TEST(Summarizer, whatEndsLikeASentenceComesBeforeLabels) {
  EXPECT_EQ(summary(pageOf({prose("Source code: Lib/zeb.py"), prose("It prints (slowly).”")})),
            "It prints (slowly).”");
}

TEST(Summarizer, leadInsCountAsSentencesAndLabelsDoNot) {
  const std::string leadIn = "The queue can be in any of these four states:";
  EXPECT_EQ(summary(pageOf({prose("Note:"), prose("To open it..."), prose(leadIn)})), leadIn);
}

TEST(Summarizer, proseComesBeforeListsAndTables) {
  EXPECT_EQ(summary(pageOf({other("Cell."), prose("Prose without end")})), "Prose without end");
  EXPECT_EQ(summary(pageOf({other("Cell one"), other("Cell two")})), "Cell one Cell two");
}

TEST(Summarizer, pagesWithoutBodyAreSummedUpByHeadingOrTitle) {
  EXPECT_EQ(summary(pageOf({})), "Heading");
  Page page;
  page.title = "Title";
  EXPECT_EQ(summary(page), "Title");
}

TEST(Summarizer, pagesWithoutTextHaveNoSummary) { EXPECT_EQ(summary(Page()), ""); }

TEST(Summarizer, servesManyPagesOneAfterTheOther) {
  Summarizer summarizer;
  for (int i = 0; i < 100; ++i) {
    const std::string text = "Page number " + std::to_string(i) + ".";
    EXPECT_EQ(summarizer.summary(pageOf({prose(text)})), text);
  }
}

}  // namespace
}  // namespace bvmake
