// The file in which the shelf remembers its records.
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <cerrno>
#include <filesystem>

#include "platform/KeyedArchive.h"
#include "platform/PropertyList.h"
#include "platform/Strings.h"
#include "plugin/records/ZEBHelpindexIndex.h"
#include "tests/plugin/shelf/ShelfWorld.h"

using platform::FailingFileManager;
using platform::KeyedArchiver;
using platform::KeyedObject;
using platform::KeyedUnarchiver;
using platform::Value;
using testing::ElementsAre;
using testing::IsEmpty;
using tests::LogEntry;
using tests::ShelfWorld;

namespace {

class Cache : public testing::Test {
 protected:
  /// Has a shelf with one installed book write its cache file.
  void writeCache() {
    book = world.makeBookWithIndex("org.one");
    world.makeShelf().indicesForBook(book);
    world.shelf->archiveKnownIndices();
    ASSERT_TRUE(ShelfWorld::exists(world.cachePath()));
    world.dropShelf();
    world.log->clear();
  }

  void setClockToAgeOfCache(std::chrono::seconds age) {
    world.clock->setNow(*world.files->modificationDate(world.cachePath()) + age);
  }

  /// A cache file as another program might have written it, just now.
  void writeArchive(const KeyedObject& version, const KeyedObject& language,
                    const KeyedObject& indices) {
    KeyedArchiver coder;
    coder.encodeObject(language, "CacheLanguage");
    coder.encodeObject(indices, "KnownIndices");
    coder.encodeObject(version, "CacheVersion");
    world.folder.write("caches/help/HelpindexCache.plist", coder.finishEncoding().view());
    setClockToAgeOfCache(std::chrono::seconds(0));
  }

  static KeyedObject text(const std::string& string) { return KeyedObject(Value(string)); }

  KeyedObject oneRecord() {
    const auto record =
        ZEBHelpindexIndex::initWithPath(world.writeIndex(world.folder.path("x/one.helpindex")));
    record->setBookID("org.one");
    return KeyedObject::mutableDictionary(
        {{"org.one",
          KeyedObject(KeyedObject::Array{std::shared_ptr<const platform::KeyedCodable>(record)})}});
  }

  size_t countOfKnownBooks() { return world.makeShelf()._knownIndices().size(); }

  ShelfWorld world;
  std::shared_ptr<ZEBHelpBook> book;
};

TEST_F(Cache, modifiedSevenHoursAndFiftyNineMinutesAgoIsUsed) {
  writeCache();
  setClockToAgeOfCache(std::chrono::hours(7) + std::chrono::minutes(59));
  EXPECT_EQ(countOfKnownBooks(), 1U);
}

TEST_F(Cache, modifiedExactlyEightHoursAgoIsIgnoredSilently) {
  writeCache();
  setClockToAgeOfCache(std::chrono::hours(8));
  EXPECT_EQ(countOfKnownBooks(), 0U);
  EXPECT_THAT(world.log->entries(), IsEmpty());
}

TEST_F(Cache, ageGoesByTheModificationDateOfTheFile) {
  writeCache();
  const auto eightHours = std::chrono::hours(8);
  std::filesystem::last_write_time(
      world.cachePath(), std::filesystem::last_write_time(world.cachePath()) - eightHours);
  world.clock->setNow(std::chrono::system_clock::now());
  EXPECT_EQ(countOfKnownBooks(), 0U);
}

TEST_F(Cache, fromTheFutureIsUsed) {
  writeCache();
  setClockToAgeOfCache(std::chrono::hours(-24));
  EXPECT_EQ(countOfKnownBooks(), 1U);
}

TEST_F(Cache, withoutAModificationDateIsIgnoredSilently) {
  writeCache();
  world.files->fail(FailingFileManager::Operation::modificationDate, EACCES, "HelpindexCache");
  EXPECT_EQ(countOfKnownBooks(), 0U);
  EXPECT_THAT(world.log->entries(), IsEmpty());
}

TEST_F(Cache, writtenInEnglishIsIgnoredOnceTheUserPrefersGerman) {
  writeCache();
  world.change([](platform::Environment& environment) {
    environment.preferredLanguages = {"de", "en"};
  });
  EXPECT_EQ(countOfKnownBooks(), 0U);
  EXPECT_THAT(world.log->entries(), IsEmpty());
  world.change([](platform::Environment& environment) { environment.preferredLanguages = {"en"}; });
  EXPECT_EQ(countOfKnownBooks(), 1U);
}

TEST_F(Cache, ofVersionOnePointTenIsAccepted) {
  writeArchive(text("1.10"), text("en"), oneRecord());
  EXPECT_EQ(countOfKnownBooks(), 1U);
}

TEST_F(Cache, ofVersionOnePointOneIsRefusedSilently) {
  writeArchive(text("1.1"), text("en"), oneRecord());
  world.log->clear();
  EXPECT_EQ(countOfKnownBooks(), 0U);
  EXPECT_THAT(world.log->entries(), IsEmpty());
}

TEST_F(Cache, validationComparesVersionsByTheirNumbers) {
  const auto valid = &ZEBIndexshelf::_validateHelpIndexCacheVersion;
  EXPECT_TRUE(valid("1.2", "en"));
  EXPECT_TRUE(valid("1.10", "en"));
  EXPECT_TRUE(valid("2.0", "en"));
  EXPECT_FALSE(valid("1.1", "en"));
  EXPECT_FALSE(valid("0.9", "en"));
  EXPECT_FALSE(valid("", "en"));
  EXPECT_FALSE(valid(std::nullopt, "en"));
  EXPECT_FALSE(valid("1.2", std::nullopt));
  EXPECT_FALSE(valid("1.2", "de"));
  EXPECT_FALSE(valid("1.2", ""));
}

TEST_F(Cache, withoutVersionOrLanguageIsRefusedSilently) {
  const KeyedObject records = oneRecord();
  world.log->clear();
  writeArchive(KeyedObject(), text("en"), records);
  EXPECT_EQ(countOfKnownBooks(), 0U);
  writeArchive(text("1.2"), KeyedObject(), records);
  EXPECT_EQ(countOfKnownBooks(), 0U);
  EXPECT_THAT(world.log->entries(), IsEmpty());
}

TEST_F(Cache, ofAnEmptyDictionaryLeavesTheShelfWithAFreshOne) {
  writeArchive(text("1.2"), text("en"), KeyedObject::mutableDictionary({}));
  ZEBIndexshelf& shelf = world.makeShelf();
  EXPECT_THAT(shelf._knownIndices(), IsEmpty());
  shelf._addIndex(ZEBIndex::init(), "org.one");
  EXPECT_EQ(shelf._knownIndices().size(), 1U);
}

TEST_F(Cache, thatIsNoKeyedArchiveIsLoggedWithTheReasonAloneAndIgnored) {
  world.folder.write("caches/help/HelpindexCache.plist", "this is no archive");
  setClockToAgeOfCache(std::chrono::seconds(0));
  std::string reason;
  try {
    const KeyedUnarchiver coder(platform::Data::copy("this is no archive"));
  } catch (const platform::Exception& exception) {
    reason = exception.reason();
  }
  ASSERT_NE(reason, "");
  EXPECT_EQ(countOfKnownBooks(), 0U);
  EXPECT_THAT(world.log->entries(), ElementsAre(LogEntry{1, "Error loading help index cache from " +
                                                                reason + " (exception: )"}));
}

TEST_F(Cache, whoseVersionIsNoStringIsLoggedAsAnException) {
  writeArchive(KeyedObject(Value(12)), text("en"), KeyedObject::mutableDictionary({}));
  EXPECT_EQ(countOfKnownBooks(), 0U);
  ASSERT_EQ(world.log->entries().size(), 1U);
  EXPECT_EQ(world.log->entries().front().level, 1);
  EXPECT_TRUE(world.log->entries().front().message.ends_with(" (exception: )"));
}

TEST_F(Cache, withAnObjectOfAnotherClassIsLoggedAsAnExceptionAndIgnoredAsAWhole) {
  KeyedObject::Dictionary books = *oneRecord().dictionaryIf();
  books.emplace("org.two", KeyedObject(KeyedObject::Array{text("no record")}));
  writeArchive(text("1.2"), text("en"), KeyedObject::mutableDictionary(std::move(books)));
  world.log->clear();
  EXPECT_EQ(countOfKnownBooks(), 0U);
  ASSERT_EQ(world.log->entries().size(), 1U);
  EXPECT_EQ(world.log->entries().front().level, 1);
}

TEST_F(Cache, whoseTableIsNoMutableDictionaryIsNotUsed) {
  writeArchive(text("1.2"), text("en"), KeyedObject(*oneRecord().dictionaryIf()));
  EXPECT_EQ(countOfKnownBooks(), 0U);
  writeArchive(text("1.2"), text("en"), KeyedObject(KeyedObject::Array{}));
  EXPECT_EQ(countOfKnownBooks(), 0U);
}

TEST_F(Cache, thatCannotBeReadIsLoggedWithPathAndError) {
  writeCache();
  world.files->fail(FailingFileManager::Operation::read, EIO, "HelpindexCache");
  EXPECT_EQ(countOfKnownBooks(), 0U);
  const std::string path = world.cachePath();
  EXPECT_THAT(world.log->entries(),
              ElementsAre(LogEntry{
                  1, ZEBStringWithFormat("Error loading help index cache from %@ (error: %@)", path,
                                         platform::posixError(EIO, path))}));
}

TEST_F(Cache, leavesOutARecordThatDoesNotDecode) {
  const auto gone = world.makeBookWithIndex("org.gone");
  const auto kept = world.makeBookWithIndex("org.kept");
  ZEBIndexshelf& shelf = world.makeShelf();
  shelf.indicesForBook(gone);
  shelf.indicesForBook(kept);
  shelf.archiveKnownIndices();
  std::filesystem::remove(gone->indexPaths().front());
  const auto known = world.makeShelf()._knownIndices();
  EXPECT_THAT(known.at("org.gone"), IsEmpty());
  EXPECT_EQ(known.at("org.kept").size(), 1U);
  // A book with no record left is resolved anew.
  world.writeIndex(gone->indexPaths().front());
  EXPECT_EQ(world.shelf->indicesForBook(gone).size(), 1U);
}

TEST_F(Cache, revivedRecordsCountAsLoadedFromTheCacheAndHaveTheirBook) {
  writeCache();
  world.makeShelf();
  const auto record = world.knownRecord("org.one");
  ASSERT_NE(record, nullptr);
  EXPECT_EQ(record->bookID(), "org.one");
  EXPECT_TRUE(record->loadedFromGeneratedCache());
}

TEST_F(Cache, holdsLanguageTableAndVersionInAKeyedArchive) {
  writeCache();
  KeyedUnarchiver coder(*platform::systemFileManager()->contentsAtPath(world.cachePath()));
  const auto stringUnder = [&](const char* key) {
    return coder.decodeObjectOfClasses({KeyedUnarchiver::stringClass}, key).value().stringValue();
  };
  EXPECT_EQ(stringUnder("CacheLanguage"), "en");
  EXPECT_EQ(stringUnder("CacheVersion"), "1.2");
  ZEBHelpindexIndex::registerArchiveClass();
  const KeyedObject table = coder.decodeObjectOfClasses(
      {KeyedUnarchiver::mutableDictionaryClass, KeyedUnarchiver::arrayClass,
       ZEBHelpindexIndex::archivedClassName},
      "KnownIndices");
  ASSERT_NE(table.dictionaryIf(), nullptr);
  EXPECT_TRUE(table.isMutable());
  EXPECT_EQ(table.dictionaryIf()->at("org.one").arrayIf()->size(), 1U);
  EXPECT_FALSE(table.dictionaryIf()->at("org.one").isMutable());
}

TEST_F(Cache, holdsNoIndexData) {
  book = world.makeBookWithIndex("org.one", 1, {{"filler", std::string(100'000, 'x')}});
  world.makeShelf().indicesForBook(book);
  world.shelf->archiveKnownIndices();
  EXPECT_LT(std::filesystem::file_size(world.cachePath()), 2000U);
}

TEST_F(Cache, isWrittenIntoAFolderThatIsMadeForIt) {
  ASSERT_FALSE(ShelfWorld::exists(world.helpCaches));
  world.makeShelf().archiveKnownIndices();
  EXPECT_TRUE(ShelfWorld::exists(world.cachePath()));
  EXPECT_THAT(world.log->entries(), IsEmpty());
}

TEST_F(Cache, isWrittenWithoutMakingFoldersWhereAFileExistsAlready) {
  writeCache();
  world.files->fail(FailingFileManager::Operation::createDirectory, EROFS);
  world.makeShelf().archiveKnownIndices();
  EXPECT_THAT(world.logged(), IsEmpty());
}

TEST_F(Cache, isWrittenWhereNothingIsLeftOfHostsThatWereKilledWhileTheyWrote) {
  const std::string left = world.folder.write("caches/help/.HelpindexCache.plist.76.0.tmp", "half");
  writeCache();
  EXPECT_FALSE(ShelfWorld::exists(left));
}

TEST_F(Cache, thatCannotBeWrittenIsLoggedAndTheEarlierFileStays) {
  writeCache();
  const std::string before = ShelfWorld::contents(world.cachePath());
  world.files->fail(FailingFileManager::Operation::write, ENOSPC, "HelpindexCache");
  world.makeShelf()._addIndex(ZEBIndex::init(), "org.two");
  world.log->clear();
  world.shelf->archiveKnownIndices();
  const std::string path = world.cachePath();
  EXPECT_THAT(
      world.log->entries(),
      ElementsAre(LogEntry{1, ZEBStringWithFormat("Failed to save indexindex to: %@ (error: %@)",
                                                  path, platform::posixError(ENOSPC, path))}));
  EXPECT_EQ(ShelfWorld::contents(path), before);
}

TEST_F(Cache, ignoresAFailureToMakeItsFolderUntilTheWriteFailsToo) {
  world.files->fail(FailingFileManager::Operation::createDirectory, EROFS);
  world.makeShelf().archiveKnownIndices();
  const std::string path = world.cachePath();
  EXPECT_THAT(
      world.log->entries(),
      ElementsAre(LogEntry{1, ZEBStringWithFormat("Failed to save indexindex to: %@ (error: %@)",
                                                  path, platform::posixError(ENOENT, path))}));
}

TEST_F(Cache, thatCannotBeEncodedIsLoggedAtLevelThreeAndTheEarlierFileStays) {
  writeCache();
  const std::string before = ShelfWorld::contents(world.cachePath());
  const auto record = world.makeShelf().indicesForBook(book).front();
  const std::string illFormed = "org.\xff";
  std::string reason;
  try {
    KeyedArchiver coder;
    coder.encodeObject(KeyedObject::mutableDictionary({{illFormed, KeyedObject()}}), "x");
  } catch (const platform::Exception& exception) {
    reason = exception.reason();
  }
  ASSERT_NE(reason, "");
  world.shelf->_addIndex(record, illFormed);
  world.log->clear();
  world.shelf->archiveKnownIndices();
  ASSERT_EQ(world.log->entries().size(), 1U);
  EXPECT_EQ(world.log->entries().front().level, 3);
  EXPECT_THAT(
      world.log->entries().front().message,
      testing::StartsWith("Failed to save indexindex to: " + world.cachePath() + " (exception: "));
  EXPECT_EQ(ShelfWorld::contents(world.cachePath()), before);
  // The lock was given back: another thread gets in.
  std::thread([&] { EXPECT_EQ(world.shelf->_knownIndices().size(), 2U); }).join();
}

/// Asks, at the moment of the write, whether another thread gets the shelf's lock.
class LockProbingFiles : public FailingFileManager {
 public:
  std::optional<platform::Error> writeAtomically(const std::string& path,
                                                 const platform::Data& data) const override {
    if (onWrite) {
      onWrite();
    }
    return FailingFileManager::writeAtomically(path, data);
  }
  std::function<void()> onWrite;
};

TEST_F(Cache, isWrittenUnderTheLockOfTheShelf) {
  const auto files = std::make_shared<LockProbingFiles>();
  world.change([&](platform::Environment& environment) { environment.files = files; });
  ZEBIndexshelf& shelf = world.makeShelf();
  bool locked = false;
  files->onWrite = [&] { locked = !world.othersGetTheLock(); };
  shelf.archiveKnownIndices();
  EXPECT_TRUE(locked);
}

TEST_F(Cache, readByManyWhileItIsRewrittenIsAlwaysWholeAndOneOfTheTwo) {
  writeCache();
  ZEBIndexshelf& shelf = world.makeShelf();
  shelf.archiveKnownIndices();
  const std::string one = ShelfWorld::contents(world.cachePath());
  const auto record = world.knownRecord("org.one");
  shelf._addIndex(record, "org.two");
  shelf.archiveKnownIndices();
  const std::string two = ShelfWorld::contents(world.cachePath());
  ASSERT_NE(one, two);
  std::atomic<bool> over{false};
  std::thread reader([&] {
    while (!over) {
      const std::string seen = ShelfWorld::contents(world.cachePath());
      ASSERT_TRUE(seen == one || seen == two);
    }
  });
  for (int i = 0; i < 15; ++i) {
    shelf.removeIndexForBookID("org.two");
    shelf.archiveKnownIndices();
    shelf._addIndex(record, "org.two");
    shelf.archiveKnownIndices();
  }
  over = true;
  reader.join();
  EXPECT_EQ(std::distance(std::filesystem::directory_iterator(world.helpCaches),
                          std::filesystem::directory_iterator()),
            1);
}

/// Gives bytes of the test's choice for the cache file.
class CacheBytesFiles : public FailingFileManager {
 public:
  std::optional<platform::Data> contentsMappedAtPath(const std::string& path,
                                                     platform::Error* error) const override {
    return path.ends_with("HelpindexCache.plist")
               ? std::optional(platform::Data::copy(bytes))
               : FailingFileManager::contentsMappedAtPath(path, error);
  }
  std::string bytes;
};

TEST_F(Cache, cutShortOrWithAFlippedByteAnywhereNeverHarmsTheShelf) {
  writeCache();
  const std::string whole = ShelfWorld::contents(world.cachePath());
  setClockToAgeOfCache(std::chrono::seconds(0));
  const auto files = std::make_shared<CacheBytesFiles>();
  world.change([&](platform::Environment& environment) { environment.files = files; });
  const auto load = [&](std::string bytes) {
    files->bytes = std::move(bytes);
    return ZEBIndexshelf::initWithOwner(world.owner)->_knownIndices().size();
  };
  ASSERT_EQ(load(whole), 1U);
  for (size_t length = 0; length < whole.size(); ++length) {
    EXPECT_EQ(load(whole.substr(0, length)), 0U);
  }
  for (size_t i = 0; i < whole.size(); ++i) {
    std::string flipped = whole;
    flipped[i] = static_cast<char>(flipped[i] ^ 0x55);
    EXPECT_LE(load(std::move(flipped)), 1U);
  }
}

TEST_F(Cache, isRewrittenWhenTheGeneratingQueueDrains) {
  world.launcher->behave(tests::writesIndex());
  world.makeShelf().indicesForBook(world.makeBook("org.generated"));
  world.finishWork();
  world.dropShelf();
  setClockToAgeOfCache(std::chrono::seconds(1));
  world.makeShelf();
  EXPECT_NE(world.knownRecord("org.generated"), nullptr);
}

TEST_F(Cache, isRewrittenWhenTheFetchUpdateQueueDrainsForBooksThatShipAnIndex) {
  world.makeShelf().indicesForBook(world.makeBookWithIndex("org.installed"));
  EXPECT_FALSE(ShelfWorld::exists(world.cachePath()));
  world.finishWork();
  world.dropShelf();
  setClockToAgeOfCache(std::chrono::seconds(1));
  world.makeShelf();
  EXPECT_NE(world.knownRecord("org.installed"), nullptr);
}

TEST_F(Cache, isNotWrittenByRegistrationOrRemovalAlone) {
  book = world.makeBookWithIndex("org.one");
  world.makeShelf(false).addRegistrationOperationForBook(book);
  world.finishWork();
  ASSERT_NE(world.knownRecord("org.one"), nullptr);
  EXPECT_FALSE(ShelfWorld::exists(world.cachePath()));
  world.shelf->removeIndexForBookID("org.one");
  EXPECT_FALSE(ShelfWorld::exists(world.cachePath()));
}

}  // namespace
