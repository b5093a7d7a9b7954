#include "bench/engines/Memory.h"

#include <unistd.h>

#include <cstdio>
#include <filesystem>
#include <fstream>
#include <memory>
#include <sstream>
#include <stdexcept>
#include <vector>

#include "bench/engines/Engine.h"

namespace engines {

namespace {

// In bytes; the kernel gives kilobytes.
size_t processStatus(const std::string& key) {
  std::ifstream status("/proc/self/status");
  for (std::string line; std::getline(status, line);) {
    if (line.starts_with(key + ":")) {
      return std::stoul(line.substr(key.size() + 1)) * 1024;
    }
  }
  return 0;
}

struct ClosePipe {
  void operator()(FILE* pipe) const noexcept { pclose(pipe); }
};

}  // namespace

MemoryUse memoryOfSearch(const std::string& engine, const std::string& folder,
                         const std::string& questions) {
  const std::string command = "'" + std::filesystem::read_symlink("/proc/self/exe").string() +
                              "' memory '" + engine + "' '" + folder + "' '" + questions + "'";
  const std::unique_ptr<FILE, ClosePipe> pipe(popen(command.c_str(), "r"));
  MemoryUse use;
  if (pipe == nullptr || fscanf(pipe.get(), "%zu %zu", &use.resident, &use.anonymous) != 2) {
    throw std::runtime_error("no answer from " + command);
  }
  return use;
}

int searchForMemory(const std::string& engine, const std::string& folder,
                    const std::string& questions) {
  std::vector<Question> all;
  std::istringstream words(questions);
  for (std::string word; words >> word;) {
    all.push_back({{word}, true, false});
    all.push_back({{word}, false, false});
  }
  // So that the peak is that of what follows.
  std::ofstream("/proc/self/clear_refs") << "5";
  const size_t resident = processStatus("VmRSS");
  const size_t anonymous = processStatus("RssAnon");
  const Images images = mapFolder(folder);
  const std::unique_ptr<Engine> opened = engine == "SearchKit" ? openKeywordEngine(images)
                                         : engine == "Xapian"  ? openXapianEngine(images, true)
                                                               : openSQLiteEngine(images, "FTS5");
  std::vector<Found> found;
  size_t most = 0;
  for (const Question& question : all) {
    opened->search(question, found);
    const size_t now = processStatus("RssAnon");
    most = std::max(most, now > anonymous ? now - anonymous : 0);
  }
  const size_t peak = processStatus("VmHWM");
  std::printf("%zu %zu\n", peak > resident ? peak - resident : 0, most);
  return 0;
}

}  // namespace engines
