#include "zeb/IndexingTools.h"

#include <gtest/gtest.h>

#include <cerrno>
#include <map>
#include <memory>
#include <string>
#include <utility>
#include <vector>

#include "platform/Environment.h"
#include "platform/Processes.h"

namespace {

using namespace std::string_literals;

/// Processes by number: name and arguments.
class MadeTable : public platform::ProcessTable {
 public:
  int readProcesses(std::vector<platform::ProcessEntry>& entries) const override {
    entries.clear();
    for (const auto& [number, process] : processes) {
      platform::ProcessEntry entry;
      entry.processID = number;
      entry.commandName = process.first;
      entries.push_back(std::move(entry));
    }
    return failure;
  }
  std::optional<platform::Data> argumentsOfProcess(int processID) const override {
    const std::string& arguments = processes.at(processID).second;
    return arguments.empty() ? std::nullopt : std::optional(platform::Data::copy(arguments));
  }

  std::map<int, std::pair<std::string, std::string>> processes;
  int failure = 0;
};

class IndexingToolsTest : public testing::Test {
 protected:
  IndexingToolsTest() : _environment(_made()) {}

  const std::shared_ptr<MadeTable> table = std::make_shared<MadeTable>();

 private:
  platform::Environment _made() const {
    platform::Environment environment = *platform::Environment::current();
    environment.cachesDirectory = "/home/me/.cache";
    environment.processTable = table;
    return environment;
  }

  platform::EnvironmentOverride _environment;
};

TEST_F(IndexingToolsTest, ThoseThatWriteForTheUserAreCounted) {
  const std::string mine = "/home/me/.cache/org.zeb.zebd/GeneratedIndexes/";
  table->processes[10] = {"bvmake", "bvmake\0--file\0"s + mine + "a/a.helpindex\0/pages\0"s};
  table->processes[11] = {"bvmake", "bvmake\0--file\0"s + mine + "b/en.helpindex\0/pages\0"s};
  EXPECT_EQ(zeb::runningIndexingToolCount(), 2U);
}

TEST_F(IndexingToolsTest, OtherUsersAndOtherProgramsAndFilesElsewhereDoNotCount) {
  const std::string mine = "/home/me/.cache/org.zeb.zebd/GeneratedIndexes/";
  table->processes[10] = {"bvmake", "bvmake\0--file\0/home/you"s + mine + "a/a.helpindex\0"s};
  table->processes[11] = {"bvmake", "bvmake\0--create\0--file\0/tmp/a.helpindex\0"s};
  table->processes[12] = {"editor", "editor\0"s + mine + "a/a.helpindex\0"s};
  table->processes[13] = {"bvmake", ""};
  EXPECT_EQ(zeb::runningIndexingToolCount(), 0U);
}

TEST_F(IndexingToolsTest, TableThatCannotBeReadHasNone) {
  table->processes[10] = {"bvmake",
                          "bvmake\0/home/me/.cache/org.zeb.zebd/GeneratedIndexes/a/a.helpindex\0"s};
  table->failure = EIO;
  EXPECT_EQ(zeb::runningIndexingToolCount(), 0U);
}

}  // namespace
