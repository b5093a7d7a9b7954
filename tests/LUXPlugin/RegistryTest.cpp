// Who holds a model, the semantic indexes of books, and settings.
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <filesystem>

#include "LUXPlugin/HelpLUXModel+ZEBAdditions.h"
#include "host/Luxwell/HelpLUXIndex.h"
#include "platform/OperationQueue.h"
#include "tests/LUXPlugin/LUXWorld.h"

using testing::AllOf;
using testing::Each;
using testing::ElementsAre;
using testing::IsEmpty;
using testing::SizeIs;
using tests::LogEntry;
using tests::LUXWorld;

namespace {

class Registry : public testing::Test {
 protected:
  std::shared_ptr<HelpLUXModel> take(int activity, const std::string& group = "System",
                                     const std::string& language = "English") const {
    return world.controller->modelForGroupName(group, language, true, activity);
  }
  void finish(int activity, const std::string& group = "System",
              const std::string& language = "English") const {
    world.controller->finishedActivity(activity, group, language);
  }

  LUXWorld world;
};

TEST_F(Registry, handsAModelOutOnceUntilItIsFinished) {
  const auto model = take(kLUXModelActivityQuerying);
  ASSERT_TRUE(model);
  EXPECT_EQ(model->activity(), kLUXModelActivityQuerying);
  EXPECT_EQ(model->language(), "English");
  EXPECT_EQ(model->modelDirectoryPath(), world.modelFolder("System"));
  EXPECT_FALSE(take(kLUXModelActivityQuerying));
  EXPECT_FALSE(take(kLUXModelActivityPreloading));
  EXPECT_EQ(world.activity("System"), kLUXModelActivityQuerying);
  finish(kLUXModelActivityQuerying);
  EXPECT_EQ(model->activity(), kLUXModelActivityNone);
  EXPECT_EQ(take(kLUXModelActivityPreloading), model);
  finish(kLUXModelActivityPreloading);
}

TEST_F(Registry, keepsGroupsAndLanguagesApart) {
  const auto model = take(kLUXModelActivityQuerying);
  const auto otherLanguage = take(kLUXModelActivityPreloading, "System", "German");
  const auto otherGroup = take(kLUXModelActivityPreloading, "Apps");
  EXPECT_NE(model, otherLanguage);
  EXPECT_NE(model, otherGroup);
  EXPECT_EQ(world.controller->activeModelCountWithActivity(kLUXModelActivityPreloading), 2U);
  EXPECT_EQ(world.controller->activeModelCountWithActivity(kLUXModelActivityQuerying), 1U);
  EXPECT_EQ(world.controller->activeModelCountWithActivity(kLUXModelActivityBuilding), 0U);
  EXPECT_THAT(world.controller->_registeredModels(),
              ElementsAre(std::pair<const std::string, int>{"Apps_English", 3},
                          std::pair<const std::string, int>{"System_English", 1},
                          std::pair<const std::string, int>{"System_German", 3}));
}

TEST_F(Registry, makesNoModelUnlessAskedTo) {
  EXPECT_FALSE(
      world.controller->modelForGroupName("System", "English", false, kLUXModelActivityQuerying));
  EXPECT_THAT(world.controller->_registeredModels(), IsEmpty());
  EXPECT_EQ(world.activity("System"), kLUXModelActivityNone);
}

TEST_F(Registry, registersNothingForAFolderThatCannotBeOpened) {
  world.folder.write("caches/org.zeb.zebd/Models/System/English", "a file, no folder");
  EXPECT_FALSE(take(kLUXModelActivityQuerying));
  EXPECT_THAT(world.controller->_registeredModels(), IsEmpty());
  // Nothing is remembered: the next one to ask gets what is there then.
  std::filesystem::remove(world.modelFolder("System"));
  EXPECT_TRUE(take(kLUXModelActivityQuerying));
}

TEST_F(Registry, logsAWrongActivityAndLeavesTheModelHeld) {
  const auto model = take(kLUXModelActivityPreloading);
  finish(kLUXModelActivityQuerying);
  EXPECT_THAT(world.logged(3),
              ElementsAre("Attemping to finish wrong activity. Current model activity: 3, trying "
                          "to finish activity: 1"));
  EXPECT_EQ(model->activity(), kLUXModelActivityPreloading);
  EXPECT_FALSE(take(kLUXModelActivityQuerying));
}

TEST_F(Registry, forgetsAModelAtTheEndOfBuildingEvenWhenItWasNotBuilding) {
  const auto model = take(kLUXModelActivityPreloading);
  finish(kLUXModelActivityBuilding);
  EXPECT_THAT(world.logged(3),
              ElementsAre("Attemping to finish wrong activity. Current model activity: 3, trying "
                          "to finish activity: 2"));
  EXPECT_THAT(world.controller->_registeredModels(), IsEmpty());
  EXPECT_EQ(model->activity(), kLUXModelActivityPreloading);
}

TEST_F(Registry, opensTheModelAnewAfterABuild) {
  const auto model = take(kLUXModelActivityBuilding);
  finish(kLUXModelActivityBuilding);
  EXPECT_THAT(world.log->entries(), IsEmpty());
  EXPECT_EQ(model->activity(), kLUXModelActivityNone);
  const auto next = take(kLUXModelActivityQuerying);
  EXPECT_TRUE(next);
  EXPECT_NE(next, model);
}

TEST_F(Registry, showsOtherProcessesWhatIsBeingBuiltAndNothingElse) {
  std::filesystem::create_directories(world.modelFolder("System"));
  const auto isMarked = [&] { return world.files->folderIsMarked(world.modelFolder("System")); };
  for (const int activity : {kLUXModelActivityQuerying, kLUXModelActivityPreloading}) {
    take(activity);
    EXPECT_FALSE(isMarked());
    finish(activity);
  }
  take(kLUXModelActivityBuilding);
  EXPECT_TRUE(isMarked());
  finish(kLUXModelActivityQuerying);
  EXPECT_TRUE(isMarked());
  finish(kLUXModelActivityBuilding);
  EXPECT_FALSE(isMarked());
}

TEST_F(Registry, ignoresTheEndOfWorkOnAnUnknownModel) {
  finish(kLUXModelActivityBuilding);
  finish(kLUXModelActivityQuerying, "None");
  EXPECT_THAT(world.log->entries(), IsEmpty());
}

TEST_F(Registry, waitingGetsAFreeModelAtOnce) {
  const auto model = world.controller->aquiredModelWithGroupName("System", "English",
                                                                 kLUXModelActivityBuilding, 5.0);
  ASSERT_TRUE(model);
  EXPECT_EQ(model->activity(), kLUXModelActivityBuilding);
  EXPECT_THAT(world.clock->sleeps(), IsEmpty());
}

TEST_F(Registry, waitingLooksEveryTenthOfASecondUntilTheModelIsFree) {
  const auto model = take(kLUXModelActivityQuerying);
  world.clock->onSleep = [&](size_t count) {
    if (count == 7) {
      finish(kLUXModelActivityQuerying);
    }
  };
  EXPECT_EQ(world.controller->aquiredModelWithGroupName("System", "English",
                                                        kLUXModelActivityPreloading, 5.0),
            model);
  EXPECT_THAT(world.clock->sleepsOf(""), AllOf(SizeIs(7), Each(0.1)));
}

TEST_F(Registry, waitingGivesUpAfterItsInterval) {
  take(kLUXModelActivityQuerying);
  world.clock->onSleep = nullptr;
  EXPECT_FALSE(world.controller->aquiredModelWithGroupName("System", "English",
                                                           kLUXModelActivityBuilding, 5.0));
  EXPECT_NEAR(world.clock->elapsed().count(), 5.0, 0.11);
  EXPECT_THAT(world.clock->sleeps(), SizeIs(testing::AnyOf(50, 51)));
  EXPECT_EQ(world.activity("System"), kLUXModelActivityQuerying);
}

TEST_F(Registry, waitingForNoTimeGetsNothingEvenWhenTheModelIsFree) {
  for (const double interval : {0.0, -1.0}) {
    EXPECT_FALSE(world.controller->aquiredModelWithGroupName("System", "English",
                                                             kLUXModelActivityQuerying, interval));
  }
  EXPECT_THAT(world.clock->sleeps(), IsEmpty());
  EXPECT_THAT(world.controller->_registeredModels(), IsEmpty());
}

TEST_F(Registry, nobodyBuildsWhileAnotherModelIsBeingBuilt) {
  take(kLUXModelActivityBuilding, "Apps");
  world.clock->onSleep = nullptr;
  EXPECT_FALSE(world.controller->aquiredModelWithGroupName("System", "English",
                                                           kLUXModelActivityBuilding, 5.0));
  EXPECT_NEAR(world.clock->elapsed().count(), 5.0, 0.11);
  EXPECT_EQ(world.activity("System"), kLUXModelActivityNone);
}

TEST_F(Registry, othersUseModelsWhileOneIsBeingBuilt) {
  take(kLUXModelActivityBuilding, "Apps");
  EXPECT_TRUE(world.controller->aquiredModelWithGroupName("System", "English",
                                                          kLUXModelActivityQuerying, 5.0));
}

TEST(LUXSearchController, beginsWithTheLongTimeoutsAndNothingUnderWay) {
  const LUXWorld world;
  EXPECT_EQ(world.controller->_acquisitionSeconds(), 8);
  EXPECT_EQ(world.controller->_searchSeconds(), 16);
  EXPECT_FALSE(world.controller->_queryInProgress());
  EXPECT_FALSE(world.controller->_loading());
  EXPECT_FALSE(world.controller->_finalizedStartup());
  EXPECT_EQ(world.controller->_modelUpdateQueue()->maxConcurrentOperationCount(), 1);
  EXPECT_EQ(world.controller->owner(), world.owner);
  EXPECT_EQ(world.controller->indexshelf(), world.shelf);
}

TEST(LUXSearchController, canDoWithoutAnOwner) {
  const LUXWorld world;
  const auto controller = LUXSearchController::init();
  EXPECT_FALSE(controller->owner());
  EXPECT_FALSE(controller->indexshelf());
  EXPECT_FALSE(controller->_luxIndexForHelpbookIdentifier("org.one"));
  EXPECT_THAT(controller->_copyAllBooksForLanguage("English"), IsEmpty());
  controller->loadLUXModels();
  controller->_syncModelsWithIndexEvents();
  controller->completeSearchQuery(nullptr);
}

TEST(LUXSearchController, doesNotKeepItsOwnerAlive) {
  const LUXWorld world;
  auto owner = std::make_shared<tests::RecordingOwner>();
  const auto controller = LUXSearchController::initWithOwner(owner);
  EXPECT_EQ(controller->owner(), owner);
  owner.reset();
  EXPECT_FALSE(controller->owner());
}

TEST(LUXSearchController, shorterTimeoutsCanBeTakenBack) {
  const LUXWorld world;
  world.controller->useShorterTimeouts(true);
  EXPECT_EQ(world.controller->_acquisitionSeconds(), 1);
  EXPECT_EQ(world.controller->_searchSeconds(), 1);
  world.controller->useShorterTimeouts(false);
  EXPECT_EQ(world.controller->_acquisitionSeconds(), 8);
  EXPECT_EQ(world.controller->_searchSeconds(), 16);
}

TEST(LUXSearchController, hearsOfChangesOfItsShelf) {
  LUXWorld world;
  const auto book = world.addBook("org.one", tests::printerPages());
  EXPECT_THAT(world.shelf->indicesForBook(book), SizeIs(1));
  EXPECT_THAT(world.controller->_pendingIndexEvents(),
              ElementsAre(std::pair<const std::string, int32_t>{"org.one", 1}));
}

TEST(LUXSearchController, namesTheFirstLanguageThatTheModelsHave) {
  LUXWorld world;
  const auto nameFor = [&](std::vector<std::string> languages) {
    world.change([&](platform::Environment& e) { e.preferredLanguages = std::move(languages); });
    return LUXSearchController::currentLanguageFolderName();
  };
  EXPECT_EQ(nameFor({"en-GB", "de"}), "English");
  EXPECT_EQ(nameFor({"de_AT", "en"}), "German");
  EXPECT_EQ(nameFor({"tlh", "fr"}), "French");
}

TEST(LUXSearchController, namesEnglishWhereNoLanguageOfTheUserHasModels) {
  LUXWorld world;
  world.change([](platform::Environment& e) { e.preferredLanguages = {"tlh", "xx-YY"}; });
  EXPECT_EQ(LUXSearchController::currentLanguageFolderName(), "English");
}

TEST(LUXSearchController, reducesIdentifiersBeforeTheModelsSeeThem) {
  LUXWorld world;
  world.setBook("org.one", "Apps", {{"Weight", 2.5}, {"SmoothingOnly", true}});
  world.setBook("org.two", "System");
  EXPECT_EQ(zeb_modelGroupNameForHelpbookID("org.two*1.0"), "System");
  EXPECT_EQ(zeb_combiningWeightForHelpbookID("org.one*2"), 2.5F);
  EXPECT_EQ(zeb_combiningWeightForHelpbookID("org.two*2"), 0.0F);
  EXPECT_TRUE(
      zeb_helpbookPropertiesForHelpbookID("org.one*2", "Apps")["SmoothingOnly"].boolValue());
  EXPECT_FALSE(zeb_modelExistsForHelpbookID("org.two*1.0", "English"));
  world.build("System");
  EXPECT_TRUE(zeb_modelExistsForHelpbookID("org.two*1.0", "English"));
  EXPECT_FALSE(zeb_modelExistsForHelpbookID("org.two*1.0", "German"));
}

TEST(SemanticIndexes, areLoadedOnce) {
  LUXWorld world;
  world.addBook("org.one", tests::printerPages());
  const auto index = world.controller->_luxIndexForHelpbookIdentifier("org.one");
  ASSERT_TRUE(index);
  EXPECT_THAT(index->documentKeys(), ElementsAre("add.html", "jam.html", "queue.html"));
  world.owner->forgetMessages();
  EXPECT_EQ(world.controller->_luxIndexForHelpbookIdentifier("org.one"), index);
  EXPECT_THAT(world.owner->questions(), IsEmpty());
}

TEST(SemanticIndexes, areNotThereForNoIdentifier) {
  const LUXWorld world;
  EXPECT_FALSE(world.controller->_luxIndexForHelpbookIdentifier(std::nullopt));
  EXPECT_THAT(world.log->entries(), IsEmpty());
}

TEST(SemanticIndexes, areMissedEachTimeUntilTheyAreThere) {
  LUXWorld world;
  const std::vector<LogEntry> missed{{5, "Didn't find lux index for book ID: org.one"}};
  EXPECT_FALSE(world.controller->_luxIndexForHelpbookIdentifier("org.one"));
  EXPECT_EQ(world.log->entries(), missed);
  world.addBookWithData("org.one", std::nullopt);
  world.log->clear();
  EXPECT_FALSE(world.controller->_luxIndexForHelpbookIdentifier("org.one"));
  EXPECT_EQ(world.loggedBeginningWith({"Didn't find"}), missed);
  // The book comes back with semantic data.
  world.shelf->removeIndexForBookID("org.one");
  world.addBook("org.one", tests::printerPages());
  EXPECT_TRUE(world.controller->_luxIndexForHelpbookIdentifier("org.one"));
}

}  // namespace
