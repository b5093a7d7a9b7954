#include <gtest/gtest.h>

#include <filesystem>
#include <fstream>
#include <string>
#include <utility>

#include "LUXPlugin/HelpLUXModel+ZEBAdditions.h"
#include "platform/Environment.h"
#include "tests/platform/TemporaryFolder.h"

using platform::Value;

namespace {

// A group list that is in force as long as a test runs.
class ZEBAdditions : public testing::Test {
 protected:
  ZEBAdditions() {
    HelpLUXModel::setGroupList(Value::Dictionary{
        {"Groups",
         Value::Dictionary{
             {"System", Value::Dictionary{
                            {"Books", Value::Dictionary{
                                          {"org.zeb.manual", Value::Dictionary{{"Weight", 2.0}}},
                                          {"org.zeb.glossary",
                                           Value::Dictionary{{"SmoothingOnly", true}}}}}}}}}});
  }
  ~ZEBAdditions() override { HelpLUXModel::setGroupList(Value()); }
};

// What the identifiers of two versions of one book look like.
std::string versioned(const std::string& bookID) {
  std::string id = bookID + "*1.2";
  EXPECT_EQ(ZEBHelpBook::unversionedbookIDFromBookID(id), bookID);
  return id;
}

}  // namespace

TEST_F(ZEBAdditions, VersionsDoNotReachTheNameOfTheGroup) {
  EXPECT_EQ(zeb_modelGroupNameForHelpbookID("org.zeb.manual"), "System");
  EXPECT_EQ(zeb_modelGroupNameForHelpbookID(versioned("org.zeb.manual")), "System");
  EXPECT_EQ(HelpLUXModel::modelGroupNameForHelpbookID(versioned("org.zeb.manual")), "Default");
}

TEST_F(ZEBAdditions, VersionsDoNotReachTheWeight) {
  EXPECT_EQ(zeb_combiningWeightForHelpbookID(versioned("org.zeb.manual")), 2);
  EXPECT_EQ(zeb_combiningWeightForHelpbookID(versioned("org.zeb.other")), 0);
}

TEST_F(ZEBAdditions, VersionsDoNotReachTheProperties) {
  const auto isForSmoothing = [](const std::string& bookID, const char* group) {
    return zeb_helpbookPropertiesForHelpbookID(bookID, group)["SmoothingOnly"].boolValue();
  };
  EXPECT_TRUE(isForSmoothing("org.zeb.glossary", "System"));
  EXPECT_TRUE(isForSmoothing(versioned("org.zeb.glossary"), "System"));
  EXPECT_FALSE(isForSmoothing(versioned("org.zeb.manual"), "System"));
  EXPECT_FALSE(isForSmoothing(versioned("org.zeb.glossary"), "Default"));
}

TEST_F(ZEBAdditions, VersionsDoNotReachTheQuestionWhetherThereIsAModel) {
  const tests::TemporaryFolder folder;
  platform::Environment environment = platform::Environment::system();
  environment.cachesDirectory = folder.path();
  const platform::EnvironmentOverride override(std::move(environment));
  EXPECT_FALSE(zeb_modelExistsForHelpbookID(versioned("org.zeb.manual"), "English"));
  const auto model = HelpLUXModel::initWithDirectoryPath(
      HelpLUXModel::directoryPathForModelGroupName("System", "English"), "English");
  ASSERT_NE(model, nullptr);
  model->reset();
  ASSERT_TRUE(model->saveWithOptions(Value()));
  EXPECT_TRUE(zeb_modelExistsForHelpbookID("org.zeb.manual", "English"));
  EXPECT_TRUE(zeb_modelExistsForHelpbookID(versioned("org.zeb.manual"), "English"));
  EXPECT_FALSE(zeb_modelExistsForHelpbookID(versioned("org.zeb.other"), "English"));
  EXPECT_FALSE(zeb_modelExistsForHelpbookID(versioned("org.zeb.manual"), "German"));
}
