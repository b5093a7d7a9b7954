// Runs that are killed leave what was there, and nothing else for ever.
#include <fcntl.h>
#include <fmt/format.h>
#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <pty.h>
#include <spawn.h>
#include <sys/wait.h>
#include <unistd.h>

#include <csignal>
#include <filesystem>

#include "TestSupport.h"

namespace bvmake {
namespace {

using testing::HasSubstr;
using testing::Not;

/// A run of the real program whose messages are read while it goes on.
class RunningTool {
 public:
  /// `onTerminal`: its standard error is a terminal, else a pipe.
  explicit RunningTool(std::vector<std::string> words, bool onTerminal = false) {
    int ends[2];
    const bool made =
        onTerminal ? openpty(&ends[0], &ends[1], nullptr, nullptr, nullptr) == 0 : pipe(ends) == 0;
    EXPECT_TRUE(made);
    fcntl(ends[0], F_SETFD, FD_CLOEXEC);
    words.insert(words.begin(), BVMAKE_PROGRAM);
    std::vector<char*> pointers;
    for (std::string& word : words) {
      pointers.push_back(word.data());
    }
    pointers.push_back(nullptr);
    posix_spawn_file_actions_t actions;
    posix_spawn_file_actions_init(&actions);
    posix_spawn_file_actions_adddup2(&actions, ends[1], STDERR_FILENO);
    posix_spawn_file_actions_addclose(&actions, ends[1]);
    EXPECT_EQ(posix_spawn(&_process, BVMAKE_PROGRAM, &actions, nullptr, pointers.data(), environ),
              0);
    posix_spawn_file_actions_destroy(&actions);
    close(ends[1]);
    _messages = ends[0];
  }
  ~RunningTool() {
    kill();
    close(_messages);
  }
  RunningTool(const RunningTool&) = delete;
  RunningTool& operator=(const RunningTool&) = delete;

  /// One line of its messages; empty at their end.
  std::string line() {
    std::string text;
    char character = 0;
    while (text.find('\n') == std::string::npos && read(_messages, &character, 1) == 1) {
      text += character;
    }
    return text;
  }

  std::string rest() {
    std::string text;
    char character = 0;
    // A terminal whose other side is closed gives an error instead of an end.
    while (read(_messages, &character, 1) == 1) {
      text += character;
    }
    return text;
  }

  void kill() {
    if (_process > 0) {
      ::kill(_process, SIGKILL);
      wait();
    }
  }

  int wait() {
    int status = 0;
    waitpid(_process, &status, 0);
    _process = 0;
    return status;
  }

 private:
  pid_t _process = 0;
  int _messages = -1;
};

class KilledRun : public testing::Test {
 protected:
  KilledRun() {
    for (int i = 0; i < 60; ++i) {
      _folder.write(fmt::format("book/{}.html", i), fmt::format("<title>{0}</title><p>w{0}", i));
    }
    runBvmake(arguments("1"));
    _former = contentsOfFile(path());
    _folder.write("book/more.html", "<p>another page");
    _folder.makeFolder("copy");
    std::vector<std::string> elsewhere = arguments("1");
    elsewhere[2] = _folder / "copy/o";
    runBvmake(elsewhere);
    _next = contentsOfFile(_folder / "copy/o");
    EXPECT_NE(_former, _next);
  }

  std::string path() const { return _folder / "out/o"; }

  std::vector<std::string> arguments(std::string jobs) const {
    return {"--create", "--file",        path(), "--anchors",
            "--jobs",   std::move(jobs), "-vv",  _folder / "book"};
  }

  void expectWhole() const {
    const std::string found = contentsOfFile(path());
    EXPECT_TRUE(found == _former || found == _next) << found.size() << " bytes";
  }

  size_t filesInOut() const {
    return static_cast<size_t>(
        std::distance(std::filesystem::directory_iterator(_folder / "out"), {}));
  }

  TemporaryFolder _folder;
  std::string _former;
  std::string _next;
};

TEST_F(KilledRun, leavesTheFormerFileWhateverItWasDoing) {
  for (const char* const jobs : {"1", "4"}) {
    for (const int lines : {0, 1, 10, 40, 61}) {
      RunningTool tool(arguments(jobs));
      for (int i = 0; i < lines; ++i) {
        EXPECT_THAT(tool.line(), HasSubstr(".html"));
      }
      tool.kill();
      expectWhole();
    }
  }
  EXPECT_EQ(runBvmake(arguments("2")).status, 0);
  EXPECT_EQ(contentsOfFile(path()), _next);
  EXPECT_EQ(filesInOut(), 1U);
}

TEST_F(KilledRun, whatItWasWritingIsClearedAwayByTheNext) {
  // Killed, if it is not too quick, while the file that is to replace the other one is there.
  for (int round = 0; round < 10; ++round) {
    RunningTool tool(arguments("2"));
    for (int i = 0; i < 61; ++i) {
      tool.line();
    }
    while (filesInOut() < 2 && contentsOfFile(path()) == _former) {
    }
    tool.kill();
    expectWhole();
  }
  EXPECT_EQ(runBvmake(arguments("2")).status, 0);
  EXPECT_EQ(filesInOut(), 1U);
}

TEST_F(KilledRun, temporaryFileOfADeadProcessIsClearedAwayAndNoOther) {
  const pid_t dead = fork();
  ASSERT_GE(dead, 0);
  if (dead == 0) {
    _exit(0);
  }
  waitpid(dead, nullptr, 0);
  _folder.write(fmt::format("out/.o.{}.0.tmp", dead), "half of it");
  const std::string running = _folder.write(fmt::format("out/.o.{}.0.tmp", getpid()), "x");
  const std::string other = _folder.write(fmt::format("out/.other.{}.0.tmp", dead), "x");
  EXPECT_EQ(runBvmake(arguments("1")).status, 0);
  EXPECT_EQ(filesInOut(), 3U);
  EXPECT_TRUE(std::filesystem::exists(running));
  EXPECT_TRUE(std::filesystem::exists(other));
}

TEST_F(KilledRun, terminalShowsABarAndAPipeDoesNot) {
  std::vector<std::string> words = arguments("2");
  std::erase(words, "-vv");
  RunningTool onTerminal(words, true);
  const std::string shown = onTerminal.rest();
  EXPECT_EQ(onTerminal.wait(), 0);
  EXPECT_THAT(shown,
              HasSubstr("bvmake: [########################################] 61 of 61 files"));
  EXPECT_THAT(shown, testing::EndsWith(" \r"));
  RunningTool inPipe(words);
  EXPECT_EQ(inPipe.rest(), "");
  EXPECT_EQ(inPipe.wait(), 0);
}

}  // namespace
}  // namespace bvmake
