#include "zebd/HelpFolders.h"

#include <gmock/gmock.h>
#include <unistd.h>

#include <filesystem>
#include <map>
#include <string>
#include <vector>

#include "tests/platform/TemporaryFolder.h"

namespace {

using testing::HasSubstr;
using testing::IsEmpty;
using zebd::HelpFolder;

class HelpFoldersTest : public testing::Test {
 protected:
  /// What was found, as "identifier language folder-below-the-root".
  std::vector<std::string> described(const std::vector<HelpFolder>& folders) const {
    std::vector<std::string> lines;
    for (const HelpFolder& found : folders) {
      EXPECT_TRUE(found.folder.starts_with(root.path() + "/usr/share/")) << found.folder;
      lines.push_back(found.bookID + " " + (found.language.empty() ? "-" : found.language) + " " +
                      found.folder.substr(root.path("usr/share/").size()));
    }
    return lines;
  }

  std::vector<std::string> applications(const std::vector<std::string>& preferred = {"pt-BR"}) {
    return described(zebd::applicationHelpFolders({root.path("usr/share")},
                                                  zebd::languageFallbacks(preferred), passedOver));
  }

  std::vector<std::string> manuals() {
    return described(zebd::manualFolders({root.path("usr/share")}, passedOver));
  }

  void page(const std::string& name) { root.write("usr/share/" + name, "<p>page</p>"); }
  void link(const std::string& target, const std::string& name) {
    const std::filesystem::path path = root.path("usr/share/" + name);
    std::filesystem::create_directories(path.parent_path());
    std::filesystem::create_symlink(target, path);
  }
  std::string reason(const std::string& folder) const {
    const auto found = reasons.find(root.path("usr/share/" + folder));
    return found == reasons.end() ? "" : found->second;
  }

  tests::TemporaryFolder root;
  std::map<std::string, std::string> reasons;
  zebd::PassedOver passedOver = [this](const std::string& folder, const std::string& reason) {
    reasons[folder] = reason;
  };
};

using Lines = std::vector<std::string>;

TEST_F(HelpFoldersTest, ComputerWithoutHelpHasNoFolders) {
  EXPECT_THAT(applications(), IsEmpty());
  EXPECT_THAT(manuals(), IsEmpty());
}

TEST_F(HelpFoldersTest, EveryKindOfPageMakesAFolderOneOfHelp) {
  page("help/C/caterer/index.docbook");
  page("help/C/editor/start.page");
  page("help/C/player/START.HTM");
  page("help/C/viewer/notes.docbook");
  EXPECT_EQ(applications(), (Lines{"caterer C help/C/caterer", "editor C help/C/editor",
                                   "player C help/C/player"}));
  EXPECT_EQ(reason("help/C/viewer"), zebd::noPagesReason) << "only a part of a document";
}

TEST_F(HelpFoldersTest, TakesTheBestLanguageOfEachApplication) {
  page("help/C/editor/index.page");
  page("help/pt/editor/index.page");
  page("help/pt_BR/editor/index.page");
  page("help/C/player/index.page");
  page("help/pt/player/index.page");
  page("help/C/viewer/index.page");
  page("help/de/viewer/index.page");
  EXPECT_EQ(applications(), (Lines{"editor pt_BR help/pt_BR/editor", "player pt help/pt/player",
                                   "viewer C help/C/viewer"}));
  EXPECT_EQ(applications({"de"}), (Lines{"editor C help/C/editor", "player C help/C/player",
                                         "viewer de help/de/viewer"}));
}

TEST_F(HelpFoldersTest, TranslationWithoutPagesIsPassedOver) {
  page("help/C/editor/index.page");
  page("help/pt_BR/editor/figures/picture.png");
  EXPECT_EQ(applications(), (Lines{"editor C help/C/editor"}));
}

TEST_F(HelpFoldersTest, ApplicationsWithoutPagesOrLanguageAreNamedWithTheReason) {
  page("help/C/empty/picture.png");
  page("help/ru/foreign/index.page");
  EXPECT_THAT(applications(), IsEmpty());
  EXPECT_THAT(reason("help/C/empty"), HasSubstr("no pages"));
  EXPECT_THAT(reason("help/ru/foreign"), HasSubstr("languages"));
}

TEST_F(HelpFoldersTest, TakesHelpInAnApplicationsOwnFolder) {
  page("office/help/en-US/text/writer/main.html");
  page("office/help/de/text/writer/main.html");
  page("office/help/media/picture.svg");
  EXPECT_EQ(applications(), (Lines{"office en-US office/help/en-US"}));
  EXPECT_EQ(applications({"de"}), (Lines{"office de office/help/de"}));
}

TEST_F(HelpFoldersTest, ManualIsAFolderWithAnIndexPage) {
  page("doc/tool/html/index.html");
  page("doc/other/manual/index.html");
  page("doc/flat/index.html");
  page("doc/none/html/chapter.html");
  EXPECT_EQ(manuals(), (Lines{"doc.flat - doc/flat", "doc.other - doc/other/manual",
                              "doc.tool - doc/tool/html"}));
}

TEST_F(HelpFoldersTest, FolderWithSeveralNamesIsTakenOnce) {
  page("doc/python3.11/html/index.html");
  link("../python3.11/html", "doc/python3.11-doc/html");
  link("../python3.11-doc/html", "doc/python3/html");
  link("tool", "doc/alias");
  page("doc/tool/html/index.html");
  EXPECT_EQ(manuals(), (Lines{"doc.tool - doc/tool/html", "doc.python3.11 - doc/python3.11/html"}));
  EXPECT_THAT(reason("doc/python3.11-doc/html"), HasSubstr("another name"));
}

TEST_F(HelpFoldersTest, PackageWithASharedFolderStillGetsItsOwn) {
  page("doc/lang3.11/html/index.html");
  link("../lang3.11/html", "doc/lang/html");
  page("doc/lang/index.html");
  EXPECT_EQ(manuals(), (Lines{"doc.lang3.11 - doc/lang3.11/html", "doc.lang - doc/lang"}));
}

TEST_F(HelpFoldersTest, LinksOutOfTheDocumentationAreNotFollowed) {
  tests::TemporaryFolder elsewhere;
  elsewhere.write("index.html", "<p>page</p>");
  link(elsewhere.path(), "doc/tool/html");
  link("nowhere", "doc/other/html");
  EXPECT_THAT(manuals(), IsEmpty());
  EXPECT_THAT(reason("doc/tool/html"), HasSubstr("link"));
}

TEST_F(HelpFoldersTest, WhatDrownsOtherHelpIsPassedOver) {
  page("doc/libthing-dev/html/index.html");
  page("doc/libjs-thing/index.html");
  page("doc/generated/html/index.html");
  page("doc/generated/html/doxygen.css");
  EXPECT_THAT(manuals(), IsEmpty());
  EXPECT_THAT(reason("doc/libthing-dev/html"), HasSubstr("developers"));
  EXPECT_THAT(reason("doc/libjs-thing"), HasSubstr("developers"));
  EXPECT_THAT(reason("doc/generated/html"), HasSubstr("generator"));
}

class FolderFingerprintTest : public testing::Test {
 protected:
  std::string fingerprint() const { return zebd::folderFingerprint(folder.path()); }

  tests::TemporaryFolder folder;
};

TEST_F(FolderFingerprintTest, StaysTheSameWhileNothingChanges) {
  folder.write("a.html", "a");
  folder.write("deep/b.html", "b");
  EXPECT_EQ(fingerprint(), fingerprint());
}

TEST_F(FolderFingerprintTest, ChangesWhenAFileComesGoesOrIsRenamed) {
  folder.write("a.html", "a");
  const std::string before = fingerprint();
  const std::string added = folder.write("deep/b.html", "b");
  const std::string after = fingerprint();
  EXPECT_NE(after, before);
  std::filesystem::rename(added, folder.path("deep/c.html"));
  EXPECT_NE(fingerprint(), after);
  std::filesystem::remove(folder.path("deep/c.html"));
  EXPECT_EQ(fingerprint(), before);
}

TEST_F(FolderFingerprintTest, ChangesWhenAFileIsWrittenEvenWithAnOlderDate) {
  const std::string path = folder.write("a.html", "a");
  const std::string before = fingerprint();
  std::filesystem::last_write_time(
      path, std::filesystem::last_write_time(path) - std::chrono::hours(24 * 365));
  EXPECT_NE(fingerprint(), before);
}

TEST_F(FolderFingerprintTest, IndexInTheFolderMakesNoDifference) {
  folder.write("a.html", "a");
  const std::string before = fingerprint();
  folder.write("book.helpindex", "index");
  EXPECT_EQ(fingerprint(), before);
}

TEST_F(FolderFingerprintTest, LinkToItsOwnFolderIsNoTrap) {
  folder.write("a.html", "a");
  std::filesystem::create_symlink(".", folder.path("loop"));
  std::filesystem::create_symlink("..", folder.path("up"));
  EXPECT_EQ(fingerprint(), fingerprint());
}

TEST_F(FolderFingerprintTest, MissingFolderLooksLikeAnEmptyOne) {
  EXPECT_EQ(zebd::folderFingerprint(folder.path("none")), fingerprint());
}

TEST_F(HelpFoldersTest, FolderThatMayNotBeListedHidesNoPageBesideIt) {
  namespace fs = std::filesystem;
  root.write("help/image.png", "no page");
  EXPECT_FALSE(zebd::holdsPages(root.path("help")));
  root.write("help/page.html", "<title>Page</title>");
  // Folders are listed in no order; one of these may come before the page.
  const std::vector<std::string> closed = {root.path("help/a"), root.path("help/m"),
                                           root.path("help/z")};
  for (const std::string& folder : closed) {
    fs::create_directory(folder);
    fs::permissions(folder, fs::perms::none);
  }
  // Nothing is closed to root.
  const bool isRoot = ::geteuid() == 0;
  fs::permissions(root.path(), fs::perms::all);
  ASSERT_EQ(isRoot ? ::seteuid(65534) : 0, 0);
  const bool holds = zebd::holdsPages(root.path("help"));
  ASSERT_EQ(isRoot ? ::seteuid(0) : 0, 0);
  for (const std::string& folder : closed) {
    fs::permissions(folder, fs::perms::owner_all);
  }
  EXPECT_TRUE(holds);
}

}  // namespace
