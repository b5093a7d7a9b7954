// Man pages and completions name what the programs understand: no more, and no less.
#include <gmock/gmock.h>

#include <fstream>
#include <iterator>
#include <regex>
#include <set>
#include <sstream>
#include <string>
#include <vector>

#include "bvmake/CommandLine.h"
#include "tests/zeb/World.h"
#include "zebd/Daemon.h"

namespace {

using Words = std::set<std::string>;

std::string contents(const std::string& name) {
  std::ifstream file(std::string(ZEB_SOURCE_DIR) + "/" + name);
  EXPECT_TRUE(file.is_open()) << name;
  return {std::istreambuf_iterator<char>(file), {}};
}

/// What the first group of the expression matches.
Words matches(const std::string& text, const std::string& expression) {
  const std::regex pattern(expression);
  Words words;
  for (std::sregex_iterator match(text.begin(), text.end(), pattern), end; match != end; ++match) {
    words.insert((*match)[1].str());
  }
  return words;
}

Words both(Words words, const Words& others) {
  words.insert(others.begin(), others.end());
  return words;
}

/// The long options in what a program says of itself.
Words optionsInHelp(const std::string& help) {
  return matches(help, "\n  (?:-\\w,)?--([A-Za-z][A-Za-z-]*)");
}

Words optionsInManual(const std::string& name) {
  return matches(contents(name), "Fl -([A-Za-z][A-Za-z-]*)");
}

Words optionsInBash(const std::string& name) {
  return matches(contents(name), "--([A-Za-z][A-Za-z-]*)");
}

/// Those that are described, not those of the program that it asks for books.
Words optionsInZsh(const std::string& name) {
  return both(matches(contents(name), "--([A-Za-z][A-Za-z-]*)=?\\["),
              matches(contents(name), "--([A-Za-z][A-Za-z-]*)\\}'\\["));
}

Words optionsInFish(const std::string& name) {
  return matches(contents(name), "\ncomplete -c [^\n]*? -l ([A-Za-z][A-Za-z-]*)");
}

std::string helpOfZeb(const std::vector<std::string>& arguments) {
  std::ostringstream out;
  std::ostringstream err;
  zeb::Console console(out, err);
  EXPECT_EQ(zeb::run(arguments, tests::installation(), console), zeb::ExitCode::success);
  return out.str();
}

Words commandsOfZeb() {
  const std::string help = helpOfZeb({"--help"});
  return matches(help.substr(help.find("Subcommands:")), "\n  ([a-z]+) ");
}

Words optionsOfZeb() {
  Words options = optionsInHelp(helpOfZeb({"--help"}));
  for (const std::string& command : commandsOfZeb()) {
    options = both(options, optionsInHelp(helpOfZeb({command, "--help"})));
  }
  return options;
}

TEST(ManualsTest, ProgramsSayWhatTheyUnderstand) {
  EXPECT_TRUE(commandsOfZeb().contains("search"));
  EXPECT_TRUE(optionsOfZeb().contains("limit"));
}

TEST(ManualsTest, ManualOfZebHasEveryCommandAndOptionAndNoOther) {
  EXPECT_EQ(matches(contents("docs/man/zeb.1"), "\n\\.It Cm ([a-z]+) [A-Z]"), commandsOfZeb());
  Words options = optionsOfZeb();
  // Of bvmake, referred to.
  options.insert("check");
  EXPECT_EQ(optionsInManual("docs/man/zeb.1"), options);
}

TEST(ManualsTest, ManualOfZebDescribesTheOptionsOfEachCommand) {
  const std::string manual = contents("docs/man/zeb.1");
  for (const std::string& command : commandsOfZeb()) {
    const Words synopsis = matches(manual, "\n(\\.It Cm " + command + " [A-Z].*)");
    ASSERT_EQ(synopsis.size(), 1U) << command;
    Words options = optionsInHelp(helpOfZeb({command, "--help"}));
    options.erase("help");
    EXPECT_EQ(matches(*synopsis.begin(), "Fl -([A-Za-z][A-Za-z-]*)"), options) << command;
  }
}

TEST(ManualsTest, CompletionsOfZebHaveEveryCommandAndOptionAndNoOther) {
  EXPECT_EQ(
      matches(" " + *matches(contents("install/completions/zeb.bash"), "local commands='([^']*)'")
                         .begin(),
              " ([a-z]+)"),
      commandsOfZeb());
  EXPECT_EQ(matches(contents("install/completions/_zeb"), "\n    '([a-z]+):"), commandsOfZeb());
  EXPECT_EQ(matches(contents("install/completions/zeb.fish"), "none -a ([a-z]+)"), commandsOfZeb());
  EXPECT_EQ(optionsInBash("install/completions/zeb.bash"), optionsOfZeb());
  EXPECT_EQ(optionsInZsh("install/completions/_zeb"), optionsOfZeb());
  EXPECT_EQ(optionsInFish("install/completions/zeb.fish"), optionsOfZeb());
}

TEST(ManualsTest, ManualAndCompletionsOfTheIndexingToolHaveEveryOptionAndNoOther) {
  const Words options = optionsInHelp(bvmake::parseCommandLine({"--help"}).output);
  EXPECT_TRUE(options.contains("create"));
  EXPECT_EQ(optionsInManual("docs/man/bvmake.1"), options);
  EXPECT_EQ(optionsInBash("install/completions/bvmake.bash"), options);
  EXPECT_EQ(optionsInZsh("install/completions/_bvmake"), options);
  EXPECT_EQ(optionsInFish("install/completions/bvmake.fish"), options);
}

TEST(ManualsTest, ManualOfTheDaemonHasEveryOptionAndNoOther) {
  std::ostringstream out;
  std::ostringstream err;
  int exitCode = 0;
  (void)zebd::parseDaemonOptions({"--help"}, out, err, exitCode);
  EXPECT_EQ(optionsInManual("docs/man/zebd.8"), optionsInHelp(out.str()));
}

}  // namespace
