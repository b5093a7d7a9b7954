// Hosts that are killed in the middle of building models and of keeping them in step with books, at
// steps that they come to themselves, in the middle of a file, and from outside as soon as they are
// seen to have got so far. ZEB_KILLS=n kills n times each instead of the usual number.
#include <gtest/gtest.h>

#include <spawn.h>
#include <sys/wait.h>

#include <array>
#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <thread>

#include "tests/LUXPlugin/DoomedHost.h"
#include "tests/LUXPlugin/LUXWorld.h"

namespace fs = std::filesystem;

namespace {

class KilledHost : public testing::Test {
 protected:
  KilledHost() : steps(folder.write("steps", std::string(8, '\0'))) {
    writeBook(KROrvHelpbookID, tests::printerPages());
    writeBook(tests::doomedHostKitchen, tests::kitchenPages());
  }

  static uint64_t rounds() {
    // Read before any thread runs that could change it; none does.
    const char* const asked = std::getenv("ZEB_KILLS");  // NOLINT(concurrency-mt-unsafe)
    return asked == nullptr ? 9 : std::strtoull(asked, nullptr, 10);
  }

  void writeBook(const std::string& bookID, const std::vector<tests::LUXPage>& pages) const {
    std::vector<searchkit::Document> documents;
    for (const tests::LUXPage& each : pages) {
      documents.push_back(tests::page("/" + each.key, each.title, each.blocks.front()));
    }
    folder.write("books/" + bookID + "/book.helpindex",
                 platform::classicArchiveWithRootObject(
                     platform::Value::Dictionary{
                         {"SKI_INDEX_DATA", tests::keywordIndex(std::move(documents))},
                         {"LUXIndexData", tests::LUXWorld::semanticData(pages)}})
                     .view());
  }

  pid_t start(const std::string& work, uint64_t dieAt = 0, uint64_t fileLimit = 0) {
    steps.forget();
    std::array<std::string, 6> words{DOOMED_HOST_PROGRAM,   work,
                                     folder.path(),         folder.path("steps"),
                                     std::to_string(dieAt), std::to_string(fileLimit)};
    std::array<char*, 7> arguments{};
    for (size_t i = 0; i < words.size(); ++i) {
      arguments[i] = words[i].data();
    }
    pid_t child = -1;
    EXPECT_EQ(::posix_spawn(&child, arguments[0], nullptr, nullptr, arguments.data(), environ), 0);
    return child;
  }

  /// Waits for the end of a process that is killed, here or by itself.
  void expectKilled(pid_t child, uint64_t killAfter = 0) {
    int status = 0;
    pid_t ended = 0;
    while (killAfter > 0 && steps.count() < killAfter && ended == 0) {
      std::this_thread::sleep_for(std::chrono::microseconds(50));
      ended = ::waitpid(child, &status, WNOHANG);
    }
    if (killAfter > 0 && ended == 0) {
      ASSERT_EQ(::kill(child, SIGKILL), 0);
    }
    if (ended == 0) {
      ASSERT_EQ(::waitpid(child, &status, 0), child);
    }
    ASSERT_TRUE(WIFSIGNALED(status) && WTERMSIG(status) == SIGKILL) << "status " << status;
  }

  /// The next start: all is found, and nothing of the killed one is left after a build.
  void expectGoodStart() {
    int status = -1;
    const pid_t child = start(tests::doomedHostServes);
    ASSERT_EQ(::waitpid(child, &status, 0), child);
    EXPECT_EQ(status, 0);
    for (const auto& entry : fs::recursive_directory_iterator(folder.path("caches"))) {
      EXPECT_NE(entry.path().extension(), ".tmp") << entry.path();
    }
  }

  /// Every model that is there is whole.
  void expectWholeModels() const {
    const fs::path models = folder.path("caches/org.zeb.zebd/Models");
    if (!fs::exists(models)) {
      return;
    }
    for (const auto& group : fs::directory_iterator(models)) {
      const std::string directory = (group.path() / "English").string();
      if (fs::exists(directory + "/LUXModel")) {
        const auto model = HelpLUXModel::initWithDirectoryPath(directory, "English");
        ASSERT_TRUE(model);
        model->loadLSMMap();
        EXPECT_FALSE(model->needsBuild()) << directory;
      }
    }
  }

  /// Kills one at a step of its own, one in the middle of a file, one from outside, and so on.
  void killAgainAndAgain(const std::string& work) {
    // How far a host gets that begins from nothing and does the work twice or so.
    expectKilled(start(work), manySteps);
    constexpr uint64_t largeFile = 20000;
    for (uint64_t round = 0; round < rounds() && !HasFailure(); ++round) {
      SCOPED_TRACE("round " + std::to_string(round));
      // Any order of the numbers will do.
      const uint64_t number = round * 37 % 101;
      if (round % 8 == 7) {
        fs::remove_all(folder.path("caches"));
      }
      switch (round % 3) {
        case 0:
          expectKilled(start(work, 1 + number * manySteps / 101));
          break;
        case 1:
          expectKilled(start(work, manySteps * 10, 1 + number * largeFile / 101));
          break;
        default:
          expectKilled(start(work), 1 + number * manySteps / 101);
          break;
      }
      expectWholeModels();
      expectGoodStart();
    }
  }

  static constexpr uint64_t manySteps = 200;

  tests::TemporaryFolder folder;
  tests::SharedSteps steps;
};

TEST_F(KilledHost, inTheMiddleOfABuildLeavesWhatTheNextCanUse) {
  killAgainAndAgain(tests::doomedHostBuilds);
}

TEST_F(KilledHost, inTheMiddleOfASynchronisationLeavesWhatTheNextCanUse) {
  killAgainAndAgain(tests::doomedHostSynchronises);
}

}  // namespace
