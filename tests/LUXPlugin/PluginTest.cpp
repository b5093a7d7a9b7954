// The plug-in with its own controller of the search by meaning.
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <filesystem>

#include "platform/OperationQueue.h"
#include "platform/RunLoop.h"
#include "plugin/front/HelpPluginController.h"
#include "tests/LUXPlugin/LUXWorld.h"

using testing::Contains;
using testing::ElementsAre;
using testing::IsEmpty;
using testing::Not;
using testing::SizeIs;
using tests::LUXWorld;
using tests::titlesOf;

namespace {

/// A plug-in of a logged-in user, with books in two groups.
class PluginWithModels : public testing::Test {
 protected:
  PluginWithModels() {
    world.addBook(KROrvHelpbookID, tests::printerPages(), "System");
    world.addBook("org.kitchen", tests::kitchenPages(), "Apps");
    world.owner->loggedIn = true;
    plugin = HelpPluginController::initWithOwner(world.owner);
    models = plugin->_luxController();
    world.owner->forgetMessages();
  }
  ~PluginWithModels() override {
    catchUp();
    models->setIndexshelf(nullptr);
  }

  /// Lets the models catch up with the books.
  void catchUp() const {
    EXPECT_TRUE(LUXWorld::waitUntil([&] {
      world.clock->letOthersWork();
      world.clock->advance(platform::Seconds(0.5));
      platform::RunLoop::main()->runPending();
      return models->_pendingIndexEvents().empty() &&
             models->_modelUpdateQueue()->operationCount() == 0 && world.owner->guards() == 0;
    }));
  }
  LUXWorld::Results search(const std::string& text, const std::string& kind,
                           std::vector<std::string> scope = {}) const {
    world.owner->forgetMessages();
    const auto query = LUXWorld::query(text, std::move(scope));
    query->setResultTypes({kind});
    plugin->startSearchForQuery(query);
    auto results = world.owner->records(0);
    plugin->completeSearchForQuery(query);
    return results;
  }

  LUXWorld world;
  std::shared_ptr<HelpPluginController> plugin;
  std::shared_ptr<LUXSearchController> models;
};

TEST_F(PluginWithModels, hasAControllerThatKnowsItsShelf) {
  ASSERT_TRUE(models);
  EXPECT_EQ(models->owner(), world.owner);
  EXPECT_EQ(models->indexshelf(), plugin->_shelf());
}

TEST_F(PluginWithModels, hasNoneWhereNobodyIsLoggedIn) {
  world.owner->loggedIn = false;
  const auto other = HelpPluginController::initWithOwner(world.owner);
  EXPECT_FALSE(other->_luxController());
  other->finishPopulatingKnownBooks();
}

TEST_F(PluginWithModels, buildsTheModelsOfBooksThatAreRegistered) {
  for (const auto& entry : world.owner->knownBooks()) {
    plugin->_shelf()->indicesForBook(entry.second);
  }
  EXPECT_THAT(models->_pendingIndexEvents(), SizeIs(2));
  catchUp();
  EXPECT_TRUE(HelpLUXModel::modelExistsForGroupName("System", "English"));
  EXPECT_TRUE(HelpLUXModel::modelExistsForGroupName("Apps", "English"));
}

TEST_F(PluginWithModels, readsModelsAheadOnceTheBooksAreKnown) {
  world.owner->lazy = false;
  plugin->finishPopulatingKnownBooks();
  EXPECT_TRUE(LUXWorld::waitUntil([&] { return models->_finalizedStartup(); }));
  EXPECT_TRUE(LUXWorld::waitUntil([&] { return !models->_loading(); }));
  EXPECT_THAT(world.clock->sleepsOf("book-preload"), ElementsAre(0.1, 0.1, 0.1, 0.1));
}

TEST_F(PluginWithModels, findsPagesInWordsThatTheyDoNotHave) {
  search("printer", ZEBHelpArticleResult);
  catchUp();
  const auto results = search("printers papers", ZEBHelpArticleResult);
  ASSERT_THAT(results, Not(IsEmpty()));
  EXPECT_THAT(titlesOf(results), Contains("Clear a paper jam"));
  // Found by meaning, and so with the mark that only such results have.
  EXPECT_FALSE(results.front()->payloadValueForKey(ZEBResultUsesExternalViewerKey).isAbsent());
}

TEST_F(PluginWithModels, completesActsAndFindsSimilarSearches) {
  search("printer", ZEBHelpArticleResult);
  catchUp();
  EXPECT_THAT(titlesOf(search("print qu", ZEBHelpSuggestionResult, {KROrvHelpbookID})),
              Contains("print queue"));
  EXPECT_THAT(search("tray", ZEBHelpSimilarSuggestionResult, {KROrvHelpbookID}), Not(IsEmpty()));
  EXPECT_THAT(world.owner->deliveries(), ElementsAre("found", "finished"));
}

TEST_F(PluginWithModels, forgetsTheBooksThatAreRemoved) {
  search("soup", ZEBHelpArticleResult, {"org.kitchen"});
  catchUp();
  ASSERT_TRUE(HelpLUXModel::modelExistsForGroupName("Apps", "English"));
  plugin->removeIndexForBookWithID("org.kitchen");
  world.clock->advance(platform::Seconds(0.1));
  platform::RunLoop::main()->runPending();
  world.owner->forgetBook("org.kitchen");
  EXPECT_THAT(models->_pendingIndexEvents(), Contains(testing::Key("org.kitchen")));
  catchUp();
  const auto model = models->modelForGroupName("Apps", "English", true, kLUXModelActivityQuerying);
  ASSERT_TRUE(model);
  EXPECT_THAT(model->allHelpbookIDs(), IsEmpty());
  models->finishedActivity(kLUXModelActivityQuerying, "Apps", "English");
}

TEST_F(PluginWithModels, servesKeywordsAtOnceWhereModelsWereDeleted) {
  search("printer", ZEBHelpArticleResult);
  catchUp();
  std::filesystem::remove_all(world.folder.path("caches/org.zeb.zebd/Models"));
  world.clock->onSleep = nullptr;  // Nobody waits in earnest for the models.
  EXPECT_THAT(titlesOf(search("soup", ZEBHelpArticleResult)), Contains("Cooking tomato soup"));
  catchUp();
  world.clock->onSleep = [&](size_t) { world.clock->letOthersWork(); };
  EXPECT_TRUE(LUXWorld::waitUntil([&] {
    search("soup", ZEBHelpArticleResult);
    return HelpLUXModel::modelExistsForGroupName("Apps", "English");
  }));
}

}  // namespace
