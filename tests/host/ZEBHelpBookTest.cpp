#include "host/Zebrine/ZEBHelpBook.h"

#include <gtest/gtest.h>

#include <thread>
#include <vector>

#include "host/Zebrine/ZEBConstants.h"

class RNXBook {};

namespace {

std::shared_ptr<ZEBHelpBook> bookOfType(int32_t type) {
  return ZEBHelpBook::bookWithID("org.example.book", type, "/books/example");
}

TEST(ZEBHelpBook, aBookMadeByTheHostHasIdentifierTypeAndFolder) {
  const auto book = bookOfType(ZEBHelpBookType1);
  ASSERT_NE(book, nullptr);
  EXPECT_EQ(book->bookID(), "org.example.book");
  EXPECT_EQ(book->type(), 1);
  EXPECT_EQ(book->path(), "/books/example");
  EXPECT_EQ(book->title(), "org.example.book");
  EXPECT_EQ(book->localization(), "");
  EXPECT_TRUE(book->indexPaths().empty());
  EXPECT_FALSE(book->usesExternalViewer());
  EXPECT_EQ(book->accessPagePath(), std::nullopt);
  EXPECT_EQ(book->exactMatchPath(), std::nullopt);
  EXPECT_EQ(book->suggestionsPath(), std::nullopt);
  EXPECT_EQ(book->remoteURL(), std::nullopt);
  EXPECT_EQ(book->appBundleID(), std::nullopt);
  EXPECT_EQ(book->appBundleVersion(), std::nullopt);
  EXPECT_TRUE(book->remoteBookInfo().isAbsent());
  EXPECT_TRUE(book->miscAttributes().isAbsent());
  EXPECT_EQ(book->remoteSearchIndex(), std::nullopt);
  EXPECT_EQ(book->remoteExactMatch(), std::nullopt);
  EXPECT_EQ(book->rnxBook(), nullptr);
}

TEST(ZEBHelpBook, whatTheHostSetsIsWhatItGets) {
  const auto book = bookOfType(ZEBHelpBookType2);
  const auto url = platform::URL::URLWithString("https://example.org/book/");
  book->setTitle("Example Help");
  EXPECT_EQ(book->title(), "Example Help");
  EXPECT_TRUE(book->setLocalization("pt_BR"));
  EXPECT_EQ(book->localization(), "pt_BR");
  book->setIndexPaths({"/a.helpindex", "/b.helpindex"});
  EXPECT_EQ(book->indexPaths(), (std::vector<std::string>{"/a.helpindex", "/b.helpindex"}));
  book->setAccessPagePath("/index.html");
  EXPECT_EQ(book->accessPagePath(), "/index.html");
  book->setResourcesRootPath("/resources");
  EXPECT_EQ(book->resourcesRootPath(), "/resources");
  book->setExactMatchPath("/exactmatch.plist");
  EXPECT_EQ(book->exactMatchPath(), "/exactmatch.plist");
  book->setSuggestionsPath("/suggestions.plist");
  EXPECT_EQ(book->suggestionsPath(), "/suggestions.plist");
  book->setRemoteURL(url);
  EXPECT_EQ(book->remoteURL(), url);
  book->setUsesExternalViewer(true);
  EXPECT_TRUE(book->usesExternalViewer());
  book->setAppBundleID("org.example.app");
  EXPECT_EQ(book->appBundleID(), "org.example.app");
  book->setAppBundleVersion("2.1");
  EXPECT_EQ(book->appBundleVersion(), "2.1");
  book->setRemoteBookInfo(platform::Value::Dictionary{{ZEBBookLocalizationKey, "en"}});
  EXPECT_EQ(book->remoteBookInfo()[ZEBBookLocalizationKey], platform::Value("en"));
  book->setRemoteSearchIndex(url);
  EXPECT_EQ(book->remoteSearchIndex(), url);
  book->setRemoteExactMatch(url);
  EXPECT_EQ(book->remoteExactMatch(), url);
  book->setMiscAttributes(platform::Value::Dictionary{{"key", 1}});
  EXPECT_EQ(book->miscAttributes()["key"], platform::Value(1));
  const auto rnxBook = std::make_shared<RNXBook>();
  book->setRnxBook(rnxBook);
  EXPECT_EQ(book->rnxBook(), rnxBook);
}

TEST(ZEBHelpBook, bundlesHaveNoResourceFolderUntilOneIsSet) {
  EXPECT_EQ(bookOfType(ZEBHelpBookType2)->resourcesRootPath(), std::nullopt);
  EXPECT_EQ(bookOfType(ZEBHelpBookType3)->resourcesRootPath(), std::nullopt);
}

TEST(ZEBHelpBook, otherBooksHaveTheirResourcesInTheirFolder) {
  EXPECT_EQ(bookOfType(ZEBHelpBookType1)->resourcesRootPath(), "/books/example");
  EXPECT_EQ(bookOfType(ZEBHelpBookType4)->resourcesRootPath(), "/books/example");
}

TEST(ZEBHelpBook, identifiersThatCouldLeaveAFolderAreRefused) {
  using namespace std::string_view_literals;
  for (const std::string_view bookID :
       {""sv, "."sv, ".."sv, "/"sv, "a/b"sv, "../a"sv, "a\0b"sv, "\0"sv, "a\xff"sv}) {
    EXPECT_FALSE(ZEBHelpBook::isValidBookID(bookID)) << bookID;
    EXPECT_EQ(ZEBHelpBook::bookWithID(std::string(bookID), ZEBHelpBookType1, "/b"), nullptr);
  }
  EXPECT_FALSE(ZEBHelpBook::isValidBookID(std::string(201, 'a')));
}

TEST(ZEBHelpBook, otherIdentifiersAreAccepted) {
  for (const char* bookID : {"a", "...", "org.example.help*1.2", "Hilfe für Drucker", ".hidden"}) {
    EXPECT_TRUE(ZEBHelpBook::isValidBookID(bookID)) << bookID;
  }
  EXPECT_TRUE(ZEBHelpBook::isValidBookID(std::string(200, 'a')));
}

TEST(ZEBHelpBook, unknownTypesAreRefused) {
  EXPECT_EQ(bookOfType(0), nullptr);
  EXPECT_EQ(bookOfType(5), nullptr);
  EXPECT_EQ(bookOfType(-1), nullptr);
}

TEST(ZEBHelpBook, localizationsThatCouldLeaveAFolderAreRefused) {
  const auto book = bookOfType(ZEBHelpBookType1);
  ASSERT_TRUE(book->setLocalization("de"));
  for (const char* localization : {"..", ".", "de/..", "/"}) {
    EXPECT_FALSE(book->setLocalization(localization));
    EXPECT_EQ(book->localization(), "de");
  }
  EXPECT_TRUE(book->setLocalization(""));
  EXPECT_EQ(book->localization(), "");
}

TEST(ZEBHelpBook, theIdentifierIsTheSameObjectEachTimeAndNoOtherBooks) {
  const auto book = bookOfType(ZEBHelpBookType1);
  const auto other = bookOfType(ZEBHelpBookType1);
  EXPECT_EQ(&book->bookID(), &book->bookID());
  EXPECT_NE(&book->bookID(), &other->bookID());
  EXPECT_EQ(book->bookID(), other->bookID());
}

TEST(ZEBHelpBook, theUnversionedIdentifierEndsBeforeTheFirstAsterisk) {
  EXPECT_EQ(ZEBHelpBook::unversionedbookIDFromBookID("org.example.help*1.2"), "org.example.help");
  EXPECT_EQ(ZEBHelpBook::unversionedbookIDFromBookID("org.example.help*1*2"), "org.example.help");
  EXPECT_EQ(ZEBHelpBook::unversionedbookIDFromBookID("org.example.help*"), "org.example.help");
}

TEST(ZEBHelpBook, identifiersWithoutAVersionStayAsTheyAre) {
  for (const char* bookID : {"org.example.help", "", "*", "*1.2"}) {
    EXPECT_EQ(ZEBHelpBook::unversionedbookIDFromBookID(bookID), bookID);
  }
}

TEST(ZEBHelpBook, describesItselfForLogs) {
  EXPECT_EQ(bookOfType(ZEBHelpBookType1)->description(),
            "book org.example.book type: 1 path: /books/example localization: ");
}

TEST(ZEBHelpBook, propertiesMayBeReadWhileTheyAreSet) {
  const auto book = bookOfType(ZEBHelpBookType4);
  std::thread writer([&] {
    for (int i = 0; i < 2000; ++i) {
      book->setExactMatchPath("/exactmatch/" + std::to_string(i) + "/with-a-name-of-some-length");
      book->setRemoteBookInfo(platform::Value::Dictionary{{ZEBBookLocalizationKey, "en"}});
    }
  });
  for (int i = 0; i < 2000; ++i) {
    const auto path = book->exactMatchPath();
    EXPECT_TRUE(!path || path->ends_with("/with-a-name-of-some-length"));
    const platform::Value info = book->remoteBookInfo();
    EXPECT_TRUE(info.isAbsent() || info[ZEBBookLocalizationKey] == platform::Value("en"));
  }
  writer.join();
}

}  // namespace
