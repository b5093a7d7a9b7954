#include <gmock/gmock.h>

#include <filesystem>
#include <nlohmann/json.hpp>
#include <string>
#include <vector>

#include "tests/zeb/World.h"

namespace {

using testing::ElementsAre;
using testing::HasSubstr;
using testing::IsEmpty;
using tests::Outcome;
using zeb::ExitCode;
using JSON = nlohmann::json;

/// A world with two small books, "garden" and "kitchen".
class SearchCommandTest : public testing::Test {
 protected:
  SearchCommandTest() {
    world.writePage("garden/roses.html", "Roses", "Cut roses in spring. Water them in summer.");
    world.writePage("garden/watering.html", "Watering", "Water the garden in the evening.");
    world.writePage("garden/lawn.html", "Lawn", "Mow the lawn once a week.");
    world.writePage("kitchen/boiling.html", "Boiling", "Put water into a pot. Wait.");
    world.writePage("kitchen/knives.html", "Knives", "Cut away from yourself. Caf\xC3\xA9.");
    EXPECT_EQ(
        world.zeb({"index", world.files().path("garden"), world.files().path("kitchen")}).code,
        ExitCode::success);
  }

  std::vector<std::string> titles(std::vector<std::string> arguments, ExitCode code) const {
    arguments.emplace_back("--json");
    const Outcome run = world.zeb(std::move(arguments));
    EXPECT_EQ(run.code, code) << run.err;
    std::vector<std::string> titles;
    const JSON json = JSON::parse(run.out);
    for (const JSON& result : json["results"]) {
      titles.push_back(result["title"]);
    }
    EXPECT_EQ(json["results"].size(), titles.size());
    return titles;
  }
  std::vector<std::string> search(const std::vector<std::string>& words) const {
    std::vector<std::string> arguments = {"search"};
    arguments.insert(arguments.end(), words.begin(), words.end());
    return titles(std::move(arguments), ExitCode::success);
  }
  std::vector<std::string> searchForNothing(const std::vector<std::string>& words) const {
    std::vector<std::string> arguments = {"search"};
    arguments.insert(arguments.end(), words.begin(), words.end());
    return titles(std::move(arguments), ExitCode::nothingFound);
  }

  tests::World world;
};

TEST_F(SearchCommandTest, FindsPagesOfAllBooks) {
  EXPECT_THAT(search({"water"}), testing::UnorderedElementsAre("Watering", "Roses", "Boiling"));
}

TEST_F(SearchCommandTest, TitleComesFirst) { EXPECT_EQ(search({"watering"}).front(), "Watering"); }

TEST_F(SearchCommandTest, HalfAWordIsEnough) {
  EXPECT_THAT(search({"kni"}), ElementsAre("Knives"));
  EXPECT_THAT(search({"ro", "spr"}).front(), "Roses");
}

TEST_F(SearchCommandTest, WordsInOneArgumentAreSeveralWords) {
  EXPECT_EQ(search({"cut spring"}), search({"cut", "spring"}));
  EXPECT_EQ(search({"cut spring"}).front(), "Roses");
}

TEST_F(SearchCommandTest, PagesWithAllWordsComeBeforePagesWithSome) {
  EXPECT_EQ(search({"cut", "roses", "summer"}).front(), "Roses");
}

TEST_F(SearchCommandTest, CaseAndAccentsMakeNoDifference) {
  EXPECT_THAT(search({"CAFE"}), ElementsAre("Knives"));
}

TEST_F(SearchCommandTest, OperatorsWork) {
  EXPECT_THAT(search({"water", "-pot"}), testing::UnorderedElementsAre("Watering", "Roses"));
  EXPECT_THAT(search({"\"cut roses\""}), ElementsAre("Roses"));
  EXPECT_THAT(search({"mow | pot"}), testing::UnorderedElementsAre("Lawn", "Boiling"));
}

TEST_F(SearchCommandTest, ResultHasTitleBookAbstractAndURL) {
  const Outcome run = world.zeb({"search", "mow"});
  EXPECT_EQ(run.code, ExitCode::success);
  EXPECT_EQ(run.out, "1. Lawn  garden\n   About Lawn.\n   file://" +
                         world.files().path("garden/lawn.html") + "\n");
  EXPECT_EQ(run.err, "");
}

TEST_F(SearchCommandTest, BookOptionNarrows) {
  EXPECT_THAT(search({"water", "--book", "kitchen"}), ElementsAre("Boiling"));
  EXPECT_THAT(search({"water", "--book", "kitchen", "--book", "garden"}),
              testing::UnorderedElementsAreArray(search({"water"})));
}

TEST_F(SearchCommandTest, UnknownBookFailsAndNamesIt) {
  const Outcome run = world.zeb({"search", "water", "--book", "cellar", "--json"});
  EXPECT_EQ(run.code, ExitCode::failure);
  EXPECT_EQ(run.err, "zeb: error: there is no book \"cellar\"; 'zeb books' lists all\n");
  EXPECT_EQ(run.out, "");
}

TEST_F(SearchCommandTest, LimitCutsAndCountTellsTheWhole) {
  const Outcome run = world.zeb({"search", "water", "--limit", "1", "--json"});
  const JSON json = JSON::parse(run.out);
  EXPECT_EQ(json["results"].size(), 1U);
  EXPECT_EQ(json["count"], 3U);
  EXPECT_EQ(json["results"][0]["title"], search({"water"}).front());
  EXPECT_THAT(world.zeb({"search", "water", "--limit", "1"}).out, HasSubstr("\n2 more pages\n"));
}

TEST_F(SearchCommandTest, RelevanceFallsFromTopToBottom) {
  const JSON json = JSON::parse(world.zeb({"search", "water", "cut", "--json"}).out);
  double last = std::numeric_limits<double>::infinity();
  for (const JSON& result : json["results"]) {
    EXPECT_LE(result["relevance"].get<double>(), last);
    EXPECT_GT(result["relevance"].get<double>(), 0);
    last = result["relevance"];
  }
  EXPECT_GT(json["results"].size(), 2U);
}

TEST_F(SearchCommandTest, SameSearchGivesTheSameBytes) {
  EXPECT_EQ(world.zeb({"search", "water", "--json"}).out,
            world.zeb({"search", "water", "--json"}).out);
}

TEST_F(SearchCommandTest, NothingFoundIsSaidOnTheSideAndByTheExitCode) {
  const Outcome run = world.zeb({"search", "zebra"});
  EXPECT_EQ(run.code, ExitCode::nothingFound);
  EXPECT_EQ(run.out, "");
  EXPECT_EQ(run.err, "zeb: nothing found for zebra\n");
  EXPECT_THAT(searchForNothing({"zebra"}), IsEmpty());
}

TEST_F(SearchCommandTest, WeirdWordsFindNothingQuietly) {
  for (const char* words :
       {"", " ", "...", "\"", "((((", "-", "!", "* * *", "\"\" | ()", "-water", "\xFF\xFE",
        "\xED\xA0\x80", "\xF0\x9F\xA6\x93", "[xq,zq]", "%q%z", "\033[2J"}) {
    const Outcome run = world.zeb({"search", "--json", "--", words});
    EXPECT_EQ(run.code, ExitCode::nothingFound) << words;
    EXPECT_THAT(JSON::parse(run.out)["results"], IsEmpty()) << words;
    EXPECT_EQ(run.err, "") << words;
  }
}

TEST_F(SearchCommandTest, VeryLongWordsAreJustWords) {
  EXPECT_THAT(searchForNothing({std::string(100'000, 'x')}), IsEmpty());
  std::string many;
  for (int i = 0; i < 5'000; ++i) {
    many += "water ";
  }
  EXPECT_EQ(search({many}), search({"water"}));
}

TEST_F(SearchCommandTest, BytesThatAreNoTextDoNotSpoilTheOthers) {
  EXPECT_THAT(search({"mow \xE9"}), testing::Contains("Lawn"));
}

TEST_F(SearchCommandTest, WithoutBooksItFailsAndSaysWhatToDo) {
  const tests::World empty;
  for (const std::vector<std::string>& line :
       {std::vector<std::string>{"search", "water"}, {"anchor", "x"}}) {
    const Outcome run = empty.zeb(line);
    EXPECT_EQ(run.code, ExitCode::failure);
    EXPECT_EQ(run.err, "zeb: error: no book has been indexed yet; 'zeb scan' looks for some\n");
    EXPECT_EQ(run.out, "");
  }
}

TEST_F(SearchCommandTest, BooksWithoutIndexAreIndexedFirstAndThatIsSaid) {
  std::filesystem::remove(world.indexPath("kitchen"));
  const Outcome run = world.zeb({"search", "water"});
  EXPECT_EQ(run.code, ExitCode::success);
  EXPECT_EQ(run.err, "zeb: 1 book is being indexed for the first time\n");
  EXPECT_THAT(run.out, HasSubstr("Watering"));
  EXPECT_THAT(run.out, HasSubstr("Boiling"));
  EXPECT_EQ(world.zeb({"search", "water"}).err, "");
}

TEST_F(SearchCommandTest, BooksThatAreNotSearchedAreNotWaitedFor) {
  std::filesystem::remove(world.indexPath("kitchen"));
  EXPECT_EQ(world.zeb({"search", "water", "--book", "garden"}).err, "");
}

TEST_F(SearchCommandTest, OnlyBooksThatAreSearchedAreWaitedFor) {
  std::filesystem::remove(world.indexPath("kitchen"));
  std::filesystem::remove(world.indexPath("garden"));
  EXPECT_EQ(world.zeb({"anchor", "anchor-Boiling", "--book", "kitchen"}).err,
            "zeb: 1 book is being indexed for the first time\n");
}

TEST_F(SearchCommandTest, ProgressIsShownWhileBooksAreIndexed) {
  std::filesystem::remove(world.indexPath("kitchen"));
  std::filesystem::remove(world.indexPath("garden"));
  const Outcome run =
      world.zeb({"search", "water"}, [](zeb::Console& console) { console.setErrIsTerminal(true); });
  EXPECT_THAT(run.err, HasSubstr("2 books are being indexed for the first time\n"));
  EXPECT_THAT(run.err, HasSubstr("0 of 2 books"));
  EXPECT_THAT(run.err, HasSubstr("2 of 2 books"));
  EXPECT_THAT(run.err, testing::EndsWith("\r\033[K"));
}

TEST_F(SearchCommandTest, WaitingIsGivenUpAfterTheLimit) {
  std::filesystem::remove(world.indexPath("kitchen"));
  const Outcome run = world.zeb({"search", "water", "--wait", "0"});
  EXPECT_EQ(run.code, ExitCode::success);
  EXPECT_EQ(run.err,
            "zeb: 1 book is being indexed for the first time\n"
            "zeb: gave up waiting after 0 seconds; 1 book is not indexed yet\n");
  EXPECT_THAT(run.out, HasSubstr("Watering"));
  EXPECT_EQ(world.zeb({"search", "boiling"}).code, ExitCode::success);
}

TEST_F(SearchCommandTest, BookThatCannotBeIndexedIsNamedAndTheOthersAreSearched) {
  std::filesystem::remove_all(world.files().path("kitchen"));
  std::filesystem::remove(world.indexPath("kitchen"));
  const Outcome run = world.zeb({"search", "water"});
  EXPECT_EQ(run.code, ExitCode::success);
  EXPECT_THAT(run.err, HasSubstr("zeb: warning: kitchen: it could not be indexed\n"));
  EXPECT_THAT(run.out, HasSubstr("Watering"));
}

TEST_F(SearchCommandTest, IndexCutOffAnywhereNeverHarmsTheOtherBooksAndIsMadeAgain) {
  const std::string index = world.indexPath("kitchen");
  const auto length = std::filesystem::file_size(index);
  for (auto size = length - 1; size > 0; size = size / 3) {
    std::filesystem::resize_file(index, size);
    const Outcome run = world.zeb({"search", "mow"});
    EXPECT_EQ(run.code, ExitCode::success) << size;
    EXPECT_THAT(run.out, HasSubstr("Lawn")) << size;
    const Outcome indexed = world.zeb({"index", world.files().path("kitchen")});
    EXPECT_EQ(indexed.code, ExitCode::success) << indexed.err;
    EXPECT_EQ(world.zeb({"search", "boiling"}).code, ExitCode::success) << size;
  }
}

TEST_F(SearchCommandTest, WithoutThePluginItFailsAndSaysWhy) {
  std::ostringstream out;
  std::ostringstream err;
  zeb::Console console(out, err);
  EXPECT_EQ(zeb::run({"search", "mow", "--cache-dir", world.cacheFolder()}, {}, console),
            ExitCode::failure);
  EXPECT_EQ(err.str(), "zeb: error: the plug-in cannot be used: its path is not absolute\n");
  EXPECT_EQ(out.str(), "");
}

TEST_F(SearchCommandTest, AnchorFindsItsPagesByTheExactName) {
  const Outcome run = world.zeb({"anchor", "anchor-Roses"});
  EXPECT_EQ(run.code, ExitCode::success);
  EXPECT_THAT(run.out, HasSubstr("1. Roses  garden\n"));
  EXPECT_EQ(world.zeb({"anchor", "anchor-roses"}).code, ExitCode::nothingFound);
  EXPECT_EQ(world.zeb({"anchor", "anchor-Ros"}).code, ExitCode::nothingFound);
  EXPECT_EQ(world.zeb({"anchor", "anchor-Roses", "--book", "kitchen"}).code,
            ExitCode::nothingFound);
  EXPECT_EQ(world.zeb({"anchor", "\xFF"}).code, ExitCode::nothingFound);
}

TEST_F(SearchCommandTest, AnchorAsJSONHasRelevanceOne) {
  const JSON json = JSON::parse(world.zeb({"anchor", "anchor-Lawn", "--json"}).out);
  EXPECT_EQ(json["query"], "anchor-Lawn");
  ASSERT_EQ(json["count"], 1);
  EXPECT_EQ(json["results"][0]["relevance"], 1.0);
  EXPECT_EQ(json["results"][0]["url"], "file://" + world.files().path("garden/lawn.html"));
}

TEST_F(SearchCommandTest, BooksListsThemAndTellsWhichHaveNoIndex) {
  EXPECT_EQ(world.zeb({"books"}).out, "garden     indexed  garden\nkitchen    indexed  kitchen\n");
  std::filesystem::remove(world.indexPath("kitchen"));
  EXPECT_THAT(world.zeb({"books"}).out, HasSubstr("kitchen    not indexed yet  kitchen\n"));
  const JSON json = JSON::parse(world.zeb({"books", "--json"}).out);
  EXPECT_EQ(json["count"], 2);
  EXPECT_EQ(json["books"][0]["indexed"], true);
  EXPECT_EQ(json["books"][1]["indexed"], false);
}

TEST_F(SearchCommandTest, BooksWithoutBooksFindsNothing) {
  const tests::World empty;
  EXPECT_EQ(empty.zeb({"books"}).code, ExitCode::nothingFound);
  EXPECT_EQ(JSON::parse(empty.zeb({"books", "--json"}).out),
            JSON::parse(R"({"count": 0, "books": []})"));
}

TEST_F(SearchCommandTest, ColoursOnATerminalAndOnRequest) {
  const auto terminal = [](zeb::Console& console) { console.setOutIsTerminal(true); };
  EXPECT_THAT(world.zeb({"search", "mow"}, terminal).out, HasSubstr("\033[1mLawn\033[0m"));
  EXPECT_THAT(world.zeb({"search", "mow", "--color=never"}, terminal).out, Not(HasSubstr("\033")));
  EXPECT_THAT(world.zeb({"search", "mow", "--color=always"}).out, HasSubstr("\033[1mLawn"));
  EXPECT_THAT(world.zeb({"search", "mow"}).out, Not(HasSubstr("\033")));
}

TEST_F(SearchCommandTest, LostOutputIsAFailure) {
  std::ostringstream err;
  std::ostream out(nullptr);
  zeb::Console console(out, err);
  EXPECT_EQ(zeb::run({"search", "mow", "--cache-dir", world.cacheFolder()}, tests::installation(),
                     console),
            ExitCode::failure);
  EXPECT_THAT(err.str(), HasSubstr("cannot write"));
}

}  // namespace
