#include "zeb/DaemonState.h"

#include <gmock/gmock.h>
#include <sdbus-c++/sdbus-c++.h>

#include <cstdint>
#include <cstdlib>
#include <map>
#include <memory>
#include <string>

#include "tests/platform/TemporaryFolder.h"
#include "tests/platform/services/PrivateBus.h"

namespace {

using Kind = zeb::DaemonState::Kind;
using Status = std::map<std::string, sdbus::Variant>;

/// Stands in for a daemon: says of itself whatever a test wants.
class PretendedDaemon {
 public:
  PretendedDaemon(const std::string& address, const Status& status)
      : _connection(sdbus::createSessionBusConnectionWithAddress(address)),
        _object(sdbus::createObject(*_connection, "/org/zeb/Help")) {
    _object->registerMethod("Status").onInterface("org.zeb.Help1").implementedAs([status] {
      return status;
    });
    _object->finishRegistration();
    _connection->requestName("org.zeb.zebd");
    _connection->enterEventLoopAsync();
  }
  ~PretendedDaemon() { _connection->leaveEventLoop(); }
  PretendedDaemon(const PretendedDaemon&) = delete;
  PretendedDaemon& operator=(const PretendedDaemon&) = delete;

 private:
  const std::unique_ptr<sdbus::IConnection> _connection;
  const std::unique_ptr<sdbus::IObject> _object;
};

TEST(DaemonStateTest, WithoutABusThereIsNone) {
  ::setenv("DBUS_SESSION_BUS_ADDRESS", "unix:path=/nowhere/at/all", 1);
  const zeb::DaemonState state = zeb::stateOfDaemon();
  ::unsetenv("DBUS_SESSION_BUS_ADDRESS");
  EXPECT_EQ(state.kind, Kind::noBus);
  EXPECT_NE(state.reason, "");
}

TEST(DaemonStateTest, BusThatKnowsNoDaemonHasNone) {
  const tests::PrivateBus bus;
  EXPECT_EQ(zeb::stateOfDaemon(bus.address()).kind, Kind::notInstalled);
}

TEST(DaemonStateTest, DaemonThatRunsSaysItsVersionAndWhetherItIsAtWork) {
  const tests::PrivateBus bus;
  const PretendedDaemon daemon(
      bus.address(),
      {{"version", std::string("7.1")}, {"scanning", false}, {"guards", int64_t{2}}});
  const zeb::DaemonState state = zeb::stateOfDaemon(bus.address());
  EXPECT_EQ(state.kind, Kind::running);
  EXPECT_EQ(state.version, "7.1");
  EXPECT_TRUE(state.isBusy);
}

TEST(DaemonStateTest, DaemonThatSaysLessOrOtherThingsIsTakenAsItIs) {
  const tests::PrivateBus bus;
  const PretendedDaemon daemon(bus.address(), {{"version", 7}, {"guards", std::string("many")}});
  const zeb::DaemonState state = zeb::stateOfDaemon(bus.address());
  EXPECT_EQ(state.kind, Kind::running);
  EXPECT_EQ(state.version, "");
  EXPECT_FALSE(state.isBusy);
}

TEST(DaemonStateTest, DaemonThatTheBusCannotStartIsSilentAndTheReasonIsKept) {
  const tests::TemporaryFolder folder;
  folder.write("org.zeb.zebd.service", "[D-BUS Service]\nName=org.zeb.zebd\nExec=/nowhere/zebd\n");
  const tests::PrivateBus bus("<servicedir>" + folder.path() + "</servicedir>");
  const zeb::DaemonState state = zeb::stateOfDaemon(bus.address());
  EXPECT_EQ(state.kind, Kind::silent);
  EXPECT_NE(state.reason, "");
}

}  // namespace
