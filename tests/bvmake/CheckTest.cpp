#include "bvmake/Check.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "TestSupport.h"
#include "bvmake/HelpIndexFile.h"
#include "platform/ClassicArchive.h"
#include "platform/Data.h"

namespace bvmake {
namespace {

using platform::Value;
using testing::Contains;
using testing::ElementsAre;
using testing::EndsWith;
using testing::HasSubstr;
using testing::IsEmpty;
using testing::Not;
using testing::SizeIs;

class Check : public testing::Test {
 protected:
  Check() {
    _folder.write("book/a.html", "<title>Alpha</title><p id=here>Words of it.");
    _folder.write("book/b.html", "<title>Beta</title><p id=here>Other words.");
    _folder.write("book/c.html", "<meta name=robots content=noindex><p id=there>Hidden words.");
    CreateOptions options;
    options.folder = _folder / "book";
    options.outputPath = path();
    options.anchors = true;
    options.generateSummaries = true;
    run(options, _report);
    _root = *readHelpIndexFile(path());
  }

  std::string path() const { return _folder / "book.helpindex"; }

  ExitCode checkFile() {
    _output.clear();
    return check(path(), _output, _report);
  }

  /// Problems of the file with one value replaced.
  std::vector<std::string> problemsWith(const char* key, Value value) const {
    Value::Dictionary root;
    for (const auto& entry : *_root.dictionaryIf()) {
      if (entry.first != key) {
        root.emplace(entry.first, entry.second);
      }
    }
    root.emplace(key, std::move(value));
    return helpIndexProblems(std::move(root));
  }

  Value anchors(Value pages) const {
    Value::Dictionary table;
    table.emplace("name", std::move(pages));
    return table;
  }

  TemporaryFolder _folder;
  RecordingReport _report;
  Value _root;
  std::string _output;
};

TEST_F(Check, whatTheToolMakesIsSound) {
  EXPECT_EQ(checkFile(), ExitCode::success);
  EXPECT_EQ(_output, path() + ": sound\n");
  EXPECT_THAT(_report.errors, IsEmpty());
}

TEST_F(Check, emptyIndexAndEmptyDictionaryAreSound) {
  EXPECT_THAT(helpIndexProblems(Value::Dictionary{}), IsEmpty());
  const TemporaryFolder folder;
  folder.makeFolder("book");
  CreateOptions options;
  options.folder = folder / "book";
  options.outputPath = path();
  options.anchors = true;
  run(options, _report);
  EXPECT_EQ(checkFile(), ExitCode::success);
}

TEST_F(Check, fileThatCannotBeReadIsAFailure) {
  EXPECT_EQ(check(_folder / "none", _output, _report), ExitCode::failure);
  EXPECT_THAT(_report.errors, ElementsAre(HasSubstr("cannot read")));
  EXPECT_EQ(_output, "");
}

TEST_F(Check, fileThatIsNoArchiveIsDamaged) {
  _folder.write("book.helpindex", "text");
  EXPECT_EQ(checkFile(), ExitCode::damaged);
  EXPECT_THAT(_output, HasSubstr("no help index"));
  EXPECT_THAT(_output, EndsWith(": damaged, 1 problems\n"));
  _folder.write("book.helpindex", "");
  EXPECT_EQ(checkFile(), ExitCode::damaged);
}

TEST_F(Check, archiveOfSomethingElseIsDamaged) {
  const platform::Data bytes = platform::classicArchiveWithRootObject(Value("text"));
  _folder.write("book.helpindex", bytes.view());
  EXPECT_EQ(checkFile(), ExitCode::damaged);
  EXPECT_THAT(_output, HasSubstr("not of a dictionary"));
}

TEST_F(Check, everyCutAndMostChangedBytesAreFound) {
  const std::string bytes = contentsOfFile(path());
  for (size_t length = 0; length < bytes.size(); length += 7) {
    _folder.write("cut", bytes.substr(0, length));
    EXPECT_EQ(check(_folder / "cut", _output, _report), ExitCode::damaged) << length;
  }
  size_t unnoticed = 0;
  for (size_t at = 0; at < bytes.size(); at += 3) {
    std::string changed = bytes;
    changed[at] = static_cast<char>(changed[at] ^ 0x10);
    _folder.write("changed", changed);
    unnoticed += check(_folder / "changed", _output, _report) == ExitCode::success ? 1 : 0;
  }
  // What stands between sections, reserved fields, the spelling of an anchor or of a key.
  EXPECT_LT(unnoticed, bytes.size() / 3 / 8);
}

TEST_F(Check, valuesOfWrongKindsAreNamed) {
  EXPECT_THAT(problemsWith("SKI_INDEX_DATA", Value("x")),
              Contains("the value of SKI_INDEX_DATA is not data"));
  EXPECT_THAT(problemsWith("LUXIndexData", Value(1)),
              ElementsAre("the value of LUXIndexData is not data"));
  EXPECT_THAT(problemsWith("SKI_ANCHOR_DATA", Value("x")),
              ElementsAre("the value of SKI_ANCHOR_DATA is not a dictionary"));
  EXPECT_THAT(problemsWith("SKI_USE_REMOTE_ROOT", Value("x")),
              ElementsAre("the value of SKI_USE_REMOTE_ROOT is not a boolean"));
  EXPECT_THAT(problemsWith("SKI_PREFER_NETWORK_FILES", Value("x")),
              ElementsAre("the value of SKI_PREFER_NETWORK_FILES is not a boolean"));
  EXPECT_THAT(problemsWith("SKI_REMOTE_ROOT", Value(true)),
              ElementsAre("the value of SKI_REMOTE_ROOT is not a string"));
  EXPECT_THAT(problemsWith("unknown", Value(true)), IsEmpty());
}

TEST_F(Check, keywordIndexThatCannotBeOpenedIsNamed) {
  EXPECT_THAT(problemsWith("SKI_INDEX_DATA", platform::Data::copy("nonsense")),
              Contains("keyword index: it cannot be opened"));
}

TEST_F(Check, damagedKeywordIndexIsNamed) {
  std::string bytes(_root["SKI_INDEX_DATA"].dataIf()->view());
  bytes.back() = static_cast<char>(bytes.back() ^ 1);
  EXPECT_THAT(problemsWith("SKI_INDEX_DATA", platform::Data::copy(bytes)),
              Contains(HasSubstr("keyword index: the checksum of section")));
}

TEST_F(Check, damagedSemanticDataAreNamed) {
  EXPECT_THAT(problemsWith("LUXIndexData", platform::Data::copy("nonsense")),
              ElementsAre("semantic data: header, table or length are wrong"));
}

TEST_F(Check, halvesThatSpeakOfDifferentPagesAreNamed) {
  const TemporaryFolder folder;
  folder.write("book/other.html", "<p>words");
  CreateOptions options;
  options.folder = folder / "book";
  options.outputPath = folder / "o";
  run(options, _report);
  const Value other = *readHelpIndexFile(folder / "o");
  EXPECT_THAT(problemsWith("LUXIndexData", *other["LUXIndexData"].dataIf()),
              ElementsAre("semantic data: the page other.html is not in the keyword index"));
}

TEST_F(Check, anchorsAreLookedAt) {
  const auto problems = [&](Value pages) {
    return problemsWith("SKI_ANCHOR_DATA", anchors(std::move(pages)));
  };
  EXPECT_THAT(problems(Value::Array{"/a.html", "/b.html"}), IsEmpty());
  EXPECT_THAT(problems("text"), ElementsAre("anchors: name: no list of pages"));
  EXPECT_THAT(problems(Value::Array{}), ElementsAre("anchors: name: no list of pages"));
  EXPECT_THAT(problems(Value::Array{1}), ElementsAre("anchors: name: no path of a page"));
  EXPECT_THAT(problems(Value::Array{"a.html"}), ElementsAre("anchors: name: no path of a page"));
  EXPECT_THAT(problems(Value::Array{"/b.html", "/a.html"}),
              ElementsAre("anchors: name: pages out of order"));
  EXPECT_THAT(problems(Value::Array{"/none.html"}),
              ElementsAre("anchors: name: the page /none.html is not in the keyword index"));
}

TEST_F(Check, problemsAreCountedToABound) {
  Value::Dictionary table;
  for (int i = 0; i < 1000; ++i) {
    table.emplace("a" + std::to_string(i), Value(1));
  }
  EXPECT_THAT(problemsWith("SKI_ANCHOR_DATA", std::move(table)), SizeIs(maximumProblemCount + 1));
}

TEST_F(Check, programTellsByItsExitStatus) {
  const ChildResult sound = runBvmake({"--check", path()});
  EXPECT_EQ(sound.status, 0);
  EXPECT_EQ(sound.output, path() + ": sound\n");
  EXPECT_EQ(sound.errors, "");
  _folder.write("bad\nname", "text");
  const ChildResult damaged = runBvmake({"--check", _folder / "bad\nname"});
  EXPECT_EQ(damaged.status, 3);
  EXPECT_THAT(damaged.output, HasSubstr("bad?name: no help index"));
  EXPECT_EQ(damaged.errors, "");
  const ChildResult missing = runBvmake({"--check", _folder / "none"});
  EXPECT_EQ(missing.status, 1);
  EXPECT_THAT(missing.errors, HasSubstr("bvmake: error: cannot read"));
}

}  // namespace
}  // namespace bvmake
