#include "platform/URL.h"

#include <gtest/gtest.h>

namespace platform {
namespace {

TEST(URL, takesWellFormedStringsOnly) {
  EXPECT_TRUE(URL::URLWithString("https://example.org/a%20b?q#f"));
  EXPECT_TRUE(URL::URLWithString("relative/path"));
  EXPECT_FALSE(URL::URLWithString(""));
  EXPECT_FALSE(URL::URLWithString("a b"));
  EXPECT_FALSE(URL::URLWithString("ü"));
  EXPECT_FALSE(URL::URLWithString("a%2"));
  EXPECT_FALSE(URL::URLWithString("a%zz"));
  EXPECT_FALSE(URL::URLWithString("a\"b"));
  EXPECT_FALSE(URL::URLWithString(std::string_view("a\0b", 3)));
}

TEST(URL, fileURLEscapesThePath) {
  const URL url = URL::fileURLWithPath("/usr/share/help/C#/a b/ü?.html");
  EXPECT_EQ(url.absoluteString(), "file:///usr/share/help/C%23/a%20b/%C3%BC%3F.html");
  EXPECT_EQ(url.path(), "/usr/share/help/C#/a b/ü?.html");
  EXPECT_TRUE(url.isFileURL());
  EXPECT_EQ(url.host(), "");
  EXPECT_EQ(url.lastPathComponent(), "ü?.html");
  EXPECT_EQ(URL::fileURLWithPath("page.html").path(), "/page.html");
}

TEST(URL, partsOfAWebAddress) {
  const URL url = *URL::URLWithString("HTTPS://help.example.org:8443/a/b%20c/?q=1#top");
  EXPECT_EQ(url.scheme(), "https");
  EXPECT_EQ(url.host(), "help.example.org");
  EXPECT_EQ(url.path(), "/a/b c");
  EXPECT_FALSE(url.isFileURL());
}

TEST(URL, pathOfRootKeepsItsSlash) {
  EXPECT_EQ(URL::URLWithString("file:///")->path(), "/");
  EXPECT_EQ(URL::URLWithString("http://example.org/")->path(), "/");
}

TEST(URL, relativeNameReplacesTheLastSegmentOfTheBase) {
  const URL file = *URL::URLWithString("https://example.org/books/old.helpindex");
  const URL folder = *URL::URLWithString("https://example.org/books/");
  EXPECT_EQ(URL::URLWithStringRelativeToURL("new.helpindex", file)->absoluteString(),
            "https://example.org/books/new.helpindex");
  EXPECT_EQ(URL::URLWithStringRelativeToURL("new.helpindex", folder)->absoluteString(),
            "https://example.org/books/new.helpindex");
  EXPECT_EQ(URL::URLWithStringRelativeToURL("../x", folder)->absoluteString(),
            "https://example.org/x");
  EXPECT_EQ(URL::URLWithStringRelativeToURL("http://other.example/y", folder)->absoluteString(),
            "http://other.example/y");
  EXPECT_FALSE(URL::URLWithStringRelativeToURL("a b", folder));
}

TEST(URL, relativeURLIsEqualByTargetNotBySpelling) {
  const URL base = URL::fileURLWithPath("/books/manual/");
  const URL relative = *URL::URLWithStringRelativeToURL("page.html", base);
  const URL direct = URL::fileURLWithPath("/books/manual/page.html");
  EXPECT_EQ(relative.relativeString(), "page.html");
  EXPECT_FALSE(relative == direct);
  EXPECT_EQ(relative.absoluteURL(), direct);
  EXPECT_EQ(relative.path(), direct.path());
}

TEST(URL, baseThatIsNoAddressLeavesTheNameAlone) {
  const URL base = *URL::URLWithString("books/manual");
  EXPECT_EQ(URL::URLWithStringRelativeToURL("page.html", base)->absoluteString(), "page.html");
}

TEST(URL, appendingAComponentEscapesItAndDropsTheQuery) {
  const URL url = *URL::URLWithString("https://example.org/books?x#y");
  EXPECT_EQ(url.URLByAppendingPathComponent("a b#c").absoluteString(),
            "https://example.org/books/a%20b%23c");
}

TEST(URL, escapingTwiceChangesNothing) {
  EXPECT_EQ(stringByEscapingPath("/a b%20c%"), "/a%20b%20c%25");
  EXPECT_EQ(stringByEscapingPath("/a%20b%20c%25"), "/a%20b%20c%25");
  EXPECT_EQ(stringByEscapingPath(std::string_view("\0\x7F\xFF", 3)), "%00%7F%FF");
}

TEST(URL, aPathWithPercentSignsComesBackAsItWas) {
  const URL url = URL::fileURLWithPath("/50%25 off/%41.html");
  EXPECT_EQ(url.absoluteString(), "file:///50%2525%20off/%2541.html");
  EXPECT_EQ(url.path(), "/50%25 off/%41.html");
  EXPECT_EQ(url.URLByAppendingPathComponent("%42").lastPathComponent(), "%42");
}

TEST(URL, removingEscapesLeavesMalformedOnes) {
  EXPECT_EQ(stringByRemovingPercentEncoding("%41%c3%BC%4%%zz"), "Aü%4%%zz");
}

TEST(URL, strangePathsDoNotConfuseThePathOfAFileURL) {
  EXPECT_EQ(URL::fileURLWithPath("//server/x").path(), "//server/x");
  EXPECT_EQ(URL::URLWithString("file:///a/../b")->path(), "/a/../b");
  EXPECT_EQ(URL::URLWithString("file:///a?q")->path(), "/a");
}

}  // namespace
}  // namespace platform
