#include "plugin/records/ZEBIndex.h"

#include <gtest/gtest.h>

#include <cstdlib>
#include <set>
#include <thread>

#include "host/Zebrine/ZEBConstants.h"
#include "platform/Exception.h"
#include "plugin/records/ZEBHelpindexIndex.h"
#include "tests/plugin/HelpIndexWorld.h"

using platform::Data;
using tests::HelpIndexWorld;

TEST(ZEBIndex, FirstRecordOfAProcessHasIndexIDOne) {
  // In a process of its own, whatever ran before in this one.
  GTEST_FLAG_SET(death_test_style, "threadsafe");
  EXPECT_EXIT(
      {
        const int32_t first = ZEBIndex::init()->indexID();
        const int32_t second = ZEBIndex::initWithPath("/x")->indexID();
        std::_Exit(first == 1 && second == 2 ? 0 : 1);
      },
      testing::ExitedWithCode(0), "");
}

TEST(ZEBIndex, IndexIDsRiseByOneAndAFailedInitialisationUsesOneUp) {
  const HelpIndexWorld world;
  const int32_t first = ZEBIndex::init()->indexID();
  EXPECT_EQ(ZEBHelpindexIndex::initWithPath(world.folder.path("missing.helpindex")), nullptr);
  EXPECT_EQ(ZEBIndex::init()->indexID(), first + 2);
  EXPECT_EQ(ZEBHelpindexIndex::initWithPath(world.folder.write("no.helpindex", "x")), nullptr);
  EXPECT_EQ(ZEBHelpindexIndex::init(), nullptr);
  EXPECT_EQ(ZEBHelpindexIndex::initWithPath(world.write("good.helpindex", {}))->indexID(),
            first + 5);
}

TEST(ZEBIndex, RecordsMadeOnManyThreadsNeverShareANumber) {
  std::vector<std::vector<int32_t>> numbers(4);
  std::vector<std::thread> threads;
  threads.reserve(numbers.size());
  for (auto& list : numbers) {
    threads.emplace_back([&list] {
      for (int i = 0; i < 250; ++i) {
        list.push_back(ZEBIndex::init()->indexID());
      }
    });
  }
  std::set<int32_t> all;
  for (size_t i = 0; i < threads.size(); ++i) {
    threads[i].join();
    all.insert(numbers[i].begin(), numbers[i].end());
  }
  EXPECT_EQ(all.size(), 1000U);
}

TEST(ZEBIndex, PathWithTheHelpIndexExtensionYieldsAHelpIndexRecord) {
  const HelpIndexWorld world;
  const std::string path = world.write("manual." + ZEBHelpindexExtension, {});
  const std::shared_ptr<ZEBIndex> index = ZEBIndex::indexWithPath(path);
  ASSERT_NE(index, nullptr);
  EXPECT_NE(std::dynamic_pointer_cast<ZEBHelpindexIndex>(index), nullptr);
  EXPECT_EQ(index->path(), path);
}

TEST(ZEBIndex, PathWithAnotherOrNoExtensionYieldsNothing) {
  const HelpIndexWorld world;
  EXPECT_EQ(ZEBIndex::indexWithPath(world.write("manual.plist", {})), nullptr);
  EXPECT_EQ(ZEBIndex::indexWithPath(world.write("manual", {})), nullptr);
  EXPECT_EQ(ZEBIndex::indexWithPath(world.write("manual.HELPINDEX", {})), nullptr);
  EXPECT_EQ(ZEBIndex::indexWithPath(world.write(".helpindex", {})), nullptr);
  EXPECT_EQ(ZEBIndex::indexWithPath(""), nullptr);
  EXPECT_EQ(ZEBIndex::indexWithPath(std::nullopt), nullptr);
}

TEST(ZEBIndex, HelpIndexPathThatCannotBeReadOrDecodedYieldsNothing) {
  const HelpIndexWorld world;
  EXPECT_EQ(ZEBIndex::indexWithPath(world.folder.path("missing.helpindex")), nullptr);
  EXPECT_EQ(ZEBIndex::indexWithPath(world.folder.write("broken.helpindex", "broken")), nullptr);
}

TEST(ZEBIndex, KeepsItsPathWhetherOrNotAFileIsThere) {
  EXPECT_EQ(ZEBIndex::initWithPath("/nowhere/at.all")->path(), "/nowhere/at.all");
  EXPECT_EQ(ZEBIndex::initWithPath(std::nullopt)->path(), std::nullopt);
  EXPECT_EQ(ZEBIndex::init()->path(), std::nullopt);
}

TEST(ZEBIndex, BeginsWithoutBookRootOrFlags) {
  const auto index = ZEBIndex::initWithPath("/a.helpindex");
  EXPECT_EQ(index->bookID(), std::nullopt);
  EXPECT_EQ(index->remoteRoot(), std::nullopt);
  EXPECT_FALSE(index->networkFilesPreferred());
  EXPECT_FALSE(index->isSearchable());
  EXPECT_FALSE(index->hasAnchors());
  EXPECT_FALSE(index->isReinitialized());
  EXPECT_FALSE(index->isDownloading());
  EXPECT_FALSE(index->isRebuilding());
  EXPECT_FALSE(index->loadedFromGeneratedCache());
}

TEST(ZEBIndex, PropertiesKeepWhatIsSet) {
  const auto index = ZEBIndex::init();
  index->setBookID("org.example.book");
  EXPECT_EQ(index->bookID(), "org.example.book");
  index->setBookID(std::nullopt);
  EXPECT_EQ(index->bookID(), std::nullopt);
  index->setRemoteRoot("https://help.example/");
  EXPECT_EQ(index->remoteRoot(), "https://help.example/");
  index->setIsDownloading(true);
  EXPECT_TRUE(index->isDownloading());
  EXPECT_FALSE(index->isRebuilding());
  index->setIsRebuilding(true);
  EXPECT_TRUE(index->isRebuilding());
  EXPECT_FALSE(index->loadedFromGeneratedCache());
  index->setLoadedFromGeneratedCache(true);
  EXPECT_TRUE(index->loadedFromGeneratedCache());
  index->setIsDownloading(false);
  EXPECT_FALSE(index->isDownloading());
}

TEST(ZEBIndex, ReinitialisingAPlainRecordThrows) {
  const auto index = ZEBIndex::init();
  try {
    index->reinitializeWithData(Data());
    FAIL() << "nothing was thrown";
  } catch (const platform::Exception& exception) {
    EXPECT_EQ(exception.name(), "ZEBVirtualFunctionException");
    EXPECT_EQ(exception.reason(), "-[ZEBIndex reinitializeWithData:] called on a virtual function");
  }
  EXPECT_FALSE(index->isReinitialized());
}

TEST(ZEBIndex, SetPathRefusesAFolder) {
  const HelpIndexWorld world;
  const auto index = ZEBIndex::initWithPath("/old");
  EXPECT_FALSE(index->setPath(world.folder.path()));
  EXPECT_EQ(index->path(), "/old");
}

TEST(ZEBIndex, SetPathRefusesWhatDoesNotExist) {
  const HelpIndexWorld world;
  const auto index = ZEBIndex::initWithPath("/old");
  EXPECT_FALSE(index->setPath(world.folder.path("missing")));
  EXPECT_FALSE(index->setPath(""));
  EXPECT_EQ(index->path(), "/old");
}

TEST(ZEBIndex, SetPathTakesACopyOfThePathOfAFile) {
  const HelpIndexWorld world;
  const auto index = ZEBIndex::initWithPath("/old");
  const std::string original = world.folder.write("file", "content");
  std::string path = original;
  EXPECT_TRUE(index->setPath(path));
  path += " changed";
  EXPECT_EQ(index->path(), original);
  index->path()->clear();
  EXPECT_EQ(index->path(), original);
}

TEST(ZEBIndex, WithoutARemoteRootThereIsNoRemoteURL) {
  const auto index = ZEBIndex::initWithPath("/books/a.helpindex");
  EXPECT_EQ(index->remoteURL(), std::nullopt);
  index->setRemoteRoot("https://help.example/books/");
  ASSERT_TRUE(index->remoteURL()) << "having had none is not remembered";
  EXPECT_EQ(index->remoteURL()->absoluteString(), "https://help.example/books/a.helpindex");
}

TEST(ZEBIndex, RemoteURLStaysOnceItWasRead) {
  const HelpIndexWorld world;
  const auto index = ZEBIndex::initWithPath("/books/a.helpindex");
  index->setRemoteRoot("https://help.example/books/");
  const auto first = index->remoteURL();
  ASSERT_TRUE(first);
  index->setRemoteRoot("https://elsewhere.example/");
  EXPECT_EQ(index->remoteURL(), first);
  ASSERT_TRUE(index->setPath(world.folder.write("b.helpindex", "")));
  EXPECT_EQ(index->remoteURL(), first);
  index->setRemoteRoot(std::nullopt);
  EXPECT_EQ(index->remoteURL(), first);
}

TEST(ZEBIndex, RemoteURLReplacesTheLastSegmentOfARootWithoutSlash) {
  const auto index = ZEBIndex::initWithPath("/books/a.helpindex");
  index->setRemoteRoot("https://help.example/books/old");
  ASSERT_TRUE(index->remoteURL());
  EXPECT_EQ(index->remoteURL()->absoluteString(), "https://help.example/books/a.helpindex");
  EXPECT_EQ(index->remoteURL()->relativeString(), "a.helpindex");
}

TEST(ZEBIndex, RemoteURLEscapesFileNameAndRoot) {
  const auto index = ZEBIndex::initWithPath(
      "/books/my b\xC3\xBC"
      "cher.helpindex");
  index->setRemoteRoot("https://help.example/my books/");
  ASSERT_TRUE(index->remoteURL());
  EXPECT_EQ(index->remoteURL()->absoluteString(),
            "https://help.example/my%20books/my%20b%C3%BCcher.helpindex");
}

TEST(ZEBIndex, RemoteURLNeedsAFileName) {
  for (const auto& path : {std::optional<std::string>(), std::optional<std::string>("")}) {
    const auto index = ZEBIndex::initWithPath(path);
    index->setRemoteRoot("https://help.example/");
    EXPECT_EQ(index->remoteURL(), std::nullopt);
  }
}

TEST(ZEBIndex, RemoteRootThatMakesNoURLIsNotRemembered) {
  const auto index = ZEBIndex::initWithPath("/books/a.helpindex");
  index->setRemoteRoot("");
  EXPECT_EQ(index->remoteURL(), std::nullopt);
  index->setRemoteRoot("https://help.example/");
  EXPECT_TRUE(index->remoteURL());
}

TEST(ZEBIndex, DescribesItselfByItsPath) {
  EXPECT_EQ(ZEBIndex::initWithPath("/books/a.helpindex")->description(),
            "path: /books/a.helpindex");
  EXPECT_EQ(ZEBIndex::init()->description(), "path: (null)");
}
