// A command that goes on while books, daemon and bus come and go.
#include <gmock/gmock.h>

#include "tests/zebd/DaemonWorld.h"

namespace {

using testing::AllOf;
using testing::HasSubstr;
using testing::StartsWith;
using tests::contents;

namespace fs = std::filesystem;

class DaemonWatchTest : public testing::Test, protected tests::DaemonWorld {};

TEST_F(DaemonWatchTest, PrintsPagesAsTheyAreFoundAndAsBooksComeAndGo) {
  for (const bool hasBus : {true, false}) {
    EXPECT_THAT(zeb({"watch", "--once", "spring"}, hasBus),
                AllOf(StartsWith("0\n"), HasSubstr("+ Roses  Roses  file://")))
        << hasBus;
  }
  EXPECT_THAT(zeb({"watch", "--once", "nowhere"}), "1\n");
  EXPECT_THAT(zeb({"watch", "--once", "--json", "spring"}),
              HasSubstr("{\"change\":\"found\",\"title\":\"Roses\",\"book\":\"garden\""));
  const tests::Variable address("DBUS_SESSION_BUS_ADDRESS", bus.address());
  const std::string output = folder.path("watched");
  tests::ChildProcess watcher(ZEB_PROGRAM, {"watch", "spring"}, output);
  const auto says = [&](const std::string& text) {
    return contents(output).find(text) != std::string::npos;
  };
  EXPECT_TRUE(waitFor([&] { return says("+ Roses"); }));
  page("orchard", "Pears", "Pear trees flower in spring.");
  fs::remove_all(folder.path("share/help/en/garden"));
  EXPECT_TRUE(waitFor([&] { return says("+ Pears") && says("- Roses"); })) << contents(output);
  EXPECT_TRUE(watcher.isRunning());
}

TEST_F(DaemonWatchTest, OutlivesTheDaemon) {
  EXPECT_THAT(zeb({"scan"}), StartsWith("0\n"));
  const tests::Variable address("DBUS_SESSION_BUS_ADDRESS", bus.address());
  const std::string output = folder.path("watched");
  tests::ChildProcess watcher(ZEB_PROGRAM, {"watch", "spring"}, output);
  const auto says = [&](const std::string& text) {
    return contents(output).find(text) != std::string::npos;
  };
  EXPECT_TRUE(waitFor([&] { return says("+ Roses"); }));
  ASSERT_EQ(::kill(daemonProcess(), SIGKILL), 0);
  page("orchard", "Pears", "Pear trees flower in spring.");
  EXPECT_TRUE(waitFor([&] { return says("+ Pears"); })) << contents(output);
}

TEST_F(DaemonWatchTest, ProgramEndsInOrderWhenTheBusGoes) {
  EXPECT_THAT(zeb({"scan"}), StartsWith("0\n"));
  const pid_t daemon = daemonProcess();
  const tests::Variable address("DBUS_SESSION_BUS_ADDRESS", bus.address());
  const std::string output = folder.path("watched");
  tests::ChildProcess watcher(ZEB_PROGRAM, {"watch", "spring"}, output);
  EXPECT_TRUE(waitFor([&] { return contents(output).find("+ Roses") != std::string::npos; }));
  bus.stop();
  EXPECT_EQ(watcher.wait(), 3);
  EXPECT_THAT(contents(output), HasSubstr("the search broke off"));
  EXPECT_TRUE(waitFor([&] { return ::kill(daemon, 0) != 0; }));
}

}  // namespace
