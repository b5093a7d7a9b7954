// The real indexing tool, run by the real operation.
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <filesystem>

#include "SearchKit/SearchKit.h"
#include "plugin/operations/ZEBOperationQueue.h"
#include "plugin/records/ZEBHelpindexIndex.h"
#include "plugin/shelf/ZEBIndexGenerationOperation.h"
#include "tests/plugin/shelf/ShelfWorld.h"

using testing::ElementsAre;
using testing::IsEmpty;
using tests::ShelfWorld;

namespace {

constexpr const char* toolPath = "/usr/bin/bvmake";

class GenerationTool : public testing::Test {
 protected:
  GenerationTool() {
    world.change([](platform::Environment& environment) {
      environment.processLauncher = platform::substitutingProcessLauncher(toolPath, BVMAKE_PROGRAM);
    });
  }

  static void expectUsable(const std::shared_ptr<ZEBIndex>& index) {
    const auto record = std::dynamic_pointer_cast<ZEBHelpindexIndex>(index);
    ASSERT_NE(record, nullptr);
    SKIndexRef opened = record->copyIndexRef();
    ASSERT_NE(opened, nullptr);
    EXPECT_TRUE(record->isSearchable());
    EXPECT_TRUE(record->hasAnchors());
    record->disposeIndexRef(opened);
  }

  /// What lies in a book's generated folder.
  std::vector<std::string> generatedFiles(const std::string& bookID) const {
    std::vector<std::string> names;
    for (const auto& entry :
         std::filesystem::directory_iterator(world.generatedRoot() + "/" + bookID)) {
      names.push_back(entry.path().filename());
    }
    return names;
  }

  ShelfWorld world;
};

TEST_F(GenerationTool, makesAnIndexThatTheShelfServes) {
  const auto book = world.makeBook("org.one");
  world.makeShelf();
  EXPECT_THAT(world.shelf->indicesForBook(book), IsEmpty());
  world.finishWork();
  EXPECT_THAT(world.log->messages(0), IsEmpty());
  const auto found = world.shelf->indicesForBook(book);
  ASSERT_EQ(found.size(), 1U);
  expectUsable(found.front());
  EXPECT_THAT(world.observer->kinds(), ElementsAre(ZEBIndexChangeUpdated));
}

TEST_F(GenerationTool, isServedFromTheCacheFileInTheNextProcess) {
  const auto book = world.makeBook("org.one");
  world.makeShelf().indicesForBook(book);
  world.finishWork();
  ASSERT_TRUE(ShelfWorld::exists(world.cachePath()));
  world.makeShelf();
  const auto record = world.knownRecord("org.one");
  expectUsable(record);
  EXPECT_EQ(world.shelf->indicesForBook(book).front(), record);
}

TEST_F(GenerationTool, reportsAFolderThatIsNotThere) {
  const auto book = ZEBHelpBook::bookWithID("org.one", 1, world.folder.path("missing"));
  world.makeShelf().indicesForBook(book);
  world.finishWork();
  ASSERT_EQ(world.log->messages(0).size(), 1U);
  EXPECT_THAT(world.log->messages(0).front(),
              testing::StartsWith("Task at /usr/bin/bvmake failed with error 1. Arguments ["));
  EXPECT_THAT(world.shelf->_knownIndices(), IsEmpty());
}

TEST_F(GenerationTool, thatIsNotInstalledIsReportedAsAnException) {
  world.change([&](platform::Environment& environment) {
    environment.processLauncher =
        platform::substitutingProcessLauncher(toolPath, world.folder.path("no-tool"));
  });
  world.makeShelf().indicesForBook(world.makeBook("org.one"));
  world.finishWork();
  ASSERT_EQ(world.log->messages(0).size(), 1U);
  EXPECT_THAT(world.log->messages(0).front(),
              testing::StartsWith("Task at /usr/bin/bvmake threw exception: "));
}

TEST_F(GenerationTool, twoRunsOfItOnOneFileAtOnceLeaveAWholeFile) {
  const auto book = world.makeBook("org.one");
  world.makeShelf();
  const std::string path = world.generatedPath("org.one", "org.one");
  std::filesystem::create_directories(world.generatedRoot() + "/org.one");
  for (int round = 0; round < 3; ++round) {
    std::vector<std::thread> runs;
    runs.reserve(3);
    for (int i = 0; i < 3; ++i) {
      runs.emplace_back([&] {
        EXPECT_EQ(platform::systemProcessLauncher()->launchAndWait(
                      BVMAKE_PROGRAM, {"--create", "--anchors", "--file", path, book->path()}),
                  0);
      });
    }
    for (std::thread& run : runs) {
      run.join();
    }
    expectUsable(ZEBIndex::indexWithPath(path));
    EXPECT_THAT(generatedFiles("org.one"), ElementsAre("org.one.helpindex"));
  }
}

TEST_F(GenerationTool, runByTwoProcessesForOneBookAtOnceLeavesAWholeFileAndAnIndexInOneAtLeast) {
  const auto book = world.makeBook("org.one");
  world.makeShelf();
  world.change([](platform::Environment& environment) {
    environment.processTable = platform::systemProcessTable();
  });
  for (int round = 0; round < 4; ++round) {
    std::vector<int> statuses(2, -1);
    std::vector<std::thread> others;
    others.reserve(statuses.size());
    for (int& status : statuses) {
      others.emplace_back([&, place = &status] {
        *place = platform::systemProcessLauncher()->launchAndWait(
            GENERATE_ONCE_PROGRAM, {BVMAKE_PROGRAM, world.caches, "org.one", book->path()});
      });
    }
    world.shelf->removeIndexForBookID("org.none");
    ZEBIndexGenerationOperation::initWithBook(book, nullptr, world.shelf, false)->start();
    for (std::thread& other : others) {
      other.join();
    }
    const bool hereToo = world.knownRecord("org.one") != nullptr;
    for (const int status : statuses) {
      // Made it, or left it to whoever was first.
      EXPECT_TRUE(status == 0 || status == 3) << status;
    }
    EXPECT_TRUE(hereToo || std::count(statuses.begin(), statuses.end(), 0) > 0);
    expectUsable(ZEBIndex::indexWithPath(world.generatedPath("org.one", "org.one")));
    EXPECT_THAT(generatedFiles("org.one"), ElementsAre("org.one.helpindex"));
    world.shelf->removeIndexForBookID("org.one");
    EXPECT_FALSE(ShelfWorld::exists(world.generatedRoot() + "/org.one"));
  }
  EXPECT_THAT(world.log->messages(0), IsEmpty());
}

}  // namespace
