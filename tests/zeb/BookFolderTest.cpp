#include "zeb/BookFolder.h"

#include <gmock/gmock.h>

#include <filesystem>

#include "host/Zebrine/ZEBGeneratedFiles.h"
#include "host/Zebrine/ZEBHelpBook.h"
#include "tests/zeb/World.h"

namespace {

using zeb::CatalogueEntry;

class BookFolderTest : public testing::Test {
 protected:
  std::optional<CatalogueEntry> entry(const std::string& name,
                                      const std::optional<std::string>& bookID = std::nullopt) {
    reason.clear();
    return zeb::entryForFolder(world.files().path(name), bookID, "de", reason);
  }

  tests::World world;
  std::string reason;
};

TEST_F(BookFolderTest, FolderIsTitledByThePageThatOpensIt) {
  world.writePage("a/index.html", "First page", "Text.");
  const auto found = entry("a");
  ASSERT_TRUE(found.has_value()) << reason;
  EXPECT_EQ(found->bookID, "a");
  EXPECT_EQ(found->title, "First page");
  EXPECT_EQ(found->language, "de");
  EXPECT_EQ(found->accessPagePath, world.files().path("a/index.html"));
  EXPECT_NE(found->fingerprint, "");
}

TEST_F(BookFolderTest, FingerprintChangesWithThePages) {
  world.writePage("a/index.html", "First page", "Text.");
  const auto before = entry("a");
  EXPECT_EQ(entry("a"), before);
  world.writePage("a/deep/more.html", "More", "Text.");
  EXPECT_NE(entry("a"), before);
}

TEST_F(BookFolderTest, PagesMayLieDeeper) {
  world.writePage("a/deep/down/page.html", "Page", "Text.");
  EXPECT_TRUE(entry("a").has_value()) << reason;
}

TEST_F(BookFolderTest, FolderWithoutPagesIsRefused) {
  world.files().write("a/readme.txt", "no page");
  EXPECT_EQ(entry("a"), std::nullopt);
  EXPECT_EQ(reason, "there are no pages in it");
}

TEST_F(BookFolderTest, BookOfAnEntryIsWhatTheEntrySays) {
  world.writePage("a/index.html", "First page", "Text.");
  const auto book = zeb::bookOfEntry(entry("a", "org.a").value());
  ASSERT_NE(book, nullptr);
  EXPECT_EQ(book->bookID(), "org.a");
  EXPECT_EQ(book->title(), "First page");
  EXPECT_EQ(book->localization(), "de");
  EXPECT_EQ(book->accessPagePath(), world.files().path("a/index.html"));
}

TEST_F(BookFolderTest, FolderThatHasBecomeAnotherBookIsNotTheEntrys) {
  world.writePage("a/index.html", "First page", "Text.");
  const CatalogueEntry before = entry("a").value();
  world.files().write("a/Info.plist",
                      "<plist><dict><key>ZEBBookIdentifier</key><string>org.other</string>"
                      "</dict></plist>");
  EXPECT_EQ(zeb::bookOfEntry(before), nullptr);
}

TEST_F(BookFolderTest, GeneratedIndexComesBeforeTheShippedOne) {
  world.writePage("a/index.html", "First page", "Text.");
  const auto book = zeb::bookOfEntry(entry("a").value());
  EXPECT_EQ(zeb::indexPathOfBook(*book), std::nullopt);
  const std::string shipped = world.files().path("a/own.helpindex");
  book->setIndexPaths({shipped});
  EXPECT_EQ(zeb::indexPathOfBook(*book), std::nullopt);
  world.files().write("a/own.helpindex", "");
  EXPECT_EQ(zeb::indexPathOfBook(*book), shipped);
  const std::string generated =
      ZEBGeneratedFilePath(ZEBGeneratedRoot().value(), "a", "de", "helpindex");
  std::filesystem::create_directories(generated);
  EXPECT_EQ(zeb::indexPathOfBook(*book), shipped);
  std::filesystem::remove(generated);
  std::filesystem::create_symlink(shipped, generated);
  EXPECT_EQ(zeb::indexPathOfBook(*book), generated);
}

}  // namespace
