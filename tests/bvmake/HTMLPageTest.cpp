#include "bvmake/HTMLPage.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <string>

#include "TestSupport.h"
#include "bvmake/PageReader.h"

namespace bvmake {
namespace {

using testing::ElementsAre;
using testing::IsEmpty;

Page read(std::string_view html) {
  platform::Error error;
  std::optional<Page> page = readPage(PageKind::html, html, &error);
  EXPECT_TRUE(page) << error.description;
  return page.value_or(Page());
}

std::string repeated(std::string_view text, size_t count) {
  std::string result;
  result.reserve(text.size() * count);
  for (size_t i = 0; i < count; ++i) {
    result += text;
  }
  return result;
}

TEST(HTMLPage, titleIsCollapsedAndDecoded) {
  EXPECT_EQ(read("<html><head><title>\n  Print &amp;\n scan &#x2014; help </title>").title,
            "Print & scan — help");
}

TEST(HTMLPage, firstTitleThatSaysSomethingCounts) {
  EXPECT_EQ(read("<title> </title><title>A</title><body><title>B</title>").title, "A");
}

TEST(HTMLPage, titleOfAnImageIsNotThePages) {
  EXPECT_EQ(read("<body><svg><title>Arrow</title></svg><h1>Page</h1>").title, "Page");
}

TEST(HTMLPage, pageWithoutTitleIsNamedByItsFirstHeading) {
  EXPECT_EQ(read("<p>Text<h2>First</h2><h1>Second</h1>").title, "First");
}

TEST(HTMLPage, pageWithoutTitleIsNamedByAHeadingInItsHeaderRatherThanNotAtAll) {
  const Page page = read("<header><h1>Name</h1></header><p>Text");
  EXPECT_EQ(page.title, "Name");
  EXPECT_THAT(page.headings, IsEmpty());
}

TEST(HTMLPage, headingsOfAllLevelsAreTaken) {
  EXPECT_THAT(
      read("<h1>A</h1><h2>B</h2><h3>C</h3><h4>D</h4><h5>E</h5><h6>F <b>G</b></h6>").headings,
      ElementsAre("A", "B", "C", "D", "E", "F G"));
}

TEST(HTMLPage, headingsAreNotBodyText) {
  EXPECT_THAT(bodyTexts(read("<h1>A</h1>b<h2>C</h2>d")), ElementsAre("b", "d"));
}

TEST(HTMLPage, blocksAreSeparateAndInlineElementsJoin) {
  EXPECT_THAT(bodyTexts(read("<p>one <b>two</b>three<p>four<br>five<ul><li>six<li>seven</ul>")),
              ElementsAre("one twothree", "four five", "six", "seven"));
}

TEST(HTMLPage, paragraphsAreProseAndListsTablesAndProgramsAreNot) {
  const Page page =
      read("<p>a<ul><li>b<li><p>c</p></ul><table><tr><td><p>d</table><pre>e</pre><div>f</div>");
  EXPECT_THAT(
      page.body,
      ElementsAre(TextBlock{TextBlock::Kind::prose, "a"}, TextBlock{TextBlock::Kind::other, "b"},
                  TextBlock{TextBlock::Kind::prose, "c"}, TextBlock{TextBlock::Kind::other, "d"},
                  TextBlock{TextBlock::Kind::other, "e"}, TextBlock{TextBlock::Kind::prose, "f"}));
}

TEST(HTMLPage, descriptionAndKeywordsComeFromMeta) {
  const Page page = read(
      "<META NAME='Description' CONTENT=' How to\n print. '><meta name=keywords content='print, "
      "page setup'><meta name=description content=second>");
  EXPECT_EQ(page.description, "How to print.");
  EXPECT_THAT(page.keywords, ElementsAre("print", "page setup"));
}

TEST(HTMLPage, robotsCanExcludeThePage) {
  EXPECT_TRUE(read("<meta name=robots content='noindex'>").excludedFromSearch);
  EXPECT_TRUE(read("<meta name=ROBOTS content='nofollow, NOINDEX'>").excludedFromSearch);
  EXPECT_TRUE(read("<meta name=robots content='none'>").excludedFromSearch);
  EXPECT_FALSE(read("<meta name=robots content='index, nofollow'>").excludedFromSearch);
  EXPECT_FALSE(read("<meta name=author content='noindex'>").excludedFromSearch);
}

TEST(HTMLPage, scriptsStylesAndTemplatesAreLeftOut) {
  EXPECT_THAT(bodyTexts(read("<body>a<script>if (x < y) { document.write('<p>s</p>'); }</script>"
                             "<style>p { color: red }</style><template><p>t</p></template>"
                             "<noscript>n</noscript>b")),
              ElementsAre("ab"));
}

TEST(HTMLPage, formControlsAndMediaAreLeftOut) {
  EXPECT_THAT(bodyTexts(read("<p>a <button>Copy</button><select><option>o</select>"
                             "<textarea>t</textarea><video>v</video><iframe>i</iframe>b")),
              ElementsAre("a b"));
}

TEST(HTMLPage, navigationIsLeftOut) {
  EXPECT_THAT(bodyTexts(read("<nav><ul><li>x</ul></nav><div role=navigation>y</div>"
                             "<form role='search'>z</form><p>a")),
              ElementsAre("a"));
}

TEST(HTMLPage, hiddenContentIsLeftOut) {
  EXPECT_THAT(
      bodyTexts(read("<div hidden>1</div><div hidden=''>2</div><span aria-hidden=true>3"
                     "</span><p style='color:red; DISPLAY : none'>4</p>"
                     "<p style='visibility:hidden'>5</p><dialog>6</dialog><p>a"
                     "<p aria-hidden=false>b<p hidden=until-found>c<dialog open>d</dialog>")),
      ElementsAre("a", "b", "c", "d"));
}

TEST(HTMLPage, contentInsideHiddenContentStaysHidden) {
  EXPECT_THAT(bodyTexts(read("<div hidden><div style='display:block'>x</div>y</div>z")),
              ElementsAre("z"));
}

TEST(HTMLPage, hidingTheWholePageIsATrickOfScripts) {
  EXPECT_THAT(bodyTexts(read("<html hidden><body style='display:none'><p>a")), ElementsAre("a"));
}

TEST(HTMLPage, headersFootersAndAsidesAreLeftOutAroundTheContent) {
  EXPECT_THAT(bodyTexts(read("<header>1</header><div role=banner>2</div><p>a</p>"
                             "<aside>3</aside><footer>4</footer><div role=contentinfo>5</div>")),
              ElementsAre("a"));
}

TEST(HTMLPage, headersFootersAndAsidesInsideTheContentAreContent) {
  EXPECT_THAT(bodyTexts(read("<article><header>a</header><p>b</p><aside>c</aside>"
                             "<footer>d</footer></article>")),
              ElementsAre("a", "b", "c", "d"));
}

TEST(HTMLPage, onlyTheMainContentIsReadWhereItIsMarked) {
  const Page page = read("<p>before<h2>Other</h2><main><h1>Main</h1><p>inside</main><p>after");
  EXPECT_THAT(bodyTexts(page), ElementsAre("inside"));
  EXPECT_THAT(page.headings, ElementsAre("Main"));
  EXPECT_THAT(bodyTexts(read("<p>before<div role=main><p>inside</div><p>after")),
              ElementsAre("inside"));
}

TEST(HTMLPage, emptyMainContentHidesNothing) {
  EXPECT_THAT(bodyTexts(read("<main></main><p>text")), ElementsAre("text"));
}

TEST(HTMLPage, marksThatLinkToTheirOwnPlaceAreNoText) {
  const Page page = read(
      "<h1>Queues<a href='#queues'>¶</a></h1><p>A <a href=x>link</a>. "
      "<a href='#'>§</a>");
  EXPECT_THAT(page.headings, ElementsAre("Queues"));
  EXPECT_THAT(bodyTexts(page), ElementsAre("A link."));
}

TEST(HTMLPage, readingAidsAboveCharactersAreLeftOut) {
  EXPECT_THAT(bodyTexts(read("<p><ruby>漢<rp>(</rp><rt>かん</rt><rp>)</rp>字</ruby>")),
              ElementsAre("漢字"));
}

TEST(HTMLPage, anchorsAreNamesAndIdentifiersInDocumentOrderEachOnce) {
  EXPECT_THAT(read("<body id=top><a name=first id=one></a><p id=two><a name='first'></a>"
                   "<a name=''></a><a name=three>x</a>")
                  .anchors,
              ElementsAre("top", "one", "first", "two", "three"));
}

TEST(HTMLPage, namesOfOtherElementsAreNoAnchors) {
  EXPECT_THAT(read("<form name=f><input name=i></form><meta name=m content=x>").anchors, IsEmpty());
}

TEST(HTMLPage, anchorsAreFoundInNavigationAndHiddenContentToo) {
  EXPECT_THAT(read("<nav id=n><a name=m></a></nav><div hidden id=h></div>").anchors,
              ElementsAre("n", "m", "h"));
}

TEST(HTMLPage, anchorNamesKeepTheirSpelling) {
  EXPECT_THAT(read("<a name='A b&amp;c'></a><a name='a b&amp;c'></a>").anchors,
              ElementsAre("A b&c", "a b&c"));
}

TEST(HTMLPage, entitiesAreReplaced) {
  EXPECT_THAT(bodyTexts(read("<p>&lt;tag&gt; caf&eacute; &#26085;&#x672C; a&nbsp;b &quot;")),
              ElementsAre("<tag> café 日本 a b \""));
}

TEST(HTMLPage, xhtmlIsRead) {
  const Page page = read(
      "<?xml version=\"1.0\" encoding=\"UTF-8\"?>\n<!DOCTYPE html PUBLIC \"-//W3C//DTD XHTML 1.0 "
      "Strict//EN\" \"http://www.w3.org/TR/xhtml1/DTD/xhtml1-strict.dtd\">\n"
      "<html xmlns=\"http://www.w3.org/1999/xhtml\"><head><title>T</title>"
      "<script src=\"x.js\"/></head><body><a name=\"x\"/><p>a<br/>b</p>"
      "<p><![CDATA[c < d]]></p></body></html>");
  EXPECT_EQ(page.title, "T");
  EXPECT_THAT(page.anchors, ElementsAre("x"));
  EXPECT_THAT(bodyTexts(page), ElementsAre("a b", "c d"));
}

TEST(HTMLPage, marksOfWordProcessorsAreNoText) {
  EXPECT_THAT(bodyTexts(read("<p><![if !supportLists]>1. <![endif]>Open the lid.")),
              ElementsAre("1. Open the lid."));
}

TEST(HTMLPage, tagsLeftOpenAndClosedWronglyDoNoHarm) {
  EXPECT_THAT(bodyTexts(read("<p>a<b>b<i>c</b>d</p></div></table><td>e</x>")),
              ElementsAre("abcd", "e"));
}

TEST(HTMLPage, namesOfCharacterSetsInThePageAreNotObeyedTwice) {
  // Declared and converted once; the parser must not convert again.
  EXPECT_THAT(bodyTexts(read("<meta charset=windows-1251><p>\xEF\xF0\xE8\xE2\xE5\xF2")),
              ElementsAre("привет"));
}

TEST(HTMLPage, emptyAndBlankPagesHoldNothing) {
  EXPECT_FALSE(read("").hasText());
  EXPECT_FALSE(read(" ").hasText());
  EXPECT_FALSE(read("<").hasText());
}

TEST(HTMLPage, plainTextUnderTheNameOfAPageIsText) {
  EXPECT_THAT(bodyTexts(read("just words & <")), ElementsAre("just words & <"));
}

TEST(HTMLPage, hundredThousandNestedElementsAreReadToTheBottom) {
  const Page page = read(repeated("<div>", 100'000) + "bottom" + repeated("</div>", 100'000));
  EXPECT_THAT(bodyTexts(page), ElementsAre("bottom"));
}

TEST(HTMLPage, hundredThousandHiddenNestedElementsStayHidden) {
  EXPECT_THAT(bodyTexts(read("<nav>" + repeated("<span>", 100'000) + "x</nav>")), IsEmpty());
}

TEST(HTMLPage, megabytesOfTextAreRead) {
  const Page page = read("<p>" + repeated("word ", 2'000'000) + "<p>end");
  ASSERT_EQ(page.body.size(), 2U);
  EXPECT_EQ(page.body[0].text.size(), 5U * 2'000'000 - 1);
  EXPECT_EQ(page.body[1].text, "end");
}

class HostileHTMLPage : public testing::TestWithParam<std::string> {};

TEST_P(HostileHTMLPage, isReadOrRefusedInTimeInProportionToItsLength) {
  // A second and a half in a release build. Without limits it takes minutes to days, which the
  // time-out of the suite ends.
  (void)readPage(PageKind::html, GetParam());
}

std::string distinctAttributes(size_t count) {
  std::string tag = "<p";
  for (size_t i = 0; i < count; ++i) {
    tag += " a" + std::to_string(i);
  }
  return tag + ">";
}

INSTANTIATE_TEST_SUITE_P(
    constructions, HostileHTMLPage,
    testing::Values(repeated("<b>", 200'000) + repeated("</i>", 200'000),
                    repeated("<div>", 200'000) + repeated("</p>", 200'000),
                    repeated("<body>", 200'000), repeated("<table>", 200'000),
                    repeated("<p><b>", 100'000) + repeated("</span></a>", 100'000),
                    distinctAttributes(200'000), "<p " + std::string(5'000'000, 'a') + ">",
                    repeated("<", 2'000'000), repeated("<a", 1'000'000), repeated("&", 2'000'000),
                    repeated("<!--", 500'000), repeated("<![CDATA[", 200'000),
                    repeated("<script>", 200'000), repeated("<meta", 500'000),
                    repeated("</", 1'000'000), "<title>" + repeated("<title>", 200'000),
                    repeated("<a href=x>\u00B6", 200'000), repeated("<select><nav>", 100'000)));

TEST(HTMLPage, misnestingBeyondAllMeasureIsRefusedWithAReason) {
  platform::Error error;
  EXPECT_FALSE(
      readPage(PageKind::html, repeated("<b>", 200'000) + repeated("</i>", 200'000), &error));
  EXPECT_EQ(error.description, "misnested tags too deep inside each other");
}

TEST(HTMLPage, tagsWithEndlessAttributesAreRefusedWithAReason) {
  platform::Error error;
  EXPECT_FALSE(readPage(PageKind::html, distinctAttributes(1000), &error));
  EXPECT_EQ(error.description, "a tag with more than 256 attributes");
}

TEST(HTMLPage, binaryDataIsRefusedWithAReason) {
  platform::Error error;
  EXPECT_FALSE(
      readPage(PageKind::html, std::string_view("\x89PNG\r\n\x1A\n\0\0\0\rIHDR", 16), &error));
  EXPECT_EQ(error.description, "no text, but binary data");
}

TEST(HTMLPage, pagesCutOffAnywhereAreReadAsFarAsTheyGo) {
  const std::string page =
      "<!DOCTYPE html><html lang=en><head><meta charset=\"utf-8\"><title>Ti&amp;tle</title>"
      "<meta name=\"description\" content=\"De\"><script>x<y</script></head><body>"
      "<h1 id=\"h\">H<a href=\"#h\">¶</a></h1><nav>n</nav><p>Té<b>x</b>t<!-- c --><br/>"
      "<![CDATA[d]]></p><table><tr><td>1</table></body></html>";
  for (size_t length = 0; length <= page.size(); ++length) {
    EXPECT_TRUE(readPage(PageKind::html, page.substr(0, length))) << length;
  }
}

TEST(PageReader, kindsAreKnownByExtensionInAnyCase) {
  EXPECT_EQ(pageKindOfFileName("a.html"), PageKind::html);
  EXPECT_EQ(pageKindOfFileName("a.HTM"), PageKind::html);
  EXPECT_EQ(pageKindOfFileName("a.b.xhtml"), PageKind::html);
  EXPECT_EQ(pageKindOfFileName("a.xht"), PageKind::html);
  EXPECT_EQ(pageKindOfFileName("a.Page"), PageKind::mallard);
  EXPECT_EQ(pageKindOfFileName("a.page.stub"), std::nullopt);
  EXPECT_EQ(pageKindOfFileName("a.txt"), std::nullopt);
  EXPECT_EQ(pageKindOfFileName(".html"), std::nullopt);
  EXPECT_EQ(pageKindOfFileName("html"), std::nullopt);
}

}  // namespace
}  // namespace bvmake
