// What the books that come with the system promise.
#include <gmock/gmock.h>
#include <libxml/HTMLparser.h>
#include <libxml/xpath.h>

#include <algorithm>
#include <filesystem>
#include <map>
#include <memory>
#include <regex>
#include <set>
#include <string>
#include <vector>

#include "host/Zebrine/ZEBConstants.h"
#include "host/Zebrine/ZEBHelpBook.h"
#include "platform/PropertyList.h"
#include "platform/Strings.h"
#include "tests/zeb/World.h"

namespace {

using platform::Value;
using testing::Not;

/// A page as a web browser reads it.
class HTMLPage {
 public:
  explicit HTMLPage(const std::string& path)
      : _document(htmlReadFile(path.c_str(), nullptr, HTML_PARSE_NONET | HTML_PARSE_NOERROR),
                  xmlFreeDoc) {}

  /// The text of every node that an XPath expression selects.
  std::vector<std::string> texts(const char* expression) const {
    const std::unique_ptr<xmlXPathContext, decltype(&xmlXPathFreeContext)> context(
        xmlXPathNewContext(_document.get()), xmlXPathFreeContext);
    const std::unique_ptr<xmlXPathObject, decltype(&xmlXPathFreeObject)> found(
        xmlXPathEvalExpression(reinterpret_cast<const xmlChar*>(expression), context.get()),
        xmlXPathFreeObject);
    std::vector<std::string> texts;
    for (int i = 0; found && found->nodesetval && i < found->nodesetval->nodeNr; ++i) {
      const std::unique_ptr<xmlChar, decltype(xmlFree)> text(
          xmlNodeGetContent(found->nodesetval->nodeTab[i]), xmlFree);
      texts.emplace_back(reinterpret_cast<const char*>(text.get()));
    }
    return texts;
  }

 private:
  std::unique_ptr<xmlDoc, decltype(&xmlFreeDoc)> _document;
};

class ShippedBooksTest : public testing::TestWithParam<std::string> {
 protected:
  ShippedBooksTest() {
    for (const auto& file : std::filesystem::directory_iterator(folder)) {
      if (file.path().extension() == ".html") {
        pages.emplace(file.path().filename().string(), HTMLPage(file.path().string()));
      }
    }
  }

  std::set<std::string> anchors() const {
    std::set<std::string> names;
    for (const auto& [name, page] : pages) {
      const auto ids = page.texts("//@id");
      names.insert(ids.begin(), ids.end());
    }
    return names;
  }

  const std::string folder = tests::shippedBook(GetParam());
  std::map<std::string, HTMLPage> pages;
};

TEST_P(ShippedBooksTest, IsABookThatOpensWithItsAccessPage) {
  const auto book = ZEBHelpBook::initWithPath(folder);
  ASSERT_NE(book, nullptr);
  EXPECT_EQ(book->type(), ZEBHelpBookType1);
  EXPECT_EQ(book->accessPagePath(), folder + "/index.html");
  EXPECT_FALSE(book->title().empty());
  EXPECT_NE(book->title(), book->bookID());
}

TEST_P(ShippedBooksTest, EveryPageHasATitleOfItsOwnAndSaysItAgainAsItsHeading) {
  std::set<std::string> titles;
  for (const auto& [name, page] : pages) {
    const auto title = page.texts("/html/head/title");
    ASSERT_EQ(title.size(), 1U) << name;
    EXPECT_FALSE(title[0].empty()) << name;
    EXPECT_TRUE(titles.insert(title[0]).second) << name;
    EXPECT_EQ(page.texts("/html/body/h1"), title) << name;
  }
}

TEST_P(ShippedBooksTest, EveryPageHasADescriptionOfUsefulLengthAndKeyWords) {
  for (const auto& [name, page] : pages) {
    const auto description = page.texts("/html/head/meta[@name='description']/@content");
    ASSERT_EQ(description.size(), 1U) << name;
    EXPECT_GE(description[0].size(), 40U) << name;
    EXPECT_LE(description[0].size(), 200U) << name;
    EXPECT_EQ(page.texts("/html/head/meta[@name='keywords']/@content").size(), 1U) << name;
  }
}

TEST_P(ShippedBooksTest, EveryHeadingCanBeAddressed) {
  for (const auto& [name, page] : pages) {
    EXPECT_EQ(page.texts("//h1[not(@id)] | //h2[not(@id)] | //h3[not(@id)]"),
              std::vector<std::string>())
        << name;
  }
}

TEST_P(ShippedBooksTest, NoAnchorIsOnTwoPages) {
  std::map<std::string, std::string> pageOfAnchor;
  for (const auto& [name, page] : pages) {
    for (const std::string& id : page.texts("//@id")) {
      const auto [where, isNew] = pageOfAnchor.emplace(id, name);
      EXPECT_TRUE(isNew) << id << " is on " << where->second << " and on " << name;
    }
  }
}

TEST_P(ShippedBooksTest, EveryLinkLeadsSomewhere) {
  size_t count = 0;
  for (const auto& [name, page] : pages) {
    for (const std::string& link : page.texts("//@href | //@src")) {
      ASSERT_THAT(link, Not(testing::HasSubstr("//"))) << name;
      const std::string target = link.substr(0, link.find('#'));
      EXPECT_TRUE(target.empty() || std::filesystem::is_regular_file(folder + "/" + target))
          << name << " links to " << link;
      if (link.find('#') != std::string::npos) {
        const auto found = pages.find(target.empty() ? name : target);
        ASSERT_NE(found, pages.end()) << link;
        EXPECT_THAT(found->second.texts("//@id"),
                    testing::Contains(link.substr(link.find('#') + 1)))
            << name << " links to " << link;
      }
      ++count;
    }
  }
  EXPECT_GT(count, pages.size());
}

TEST_P(ShippedBooksTest, EveryPageCanBeReachedFromTheAccessPage) {
  std::set<std::string> reached = {"index.html"};
  std::vector<std::string> open = {"index.html"};
  while (!open.empty()) {
    const HTMLPage& page = pages.at(open.back());
    open.pop_back();
    for (const std::string& link : page.texts("//a/@href")) {
      const std::string target = link.substr(0, link.find('#'));
      if (pages.contains(target) && reached.insert(target).second) {
        open.push_back(target);
      }
    }
  }
  EXPECT_EQ(reached.size(), pages.size());
}

TEST_P(ShippedBooksTest, ExactMatchListLeadsToAnchorsAndHasOnlyKeysThatCanBeFound) {
  const auto path = ZEBHelpBook::initWithPath(folder)->exactMatchPath();
  ASSERT_TRUE(path.has_value());
  const Value list = platform::dictionaryWithContentsOfFile(*path).value();
  const std::set<std::string> known = anchors();
  EXPECT_GE(list.dictionaryIf()->size(), 5U);
  for (const auto& [query, anchor] : *list.dictionaryIf()) {
    EXPECT_EQ(platform::lowercaseString(platform::stringByRemovingWhitespace(query)), query);
    EXPECT_TRUE(known.contains(anchor.stringValue().value())) << query;
  }
}

TEST_P(ShippedBooksTest, SuggestionsLeadToAnchors) {
  const auto path = ZEBHelpBook::initWithPath(folder)->suggestionsPath();
  ASSERT_TRUE(path.has_value());
  const Value list = platform::dictionaryWithContentsOfFile(*path).value();
  const std::set<std::string> known = anchors();
  EXPECT_GE(list.dictionaryIf()->size(), 3U);
  for (const auto& [key, texts] : *list.dictionaryIf()) {
    EXPECT_EQ(platform::lowercaseString(key), key);
    ASSERT_NE(texts.dictionaryIf(), nullptr) << key;
    EXPECT_FALSE(texts.dictionaryIf()->empty()) << key;
    for (const auto& [text, anchor] : *texts.dictionaryIf()) {
      EXPECT_TRUE(anchor.stringValue() == "" || known.contains(anchor.stringValue().value()))
          << text;
    }
  }
}

INSTANTIATE_TEST_SUITE_P(Books, ShippedBooksTest, testing::Values("manual", "offline"),
                         [](const auto& book) { return book.param; });

TEST(Manual, IsTheSystemsOwnBook) {
  EXPECT_EQ(ZEBHelpBook::initWithPath(tests::shippedBook("manual"))->bookID(), KROrvHelpbookID);
}

TEST(Manual, HasAPageForEachSubject) {
  for (const char* page : {"searching", "books", "indexing-tool", "remote-books", "troubleshooting",
                           "command-line", "glossary"}) {
    EXPECT_TRUE(std::filesystem::exists(tests::shippedBook("manual") + "/" + page + ".html"))
        << page;
  }
}

TEST(OfflineBook, IsTheBookForBeingOfflineWithItsTopic) {
  EXPECT_EQ(ZEBHelpBook::initWithPath(tests::shippedBook("offline"))->bookID(),
            KROfflineHelpbookID);
  EXPECT_THAT(HTMLPage(tests::shippedBook("offline") + "/not-connected.html").texts("//h1/@id"),
              testing::ElementsAre(KROfflineHelpTopicNotConnected));
}

std::set<std::string> optionsIn(const std::string& text) {
  std::set<std::string> options;
  const std::regex option("--[A-Za-z][A-Za-z-]*");
  for (std::sregex_iterator found(text.begin(), text.end(), option), end; found != end; ++found) {
    options.insert(found->str());
  }
  return options;
}

TEST(Manual, ReferenceNamesEveryOptionAndNoOther) {
  const tests::World world;
  std::string help = world.zeb({"--help"}).out;
  for (const char* command : {"search", "anchor", "books", "index", "scan", "add", "remove",
                              "publish", "doctor", "status", "watch"}) {
    help += world.zeb({command, "--help"}).out;
  }
  std::set<std::string> offered = optionsIn(help);
  offered.erase("--output");
  std::string reference;
  for (const std::string& text :
       HTMLPage(tests::shippedBook("manual") + "/command-line.html").texts("//code | //pre")) {
    reference += text + " ";
  }
  EXPECT_EQ(optionsIn(reference), offered);
}

}  // namespace
