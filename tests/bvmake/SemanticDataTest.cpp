#include "bvmake/SemanticData.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <algorithm>
#include <filesystem>

#include "TestSupport.h"
#include "bvmake/HelpIndexFile.h"
#include "bvmake/Inspect.h"
#include "bvmake/Run.h"
#include "host/Luxwell/HelpLUXIndex.h"
#include "platform/ClassicArchive.h"
#include "platform/Environment.h"
#include "platform/Exception.h"

namespace bvmake {
namespace {

using platform::ClassicArchive;
using platform::Data;
using platform::Value;
using testing::Contains;
using testing::ElementsAre;
using testing::HasSubstr;
using testing::IsEmpty;
using testing::Not;

/// A folder with a book in it, and an index made from it.
class SemanticDataRun : public testing::Test {
 protected:
  Outcome create() { return run(options(), _report); }

  Outcome append() {
    options().appendLUXOnly = true;
    const Outcome outcome = create();
    options().appendLUXOnly = false;
    return outcome;
  }

  CreateOptions& options() {
    _options.folder = _folder / "book";
    _options.outputPath = _folder / "book.helpindex";
    return _options;
  }

  void page(std::string_view path, std::string_view contents) {
    _folder.write("book/" + std::string(path), contents);
  }

  // From a copy: the tests write over the file, which the program never does.
  Value root() const {
    const Data bytes = Data::copy(contentsOfFile(_folder / "book.helpindex"));
    return platform::ClassicUnarchiver(bytes).decodeRootObject();
  }

  std::shared_ptr<HelpLUXIndex> index() const {
    const Value file = root();
    const Data* data = file[helpindexkeys::luxIndexData].dataIf();
    return data == nullptr ? nullptr : HelpLUXIndex::initWithVersionedData(*data);
  }

  std::string language() const {
    return index()->attributes()[HelpLUXIndexAttributeLanguageKey].stringValue().value_or("none");
  }

  std::vector<std::string> tokens(std::string_view key, LUXTokenKind kind) const {
    const LUXTokenCounts counts = index()->tokenCountsForKey(key);
    std::vector<std::string> result;
    for (size_t i = 0; i < counts.size(); ++i) {
      if (counts[i].kind == kind) {
        result.emplace_back(counts[i].token);
      }
    }
    return result;
  }

  TemporaryFolder _folder;
  CreateOptions _options;
  RecordingReport _report;
};

TEST_F(SemanticDataRun, aPlainRunWritesPagesUnderTheirPathsWithoutASlash) {
  page("b.html", "<title>Beta</title><p>Second words.");
  page("sub/a.html", "<title>Alpha</title><p>First words.");
  const Outcome outcome = create();
  ASSERT_NE(index(), nullptr);
  EXPECT_THAT(index()->documentKeys(), ElementsAre("b.html", "sub/a.html"));
  EXPECT_THAT(tokens("sub/a.html", LUXTokenKind::stem), ElementsAre("alpha", "first", "word"));
  EXPECT_EQ(outcome.semanticBytes, root()[helpindexkeys::luxIndexData].dataIf()->length());
}

TEST_F(SemanticDataRun, titlesAndAbstractsAreThoseOfTheKeywordIndex) {
  page("described.html", "<title>Alpha</title><meta name=description content='Of alpha.'><p>Text.");
  page("plain.html", "<h1>Beta</h1><p>The first sentence of it. And another.");
  page("unnamed.first.html", "<p>Text that stands alone.");
  options().generateSummaries = true;
  create();
  const auto opened = index();
  EXPECT_EQ(opened->fileProperitesForKey("described.html")[HelpDocPropertyTitle], Value("Alpha"));
  EXPECT_EQ(opened->fileProperitesForKey("described.html")[HelpDocPropertyDescription],
            Value("Of alpha."));
  EXPECT_EQ(opened->fileProperitesForKey("plain.html")[HelpDocPropertyTitle], Value("Beta"));
  EXPECT_THAT(*opened->fileProperitesForKey("plain.html")[HelpDocPropertyDescription].stringIf(),
              HasSubstr("The first sentence of it."));
  EXPECT_EQ(opened->fileProperitesForKey("unnamed.first.html")[HelpDocPropertyTitle],
            Value("unnamed.first"));
}

TEST_F(SemanticDataRun, descriptionHeadingsAndKeywordsAreCountedAsBody) {
  page("a.html",
       "<title>Alpha</title><meta name=description content='indescription'>"
       "<meta name=keywords content='inkeywords'><h2>inheading</h2><p>inbody");
  create();
  const LUXTokenCounts counts = index()->tokenCountsForKey("a.html");
  std::vector<std::string> body;
  std::vector<std::string> title;
  for (size_t i = 0; i < counts.size(); ++i) {
    if (counts[i].kind == LUXTokenKind::form) {
      (counts[i].bodyCount > 0 ? body : title).emplace_back(counts[i].token);
    }
  }
  EXPECT_THAT(title, ElementsAre("alpha"));
  EXPECT_THAT(body, ElementsAre("inbody", "indescription", "inheading", "inkeywords"));
}

TEST_F(SemanticDataRun, pagesThatAskNotToBeFoundAreMarkedAndLendTheirWords) {
  page("a.html", "<meta name=robots content=noindex><title>Alpha</title><p>hidden words");
  page("b.html", "<title>Beta</title><p>shown words");
  create();
  EXPECT_TRUE(
      index()->fileProperitesForKey("a.html")[HelpDocPropertyExcludeFromSearch].boolValue());
  EXPECT_TRUE(index()->fileProperitesForKey("b.html")[HelpDocPropertyExcludeFromSearch].isAbsent());
  EXPECT_THAT(tokens("a.html", LUXTokenKind::form), Contains("hidden"));
}

TEST_F(SemanticDataRun, pagesWithNothingInThemAreLeftOut) {
  page("empty.html", "");
  page("a.html", "<p>text");
  create();
  EXPECT_THAT(index()->documentKeys(), ElementsAre("a.html"));
}

TEST_F(SemanticDataRun, aFolderWithoutPagesGivesDataWithoutPages) {
  _folder.makeFolder("book");
  create();
  ASSERT_NE(index(), nullptr);
  EXPECT_THAT(index()->documentKeys(), IsEmpty());
}

TEST_F(SemanticDataRun, sameFolderSameBytesWhateverTheOptionsOfTheKeywordHalf) {
  page("a.html", "<title>Alpha</title><p id=x>The print queue. The print queue.");
  page("b.html", "<title>Beta</title><p>Print queues and the print queue.");
  create();
  const Value first = root();
  const std::string bytes = contentsOfFile(_options.outputPath);
  create();
  EXPECT_EQ(contentsOfFile(_options.outputPath), bytes);
  options().anchors = true;
  options().minimumTermLength = 7;
  create();
  EXPECT_EQ(root()[helpindexkeys::luxIndexData], first[helpindexkeys::luxIndexData]);
}

TEST_F(SemanticDataRun, appendingAddsTheDataAndLeavesEverythingElse) {
  page("a.html", "<title>Alpha</title><p id=x>The print queue.");
  options().anchors = true;
  options().generateSummaries = true;
  create();
  const Value whole = root();
  Value::Dictionary without = *whole.dictionaryIf();
  without.erase(helpindexkeys::luxIndexData);
  const std::string bare(platform::classicArchiveWithRootObject(without).view());
  _folder.write("book.helpindex", bare);

  const Outcome outcome = append();
  EXPECT_EQ(outcome.exitCode, ExitCode::success);
  EXPECT_EQ(outcome.pageCount, 1U);
  EXPECT_EQ(outcome.outputBytes, std::filesystem::file_size(_options.outputPath));
  EXPECT_EQ(root(), whole) << "the same as a plain run writes";

  // Byte for byte but for the number of entries and what comes last.
  const std::string appended = contentsOfFile(_options.outputPath);
  const size_t countAt = static_cast<size_t>(
      std::mismatch(bare.begin(), bare.end(), appended.begin(), appended.end()).first -
      bare.begin());
  EXPECT_EQ(static_cast<unsigned char>(bare[countAt]) + 1,
            static_cast<unsigned char>(appended[countAt]));
  EXPECT_EQ(bare.substr(countAt + 1, bare.size() - countAt - 2),
            appended.substr(countAt + 1, bare.size() - countAt - 2));
}

TEST_F(SemanticDataRun, appendingReplacesFormerDataWhereTheyStand) {
  page("a.html", "<title>Alpha</title><p>The print queue.");
  create();
  const std::string made = contentsOfFile(_options.outputPath);
  Value::Dictionary stale = *root().dictionaryIf();
  stale[helpindexkeys::luxIndexData] = Data::copy("stale");
  stale["A stranger's key"] = "kept";
  const Value kept = stale;
  _folder.write("book.helpindex", platform::classicArchiveWithRootObject(kept).view());
  append();
  stale[helpindexkeys::luxIndexData] = root()[helpindexkeys::luxIndexData];
  EXPECT_EQ(root(), Value(stale));
  EXPECT_NE(index(), nullptr);
  const std::string once = contentsOfFile(_options.outputPath);
  append();
  EXPECT_EQ(contentsOfFile(_options.outputPath), once);
}

TEST_F(SemanticDataRun, appendingKeepsByteOrderClassesAndNumbersOfAStrangersArchive) {
  page("a.html", "<title>Alpha</title><p>The print queue.");
  ClassicArchive archive;
  archive.byteOrder = ClassicArchive::ByteOrder::bigEndian;
  archive.streamerVersion = 3;
  ClassicArchive::Node dictionary;
  dictionary.nodeClass = ClassicArchive::Class::mutableDictionary;
  dictionary.children = {1, 2};
  ClassicArchive::Node key;
  key.nodeClass = ClassicArchive::Class::string;
  key.bytes = Data::copy("SKI_PREFER_NETWORK_FILES");
  ClassicArchive::Node number;
  number.nodeClass = ClassicArchive::Class::number;
  number.scalars = {"s", {int64_t{1}}};
  archive.nodes = {dictionary, key, number};
  archive.roots = {0};
  _folder.write("book.helpindex", platform::classicarchive::encode(archive).view());
  EXPECT_EQ(append().exitCode, ExitCode::success);
  const ClassicArchive read =
      platform::classicarchive::decode(Data::copy(contentsOfFile(_options.outputPath)));
  EXPECT_EQ(read.byteOrder, ClassicArchive::ByteOrder::bigEndian);
  EXPECT_EQ(read.streamerVersion, 3);
  ASSERT_EQ(read.nodes.size(), 5U);
  EXPECT_EQ(read.nodes[0].nodeClass, ClassicArchive::Class::mutableDictionary);
  EXPECT_EQ(read.nodes[1], key);
  EXPECT_EQ(read.nodes[2], number);
  EXPECT_NE(index(), nullptr);
}

TEST_F(SemanticDataRun, appendingToNothingOrToWhatIsNoIndexFailsAndTouchesNothing) {
  page("a.html", "<p>word");
  EXPECT_EQ(append().exitCode, ExitCode::failure);
  EXPECT_THAT(_report.errors, ElementsAre(HasSubstr("cannot add semantic data to")));
  EXPECT_FALSE(std::filesystem::exists(_options.outputPath));
  const std::string list(platform::classicArchiveWithRootObject(Value::Array{}).view());
  for (const std::string& former : {std::string("former"), std::string(), list}) {
    _folder.write("book.helpindex", former);
    EXPECT_EQ(append().exitCode, ExitCode::failure);
    EXPECT_EQ(contentsOfFile(_options.outputPath), former);
  }
}

TEST_F(SemanticDataRun, appendingThatCannotWriteLeavesTheFileAsItWas) {
  page("a.html", "<p>word");
  create();
  const std::string former = contentsOfFile(_options.outputPath);
  const auto files = std::make_shared<platform::FailingFileManager>();
  files->fail(platform::FailingFileManager::Operation::write, ENOSPC);
  platform::Environment environment = platform::Environment::system();
  environment.files = files;
  const platform::EnvironmentOverride override(environment);
  page("a.html", "<p>another word");
  EXPECT_EQ(append().exitCode, ExitCode::failure);
  EXPECT_THAT(_report.errors, ElementsAre(HasSubstr("cannot write")));
  EXPECT_EQ(contentsOfFile(_options.outputPath), former);
}

TEST_F(SemanticDataRun, theLanguageIsTheOneThatMostPagesSay) {
  page("a.html", "<html lang=de-AT><p>wort");
  page("b.html", "<html xml:lang=de><p>wort");
  page("c.html", "<html lang=en><p>word");
  page("d.html", "<html lang=xx><p>word");
  create();
  EXPECT_EQ(language(), "de");
}

TEST_F(SemanticDataRun, mallardPagesSayTheirLanguageToo) {
  page("a.page",
       "<page xmlns='http://projectmallard.org/1.0/' id='a' xml:lang='cs'><title>Alfa</title>"
       "<p xml:lang='en'>text</p></page>");
  create();
  EXPECT_EQ(language(), "cs");
}

TEST_F(SemanticDataRun, theNameOfALanguageFolderTellsMoreThanThePages) {
  _folder.write("book/fr.lproj/pages/a.html", "<html lang=en><p>mot");
  options();
  _options.folder = _folder / "book/fr.lproj/pages";
  run(_options, _report);
  EXPECT_EQ(language(), "fr");
}

TEST_F(SemanticDataRun, theLanguageOfTheCommandLineTellsMost) {
  _folder.write("book/fr.lproj/a.html", "<html lang=en><p>mot");
  options().language = "pt-BR";
  _options.folder = _folder / "book/fr.lproj";
  run(_options, _report);
  EXPECT_EQ(language(), "pt");
}

TEST_F(SemanticDataRun, aLanguageThatNobodyKnowsFails) {
  page("a.html", "<p>word");
  options().language = "klingon";
  EXPECT_EQ(create().exitCode, ExitCode::failure);
  EXPECT_THAT(_report.errors, ElementsAre(HasSubstr("klingon")));
  EXPECT_FALSE(std::filesystem::exists(_options.outputPath));
}

TEST_F(SemanticDataRun, theLanguageIsGuessedWherePagesSayNone) {
  page("a.html", "<p>Wählen Sie die Datei, die Sie mit dem Programm auf einem Drucker drucken.");
  create();
  EXPECT_EQ(language(), "de");
}

TEST_F(SemanticDataRun, pagesAfterTheSampleAreTokenisedLikeThoseBefore) {
  for (size_t i = 0; i < languageSample + 5; ++i) {
    page("p" + std::to_string(1000 + i) + ".html", "<html lang=en><p>printers");
  }
  create();
  ASSERT_EQ(index()->documentKeys().size(), languageSample + 5);
  for (const std::string& key : index()->documentKeys()) {
    EXPECT_THAT(tokens(key, LUXTokenKind::stem), Contains("printer"));
  }
}

TEST_F(SemanticDataRun, hugeAndTinyPagesAreTaken) {
  std::string huge = "<html lang=en><title>Huge</title><p>";
  for (int i = 0; i < 100000; ++i) {
    huge += "word" + std::to_string(i % 5000) + ' ';
  }
  huge += "<p>" + std::string(1 << 20, 'x');
  page("huge.html", huge);
  page("tiny.html", "<p>x");
  EXPECT_EQ(create().exitCode, ExitCode::success);
  EXPECT_GT(index()->tokenCountsForKey("huge.html").size(), 10000U);
  EXPECT_THAT(tokens("tiny.html", LUXTokenKind::stem), ElementsAre("tini", "x"));
}

TEST_F(SemanticDataRun, inspectionShowsPagesLanguageAndDamage) {
  page("a.html", "<html lang=de><title>Alpha</title><p>Wörter.");
  create();
  InspectOptions inspection;
  inspection.path = _options.outputPath;
  std::string output;
  EXPECT_EQ(inspect(inspection, output, _report), ExitCode::success);
  EXPECT_THAT(output, HasSubstr("semantic data: 1 pages, "));
  EXPECT_THAT(output, HasSubstr("  language de, thresholds 0.000 and 0.000\n"));
  EXPECT_THAT(output, Not(HasSubstr("DAMAGED")));

  Value::Dictionary file = *root().dictionaryIf();
  std::string bytes(file[helpindexkeys::luxIndexData].dataIf()->view());
  bytes.back() = '~';
  file[helpindexkeys::luxIndexData] = Data::copy(bytes);
  _folder.write("book.helpindex", platform::classicArchiveWithRootObject(file).view());
  output.clear();
  EXPECT_EQ(inspect(inspection, output, _report), ExitCode::success);
  EXPECT_THAT(output, HasSubstr("DAMAGED"));

  file[helpindexkeys::luxIndexData] = Data::copy("nonsense");
  _folder.write("book.helpindex", platform::classicArchiveWithRootObject(file).view());
  output.clear();
  EXPECT_EQ(inspect(inspection, output, _report), ExitCode::success);
  EXPECT_THAT(output, HasSubstr("semantic data: 8 bytes that cannot be read"));
}

}  // namespace
}  // namespace bvmake
