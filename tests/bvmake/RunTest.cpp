#include "bvmake/Run.h"

#include <fmt/format.h>
#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <sys/stat.h>

#include <cerrno>
#include <filesystem>

#include "SearchKit/IndexReader.h"
#include "TestSupport.h"
#include "bvmake/HelpIndexFile.h"
#include "platform/Environment.h"

namespace bvmake {
namespace {

using testing::ElementsAre;
using testing::HasSubstr;
using testing::IsEmpty;
using testing::Pair;
using testing::UnorderedElementsAre;

using Operation = platform::FailingFileManager::Operation;

/// A folder with a book in it, and an index made from it.
class Run : public testing::Test {
 protected:
  Outcome create() { return run(options(), _report); }

  CreateOptions& options() {
    _options.folder = _folder / "book";
    _options.outputPath = outputPath();
    return _options;
  }

  std::string outputPath() const { return _folder / "out/deeper/book.helpindex"; }
  std::string outputFolder() const { return _folder / "out/deeper"; }

  void page(std::string_view path, std::string_view contents) {
    _folder.write("book/" + std::string(path), contents);
  }

  platform::Value root() const {
    platform::Error error;
    auto value = readHelpIndexFile(outputPath(), &error);
    EXPECT_TRUE(value) << error.description;
    return value.value_or(platform::Value());
  }

  SKIndexRef index() const {
    const platform::Value file = root();
    const platform::Data* data = file[helpindexkeys::indexData].dataIf();
    return data == nullptr ? nullptr : SKIndexOpenWithData(*data);
  }

  std::vector<std::string> pagesWith(std::string_view term) const {
    const SKIndexRef opened = index();
    std::vector<std::string> paths;
    for (const SKDocumentID id : searchkit::indexDocumentsWithTerm(*opened, term)) {
      paths.emplace_back(searchkit::indexDocument(*opened, id)->path);
    }
    return paths;
  }

  /// Title and abstract of a page.
  std::pair<std::string, std::string> properties(std::string_view path) const {
    const SKIndexRef opened = index();
    const auto id = searchkit::indexDocumentIDForPath(*opened, path);
    if (!id) {
      return {"no such page", ""};
    }
    const auto document = searchkit::indexDocument(*opened, *id);
    return {std::string(document->title.value_or("no title")),
            std::string(document->abstract.value_or("no abstract"))};
  }

  std::vector<std::string> anchorPages(std::string_view name) const {
    std::vector<std::string> paths;
    const platform::Value file = root();
    const platform::Value& list = file[helpindexkeys::anchorData][name];
    if (list.arrayIf() != nullptr) {
      for (const platform::Value& path : *list.arrayIf()) {
        paths.push_back(path.stringValue().value_or("no string"));
      }
    }
    return paths;
  }

  std::shared_ptr<platform::FailingFileManager> failingFiles() {
    auto files = std::make_shared<platform::FailingFileManager>();
    platform::Environment environment = platform::Environment::system();
    environment.files = files;
    _override = std::make_unique<platform::EnvironmentOverride>(environment);
    return files;
  }

  TemporaryFolder _folder;
  CreateOptions _options;
  RecordingReport _report;
  std::unique_ptr<platform::EnvironmentOverride> _override;
};

TEST_F(Run, pagesOfAllKindsAreIndexed) {
  page("a.html", "<title>Alpha</title><h2>Heading</h2><p>queue");
  page("sub/b.page",
       "<page xmlns='http://projectmallard.org/1.0/' id='b'><info><desc>About beta.</desc></info>"
       "<title>Beta</title><p>queue</p></page>");
  const Outcome outcome = create();
  EXPECT_EQ(outcome.exitCode, ExitCode::success);
  EXPECT_EQ(outcome.pageCount, 2U);
  EXPECT_EQ(outcome.outputBytes, std::filesystem::file_size(outputPath()));
  EXPECT_GT(outcome.inputBytes, 0U);
  EXPECT_THAT(pagesWith("queue"), ElementsAre("/a.html", "/sub/b.page"));
  EXPECT_THAT(properties("/a.html"), Pair("Alpha", "no abstract"));
  EXPECT_THAT(properties("/sub/b.page"), Pair("Beta", "About beta."));
  EXPECT_THAT(_report.warnings, IsEmpty());
}

TEST_F(Run, titlesHeadingsKeywordsAndDescriptionsAreSearched) {
  page("a.html",
       "<title>inthetitle</title><meta name=description content=inthedescription>"
       "<meta name=keywords content='inthekeywords, other'><h1>intheheading</h1><p>inthebody");
  create();
  for (const char* word :
       {"inthetitle", "inthedescription", "inthekeywords", "intheheading", "inthebody"}) {
    EXPECT_THAT(pagesWith(word), ElementsAre("/a.html")) << word;
  }
}

TEST_F(Run, pageWithoutAnyTitleIsNamedByItsFile) {
  page("sub/first.steps.html", "<p>text");
  create();
  EXPECT_EQ(properties("/sub/first.steps.html").first, "first.steps");
}

TEST_F(Run, abstractIsTheDescriptionEvenWhenSummariesAreMade) {
  page("a.html", "<meta name=description content='Described.'><p>First sentence.");
  options().generateSummaries = true;
  EXPECT_EQ(create().abstractCount, 1U);
  EXPECT_EQ(properties("/a.html").second, "Described.");
}

TEST_F(Run, summariesAreMadeOnlyWhenAskedFor) {
  page("a.html", "<h1>T</h1><p>First sentence. Second sentence.");
  EXPECT_EQ(create().abstractCount, 0U);
  EXPECT_EQ(properties("/a.html").second, "no abstract");
  options().generateSummaries = true;
  EXPECT_EQ(create().abstractCount, 1U);
  EXPECT_EQ(properties("/a.html").second, "First sentence. Second sentence.");
}

TEST_F(Run, shortTermsAreLeftOut) {
  page("a.html", "<p>to be longer");
  options().minimumTermLength = 3;
  create();
  EXPECT_THAT(pagesWith("be"), IsEmpty());
  EXPECT_THAT(pagesWith("longer"), ElementsAre("/a.html"));
}

TEST_F(Run, anchorsNameThePagesThatCarryThemInOrder) {
  page("b.html", "<a name=both></a><p id=onlyb>x");
  page("a.html", "<p id=both>x");
  page("c.page", "<page xmlns='http://projectmallard.org/1.0/' id='c'><section id='both'/></page>");
  options().anchors = true;
  EXPECT_EQ(create().anchorCount, 3U);
  EXPECT_THAT(anchorPages("both"), ElementsAre("/a.html", "/b.html", "/c.page"));
  EXPECT_THAT(anchorPages("onlyb"), ElementsAre("/b.html"));
  EXPECT_THAT(anchorPages("c"), ElementsAre("/c.page"));
}

TEST_F(Run, anchorsAreStoredOnlyWhenAskedFor) {
  page("a.html", "<p id=x>x");
  create();
  EXPECT_TRUE(root()[helpindexkeys::anchorData].isAbsent());
}

TEST_F(Run, fileHasTheKeysOfALocalBook) {
  page("a.html", "<p>x");
  options().anchors = true;
  create();
  const platform::Value file = root();
  std::vector<std::string> keys;
  for (const auto& entry : *file.dictionaryIf()) {
    keys.push_back(entry.first);
  }
  EXPECT_THAT(keys, UnorderedElementsAre("SKI_INDEX_DATA", "SKI_ANCHOR_DATA", "SKI_USE_REMOTE_ROOT",
                                         "LUXIndexData"));
  EXPECT_FALSE(file[helpindexkeys::useRemoteRoot].boolValue());
}

TEST_F(Run, pagesThatAskNotToBeFoundAreLeftOutWithTheirAnchors) {
  page("a.html", "<meta name=robots content=noindex><p id=x>word");
  page("b.html", "<p id=y>word");
  options().anchors = true;
  const Outcome outcome = create();
  EXPECT_EQ(outcome.leftOutCount, 1U);
  EXPECT_EQ(outcome.pageCount, 1U);
  EXPECT_THAT(pagesWith("word"), ElementsAre("/b.html"));
  EXPECT_THAT(anchorPages("x"), IsEmpty());
}

TEST_F(Run, pagesWithNothingInThemAreLeftOut) {
  page("a.html", "");
  page("b.html", "<html><body><script>x</script></body></html>");
  page("c.html", "<p>word");
  const Outcome outcome = create();
  EXPECT_EQ(outcome.leftOutCount, 2U);
  EXPECT_EQ(outcome.skippedCount, 0U);
  EXPECT_EQ(outcome.pageCount, 1U);
}

TEST_F(Run, badPagesAreReportedAndSkippedAndTheRestIsIndexed) {
  page("bad.page", "<page xmlns='http://projectmallard.org/1.0/'>");
  page("binary.html", std::string_view("\x7F"
                                       "ELF\2\1\1\0\0\0\0\0\0\0\0\0",
                                       16));
  page("good.html", "<p>word");
  const Outcome outcome = create();
  EXPECT_EQ(outcome.exitCode, ExitCode::success);
  EXPECT_EQ(outcome.skippedCount, 2U);
  EXPECT_THAT(_report.warnings, ElementsAre(HasSubstr("/bad.page: "), HasSubstr("/binary.html: ")));
  EXPECT_THAT(pagesWith("word"), ElementsAre("/good.html"));
}

TEST_F(Run, pagesThatCannotBeReadAreReportedAndSkipped) {
  page("closed.html", "<p>word");
  page("open.html", "<p>word");
  failingFiles()->fail(Operation::read, EACCES, "closed.html");
  const Outcome outcome = create();
  EXPECT_EQ(outcome.exitCode, ExitCode::success);
  EXPECT_EQ(outcome.skippedCount, 1U);
  EXPECT_THAT(_report.warnings, ElementsAre(HasSubstr("closed.html")));
  EXPECT_THAT(pagesWith("word"), ElementsAre("/open.html"));
}

TEST_F(Run, emptyFolderGivesAnEmptyIndexAndAWarning) {
  _folder.makeFolder("book");
  options().anchors = true;
  const Outcome outcome = create();
  EXPECT_EQ(outcome.exitCode, ExitCode::success);
  EXPECT_THAT(_report.warnings, ElementsAre(HasSubstr("nothing to index")));
  ASSERT_NE(index(), nullptr);
  EXPECT_EQ(SKIndexGetMaximumTermID(index()), 0);
}

TEST_F(Run, sameFolderGivesTheSameBytes) {
  options().anchors = true;
  options().generateSummaries = true;
  const auto fill = [this](const std::string& book, bool backwards) {
    for (int i = 0; i < 60; ++i) {
      const int number = backwards ? 59 - i : i;
      _folder.write(fmt::format("{}/{}.html", book, number),
                    fmt::format("<title>Page {0}</title><p id=a{0}>word{0} common.", number));
    }
  };
  fill("book", false);
  create();
  const std::string first = contentsOfFile(outputPath());
  create();
  EXPECT_EQ(contentsOfFile(outputPath()), first);

  // Another folder, filled in another order, lists its files in another order.
  fill("again", true);
  options();
  CreateOptions again = _options;
  again.folder = _folder / "again";
  EXPECT_EQ(run(again, _report).exitCode, ExitCode::success);
  EXPECT_EQ(contentsOfFile(outputPath()), first);
}

TEST_F(Run, missingFolderFails) {
  EXPECT_EQ(create().exitCode, ExitCode::failure);
  EXPECT_THAT(_report.errors, ElementsAre(HasSubstr("No such file or directory")));
  EXPECT_FALSE(std::filesystem::exists(outputPath()));
}

TEST_F(Run, folderThatIsAFileFails) {
  _folder.write("book", "x");
  EXPECT_EQ(create().exitCode, ExitCode::failure);
  EXPECT_THAT(_report.errors, ElementsAre(HasSubstr("Not a directory")));
}

TEST_F(Run, writeFailureLeavesTheFormerFileAsItWas) {
  page("a.html", "<p>word");
  _folder.write("out/deeper/book.helpindex", "former");
  failingFiles()->fail(Operation::write, ENOSPC);
  EXPECT_EQ(create().exitCode, ExitCode::failure);
  EXPECT_THAT(_report.errors, ElementsAre(HasSubstr("No space left")));
  EXPECT_EQ(contentsOfFile(outputPath()), "former");
  EXPECT_EQ(std::distance(std::filesystem::directory_iterator(outputFolder()), {}), 1);
}

TEST_F(Run, folderThatCannotBeMadeForTheOutputFails) {
  page("a.html", "<p>word");
  failingFiles()->fail(Operation::createDirectory, EACCES);
  EXPECT_EQ(create().exitCode, ExitCode::failure);
  EXPECT_THAT(_report.errors, ElementsAre(HasSubstr("Permission denied")));
}

TEST_F(Run, outputThatIsAFolderFails) {
  page("a.html", "<p>word");
  _folder.makeFolder("out/deeper/book.helpindex");
  EXPECT_EQ(create().exitCode, ExitCode::failure);
  EXPECT_THAT(_report.errors, ElementsAre(HasSubstr("no regular file")));
}

TEST_F(Run, outputThatIsAPipeIsNotReplaced) {
  page("a.html", "<p>word");
  _folder.makeFolder("out/deeper");
  ASSERT_EQ(mkfifo(outputPath().c_str(), 0600), 0);
  EXPECT_EQ(create().exitCode, ExitCode::failure);
  EXPECT_THAT(_report.errors, ElementsAre(HasSubstr("no regular file")));
  EXPECT_TRUE(std::filesystem::is_fifo(outputPath()));
}

TEST_F(Run, verbosityTellsOfTheRunThenOfEachPage) {
  page("a.html", "<p>word");
  RecordingReport quiet(0);
  run(options(), quiet);
  EXPECT_THAT(quiet.messages, IsEmpty());
  RecordingReport once(1);
  run(options(), once);
  EXPECT_THAT(once.messages, ElementsAre(Pair(1, HasSubstr("1 pages"))));
  RecordingReport twice(2);
  run(options(), twice);
  EXPECT_THAT(twice.messages, ElementsAre(Pair(2, "/a.html"), Pair(1, HasSubstr("1 pages"))));
}

TEST_F(Run, outputInTheFolderItselfIsNotIndexedTheNextTime) {
  page("a.html", "<p>word");
  options();
  CreateOptions inside = _options;
  inside.outputPath = _folder / "book/book.helpindex";
  run(inside, _report);
  const std::string first = contentsOfFile(inside.outputPath);
  run(inside, _report);
  EXPECT_EQ(contentsOfFile(inside.outputPath), first);
}

}  // namespace
}  // namespace bvmake
