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

std::string thinned(std::string text) {
  EXPECT_FALSE(tameAndThinHTML(text));
  return text;
}

TEST(MarkupGuard, onlyAttributesThatSomebodyAsksForStay) {
  EXPECT_EQ(thinned("<p class=\"a\" id=\"b\" title='c'>d"), "<p id=\"b\">d");
  EXPECT_EQ(thinned("<p class=a id=b>d"), "<p class=a id=b>d");
  EXPECT_EQ(thinned("<p style=\"color: red\">a<p style=\"display: none\">b"),
            "<p>a<p style=\"display: none\">b");
  EXPECT_EQ(thinned("<p CLASS=\"a\" Hidden>b"), "<p Hidden>b");
}

TEST(MarkupGuard, commentsScriptsAndAllButOneBlankAreLeftOut) {
  EXPECT_EQ(thinned("a<!-- b -->c"), "ac");
  EXPECT_EQ(thinned("a<script src='b'>if (c < d) {}</script>e"), "a<script></script>e");
  EXPECT_EQ(thinned("<ul>\n    <li>a\n  </ul>"), "<ul>\n<li>a\n</ul>");
}

TEST(MarkupGuard, marksAroundTextAreLeftOutInTheBody) {
  EXPECT_EQ(thinned("<body><code><span>a</span> <b>b</b></code>"), "<body>a b");
  EXPECT_EQ(thinned("<span>a</span>"), "<span>a</span>");
  EXPECT_EQ(thinned("<body><span id='x'>a</span>"), "<body><span id='x'>a</span>");
  EXPECT_EQ(thinned("<body><em>a<br>b</em>"), "<body><em>a<br>b</em>");
  EXPECT_EQ(thinned("<body><em>a</i></em>"), "<body><em>a</i></em>");
  const std::string text(1000, 'a');
  EXPECT_EQ(thinned("<body><em>" + text + "</em>"), "<body><em>" + text + "</em>");
}

TEST(MarkupGuard, attributesThatAreLeftOutAreCountedAllTheSame) {
  std::string tag = "<p";
  for (size_t i = 0; i <= maximumAttributeCount; ++i) {
    tag += " class='a'";
  }
  EXPECT_TRUE(tameAndThinHTML(tag).has_value());
}

}  // namespace
}  // namespace bvmake
