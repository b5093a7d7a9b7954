// The guard that keeps two runs of the tool from one file.
#include <fcntl.h>
#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <spawn.h>
#include <sys/wait.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <filesystem>

#include "plugin/records/ZEBIndex.h"
#include "plugin/shelf/ZEBIndexGenerationOperation.h"
#include "tests/plugin/shelf/ShelfWorld.h"

using testing::ElementsAre;
using testing::IsEmpty;
using tests::LogEntry;
using tests::ShelfWorld;

namespace {

class GenerationGuard : public testing::Test {
 protected:
  GenerationGuard() {
    world.makeShelf();
    world.launcher->behave(tests::writesIndex());
  }

  /// Whether a generation of org.one goes on to run the tool.
  bool goesOn() {
    const auto record = world.shelf->_generateIndexForBook(world.makeBook("org.one"), path, false);
    EXPECT_EQ(record != nullptr, !world.launcher->launches().empty());
    // Nothing is said of a run that is left to another.
    EXPECT_THAT(world.logged(),
                ElementsAre(LogEntry{3, "Writing generated index out to path: " + path}));
    return record != nullptr;
  }

  ShelfWorld world;
  const std::string path = world.generatedPath("org.one", "org.one");
};

TEST_F(GenerationGuard, letsTheToolRunWhereNoOtherDoes) {
  world.processes->add(1, "init", {"init"});
  world.processes->add(77, "editor", {"editor", "--file", path});
  EXPECT_TRUE(goesOn());
  EXPECT_THAT(world.processes->asked, IsEmpty());
}

TEST_F(GenerationGuard, abandonsAGenerationWhoseFileAToolIsWriting) {
  world.processes->add(77, "bvmake", {"/usr/bin/bvmake", "--create", "--file", path, "/books"});
  EXPECT_FALSE(goesOn());
  EXPECT_THAT(world.shelf->_knownIndices(), IsEmpty());
  EXPECT_THAT(world.observer->changes(), IsEmpty());
}

TEST_F(GenerationGuard, letsTheToolRunWhileAnotherWritesAnotherFile) {
  world.processes->add(77, "bvmake", {"/usr/bin/bvmake", "--file", path + ".other", "/books"});
  EXPECT_TRUE(goesOn());
  EXPECT_THAT(world.processes->asked, ElementsAre(77));
}

TEST_F(GenerationGuard, looksAtTheFirstToolAloneThoughTheSecondWritesTheFile) {
  world.processes->add(77, "bvmake", {"bvmake", "--file", "/another"});
  world.processes->add(78, "bvmake", {"bvmake", "--file", path});
  EXPECT_TRUE(goesOn());
  EXPECT_THAT(world.processes->asked, ElementsAre(77));
}

TEST_F(GenerationGuard, passesOverToolsOfProcessZeroAndOfLongerNames) {
  world.processes->add(0, "bvmake", {"bvmake", "--file", path});
  world.processes->add(5, "bvmake2", {"bvmake", "--file", path});
  world.processes->add(6, "/usr/bin/bvmake", {"bvmake", "--file", path});
  EXPECT_TRUE(goesOn());
  EXPECT_THAT(world.processes->asked, IsEmpty());
}

TEST_F(GenerationGuard, readsTheTableAgainUntilItIsLargeEnough) {
  world.processes->failures = {ENOMEM, ENOMEM, ENOMEM};
  EXPECT_TRUE(goesOn());
  EXPECT_EQ(world.processes->reads, 4);
}

TEST_F(GenerationGuard, abandonsAGenerationWhenTheTableCannotBeRead) {
  for (const int failure : {EPERM, EIO, ENOENT}) {
    world.processes->failures = {ENOMEM, failure};
    world.processes->reads = 0;
    world.log->clear();
    EXPECT_FALSE(goesOn());
    EXPECT_EQ(world.processes->reads, 2);
  }
}

TEST_F(GenerationGuard, letsTheToolRunWhereTheArgumentsOfTheOtherCannotBeRead) {
  world.processes->processes.push_back({77, "bvmake"});
  EXPECT_TRUE(goesOn());
}

TEST_F(GenerationGuard, letsTheToolRunWhereTheSizeOfArgumentsCannotBeTold) {
  world.processes->add(77, "bvmake", {"bvmake", "--file", path});
  world.processes->maximumSize.reset();
  EXPECT_TRUE(goesOn());
  EXPECT_THAT(world.processes->asked, IsEmpty());
}

TEST_F(GenerationGuard, anAbandonedGenerationUnmarksTheRecord) {
  world.processes->add(77, "bvmake", {"bvmake", "--file", path});
  const auto record = ZEBIndex::init();
  ZEBIndexGenerationOperation::initWithBook(world.makeBook("org.one"), record, world.shelf, false)
      ->start();
  EXPECT_FALSE(record->isRebuilding());
  EXPECT_THAT(world.launcher->launches(), IsEmpty());
}

class PidHasArgs : public testing::Test {
 protected:
  int search(const std::vector<std::string>& arguments, const std::vector<std::string>& strings) {
    world.processes->areas.clear();
    world.processes->add(7, "x", arguments);
    return pidHasArgs(7, strings, strings.size());
  }

  ShelfWorld world;
};

TEST_F(PidHasArgs, findsConsecutiveArguments) {
  EXPECT_EQ(search({"x", "--file", "/a"}, {"--file", "/a"}), 1);
  EXPECT_EQ(search({"x", "-v", "--file", "/a", "b"}, {"--file", "/a"}), 1);
  EXPECT_EQ(search({"x", "--file", "b", "/a"}, {"--file", "/a"}), -1);
  EXPECT_EQ(search({"x", "/a", "--file"}, {"--file", "/a"}), -1);
  EXPECT_EQ(search({"x", "--file"}, {"--file", "/a"}), -1);
  EXPECT_EQ(search({"x"}, {"--file", "/a"}), -1);
}

TEST_F(PidHasArgs, comparesOnlyTheFirstStringsThatAreCounted) {
  world.processes->add(7, "x", {"x", "--file", "/a"});
  EXPECT_EQ(pidHasArgs(7, {"--file", "/b"}, 1), 1);
  EXPECT_EQ(pidHasArgs(7, {"--file", "/b"}, 2), -1);
  EXPECT_EQ(pidHasArgs(7, {"--file"}, 2), -1);
  EXPECT_EQ(pidHasArgs(7, {}, 0), -1);
}

TEST_F(PidHasArgs, skipsTheProgramsOwnName) {
  EXPECT_EQ(search({"--file", "/a"}, {"--file", "/a"}), -1);
  EXPECT_EQ(search({"--file", "--file", "/a"}, {"--file", "/a"}), 1);
}

TEST_F(PidHasArgs, doesNotTestAnUnequalStringAgain) {
  // The second "--file" ends the first match and does not begin one of its own.
  EXPECT_EQ(search({"x", "--file", "--file", "/a"}, {"--file", "/a"}), -1);
}

TEST_F(PidHasArgs, takesPaddingAsEmptyStrings) {
  EXPECT_EQ(search({"x", "", "", "--file", "/a"}, {"--file", "/a"}), 1);
  EXPECT_EQ(search({"x", "--file", "", "/a"}, {"--file", "/a"}), -1);
}

TEST_F(PidHasArgs, ignoresAnArgumentThatIsNotEnded) {
  world.processes->areas[7] = std::string("x\0--file\0/a", 11);
  EXPECT_EQ(pidHasArgs(7, {"--file", "/a"}, 2), -1);
  world.processes->areas[7] = "x";
  EXPECT_EQ(pidHasArgs(7, {"--file", "/a"}, 2), -1);
  world.processes->areas[7] = "";
  EXPECT_EQ(pidHasArgs(7, {"--file", "/a"}, 2), -1);
}

TEST_F(PidHasArgs, readsNoMoreThanTheLargestArea) {
  world.processes->maximumSize = 12;
  EXPECT_EQ(search({"x", "--file", "/ab"}, {"--file", "/ab"}), -1);
  world.processes->maximumSize = 13;
  EXPECT_EQ(search({"x", "--file", "/ab"}, {"--file", "/ab"}), 1);
}

TEST_F(PidHasArgs, failsForAProcessThatIsNotThere) {
  EXPECT_EQ(pidHasArgs(4711, {"--file", "/a"}, 2), -1);
}

TEST_F(PidHasArgs, printsEachArgumentOnALineOfItsOwnUpToTheMatch) {
  search({"x", "-v", "", "--file", "/a", "after"}, {"--file", "/a"});
  EXPECT_EQ(world.printed, "-v\n\n--file\n/a\n");
  world.printed.clear();
  search({"x", "-v", "b"}, {"--file", "/a"});
  EXPECT_EQ(world.printed, "-v\nb\n");
}

/// A real process that is called like the tool and waits until it is let go.
class RealTool {
 public:
  RealTool(const std::string& folder, const std::string& outputPath) {
    const std::string program = folder + "/bvmake";
    std::filesystem::copy_file("/bin/sh", program,
                               std::filesystem::copy_options::overwrite_existing);
    int toChild[2];
    int fromChild[2];
    EXPECT_EQ(::pipe2(toChild, O_CLOEXEC), 0);
    EXPECT_EQ(::pipe2(fromChild, O_CLOEXEC), 0);
    posix_spawn_file_actions_t actions;
    posix_spawn_file_actions_init(&actions);
    posix_spawn_file_actions_adddup2(&actions, toChild[0], STDIN_FILENO);
    posix_spawn_file_actions_adddup2(&actions, fromChild[1], STDOUT_FILENO);
    std::vector<std::string> words = {program,  "-c",       "echo ready; read line",
                                      "--file", outputPath, "--verbose"};
    std::vector<char*> arguments;
    arguments.reserve(words.size() + 1);
    for (std::string& word : words) {
      arguments.push_back(word.data());
    }
    arguments.push_back(nullptr);
    EXPECT_EQ(
        posix_spawn(&processID, program.c_str(), &actions, nullptr, arguments.data(), environ), 0);
    posix_spawn_file_actions_destroy(&actions);
    ::close(toChild[0]);
    ::close(fromChild[1]);
    char ready = 0;
    EXPECT_EQ(::read(fromChild[0], &ready, 1), 1);
    ::close(fromChild[0]);
    _input = toChild[1];
  }

  ~RealTool() {
    ::close(_input);
    int status = 0;
    ::waitpid(processID, &status, 0);
    // It was left alone: it ended by itself.
    EXPECT_TRUE(WIFEXITED(status));
  }
  RealTool(const RealTool&) = delete;
  RealTool& operator=(const RealTool&) = delete;

  pid_t processID = 0;

 private:
  int _input = -1;
};

/// The real table, without tools that others run on this machine at the same time.
class OwnProcesses : public platform::ProcessTable {
 public:
  explicit OwnProcesses(pid_t tool) : _tool(tool) {}
  int readProcesses(std::vector<platform::ProcessEntry>& entries) const override {
    const int failure = ProcessTable::readProcesses(entries);
    std::erase_if(entries, [&](const platform::ProcessEntry& entry) {
      return entry.commandName == "bvmake" && entry.processID != _tool;
    });
    return failure;
  }

 private:
  const pid_t _tool;
};

TEST_F(GenerationGuard, findsARealToolThatWritesTheFileAndLeavesItAlone) {
  const RealTool tool(world.folder.path(), path);
  world.change([&](platform::Environment& environment) {
    environment.processTable = std::make_shared<OwnProcesses>(tool.processID);
  });
  EXPECT_FALSE(goesOn());
  EXPECT_EQ(world.printed, "-c\necho ready; read line\n--file\n" + path + "\n");
}

TEST_F(GenerationGuard, letsTheToolRunBesideARealOneThatWritesAnotherFile) {
  const RealTool tool(world.folder.path(), path + ".other");
  world.change([&](platform::Environment& environment) {
    environment.processTable = std::make_shared<OwnProcesses>(tool.processID);
  });
  EXPECT_TRUE(goesOn());
}

TEST_F(GenerationGuard, readsTheArgumentsOfThisVeryProcess) {
  world.change([](platform::Environment& environment) {
    environment.processTable = platform::systemProcessTable();
  });
  EXPECT_EQ(pidHasArgs(::getpid(), {"no argument of this program"}, 1), -1);
}

}  // namespace
