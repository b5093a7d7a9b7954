// The program as its users and the help daemon meet it: a child process.
#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <sys/resource.h>
#include <sys/syscall.h>
#include <sys/wait.h>
#include <unistd.h>

#include <algorithm>
#include <atomic>
#include <filesystem>

#include "TestSupport.h"
#include "bvmake/Priority.h"
#include "bvmake/Run.h"
#include "platform/Environment.h"

namespace bvmake {
namespace {

using testing::HasSubstr;
using testing::StartsWith;

TEST(Program, indexesAFolderWithTheCommandLineOfTheHelpDaemon) {
  const TemporaryFolder folder;
  folder.write("book/a.html", "<title>Alpha</title><p id=here>Some words.");
  const std::string output = folder / "out/a.helpindex";
  const ChildResult result =
      runBvmake({"--create", "--anchors", "--generate-summaries", "--file", output,
                 "--min-term-length", "3", "--lowered-priority", "--verbose", folder / "book"});
  EXPECT_EQ(result.status, 0);
  EXPECT_EQ(result.output, "");
  EXPECT_THAT(result.errors, HasSubstr("1 pages"));
  EXPECT_TRUE(std::filesystem::exists(output));

  const ChildResult shown = runBvmake({"--inspect", output, "--anchor", "here", "--term", "words"});
  EXPECT_EQ(shown.status, 0);
  EXPECT_THAT(shown.output, HasSubstr("anchor \"here\": 1 pages\n  /a.html: Alpha"));
  EXPECT_THAT(shown.output, HasSubstr("term \"words\": 1 pages\n  /a.html: Alpha"));
  EXPECT_EQ(shown.errors, "");
}

TEST(Program, isSilentWhenAllIsWell) {
  const TemporaryFolder folder;
  folder.write("book/a.html", "<p>x");
  const ChildResult result = runBvmake({"--create", "--file", folder / "o", folder / "book"});
  EXPECT_EQ(result.status, 0);
  EXPECT_EQ(result.output + result.errors, "");
}

TEST(Program, reportsBadPagesOnStandardErrorAndSucceeds) {
  const TemporaryFolder folder;
  folder.write("book/a.html", "<p>x");
  folder.write("book/b.page", "<page>");
  const ChildResult result = runBvmake({"--create", "--file", folder / "o", folder / "book"});
  EXPECT_EQ(result.status, 0);
  EXPECT_THAT(result.errors, StartsWith("bvmake: warning: " + (folder / "book/b.page") + ": "));
  EXPECT_EQ(std::count(result.errors.begin(), result.errors.end(), '\n'), 1);
}

TEST(Program, failsWithOneForAMissingFolder) {
  const TemporaryFolder folder;
  const ChildResult result = runBvmake({"--create", "--file", folder / "o", folder / "none"});
  EXPECT_EQ(result.status, 1);
  EXPECT_EQ(result.output, "");
  EXPECT_THAT(result.errors, StartsWith("bvmake: error: "));
  EXPECT_THAT(result.errors, HasSubstr(folder / "none"));
}

TEST(Program, failsWithOneForAnOutputThatCannotBeWritten) {
  const TemporaryFolder folder;
  folder.write("book/a.html", "<p>x");
  folder.write("file", "x");
  const ChildResult result = runBvmake({"--create", "--file", folder / "file/o", folder / "book"});
  EXPECT_EQ(result.status, 1);
  EXPECT_THAT(result.errors, HasSubstr("cannot write"));
}

TEST(Program, failsWithOneForAFileThatIsNoIndex) {
  const TemporaryFolder folder;
  const ChildResult result = runBvmake({"--inspect", folder.write("x", "text")});
  EXPECT_EQ(result.status, 1);
  EXPECT_THAT(result.errors, StartsWith("bvmake: error: "));
}

TEST(Program, failsWithOneWhereThereIsNoFileToAppendTo) {
  const TemporaryFolder folder;
  folder.write("book/a.html", "<p>x");
  const ChildResult result =
      runBvmake({"--create", "--append-LUX-only", "--file", folder / "o", folder / "book"});
  EXPECT_EQ(result.status, 1);
  EXPECT_THAT(result.errors, HasSubstr("cannot add semantic data to"));
  EXPECT_FALSE(std::filesystem::exists(folder / "o"));
}

TEST(Program, failsWithTwoForAWrongCommandLine) {
  for (const std::vector<std::string>& words :
       {std::vector<std::string>{},
        {"--create"},
        {"--unknown"},
        {"--create", "--file", "o", "--min-term-length", "x", "f"}}) {
    const ChildResult result = runBvmake(words);
    EXPECT_EQ(result.status, 2);
    EXPECT_EQ(result.output, "");
    EXPECT_THAT(result.errors, StartsWith("bvmake: error: "));
  }
}

TEST(Program, printsHelpAndVersionOnStandardOutput) {
  const ChildResult help = runBvmake({"--help"});
  EXPECT_EQ(help.status, 0);
  EXPECT_THAT(help.output, HasSubstr("--min-term-length"));
  EXPECT_EQ(help.errors, "");
  const ChildResult version = runBvmake({"--version"});
  EXPECT_EQ(version.status, 0);
  EXPECT_THAT(version.output, StartsWith("bvmake "));
  EXPECT_EQ(version.errors, "");
}

TEST(StreamReport, namesProgramAndKindAndTamesControlCharacters) {
  const TemporaryFolder folder;
  std::FILE* stream = std::fopen((folder / "log").c_str(), "w");
  ASSERT_NE(stream, nullptr);
  StreamReport report(stream, "tool", 1);
  report.error("bad");
  report.warning("odd \x1B[31m\nname");
  report.progress(1, "told");
  report.progress(2, "not told");
  EXPECT_TRUE(report.wants(1));
  EXPECT_FALSE(report.wants(2));
  std::fclose(stream);
  EXPECT_EQ(contentsOfFile(folder / "log"),
            "tool: error: bad\ntool: warning: odd ?[31m?name\ntool: told\n");
}

TEST(Priority, isLoweredOnProcessorAndDisk) {
  // In a child: there is no way back.
  const pid_t child = fork();
  ASSERT_GE(child, 0);
  if (child == 0) {
    const bool done = !lowerPriority();
    const bool nice = getpriority(PRIO_PROCESS, 0) >= loweredNiceness;
    const bool idle = (syscall(SYS_ioprio_get, 1, 0) >> 13) == 3;
    _exit(done && nice && idle ? 0 : 1);
  }
  int status = 0;
  waitpid(child, &status, 0);
  EXPECT_TRUE(WIFEXITED(status) && WEXITSTATUS(status) == 0);
}

/// Notes whether every thread that reads a page has given way.
class PriorityWatcher : public platform::FileManager {
 public:
  std::optional<platform::Data> contentsAtPath(const std::string& path,
                                               platform::Error* error) const override {
    const auto thread = static_cast<id_t>(syscall(SYS_gettid));
    const bool nice = getpriority(PRIO_PROCESS, thread) >= loweredNiceness;
    const bool idle = (syscall(SYS_ioprio_get, 1, 0) >> 13) == 3;
    reads += 1;
    lowered += nice && idle ? 1 : 0;
    return FileManager::contentsAtPath(path, error);
  }

  mutable std::atomic<int> reads{0};
  mutable std::atomic<int> lowered{0};
};

TEST(Priority, isLoweredInEveryThreadOfARun) {
  const TemporaryFolder folder;
  for (int i = 0; i < 50; ++i) {
    folder.write("book/" + std::to_string(i) + ".html", "<p>words");
  }
  CreateOptions options;
  options.folder = folder / "book";
  options.outputPath = folder / "o";
  options.loweredPriority = true;
  for (const size_t jobs : {size_t{0}, size_t{4}}) {
    options.jobs = jobs;
    const pid_t child = fork();
    ASSERT_GE(child, 0);
    if (child == 0) {
      const auto files = std::make_shared<PriorityWatcher>();
      platform::Environment environment = platform::Environment::system();
      environment.files = files;
      const platform::EnvironmentOverride override(environment);
      RecordingReport report;
      const bool done = run(options, report).exitCode == ExitCode::success;
      _exit(done && files->reads == 50 && files->lowered == 50 ? 0 : 1);
    }
    int status = 0;
    waitpid(child, &status, 0);
    EXPECT_TRUE(WIFEXITED(status) && WEXITSTATUS(status) == 0) << jobs;
  }
}

TEST(Priority, isNeverRaised) {
  const pid_t child = fork();
  ASSERT_GE(child, 0);
  if (child == 0) {
    setpriority(PRIO_PROCESS, 0, 15);
    const bool done = !lowerPriority();
    _exit(done && getpriority(PRIO_PROCESS, 0) == 15 ? 0 : 1);
  }
  int status = 0;
  waitpid(child, &status, 0);
  EXPECT_TRUE(WIFEXITED(status) && WEXITSTATUS(status) == 0);
}

}  // namespace
}  // namespace bvmake
