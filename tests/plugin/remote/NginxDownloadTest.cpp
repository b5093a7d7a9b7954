// Whole downloads from a real web server, from the catalogue to the record.
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <nlohmann/json.hpp>

#include "host/Zebrine/RNXCatalogue.h"
#include "host/Zebrine/RNXObjectManager.h"
#include "platform/Digest.h"
#include "platform/PropertyList.h"
#include "platform/RunLoop.h"
#include "platform/UserDefaults.h"
#include "plugin/operations/ZEBOperationQueue.h"
#include "plugin/records/ZEBHelpindexIndex.h"
#include "tests/plugin/remote/RemoteWorld.h"
#include "tests/support/NginxServer.h"

using testing::Contains;
using testing::HasSubstr;
using testing::IsEmpty;
using testing::SizeIs;
using tests::NginxServer;
using tests::ShelfWorld;
using tests::testURL;

namespace {

std::string indexBytes(const std::string& word) {
  return std::string(
      platform::classicArchiveWithRootObject(
          platform::Value::Dictionary{
              {"SKI_INDEX_DATA", tests::keywordIndex({tests::page("/a.html", "A", word)})}})
          .view());
}

std::string listBytes(const std::string& word) {
  return std::string(platform::dataFromPropertyList(platform::Value::Dictionary{{word, "anchor"}},
                                                    platform::PropertyListFormat::xml)
                         .view());
}

class NginxDownload : public testing::Test {
 protected:
  NginxDownload() {
    RNXObjectManager::setSharedObjectManager(RNXObjectManager::init());
    world.makeShelf();
  }
  ~NginxDownload() override {
    world.dropShelf();
    RNXObjectManager::setSharedObjectManager(nullptr);
  }

  /// Puts the book's files on the server, under names of the edition, and its entry into the
  /// catalogue.
  void publish(const NginxServer& server, const std::string& bookID, const std::string& word,
               const std::string& locale = "en") {
    RNXCatalogueEntry entry;
    entry.identifier = bookID;
    entry.version = word;
    entry.locale = locale;
    entry.pages = testURL(bookID + "/" + locale + "/");
    const auto add = [&](const std::string& name, const std::string& bytes) {
      server.write(name, bytes);
      return RNXAsset{testURL(name), platform::sha256Digest(bytes)};
    };
    entry.searchIndex = add(bookID + "/" + word + ".helpindex", indexBytes(word));
    entry.exactMatch = add(bookID + "/" + word + ".plist", listBytes(word));
    std::erase_if(_catalogue.books, [&](const RNXCatalogueEntry& former) {
      return former.identifier == bookID && former.locale == locale;
    });
    _catalogue.books.push_back(entry);
    server.write("catalogue.json", _catalogue.text());
    server.setModified("catalogue.json", ++_modified);
  }

  std::shared_ptr<ZEBHelpBook> makeBook(const NginxServer& server, const std::string& bookID) {
    auto book = ZEBHelpBook::bookWithID(bookID, ZEBHelpBookType4, "/books/" + bookID);
    book->setLocalization("en");
    book->setCatalogueURL(testURL(server.URL("/catalogue.json")));
    world.owner->books[bookID] = book;
    return book;
  }

  bool finishDownload(const std::shared_ptr<ZEBHelpBook>& book) const {
    return world.runMainLoopUntil([&] { return !world.shelf->isIndexDownloadingForBook(book); });
  }

  std::vector<std::string> messages(int level) const { return world.log->messages(level); }

  /// A start of the host over what is on the disk.
  void restart() {
    world.dropShelf();
    world.owner->books.clear();
    RNXObjectManager::setSharedObjectManager(RNXObjectManager::init());
    std::filesystem::remove(world.cachePath());
    world.log->clear();
    world.makeShelf();
  }

  ShelfWorld world;

 private:
  RNXCatalogue _catalogue;
  long _modified = 1'700'000'000;
};

TEST_F(NginxDownload, bringsSeveralBooksAtOnceWithOneCatalogue) {
  const NginxServer server;
  std::vector<std::shared_ptr<ZEBHelpBook>> books;
  for (int i = 0; i < 20; ++i) {
    const std::string bookID = "org.book" + std::to_string(i);
    publish(server, bookID, "word" + std::to_string(i));
    books.push_back(makeBook(server, bookID));
  }
  for (const auto& book : books) {
    EXPECT_THAT(world.shelf->indicesForBook(book), IsEmpty());
  }
  for (size_t i = 0; i < books.size(); ++i) {
    EXPECT_TRUE(finishDownload(books[i]));
    ASSERT_THAT(world.shelf->indicesForBook(books[i]), SizeIs(1));
    const std::string& bookID = books[i]->bookID();
    EXPECT_EQ(ShelfWorld::contents(world.generatedPath(bookID, "en")),
              indexBytes("word" + std::to_string(i)));
    EXPECT_EQ(books[i]->remoteURL()->absoluteString(), server.URL("/" + bookID + "/en/"));
    EXPECT_TRUE(books[i]->exactMatchPath());
  }
  EXPECT_THAT(server.waitForAccessLog(41), SizeIs(41));
  EXPECT_THAT(messages(1), IsEmpty());
}

TEST_F(NginxDownload, ofWhatHasNotChangedAsksForTheCatalogueAlone) {
  const NginxServer server;
  publish(server, "org.book", "applet");
  auto book = makeBook(server, "org.book");
  (void)world.shelf->indicesForBook(book);
  EXPECT_TRUE(finishDownload(book));
  restart();
  book = makeBook(server, "org.book");
  ASSERT_THAT(world.shelf->indicesForBook(book), SizeIs(1));
  EXPECT_TRUE(finishDownload(book));
  const auto log = server.waitForAccessLog(4);
  ASSERT_THAT(log, SizeIs(4));
  EXPECT_EQ(log[3], "GET /catalogue.json 304 0");
  // Found equal, the index counts as added all the same.
  EXPECT_EQ(world.observer->kinds().back(), ZEBIndexChangeAdded);
  EXPECT_THAT(messages(1), IsEmpty());
}

TEST_F(NginxDownload, bringsANewEdition) {
  const NginxServer server;
  publish(server, "org.book", "applet");
  auto book = makeBook(server, "org.book");
  (void)world.shelf->indicesForBook(book);
  EXPECT_TRUE(finishDownload(book));
  publish(server, "org.book", "gadget");
  restart();
  book = makeBook(server, "org.book");
  const auto found = world.shelf->indicesForBook(book);
  ASSERT_THAT(found, SizeIs(1));
  EXPECT_TRUE(finishDownload(book));
  EXPECT_EQ(ShelfWorld::contents(world.generatedPath("org.book", "en")), indexBytes("gadget"));
  EXPECT_TRUE(found.front()->isReinitialized());
  // A quick download may be told before the record is that was there.
  EXPECT_THAT(world.observer->kinds(), Contains(ZEBIndexChangeUpdated));
}

TEST_F(NginxDownload, anIndexInAnotherLanguageTakesThePlaceOfTheFormerOne) {
  const auto speak = [&](const std::string& language) {
    world.change(
        [&](platform::Environment& environment) { environment.preferredLanguages = {language}; });
  };
  const NginxServer server;
  publish(server, "org.book", "drucker", "de");
  publish(server, "org.book", "imprimante", "fr");
  speak("de");
  auto book = makeBook(server, "org.book");
  (void)world.shelf->indicesForBook(book);
  EXPECT_TRUE(finishDownload(book));
  EXPECT_EQ(ShelfWorld::contents(world.generatedPath("org.book", "de")), indexBytes("drucker"));
  restart();
  speak("fr");
  book = makeBook(server, "org.book");
  book->setLocalization("de");
  const auto found = world.shelf->indicesForBook(book);
  ASSERT_THAT(found, SizeIs(1));
  EXPECT_TRUE(finishDownload(book));
  // The record of searches that are under way is in the new language now, and so is what is
  // remembered of it.
  EXPECT_TRUE(found.front()->isReinitialized());
  EXPECT_EQ(found.front()->path(), world.generatedPath("org.book", "fr"));
  EXPECT_THAT(world.observer->kinds(), Contains(ZEBIndexChangeUpdated));
  EXPECT_EQ(ShelfWorld::contents(world.generatedPath("org.book", "fr")), indexBytes("imprimante"));
  EXPECT_EQ(ShelfWorld::contents(world.generatedPath("org.book", "de")), indexBytes("drucker"));
  world.makeShelf();
  ASSERT_NE(world.knownRecord("org.book"), nullptr);
  EXPECT_EQ(world.knownRecord("org.book")->path(), world.generatedPath("org.book", "fr"));
}

TEST_F(NginxDownload, whatTheServerDoesNotHaveLeavesWhatIsHere) {
  for (const char* directives :
       {"location ~ (helpindex|plist)$ { return 404; }", "location ~ helpindex$ { return 500; }",
        "location = /catalogue.json { return 503; }", "location ~ helpindex$ { return 304; }",
        "location ~ helpindex$ { return 302 https://127.0.0.1:1/; }",
        "location ~ helpindex$ { return 302 /elsewhere; }"}) {
    const NginxServer good;
    publish(good, "org.book", "applet");
    auto book = makeBook(good, "org.book");
    (void)world.shelf->indicesForBook(book);
    EXPECT_TRUE(finishDownload(book));
    const NginxServer bad(directives);
    publish(bad, "org.book", "gadget");
    restart();
    book = makeBook(bad, "org.book");
    const auto found = world.shelf->indicesForBook(book);
    ASSERT_THAT(found, SizeIs(1)) << directives;
    EXPECT_TRUE(finishDownload(book)) << directives;
    EXPECT_EQ(ShelfWorld::contents(world.generatedPath("org.book", "en")), indexBytes("applet"))
        << directives;
    EXPECT_FALSE(found.front()->isReinitialized());
    EXPECT_FALSE(found.front()->isDownloading());
    EXPECT_THAT(messages(1), Contains(HasSubstr("Failed to"))) << directives;
    restart();
    std::filesystem::remove_all(world.generatedRoot());
  }
}

TEST_F(NginxDownload, followsRedirectsWithinTheServer) {
  const NginxServer server("location ~ ^/org.book/(.*)$ { return 302 /moved/$1; }");
  publish(server, "org.book", "applet");
  server.write("moved/applet.helpindex", indexBytes("applet"));
  server.write("moved/applet.plist", listBytes("applet"));
  const auto book = makeBook(server, "org.book");
  (void)world.shelf->indicesForBook(book);
  EXPECT_TRUE(finishDownload(book));
  EXPECT_NE(world.knownRecord("org.book"), nullptr);
  EXPECT_THAT(messages(1), IsEmpty());
}

TEST_F(NginxDownload, showsTheUsersPassword) {
  const tests::TemporaryFolder folder;
  const std::string passwords =
      folder.write("passwords", tests::nginxPasswordLine("user", "secret"));
  std::filesystem::permissions(folder.path(), std::filesystem::perms::all);
  const NginxServer server("auth_basic \"help\"; auth_basic_user_file " + passwords + ";");
  publish(server, "org.book", "applet");
  auto book = makeBook(server, "org.book");
  (void)world.shelf->indicesForBook(book);
  EXPECT_TRUE(finishDownload(book));
  EXPECT_EQ(world.knownRecord("org.book"), nullptr);
  EXPECT_THAT(messages(1), Contains(HasSubstr("401")));

  world.change([&](platform::Environment& environment) {
    environment.userDefaults = platform::userDefaultsFromDictionary(
        {{"RemoteServices", platform::Value::Dictionary{
                                {"org.zeb.help", platform::Value::Array{platform::Value::Dictionary{
                                                     {"Host", "127.0.0.1"},
                                                     {"Port", server.port()},
                                                     {"User", "user"},
                                                     {"Password", "secret"}}}}}}});
  });
  (void)world.shelf->indicesForBook(book);
  EXPECT_TRUE(finishDownload(book));
  EXPECT_NE(world.knownRecord("org.book"), nullptr);
}

TEST_F(NginxDownload, showsTheUsersPasswordOverTLSAndBelievesNoWrongCertificate) {
  const auto& authority = tests::TestAuthority::shared();
  const tests::TemporaryFolder folder;
  const std::string passwords =
      folder.write("passwords", tests::nginxPasswordLine("user", "secret"));
  std::filesystem::permissions(folder.path(), std::filesystem::perms::all);
  const std::string locked = "auth_basic \"help\"; auth_basic_user_file " + passwords + ";";
  const NginxServer server(locked, authority.serverIdentity());
  const NginxServer impostor({}, authority.foreignIdentity());
  publish(server, "org.book", "applet");
  publish(impostor, "org.book", "gadget");
  const auto credential = [](const NginxServer& of) {
    return platform::Value::Dictionary{
        {"Host", "127.0.0.1"}, {"Port", of.port()}, {"User", "user"}, {"Password", "secret"}};
  };
  world.change([&](platform::Environment& environment) {
    environment.certificateAuthorityFile = authority.certificateFile();
    environment.userDefaults = platform::userDefaultsFromDictionary(
        {{"RemoteServices", platform::Value::Dictionary{
                                {"org.zeb.help", platform::Value::Array{credential(server),
                                                                        credential(impostor)}}}}});
  });
  auto book = makeBook(server, "org.book");
  (void)world.shelf->indicesForBook(book);
  EXPECT_TRUE(finishDownload(book));
  EXPECT_NE(world.knownRecord("org.book"), nullptr);
  EXPECT_THAT(messages(1), IsEmpty());
  restart();
  book = makeBook(impostor, "org.book");
  (void)world.shelf->indicesForBook(book);
  EXPECT_TRUE(finishDownload(book));
  EXPECT_THAT(messages(1), testing::ElementsAre(HasSubstr("Failed to make book request")));
  EXPECT_EQ(ShelfWorld::contents(world.generatedPath("org.book", "en")), indexBytes("applet"));
  EXPECT_TRUE(impostor.accessLog().empty());
}

TEST_F(NginxDownload, withoutAServerLeavesWhatIsHere) {
  NginxServer server;
  publish(server, "org.book", "applet");
  auto book = makeBook(server, "org.book");
  (void)world.shelf->indicesForBook(book);
  EXPECT_TRUE(finishDownload(book));
  server.stop();
  restart();
  book = makeBook(server, "org.book");
  ASSERT_THAT(world.shelf->indicesForBook(book), SizeIs(1));
  EXPECT_TRUE(finishDownload(book));
  EXPECT_THAT(messages(1), Contains(HasSubstr("Failed to make book request (org.book)")));
  EXPECT_EQ(ShelfWorld::contents(world.generatedPath("org.book", "en")), indexBytes("applet"));
}

/// An installed book whose catalogue has been read, as by a host that was there before.
std::shared_ptr<ZEBHelpBook> installedBook(ShelfWorld& world, const NginxServer& server) {
  const auto book = world.makeBookWithIndex("org.book", ZEBHelpBookType3);
  book->setLocalization("en");
  book->setResourcesRootPath(book->path());
  book->setCatalogueURL(testURL(server.URL("/catalogue.json")));
  world.shelf->indexGeneratingQueue()->setMaxConcurrentOperationCount(0);
  bool isKnown = false;
  RNXObjectManager::sharedObjectManager()->loadCatalogue(
      testURL(server.URL("/catalogue.json")), [&](const auto&, const auto&) {
        platform::RunLoop::main()->perform([&] { isKnown = true; });
      });
  EXPECT_TRUE(world.runMainLoopUntil([&] { return isKnown; }));
  return book;
}

TEST_F(NginxDownload, takesNoTamperedIndexForAnInstalledBook) {
  const NginxServer server;
  publish(server, "org.book", "gadget");
  server.write("org.book/gadget.helpindex", indexBytes("tampered"));
  const auto book = installedBook(world, server);
  const auto found = world.shelf->indicesForBook(book);
  ASSERT_THAT(found, SizeIs(1));
  EXPECT_TRUE(world.runMainLoopUntil(
      [&] { return world.shelf->indexGeneratingQueue()->operationCount() == 1; }));
  EXPECT_FALSE(found.front()->isReinitialized());
  EXPECT_FALSE(found.front()->isDownloading());
  EXPECT_FALSE(ShelfWorld::exists(world.generatedPath("org.book", "en")));
  EXPECT_THAT(messages(4), Contains(HasSubstr("failed loading with error")));
  world.shelf->indexGeneratingQueue()->cancelAllOperations();
  world.shelf->indexGeneratingQueue()->setMaxConcurrentOperationCount(1);
}

TEST_F(NginxDownload, renewsTheIndexOfAnInstalledBook) {
  const NginxServer server;
  publish(server, "org.book", "gadget");
  const auto book = installedBook(world, server);
  const auto found = world.shelf->indicesForBook(book);
  ASSERT_THAT(found, SizeIs(1));
  EXPECT_TRUE(world.runMainLoopUntil([&] { return found.front()->isReinitialized(); }));
  EXPECT_TRUE(world.runMainLoopUntil([&] { return !found.front()->isDownloading(); }));
  EXPECT_EQ(ShelfWorld::contents(world.generatedPath("org.book", "en")), indexBytes("gadget"));
  EXPECT_EQ(found.front()->path(), world.generatedPath("org.book", "en"));
  EXPECT_THAT(messages(4), Contains(HasSubstr("did receive response 200")));
  world.shelf->indexGeneratingQueue()->cancelAllOperations();
  world.shelf->indexGeneratingQueue()->setMaxConcurrentOperationCount(1);
}

}  // namespace
