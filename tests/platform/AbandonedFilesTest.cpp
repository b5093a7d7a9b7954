#include "platform/AbandonedFiles.h"

#include <gtest/gtest.h>

#include <sys/wait.h>
#include <unistd.h>

#include <cerrno>
#include <filesystem>
#include <memory>
#include <optional>
#include <string>
#include <vector>

#include "platform/Environment.h"
#include "platform/Processes.h"
#include "tests/platform/TemporaryFolder.h"

using platform::removeAbandonedFiles;

namespace {

using Names = std::vector<std::string>;

/// Knows of this process alone, or cannot tell.
class OneProcess : public platform::ProcessTable {
 public:
  int readProcesses(std::vector<platform::ProcessEntry>& entries) const override {
    entries = {{77, "host"}};
    return error;
  }
  int error = 0;
};

class AbandonedFiles : public testing::Test {
 protected:
  AbandonedFiles() {
    platform::Environment environment = platform::Environment::system();
    environment.processTable = processes;
    _override.emplace(std::move(environment));
  }
  Names names() const {
    return platform::systemFileManager()->namesInDirectory(folder.path("a")).value_or(Names());
  }
  void leave(const Names& files) const {
    for (const std::string& name : files) {
      folder.write("a/" + name, "half");
    }
  }

  const std::shared_ptr<OneProcess> processes = std::make_shared<OneProcess>();
  tests::TemporaryFolder folder;

 private:
  std::optional<platform::EnvironmentOverride> _override;
};

}  // namespace

TEST_F(AbandonedFiles, ofProcessesThatHaveEndedAreDeleted) {
  leave({".book*1.0.78.0.tmp", ".model.79.12.tmp", ".model.77.0.tmp", "model"});
  removeAbandonedFiles(folder.path("a"));
  EXPECT_EQ(names(), (Names{".model.77.0.tmp", "model"}));
}

TEST_F(AbandonedFiles, ofOneNameAloneMayBeDeleted) {
  leave({".model.78.0.tmp", ".model.more.78.0.tmp", ".mode.78.0.tmp"});
  removeAbandonedFiles(folder.path("a"), "model");
  EXPECT_EQ(names(), (Names{".mode.78.0.tmp", ".model.more.78.0.tmp"}));
}

TEST_F(AbandonedFiles, areNotToBeTakenForOthers) {
  const Names others{
      ".a.-.0.tmp", ".a.78.tmp",  ".a.78x.0.tmp", ".a..0.tmp",       ".a.x.tmp",
      ".tmp",       "a.78.0.tmp", "tmp",          ".a.78.0.tmp.bak", ".a.9999999999999.0.tmp"};
  leave(others);
  removeAbandonedFiles(folder.path("a"), "a");
  EXPECT_EQ(names().size(), others.size());
}

TEST_F(AbandonedFiles, stayWhereTheProcessesCannotBeListed) {
  leave({".model.78.0.tmp"});
  processes->error = EPERM;
  removeAbandonedFiles(folder.path("a"));
  EXPECT_EQ(names().size(), 1U);
}

TEST_F(AbandonedFiles, ofAFolderThatIsNotThereAreNone) {
  removeAbandonedFiles(folder.path("none"));
  EXPECT_FALSE(std::filesystem::exists(folder.path("none")));
}

TEST_F(AbandonedFiles, areThoseOfAWriteThatNeverEnded) {
  platform::Environment environment = platform::Environment::system();
  const platform::EnvironmentOverride override(environment);
  folder.write("a/file", "whole");
  const pid_t child = ::fork();
  if (child == 0) {
    ::_exit(0);
  }
  ASSERT_EQ(::waitpid(child, nullptr, 0), child);
  leave({".file." + std::to_string(child) + ".3.tmp",
         ".file." + std::to_string(::getpid()) + ".0.tmp"});
  removeAbandonedFiles(folder.path("a"), "file");
  EXPECT_EQ(names(), (Names{".file." + std::to_string(::getpid()) + ".0.tmp", "file"}));
}
