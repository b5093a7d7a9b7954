// Folders with a DocBook document in them, from the disk to the index.
#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <sys/stat.h>

#include <filesystem>

#include "SearchKit/IndexReader.h"
#include "TestSupport.h"
#include "bvmake/Check.h"
#include "bvmake/HelpIndexFile.h"
#include "bvmake/Run.h"

namespace bvmake {
namespace {

using testing::ElementsAre;
using testing::HasSubstr;
using testing::IsEmpty;

class DocBookRun : public testing::Test {
 protected:
  void create() {
    CreateOptions options;
    options.folder = _folder / "book";
    options.outputPath = _folder / "o";
    options.anchors = true;
    options.generateSummaries = true;
    _report = RecordingReport(2);
    _outcome = run(options, _report);
    EXPECT_EQ(_outcome.exitCode, ExitCode::success);
    _root = *readHelpIndexFile(options.outputPath);
    std::string output;
    EXPECT_EQ(check(options.outputPath, output, _report), ExitCode::success) << output;
  }

  std::vector<std::string> paths() const {
    return searchkit::indexDocumentPaths(
        *SKIndexOpenWithData(*_root[helpindexkeys::indexData].dataIf()));
  }

  std::vector<std::string> pagesWith(std::string_view term) const {
    const SKIndexRef index = SKIndexOpenWithData(*_root[helpindexkeys::indexData].dataIf());
    std::vector<std::string> found;
    for (const SKDocumentID id : searchkit::indexDocumentsWithTerm(*index, term)) {
      found.emplace_back(searchkit::indexDocument(*index, id)->path);
    }
    return found;
  }

  /// Writes a document that includes these files.
  void document(const std::vector<std::string>& references) {
    std::string text = "<book xmlns:xi='http://www.w3.org/2001/XInclude'><title>Book</title>";
    for (const std::string& reference : references) {
      text += "<xi:include href='" + reference + "'/>";
    }
    _folder.write("book/index.docbook", text + "</book>");
  }

  static constexpr const char* secret = "<chapter id='secret'><para>secret</para></chapter>";

  TemporaryFolder _folder;
  RecordingReport _report;
  Outcome _outcome;
  platform::Value _root;
};

TEST_F(DocBookRun, pagesAreNamedByFileAndIdentifier) {
  document({"parts/one.docbook"});
  _folder.write(
      "book/parts/one.docbook",
      "<chapter id='one'><title>One</title><para id='here'>First words.</para></chapter>");
  _folder.write("book/page.html", "<p>words");
  create();
  EXPECT_THAT(paths(), ElementsAre("/index.docbook", "/index.docbook#one", "/page.html"));
  EXPECT_THAT(pagesWith("words"), ElementsAre("/index.docbook#one", "/page.html"));
  EXPECT_EQ(_root[helpindexkeys::anchorData]["here"],
            platform::Value(platform::Value::Array{"/index.docbook#one"}));
  EXPECT_THAT(_report.warnings, IsEmpty());
  EXPECT_EQ(_outcome.pageCount, 3U);
}

TEST_F(DocBookRun, pageWithoutTitleIsNamedByItsIdentifier) {
  document({"one.docbook"});
  _folder.write("book/one.docbook", "<chapter id='first-steps'><para>x</para></chapter>");
  create();
  const SKIndexRef index = SKIndexOpenWithData(*_root[helpindexkeys::indexData].dataIf());
  EXPECT_EQ(searchkit::indexDocument(*index, 1)->title, "first-steps");
}

TEST_F(DocBookRun, includedFilesNeverLieOutsideTheFolder) {
  const std::string outside = _folder.write("outside.docbook", secret);
  _folder.makeFolder("book/sub");
  _folder.write("beside/x.docbook", secret);
  _folder.makeLink(outside, "book/link.docbook");
  _folder.makeLink(_folder / "beside", "book/folder");
  _folder.write("book/sub/real.docbook", "<chapter id='real'><para>real</para></chapter>");
  _folder.makeLink("sub/real.docbook", "book/inside.docbook");
  document({"../outside.docbook", outside, "file://" + outside, "http://example.org/x.docbook",
            "link.docbook", "folder/x.docbook", "sub/../../outside.docbook", "inside.docbook",
            "%2e%2e/outside.docbook"});
  create();
  EXPECT_THAT(pagesWith("secret"), IsEmpty());
  EXPECT_THAT(pagesWith("real"), ElementsAre("/index.docbook#real"));
  ASSERT_EQ(_report.warnings.size(), 8U);
  EXPECT_THAT(_report.warnings[0],
              HasSubstr("index.docbook: cannot include ../outside.docbook: it lies outside"));
  EXPECT_THAT(_report.warnings[2], HasSubstr("only files are included"));
  EXPECT_THAT(_report.warnings[3], HasSubstr("only files are included"));
}

TEST_F(DocBookRun, whatIsNoFileIsNotIncluded) {
  _folder.makeFolder("book/folder");
  ASSERT_EQ(mkfifo((_folder / "book/pipe").c_str(), 0600), 0);
  _folder.write("book/binary", std::string(4096, '\1'));
  document({"folder", "pipe", "binary", "missing", "#part"});
  create();
  ASSERT_EQ(_report.warnings.size(), 5U);
  EXPECT_THAT(_report.warnings[0], HasSubstr("no regular file"));
  EXPECT_THAT(_report.warnings[1], HasSubstr("no regular file"));
  EXPECT_THAT(_report.warnings[2], HasSubstr("binary data"));
  EXPECT_THAT(_report.warnings[3], HasSubstr("No such file or directory"));
  EXPECT_THAT(_report.warnings[4], HasSubstr("no name of a file"));
}

TEST_F(DocBookRun, escapedNamesAndOtherCharacterSetsAreRead) {
  _folder.write("book/two words.docbook",
                "<?xml version='1.0' encoding='ISO-8859-1'?><chapter id='c'><para>Gr\xFC\xDF"
                "e</para></chapter>");
  document({"two%20words.docbook"});
  create();
  EXPECT_THAT(pagesWith("grusse"), ElementsAre("/index.docbook#c"));
}

TEST_F(DocBookRun, onlyTheFirstFileOfADocumentIsAPage) {
  document({});
  _folder.write("book/other.docbook", secret);
  _folder.write("book/INDEX.DOCBOOK", secret);
  _folder.write("book/index.docbook#x.html", "<p>x");
  create();
  EXPECT_THAT(paths(), ElementsAre("/index.docbook"));
}

TEST_F(DocBookRun, documentThatIsNoneIsReportedAndLeftOut) {
  _folder.write("book/index.docbook", "<book><chapter></book>");
  _folder.write("book/a.html", "<p>word");
  create();
  EXPECT_THAT(paths(), ElementsAre("/a.html"));
  EXPECT_THAT(_report.warnings, ElementsAre(HasSubstr("index.docbook: line 1: ")));
  EXPECT_EQ(_outcome.skippedCount, 1U);
}

}  // namespace
}  // namespace bvmake
