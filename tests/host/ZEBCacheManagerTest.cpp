#include "host/Zebrine/ZEBCacheManager.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "SearchKit/IndexWriter.h"
#include "host/Zebrine/RNXExpectedAssets.h"
#include "host/Zebrine/ZEBConstants.h"
#include "host/Zebrine/ZEBHelpBook.h"
#include "platform/ClassicArchive.h"
#include "tests/host/RemoteHostWorld.h"
#include "tests/support/ScriptedServer.h"

using tests::httpAnswer;
using tests::urlOf;

namespace {

std::string indexBytes() {
  searchkit::IndexWriter writer;
  return std::string(platform::classicArchiveWithRootObject(
                         platform::Value::Dictionary{{"SKI_INDEX_DATA", writer.finish()}})
                         .view());
}

class ZEBCacheManagerTest : public testing::Test {
 protected:
  ZEBCacheManagerTest()
      : server(tests::ScriptedServer::sending(
            httpAnswer(200, R"({"format": 1, "books": [{"identifier": "org.one", "version": "1",
                    "locale": "en", "pages": "pages/", "searchIndex": {"url": "i", "sha256": ")" +
                                platform::sha256Digest(indexBytes()) +
                                R"("}, "exactMatch": {"url": "e", "sha256": ")" +
                                platform::sha256Digest("list") + R"("}}]})"))) {
    book->setLocalization("en");
    book->setCatalogueURL(urlOf(server->URL("/catalogue.json")));
    book->setIndexPaths({world.folder.write("book/en.lproj/help.helpindex", "installed")});
    book->setExactMatchPath(world.folder.path("book/en.lproj/exactmatch.plist"));
    book->setAccessPagePath(world.folder.path("book/en.lproj/index.html"));
  }

  void loadCatalogue() const {
    tests::Latch done;
    RNXObjectManager::sharedObjectManager()->loadCatalogue(
        *book->catalogueURL(), [&](const auto&, const auto&) { done.open(); });
    EXPECT_TRUE(done.wait());
  }
  std::optional<platform::URL> remoteURL(const std::string& path) const {
    return ZEBCacheManager::remoteURLForLocalURL(platform::URL::fileURLWithPath(path), book);
  }
  std::string indexPath() const { return book->indexPaths().front(); }

  tests::RemoteHostWorld world;
  const std::unique_ptr<tests::ScriptedServer> server;
  const std::shared_ptr<ZEBHelpBook> book =
      ZEBHelpBook::bookWithID("org.one", ZEBHelpBookType3, world.folder.path("book"));
};

TEST_F(ZEBCacheManagerTest, knowsWhereIndexListAndPagesAre) {
  loadCatalogue();
  EXPECT_EQ(remoteURL(indexPath()), urlOf(server->URL("/i")));
  EXPECT_EQ(remoteURL(*book->exactMatchPath()), urlOf(server->URL("/e")));
  EXPECT_EQ(remoteURL(world.folder.path("book/en.lproj/a b/c.html")),
            urlOf(server->URL("/pages/a%20b/c.html")));
}

TEST_F(ZEBCacheManagerTest, whatItGivesIsChecked) {
  loadCatalogue();
  const auto url = remoteURL(indexPath());
  ASSERT_TRUE(url);
  const auto expected = RNXExpectedAssets::shared().assetForURL(*url);
  ASSERT_TRUE(expected);
  EXPECT_EQ(expected->sha256, platform::sha256Digest(indexBytes()));
}

TEST_F(ZEBCacheManagerTest, knowsNothingOfOtherFilesAndBooks) {
  loadCatalogue();
  EXPECT_EQ(remoteURL("/etc/passwd"), std::nullopt);
  EXPECT_EQ(remoteURL(world.folder.path("book/en.lproj")), std::nullopt);
  EXPECT_EQ(remoteURL(world.folder.path("book/en.lproj/../../x")), std::nullopt);
  EXPECT_EQ(ZEBCacheManager::remoteURLForLocalURL(urlOf("https://a.example/"), book), std::nullopt);
  EXPECT_EQ(ZEBCacheManager::remoteURLForLocalURL(platform::URL::fileURLWithPath("/a"), nullptr),
            std::nullopt);
  book->setCatalogueURL(std::nullopt);
  EXPECT_EQ(remoteURL(indexPath()), std::nullopt);
}

TEST_F(ZEBCacheManagerTest, anotherLanguageIsNoNewerVersion) {
  loadCatalogue();
  book->setLocalization("de");
  EXPECT_EQ(remoteURL(indexPath()), std::nullopt);
}

TEST_F(ZEBCacheManagerTest, anIndexThatIsHereAlreadyHasNoNewerVersion) {
  loadCatalogue();
  world.folder.write("book/en.lproj/help.helpindex", indexBytes());
  EXPECT_EQ(remoteURL(indexPath()), std::nullopt);
  // A generated one is in use in its stead.
  const std::string generated = "caches/org.zeb.zebd/GeneratedIndexes/org.one/en.helpindex";
  world.folder.write(generated, "another");
  EXPECT_TRUE(remoteURL(indexPath()));
  world.folder.write(generated, indexBytes());
  EXPECT_EQ(remoteURL(indexPath()), std::nullopt);
}

TEST_F(ZEBCacheManagerTest, asksNobodyAndHasTheCatalogueFetchedForTheNextTime) {
  EXPECT_EQ(remoteURL(indexPath()), std::nullopt);
  loadCatalogue();
  EXPECT_EQ(server->requests().size(), 1U);
  EXPECT_TRUE(remoteURL(indexPath()));
}

}  // namespace
