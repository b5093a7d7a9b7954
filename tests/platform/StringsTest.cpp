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

TEST(Strings, runsOfDigitsCompareByTheirValue) {
  EXPECT_LT(numericCompare("1.2", "1.10"), 0);
  EXPECT_GT(numericCompare("1.10", "1.2"), 0);
  EXPECT_EQ(numericCompare("1.2", "1.2"), 0);
  EXPECT_LT(numericCompare("9", "10"), 0);
  EXPECT_LT(numericCompare("book9x", "book10a"), 0);
  EXPECT_LT(numericCompare("0", "1"), 0);
}

TEST(Strings, leadingZerosDoNotCount) {
  EXPECT_EQ(numericCompare("1.02", "1.2"), 0);
  EXPECT_EQ(numericCompare("000", "0"), 0);
  EXPECT_LT(numericCompare("007", "8"), 0);
  EXPECT_LT(numericCompare("01a", "1b"), 0);
}

TEST(Strings, numbersOfAnyLengthCompare) {
  const std::string nines(1000, '9');
  EXPECT_LT(numericCompare(nines, "1" + std::string(1000, '0')), 0);
  EXPECT_LT(numericCompare("18446744073709551615", "18446744073709551616"), 0);
}

TEST(Strings, whatIsNoDigitComparesByBytes) {
  EXPECT_LT(numericCompare("", "a"), 0);
  EXPECT_GT(numericCompare("a", ""), 0);
  EXPECT_EQ(numericCompare("", ""), 0);
  EXPECT_LT(numericCompare("1.2", "1.2.0"), 0);
  EXPECT_LT(numericCompare("A", "a"), 0);
  EXPECT_LT(numericCompare("z", "\u00E4"), 0);
  EXPECT_LT(numericCompare("a", "\xFF"), 0);
  EXPECT_LT(numericCompare("5", "a"), 0);
  EXPECT_GT(numericCompare("5", "-5"), 0);
}

TEST(Strings, numericOrderIsAnOrder) {
  const std::vector<std::string> strings = {"",
                                            "0",
                                            "00",
                                            "1",
                                            "01",
                                            "10",
                                            "1a",
                                            "1.",
                                            "a",
                                            "a1",
                                            "a01",
                                            "a10",
                                            "a1b",
                                            "10a",
                                            ".1",
                                            "/1",
                                            ":1",
                                            "-",
                                            "\xFF",
                                            "\xFF"
                                            "1"};
  const auto sign = [](int order) { return (order > 0) - (order < 0); };
  for (const std::string& a : strings) {
    for (const std::string& b : strings) {
      EXPECT_EQ(sign(numericCompare(a, b)), -sign(numericCompare(b, a))) << a << " " << b;
      for (const std::string& c : strings) {
        if (numericCompare(a, b) <= 0 && numericCompare(b, c) <= 0) {
          EXPECT_LE(numericCompare(a, c), 0) << a << " " << b << " " << c;
        }
      }
    }
  }
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
