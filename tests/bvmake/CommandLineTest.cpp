#include "bvmake/CommandLine.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <algorithm>
#include <numeric>

namespace bvmake {
namespace {

using testing::HasSubstr;
using testing::StartsWith;

using Words = std::vector<std::string>;

CommandLine parsed(const Words& words) {
  const ParsedCommandLine result = parseCommandLine(words);
  EXPECT_TRUE(result.command) << result.errorOutput;
  EXPECT_EQ(result.errorOutput, "");
  EXPECT_EQ(result.output, "");
  return result.command.value_or(CommandLine());
}

std::string misuse(const Words& words) {
  const ParsedCommandLine result = parseCommandLine(words);
  EXPECT_FALSE(result.command);
  EXPECT_EQ(result.exitCode, ExitCode::usage);
  EXPECT_EQ(result.output, "");
  EXPECT_THAT(result.errorOutput, StartsWith("bvmake: error: "));
  return result.errorOutput;
}

void expectWhole(const CommandLine& command) {
  EXPECT_EQ(command.action, CommandLine::Action::create);
  EXPECT_EQ(command.create.folder, "/the/folder");
  EXPECT_EQ(command.create.outputPath, "/the/out.helpindex");
  EXPECT_TRUE(command.create.anchors);
  EXPECT_TRUE(command.create.generateSummaries);
  EXPECT_EQ(command.create.minimumTermLength, 3U);
  EXPECT_TRUE(command.create.appendLUXOnly);
  EXPECT_TRUE(command.create.loweredPriority);
  EXPECT_EQ(command.verbosity, 2);
}

TEST(CommandLine, everyOptionIsReadInTheOrderInWhichTheHelpDaemonGivesThem) {
  expectWhole(parsed({"--create", "--anchors", "--generate-summaries", "--file",
                      "/the/out.helpindex", "--min-term-length", "3", "--append-LUX-only",
                      "--lowered-priority", "--verbose", "--verbose", "/the/folder"}));
}

TEST(CommandLine, theOrderOfOptionsDoesNotMatter) {
  const std::vector<Words> groups = {{"--create"},
                                     {"--anchors"},
                                     {"--generate-summaries"},
                                     {"--file", "/the/out.helpindex"},
                                     {"--min-term-length", "3"},
                                     {"--append-LUX-only"},
                                     {"--lowered-priority"},
                                     {"--verbose"},
                                     {"--verbose"},
                                     {"/the/folder"}};
  std::vector<size_t> order(groups.size());
  std::iota(order.begin(), order.end(), 0U);
  // Every option in every place, and a few hundred more orders.
  for (int round = 0; round < 400; ++round) {
    Words words;
    for (const size_t index : order) {
      words.insert(words.end(), groups[index].begin(), groups[index].end());
    }
    expectWhole(parsed(words));
    if (round < 10) {
      std::rotate(order.begin(), order.begin() + 1, order.end());
    } else {
      std::next_permutation(order.begin(), order.end());
    }
  }
}

TEST(CommandLine, onlyActionFileAndFolderAreNeeded) {
  const CommandLine command = parsed({"--create", "--file", "o", "f"});
  EXPECT_FALSE(command.create.anchors);
  EXPECT_FALSE(command.create.generateSummaries);
  EXPECT_EQ(command.create.minimumTermLength, 1U);
  EXPECT_FALSE(command.create.appendLUXOnly);
  EXPECT_FALSE(command.create.loweredPriority);
  EXPECT_EQ(command.verbosity, 0);
}

TEST(CommandLine, valuesMayBeJoinedByAnEqualsSign) {
  const CommandLine command = parsed({"--create", "--file=o", "--min-term-length=4", "f"});
  EXPECT_EQ(command.create.outputPath, "o");
  EXPECT_EQ(command.create.minimumTermLength, 4U);
}

TEST(CommandLine, folderThatLooksLikeAnOptionFollowsTwoDashes) {
  EXPECT_EQ(parsed({"--create", "--file", "o", "--", "--folder"}).create.folder, "--folder");
}

TEST(CommandLine, inspectionTakesTermAnchorAndPages) {
  const CommandLine command =
      parsed({"--anchor", "name", "--inspect", "file", "--pages", "--term", "word"});
  EXPECT_EQ(command.action, CommandLine::Action::inspect);
  EXPECT_EQ(command.inspect.path, "file");
  EXPECT_EQ(command.inspect.term, "word");
  EXPECT_EQ(command.inspect.anchor, "name");
  EXPECT_TRUE(command.inspect.pages);
  EXPECT_EQ(parsed({"--inspect", "file"}).inspect.term, std::nullopt);
}

TEST(CommandLine, checkTakesAFile) {
  const CommandLine command = parsed({"--check", "file"});
  EXPECT_EQ(command.action, CommandLine::Action::check);
  EXPECT_EQ(command.checkedPath, "file");
}

TEST(CommandLine, jobsAreANumberFromOne) {
  EXPECT_EQ(parsed({"--create", "--file", "o", "f"}).create.jobs, 0U);
  EXPECT_EQ(parsed({"--create", "--file", "o", "--jobs", "3", "f"}).create.jobs, 3U);
  for (const char* number : {"0", "-1", "257", "many", ""}) {
    EXPECT_THAT(misuse({"--create", "--file", "o", "--jobs", number, "f"}), HasSubstr("--jobs"))
        << number;
  }
}

TEST(CommandLine, wrongNumbersAreMisuse) {
  for (const char* number : {"three", "-1", "3.5", "1000", "99999999999999999999999", "", "3x"}) {
    EXPECT_THAT(misuse({"--create", "--file", "o", "--min-term-length", number, "f"}),
                HasSubstr("--min-term-length"))
        << number;
  }
}

TEST(CommandLine, whatIsMissingIsNamed) {
  EXPECT_THAT(misuse({}), HasSubstr("--create, --inspect or --check"));
  EXPECT_THAT(misuse({"--file", "o", "f"}), HasSubstr("--create, --inspect or --check"));
  EXPECT_THAT(misuse({"--create", "f"}), HasSubstr("--file"));
  EXPECT_THAT(misuse({"--create", "--file", "o"}), HasSubstr("FOLDER"));
  EXPECT_THAT(misuse({"--create", "--file"}), HasSubstr("--file"));
  EXPECT_THAT(misuse({"--create", "--file", "o", ""}), HasSubstr("empty"));
  EXPECT_THAT(misuse({"--inspect"}), HasSubstr("--inspect"));
  EXPECT_THAT(misuse({"--check"}), HasSubstr("--check"));
}

TEST(CommandLine, whatIsTooMuchIsNamed) {
  EXPECT_THAT(misuse({"--create", "--file", "o", "f", "g"}), HasSubstr("g"));
  EXPECT_THAT(misuse({"--create", "--file", "o", "--file", "p", "f"}), HasSubstr("--file"));
  EXPECT_THAT(misuse({"--create", "--file", "o", "--unknown", "f"}), HasSubstr("--unknown"));
  EXPECT_THAT(misuse({"--create", "--inspect", "i", "--file", "o", "f"}), HasSubstr("exclude"));
  EXPECT_THAT(misuse({"--create", "--file", "o", "--term", "t", "f"}), HasSubstr("--inspect"));
  EXPECT_THAT(misuse({"--create", "--check", "i", "--file", "o", "f"}), HasSubstr("exclude"));
  EXPECT_THAT(misuse({"--inspect", "i", "--check", "i"}), HasSubstr("exclude"));
  EXPECT_THAT(misuse({"--check", "i", "--term", "t"}), HasSubstr("--inspect"));
  EXPECT_THAT(misuse({"--inspect", "i", "f"}), HasSubstr("--inspect takes neither FOLDER"));
  EXPECT_THAT(misuse({"--check", "i", "f"}), HasSubstr("--check takes neither FOLDER"));
  EXPECT_THAT(misuse({"--check", "i", "--file", "o"}), HasSubstr("--check takes neither FOLDER"));
}

TEST(CommandLine, helpNamesEveryOptionAndSucceeds) {
  const ParsedCommandLine result = parseCommandLine({"--help"});
  EXPECT_FALSE(result.command);
  EXPECT_EQ(result.exitCode, ExitCode::success);
  EXPECT_EQ(result.errorOutput, "");
  for (const char* option :
       {"--create", "--anchors", "--generate-summaries", "--file", "--min-term-length",
        "--append-LUX-only", "--language", "--jobs", "--lowered-priority", "--check", "--verbose",
        "--inspect", "--term", "--anchor", "--pages", "--version", "FOLDER", "Exit status"}) {
    EXPECT_THAT(result.output, HasSubstr(option));
  }
}

TEST(CommandLine, versionIsPrintedAndSucceeds) {
  const ParsedCommandLine result = parseCommandLine({"--version"});
  EXPECT_FALSE(result.command);
  EXPECT_EQ(result.exitCode, ExitCode::success);
  EXPECT_THAT(result.output, testing::MatchesRegex("bvmake [0-9]+\\.[0-9]+\\.[0-9]+\n"));
}

}  // namespace
}  // namespace bvmake
