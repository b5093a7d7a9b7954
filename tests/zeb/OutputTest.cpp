#include "zeb/Output.h"

#include <gtest/gtest.h>

#include <nlohmann/json.hpp>
#include <sstream>

namespace {

using zeb::Answer;
using zeb::FoundPage;

FoundPage page(const std::string& title) {
  FoundPage page;
  page.title = title;
  page.bookID = "org.example.book";
  page.bookTitle = "Book";
  page.abstract = "About " + title + ".";
  page.url = "file:///book/" + title + ".html";
  page.relevance = 0.5;
  return page;
}

class OutputTest : public testing::Test {
 protected:
  std::ostringstream out;
  std::ostringstream err;
  zeb::Console console{out, err};
};

TEST_F(OutputTest, PlainPagesAreNumberedAndIndented) {
  zeb::printAnswer({{page("One"), page("Two")}, 2}, console);
  EXPECT_EQ(out.str(),
            "1. One  Book\n"
            "   About One.\n"
            "   file:///book/One.html\n"
            "\n"
            "2. Two  Book\n"
            "   About Two.\n"
            "   file:///book/Two.html\n");
}

TEST_F(OutputTest, ColouredPagesSayTheSame) {
  console.setColorMode(zeb::ColorMode::always);
  zeb::printAnswer({{page("One")}, 1}, console);
  EXPECT_EQ(out.str(),
            "1. \033[1mOne\033[0m  \033[36mBook\033[0m\n"
            "   About One.\n"
            "   \033[34mfile:///book/One.html\033[0m\n");
}

TEST_F(OutputTest, LinesBelowTheTitleFollowTheWidthOfTheNumbers) {
  Answer answer;
  for (int i = 0; i < 10; ++i) {
    answer.pages.push_back(page("P"));
  }
  answer.count = 10;
  zeb::printAnswer(answer, console);
  EXPECT_TRUE(out.str().starts_with(" 1. P  Book\n    About P.\n")) << out.str();
  EXPECT_NE(out.str().find("\n10. P  Book\n    About P.\n"), std::string::npos);
}

TEST_F(OutputTest, PagesBeyondTheLimitAreCounted) {
  zeb::printAnswer({{page("One")}, 2}, console);
  EXPECT_TRUE(out.str().ends_with("\n1 more page\n")) << out.str();
  out.str("");
  zeb::printAnswer({{page("One")}, 12}, console);
  EXPECT_TRUE(out.str().ends_with("\n11 more pages\n")) << out.str();
}

TEST_F(OutputTest, PageWithoutAbstractHasNoLineForIt) {
  FoundPage bare = page("One");
  bare.abstract = std::nullopt;
  FoundPage empty = page("Two");
  empty.abstract = "";
  zeb::printAnswer({{bare, empty}, 2}, console);
  EXPECT_EQ(out.str(),
            "1. One  Book\n   file:///book/One.html\n\n2. Two  Book\n   file:///book/Two.html\n");
}

TEST_F(OutputTest, NoPagesNoOutput) {
  zeb::printAnswer({}, console);
  EXPECT_EQ(out.str(), "");
}

TEST_F(OutputTest, BooksCannotPlayWithTheTerminal) {
  FoundPage odd = page("One\n2. Forged");
  odd.bookTitle = "Book\033[2J";
  odd.abstract = "Two\r\nlines\a.";
  zeb::printAnswer({{odd}, 1}, console);
  EXPECT_TRUE(out.str().starts_with("1. One 2. Forged  Book [2J\n   Two lines .\n")) << out.str();
}

TEST_F(OutputTest, JSONHasEverything) {
  zeb::printAnswerAsJSON("words \"quoted\"", {{page("One")}, 12}, console);
  const auto json = nlohmann::json::parse(out.str());
  EXPECT_EQ(json, nlohmann::json::parse(R"({
    "query": "words \"quoted\"",
    "count": 12,
    "results": [{
      "title": "One",
      "book": "org.example.book",
      "bookTitle": "Book",
      "abstract": "About One.",
      "url": "file:///book/One.html",
      "relevance": 0.5
    }]
  })"));
}

TEST_F(OutputTest, JSONIsOneObjectEvenWithoutPages) {
  zeb::printAnswerAsJSON("x", {}, console);
  EXPECT_EQ(nlohmann::json::parse(out.str()),
            nlohmann::json::parse(R"({"query": "x", "count": 0, "results": []})"));
}

TEST_F(OutputTest, JSONLeavesOutAnAbstractThatIsNotThere) {
  FoundPage bare = page("One");
  bare.abstract = std::nullopt;
  zeb::printAnswerAsJSON("x", {{bare}, 1}, console);
  EXPECT_FALSE(nlohmann::json::parse(out.str())["results"][0].contains("abstract"));
}

TEST_F(OutputTest, JSONIsNeverColoured) {
  console.setColorMode(zeb::ColorMode::always);
  zeb::printAnswerAsJSON("x", {{page("One")}, 1}, console);
  EXPECT_EQ(out.str().find('\033'), std::string::npos);
}

TEST_F(OutputTest, JSONRepairsTextAndKeepsControlCharactersEscaped) {
  FoundPage odd = page("One");
  odd.title = "caf\xE9\033";
  zeb::printAnswerAsJSON("\xFF", {{odd}, 1}, console);
  const auto json = nlohmann::json::parse(out.str());
  EXPECT_EQ(json["query"], "\xEF\xBF\xBD");
  EXPECT_EQ(json["results"][0]["title"], "caf\xEF\xBF\xBD\033");
}

TEST_F(OutputTest, BooksAreListedInColumns) {
  zeb::ListedBook one;
  one.entry.bookID = "a";
  one.entry.title = "First";
  one.entry.language = "pt_BR";
  one.indexPath = "/a.helpindex";
  zeb::ListedBook two;
  two.entry.bookID = "longer";
  two.entry.title = "Second";
  zeb::printBooks({one, two}, console);
  EXPECT_EQ(out.str(),
            "a       pt_BR  indexed          First\n"
            "longer         not indexed yet  Second\n");
}

TEST_F(OutputTest, BooksAsJSONHaveEverything) {
  zeb::ListedBook book;
  book.entry.bookID = "a";
  book.entry.title = "First";
  book.entry.type = 4;
  book.entry.language = "de";
  book.entry.folder = "/a";
  book.indexPath = "/a.helpindex";
  zeb::printBooksAsJSON({book}, console);
  EXPECT_EQ(nlohmann::json::parse(out.str()), nlohmann::json::parse(R"({
    "count": 1,
    "books": [{"id": "a", "title": "First", "type": 4, "language": "de", "folder": "/a",
               "index": "/a.helpindex", "indexed": true}]
  })"));
}

}  // namespace
