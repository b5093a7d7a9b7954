// Reading models ahead of time, and giving way to queries.
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <filesystem>
#include <fstream>

#include "tests/LUXPlugin/LUXWorld.h"

using testing::AllOf;
using testing::Each;
using testing::ElementsAre;
using testing::IsEmpty;
using testing::SizeIs;
using tests::LogEntry;
using tests::LUXWorld;

namespace {

const LogEntry waiting{3, "Waiting to start loading"};
const LogEntry starting{3, "Starting preload"};
const LogEntry bailedOpening{3, "Bailing preload while opening models"};
const LogEntry bailedLoading{3, "Bailing preload while loading models"};

/// Three groups with a model each.
class Preload : public testing::Test {
 protected:
  Preload() {
    for (const char* group : {"A", "B", "C"}) {
      world.addBook(std::string("org.") + group, tests::printerPages(), group);
    }
    for (const char* group : {"A", "B", "C"}) {
      world.build(group);
    }
    world.clock->onSleep = nullptr;
  }
  ~Preload() override {
    world.controller->_setQueryInProgress(false);
    EXPECT_FALSE(world.controller->_loading());
  }

  void load() const {
    world.controller->loadLUXModels();
    EXPECT_EQ(world.owner->guards(), 0);
    EXPECT_THAT(world.owner->messages(), ElementsAre("disableShutdown", "enableShutdown"));
  }
  void hold(const std::string& group, int activity) const {
    ASSERT_TRUE(world.controller->modelForGroupName(group, "English", true, activity));
  }
  std::vector<LogEntry> logged() const {
    return world.loggedBeginningWith({"Waiting", "Starting", "Bailing", "Attemping"});
  }
  std::vector<double> sleeps() const { return world.clock->sleepsOf(""); }
  /// A query begins during the sleep of that number.
  void queryDuringSleep(size_t number) const {
    world.clock->onSleep = [this, number](size_t count) {
      if (count == number) {
        world.controller->_setQueryInProgress(true);
      }
    };
  }

  LUXWorld world;
};

TEST_F(Preload, opensAndReadsEveryModelWithAPauseAfterEach) {
  world.clock->onSleep = [&](size_t) {
    EXPECT_TRUE(world.controller->_loading());
    EXPECT_EQ(world.owner->guards(), 1);
    EXPECT_TRUE(world.nothingIsHeld());
  };
  load();
  EXPECT_THAT(logged(), ElementsAre(waiting, starting));
  EXPECT_THAT(sleeps(), AllOf(SizeIs(6), Each(0.1)));
  EXPECT_THAT(world.controller->_registeredModels(), SizeIs(3));
  EXPECT_TRUE(world.nothingIsHeld());
  EXPECT_TRUE(world.controller->_finalizedStartup());
  EXPECT_FALSE(world.controller->_loading());
}

TEST_F(Preload, findsDamageThatOpeningDoesNotShow) {
  {
    // In the middle of the file, far from its header.
    const auto size = std::filesystem::file_size(world.modelPath("B"));
    std::fstream file(world.modelPath("B"), std::ios::in | std::ios::out | std::ios::binary);
    file.seekp(static_cast<std::streamoff>(size / 2));
    file << "damage, of which the header knows nothing";
  }
  load();
  const auto model =
      world.controller->modelForGroupName("B", "English", false, kLUXModelActivityQuerying);
  ASSERT_TRUE(model);
  EXPECT_TRUE(model->needsBuild());
  world.controller->finishedActivity(kLUXModelActivityQuerying, "B", "English");
}

TEST_F(Preload, loadsModelsThatAreNotThereWithoutComplaint) {
  std::filesystem::remove_all(world.modelFolder("B"));
  load();
  EXPECT_TRUE(world.controller->_finalizedStartup());
  EXPECT_THAT(sleeps(), SizeIs(6));
}

TEST_F(Preload, doesNothingDuringAQueryWithoutTheViewer) {
  world.controller->_setQueryInProgress(true);
  load();
  EXPECT_THAT(logged(), ElementsAre(waiting, starting));
  EXPECT_THAT(sleeps(), IsEmpty());
  EXPECT_THAT(world.controller->_registeredModels(), IsEmpty());
  EXPECT_FALSE(world.controller->_finalizedStartup());
}

TEST_F(Preload, withTheViewerWaitsOnceDuringAQueryThatHoldsAModel) {
  world.runningApplications = {"org.example.other", ZEBKestrelBundleID};
  hold("A", kLUXModelActivityQuerying);
  world.controller->_setQueryInProgress(true);
  load();
  EXPECT_THAT(logged(), ElementsAre(waiting, starting));
  EXPECT_THAT(sleeps(), ElementsAre(0.1));
  EXPECT_FALSE(world.controller->_finalizedStartup());
  EXPECT_EQ(world.activity("A"), kLUXModelActivityQuerying);
}

TEST_F(Preload, withTheViewerDoesNotLoadDuringAQueryThatHoldsNothing) {
  world.runningApplications = {ZEBKestrelBundleID};
  world.controller->_setQueryInProgress(true);
  load();
  EXPECT_THAT(sleeps(), IsEmpty());
  EXPECT_THAT(world.controller->_registeredModels(), IsEmpty());
  EXPECT_FALSE(world.controller->_finalizedStartup());
}

TEST_F(Preload, asksWhoRunsEachTime) {
  int asked = 0;
  world.change([&](platform::Environment& environment) {
    environment.runningApplications = [&] {
      ++asked;
      return std::vector<std::string>{ZEBKestrelBundleID};
    };
  });
  world.controller->loadLUXModels();
  world.controller->loadLUXModels();
  EXPECT_EQ(asked, 2);
}

TEST_F(Preload, waitsSixHundredTimesForABuildAndThenLoadsNothing) {
  hold("A", kLUXModelActivityBuilding);
  load();
  EXPECT_THAT(logged(), ElementsAre(waiting, starting));
  EXPECT_THAT(sleeps(), AllOf(SizeIs(600), Each(0.1)));
  EXPECT_NEAR(world.clock->elapsed().count(), 60.0, 0.001);
  EXPECT_THAT(world.controller->_registeredModels(), SizeIs(1));
  EXPECT_EQ(world.activity("A"), kLUXModelActivityBuilding);
  EXPECT_FALSE(world.controller->_finalizedStartup());
}

TEST_F(Preload, loadsNothingWhenTheModelIsFreedInTheLastWait) {
  hold("A", kLUXModelActivityBuilding);
  world.clock->onSleep = [&](size_t count) {
    if (count == 600) {
      world.controller->finishedActivity(kLUXModelActivityBuilding, "A", "English");
    }
  };
  load();
  EXPECT_THAT(sleeps(), SizeIs(600));
  EXPECT_FALSE(world.controller->_finalizedStartup());
}

TEST_F(Preload, loadsAsSoonAsNobodyHoldsAModel) {
  hold("A", kLUXModelActivityBuilding);
  world.clock->onSleep = [&](size_t count) {
    if (count == 17) {
      world.controller->finishedActivity(kLUXModelActivityBuilding, "A", "English");
    }
  };
  load();
  EXPECT_THAT(sleeps(), AllOf(SizeIs(17 + 6), Each(0.1)));
  EXPECT_TRUE(world.controller->_finalizedStartup());
}

TEST_F(Preload, stopsWaitingWhenAQueryBegins) {
  hold("A", kLUXModelActivityBuilding);
  queryDuringSleep(4);
  load();
  EXPECT_THAT(logged(), ElementsAre(waiting, starting));
  EXPECT_THAT(sleeps(), SizeIs(4));
  EXPECT_FALSE(world.controller->_finalizedStartup());
}

TEST_F(Preload, bailsWhileOpeningAfterTheModelThatItIsAt) {
  queryDuringSleep(2);
  load();
  EXPECT_THAT(logged(), ElementsAre(waiting, starting, bailedOpening));
  EXPECT_THAT(sleeps(), SizeIs(2));
  EXPECT_THAT(world.controller->_registeredModels(), SizeIs(2));
  EXPECT_TRUE(world.nothingIsHeld());
  EXPECT_FALSE(world.controller->_finalizedStartup());
}

TEST_F(Preload, bailsWhileLoadingAfterTheModelThatItIsAt) {
  queryDuringSleep(4);
  load();
  EXPECT_THAT(logged(), ElementsAre(waiting, starting, bailedLoading));
  EXPECT_THAT(sleeps(), SizeIs(4));
  EXPECT_THAT(world.controller->_registeredModels(), SizeIs(3));
  EXPECT_TRUE(world.nothingIsHeld());
  EXPECT_FALSE(world.controller->_finalizedStartup());
}

TEST_F(Preload, afterABailMayCompleteLater) {
  queryDuringSleep(2);
  world.controller->loadLUXModels();
  world.controller->_setQueryInProgress(false);
  world.clock->onSleep = nullptr;
  world.controller->loadLUXModels();
  EXPECT_TRUE(world.controller->_finalizedStartup());
}

TEST_F(Preload, passesAModelOverThatIsTakenMeanwhile) {
  world.clock->onSleep = [&](size_t count) {
    if (count == 1) {
      hold("B", kLUXModelActivityBuilding);
    }
  };
  load();
  // A and C are opened, with a pause for B all the same, and read.
  EXPECT_THAT(sleeps(), SizeIs(3 + 2));
  EXPECT_EQ(world.activity("B"), kLUXModelActivityBuilding);
  EXPECT_EQ(world.activity("A"), kLUXModelActivityNone);
  EXPECT_TRUE(world.controller->_finalizedStartup());
  EXPECT_THAT(logged(), ElementsAre(waiting, starting));
}

TEST_F(Preload, leavesAModelToWhoeverTookItBeforeTheEnd) {
  world.clock->onSleep = [&](size_t count) {
    if (count == 6) {
      hold("B", kLUXModelActivityQuerying);
    }
  };
  load();
  EXPECT_EQ(world.activity("B"), kLUXModelActivityQuerying);
  EXPECT_THAT(logged(), ElementsAre(waiting, starting));
}

TEST_F(Preload, returnsAtOnceWhileAnotherRuns) {
  world.clock->onSleep = [&](size_t count) {
    if (count == 3) {
      const auto before = world.log->entries().size();
      world.controller->loadLUXModels();
      EXPECT_EQ(world.log->entries().size(), before);
      EXPECT_EQ(world.owner->guards(), 1);
      EXPECT_TRUE(world.controller->_loading());
    }
  };
  load();
  EXPECT_THAT(sleeps(), SizeIs(6));
}

TEST_F(Preload, completesWhereNoModelCanBeHad) {
  for (const char* group : {"A", "B", "C"}) {
    std::filesystem::remove_all(world.modelFolder(group));
    world.folder.write(std::string("caches/org.zeb.zebd/Models/") + group + "/English", "a file");
    world.controller->finishedActivity(kLUXModelActivityBuilding, group, "English");
  }
  load();
  EXPECT_THAT(sleeps(), SizeIs(3));
  EXPECT_THAT(world.controller->_registeredModels(), IsEmpty());
  EXPECT_TRUE(world.controller->_finalizedStartup());
}

TEST_F(Preload, readsTheModelsOfTheUsersLanguage) {
  world.change([](platform::Environment& environment) {
    environment.preferredLanguages = {"de", "en"};
  });
  load();
  for (const auto& model : world.controller->_registeredModels()) {
    EXPECT_TRUE(model.first.ends_with("_German")) << model.first;
  }
}

}  // namespace
