// How fast language models are and how much room they take, beside other engines over the same
// pages, in one run.
#include <spawn.h>
#include <sys/wait.h>

#include <CLI/CLI.hpp>
#include <algorithm>
#include <chrono>
#include <cstdio>
#include <cstdlib>
#include <exception>
#include <filesystem>
#include <fstream>
#include <functional>
#include <stdexcept>
#include <string>
#include <thread>
#include <vector>

#include "bench/Luxwell/PageSample.h"
#include "bench/Luxwell/SpeedPeers.h"
#include "bench/quality/IndexedBook.h"
#include "host/Luxwell/HelpLUXIndex.h"
#include "host/Luxwell/HelpLUXModel.h"
#include "host/Luxwell/HelpTokenizer.h"
#include "host/Luxwell/LUXModelView.h"
#include "host/Luxwell/LUXQuery.h"

extern char** environ;  // NOLINT(readability-redundant-declaration): only some headers have it.

namespace quality {

namespace {

namespace fs = std::filesystem;

double secondsSince(std::chrono::steady_clock::time_point start) {
  return std::chrono::duration<double>(std::chrono::steady_clock::now() - start).count();
}

struct Percentiles {
  double p50 = 0;
  double p99 = 0;
};

class Samples {
 public:
  template <typename Work>
  void measure(const Work& work) {
    const auto start = std::chrono::steady_clock::now();
    work();
    _microseconds.push_back(secondsSince(start) * 1e6);
  }

  Percentiles percentiles() {
    std::sort(_microseconds.begin(), _microseconds.end());
    return {_microseconds[_microseconds.size() / 2],
            _microseconds[_microseconds.size() * 99 / 100]};
  }

 private:
  std::vector<double> _microseconds;
};

struct Training {
  double seconds = 0;
  long peakKilobytes = 0;
};

/// The most memory that this process ever had. The kernel's figure for children counts what the
/// parent had when it started them.
long peakKilobytes() {
  std::ifstream status("/proc/self/status");
  for (std::string word; status >> word;) {
    if (word == "VmHWM:") {
      long kilobytes = 0;
      status >> kilobytes;
      return kilobytes;
    }
  }
  return 0;
}

/// Trains in a process of its own, whose memory is that of training alone.
Training trainElsewhere(const std::string& program, const fs::path& index, const fs::path& model) {
  const fs::path report = model.string() + ".seconds";
  std::vector<std::string> words = {program,        "--train",  index.string(), "--model",
                                    model.string(), "--report", report.string()};
  std::vector<char*> arguments;
  for (std::string& word : words) {
    arguments.push_back(word.data());
  }
  arguments.push_back(nullptr);
  pid_t child = 0;
  int status = 0;
  if (posix_spawn(&child, program.c_str(), nullptr, nullptr, arguments.data(), environ) != 0 ||
      waitpid(child, &status, 0) != child || status != 0) {
    throw std::runtime_error("training in a process of its own failed");
  }
  Training training;
  std::ifstream(report) >> training.seconds >> training.peakKilobytes;
  return training;
}

int train(const std::string& indexFile, const std::string& modelFolder, const std::string& report) {
  const auto index = luxIndexOfFile(indexFile);
  const auto start = std::chrono::steady_clock::now();
  trainedModel(*index, modelFolder);
  std::ofstream(report) << secondsSince(start) << ' ' << peakKilobytes() << '\n';
  return 0;
}

void printRow(const std::string& what, Percentiles ours, const char* peer, Percentiles theirs) {
  std::printf("| %s | %.0f | %.0f | %s | %.0f | %.0f | %.1f | %.1f |\n", what.c_str(), ours.p50,
              ours.p99, peer, theirs.p50, theirs.p99, theirs.p50 / ours.p50, theirs.p99 / ours.p99);
  std::fflush(stdout);
}

/// Each text once without counting, then three times, the engines in turns.
struct Race {
  Samples ours;
  Samples xapian;
  Samples sqlite;

  Race(const std::vector<std::string>& texts, const std::function<void(const std::string&)>& own,
       const std::function<void(const std::string&)>& xapianPeer,
       const std::function<void(const std::string&)>& sqlitePeer) {
    for (int round = 0; round < 4; ++round) {
      Samples warming;
      for (const std::string& text : texts) {
        (round == 0 ? warming : ours).measure([&] { own(text); });
      }
      for (const std::string& text : texts) {
        (round == 0 ? warming : xapian).measure([&] { xapianPeer(text); });
      }
      for (const std::string& text : texts) {
        (round == 0 ? warming : sqlite).measure([&] { sqlitePeer(text); });
      }
    }
  }
};

void raceOverPages(const Collection& pages, const fs::path& folder) {
  const IndexedBook book(pages, folder / "book");
  const auto xapian = xapianSpeedPeer(pages, folder);
  const auto sqlite = sqliteSpeedPeer(pages, folder);
  const std::string size = std::to_string(pages.documents.size()) + " pages";
  // A model that was saved just now is opened anew for each query, for one second.
  std::this_thread::sleep_for(std::chrono::seconds(2));

  Race searches(
      sampleQueries(pages, 1000),
      [&](const std::string& text) { book.hits(text, LUXQueryTypeArticles, 50); },
      [&](const std::string& text) { xapian->search(text); },
      [&](const std::string& text) { sqlite->search(text); });
  const Percentiles search = searches.ours.percentiles();
  printRow("type 1, " + size, search, "Xapian, OR of stems", searches.xapian.percentiles());
  printRow("type 1, " + size, search, "SQLite FTS5, OR", searches.sqlite.percentiles());

  Race completions(
      samplePrefixes(pages, 1000),
      [&](const std::string& text) { book.hits(text, LUXQueryTypeCompletions, 50); },
      [&](const std::string& text) { xapian->complete(text); },
      [&](const std::string& text) { sqlite->complete(text); });
  const Percentiles completion = completions.ours.percentiles();
  printRow("type 3, " + size, completion, "Xapian, OR of stems", searches.xapian.percentiles());
  printRow("type 3, " + size, completion, "Xapian, prefix", completions.xapian.percentiles());
  printRow("type 3, " + size, completion, "SQLite FTS5, prefix", completions.sqlite.percentiles());

  Samples similar;
  for (const std::string& text : sampleQueries(pages, 300)) {
    similar.measure([&] { book.hits(text, LUXQueryTypeSimilar, 50); });
  }
  const Percentiles ours = similar.percentiles();
  std::printf("| type 4, %s | %.0f | %.0f | | | | | |\n", size.c_str(), ours.p50, ours.p99);
}

void printGrowth(const Collection& pages, const fs::path& folder, const std::string& program,
                 bool withSpectra) {
  const IndexedBook book(pages, folder / "book");
  Training best = trainElsewhere(program, book.indexFile(), folder / "model");
  for (int round = 0; round < 2; ++round) {
    const Training again = trainElsewhere(program, book.indexFile(), folder / "model");
    best.seconds = std::min(best.seconds, again.seconds);
    best.peakKilobytes = std::max(best.peakKilobytes, again.peakKilobytes);
  }
  Samples opening;
  for (int round = 0; round < 200; ++round) {
    opening.measure([&] {
      const auto model = HelpLUXModel::initWithDirectoryPath((folder / "model").string(),
                                                             book.tokenizer().localization());
      if (model->view() == nullptr) {
        throw std::runtime_error("cannot open the model");
      }
    });
  }
  const Percentiles open = opening.percentiles();
  uintmax_t textBytes = 0;
  for (const Document& page : pages.documents) {
    textBytes += page.title.size() + page.text().size();
  }
  constexpr double megabyte = 1024.0 * 1024.0;
  std::printf(
      "| %zu | %.1f | %.1f | %.1f | %.2f | %s | %.0f | %.0f | %.0f |\n", pages.documents.size(),
      static_cast<double>(textBytes) / megabyte, static_cast<double>(book.indexBytes()) / megabyte,
      static_cast<double>(book.modelBytes()) / megabyte, best.seconds,
      withSpectra ? std::to_string(spectraSeconds(*book.luxIndex())).substr(0, 5).c_str() : "",
      static_cast<double>(best.peakKilobytes) / 1024, open.p50, open.p99);
  std::fflush(stdout);
}

int run(int argc, char** argv) {
  CLI::App app("Measures how fast language models are.");
  std::vector<std::string> roots;
  std::vector<size_t> raceSizes = {2500, 28000};
  std::vector<size_t> growthSizes = {1000, 10000, 28000};
  std::string index;
  std::string model;
  std::string report;
  bool withoutSpectra = false;
  app.add_option("--pages", roots, "Folders with help pages");
  app.add_option("--race", raceSizes, "Numbers of pages to race over");
  app.add_option("--growth", growthSizes, "Numbers of pages to report sizes for");
  app.add_flag("--without-spectra", withoutSpectra);
  app.add_option("--train", index, "Train with this help-index file, for the measuring process");
  app.add_option("--model", model);
  app.add_option("--report", report);
  CLI11_PARSE(app, argc, argv);
  if (!index.empty()) {
    return train(index, model, report);
  }

  std::string work = (fs::temp_directory_path() / "zeb-speed-XXXXXX").string();
  if (mkdtemp(work.data()) == nullptr) {
    throw std::runtime_error("cannot make a temporary folder");
  }
  size_t most = 0;
  for (const std::vector<size_t>* sizes : {&raceSizes, &growthSizes}) {
    for (const size_t size : *sizes) {
      most = std::max(most, size);
    }
  }
  const Collection all = pageSample(roots, most);
  std::fprintf(stderr, "%zu pages\n", all.documents.size());
  const auto first = [&all](size_t count) {
    Collection part;
    part.name = all.name;
    part.documents.assign(
        all.documents.begin(),
        all.documents.begin() + static_cast<std::ptrdiff_t>(std::min(count, all.documents.size())));
    return part;
  };

  std::puts(
      "| query | p50 µs | p99 µs | peer | p50 µs | p99 µs | times faster, p50 | times faster, p99 |"
      "\n|---|---:|---:|---|---:|---:|---:|---:|");
  for (const size_t size : raceSizes) {
    const Collection pages = first(size);
    raceOverPages(pages, fs::path(work));
    fs::remove_all(fs::path(work));
    fs::create_directory(work);
  }
  std::puts(
      "\n| pages | text MiB | token data MiB | model MiB | building s | Spectra alone s | "
      "building, "
      "peak MiB | opening p50 µs | opening p99 µs "
      "|\n|---:|---:|---:|---:|---:|---:|---:|---:|---:|");
  for (const size_t size : growthSizes) {
    const Collection pages = first(size);
    printGrowth(pages, fs::path(work), argv[0], !withoutSpectra);
    fs::remove_all(fs::path(work));
    fs::create_directory(work);
  }
  fs::remove_all(work);
  return 0;
}

}  // namespace

}  // namespace quality

int main(int argc, char** argv) {
  try {
    return quality::run(argc, argv);
  } catch (const std::exception& exception) {
    std::fprintf(stderr, "bench: %s\n", exception.what());
    return 1;
  }
}
