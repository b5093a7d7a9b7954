#include "bvmake/TextRun.h"

#include <gtest/gtest.h>

#include "bvmake/KeywordList.h"

namespace bvmake {
namespace {

TEST(TextRun, whiteSpaceOfAnyKindBecomesOneBlank) {
  EXPECT_EQ(collapsedText(" \t a\r\n\f b\u00A0\u2003c\u3000"), "a b c");
}

TEST(TextRun, blanksCollapseAcrossPieces) {
  TextRun run;
  run.append("a ");
  run.append(" ");
  run.appendBlank();
  run.append(" b");
  EXPECT_EQ(run.text(), "a b");
}

TEST(TextRun, piecesWithoutBlankBetweenThemAreOneWord) {
  TextRun run;
  run.append("Zeb");
  run.append("ra");
  EXPECT_EQ(run.take(), "Zebra");
  EXPECT_TRUE(run.empty());
}

TEST(TextRun, softHyphensAndByteOrderMarksVanish) {
  EXPECT_EQ(collapsedText("hy\u00ADphen\uFEFFated"), "hyphenated");
}

TEST(TextRun, takenRunForgetsItsPendingBlank) {
  TextRun run;
  run.append("a ");
  run.take();
  run.append("b");
  EXPECT_EQ(run.take(), "b");
}

TEST(TextRun, truncatedRunGoesOnAfterABlank) {
  TextRun run;
  run.append("Heading ");
  const size_t length = run.text().size();
  run.append("mark");
  run.truncate(length);
  run.append("more");
  EXPECT_EQ(run.take(), "Heading more");
}

TEST(TextRun, lettersAndDigitsOfAnyScriptCount) {
  EXPECT_TRUE(hasLetterOrDigit("-- 7"));
  EXPECT_TRUE(hasLetterOrDigit("日"));
  EXPECT_FALSE(hasLetterOrDigit("¶ § # » \u2014"));
  EXPECT_FALSE(hasLetterOrDigit(""));
}

TEST(KeywordList, commasAndSemicolonsOfAnyScriptDivide) {
  std::vector<std::string> keywords{"first"};
  addKeywords("print queue, printer ;  , 打印，队列、纸", keywords);
  EXPECT_EQ(keywords,
            (std::vector<std::string>{"first", "print queue", "printer", "打印", "队列", "纸"}));
}

}  // namespace
}  // namespace bvmake
