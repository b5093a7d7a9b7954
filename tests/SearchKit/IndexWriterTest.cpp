#include "SearchKit/IndexWriter.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <algorithm>
#include <random>
#include <string>
#include <vector>

#include "platform/Exception.h"
#include "tests/SearchKit/Indexes.h"

namespace searchkit {
namespace {

using ::testing::ElementsAre;
using testing::found;
using testing::indexData;
using testing::openIndex;
using testing::page;

std::string exceptionName(IndexWriter& writer, Document document) {
  try {
    writer.add(std::move(document));
  } catch (const platform::Exception& exception) {
    return exception.name();
  }
  return "none";
}

TEST(IndexWriter, makesTheSameBytesInWhateverOrderDocumentsAreAdded) {
  std::mt19937 random(7);
  std::vector<Document> documents;
  for (int i = 0; i < 60; ++i) {
    Document document = page("/page" + std::to_string(random() % 100000) + ".html", "");
    document.title = "Page " + std::to_string(i);
    document.headings = {"About printing", "Wörter " + std::to_string(i % 7)};
    for (int block = 0; block < 5; ++block) {
      std::string text;
      for (int word = 0; word < 30; ++word) {
        text += "word" + std::to_string(random() % 200) + " ";
      }
      document.body.push_back(text);
    }
    documents.push_back(std::move(document));
  }
  const platform::Data bytes = indexData(documents);
  for (int round = 0; round < 5; ++round) {
    std::shuffle(documents.begin(), documents.end(), random);
    EXPECT_EQ(indexData(documents), bytes);
  }
}

TEST(IndexWriter, absorbedWritersMakeTheSameBytesAsOne) {
  std::mt19937 random(5);
  std::vector<Document> documents;
  for (int i = 0; i < 80; ++i) {
    std::string text = "everywhere own" + std::to_string(i);
    for (int word = 0; word < 40; ++word) {
      text += " word" + std::to_string(random() % 300);
    }
    documents.push_back(page("/page" + std::to_string(random()) + ".html", text));
  }
  const platform::Data bytes = indexData(documents);
  for (const size_t count : {1U, 2U, 3U, 7U, 90U}) {
    std::vector<std::unique_ptr<IndexWriter>> writers;
    for (size_t i = 0; i < count; ++i) {
      writers.push_back(std::make_unique<IndexWriter>());
    }
    for (const Document& document : documents) {
      writers[random() % count]->add(document);
    }
    for (size_t i = 1; i < count; ++i) {
      if (i % 2 == 0) {
        writers[i]->sortTerms();
      }
      writers[0]->absorb(*writers[i]);
    }
    EXPECT_EQ(writers[0]->documentCount(), documents.size());
    EXPECT_EQ(writers[0]->finish(), bytes);
  }
}

TEST(IndexWriter, refusesAPathOfAnAbsorbedWriter) {
  IndexWriter writer;
  IndexWriter first;
  IndexWriter second;
  first.add(page("/a", "one"));
  second.add(page("/a", "two"));
  writer.absorb(first);
  EXPECT_THROW(writer.absorb(second), platform::Exception);
  EXPECT_EQ(exceptionName(writer, page("/a", "three")), platform::invalidArgumentException);
  EXPECT_EQ(writer.documentCount(), 1U);
  EXPECT_EQ(second.documentCount(), 1U);
}

TEST(IndexWriter, refusesAPathThatIsThereAlready) {
  IndexWriter writer;
  writer.add(page("/a", "one"));
  EXPECT_EQ(exceptionName(writer, page("/a", "two")), platform::invalidArgumentException);
  EXPECT_EQ(writer.documentCount(), 1U);
  const SKIndexRef index = SKIndexOpenWithData(writer.finish());
  EXPECT_EQ(found(index, "one"), "/a ");
  EXPECT_EQ(found(index, "two"), "");
}

TEST(IndexWriter, refusesAPathWithoutASlashInFront) {
  IndexWriter writer;
  EXPECT_EQ(exceptionName(writer, page("a", "one")), platform::invalidArgumentException);
  EXPECT_EQ(exceptionName(writer, page("", "one")), platform::invalidArgumentException);
  EXPECT_EQ(writer.documentCount(), 0U);
}

TEST(IndexWriter, finishesOnce) {
  IndexWriter writer;
  writer.finish();
  EXPECT_THROW(writer.finish(), platform::Exception);
  EXPECT_EQ(exceptionName(writer, page("/a", "")), platform::invalidArgumentException);
}

TEST(IndexWriter, makesAnIndexOfNothing) {
  const SKIndexRef index = SKIndexOpenWithData(IndexWriter().finish());
  ASSERT_NE(index, nullptr);
  EXPECT_TRUE(SKIndexVerifyChecksums(index));
  EXPECT_EQ(SKIndexGetMaximumTermID(index), 0);
  EXPECT_EQ(found(index, "any"), "");
  EXPECT_EQ(found(index, "a*"), "");
  EXPECT_EQ(found(index, "*a* | \"b c\""), "");
  EXPECT_FALSE(TermIterator(*index).next());
}

TEST(IndexWriter, makesAnIndexOfDocumentsWithoutWords) {
  const SKIndexRef index = openIndex({page("/a", ""), page("/b", " … ")});
  ASSERT_NE(index, nullptr);
  EXPECT_EQ(SKIndexGetMaximumTermID(index), 0);
  EXPECT_THAT(indexDocumentPaths(*index), ElementsAre("/a", "/b"));
}

TEST(IndexWriter, leavesShortTermsOut) {
  const SKIndexRef index = openIndex({page("/a", "go to the printer 東 где и")}, 3);
  EXPECT_FALSE(indexTermID(*index, "to"));
  EXPECT_FALSE(indexTermID(*index, "и"));
  EXPECT_TRUE(indexTermID(*index, "the"));
  EXPECT_TRUE(indexTermID(*index, "где"));
  EXPECT_TRUE(indexTermID(*index, "東"));
  EXPECT_EQ(indexSummary(*index).minimumTermLength, 3U);
}

TEST(IndexWriter, takesPathsOfAnyLengthAndBytes) {
  const std::string longPath = "/" + std::string(100000, 'p') + "/a.html";
  const std::string rawPath = "/caf\xE9.html";
  const SKIndexRef index = openIndex({page(longPath, "one"), page(rawPath, "two")});
  EXPECT_THAT(indexDocumentPaths(*index), ElementsAre(rawPath, longPath));
  EXPECT_EQ(found(index, "one"), longPath + " ");
  EXPECT_EQ(indexDocumentIDForPath(*index, longPath), 1U);
}

TEST(IndexWriter, repairsIllFormedTexts) {
  Document document = page("/a", "bad\xFFword");
  document.title = "T\xC3itle";
  document.abstract = "\xE2\x80";
  const SKIndexRef index = openIndex({document});
  const auto stored = indexDocument(*index, 0);
  ASSERT_TRUE(stored);
  EXPECT_EQ(stored->title, "T\uFFFDitle");
  EXPECT_EQ(stored->abstract, "\uFFFD");
  EXPECT_EQ(found(index, "bad word itle"), "/a ");
}

TEST(IndexWriter, doesNotSearchTheAbstract) {
  Document document = page("/a", "body");
  document.abstract = "summary";
  EXPECT_EQ(found(openIndex({document}), "summary"), "");
}

TEST(IndexWriter, keepsATermOfTheGreatestLength) {
  const std::string word(1000, 'w');
  const SKIndexRef index = openIndex({page("/a", word), page("/b", word + "x")});
  // Both are cut to the same term.
  EXPECT_EQ(SKIndexGetMaximumTermID(index), 1);
  EXPECT_EQ(found(index, word), "/a /b ");
  EXPECT_EQ(found(index, word + "*"), "/a /b ");
}

}  // namespace
}  // namespace searchkit
