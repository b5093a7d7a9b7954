#include "bench/pipeline/PluginSpeed.h"

#include <fmt/format.h>

#include <algorithm>
#include <chrono>
#include <cstdio>
#include <functional>
#include <limits>
#include <utility>

#include "bench/Luxwell/PageSample.h"
#include "bench/pipeline/PluginWorld.h"
#include "bench/quality/Collection.h"
#include "host/Luxwell/HelpLUXModel.h"
#include "host/Luxwell/LUXQuery.h"
#include "host/Zebrine/ZEBConstants.h"

namespace pipeline {

namespace {

namespace fs = std::filesystem;
using quality::Collection;

constexpr int roundCount = 5;
/// The plug-in's first look at whether its queries have answered.
constexpr double waitingStep = 0.010;

class Nobody : public LUXQueryDelegate {
 public:
  void queryDidFinishWithResults(const std::shared_ptr<LUXQuery>& /*query*/,
                                 const std::vector<std::shared_ptr<LUXHit>>& /*results*/) override {
  }
};

/// Seconds of every query, the least of all rounds: other programs run beside this one.
using Times = std::vector<double>;
using Timed = std::function<double(const std::string& text)>;

/// Each text with every way to search, in turns; the first round only warms up.
std::vector<Times> race(const std::vector<std::string>& texts, const std::vector<Timed>& ways) {
  std::vector<Times> best(ways.size(),
                          Times(texts.size(), std::numeric_limits<double>::infinity()));
  for (int round = 0; round <= roundCount; ++round) {
    for (size_t text = 0; text < texts.size(); ++text) {
      for (size_t way = 0; way < ways.size(); ++way) {
        const double seconds = ways[way](texts[text]);
        if (round > 0) {
          best[way][text] = std::min(best[way][text], seconds);
        }
      }
    }
  }
  for (Times& times : best) {
    std::sort(times.begin(), times.end());
  }
  return best;
}

std::string cells(const Times& times, double minus = 0) {
  const auto at = [&](size_t percent) {
    return (times[std::min(times.size() - 1, times.size() * percent / 100)] - minus) * 1000;
  };
  return fmt::format("| {:.2f} | {:.2f} ", at(50), at(99));
}

std::vector<Book> booksOfPages(const Collection& pages, size_t bookCount, const fs::path& folder) {
  std::vector<Book> books;
  for (size_t number = 0; number < bookCount; ++number) {
    Collection part;
    for (size_t i = number; i < pages.documents.size(); i += bookCount) {
      part.documents.push_back(pages.documents[i]);
    }
    const fs::path bookFolder = folder / fmt::format("book{}", number);
    writeBook(part, bookFolder);
    books.push_back({fmt::format("org.zeb.bench.book{}", number), bookFolder / "book.helpindex"});
    makeIndex(bookFolder, books.back().indexFile, "en");
  }
  return books;
}

Timed throughPlugin(const PluginHost& host, std::vector<std::string> kinds) {
  return [&host, kinds = std::move(kinds)](const std::string& text) {
    return host.search(text, kinds).seconds;
  };
}

Timed throughFramework(std::shared_ptr<HelpLUXModel> model, int queryType) {
  return [model = std::move(model), queryType](const std::string& text) {
    const auto nobody = std::make_shared<Nobody>();
    const auto start = std::chrono::steady_clock::now();
    const auto query = LUXQuery::initWithString(text, std::nullopt, 50, nobody, model, nullptr);
    query->setQueryType(queryType);
    query->run();
    return std::chrono::duration<double>(std::chrono::steady_clock::now() - start).count();
  };
}

struct Row {
  std::string name;
  std::vector<std::string> kinds;
  /// 0: the framework has no such query alone.
  int queryType = 0;
  /// How many times the plug-in waits at least one step.
  int steps = 1;
  bool byKeyword = false;
  std::vector<std::string> texts;
};

std::string measuredRow(const Row& row, const PluginHost& both, const PluginHost& keywordAlone,
                        const std::shared_ptr<HelpLUXModel>& model) {
  std::vector<Timed> ways = {throughPlugin(both, row.kinds)};
  if (row.queryType != 0) {
    ways.push_back(throughFramework(model, row.queryType));
  }
  if (row.byKeyword) {
    ways.push_back(throughPlugin(keywordAlone, {ZEBHelpArticleResult}));
  }
  const std::vector<Times> times = race(row.texts, ways);
  std::string text =
      fmt::format("| {} {}{}", row.name, cells(times[0]), cells(times[0], row.steps * waitingStep));
  text += row.queryType != 0 ? cells(times[1]) : "| | ";
  text += row.byKeyword ? cells(times.back()) : "| | ";
  std::fprintf(stderr, "%s|\n", text.c_str());
  return text + "|\n";
}

Collection firstPages(const Collection& all, size_t count) {
  Collection part;
  const size_t end = std::min(count, all.documents.size());
  part.documents.assign(all.documents.begin(),
                        all.documents.begin() + static_cast<std::ptrdiff_t>(end));
  return part;
}

}  // namespace

std::string speedTable(const SpeedOptions& options, const fs::path& work) {
  const Collection all =
      quality::pageSample(options.roots, std::max(options.articlePages, options.suggestionPages));
  std::string text =
      "| search | whole p50 ms | p99 | beyond the steps p50 | p99 | framework alone p50 | p99 "
      "| keywords alone p50 | p99 |\n|---|---:|---:|---:|---:|---:|---:|---:|---:|\n";
  std::vector<size_t> sizes = {options.suggestionPages, options.articlePages};
  sizes.erase(std::unique(sizes.begin(), sizes.end()), sizes.end());
  for (const size_t size : sizes) {
    const Collection pages = firstPages(all, size);
    const fs::path folder = work / "speed";
    const std::vector<Book> books = booksOfPages(pages, options.bookCount, folder);
    {
      const PluginWorld world(folder / "caches", "en");
      const PluginHost both(books, true);
      const PluginHost keywordAlone(books, false);
      const auto model = world.model();
      const auto queries = quality::sampleQueries(pages, options.queryCount);
      const auto prefixes = quality::samplePrefixes(pages, options.queryCount);
      const std::string pageCount = fmt::format(", {} pages", pages.documents.size());
      const std::vector<Row> rows = {
          {"articles" + pageCount, {ZEBHelpArticleResult}, LUXQueryTypeArticles, 1, true, queries},
          {"suggestions" + pageCount,
           {ZEBHelpSuggestionResult},
           LUXQueryTypeCompletions,
           1,
           false,
           prefixes},
          {"similar suggestions" + pageCount,
           {ZEBHelpSimilarSuggestionResult},
           LUXQueryTypeSimilar,
           1,
           false,
           queries},
          {"articles and suggestions, while one types" + pageCount,
           {ZEBHelpArticleResult, ZEBHelpSuggestionResult},
           0,
           2,
           true,
           prefixes},
      };
      for (const Row& row : rows) {
        text += measuredRow(row, both, keywordAlone, model);
      }
    }
    fs::remove_all(folder);
  }
  return text;
}

}  // namespace pipeline
