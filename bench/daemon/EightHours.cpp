#include "bench/daemon/EightHours.h"

#include <fmt/format.h>
#include <malloc.h>
#include <unistd.h>

#include <atomic>
#include <chrono>
#include <filesystem>
#include <fstream>
#include <memory>
#include <string>
#include <system_error>
#include <thread>
#include <vector>

#include "bench/daemon/MadeBooks.h"
#include "host/Zebrine/ZEBConstants.h"
#include "platform/Clock.h"
#include "platform/DistributedNotificationCenter.h"
#include "platform/Environment.h"
#include "platform/Processes.h"
#include "tests/platform/OtherThreads.h"
#include "tests/platform/TemporaryFolder.h"
#include "zebd/HelpService.h"

namespace {

constexpr int bookCount = 20;
constexpr int clientCount = 8;
constexpr platform::Seconds step{0.25};
constexpr platform::Seconds minute{60};
constexpr platform::Seconds ample{3600};

/// Lets time pass whenever everybody waits for it.
class PassingTime {
 public:
  explicit PassingTime(platform::SimulatedClock& clock)
      : _thread([this, &clock] {
          tests::OtherThreads others;
          while (!_isOver) {
            others.waitUntilBlocked(std::chrono::milliseconds(5));
            clock.advance(step);
            // Children have work to do as well.
            std::this_thread::sleep_for(std::chrono::microseconds(500));
          }
        }) {}
  ~PassingTime() {
    _isOver = true;
    _thread.join();
  }
  PassingTime(const PassingTime&) = delete;
  PassingTime& operator=(const PassingTime&) = delete;

 private:
  std::atomic<bool> _isOver{false};
  std::thread _thread;
};

class Counter : public zebd::SearchListener {
 public:
  void searchFound(const std::string&, uint64_t,
                   const std::vector<zebd::FoundItem>& items) override {
    results += items.size();
  }
  void searchEnded(const std::string&, uint64_t, zebd::SearchEnding ending,
                   platform::Seconds) override {
    ++(ending == zebd::SearchEnding::complete ? complete : others);
  }

  std::atomic<size_t> results{0};
  std::atomic<size_t> complete{0};
  std::atomic<size_t> others{0};
};

double residentMegabytes() {
  ::malloc_trim(0);
  std::ifstream file("/proc/self/statm");
  double all = 0;
  double resident = 0;
  file >> all >> resident;
  return resident * static_cast<double>(::sysconf(_SC_PAGESIZE)) / 1e6;
}

double allocatedMegabytes() { return static_cast<double>(::mallinfo2().uordblks) / 1e6; }

size_t threadCount() {
  std::ifstream status("/proc/self/status");
  std::string word;
  size_t count = 0;
  while (status >> word) {
    if (word == "Threads:") {
      status >> count;
    }
  }
  return count;
}

/// Those that this program has open to look at its threads left out.
size_t openFileCount() {
  size_t count = 0;
  for (const auto& entry : std::filesystem::directory_iterator("/proc/self/fd")) {
    std::error_code gone;
    const std::string target = std::filesystem::read_symlink(entry.path(), gone).string();
    count += target.starts_with("/proc/") ? 0 : 1;
  }
  return count;
}

std::string nameOfBook(int number) { return "book" + std::to_string(number); }

}  // namespace

bool measureHours(int hours) {
  const tests::TemporaryFolder folder;
  MadeBooks books(folder.path("share/help/en"));
  for (int i = 0; i < bookCount; ++i) {
    books.write(nameOfBook(i), 10, 200);
  }
  const auto clock = std::make_shared<platform::SimulatedClock>(std::chrono::system_clock::now());
  platform::Environment environment = platform::Environment::system();
  environment.clock = clock;
  environment.log = platform::standardErrorLogSink(-1);
  environment.processLauncher = platform::substitutingProcessLauncher("/usr/bin/bvmake", ZEB_TOOL);
  environment.notificationCenter = platform::localNotificationCenter();
  environment.standardOutput = [](const std::string&) {};
  environment.cachesDirectory = folder.path("caches");
  const platform::EnvironmentOverride override(environment);
  platform::Error error;
  auto host =
      zebd::Host::start(ZEB_PLUGIN_BUNDLE, {true, false, folder.path("caches/help")}, error);
  if (host == nullptr) {
    fmt::print(stderr, "{}\n", error.description);
    return false;
  }
  const auto counter = std::make_shared<Counter>();
  const auto realStart = std::chrono::steady_clock::now();
  zebd::HelpService service(
      std::move(host), {{folder.path("share")}, folder.path("caches/zeb/books"), {"en"}}, counter);
  service.begin();
  int changes = 0;
  {
    const PassingTime time(*clock);
    MadeBooks words("", 7);
    fmt::print(
        "| hour | books | indexed | changes | searches | resident, MB | allocated, MB |"
        " threads | open files |\n|---:|---:|---:|---:|---:|---:|---:|---:|---:|\n");
    for (int hour = 1; hour <= hours; ++hour) {
      for (int i = 0; i < 60; ++i, ++changes) {
        const int number = bookCount + changes % 7;
        if (changes % 3 == 0) {
          books.write(nameOfBook(number), 5, 200);
        } else if (changes % 3 == 1) {
          books.touch(nameOfBook(changes % bookCount), 2, 200);
        } else {
          books.remove(nameOfBook(bookCount + (changes + 3) % 7));
        }
        const auto end = clock->elapsed() + minute;
        for (int client = 0; client < clientCount; ++client) {
          zebd::SearchRequest request;
          request.text = words.word() + " " + words.word(3);
          request.kinds = {ZEBHelpArticleResult, ZEBHelpSuggestionResult};
          (void)service.searches().start("client" + std::to_string(client), request);
        }
        zebd::Host::runMainLoopUntil([&] { return clock->elapsed() >= end; }, ample);
      }
      zebd::Host::runMainLoopUntil(
          [&] { return !service.isInUse() && service.owner().isQuietFor(platform::Seconds(10)); },
          ample);
      const zebd::ServiceStatus status = service.status();
      fmt::print("| {} | {} | {} | {} | {} | {:.1f} | {:.2f} | {} | {} |\n", hour, status.bookCount,
                 status.indexedBookCount, changes, counter->complete.load(), residentMegabytes(),
                 allocatedMegabytes(), threadCount(), openFileCount());
      std::fflush(stdout);
    }
  }
  fmt::print(
      "\n{} results; {} searches did not come to their end; {:.0f} seconds of the machine's"
      " time.\n",
      counter->results.load(), counter->others.load(),
      std::chrono::duration<double>(std::chrono::steady_clock::now() - realStart).count());
  return counter->others == 0;
}
