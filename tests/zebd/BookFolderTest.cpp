#include "zebd/BookFolder.h"

#include <gmock/gmock.h>

#include <filesystem>

#include "host/Zebrine/ZEBGeneratedFiles.h"
#include "host/Zebrine/ZEBHelpBook.h"
#include "platform/Environment.h"
#include "tests/platform/TemporaryFolder.h"

namespace {

using tests::TemporaryFolder;
using zebd::CatalogueEntry;

class BookFolderTest : public testing::Test {
 protected:
  std::optional<CatalogueEntry> entry(const std::string& name,
                                      const std::optional<std::string>& bookID = std::nullopt) {
    reason.clear();
    return zebd::entryForFolder(folder.path(name), bookID, "de", reason);
  }

  void writePage(const std::string& name, const std::string& title, const std::string& body) const {
    folder.write(name, "<!DOCTYPE html><html><head><title>" + title + "</title></head><body><p>" +
                           body + "</p></body></html>");
  }

  TemporaryFolder folder;
  std::string reason;

 private:
  platform::Environment _madeEnvironment() const {
    platform::Environment environment = *platform::Environment::current();
    environment.cachesDirectory = folder.path("cache");
    return environment;
  }
  platform::EnvironmentOverride _environment{_madeEnvironment()};
};

TEST_F(BookFolderTest, FolderIsTitledByThePageThatOpensIt) {
  writePage("a/index.html", "First page", "Text.");
  const auto found = entry("a");
  ASSERT_TRUE(found.has_value()) << reason;
  EXPECT_EQ(found->bookID, "a");
  EXPECT_EQ(found->title, "First page");
  EXPECT_EQ(found->language, "de");
  EXPECT_EQ(found->accessPagePath, folder.path("a/index.html"));
  EXPECT_NE(found->fingerprint, "");
}

TEST_F(BookFolderTest, FingerprintChangesWithThePages) {
  writePage("a/index.html", "First page", "Text.");
  const auto before = entry("a");
  EXPECT_EQ(entry("a"), before);
  writePage("a/deep/more.html", "More", "Text.");
  EXPECT_NE(entry("a"), before);
}

TEST_F(BookFolderTest, PagesMayLieDeeper) {
  writePage("a/deep/down/page.html", "Page", "Text.");
  EXPECT_TRUE(entry("a").has_value()) << reason;
}

TEST_F(BookFolderTest, FolderWithoutPagesIsRefused) {
  folder.write("a/readme.txt", "no page");
  EXPECT_EQ(entry("a"), std::nullopt);
  EXPECT_EQ(reason, "there are no pages in it");
}

TEST_F(BookFolderTest, BookOfAnEntryIsWhatTheEntrySays) {
  writePage("a/index.html", "First page", "Text.");
  const auto book = zebd::bookOfEntry(entry("a", "org.a").value());
  ASSERT_NE(book, nullptr);
  EXPECT_EQ(book->bookID(), "org.a");
  EXPECT_EQ(book->title(), "First page");
  EXPECT_EQ(book->localization(), "de");
  EXPECT_EQ(book->accessPagePath(), folder.path("a/index.html"));
}

TEST_F(BookFolderTest, FolderThatHasBecomeAnotherBookIsNotTheEntrys) {
  writePage("a/index.html", "First page", "Text.");
  const CatalogueEntry before = entry("a").value();
  folder.write("a/Info.plist",
               "<plist><dict><key>ZEBBookIdentifier</key><string>org.other</string>"
               "</dict></plist>");
  EXPECT_EQ(zebd::bookOfEntry(before), nullptr);
}

TEST_F(BookFolderTest, GeneratedIndexComesBeforeTheShippedOne) {
  writePage("a/index.html", "First page", "Text.");
  const auto book = zebd::bookOfEntry(entry("a").value());
  EXPECT_EQ(zebd::indexPathOfBook(*book), std::nullopt);
  const std::string shipped = folder.path("a/own.helpindex");
  book->setIndexPaths({shipped});
  EXPECT_EQ(zebd::indexPathOfBook(*book), std::nullopt);
  folder.write("a/own.helpindex", "");
  EXPECT_EQ(zebd::indexPathOfBook(*book), shipped);
  const std::string generated =
      ZEBGeneratedFilePath(ZEBGeneratedRoot().value(), "a", "de", "helpindex");
  std::filesystem::create_directories(generated);
  EXPECT_EQ(zebd::indexPathOfBook(*book), shipped);
  std::filesystem::remove(generated);
  std::filesystem::create_symlink(shipped, generated);
  EXPECT_EQ(zebd::indexPathOfBook(*book), generated);
}

}  // namespace
