#include <gmock/gmock.h>

#include <optional>
#include <random>
#include <sstream>

#include "tests/zebd/DaemonWorld.h"
#include "zebd/Daemon.h"

namespace {

using testing::AllOf;
using testing::HasSubstr;
using testing::StartsWith;
using tests::contents;
using tests::Variable;

namespace fs = std::filesystem;

class DaemonProgramTest : public testing::Test, protected tests::DaemonWorld {
 protected:
  using DaemonWorld::DaemonWorld;

  /// Left to itself the daemon takes two seconds for each.
  void haveOneBook() const { fs::remove_all(folder.path("share/help/en/kitchen")); }
};

class HastyDaemonTest : public DaemonProgramTest {
 protected:
  HastyDaemonTest() : DaemonProgramTest("--idle 0.5") {}
};

TEST_F(DaemonProgramTest, BusStartsTheDaemonForWhoeverAsksAndItIndexesTheBooks) {
  haveOneBook();
  EXPECT_FALSE(isThere());
  EXPECT_THAT(status(), HasSubstr("'process'"));
  EXPECT_TRUE(isThere());
  EXPECT_TRUE(waitUntilIndexed("1"));
  EXPECT_THAT(gdbus({"org.zeb.Help1.StartSearch", "spring", "{}"}), StartsWith("(uint64 "));
}

TEST_F(HastyDaemonTest, DaemonLeavesWhenItHasNothingToDoAndComesBackWhenItIsAsked) {
  haveOneBook();
  EXPECT_TRUE(waitUntilIndexed("1"));
  EXPECT_TRUE(waitFor([this] { return !isThere(); }));
  EXPECT_THAT(status(), HasSubstr("'indexed': <uint64 1>")) << "it has kept what it made";
}

TEST_F(DaemonProgramTest, DaemonEndsWhenItIsToldTo) {
  EXPECT_THAT(status(), HasSubstr("'process'"));
  const pid_t process = daemonProcess();
  ASSERT_GT(process, 0);
  ASSERT_EQ(::kill(process, SIGTERM), 0);
  EXPECT_TRUE(waitFor([this] { return !isThere(); }));
}

TEST_F(DaemonProgramTest, DaemonEndsWithItsBus) {
  EXPECT_THAT(status(), HasSubstr("'process'"));
  const pid_t process = daemonProcess();
  ASSERT_GT(process, 0);
  bus.stop();
  // Whose child it is depends on the bus; that it is no program any more, the kernel tells.
  EXPECT_TRUE(waitFor([&] {
    std::error_code gone;
    return fs::read_symlink("/proc/" + std::to_string(process) + "/exe", gone).empty();
  }));
}

/// The command line gives the same answers with the daemon as by itself.
TEST_F(DaemonProgramTest, CommandLineAsksTheDaemonAndAnswersTheSameAsWithoutIt) {
  page("long", "Many words",
       "Words about words. <h2 id=\"deep\">Deep inside</h2> Nothing of note.");
  // The daemon finds the books, and indexes them while the first search waits; a model follows.
  EXPECT_THAT(zeb({"search", "--json", "spring"}),
              AllOf(StartsWith("0\n"), HasSubstr("\"title\": \"Roses\"")));
  EXPECT_TRUE(isThere());
  EXPECT_TRUE(waitUntilIndexed("3"));
  EXPECT_TRUE(waitFor([this] {
    const std::string models = gdbus({"org.zeb.Help1.Models"});
    return models.find("['garden', 'kitchen', 'long']") != std::string::npos &&
           models.find("'needsBuild': <false>") != std::string::npos &&
           models.find("'building': <false>") != std::string::npos;
  }));
  const std::vector<std::vector<std::string>> lines = {{"search", "--json", "spring"},
                                                       {"search", "water"},
                                                       {"search", "nowhere"},
                                                       {"search", "--actions", "wo"},
                                                       {"suggest", "--json", "w"},
                                                       {"similar", "roses"},
                                                       {"anchor", "deep"},
                                                       {"anchor", "none"},
                                                       {"search", "--book", "garden", "roses"},
                                                       {"search", "--book", "no", "a"}};
  for (const auto& line : lines) {
    EXPECT_EQ(zeb(line), zeb(line, false)) << testing::PrintToString(line);
  }
}

TEST_F(DaemonProgramTest, DoctorAsksTheDaemonAndFindsNothingWrongWithWhatItHasMade) {
  ASSERT_THAT(zeb({"scan"}), StartsWith("0\n"));
  const Variable address("DBUS_SESSION_BUS_ADDRESS", bus.address());
  const std::string output = folder.path("doctor's output");
  tests::ChildProcess program(ZEB_PROGRAM, {"doctor", "--json"}, output);
  EXPECT_EQ(program.wait(), 0) << contents(output);
  EXPECT_THAT(contents(output), AllOf(HasSubstr("\"books\": 2"), HasSubstr("\"running\"")));
}

TEST_F(DaemonProgramTest, CommandLineDoesWithoutADaemonThatTheBusCannotStart) {
  folder.write("broken/org.zeb.zebd.service",
               "[D-BUS Service]\nName=org.zeb.zebd\nExec=" + folder.path("no daemon") + "\n");
  const tests::PrivateBus other("<servicedir>" + folder.path("broken") + "</servicedir>");
  const Variable address("DBUS_SESSION_BUS_ADDRESS", other.address());
  const std::string output = folder.path("zeb output");
  tests::ChildProcess scan(ZEB_PROGRAM, {"scan"}, output);
  EXPECT_EQ(scan.wait(), 0) << contents(output);
  EXPECT_THAT(contents(output), HasSubstr("the help daemon cannot be started"));
  tests::ChildProcess search(ZEB_PROGRAM, {"search", "spring"}, output);
  EXPECT_EQ(search.wait(), 0) << contents(output);
  tests::ChildProcess doctor(ZEB_PROGRAM, {"doctor", "--json"}, output);
  EXPECT_EQ(doctor.wait(), 1);
  EXPECT_THAT(contents(output), HasSubstr("\"finding\": \"daemon\""));
}

TEST_F(DaemonProgramTest, CommandLineAsksADaemonThatSomebodyHasStartedByHand) {
  const tests::PrivateBus other;
  const Variable address("DBUS_SESSION_BUS_ADDRESS", other.address());
  tests::ChildProcess daemon(ZEB_DAEMON, {"-v"}, folder.path("log"));
  EXPECT_TRUE(waitFor([this] {
    return contents(folder.path("log")).find("Books: ") != std::string::npos;
  })) << contents(folder.path("log"));
  const std::string output = folder.path("scan's output");
  tests::ChildProcess scan(ZEB_PROGRAM, {"scan"}, output);
  EXPECT_EQ(scan.wait(), 0);
  EXPECT_THAT(contents(output), testing::Not(HasSubstr("cannot be started")));
  EXPECT_THAT(contents(output), HasSubstr("0 forgotten, 0 failed"));
}

TEST_F(DaemonProgramTest, CommandLineDoesWithoutTheDaemonWhereItIsToldTo) {
  const Variable address("DBUS_SESSION_BUS_ADDRESS", bus.address());
  const std::string output = folder.path("zeb output");
  tests::ChildProcess program(ZEB_PROGRAM, {"--no-daemon", "search", "spring"}, output);
  EXPECT_EQ(program.wait(), 3);
  EXPECT_THAT(contents(output), HasSubstr("no book has been indexed yet"));
  EXPECT_FALSE(isThere());
}

TEST_F(DaemonProgramTest, SecondDaemonEndsAtOnce) {
  EXPECT_THAT(status(), HasSubstr("'process'"));
  const Variable address("DBUS_SESSION_BUS_ADDRESS", bus.address());
  tests::ChildProcess second(ZEB_DAEMON, {}, folder.path("second"));
  EXPECT_EQ(second.wait(), 1);
  EXPECT_THAT(contents(folder.path("second")), HasSubstr("the name org.zeb.zebd cannot be had"));
}

TEST_F(DaemonProgramTest, DaemonWithoutABusSaysSo) {
  const Variable address("DBUS_SESSION_BUS_ADDRESS", "unix:path=" + folder.path("none"));
  tests::ChildProcess daemon(ZEB_DAEMON, {}, folder.path("log"));
  EXPECT_EQ(daemon.wait(), 1);
  EXPECT_THAT(contents(folder.path("log")), HasSubstr("there is no message bus"));
}

class DaemonOptionsTest : public testing::Test {
 protected:
  std::optional<zebd::DaemonOptions> parse(const std::vector<std::string>& arguments) {
    out.str({});
    err.str({});
    return zebd::parseDaemonOptions(arguments, out, err, exitCode);
  }

  std::ostringstream out;
  std::ostringstream err;
  int exitCode = -1;
};

TEST_F(DaemonOptionsTest, WithoutArgumentsTheDefaultsHold) {
  const auto options = parse({});
  ASSERT_TRUE(options.has_value());
  EXPECT_EQ(options->idleDelay, 60);
  EXPECT_EQ(options->cacheFolder, std::nullopt);
  EXPECT_EQ(options->verbosity, 0);
}

TEST_F(DaemonOptionsTest, OptionsAreUnderstood) {
  const auto options = parse({"--idle", "2.5", "--cache-dir", "/tmp/c", "-vv"});
  ASSERT_TRUE(options.has_value());
  EXPECT_EQ(options->idleDelay, 2.5);
  EXPECT_EQ(options->cacheFolder, "/tmp/c");
  EXPECT_EQ(options->verbosity, 2);
}

TEST_F(DaemonOptionsTest, HelpAndVersionArePrintedAndNothingIsLeftToDo) {
  EXPECT_FALSE(parse({"--help"}).has_value());
  EXPECT_EQ(exitCode, 0);
  EXPECT_THAT(out.str(), AllOf(HasSubstr("--idle"), HasSubstr("--cache-dir")));
  EXPECT_FALSE(parse({"--version"}).has_value());
  EXPECT_EQ(exitCode, 0);
  EXPECT_THAT(out.str(), StartsWith("zebd "));
}

TEST_F(DaemonOptionsTest, WrongLinesAreErrors) {
  for (const std::vector<std::string>& line : {std::vector<std::string>{"--idle", "0"},
                                               {"--idle", "soon"},
                                               {"--idle", "nan"},
                                               {"--cache-dir", "relative"},
                                               {"--nonsense"},
                                               {"word"}}) {
    EXPECT_FALSE(parse(line).has_value());
    EXPECT_EQ(exitCode, 2) << line.front();
    EXPECT_NE(err.str(), "");
  }
}

}  // namespace
