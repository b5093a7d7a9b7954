#include "zebd/SystemLoad.h"

#include <gmock/gmock.h>

#include <string>

#include "tests/platform/TemporaryFolder.h"

namespace {

class SystemLoadTest : public testing::Test {
 protected:
  void supply(const std::string& name, const std::string& file, const std::string& value) {
    root.write("sys/class/power_supply/" + name + "/" + file, value + "\n");
  }
  bool isLazy() const { return zebd::computerShouldBeLazy(4, root.path()); }

  tests::TemporaryFolder root;
};

TEST_F(SystemLoadTest, ComputerThatTellsNothingIsNotBusy) { EXPECT_FALSE(isLazy()); }

TEST_F(SystemLoadTest, HalfAsMuchWorkAgainAsProcessorsIsTooMuch) {
  root.write("proc/loadavg", "5.99 0.10 0.00 1/100 1\n");
  EXPECT_FALSE(isLazy());
  root.write("proc/loadavg", "6.00 0.10 0.00 1/100 1\n");
  EXPECT_TRUE(isLazy());
}

TEST_F(SystemLoadTest, ComputerOnItsBatteryIsSpared) {
  supply("BAT0", "type", "Battery");
  supply("BAT0", "status", "Discharging");
  EXPECT_TRUE(isLazy());
  supply("BAT0", "status", "Charging");
  EXPECT_FALSE(isLazy());
}

TEST_F(SystemLoadTest, BatteryBesideMainsPowerDoesNotCount) {
  supply("BAT0", "type", "Battery");
  supply("BAT0", "status", "Discharging");
  supply("AC", "type", "Mains");
  supply("AC", "online", "1");
  EXPECT_FALSE(isLazy());
  supply("AC", "online", "0");
  EXPECT_TRUE(isLazy());
}

TEST_F(SystemLoadTest, BatteryOfADeviceDoesNotCount) {
  supply("mouse", "type", "Battery");
  supply("mouse", "status", "Discharging");
  supply("mouse", "scope", "Device");
  EXPECT_FALSE(isLazy());
}

}  // namespace
