#include <fcntl.h>
#include <gtest/gtest.h>
#include <signal.h>
#include <sys/wait.h>
#include <unistd.h>

#include <atomic>
#include <filesystem>
#include <fstream>
#include <sstream>
#include <thread>

#include "platform/Environment.h"
#include "platform/Exception.h"
#include "platform/Processes.h"
#include "tests/platform/TemporaryFolder.h"

namespace platform {
namespace {

using tests::TemporaryFolder;

/// Runs a line of shell with `arguments` as $1 and so on.
int runShell(const std::string& line, const std::vector<std::string>& arguments = {}) {
  std::vector<std::string> all = {"-c", line, "shell"};
  all.insert(all.end(), arguments.begin(), arguments.end());
  return systemProcessLauncher()->launchAndWait("/bin/sh", all);
}

std::string contents(const std::string& path) {
  std::ostringstream text;
  text << std::ifstream(path).rdbuf();
  return text.str();
}

/// The reason why `path` cannot be launched; empty when it can.
std::string refusal(const std::string& path, const std::vector<std::string>& arguments = {}) {
  try {
    systemProcessLauncher()->launchAndWait(path, arguments);
    return {};
  } catch (const Exception& exception) {
    EXPECT_EQ(exception.name(), "LaunchException");
    return exception.reason();
  }
}

TEST(ProcessLauncher, givesTheExitStatus) {
  EXPECT_EQ(runShell("exit 0"), 0);
  EXPECT_EQ(runShell("exit 1"), 1);
  EXPECT_EQ(runShell("exit 255"), 255);
}

TEST(ProcessLauncher, aChildEndedByASignalGives128AndItsNumber) {
  EXPECT_EQ(runShell("kill -TERM $$"), 128 + SIGTERM);
  EXPECT_EQ(runShell("kill -KILL $$"), 128 + SIGKILL);
}

TEST(ProcessLauncher, whatCannotBeStartedThrows) {
  const TemporaryFolder folder;
  const std::string text = folder.write("text", "no program");
  EXPECT_EQ(refusal(folder.path("missing")),
            "cannot launch " + folder.path("missing") + ": No such file or directory");
  EXPECT_EQ(refusal(text), "cannot launch " + text + ": Permission denied");
  EXPECT_EQ(refusal(folder.path()), "cannot launch " + folder.path() + ": Permission denied");
  std::filesystem::permissions(text, std::filesystem::perms::owner_all);
  EXPECT_EQ(refusal(text), "cannot launch " + text + ": Exec format error");
  EXPECT_EQ(refusal(text + "/below"), "cannot launch " + text + "/below: Not a directory");
  EXPECT_EQ(refusal(""), "cannot launch : No such file or directory");
}

TEST(ProcessLauncher, aNULInPathOrArgumentIsRefusedBeforeAnythingRuns) {
  const TemporaryFolder folder;
  const std::string made = folder.path("made");
  EXPECT_NE(refusal("/usr/bin/touch", {made, std::string("a\0b", 3)}), "");
  EXPECT_NE(refusal(std::string("/usr/bin/touch\0x", 16), {made}), "");
  EXPECT_FALSE(std::filesystem::exists(made));
}

TEST(ProcessLauncher, tooManyArgumentsAreAnExceptionToo) {
  const std::vector<std::string> arguments(40, std::string(200000, 'x'));
  EXPECT_NE(refusal("/bin/true", arguments), "");
}

TEST(ProcessLauncher, argumentsArriveAsTheyAre) {
  const TemporaryFolder folder;
  const std::string file = folder.path("arguments");
  EXPECT_EQ(runShell("out=$1; shift; printf '[%s]' \"$0\" \"$@\" >\"$out\"",
                     {file, "a", "b c", "", "\"'$HOME*", "ü\xFF", "--", "-x"}),
            0);
  EXPECT_EQ(contents(file), "[shell][a][b c][][\"'$HOME*][ü\xFF][--][-x]");
}

TEST(ProcessLauncher, theProgramsOwnNameIsItsPath) {
  const TemporaryFolder folder;
  const std::string script = folder.write("script", "#!/bin/sh\nprintf %s \"$0\" >\"$1\"\n");
  std::filesystem::permissions(script, std::filesystem::perms::owner_all);
  EXPECT_EQ(systemProcessLauncher()->launchAndWait(script, {folder.path("name")}), 0);
  EXPECT_EQ(contents(folder.path("name")), script);
}

TEST(ProcessLauncher, standardInputIsEmptyWhateverOurOwnHolds) {
  const TemporaryFolder folder;
  const std::string ours = folder.write("ours", "a line\n");
  const int kept = ::fcntl(STDIN_FILENO, F_DUPFD_CLOEXEC, 3);
  const int file = ::open(ours.c_str(), O_RDONLY | O_CLOEXEC);
  ASSERT_EQ(::dup2(file, STDIN_FILENO), STDIN_FILENO);
  const int status = runShell("cat >\"$1\"", {folder.path("read")});
  if (kept >= 0) {
    ::dup2(kept, STDIN_FILENO);
    ::close(kept);
  } else {
    ::close(STDIN_FILENO);
  }
  ::close(file);
  EXPECT_EQ(status, 0);
  ASSERT_TRUE(std::filesystem::exists(folder.path("read")));
  EXPECT_EQ(contents(folder.path("read")), "");
}

TEST(ProcessLauncher, noOtherOpenFileReachesTheChild) {
  const TemporaryFolder folder;
  // Deliberately inheritable, as a careless library would open it.
  const int careless = ::open("/dev/null", O_RDONLY);  // NOLINT(android-cloexec-open)
  const int near = ::fcntl(careless, F_DUPFD, 50);
  const int far = ::fcntl(careless, F_DUPFD, 200);
  const int status =
      runShell("for n in 50 200; do [ ! -e /proc/$$/fd/$n ] || echo $n; done >\"$1\"",
               {folder.path("numbers")});
  ::close(careless);
  ::close(near);
  ::close(far);
  ASSERT_EQ(near, 50);
  ASSERT_EQ(far, 200);
  EXPECT_EQ(status, 0);
  ASSERT_TRUE(std::filesystem::exists(folder.path("numbers")));
  EXPECT_EQ(contents(folder.path("numbers")), "");
}

TEST(ProcessLauncher, theChildIgnoresAndBlocksNoSignal) {
  const TemporaryFolder folder;
  const auto former = ::signal(SIGPIPE, SIG_IGN);
  sigset_t blocked;
  sigset_t before;
  sigemptyset(&blocked);
  sigaddset(&blocked, SIGTERM);
  ::pthread_sigmask(SIG_BLOCK, &blocked, &before);
  const int status = systemProcessLauncher()->launchAndWait(
      "/bin/sh",
      {"-c", "grep -E '^Sig(Blk|Ign)' /proc/self/status >\"$0\"", folder.path("signals")});
  ::pthread_sigmask(SIG_SETMASK, &before, nullptr);
  ::signal(SIGPIPE, former);
  EXPECT_EQ(status, 0);
  std::istringstream lines(contents(folder.path("signals")));
  // The C library keeps 32 and 33 for itself, and ignores them in every child.
  constexpr uint64_t ownSignals = uint64_t{3} << 31;
  std::string name;
  uint64_t mask = ~uint64_t{0};
  int count = 0;
  while (lines >> name >> std::hex >> mask) {
    EXPECT_EQ(mask & ~ownSignals, 0U) << name;
    ++count;
  }
  EXPECT_EQ(count, 2);
}

TEST(ProcessLauncher, launchesOfSeveralThreadsKeepTheirStatusApart) {
  std::vector<std::thread> threads;
  threads.reserve(6);
  std::atomic<int> wrong = 0;
  for (int t = 0; t < 6; ++t) {
    threads.emplace_back([&, t] {
      for (int i = 0; i < 8; ++i) {
        const int expected = t * 10 + i;
        wrong += runShell("exit " + std::to_string(expected)) == expected ? 0 : 1;
      }
    });
  }
  for (std::thread& thread : threads) {
    thread.join();
  }
  EXPECT_EQ(wrong, 0);
}

TEST(ProcessLauncher, leavesTheChildrenOfOthersAlone) {
  const pid_t other = ::fork();
  if (other == 0) {
    ::_exit(9);
  }
  EXPECT_EQ(runShell("exit 3"), 3);
  int status = 0;
  EXPECT_EQ(::waitpid(other, &status, 0), other);
  EXPECT_EQ(WEXITSTATUS(status), 9);
}

TEST(SubstitutingProcessLauncher, startsTheOtherProgramForThatPathOnly) {
  const auto launcher = substitutingProcessLauncher("/usr/bin/no-such-tool", "/bin/sh");
  EXPECT_EQ(launcher->launchAndWait("/usr/bin/no-such-tool", {"-c", "exit 5"}), 5);
  EXPECT_EQ(launcher->launchAndWait("/bin/sh", {"-c", "exit 6"}), 6);
  EXPECT_EQ(launcher->launchAndWait("/bin/false", {}), 1);
  EXPECT_THROW(launcher->launchAndWait("/usr/bin/no-such-tool2", {}), Exception);
}

TEST(SubstitutingProcessLauncher, throwsWhenTheOtherProgramIsMissing) {
  const auto launcher = substitutingProcessLauncher("/bin/sh", "/usr/bin/no-such-tool");
  EXPECT_THROW(launcher->launchAndWait("/bin/sh", {"-c", "exit 0"}), Exception);
}

}  // namespace
}  // namespace platform
