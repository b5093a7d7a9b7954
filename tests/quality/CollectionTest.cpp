#include "bench/quality/Collection.h"

#include <gtest/gtest.h>

#include <filesystem>
#include <fstream>
#include <iterator>
#include <stdexcept>
#include <string>

#include "tests/platform/TemporaryFolder.h"

using quality::Collection;

namespace {

namespace fs = std::filesystem;

class CollectionTest : public testing::Test {
 protected:
  void write(const std::string& name, const std::string& text) const { _folder.write(name, text); }
  std::string read(const std::string& name) const {
    std::ifstream stream(_folder.path(name));
    return {std::istreambuf_iterator<char>(stream), {}};
  }

  const tests::TemporaryFolder _folder;
};

TEST_F(CollectionTest, documentsQueriesAndJudgementsAreRead) {
  write("docs.tsv", "a\tFirst\tone two\nb\t\tthree\n");
  write("queries.tsv", "1\tone\n2\tunanswered\n");
  write("qrels.tsv", "1\ta\t2\n1\tb\t0\n1\tgone\t1\n");
  const Collection collection = quality::readCollection(_folder.path());
  EXPECT_EQ(collection.name, fs::path(_folder.path()).filename().string());
  EXPECT_EQ(collection.language, "en");
  ASSERT_EQ(collection.documents.size(), 2U);
  EXPECT_EQ(collection.documents[0].title, "First");
  EXPECT_EQ(collection.documents[0].text(), "one two");
  EXPECT_EQ(collection.documents[1].title, "");
  ASSERT_EQ(collection.queries.size(), 1U);
  EXPECT_EQ(collection.queries[0].text, "one");
  EXPECT_EQ(collection.answers.at("1"), (std::map<size_t, int>{{0, 2}}));
}

TEST_F(CollectionTest, aFileThatIsMissingIsAnError) {
  write("docs.tsv", "a\tFirst\tone\n");
  EXPECT_THROW(quality::readCollection(_folder.path()), std::runtime_error);
}

TEST_F(CollectionTest, whatIsWrittenIsReadBack) {
  Collection collection;
  collection.language = "de";
  collection.origin = "package 1.0";
  collection.documents = {{"x", "Title", {"one", "two\tthree"}}};
  collection.queries = {{"q", "what?"}};
  collection.answers["q"][0] = 1;
  quality::writeCollection(collection, _folder.path());
  const Collection again = quality::readCollection(_folder.path());
  EXPECT_EQ(again.language, "de");
  EXPECT_EQ(again.origin, "package 1.0");
  EXPECT_EQ(again.documents.at(0).text(), "one two three");
  EXPECT_EQ(again.answers, collection.answers);
}

TEST_F(CollectionTest, aBookHasOneEscapedPageADocument) {
  Collection collection;
  collection.documents = {{"x", "A < B", {"one & two", "three"}}, {"y", "", {"text"}}};
  quality::writeBook(collection, _folder.path());
  const std::string page = read(quality::bookPageName(0));
  EXPECT_NE(page.find("<title>A &lt; B</title>"), std::string::npos);
  EXPECT_NE(page.find("<p>one &amp; two</p>\n<p>three</p>"), std::string::npos);
  EXPECT_NE(read(quality::bookPageName(1)).find("<title>-</title>"), std::string::npos);
}

TEST_F(CollectionTest, namesOfPagesLeadBackToDocuments) {
  EXPECT_EQ(quality::documentOfBookPageName(quality::bookPageName(1234567)), 1234567U);
  EXPECT_EQ(quality::documentOfBookPageName("index.html"), SIZE_MAX);
}

TEST_F(CollectionTest, theHashIsTheSameForEver) {
  EXPECT_EQ(quality::stableHash(""), 0xcbf29ce484222325U);
  EXPECT_EQ(quality::stableHash("a"), 0xaf63dc4c8601ec8cU);
}

}  // namespace
