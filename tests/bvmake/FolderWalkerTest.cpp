#include "bvmake/FolderWalker.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <sys/stat.h>

#include <cerrno>

#include "TestSupport.h"
#include "platform/Environment.h"

namespace bvmake {
namespace {

using testing::ElementsAre;
using testing::HasSubstr;
using testing::IsEmpty;

std::vector<std::string> pathsIn(const TemporaryFolder& folder, Report& report) {
  std::vector<std::string> paths;
  const auto pages = findPages(folder.path(), report);
  EXPECT_TRUE(pages);
  for (const FoundPage& page : pages.value_or(std::vector<FoundPage>())) {
    EXPECT_EQ(page.file, folder.path() + page.path);
    paths.push_back(page.path);
  }
  return paths;
}

TEST(FolderWalker, pagesOfAllSubfoldersComeInTheOrderOfTheirPathsBytes) {
  const TemporaryFolder folder;
  for (const char* path :
       {"b.html", "a/z.page", "a.html", "a/b/c.HTM", "B.xhtml", "a/readme.txt"}) {
    folder.write(path, "x");
  }
  RecordingReport report;
  EXPECT_THAT(pathsIn(folder, report),
              ElementsAre("/B.xhtml", "/a.html", "/a/b/c.HTM", "/a/z.page", "/b.html"));
  EXPECT_THAT(report.warnings, IsEmpty());
}

TEST(FolderWalker, slashesAfterTheFolderDoNotMatter) {
  const TemporaryFolder folder;
  folder.write("a.html", "x");
  RecordingReport report;
  const auto pages = findPages(folder.path() + "//", report);
  ASSERT_TRUE(pages);
  ASSERT_EQ(pages->size(), 1U);
  EXPECT_EQ(pages->front().path, "/a.html");
}

TEST(FolderWalker, missingFolderIsAnError) {
  const TemporaryFolder folder;
  RecordingReport report;
  platform::Error error;
  EXPECT_FALSE(findPages(folder / "none", report, &error));
  EXPECT_EQ(error.code, ENOENT);
  EXPECT_THAT(error.description, HasSubstr(folder / "none"));
}

TEST(FolderWalker, fileInPlaceOfTheFolderIsAnError) {
  const TemporaryFolder folder;
  RecordingReport report;
  platform::Error error;
  EXPECT_FALSE(findPages(folder.write("a.html", "x"), report, &error));
  EXPECT_EQ(error.code, ENOTDIR);
}

TEST(FolderWalker, folderThatCannotBeListedIsAnError) {
  const TemporaryFolder folder;
  auto files = std::make_shared<platform::FailingFileManager>();
  files->fail(platform::FailingFileManager::Operation::list, EACCES);
  platform::Environment environment = platform::Environment::system();
  environment.files = files;
  const platform::EnvironmentOverride override(environment);
  RecordingReport report;
  platform::Error error;
  EXPECT_FALSE(findPages(folder.path(), report, &error));
  EXPECT_EQ(error.code, EACCES);
}

TEST(FolderWalker, subfolderThatCannotBeListedIsReportedAndLeftOut) {
  const TemporaryFolder folder;
  folder.write("a.html", "x");
  folder.write("closed/b.html", "x");
  folder.write("open/c.html", "x");
  auto files = std::make_shared<platform::FailingFileManager>();
  files->fail(platform::FailingFileManager::Operation::list, EACCES, "/closed");
  platform::Environment environment = platform::Environment::system();
  environment.files = files;
  const platform::EnvironmentOverride override(environment);
  RecordingReport report;
  EXPECT_THAT(pathsIn(folder, report), ElementsAre("/a.html", "/open/c.html"));
  EXPECT_THAT(report.warnings, ElementsAre(HasSubstr("/closed")));
}

TEST(FolderWalker, linksOutOfTheFolderAreNotFollowed) {
  const TemporaryFolder outside;
  const TemporaryFolder folder;
  outside.write("secret.html", "x");
  folder.makeLink(outside.path(), "folder");
  folder.makeLink(outside / "secret.html", "file.html");
  outside.write("secret.data", "x");
  folder.makeLink(outside / "secret.data", "data.html");
  folder.makeLink("/etc/passwd", "passwd.html");
  folder.write("a.html", "x");
  RecordingReport report;
  EXPECT_THAT(pathsIn(folder, report), ElementsAre("/a.html"));
}

TEST(FolderWalker, folderNextToTheFolderIsOutsideThoughItsNameBeginsAlike) {
  const TemporaryFolder folder;
  folder.write("book/a.html", "x");
  folder.write("book-two/stored.data", "x");
  folder.makeLink("../book-two/stored.data", "book/b.html");
  RecordingReport report;
  const auto pages = findPages(folder / "book", report);
  ASSERT_TRUE(pages);
  EXPECT_EQ(pages->size(), 1U);
}

TEST(FolderWalker, linksInsideTheFolderBringNoPageTwice) {
  const TemporaryFolder folder;
  folder.write("a.html", "x");
  folder.write("sub/b.html", "x");
  folder.makeLink("a.html", "again.html");
  folder.makeLink("sub", "again");
  RecordingReport report;
  EXPECT_THAT(pathsIn(folder, report), ElementsAre("/a.html", "/sub/b.html"));
}

TEST(FolderWalker, linkGivesAPageItsNameWhereTheFileHasNone) {
  const TemporaryFolder folder;
  folder.write("store/1.data", "x");
  folder.makeLink("store/1.data", "b.html");
  folder.makeLink("store/1.data", "a.html");
  RecordingReport report;
  EXPECT_THAT(pathsIn(folder, report), ElementsAre("/a.html"));
}

TEST(FolderWalker, cyclesAndDanglingLinksDoNoHarm) {
  const TemporaryFolder folder;
  folder.makeFolder("sub");
  folder.write("sub/a.html", "x");
  folder.makeLink("..", "sub/up");
  folder.makeLink(".", "here");
  folder.makeLink("loop.html", "loop.html");
  folder.makeLink("nothing", "dangling.html");
  RecordingReport report;
  EXPECT_THAT(pathsIn(folder, report), ElementsAre("/sub/a.html"));
}

TEST(FolderWalker, folderMayItselfBeALink) {
  const TemporaryFolder folder;
  folder.write("real/a.html", "x");
  folder.makeLink("real", "link");
  RecordingReport report;
  const auto pages = findPages(folder / "link", report);
  ASSERT_TRUE(pages);
  ASSERT_EQ(pages->size(), 1U);
  EXPECT_EQ(pages->front().path, "/a.html");
}

TEST(FolderWalker, pipesAndFoldersNamedLikePagesAreLeftAlone) {
  const TemporaryFolder folder;
  ASSERT_EQ(mkfifo((folder / "pipe.html").c_str(), 0600), 0);
  folder.write("folder.html/inside.html", "x");
  RecordingReport report;
  EXPECT_THAT(pathsIn(folder, report), ElementsAre("/folder.html/inside.html"));
}

TEST(FolderWalker, namesThatAreNotUTF8AreReportedAndLeftOut) {
  const TemporaryFolder folder;
  folder.write("a.html", "x");
  folder.write("b\xFF.html", "x");
  folder.write("ü.html", "x");
  RecordingReport report;
  EXPECT_THAT(pathsIn(folder, report), ElementsAre("/a.html", "/ü.html"));
  EXPECT_THAT(report.warnings, ElementsAre(HasSubstr("not UTF-8")));
}

TEST(FolderWalker, deepFoldersAreWalkedToTheBottom) {
  const TemporaryFolder folder;
  std::string path;
  for (int i = 0; i < 150; ++i) {
    path += "d/";
  }
  folder.write(path + "a.html", "x");
  RecordingReport report;
  EXPECT_THAT(pathsIn(folder, report), ElementsAre("/" + path + "a.html"));
}

}  // namespace
}  // namespace bvmake
