#include "host/Luxwell/HelpLUXModel.h"

#include <gtest/gtest.h>

#include <cmath>
#include <limits>

#include "LUXPlugin/HelpLUXModel+ZEBAdditions.h"

using platform::Value;

namespace {

using Dictionary = Value::Dictionary;

Value list() {
  return Dictionary{
      {"DefaultGroup", "Applications"},
      {"Groups",
       Dictionary{{"System", Dictionary{{"Weight", 1.5},
                                        {"Books", Dictionary{{"manual", Dictionary{{"Weight", 2}}},
                                                             {"plain", Dictionary{}}}}}},
                  {"Tools", Dictionary{{"Books", Dictionary{{"tool", Dictionary{}}}}}}}}};
}

class HelpLUXModelTest : public testing::Test {
 protected:
  ~HelpLUXModelTest() override { HelpLUXModel::setGroupList({}); }
};

}  // namespace

TEST_F(HelpLUXModelTest, ABookBelongsToTheGroupThatNamesIt) {
  HelpLUXModel::setGroupList(list());
  EXPECT_EQ(HelpLUXModel::modelGroupNameForHelpbookID("manual"), "System");
  EXPECT_EQ(HelpLUXModel::modelGroupNameForHelpbookID("tool"), "Tools");
}

TEST_F(HelpLUXModelTest, ABookThatNoGroupNamesBelongsToTheDefaultGroup) {
  EXPECT_EQ(HelpLUXModel::modelGroupNameForHelpbookID("manual"), "Default");
  HelpLUXModel::setGroupList(list());
  EXPECT_EQ(HelpLUXModel::modelGroupNameForHelpbookID("nobody"), "Applications");
  EXPECT_EQ(HelpLUXModel::modelGroupNameForHelpbookID(""), "Applications");
}

TEST_F(HelpLUXModelTest, WeightsAreThoseOfTheListAndZeroWhereNoneIsGiven) {
  HelpLUXModel::setGroupList(list());
  EXPECT_EQ(HelpLUXModel::combiningWeightForModelGroupName("System"), 1.5F);
  EXPECT_EQ(HelpLUXModel::combiningWeightForModelGroupName("Tools"), 0.0F);
  EXPECT_EQ(HelpLUXModel::combiningWeightForModelGroupName("nobody"), 0.0F);
  EXPECT_EQ(HelpLUXModel::combiningWeightForHelpbookID("manual"), 2.0F);
  EXPECT_EQ(HelpLUXModel::combiningWeightForHelpbookID("plain"), 0.0F);
  EXPECT_EQ(HelpLUXModel::combiningWeightForHelpbookID("nobody"), 0.0F);
}

TEST_F(HelpLUXModelTest, VersionsOfIdentifiersCountOnlyForTheModel) {
  HelpLUXModel::setGroupList(list());
  EXPECT_EQ(HelpLUXModel::modelGroupNameForHelpbookID("manual*2.1"), "Applications");
  EXPECT_EQ(HelpLUXModel::combiningWeightForHelpbookID("manual*2.1"), 0.0F);
  EXPECT_EQ(zeb_modelGroupNameForHelpbookID("manual*2.1"), "System");
  EXPECT_EQ(zeb_combiningWeightForHelpbookID("manual*2.1"), 2.0F);
}

TEST_F(HelpLUXModelTest, AListThatIsNoListHoldsNoGroups) {
  for (const Value& broken :
       {Value(7), Value("list"), Value(Dictionary{{"Groups", Value::Array{}}}),
        Value(Dictionary{{"Groups", Dictionary{{"System", "x"}}}, {"DefaultGroup", 3}})}) {
    HelpLUXModel::setGroupList(broken);
    EXPECT_EQ(HelpLUXModel::modelGroupNameForHelpbookID("manual"), "Default");
    EXPECT_EQ(HelpLUXModel::combiningWeightForModelGroupName("System"), 0.0F);
    EXPECT_EQ(HelpLUXModel::combiningWeightForHelpbookID("manual"), 0.0F);
  }
}

TEST_F(HelpLUXModelTest, AWeightThatIsNoPositiveNumberIsNone) {
  for (const Value& weight :
       {Value(-1), Value(std::nan("")), Value(std::numeric_limits<double>::infinity()),
        Value(1e300), Value("2"), Value(0)}) {
    HelpLUXModel::setGroupList(
        Dictionary{{"Groups", Dictionary{{"System", Dictionary{{"Weight", weight}}}}}});
    EXPECT_EQ(HelpLUXModel::combiningWeightForModelGroupName("System"), 0.0F);
  }
}
