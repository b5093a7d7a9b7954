#include "bvmake/CommandLine.h"

#include <unistd.h>

#include <CLI/CLI.hpp>
#include <algorithm>
#include <sstream>

#include "bvmake/Check.h"
#include "bvmake/Report.h"

namespace bvmake {

namespace {

constexpr const char* program = "bvmake";

constexpr const char* description =
    "Makes the help index of a folder of help pages (HTML, XHTML, Mallard, DocBook), shows what is "
    "in one, or checks whether one is sound.";

constexpr const char* footer =
    "Exit status: 0 done (pages that could not be read were reported), 1 failure, 2 wrong command "
    "line, 3 what was checked is damaged.";

constexpr size_t longestMinimumTermLength = 255;

ParsedCommandLine misuse(std::string_view what) {
  ParsedCommandLine result;
  result.exitCode = ExitCode::usage;
  result.errorOutput = std::string(program) + ": error: " + std::string(what) + "\n" +
                       "Run bvmake --help for more information.\n";
  return result;
}

}  // namespace

ParsedCommandLine parseCommandLine(const std::vector<std::string>& arguments) {
  CommandLine command;
  CreateOptions& create = command.create;
  InspectOptions& inspect = command.inspect;
  std::string term;
  std::string anchor;
  bool wantsCreate = false;

  CLI::App app(description, program);
  app.footer(footer);
  app.set_version_flag("--version", std::string(program) + " " + BVMAKE_VERSION);
  app.add_flag("--create", wantsCreate, "Index FOLDER and write the index to the file of --file");
  app.add_flag("--anchors", create.anchors, "Store which pages carry which anchors");
  app.add_flag("--generate-summaries", create.generateSummaries,
               "Use the first sentences of pages without description as their abstract");
  CLI::Option* file =
      app.add_option("--file", create.outputPath, "The help-index file to write")->type_name("OUT");
  app.add_option("--min-term-length", create.minimumTermLength,
                 "Leave terms of fewer than N characters out")
      ->type_name("N")
      ->check(CLI::Range(size_t{0}, longestMinimumTermLength).description(""));
  app.add_flag("--append-LUX-only", create.appendLUXOnly,
               "Add semantic data to the file there and change nothing else in it");
  app.add_option(
         "--language", create.language,
         "The language of the pages (\"de\", \"pt-BR\", \"German\"); without, it is found out")
      ->type_name("TAG");
  app.add_option(
         "--jobs", create.jobs,
         "Read pages in N threads; without, one a processor, or one with --lowered-priority")
      ->type_name("N")
      ->check(CLI::Range(size_t{1}, maximumJobs).description(""));
  app.add_flag("--lowered-priority", create.loweredPriority,
               "Give way to other programs, on the processor and on the disk");
  app.add_flag("-v,--verbose", command.verbosity,
               "Say more: once the run's figures, twice each page, thrice links left alone");
  CLI::Option* folder =
      app.add_option("FOLDER", create.folder, "The folder to index")->type_name("");
  CLI::Option* inspected =
      app.add_option("--inspect", inspect.path, "Show what is in the help-index file FILE")
          ->type_name("FILE");
  CLI::Option* checked = app.add_option("--check", command.checkedPath,
                                        "Check whether all of the help-index file FILE is sound")
                             ->type_name("FILE");
  CLI::Option* termOption =
      app.add_option("--term", term, "With --inspect: the pages that have WORD")->type_name("WORD");
  CLI::Option* anchorOption =
      app.add_option("--anchor", anchor, "With --inspect: the pages that carry the anchor NAME")
          ->type_name("NAME");
  app.add_flag("--pages", inspect.pages, "With --inspect: each page with its title and abstract");

  try {
    // The parser takes its words from the back.
    app.parse(std::vector<std::string>(arguments.rbegin(), arguments.rend()));
  } catch (const CLI::Success& success) {
    ParsedCommandLine result;
    std::ostringstream output;
    app.exit(success, output, output);
    result.output = output.str();
    return result;
  } catch (const CLI::ParseError& error) {
    return misuse(error.what());
  }

  const bool inspecting = inspected->count() != 0;
  const bool checking = checked->count() != 0;
  const int actions = (wantsCreate ? 1 : 0) + (inspecting ? 1 : 0) + (checking ? 1 : 0);
  if (actions > 1) {
    return misuse("--create, --inspect and --check exclude each other");
  }
  if (actions == 0) {
    return misuse("nothing to do: give --create, --inspect or --check");
  }
  if (!inspecting && (termOption->count() != 0 || anchorOption->count() != 0 || inspect.pages)) {
    return misuse("--term, --anchor and --pages go with --inspect");
  }
  if (!wantsCreate && (folder->count() != 0 || file->count() != 0)) {
    return misuse(inspecting ? "--inspect takes neither FOLDER nor --file"
                             : "--check takes neither FOLDER nor --file");
  }
  if (wantsCreate && file->count() == 0) {
    return misuse("--create needs --file OUT");
  }
  if (wantsCreate && folder->count() == 0) {
    return misuse("--create needs the FOLDER to index");
  }
  if (wantsCreate && (create.folder.empty() || create.outputPath.empty())) {
    return misuse("FOLDER and OUT must not be empty");
  }
  if (termOption->count() != 0) {
    inspect.term = std::move(term);
  }
  if (anchorOption->count() != 0) {
    inspect.anchor = std::move(anchor);
  }
  command.action = inspecting ? CommandLine::Action::inspect
                   : checking ? CommandLine::Action::check
                              : CommandLine::Action::create;
  ParsedCommandLine result;
  result.command = std::move(command);
  return result;
}

int runProgram(const std::vector<std::string>& arguments, std::FILE* output, std::FILE* errors) {
  const ParsedCommandLine parsed = parseCommandLine(arguments);
  std::fwrite(parsed.output.data(), 1, parsed.output.size(), output);
  std::fwrite(parsed.errorOutput.data(), 1, parsed.errorOutput.size(), errors);
  if (!parsed.command) {
    return static_cast<int>(parsed.exitCode);
  }
  StreamReport report(errors, program, parsed.command->verbosity);
  if (parsed.command->action == CommandLine::Action::create) {
    if (isatty(fileno(errors)) != 0) {
      report.showProgressBar();
    }
    return static_cast<int>(run(parsed.command->create, report).exitCode);
  }
  std::string text;
  const ExitCode code = parsed.command->action == CommandLine::Action::check
                            ? check(parsed.command->checkedPath, text, report)
                            : inspect(parsed.command->inspect, text, report);
  const bool written = std::fwrite(text.data(), 1, text.size(), output) == text.size();
  if (!written || std::fflush(output) != 0) {
    report.error("cannot write to standard output");
    return static_cast<int>(ExitCode::failure);
  }
  return static_cast<int>(code);
}

}  // namespace bvmake
