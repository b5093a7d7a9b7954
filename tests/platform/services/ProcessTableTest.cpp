#include <gtest/gtest.h>
#include <signal.h>
#include <spawn.h>
#include <sys/wait.h>
#include <unistd.h>

#include <algorithm>
#include <filesystem>
#include <thread>
#include <utility>

#include "platform/Processes.h"
#include "tests/platform/TemporaryFolder.h"

namespace platform {
namespace {

using tests::TemporaryFolder;

/// A child that sleeps until it is ended.
class Child {
 public:
  explicit Child(const std::string& program, std::vector<std::string> arguments) {
    arguments.insert(arguments.begin(), program);
    std::vector<char*> pointers;
    pointers.reserve(arguments.size() + 1);
    for (std::string& argument : arguments) {
      pointers.push_back(argument.data());
    }
    pointers.push_back(nullptr);
    EXPECT_EQ(::posix_spawn(&_process, program.c_str(), nullptr, nullptr, pointers.data(), environ),
              0);
    // The kernel fills in the argument area last, and a moment after the return.
    while (systemProcessTable()->argumentsOfProcess(_process).value_or(Data()).view().empty()) {
      std::this_thread::yield();
    }
  }
  ~Child() {
    end();
    reap();
  }
  Child(const Child&) = delete;
  Child& operator=(const Child&) = delete;

  pid_t number() const { return _process; }
  void end() const {
    if (!_reaped) {
      ::kill(_process, SIGKILL);
      siginfo_t information;
      ::waitid(P_PID, static_cast<id_t>(_process), &information, WEXITED | WNOWAIT);
    }
  }
  void reap() {
    if (!std::exchange(_reaped, true)) {
      ::waitpid(_process, nullptr, 0);
    }
  }

 private:
  pid_t _process = 0;
  bool _reaped = false;
};

std::optional<std::string> nameOf(int processID) {
  std::vector<ProcessEntry> entries;
  EXPECT_EQ(systemProcessTable()->readProcesses(entries), 0);
  for (const ProcessEntry& entry : entries) {
    if (entry.processID == processID) {
      return entry.commandName;
    }
  }
  return std::nullopt;
}

/// A copy of a sleeping program under another name.
std::string sleeperNamed(const TemporaryFolder& folder, const std::string& name) {
  std::filesystem::copy_file("/bin/sleep", folder.path(name));
  return folder.path(name);
}

TEST(ProcessTable, findsThisVeryProcess) {
  EXPECT_EQ(nameOf(::getpid()), std::string(program_invocation_short_name).substr(0, 15));
}

TEST(ProcessTable, replacesWhatWasThereAndListsByNumber) {
  std::vector<ProcessEntry> entries = {{-5, "stale"}};
  ASSERT_EQ(systemProcessTable()->readProcesses(entries), 0);
  ASSERT_FALSE(entries.empty());
  EXPECT_TRUE(std::is_sorted(entries.begin(), entries.end(), [](const auto& a, const auto& b) {
    return a.processID < b.processID;
  }));
  EXPECT_GT(entries.front().processID, 0);
}

TEST(ProcessTable, listsAChildAndForgetsItWhenItIsGone) {
  Child child("/bin/sleep", {"1000"});
  EXPECT_EQ(nameOf(child.number()), "sleep");
  child.end();
  child.reap();
  EXPECT_EQ(nameOf(child.number()), std::nullopt);
}

TEST(ProcessTable, aNameIsCutToFifteenBytes) {
  const TemporaryFolder folder;
  const Child child(sleeperNamed(folder, "abcdefghijklmnopqrstuvwxyz"), {"1000"});
  EXPECT_EQ(nameOf(child.number()), "abcdefghijklmno");
}

TEST(ProcessTable, aLineBreakInANameHidesNothing) {
  const TemporaryFolder folder;
  const Child child(sleeperNamed(folder, "bvmake\nodd"), {"1000"});
  EXPECT_EQ(nameOf(child.number()), "bvmake\nodd");
  const Child other(sleeperNamed(folder, "bvmake\n"), {"1000"});
  EXPECT_EQ(nameOf(other.number()), "bvmake\n");
}

TEST(ProcessTable, theArgumentAreaIsTheNameAndTheArgumentsEachWithItsNUL) {
  const Child child("/bin/sleep", {"1000", "2000"});
  const auto area = systemProcessTable()->argumentsOfProcess(child.number());
  ASSERT_TRUE(area);
  EXPECT_EQ(area->view(), std::string_view("/bin/sleep\0001000\0002000\0", 21));
}

TEST(ProcessTable, aProcessThatHasEndedButIsNotReapedHasNoArguments) {
  const Child child("/bin/sleep", {"1000"});
  child.end();
  const auto area = systemProcessTable()->argumentsOfProcess(child.number());
  EXPECT_TRUE(!area || area->view().empty());
}

TEST(ProcessTable, aMissingProcessHasNoArgumentArea) {
  Child child("/bin/sleep", {"1000"});
  child.end();
  child.reap();
  EXPECT_EQ(systemProcessTable()->argumentsOfProcess(child.number()), std::nullopt);
  EXPECT_EQ(systemProcessTable()->argumentsOfProcess(0), std::nullopt);
  EXPECT_EQ(systemProcessTable()->argumentsOfProcess(-1), std::nullopt);
}

TEST(ProcessTable, theArgumentLimitIsThatOfTheSystem) {
  const auto size = systemProcessTable()->maximumArgumentSize();
  ASSERT_TRUE(size);
  EXPECT_GE(*size, 131072U);
}

}  // namespace
}  // namespace platform
