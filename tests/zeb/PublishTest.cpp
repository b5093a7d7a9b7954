// From a help book to a folder that a web server can serve.
#include <gmock/gmock.h>

#include <filesystem>
#include <map>
#include <sstream>

#include "SearchKit/SearchKit.h"
#include "bvmake/HelpIndexFile.h"
#include "host/Zebrine/RNXCatalogue.h"
#include "platform/Digest.h"
#include "platform/PropertyList.h"
#include "tests/zeb/World.h"

namespace {

namespace fs = std::filesystem;
using testing::Contains;
using testing::ElementsAre;
using testing::HasSubstr;
using testing::IsEmpty;
using testing::Not;
using tests::Outcome;
using zeb::ExitCode;

std::string contents(const std::string& path) {
  std::ostringstream bytes;
  bytes << std::ifstream(path, std::ios::binary).rdbuf();
  return bytes.str();
}

class PublishTest : public testing::Test {
 protected:
  std::string site() const { return world.files().path("site"); }

  Outcome publish(const std::string& folder, std::vector<std::string> more = {}) const {
    std::vector<std::string> line = {"publish", folder, "--site", site()};
    line.insert(line.end(), more.begin(), more.end());
    return world.zeb(line);
  }

  RNXCatalogue catalogue() const {
    platform::Error error;
    auto read = RNXCatalogue::catalogueWithData(
        platform::Data::copy(contents(site() + "/catalogue.json")),
        *platform::URL::URLWithString("https://help.example.org/catalogue.json"), &error);
    EXPECT_TRUE(read) << error.description;
    return read.value_or(RNXCatalogue());
  }

  /// The published file behind a URL of the catalogue.
  std::string fileOf(const platform::URL& url) const {
    const std::string path = url.path();
    return site() + path;
  }

  /// Every file and folder with its bytes and the time of its last change.
  std::map<std::string, std::pair<std::string, fs::file_time_type>> snapshot() const {
    std::map<std::string, std::pair<std::string, fs::file_time_type>> all;
    for (const auto& entry : fs::recursive_directory_iterator(site())) {
      all[entry.path()] = {entry.is_regular_file() ? contents(entry.path()) : "",
                           fs::last_write_time(entry.path())};
    }
    all[site()] = {"", fs::last_write_time(site())};
    return all;
  }

  std::vector<std::string> names(const std::string& folder) const {
    std::vector<std::string> found;
    for (const auto& entry : fs::recursive_directory_iterator(site() + "/" + folder)) {
      if (entry.is_regular_file()) {
        found.push_back(entry.path().lexically_relative(site() + "/" + folder));
      }
    }
    std::sort(found.begin(), found.end());
    return found;
  }

  void writeList(const std::string& name, platform::Value::Dictionary list) const {
    world.files().write(
        name,
        platform::dataFromPropertyList(std::move(list), platform::PropertyListFormat::xml).view());
  }

  const tests::World world;
};

TEST_F(PublishTest, aHelpBookBecomesPagesIndexListAndCatalogue) {
  const Outcome run = publish(tests::shippedBook("manual"));
  EXPECT_EQ(run.code, ExitCode::success) << run.err;
  EXPECT_EQ(run.err, "");
  EXPECT_THAT(run.out, HasSubstr("org.zeb.manual"));
  const RNXCatalogue published = catalogue();
  ASSERT_EQ(published.books.size(), 1U);
  const RNXCatalogueEntry& book = published.books.front();
  EXPECT_EQ(book.identifier, "org.zeb.manual");
  EXPECT_EQ(book.title, "Help Search Manual");
  EXPECT_EQ(book.locale, std::nullopt);
  EXPECT_EQ(contents(fileOf(*book.pages) + "/index.html"),
            contents(tests::shippedBook("manual") + "/index.html"));
  ASSERT_TRUE(book.searchIndex && book.exactMatch);
  EXPECT_EQ(platform::sha256Digest(contents(fileOf(book.searchIndex->url))),
            book.searchIndex->sha256);
  EXPECT_EQ(contents(fileOf(book.exactMatch->url)),
            contents(tests::shippedBook("manual") + "/exactmatch.plist"));
  const auto index = bvmake::readHelpIndexFile(fileOf(book.searchIndex->url));
  ASSERT_TRUE(index);
  const platform::Data* keywords = (*index)[bvmake::helpindexkeys::indexData].dataIf();
  ASSERT_NE(keywords, nullptr);
  EXPECT_NE(SKIndexOpenWithData(*keywords), nullptr);
  EXPECT_NE((*index)[bvmake::helpindexkeys::luxIndexData].dataIf(), nullptr);
  EXPECT_NE((*index)[bvmake::helpindexkeys::anchorData].dictionaryIf(), nullptr);
}

TEST_F(PublishTest, whatIsNoPageIsNotAmongThePages) {
  world.writePage("book/index.html", "Book", "words");
  world.files().write("book/picture.svg", "<svg/>");
  world.files().write("book/.hidden", "x");
  world.files().write("book/.git/config", "x");
  world.files().write("book/old.helpindex", "x");
  writeList("book/Info.plist", {{"ZEBBookIdentifier", "org.book"},
                                {"ZEBBookExactMatchFile", "exactmatch.plist"},
                                {"ZEBBookSuggestionsFile", "suggestions.plist"}});
  writeList("book/exactmatch.plist", {{"words", "anchor-Book"}});
  writeList("book/suggestions.plist", {});
  fs::create_symlink("/etc/passwd", world.files().path("book/link.html"));
  ASSERT_EQ(publish(world.files().path("book")).code, ExitCode::success);
  EXPECT_THAT(names("books/org.book/default/pages"), ElementsAre("index.html", "picture.svg"));
}

TEST_F(PublishTest, anUnchangedBookChangesNothing) {
  ASSERT_EQ(publish(tests::shippedBook("manual")).code, ExitCode::success);
  const auto before = snapshot();
  const Outcome run = publish(tests::shippedBook("manual"));
  EXPECT_EQ(run.code, ExitCode::success) << run.err;
  EXPECT_THAT(run.out, HasSubstr("nothing to change"));
  EXPECT_EQ(snapshot(), before);
}

TEST_F(PublishTest, anUnchangedBookChangesNothingAfterAChangeEither) {
  const std::string folder = world.files().path("book");
  world.writePage("book/index.html", "Book", "words");
  ASSERT_EQ(publish(folder).code, ExitCode::success);
  world.writePage("book/index.html", "Book", "other words");
  ASSERT_EQ(publish(folder).code, ExitCode::success);
  const auto before = snapshot();
  ASSERT_EQ(publish(folder).code, ExitCode::success);
  EXPECT_EQ(snapshot(), before);
}

TEST_F(PublishTest, aNewEditionHasNewNamesAndTheFormerOneStaysForOneMore) {
  const std::string folder = world.files().path("book");
  world.writePage("book/index.html", "Book", "words");
  world.writePage("book/old.html", "Old", "ancient");
  ASSERT_EQ(publish(folder).code, ExitCode::success);
  const RNXCatalogueEntry first = catalogue().books.at(0);
  world.writePage("book/index.html", "Book", "other words");
  fs::remove(world.files().path("book/old.html"));
  ASSERT_EQ(publish(folder).code, ExitCode::success);
  const RNXCatalogueEntry second = catalogue().books.at(0);
  EXPECT_NE(first.version, second.version);
  EXPECT_NE(first.searchIndex->url, second.searchIndex->url);
  EXPECT_TRUE(fs::exists(fileOf(first.searchIndex->url)));
  EXPECT_TRUE(fs::exists(fileOf(second.searchIndex->url)));
  EXPECT_THAT(names("books/book/default/pages"), ElementsAre("index.html"));
  world.writePage("book/index.html", "Book", "still other words");
  ASSERT_EQ(publish(folder).code, ExitCode::success);
  EXPECT_FALSE(fs::exists(fileOf(first.searchIndex->url)));
  EXPECT_TRUE(fs::exists(fileOf(second.searchIndex->url)));
}

TEST_F(PublishTest, booksShareASite) {
  world.writePage("one/index.html", "One", "words");
  world.writePage("two/index.html", "Two", "words");
  const Outcome run = world.zeb({"publish", world.files().path("one"), world.files().path("two"),
                                 "--site", site(), "--book-id", "org.one", "--book-id", "org.two"});
  ASSERT_EQ(run.code, ExitCode::success) << run.err;
  ASSERT_EQ(catalogue().books.size(), 2U);
  const auto two = catalogue().books.at(1);
  world.writePage("one/index.html", "One", "other words");
  ASSERT_EQ(publish(world.files().path("one"), {"--book-id", "org.one"}).code, ExitCode::success);
  EXPECT_EQ(catalogue().books.at(1), two);
  EXPECT_TRUE(fs::exists(fileOf(two.searchIndex->url)));
}

TEST_F(PublishTest, eachLanguageIsAnEdition) {
  writeList("book/Info.plist", {{"ZEBBookIdentifier", "org.book"}, {"ZEBBookTitle", "Book"}});
  writeList("book/de.lproj/Info.plist", {{"ZEBBookTitle", "Buch"}});
  world.writePage("book/de.lproj/index.html", "Buch", "Drucker");
  world.writePage("book/en.lproj/index.html", "Book", "printer");
  ASSERT_EQ(publish(world.files().path("book")).code, ExitCode::success);
  const RNXCatalogue published = catalogue();
  ASSERT_EQ(published.books.size(), 2U);
  EXPECT_EQ(published.books[0].locale, "de");
  EXPECT_EQ(published.books[0].title, "Buch");
  EXPECT_EQ(published.books[1].locale, "en");
  EXPECT_EQ(published.books[1].title, "Book");
  // A language that is gone from the book goes from the site.
  fs::remove_all(world.files().path("book/de.lproj"));
  ASSERT_EQ(publish(world.files().path("book")).code, ExitCode::success);
  ASSERT_EQ(catalogue().books.size(), 1U);
  EXPECT_FALSE(fs::exists(site() + "/books/org.book/de"));
}

TEST_F(PublishTest, oddNamesMakeGoodURLs) {
  world.writePage("book/a b%20c.html", "Page", "words");
  const Outcome run = publish(world.files().path("book"), {"--book-id", "Büch er%41*2"});
  ASSERT_EQ(run.code, ExitCode::success) << run.err;
  const RNXCatalogueEntry book = catalogue().books.at(0);
  EXPECT_EQ(book.identifier, "Büch er%41*2");
  EXPECT_TRUE(fs::exists(fileOf(book.searchIndex->url))) << book.searchIndex->url.absoluteString();
  EXPECT_TRUE(fs::exists(fileOf(*book.pages) + "/a b%20c.html"));
}

TEST_F(PublishTest, whatCannotBePublishedLeavesTheSiteAsItWas) {
  world.writePage("book/index.html", "Book", "words");
  ASSERT_EQ(publish(world.files().path("book")).code, ExitCode::success);
  const auto before = snapshot();
  fs::create_directory(world.files().path("empty"));
  for (const char* folder : {"missing", "empty"}) {
    const Outcome run = publish(world.files().path(folder));
    EXPECT_EQ(run.code, ExitCode::failure);
    EXPECT_THAT(run.err, HasSubstr(folder));
  }
  writeList("remote/Info.plist", {{"ZEBBookIdentifier", "org.remote"}, {"ZEBBookType", 4}});
  EXPECT_THAT(publish(world.files().path("remote")).err, HasSubstr("its pages are not here"));
  EXPECT_EQ(publish(world.files().path("book"), {"--book-id", "a/b"}).code, ExitCode::failure);
  EXPECT_EQ(publish(world.files().path("book"), {"--book-id", "a", "--book-id", "b"}).code,
            ExitCode::usage);
  EXPECT_EQ(snapshot(), before);
}

TEST_F(PublishTest, aCatalogueThatCannotBeReadIsNotReplaced) {
  world.files().write("site/catalogue.json", "somebody's own");
  world.writePage("book/index.html", "Book", "words");
  const Outcome run = publish(world.files().path("book"));
  EXPECT_EQ(run.code, ExitCode::failure);
  EXPECT_THAT(run.err, HasSubstr("catalogue.json"));
  EXPECT_EQ(contents(site() + "/catalogue.json"), "somebody's own");
}

TEST_F(PublishTest, aListThatIsNoneIsAnError) {
  world.writePage("book/index.html", "Book", "words");
  writeList("book/Info.plist",
            {{"ZEBBookIdentifier", "org.book"}, {"ZEBBookExactMatchFile", "exactmatch.plist"}});
  world.files().write("book/exactmatch.plist", "no list");
  const Outcome run = publish(world.files().path("book"));
  EXPECT_EQ(run.code, ExitCode::failure);
  EXPECT_THAT(run.err, HasSubstr("is no exact-match list"));
  EXPECT_FALSE(fs::exists(site() + "/catalogue.json"));
}

}  // namespace
