#include <gtest/gtest.h>

#include <filesystem>

#include "host/Zebrine/ZEBConstants.h"
#include "host/Zebrine/ZEBHelpBook.h"
#include "platform/Environment.h"
#include "platform/PropertyList.h"
#include "tests/platform/TemporaryFolder.h"

namespace {

using platform::Value;
using Dictionary = platform::Value::Dictionary;
using Strings = std::vector<std::string>;

/// A book folder in a world with chosen languages whose file system fails on demand.
class ZEBHelpBookReading : public testing::Test {
 protected:
  void prefer(Strings languages) {
    platform::Environment environment = platform::Environment::system();
    environment.preferredLanguages = std::move(languages);
    environment.files = _files;
    environment.log = _log;
    _override.reset();
    _override = std::make_unique<platform::EnvironmentOverride>(std::move(environment));
  }

  void SetUp() override { prefer({"en"}); }

  void TearDown() override { EXPECT_TRUE(_log->entries().empty()); }

  std::string path(const std::string& name) const { return _folder.path(name); }

  void write(const std::string& name, std::string_view content = "content") const {
    _folder.write(name, content);
  }

  void writeList(const Value& list, const std::string& name = "Info.plist",
                 platform::PropertyListFormat format = platform::PropertyListFormat::xml) const {
    _folder.write(name, platform::dataFromPropertyList(list, format).view());
  }

  /// The smallest information list, with some more entries.
  static Dictionary minimal(const Dictionary& more = {}) {
    Dictionary list = {{"ZEBBookIdentifier", "org.example.book"}};
    for (const auto& [key, value] : more) {
      list.insert_or_assign(key, value);
    }
    return list;
  }

  std::shared_ptr<ZEBHelpBook> read() const { return ZEBHelpBook::initWithPath(_folder.path()); }

  std::shared_ptr<ZEBHelpBook> readWith(const Dictionary& more) const {
    writeList(minimal(more));
    return read();
  }

  tests::TemporaryFolder _folder;
  std::shared_ptr<platform::FailingFileManager> _files =
      std::make_shared<platform::FailingFileManager>();
  std::shared_ptr<platform::CapturingLogSink> _log = std::make_shared<platform::CapturingLogSink>();
  std::unique_ptr<platform::EnvironmentOverride> _override;
};

TEST_F(ZEBHelpBookReading, anIdentifierIsEnough) {
  const auto book = readWith({});
  ASSERT_NE(book, nullptr);
  EXPECT_EQ(book->bookID(), "org.example.book");
  EXPECT_EQ(book->type(), ZEBHelpBookType1);
  EXPECT_EQ(book->path(), _folder.path());
  EXPECT_EQ(book->resourcesRootPath(), _folder.path());
  EXPECT_EQ(book->title(), "org.example.book");
  EXPECT_EQ(book->localization(), "");
  EXPECT_TRUE(book->indexPaths().empty());
  EXPECT_EQ(book->accessPagePath(), std::nullopt);
}

TEST_F(ZEBHelpBookReading, everyKeyIsRead) {
  for (const char* name :
       {"start.html", "a.helpindex", "more/b.helpindex", "em.plist", "s.plist"}) {
    write(name);
  }
  const auto book =
      readWith({{"ZEBBookType", 4},
                {"ZEBBookTitle", "Example Help"},
                {"ZEBBookAccessPage", "start.html"},
                {"ZEBBookIndexFiles", Value::Array{"a.helpindex", "more/b.helpindex"}},
                {"ZEBBookExactMatchFile", "em.plist"},
                {"ZEBBookSuggestionsFile", "s.plist"},
                {"ZEBBookRemoteRoot", "https://example.org/a b/"},
                {"ZEBBookUsesExternalViewer", true},
                {"ZEBBookAppIdentifier", "org.example.app"},
                {"ZEBBookAppVersion", "2.1"}});
  ASSERT_NE(book, nullptr);
  EXPECT_EQ(book->type(), ZEBHelpBookType4);
  EXPECT_EQ(book->title(), "Example Help");
  EXPECT_EQ(book->accessPagePath(), path("start.html"));
  EXPECT_EQ(book->indexPaths(), (Strings{path("a.helpindex"), path("more/b.helpindex")}));
  EXPECT_EQ(book->exactMatchPath(), path("em.plist"));
  EXPECT_EQ(book->suggestionsPath(), path("s.plist"));
  EXPECT_EQ(book->remoteURL()->absoluteString(), "https://example.org/a%20b/");
  EXPECT_TRUE(book->usesExternalViewer());
  EXPECT_EQ(book->appBundleID(), "org.example.app");
  EXPECT_EQ(book->appBundleVersion(), "2.1");
}

TEST_F(ZEBHelpBookReading, bothFormsOfPropertyListAreRead) {
  for (const auto format :
       {platform::PropertyListFormat::xml, platform::PropertyListFormat::binary}) {
    writeList(minimal(), "Info.plist", format);
    EXPECT_NE(read(), nullptr);
  }
}

TEST_F(ZEBHelpBookReading, oneIndexFileNeedsNoArray) {
  write("a.helpindex");
  EXPECT_EQ(readWith({{"ZEBBookIndexFiles", "a.helpindex"}})->indexPaths(),
            Strings{path("a.helpindex")});
}

TEST_F(ZEBHelpBookReading, filesThatAreNotThereAreLeftOut) {
  write("b.helpindex");
  std::filesystem::create_directories(path("folder"));
  const auto book =
      readWith({{"ZEBBookIndexFiles", Value::Array{"a.helpindex", "b.helpindex", "folder", "."}},
                {"ZEBBookAccessPage", "start.html"},
                {"ZEBBookExactMatchFile", "em.plist"},
                {"ZEBBookSuggestionsFile", "folder"}});
  ASSERT_NE(book, nullptr);
  EXPECT_EQ(book->indexPaths(), Strings{path("b.helpindex")});
  EXPECT_EQ(book->accessPagePath(), std::nullopt);
  EXPECT_EQ(book->exactMatchPath(), std::nullopt);
  EXPECT_EQ(book->suggestionsPath(), std::nullopt);
}

TEST_F(ZEBHelpBookReading, theAccessPageIsTheIndexPageUnlessToldOtherwise) {
  write("index.html");
  EXPECT_EQ(readWith({})->accessPagePath(), path("index.html"));
}

TEST_F(ZEBHelpBookReading, slashesAfterTheFolderMakeNoDifference) {
  writeList(minimal());
  EXPECT_EQ(ZEBHelpBook::initWithPath(_folder.path() + "//")->path(), _folder.path());
}

TEST_F(ZEBHelpBookReading, aFolderWithoutAnInformationListIsNoBook) {
  EXPECT_EQ(read(), nullptr);
  EXPECT_EQ(ZEBHelpBook::initWithPath(path("missing")), nullptr);
  EXPECT_EQ(ZEBHelpBook::initWithPath(""), nullptr);
  EXPECT_EQ(ZEBHelpBook::initWithPath(std::string("a\0b", 3)), nullptr);
}

TEST_F(ZEBHelpBookReading, aFileIsNoBook) {
  write("book", "text");
  EXPECT_EQ(ZEBHelpBook::initWithPath(path("book")), nullptr);
}

TEST_F(ZEBHelpBookReading, anUnreadableInformationListMakesNoBook) {
  writeList(minimal());
  _files->fail(platform::FailingFileManager::Operation::read, EIO, "Info.plist");
  EXPECT_EQ(read(), nullptr);
  _files->recover();
  EXPECT_NE(read(), nullptr);
}

TEST_F(ZEBHelpBookReading, whatIsNoPropertyListIsNoBook) {
  write("Info.plist", "");
  EXPECT_EQ(read(), nullptr);
  write("Info.plist", "no list");
  EXPECT_EQ(read(), nullptr);
  write("Info.plist",
        "<plist version=\"1.0\"><dict><key>ZEBBookIdentifier</key>"
        "<string>\xff\xfe</string></dict></plist>");
  EXPECT_EQ(read(), nullptr);
}

TEST_F(ZEBHelpBookReading, aListThatIsNoDictionaryIsNoBook) {
  writeList(Value::Array{"ZEBBookIdentifier", "org.example.book"});
  EXPECT_EQ(read(), nullptr);
  writeList("ZEBBookIdentifier");
  EXPECT_EQ(read(), nullptr);
}

TEST_F(ZEBHelpBookReading, aHugeListIsNoBook) {
  EXPECT_NE(readWith({{"Padding", std::string(1000000, 'a')}}), nullptr);
  EXPECT_EQ(readWith({{"Padding", std::string(1100000, 'a')}}), nullptr);
}

TEST_F(ZEBHelpBookReading, aDeepListIsNoBook) {
  const std::string list =
      "<plist version=\"1.0\"><dict><key>ZEBBookIdentifier</key>"
      "<string>org.example.book</string><key>Deep</key>";
  std::string opening;
  std::string closing;
  for (int i = 0; i < 40000; ++i) {
    opening += "<array>";
    closing += "</array>";
  }
  write("Info.plist", list + opening + closing + "</dict></plist>");
  EXPECT_EQ(read(), nullptr);
  write("Info.plist", list + "<array></array></dict></plist>");
  EXPECT_NE(read(), nullptr);
}

TEST_F(ZEBHelpBookReading, anIdentifierThatCouldLeaveAFolderIsRefused) {
  for (const char* bookID : {"", ".", "..", "../other", "a/b", "/etc"}) {
    EXPECT_EQ(readWith({{"ZEBBookIdentifier", bookID}}), nullptr) << bookID;
  }
  writeList(minimal({{"ZEBBookIdentifier", std::string("a\0b", 3)}}), "Info.plist",
            platform::PropertyListFormat::binary);
  EXPECT_EQ(read(), nullptr);
}

TEST_F(ZEBHelpBookReading, aMissingIdentifierIsRefused) {
  writeList(Dictionary{{"ZEBBookTitle", "Example Help"}});
  EXPECT_EQ(read(), nullptr);
}

TEST_F(ZEBHelpBookReading, pathsThatLeaveTheBookAreRefused) {
  write("index.html");
  for (const char* key : {"ZEBBookAccessPage", "ZEBBookIndexFiles", "ZEBBookExactMatchFile",
                          "ZEBBookSuggestionsFile"}) {
    for (const char* name : {"../a", "..", "a/../../b", "a/..", "/etc/passwd", ""}) {
      EXPECT_EQ(readWith({{key, name}}), nullptr) << key << " " << name;
    }
    EXPECT_NE(readWith({{key, "..a/b..c"}}), nullptr) << key;
  }
  EXPECT_EQ(readWith({{"ZEBBookIndexFiles", Value::Array{"index.html", "../a"}}}), nullptr);
}

TEST_F(ZEBHelpBookReading, valuesOfTheWrongKindAreRefused) {
  const std::vector<std::pair<std::string, Value>> wrong = {
      {"ZEBBookIdentifier", 1},
      {"ZEBBookIdentifier", Value::Array{"org.example.book"}},
      {"ZEBBookType", "1"},
      {"ZEBBookType", 0},
      {"ZEBBookType", 5},
      {"ZEBBookType", 1.0},
      {"ZEBBookType", true},
      {"ZEBBookType", int64_t{1} << 32U | 1},
      {"ZEBBookTitle", 1},
      {"ZEBBookTitle", ""},
      {"ZEBBookDevelopmentLanguage", false},
      {"ZEBBookAccessPage", Value::Array{"index.html"}},
      {"ZEBBookAccessPage", 3},
      {"ZEBBookIndexFiles", Dictionary{}},
      {"ZEBBookIndexFiles", Value::Array{1}},
      {"ZEBBookExactMatchFile", platform::Data::copy("em.plist")},
      {"ZEBBookSuggestionsFile", Value::Array{}},
      {"ZEBBookRemoteRoot", 1},
      {"ZEBBookRemoteRoot", "no-scheme"},
      {"ZEBBookUsesExternalViewer", "yes"},
      {"ZEBBookUsesExternalViewer", 1},
      {"ZEBBookAppIdentifier", 1},
      {"ZEBBookAppVersion", 2.1},
  };
  for (const auto& [key, value] : wrong) {
    EXPECT_EQ(readWith({{key, value}}), nullptr) << key;
  }
}

TEST_F(ZEBHelpBookReading, anEmptyListOfIndexFilesIsNone) {
  EXPECT_TRUE(readWith({{"ZEBBookIndexFiles", Value::Array{}}})->indexPaths().empty());
}

TEST_F(ZEBHelpBookReading, unknownKeysAreLeftAlone) {
  EXPECT_NE(readWith({{"Comment", Value::Array{1, 2}}}), nullptr);
}

TEST_F(ZEBHelpBookReading, theCatalogueIsMadeSecureAndHasToBeAURL) {
  EXPECT_EQ(readWith({{"ZEBBookCatalogue", "http://example.org/c.json"}})
                ->catalogueURL()
                ->absoluteString(),
            "https://example.org/c.json");
  EXPECT_EQ(readWith({})->catalogueURL(), std::nullopt);
  EXPECT_EQ(readWith({{"ZEBBookCatalogue", "no-scheme"}}), nullptr);
  EXPECT_EQ(readWith({{"ZEBBookCatalogue", 1}}), nullptr);
}

TEST_F(ZEBHelpBookReading, theRemoteRootIsMadeSecure) {
  EXPECT_EQ(
      readWith({{"ZEBBookRemoteRoot", "http://example.org/book/"}})->remoteURL()->absoluteString(),
      "https://example.org/book/");
}

TEST_F(ZEBHelpBookReading, aRemoteBookIsKnownByItsIdentifier) {
  const auto book = readWith({{"ZEBBookIdentifier", "org.example.remote"},
                              {"ZEBBookType", 4},
                              {"ZEBBookRemoteRoot", "https://example.org/book/"}});
  EXPECT_EQ(
      ZEBHelpBook::_urlForType4HelpBookResult("/a.html", "org.example.remote")->absoluteString(),
      "https://example.org/book/a.html");
}

TEST_F(ZEBHelpBookReading, aBundleKeepsItsFilesInItsResources) {
  write("Resources/index.html");
  write("index.html");
  for (const int type : {2, 3}) {
    const auto book = readWith({{"ZEBBookType", type}});
    EXPECT_EQ(book->path(), _folder.path());
    EXPECT_EQ(book->resourcesRootPath(), path("Resources"));
    EXPECT_EQ(book->accessPagePath(), path("Resources/index.html"));
  }
}

TEST_F(ZEBHelpBookReading, aBundleWithoutResourcesHasThemInItsFolder) {
  write("index.html");
  const auto book = readWith({{"ZEBBookType", 2}});
  EXPECT_EQ(book->resourcesRootPath(), std::nullopt);
  EXPECT_EQ(book->accessPagePath(), path("index.html"));
}

TEST_F(ZEBHelpBookReading, filesOfTheLanguageInUseGoFirst) {
  prefer({"pt-BR", "de"});
  for (const char* name : {"index.html", "em.plist", "de.lproj/index.html", "en.lproj/index.html",
                           "pt.lproj/index.html", "pt.lproj/pt.helpindex"}) {
    write(name);
  }
  const auto book =
      readWith({{"ZEBBookIndexFiles", "pt.helpindex"}, {"ZEBBookExactMatchFile", "em.plist"}});
  ASSERT_NE(book, nullptr);
  EXPECT_EQ(book->localization(), "pt");
  EXPECT_EQ(book->accessPagePath(), path("pt.lproj/index.html"));
  EXPECT_EQ(book->indexPaths(), Strings{path("pt.lproj/pt.helpindex")});
  EXPECT_EQ(book->exactMatchPath(), path("em.plist"));
}

TEST_F(ZEBHelpBookReading, languagesFallBackFromRegionToLanguageToEnglish) {
  prefer({"pt-BR"});
  write("en.lproj/index.html");
  EXPECT_EQ(readWith({})->localization(), "en");
  write("pt.lproj/index.html");
  EXPECT_EQ(read()->localization(), "pt");
  write("pt_BR.lproj/index.html");
  EXPECT_EQ(read()->localization(), "pt_BR");
}

TEST_F(ZEBHelpBookReading, theDevelopmentLanguageServesReadersOfOtherLanguages) {
  prefer({"ja"});
  write("de.lproj/index.html");
  write("en.lproj/index.html");
  EXPECT_EQ(readWith({{"ZEBBookDevelopmentLanguage", "de"}})->localization(), "de");
}

TEST_F(ZEBHelpBookReading, aBundlesLanguagesAreInItsResources) {
  prefer({"fr"});
  write("de.lproj/index.html");
  write("Resources/fr.lproj/index.html");
  write("Resources/en.lproj/index.html");
  const auto book = readWith({{"ZEBBookType", 3}});
  EXPECT_EQ(book->localization(), "fr");
  EXPECT_EQ(book->accessPagePath(), path("Resources/fr.lproj/index.html"));
}

TEST_F(ZEBHelpBookReading, theListOfTheLanguageInUseIsLaidOverTheBooks) {
  prefer({"de"});
  write("de.lproj/anfang.html");
  writeList(Dictionary{{"ZEBBookTitle", "Hilfe"},
                       {"ZEBBookAccessPage", "anfang.html"},
                       {"ZEBBookRemoteRoot", "https://example.org/de/"}},
            "de.lproj/Info.plist");
  const auto book = readWith({{"ZEBBookTitle", "Help"}, {"ZEBBookAppVersion", "2.1"}});
  ASSERT_NE(book, nullptr);
  EXPECT_EQ(book->title(), "Hilfe");
  EXPECT_EQ(book->accessPagePath(), path("de.lproj/anfang.html"));
  EXPECT_EQ(book->remoteURL()->absoluteString(), "https://example.org/de/");
  EXPECT_EQ(book->appBundleVersion(), "2.1");
}

TEST_F(ZEBHelpBookReading, aLanguageDoesNotChangeWhichBookItIs) {
  prefer({"de"});
  writeList(Dictionary{{"ZEBBookIdentifier", "../other"}, {"ZEBBookType", 4}},
            "de.lproj/Info.plist");
  const auto book = readWith({});
  ASSERT_NE(book, nullptr);
  EXPECT_EQ(book->bookID(), "org.example.book");
  EXPECT_EQ(book->type(), ZEBHelpBookType1);
}

TEST_F(ZEBHelpBookReading, aLanguagesListHasToBeRightToo) {
  prefer({"de"});
  writeList(Dictionary{{"ZEBBookAccessPage", "../../index.html"}}, "de.lproj/Info.plist");
  EXPECT_EQ(readWith({}), nullptr);
}

TEST_F(ZEBHelpBookReading, aLanguagesListThatCannotBeReadCountsAsNone) {
  prefer({"de"});
  write("de.lproj/Info.plist", "no list");
  EXPECT_EQ(readWith({{"ZEBBookTitle", "Help"}})->title(), "Help");
}

TEST_F(ZEBHelpBookReading, whatOnlyLooksLikeALanguageFolderIsPassedOver) {
  prefer({"de"});
  write("de.lproj", "a file");
  std::filesystem::create_directories(path(".lproj"));
  std::filesystem::create_directories(path("...lproj"));
  EXPECT_EQ(readWith({})->localization(), "");
}

TEST_F(ZEBHelpBookReading, truncatedAndAlteredListsNeverDoWorseThanNoBook) {
  prefer({"de"});
  write("index.html");
  const std::string bytes(
      platform::dataFromPropertyList(minimal({{"ZEBBookType", 2},
                                              {"ZEBBookIndexFiles", Value::Array{"index.html"}},
                                              {"ZEBBookRemoteRoot", "https://example.org/"}}),
                                     platform::PropertyListFormat::binary)
          .view());
  for (size_t i = 0; i < bytes.size(); ++i) {
    write("Info.plist", bytes.substr(0, i));
    EXPECT_EQ(read(), nullptr) << i;
    std::string altered = bytes;
    altered[i] = static_cast<char>(altered[i] ^ 0x41);
    write("Info.plist", altered);
    const auto book = read();
    EXPECT_TRUE(book == nullptr || ZEBHelpBook::isValidBookID(book->bookID())) << i;
  }
}

}  // namespace
