#include "host/Zebrine/ZEBStrings.h"

#include <gtest/gtest.h>

#include <random>
#include <vector>

namespace {

std::string escaped(std::string_view string) {
  const auto url = URLByEscapingString(string);
  return url ? url->absoluteString() : "(absent)";
}

TEST(URLByEscapingString, cleanURLsStayAsTheyAre) {
  for (const char* url : {"file:///usr/share/help/C/a.html", "https://example.org/a/b.html?q=1&r#f",
                          "http://user:pw@[::1]:8080/x", "https://example.org", "/usr/share/help",
                          "a/b.html", "file:///a%20b.html", "%41", "ftp://h/a;type=i"}) {
    EXPECT_EQ(escaped(url), url);
  }
}

TEST(URLByEscapingString, blanksAndLettersBeyondASCIIAreEscaped) {
  EXPECT_EQ(escaped("file:///a b/ü.html"), "file:///a%20b/%C3%BC.html");
  EXPECT_EQ(escaped("https://x/y z?q w#f g"), "https://x/y%20z?q%20w#f%20g");
  EXPECT_EQ(escaped("/a b"), "/a%20b");
  EXPECT_EQ(escaped("https://exämple.org/"), "https://ex%C3%A4mple.org/");
}

TEST(URLByEscapingString, delimitersBelongToTheNamesOfFilesAndToTheStructureOfOtherURLs) {
  EXPECT_EQ(escaped("file:///c#/what?.html"), "file:///c%23/what%3F.html");
  EXPECT_EQ(escaped("/c#/what?.html"), "/c%23/what%3F.html");
  EXPECT_EQ(escaped("x y#1.html"), "x%20y%231.html");
  EXPECT_EQ(escaped("https://x/y?q#f"), "https://x/y?q#f");
  EXPECT_EQ(escaped("https://x/y#f#g?h"), "https://x/y#f%23g?h");
  EXPECT_EQ(escaped("https://x?q"), "https://x?q");
}

TEST(URLByEscapingString, aColonInANameIsNoScheme) {
  EXPECT_EQ(escaped("a:b.html"), "a%3Ab.html");
  EXPECT_EQ(escaped("a:b/c:d.html"), "a%3Ab/c:d.html");
  EXPECT_EQ(escaped("file:a.html"), "file%3Aa.html");
  EXPECT_EQ(escaped("mailto:someone"), "mailto%3Asomeone");
  EXPECT_EQ(escaped("1a://b"), "1a%3A//b");
  EXPECT_TRUE(URLByEscapingString("a:b.html")->scheme().empty());
}

TEST(URLByEscapingString, schemesAreRecognisedInEitherCase) {
  EXPECT_EQ(escaped("FILE:///a#b"), "FILE:///a%23b");
  EXPECT_EQ(escaped("HTTPS://x/a#b"), "HTTPS://x/a#b");
  EXPECT_EQ(escaped("file:/a b"), "file:/a%20b");
}

TEST(URLByEscapingString, existingEscapesStayAndLonePercentsAreEscaped) {
  EXPECT_EQ(escaped("/100%/a%20b%zz%4"), "/100%25/a%20b%25zz%254");
  EXPECT_EQ(escaped("https://x/%%41"), "https://x/%25%41");
}

TEST(URLByEscapingString, slashesAtTheBeginningOfAPathAreOne) {
  EXPECT_EQ(escaped("//usr/share/a.html"), "/usr/share/a.html");
  EXPECT_EQ(escaped("///"), "/");
  EXPECT_EQ(escaped("/"), "/");
}

TEST(URLByEscapingString, bracketsStayInTheHostOnly) {
  EXPECT_EQ(escaped("https://[::1]/a[1].html?b[]#[c]"),
            "https://[::1]/a%5B1%5D.html?b%5B%5D#%5Bc%5D");
  EXPECT_EQ(escaped("file:///a[1].html"), "file:///a%5B1%5D.html");
}

TEST(URLByEscapingString, charactersThatNoURLMayHaveAreEscaped) {
  EXPECT_EQ(escaped("https://x/\"<>\\^`{|}\n\x7f"), "https://x/%22%3C%3E%5C%5E%60%7B%7C%7D%0A%7F");
}

TEST(URLByEscapingString, bytesThatAreNoUTF8AreEscapedOneByOne) {
  EXPECT_EQ(escaped("/a\xff\xc3"), "/a%FF%C3");
}

TEST(URLByEscapingString, nothingAndNULGiveNothing) {
  EXPECT_EQ(URLByEscapingString(""), std::nullopt);
  EXPECT_EQ(URLByEscapingString(std::string_view("/a\0b", 4)), std::nullopt);
}

TEST(URLByEscapingString, aFileURLGivesBackThePathThatItWasMadeFrom) {
  for (const std::string path : {"/a b/ü#?.html", "/plain.html", "/c:d/[1] {2}.html"}) {
    EXPECT_EQ(URLByEscapingString("file://" + path)->path(), path);
  }
}

TEST(URLByEscapingString, appliedToItsOwnResultChangesNothing) {
  const std::vector<std::string> pieces = {
      "/",    "//", ":", "a",    "%",     "%4",  "1",       "?",  "#",  "[",  "]", "\\", "ü",
      "\xff", " ",  "@", "file", "https", "://", "file://", "..", "\n", "\"", ".", "-"};
  std::mt19937 random(1);  // NOLINT(bugprone-random-generator-seed): the same strings each time
  for (int i = 0; i < 20000; ++i) {
    std::string string;
    for (unsigned length = 1 + random() % 8; length > 0; --length) {
      string += pieces[random() % pieces.size()];
    }
    const auto once = URLByEscapingString(string);
    ASSERT_TRUE(once) << string;
    const auto twice = URLByEscapingString(once->absoluteString());
    ASSERT_TRUE(twice) << string;
    EXPECT_EQ(twice->absoluteString(), once->absoluteString()) << string;
  }
}

TEST(addSSLAsNecessary, makesHTTPSecure) {
  EXPECT_EQ(addSSLAsNecessary("http://example.org/a?b#c"), "https://example.org/a?b#c");
  EXPECT_EQ(addSSLAsNecessary("HTTP://example.org"), "https://example.org");
}

TEST(addSSLAsNecessary, leavesWhatIsSecureOrNoWebURL) {
  for (const char* string : {"https://example.org/", "file:///a", "ftp://example.org/", "", "http",
                             "http:/example.org", "/http://example.org", "example.org"}) {
    EXPECT_EQ(addSSLAsNecessary(string), string);
  }
}

TEST(addSSLAsNecessary, dropsTheStandardPortAndKeepsOthers) {
  EXPECT_EQ(addSSLAsNecessary("http://example.org:80/a"), "https://example.org/a");
  EXPECT_EQ(addSSLAsNecessary("http://example.org:8080/a"), "https://example.org:8080/a");
  EXPECT_EQ(addSSLAsNecessary("http://u:80@example.org/a"), "https://u:80@example.org/a");
  EXPECT_EQ(addSSLAsNecessary("http://[2001:db8::80]/a"), "https://[2001:db8::80]/a");
  EXPECT_EQ(addSSLAsNecessary("http://[2001:db8::1]:80/a"), "https://[2001:db8::1]/a");
}

TEST(addSSLAsNecessary, leavesHostsThatAreThisMachine) {
  for (const char* string : {"http://localhost/a", "http://LocalHost:8080/", "http://127.0.0.1:80/",
                             "http://127.255.0.1", "http://[::1]:9/a", "http://u@localhost/"}) {
    EXPECT_EQ(addSSLAsNecessary(string), string);
  }
}

TEST(addSSLAsNecessary, isNotFooledByHostsThatOnlyLookLocal) {
  EXPECT_EQ(addSSLAsNecessary("http://localhost.example.org/"), "https://localhost.example.org/");
  EXPECT_EQ(addSSLAsNecessary("http://127.0.0.1.example.org/"), "https://127.0.0.1.example.org/");
  EXPECT_EQ(addSSLAsNecessary("http://localhost@example.org/"), "https://localhost@example.org/");
  EXPECT_EQ(addSSLAsNecessary("http://example.org\\@localhost/"),
            "https://example.org\\@localhost/");
  EXPECT_EQ(addSSLAsNecessary("http://example.org/@localhost"), "https://example.org/@localhost");
  EXPECT_EQ(addSSLAsNecessary("http://127.0.0/"), "https://127.0.0/");
  EXPECT_EQ(addSSLAsNecessary("http://127.0.0.1./"), "https://127.0.0.1./");
}

TEST(addSSLAsNecessary, changesNothingTheSecondTime) {
  for (const char* string : {"http://example.org:80/a", "http://h", "http://", "http://:80"}) {
    const std::string once = addSSLAsNecessary(string);
    EXPECT_EQ(addSSLAsNecessary(once), once);
  }
}

}  // namespace
