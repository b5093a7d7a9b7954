#include "platform/TextForms.h"

#include <gtest/gtest.h>

namespace platform {
namespace {

std::string formOf(NormalForm form, std::string_view text) {
  std::u16string work = utf16FromUTF8(text);
  normalize(form, work);
  return utf8FromUTF16(work);
}

std::string withoutDiacritics(std::string_view text) {
  std::u16string work = utf16FromUTF8(text);
  normalize(NormalForm::decomposed, work);
  dropDiacritics(work);
  normalize(NormalForm::composed, work);
  return utf8FromUTF16(work);
}

TEST(TextForms, textComesBackFromUTF16) {
  const std::string text = "a\u00E9\u4E2D\U0001F600z";
  EXPECT_EQ(utf16FromUTF8(text), u"a\u00E9\u4E2D\U0001F600z");
  EXPECT_EQ(utf8FromUTF16(utf16FromUTF8(text)), text);
  EXPECT_EQ(utf16FromUTF8(""), u"");
  EXPECT_EQ(utf8FromUTF16(u""), "");
}

TEST(TextForms, illFormedBytesBecomeReplacementCharacters) {
  EXPECT_EQ(utf16FromUTF8("a\xFFz"), u"a\uFFFDz");
  EXPECT_EQ(utf16FromUTF8("\xE4\xB8"), u"\uFFFD");
  // A surrogate is no character.
  EXPECT_EQ(utf16FromUTF8("\xED\xA0\x80").find(u'\xD800'), std::u16string::npos);
}

TEST(TextForms, everyFormIsItsOwn) {
  EXPECT_EQ(formOf(NormalForm::composed, "e\u0301"), "\u00E9");
  EXPECT_EQ(formOf(NormalForm::decomposed, "\u00E9"), "e\u0301");
  EXPECT_EQ(formOf(NormalForm::composed, "\uFB01\uFF21"), "\uFB01\uFF21");
  EXPECT_EQ(formOf(NormalForm::compatible, "\uFB01\uFF21"), "fiA");
  EXPECT_EQ(formOf(NormalForm::caseless,
                   "\uFB01\uFF21Stra\u00DF\u00AD"
                   "e"),
            "fiastrasse");
}

TEST(TextForms, textThatGrowsManifoldFits) {
  std::string ligatures;
  for (int i = 0; i < 100; ++i) {
    ligatures += "\uFDFA";
  }
  EXPECT_EQ(utf16FromUTF8(formOf(NormalForm::compatible, ligatures)).size(), 1800U);
}

TEST(TextForms, diacriticsOfAlphabetsAreDropped) {
  EXPECT_EQ(withoutDiacritics("cr\u00E8me br\u00FBl\u00E9e"), "creme brulee");
  EXPECT_EQ(withoutDiacritics("\u03AC\u0439\u05E9\u05B8\u0643\u064E"), "\u03B1\u0438\u05E9\u0643");
}

TEST(TextForms, marksThatAreVowelsOrVoicingStay) {
  for (const char* text :
       {"\u0939\u093F\u0928\u094D\u0926\u0940", "\u0E17\u0E35\u0E48", "\u30AC", "\u3071"}) {
    EXPECT_EQ(withoutDiacritics(text), text);
  }
}

TEST(TextForms, lettersThatDoNotDecomposeBecomePlain) {
  EXPECT_EQ(withoutDiacritics("\u00E6\u00F0\u0111\u00F8\u0127\u0131\u0142\u0153\u0167"),
            "aeddohiloet");
  EXPECT_EQ(withoutDiacritics("\u0627\u0640\u0644"), "\u0627\u0644");
  EXPECT_EQ(withoutDiacritics("\u00FE"), "\u00FE");
}

}  // namespace
}  // namespace platform
