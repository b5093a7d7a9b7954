#include "zeb/CommandLine.h"

#include <gmock/gmock.h>

#include <sstream>

#include "platform/Strings.h"

namespace {

using testing::ElementsAre;
using testing::HasSubstr;
using testing::IsEmpty;
using zeb::CommandLine;
using zeb::ExitCode;

class CommandLineTest : public testing::Test {
 protected:
  std::optional<CommandLine> parse(const std::vector<std::string>& arguments) {
    out.str("");
    err.str("");
    code = ExitCode::failure;
    return zeb::parseCommandLine(arguments, console, code);
  }

  template <typename Command>
  Command parsed(const std::vector<std::string>& arguments) {
    const std::optional<CommandLine> line = parse(arguments);
    EXPECT_TRUE(line.has_value()) << err.str();
    if (!line || !std::holds_alternative<Command>(line->command)) {
      ADD_FAILURE() << "another command";
      return {};
    }
    return std::get<Command>(line->command);
  }

  void expectUsageError(const std::vector<std::string>& arguments, const std::string& text) {
    EXPECT_FALSE(parse(arguments).has_value());
    EXPECT_EQ(code, ExitCode::usage);
    EXPECT_THAT(err.str(), HasSubstr("zeb: error: "));
    EXPECT_THAT(err.str(), HasSubstr(text));
    EXPECT_TRUE(platform::isValidUTF8(err.str()));
    EXPECT_EQ(out.str(), "");
  }

  std::ostringstream out;
  std::ostringstream err;
  zeb::Console console{out, err};
  ExitCode code = ExitCode::failure;
};

TEST_F(CommandLineTest, SearchTakesWordsBooksLimitAndJSONInAnyOrder) {
  const auto command = parsed<zeb::SearchCommand>(
      {"search", "--book", "a", "print", "--limit", "3", "queue", "--book=b", "--json", "now"});
  EXPECT_THAT(command.words, ElementsAre("print", "queue", "now"));
  EXPECT_THAT(command.books, ElementsAre("a", "b"));
  EXPECT_EQ(command.limit, 3U);
  EXPECT_TRUE(command.json);
}

TEST_F(CommandLineTest, SearchShowsTenPagesOfAllBooksByItself) {
  const auto command = parsed<zeb::SearchCommand>({"search", "print"});
  EXPECT_EQ(command.limit, 10U);
  EXPECT_THAT(command.books, IsEmpty());
  EXPECT_FALSE(command.json);
}

TEST_F(CommandLineTest, OneHyphenMakesAWordOfTheQueryLanguage) {
  const auto command =
      parsed<zeb::SearchCommand>({"search", "print", "-queue", "-o", "-h", "-", "+x", "!y"});
  EXPECT_THAT(command.words, ElementsAre("print", "-queue", "-o", "-h", "-", "+x", "!y"));
}

TEST_F(CommandLineTest, BehindTwoHyphensEverythingIsAWord) {
  const auto command = parsed<zeb::SearchCommand>({"search", "--json", "--", "--limit", "-x", "["});
  EXPECT_THAT(command.words, ElementsAre("--limit", "-x", "["));
  EXPECT_TRUE(command.json);
}

TEST_F(CommandLineTest, WordsInBracketsAreNoLists) {
  const auto command = parsed<zeb::SearchCommand>({"search", "[a,b]", "{}", "a,b", "%%"});
  EXPECT_THAT(command.words, ElementsAre("[a,b]", "{}", "a,b", "%%"));
}

TEST_F(CommandLineTest, BytesThatAreNoTextArriveAsTheyAre) {
  const auto command = parsed<zeb::SearchCommand>({"search", "caf\xE9", "\xFF-x", "\xFF"});
  EXPECT_THAT(command.words, ElementsAre("caf\xE9", "\xFF-x", "\xFF"));
}

TEST_F(CommandLineTest, WordsMayBeNamedLikeCommands) {
  const auto command = parsed<zeb::SearchCommand>({"search", "books", "index", "-o", "x"});
  EXPECT_THAT(command.words, ElementsAre("books", "index", "-o", "x"));
}

TEST_F(CommandLineTest, EmptyWordIsAWord) {
  EXPECT_THAT(parsed<zeb::SearchCommand>({"search", ""}).words, ElementsAre(""));
}

TEST_F(CommandLineTest, AnchorTakesOneName) {
  const auto command = parsed<zeb::AnchorCommand>({"anchor", "-odd [name]", "--book", "a"});
  EXPECT_EQ(command.name, "-odd [name]");
  EXPECT_THAT(command.books, ElementsAre("a"));
  expectUsageError({"anchor"}, "anchor: NAME is missing");
  expectUsageError({"anchor", "a", "b"}, "b");
}

TEST_F(CommandLineTest, SuggestAndSimilarTakeWords) {
  const auto suggest =
      parsed<zeb::SuggestCommand>({"suggest", "pri", "--limit", "3", "--book", "a", "--json"});
  EXPECT_EQ(suggest.kind, zeb::SuggestCommand::Kind::completions);
  EXPECT_THAT(suggest.words, ElementsAre("pri"));
  EXPECT_THAT(suggest.books, ElementsAre("a"));
  EXPECT_EQ(suggest.limit, 3U);
  EXPECT_TRUE(suggest.json);
  const auto similar = parsed<zeb::SuggestCommand>({"similar", "-print", "page"});
  EXPECT_EQ(similar.kind, zeb::SuggestCommand::Kind::similar);
  EXPECT_THAT(similar.words, ElementsAre("-print", "page"));
}

TEST_F(CommandLineTest, SearchMayHaveNoWordsAndMayAskForActions) {
  EXPECT_THAT(parsed<zeb::SearchCommand>({"search"}).words, IsEmpty());
  EXPECT_FALSE(parsed<zeb::SearchCommand>({"search", "a"}).actions);
  EXPECT_TRUE(parsed<zeb::SearchCommand>({"search", "a", "--actions"}).actions);
}

TEST_F(CommandLineTest, ModelsTakesNothingButJSON) {
  EXPECT_TRUE(parsed<zeb::ModelsCommand>({"models", "--json"}).json);
  expectUsageError({"models", "a"}, "a");
}

TEST_F(CommandLineTest, BooksTakesNothingButJSON) {
  EXPECT_TRUE(parsed<zeb::BooksCommand>({"books", "--json"}).json);
  expectUsageError({"books", "a"}, "a");
}

TEST_F(CommandLineTest, StatusTakesNothingButJSON) {
  EXPECT_TRUE(parsed<zeb::StatusCommand>({"status", "--json"}).json);
  expectUsageError({"status", "a"}, "a");
}

TEST_F(CommandLineTest, WatchTakesWordsBooksAndAnEnd) {
  const auto command =
      parsed<zeb::WatchCommand>({"watch", "a", "-b", "--book", "c", "--once", "--json"});
  EXPECT_THAT(command.words, ElementsAre("a", "-b"));
  EXPECT_THAT(command.books, ElementsAre("c"));
  EXPECT_TRUE(command.once);
  EXPECT_TRUE(command.json);
  EXPECT_FALSE(parsed<zeb::WatchCommand>({"watch", "a"}).once);
  EXPECT_EQ(parse({"watch"}), std::nullopt);
}

TEST_F(CommandLineTest, IndexTakesFoldersAndIdentifiers) {
  const auto command =
      parsed<zeb::IndexCommand>({"index", "one", "two", "--book-id", "a", "--book-id", "b"});
  EXPECT_THAT(command.folders, ElementsAre("one", "two"));
  EXPECT_THAT(command.bookIDs, ElementsAre("a", "b"));
  expectUsageError({"index", "--book-id", "a"}, "index: FOLDER... is missing");
}

TEST_F(CommandLineTest, CommandsWaitUnlessToldOtherwise) {
  EXPECT_TRUE(parse({"search", "a"})->waiting.waits);
  EXPECT_EQ(parse({"search", "a"})->waiting.limit, 300);
  EXPECT_FALSE(parse({"search", "a", "--no-wait"})->waiting.waits);
  EXPECT_EQ(parse({"--wait", "2.5", "scan"})->waiting.limit, 2.5);
  expectUsageError({"search", "a", "--wait", "-1"}, "wait");
  expectUsageError({"search", "a", "--wait", "soon"}, "wait");
  expectUsageError({"search", "a", "--wait", "nan"}, "wait");
}

TEST_F(CommandLineTest, ScanTakesFoldersRootLanguagesAndForce) {
  const auto command =
      parsed<zeb::ScanCommand>({"scan", "one", "--root", "/mnt", "--language", "de", "--language",
                                "fr", "--force", "--no-system"});
  EXPECT_THAT(command.folders, ElementsAre("one"));
  EXPECT_EQ(command.root, "/mnt");
  EXPECT_THAT(command.languages, ElementsAre("de", "fr"));
  EXPECT_TRUE(command.evenIfUnchanged);
  EXPECT_FALSE(command.installedBooks);
  EXPECT_TRUE(parsed<zeb::ScanCommand>({"scan"}).installedBooks);
}

TEST_F(CommandLineTest, AddTakesAnAddressBooksAndLanguages) {
  const auto command = parsed<zeb::AddCommand>(
      {"add", "https://a.example/", "--book", "a", "--book", "b", "--language", "de"});
  EXPECT_EQ(command.url, "https://a.example/");
  EXPECT_THAT(command.books, ElementsAre("a", "b"));
  EXPECT_THAT(command.languages, ElementsAre("de"));
  EXPECT_EQ(parse({"add"}), std::nullopt);
}

TEST_F(CommandLineTest, RemoveTakesBooksAndAddresses) {
  EXPECT_THAT(parsed<zeb::RemoveCommand>({"remove", "a", "https://a.example/", "-b"}).names,
              ElementsAre("a", "https://a.example/", "-b"));
  EXPECT_EQ(parse({"remove"}), std::nullopt);
}

TEST_F(CommandLineTest, PublishTakesFoldersASiteIdentifiersAndALanguage) {
  const auto command =
      parsed<zeb::PublishCommand>({"publish", "one", "two", "--site", "www", "--book-id", "a",
                                   "--book-id", "b", "--language", "de"});
  EXPECT_THAT(command.folders, ElementsAre("one", "two"));
  EXPECT_EQ(command.site, "www");
  EXPECT_THAT(command.bookIDs, ElementsAre("a", "b"));
  EXPECT_EQ(command.language, "de");
  EXPECT_EQ(parse({"publish", "one"}), std::nullopt);
  EXPECT_EQ(parse({"publish", "--site", "www"}), std::nullopt);
}

TEST_F(CommandLineTest, CommonOptionsStandAnywhere) {
  const auto before = parse({"--color", "never", "--cache-dir", "/c", "--verbose", "books"});
  const auto after = parse({"books", "--color=never", "--cache-dir=/c", "--verbose"});
  for (const auto& line : {before, after}) {
    ASSERT_TRUE(line.has_value()) << err.str();
    EXPECT_EQ(line->color, zeb::ColorMode::never);
    EXPECT_EQ(line->cacheFolder, "/c");
    EXPECT_EQ(line->verbosity, 1);
  }
}

TEST_F(CommandLineTest, ColorKnowsThreeWords) {
  EXPECT_EQ(parse({"books", "--color=auto"})->color, zeb::ColorMode::automatic);
  EXPECT_EQ(parse({"books", "--color=always"})->color, zeb::ColorMode::always);
  expectUsageError({"books", "--color=blue"}, "--color");
}

TEST_F(CommandLineTest, WrongLinesAreUsageErrors) {
  expectUsageError({}, "a command is missing");
  expectUsageError({"publish", "a"}, "publish: --site DIR is missing");
  expectUsageError({"--color", "never", "serach", "a"}, "there is no command \"serach\"");
  expectUsageError({"search", "a", "--limit", "10001"}, "not in range 1 to 10000");
  expectUsageError({"sing"}, "sing");
  expectUsageError({"suggest"}, "suggest: WORDS... is missing");
  expectUsageError({"similar"}, "similar: WORDS... is missing");
  expectUsageError({"search", "a", "--limt", "3"}, "--limt");
  expectUsageError({"search", "a", "--limit", "0"}, "--limit");
  expectUsageError({"search", "a", "--limit", "-3"}, "--limit");
  expectUsageError({"search", "a", "--limit", "many"}, "--limit");
  expectUsageError({"search", "a", "--limit"}, "--limit");
  expectUsageError({"search", "a", "--book"}, "--book");
  expectUsageError({"--color", "books"}, "--color");
  expectUsageError({"-q", "search", "print"}, "-q");
}

TEST_F(CommandLineTest, HelpAndVersionGoToTheOutputAndSucceed) {
  EXPECT_FALSE(parse({"--help"}).has_value());
  EXPECT_EQ(code, ExitCode::success);
  for (const char* command :
       {"search", "anchor", "books", "index", "scan", "add", "remove", "publish"}) {
    EXPECT_THAT(out.str(), HasSubstr(command));
  }
  EXPECT_FALSE(parse({"search", "--help"}).has_value());
  EXPECT_THAT(out.str(), HasSubstr("--limit"));
  EXPECT_EQ(code, ExitCode::success);
  EXPECT_FALSE(parse({"--version"}).has_value());
  EXPECT_THAT(out.str(), testing::MatchesRegex("zeb [0-9.]+\n"));
  EXPECT_EQ(err.str(), "");
}

}  // namespace
