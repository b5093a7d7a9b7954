#include "bvmake/Inspect.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "TestSupport.h"
#include "bvmake/HelpIndexFile.h"
#include "platform/ClassicArchive.h"

namespace bvmake {
namespace {

using testing::ElementsAre;
using testing::HasSubstr;
using testing::IsEmpty;
using testing::Not;

class Inspect : public testing::Test {
 protected:
  std::string indexFile() {
    _folder.write("book/a.html",
                  "<title>Alpha</title><meta name=description content='On print queues.'>"
                  "<a name=both></a><p>Queues and more queues");
    _folder.write("book/b.html", "<title>B\x1B[31m</title><p id=both>Résumé");
    CreateOptions options;
    options.folder = _folder / "book";
    options.outputPath = _folder / "out.helpindex";
    options.anchors = true;
    EXPECT_EQ(run(options, _report).exitCode, ExitCode::success);
    return options.outputPath;
  }

  std::string output(const InspectOptions& options, ExitCode expected = ExitCode::success) {
    std::string text;
    EXPECT_EQ(inspect(options, text, _report), expected);
    return text;
  }

  InspectOptions options(std::string path) {
    InspectOptions result;
    result.path = std::move(path);
    return result;
  }

  TemporaryFolder _folder;
  RecordingReport _report;
};

TEST_F(Inspect, showsKeysSizesAndCounts) {
  const std::string text = output(options(indexFile()));
  EXPECT_THAT(text, HasSubstr("SKI_INDEX_DATA: data, "));
  EXPECT_THAT(text, HasSubstr("SKI_ANCHOR_DATA: dictionary, 1 entries"));
  EXPECT_THAT(text, HasSubstr("SKI_USE_REMOTE_ROOT: false"));
  EXPECT_THAT(text, HasSubstr("keyword index: 2 pages, "));
  EXPECT_THAT(text, HasSubstr("anchors: 1 names, 2 places"));
  EXPECT_THAT(text, Not(HasSubstr("DAMAGED")));
}

TEST_F(Inspect, showsThePagesOfATermFoldedAsTheIndexFoldsIt) {
  InspectOptions wanted = options(indexFile());
  wanted.term = "QUEUES";
  EXPECT_THAT(output(wanted), HasSubstr("term \"queues\": 1 pages\n  /a.html: Alpha\n"));
  wanted.term = "resume";
  EXPECT_THAT(output(wanted), HasSubstr("term \"resume\": 1 pages\n  /b.html"));
  wanted.term = "absent";
  EXPECT_THAT(output(wanted), HasSubstr("term \"absent\": 0 pages\n"));
  wanted.term = "---";
  EXPECT_THAT(output(wanted), HasSubstr("no word that an index could have"));
}

TEST_F(Inspect, showsThePagesOfAnAnchorSpelledExactlySo) {
  InspectOptions wanted = options(indexFile());
  wanted.anchor = "both";
  EXPECT_THAT(output(wanted),
              HasSubstr("anchor \"both\": 2 pages\n  /a.html: Alpha\n  /b.html: B"));
  wanted.anchor = "Both";
  EXPECT_THAT(output(wanted), HasSubstr("anchor \"Both\": 0 pages\n"));
}

TEST_F(Inspect, showsAllPagesWithTheirAbstracts) {
  InspectOptions wanted = options(indexFile());
  wanted.pages = true;
  EXPECT_THAT(output(wanted), HasSubstr("  /a.html: Alpha\n    On print queues.\n  /b.html: B"));
}

TEST_F(Inspect, controlCharactersOfTheFileDoNotReachTheTerminal) {
  InspectOptions wanted = options(indexFile());
  wanted.pages = true;
  wanted.term = "\x1B[31m";
  wanted.anchor = "\x1B";
  EXPECT_THAT(output(wanted), Not(HasSubstr("\x1B")));
}

TEST_F(Inspect, filesWithoutIndexAndAnchorsAreShownToo) {
  platform::Value::Dictionary root;
  root.emplace("SKI_REMOTE_ROOT", "http://example.org/");
  root.emplace("number", 7);
  const std::string path =
      _folder.write("x.helpindex", platform::classicArchiveWithRootObject(root).view());
  InspectOptions wanted = options(path);
  wanted.term = "word";
  wanted.anchor = "name";
  wanted.pages = true;
  const std::string text = output(wanted);
  EXPECT_THAT(text, HasSubstr("keyword index: none"));
  EXPECT_THAT(text, HasSubstr("anchors: none"));
  EXPECT_THAT(text, HasSubstr("SKI_REMOTE_ROOT: string \"http://example.org/\""));
  EXPECT_THAT(text, HasSubstr("number: number 7"));
}

TEST_F(Inspect, missingFileFails) {
  EXPECT_THAT(output(options(_folder / "none"), ExitCode::failure), IsEmpty());
  EXPECT_THAT(_report.errors, ElementsAre(HasSubstr("No such file")));
}

TEST_F(Inspect, fileThatIsNoArchiveFails) {
  output(options(_folder.write("x", "no archive")), ExitCode::failure);
  EXPECT_THAT(_report.errors, ElementsAre(HasSubstr("is no help index")));
}

TEST_F(Inspect, archiveOfSomethingElseFails) {
  const std::string path =
      _folder.write("x", platform::classicArchiveWithRootObject(platform::Value("text")).view());
  output(options(path), ExitCode::failure);
  EXPECT_THAT(_report.errors, ElementsAre(HasSubstr("not of a dictionary")));
}

TEST_F(Inspect, keywordIndexThatCannotBeOpenedFails) {
  const std::string path = _folder.write(
      "x",
      helpIndexFile(platform::Data::copy("no index"), platform::Data(), platform::Value()).view());
  output(options(path), ExitCode::failure);
  EXPECT_THAT(_report.errors, ElementsAre(HasSubstr("cannot be opened")));
}

TEST_F(Inspect, damagedFilesAreShownOrRefusedNeverWorse) {
  const std::string whole = contentsOfFile(indexFile());
  for (size_t at = 0; at < whole.size(); at += 1 + whole.size() / 150) {
    std::string flipped = whole;
    flipped[at] = static_cast<char>(flipped[at] ^ 0x5A);
    for (const std::string& bytes : {flipped, whole.substr(0, at)}) {
      InspectOptions wanted = options(_folder.write("damaged", bytes));
      wanted.term = "queues";
      wanted.anchor = "both";
      wanted.pages = true;
      std::string text;
      inspect(wanted, text, _report);
    }
  }
}

}  // namespace
}  // namespace bvmake
