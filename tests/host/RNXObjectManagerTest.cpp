#include "host/Zebrine/RNXObjectManager.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <atomic>

#include "host/Zebrine/RNXBook.h"
#include "host/Zebrine/RNXCatalogue.h"
#include "host/Zebrine/RNXExpectedAssets.h"
#include "host/Zebrine/ZEBConstants.h"
#include "host/Zebrine/ZEBHelpBook.h"
#include "platform/URLError.h"
#include "tests/host/RemoteHostWorld.h"
#include "tests/support/DigestGate.h"
#include "tests/support/NginxServer.h"
#include "tests/support/ScriptedServer.h"

using testing::HasSubstr;
using testing::SizeIs;
using tests::httpAnswer;
using tests::ScriptedServer;
using tests::urlOf;

namespace {

const std::string digest = platform::sha256Digest("bytes");

std::string catalogue(const std::string& locale = "en", const std::string& version = "1") {
  return R"({"format": 1, "books": [{"identifier": "org.one", "version": ")" + version +
         R"(", "locale": ")" + locale + R"(", "title": "One", "pages": "one/pages/",
          "searchIndex": {"url": "one/i", "sha256": ")" +
         digest + R"("}, "exactMatch": {"url": "one/e", "sha256": ")" + digest + R"("}}]})";
}

/// The book in several languages.
std::string catalogueIn(const std::vector<std::string>& locales) {
  std::string entries;
  for (const std::string& locale : locales) {
    entries += (entries.empty() ? "" : ", ") +
               std::string(R"({"identifier": "org.one", "version": "1", "locale": ")") + locale +
               R"(", "pages": ")" + locale + R"(/pages/"})";
  }
  return R"({"format": 1, "books": [)" + entries + "]}";
}

class RNXObjectManagerTest : public testing::Test {
 protected:
  struct Answer {
    std::shared_ptr<RNXBook> book;
    std::optional<platform::Error> error;
  };

  std::shared_ptr<ZEBHelpBook> book(const std::string& url, const std::string& bookID = "org.one") {
    auto made = ZEBHelpBook::bookWithID(bookID, ZEBHelpBookType4, "/books/one");
    if (!url.empty()) {
      made->setCatalogueURL(urlOf(url));
    }
    return made;
  }

  Answer request(const std::shared_ptr<ZEBHelpBook>& helpBook) const {
    Answer answer;
    tests::Latch done;
    manager->_requestBookWithHelpBook(helpBook, [&](const std::shared_ptr<RNXBook>& found,
                                                    const std::optional<platform::Error>& error) {
      answer = {found, error};
      done.open();
    });
    EXPECT_TRUE(done.wait());
    return answer;
  }

  tests::RemoteHostWorld world;
  const std::shared_ptr<RNXObjectManager> manager = RNXObjectManager::init();
};

TEST_F(RNXObjectManagerTest, findsABookInItsCatalogueAndTellsTheHelpBook) {
  const auto server = ScriptedServer::sending(httpAnswer(200, catalogue()));
  const auto helpBook = book(server->URL("/catalogue.json"));
  const Answer answer = request(helpBook);
  EXPECT_EQ(answer.error, std::nullopt);
  ASSERT_NE(answer.book, nullptr);
  EXPECT_EQ(answer.book->bookID(), "org.one");
  EXPECT_EQ(answer.book->version(), "1");
  EXPECT_EQ(answer.book->locale(), "en");
  EXPECT_EQ(answer.book->remoteSearchIndex()->absoluteString(), server->URL("/one/i"));
  EXPECT_EQ(answer.book->remoteExactMatch()->absoluteString(), server->URL("/one/e"));
  EXPECT_EQ(helpBook->rnxBook(), answer.book);
  EXPECT_EQ(helpBook->remoteURL()->absoluteString(), server->URL("/one/pages/"));
  EXPECT_EQ(helpBook->localization(), "en");
  EXPECT_EQ(helpBook->remoteSearchIndex(), answer.book->remoteSearchIndex());
  EXPECT_EQ(helpBook->remoteExactMatch(), answer.book->remoteExactMatch());
  EXPECT_EQ(helpBook->miscAttributes(), answer.book->miscAttributes());
}

TEST_F(RNXObjectManagerTest, theFilesThatTheCatalogueNamesAreExpectedFromThenOn) {
  const auto server = ScriptedServer::sending(httpAnswer(200, catalogue()));
  request(book(server->URL("/catalogue.json")));
  const auto expected = RNXExpectedAssets::shared().assetForURL(urlOf(server->URL("/one/i")));
  ASSERT_TRUE(expected);
  EXPECT_EQ(expected->kind, RNXExpectedAsset::Kind::searchIndex);
  EXPECT_EQ(expected->sha256, digest);
  EXPECT_EQ(expected->localPath,
            world.folder.path("caches/org.zeb.zebd/GeneratedIndexes/org.one/en.helpindex"));
  const auto list = RNXExpectedAssets::shared().assetForURL(urlOf(server->URL("/one/e")));
  ASSERT_TRUE(list);
  EXPECT_EQ(list->kind, RNXExpectedAsset::Kind::exactMatch);
  EXPECT_EQ(list->localPath,
            world.folder.path("caches/org.zeb.zebd/GeneratedIndexes/org.one/en.exactmatch.plist"));
}

TEST_F(RNXObjectManagerTest, withoutACatalogueThereIsAnError) {
  for (const auto& helpBook : {book(""), std::shared_ptr<ZEBHelpBook>()}) {
    const Answer answer = request(helpBook);
    EXPECT_EQ(answer.book, nullptr);
    ASSERT_TRUE(answer.error);
    EXPECT_EQ(answer.error->domain, RNXErrorDomain);
    EXPECT_EQ(answer.error->code, RNXErrorNoCatalogue);
  }
}

TEST_F(RNXObjectManagerTest, aBookThatIsNotInTheCatalogueIsAnError) {
  const auto server = ScriptedServer::sending(httpAnswer(200, catalogue()));
  const Answer answer = request(book(server->URL("/catalogue.json"), "org.other"));
  ASSERT_TRUE(answer.error);
  EXPECT_EQ(answer.error->code, RNXErrorNoSuchBook);
  EXPECT_THAT(answer.error->description, HasSubstr(server->URL("/catalogue.json")));
}

TEST_F(RNXObjectManagerTest, anAnswerThatIsNoCatalogueIsAnErrorAndLeavesTheBookAlone) {
  for (const auto& [answer, part] : std::vector<std::pair<std::string, std::string>>{
           {httpAnswer(404, "page"), "404"},
           {httpAnswer(500, ""), "500"},
           {httpAnswer(200, "no catalogue"), "no JSON"},
           {"HTTP/1.1 200 OK\r\nContent-Length: 1000\r\n\r\n{", ""}}) {
    const auto server = ScriptedServer::sending(answer);
    const auto helpBook = book(server->URL("/catalogue.json"));
    const Answer answered = request(helpBook);
    EXPECT_EQ(answered.book, nullptr);
    ASSERT_TRUE(answered.error);
    EXPECT_THAT(answered.error->description, HasSubstr(part));
    EXPECT_EQ(helpBook->remoteURL(), std::nullopt);
  }
}

TEST_F(RNXObjectManagerTest, aCatalogueThatIsTooLongIsNotReadToItsEnd) {
  ScriptedServer server([](const auto&, tests::ScriptedConnection& connection) {
    connection.send("HTTP/1.1 200 OK\r\nConnection: close\r\n\r\n");
    connection.sendFiller(uint64_t{1} << 30);
  });
  EXPECT_TRUE(request(book(server.URL("/catalogue.json"))).error);
}

TEST_F(RNXObjectManagerTest, aCatalogueIsAskedForAtMostOnceAMinute) {
  ScriptedServer server([](const auto&, tests::ScriptedConnection& connection) {
    connection.send(httpAnswer(200, catalogue()));
  });
  for (int i = 0; i < 5; ++i) {
    EXPECT_NE(request(book(server.URL("/catalogue.json"))).book, nullptr);
  }
  EXPECT_THAT(server.requests(), SizeIs(1));
  world.clock->advance(platform::Seconds(60));
  request(book(server.URL("/catalogue.json")));
  EXPECT_THAT(server.requests(), SizeIs(2));
}

TEST_F(RNXObjectManagerTest, aFailureIsNotRememberedForAMinute) {
  std::atomic<bool> isThere{false};
  ScriptedServer server([&](const auto&, tests::ScriptedConnection& connection) {
    connection.send(isThere ? httpAnswer(200, catalogue()) : httpAnswer(503, ""));
  });
  EXPECT_TRUE(request(book(server.URL("/catalogue.json"))).error);
  isThere = true;
  EXPECT_EQ(request(book(server.URL("/catalogue.json"))).error, std::nullopt);
}

TEST_F(RNXObjectManagerTest, thoseWhoAskAtOnceShareOneTransfer) {
  tests::Latch mayAnswer;
  ScriptedServer server([&](const auto&, tests::ScriptedConnection& connection) {
    mayAnswer.wait();
    connection.send(httpAnswer(200, catalogue()));
  });
  tests::Counter answers;
  const auto helpBook = book(server.URL("/catalogue.json"));
  for (int i = 0; i < 10; ++i) {
    manager->_requestBookWithHelpBook(helpBook, [&](const auto& found, const auto&) {
      EXPECT_NE(found, nullptr);
      answers.add();
    });
  }
  server.waitForRequests(1);
  mayAnswer.open();
  EXPECT_TRUE(answers.waitFor(10));
  EXPECT_THAT(server.requests(), SizeIs(1));
}

TEST_F(RNXObjectManagerTest, askingAgainCostsAConditionalRequestWithoutABody) {
  const tests::NginxServer server;
  server.write("catalogue.json", catalogue());
  for (int i = 0; i < 3; ++i) {
    EXPECT_NE(request(book(server.URL("/catalogue.json"))).book, nullptr);
    world.clock->advance(platform::Seconds(61));
  }
  const auto log = server.waitForAccessLog(3);
  EXPECT_EQ(log[0], "GET /catalogue.json 200 " + std::to_string(catalogue().size()));
  EXPECT_EQ(log[1], "GET /catalogue.json 304 0");
  EXPECT_EQ(log[2], "GET /catalogue.json 304 0");
  server.write("catalogue.json", catalogue("en", "2"));
  server.setModified("catalogue.json", 2'000'000'000);
  EXPECT_EQ(request(book(server.URL("/catalogue.json"))).book->version(), "2");
}

TEST_F(RNXObjectManagerTest, whatWasKnownOfACatalogueIsKnownToTheNextProcess) {
  const auto server = ScriptedServer::sending(httpAnswer(200, catalogue(), {"ETag: \"a\""}));
  const auto url = urlOf(server->URL("/catalogue.json"));
  EXPECT_EQ(manager->knownCatalogue(url), nullptr);
  request(book(server->URL("/catalogue.json")));
  ASSERT_NE(manager->knownCatalogue(url), nullptr);
  const auto next = RNXObjectManager::init();
  ASSERT_NE(next->knownCatalogue(url), nullptr);
  EXPECT_THAT(next->knownCatalogue(url)->books, SizeIs(1));
}

TEST_F(RNXObjectManagerTest, sendsTheUsersCredentialsForTheCatalogue) {
  ScriptedServer server([](const auto&, tests::ScriptedConnection& connection) {
    connection.send(httpAnswer(200, catalogue()));
  });
  world.setCredential(
      {{"Host", "127.0.0.1"}, {"Port", server.port()}, {"Scheme", "bearer"}, {"Token", "secret"}});
  request(book(server.URL("/catalogue.json")));
  EXPECT_EQ(server.requests().at(0).header("Authorization"), "Bearer secret");
}

TEST_F(RNXObjectManagerTest, readsACatalogueBehindADigestPassword) {
  const tests::DigestGate gate("SHA-256", "reader", "secret");
  const ScriptedServer server(gate.before(tests::answering(httpAnswer(200, catalogue()))));
  EXPECT_THAT(request(book(server.URL("/catalogue.json"))).error->description, HasSubstr("401"));
  world.setCredential({{"Host", "127.0.0.1"},
                       {"Port", server.port()},
                       {"Scheme", "digest"},
                       {"User", "reader"},
                       {"Password", "secret"}});
  EXPECT_NE(request(book(server.URL("/catalogue.json"))).book, nullptr);
}

TEST_F(RNXObjectManagerTest, readsACatalogueThatHasMovedElsewhereWithoutCredentials) {
  ScriptedServer other([](const auto&, tests::ScriptedConnection& connection) {
    connection.send(httpAnswer(200, catalogue()));
  });
  const auto server =
      ScriptedServer::sending(httpAnswer(302, "", {"Location: " + other.URL("/moved.json")}));
  world.setCredential(
      {{"Host", "127.0.0.1"}, {"Port", server->port()}, {"Scheme", "bearer"}, {"Token", "secret"}});
  const Answer answer = request(book(server->URL("/catalogue.json")));
  ASSERT_NE(answer.book, nullptr);
  // What it names is still relative to where it was asked for.
  EXPECT_EQ(answer.book->remoteSearchIndex()->absoluteString(), server->URL("/one/i"));
  EXPECT_EQ(other.requests().at(0).header("Authorization"), std::nullopt);
}

TEST_F(RNXObjectManagerTest, readsCataloguesOfServersWithARightCertificateAlone) {
  const auto& authority = tests::TestAuthority::shared();
  world.trustedAuthority = authority.certificateFile();
  world.setDefaults({});
  const tests::NginxServer right({}, authority.serverIdentity());
  right.write("catalogue.json", catalogue());
  EXPECT_NE(request(book(right.URL("/catalogue.json"))).book, nullptr);
  const tests::NginxServer wrong({}, authority.foreignIdentity());
  wrong.write("catalogue.json", catalogue());
  const Answer answer = request(book(wrong.URL("/catalogue.json")));
  EXPECT_EQ(answer.book, nullptr);
  ASSERT_TRUE(answer.error);
  EXPECT_TRUE(platform::isURLError(*answer.error, platform::URLErrorServerCertificateUntrusted));
  EXPECT_TRUE(wrong.accessLog().empty());
}

TEST_F(RNXObjectManagerTest, aBookTurnsToTheLanguageOfItsReader) {
  const auto server = ScriptedServer::sending(httpAnswer(200, catalogueIn({"de", "fr"})));
  const auto helpBook = book(server->URL("/catalogue.json"));
  helpBook->setLocalization("de");
  helpBook->setExactMatchPath("/de.exactmatch.plist");
  world.speak({"fr"});
  EXPECT_EQ(request(helpBook).book->locale(), "fr");
  EXPECT_EQ(helpBook->localization(), "fr");
  EXPECT_EQ(helpBook->remoteURL()->absoluteString(), server->URL("/fr/pages/"));
  EXPECT_EQ(helpBook->exactMatchPath(), std::nullopt);
  // Nor is it asked for in another language than it is in where that is all the same.
  world.speak({"sv"});
  EXPECT_EQ(request(helpBook).book->locale(), "fr");
}

TEST_F(RNXObjectManagerTest, theBooksOwnLanguagesComeBeforeTheUsers) {
  const auto server = ScriptedServer::sending(httpAnswer(200, catalogueIn({"de", "fr"})));
  const auto helpBook = book(server->URL("/catalogue.json"));
  world.speak({"fr"});
  helpBook->setPreferredLanguages({"sv", "de"});
  EXPECT_EQ(request(helpBook).book->locale(), "de");
}

TEST_F(RNXObjectManagerTest, aBookThatIsHereInOneLanguageStaysInItUntilTheOtherHasCome) {
  const auto server = ScriptedServer::sending(httpAnswer(200, catalogueIn({"de", "fr"})));
  const std::string kept = "caches/org.zeb.zebd/GeneratedIndexes/org.one/";
  world.folder.write(kept + "de.helpindex", "index");
  const auto helpBook = book(server->URL("/catalogue.json"));
  helpBook->setLocalization("de");
  helpBook->setRemoteURL(urlOf("https://a.example/de/"));
  world.speak({"fr"});
  EXPECT_EQ(request(helpBook).book->locale(), "fr");
  EXPECT_EQ(helpBook->localization(), "de");
  EXPECT_EQ(helpBook->remoteURL()->absoluteString(), "https://a.example/de/");
  world.folder.write(kept + "fr.exactmatch.plist", "list");
  manager->takeLocalization(helpBook);
  EXPECT_EQ(helpBook->localization(), "de");
  world.folder.write(kept + "fr.helpindex", "index");
  manager->takeLocalization(helpBook);
  EXPECT_EQ(helpBook->localization(), "fr");
  EXPECT_EQ(helpBook->remoteURL()->absoluteString(), server->URL("/fr/pages/"));
  EXPECT_EQ(helpBook->exactMatchPath(), world.folder.path(kept + "fr.exactmatch.plist"));
}

TEST_F(RNXObjectManagerTest, takingALocalizationAsksNobody) {
  const auto server = ScriptedServer::sending(httpAnswer(200, catalogueIn({"de", "fr"})));
  const auto helpBook = book(server->URL("/catalogue.json"));
  helpBook->setLocalization("de");
  world.speak({"fr"});
  manager->takeLocalization(helpBook);
  EXPECT_EQ(helpBook->localization(), "de");
  EXPECT_EQ(server->requests().size(), 0U);
  request(book(server->URL("/catalogue.json")));
  manager->takeLocalization(helpBook);
  EXPECT_EQ(helpBook->localization(), "fr");
  EXPECT_EQ(server->requests().size(), 1U);
}

TEST_F(RNXObjectManagerTest, onlyBooksOfServersTakeALocalization) {
  const auto server = ScriptedServer::sending(httpAnswer(200, catalogueIn({"de", "fr"})));
  request(book(server->URL("/catalogue.json")));
  const auto installed = ZEBHelpBook::bookWithID("org.one", ZEBHelpBookType3, "/books/one");
  installed->setCatalogueURL(urlOf(server->URL("/catalogue.json")));
  installed->setLocalization("en");
  manager->takeLocalization(installed);
  EXPECT_EQ(installed->localization(), "en");
  manager->takeLocalization(nullptr);
  const auto withdrawn = book(server->URL("/catalogue.json"), "org.withdrawn");
  withdrawn->setLocalization("en");
  manager->takeLocalization(withdrawn);
  EXPECT_EQ(withdrawn->localization(), "en");
}

TEST_F(RNXObjectManagerTest, whatAnEarlierProcessKnewIsReadOnceAndItsServerAskedAllTheSame) {
  const auto server = ScriptedServer::sending(httpAnswer(200, catalogue(), {"ETag: \"a\""}));
  const auto url = urlOf(server->URL("/catalogue.json"));
  request(book(server->URL("/catalogue.json")));
  const auto next = RNXObjectManager::init();
  EXPECT_EQ(next->knownCatalogue(url), next->knownCatalogue(url));
  tests::Latch done;
  next->loadCatalogue(url, [&](const auto&, const auto&) { done.open(); });
  EXPECT_TRUE(done.wait());
  EXPECT_THAT(server->requests(), SizeIs(2));
}

TEST_F(RNXObjectManagerTest, takesWhatTheCatalogueHasWhereItHasNoneOfTheLanguages) {
  const auto server = ScriptedServer::sending(httpAnswer(200, catalogue("de")));
  const auto helpBook = book(server->URL("/catalogue.json"));
  helpBook->setLocalization("fr");
  EXPECT_EQ(request(helpBook).book->locale(), "de");
  EXPECT_EQ(helpBook->localization(), "de");
}

TEST_F(RNXObjectManagerTest, theOneOfTheProcessCanBeReplaced) {
  EXPECT_EQ(RNXObjectManager::sharedObjectManager(), RNXObjectManager::sharedObjectManager());
  RNXObjectManager::setSharedObjectManager(manager);
  EXPECT_EQ(RNXObjectManager::sharedObjectManager(), manager);
  RNXObjectManager::setSharedObjectManager(nullptr);
  EXPECT_NE(RNXObjectManager::sharedObjectManager(), manager);
}

TEST(RNXBookTest, attributesThatAreNoURLsAreNoURLs) {
  const auto book =
      RNXBook::bookWithID("a", "1", std::nullopt, {{RNXBook::remoteSearchIndexKey, "text"}});
  EXPECT_EQ(book->remoteSearchIndex(), std::nullopt);
  EXPECT_EQ(book->remoteExactMatch(), std::nullopt);
  EXPECT_EQ(book->locale(), std::nullopt);
}

}  // namespace
