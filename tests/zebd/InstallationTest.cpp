#include "zebd/Installation.h"

#include <gmock/gmock.h>

#include <filesystem>

#include "tests/platform/TemporaryFolder.h"

namespace {

using zebd::Installation;

TEST(InstallationTest, ProgramOfABuildFolderUsesItsOwnParts) {
  const tests::TemporaryFolder folder;
  folder.write("plugin/HelpPlugin.bundle/Info.plist", "");
  folder.write("bvmake/bvmake", "");
  const Installation installation = Installation::ofProgramAtPath(folder.path("zeb/zeb"));
  EXPECT_EQ(installation.pluginBundlePath, folder.path("plugin/HelpPlugin.bundle"));
  EXPECT_EQ(installation.indexingToolPath, folder.path("bvmake/bvmake"));
}

/// An installation below a folder, as the build lays it out.
class InstalledProgramTest : public testing::Test {
 protected:
  static std::string under(const std::string& start, const std::string& way) {
    return (std::filesystem::path(start) / way).lexically_normal().string();
  }

  const tests::TemporaryFolder folder;
  const std::string programs = folder.path("usr/bin");
  const std::string code = under(programs, ZEB_CODE_FROM_PROGRAMS);
  const std::string daemons = under(programs, ZEB_DAEMON_FROM_PROGRAMS);
};

TEST_F(InstalledProgramTest, ProgramsAndDaemonUseThePartsOfTheirInstallation) {
  std::filesystem::create_directories(code + "/HelpPlugin.bundle");
  folder.write("usr/bin/bvmake", "");
  for (const std::string& program : {programs + "/zeb", daemons + "/zebd"}) {
    const Installation installation = Installation::ofProgramAtPath(program);
    EXPECT_EQ(installation.pluginBundlePath, code + "/HelpPlugin.bundle") << program;
    EXPECT_EQ(installation.indexingToolPath, programs + "/bvmake") << program;
  }
}

TEST_F(InstalledProgramTest, WithoutAToolBesideItTheUsualOneIsUsed) {
  std::filesystem::create_directories(code + "/HelpPlugin.bundle");
  EXPECT_EQ(Installation::ofProgramAtPath(programs + "/zeb").indexingToolPath, "");
}

TEST_F(InstalledProgramTest, HalfABuildFolderIsNone) {
  folder.write("plugin/HelpPlugin.bundle/Info.plist", "");
  const Installation installation = Installation::ofProgramAtPath(programs + "/zeb");
  EXPECT_EQ(installation.pluginBundlePath, code + "/HelpPlugin.bundle")
      << "where it should be, for whoever is told that it is not there";
  EXPECT_EQ(installation.indexingToolPath, "");
}

}  // namespace
