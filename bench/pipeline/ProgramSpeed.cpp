#include "bench/pipeline/ProgramSpeed.h"

#include <fcntl.h>
#include <fmt/format.h>
#include <poll.h>
#include <pty.h>
#include <spawn.h>
#include <sys/wait.h>
#include <unistd.h>

#include <algorithm>
#include <array>
#include <cerrno>
#include <chrono>
#include <cstdlib>
#include <stdexcept>
#include <string_view>
#include <thread>

extern char** environ;  // NOLINT(readability-redundant-declaration): only some headers have it.

namespace pipeline {

namespace {

namespace fs = std::filesystem;
using Clock = std::chrono::steady_clock;

double millisecondsSince(Clock::time_point start) {
  return std::chrono::duration<double, std::milli>(Clock::now() - start).count();
}

std::string cells(std::vector<double> milliseconds) {
  std::sort(milliseconds.begin(), milliseconds.end());
  const auto at = [&](size_t percent) {
    return milliseconds[std::min(milliseconds.size() - 1, milliseconds.size() * percent / 100)];
  };
  return fmt::format("| {:.1f} | {:.1f} ", at(50), at(99));
}

std::vector<char*> pointersTo(std::vector<std::string>& words) {
  std::vector<char*> pointers;
  pointers.reserve(words.size() + 1);
  for (std::string& word : words) {
    pointers.push_back(word.data());
  }
  pointers.push_back(nullptr);
  return pointers;
}

/// Runs a program without showing what it prints; returns its exit status.
int runQuietly(std::vector<std::string> words) {
  posix_spawn_file_actions_t actions;
  posix_spawn_file_actions_init(&actions);
  posix_spawn_file_actions_addopen(&actions, STDOUT_FILENO, "/dev/null", O_WRONLY, 0);
  pid_t child = 0;
  const int problem = posix_spawn(&child, words.front().c_str(), &actions, nullptr,
                                  pointersTo(words).data(), environ);
  posix_spawn_file_actions_destroy(&actions);
  int status = 0;
  if (problem != 0 || waitpid(child, &status, 0) != child || !WIFEXITED(status)) {
    throw std::runtime_error("cannot run " + words.front());
  }
  return WEXITSTATUS(status);
}

/// `zeb search` on a terminal of its own.
class Typist {
 public:
  explicit Typist(const fs::path& caches) {
    std::vector<std::string> words = {ZEB_PROGRAM, "--cache-dir", caches.string(), "search"};
    const std::vector<char*> pointers = pointersTo(words);
    winsize size{};
    size.ws_col = 100;
    size.ws_row = 30;
    _child = forkpty(&_terminal, nullptr, nullptr, &size);
    if (_child == 0) {
      execv(pointers[0], pointers.data());
      _exit(127);
    }
    if (_child < 0) {
      throw std::runtime_error("no pseudo-terminal");
    }
    _waitForScreens(1);
  }
  ~Typist() {
    _write("\x1B");
    int status = 0;
    waitpid(_child, &status, 0);
    close(_terminal);
  }
  Typist(const Typist&) = delete;
  Typist& operator=(const Typist&) = delete;

  struct Times {
    double shown = 0;
    double answered = 0;
  };

  /// Presses a key that changes the text, and waits for its answer.
  Times press(char key) {
    const auto start = Clock::now();
    _write(std::string_view(&key, 1));
    Times times;
    _waitForScreens(1);
    times.shown = millisecondsSince(start);
    _waitForScreens(1);
    times.answered = millisecondsSince(start);
    return times;
  }

  /// Takes all of the text away; no text has no answer.
  void clear() {
    _write("\x15");
    _waitForScreens(1);
  }

 private:
  void _write(std::string_view keys) const {
    if (write(_terminal, keys.data(), keys.size()) != static_cast<ssize_t>(keys.size())) {
      throw std::runtime_error("cannot type");
    }
  }

  /// Every screen begins with the sequence that takes the one before away, and comes in one write.
  void _waitForScreens(size_t count) {
    constexpr std::string_view mark = "\033[J";
    while (true) {
      for (size_t at = _output.find(mark); count > 0 && at != std::string::npos;
           at = _output.find(mark)) {
        _output.erase(0, at + mark.size());
        --count;
      }
      if (count == 0) {
        return;
      }
      pollfd waiting{_terminal, POLLIN, 0};
      constexpr int patience = 20000;
      std::array<char, 8192> buffer{};
      const ssize_t got =
          poll(&waiting, 1, patience) > 0 ? read(_terminal, buffer.data(), buffer.size()) : -1;
      if (got <= 0) {
        throw std::runtime_error("nothing more on the terminal");
      }
      _output.append(buffer.data(), static_cast<size_t>(got));
    }
  }

  pid_t _child = -1;
  int _terminal = -1;
  std::string _output;
};

constexpr std::array<const char*, 24> typedTexts = {
    "print a document",       "set up bluetooth",    "change page margins", "open a file",
    "list comprehension",     "wifi password",       "insert a picture",    "select layers",
    "create index",           "virtual host",        "regular expressions", "mail merge",
    "keyboard shortcuts",     "screen resolution",   "pivot table",         "rewrite rule",
    "string formatting",      "replication slots",   "crop an image",       "battery power",
    "conditional formatting", "exception hierarchy", "color balance",       "foreign key",
};

}  // namespace

void indexBooks(const std::vector<std::string>& folders, const fs::path& caches) {
  std::vector<std::string> words = {ZEB_PROGRAM, "--cache-dir", caches.string(), "scan",
                                    "--no-system"};
  words.insert(words.end(), folders.begin(), folders.end());
  if (runQuietly(words) != 0) {
    throw std::runtime_error("cannot index the books");
  }
  // A model that was saved just now is opened anew for each query, for one second.
  std::this_thread::sleep_for(std::chrono::seconds(2));
}

std::string keystrokeTable(const fs::path& caches) {
  Typist typist(caches);
  std::vector<double> shown;
  std::vector<double> answered;
  for (const char* text : typedTexts) {
    for (const char key : std::string_view(text)) {
      const Typist::Times times = typist.press(key);
      shown.push_back(times.shown);
      answered.push_back(times.answered);
    }
    typist.clear();
  }
  return fmt::format(
      "| from the key | keys | p50 ms | p99 ms |\n|---|---:|---:|---:|\n"
      "| to the screen that shows it | {} {}|\n| to the screen that shows what it finds | {} {}|\n",
      shown.size(), cells(shown), answered.size(), cells(answered));
}

std::string processTable(const std::vector<std::string>& programs, const fs::path& caches,
                         size_t rounds) {
  struct Row {
    const char* name;
    std::vector<std::string> arguments;
  };
  const std::vector<Row> rows = {
      {"zeb --version", {"--version"}},
      {"zeb search print a document", {"search", "print", "a", "document"}},
      {"zeb suggest pri", {"suggest", "pri"}},
      {"zeb similar print a document", {"similar", "print", "a", "document"}},
  };
  std::string text = "| whole process |";
  for (size_t i = 0; i < programs.size(); ++i) {
    text += i == 0 ? " least ms | p50 ms |"
                   : fmt::format(" {0}: least ms | p50 ms | times as long |", i);
  }
  text += "\n|---|";
  for (size_t i = 0; i < programs.size(); ++i) {
    text += i == 0 ? "---:|---:|" : "---:|---:|---:|";
  }
  text += "\n";
  for (const Row& row : rows) {
    std::vector<std::vector<double>> times(programs.size());
    for (size_t round = 0; round <= rounds; ++round) {
      for (size_t i = 0; i < programs.size(); ++i) {
        std::vector<std::string> words = {programs[i], "--cache-dir", caches.string()};
        words.insert(words.end(), row.arguments.begin(), row.arguments.end());
        const auto start = Clock::now();
        runQuietly(words);
        // The first round warms up.
        if (round > 0) {
          times[i].push_back(millisecondsSince(start));
        }
      }
    }
    text += fmt::format("| `{}` ", row.name);
    double least = 0;
    for (size_t i = 0; i < programs.size(); ++i) {
      std::sort(times[i].begin(), times[i].end());
      text += fmt::format("| {:.1f} | {:.1f} ", times[i].front(), times[i][times[i].size() / 2]);
      if (i == 0) {
        least = times[i].front();
      } else {
        text += fmt::format("| {:.2f} ", times[i].front() / least);
      }
    }
    text += "|\n";
  }
  return text;
}

}  // namespace pipeline
