#include "bench/engines/Tables.h"

#include <fmt/format.h>

#include <algorithm>
#include <chrono>
#include <cstdio>
#include <filesystem>
#include <functional>
#include <memory>

#include "SearchKit/Tokenizer.h"
#include "bench/engines/Comparison.h"
#include "bench/engines/Memory.h"
#include "bench/engines/PluginSearch.h"

namespace engines {

namespace {

namespace fs = std::filesystem;

double microsecondsOf(const std::function<void()>& work) {
  const auto start = std::chrono::steady_clock::now();
  work();
  return std::chrono::duration<double, std::micro>(std::chrono::steady_clock::now() - start)
      .count();
}

double best(size_t rounds, const std::function<void()>& work) {
  double shortest = microsecondsOf(work);
  for (size_t i = 1; i < rounds; ++i) {
    shortest = std::min(shortest, microsecondsOf(work));
  }
  return shortest;
}

double percentile(std::vector<double> times, size_t hundredths) {
  std::sort(times.begin(), times.end());
  return times[std::min(times.size() - 1, times.size() * hundredths / 100)];
}

template <typename... Arguments>
void print(fmt::format_string<Arguments...> text, Arguments&&... arguments) {
  fmt::print(text, std::forward<Arguments>(arguments)...);
  std::fflush(stdout);
}

// Every engine over one division of the pages into books.
struct Shelf {
  std::string name;
  Books books;
  std::string folder;
  Images keywordImages;
  Images sqliteImages;
  Images prefixImages;
  Images xapianImages;
  std::unique_ptr<Engine> keyword;
  std::unique_ptr<Engine> sqlite;
  std::unique_ptr<Engine> prefixed;
  std::unique_ptr<Engine> xapian;
  std::unique_ptr<Engine> xapianBookByBook;
  std::unique_ptr<PluginSearch> plugin;

  std::vector<Engine*> engines() const {
    return {keyword.get(), sqlite.get(), prefixed.get(), xapian.get(), xapianBookByBook.get()};
  }
};

// Peers' files are kept: they take minutes.
void buildOnce(const std::string& folder, const std::function<void()>& build) {
  if (!fs::exists(folder + "/done")) {
    fs::remove_all(folder);
    fs::create_directories(folder);
    build();
    writeImage(folder, 9999, "", 0);
    fs::rename(imagePath(folder, 9999), folder + "/done");
  }
}

Shelf makeShelf(std::string name, Books books, const std::string& folder) {
  Shelf shelf;
  shelf.name = std::move(name);
  shelf.books = std::move(books);
  shelf.folder = folder;
  fs::remove_all(folder + "/keyword");
  fs::remove_all(folder + "/plugin");
  buildKeywordIndexes(shelf.books, folder + "/keyword");
  buildOnce(folder + "/sqlite",
            [&] { buildSQLiteImages(shelf.books, folder + "/sqlite", {nullptr}); });
  buildOnce(folder + "/prefixed",
            [&] { buildSQLiteImages(shelf.books, folder + "/prefixed", {"1 2 3 4"}); });
  buildOnce(folder + "/xapian", [&] { buildXapianFiles(shelf.books, folder + "/xapian"); });
  shelf.keywordImages = mapFolder(folder + "/keyword");
  shelf.sqliteImages = mapFolder(folder + "/sqlite");
  shelf.prefixImages = mapFolder(folder + "/prefixed");
  shelf.xapianImages = mapFolder(folder + "/xapian");
  shelf.keyword = openKeywordEngine(shelf.keywordImages);
  shelf.sqlite = openSQLiteEngine(shelf.sqliteImages, "FTS5");
  shelf.prefixed = openSQLiteEngine(shelf.prefixImages, "FTS5 with prefixes");
  shelf.xapian = openXapianEngine(shelf.xapianImages, true);
  shelf.xapianBookByBook = openXapianEngine(shelf.xapianImages, false);
  shelf.plugin = std::make_unique<PluginSearch>(shelf.keywordImages, folder + "/plugin");
  return shelf;
}

struct Times {
  std::vector<double> all;

  double p50() const { return percentile(all, 50); }
  double p99() const { return percentile(all, 99); }
};

// The engines take turns, so that whatever else the machine does meets them all.
std::vector<Times> timesOf(const std::vector<std::function<void(const Question&)>>& runs,
                           const std::vector<Question>& questions, size_t rounds) {
  std::vector<Times> times(runs.size());
  for (const Question& question : questions) {
    for (size_t i = 0; i < runs.size(); ++i) {
      runs[i](question);
      times[i].all.push_back(best(rounds, [&] { runs[i](question); }));
    }
  }
  return times;
}

std::function<void(const Question&)> runOf(Engine& engine) {
  return [&engine, found = std::vector<Found>()](const Question& question) mutable {
    engine.searchForTiming(question, found);
  };
}

// The two passes of the plug-in, and the records of what they find.
std::function<void(const Question&)> wholeRunOf(Engine& engine) {
  return [&engine, found = std::vector<Found>()](const Question& question) mutable {
    constexpr size_t enough = 15;
    Question asked = question;
    asked.isPrefix = true;
    engine.searchForTiming(asked, found);
    if (found.size() < enough) {
      asked.isAny = true;
      engine.searchForTiming(asked, found);
    }
    engine.readRecords(found);
  };
}

// The same without the records.
std::function<void(const Question&)> passesOf(Engine& engine) {
  return [&engine, found = std::vector<Found>()](const Question& question) mutable {
    constexpr size_t enough = 15;
    Question asked = question;
    asked.isPrefix = true;
    engine.searchForTiming(asked, found);
    if (found.size() < enough) {
      asked.isAny = true;
      engine.searchForTiming(asked, found);
    }
  };
}

void printSearches(const Shelf& shelf, const std::vector<QuestionClass>& classes) {
  print(
      "\n### The engine, {}\n\n"
      "Microseconds, p50 / p99; ratios at p50 to the faster form of each peer.\n\n"
      "| query | hits, p50 | SearchKit | FTS5 | FTS5, prefixes | Xapian | Xapian, book by book "
      "| to FTS5 | to Xapian |\n|---|---:|---:|---:|---:|---:|---:|---:|---:|\n",
      shelf.name);
  for (const QuestionClass& some : classes) {
    std::vector<std::function<void(const Question&)>> runs;
    for (Engine* const engine : shelf.engines()) {
      runs.push_back(runOf(*engine));
    }
    const std::vector<Times> times = timesOf(runs, some.questions, 2);
    Times hits;
    std::vector<Found> found;
    for (const Question& question : some.questions) {
      shelf.keyword->search(question, found);
      hits.all.push_back(static_cast<double>(found.size()));
    }
    print("| {} | {:.0f}", some.name, hits.p50());
    for (const Times& one : times) {
      print(" | {:.1f} / {:.0f}", one.p50(), one.p99());
    }
    print(" | {:.1f} | {:.1f} |\n", std::min(times[1].p50(), times[2].p50()) / times[0].p50(),
          std::min(times[3].p50(), times[4].p50()) / times[0].p50());
  }
}

void printWholeSearches(const Shelf& shelf, const std::vector<QuestionClass>& classes) {
  print(
      "\n### `doSearchForString`, {}\n\n"
      "Both passes with all records; peers as above, and with path, title and abstract read for "
      "each hit. Microseconds, p50 / p99; ratios at p50 to the faster form of each peer.\n\n"
      "| query | records, p50 | plug-in | FTS5, hits | FTS5, records | Xapian, hits "
      "| Xapian, records | hits: to FTS5 | to Xapian | records: to FTS5 | to Xapian |\n"
      "|---|---:|---:|---:|---:|---:|---:|---:|---:|---:|---:|\n",
      shelf.name);
  for (const QuestionClass& some : classes) {
    Times records;
    const auto plugin = [&](const Question& question) {
      Question words = question;
      words.isPrefix = false;
      records.all.push_back(static_cast<double>(shelf.plugin->search(words.text())));
    };
    const std::vector<Times> times = timesOf(
        {plugin, passesOf(*shelf.sqlite), passesOf(*shelf.prefixed), passesOf(*shelf.xapian),
         passesOf(*shelf.xapianBookByBook), wholeRunOf(*shelf.sqlite), wholeRunOf(*shelf.prefixed),
         wholeRunOf(*shelf.xapian), wholeRunOf(*shelf.xapianBookByBook)},
        some.questions, 1);
    const auto faster = [&](size_t peer) -> const Times& {
      return times[peer].p50() < times[peer + 1].p50() ? times[peer] : times[peer + 1];
    };
    print("| {} | {:.0f} | {:.1f} / {:.0f}", some.name, records.p50(), times[0].p50(),
          times[0].p99());
    for (const size_t peer : {1U, 5U, 3U, 7U}) {
      print(" | {:.1f} / {:.0f}", faster(peer).p50(), faster(peer).p99());
    }
    for (const size_t peer : {1U, 3U, 5U, 7U}) {
      print(" | {:.1f}", faster(peer).p50() / times[0].p50());
    }
    print(" |\n");
  }
}

void printLetters(const std::vector<Shelf*>& shelves) {
  print(
      "\n### 26 single letters, all of which a page must have words with\n\n"
      "Milliseconds, p50.\n\n| books | SearchKit | FTS5 | FTS5, prefixes | Xapian "
      "| Xapian, book by book | share of FTS5's time |\n|---|---:|---:|---:|---:|---:|---:|\n");
  const std::vector<Question> questions(5, allLetters());
  for (const Shelf* const shelf : shelves) {
    std::vector<std::function<void(const Question&)>> runs;
    for (Engine* const engine : shelf->engines()) {
      runs.push_back(runOf(*engine));
    }
    const std::vector<Times> times = timesOf(runs, questions, 1);
    print("| {}", shelf->name);
    for (const Times& one : times) {
      print(" | {:.2f}", one.p50() / 1e3);
    }
    print(" | {:.4f} |\n", times[0].p50() / std::min(times[1].p50(), times[2].p50()));
  }
}

void printOpening(const std::vector<Shelf*>& shelves) {
  print(
      "\n### Opening a book\n\nMicroseconds, from bytes in memory.\n\n"
      "| books | SearchKit | FTS5 | Xapian |\n|---|---:|---:|---:|\n");
  for (const Shelf* const shelf : shelves) {
    const auto count = static_cast<double>(shelf->books.size());
    print("| {} | {:.3f} | {:.1f} | {:.1f} |\n", shelf->name,
          best(200, [&] { reopenKeywordIndexes(shelf->keywordImages); }) / count,
          best(5, [&] { reopenSQLiteImages(shelf->sqliteImages); }) / count,
          best(5, [&] { reopenXapianFiles(shelf->xapianImages); }) / count);
  }
}

void printSizes(const std::vector<Shelf*>& shelves) {
  print(
      "\n### Size\n\nAs a share of the text (titles, headings, body).\n\n"
      "| books | text, MB | SearchKit | without positions | FTS5 | FTS5, prefixes | Xapian |\n"
      "|---|---:|---:|---:|---:|---:|---:|\n");
  for (const Shelf* const shelf : shelves) {
    const auto text = static_cast<double>(textLength(shelf->books));
    const auto share = [&](size_t length) { return static_cast<double>(length) / text; };
    print("| {} | {:.1f} | {:.3f} | {:.3f} | {:.3f} | {:.3f} | {:.3f} |\n", shelf->name, text / 1e6,
          share(totalLength(shelf->keywordImages)),
          share(lengthWithoutPositions(shelf->keywordImages)),
          share(totalLength(shelf->sqliteImages)), share(totalLength(shelf->prefixImages)),
          share(totalLength(shelf->xapianImages)));
  }
}

void printBuilding(const Books& books) {
  std::vector<std::vector<PageWords>> words;
  for (const Book& book : books) {
    words.emplace_back();
    for (const searchkit::Document& page : book.pages) {
      words.back().push_back(wordsOfPage(page));
    }
  }
  const auto forAll = [&](const std::function<void(size_t)>& build) {
    return best(3, [&] {
      for (size_t i = 0; i < books.size(); ++i) {
        build(i);
      }
    });
  };
  const double text = static_cast<double>(textLength(books));
  const double keyword = forAll([&](size_t i) { buildKeywordIndexInMemory(books[i]); });
  const double sqlite = forAll([&](size_t i) { buildSQLiteInMemory(books[i]); });
  const double split = forAll([&](size_t i) { buildSQLiteInMemory(words[i]); });
  size_t count = 0;
  const double tokenizing = best(3, [&] {
    for (const Book& book : books) {
      // One a book, as a writer has it: it remembers what it has split.
      searchkit::Tokenizer tokenizer;
      for (const searchkit::Document& page : book.pages) {
        for (const std::string& block : page.body) {
          tokenizer.tokenize(block, [&](std::string_view term, bool) { count += term.size(); });
        }
      }
    }
  });
  print(
      "\n### Building from extracted text, one core\n\n"
      "In memory, book by book; megabytes of text a second. FTS5 splits words itself (unicode61), "
      "or is given them already split, which costs it nothing.\n\n"
      "| SearchKit | FTS5 | FTS5, words split before | splitting words alone | to FTS5 | "
      "to FTS5, split before |\n|---:|---:|---:|---:|---:|---:|\n"
      "| {:.1f} | {:.1f} | {:.1f} | {:.1f} | {:.2f} | {:.2f} |\n",
      text / keyword, text / sqlite, text / split, text / tokenizing, sqlite / keyword,
      split / keyword);
}

void printMemory(const Shelf& shelf, const std::vector<QuestionClass>& classes) {
  print(
      "\n### Peak memory of searches over {}\n\n"
      "Megabytes beyond the process before it opened the books, which are mapped files: all that "
      "is resident, and what belongs to no file.\n\n"
      "| | SearchKit | FTS5 | FTS5, prefixes | Xapian | share of FTS5's |\n"
      "|---|---:|---:|---:|---:|---:|\n",
      shelf.name);
  std::string questions;
  for (size_t i = 0; i < 20; ++i) {
    questions += classes[0].questions[i].terms[0] + " ";
  }
  const MemoryUse uses[] = {memoryOfSearch("SearchKit", shelf.folder + "/keyword", questions),
                            memoryOfSearch("FTS5", shelf.folder + "/sqlite", questions),
                            memoryOfSearch("FTS5", shelf.folder + "/prefixed", questions),
                            memoryOfSearch("Xapian", shelf.folder + "/xapian", questions)};
  const auto row = [&](const char* name, size_t MemoryUse::*field) {
    print("| {}", name);
    for (const MemoryUse& use : uses) {
      print(" | {:.2f}", static_cast<double>(use.*field) / 1e6);
    }
    print(" | {:.2f} |\n", static_cast<double>(uses[0].*field) /
                               static_cast<double>(std::min(uses[1].*field, uses[2].*field)));
  };
  row("resident", &MemoryUse::resident);
  row("of no file", &MemoryUse::anonymous);
}

}  // namespace

void printTables(const Settings& settings) {
  const Books books = readBooks(settings.corpus);
  const auto classes = questionClasses(books, settings.questionCount, settings.seed);
  Shelf manuals =
      makeShelf(fmt::format("{} manuals", books.size()), books, settings.folder + "/manuals");
  Shelf parts = makeShelf("300 books", split(books, 300), settings.folder + "/parts");
  size_t found = 0;
  const std::vector<Question> compared =
      questionsToCompare(books, settings.questionCount / 2, settings.seed + 100);
  for (const Shelf* const shelf : {&manuals, &parts}) {
    found += requireSameResults(shelf->engines(), compared);
    for (const QuestionClass& some : classes) {
      found += requireSameResults(shelf->engines(), some.questions);
    }
  }
  print(
      "{} pages in {} manuals, {:.1f} MB of text. All engines found the same pages for all "
      "questions asked, {} in all.\n",
      pageCount(books), books.size(), static_cast<double>(textLength(books)) / 1e6, found);
  const auto isWanted = [&](const char* table) {
    return settings.tables.empty() || std::find(settings.tables.begin(), settings.tables.end(),
                                                table) != settings.tables.end();
  };
  for (const Shelf* const shelf : {&manuals, &parts}) {
    if (isWanted("engine")) {
      printSearches(*shelf, classes);
    }
  }
  for (const Shelf* const shelf : {&manuals, &parts}) {
    if (isWanted("plugin")) {
      printWholeSearches(*shelf, classes);
    }
  }
  if (isWanted("letters")) {
    printLetters({&manuals, &parts});
  }
  if (isWanted("opening")) {
    printOpening({&manuals, &parts});
  }
  if (isWanted("size")) {
    printSizes({&manuals, &parts});
  }
  if (isWanted("building")) {
    printBuilding(books);
  }
  if (isWanted("memory")) {
    printMemory(parts, classes);
  }
}

}  // namespace engines
