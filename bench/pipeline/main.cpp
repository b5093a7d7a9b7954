// Measures the plug-in whole, as a host runs it, and the command line on top of it: how good what
// reaches the owner is, and how long it takes.
#include <CLI/CLI.hpp>
#include <algorithm>
#include <cstdio>
#include <cstdlib>
#include <exception>
#include <filesystem>
#include <stdexcept>
#include <string>
#include <vector>

#include "bench/pipeline/PluginQuality.h"
#include "bench/pipeline/PluginSpeed.h"
#include "bench/pipeline/ProgramSpeed.h"
#include "bench/quality/HelpCollections.h"

namespace pipeline {

namespace {

namespace fs = std::filesystem;
using quality::Collection;

class WorkFolder {
 public:
  WorkFolder() {
    std::string pattern = (fs::temp_directory_path() / "zeb-pipeline-XXXXXX").string();
    if (mkdtemp(pattern.data()) == nullptr) {
      throw std::runtime_error("cannot make a temporary folder");
    }
    _path = pattern;
  }
  ~WorkFolder() {
    std::error_code ignored;
    fs::remove_all(_path, ignored);
  }
  WorkFolder(const WorkFolder&) = delete;
  WorkFolder& operator=(const WorkFolder&) = delete;
  const fs::path& path() const { return _path; }

 private:
  fs::path _path;
};

void measureQuality(const std::vector<std::string>& folders, const std::string& packages,
                    const std::vector<std::string>& only, bool withCollections,
                    bool withKnownPages) {
  const WorkFolder work;
  std::vector<Collection> made;
  if (!packages.empty()) {
    made = quality::helpCollections(packages);
  }
  if (withCollections) {
    std::vector<Collection> collections = quality::collectionsInFolders(folders);
    collections.insert(collections.end(), made.begin(), made.end());
    if (!only.empty()) {
      std::erase_if(collections, [&only](const Collection& collection) {
        return std::find(only.begin(), only.end(), collection.name) == only.end();
      });
    }
    std::printf("Collections:\n\n%s\n", collectionTables(collections, work.path()).c_str());
  }
  if (withKnownPages && !packages.empty()) {
    std::printf("Known pages:\n\n%s", knownPageTable(made, packages, work.path()).c_str());
  }
}

int run(int argc, char** argv) {
  CLI::App app("Measures the plug-in whole.");
  app.require_subcommand(1);

  CLI::App* const quality = app.add_subcommand("quality", "How good results are");
  std::vector<std::string> folders;
  std::string packages;
  std::vector<std::string> only;
  bool withoutCollections = false;
  bool withoutKnownPages = false;
  quality->add_option("--collections", folders, "Folder of a collection, or of collections")
      ->envname("ZEB_COLLECTIONS")
      ->delimiter(':');
  quality->add_option("--packages", packages, "Root that packages were unpacked to");
  quality->add_option("--only", only, "Names of the collections to measure");
  quality->add_flag("--without-collections", withoutCollections);
  quality->add_flag("--without-known-pages", withoutKnownPages);

  CLI::App* const speed = app.add_subcommand("speed", "How long whole searches take");
  SpeedOptions speedOptions;
  speed->add_option("--pages", speedOptions.roots, "Folders with help pages")->required();
  speed->add_option("--article-pages", speedOptions.articlePages);
  speed->add_option("--suggestion-pages", speedOptions.suggestionPages);
  speed->add_option("--books", speedOptions.bookCount);
  speed->add_option("--queries", speedOptions.queryCount);

  CLI::App* const program = app.add_subcommand("program", "How long the command line takes");
  std::vector<std::string> bookFolders;
  std::vector<std::string> programs = {ZEB_PROGRAM};
  size_t rounds = 30;
  program->add_option("--books", bookFolders, "Folders of help books to search in")->required();
  program->add_option("--rounds", rounds);
  program->add_option_function<std::vector<std::string>>(
      "--beside",
      [&programs](const std::vector<std::string>& others) {
        programs.insert(programs.end(), others.begin(), others.end());
      },
      "Other builds of the program to measure in turns with this one");

  CLI11_PARSE(app, argc, argv);
  if (program->parsed()) {
    const WorkFolder work;
    const fs::path caches = work.path() / "cache";
    indexBooks(bookFolders, caches);
    std::printf("%s\n%s", keystrokeTable(caches).c_str(),
                processTable(programs, caches, rounds).c_str());
  } else if (quality->parsed()) {
    measureQuality(folders, packages, only, !withoutCollections, !withoutKnownPages);
  } else {
    const WorkFolder work;
    std::fputs(speedTable(speedOptions, work.path()).c_str(), stdout);
  }
  std::fflush(stdout);
  return 0;
}

}  // namespace

}  // namespace pipeline

int main(int argc, char** argv) {
  int status = 1;
  try {
    status = pipeline::run(argc, argv);
  } catch (const std::exception& exception) {
    std::fprintf(stderr, "pipeline: %s\n", exception.what());
  }
  // Plug-ins are never unloaded, and their threads would find what they use destroyed.
  std::_Exit(status);
}
