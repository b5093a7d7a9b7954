// Measures how good search by meaning is, beside other engines over the same pages, and prints the
// tables of docs/quality.md.

#include <CLI/CLI.hpp>
#include <algorithm>
#include <cstdio>
#include <cstdlib>
#include <exception>
#include <filesystem>
#include <stdexcept>
#include <string>
#include <vector>

#include "bench/quality/Checks.h"
#include "bench/quality/HelpCollections.h"
#include "bench/quality/IndexedBook.h"
#include "bench/quality/Tables.h"
#include "host/Luxwell/HelpTokenizer.h"

namespace quality {

namespace {

namespace fs = std::filesystem;

constexpr size_t rankingDepth = 1000;

Measured measuredEngine(Engine& engine, const Collection& collection) {
  std::vector<Ranking> rankings;
  for (const Query& query : collection.queries) {
    rankings.push_back(engine.search(query.text, rankingDepth));
  }
  Measured measured;
  measured.metrics = metricsOfRankings(collection, rankings, &measured.perQuery);
  return measured;
}

Result measuredCollection(const Collection& collection, const std::vector<std::string>& foreign,
                          bool withChecks, const fs::path& folder) {
  Result result;
  result.name = collection.name;
  result.origin = collection.origin;
  result.language = collection.language;
  result.documentCount = collection.documents.size();
  result.queryCount = collection.queries.size();
  const IndexedBook book(collection, folder);
  result.detectedLanguage = book.tokenizer().languageTag();
  result.engines[ours] = measuredEngine(*luxwellEngine(book), collection);
  result.engines[xapian] = measuredEngine(*xapianEngine(collection, 1), collection);
  result.engines[xapianTitles] = measuredEngine(*xapianEngine(collection, 4), collection);
  result.engines[sqlite] = measuredEngine(*sqliteEngine(collection), collection);
  result.engines[bm25] = measuredEngine(*bm25Engine(book), collection);
  result.typed = unfinishedQueries(book);
  if (withChecks) {
    std::vector<std::string> failures;
    result.titles = exactTitles(book, &failures);
    for (const std::string& title : failures) {
      std::fprintf(stderr, "%s: title not found first: %s\n", collection.name.c_str(),
                   title.c_str());
    }
    result.everyday = cutOff(book, everydayQuestions());
    result.foreign = cutOff(book, foreign);
    result.completions = completions(book);
    result.similar = similarSearches(book, false);
    result.similarOtherWords = similarSearches(book, true);
  }
  return result;
}

std::vector<std::string> queriesOf(const std::vector<Collection>& collections,
                                   const std::string& name) {
  std::vector<std::string> queries;
  for (const Collection& collection : collections) {
    if (collection.name == name) {
      for (const Query& query : collection.queries) {
        queries.push_back(query.text);
      }
    }
  }
  return queries;
}

int run(int argc, char** argv) {
  CLI::App app("Measures how good search by meaning is.");
  std::vector<std::string> folders;
  std::vector<std::string> packages;
  std::vector<std::string> only;
  std::string save;
  bool rankingsOnly = false;
  app.add_option("--collections", folders, "Folder of a collection, or of collections")
      ->envname("ZEB_COLLECTIONS")
      ->delimiter(':');
  app.add_option("--packages", packages, "Root that packages with help books were unpacked to");
  app.add_option("--only", only, "Names of the collections to measure");
  app.add_option("--save", save, "Write the collections made from packages to this folder");
  app.add_flag("--rankings-only", rankingsOnly, "Leave out what is no ranking");
  CLI11_PARSE(app, argc, argv);

  std::vector<Collection> collections = collectionsInFolders(folders);
  for (const std::string& root : packages) {
    for (Collection& collection : helpCollections(root)) {
      if (!save.empty()) {
        writeCollection(collection, fs::path(save) / collection.name);
      }
      collections.push_back(std::move(collection));
    }
  }
  const std::vector<std::string> aerodynamics = queriesOf(collections, "cran");
  const std::vector<std::string> desktop = queriesOf(collections, "gnome-descriptions");
  if (!only.empty()) {
    std::erase_if(collections, [&only](const Collection& collection) {
      return std::find(only.begin(), only.end(), collection.name) == only.end();
    });
  }
  std::string work = (fs::temp_directory_path() / "zeb-quality-XXXXXX").string();
  if (mkdtemp(work.data()) == nullptr) {
    throw std::runtime_error("cannot make a temporary folder");
  }
  std::vector<Result> results;
  for (const Collection& collection : collections) {
    const fs::path folder = fs::path(work) / "book";
    results.push_back(measuredCollection(
        collection, collection.name == "cran" ? desktop : aerodynamics, !rankingsOnly, folder));
    fs::remove_all(folder);
    std::fprintf(stderr, "%s: %.3f\n", collection.name.c_str(),
                 results.back().engines[ours].metrics.ndcg10);
  }
  fs::remove_all(work);
  std::fputs(tables(results, !rankingsOnly).c_str(), stdout);
  return 0;
}

}  // namespace

}  // namespace quality

int main(int argc, char** argv) {
  try {
    return quality::run(argc, argv);
  } catch (const std::exception& exception) {
    std::fprintf(stderr, "quality: %s\n", exception.what());
    return 1;
  }
}
