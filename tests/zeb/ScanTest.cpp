#include "zeb/Scan.h"

#include <gmock/gmock.h>

#include <chrono>
#include <filesystem>
#include <sstream>
#include <string>

#include "tests/zeb/World.h"

namespace {

using testing::ElementsAre;
using testing::EndsWith;
using testing::HasSubstr;
using testing::Not;
using tests::Outcome;
using zeb::ExitCode;
using zebd::Catalogue;

/// A computer with the help of two applications and one manual.
class ScanTest : public testing::Test {
 protected:
  ScanTest() {
    mallardPage("C/editor/index.page", "Text Editor", "Type text.");
    mallardPage("de/editor/index.page", "Texteditor", "Tippen Sie.");
    mallardPage("C/player/index.page", "Music Player", "Play songs.");
    world.writePage("root/usr/share/doc/tool/html/index.html", "Tool Manual", "Use the tool.");
  }

  void mallardPage(const std::string& name, const std::string& title, const std::string& body) {
    world.files().write("root/usr/share/help/" + name,
                        "<page xmlns=\"http://projectmallard.org/1.0/\" type=\"topic\" id=\"" +
                            title.substr(0, 4) + "\"><info><desc>About it.</desc></info><title>" +
                            title + "</title><p>" + body + "</p></page>");
  }

  Outcome scan(std::vector<std::string> arguments = {}) const {
    arguments.insert(arguments.begin(), {"scan", "--root", world.files().path("root")});
    return world.zeb(std::move(arguments));
  }

  std::vector<std::string> titles() const {
    std::vector<std::string> titles;
    for (const auto& entry : Catalogue(world.booksFolder()).entries()) {
      titles.push_back(entry.bookID + ": " + entry.title);
    }
    return titles;
  }

  tests::World world;
};

TEST_F(ScanTest, IndexesHelpAndManualsOfTheComputer) {
  const Outcome run = scan({"--language", "en"});
  EXPECT_EQ(run.code, ExitCode::success) << run.err;
  EXPECT_THAT(run.out, EndsWith("3 indexed, 0 unchanged, 0 forgotten, 0 failed\n"));
  EXPECT_EQ(run.err, "");
  EXPECT_THAT(titles(),
              ElementsAre("doc.tool: Tool Manual", "editor: Text Editor", "player: Music Player"));
  EXPECT_EQ(world.zeb({"search", "songs"}).code, ExitCode::success);
  EXPECT_EQ(world.zeb({"anchor", "Musi"}).code, ExitCode::success);
}

TEST_F(ScanTest, SecondScanFindsEverythingUnchanged) {
  scan();
  const Outcome run = scan();
  EXPECT_EQ(run.code, ExitCode::success);
  EXPECT_EQ(run.out, "0 indexed, 3 unchanged, 0 forgotten, 0 failed\n");
}

TEST_F(ScanTest, ForceIndexesUnchangedBooks) {
  scan();
  EXPECT_THAT(scan({"--force"}).out, EndsWith("3 indexed, 0 unchanged, 0 forgotten, 0 failed\n"));
}

TEST_F(ScanTest, ChangedPageIsNoticed) {
  scan();
  mallardPage("C/player/videos.page", "Videos", "Play films.");
  EXPECT_THAT(scan().out, EndsWith("1 indexed, 2 unchanged, 0 forgotten, 0 failed\n"));
  EXPECT_EQ(world.zeb({"search", "films"}).code, ExitCode::success);
}

TEST_F(ScanTest, PagesOfAnUpgradeAreNoticedThoughTheyAreOlderThanTheIndex) {
  const std::string page =
      world.writePage("root/usr/share/doc/tool/html/index.html", "Tool Manual", "Before.");
  const auto now = std::filesystem::last_write_time(page);
  std::filesystem::last_write_time(page, now - std::chrono::hours(2000));
  scan();
  world.writePage("root/usr/share/doc/tool/html/index.html", "Tool Manual", "Afterwards.");
  std::filesystem::last_write_time(page, now - std::chrono::hours(1000));
  EXPECT_THAT(scan().out, EndsWith("1 indexed, 2 unchanged, 0 forgotten, 0 failed\n"));
  EXPECT_EQ(world.zeb({"search", "afterwards"}).code, ExitCode::success);
}

TEST_F(ScanTest, LostIndexesAndDamagedEntriesAreMadeAgain) {
  scan();
  std::filesystem::remove(world.indexPath("editor", "C"));
  world.files().write("cache/books/doc.tool.plist", "garbage");
  EXPECT_THAT(scan().out, EndsWith("2 indexed, 1 unchanged, 0 forgotten, 0 failed\n"));
  EXPECT_EQ(world.zeb({"search", "type", "--book", "editor"}).code, ExitCode::success);
  EXPECT_EQ(world.zeb({"search", "tool", "--book", "doc.tool"}).code, ExitCode::success);
}

TEST_F(ScanTest, BooksThatAreGoneAreForgotten) {
  scan();
  std::filesystem::remove_all(world.files().path("root/usr/share/help/C/player"));
  EXPECT_EQ(scan({"--language", "en"}).out, "0 indexed, 2 unchanged, 1 forgotten, 0 failed\n");
  EXPECT_THAT(titles(), ElementsAre("doc.tool: Tool Manual", "editor: Text Editor"));
  EXPECT_FALSE(std::filesystem::exists(world.indexPath("player", "C")));
}

TEST_F(ScanTest, AnotherLanguageTakesTheBooksPlace) {
  scan({"--language", "en"});
  EXPECT_THAT(scan({"--language", "de-AT"}).out,
              EndsWith("1 indexed, 2 unchanged, 0 forgotten, 0 failed\n"));
  EXPECT_THAT(titles(),
              ElementsAre("doc.tool: Tool Manual", "editor: Texteditor", "player: Music Player"));
}

TEST_F(ScanTest, FoldersOfOnesOwnAreAddedAndLookedAtAgain) {
  world.writePage("mine/index.html", "My Book", "Secrets.");
  EXPECT_EQ(world.zeb({"scan", "--no-system", world.files().path("mine")}).code, ExitCode::success);
  EXPECT_THAT(titles(), ElementsAre("mine: My Book"));
  world.writePage("mine/more.html", "More", "Riddles.");
  EXPECT_THAT(world.zeb({"scan", "--no-system"}).out,
              EndsWith("1 indexed, 0 unchanged, 0 forgotten, 0 failed\n"));
  EXPECT_EQ(world.zeb({"search", "riddles"}).code, ExitCode::success);
}

TEST_F(ScanTest, FolderOfOnesOwnComesBeforeAnInstalledBookOfThatName) {
  world.writePage("editor/index.html", "My Editor", "Mine.");
  scan({world.files().path("editor")});
  EXPECT_THAT(titles(), testing::Contains("editor: My Editor"));
}

TEST_F(ScanTest, BookWithItsOwnIndexIsSearchedThroughIt) {
  world.writePage("book/index.html", "Boxed", "Treasure.");
  world.writePage("book/deep/page.html", "Deep", "Pearls.");
  ASSERT_EQ(world.zeb({"index", world.files().path("book"), "--book-id", "org.box"}).code,
            ExitCode::success);
  std::filesystem::rename(world.indexPath("org.box"), world.files().path("book/own.helpindex"));
  world.files().write("book/Info.plist",
                      "<plist><dict><key>ZEBBookIdentifier</key><string>org.box</string>"
                      "<key>ZEBBookIndexFiles</key><string>own.helpindex</string>"
                      "<key>ZEBBookTitle</key><string>The Box</string></dict></plist>");
  const tests::World other;
  ASSERT_EQ(other.zeb({"scan", "--no-system", world.files().path("book")}).code, ExitCode::success);
  const Outcome run = other.zeb({"search", "pearls"});
  EXPECT_THAT(run.out, HasSubstr("1. Deep  The Box\n"));
  EXPECT_THAT(run.out, HasSubstr("file://" + world.files().path("book/deep/page.html")));
}

TEST_F(ScanTest, FolderThatCannotBeABookFailsButTheOthersAreIndexed) {
  const Outcome run = scan({world.files().path("none")});
  EXPECT_EQ(run.code, ExitCode::failure);
  EXPECT_EQ(run.err, "zeb: error: " + world.files().path("none") + ": there is no such folder\n");
  EXPECT_THAT(run.out, EndsWith("3 indexed, 0 unchanged, 0 forgotten, 1 failed\n"));
}

TEST_F(ScanTest, VerboseNamesWhatWasPassedOver) {
  world.writePage("root/usr/share/doc/thing-dev/html/index.html", "Thing", "Interfaces.");
  EXPECT_EQ(scan().err, "");
  EXPECT_THAT(scan({"--verbose"}).err,
              HasSubstr("thing-dev/html: the package is for developers\n"));
}

TEST_F(ScanTest, ComputerWithoutHelpIsNoFailure) {
  const Outcome run = world.zeb({"scan", "--root", world.files().path("nothing")});
  EXPECT_EQ(run.code, ExitCode::success);
  EXPECT_EQ(run.out, "0 indexed, 0 unchanged, 0 forgotten, 0 failed\n");
}

TEST_F(ScanTest, PagesThatCannotBeReadDoNotKeepTheOthersOut) {
  world.files().write("root/usr/share/help/C/editor/broken.page", "<page><title>");
  const Outcome run = scan({"--language", "en"});
  EXPECT_EQ(run.code, ExitCode::success);
  EXPECT_THAT(run.out, EndsWith("3 indexed, 0 unchanged, 0 forgotten, 0 failed\n"));
  EXPECT_EQ(world.zeb({"search", "type"}).code, ExitCode::success);
}

TEST_F(ScanTest, ProgressIsShownOnATerminalAndGoneAtTheEnd) {
  const Outcome run = world.zeb({"scan", "--root", world.files().path("root")},
                                [](zeb::Console& console) { console.setErrIsTerminal(true); });
  EXPECT_THAT(run.err, HasSubstr("3 of 3 books"));
  EXPECT_THAT(run.err, EndsWith("\r\033[K"));
  EXPECT_THAT(run.out, Not(HasSubstr("\033")));
}

TEST_F(ScanTest, WithoutWaitingTheBooksAreLeftToALaterCommand) {
  const Outcome run = scan({"--no-wait"});
  EXPECT_EQ(run.code, ExitCode::success);
  EXPECT_EQ(run.out, "0 indexed, 0 unchanged, 0 forgotten, 0 failed, 3 still to be indexed\n");
  EXPECT_EQ(titles().size(), 3U);
  EXPECT_FALSE(std::filesystem::exists(world.indexPath("player", "C")));
  EXPECT_THAT(scan().out, EndsWith("3 indexed, 0 unchanged, 0 forgotten, 0 failed\n"));
}

TEST_F(ScanTest, BookThatCannotBeIndexedIsNamedAndTheOthersAreIndexed) {
  // A file where the book's folder of generated files is to be.
  world.files().write("cache/org.zeb.zebd/GeneratedIndexes/player", "");
  const Outcome run = scan();
  EXPECT_EQ(run.code, ExitCode::failure);
  EXPECT_EQ(run.err, "zeb: error: player: it could not be indexed\n");
  EXPECT_THAT(run.out, EndsWith("2 indexed, 0 unchanged, 0 forgotten, 1 failed\n"));
}

TEST_F(ScanTest, WithoutThePluginItFailsAndSaysWhy) {
  std::ostringstream out;
  std::ostringstream err;
  zeb::Console console(out, err);
  EXPECT_EQ(
      zeb::run({"scan", "--root", world.files().path("root"), "--cache-dir", world.cacheFolder()},
               {world.files().path("No.bundle"), {}}, console),
      ExitCode::failure);
  EXPECT_THAT(err.str(), HasSubstr("No.bundle cannot be used: "));
  EXPECT_TRUE(titles().empty());
}

TEST_F(ScanTest, ManyBooksAtOnceAllArrive) {
  for (int i = 0; i < 40; ++i) {
    mallardPage("C/app" + std::to_string(i) + "/index.page", "App " + std::to_string(i),
                "Number " + std::to_string(i) + ".");
  }
  // Time passes quickly here, also while the tool runs.
  EXPECT_THAT(scan({"--wait", "1000000"}).out,
              EndsWith("43 indexed, 0 unchanged, 0 forgotten, 0 failed\n"));
  EXPECT_EQ(titles().size(), 43U);
}

}  // namespace
