#include <gmock/gmock.h>

#include <filesystem>
#include <string>

#include "tests/zeb/World.h"
#include "zebd/Catalogue.h"

namespace {

using testing::HasSubstr;
using tests::Outcome;
using zeb::ExitCode;
using zebd::Catalogue;

class IndexCommandTest : public testing::Test {
 protected:
  IndexCommandTest() {
    world.writePage("one/index.html", "First", "Applets and pears.");
    world.writePage("two/page.html", "Second", "Plums.");
  }
  std::string path(const std::string& name) const { return world.files().path(name); }
  Catalogue catalogue() const { return Catalogue(world.booksFolder()); }

  tests::World world;
};

TEST_F(IndexCommandTest, MakesABookOfAFolderNamedAfterItAndTitledByItsFirstPage) {
  const Outcome run = world.zeb({"index", path("one")});
  EXPECT_EQ(run.code, ExitCode::success);
  EXPECT_THAT(run.out, testing::StartsWith("one  First"));
  const auto entry = catalogue().entry("one");
  ASSERT_TRUE(entry.has_value());
  EXPECT_EQ(entry->title, "First");
  EXPECT_EQ(entry->folder, path("one"));
  EXPECT_TRUE(std::filesystem::exists(world.indexPath("one")));
}

TEST_F(IndexCommandTest, SecondFolderOfOneNameIsAMistake) {
  world.writePage("other/one/index.html", "Other", "Figs.");
  const Outcome run = world.zeb({"index", path("one"), path("other/one")});
  EXPECT_EQ(run.code, ExitCode::failure);
  EXPECT_EQ(run.err, "zeb: error: " + path("other/one") + ": there is another book \"one\"\n");
  EXPECT_EQ(catalogue().entry("one")->title, "First");
}

TEST_F(IndexCommandTest, FolderWithoutFirstPageIsTitledByItsName) {
  ASSERT_EQ(world.zeb({"index", path("two") + "/"}).code, ExitCode::success);
  EXPECT_EQ(catalogue().entry("two")->title, "two");
}

TEST_F(IndexCommandTest, IndexesAgainThoughNothingHasChanged) {
  ASSERT_EQ(world.zeb({"index", path("one")}).code, ExitCode::success);
  const auto date = std::filesystem::last_write_time(world.indexPath("one"));
  ASSERT_EQ(world.zeb({"index", path("one")}).code, ExitCode::success);
  EXPECT_GT(std::filesystem::last_write_time(world.indexPath("one")), date);
}

TEST_F(IndexCommandTest, PathsMayBeRelative) {
  const auto before = std::filesystem::current_path();
  std::filesystem::current_path(world.files().path());
  const Outcome run = world.zeb({"index", "./one/../one"});
  std::filesystem::current_path(before);
  EXPECT_EQ(run.code, ExitCode::success) << run.err;
  EXPECT_EQ(catalogue().entry("one")->folder, path("one"));
}

TEST_F(IndexCommandTest, IdentifiersHaveToBeOneAFolder) {
  const Outcome run = world.zeb({"index", path("one"), path("two"), "--book-id", "a"});
  EXPECT_EQ(run.code, ExitCode::usage);
  EXPECT_THAT(run.err, HasSubstr("2 folders, but 1 --book-id"));
  EXPECT_TRUE(catalogue().entries().empty());
}

TEST_F(IndexCommandTest, IdentifiersThatLeaveAFolderAreRefused) {
  for (const char* bookID : {"../a", "a/b", ".", "..", ""}) {
    const Outcome run = world.zeb({"index", path("one"), "--book-id", bookID});
    EXPECT_EQ(run.code, ExitCode::failure) << bookID;
    EXPECT_THAT(run.err, HasSubstr("identifier")) << bookID;
  }
  EXPECT_TRUE(catalogue().entries().empty());
}

TEST_F(IndexCommandTest, BookFolderSaysItsOwnIdentifierAndTitle) {
  ASSERT_EQ(world.zeb({"index", tests::shippedBook("offline"), "--book-id", "other"}).code,
            ExitCode::success);
  EXPECT_FALSE(catalogue().entry("other").has_value());
  ASSERT_TRUE(catalogue().entry("org.zeb.offline").has_value());
  EXPECT_EQ(catalogue().entry("org.zeb.offline")->title, "Working Without a Connection");
}

TEST_F(IndexCommandTest, InformationListThatDescribesNoBookIsRefused) {
  world.files().write("one/Info.plist", "<plist><dict></dict></plist>");
  const Outcome run = world.zeb({"index", path("one")});
  EXPECT_EQ(run.code, ExitCode::failure);
  EXPECT_THAT(run.err, HasSubstr("information list"));
}

TEST_F(IndexCommandTest, MissingFolderAndFileAreNamed) {
  const std::string file = world.files().write("file.html", "page");
  for (const std::string& folder : {path("none"), file}) {
    const Outcome run = world.zeb({"index", folder});
    EXPECT_EQ(run.code, ExitCode::failure);
    EXPECT_EQ(run.err, "zeb: error: " + folder + ": there is no such folder\n");
  }
}

TEST_F(IndexCommandTest, OneBadFolderDoesNotKeepTheOthersOut) {
  EXPECT_EQ(world.zeb({"index", path("none"), path("two")}).code, ExitCode::failure);
  EXPECT_TRUE(catalogue().entry("two").has_value());
}

TEST_F(IndexCommandTest, FolderWithoutPagesIsNoBook) {
  std::filesystem::create_directory(path("empty"));
  const Outcome run = world.zeb({"index", path("empty")});
  EXPECT_EQ(run.code, ExitCode::failure);
  EXPECT_THAT(run.err, HasSubstr("no pages"));
  EXPECT_FALSE(catalogue().entry("empty").has_value());
  EXPECT_FALSE(std::filesystem::exists(world.indexPath("empty")));
}

TEST_F(IndexCommandTest, FolderWhoseNameIsNoTextBecomesABook) {
  world.writePage("caf\xE9/index.html", "Coffee", "Espresso.");
  const Outcome run = world.zeb({"index", path("caf\xE9")});
  EXPECT_EQ(run.code, ExitCode::success) << run.err;
  const Outcome found = world.zeb({"search", "espresso"});
  EXPECT_EQ(found.code, ExitCode::success);
  EXPECT_THAT(found.out, HasSubstr("/caf%E9/index.html"));
}

}  // namespace
