#include "zebd/Host.h"

#include <gmock/gmock.h>

#include <algorithm>
#include <filesystem>
#include <string>
#include <vector>

#include "host/Luxwell/HelpLUXModel.h"
#include "host/Zebrine/ZEBConstants.h"
#include "host/Zebrine/ZEBHelpBook.h"
#include "host/Zebrine/ZEBPlugin.h"
#include "host/Zebrine/ZEBQuery.h"
#include "host/Zebrine/ZEBResult.h"
#include "platform/Environment.h"
#include "platform/Exception.h"
#include "platform/RunLoop.h"
#include "platform/UserDefaults.h"
#include "platform/WorkerThreads.h"
#include "tests/zebd/HostWorld.h"

namespace {

using platform::Seconds;
using testing::ElementsAre;
using testing::IsEmpty;
using tests::ample;
using zebd::Host;

/// Keeps what a search delivers.
class Receiver : public zebd::SearchReceiver {
 public:
  using Records = std::vector<std::shared_ptr<ZEBResult>>;

  void foundResults(const ZEBResultBatch& batch) override {
    const platform::MutexLock lock(_mutex);
    for (const auto& record : std::get<Records>(batch)) {
      _titles.push_back(record->title().value_or(""));
    }
    _wasOnMainThread = _wasOnMainThread || platform::isMainThread();
  }
  void searchEnded(bool finished) override {
    const platform::MutexLock lock(_mutex);
    _ended = true;
    _finished = finished;
  }

  bool ended() const {
    const platform::MutexLock lock(_mutex);
    return _ended;
  }
  bool finished() const {
    const platform::MutexLock lock(_mutex);
    return _finished;
  }
  bool wasOnMainThread() const {
    const platform::MutexLock lock(_mutex);
    return _wasOnMainThread;
  }
  std::vector<std::string> titles() const {
    const platform::MutexLock lock(_mutex);
    return _titles;
  }

 private:
  mutable platform::Mutex _mutex;
  std::vector<std::string> _titles GUARDED_BY(_mutex);
  bool _ended GUARDED_BY(_mutex) = false;
  bool _finished GUARDED_BY(_mutex) = false;
  bool _wasOnMainThread GUARDED_BY(_mutex) = false;
};

/// A host over two small books, which the real plug-in has indexed by the real tool.
class HostTest : public testing::Test, protected tests::HostWorld {
 protected:
  HostTest() {
    writePage("garden/roses.html", "Roses", "Cut roses in spring.");
    writePage("kitchen/boiling.html", "Boiling", "Put water into a pot.");
    host = startHost();
    if (host != nullptr) {
      addBook(*host, "garden");
      addBook(*host, "kitchen");
    }
  }
  ~HostTest() override {
    if (host != nullptr) {
      EXPECT_TRUE(waitUntilQuiet(*host));
    }
  }

  void addBook(Host& onHost, const std::string& name) const {
    const auto book = ZEBHelpBook::bookWithID(name, ZEBHelpBookType1, folder.path(name));
    book->setAccessPagePath(folder.path(name) + "/index.html");
    onHost.bookshelf().addBook(book);
  }
  static bool waitUntilQuiet(Host& aHost) { return HostWorld::waitUntilQuiet(aHost.owner()); }
  static std::vector<std::string> search(Host& onHost, const std::string& words) {
    const auto query = ZEBQuery::initWithQueryString(words);
    query->setResultTypes({ZEBHelpArticleResult});
    const auto receiver = std::make_shared<Receiver>();
    onHost.startSearch(query, receiver);
    EXPECT_TRUE(Host::runMainLoopUntil([&] { return receiver->ended(); }, ample));
    EXPECT_TRUE(receiver->finished());
    EXPECT_FALSE(receiver->wasOnMainThread());
    return receiver->titles();
  }
  void registerAll(Host& onHost) const {
    const auto receiver = std::make_shared<Receiver>();
    onHost.registerBooks({}, receiver);
    EXPECT_TRUE(Host::runMainLoopUntil([&] { return receiver->ended(); }, ample));
    EXPECT_THAT(receiver->titles(), IsEmpty());
    EXPECT_TRUE(waitUntilQuiet(onHost));
  }
  bool hasIndex(const std::string& name) const { return HostWorld::hasIndex(name, name); }

  std::unique_ptr<Host> host;
};

TEST_F(HostTest, FirstSearchHasIndexesMadeAndTheNextFindsPages) {
  EXPECT_THAT(search(*host, "spring"), IsEmpty());
  EXPECT_TRUE(waitUntilQuiet(*host));
  EXPECT_TRUE(hasIndex("garden"));
  EXPECT_TRUE(hasIndex("kitchen"));
  EXPECT_THAT(search(*host, "spring"), ElementsAre("Roses"));
}

TEST_F(HostTest, RegisteringHasIndexesMadeAtOnce) {
  registerAll(*host);
  EXPECT_TRUE(hasIndex("garden"));
  EXPECT_THAT(search(*host, "water"), ElementsAre("Boiling"));
}

TEST_F(HostTest, RegisteringSomeBooksLeavesTheOthers) {
  const auto receiver = std::make_shared<Receiver>();
  host->registerBooks({"kitchen"}, receiver);
  EXPECT_TRUE(waitUntilQuiet(*host));
  EXPECT_TRUE(hasIndex("kitchen"));
  EXPECT_FALSE(hasIndex("garden"));
}

TEST_F(HostTest, AnnouncedBooksAreRegisteredAtLeisure) {
  host->announceBooks();
  EXPECT_TRUE(
      Host::runMainLoopUntil([&] { return hasIndex("garden") && hasIndex("kitchen"); }, ample));
}

TEST_F(HostTest, ModifiedBooksAreTold) {
  platform::Mutex mutex;
  std::vector<std::string> told;
  host->owner().setBookModifiedHandler([&](const std::shared_ptr<ZEBHelpBook>& book) {
    const platform::MutexLock lock(mutex);
    told.push_back(book ? book->bookID() : "none");
  });
  registerAll(*host);
  host->owner().setBookModifiedHandler(nullptr);
  EXPECT_THAT(told, testing::UnorderedElementsAre("garden", "kitchen"));
}

TEST_F(HostTest, RemovedIndexIsDeletedALittleLater) {
  registerAll(*host);
  host->removeIndexOfBook("garden");
  EXPECT_TRUE(hasIndex("garden"));
  EXPECT_TRUE(Host::runMainLoopUntil([&] { return !hasIndex("garden"); }, ample));
  EXPECT_TRUE(hasIndex("kitchen"));
}

TEST_F(HostTest, SecondHostKnowsTheIndexesFromTheCacheFile) {
  registerAll(*host);
  ASSERT_TRUE(std::filesystem::exists(folder.path("caches/help/HelpindexCache.plist")));
  const auto second = startHost();
  addBook(*second, "garden");
  // The folder is out of the way; only what is remembered leads to the index.
  std::filesystem::remove_all(folder.path("garden"));
  EXPECT_THAT(search(*second, "spring"), ElementsAre("Roses"));
  EXPECT_TRUE(waitUntilQuiet(*second));
}

TEST_F(HostTest, SearchesRunSideBySideWhileTheMainLoopRuns) {
  registerAll(*host);
  std::vector<std::shared_ptr<Receiver>> receivers;
  for (int i = 0; i < 16; ++i) {
    const auto query = ZEBQuery::initWithQueryString(i % 2 == 0 ? "water" : "spring");
    query->setResultTypes({ZEBHelpArticleResult});
    receivers.push_back(std::make_shared<Receiver>());
    host->startSearch(query, receivers.back());
  }
  EXPECT_TRUE(Host::runMainLoopUntil(
      [&] {
        return std::all_of(receivers.begin(), receivers.end(),
                           [](const auto& receiver) { return receiver->ended(); });
      },
      ample));
  for (size_t i = 0; i < receivers.size(); ++i) {
    EXPECT_THAT(receivers[i]->titles(), ElementsAre(i % 2 == 0 ? "Boiling" : "Roses"));
  }
}

TEST_F(HostTest, SearchThatBreaksOffEndsUnfinished) {
  class Throwing : public Receiver {
   public:
    void foundResults(const ZEBResultBatch&) override {
      throw platform::Exception("ReceiverException", "no room");
    }
  };
  registerAll(*host);
  const auto query = ZEBQuery::initWithQueryString("water");
  query->setResultTypes({ZEBHelpArticleResult});
  const auto receiver = std::make_shared<Throwing>();
  host->startSearch(query, receiver);
  EXPECT_TRUE(Host::runMainLoopUntil([&] { return receiver->ended(); }, ample));
  EXPECT_FALSE(receiver->finished());
  EXPECT_THAT(log->messages(0), testing::Contains("no room"));
}

TEST_F(HostTest, CancelledSearchFinishesWithoutResults) {
  registerAll(*host);
  const auto query = ZEBQuery::initWithQueryString("water");
  query->setResultTypes({ZEBHelpArticleResult});
  query->cancel();
  const auto receiver = std::make_shared<Receiver>();
  host->startSearch(query, receiver);
  EXPECT_TRUE(Host::runMainLoopUntil([&] { return receiver->ended(); }, ample));
  EXPECT_THAT(receiver->titles(), IsEmpty());
}

TEST_F(HostTest, TakesTheGroupsOfModelsFromTheSettings) {
  using Dictionary = platform::Value::Dictionary;
  platform::Environment environment = *platform::Environment::current();
  environment.userDefaults = platform::userDefaultsFromDictionary(
      {{"ModelGroups",
        Dictionary{{"Groups", Dictionary{{"Plants", Dictionary{{"Weight", 2.0}}}}}}}});
  {
    const platform::EnvironmentOverride override(environment);
    EXPECT_NE(startHost(), nullptr);
    EXPECT_THAT(HelpLUXModel::allModelGroupNames(), ElementsAre("Default", "Plants"));
  }
  environment.userDefaults = platform::userDefaultsFromDictionary({});
  const platform::EnvironmentOverride override(environment);
  EXPECT_NE(startHost(), nullptr);
  EXPECT_THAT(HelpLUXModel::allModelGroupNames(), ElementsAre("Default"));
}

TEST_F(HostTest, GuardIsEvenAfterEverything) {
  registerAll(*host);
  (void)search(*host, "water");
  host->removeIndexOfBook("garden");
  EXPECT_TRUE(Host::runMainLoopUntil([&] { return !hasIndex("garden"); }, ample));
  EXPECT_TRUE(waitUntilQuiet(*host));
  EXPECT_EQ(host->owner().shutdownGuardCount(), 0);
  EXPECT_THAT(messages(0), IsEmpty());
  EXPECT_THAT(messages(1), IsEmpty());
}

TEST_F(HostTest, MainLoopRunsUntilTheConditionHoldsOrTheLimitHasPassed) {
  bool ran = false;
  platform::RunLoop::main()->perform([&] { ran = true; });
  EXPECT_TRUE(Host::runMainLoopUntil([&] { return ran; }, ample));
  EXPECT_TRUE(Host::runMainLoopUntil([] { return true; }, Seconds(0)));
  EXPECT_FALSE(Host::runMainLoopUntil([] { return false; }, Seconds(0.05)));
}

TEST(HostStartTest, WithoutAPluginThereIsNoHost) {
  platform::Error error;
  EXPECT_EQ(Host::start("/none/No.bundle", {}, error), nullptr);
  EXPECT_EQ(error.description,
            "the plug-in /none/No.bundle cannot be used: there is no readable information list");
}

}  // namespace
