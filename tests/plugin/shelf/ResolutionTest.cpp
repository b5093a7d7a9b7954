// Where a book's index comes from.
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <filesystem>
#include <future>

#include "host/Zebrine/ZEBConstants.h"
#include "host/Zebrine/ZEBStrings.h"
#include "platform/DispatchQueue.h"
#include "platform/Exception.h"
#include "plugin/operations/ZEBOperationQueue.h"
#include "plugin/records/ZEBIndex.h"
#include "plugin/remote/ZEBIndexFetchUpdateOperation.h"
#include "plugin/shelf/ZEBIndexGenerationOperation.h"
#include "tests/plugin/shelf/ShelfWorld.h"

using testing::ElementsAre;
using testing::IsEmpty;
using tests::LogEntry;
using tests::ShelfWorld;

namespace {

/// A world whose background work waits, so that it can be looked at.
class Resolution : public testing::Test {
 protected:
  ZEBIndexshelf& makeShelf(bool userLoggedIn) {
    world.makeShelf(userLoggedIn);
    world.shelf->indexGeneratingQueue()->setMaxConcurrentOperationCount(0);
    world.shelf->indexFetchUpdateQueue()->setMaxConcurrentOperationCount(0);
    return *world.shelf;
  }

  void TearDown() override {
    if (world.shelf) {
      world.shelf->indexGeneratingQueue()->setMaxConcurrentOperationCount(1);
      world.shelf->indexFetchUpdateQueue()->setMaxConcurrentOperationCount(1);
    }
  }

  template <typename Operation>
  static std::vector<std::shared_ptr<Operation>> waiting(
      const std::shared_ptr<ZEBOperationQueue>& queue) {
    std::vector<std::shared_ptr<Operation>> operations;
    for (const auto& operation : queue->operations()) {
      if (auto kind = std::dynamic_pointer_cast<Operation>(operation)) {
        operations.push_back(std::move(kind));
      }
    }
    return operations;
  }
  auto fetches() const {
    return waiting<ZEBIndexFetchUpdateOperation>(world.shelf->indexFetchUpdateQueue());
  }
  auto generations() const {
    return waiting<ZEBIndexGenerationOperation>(world.shelf->indexGeneratingQueue());
  }

  ShelfWorld world;
};

TEST_F(Resolution, withoutABookYieldsNothingAndQueuesNothing) {
  EXPECT_THAT(makeShelf(true).indicesForBook(nullptr), IsEmpty());
  EXPECT_THAT(fetches(), IsEmpty());
  EXPECT_THAT(generations(), IsEmpty());
  EXPECT_THAT(world.observer->changes(), IsEmpty());
  EXPECT_EQ(world.owner->disableCount(), 1);
}

TEST_F(Resolution, returnsAKnownBookFromMemoryThoughItsFilesAreGone) {
  const auto book = world.makeBookWithIndex("org.one");
  const auto first = makeShelf(true).indicesForBook(book);
  std::filesystem::remove_all(world.folder.path("books"));
  EXPECT_EQ(world.shelf->indicesForBook(book), first);
  EXPECT_EQ(first.size(), 1U);
  EXPECT_THAT(world.observer->kinds(), ElementsAre(ZEBIndexChangeAdded));
  EXPECT_EQ(fetches().size(), 1U);
}

TEST_F(Resolution, takesTheInstalledIndexOfABook) {
  const auto book = world.makeBookWithIndex("org.one");
  const auto found = makeShelf(false).indicesForBook(book);
  ASSERT_EQ(found.size(), 1U);
  EXPECT_EQ(found.front()->path(), book->indexPaths().front());
  EXPECT_EQ(found.front()->bookID(), "org.one");
  EXPECT_FALSE(found.front()->loadedFromGeneratedCache());
  EXPECT_THAT(world.shelf->_knownIndices().at("org.one"), ElementsAre(found.front()));
  ASSERT_EQ(world.observer->changes().size(), 1U);
  EXPECT_EQ(world.observer->changes().front().kind, ZEBIndexChangeAdded);
  EXPECT_EQ(world.observer->changes().front().index, found.front());
  EXPECT_EQ(world.observer->changes().front().thread, std::this_thread::get_id());
  EXPECT_EQ(world.center->posted().size(), 1U);
}

TEST_F(Resolution, prefersAGeneratedIndexWithoutEvenOpeningTheInstalledOne) {
  const auto book = world.makeBookWithIndex("org.one");
  book->setLocalization("de");
  const std::string generated = world.writeIndex(world.generatedPath("org.one", "de"));
  world.folder.write("books/org.one/org.one.helpindex", "broken: opening it would be logged");
  const auto found = makeShelf(true).indicesForBook(book);
  ASSERT_EQ(found.size(), 1U);
  EXPECT_EQ(found.front()->path(), generated);
  EXPECT_EQ(found.front()->bookID(), "org.one");
  EXPECT_TRUE(found.front()->loadedFromGeneratedCache());
  EXPECT_THAT(world.log->messages(0), IsEmpty());
}

TEST_F(Resolution, passesGeneratedIndexesOverWhileNobodyIsLoggedIn) {
  const auto book = world.makeBookWithIndex("org.one");
  world.writeIndex(world.generatedPath("org.one", "org.one"));
  const auto found = makeShelf(false).indicesForBook(book);
  ASSERT_EQ(found.size(), 1U);
  EXPECT_EQ(found.front()->path(), book->indexPaths().front());
}

TEST_F(Resolution, passesOverAGeneratedIndexOfAnotherLocalization) {
  const auto book = world.makeBookWithIndex("org.one");
  book->setLocalization("de");
  world.writeIndex(world.generatedPath("org.one", "fr"));
  EXPECT_EQ(makeShelf(true).indicesForBook(book).front()->path(), book->indexPaths().front());
}

TEST_F(Resolution, fallsThroughABrokenGeneratedIndexToTheInstalledOne) {
  const auto book = world.makeBookWithIndex("org.one");
  const std::string generated = world.generatedPath("org.one", "org.one");
  world.writeIndex(generated);
  std::filesystem::resize_file(generated, 10);
  const auto found = makeShelf(true).indicesForBook(book);
  ASSERT_EQ(found.size(), 1U);
  EXPECT_EQ(found.front()->path(), book->indexPaths().front());
}

TEST_F(Resolution, takesOnlyTheFirstOfABooksIndexPaths) {
  const auto book = world.makeBookWithIndex("org.one");
  book->setIndexPaths({world.folder.path("missing.helpindex"), book->indexPaths().front()});
  EXPECT_THAT(makeShelf(false).indicesForBook(book), IsEmpty());
}

TEST_F(Resolution, queuesAnUpdateFetchForAnInstalledBookWhateverItsIndexCameFrom) {
  ZEBIndexshelf& shelf = makeShelf(true);
  const auto installed = world.makeBookWithIndex("org.installed");
  const auto generated = world.makeBookWithIndex("org.generated");
  world.writeIndex(world.generatedPath("org.generated", "org.generated"));
  shelf.indicesForBook(installed);
  shelf.indicesForBook(generated);
  const auto operations = fetches();
  ASSERT_EQ(operations.size(), 2U);
  EXPECT_EQ(operations[0]->bookID(), &installed->bookID());
  EXPECT_EQ(operations[1]->bookID(), &generated->bookID());
  EXPECT_THAT(generations(), IsEmpty());
}

TEST_F(Resolution, queuesNoUpdateFetchForABookWithoutIndexPaths) {
  world.writeIndex(world.generatedPath("org.one", "org.one"));
  EXPECT_EQ(makeShelf(true).indicesForBook(world.makeBook("org.one")).size(), 1U);
  EXPECT_THAT(fetches(), IsEmpty());
  EXPECT_THAT(generations(), IsEmpty());
}

TEST_F(Resolution, queuesNoUpdateFetchWhileNobodyIsLoggedIn) {
  EXPECT_EQ(makeShelf(false).indicesForBook(world.makeBookWithIndex("org.one")).size(), 1U);
  EXPECT_THAT(fetches(), IsEmpty());
}

TEST_F(Resolution, addsUpdateFetchesUnderTheMonitorOfTheirQueue) {
  ZEBIndexshelf& shelf = makeShelf(true);
  const auto book = world.makeBookWithIndex("org.one");
  std::thread resolver;
  {
    const platform::MonitorLock lock(shelf.indexFetchUpdateQueue()->monitor());
    resolver = std::thread([&] { shelf.indicesForBook(book); });
    std::this_thread::sleep_for(std::chrono::milliseconds(5));
    EXPECT_THAT(fetches(), IsEmpty());
  }
  resolver.join();
  EXPECT_EQ(fetches().size(), 1U);
}

/// Calls back whenever a file is mapped.
class WatchedFiles : public platform::FailingFileManager {
 public:
  std::optional<platform::Data> contentsMappedAtPath(const std::string& path,
                                                     platform::Error* error) const override {
    if (onRead) {
      onRead();
    }
    return FailingFileManager::contentsMappedAtPath(path, error);
  }
  std::function<void()> onRead;
};

TEST_F(Resolution, addsGenerationsUnderTheLockOfTheShelf) {
  const auto files = std::make_shared<WatchedFiles>();
  world.change([&](platform::Environment& environment) { environment.files = files; });
  ZEBIndexshelf& shelf = makeShelf(true);
  const auto book = world.makeBook("org.one");
  std::promise<void> lookedUp;
  std::promise<void> locked;
  files->onRead = [&] {
    lookedUp.set_value();
    locked.get_future().wait();
  };
  std::thread resolver([&] { shelf.indicesForBook(book); });
  lookedUp.get_future().wait();
  {
    const platform::MonitorLock lock(shelf._shelfMonitor());
    locked.set_value();
    std::this_thread::sleep_for(std::chrono::milliseconds(5));
    EXPECT_THAT(generations(), IsEmpty());
  }
  resolver.join();
  files->onRead = nullptr;
  EXPECT_EQ(generations().size(), 1U);
}

TEST_F(Resolution, ofAnUnreadableInstalledIndexWithNobodyLoggedInIsEmptyWithoutAGeneration) {
  const auto book = world.makeBook("org.one");
  book->setIndexPaths({world.folder.path("missing.helpindex")});
  EXPECT_THAT(makeShelf(false).indicesForBook(book), IsEmpty());
  EXPECT_THAT(generations(), IsEmpty());
  EXPECT_THAT(fetches(), IsEmpty());
  EXPECT_THAT(world.shelf->_knownIndices(), IsEmpty());
}

TEST_F(Resolution, ofAnUnreadableInstalledIndexWithAUserIsEmptyNowAndQueuesOneGeneration) {
  const auto book = world.makeBook("org.one");
  book->setIndexPaths({world.folder.path("missing.helpindex")});
  world.launcher->behave(tests::writesIndex());
  EXPECT_THAT(makeShelf(true).indicesForBook(book), IsEmpty());
  const auto operations = generations();
  ASSERT_EQ(operations.size(), 1U);
  EXPECT_EQ(operations.front()->book(), book);
  EXPECT_EQ(operations.front()->index(), nullptr);
  EXPECT_FALSE(operations.front()->onlyGenerateLUXIndex());
  EXPECT_THAT(fetches(), IsEmpty());
  EXPECT_THAT(world.observer->changes(), IsEmpty());
  world.shelf->indexGeneratingQueue()->setMaxConcurrentOperationCount(1);
  world.finishWork();
  // Observers hear of it when it is there.
  EXPECT_THAT(world.observer->kinds(), ElementsAre(ZEBIndexChangeUpdated));
  EXPECT_NE(world.knownRecord("org.one"), nullptr);
}

TEST_F(Resolution, asksForAGenerationEachTimeUntilThereIsAnIndex) {
  const auto book = world.makeBook("org.one");
  makeShelf(true).indicesForBook(book);
  world.shelf->indicesForBook(book);
  EXPECT_EQ(generations().size(), 2U);
}

TEST_F(Resolution, ofARemoteBookTakesTheGeneratedIndexAndQueuesNoGeneration) {
  const auto book = world.makeBookWithIndex("org.remote", ZEBHelpBookType4);
  const std::string generated = world.writeIndex(world.generatedPath("org.remote", "org.remote"));
  const auto found = makeShelf(true).indicesForBook(book);
  ASSERT_EQ(found.size(), 1U);
  EXPECT_EQ(found.front()->path(), generated);
  EXPECT_THAT(generations(), IsEmpty());
  EXPECT_THAT(fetches(), IsEmpty());
  EXPECT_THAT(world.observer->kinds(), ElementsAre(ZEBIndexChangeAdded));
}

TEST_F(Resolution, ofARemoteBookWithoutAGeneratedIndexLeavesItToTheDownload) {
  const auto book = world.makeBookWithIndex("org.remote", ZEBHelpBookType4);
  EXPECT_THAT(makeShelf(true).indicesForBook(book), IsEmpty());
  EXPECT_THAT(generations(), IsEmpty());
  EXPECT_THAT(world.shelf->_knownIndices(), IsEmpty());
}

TEST_F(Resolution, ofARemoteBookWithNobodyLoggedInQueuesNothingAndIsTriedAgain) {
  const auto book = world.makeBookWithIndex("org.remote", ZEBHelpBookType4);
  world.writeIndex(world.generatedPath("org.remote", "org.remote"));
  EXPECT_THAT(makeShelf(false).indicesForBook(book), IsEmpty());
  EXPECT_THAT(generations(), IsEmpty());
  world.shelf->setUserLoggedIn(true);
  EXPECT_EQ(world.shelf->indicesForBook(book).size(), 1U);
}

TEST_F(Resolution, withoutACachesFolderUsesTheInstalledIndex) {
  world.change([](platform::Environment& environment) { environment.cachesDirectory.reset(); });
  const auto book = world.makeBookWithIndex("org.one");
  EXPECT_EQ(makeShelf(true).indicesForBook(book).size(), 1U);
}

TEST_F(Resolution, logsAnExceptionAtLevelZeroAndReturnsWhatItHadFound) {
  const auto book = world.makeBookWithIndex("org.one");
  makeShelf(true);
  world.observer->onChange = [](const auto&) {
    throw platform::Exception("TestException", "the observer is unwell");
  };
  const auto found = world.shelf->indicesForBook(book);
  EXPECT_EQ(found.size(), 1U);
  EXPECT_THAT(world.logged(), ElementsAre(LogEntry{0, "the observer is unwell"}));
  EXPECT_EQ(world.owner->depth(), 0);
  // The lock was given back.
  std::thread([&] { EXPECT_EQ(world.shelf->_knownIndices().size(), 1U); }).join();
}

TEST_F(Resolution, readsFilesWithoutTheLockOfTheShelf) {
  const auto files = std::make_shared<WatchedFiles>();
  world.change([&](platform::Environment& environment) { environment.files = files; });
  const auto book = world.makeBookWithIndex("org.one");
  makeShelf(false);
  int reads = 0;
  files->onRead = [&] {
    ++reads;
    EXPECT_TRUE(world.othersGetTheLock());
  };
  world.shelf->indicesForBook(book);
  files->onRead = nullptr;
  EXPECT_EQ(reads, 1);
}

TEST_F(Resolution, ofOneBookByTwoThreadsAtOnceStoresAndAnnouncesTwice) {
  const auto book = world.makeBookWithIndex("org.one");
  makeShelf(false);
  std::atomic<int> inside{0};
  class Rendezvous : public platform::FailingFileManager {
   public:
    explicit Rendezvous(std::atomic<int>& arrived) : _arrived(arrived) {}
    std::optional<platform::Data> contentsMappedAtPath(const std::string& path,
                                                       platform::Error* error) const override {
      ++_arrived;
      while (_arrived < 2) {
        std::this_thread::yield();
      }
      return FailingFileManager::contentsMappedAtPath(path, error);
    }

   private:
    std::atomic<int>& _arrived;
  };
  world.change([&](platform::Environment& environment) {
    environment.files = std::make_shared<Rendezvous>(inside);
  });
  std::thread other([&] { EXPECT_EQ(world.shelf->indicesForBook(book).size(), 1U); });
  EXPECT_EQ(world.shelf->indicesForBook(book).size(), 1U);
  other.join();
  EXPECT_THAT(world.observer->kinds(), ElementsAre(ZEBIndexChangeAdded, ZEBIndexChangeAdded));
  EXPECT_NE(world.knownRecord("org.one"), nullptr);
}

platform::Value::Dictionary remoteRoot(const std::string& root) {
  return {{"SKI_USE_REMOTE_ROOT", true}, {"SKI_REMOTE_ROOT", root}};
}

TEST_F(Resolution, givesABookTheRemoteRootOfItsOnlyRecordEscaped) {
  const std::string root = "https://help.example/a book/";
  const auto book = world.makeBookWithIndex("org.one", 1, remoteRoot(root));
  makeShelf(false).indicesForBook(book);
  ASSERT_TRUE(book->remoteURL());
  EXPECT_EQ(book->remoteURL()->absoluteString(), URLByEscapingString(root)->absoluteString());
  EXPECT_EQ(book->remoteURL()->absoluteString(), "https://help.example/a%20book/");
}

TEST_F(Resolution, leavesARemoteURLThatTheBookHas) {
  const auto book = world.makeBookWithIndex("org.one", 1, remoteRoot("https://other.example/"));
  book->setRemoteURL(platform::URL::URLWithString("https://own.example/"));
  makeShelf(false).indicesForBook(book);
  EXPECT_EQ(book->remoteURL()->absoluteString(), "https://own.example/");
}

TEST_F(Resolution, leavesABookWithoutRemoteURLWhereItsRecordHasNoRoot) {
  const auto book = world.makeBookWithIndex("org.one");
  makeShelf(false).indicesForBook(book);
  EXPECT_FALSE(book->remoteURL());
  world.shelf->populateRemoteURLOfBook(nullptr);
  world.shelf->populateRemoteURLOfBook(world.makeBook("org.unknown"));
}

}  // namespace
