// Books on a web server: subscribed to, searched here, offline, renewed, left.
#include <gmock/gmock.h>

#include <filesystem>
#include <nlohmann/json.hpp>

#include "host/Zebrine/RNXObjectManager.h"
#include "platform/PropertyList.h"
#include "platform/UserDefaults.h"
#include "tests/support/NginxServer.h"
#include "tests/support/ScriptedServer.h"
#include "tests/zeb/World.h"

namespace {

namespace fs = std::filesystem;
using testing::Contains;
using testing::ElementsAre;
using testing::HasSubstr;
using testing::IsEmpty;
using testing::Not;
using testing::UnorderedElementsAre;
using tests::NginxServer;
using tests::Outcome;
using zeb::ExitCode;
using JSON = nlohmann::json;

/// Patience with servers is counted by the world's clock: it must not run out on a busy machine.
constexpr double pace = 4;

class RemoteBooksTest : public testing::Test {
 protected:
  RemoteBooksTest() { RNXObjectManager::setSharedObjectManager(RNXObjectManager::init()); }
  ~RemoteBooksTest() override { RNXObjectManager::setSharedObjectManager(nullptr); }

  void publish(const NginxServer& server, const std::string& folder,
               const std::string& bookID) const {
    const Outcome run = world.zeb(
        {"publish", world.files().path(folder), "--site", server.folder(), "--book-id", bookID});
    ASSERT_EQ(run.code, ExitCode::success) << run.err;
    // The server tells editions apart by second and size: each has a second of its own.
    server.setModified("catalogue.json", ++_modified);
  }
  void publishManual(const NginxServer& server) const {
    const Outcome run =
        world.zeb({"publish", tests::shippedBook("manual"), "--site", server.folder()});
    ASSERT_EQ(run.code, ExitCode::success) << run.err;
  }
  /// A book in German and in English.
  void publishInTwoLanguages(const NginxServer& server) const {
    world.files().write("book/Info.plist",
                        platform::dataFromPropertyList(
                            platform::Value::Dictionary{{"ZEBBookIdentifier", "org.book"}},
                            platform::PropertyListFormat::xml)
                            .view());
    world.writePage("book/de.lproj/index.html", "Buch", "Drucker");
    world.writePage("book/en.lproj/index.html", "Book", "printer");
    const Outcome run =
        world.zeb({"publish", world.files().path("book"), "--site", server.folder()});
    ASSERT_EQ(run.code, ExitCode::success) << run.err;
  }
  /// As long as this lives, the user prefers the language.
  static platform::EnvironmentOverride speaking(const std::string& language) {
    platform::Environment environment = *platform::Environment::current();
    environment.preferredLanguages = {language};
    return platform::EnvironmentOverride(std::move(environment));
  }
  /// As a new process would: nothing is remembered of catalogues.
  static void forgetCatalogues() {
    RNXObjectManager::setSharedObjectManager(RNXObjectManager::init());
  }

  std::vector<std::string> found(std::vector<std::string> line) const {
    line.emplace_back("--json");
    std::vector<std::string> urls;
    const Outcome run = world.zeb(std::move(line));
    const JSON json = JSON::parse(run.out, nullptr, false);
    if (json.is_discarded()) {
      ADD_FAILURE() << run.out << run.err;
      return urls;
    }
    for (const JSON& result : json["results"]) {
      urls.push_back(result["url"]);
    }
    return urls;
  }

  /// What is found once what is on its way has come, which no search waits for beyond its bounds.
  std::vector<std::string> foundAtLast(const std::vector<std::string>& line) const {
    std::vector<std::string> urls = found(line);
    for (int i = 0; i < 100 && urls.empty(); ++i) {
      urls = found(line);
    }
    return urls;
  }

  tests::World world{pace};

 private:
  mutable long _modified = 1'700'000'000;
};

TEST_F(RemoteBooksTest, aBookIsAddedFetchedAndSearched) {
  const NginxServer server;
  publishManual(server);
  const Outcome run = world.zeb({"add", server.URL("/catalogue.json")});
  EXPECT_EQ(run.code, ExitCode::success) << run.err;
  EXPECT_EQ(run.err, "");
  EXPECT_THAT(run.out, HasSubstr("org.zeb.manual"));
  EXPECT_TRUE(fs::exists(world.indexPath("org.zeb.manual")));
  EXPECT_THAT(found({"search", "glossary"}),
              Contains(server.URL("/books/org.zeb.manual/default/pages/glossary.html")));
  EXPECT_THAT(world.zeb({"books"}).out, HasSubstr("org.zeb.manual"));
  EXPECT_THAT(world.zeb({"books"}).out, HasSubstr("indexed"));
  // Pages are read where they are: none was fetched.
  for (const std::string& line : server.accessLog()) {
    EXPECT_THAT(line, Not(HasSubstr("/pages/")));
  }
}

TEST_F(RemoteBooksTest, everySearchWorksWhileTheServerIsGone) {
  NginxServer server;
  publishManual(server);
  ASSERT_EQ(world.zeb({"add", server.URL("/catalogue.json")}).code, ExitCode::success);
  const std::vector<std::vector<std::string>> questions = {
      {"search", "glossary"},
      {"search", "half", "words"},
      {"search", "\"default printer\""},
      {"search", "operat"},
      {"search", "+index", "-printer"},
      {"search", "why", "is", "nothing", "found"},
      {"search", "--actions", "make", "a", "book"},
      {"search", "phrases"},
      {"anchor", "searching-operators"},
      {"anchor", "no-connection"}};
  std::vector<std::vector<std::string>> online;
  for (const auto& question : questions) {
    online.push_back(found(question));
  }
  EXPECT_THAT(online[0], Not(IsEmpty()));
  EXPECT_THAT(online[9], Not(IsEmpty()));
  const std::string suggestions = world.zeb({"suggest", "sea"}).out;
  server.stop();
  forgetCatalogues();
  for (size_t i = 0; i < questions.size(); ++i) {
    EXPECT_EQ(found(questions[i]), online[i]) << questions[i].back();
  }
  EXPECT_EQ(world.zeb({"suggest", "sea"}).out, suggestions);
  // Also when the plug-in looks at every book anew, and asks in vain.
  fs::remove(world.cacheFolder() + "/org.zeb.zebd/HelpindexCache.plist");
  EXPECT_EQ(found(questions[0]), online[0]);
  EXPECT_TRUE(fs::exists(world.indexPath("org.zeb.manual")));
}

TEST_F(RemoteBooksTest, aNewEditionIsPickedUp) {
  const NginxServer server;
  world.writePage("book/index.html", "First", "applet");
  publish(server, "book", "org.book");
  ASSERT_EQ(world.zeb({"add", server.URL("/catalogue.json")}).code, ExitCode::success);
  EXPECT_THAT(found({"search", "applet"}), testing::SizeIs(1));
  world.writePage("book/second.html", "Second", "gadget");
  publish(server, "book", "org.book");
  forgetCatalogues();
  const Outcome run = world.zeb({"scan", "--no-system"});
  EXPECT_EQ(run.code, ExitCode::success) << run.err;
  EXPECT_THAT(run.out, HasSubstr("1 on servers"));
  EXPECT_THAT(found({"search", "gadget"}),
              ElementsAre(server.URL("/books/org.book/default/pages/second.html")));
}

TEST_F(RemoteBooksTest, aNewEditionIsPickedUpByItselfAfterSomeHours) {
  const NginxServer server;
  world.writePage("book/index.html", "First", "applet");
  publish(server, "book", "org.book");
  ASSERT_EQ(world.zeb({"add", server.URL("/catalogue.json")}).code, ExitCode::success);
  world.writePage("book/second.html", "Second", "gadget");
  publish(server, "book", "org.book");
  forgetCatalogues();
  const std::string marker = world.cacheFolder() + "/org.zeb.zebd/RemoteBooks.checked";
  fs::last_write_time(marker, fs::last_write_time(marker) - std::chrono::hours(4));
  EXPECT_THAT(foundAtLast({"search", "gadget"}), testing::SizeIs(1));
  EXPECT_GT(fs::last_write_time(marker), fs::file_time_type::clock::now() - std::chrono::hours(1));
}

TEST_F(RemoteBooksTest, renewingWhatIsUnchangedCostsOneConditionalRequest) {
  const NginxServer server;
  for (const char* name : {"one", "two", "three"}) {
    world.writePage(std::string(name) + "/index.html", name, "applet");
    publish(server, name, std::string("org.") + name);
  }
  ASSERT_EQ(world.zeb({"add", server.URL("/catalogue.json")}).code, ExitCode::success);
  const size_t before = server.waitForAccessLog(4).size();
  forgetCatalogues();
  ASSERT_EQ(world.zeb({"scan", "--no-system"}).code, ExitCode::success);
  const auto log = server.waitForAccessLog(before + 1);
  ASSERT_EQ(log.size(), before + 1);
  EXPECT_EQ(log.back(), "GET /catalogue.json 304 0");
}

TEST_F(RemoteBooksTest, aTamperedIndexIsNotTakenAndTheFormerStays) {
  const NginxServer server;
  world.writePage("book/index.html", "First", "applet");
  publish(server, "book", "org.book");
  ASSERT_EQ(world.zeb({"add", server.URL("/catalogue.json")}).code, ExitCode::success);
  world.writePage("book/second.html", "Second", "gadget");
  publish(server, "book", "org.book");
  for (const auto& entry : fs::directory_iterator(server.folder() + "/books/org.book/default")) {
    if (entry.path().extension() == ".helpindex") {
      fs::resize_file(entry.path(), fs::file_size(entry.path()) / 2);
    }
  }
  forgetCatalogues();
  (void)world.zeb({"scan", "--no-system"});
  EXPECT_THAT(found({"search", "applet"}), testing::SizeIs(1));
  EXPECT_THAT(found({"search", "gadget"}), IsEmpty());
}

TEST_F(RemoteBooksTest, someBooksOfACatalogueMayBeAdded) {
  const NginxServer server;
  for (const char* name : {"one", "two"}) {
    world.writePage(std::string(name) + "/index.html", name, "applet");
    publish(server, name, std::string("org.") + name);
  }
  EXPECT_EQ(world.zeb({"add", server.URL("/catalogue.json"), "--book", "org.two"}).code,
            ExitCode::success);
  EXPECT_THAT(world.zeb({"books"}).out, Not(HasSubstr("org.one")));
  const Outcome run =
      world.zeb({"add", server.URL("/catalogue.json"), "--book", "org.two", "--book", "org.no"});
  EXPECT_EQ(run.code, ExitCode::failure);
  EXPECT_THAT(run.err, HasSubstr("org.no: the catalogue does not have this book"));
}

TEST_F(RemoteBooksTest, theUsersLanguageDecides) {
  const NginxServer server;
  publishInTwoLanguages(server);
  const auto german = speaking("de");
  ASSERT_EQ(world.zeb({"add", server.URL("/catalogue.json")}).code, ExitCode::success);
  EXPECT_TRUE(fs::exists(world.indexPath("org.book", "de")));
  EXPECT_FALSE(fs::exists(world.indexPath("org.book", "en")));
  EXPECT_THAT(found({"search", "Drucker"}),
              ElementsAre(server.URL("/books/org.book/de/pages/index.html")));
}

TEST_F(RemoteBooksTest, anotherLanguageOfTheUserBringsTheBookInThat) {
  NginxServer server;
  publishInTwoLanguages(server);
  {
    const auto german = speaking("de");
    ASSERT_EQ(world.zeb({"add", server.URL("/catalogue.json")}).code, ExitCode::success);
  }
  forgetCatalogues();
  {
    const auto english = speaking("en");
    EXPECT_THAT(foundAtLast({"search", "printer"}),
                ElementsAre(server.URL("/books/org.book/en/pages/index.html")));
    EXPECT_THAT(found({"search", "Drucker"}), IsEmpty());
    EXPECT_THAT(world.zeb({"books"}).out, HasSubstr(" en "));
  }
  // Both are here now.
  server.stop();
  forgetCatalogues();
  const auto german = speaking("de");
  EXPECT_THAT(found({"search", "Drucker"}),
              ElementsAre(server.URL("/books/org.book/de/pages/index.html")));
}

TEST_F(RemoteBooksTest, whatIsNotHereInTheUsersLanguageStaysInTheFormerOne) {
  NginxServer server;
  publishInTwoLanguages(server);
  {
    const auto german = speaking("de");
    ASSERT_EQ(world.zeb({"add", server.URL("/catalogue.json")}).code, ExitCode::success);
  }
  server.stop();
  forgetCatalogues();
  const auto english = speaking("en");
  EXPECT_THAT(found({"search", "Drucker"}),
              ElementsAre(server.URL("/books/org.book/de/pages/index.html")));
  EXPECT_THAT(world.zeb({"books"}).out, HasSubstr(" de "));
}

TEST_F(RemoteBooksTest, aLanguageThatWasAskedForStays) {
  const NginxServer server;
  publishInTwoLanguages(server);
  const auto english = speaking("en");
  ASSERT_EQ(world.zeb({"add", server.URL("/catalogue.json"), "--language", "de"}).code,
            ExitCode::success);
  forgetCatalogues();
  ASSERT_EQ(world.zeb({"scan", "--no-system"}).code, ExitCode::success);
  EXPECT_FALSE(fs::exists(world.indexPath("org.book", "en")));
  EXPECT_THAT(found({"search", "Drucker"}),
              ElementsAre(server.URL("/books/org.book/de/pages/index.html")));
  // Until the book is added without one.
  ASSERT_EQ(world.zeb({"add", server.URL("/catalogue.json")}).code, ExitCode::success);
  EXPECT_THAT(found({"search", "printer"}),
              ElementsAre(server.URL("/books/org.book/en/pages/index.html")));
}

TEST_F(RemoteBooksTest, whatIsNoCatalogueIsNotAdded) {
  const NginxServer server;
  server.write("page.html", "page");
  const Outcome missing = world.zeb({"add", server.URL("/catalogue.json")});
  EXPECT_EQ(missing.code, ExitCode::failure);
  EXPECT_THAT(missing.err, HasSubstr("404"));
  EXPECT_THAT(world.zeb({"add", server.URL("/page.html")}).err, HasSubstr("no JSON"));
  for (const char* address : {"catalogue.json", "file:///etc/passwd", "https://", "mailto:a@b"}) {
    const Outcome run = world.zeb({"add", address});
    EXPECT_EQ(run.code, ExitCode::usage) << address;
    EXPECT_THAT(run.err, HasSubstr("is no address of a web server"));
  }
}

TEST_F(RemoteBooksTest, aBookOfThisComputerIsNotReplaced) {
  const NginxServer server;
  world.writePage("book/index.html", "Local", "applet");
  publish(server, "book", "book");
  ASSERT_EQ(world.zeb({"index", world.files().path("book")}).code, ExitCode::success);
  const Outcome run = world.zeb({"add", server.URL("/catalogue.json")});
  EXPECT_EQ(run.code, ExitCode::failure);
  EXPECT_THAT(run.err, HasSubstr("there is a book of this identifier on this computer"));
}

TEST_F(RemoteBooksTest, aBookIsRemovedWithWhatWasFetchedForIt) {
  const NginxServer server;
  for (const char* name : {"one", "two", "three"}) {
    world.writePage(std::string(name) + "/index.html", name, "applet");
    publish(server, name, std::string("org.") + name);
  }
  ASSERT_EQ(world.zeb({"add", server.URL("/catalogue.json")}).code, ExitCode::success);
  EXPECT_EQ(world.zeb({"remove", "org.one"}).code, ExitCode::success);
  EXPECT_FALSE(fs::exists(world.indexPath("org.one")));
  EXPECT_TRUE(fs::exists(world.indexPath("org.two")));
  EXPECT_THAT(found({"search", "applet"}), testing::SizeIs(2));
  // All that are left of the catalogue.
  EXPECT_EQ(world.zeb({"remove", server.URL("/catalogue.json")}).code, ExitCode::success);
  EXPECT_EQ(world.zeb({"books"}).code, ExitCode::nothingFound);
  const Outcome again = world.zeb({"remove", "org.one"});
  EXPECT_EQ(again.code, ExitCode::failure);
  EXPECT_THAT(again.err, HasSubstr("there is no book \"org.one\""));
}

TEST_F(RemoteBooksTest, anInstalledBookIsRenewedFromItsPublisher) {
  const NginxServer server;
  const auto writeBook = [&](const std::string& folder, const std::string& word) {
    world.files().write(folder + "/Info.plist",
                        platform::dataFromPropertyList(
                            platform::Value::Dictionary{{"ZEBBookIdentifier", "org.book"},
                                                        {"ZEBBookType", 3},
                                                        {"ZEBBookIndexFiles", "help.helpindex"}},
                            platform::PropertyListFormat::xml)
                            .view());
    world.writePage(folder + "/Resources/en.lproj/index.html", "Page", word);
  };
  writeBook("book", "applet");
  ASSERT_EQ(world.zeb({"scan", "--no-system", world.files().path("book")}).code, ExitCode::success);
  fs::copy_file(world.indexPath("org.book", "en"),
                world.files().path("book/Resources/en.lproj/help.helpindex"));
  ASSERT_EQ(world.zeb({"scan", "--no-system", "--force", world.files().path("book")}).code,
            ExitCode::success);
  // The publisher has a newer one.
  writeBook("newer", "gadget");
  ASSERT_EQ(world.zeb({"publish", world.files().path("newer"), "--site", server.folder()}).code,
            ExitCode::success);
  EXPECT_EQ(world.zeb({"add", server.URL("/catalogue.json")}).code, ExitCode::success);
  // The catalogue is known now; whenever the plug-in looks at the book anew, it is renewed.
  fs::remove(world.cacheFolder() + "/org.zeb.zebd/HelpindexCache.plist");
  EXPECT_THAT(foundAtLast({"search", "gadget"}), ElementsAre(HasSubstr("file://")));
  // A scan asks the publisher first, so that the next edition need not be looked at twice.
  writeBook("newest", "widget");
  ASSERT_EQ(world.zeb({"publish", world.files().path("newest"), "--site", server.folder()}).code,
            ExitCode::success);
  server.setModified("catalogue.json", 1'800'000'000);
  forgetCatalogues();
  ASSERT_EQ(world.zeb({"scan", "--no-system"}).code, ExitCode::success);
  EXPECT_THAT(foundAtLast({"search", "widget"}), testing::SizeIs(1));
}

}  // namespace
