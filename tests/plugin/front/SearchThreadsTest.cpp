// Many searches at once, on threads of the host, while books come and go.
#include <gtest/gtest.h>

#include <thread>

#include "tests/plugin/front/FrontWorld.h"

using platform::RunLoop;
using platform::Seconds;
using tests::anchors;
using tests::FrontWorld;
using tests::page;

namespace {

constexpr size_t bookCount = 12;
constexpr size_t searchThreads = 4;
constexpr size_t searchesPerThread = 40;

std::string bookID(size_t number) { return "book" + std::to_string(number); }

void addBooks(const FrontWorld& world) {
  for (size_t i = 0; i < bookCount; ++i) {
    const auto book = world.addBook(bookID(i),
                                    {page("/p.html", "Printing " + bookID(i), "print queue"),
                                     page("/q.html", "Paper " + bookID(i), "print paper")},
                                    anchors({{"queue", {"/p.html"}}}));
    book->setExactMatchPath(world.writeList(bookID(i) + "/em.plist", {{"print", "queue"}}));
    book->setSuggestionsPath(world.writeList(
        bookID(i) + "/s.plist",
        {{"print", platform::Value::Dictionary{{"print", "queue"}, {"printer", ""}}}}));
  }
}

/// The searches of one host thread, of all sorts.
void searchAway(const FrontWorld& world, size_t thread) {
  for (size_t i = 0; i < searchesPerThread; ++i) {
    const std::vector<std::string> scope =
        i % 3 == 0
            ? std::vector<std::string>()
            : std::vector<std::string>{bookID((thread + i) % bookCount), bookID(i % bookCount)};
    const std::vector<std::string> kinds =
        i % 4 == 0 ? std::vector<std::string>{ZEBHelpSuggestionResult, ZEBHelpArticleResult}
                   : std::vector<std::string>{ZEBHelpArticleResult};
    platform::Value::Dictionary options;
    options[ZEBQueryAnchorSearchOptionKey] = i % 5 == 0;
    const auto query = FrontWorld::query(i % 5 == 0 ? "queue" : "print", scope, kinds, options);
    if (i % 7 == 0) {
      query->cancel();
    }
    world.controller->startSearchForQuery(query);
    world.controller->completeSearchForQuery(query);
  }
}

/// Runs the searches while this thread, the main one, runs its loop and has books removed,
/// registered and the language changed.
void searchWhileBooksComeAndGo(const FrontWorld& world) {
  std::atomic<size_t> running{searchThreads};
  std::vector<std::thread> threads;
  threads.reserve(searchThreads);
  for (size_t thread = 0; thread < searchThreads; ++thread) {
    threads.emplace_back([&, thread] {
      searchAway(world, thread);
      --running;
    });
  }
  for (size_t i = 0; running > 0; ++i) {
    world.controller->finishPopulatingBookWithID(bookID(i % bookCount));
    world.controller->removeIndexForBookWithID(bookID((i * 5) % bookCount));
    if (i % 20 == 19) {
      world.controller->notifyEvent(ZEBPluginEventLanguageChanged, {});
    }
    world.clock->advance(Seconds(0.3));
    RunLoop::main()->runPending();
    std::this_thread::sleep_for(std::chrono::milliseconds(1));
  }
  for (std::thread& thread : threads) {
    thread.join();
  }
}

}  // namespace

TEST(SearchThreads, SearchesOnManyThreadsGoOnWhileBooksAreRegisteredAndRemoved) {
  const FrontWorld world;
  addBooks(world);
  searchWhileBooksComeAndGo(world);
  size_t finished = 0;
  for (const std::string& message : world.owner->messages()) {
    finished += message == "finished" ? 1 : 0;
  }
  EXPECT_EQ(finished, searchThreads * searchesPerThread);
  EXPECT_TRUE(world.logged(0).empty());
}

TEST(SearchThreads, TheyDoForALoggedInUserTooWithFetchesOnTheMainLoop) {
  const FrontWorld world(FrontWorld::User::loggedIn);
  addBooks(world);
  searchWhileBooksComeAndGo(world);
  size_t finished = 0;
  for (const std::string& message : world.owner->messages()) {
    finished += message == "finished" ? 1 : 0;
  }
  EXPECT_EQ(finished, searchThreads * searchesPerThread);
}

TEST(SearchThreads, TheSameBooksGiveTheSameAnswerOnEveryThread) {
  const FrontWorld world;
  addBooks(world);
  world.search(FrontWorld::query("paper"));
  const auto expected = world.owner->records(0).size();
  ASSERT_EQ(expected, bookCount);
  world.owner->forgetMessages();
  std::vector<std::thread> threads;
  threads.reserve(searchThreads);
  for (size_t thread = 0; thread < searchThreads; ++thread) {
    threads.emplace_back([&] {
      for (size_t i = 0; i < 10; ++i) {
        world.controller->startSearchForQuery(FrontWorld::query("paper"));
      }
    });
  }
  for (std::thread& thread : threads) {
    thread.join();
  }
  ASSERT_EQ(world.owner->batches().size(), searchThreads * 10);
  for (size_t i = 0; i < world.owner->batches().size(); ++i) {
    EXPECT_EQ(world.owner->records(i).size(), expected);
  }
}
