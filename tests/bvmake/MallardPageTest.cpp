#include "bvmake/MallardPage.h"

#include <fmt/format.h>
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <chrono>
#include <string>

#include "TestSupport.h"
#include "bvmake/PageReader.h"

namespace bvmake {
namespace {

using testing::ElementsAre;
using testing::HasSubstr;
using testing::IsEmpty;

std::string page(std::string_view content) {
  return "<page xmlns='http://projectmallard.org/1.0/' id='the-page'>" + std::string(content) +
         "</page>";
}

Page read(std::string_view xml) {
  platform::Error error;
  std::optional<Page> result = readPage(PageKind::mallard, xml, &error);
  EXPECT_TRUE(result) << error.description;
  return result.value_or(Page());
}

std::string refusal(std::string_view xml) {
  platform::Error error;
  EXPECT_FALSE(readPage(PageKind::mallard, xml, &error));
  return error.description;
}

TEST(MallardPage, titleDescriptionAndKeywordsAreThePagesOwn) {
  const Page result = read(page(
      "<info><desc>How to <em>print</em>\n pages.</desc><keywords>print, page setup</keywords>"
      "<title type='sort'>zzz</title><credit><name>A. Writer</name></credit></info>"
      "<title>Print</title><section id='s'><info><desc>Other</desc><keywords>k</keywords></info>"
      "<title>Section</title></section>"));
  EXPECT_EQ(result.title, "Print");
  EXPECT_EQ(result.description, "How to print pages.");
  EXPECT_THAT(result.keywords, ElementsAre("print", "page setup"));
  EXPECT_THAT(result.headings, ElementsAre("Section"));
  EXPECT_THAT(result.body, IsEmpty());
}

TEST(MallardPage, identifiersAreAnchorsThePagesOwnFirst) {
  EXPECT_THAT(
      read(page("<section id='a'><p id='b'/><p id='a'/><x xmlns='other' id='c'/></section>"))
          .anchors,
      ElementsAre("the-page", "a", "b"));
}

TEST(MallardPage, infoCommentsAndMediaAreLeftOut) {
  EXPECT_THAT(bodyTexts(read(page("<info><link type='guide' xref='x'/><desc>d</desc></info>"
                                  "<comment><p>c</p></comment><media><p>m</p></media><p>a</p>"))),
              ElementsAre("a"));
}

TEST(MallardPage, paragraphsAreProseAndTheRestIsNot) {
  EXPECT_THAT(
      read(page("<p>a</p><steps><title>b</title><item><p>c</p></item></steps><table><tr><td>"
                "<p>d</p></td></tr></table><screen>e</screen><code>f</code>"))
          .body,
      ElementsAre(TextBlock{TextBlock::Kind::prose, "a"}, TextBlock{TextBlock::Kind::other, "b"},
                  TextBlock{TextBlock::Kind::prose, "c"}, TextBlock{TextBlock::Kind::other, "d"},
                  TextBlock{TextBlock::Kind::other, "e"}, TextBlock{TextBlock::Kind::other, "f"}));
}

TEST(MallardPage, inlineElementsJoin) {
  EXPECT_THAT(bodyTexts(read(page("<p>Press <key>F</key>1 in <app>Zeb</app>.</p>"))),
              ElementsAre("Press F1 in Zeb."));
}

TEST(MallardPage, menusAndKeysAreWrittenAsSequences) {
  EXPECT_THAT(
      bodyTexts(read(page("<p><guiseq><gui>File</gui><gui>Print</gui></guiseq> or "
                          "<keyseq><key>Ctrl</key><key>P</key></keyseq> or "
                          "<keyseq type='sequence'><key>g</key><key>p</key></keyseq></p>"))),
      ElementsAre("File ▸ Print or Ctrl+P or g p"));
}

TEST(MallardPage, extensionsAroundContentAreTransparentAndInclusionsAreNotFollowed) {
  EXPECT_THAT(
      bodyTexts(read(page("<if:choose xmlns:if='http://projectmallard.org/if/1.0/'><if:when><p>a"
                          "</p></if:when></if:choose><xi:include href='/etc/passwd' parse='text' "
                          "xmlns:xi='http://www.w3.org/2001/XInclude'><xi:fallback>f"
                          "</xi:fallback></xi:include><p>b</p>"))),
      ElementsAre("a", "b"));
}

TEST(MallardPage, prefixesOfTheNamespaceDoNotMatter) {
  const Page result =
      read("<m:page xmlns:m='http://projectmallard.org/1.0/' id='i'><m:title>T</m:title></m:page>");
  EXPECT_EQ(result.title, "T");
}

TEST(MallardPage, declaredCharacterSetsAreConvertedOnce) {
  EXPECT_EQ(read("<?xml version='1.0' encoding='iso-8859-1'?>" + page("<title>\xE9</title>")).title,
            "é");
}

TEST(MallardPage, pageWithoutTitleIsNamedByItsFirstSection) {
  EXPECT_EQ(read(page("<section><title>S</title></section>")).title, "S");
}

TEST(MallardPage, otherXMLIsRefused) {
  EXPECT_EQ(refusal("<page id='x'><title>t</title></page>"), "no Mallard page");
  EXPECT_EQ(refusal("<section xmlns='http://projectmallard.org/1.0/'/>"), "no Mallard page");
  EXPECT_EQ(refusal("<html xmlns='http://www.w3.org/1999/xhtml'/>"), "no Mallard page");
}

TEST(MallardPage, brokenXMLIsRefusedWithTheLine) {
  EXPECT_THAT(refusal(page("\n<p>a</b>")), HasSubstr("line 2"));
  EXPECT_NE(refusal(""), "");
  EXPECT_NE(refusal("x"), "");
  EXPECT_NE(refusal("<"), "");
}

TEST(MallardPage, pagesCutOffAnywhereAreRefused) {
  const std::string whole = page("<info><desc>d</desc></info><title>t</title><p>a&amp;b</p>");
  for (size_t length = 0; length < whole.size(); ++length) {
    EXPECT_FALSE(readPage(PageKind::mallard, whole.substr(0, length))) << length;
  }
  EXPECT_TRUE(readPage(PageKind::mallard, whole));
}

TEST(MallardPage, entitiesOfThePageItselfAreReplacedByTheirText) {
  EXPECT_EQ(read("<!DOCTYPE page [<!ENTITY app 'Zeb'>]>" + page("<title>Use &app;</title>")).title,
            "Use Zeb");
}

TEST(MallardPage, entitiesThatHoldMarkupOrEntitiesVanish) {
  EXPECT_EQ(read("<!DOCTYPE page [<!ENTITY a 'x'><!ENTITY b '&a;&a;'><!ENTITY c '<p>y</p>'>"
                 "<!ENTITY d SYSTEM 'file:///etc/passwd'>]>" +
                 page("<title>[&b;&c;&d;] t</title>"))
                .title,
            "[] t");
}

TEST(MallardPage, entityBombsDoNotGoOff) {
  std::string bomb = "<!DOCTYPE page [<!ENTITY a0 'lol'>";
  for (int i = 1; i < 30; ++i) {
    bomb += fmt::format("<!ENTITY a{0} '&a{1};&a{1};&a{1};&a{1};'>", i, i - 1);
  }
  const Page result = read(bomb + "]>" + page("<title>t</title><p>&a29;</p>"));
  EXPECT_THAT(result.body, IsEmpty());
}

TEST(MallardPage, entitiesThatStandForTooMuchTextAreRefused) {
  std::string content = "<p>";
  for (int i = 0; i < 1000; ++i) {
    content += "&big;";
  }
  EXPECT_EQ(refusal("<!DOCTYPE page [<!ENTITY big '" + std::string(4000, 'x') + "'>]>" +
                    page(content + "</p>")),
            "entities that stand for too much text");
}

TEST(MallardPage, declaredAttributesAreRefused) {
  EXPECT_EQ(refusal("<!DOCTYPE page [<!ATTLIST p a CDATA 'x' b (c|d) 'c'>]>" + page("<p/>")),
            "declarations of attributes are not taken");
}

TEST(MallardPage, externalDeclarationsAreNotLoaded) {
  const TemporaryFolder folder;
  const std::string dtd = folder.write("x.dtd", "<!ENTITY e 'loaded'>");
  EXPECT_EQ(read("<!DOCTYPE page SYSTEM '" + dtd + "' [<!ENTITY % x SYSTEM '" + dtd + "'> %x;]>" +
                 page("<title>t &e;</title>"))
                .title,
            "t");
}

TEST(MallardPage, tooDeepNestingIsRefused) {
  std::string content;
  for (int i = 0; i < 100'000; ++i) {
    content += "<section>";
  }
  EXPECT_THAT(refusal(page(content)), HasSubstr("depth"));
}

TEST(MallardPage, tooManyNamespacesAreRefused) {
  std::string content;
  for (int i = 0; i < 200; ++i) {
    content += "<p xmlns:a" + std::to_string(i) + "='u' xmlns:b" + std::to_string(i) + "='v'>";
  }
  EXPECT_EQ(refusal(page(content)), "too many name spaces");
}

TEST(MallardPage, tooManyAttributesAreRefused) {
  std::string content = "<p";
  for (int i = 0; i < 100'000; ++i) {
    content += " a" + std::to_string(i) + "=''";
  }
  EXPECT_EQ(refusal(page(content + "/>")), "a tag with more than 256 attributes");
}

TEST(MallardPage, megabytesOfTextAreRead) {
  std::string content = "<p>";
  for (int i = 0; i < 3'000'000; ++i) {
    content += "word ";
  }
  const Page result = read(page(content + "</p>"));
  ASSERT_EQ(result.body.size(), 1U);
  EXPECT_EQ(result.body[0].text.size(), 5U * 3'000'000 - 1);
}

}  // namespace
}  // namespace bvmake
