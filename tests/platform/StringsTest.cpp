#include "platform/Strings.h"

#include <gtest/gtest.h>

#include "platform/Environment.h"

namespace platform {
namespace {

TEST(Strings, removingWhitespaceTakesOutEveryBlankWhereverItStands) {
  EXPECT_EQ(stringByRemovingWhitespace("  a b\tc\n"), "abc");
  EXPECT_EQ(stringByRemovingWhitespace(""), "");
  EXPECT_EQ(stringByRemovingWhitespace(" "), "");
  EXPECT_EQ(stringByRemovingWhitespace("\u00A0Wi\u2003Fi\u3000\u2028\u0085"), "WiFi");
  EXPECT_EQ(stringByRemovingWhitespace("\v\f\r"), "");
}

TEST(Strings, removingWhitespaceKeepsWhatOnlyLooksLikeABlank) {
  // A zero-width joiner is no blank, and neither are bytes that are no text.
  EXPECT_EQ(stringByRemovingWhitespace("a\u200Db"), "a\u200Db");
  EXPECT_EQ(stringByRemovingWhitespace("a\xFF b"),
            "a\xFF"
            "b");
}

TEST(Strings, trimmingKeepsBlanksInside) {
  EXPECT_EQ(stringByTrimmingWhitespace(" \n print  queue\t"), "print  queue");
  EXPECT_EQ(stringByTrimmingWhitespace("\u00A0x\u00A0"), "x");
  EXPECT_EQ(stringByTrimmingWhitespace(" \t"), "");
  EXPECT_EQ(stringByTrimmingWhitespace(""), "");
}

TEST(Strings, lowerCasesAllOfUnicode) {
  EXPECT_EQ(lowercaseString("PRINT Ärger ΣΑΣ İ"), "print ärger σας i\u0307");
  EXPECT_EQ(lowercaseString(""), "");
}

TEST(Strings, comparesWithoutCase) {
  EXPECT_EQ(caseInsensitiveCompare("Straße", "STRASSE"), 0);
  EXPECT_LT(caseInsensitiveCompare("a", "B"), 0);
  EXPECT_GT(caseInsensitiveCompare("b", "A"), 0);
}

TEST(Strings, localizedOrderFollowsTheLanguage) {
  EXPECT_LT(localizedCaseInsensitiveCompare("ä", "z", "de"), 0);
  EXPECT_GT(localizedCaseInsensitiveCompare("ä", "z", "sv"), 0);
  EXPECT_EQ(localizedCaseInsensitiveCompare("Print", "print", "en"), 0);
  EXPECT_NE(localizedCaseInsensitiveCompare("résumé", "resume", "en"), 0);
}

TEST(Strings, localizedOrderTakesTheUsersLanguageByDefault) {
  Environment environment = Environment::system();
  environment.preferredLanguages = {"sv"};
  const EnvironmentOverride swedish(environment);
  EXPECT_GT(localizedCaseInsensitiveCompare("ä", "z"), 0);
}

TEST(Strings, unknownLanguageStillGivesAnOrder) {
  EXPECT_LT(localizedCaseInsensitiveCompare("a", "b", "not a language tag"), 0);
}

TEST(Strings, recognisesWellFormedUTF8) {
  EXPECT_TRUE(isValidUTF8(""));
  EXPECT_TRUE(isValidUTF8("Grüße 東京 😀"));
  EXPECT_FALSE(isValidUTF8("\xFF"));
  EXPECT_FALSE(isValidUTF8("a\xC3"));
  EXPECT_FALSE(isValidUTF8("\xED\xA0\x80"));
  EXPECT_FALSE(isValidUTF8("\xC0\xAF"));
}

TEST(Strings, repairsIllFormedParts) {
  EXPECT_EQ(stringByRepairingUTF8("a\xFFz"), "a\uFFFDz");
  EXPECT_EQ(stringByRepairingUTF8("good"), "good");
  EXPECT_TRUE(isValidUTF8(stringByRepairingUTF8("\xE2\x82\xF0\x9F")));
}

}  // namespace
}  // namespace platform
