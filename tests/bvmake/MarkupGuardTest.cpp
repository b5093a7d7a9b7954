#include "bvmake/MarkupGuard.h"

#include <gtest/gtest.h>

#include <string>

namespace bvmake {
namespace {

std::string attributes(size_t count) {
  std::string text;
  for (size_t i = 0; i < count; ++i) {
    text += " a" + std::to_string(i) + "=x";
  }
  return text;
}

std::string tamed(std::string text, Markup markup) {
  EXPECT_FALSE(tameMarkup(text, markup));
  return text;
}

bool isRefused(std::string text, Markup markup) { return tameMarkup(text, markup).has_value(); }

TEST(MarkupGuard, takesTagsWithAsManyAttributesAsAllowed) {
  EXPECT_FALSE(isRefused("<p" + attributes(maximumAttributeCount) + ">", Markup::html));
  EXPECT_TRUE(isRefused("<p" + attributes(maximumAttributeCount + 1) + ">", Markup::html));
  EXPECT_TRUE(isRefused("<p" + attributes(maximumAttributeCount + 1) + "/>", Markup::xml));
}

TEST(MarkupGuard, countsAttributesWithoutBlanksBetweenThem) {
  std::string tag = "<p ";
  for (int i = 0; i < 300; ++i) {
    tag += "a=\"x\"";
  }
  EXPECT_TRUE(isRefused(tag + ">", Markup::html));
}

TEST(MarkupGuard, countsPiecesOfNamesThatTheParserCuts) {
  EXPECT_TRUE(isRefused("<p " + std::string(size_t{100} * 257, 'a') + ">", Markup::html));
}

TEST(MarkupGuard, longValuesAreOneAttribute) {
  std::string value;
  for (int i = 0; i < 1000; ++i) {
    value += "word > ";
  }
  EXPECT_FALSE(isRefused("<img alt=\"" + value + "\">", Markup::html));
}

TEST(MarkupGuard, scriptsAndCommentsAreNoTags) {
  const std::string words = "<a" + attributes(maximumAttributeCount + 1);
  EXPECT_FALSE(isRefused("<script>" + words + "</script><!--" + words + "-->", Markup::html));
  EXPECT_TRUE(isRefused("<script>" + words + "</script><!-- -->" + words, Markup::html));
  EXPECT_TRUE(isRefused("<!-- --!>" + words, Markup::html));
  EXPECT_TRUE(isRefused("<script/>" + words, Markup::html));
}

TEST(MarkupGuard, comparisonSignsInTextAreNoTags) {
  std::string text = "<p>1 < 2";
  for (int i = 0; i < 1000; ++i) {
    text += " word";
  }
  EXPECT_EQ(tamed(text, Markup::html), text);
}

TEST(MarkupGuard, marksOfSectionsAreBlankedInHTMLOnly) {
  EXPECT_EQ(tamed("a<![CDATA[b<c]]>d", Markup::html), "a         b c   d");
  EXPECT_EQ(tamed("a<![CDATA[b<c]]>d", Markup::xml), "a<![CDATA[b<c]]>d");
  EXPECT_EQ(tamed("a<![if IE]>b<![endif]>c", Markup::html), "a          b          c");
}

TEST(MarkupGuard, markupCutOffAnywhereIsWalkedToTheEnd) {
  const std::string page =
      "<!-- c --><![CDATA[ x ]]><p a='b' c=d e><script>x</script></p><![if x]>";
  for (size_t length = 0; length <= page.size(); ++length) {
    EXPECT_FALSE(isRefused(page.substr(0, length), Markup::html)) << length;
    EXPECT_FALSE(isRefused(page.substr(0, length), Markup::xml)) << length;
  }
}

}  // namespace
}  // namespace bvmake
