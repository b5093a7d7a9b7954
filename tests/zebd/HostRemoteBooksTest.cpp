// A host over books of a web server, in the language of its user.
#include <gmock/gmock.h>

#include <algorithm>
#include <nlohmann/json.hpp>

#include "SearchKit/IndexWriter.h"
#include "host/Zebrine/RNXObjectManager.h"
#include "host/Zebrine/ZEBConstants.h"
#include "host/Zebrine/ZEBHelpBook.h"
#include "host/Zebrine/ZEBQuery.h"
#include "host/Zebrine/ZEBResult.h"
#include "platform/ClassicArchive.h"
#include "platform/Digest.h"
#include "platform/DistributedNotificationCenter.h"
#include "platform/Environment.h"
#include "platform/ProcessInfo.h"
#include "tests/platform/QuickClock.h"
#include "tests/platform/TemporaryFolder.h"
#include "tests/support/NginxServer.h"
#include "zebd/Host.h"

namespace {

using platform::Seconds;

using testing::ElementsAre;
using testing::IsEmpty;
using zebd::Host;
using JSON = nlohmann::json;

/// Time enough for anything that ends at all.
constexpr Seconds ample{600};

/// Keeps the addresses of the pages that a search delivers.
class Receiver : public zebd::SearchReceiver {
 public:
  void foundResults(const ZEBResultBatch& batch) override {
    const platform::MutexLock lock(_mutex);
    for (const auto& record : std::get<std::vector<std::shared_ptr<ZEBResult>>>(batch)) {
      _urls.push_back(record->payloadValueForKey(ZEBResultURLKey).stringValue().value_or(""));
    }
  }
  void searchEnded(bool /*finished*/) override {
    const platform::MutexLock lock(_mutex);
    _ended = true;
  }
  bool ended() const {
    const platform::MutexLock lock(_mutex);
    return _ended;
  }
  std::vector<std::string> urls() const {
    const platform::MutexLock lock(_mutex);
    return _urls;
  }

 private:
  mutable platform::Mutex _mutex;
  std::vector<std::string> _urls GUARDED_BY(_mutex);
  bool _ended GUARDED_BY(_mutex) = false;
};

class HostRemoteBooksTest : public testing::Test {
 protected:
  HostRemoteBooksTest() {
    speak("de");
    RNXObjectManager::setSharedObjectManager(RNXObjectManager::init());
    for (const char* locale : {"de", "fr"}) {
      publish(locale);
    }
    server.write("catalogue.json", _catalogue.dump());
    platform::Error error;
    host = Host::start(ZEB_PLUGIN_BUNDLE, {true, true, folder.path("caches/org.zeb.zebd")}, error);
    EXPECT_NE(host, nullptr) << error.description;
    book->setCatalogueURL(platform::URL::URLWithString(server.URL("/catalogue.json")));
    host->bookshelf().addBook(book);
  }
  ~HostRemoteBooksTest() override {
    EXPECT_TRUE(waitUntilQuiet());
    host.reset();
    RNXObjectManager::setSharedObjectManager(nullptr);
  }

  /// From now on the user prefers this language.
  void speak(const std::string& language) {
    platform::Environment environment = platform::Environment::system();
    environment.clock = _clock;
    environment.log = log;
    environment.notificationCenter = platform::localNotificationCenter();
    environment.cachesDirectory = folder.path("caches");
    environment.networkIsReachable = [] { return true; };
    environment.preferredLanguages = {language};
    _environment.reset();
    _environment.emplace(std::move(environment));
  }

  bool waitUntilQuiet() const {
    return Host::runMainLoopUntil([&] { return host->owner().isQuietFor(Seconds(0.5)); }, ample);
  }
  /// What comes of a search once everything that it has set off has ended.
  std::vector<std::string> found() const {
    EXPECT_TRUE(waitUntilQuiet());
    (void)search();
    EXPECT_TRUE(waitUntilQuiet());
    return search();
  }
  std::vector<std::string> search() const {
    const auto query = ZEBQuery::initWithQueryString("applet");
    query->setResultTypes({ZEBHelpArticleResult});
    const auto receiver = std::make_shared<Receiver>();
    host->startSearch(query, receiver);
    EXPECT_TRUE(Host::runMainLoopUntil([&] { return receiver->ended(); }, ample));
    return receiver->urls();
  }
  std::string page(const std::string& locale) const {
    return server.URL("/" + locale + "/" + locale + ".html");
  }

  tests::TemporaryFolder folder;
  tests::NginxServer server;
  const std::shared_ptr<platform::CapturingLogSink> log =
      std::make_shared<platform::CapturingLogSink>();
  const std::shared_ptr<ZEBHelpBook> book =
      ZEBHelpBook::bookWithID("org.remote", ZEBHelpBookType4, "/nowhere");
  std::unique_ptr<Host> host;

 private:
  void publish(const std::string& locale) {
    searchkit::IndexWriter writer;
    searchkit::Document document;
    document.path = "/" + locale + ".html";
    document.title = locale;
    document.abstract = locale;
    document.body = {"applet"};
    writer.add(std::move(document));
    const platform::Data index = platform::classicArchiveWithRootObject(
        platform::Value::Dictionary{{"SKI_INDEX_DATA", writer.finish()}});
    server.write(locale + ".helpindex", index.view());
    _catalogue["format"] = 1;
    _catalogue["books"].push_back(
        {{"identifier", "org.remote"},
         {"version", "1"},
         {"locale", locale},
         {"pages", locale + "/"},
         {"searchIndex",
          {{"url", locale + ".helpindex"}, {"sha256", platform::sha256Digest(index.view())}}}});
  }

  JSON _catalogue;
  // Patience with servers is counted by this clock: it must not run out on a busy machine.
  const std::shared_ptr<tests::QuickClock> _clock = std::make_shared<tests::QuickClock>(4);
  std::optional<platform::EnvironmentOverride> _environment;
};

TEST_F(HostRemoteBooksTest, AreInTheLanguageOfTheUser) {
  EXPECT_THAT(found(), ElementsAre(page("de")));
  EXPECT_EQ(book->localization(), "de");
}

TEST_F(HostRemoteBooksTest, FollowAChangeOfTheUsersLanguages) {
  ASSERT_THAT(found(), ElementsAre(page("de")));
  speak("fr");
  host->userLanguagesDidChange();
  EXPECT_THAT(found(), ElementsAre(page("fr")));
  EXPECT_EQ(book->localization(), "fr");
  EXPECT_THAT(log->messages(1), IsEmpty());
  // Back again no index has to be fetched.
  speak("de");
  host->userLanguagesDidChange();
  EXPECT_EQ(book->localization(), "de");
  EXPECT_THAT(found(), ElementsAre(page("de")));
  const std::vector<std::string> asked = server.accessLog();
  EXPECT_LE(std::count_if(asked.begin(), asked.end(),
                          [](const std::string& line) {
                            return line.find(".helpindex") != std::string::npos;
                          }),
            2);
}

TEST_F(HostRemoteBooksTest, StayInTheFormerLanguageUntilTheNewOneHasCome) {
  ASSERT_THAT(found(), ElementsAre(page("de")));
  server.stop();
  speak("fr");
  host->userLanguagesDidChange();
  EXPECT_THAT(found(), ElementsAre(page("de")));
  EXPECT_EQ(book->localization(), "de");
  // And when the server is there again, with the next look at the book.
  server.start();
  host->userLanguagesDidChange();
  EXPECT_THAT(found(), ElementsAre(page("fr")));
}

TEST_F(HostRemoteBooksTest, StayInTheLanguageThatTheReaderWantsThemIn) {
  book->setPreferredLanguages({"de"});
  ASSERT_THAT(found(), ElementsAre(page("de")));
  speak("fr");
  host->userLanguagesDidChange();
  EXPECT_THAT(found(), ElementsAre(page("de")));
}

/// The end of the process.
class HostDeathTest : public testing::Test {
 protected:
  HostDeathTest() {
    GTEST_FLAG_SET(death_test_style, "threadsafe");
    platform::Environment environment = platform::Environment::system();
    environment.clock = clock;
    _override.emplace(std::move(environment));
  }

  const std::shared_ptr<platform::SimulatedClock> clock =
      std::make_shared<platform::SimulatedClock>();

 private:
  std::optional<platform::EnvironmentOverride> _override;
};

TEST_F(HostDeathTest, EndsTheProcessWithItsStatus) {
  EXPECT_EXIT(Host::endProcess(3), testing::ExitedWithCode(3), "");
}

TEST_F(HostDeathTest, WaitsForWhatMustNotBeCutShort) {
  EXPECT_EXIT(
      {
        platform::ProcessInfo::processInfo()->disableSuddenTermination();
        std::thread([this] {
          clock->waitForSleepers(1);
          std::fputs("written", stderr);
          platform::ProcessInfo::processInfo()->enableSuddenTermination();
        }).detach();
        Host::endProcess(3);
      },
      testing::ExitedWithCode(3), "written");
}

TEST_F(HostDeathTest, WaitsNoLongerThanFiveSeconds) {
  EXPECT_EXIT(
      {
        platform::ProcessInfo::processInfo()->disableSuddenTermination();
        std::thread([this] {
          clock->waitForSleepers(1);
          clock->advance(Seconds(4.9));
          std::fputs("waits", stderr);
          clock->advance(Seconds(0.1));
        }).detach();
        Host::endProcess(3);
      },
      testing::ExitedWithCode(3), "waits");
}

}  // namespace
