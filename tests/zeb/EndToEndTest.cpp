// The shipped books, indexed by the tool's own code and searched as a user would.
#include <gmock/gmock.h>

#include <nlohmann/json.hpp>
#include <string>
#include <vector>

#include "host/Zebrine/ZEBConstants.h"
#include "host/Zebrine/ZEBHelpBook.h"
#include "platform/PropertyList.h"
#include "platform/Value.h"
#include "tests/zeb/World.h"

namespace {

using testing::Contains;
using testing::HasSubstr;
using tests::Outcome;
using zeb::ExitCode;
using JSON = nlohmann::json;

class EndToEndTest : public testing::Test {
 protected:
  static void SetUpTestSuite() {
    world = new tests::World;
    const Outcome run = world->zeb(
        {"scan", "--no-system", tests::shippedBook("manual"), tests::shippedBook("offline")});
    ASSERT_EQ(run.code, ExitCode::success) << run.err;
    ASSERT_EQ(run.err, "");
  }
  static void TearDownTestSuite() {
    delete world;
    world = nullptr;
  }

  /// The names of the files found, best first.
  static std::vector<std::string> pages(const std::vector<std::string>& arguments) {
    std::vector<std::string> line = arguments;
    line.emplace_back("--json");
    std::vector<std::string> names;
    const JSON json = JSON::parse(world->zeb(line).out);
    for (const JSON& result : json["results"]) {
      const std::string url = result["url"];
      names.push_back(url.substr(url.rfind('/') + 1));
    }
    return names;
  }
  static std::string best(const std::string& words) {
    const auto found = pages({"search", words});
    return found.empty() ? "" : found.front();
  }

  static tests::World* world;
};

tests::World* EndToEndTest::world = nullptr;

TEST_F(EndToEndTest, WholeWordsFindThePageThatIsAboutThem) {
  EXPECT_EQ(best("half words"), "searching.html");
  EXPECT_EQ(best("operators phrases"), "operators.html");
  EXPECT_EQ(best("glossary"), "glossary.html");
  EXPECT_EQ(best("make a help book"), "make-a-book.html");
  EXPECT_EQ(best("indexing tool"), "indexing-tool.html");
  EXPECT_EQ(best("exit codes"), "command-line.html");
  EXPECT_EQ(pages({"search", "computer is not connected", "--book", KROfflineHelpbookID}).front(),
            "not-connected.html");
}

TEST_F(EndToEndTest, HalfWordsFindTheSamePages) {
  EXPECT_EQ(best("opera phra"), "operators.html");
  EXPECT_EQ(best("glos"), "glossary.html");
  EXPECT_EQ(best("trouble"), best("troubleshooting"));
  EXPECT_EQ(pages({"search", "comp conn", "--book", KROfflineHelpbookID}).front(),
            "not-connected.html");
}

TEST_F(EndToEndTest, KeyWordsThatAreNotInTheTextAreFound) {
  EXPECT_EQ(best("boolean"), "operators.html");
  EXPECT_EQ(best("uninstall"), "files-and-privacy.html");
}

TEST_F(EndToEndTest, PhraseFindsFewerPagesThanItsWords) {
  const auto phrase = pages({"search", "\"half words\"", "--limit", "100"});
  const auto words = pages({"search", "half words", "--limit", "100"});
  EXPECT_THAT(phrase, Contains("searching.html"));
  EXPECT_LT(phrase.size(), words.size());
}

TEST_F(EndToEndTest, NavigationIsNotSearched) {
  // Every page names its neighbours there; only in the contents are these words text.
  const auto found = pages({"search", "\"Books whose pages live on a server\"", "--limit", "100"});
  EXPECT_THAT(found,
              testing::UnorderedElementsAre("remote-books.html", "index.html", "glossary.html"));
}

TEST_F(EndToEndTest, EveryResultIsAPageThatExistsWithTitleBookAndAbstract) {
  const JSON json = JSON::parse(world->zeb({"search", "book", "--limit", "100", "--json"}).out);
  EXPECT_GT(json["results"].size(), 10U);
  for (const JSON& result : json["results"]) {
    EXPECT_FALSE(result["title"].get<std::string>().empty());
    EXPECT_FALSE(result["abstract"].get<std::string>().empty());
    EXPECT_THAT(result["bookTitle"].get<std::string>(),
                testing::AnyOf("Help Search Manual", "Working Without a Connection"));
    const std::string url = result["url"];
    ASSERT_TRUE(url.starts_with("file:///")) << url;
    EXPECT_TRUE(std::filesystem::is_regular_file(url.substr(7))) << url;
  }
}

TEST_F(EndToEndTest, AnchorLeadsToItsPage) {
  EXPECT_THAT(pages({"anchor", "half-words"}), testing::ElementsAre("searching.html"));
  EXPECT_THAT(pages({"anchor", KROfflineHelpTopicNotConnected}),
              testing::ElementsAre("not-connected.html"));
  EXPECT_THAT(pages({"anchor", KROfflineHelpTopicNotConnected, "--book", KROfflineHelpbookID}),
              testing::ElementsAre("not-connected.html"));
}

TEST_F(EndToEndTest, EveryAnchorOfTheListsIsInTheIndexOnce) {
  for (const char* name : {"manual", "offline"}) {
    const auto book = ZEBHelpBook::initWithPath(tests::shippedBook(name));
    const auto list = platform::dictionaryWithContentsOfFile(book->exactMatchPath().value());
    for (const auto& [query, anchor] : *list->dictionaryIf()) {
      EXPECT_EQ(pages({"anchor", anchor.stringValue().value(), "--book", book->bookID()}).size(),
                1U)
          << query;
    }
  }
}

TEST_F(EndToEndTest, BooksHaveTheirTitles) {
  const Outcome run = world->zeb({"books"});
  EXPECT_THAT(run.out, HasSubstr("org.zeb.manual"));
  EXPECT_THAT(run.out, HasSubstr("Help Search Manual"));
  EXPECT_THAT(run.out, HasSubstr("Working Without a Connection"));
}

TEST_F(EndToEndTest, SecondScanHasNothingToDo) {
  EXPECT_EQ(world->zeb({"scan", "--no-system"}).out,
            "0 indexed, 2 unchanged, 0 forgotten, 0 failed\n");
}

}  // namespace
