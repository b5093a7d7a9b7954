// The archived form of help-index records.
#include <gtest/gtest.h>

#include "plugin/records/ZEBHelpindexIndex.h"
#include "tests/plugin/HelpIndexWorld.h"

using platform::Data;
using platform::KeyedArchiver;
using platform::KeyedObject;
using platform::KeyedUnarchiver;
using platform::Value;
using testing::IsEmpty;
using tests::HelpIndexWorld;

namespace {

// An archive with these values under the record's keys, at top level, where initWithCoder() reads
// them as it reads those of an object.
Data roots(const Value& path, const Value& bookID) {
  KeyedArchiver archiver;
  if (!path.isAbsent()) {
    archiver.encodeObject(path, SKIIndexPathKey);
  }
  if (!bookID.isAbsent()) {
    archiver.encodeObject(bookID, SKIBookIDKey);
  }
  return archiver.finishEncoding();
}

std::shared_ptr<ZEBHelpindexIndex> revived(const Data& archive) {
  KeyedUnarchiver unarchiver(archive);
  return ZEBHelpindexIndex::initWithCoder(unarchiver);
}

Data archived(std::shared_ptr<const ZEBHelpindexIndex> record) {
  KeyedArchiver archiver;
  archiver.encodeObject(std::shared_ptr<const platform::KeyedCodable>(std::move(record)), "record");
  return archiver.finishEncoding();
}

}  // namespace

TEST(ZEBHelpindexIndexArchive, KeysAreTheirOwnNames) {
  EXPECT_STREQ(SKIIndexPathKey, "SKIIndexPathKey");
  EXPECT_STREQ(SKIBookIDKey, "SKIBookIDKey");
  EXPECT_TRUE(ZEBHelpindexIndex::supportsSecureCoding());
}

TEST(ZEBHelpindexIndexArchive, WritesPathAndBookAndNothingElse) {
  const HelpIndexWorld world;
  const std::string path = world.write("a.helpindex", {});
  const auto index = ZEBHelpindexIndex::initWithPath(path);
  ASSERT_NE(index, nullptr);
  index->setBookID("org.example.book");
  index->setRemoteRoot("https://help.example/");
  KeyedArchiver archiver;
  index->encodeWithCoder(archiver);
  EXPECT_EQ(archiver.finishEncoding(), roots(path, "org.example.book"));
}

TEST(ZEBHelpindexIndexArchive, WithoutABookWritesNoBook) {
  const HelpIndexWorld world;
  const std::string path = world.write("a.helpindex", {});
  const auto index = ZEBHelpindexIndex::initWithPath(path);
  ASSERT_NE(index, nullptr);
  KeyedArchiver archiver;
  index->encodeWithCoder(archiver);
  EXPECT_EQ(archiver.finishEncoding(), roots(path, Value()));
}

TEST(ZEBHelpindexIndexArchive, RevivedRecordReadsItsFileAgainAndSaysWhereItComesFrom) {
  const HelpIndexWorld world;
  ZEBHelpindexIndex::registerArchiveClass();
  ZEBHelpindexIndex::registerArchiveClass();
  const std::string path = world.write("a.helpindex", {});
  const auto index = ZEBHelpindexIndex::initWithPath(path);
  ASSERT_NE(index, nullptr);
  index->setBookID("org.example.book");
  const Data archive = archived(index);
  // Another index in the same place since then.
  world.write("a.helpindex", {{"SKI_ANCHOR_DATA", tests::anchors({{"a", {"/a.html"}}})}});

  KeyedUnarchiver unarchiver(archive);
  const KeyedObject object =
      unarchiver.decodeObjectOfClasses({ZEBHelpindexIndex::archivedClassName}, "record");
  const auto again = std::dynamic_pointer_cast<const ZEBHelpindexIndex>(object.object());
  ASSERT_NE(again, nullptr);
  EXPECT_EQ(again->path(), path);
  EXPECT_EQ(again->bookID(), "org.example.book");
  EXPECT_TRUE(again->loadedFromGeneratedCache());
  EXPECT_FALSE(again->isReinitialized());
  EXPECT_TRUE(again->hasAnchors());
  EXPECT_GT(again->indexID(), index->indexID());
}

TEST(ZEBHelpindexIndexArchive, RecordThatCannotBeRevivedIsNil) {
  const HelpIndexWorld world;
  ZEBHelpindexIndex::registerArchiveClass();
  const Data archive = archived(ZEBHelpindexIndex::initWithPath(world.write("a.helpindex", {})));
  std::filesystem::remove(world.folder.path("a.helpindex"));
  KeyedUnarchiver unarchiver(archive);
  EXPECT_EQ(
      unarchiver.decodeObjectOfClasses({ZEBHelpindexIndex::archivedClassName}, "record").object(),
      nullptr);
}

TEST(ZEBHelpindexIndexArchive, WithoutAPathThereIsNoRecord) {
  const HelpIndexWorld world;
  EXPECT_EQ(revived(roots(Value(), "org.example.book")), nullptr);
  EXPECT_EQ(revived(roots(Value(), Value())), nullptr);
  EXPECT_THAT(world.log->entries(), IsEmpty());
}

TEST(ZEBHelpindexIndexArchive, WithAPathThatHoldsNoReadableIndexThereIsNoRecord) {
  const HelpIndexWorld world;
  EXPECT_EQ(revived(roots(world.folder.path("missing.helpindex"), "book")), nullptr);
  EXPECT_THAT(world.log->entries(), IsEmpty());
  EXPECT_EQ(revived(roots(world.folder.write("a.helpindex", "broken"), "book")), nullptr);
  EXPECT_EQ(world.log->messages(0).size(), 1U);
}

TEST(ZEBHelpindexIndexArchive, PathOfAnotherClassIsNone) {
  const HelpIndexWorld world;
  const std::string path = world.write("a.helpindex", {});
  EXPECT_EQ(revived(roots(7, "book")), nullptr);
  EXPECT_EQ(revived(roots(Data::copy(path), "book")), nullptr);
  EXPECT_EQ(revived(roots(Value::Array{path}, "book")), nullptr);
}

TEST(ZEBHelpindexIndexArchive, BookThatIsMissingOrOfAnotherClassIsNone) {
  const HelpIndexWorld world;
  const std::string path = world.write("a.helpindex", {});
  for (const Value& bookID : {Value(), Value(7), Value(Data::copy("book")),
                              Value(Value::Array{"book"}), Value(Value::Dictionary{})}) {
    const auto index = revived(roots(path, bookID));
    ASSERT_NE(index, nullptr);
    EXPECT_EQ(index->bookID(), std::nullopt);
    EXPECT_TRUE(index->loadedFromGeneratedCache());
  }
}
