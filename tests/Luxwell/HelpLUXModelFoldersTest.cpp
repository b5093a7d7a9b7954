// What HelpLUXModel knows without opening a model: groups, and where models are.
#include <gtest/gtest.h>

#include <filesystem>
#include <set>

#include "host/Luxwell/HelpLUXModel.h"
#include "platform/Environment.h"
#include "platform/PropertyList.h"
#include "tests/Luxwell/LUXModelWorld.h"
#include "tests/platform/TemporaryFolder.h"

using platform::Value;

namespace {

using Dictionary = Value::Dictionary;

Value list() {
  return Dictionary{
      {"DefaultGroup", "Applications"},
      {"Groups",
       Dictionary{
           {"System",
            Dictionary{{"Weight", 1.5},
                       {"Books", Dictionary{{"manual", Dictionary{{"Weight", 2}}},
                                            {"words", Dictionary{{"SmoothingOnly", true}}}}}}}}}};
}

class HelpLUXModelFolders : public testing::Test {
 protected:
  HelpLUXModelFolders() : _override(_environment()) {}
  ~HelpLUXModelFolders() override { HelpLUXModel::setGroupList({}); }

  platform::Environment _environment() {
    platform::Environment environment = platform::Environment::system();
    environment.cachesDirectory = folder.path("caches");
    return environment;
  }

  void save(const std::string& group, const std::string& language) const {
    const auto model = HelpLUXModel::initWithDirectoryPath(
        HelpLUXModel::directoryPathForModelGroupName(group, language), language);
    model->reset();
    ASSERT_TRUE(model->saveWithOptions({}));
  }

  tests::TemporaryFolder folder;
  platform::EnvironmentOverride _override;
};

}  // namespace

TEST_F(HelpLUXModelFolders, GroupsAreThoseOfTheListAndTheDefaultGroup) {
  EXPECT_EQ(HelpLUXModel::allModelGroupNames(), std::vector<std::string>{"Default"});
  HelpLUXModel::setGroupList(list());
  EXPECT_EQ(HelpLUXModel::allModelGroupNames(),
            (std::vector<std::string>{"Applications", "System"}));
}

TEST_F(HelpLUXModelFolders, PropertiesOfABookAreThoseOfTheList) {
  HelpLUXModel::setGroupList(list());
  const Value words = HelpLUXModel::helpbookPropertiesForHelpbookID("words", "System");
  EXPECT_TRUE(words["SmoothingOnly"].boolValue());
  const Value manual = HelpLUXModel::helpbookPropertiesForHelpbookID("manual", "System");
  EXPECT_FALSE(manual["SmoothingOnly"].boolValue());
  EXPECT_EQ(manual["Weight"], Value(2.0));
  EXPECT_EQ(HelpLUXModel::helpbookPropertiesForHelpbookID("manual", "Applications"),
            Value(Dictionary{}));
}

TEST_F(HelpLUXModelFolders, BooksForSmoothingAreMembersWhenTheyAreWanted) {
  HelpLUXModel::setGroupList(list());
  EXPECT_EQ(HelpLUXModel::copyHelpbookIDsForModelGroupName("System", true),
            (std::set<std::string>{"manual", "words"}));
  EXPECT_EQ(HelpLUXModel::copyHelpbookIDsForModelGroupName("System", false),
            std::set<std::string>{"manual"});
  EXPECT_EQ(HelpLUXModel::copyHelpbookIDsForModelGroupName("Applications", true),
            std::set<std::string>{});
}

TEST_F(HelpLUXModelFolders, AListIsReadFromAFile) {
  const auto data = platform::dataFromPropertyList(list(), platform::PropertyListFormat::xml);
  EXPECT_TRUE(HelpLUXModel::setGroupListFromFile(folder.write("groups.plist", data.view())));
  EXPECT_EQ(HelpLUXModel::modelGroupNameForHelpbookID("manual"), "System");
  EXPECT_FALSE(HelpLUXModel::setGroupListFromFile(folder.path("missing.plist")));
  EXPECT_FALSE(HelpLUXModel::setGroupListFromFile(folder.write("broken.plist", "broken")));
  EXPECT_EQ(HelpLUXModel::modelGroupNameForHelpbookID("manual"), "System")
      << "the list in force stays";
}

TEST_F(HelpLUXModelFolders, EachGroupAndLanguageHasAFolderBelowTheCachesFolder) {
  EXPECT_EQ(HelpLUXModel::directoryPathForModelGroupName("System", "English"),
            folder.path("caches/org.zeb.zebd/Models/System/English"));
}

TEST_F(HelpLUXModelFolders, WhateverTheNamesAreTheFoldersAreBelowTheCachesFolderAndApart) {
  const std::string longName(5000, 'x');
  const std::vector<std::string> names = {"",
                                          ".",
                                          "..",
                                          "../../etc",
                                          "/",
                                          "a/b",
                                          "a%2Fb",
                                          "a",
                                          "A",
                                          "\n",
                                          std::string("a\0b", 3),
                                          "%",
                                          "Ä",
                                          ".a",
                                          "a ",
                                          "%2E%",
                                          "a.b",
                                          longName,
                                          longName + "y",
                                          "~",
                                          "-",
                                          "con",
                                          "a\\b"};
  std::set<std::string> folders;
  for (const std::string& name : names) {
    const std::string path = HelpLUXModel::directoryPathForModelGroupName(name, "English");
    EXPECT_TRUE(path.starts_with(folder.path("caches/org.zeb.zebd/Models/")));
    EXPECT_EQ(std::filesystem::path(path).lexically_normal(), path);
    EXPECT_EQ(std::filesystem::path(path).parent_path().parent_path(),
              folder.path("caches/org.zeb.zebd/Models"));
    EXPECT_EQ(path.find('\0'), std::string::npos);
    EXPECT_LE(std::filesystem::path(path).parent_path().filename().string().size(), 255U);
    folders.insert(path);
    const std::string byLanguage = HelpLUXModel::directoryPathForModelGroupName("Group", name);
    EXPECT_EQ(std::filesystem::path(byLanguage).parent_path(),
              folder.path("caches/org.zeb.zebd/Models/Group"));
  }
  EXPECT_EQ(folders.size(), names.size());
}

TEST_F(HelpLUXModelFolders, WithoutACachesFolderThereAreNoModels) {
  platform::Environment environment = platform::Environment::system();
  environment.cachesDirectory.reset();
  const platform::EnvironmentOverride nowhere(std::move(environment));
  EXPECT_EQ(HelpLUXModel::directoryPathForModelGroupName("Default", "English"), "");
  EXPECT_FALSE(HelpLUXModel::modelExistsForGroupName("Default", "English"));
  EXPECT_EQ(HelpLUXModel::initWithDirectoryPath("", "English"), nullptr);
}

TEST_F(HelpLUXModelFolders, AModelExistsOnceItWasSaved) {
  HelpLUXModel::setGroupList(list());
  EXPECT_FALSE(HelpLUXModel::modelExistsForGroupName("System", "English"));
  EXPECT_FALSE(HelpLUXModel::modelExistsForHelpbookID("manual", "English"));
  save("System", "English");
  EXPECT_TRUE(HelpLUXModel::modelExistsForGroupName("System", "English"));
  EXPECT_TRUE(HelpLUXModel::modelExistsForHelpbookID("manual", "English"));
  EXPECT_FALSE(HelpLUXModel::modelExistsForGroupName("System", "German"));
  EXPECT_FALSE(HelpLUXModel::modelExistsForHelpbookID("stranger", "English"))
      << "it belongs to the default group";
  save("Applications", "English");
  EXPECT_TRUE(HelpLUXModel::modelExistsForHelpbookID("stranger", "English"));
}

TEST_F(HelpLUXModelFolders, AFolderInThePlaceOfTheFileIsNoModel) {
  save("System", "English");
  const std::string path = HelpLUXModel::directoryPathForModelGroupName("System", "English");
  for (const auto& entry : std::filesystem::directory_iterator(path)) {
    std::filesystem::remove(entry.path());
    std::filesystem::create_directory(entry.path());
  }
  EXPECT_FALSE(HelpLUXModel::modelExistsForGroupName("System", "English"));
  EXPECT_TRUE(HelpLUXModel::initWithDirectoryPath(path, "English")->needsBuild());
}
