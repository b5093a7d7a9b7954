// bench_tool BVMAKE OMINDEX WORK-FOLDER PAGES-FOLDER
//
// Prints tables: from the HTML below PAGES-FOLDER to a finished index, by bvmake and by the indexer
// of the Xapian project, on one core and on all; and what bvmake takes for many small pages and for
// very large ones, which it makes below WORK-FOLDER. All programs run in turn, each three times;
// the best of each counts. Nothing else should run meanwhile.
#include <fmt/format.h>

#include <algorithm>
#include <cstdio>
#include <exception>
#include <filesystem>
#include <functional>
#include <set>
#include <string>
#include <vector>

#include "bench/tool/ChildRun.h"
#include "bench/tool/MadePages.h"

namespace {

namespace fs = std::filesystem;
using bench::Measured;

constexpr int rounds = 3;

struct Input {
  size_t files = 0;
  uint64_t bytes = 0;
  uint64_t largest = 0;
};

Input inputOf(const std::string& folder) {
  Input input;
  for (const fs::directory_entry& entry : fs::recursive_directory_iterator(folder)) {
    if (entry.is_regular_file()) {
      ++input.files;
      input.bytes += entry.file_size();
      input.largest = std::max<uint64_t>(input.largest, entry.file_size());
    }
  }
  return input;
}

uint64_t sizeOf(const std::string& path) {
  return fs::is_directory(path) ? inputOf(path).bytes : fs::file_size(path);
}

double megabytes(uint64_t bytes) { return static_cast<double>(bytes) / 1e6; }

class Bench {
 public:
  Bench(std::string tool, std::string peer, std::string work)
      : _tool(std::move(tool)), _peer(std::move(peer)), _work(std::move(work)) {}

  void comparePeers(const std::string& folder) {
    const Input input = inputOf(folder);
    fmt::print("{} HTML files, {:.1f} MB.\n\n", input.files, megabytes(input.bytes));
    fmt::print(
        "| cores | program | seconds | MB/s | processor seconds | peak MB | index MB | throughput "
        "|\n|---:|---|---:|---:|---:|---:|---:|---:|\n");
    for (const size_t cores : std::set<size_t>{1, 2, bench::availableCores()}) {
      if (cores > bench::availableCores()) {
        continue;
      }
      Measured best[2];
      for (int round = 0; round < rounds; ++round) {
        _keepBest(_runTool(folder, cores), round, best[0]);
        _keepBest(_runPeer(folder, cores), round, best[1]);
      }
      _row(cores, "bvmake", best[0], input.bytes, sizeOf(_toolOutput()),
           best[1].seconds / best[0].seconds);
      _row(cores, "omindex", best[1], input.bytes, sizeOf(_peerOutput()), 1);
    }
  }

  void measureSizes() {
    fmt::print(
        "\n| pages | HTML MB | cores | seconds | MB/s | peak MB | largest page + index, MB "
        "|\n|---|---:|---:|---:|---:|---:|---:|\n");
    _measureMade("100,000 of 2 KB", 100'000, 2'000);
    _measureMade("1,000 of 200 KB", 1'000, 200'000);
    _measureMade("4 of 50 MB", 4, 50'000'000);
    _measureMade("1 of 50 MB", 1, 50'000'000);
  }

 private:
  std::string _toolOutput() const { return _work + "/book.helpindex"; }
  std::string _peerOutput() const { return _work + "/omindex"; }

  Measured _runTool(const std::string& folder, size_t cores) const {
    return bench::runToEnd({_tool, "--create", "--anchors", "--generate-summaries", "--language",
                            "en", "--jobs", std::to_string(cores), "--file", _toolOutput(), folder},
                           cores);
  }

  Measured _runPeer(const std::string& folder, size_t cores) const {
    fs::remove_all(_peerOutput());
    return bench::runToEnd(
        {_peer, "--db", _peerOutput(), "--url", "/", "--stemmer", "none", folder}, cores);
  }

  static void _keepBest(const Measured& measured, int round, Measured& best) {
    if (round == 0 || measured.seconds < best.seconds) {
      best = measured;
    }
  }

  static void _row(size_t cores, const char* name, const Measured& measured, uint64_t input,
                   uint64_t output, double ratio) {
    fmt::print("| {} | {} | {:.2f} | {:.1f} | {:.2f} | {:.0f} | {:.1f} | {:.1f} |\n", cores, name,
               measured.seconds, megabytes(input) / measured.seconds, measured.processorSeconds,
               megabytes(measured.peakBytes), megabytes(output), ratio);
    std::fflush(stdout);
  }

  void _measureMade(const char* name, size_t count, size_t bytes) {
    const std::string folder = _work + "/made";
    fs::remove_all(folder);
    bench::makePages(folder, count, bytes);
    const Input input = inputOf(folder);
    for (const size_t cores : std::set<size_t>{1, bench::availableCores()}) {
      const Measured measured = _runTool(folder, cores);
      fmt::print("| {} | {:.1f} | {} | {:.2f} | {:.1f} | {:.0f} | {:.0f} |\n", name,
                 megabytes(input.bytes), cores, measured.seconds,
                 megabytes(input.bytes) / measured.seconds, megabytes(measured.peakBytes),
                 megabytes(input.largest + sizeOf(_toolOutput())));
      std::fflush(stdout);
    }
    fs::remove_all(folder);
  }

  std::string _tool;
  std::string _peer;
  std::string _work;
};

}  // namespace

int main(int argc, char** argv) {
  if (argc != 5) {
    std::fprintf(stderr, "usage: bench_tool BVMAKE OMINDEX WORK-FOLDER PAGES-FOLDER\n");
    return 2;
  }
  try {
    // What is not flushed when it is full is flushed once, at the end.
    setenv("XAPIAN_FLUSH_THRESHOLD", "1000000", 1);
    Bench bench(argv[1], argv[2], argv[3]);
    bench.comparePeers(argv[4]);
    bench.measureSizes();
  } catch (const std::exception& exception) {
    std::fprintf(stderr, "bench_tool: %s\n", exception.what());
    return 1;
  }
  return 0;
}
