#include "bench/quality/MarkupText.h"

#include <gtest/gtest.h>

using quality::plainText;
using quality::termsOfIndexPage;

namespace {

TEST(MarkupText, tagsEntitiesAndWhiteSpaceGo) {
  EXPECT_EQ(plainText("  a <b>big</b>\n&amp; small &lt;thing&gt; "), "a big & small <thing>");
}

TEST(MarkupText, anUnfinishedTagEndsTheText) { EXPECT_EQ(plainText("word <b"), "word"); }

TEST(MarkupText, narrowerTermsFollowTheBroaderOne) {
  const auto terms = termsOfIndexPage(
      "<dl><dt>Colors</dt><dd><dl>"
      "<dt>Auto, <a class=\"indexterm\" href=\"auto.html#x\">Auto</a>, "
      "<a class=\"indexterm\" href=\"more.html\">More</a></dt></dl></dd>"
      "<dt>Crop, <a class=\"indexterm\" href=\"crop.html\">Crop</a></dt></dl>");
  ASSERT_EQ(terms.size(), 2U);
  EXPECT_EQ(terms[0].text, "Colors Auto");
  EXPECT_EQ(terms[0].links, (std::vector<std::string>{"auto.html#x", "more.html"}));
  EXPECT_EQ(terms[1].text, "Crop");
}

TEST(MarkupText, termsWithoutLinksAreLeftOut) {
  EXPECT_TRUE(termsOfIndexPage("<dl><dt>Colors (see Palette)</dt></dl>").empty());
}

}  // namespace
