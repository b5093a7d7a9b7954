#include "zeb/Interactive.h"

#include <gmock/gmock.h>

namespace {

using testing::ElementsAre;
using testing::IsEmpty;
using zeb::Key;
using zeb::KeyDecoder;
using zeb::SearchPrompt;
using Kind = zeb::Key::Kind;
using Outcome = zeb::SearchPrompt::Outcome;

std::vector<Key> keysOf(const std::string& bytes) {
  KeyDecoder decoder;
  decoder.feed(bytes);
  return decoder.take(true);
}

TEST(AddressForViewerTest, PageOfADocumentIsNamedAsViewersDo) {
  EXPECT_EQ(zeb::addressForViewer("file:///book/index.docbook%23printing"),
            "file:///book/index.docbook#printing");
  for (const char* const url :
       {"file:///book/index.docbook", "file:///book/a%23b.html", "file:///index.docbook/a.html",
        "https://host/index.docbookx%23a"}) {
    EXPECT_EQ(zeb::addressForViewer(url), url);
  }
}

TEST(KeyDecoderTest, TextArrivesInOnePiece) {
  EXPECT_THAT(keysOf("caf\xC3\xA9 \xF0\x9F\xA6\x93"),
              ElementsAre(Key{Kind::text, "caf\xC3\xA9 \xF0\x9F\xA6\x93"}));
}

TEST(KeyDecoderTest, EditingKeysAreKnown) {
  EXPECT_THAT(keysOf("a\x7F\r\t\x15\x17\x04"),
              ElementsAre(Key{Kind::text, "a"}, Key{Kind::backspace, ""}, Key{Kind::enter, ""},
                          Key{Kind::tab, ""}, Key{Kind::deleteLine, ""}, Key{Kind::deleteWord, ""},
                          Key{Kind::end, ""}));
}

TEST(KeyDecoderTest, ArrowsComeInTwoSpellings) {
  EXPECT_THAT(keysOf("\x1B[A\x1B[B\x1BOA\x1BOB\x1B[1;5A"),
              ElementsAre(Key{Kind::up, ""}, Key{Kind::down, ""}, Key{Kind::up, ""},
                          Key{Kind::down, ""}, Key{Kind::up, ""}));
}

TEST(KeyDecoderTest, OtherSequencesAndControlsDoNothing) {
  EXPECT_THAT(keysOf("\x1B[C\x1B[3~\x01\x1B[200~"), IsEmpty());
}

TEST(KeyDecoderTest, EscapeAloneIsAKeyOnlyWhenNothingFollows) {
  KeyDecoder decoder;
  decoder.feed("\x1B");
  EXPECT_THAT(decoder.take(false), IsEmpty());
  decoder.feed("[A");
  EXPECT_THAT(decoder.take(false), ElementsAre(Key{Kind::up, ""}));
  decoder.feed("\x1B");
  EXPECT_THAT(decoder.take(true), ElementsAre(Key{Kind::escape, ""}));
  EXPECT_THAT(keysOf("\x1B\x1B"), ElementsAre(Key{Kind::escape, ""}, Key{Kind::escape, ""}));
}

TEST(KeyDecoderTest, CharactersThatArriveInPiecesArePutTogether) {
  KeyDecoder decoder;
  decoder.feed("\xE6\xBC");
  EXPECT_THAT(decoder.take(false), IsEmpty());
  decoder.feed("\xA2");
  EXPECT_THAT(decoder.take(false), ElementsAre(Key{Kind::text, "\xE6\xBC\xA2"}));
}

TEST(KeyDecoderTest, AnyBytesAreTakenToTheEnd) {
  for (int first = 0; first < 256; ++first) {
    for (int second = 0; second < 256; ++second) {
      KeyDecoder decoder;
      decoder.feed(std::string{static_cast<char>(first), static_cast<char>(second)});
      (void)decoder.take(true);
      EXPECT_THAT(decoder.take(true), IsEmpty()) << first << ' ' << second;
    }
  }
}

class SearchPromptTest : public testing::Test {
 protected:
  Outcome press(Kind kind, const std::string& text = {}) { return prompt.press({kind, text}); }
  static zeb::LiveAnswer answer() {
    zeb::FoundPage page;
    page.title = "Printing";
    page.bookTitle = "Help";
    page.url = "file:///print.html";
    zeb::FoundPage other = page;
    other.url = "file:///other.html";
    return {{{"print", 1}, {"printer", 0.5}}, {page, other}};
  }

  SearchPrompt prompt;
};

TEST_F(SearchPromptTest, TypingChangesTheText) {
  EXPECT_EQ(press(Kind::text, "pri"), Outcome::textChanged);
  EXPECT_EQ(press(Kind::text, "nt \xC3\xA9\xE6\xBC\xA2"), Outcome::textChanged);
  EXPECT_EQ(prompt.text(), "print \xC3\xA9\xE6\xBC\xA2");
  EXPECT_EQ(press(Kind::backspace), Outcome::textChanged);
  EXPECT_EQ(prompt.text(), "print \xC3\xA9");
  press(Kind::backspace);
  EXPECT_EQ(prompt.text(), "print ");
  press(Kind::deleteWord);
  EXPECT_EQ(prompt.text(), "");
  press(Kind::backspace);
  EXPECT_EQ(prompt.text(), "");
  press(Kind::text, "a b");
  press(Kind::deleteLine);
  EXPECT_EQ(prompt.text(), "");
}

TEST_F(SearchPromptTest, ArrowsGoThroughCompletionsAndPages) {
  prompt.show(answer());
  EXPECT_EQ(prompt.selectedPage(), nullptr);
  press(Kind::down);
  EXPECT_EQ(prompt.lines(80, 24)[1], "> print");
  press(Kind::down);
  EXPECT_EQ(prompt.selectedPage(), nullptr);
  press(Kind::down);
  ASSERT_NE(prompt.selectedPage(), nullptr);
  EXPECT_EQ(prompt.selectedPage()->url, "file:///print.html");
  press(Kind::down);
  press(Kind::down);
  EXPECT_EQ(prompt.selectedPage()->url, "file:///other.html");
  for (int i = 0; i < 5; ++i) {
    press(Kind::up);
  }
  EXPECT_THAT(prompt.lines(80, 24), testing::Not(testing::Contains(testing::StartsWith("> "))));
}

TEST_F(SearchPromptTest, EnterTakesACompletionAndOpensAPage) {
  prompt.show(answer());
  press(Kind::down);
  press(Kind::down);
  EXPECT_EQ(press(Kind::enter), Outcome::textChanged);
  EXPECT_EQ(prompt.text(), "printer");
  prompt.show(answer());
  for (int i = 0; i < 4; ++i) {
    press(Kind::down);
  }
  EXPECT_EQ(press(Kind::enter), Outcome::opensPage);
  EXPECT_EQ(prompt.selectedPage()->url, "file:///other.html");
}

TEST_F(SearchPromptTest, EnterOnTheTextOpensTheBestPage) {
  EXPECT_EQ(press(Kind::enter), Outcome::stays);
  prompt.show(answer());
  EXPECT_EQ(press(Kind::enter), Outcome::opensPage);
  EXPECT_EQ(prompt.selectedPage()->url, "file:///print.html");
}

TEST_F(SearchPromptTest, TabTakesTheFirstCompletion) {
  EXPECT_EQ(press(Kind::tab), Outcome::stays);
  prompt.show(answer());
  EXPECT_EQ(press(Kind::tab), Outcome::textChanged);
  EXPECT_EQ(prompt.text(), "print");
}

TEST_F(SearchPromptTest, EscapeAndEndLeave) {
  EXPECT_EQ(press(Kind::escape), Outcome::leaves);
  EXPECT_EQ(press(Kind::end), Outcome::leaves);
}

TEST_F(SearchPromptTest, TypingAndFewerAnswersUndoTheSelection) {
  prompt.show(answer());
  press(Kind::down);
  press(Kind::text, "x");
  prompt.show(answer());
  EXPECT_EQ(prompt.lines(80, 24)[1], "  print");
  for (int i = 0; i < 4; ++i) {
    press(Kind::down);
  }
  prompt.show({});
  EXPECT_EQ(prompt.selectedPage(), nullptr);
  EXPECT_EQ(press(Kind::down), Outcome::stays);
}

TEST_F(SearchPromptTest, LinesFitTheTerminal) {
  press(Kind::text, "pri\033[2J");
  prompt.show(answer());
  EXPECT_THAT(prompt.lines(12, 3), ElementsAre("search: pri\xE2\x80\xA6", "  print", "  printer"));
  EXPECT_EQ(prompt.lines(12, 0).size(), 1U);
}

}  // namespace
