#include <gtest/gtest.h>

#include <atomic>
#include <thread>
#include <vector>

#include "host/Zebrine/ZEBConstants.h"
#include "host/Zebrine/ZEBHelpBook.h"

namespace {

using platform::URL;

// Every test has an identifier of its own: the books of a process share one registry.
std::shared_ptr<ZEBHelpBook> remoteBook(const std::string& bookID, const std::string& root) {
  auto book = ZEBHelpBook::bookWithID(bookID, ZEBHelpBookType4, "/books/remote");
  book->setRemoteURL(URL::URLWithString(root));
  return book;
}

std::string pageURL(std::string_view path, std::string_view bookID) {
  const auto url = ZEBHelpBook::_urlForType4HelpBookResult(path, bookID);
  return url ? url->absoluteString() : "(absent)";
}

TEST(ZEBType4Books, aPageIsUnderTheRemoteRootWithOneSlashBetween) {
  const auto book = remoteBook("type4.root", "https://example.org/book");
  EXPECT_EQ(pageURL("/a/b.html", "type4.root"), "https://example.org/book/a/b.html");
  EXPECT_EQ(pageURL("a/b.html", "type4.root"), "https://example.org/book/a/b.html");
  EXPECT_EQ(pageURL("//a.html", "type4.root"), "https://example.org/book/a.html");
  book->setRemoteURL(URL::URLWithString("https://example.org/other/"));
  EXPECT_EQ(pageURL("/a/b.html", "type4.root"), "https://example.org/other/a/b.html");
}

TEST(ZEBType4Books, thePathIsEscapedAndQueryAndFragmentOfTheRootAreDropped) {
  const auto book = remoteBook("type4.escaped", "https://example.org/book/?v=1#top");
  EXPECT_EQ(pageURL("/a b#1?.html", "type4.escaped"), "https://example.org/book/a%20b%231%3F.html");
}

TEST(ZEBType4Books, pathsThatLeaveTheBookGiveNothing) {
  const auto book = remoteBook("type4.leaving", "https://example.org/book/");
  for (const char* path :
       {"/../x", "/a/../../x", "..", "/%2e%2E/x", "/a%2F..%2fx", "/..\\x", "/a%00b", ""}) {
    EXPECT_EQ(pageURL(path, "type4.leaving"), "(absent)") << path;
  }
  EXPECT_EQ(pageURL("/a..b/...", "type4.leaving"), "https://example.org/book/a..b/...");
}

TEST(ZEBType4Books, anUnknownBookGivesNothing) {
  EXPECT_EQ(pageURL("/a.html", "type4.unknown"), "(absent)");
  EXPECT_EQ(pageURL("/a.html", ""), "(absent)");
}

TEST(ZEBType4Books, aBookWithoutARemoteURLGivesNothing) {
  const auto book = ZEBHelpBook::bookWithID("type4.rootless", ZEBHelpBookType4, "/b");
  EXPECT_EQ(pageURL("/a.html", "type4.rootless"), "(absent)");
}

TEST(ZEBType4Books, aBookOfAnotherTypeGivesNothing) {
  const auto book = ZEBHelpBook::bookWithID("type4.installed", ZEBHelpBookType3, "/b");
  book->setRemoteURL(URL::URLWithString("https://example.org/"));
  EXPECT_EQ(pageURL("/a.html", "type4.installed"), "(absent)");
}

TEST(ZEBType4Books, aBookThatIsGoneGivesNothing) {
  auto book = remoteBook("type4.gone", "https://example.org/");
  ASSERT_EQ(pageURL("/a.html", "type4.gone"), "https://example.org/a.html");
  book.reset();
  EXPECT_EQ(pageURL("/a.html", "type4.gone"), "(absent)");
}

TEST(ZEBType4Books, theBookMadeLastAnswersAndTheEarlierOneWhenThatIsGone) {
  const auto earlier = remoteBook("type4.twice", "https://example.org/1/");
  auto later = remoteBook("type4.twice", "https://example.org/2/");
  EXPECT_EQ(pageURL("/a.html", "type4.twice"), "https://example.org/2/a.html");
  later->setRemoteURL(std::nullopt);
  EXPECT_EQ(pageURL("/a.html", "type4.twice"), "https://example.org/1/a.html");
  later->setRemoteURL(URL::URLWithString("https://example.org/3/"));
  EXPECT_EQ(pageURL("/a.html", "type4.twice"), "https://example.org/3/a.html");
  later.reset();
  EXPECT_EQ(pageURL("/a.html", "type4.twice"), "https://example.org/1/a.html");
}

TEST(ZEBType4Books, lookUpsRunBesideBooksThatComeAndGo) {
  std::atomic<bool> done{false};
  std::vector<std::thread> readers;
  readers.reserve(3);
  std::atomic<int> wrong{0};
  for (int i = 0; i < 3; ++i) {
    readers.emplace_back([&] {
      while (!done.load()) {
        const std::string url = pageURL("/a.html", "type4.busy");
        if (url != "(absent)" && url != "https://example.org/a.html") {
          ++wrong;
        }
      }
    });
  }
  for (int i = 0; i < 2000; ++i) {
    remoteBook("type4.busy", "https://example.org/");
  }
  done = true;
  for (std::thread& reader : readers) {
    reader.join();
  }
  EXPECT_EQ(wrong.load(), 0);
}

}  // namespace
