#include "zebd/PluginLoader.h"

#include <gmock/gmock.h>

#include <filesystem>
#include <string>

#include "host/Zebrine/ZEBPlugin.h"
#include "platform/Bundle.h"
#include "tests/platform/TemporaryFolder.h"
#include "tests/platform/TestEnvironment.h"
#include "zebd/Owner.h"

namespace {

using testing::HasSubstr;

class PluginLoaderTest : public testing::Test {
 protected:
  std::string writeBundle(const std::string& principalClass, const std::string& executable) const {
    folder.write("Sample.bundle/Info.plist",
                 "<plist><dict><key>BundleIdentifier</key><string>org.example.sample</string>"
                 "<key>BundlePrincipalClass</key><string>" +
                     principalClass +
                     "</string><key>BundleExecutable</key>"
                     "<string>" +
                     executable + "</string></dict></plist>");
    return folder.path("Sample.bundle");
  }
  /// Why a bundle is refused; empty for one that is not.
  std::string refusal(const std::string& path) const {
    platform::Error error;
    return zebd::loadPlugin(path, owner, error) == nullptr ? error.description : "";
  }

  tests::TestEnvironment environment;
  tests::TemporaryFolder folder;
  std::shared_ptr<zebd::Owner> owner = std::make_shared<zebd::Owner>(
      std::make_shared<zebd::Bookshelf>(), zebd::OwnerSettings{false, true, std::nullopt});
};

TEST_F(PluginLoaderTest, MakesAnInstanceForTheOwner) {
  platform::Error error;
  const auto plugin = zebd::loadPlugin(ZEB_PLUGIN_BUNDLE, owner, error);
  ASSERT_NE(plugin, nullptr) << error.description;
  EXPECT_EQ(plugin->owner(), owner);
  EXPECT_EQ(plugin->pluginID(), "org.zeb.HelpPlugin");
}

TEST_F(PluginLoaderTest, EachInstanceIsAnother) {
  platform::Error error;
  EXPECT_NE(zebd::loadPlugin(ZEB_PLUGIN_BUNDLE, owner, error),
            zebd::loadPlugin(ZEB_PLUGIN_BUNDLE, owner, error));
}

TEST_F(PluginLoaderTest, RelativePathIsRefused) {
  EXPECT_EQ(refusal("plugin/HelpPlugin.bundle"),
            "the plug-in plugin/HelpPlugin.bundle cannot be used: its path is not absolute");
  EXPECT_EQ(refusal(""), "the plug-in cannot be used: its path is not absolute");
}

TEST_F(PluginLoaderTest, FolderWithoutInformationListIsRefused) {
  EXPECT_THAT(refusal(folder.path()), HasSubstr("there is no readable information list"));
  EXPECT_THAT(refusal(folder.path("none")), HasSubstr("there is no readable information list"));
}

TEST_F(PluginLoaderTest, CodeOutsideTheBundleIsNoCode) {
  EXPECT_THAT(refusal(writeBundle("HelpPluginController", "../other.so")),
              HasSubstr("names no code"));
}

TEST_F(PluginLoaderTest, MissingAndBrokenCodeIsRefusedWithTheReason) {
  const std::string bundle = writeBundle("HelpPluginController", "code.so");
  EXPECT_THAT(refusal(bundle), HasSubstr("code.so: cannot open shared object file"));
  folder.write("Sample.bundle/code.so", "no code");
  EXPECT_THAT(refusal(bundle), HasSubstr("code.so: "));
}

TEST_F(PluginLoaderTest, CodeWithoutTheEntryIsRefused) {
  const std::string bundle = writeBundle("HelpPluginController", "code.so");
  // Any shared object that is not a plug-in will do.
  std::filesystem::copy_file(ZEB_OTHER_CODE, folder.path("Sample.bundle/code.so"));
  EXPECT_THAT(refusal(bundle), HasSubstr("ZEBPluginMakeInstance"));
}

TEST_F(PluginLoaderTest, UnknownPrincipalClassIsRefused) {
  const std::string bundle = writeBundle("Stranger", "code.so");
  const auto original = platform::Bundle::bundleWithPath(ZEB_PLUGIN_BUNDLE);
  std::filesystem::copy_file(original->executablePath().value(),
                             folder.path("Sample.bundle/code.so"));
  EXPECT_THAT(refusal(bundle), HasSubstr("it has no class \"Stranger\""));
}

}  // namespace
