#include "SearchKit/TextFolding.h"

#include <gtest/gtest.h>
#include <unicode/utf8.h>

#include <string>

#include "SearchKit/Tokenizer.h"

namespace searchkit {
namespace {

std::string folded(std::string_view text) {
  std::u16string out;
  foldText(text, out);
  return termFromFolded(out);
}

std::string utf8(UChar32 character) {
  char bytes[4];
  int32_t length = 0;
  U8_APPEND_UNSAFE(bytes, length, character);
  return {bytes, static_cast<size_t>(length)};
}

TEST(TextFolding, lowersCase) {
  EXPECT_EQ(folded("Print QUEUE"), "print queue");
  EXPECT_EQ(folded("ДРУК"), "друк");
  EXPECT_EQ(folded("ΟΔΟΣ"), folded("οδος"));
  EXPECT_EQ(folded("STRASSE"), folded("Straße"));
}

TEST(TextFolding, dropsDiacriticsOfAlphabets) {
  EXPECT_EQ(folded("Café naïve Ångström"), "cafe naive angstrom");
  EXPECT_EQ(folded("e\u0301"), folded("é"));
  EXPECT_EQ(folded("Ελλάδα"), folded("ελλαδα"));
  EXPECT_EQ(folded("ёлка й"), folded("елка и"));
  EXPECT_EQ(folded("người Việt"), "nguoi viet");
  EXPECT_EQ(folded("שָׁלוֹם"), folded("שלום"));
  EXPECT_EQ(folded("أحمد كِتاب"), folded("احمد كتاب"));
}

TEST(TextFolding, readsLettersThatDoNotDecomposeAsPlainOnes) {
  EXPECT_EQ(folded("Łódź Ørsted đa smørbrød"), "lodz orsted da smorbrod");
  EXPECT_EQ(folded("œuvre Æon"), "oeuvre aeon");
  EXPECT_EQ(folded("IŞIK"), folded("ışık"));
  EXPECT_EQ(folded("İstanbul"), "istanbul");
}

TEST(TextFolding, dropsTheArabicElongation) { EXPECT_EQ(folded("مـــلف"), folded("ملف")); }

TEST(TextFolding, keepsMarksThatAreVowels) {
  EXPECT_NE(folded("कि"), folded("क"));
  EXPECT_NE(folded("কি"), folded("ক"));
  EXPECT_NE(folded("ที่"), folded("ท"));
  EXPECT_NE(folded("កី"), folded("ក"));
}

TEST(TextFolding, keepsTheVoicingOfKana) {
  EXPECT_NE(folded("が"), folded("か"));
  EXPECT_EQ(folded("か\u3099"), folded("が"));
  EXPECT_EQ(folded("ｶﾞ"), folded("ガ"));
}

TEST(TextFolding, composesHangul) {
  EXPECT_EQ(folded("한글"), "한글");
  EXPECT_EQ(folded("\u1112\u1161\u11AB"), "한");
}

TEST(TextFolding, takesCompatibilityFormsForWhatTheyStandFor) {
  EXPECT_EQ(folded("ＡＢＣ１２３"), "abc123");
  EXPECT_EQ(folded("ﬁle"), "file");
  EXPECT_EQ(folded("x²"), "x2");
}

TEST(TextFolding, dropsInvisibleCharactersInsideWords) {
  EXPECT_EQ(folded("auto\u00ADmatic"), "automatic");
  EXPECT_EQ(folded("می\u200Cخواهم"), folded("میخواهم"));
  EXPECT_EQ(folded("\uFEFFword"), "word");
}

TEST(TextFolding, readsAZeroWidthSpaceAsABlank) { EXPECT_EQ(folded("a\u200Bb"), "a b"); }

TEST(TextFolding, replacesIllFormedText) {
  EXPECT_EQ(folded("a\xFF"
                   "b"),
            "a\uFFFDb");
  EXPECT_EQ(folded("\xE2\x80"), "\uFFFD");
}

// A term that a search was given must come back as itself when it is folded once more.
TEST(TextFolding, ofFoldedTextChangesNothing) {
  // Many at a time, each between letters of its own.
  constexpr UChar32 batch = 64;
  for (UChar32 first = 0; first <= 0x10FFFF; first += batch) {
    std::string text = "a";
    for (UChar32 character = std::max(first, 1); character < first + batch; ++character) {
      text += U_IS_SURROGATE(character) ? "ba" : utf8(character) + "ba";
    }
    const std::string once = folded(text);
    ASSERT_EQ(folded(once), once) << std::hex << first;
  }
}

TEST(TextFolding, classesTellUnspacedScriptsFromOthers) {
  for (const char32_t letter : U"aé9жαकשعა") {
    if (letter != 0) {
      EXPECT_EQ(characterClass(letter), CharacterClass::letter) << static_cast<uint32_t>(letter);
    }
  }
  for (const char32_t letter : U"東ひカ々ー한ไກខမ") {
    if (letter != 0) {
      EXPECT_EQ(characterClass(letter), CharacterClass::unspacedLetter)
          << static_cast<uint32_t>(letter);
    }
  }
  for (const char32_t other : U" .'’ʼ-_、。€→😀\uFFFD") {
    if (other != 0) {
      EXPECT_EQ(characterClass(other), CharacterClass::separator) << static_cast<uint32_t>(other);
    }
  }
}

}  // namespace
}  // namespace searchkit
