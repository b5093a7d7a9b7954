#include "zeb/Console.h"

#include <gtest/gtest.h>

#include <sstream>

namespace {

using zeb::ColorMode;
using zeb::Console;
using zeb::singleLine;
using zeb::Style;

class ConsoleTest : public testing::Test {
 protected:
  std::ostringstream out;
  std::ostringstream err;
  Console console{out, err};
};

TEST_F(ConsoleTest, ResultsInAPipeHaveNoColours) {
  EXPECT_EQ(console.styled(Style::title, "text"), "text");
}

TEST_F(ConsoleTest, ResultsOnATerminalHaveColours) {
  console.setOutIsTerminal(true);
  EXPECT_EQ(console.styled(Style::title, "text"), "\033[1mtext\033[0m");
}

TEST_F(ConsoleTest, NoColorVariableTurnsColoursOffOnATerminal) {
  console.setOutIsTerminal(true);
  console.setColorsUnwanted(true);
  EXPECT_EQ(console.styled(Style::title, "text"), "text");
}

TEST_F(ConsoleTest, AlwaysOverridesPipeAndNoColorVariable) {
  console.setColorsUnwanted(true);
  console.setColorMode(ColorMode::always);
  EXPECT_EQ(console.styled(Style::url, "text"), "\033[34mtext\033[0m");
}

TEST_F(ConsoleTest, NeverOverridesTerminal) {
  console.setOutIsTerminal(true);
  console.setColorMode(ColorMode::never);
  EXPECT_EQ(console.styled(Style::book, "text"), "text");
}

TEST_F(ConsoleTest, MessagesGoToTheOtherStream) {
  console.error("broken");
  console.warning("odd");
  console.note("by the way");
  EXPECT_EQ(err.str(), "zeb: error: broken\nzeb: warning: odd\nzeb: by the way\n");
  EXPECT_EQ(out.str(), "");
}

TEST_F(ConsoleTest, ErrorsAreColouredByTheTerminalThatTheyGoTo) {
  console.setOutIsTerminal(true);
  console.error("broken");
  EXPECT_EQ(err.str(), "zeb: error: broken\n");
  console.setErrIsTerminal(true);
  console.error("broken");
  EXPECT_NE(err.str().find("\033[1;31merror:\033[0m"), std::string::npos);
}

TEST_F(ConsoleTest, MessagesStayOnTheirLine) {
  console.error("no file \"a\nb\033[2J\"");
  EXPECT_EQ(err.str(), "zeb: error: no file \"a b [2J\"\n");
}

TEST_F(ConsoleTest, ProgressIsForTerminalsOnly) {
  console.progress("1 of 2");
  EXPECT_EQ(err.str(), "");
  console.setErrIsTerminal(true);
  console.progress("1 of 2");
  EXPECT_EQ(err.str(), "\r\033[K1 of 2");
}

TEST_F(ConsoleTest, MessageReplacesProgress) {
  console.setErrIsTerminal(true);
  console.progress("1 of 2");
  console.note("done");
  EXPECT_EQ(err.str(), "\r\033[K1 of 2\r\033[Kzeb: done\n");
  console.clearProgress();
  EXPECT_EQ(err.str(), "\r\033[K1 of 2\r\033[Kzeb: done\n");
}

TEST_F(ConsoleTest, FlushTellsOfLostResults) {
  EXPECT_TRUE(console.flush());
  out.setstate(std::ios::badbit);
  EXPECT_FALSE(console.flush());
}

TEST(SingleLine, BlanksAndLineBreaksBecomeOneBlank) {
  EXPECT_EQ(singleLine("  two \t\r\n words  "), "two words");
  EXPECT_EQ(singleLine(""), "");
  EXPECT_EQ(singleLine(" \n "), "");
}

TEST(SingleLine, ControlCharactersAreTakenOut) {
  EXPECT_EQ(singleLine("\033[31mred\007"), "[31mred");
  EXPECT_EQ(singleLine(std::string_view("a\0b", 3)), "a b");
  EXPECT_EQ(singleLine("a\x7F"
                       "b"),
            "a b");
}

TEST(SingleLine, LateControlCharactersAreTakenOut) {
  // U+009B is what ESC [ is in one character.
  EXPECT_EQ(singleLine("a\xC2\x9B"
                       "31mb"),
            "a 31mb");
  EXPECT_EQ(singleLine("a\xC2\xA9"
                       "b"),
            "a\xC2\xA9"
            "b");
}

TEST(SingleLine, IllFormedTextIsRepaired) {
  EXPECT_EQ(singleLine("caf\xE9"), "caf\xEF\xBF\xBD");
  EXPECT_EQ(singleLine("\xC2"), "\xEF\xBF\xBD");
}

}  // namespace
