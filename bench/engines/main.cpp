// How fast and how small the keyword engine is beside others over the same words of the same pages,
// in one run. Fails before anything is timed when the engines do not find the same.
#include <CLI/CLI.hpp>
#include <cstdio>
#include <exception>

#include "bench/engines/Memory.h"
#include "bench/engines/Tables.h"

int main(int count, char** arguments) {
  CLI::App app("Compares the keyword engine with others");
  engines::Settings settings;
  app.add_option("--corpus", settings.corpus, "File made by bench_corpus");
  app.add_option("--folder", settings.folder, "Where the indexes are made");
  app.add_option("--questions", settings.questionCount, "Questions of each kind");
  app.add_option("--seed", settings.seed, "Other questions with another number");
  app.add_option("--tables", settings.tables,
                 "Only these: engine, plugin, letters, opening, size, building, memory");
  std::string engine;
  std::string folder;
  std::string questions;
  CLI::App* const memory = app.add_subcommand("memory", "Measures one search; used by itself");
  memory->add_option("engine", engine)->required();
  memory->add_option("folder", folder)->required();
  memory->add_option("questions", questions)->required();
  CLI11_PARSE(app, count, arguments);
  try {
    if (*memory) {
      return engines::searchForMemory(engine, folder, questions);
    }
    engines::printTables(settings);
    return 0;
  } catch (const std::exception& exception) {
    std::fprintf(stderr, "bench_engines: %s\n", exception.what());
    return 1;
  }
}
