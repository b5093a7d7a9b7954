// Indexes made by the indexing tool: what is run, and what becomes of its output.
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <cerrno>
#include <filesystem>

#include "host/Zebrine/ZEBConstants.h"
#include "platform/Exception.h"
#include "platform/UserDefaults.h"
#include "plugin/operations/ZEBOperationQueue.h"
#include "plugin/records/ZEBHelpindexIndex.h"
#include "plugin/shelf/ZEBIndexGenerationOperation.h"
#include "tests/plugin/shelf/ShelfWorld.h"

using platform::FailingFileManager;
using platform::Value;
using testing::Contains;
using testing::ElementsAre;
using testing::IsEmpty;
using tests::LogEntry;
using tests::RecordingLauncher;
using tests::ShelfWorld;

namespace {

constexpr const char* tool = "/usr/bin/bvmake";

class Generation : public testing::Test {
 protected:
  /// Runs one operation on this thread.
  void generate(const std::shared_ptr<ZEBHelpBook>& book,
                const std::shared_ptr<ZEBIndex>& existing = nullptr, bool onlyLUX = false) {
    ZEBIndexGenerationOperation::initWithBook(book, existing, world.shelf, onlyLUX)->start();
  }

  std::vector<std::string> argumentsOfOnlyLaunch() const {
    const auto launches = world.launcher->launches();
    EXPECT_EQ(launches.size(), 1U);
    return launches.empty() ? std::vector<std::string>() : launches.front().arguments;
  }

  void setLogLevel(const Value& level) {
    world.change([&](platform::Environment& environment) {
      environment.userDefaults =
          platform::userDefaultsFromDictionary(Value::Dictionary{{"LogLevel", level}});
    });
  }

  size_t verbosityOfOnlyLaunch() const {
    const auto arguments = argumentsOfOnlyLaunch();
    return static_cast<size_t>(std::count(arguments.begin(), arguments.end(), "--verbose"));
  }

  ShelfWorld world;
};

TEST_F(Generation, runsTheInstalledToolWithTheExactCommandLine) {
  const auto book = world.makeBook("org.one");
  book->setLocalization("de");
  world.makeShelf();
  generate(book);
  const auto launches = world.launcher->launches();
  ASSERT_EQ(launches.size(), 1U);
  EXPECT_EQ(launches.front().path, tool);
  EXPECT_THAT(launches.front().arguments,
              ElementsAre("--create", "--anchors", "--generate-summaries", "--file",
                          world.generatedPath("org.one", "de"), "--min-term-length", "3",
                          "--lowered-priority", book->path()));
}

TEST_F(Generation, deletesWhatHostsAndToolsLeftThatWereKilledWhileTheyWrote) {
  world.processes->add(77, "host");
  const std::string folder =
      platform::stringByDeletingLastPathComponent(world.generatedPath("org.one", "de"));
  ASSERT_EQ(world.files->createDirectoryWithParents(folder), std::nullopt);
  for (const char* name : {"/.de.helpindex.76.0.tmp", "/.de.helpindex.77.0.tmp"}) {
    ASSERT_EQ(world.files->writeAtomically(folder + name, {}), std::nullopt);
  }
  const auto book = world.makeBook("org.one");
  book->setLocalization("de");
  world.makeShelf();
  generate(book);
  EXPECT_EQ(world.files->namesInDirectory(folder),
            std::vector<std::string>{".de.helpindex.77.0.tmp"});
}

TEST_F(Generation, asksForSemanticDataAloneWithOneMoreWord) {
  const auto book = world.makeBookWithIndex("org.one");
  const auto record = world.makeShelf(false).indicesForBook(book).front();
  generate(book, record, true);
  EXPECT_THAT(argumentsOfOnlyLaunch(),
              ElementsAre("--create", "--anchors", "--generate-summaries", "--file",
                          world.generatedPath("org.one", "org.one"), "--min-term-length", "3",
                          "--append-LUX-only", "--lowered-priority", book->path()));
}

TEST_F(Generation, atLogLevelTwoSaysVerboseTwiceBetweenThePriorityAndTheFolder) {
  setLogLevel(2);
  const auto book = world.makeBook("org.one");
  world.makeShelf();
  generate(book);
  const auto arguments = argumentsOfOnlyLaunch();
  ASSERT_GE(arguments.size(), 4U);
  EXPECT_THAT(std::vector<std::string>(arguments.end() - 4, arguments.end()),
              ElementsAre("--lowered-priority", "--verbose", "--verbose", book->path()));
}

TEST_F(Generation, atLogLevelZeroIsNotVerbose) {
  setLogLevel(0);
  world.makeShelf();
  generate(world.makeBook("org.one"));
  EXPECT_EQ(verbosityOfOnlyLaunch(), 0U);
}

TEST_F(Generation, atANegativeLogLevelIsNotVerbose) {
  setLogLevel(-3);
  world.makeShelf();
  generate(world.makeBook("org.one"));
  EXPECT_EQ(verbosityOfOnlyLaunch(), 0U);
}

TEST_F(Generation, readsALogLevelThatIsWrittenAsAString) {
  setLogLevel("6");
  world.makeShelf();
  generate(world.makeBook("org.one"));
  EXPECT_EQ(verbosityOfOnlyLaunch(), 6U);
}

TEST_F(Generation, anAbsurdLogLevelFillsNoMemory) {
  setLogLevel(std::numeric_limits<int64_t>::max());
  world.makeShelf();
  generate(world.makeBook("org.one"));
  EXPECT_LE(verbosityOfOnlyLaunch(), 100'000U);
}

TEST_F(Generation, indexesTheFolderOfTheLocalizationOfABundle) {
  for (const int32_t type : {ZEBHelpBookType2, ZEBHelpBookType3}) {
    const auto book = world.makeBook("org.one", type);
    world.folder.write("books/org.one/Resources/fr.lproj/page.html", "x");
    book->setResourcesRootPath(book->path() + "/Resources");
    book->setLocalization("fr");
    EXPECT_EQ(localizedDocumentRootPath(*book), book->path() + "/Resources/fr.lproj");
    world.makeShelf();
    generate(book);
    EXPECT_EQ(world.launcher->launches().back().arguments.back(),
              book->path() + "/Resources/fr.lproj");
  }
}

TEST_F(Generation, indexesTheResourcesOfABundleWithoutAFolderForTheLocalization) {
  const auto book = world.makeBook("org.one", ZEBHelpBookType3);
  world.folder.write("books/org.one/Resources/de.lproj/page.html", "x");
  world.folder.write("books/org.one/Resources/fr.lproj", "a file, no folder");
  book->setResourcesRootPath(book->path() + "/Resources");
  book->setLocalization("fr");
  EXPECT_EQ(localizedDocumentRootPath(*book), book->path() + "/Resources");
  book->setLocalization("");
  EXPECT_EQ(localizedDocumentRootPath(*book), book->path() + "/Resources");
}

TEST_F(Generation, indexesThePathOfABundleWithoutResources) {
  const auto book = world.makeBook("org.one", ZEBHelpBookType2);
  book->setLocalization("fr");
  EXPECT_EQ(localizedDocumentRootPath(*book), book->path());
}

TEST_F(Generation, indexesThePathOfEveryOtherBook) {
  for (const int32_t type : {ZEBHelpBookType1, ZEBHelpBookType4}) {
    const auto book = world.makeBook("org.one", type);
    world.folder.write("books/org.one/Resources/fr.lproj/page.html", "x");
    book->setResourcesRootPath(book->path() + "/Resources");
    book->setLocalization("fr");
    EXPECT_EQ(localizedDocumentRootPath(*book), book->path());
  }
}

TEST_F(Generation, saysWhereItWritesAndMakesTheFolder) {
  world.makeShelf();
  generate(world.makeBook("org.one"));
  EXPECT_TRUE(ShelfWorld::exists(world.generatedRoot() + "/org.one"));
  EXPECT_THAT(world.logged(),
              ElementsAre(LogEntry{3, "Writing generated index out to path: " +
                                          world.generatedPath("org.one", "org.one")}));
}

TEST_F(Generation, ofABookWithoutARecordStoresTheNewOneAndTellsObserversOfAnUpdate) {
  world.launcher->behave(tests::writesIndex(
      {{"SKI_USE_REMOTE_ROOT", true}, {"SKI_REMOTE_ROOT", "https://help.example/one/"}}));
  const auto book = world.makeBook("org.one");
  world.makeShelf();
  generate(book);
  const auto record = world.knownRecord("org.one");
  ASSERT_NE(record, nullptr);
  EXPECT_EQ(record->path(), world.generatedPath("org.one", "org.one"));
  EXPECT_EQ(record->bookID(), "org.one");
  EXPECT_TRUE(record->loadedFromGeneratedCache());
  ASSERT_THAT(world.observer->kinds(), ElementsAre(ZEBIndexChangeUpdated));
  EXPECT_EQ(world.observer->changes().front().index, record);
  EXPECT_EQ(book->remoteURL()->absoluteString(), "https://help.example/one/");
  EXPECT_EQ(world.owner->disableCount(), 1);
}

TEST_F(Generation, ofABookWithARecordPoursTheNewDataIntoIt) {
  const auto book = world.makeBookWithIndex("org.one");
  const auto record = std::dynamic_pointer_cast<ZEBHelpindexIndex>(
      world.makeShelf(false).indicesForBook(book).front());
  const auto lux = platform::Data::copy("semantic");
  world.launcher->behave(tests::writesIndex({{"LUXIndexData", lux}}));
  const auto operation = ZEBIndexGenerationOperation::initWithBook(book, record, world.shelf, true);
  EXPECT_TRUE(record->isRebuilding());
  operation->start();
  EXPECT_FALSE(record->isRebuilding());
  // The record keeps its place, its path and its number.
  EXPECT_EQ(world.knownRecord("org.one"), record);
  EXPECT_EQ(record->path(), book->indexPaths().front());
  EXPECT_EQ(record->luxIndexData(), lux);
  EXPECT_TRUE(record->isReinitialized());
  EXPECT_FALSE(record->loadedFromGeneratedCache());
  ASSERT_THAT(world.observer->kinds(), ElementsAre(ZEBIndexChangeAdded, ZEBIndexChangeUpdated));
  // Observers get the record of the generated file.
  const auto told = world.observer->changes().back().index;
  EXPECT_NE(told, record);
  EXPECT_EQ(told->path(), world.generatedPath("org.one", "org.one"));
  EXPECT_TRUE(told->loadedFromGeneratedCache());
}

TEST_F(Generation, ofSemanticDataCopiesTheRecordsFileFirst) {
  const auto book = world.makeBookWithIndex("org.one");
  const auto record = world.makeShelf(false).indicesForBook(book).front();
  std::string copied;
  world.launcher->behave([&](const RecordingLauncher::Launch& launch) {
    copied = ShelfWorld::contents(launch.outputPath);
    return 0;
  });
  generate(book, record, true);
  EXPECT_EQ(copied, ShelfWorld::contents(book->indexPaths().front()));
}

TEST_F(Generation, ofSemanticDataRunsDirectlyOnAFileThatIsThere) {
  const auto book = world.makeBookWithIndex("org.one");
  const auto record = world.makeShelf(false).indicesForBook(book).front();
  world.folder.write("caches/org.zeb.zebd/GeneratedIndexes/org.one/org.one.helpindex", "earlier");
  world.files->fail(FailingFileManager::Operation::copy, EACCES);
  std::string found;
  world.launcher->behave([&](const RecordingLauncher::Launch& launch) {
    found = ShelfWorld::contents(launch.outputPath);
    return 0;
  });
  generate(book, record, true);
  EXPECT_EQ(found, "earlier");
}

TEST_F(Generation, ofSemanticDataWithoutARecordRunsTheToolAllTheSame) {
  world.makeShelf();
  generate(world.makeBookWithIndex("org.one"), nullptr, true);
  EXPECT_THAT(argumentsOfOnlyLaunch(), Contains("--append-LUX-only"));
  EXPECT_FALSE(ShelfWorld::exists(world.generatedPath("org.one", "org.one")));
}

TEST_F(Generation, ofSemanticDataWhoseCopyFailsIsSkippedWithAMessageAndLeavesTheRecord) {
  const auto book = world.makeBookWithIndex("org.one");
  const auto record = world.makeShelf(false).indicesForBook(book).front();
  world.files->fail(FailingFileManager::Operation::copy, ENOSPC);
  world.log->clear();
  generate(book, record, true);
  EXPECT_THAT(world.logged(),
              ElementsAre(LogEntry{3,
                                   "Skipping generation of LUX info because if couldn't be copied "
                                   "to the Generated directory. " +
                                       book->indexPaths().front()}));
  EXPECT_THAT(world.launcher->launches(), IsEmpty());
  EXPECT_FALSE(record->isRebuilding());
  EXPECT_FALSE(record->isReinitialized());
  EXPECT_EQ(world.knownRecord("org.one"), record);
  EXPECT_THAT(world.observer->kinds(), ElementsAre(ZEBIndexChangeAdded));
}

TEST_F(Generation, ofSemanticDataIsSkippedWhereTheFolderCannotBeMadeEither) {
  const auto book = world.makeBookWithIndex("org.one");
  const auto record = world.makeShelf(false).indicesForBook(book).front();
  world.files->fail(FailingFileManager::Operation::createDirectory, EROFS);
  world.log->clear();
  generate(book, record, true);
  ASSERT_EQ(world.logged().size(), 1U);
  EXPECT_EQ(world.logged().front().level, 3);
  EXPECT_THAT(world.launcher->launches(), IsEmpty());
}

TEST_F(Generation, ofSemanticDataForARecordWithoutAPathIsSkipped) {
  world.makeShelf();
  const auto record = ZEBIndex::init();
  generate(world.makeBook("org.one"), record, true);
  EXPECT_THAT(world.logged(),
              ElementsAre(LogEntry{3,
                                   "Skipping generation of LUX info because if couldn't be copied "
                                   "to the Generated directory. (null)"}));
  EXPECT_FALSE(record->isRebuilding());
}

TEST_F(Generation, withoutAGeneratedPathLogsTheMessageWithoutValues) {
  world.change([](platform::Environment& environment) { environment.cachesDirectory.reset(); });
  world.makeShelf();
  generate(world.makeBook("org.one"));
  EXPECT_THAT(world.logged(), ElementsAre(LogEntry{1, "Error creating directory at path <>: "}));
  EXPECT_THAT(world.launcher->launches(), IsEmpty());
}

TEST_F(Generation, logsAFolderThatCannotBeMade) {
  world.files->fail(FailingFileManager::Operation::createDirectory, EROFS);
  world.makeShelf();
  generate(world.makeBook("org.one"));
  const std::string folder = world.generatedRoot() + "/org.one";
  EXPECT_THAT(
      world.logged(),
      ElementsAre(LogEntry{1, ZEBStringWithFormat("Error creating directory at path <%@>: %@",
                                                  folder, platform::posixError(EROFS, folder))}));
  EXPECT_THAT(world.launcher->launches(), IsEmpty());
}

TEST_F(Generation, logsAnExitStatusOfOneAndStoresNoRecord) {
  world.launcher->behave([](const RecordingLauncher::Launch&) { return 1; });
  world.makeShelf();
  generate(world.makeBook("org.one"));
  const std::vector<std::string> arguments = argumentsOfOnlyLaunch();
  EXPECT_THAT(
      world.logged(),
      Contains(LogEntry{0, ZEBStringWithFormat("Task at %@ failed with error %d. Arguments %@",
                                               tool, 1, arguments)}));
  EXPECT_THAT(world.shelf->_knownIndices(), IsEmpty());
  EXPECT_THAT(world.observer->changes(), IsEmpty());
  EXPECT_THAT(world.center->posted(), IsEmpty());
}

TEST_F(Generation, logsAFailedTaskWithToolStatusAndEveryArgument) {
  world.launcher->behave([](const RecordingLauncher::Launch&) { return 1; });
  const auto book = world.makeBook("org.one");
  world.makeShelf();
  generate(book);
  EXPECT_THAT(world.log->messages(0),
              ElementsAre("Task at /usr/bin/bvmake failed with error 1. Arguments [\"--create\", "
                          "\"--anchors\", \"--generate-summaries\", \"--file\", \"" +
                          world.generatedPath("org.one", "org.one") +
                          "\", \"--min-term-length\", \"3\", \"--lowered-priority\", \"" +
                          book->path() + "\"]"));
}

TEST_F(Generation, aToolThatIsKilledFails) {
  world.launcher->behave([](const RecordingLauncher::Launch&) { return 137; });
  world.makeShelf();
  generate(world.makeBook("org.one"));
  ASSERT_EQ(world.log->messages(0).size(), 1U);
  EXPECT_THAT(world.log->messages(0).front(), testing::HasSubstr("failed with error 137."));
}

TEST_F(Generation, logsALaunchThatThrows) {
  world.launcher->behave([](const RecordingLauncher::Launch&) -> int {
    throw platform::Exception("LaunchException", "no such program");
  });
  world.makeShelf();
  generate(world.makeBook("org.one"));
  EXPECT_THAT(world.log->messages(0),
              ElementsAre(ZEBStringWithFormat("Task at %@ threw exception: %@. Arguments %@", tool,
                                              "no such program", argumentsOfOnlyLaunch())));
  EXPECT_THAT(world.shelf->_knownIndices(), IsEmpty());
  EXPECT_EQ(world.owner->depth(), 0);
}

TEST_F(Generation, withOutputThatCannotBeReadStoresNothing) {
  world.launcher->behave([&](const RecordingLauncher::Launch& launch) {
    std::ofstream(launch.outputPath) << "no help index";
    return 0;
  });
  world.makeShelf();
  generate(world.makeBook("org.one"));
  EXPECT_THAT(world.shelf->_knownIndices(), IsEmpty());
  EXPECT_THAT(world.observer->changes(), IsEmpty());
}

TEST_F(Generation, withoutAnyOutputStoresNothingAndLogsNoFailure) {
  world.makeShelf();
  generate(world.makeBook("org.one"));
  EXPECT_THAT(world.shelf->_knownIndices(), IsEmpty());
  EXPECT_THAT(world.log->messages(0), IsEmpty());
}

TEST_F(Generation, thatFailsLeavesAnExistingRecordAsItWas) {
  const auto book = world.makeBookWithIndex("org.one");
  const auto record = world.makeShelf(false).indicesForBook(book).front();
  world.launcher->behave([](const RecordingLauncher::Launch&) { return 1; });
  generate(book, record);
  EXPECT_FALSE(record->isRebuilding());
  EXPECT_FALSE(record->isReinitialized());
  EXPECT_EQ(world.knownRecord("org.one"), record);
  EXPECT_THAT(world.observer->kinds(), ElementsAre(ZEBIndexChangeAdded));
}

TEST_F(Generation, isTriedAgainAtTheNextRequestAfterAFailure) {
  world.launcher->behave([](const RecordingLauncher::Launch&) { return 1; });
  const auto book = world.makeBook("org.one");
  world.makeShelf().indicesForBook(book);
  world.finishWork();
  world.launcher->behave(tests::writesIndex());
  world.shelf->indicesForBook(book);
  world.finishWork();
  EXPECT_EQ(world.launcher->launches().size(), 2U);
  EXPECT_NE(world.knownRecord("org.one"), nullptr);
}

TEST_F(Generation, anExceptionIsLoggedAndTheRecordIsNoLongerMarked) {
  world.launcher->behave(tests::writesIndex());
  world.makeShelf();
  // A record of the base class refuses to be filled.
  const auto record = ZEBIndex::init();
  generate(world.makeBook("org.one"), record);
  EXPECT_THAT(world.log->messages(0),
              ElementsAre("-[ZEBIndex reinitializeWithData:] called on a virtual function"));
  EXPECT_FALSE(record->isRebuilding());
  EXPECT_EQ(world.owner->depth(), 0);
  EXPECT_EQ(world.owner->disableCount(), 1);
  EXPECT_THAT(world.observer->changes(), IsEmpty());
}

TEST_F(Generation, anExceptionOfAnObserverIsLoggedAfterTheRecordWasStored) {
  world.launcher->behave(tests::writesIndex());
  world.makeShelf();
  world.observer->onChange = [](const auto&) { throw platform::Exception("Test", "unwell"); };
  generate(world.makeBook("org.one"));
  EXPECT_THAT(world.log->messages(0), ElementsAre("unwell"));
  EXPECT_NE(world.knownRecord("org.one"), nullptr);
}

TEST_F(Generation, withoutShelfOrBookDoesNothingButUnmarkTheRecord) {
  world.makeShelf();
  ZEBIndexGenerationOperation::init()->start();
  EXPECT_THAT(world.logged(), IsEmpty());
  const auto record = ZEBIndex::init();
  ZEBIndexGenerationOperation::initWithBook(nullptr, record, nullptr, false)->start();
  EXPECT_FALSE(record->isRebuilding());
  generate(nullptr);
  EXPECT_THAT(world.logged(), ElementsAre(LogEntry{1, "Error creating directory at path <>: "}));
  EXPECT_THAT(world.launcher->launches(), IsEmpty());
}

TEST_F(Generation, keepsTheDaemonAliveUntilTheToolHasExited) {
  int depth = 0;
  world.launcher->behave([&](const RecordingLauncher::Launch&) {
    depth = world.owner->depth();
    return 0;
  });
  world.makeShelf();
  generate(world.makeBook("org.one"));
  EXPECT_EQ(depth, 1);
  EXPECT_EQ(world.owner->depth(), 0);
}

TEST_F(Generation, runsOneToolAtATimeInLazyModeAndOneAProcessorOtherwise) {
  std::atomic<int> running{0};
  std::atomic<int> most{0};
  std::atomic<int> wanted{1};
  std::atomic<bool> blockedTooLong{false};
  world.launcher->behave([&](const RecordingLauncher::Launch&) {
    const int now = ++running;
    most = std::max(most.load(), now);
    const auto limit = std::chrono::steady_clock::now() + std::chrono::seconds(10);
    while (most < wanted && std::chrono::steady_clock::now() < limit) {
      std::this_thread::yield();
    }
    blockedTooLong = blockedTooLong || most < wanted;
    --running;
    return 1;
  });
  world.change(
      [](platform::Environment& environment) { environment.processorCount = [] { return 3; }; });
  const auto addBooks = [&] {
    for (int i = 0; i < 6; ++i) {
      world.shelf->indicesForBook(world.makeBook("org.book" + std::to_string(i)));
    }
    world.finishWork();
  };
  world.makeShelf();
  addBooks();
  EXPECT_EQ(most, 1);
  wanted = 3;
  world.shelf->setShouldBeLazy(false);
  addBooks();
  EXPECT_EQ(most, 3);
  EXPECT_FALSE(blockedTooLong);
}

}  // namespace
