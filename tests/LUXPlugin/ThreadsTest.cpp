// Everything at once, on real threads: meant for the thread sanitizer.
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <algorithm>
#include <array>
#include <atomic>
#include <filesystem>
#include <random>
#include <thread>

#include "platform/OperationQueue.h"
#include "platform/RunLoop.h"
#include "tests/LUXPlugin/LUXWorld.h"

using testing::Contains;
using testing::IsEmpty;
using tests::LUXWorld;
using tests::titlesOf;

namespace {

constexpr std::chrono::milliseconds duration{1500};

class Threads : public testing::Test {
 protected:
  Threads() {
    world.addBook(KROrvHelpbookID, tests::printerPages(), "System");
    world.addBook("org.second", tests::kitchenPages(), "System");
    world.addBook("org.kitchen", tests::kitchenPages(), "Apps");
    world.build("System");
    world.owner->loggedIn = true;
    world.owner->lazy = false;
    world.controller->useShorterTimeouts(true);
  }

  /// Does something on a thread of its own, again and again, until the time is over.
  template <typename Work>
  void repeat(const std::string& name, Work work) {
    _threads.emplace_back([this, name, work, seed = _threads.size()]() mutable {
      platform::setCurrentThreadName(name);
      std::mt19937 random(static_cast<unsigned>(seed));
      while (!_over) {
        work(random);
        ++_rounds;
        std::this_thread::sleep_for(std::chrono::microseconds(random() % 2000));
      }
    });
  }
  void runUntilOver() {
    const auto end = std::chrono::steady_clock::now() + duration;
    while (std::chrono::steady_clock::now() < end) {
      platform::RunLoop::main()->runPending();
      world.clock->advance(platform::Seconds(0.05));
      std::this_thread::sleep_for(std::chrono::milliseconds(1));
    }
    _over = true;
    for (std::thread& thread : _threads) {
      thread.join();
    }
    EXPECT_GT(_rounds, _threads.size());
  }
  static const char* anyBook(std::mt19937& random) {
    constexpr std::array<const char*, 4> books{"org.zeb.manual", "org.second", "org.kitchen",
                                               "org.unknown"};
    return books[random() % books.size()];
  }

  LUXWorld world;

 private:
  std::atomic<bool> _over{false};
  std::atomic<size_t> _rounds{0};
  std::vector<std::thread> _threads;
};

TEST_F(Threads, useModelsBuildReadSynchroniseAndRemoveAtOnce) {
  for (const char* name : {"searcher 1", "searcher 2"}) {
    repeat(name, [&](std::mt19937& random) {
      const std::array<std::string, 4> kinds{ZEBHelpArticleResult, ZEBHelpActionResult,
                                             ZEBHelpSuggestionResult,
                                             ZEBHelpSimilarSuggestionResult};
      const auto query = LUXWorld::query("print the tomato soup");
      if (random() % 2 == 0) {
        query->setScope({anyBook(random)});
      }
      if (random() % 4 == 0) {
        query->setPreferredLanguages({"de"});
      }
      std::thread canceller;
      if (random() % 3 == 0) {
        canceller = std::thread([query, pause = random() % 5000] {
          std::this_thread::sleep_for(std::chrono::microseconds(pause));
          query->cancel();
        });
      }
      std::set<std::string> searched;
      for (const auto& result :
           world.search(query, kinds[random() % kinds.size()], {"Soup"}, &searched)) {
        // As the search does that merges these with others.
        result->setRelevance(result->relevance().doubleValue() * 0.5);
      }
      world.controller->completeSearchQuery(query);
      if (canceller.joinable()) {
        canceller.join();
      }
    });
  }
  repeat("preloader", [&](std::mt19937&) { world.controller->loadLUXModels(); });
  repeat("builder", [&](std::mt19937& random) {
    const auto build = world.controller->startBuildingModelGroupName(
        random() % 2 == 0 ? "System" : "Apps", random() % 4 == 0 ? "German" : "English");
    if (random() % 2 == 0) {
      build->cancel();
    }
    build->waitUntilFinished();
  });
  repeat("registrar", [&](std::mt19937& random) {
    if (const auto book = world.owner->bookWithID(anyBook(random))) {
      for (const auto& record : world.shelf->indicesForBook(book)) {
        if (random() % 2 == 0) {
          world.controller->indexDidChange(
              record, random() % 2 == 0 ? ZEBIndexChangeUpdated : ZEBIndexChangeAdded);
        }
      }
    }
  });
  repeat("remover", [&](std::mt19937& random) {
    world.shelf->removeIndexForBookID(anyBook(random));
    if (random() % 8 == 0) {
      std::filesystem::remove(world.modelPath(random() % 2 == 0 ? "System" : "Apps"));
    }
  });
  repeat("linguist", [&](std::mt19937&) {
    platform::Environment german = *platform::Environment::current();
    german.preferredLanguages = {"de"};
    const platform::EnvironmentOverride override(std::move(german));
    world.shelf->_resetForLanguageChange();
    std::this_thread::sleep_for(std::chrono::milliseconds(3));
  });
  repeat("synchroniser", [&](std::mt19937&) { world.controller->processPendingIndexEvents(); });
  runUntilOver();

  // What is left ends, and leaves everything in order.
  EXPECT_TRUE(LUXWorld::waitUntil([&] {
    platform::RunLoop::main()->runPending();
    world.clock->advance(platform::Seconds(0.5));
    return world.owner->guards() == 0 && world.controller->_pendingIndexEvents().empty() &&
           world.controller->_modelUpdateQueue()->operationCount() == 0;
  }));
  EXPECT_TRUE(LUXWorld::waitUntil([&] { return world.nothingIsHeld(); }));
  EXPECT_FALSE(world.controller->_queryInProgress());
  EXPECT_FALSE(world.controller->_loading());
  EXPECT_EQ(world.controller->activeModelCountWithActivity(kLUXModelActivityBuilding), 0U);
  EXPECT_THAT(world.logged(0), IsEmpty());
  EXPECT_THAT(world.loggedBeginningWith({"Attemping"}), IsEmpty());
  world.controller->useShorterTimeouts(false);
  EXPECT_TRUE(LUXWorld::waitUntil([&] {
    const auto titles = titlesOf(world.search(LUXWorld::query("printer", {KROrvHelpbookID})));
    return std::find(titles.begin(), titles.end(), "Add a printer") != titles.end();
  }));
}

}  // namespace
