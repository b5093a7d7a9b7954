#include "zebd/Installation.h"

#include <gmock/gmock.h>

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

TEST(InstallationTest, InstalledProgramUsesTheInstalledParts) {
  const tests::TemporaryFolder folder;
  // Half a build folder is none.
  folder.write("plugin/HelpPlugin.bundle/Info.plist", "");
  const Installation installation = Installation::ofProgramAtPath(folder.path("bin/zeb"));
  EXPECT_EQ(installation.pluginBundlePath, folder.path("lib/zeb/HelpPlugin.bundle"));
  EXPECT_EQ(installation.indexingToolPath, "");
}

}  // namespace
