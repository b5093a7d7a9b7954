#include "zebd/Catalogue.h"

#include <gmock/gmock.h>

#include <filesystem>
#include <fstream>
#include <iterator>
#include <string>

#include "platform/Environment.h"
#include "platform/PropertyList.h"
#include "tests/platform/TemporaryFolder.h"

namespace {

using testing::ElementsAre;
using testing::IsEmpty;
using zebd::Catalogue;
using zebd::CatalogueEntry;

class CatalogueTest : public testing::Test {
 protected:
  CatalogueEntry entry(const std::string& bookID) const {
    CatalogueEntry entry;
    entry.bookID = bookID;
    entry.title = "Title of " + bookID;
    entry.type = 3;
    entry.folder = "/books/" + bookID;
    entry.accessPagePath = "/books/" + bookID + "/index.html";
    entry.language = "pt_BR";
    entry.fingerprint = "1:2:3";
    return entry;
  }

  std::string content(const std::string& path) const {
    std::ifstream file(path, std::ios::binary);
    return {std::istreambuf_iterator<char>(file), {}};
  }

  tests::TemporaryFolder folder;
  Catalogue catalogue{folder.path("deep/down")};
};

TEST_F(CatalogueTest, MissingFolderIsAnEmptyCatalogue) {
  EXPECT_THAT(catalogue.entries(), IsEmpty());
  EXPECT_EQ(catalogue.entry("a"), std::nullopt);
}

TEST_F(CatalogueTest, KeepsEverythingThatIsKnownOfABook) {
  ASSERT_EQ(catalogue.store(entry("a")), std::nullopt);
  EXPECT_EQ(catalogue.entry("a"), entry("a"));
}

TEST_F(CatalogueTest, KeepsWhereAServerHasABook) {
  CatalogueEntry remote = entry("a");
  remote.type = 4;
  remote.catalogueURL = "https://help.example.org/catalogue.json";
  remote.languages = {"pt-BR", "de"};
  remote.pagesURL = "https://help.example.org/pages/";
  ASSERT_EQ(catalogue.store(remote), std::nullopt);
  EXPECT_EQ(catalogue.entry("a"), remote);
  EXPECT_TRUE(catalogue.entry("a")->isRemote());
  EXPECT_FALSE(entry("a").isRemote());
}

TEST_F(CatalogueTest, ListsBooksByIdentifier) {
  for (const char* bookID : {"b", "c", "a", "a.plist"}) {
    ASSERT_EQ(catalogue.store(entry(bookID)), std::nullopt);
  }
  EXPECT_THAT(catalogue.entries(),
              ElementsAre(entry("a"), entry("a.plist"), entry("b"), entry("c")));
}

TEST_F(CatalogueTest, StoringAgainReplaces) {
  ASSERT_EQ(catalogue.store(entry("a")), std::nullopt);
  CatalogueEntry changed = entry("a");
  changed.title = "Another";
  ASSERT_EQ(catalogue.store(changed), std::nullopt);
  EXPECT_THAT(catalogue.entries(), ElementsAre(changed));
}

TEST_F(CatalogueTest, KeepsPathsThatAreNoText) {
  CatalogueEntry odd = entry("a");
  odd.folder = "/books/caf\xE9";
  odd.accessPagePath = "/books/line\nbreak\001\xEF\xBF\xBF/index.html";
  ASSERT_EQ(catalogue.store(odd), std::nullopt);
  EXPECT_EQ(catalogue.entry("a"), odd);
}

TEST_F(CatalogueTest, TitleThatIsNoTextIsAnErrorAndChangesNothing) {
  ASSERT_EQ(catalogue.store(entry("a")), std::nullopt);
  CatalogueEntry odd = entry("a");
  odd.title = "caf\xE9";
  EXPECT_NE(catalogue.store(odd), std::nullopt);
  EXPECT_EQ(catalogue.entry("a"), entry("a"));
}

TEST_F(CatalogueTest, RemovingForgetsTheBookAndNoOther) {
  ASSERT_EQ(catalogue.store(entry("a")), std::nullopt);
  ASSERT_EQ(catalogue.store(entry("b")), std::nullopt);
  const std::string outside = folder.write("deep/outside.plist", "not a book");
  EXPECT_EQ(catalogue.remove("a"), std::nullopt);
  EXPECT_EQ(catalogue.remove("a"), std::nullopt);
  EXPECT_EQ(catalogue.remove("../outside"), std::nullopt);
  EXPECT_THAT(catalogue.entries(), ElementsAre(entry("b")));
  EXPECT_TRUE(std::filesystem::exists(outside));
}

TEST_F(CatalogueTest, BookThatCannotBeForgottenIsAnError) {
  ASSERT_EQ(catalogue.store(entry("a")), std::nullopt);
  const auto files = std::make_shared<platform::FailingFileManager>();
  files->fail(platform::FailingFileManager::Operation::remove, EROFS, "a.plist");
  platform::Environment environment = *platform::Environment::current();
  environment.files = files;
  const platform::EnvironmentOverride override(std::move(environment));
  EXPECT_NE(catalogue.remove("a"), std::nullopt);
  EXPECT_EQ(catalogue.entry("a"), entry("a"));
  EXPECT_EQ(catalogue.remove("b"), std::nullopt) << "it is not there anyway";
}

TEST_F(CatalogueTest, EntryCutOffAnywhereCostsOnlyThatBook) {
  ASSERT_EQ(catalogue.store(entry("a")), std::nullopt);
  ASSERT_EQ(catalogue.store(entry("b")), std::nullopt);
  const std::string path = folder.path("deep/down/a.plist");
  const std::string whole = content(path);
  ASSERT_FALSE(whole.empty());
  // The last characters are the line break behind the closing tag, which nothing misses.
  for (size_t length = 0; length + 2 < whole.size(); ++length) {
    folder.write("deep/down/a.plist", whole.substr(0, length));
    EXPECT_THAT(catalogue.entries(), ElementsAre(entry("b"))) << length;
  }
}

TEST_F(CatalogueTest, EntryWithAnyByteChangedNeverHarmsTheOthers) {
  ASSERT_EQ(catalogue.store(entry("a")), std::nullopt);
  ASSERT_EQ(catalogue.store(entry("b")), std::nullopt);
  const std::string whole = content(folder.path("deep/down/a.plist"));
  for (size_t at = 0; at < whole.size(); ++at) {
    std::string changed = whole;
    changed[at] = static_cast<char>(changed[at] ^ 0x15);
    folder.write("deep/down/a.plist", changed);
    const auto entries = catalogue.entries();
    ASSERT_FALSE(entries.empty());
    EXPECT_EQ(entries.back(), entry("b")) << at;
    if (entries.size() == 2) {
      EXPECT_EQ(entries.front().bookID, "a") << at;
    }
  }
}

TEST_F(CatalogueTest, GarbageFoldersAndStrangersArePassedOver) {
  ASSERT_EQ(catalogue.store(entry("a")), std::nullopt);
  folder.write("deep/down/b.plist", "garbage");
  folder.write("deep/down/c.plist/inside", "a folder");
  folder.write("deep/down/d.helpindex", "an index without a book");
  folder.write("deep/down/.plist", content(folder.path("deep/down/a.plist")));
  // An entry that was copied under another name speaks of another book.
  folder.write("deep/down/e.plist", content(folder.path("deep/down/a.plist")));
  EXPECT_THAT(catalogue.entries(), ElementsAre(entry("a")));
}

class CatalogueEntryTest : public CatalogueTest {
 protected:
  /// The entry "a" with one value of its property list replaced.
  std::optional<CatalogueEntry> with(const std::string& key, const platform::Value& value) {
    EXPECT_EQ(catalogue.store(entry("a")), std::nullopt);
    const std::string path = folder.path("deep/down/a.plist");
    platform::Value::Dictionary list =
        *platform::dictionaryWithContentsOfFile(path).value().dictionaryIf();
    EXPECT_TRUE(list.contains(key));
    list[key] = value;
    folder.write(
        "deep/down/a.plist",
        platform::dataFromPropertyList(platform::Value(list), platform::PropertyListFormat::binary)
            .view());
    return catalogue.entry("a");
  }
};

TEST_F(CatalogueEntryTest, RelativePathsAreRefused) {
  EXPECT_EQ(with("folder", "books/a"), std::nullopt);
  EXPECT_EQ(with("folder", ""), std::nullopt);
  EXPECT_EQ(with("accessPage", 3), std::nullopt);
}

TEST_F(CatalogueEntryTest, UnknownTypesAreRefused) {
  EXPECT_EQ(with("type", 0), std::nullopt);
  EXPECT_EQ(with("type", 5), std::nullopt);
  EXPECT_EQ(with("type", "one"), std::nullopt);
}

TEST_F(CatalogueEntryTest, IdentifierHasToBeThatOfTheFile) {
  EXPECT_EQ(with("bookID", "../a"), std::nullopt);
  EXPECT_EQ(with("bookID", "b"), std::nullopt);
}

TEST_F(CatalogueEntryTest, ValuesOfLessImportanceMayBeWrong) {
  ASSERT_NE(with("title", 7), std::nullopt);
  EXPECT_EQ(with("title", 7)->title, "a");
}

TEST_F(CatalogueTest, IdentifiersThatLeaveTheFolderAreRefused) {
  folder.write("deep/a.plist", "outside");
  EXPECT_EQ(catalogue.entry("../a"), std::nullopt);
  EXPECT_EQ(catalogue.entry(std::string("a\0b", 3)), std::nullopt);
}

class CatalogueOnABrokenDiskTest : public CatalogueTest {
 protected:
  CatalogueOnABrokenDiskTest() {
    platform::Environment environment = *platform::Environment::current();
    environment.files = files;
    override.emplace(std::move(environment));
  }

  std::shared_ptr<platform::FailingFileManager> files =
      std::make_shared<platform::FailingFileManager>();
  std::optional<platform::EnvironmentOverride> override;
};

TEST_F(CatalogueOnABrokenDiskTest, FailedWriteIsReportedAndKeepsTheEarlierEntry) {
  ASSERT_EQ(catalogue.store(entry("a")), std::nullopt);
  files->fail(platform::FailingFileManager::Operation::write, ENOSPC);
  CatalogueEntry changed = entry("a");
  changed.title = "Another";
  const auto error = catalogue.store(changed);
  ASSERT_NE(error, std::nullopt);
  EXPECT_EQ(error->code, ENOSPC);
  EXPECT_EQ(catalogue.entry("a"), entry("a"));
}

TEST_F(CatalogueOnABrokenDiskTest, FolderThatCannotBeMadeIsReported) {
  files->fail(platform::FailingFileManager::Operation::createDirectory, EACCES);
  const auto error = catalogue.store(entry("a"));
  ASSERT_NE(error, std::nullopt);
  EXPECT_EQ(error->code, EACCES);
}

TEST_F(CatalogueOnABrokenDiskTest, UnreadableEntryIsPassedOver) {
  ASSERT_EQ(catalogue.store(entry("a")), std::nullopt);
  ASSERT_EQ(catalogue.store(entry("b")), std::nullopt);
  files->fail(platform::FailingFileManager::Operation::read, EIO, "a.plist");
  EXPECT_THAT(catalogue.entries(), ElementsAre(entry("b")));
}

}  // namespace
