#include "bvmake/PlainHTML.h"

#include <gtest/gtest.h>

#include <string>

#include "bvmake/HTMLPage.h"
#include "bvmake/MarkupGuard.h"

namespace bvmake {
namespace {

const std::string plainStart =
    "<?xml version=\"1.0\" encoding=\"utf-8\"?>\n<!DOCTYPE html>\n<!-- c -->\n<html lang=\"en\">"
    "<head><meta name='description' content='a &amp; b'><title>T &#233;</title></head>\n<body>";

bool isPlain(const std::string& html) {
  HTMLPageBuilder builder;
  return readPlainHTML(html, builder);
}

void expectSameEitherWay(const std::string& html) {
  platform::Error error;
  const auto page = readHTMLPage(html, &error, HTMLParsing::whereNeeded);
  ASSERT_TRUE(page) << error.description;
  EXPECT_TRUE(page == readHTMLPage(html, nullptr, HTMLParsing::always)) << html;
}

TEST(PlainHTML, takesWhatProgramsWrite) {
  for (const std::string body :
       {"<p>a</p>", "<P CLASS='x'>a</p >",
        "<div class=\"x\"\n id=\"y\"><section><h1>a</h1></section></div>",
        "<p>a<br>b<br/>c<img src=\"d\" alt='e > f'></p><hr />", "<ul><li>a<li>b</ul>",
        "<p>a<p>b<div>c</div>", "<dl><dt>a<dd>b<dt>c</dl>",
        "<table><tr><td>a<td nowrap>b</td><tr><th>c</th></tr></table>",
        "<a name=x>a</a><a id='z'/>", "a &lt; b &nbsp;&copy; &#x41;&#66; & c",
        "<!-- <p> - -- --><span hidden>a</span>",
        "<script>if (a < b) { x('<p>'); }</script><style>a > b {}</style>", "<script/>a",
        "<unknown-element>a</unknown-element>",
        "<p role='navigation'>a</p><p style='display: none'>b</p><details open>c</details>"}) {
    const std::string page = plainStart + body;
    EXPECT_TRUE(isPlain(page)) << body;
    EXPECT_TRUE(isPlain(page + "</body></html>\n")) << body;
    expectSameEitherWay(page);
    expectSameEitherWay(page + "</body></html>\n<!-- d -->\n");
  }
}

TEST(PlainHTML, leavesToTheParserWhatHasToBeMended) {
  for (const std::string& html :
       {std::string(), std::string("a"), std::string("<p>a</p>"),
        std::string("<html><p>a</p></html>"), std::string("<html><head>a</head><body>b"),
        std::string("<html><head><title>a</title></head>b"),
        std::string("<html><body>a</body>b</html>"), std::string("<html><body>a</body></html>b"),
        std::string("<html><body>a</body><body>b")}) {
    EXPECT_FALSE(isPlain(html)) << html;
    expectSameEitherWay(html);
  }
  for (const std::string body : {"<b><i>a</b></i>",
                                 "</p>",
                                 "<div>a</span></div>",
                                 "<p>a</p",
                                 "<p",
                                 "<p class='x",
                                 "<!-- a",
                                 "<!-- a --!> b -->",
                                 "<!--> a -->",
                                 "<![CDATA[a]]>",
                                 "<?php a ?>",
                                 "<!DOCTYPE html>",
                                 "a < b",
                                 "a &copy b",
                                 "a &unknown; b",
                                 "a &#0; b",
                                 "a &#xD800; b",
                                 "a &#x110000; b",
                                 "a&b;",
                                 "a \f b",
                                 "a \x01 b",
                                 "a \xEF\xBF\xBF b",
                                 "<script>a",
                                 "<html>a",
                                 "<head>a",
                                 "<p a='1'b='2'>",
                                 "<p a=\"1\" / b>",
                                 "<p a=b/>",
                                 "<p 'a'>",
                                 "<p =a>",
                                 "<p id='&x'>"}) {
    EXPECT_FALSE(isPlain(plainStart + body)) << body;
    expectSameEitherWay(plainStart + body);
  }
}

TEST(PlainHTML, everyElementInEveryOtherIsReadAsTheParserReadsIt) {
  size_t plain = 0;
  for (const HTMLElement& outer : htmlElements()) {
    for (const HTMLElement& inner : htmlElements()) {
      const std::string a = outer.name;
      const std::string b = inner.name;
      const std::string page =
          "<html><body><div>v<" + a + " id=a>w<" + b + " id=b>x</" + b + ">y</" + a + ">z</div>";
      HTMLPageBuilder builder;
      if (readPlainHTML(page, builder)) {
        ++plain;
        ASSERT_TRUE(builder.finish() == readHTMLPage(page, nullptr, HTMLParsing::always)) << page;
      }
    }
  }
  // Most of them are plain, or nothing would be shown.
  EXPECT_GT(plain, 8000U);
}

TEST(PlainHTML, findsCharactersThatTheParserDropsAnywhere) {
  const std::string page = plainStart + "<p>\t\r\n0123456789</p>\n</body></html>";
  ASSERT_TRUE(isPlain(page));
  for (size_t at = 0; at <= page.size(); ++at) {
    std::string other = page;
    other.insert(at, 1, at % 2 == 0 ? '\x1F' : '\x0B');
    EXPECT_FALSE(isPlain(other)) << at;
  }
}

TEST(PlainHTML, doesNotFollowPagesThatNestDeep) {
  std::string html = plainStart;
  for (int i = 0; i < 300; ++i) {
    html += "<div>";
  }
  EXPECT_FALSE(isPlain(html));
  expectSameEitherWay(html + "a");
}

TEST(PlainHTML, leavesTagsOfTooManyAttributesToTheGuard) {
  std::string tag = "<p";
  for (size_t i = 0; i <= maximumAttributeCount; ++i) {
    tag += " class='a'";
  }
  EXPECT_FALSE(isPlain(plainStart + tag + ">"));
  EXPECT_FALSE(readHTMLPage(plainStart + tag + ">"));
}

TEST(PlainHTML, whatIsMalformedAnywhereMakesNoDifference) {
  for (const std::string html :
       {"<body><span>a<em>b</span>c</em>d",
        "<body><span>a<p>b</span>c</p>d",
        "<body><span>a</em>b</span>",
        "<body><span>a</span",
        "<body><span>a</span x>b",
        "<body><span/>a</span>b",
        "<body><span a='1'b='2'>c</span>",
        "<p title='<b>x'>y",
        "<p class='x",
        "<p class='x'title=\"z\"",
        "<!-->a--><p>b",
        "<!--->a--><p>b",
        "<!--a--!>b-->c",
        "a<!-- b",
        "<script>a",
        "<script>a</b></script>c",
        "<style><!-- </style> --> a",
        "<body>1 < 2 <b>3</b>",
        "<BODY><SPAN CLASS=a ID=b>c</SPAN><A NAME='d'>e</A>",
        "<body><p style='display:none'>a<p style='color:red'>b<p style='&#100;isplay:none'>c",
        "<body><span>a<!-- b -->c</span>d",
        "<body><b><i><u>a</u></i></b>b<![CDATA[<b>c</b>]]>",
        "<body></body><span>a</span>b",
        "<body><head><span>a</span></head>b",
        "<html><span>a</span><body>b",
        "<body>a  \n <p>  b </p>  \n c",
        "<pre>a\n\n  <b>b</b>  c</pre>",
        "<p hidden>a</p><p Hidden='until-found'>b</p><p class='a' hidden>c</p>",
        "<title>a  <b>b</b></title><meta name='description' content='c' class='d'>"}) {
    // As the whole page, and in one that is otherwise plain.
    for (const std::string& page : {html, plainStart + html}) {
      expectSameEitherWay(page);
      for (size_t length = 0; length < page.size(); ++length) {
        expectSameEitherWay(page.substr(0, length));
      }
    }
  }
}

}  // namespace
}  // namespace bvmake
