#include "bvmake/DocBookPages.h"

#include <fmt/format.h>
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <map>

#include "TestSupport.h"

namespace bvmake {
namespace {

using testing::Contains;
using testing::ElementsAre;
using testing::HasSubstr;
using testing::IsEmpty;
using testing::Not;
using testing::SizeIs;

/// Documents whose files are strings.
class DocBook : public testing::Test {
 protected:
  std::optional<DocBookPages> read(std::string_view text) {
    const DocBookLoader load = [this](const std::string& from, std::string_view reference,
                                      std::string& why) -> std::optional<DocBookFile> {
      _asked.push_back(from + " > " + std::string(reference));
      const auto found = _files.find(std::string(reference));
      if (found == _files.end()) {
        why = "not there";
        return std::nullopt;
      }
      return DocBookFile{found->first, found->second};
    };
    return readDocBook({"main", std::string(text)}, load, &_error);
  }

  std::vector<Page> pages(std::string_view text) {
    const auto document = read(text);
    EXPECT_TRUE(document) << _error.description;
    _notes = document ? document->notes : std::vector<std::string>();
    return document ? document->pages : std::vector<Page>();
  }

  /// Why it is none.
  std::string refusal(std::string_view text) { return read(text) ? "taken" : _error.description; }

  static std::vector<std::string> fragments(const std::vector<Page>& pages) {
    std::vector<std::string> result;
    for (const Page& page : pages) {
      result.push_back(page.fragment);
    }
    return result;
  }

  std::map<std::string, std::string> _files;
  std::vector<std::string> _asked;
  std::vector<std::string> _notes;
  platform::Error _error;
};

TEST_F(DocBook, chaptersAndTheirSectionsWithIdentifiersArePages) {
  const auto found = pages(
      "<book id='b'><title>Book</title><preface id='p'><title>Preface</title><para>p</para>"
      "</preface><chapter id='c'><title>Chapter</title><para>c</para>"
      "<sect1 id='s'><title>Section</title><para>s</para>"
      "<sect2 id='t'><title>Deeper</title><para>t</para></sect2></sect1>"
      "<para>more of c</para></chapter></book>");
  EXPECT_THAT(fragments(found), ElementsAre("", "p", "c", "s"));
  EXPECT_EQ(found[0].title, "Book");
  EXPECT_EQ(found[2].title, "Chapter");
  EXPECT_THAT(bodyTexts(found[2]), ElementsAre("c", "more of c"));
  EXPECT_EQ(found[3].title, "Section");
  EXPECT_THAT(found[3].headings, ElementsAre("Deeper"));
  EXPECT_THAT(bodyTexts(found[3]), ElementsAre("s", "t"));
}

TEST_F(DocBook, sectionsWithoutIdentifierBelongToThePageAroundThem) {
  const auto found = pages(
      "<article><title>A</title><section><title>One</title><para>1</para></section>"
      "<section id='two'><title>Two</title><para>2</para></section></article>");
  EXPECT_THAT(fragments(found), ElementsAre("", "two"));
  EXPECT_THAT(found[0].headings, ElementsAre("One"));
  EXPECT_THAT(bodyTexts(found[0]), ElementsAre("1"));
}

TEST_F(DocBook, sectionsOfAnyNameAreOnlyPagesRightBelowAChapter) {
  const auto found = pages(
      "<article><section id='a'><title>A</title><section id='b'><title>B</title></section>"
      "</section><appendix id='c'><section id='d'><title>D</title></section></appendix></article>");
  EXPECT_THAT(fragments(found), ElementsAre("", "a", "c", "d"));
  EXPECT_THAT(found[1].headings, ElementsAre("B"));
}

TEST_F(DocBook, identifiersThatCannotBePartOfAPathMakeNoPage) {
  const auto found = pages(
      "<book><chapter id='a/b'><para>x</para></chapter>"
      "<chapter id='a b'/><chapter id='a#b'/></book>");
  EXPECT_THAT(fragments(found), ElementsAre(""));
  EXPECT_THAT(found[0].anchors, ElementsAre("a/b", "a b", "a#b"));
}

TEST_F(DocBook, identifierThatComesTwiceMakesOnePage) {
  EXPECT_THAT(fragments(pages("<book><chapter id='a'/><chapter id='a'/></book>")),
              ElementsAre("", "a"));
}

TEST_F(DocBook, identifiersAreAnchorsOfThePageThatTheyStandIn) {
  const auto found = pages(
      "<book id='b'><chapter id='c'><para id='p'>x<anchor id='q'/></para>"
      "<sect1 xml:id='s'><para id='r'/></sect1><para id='t'/></chapter></book>");
  EXPECT_THAT(found[0].anchors, ElementsAre("b"));
  EXPECT_THAT(found[1].anchors, ElementsAre("c", "p", "q", "t"));
  EXPECT_THAT(found[2].anchors, ElementsAre("s", "r"));
}

TEST_F(DocBook, informationGivesTitleAbstractAndKeywords) {
  const auto found = pages(
      "<book><bookinfo><title>Title</title><subtitle>Below it</subtitle>"
      "<author><firstname>Nobody</firstname></author><legalnotice><para>rights</para></legalnotice>"
      "<abstract><para>First.</para><para>Second.</para></abstract>"
      "<keywordset><keyword>one</keyword><keyword>two words</keyword></keywordset>"
      "<subjectset><subject><subjectterm>three</subjectterm></subject></subjectset>"
      "</bookinfo><chapter id='c'><chapterinfo><title>Chapter</title>"
      "<abstract><para>Of c.</para></abstract></chapterinfo></chapter></book>");
  EXPECT_EQ(found[0].title, "Title");
  EXPECT_THAT(found[0].headings, ElementsAre("Below it"));
  EXPECT_EQ(found[0].description, "First. Second.");
  EXPECT_THAT(found[0].keywords, ElementsAre("one", "two words", "three"));
  EXPECT_THAT(found[0].body, IsEmpty());
  EXPECT_EQ(found[1].title, "Chapter");
  EXPECT_EQ(found[1].description, "Of c.");
}

TEST_F(DocBook, termsOfTheIndexAreKeywordsAndDoNotCutSentences) {
  const auto found = pages(
      "<article><para>Print<indexterm><primary>printing</primary><secondary>on paper</secondary>"
      "</indexterm> the page.<indexterm><primary>printing</primary> <secondary>on paper"
      "</secondary></indexterm></para></article>");
  EXPECT_THAT(found[0].keywords, ElementsAre("printing on paper"));
  EXPECT_THAT(bodyTexts(found[0]), ElementsAre("Print the page."));
}

TEST_F(DocBook, blocksAreToldApartAndInlinesAreNot) {
  const auto found = pages(
      "<article><para>One <guilabel>two</guilabel> three.</para><itemizedlist><listitem>"
      "<para>item</para></listitem></itemizedlist><screen>a  b</screen><table><title>T</title>"
      "<tgroup><tbody><row><entry>x</entry><entry><para>y</para></entry></row></tbody></tgroup>"
      "</table></article>");
  using Kind = TextBlock::Kind;
  EXPECT_THAT(found[0].body,
              ElementsAre(TextBlock{Kind::prose, "One two three."}, TextBlock{Kind::prose, "item"},
                          TextBlock{Kind::other, "a b"}, TextBlock{Kind::other, "T"},
                          TextBlock{Kind::other, "x"}, TextBlock{Kind::other, "y"}));
}

TEST_F(DocBook, menusAndKeysReadAsPeopleWriteThem) {
  const auto found = pages(
      "<article><para><menuchoice><guimenu>File</guimenu><guimenuitem>Open</guimenuitem>"
      "</menuchoice> or <keycombo><keycap>Ctrl</keycap><keycap>O</keycap></keycombo></para>"
      "</article>");
  EXPECT_THAT(bodyTexts(found[0]), ElementsAre("File \u25B8 Open or Ctrl+O"));
}

TEST_F(DocBook, mediaRemarksAndOtherVocabulariesAreLeftOut) {
  const auto found = pages(
      "<article xmlns:s='http://example.org/s'><remark>x</remark><para>a<inlinemediaobject>"
      "<textobject><phrase>x</phrase></textobject></inlinemediaobject></para><screenshot>"
      "<screeninfo>x</screeninfo></screenshot><s:g><s:t>x</s:t></s:g><para>b</para></article>");
  EXPECT_THAT(bodyTexts(found[0]), ElementsAre("a", "b"));
}

TEST_F(DocBook, manualPagesAreNamedByWhatTheyDescribe) {
  const auto found = pages(
      "<reference><refentry id='r'><refmeta><refentrytitle>no</refentrytitle></refmeta>"
      "<refnamediv><refname>print</refname><refname>lpr</refname>"
      "<refpurpose>prints files</refpurpose></refnamediv>"
      "<refsect1 id='o'><title>Options</title><para>x</para></refsect1></refentry></reference>");
  EXPECT_THAT(fragments(found), ElementsAre("", "r"));
  EXPECT_EQ(found[1].title, "print");
  EXPECT_EQ(found[1].description, "prints files");
  EXPECT_THAT(found[1].headings, ElementsAre("lpr", "Options"));
}

TEST_F(DocBook, fifthVersionIsTaken) {
  const auto found = pages(
      "<article xmlns='http://docbook.org/ns/docbook' version='5.0' xml:lang='de'><info>"
      "<title>Titel</title></info><section xml:id='s'><title>Teil</title></section></article>");
  EXPECT_EQ(found[0].title, "Titel");
  EXPECT_THAT(fragments(found), ElementsAre("", "s"));
  EXPECT_EQ(found[0].language, "de");
  EXPECT_EQ(found[1].language, "de");
}

TEST_F(DocBook, languageIsThatOfTheDocument) {
  EXPECT_EQ(pages("<book lang='fr'><chapter lang='de'/></book>")[0].language, "fr");
}

TEST_F(DocBook, filesAreIncludedWhereTheirEntitiesStand) {
  _files["one.docbook"] =
      "<?xml version='1.0' encoding='UTF-8'?>\n<chapter id='one'><title>One"
      "</title><para>&product;</para></chapter>";
  _files["two.docbook"] = "<para>loose</para><para>text</para>";
  const auto found = pages(
      "<!DOCTYPE book [<!ENTITY one SYSTEM 'one.docbook'><!ENTITY two SYSTEM 'two.docbook'>"
      "<!ENTITY product 'Writer'>]><book><title>&product;</title>&one;&two;</book>");
  EXPECT_THAT(fragments(found), ElementsAre("", "one"));
  EXPECT_EQ(found[0].title, "Writer");
  EXPECT_THAT(bodyTexts(found[0]), ElementsAre("loose", "text"));
  EXPECT_THAT(bodyTexts(found[1]), ElementsAre("Writer"));
  EXPECT_THAT(_asked, ElementsAre("main > one.docbook", "main > two.docbook"));
  EXPECT_THAT(_notes, IsEmpty());
}

TEST_F(DocBook, filesAreIncludedByXInclude) {
  _files["one.xml"] =
      "<!DOCTYPE chapter [<!ENTITY e 'own'>]>\n<chapter id='one'>"
      "<para>&e;</para></chapter>";
  _files["list.txt"] = "a < b & c";
  const auto found = pages(
      "<book xmlns:xi='http://www.w3.org/2001/XInclude'><xi:include href='one.xml'>"
      "<xi:fallback><para>not there</para></xi:fallback></xi:include><screen>"
      "<xi:include href='list.txt' parse='text'/></screen><xi:include href='one.xml' "
      "xpointer='x'/></book>");
  EXPECT_THAT(fragments(found), ElementsAre("", "one"));
  EXPECT_THAT(bodyTexts(found[0]), ElementsAre("a < b & c"));
  EXPECT_THAT(bodyTexts(found[1]), ElementsAre("own"));
  EXPECT_THAT(_asked, SizeIs(2));
}

TEST_F(DocBook, includedFilesIncludeInTurnFromWhereTheyAre) {
  _files["one.xml"] =
      "<chapter id='one' xmlns:xi='http://www.w3.org/2001/XInclude'>"
      "<xi:include href='two.xml'/></chapter>";
  _files["two.xml"] = "<sect1 id='two'><para>deep</para></sect1>";
  const auto found =
      pages("<book xmlns:xi='http://www.w3.org/2001/XInclude'><xi:include href='one.xml'/></book>");
  EXPECT_THAT(fragments(found), ElementsAre("", "one", "two"));
  EXPECT_THAT(_asked, ElementsAre("main > one.xml", "one.xml > two.xml"));
}

TEST_F(DocBook, filesThatCannotBeIncludedAreNotedAndTheRestIsRead) {
  _files["bad.xml"] = "<chapter id='bad'><para>first</para><para>cut";
  const auto found = pages(
      "<!DOCTYPE book [<!ENTITY gone SYSTEM 'gone.xml'><!ENTITY bad SYSTEM 'bad.xml'>]>"
      "<book>&gone;&bad;<chapter id='c'><para>last</para></chapter></book>");
  EXPECT_THAT(fragments(found), ElementsAre("", "bad", "c"));
  EXPECT_THAT(bodyTexts(found[1]), Contains("first"));
  EXPECT_THAT(_notes, ElementsAre("cannot include gone.xml: not there",
                                  HasSubstr("cannot include all of bad.xml: line ")));
}

TEST_F(DocBook, filesThatIncludeThemselvesAreIncludedOnce) {
  _files["a.xml"] =
      "<chapter xmlns:xi='http://www.w3.org/2001/XInclude'><para>a</para>"
      "<xi:include href='b.xml'/></chapter>";
  _files["b.xml"] =
      "<sect1 xmlns:xi='http://www.w3.org/2001/XInclude'><para>b</para>"
      "<xi:include href='a.xml'/></sect1>";
  const auto found =
      pages("<book xmlns:xi='http://www.w3.org/2001/XInclude'><xi:include href='a.xml'/></book>");
  EXPECT_THAT(bodyTexts(found[0]), ElementsAre("a", "b"));
  EXPECT_THAT(_notes, ElementsAre("a.xml includes itself"));
}

TEST_F(DocBook, filesThatIncludeMoreAndMoreAreRefused) {
  // Each includes the next ten times.
  for (int i = 0; i < 15; ++i) {
    std::string text = "<chapter xmlns:xi='http://www.w3.org/2001/XInclude'>";
    for (int j = 0; j < 10; ++j) {
      text += fmt::format("<xi:include href='{}.xml'/>", i + 1);
    }
    _files[fmt::format("{}.xml", i)] = text + "</chapter>";
  }
  _files["15.xml"] = "<para>x</para>";
  EXPECT_EQ(refusal("<book xmlns:xi='http://www.w3.org/2001/XInclude'>"
                    "<xi:include href='0.xml'/></book>"),
            "includes too much");
  EXPECT_LE(_asked.size(), maximumIncludedCount + 2);
}

TEST_F(DocBook, filesThatIncludeTooDeeplyAreRefused) {
  for (int i = 0; i < 40; ++i) {
    _files[fmt::format("{}.xml", i)] = fmt::format(
        "<chapter xmlns:xi='http://www.w3.org/2001/XInclude'>"
        "<xi:include href='{}.xml'/></chapter>",
        i + 1);
  }
  EXPECT_EQ(refusal("<book xmlns:xi='http://www.w3.org/2001/XInclude'>"
                    "<xi:include href='0.xml'/></book>"),
            "includes too much");
}

TEST_F(DocBook, entitiesOfEntitiesStandForTheirText) {
  const auto found = pages(
      "<!DOCTYPE article [<!ENTITY app '&maker; <emphasis>Writer</emphasis>'>"
      "<!ENTITY maker 'Some'><!ENTITY name '&maker; Writer'>]>"
      "<article><title>&name;</title><para role='&app;'>With &app;.</para></article>");
  EXPECT_EQ(found[0].title, "Some Writer");
  EXPECT_THAT(bodyTexts(found[0]), ElementsAre("With Some Writer."));
}

TEST_F(DocBook, entitiesInAttributesStandForTheirText) {
  const auto found = pages(
      "<!DOCTYPE book [<!ENTITY dash '–&more;'><!ENTITY more '<b>x</b>y'>"
      "<!ENTITY file SYSTEM 'f'>]><book lang='d&e;'><chapter id='a&dash;&amp;&file;'/></book>");
  EXPECT_THAT(fragments(found), ElementsAre("", "a–xy&"));
  EXPECT_EQ(found[0].language, "de");
}

TEST_F(DocBook, undeclaredEntitiesStandForTheirNamesOrCharacters) {
  const auto found = pages(
      "<!DOCTYPE article PUBLIC 'p' 'far.dtd'><article lang='&language;'>"
      "<para>&Ctrl;&nbsp;caf&eacute; &kde;</para></article>");
  EXPECT_THAT(bodyTexts(found[0]), ElementsAre("Ctrl caf\u00E9 kde"));
}

TEST_F(DocBook, entityBombsAreRefused) {
  std::string text = "<!DOCTYPE article [<!ENTITY a0 'aaaaaaaaaaaaaaaaaaaaaaaaaaaaaaaaaaaaaaa'>";
  for (int i = 1; i < 30; ++i) {
    text += fmt::format("<!ENTITY a{0} '&a{1};&a{1};&a{1};&a{1};'>", i, i - 1);
  }
  EXPECT_THAT(refusal(text + "]><article><para>&a29;</para></article>"), Not(HasSubstr("line")));
  std::string markup = "<!DOCTYPE article [<!ENTITY a0 '<para>aaaaaaaaaaaaaaaaaaaaa</para>'>";
  for (int i = 1; i < 30; ++i) {
    markup += fmt::format("<!ENTITY a{0} '<note>&a{1};&a{1};&a{1};&a{1};</note>'>", i, i - 1);
  }
  EXPECT_EQ(refusal(markup + "]><article>&a14;</article>"), "includes too much");
  EXPECT_EQ(
      refusal("<!DOCTYPE article [<!ENTITY long '" + std::string(60000, 'x') + "'>]><article>" +
              [] {
                std::string references;
                for (int i = 0; i < 100; ++i) {
                  references += "<para>&long;</para>";
                }
                return references;
              }() +
              "</article>"),
      "entities that stand for too much text");
}

TEST_F(DocBook, shortEntitiesThatStandForMuchTextAreCountedAsThat) {
  const std::string declarations = "<!DOCTYPE article [<!ENTITY long '" + std::string(60000, 'x') +
                                   "'><!ENTITY short '&long;'>]><article>";
  std::string text = declarations;
  std::string attributes = declarations;
  for (int i = 0; i < 100; ++i) {
    text += "<para>&short;</para>";
    attributes += "<para id='&short;'/>";
  }
  EXPECT_EQ(refusal(text + "</article>"), "entities that stand for too much text");
  EXPECT_EQ(refusal(attributes + "</article>"), "entities that stand for too much text");
}

TEST_F(DocBook, entitiesThatNameThemselvesDoNoHarm) {
  const auto found = pages(
      "<!DOCTYPE article [<!ENTITY a '&b;'><!ENTITY b '&a;x'><!ENTITY c '<para>&c;</para>'>]>"
      "<article><para>&a;</para>&c;<para>end</para></article>");
  EXPECT_THAT(bodyTexts(found[0]), Contains("end"));
  EXPECT_THAT(_notes, ElementsAre("&c includes itself"));
}

TEST_F(DocBook, whatIsNoDocumentIsRefused) {
  EXPECT_EQ(refusal(""), "empty");
  EXPECT_EQ(refusal("<a>"), "no DocBook document");
  EXPECT_EQ(refusal("<html><body/></html>"), "no DocBook document");
  EXPECT_EQ(refusal("<book xmlns='http://example.org/'/>"), "no DocBook document");
  EXPECT_THAT(refusal("<book><chapter></book>"), HasSubstr("line 1: "));
  EXPECT_THAT(refusal("text"), HasSubstr("line 1: "));
  EXPECT_EQ(refusal("<!DOCTYPE book [<!ATTLIST para a CDATA 'x'>]><book/>"),
            "declarations of attributes are not taken");
  std::string attributes;
  for (int i = 0; i < 300; ++i) {
    attributes += fmt::format(" a{}='x'", i);
  }
  EXPECT_THAT(refusal("<book" + attributes + "/>"), HasSubstr("more than 256 attributes"));
  std::string spaces;
  for (int i = 0; i < 20; ++i) {
    spaces += "<para";
    for (int j = 0; j < 20; ++j) {
      spaces += fmt::format(" xmlns:n{}x{}='u'", i, j);
    }
    spaces += ">";
  }
  EXPECT_EQ(refusal("<book>" + spaces), "too many name spaces");
  std::string deep;
  for (int i = 0; i < 1000; ++i) {
    deep += "<para>";
  }
  EXPECT_THAT(refusal("<book>" + deep), HasSubstr("line 1: "));
}

TEST_F(DocBook, notesAreBounded) {
  std::string text = "<book xmlns:xi='http://www.w3.org/2001/XInclude'>";
  for (int i = 0; i < 1000; ++i) {
    text += fmt::format("<xi:include href='{}'/>", i);
  }
  pages(text + "</book>");
  EXPECT_THAT(_notes, SizeIs(100));
}

}  // namespace
}  // namespace bvmake
