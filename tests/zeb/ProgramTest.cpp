// The real programs, as the shell starts them.
#include <gmock/gmock.h>
#include <pty.h>
#include <sys/wait.h>
#include <unistd.h>

#include <array>
#include <cstdio>
#include <filesystem>
#include <fstream>
#include <iterator>
#include <nlohmann/json.hpp>
#include <string>
#include <vector>

#include "tests/zeb/World.h"

namespace {

using testing::HasSubstr;
using testing::Not;

struct ProgramRun {
  int status = -1;
  std::string out;
  std::string err;
};

std::string quoted(const std::string& word) {
  std::string result = "'";
  for (const char c : word) {
    result += c == '\'' ? std::string("'\\''") : std::string(1, c);
  }
  return result + "'";
}

class ProgramTest : public testing::Test {
 protected:
  virtual std::string caches() const { return files.path("cache"); }

  /// Runs a line of shell with the caches folder and no NO_COLOR set.
  ProgramRun shell(const std::string& line) const {
    const std::string errors = files.path("stderr");
    const std::string command =
        "unset NO_COLOR; ZEB_CACHE_DIR=" + quoted(caches()) + " " + line + " 2>" + quoted(errors);
    ProgramRun run;
    std::FILE* pipe = popen(command.c_str(), "r");
    if (pipe == nullptr) {
      return run;
    }
    std::array<char, 4096> buffer{};
    for (size_t count = 0; (count = std::fread(buffer.data(), 1, buffer.size(), pipe)) > 0;) {
      run.out.append(buffer.data(), count);
    }
    const int status = pclose(pipe);
    run.status = WIFEXITED(status) ? WEXITSTATUS(status) : 1000 + status;
    std::ifstream file(errors, std::ios::binary);
    run.err.assign(std::istreambuf_iterator<char>(file), {});
    return run;
  }

  ProgramRun zeb(const std::vector<std::string>& arguments) const {
    std::string line = quoted(ZEB_PROGRAM);
    for (const std::string& argument : arguments) {
      line += " " + quoted(argument);
    }
    return shell(line);
  }

  /// What the program writes, all in one, when it has a terminal.
  std::string onTerminal(std::vector<std::string> arguments, const char* noColor = nullptr) const {
    arguments.insert(arguments.begin(), ZEB_PROGRAM);
    arguments.insert(arguments.end(), {"--cache-dir", caches()});
    std::vector<char*> pointers;
    pointers.reserve(arguments.size() + 1);
    for (std::string& argument : arguments) {
      pointers.push_back(argument.data());
    }
    pointers.push_back(nullptr);
    int terminal = -1;
    const pid_t child = forkpty(&terminal, nullptr, nullptr, nullptr);
    if (child == 0) {
      // NOLINTBEGIN(concurrency-mt-unsafe): the child has this thread only.
      if (noColor == nullptr) {
        ::unsetenv("NO_COLOR");
      } else {
        ::setenv("NO_COLOR", noColor, 1);
      }
      // NOLINTEND(concurrency-mt-unsafe)
      execv(pointers[0], pointers.data());
      _exit(127);
    }
    std::string output;
    std::array<char, 4096> buffer{};
    // At the end of the child the terminal reports an error instead of an end.
    for (ssize_t count = 0; (count = read(terminal, buffer.data(), buffer.size())) > 0;) {
      output.append(buffer.data(), static_cast<size_t>(count));
    }
    close(terminal);
    int status = 0;
    waitpid(child, &status, 0);
    EXPECT_EQ(status, 0) << output;
    return output;
  }

  tests::TemporaryFolder files;
};

/// The programs with the manual scanned. A scan waits in earnest until the books have been quiet
/// for a second, so there is one for all these tests, and none of them changes what it left.
class ProgramWithABookTest : public ProgramTest {
 protected:
  static void SetUpTestSuite() {
    scanned = new tests::TemporaryFolder;
    ProgramWithABookTest first;
    ASSERT_EQ(first.zeb({"scan", "--no-system", tests::shippedBook("manual")}).status, 0);
  }
  static void TearDownTestSuite() {
    delete scanned;
    scanned = nullptr;
  }
  std::string caches() const override { return scanned->path("cache"); }

  static tests::TemporaryFolder* scanned;

 private:
  void TestBody() override {}
};

tests::TemporaryFolder* ProgramWithABookTest::scanned = nullptr;

TEST_F(ProgramTest, ExitStatusWithoutBooksIsFailure) {
  EXPECT_EQ(zeb({"search", "half"}).status, 3);
}

TEST_F(ProgramWithABookTest, ExitStatusTellsFoundNothingAndUsageApart) {
  EXPECT_EQ(zeb({"search", "half"}).status, 0);
  EXPECT_EQ(zeb({"search", "zebra"}).status, 1);
  EXPECT_EQ(zeb({"search"}).status, 2);
  EXPECT_EQ(zeb({}).status, 2);
  EXPECT_EQ(zeb({"--help"}).status, 0);
  EXPECT_EQ(zeb({"--version"}).status, 0);
}

TEST_F(ProgramTest, HelpIsPrintedToAPipeToo) {
  EXPECT_THAT(zeb({"--help"}).out, HasSubstr("search"));
  EXPECT_THAT(zeb({"scan", "--help"}).out, HasSubstr("--no-system"));
  EXPECT_EQ(shell(quoted(ZEB_PROGRAM) + " --help >/dev/full").status, 3);
}

TEST_F(ProgramTest, ErrorsGoToStandardErrorOnly) {
  const ProgramRun run = zeb({"search", "half"});
  EXPECT_EQ(run.out, "");
  EXPECT_EQ(run.err, "zeb: error: no book has been indexed yet; 'zeb scan' looks for some\n");
}

TEST_F(ProgramWithABookTest, PipeIsPlainAndTerminalIsColoured) {
  const ProgramRun piped = zeb({"search", "half"});
  EXPECT_THAT(piped.out, Not(HasSubstr("\033")));
  EXPECT_THAT(piped.out, HasSubstr("Search with words and half words"));
  EXPECT_THAT(onTerminal({"search", "half"}),
              HasSubstr("\033[1mSearch with words and half words\033[0m"));
  EXPECT_THAT(onTerminal({"search", "half", "--color=never"}), Not(HasSubstr("\033")));
}

TEST_F(ProgramWithABookTest, NoColorVariableCountsUnlessItIsEmpty) {
  EXPECT_THAT(onTerminal({"search", "half"}, "1"), Not(HasSubstr("\033")));
  EXPECT_THAT(onTerminal({"search", "half"}, ""), HasSubstr("\033[1m"));
  EXPECT_THAT(onTerminal({"search", "half", "--color=always"}, "1"), HasSubstr("\033[1m"));
}

TEST_F(ProgramWithABookTest, ArgumentsThatAreNoTextAreRepaired) {
  const ProgramRun run = zeb({"search", "--json", "caf\xE9\xFF half"});
  EXPECT_EQ(run.status, 0);
  EXPECT_EQ(nlohmann::json::parse(run.out)["query"], "caf\xEF\xBF\xBD\xEF\xBF\xBD half");
}

TEST_F(ProgramWithABookTest, FullDiskBehindTheOutputIsAFailure) {
  const ProgramRun run = shell(quoted(ZEB_PROGRAM) + " search half >/dev/full");
  EXPECT_EQ(run.status, 3);
  EXPECT_THAT(run.err, HasSubstr("cannot write"));
}

TEST_F(ProgramTest, CachesFolderThatCannotBeMadeIsNamed) {
  files.write("cache", "a file");
  const ProgramRun run = zeb({"scan", "--no-system", tests::shippedBook("manual")});
  EXPECT_EQ(run.status, 3);
  EXPECT_THAT(run.err, HasSubstr("zeb: error: org.zeb.manual: " + files.path("cache")));
}

TEST_F(ProgramTest, IndexOfTheToolAndOfTheCommandAreTheSameBytes) {
  const std::string ofTool = files.path("tool.helpindex");
  const std::string ofCommand =
      files.path("cache/org.zeb.zebd/GeneratedIndexes/org.zeb.manual/org.zeb.manual.helpindex");
  const std::string manual = tests::shippedBook("manual");
  ASSERT_EQ(shell(quoted(ZEB_TOOL) + " --create --anchors --generate-summaries --file " +
                  quoted(ofTool) + " --min-term-length 3 " + quoted(manual))
                .status,
            0);
  ASSERT_EQ(zeb({"index", manual}).status, 0);
  std::ifstream a(ofTool, std::ios::binary);
  std::ifstream b(ofCommand, std::ios::binary);
  const std::string bytes((std::istreambuf_iterator<char>(a)), {});
  EXPECT_FALSE(bytes.empty());
  EXPECT_EQ(bytes, std::string((std::istreambuf_iterator<char>(b)), {}));
}

TEST_F(ProgramTest, TwoScansAtOnceBothSucceedAndLeaveAWholeCatalogue) {
  const std::string scan = quoted(ZEB_PROGRAM) + " scan --force --no-system " +
                           quoted(tests::shippedBook("manual")) + " " +
                           quoted(tests::shippedBook("offline"));
  const std::string cache = "export ZEB_CACHE_DIR=" + quoted(files.path("cache")) + "; ";
  EXPECT_EQ(shell("true; " + cache + scan + " & " + scan +
                  "; a=$?; wait $!; b=$?; "
                  "test $a$b = 00")
                .status,
            0);
  EXPECT_EQ(zeb({"search", "half"}).status, 0);
  size_t count = 0;
  for (const auto& file : std::filesystem::directory_iterator(files.path("cache/books"))) {
    EXPECT_THAT(file.path().string(), testing::EndsWith(".plist"));
    ++count;
  }
  EXPECT_EQ(count, 2U);
}

TEST_F(ProgramWithABookTest, IndexesAreRememberedInTheCacheFile) {
  const std::string cache = caches() + "/org.zeb.zebd/HelpindexCache.plist";
  ASSERT_TRUE(std::filesystem::exists(cache));
  const auto before = std::filesystem::last_write_time(cache);
  const ProgramRun run = zeb({"search", "half", "--verbose", "--verbose", "--verbose"});
  EXPECT_EQ(run.status, 0);
  EXPECT_EQ(std::filesystem::last_write_time(cache), before);
  EXPECT_THAT(run.err, Not(HasSubstr("Writing generated index")));
}

TEST_F(ProgramTest, EndsAtOnceThoughBooksAreStillBeingIndexedWhenToldNotToWait) {
  ASSERT_EQ(zeb({"scan", "--no-wait", "--no-system", tests::shippedBook("manual")}).status, 0);
  const ProgramRun run = zeb({"search", "half", "--no-wait"});
  EXPECT_EQ(run.err, "zeb: 1 book is not indexed yet\nzeb: nothing found for half\n");
  EXPECT_EQ(run.status, 1);
  EXPECT_EQ(zeb({"search", "half"}).status, 0);
}

TEST_F(ProgramWithABookTest, SearchWithoutWordsOnATerminalSearchesWhileOneTypes) {
  std::vector<std::string> arguments = {ZEB_PROGRAM, "search", "--cache-dir", caches()};
  std::vector<char*> pointers;
  for (std::string& argument : arguments) {
    pointers.push_back(argument.data());
  }
  pointers.push_back(nullptr);
  int terminal = -1;
  const pid_t child = forkpty(&terminal, nullptr, nullptr, nullptr);
  if (child == 0) {
    execv(pointers[0], pointers.data());
    _exit(127);
  }
  std::string output;
  // Reads until the text has been shown; the child's end closes the terminal.
  const auto waitFor = [&](const std::string& text) {
    std::array<char, 4096> buffer{};
    while (output.find(text) == std::string::npos) {
      const ssize_t count = read(terminal, buffer.data(), buffer.size());
      if (count <= 0) {
        return false;
      }
      output.append(buffer.data(), static_cast<size_t>(count));
    }
    output.clear();
    return true;
  };
  const auto type = [&](const std::string& keys) {
    EXPECT_EQ(write(terminal, keys.data(), keys.size()), static_cast<ssize_t>(keys.size()));
  };
  EXPECT_TRUE(waitFor("search: "));
  type("hal");
  EXPECT_TRUE(waitFor("half"));
  type("f words");
  EXPECT_TRUE(waitFor("Search with words and half words"));
  type("\x1B[B");
  EXPECT_TRUE(waitFor("\033[7m> "));
  type("\x1B");
  EXPECT_FALSE(waitFor("never shown"));
  close(terminal);
  int status = -1;
  waitpid(child, &status, 0);
  EXPECT_EQ(status, 0);
}

TEST_F(ProgramTest, SearchWithoutWordsNeedsATerminal) {
  const ProgramRun run = shell(quoted(ZEB_PROGRAM) + " search </dev/null");
  EXPECT_EQ(run.status, 2);
  EXPECT_EQ(run.err,
            "zeb: error: search: words are needed where there is no terminal to type them\n");
}

TEST_F(ProgramTest, DemonstrationSearchesWithoutAnyHelpOnTheComputer) {
  const std::string demo = "ZEB_DEMO_ROOT=" + quoted(files.path("nothing")) + " " +
                           quoted(std::string(ZEB_SOURCE_DIR) + "/scripts/demo") + " " +
                           quoted(ZEB_BUILD_DIR);
  const ProgramRun shown = shell(demo);
  EXPECT_EQ(shown.status, 0) << shown.err;
  EXPECT_THAT(shown.out, HasSubstr("Search with words and half words"));
  EXPECT_THAT(shown.out, HasSubstr("not-connected.html"));
  const ProgramRun searched = shell(demo + " 'opera phra'");
  EXPECT_EQ(searched.status, 0) << searched.err;
  EXPECT_THAT(searched.out, HasSubstr("1. Narrow a search with operators and phrases"));
  EXPECT_EQ(shell(demo + " zebra").status, 1);
}

}  // namespace
