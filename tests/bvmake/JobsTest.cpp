// However many threads read the pages of a book, what comes out is the same.
#include <fmt/format.h>
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <random>

#include "TestSupport.h"
#include "bvmake/Run.h"

namespace bvmake {
namespace {

using testing::Contains;
using testing::Pair;

/// A book with everything in it that a run tells of.
class Jobs : public testing::Test {
 protected:
  Jobs() {
    std::mt19937 random(11);
    for (int i = 0; i < 300; ++i) {
      std::string text = fmt::format(
          "<title>Page {0} of {1}</title><meta name=keywords content='k{0}, shared'>"
          "<h1 id=a{0}>Heading {1}</h1><a name=everywhere></a>",
          i, i % 17);
      for (size_t block = random() % 8; block > 0; --block) {
        text += "<p>";
        for (size_t word = random() % 60; word > 0; --word) {
          text += fmt::format("word{} of the Printing queue. ", random() % 500);
        }
      }
      _folder.write(fmt::format("book/{}/{}.html", i % 7, i), text);
    }
    _folder.write("book/3/bad.page", "<page>");
    _folder.write("book/5/bad.page", "<page");
    _folder.write("book/1/binary.html", std::string(4096, '\1'));
    _folder.write("book/2/empty.html", "");
    _folder.write("book/2/hidden.html", "<meta name=robots content=noindex><p>hidden words");
    _folder.write("book/6/large.html", "<p>" + std::string(1 << 20, 'x') + " end");
  }

  struct Made {
    std::string bytes;
    RecordingReport report{3};
    Outcome outcome;
  };

  Made make(size_t jobs, bool appendLUXOnly = false) {
    Made made;
    CreateOptions options;
    options.folder = _folder / "book";
    options.outputPath = _folder / "book.helpindex";
    options.anchors = true;
    options.generateSummaries = true;
    options.minimumTermLength = 3;
    options.appendLUXOnly = appendLUXOnly;
    options.language = _language;
    options.jobs = jobs;
    made.outcome = run(options, made.report);
    made.bytes = contentsOfFile(options.outputPath);
    return made;
  }

  void expectTheSame(const Made& a, const Made& b) {
    EXPECT_TRUE(a.bytes == b.bytes);
    EXPECT_EQ(a.report.errors, b.report.errors);
    EXPECT_EQ(a.report.warnings, b.report.warnings);
    EXPECT_EQ(a.report.messages, b.report.messages);
    EXPECT_EQ(a.outcome.exitCode, b.outcome.exitCode);
    EXPECT_EQ(a.outcome.pageCount, b.outcome.pageCount);
    EXPECT_EQ(a.outcome.skippedCount, b.outcome.skippedCount);
    EXPECT_EQ(a.outcome.leftOutCount, b.outcome.leftOutCount);
    EXPECT_EQ(a.outcome.abstractCount, b.outcome.abstractCount);
    EXPECT_EQ(a.outcome.anchorCount, b.outcome.anchorCount);
    EXPECT_EQ(a.outcome.inputBytes, b.outcome.inputBytes);
    EXPECT_EQ(a.outcome.semanticBytes, b.outcome.semanticBytes);
    EXPECT_EQ(a.outcome.outputBytes, b.outcome.outputBytes);
  }

  TemporaryFolder _folder;
  std::string _language;
};

TEST_F(Jobs, anyNumberOfThemGivesTheSameBytesMessagesAndFigures) {
  const Made one = make(1);
  EXPECT_EQ(one.outcome.exitCode, ExitCode::success);
  EXPECT_EQ(one.outcome.pageCount, 301U);
  EXPECT_EQ(one.outcome.skippedCount, 3U);
  EXPECT_EQ(one.outcome.leftOutCount, 2U);
  EXPECT_EQ(one.report.warnings.size(), 3U);
  EXPECT_THAT(one.report.messages, Contains(Pair(2, "/0/0.html")));
  for (const size_t jobs : {2U, 3U, 8U, 0U}) {
    expectTheSame(make(jobs), one);
  }
}

TEST_F(Jobs, languageThatNeedNotBeFoundOutChangesNothingOfThat) {
  _language = "de";
  const Made one = make(1);
  expectTheSame(make(4), one);
}

TEST_F(Jobs, appendedSemanticDataAreTheSameToo) {
  make(1);
  const Made one = make(1, true);
  EXPECT_EQ(one.outcome.exitCode, ExitCode::success);
  expectTheSame(make(4, true), one);
}

TEST_F(Jobs, moreOfThemThanPagesDoNoHarm) {
  const TemporaryFolder folder;
  folder.write("book/a.html", "<p>one word");
  CreateOptions options;
  options.folder = folder / "book";
  options.outputPath = folder / "o";
  options.jobs = 100000;
  RecordingReport report(0);
  EXPECT_EQ(run(options, report).pageCount, 1U);
}

}  // namespace
}  // namespace bvmake
