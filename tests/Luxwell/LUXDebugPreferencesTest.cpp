#include "host/Luxwell/LUXDebugPreferences.h"

#include <gtest/gtest.h>

#include <limits>
#include <utility>

#include "platform/Environment.h"
#include "platform/UserDefaults.h"

using platform::Environment;
using platform::EnvironmentOverride;
using platform::Value;

namespace {

Environment withUserDefaults(Value::Dictionary settings) {
  Environment environment = Environment::system();
  environment.userDefaults = platform::userDefaultsFromDictionary(std::move(settings));
  return environment;
}

float threshold() {
  return LUXDebugPreferences::defaultDebugPreferences()->floatForKey("ResultCutoffThreshold");
}

}  // namespace

TEST(LUXDebugPreferences, TheCutoffThresholdHasADefault) {
  const EnvironmentOverride none(withUserDefaults({}));
  EXPECT_FLOAT_EQ(threshold(), 0.20F);
}

TEST(LUXDebugPreferences, AnythingElseIsZero) {
  const EnvironmentOverride none(withUserDefaults({}));
  EXPECT_EQ(LUXDebugPreferences::defaultDebugPreferences()->floatForKey("Nothing"), 0);
  EXPECT_EQ(LUXDebugPreferences::defaultDebugPreferences()->floatForKey(""), 0);
}

TEST(LUXDebugPreferences, AUserDefaultGoesBeforeTheBuiltInValue) {
  {
    const EnvironmentOverride number(withUserDefaults({{"ResultCutoffThreshold", 0.35}}));
    EXPECT_FLOAT_EQ(threshold(), 0.35F);
  }
  {
    const EnvironmentOverride text(withUserDefaults({{"ResultCutoffThreshold", "0.4"}}));
    EXPECT_FLOAT_EQ(threshold(), 0.4F);
  }
  {
    const EnvironmentOverride zero(withUserDefaults({{"ResultCutoffThreshold", 0}}));
    EXPECT_EQ(threshold(), 0);
  }
}

TEST(LUXDebugPreferences, AUserDefaultThatIsNoNumberDoesNotCount) {
  for (const Value& value :
       {Value("high"), Value("0.4x"), Value(""), Value("nan"), Value("1e300"), Value("inf"),
        Value(Value::Array{}), Value(std::numeric_limits<double>::quiet_NaN()), Value(1e300)}) {
    const EnvironmentOverride other(withUserDefaults({{"ResultCutoffThreshold", value}}));
    EXPECT_FLOAT_EQ(threshold(), 0.20F);
  }
}

TEST(LUXDebugPreferences, WhatIsSetGoesBeforeAllUntilItIsRemoved) {
  const EnvironmentOverride number(withUserDefaults({{"ResultCutoffThreshold", 0.35}}));
  const auto preferences = LUXDebugPreferences::defaultDebugPreferences();
  preferences->setFloat(0.5F, "ResultCutoffThreshold");
  EXPECT_EQ(threshold(), 0.5F);
  preferences->setFloat(0, "ResultCutoffThreshold");
  EXPECT_EQ(threshold(), 0);
  preferences->removeValueForKey("ResultCutoffThreshold");
  EXPECT_FLOAT_EQ(threshold(), 0.35F);
  preferences->removeValueForKey("ResultCutoffThreshold");
  EXPECT_FLOAT_EQ(threshold(), 0.35F);
}

TEST(LUXDebugPreferences, AnEnvironmentWithoutUserDefaultsHasTheBuiltInValue) {
  Environment environment = Environment::system();
  environment.userDefaults = nullptr;
  const EnvironmentOverride none(std::move(environment));
  EXPECT_FLOAT_EQ(threshold(), 0.20F);
}
