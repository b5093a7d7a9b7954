#include "zeb/Doctor.h"

#include <gmock/gmock.h>

#include <cerrno>
#include <chrono>
#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <memory>
#include <nlohmann/json.hpp>
#include <optional>
#include <string>
#include <vector>

#include "tests/platform/TemporaryFolder.h"
#include "tests/zeb/World.h"
#include "zeb/SystemExamination.h"

namespace {

namespace fs = std::filesystem;
using testing::AllOf;
using testing::ElementsAre;
using testing::EndsWith;
using testing::HasSubstr;
using testing::IsEmpty;
using tests::Outcome;
using zeb::DaemonState;
using zeb::ExitCode;
using zeb::Finding;
using JSON = nlohmann::json;

/// A computer with the help of one application, and a user who reads English.
class DoctorTest : public testing::Test {
 protected:
  DoctorTest() {
    ::setenv("XDG_CONFIG_HOME", world.files().path("config").c_str(), 1);
    platform::Environment environment = *platform::Environment::current();
    environment.dataDirectories = {world.files().path("share")};
    environment.preferredLanguages = {"en"};
    environment.files = files;
    computer = std::make_unique<platform::EnvironmentOverride>(environment);
    world.writePage("share/help/en/garden/index.html", "Roses", "Cut roses in spring.");
  }
  ~DoctorTest() override { ::unsetenv("XDG_CONFIG_HOME"); }

  void scan() const { ASSERT_EQ(world.zeb({"scan"}).code, ExitCode::success); }

  Outcome doctor(std::vector<std::string> arguments = {}) const {
    arguments.insert(arguments.begin(), "doctor");
    return world.zeb(std::move(arguments));
  }
  /// What is found, each as "<name> <book>", and that the status says so.
  std::vector<std::string> findings(std::vector<std::string> arguments = {}) const {
    arguments.emplace_back("--json");
    const Outcome run = doctor(std::move(arguments));
    const JSON object = JSON::parse(run.out);
    std::vector<std::string> found;
    for (const JSON& finding : object["findings"]) {
      found.push_back(finding["finding"].get<std::string>() +
                      (finding.contains("book") ? " " + finding["book"].get<std::string>() : ""));
    }
    EXPECT_EQ(object["count"], found.size());
    EXPECT_EQ(run.code, found.empty() ? ExitCode::success : ExitCode::nothingFound);
    EXPECT_EQ(run.err, "");
    return found;
  }

  std::string page() const { return world.files().path("share/help/en/garden/index.html"); }

  const std::shared_ptr<platform::FailingFileManager> files =
      std::make_shared<platform::FailingFileManager>();
  const tests::World world;
  std::unique_ptr<platform::EnvironmentOverride> computer;
};

TEST_F(DoctorTest, NothingIsWrongWithABookThatIsIndexed) {
  scan();
  const Outcome run = doctor();
  EXPECT_EQ(run.code, ExitCode::success) << run.out;
  EXPECT_EQ(run.out, "all is well; 1 book looked at; the help daemon was not asked\n");
  EXPECT_THAT(findings(), IsEmpty());
}

TEST_F(DoctorTest, EachThingIsTitledExplainedAndGivenAdvice) {
  const Outcome run = doctor();
  EXPECT_EQ(run.code, ExitCode::nothingFound);
  EXPECT_EQ(run.out, "garden, " + world.files().path("share/help/en/garden") +
                         ": it is installed, but not on the list of books\n"
                         "  'zeb scan' enters it\n"
                         "1 thing is wrong; 0 books looked at; the help daemon was not asked\n");
}

TEST_F(DoctorTest, ObjectForProgramsNamesWhatIsFound) {
  const JSON object = JSON::parse(doctor({"--json"}).out);
  EXPECT_EQ(object["count"], 1);
  EXPECT_EQ(object["books"], 0);
  EXPECT_EQ(object["daemon"]["state"], "unasked");
  const JSON finding = object["findings"][0];
  EXPECT_EQ(finding["finding"], "unlisted");
  EXPECT_EQ(finding["book"], "garden");
  EXPECT_EQ(finding["path"], world.files().path("share/help/en/garden"));
  EXPECT_NE(finding["text"], "");
  EXPECT_NE(finding["advice"], "");
}

TEST_F(DoctorTest, NothingIsChanged) {
  const auto everything = [this] {
    std::vector<std::string> paths;
    for (const auto& entry : fs::recursive_directory_iterator(world.files().path())) {
      paths.push_back(entry.path().string());
    }
    return paths;
  };
  const std::vector<std::string> before = everything();
  EXPECT_THAT(findings(), ElementsAre("unlisted garden"));
  EXPECT_EQ(everything(), before);
}

TEST_F(DoctorTest, MissingIndexIsFound) {
  scan();
  fs::remove(world.indexPath("garden", "en"));
  EXPECT_THAT(findings(), ElementsAre("no-index garden"));
}

TEST_F(DoctorTest, DamagedIndexIsFound) {
  scan();
  const std::string index = world.indexPath("garden", "en");
  fs::resize_file(index, fs::file_size(index) - 100);
  EXPECT_THAT(findings(), ElementsAre("damaged-index garden"));
  EXPECT_THAT(doctor().out, HasSubstr("its index is damaged: "));
}

TEST_F(DoctorTest, IndexThatCannotBeReadIsFound) {
  scan();
  files->fail(platform::FailingFileManager::Operation::read, EIO, "en.helpindex");
  EXPECT_THAT(findings(), ElementsAre("damaged-index garden"));
  EXPECT_THAT(doctor().out, HasSubstr("its index cannot be read: "));
}

TEST_F(DoctorTest, PagesThatChangedAfterTheirIndexWasMadeAreFound) {
  scan();
  world.writePage("share/help/en/garden/tulips.html", "Tulips", "Plant tulips in autumn.");
  EXPECT_THAT(findings(), ElementsAre("old-index garden"));
}

TEST_F(DoctorTest, PagesOfAFolderThatIsInNoneOfTheUsualPlacesAreLookedAtAsWell) {
  const std::string folder = world.files().path("mine");
  world.writePage("mine/index.html", "Mine", "My page.");
  ASSERT_EQ(world.zeb({"scan", folder}).code, ExitCode::success);
  EXPECT_THAT(findings({"mine"}), IsEmpty());
  world.writePage("mine/other.html", "Other", "Another page.");
  EXPECT_THAT(findings({"mine"}), ElementsAre("old-index mine"));
}

TEST_F(DoctorTest, FolderThatIsGoneIsFound) {
  scan();
  fs::remove_all(world.files().path("share/help/en/garden"));
  EXPECT_THAT(findings(), ElementsAre("gone garden"));
}

TEST_F(DoctorTest, BookWhosePagesAreGoneIsFoundOnce) {
  scan();
  fs::remove(page());
  EXPECT_THAT(findings(), ElementsAre("no-pages garden"));
}

TEST_F(DoctorTest, InstalledFolderWithoutPagesIsFound) {
  scan();
  world.files().write("share/help/en/kitchen/picture.png", "");
  EXPECT_THAT(findings(), ElementsAre("no-pages"));
}

TEST_F(DoctorTest, PageThatCannotBeReadIsFound) {
  scan();
  files->fail(platform::FailingFileManager::Operation::read, EACCES, "garden/index.html");
  EXPECT_THAT(findings(), ElementsAre("unreadable garden"));
  EXPECT_THAT(doctor().out, AllOf(HasSubstr(page()), HasSubstr("ermission denied")));
}

TEST_F(DoctorTest, FolderThatCannotBeListedIsFound) {
  scan();
  files->fail(platform::FailingFileManager::Operation::list, EACCES, "help/en/garden");
  EXPECT_THAT(findings(), ElementsAre("unreadable garden"));
}

TEST_F(DoctorTest, PlaceOfBooksThatCannotBeListedIsFound) {
  files->fail(platform::FailingFileManager::Operation::list, EACCES, "share/help");
  EXPECT_THAT(findings(), ElementsAre("unreadable"));
}

TEST_F(DoctorTest, BookThatIsOnlyInOtherLanguagesIsFound) {
  scan();
  world.writePage("share/help/de/kueche/index.html", "Kochen", "Wasser kochen.");
  EXPECT_THAT(findings(), ElementsAre("language"));
  EXPECT_THAT(doctor().out, HasSubstr("it is in none of the user's languages"));
}

TEST_F(DoctorTest, ListedBookThatTheUserCannotReadIsFound) {
  world.writePage("share/help/de/kueche/index.html", "Kochen", "Wasser kochen.");
  ASSERT_EQ(world.zeb({"scan", "--language", "de"}).code, ExitCode::success);
  EXPECT_THAT(findings(), ElementsAre("language kueche"));
  EXPECT_THAT(doctor().out, HasSubstr("which is none of yours"));
}

TEST_F(DoctorTest, ListedBookOfWhichThereIsABetterTranslationIsFound) {
  world.writePage("share/help/de/garden/index.html", "Rosen", "Rosen schneiden.");
  ASSERT_EQ(world.zeb({"scan", "--language", "de"}).code, ExitCode::success);
  EXPECT_THAT(findings(), ElementsAre("language garden"));
  EXPECT_THAT(doctor().out, HasSubstr("\"en\" suits you better"));
}

TEST_F(DoctorTest, InformationListThatDescribesNoBookIsFound) {
  scan();
  world.files().write("share/zeb/books/odd/Info.plist", "nonsense");
  EXPECT_THAT(findings(), ElementsAre("not-a-book"));
}

TEST_F(DoctorTest, ListedBookWhoseInformationListWasDamagedIsFound) {
  fs::copy(tests::shippedBook("offline"), world.files().path("offline"));
  ASSERT_EQ(world.zeb({"scan", world.files().path("offline")}).code, ExitCode::success);
  EXPECT_THAT(findings(), IsEmpty());
  world.files().write("offline/Info.plist", "nonsense");
  EXPECT_THAT(findings(), ElementsAre("not-a-book org.zeb.offline"));
}

TEST_F(DoctorTest, DamagedFileOfTheListIsFound) {
  scan();
  world.files().write("cache/books/broken.plist", "nonsense");
  EXPECT_THAT(findings(), ElementsAre("damaged-entry"));
}

TEST_F(DoctorTest, DamagedSettingsAreFound) {
  scan();
  world.files().write("config/zeb/settings.plist", "<plist><array/></plist>");
  EXPECT_THAT(findings(), ElementsAre("damaged-settings"));
  world.files().write("config/zeb/settings.plist", "<plist version=\"1.0\"><dict/></plist>");
  EXPECT_THAT(findings(), IsEmpty());
}

TEST_F(DoctorTest, CachesFolderThatIsAFileIsFoundOnce) {
  world.files().write("cache", "");
  EXPECT_THAT(findings(), ElementsAre("cache", "unlisted garden"));
}

TEST_F(DoctorTest, RemoteBookThatWasNotFetchedIsFoundWithoutAskingTheServer) {
  scan();
  // Nobody listens on this port.
  const std::string url = "http://127.0.0.1:1/catalogue.json";
  zebd::CatalogueEntry entry;
  entry.bookID = "far";
  entry.title = "Far";
  entry.type = 4;
  entry.folder = world.files().path("far");
  entry.accessPagePath = entry.folder + "/index.html";
  entry.catalogueURL = url;
  ASSERT_FALSE(zebd::Catalogue(world.booksFolder()).store(entry).has_value());
  EXPECT_THAT(findings(), ElementsAre("server far"));
  EXPECT_THAT(findings({"--network"}), ElementsAre("server far", "server"));
  EXPECT_THAT(doctor({"--network"}).out, HasSubstr("\n" + url + ": "));
}

TEST_F(DoctorTest, OnlyTheBooksThatAreNamedAreLookedAt) {
  scan();
  world.writePage("share/help/en/kitchen/index.html", "Boiling", "Boil water.");
  fs::remove(world.indexPath("garden", "en"));
  EXPECT_THAT(findings({"kitchen"}), ElementsAre("unlisted kitchen"));
  EXPECT_THAT(findings({"garden"}), ElementsAre("no-index garden"));
}

TEST_F(DoctorTest, BookThatWasPassedOverIsExplained) {
  world.writePage("share/doc/libtool-dev/html/index.html", "Tool", "For developers.");
  EXPECT_THAT(findings({"doc.libtool-dev"}), ElementsAre("passed-over doc.libtool-dev"));
  EXPECT_THAT(doctor({"libtool-dev"}).out, HasSubstr("the package is for developers"));
}

TEST_F(DoctorTest, BookThatNobodyKnowsIsSaidToBeUnknown) {
  EXPECT_THAT(findings({"nowhere"}), ElementsAre("unknown nowhere"));
}

class SystemExaminationTest : public testing::Test {
 protected:
  std::vector<std::string> findings(const zebd::Installation& installation) const {
    std::vector<std::string> found;
    for (const Finding& finding :
         zeb::examineSystem(zebd::Catalogue(world.booksFolder()), installation, std::nullopt)) {
      found.push_back(finding.name + ": " + finding.text);
    }
    return found;
  }
  zebd::Installation withTool(const std::string& path) const {
    zebd::Installation installation = tests::installation();
    installation.indexingToolPath = path;
    return installation;
  }
  std::string script(const std::string& text, fs::perms rights) const {
    const std::string path = world.files().write("tool", text);
    fs::permissions(path, rights);
    return path;
  }

  const tests::World world;
};

TEST_F(SystemExaminationTest, NothingIsWrongWithTheSystemOfThisBuild) {
  EXPECT_THAT(findings(tests::installation()), IsEmpty());
}

TEST_F(SystemExaminationTest, ToolThatIsNotThereIsFound) {
  EXPECT_THAT(findings(withTool(world.files().path("none"))),
              ElementsAre("tool: the indexing tool is not there"));
  fs::create_directories(world.files().path("folder"));
  EXPECT_THAT(findings(withTool(world.files().path("folder"))),
              ElementsAre("tool: the indexing tool is not there"));
}

TEST_F(SystemExaminationTest, ToolThatMayNotBeStartedIsFound) {
  const std::string tool = script("#!/bin/sh\nexit 0\n", fs::perms::owner_read);
  EXPECT_THAT(findings(withTool(tool)), ElementsAre("tool: the indexing tool may not be started"));
}

TEST_F(SystemExaminationTest, ToolThatDoesNotStartIsFoundAndSaysNothingItself) {
  const std::string tool = script("#!/bin/sh\necho noise; exit 7\n", fs::perms::owner_all);
  testing::internal::CaptureStdout();
  EXPECT_THAT(findings(withTool(tool)),
              ElementsAre("tool: the indexing tool cannot be started (status 7)"));
  EXPECT_EQ(testing::internal::GetCapturedStdout(), "");
}

TEST_F(SystemExaminationTest, PluginThatIsNotThereIsFound) {
  zebd::Installation installation = tests::installation();
  installation.pluginBundlePath = world.files().path("none.bundle");
  EXPECT_THAT(findings(installation), ElementsAre("plug-in: the plug-in is not there"));
}

TEST_F(SystemExaminationTest, PluginWithoutItsCodeIsFound) {
  zebd::Installation installation = tests::installation();
  world.files().write("HelpPlugin.bundle/Info.plist",
                      "<plist version=\"1.0\"><dict><key>BundleExecutable</key>"
                      "<string>HelpPlugin.so</string></dict></plist>");
  installation.pluginBundlePath = world.files().path("HelpPlugin.bundle");
  EXPECT_THAT(findings(installation), ElementsAre("plug-in: the plug-in has no code"));
}

std::vector<std::string> namesOf(const DaemonState& state) {
  std::vector<std::string> names;
  for (const Finding& finding : zeb::findingsOfDaemon(state, "1.2")) {
    names.push_back(finding.name + ": " + finding.text);
  }
  return names;
}

TEST(FindingsOfDaemonTest, DaemonOfTheSameVersionAndNoneAreNothingWrong) {
  EXPECT_THAT(namesOf({DaemonState::Kind::running, "1.2", true, ""}), IsEmpty());
  EXPECT_THAT(namesOf({DaemonState::Kind::unasked, "", false, ""}), IsEmpty());
  EXPECT_THAT(namesOf({DaemonState::Kind::noBus, "", false, "none"}), IsEmpty());
  EXPECT_THAT(namesOf({DaemonState::Kind::notInstalled, "", false, ""}), IsEmpty());
}

TEST(FindingsOfDaemonTest, DaemonOfAnotherVersionIsFound) {
  EXPECT_THAT(namesOf({DaemonState::Kind::running, "1.1", false, ""}),
              ElementsAre("other-version: the help daemon that runs is of version 1.1, this is "
                          "1.2"));
  EXPECT_THAT(namesOf({DaemonState::Kind::running, "", false, ""}),
              ElementsAre(HasSubstr("is of version unknown")));
}

TEST(FindingsOfDaemonTest, DaemonThatDoesNotAnswerIsFound) {
  EXPECT_THAT(namesOf({DaemonState::Kind::silent, "", false, "it has crashed"}),
              ElementsAre("daemon: the help daemon does not answer: it has crashed"));
}

}  // namespace
