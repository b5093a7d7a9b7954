// Building models from the books that the host knows.
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <algorithm>
#include <cerrno>
#include <filesystem>

#include "host/Luxwell/HelpLUXIndex.h"
#include "host/Luxwell/LUXModelView.h"
#include "platform/OperationQueue.h"
#include "tests/LUXPlugin/LUXWorld.h"

using platform::FailingFileManager;
using testing::AllOf;
using testing::Contains;
using testing::Each;
using testing::ElementsAre;
using testing::IsEmpty;
using testing::Not;
using testing::SizeIs;
using tests::LogEntry;
using tests::LUXWorld;

namespace {

const LogEntry started{4, "Starting build of Apps"};
const LogEntry finished{4, "Finished build of Apps"};

class Build : public testing::Test {
 protected:
  /// Builds the model of "Apps" on this thread, and keeps what was logged.
  void build() const {
    const auto model = acquire();
    ASSERT_TRUE(model);
    EXPECT_TRUE(world.controller->updateExistingModel(model, "English", "Apps"));
  }
  std::shared_ptr<HelpLUXModel> acquire() const {
    return world.controller->aquiredModelWithGroupName("Apps", "English", kLUXModelActivityBuilding,
                                                       5.0);
  }
  /// The model as it was saved.
  std::shared_ptr<HelpLUXModel> saved() const {
    return HelpLUXModel::initWithDirectoryPath(world.modelFolder("Apps"), "English");
  }
  std::vector<std::string> savedBooks() const { return saved()->allHelpbookIDs(); }
  /// Book and key of every page that may be found.
  std::vector<std::string> savedPages() const {
    std::vector<std::string> pages;
    const auto view = saved()->view();
    for (uint32_t page = 0; view && page < view->pageCount(); ++page) {
      const auto record = view->page(page);
      pages.push_back(std::string(view->bookID(record.book)) + " " + std::string(record.key));
    }
    std::sort(pages.begin(), pages.end());
    return pages;
  }
  std::vector<LogEntry> logged() const {
    return world.loggedBeginningWith({"Starting build", "Finished build", "ERROR", "No tokens",
                                      "Couldn't", "Attemping", "host on fire"});
  }
  std::string savedDataPath(const std::string& bookID) const {
    return world.modelFolder("Apps") + "/HelpLUXIndexFile/" + bookID;
  }

  LUXWorld world;
};

TEST_F(Build, makesAModelOfTheBooksOfItsGroup) {
  world.addBook("org.one", tests::kitchenPages(), "Apps");
  world.addBook("org.two", tests::printerPages(), "System");
  world.setBook("org.none", "Apps");
  build();
  EXPECT_THAT(logged(), ElementsAre(started, finished));
  EXPECT_THAT(savedBooks(), ElementsAre("org.one"));
  EXPECT_THAT(savedPages(), ElementsAre("org.one bread.html", "org.one soup.html"));
  EXPECT_EQ(saved()->view()->totalPageCount(), 3U);
  EXPECT_THAT(world.controller->_registeredModels(), IsEmpty());
  EXPECT_EQ(world.owner->guards(), 0);
}

TEST_F(Build, keepsTheDaemonFromExiting) {
  world.addBook("org.one", tests::kitchenPages(), "Apps");
  int guardsMeanwhile = 0;
  world.owner->onMessage = [&](const std::string& told) {
    if (told == "knownBooks") {
      guardsMeanwhile = world.owner->guards();
    }
  };
  build();
  EXPECT_EQ(guardsMeanwhile, 1);
  EXPECT_EQ(world.owner->guards(), 0);
}

TEST_F(Build, ofAGroupWithoutBooksSavesAnEmptyModel) {
  world.setBook("org.none", "Apps");
  build();
  EXPECT_THAT(logged(), ElementsAre(started, finished));
  EXPECT_TRUE(HelpLUXModel::modelExistsForGroupName("Apps", "English"));
  EXPECT_FALSE(saved()->needsBuild());
  EXPECT_THAT(savedBooks(), IsEmpty());
  EXPECT_EQ(saved()->view()->totalPageCount(), 0U);
  EXPECT_EQ(saved()->view()->options(),
            platform::Value(platform::Value::Dictionary{
                {"SuggestionThresholdsPerBook", platform::Value::Dictionary{}}}));
  EXPECT_THAT(world.controller->_registeredModels(), IsEmpty());
}

TEST_F(Build, beginsWithAnEmptyModel) {
  world.addBook("org.one", tests::kitchenPages(), "Apps");
  build();
  world.owner->forgetBook("org.one");
  world.addBook("org.two", tests::printerPages(), "Apps");
  build();
  EXPECT_THAT(savedBooks(), ElementsAre("org.two"));
}

TEST_F(Build, takesInBooksOfTheDefaultGroup) {
  world.setBook("org.named", "Apps");
  world.addBook("org.unnamed", tests::kitchenPages());
  build();
  EXPECT_THAT(savedBooks(), ElementsAre("org.unnamed"));
}

TEST_F(Build, ofASmoothingBookTakesWordsButNoPages) {
  world.addBook("org.one", tests::kitchenPages(), "Apps");
  world.addBook("org.smooth", tests::printerPages(), "Apps");
  world.setBook("org.smooth", "Apps", {{"SmoothingOnly", true}});
  build();
  EXPECT_THAT(savedBooks(), ElementsAre("org.one"));
  EXPECT_THAT(savedPages(), ElementsAre("org.one bread.html", "org.one soup.html"));
  const auto view = saved()->view();
  EXPECT_EQ(view->totalPageCount(), 6U);
  EXPECT_TRUE(view->termNumber(LUXTokenKind::stem, "printer"));
  // What the book says of its phrases is kept all the same, and its data beside the model.
  EXPECT_TRUE(std::filesystem::exists(savedDataPath("org.smooth")));
}

TEST_F(Build, keepsTheThresholdsOfEachBookUnchangedUnderItsFullName) {
  using platform::Value;
  // An index of attributes alone: two thresholds, one, none.
  const auto addBook = [&](const std::string& bookID, const Value::Dictionary& attributes) {
    world.addBookWithData(bookID, HelpLUXIndex::versionedDataWithAttributes(attributes), "Apps");
  };
  addBook("org.both*2.1", {{HelpLUXIndexAttributeBigramThresholdKey, 1.25},
                           {HelpLUXIndexAttributeTrigramThresholdKey, 7}});
  addBook("org.one", {{HelpLUXIndexAttributeTrigramThresholdKey, 0.5}});
  addBook("org.none", {});
  world.setBook("org.one", "Apps", {{"SmoothingOnly", true}});
  build();
  EXPECT_EQ(saved()->view()->options(),
            Value(Value::Dictionary{
                {"SuggestionThresholdsPerBook",
                 Value::Dictionary{{"org.both*2.1", Value::Dictionary{{"BigramThreshold", 1.25},
                                                                      {"TrigramThreshold", 7}}},
                                   {"org.none", Value::Dictionary{}},
                                   {"org.one", Value::Dictionary{{"TrigramThreshold", 0.5}}}}}}));
  EXPECT_THAT(savedBooks(), ElementsAre("org.both*2.1", "org.none"));
}

TEST_F(Build, ofABookThatSmoothsAnotherGroupTakesItInToo) {
  world.addBook("org.both", tests::printerPages(), "System");
  world.setBook("org.both", "Apps", {{"SmoothingOnly", true}});
  build();
  EXPECT_THAT(savedBooks(), IsEmpty());
  EXPECT_EQ(saved()->view()->totalPageCount(), 3U);
}

TEST_F(Build, knowsAVersionedBookByItsUnversionedName) {
  world.addBook("org.one*2.1", tests::kitchenPages(), "Apps");
  build();
  EXPECT_THAT(savedBooks(), ElementsAre("org.one*2.1"));
  EXPECT_THAT(savedPages(), ElementsAre("org.one*2.1 bread.html", "org.one*2.1 soup.html"));
  EXPECT_TRUE(std::filesystem::exists(savedDataPath("org.one*2.1")));
}

TEST_F(Build, tellsOfPagesWithoutWordsAndGoesOn) {
  auto pages = tests::kitchenPages();
  pages.push_back({"empty.html", "...", {}});
  world.addBook("org.one", pages, "Apps");
  build();
  EXPECT_THAT(
      logged(),
      ElementsAre(started, LogEntry{3, "No tokens found for empty.html, skipping!"}, finished));
  EXPECT_THAT(savedPages(), ElementsAre("org.one bread.html", "org.one soup.html"));
}

TEST_F(Build, passesBooksOverThatTakeNoPart) {
  world.addBookWithData("org.none", std::nullopt, "Apps");
  world.addBookWithData("org.unwilling",
                        HelpLUXIndex::versionedDataWithAttributes(
                            platform::Value::Dictionary{{HelpLUXIndexAttributeIgnoreLUXKey, true}}),
                        "Apps");
  const auto unreadable = world.addBookWithData("org.unreadable", std::nullopt, "Apps");
  std::filesystem::remove(unreadable->indexPaths().front());
  world.addBook("org.one", tests::kitchenPages(), "Apps");
  build();
  EXPECT_THAT(logged(), ElementsAre(started, finished));
  EXPECT_THAT(savedBooks(), ElementsAre("org.one"));
  EXPECT_FALSE(std::filesystem::exists(savedDataPath("org.none")));
  EXPECT_FALSE(std::filesystem::exists(savedDataPath("org.unwilling")));
}

TEST_F(Build, tellsOfDataThatMakeNoIndexAndGoesOn) {
  world.addBookWithData("org.broken", platform::Data::adopt(std::string(20000, 'x')), "Apps");
  world.addBook("org.one", tests::kitchenPages(), "Apps");
  build();
  EXPECT_THAT(
      logged(),
      ElementsAre(started, LogEntry{3, "ERROR while indexing book ID: org.broken"}, finished));
  EXPECT_THAT(savedBooks(), ElementsAre("org.one"));
}

TEST_F(Build, keepsTheDataOfEachBookBesideTheModel) {
  const auto data = LUXWorld::semanticData(tests::kitchenPages());
  world.addBookWithData("org.one", data, "Apps");
  build();
  const auto bytes = platform::systemFileManager()->contentsAtPath(savedDataPath("org.one"));
  ASSERT_TRUE(bytes);
  platform::ClassicUnarchiver unarchiver(*bytes);
  const platform::Value root = unarchiver.decodeRootObject();
  ASSERT_TRUE(root["LUXIndexData"].dataIf());
  EXPECT_EQ(*root["LUXIndexData"].dataIf(), data);
  EXPECT_THAT(*root.dictionaryIf(), SizeIs(1));
}

TEST_F(Build, goesOnWhereTheDataOfABookCannotBeKept) {
  world.addBook("org.one", tests::kitchenPages(), "Apps");
  world.files->fail(FailingFileManager::Operation::write, ENOSPC, "HelpLUXIndexFile");
  build();
  EXPECT_THAT(
      logged(),
      ElementsAre(started, LogEntry{3, "Couldn't write LUX index to " + savedDataPath("org.one")},
                  finished));
  EXPECT_THAT(savedBooks(), ElementsAre("org.one"));
}

TEST_F(Build, deletesWhatProcessesThatEndedInABuildHaveLeft) {
  world.addBook("org.one", tests::kitchenPages(), "Apps");
  build();
  // No process runs in this world.
  for (const char* name : {"/.LUXModel.77.0.tmp", "/HelpLUXIndexFile/.org.one.77.1.tmp"}) {
    world.folder.write("caches/org.zeb.zebd/Models/Apps/English" + std::string(name), "half");
  }
  build();
  std::vector<std::string> names;
  for (const auto& entry :
       std::filesystem::recursive_directory_iterator(world.modelFolder("Apps"))) {
    names.push_back(entry.path().filename());
  }
  EXPECT_THAT(names, testing::UnorderedElementsAre("HelpLUXIndexFile", "org.one", "LUXModel"));
}

TEST_F(Build, takesABookThatIsRemovedMeanwhileAsItFindsIt) {
  // At every question and message of the build, one after the other.
  for (int at = 0;; ++at) {
    const auto book = world.addBook("org.one", tests::kitchenPages(), "Apps");
    world.addBook("org.two", tests::printerPages(), "Apps");
    world.shelf->indicesForBook(book);
    int step = 0;
    world.owner->onMessage = [&](const std::string&) {
      if (step++ == at) {
        world.owner->forgetBook("org.one");
        world.shelf->removeIndexForBookID("org.one");
      }
    };
    build();
    world.owner->onMessage = nullptr;
    if (step <= at) {
      break;
    }
    EXPECT_THAT(savedBooks(), Contains("org.two")) << at;
    EXPECT_FALSE(saved()->needsBuild());
    EXPECT_THAT(world.controller->_registeredModels(), IsEmpty());
    // The news of the removal brings the model in step.
    world.controller->_syncModelsWithIndexEvents();
    EXPECT_THAT(savedBooks(), ElementsAre("org.two")) << at;
  }
}

TEST_F(Build, leavesTheOldModelWhereTheNewOneCannotBeSaved) {
  world.addBook("org.one", tests::kitchenPages(), "Apps");
  build();
  world.addBook("org.two", tests::printerPages(), "Apps");
  world.files->fail(FailingFileManager::Operation::write, ENOSPC, "LUXModel");
  build();
  EXPECT_THAT(savedBooks(), ElementsAre("org.one"));
  // Nobody but the log hears of it: the model is handed back as after any other build.
  EXPECT_THAT(world.logged(1), SizeIs(1));
  EXPECT_THAT(world.controller->_registeredModels(), IsEmpty());
}

TEST_F(Build, thatThrowsLeavesTheModelMarkedAsBuilding) {
  world.addBook("org.one", tests::kitchenPages(), "Apps");
  world.owner->onMessage = [](const std::string& told) {
    if (told == "knownBooks") {
      throw std::runtime_error("host on fire");
    }
  };
  build();
  EXPECT_THAT(logged(), ElementsAre(LogEntry{0, "host on fire"}));
  EXPECT_EQ(world.activity("Apps"), kLUXModelActivityBuilding);
  EXPECT_EQ(world.owner->guards(), 0);
  EXPECT_FALSE(HelpLUXModel::modelExistsForGroupName("Apps", "English"));
}

TEST_F(Build, isSeenByOtherProcessesFromItsBeginToItsEnd) {
  world.addBook("org.one", tests::kitchenPages(), "Apps");
  const auto isMarked = [&] { return world.files->folderIsMarked(world.modelFolder("Apps")); };
  // Its folder is made at the begin.
  bool wasMarked = false;
  world.owner->onMessage = [&](const std::string&) { wasMarked = wasMarked || isMarked(); };
  world.controller->startBuildingModelGroupName("Apps", "English")->waitUntilFinished();
  world.finishWork();
  EXPECT_TRUE(wasMarked);
  EXPECT_FALSE(isMarked());
  // One that breaks off leaves its mark as long as the model stays held.
  world.owner->onMessage = [](const std::string& told) {
    if (told == "knownBooks") {
      throw std::runtime_error("host on fire");
    }
  };
  build();
  world.owner->onMessage = nullptr;
  EXPECT_TRUE(isMarked());
  world.controller->finishedActivity(kLUXModelActivityBuilding, "Apps", "English");
  EXPECT_FALSE(isMarked());
}

TEST_F(Build, thatThrewKeepsEveryOtherModelFromBeingBuilt) {
  world.owner->onMessage = [](const std::string& told) {
    if (told == "knownBooks") {
      throw std::runtime_error("host on fire");
    }
  };
  build();
  world.owner->onMessage = nullptr;
  world.clock->onSleep = nullptr;
  EXPECT_FALSE(world.controller->aquiredModelWithGroupName("System", "English",
                                                           kLUXModelActivityBuilding, 5.0));
}

TEST_F(Build, isQueuedUnderTheNameOfItsGroup) {
  world.addBook("org.one", tests::kitchenPages(), "Apps");
  const auto operation = world.controller->startBuildingModelGroupName("Apps", "English");
  ASSERT_TRUE(operation);
  EXPECT_EQ(operation->modelGroupName(), "Apps");
  operation->waitUntilFinished();
  world.finishWork();
  EXPECT_THAT(savedBooks(), ElementsAre("org.one"));
  EXPECT_THAT(world.controller->_registeredModels(), IsEmpty());
}

TEST_F(Build, runsOneAfterTheOther) {
  world.addBook("org.one", tests::kitchenPages(), "Apps");
  world.addBook("org.two", tests::printerPages(), "System");
  std::vector<std::shared_ptr<LUXModelBuildOperation>> builds;
  for (int i = 0; i < 5; ++i) {
    builds.push_back(world.controller->startBuildingModelGroupName("Apps", "English"));
    builds.push_back(world.controller->startBuildingModelGroupName("System", "English"));
  }
  world.finishWork();
  // Whoever finds another build under way has to sleep.
  EXPECT_THAT(world.clock->sleeps(), IsEmpty());
  EXPECT_THAT(world.loggedBeginningWith({"Finished build"}), SizeIs(10));
}

TEST_F(Build, doesNothingWhereTheModelIsBusyForFiveSeconds) {
  world.addBook("org.one", tests::kitchenPages(), "Apps");
  world.clock->onSleep = nullptr;
  ASSERT_TRUE(
      world.controller->modelForGroupName("Apps", "English", true, kLUXModelActivityQuerying));
  world.controller->startBuildingModelGroupName("Apps", "English")->waitUntilFinished();
  EXPECT_THAT(world.clock->sleeps(), SizeIs(testing::AnyOf(50, 51)));
  EXPECT_NEAR(world.clock->elapsed().count(), 5.0, 0.11);
  EXPECT_THAT(world.log->entries(), IsEmpty());
  EXPECT_THAT(world.owner->messages(), IsEmpty());
  EXPECT_EQ(world.activity("Apps"), kLUXModelActivityQuerying);
}

TEST_F(Build, cancelledBeforeItsTurnIsNotDone) {
  world.addBook("org.one", tests::kitchenPages(), "Apps");
  platform::DispatchSemaphore release(0);
  world.controller->_modelUpdateQueue()->addOperationWithBlock([&] { release.wait(); });
  const auto operation = world.controller->startBuildingModelGroupName("Apps", "English");
  operation->cancel();
  release.signal();
  world.finishWork();
  EXPECT_TRUE(operation->isFinished());
  EXPECT_FALSE(HelpLUXModel::modelExistsForGroupName("Apps", "English"));
}

using BuildDeathTest = Build;

TEST_F(BuildDeathTest, withoutAModelStopsTheProcess) {
  EXPECT_DEATH(world.controller->updateExistingModel(nullptr, "English", "Apps"),
               "existingModelWithBuildingActivity != nil");
}

TEST_F(BuildDeathTest, withoutAGroupStopsTheProcess) {
  const auto model = acquire();
  EXPECT_DEATH(world.controller->updateExistingModel(model, "English", std::nullopt),
               "modelGroupName != nil");
}

TEST_F(BuildDeathTest, ofAModelThatIsHeldForSomethingElseStopsTheProcess) {
  const auto model =
      world.controller->modelForGroupName("Apps", "English", true, kLUXModelActivityPreloading);
  EXPECT_DEATH(world.controller->updateExistingModel(model, "English", "Apps"),
               "existingModelWithBuildingActivity.activity == kLUXModelActivityBuilding");
}

}  // namespace
