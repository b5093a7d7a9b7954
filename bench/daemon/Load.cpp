#include "bench/daemon/Load.h"

#include <fmt/format.h>
#include <sdbus-c++/sdbus-c++.h>

#include <algorithm>
#include <atomic>
#include <chrono>
#include <condition_variable>
#include <fstream>
#include <map>
#include <memory>
#include <mutex>
#include <string>
#include <thread>
#include <vector>

#include "bench/daemon/MadeBooks.h"
#include "tests/zebd/DaemonWorld.h"
#include "zebd/BusService.h"

namespace {

using SteadyClock = std::chrono::steady_clock;
using Dictionary = std::map<std::string, sdbus::Variant>;
using Strings = std::vector<std::string>;

constexpr int bookCount = 40;
constexpr int pagesPerBook = 50;
constexpr int wordsPerPage = 400;

double millisecondsSince(SteadyClock::time_point start) {
  return std::chrono::duration<double, std::milli>(SteadyClock::now() - start).count();
}

/// A program of its own on the bus, as far as the daemon can tell.
class Client {
 public:
  Client(const std::string& address, uint32_t seed)
      : _connection(sdbus::createSessionBusConnectionWithAddress(address)),
        _proxy(sdbus::createProxy(*_connection, zebd::ZEBBusName, zebd::ZEBBusPath)),
        _words("", seed) {
    _proxy->uponSignal("Found")
        .onInterface(zebd::ZEBBusInterface)
        .call([this](uint64_t /*handle*/, const std::vector<Dictionary>& results) {
          const std::lock_guard lock(_mutex);
          _resultCount += results.size();
        });
    _proxy->uponSignal("Ended")
        .onInterface(zebd::ZEBBusInterface)
        .call([this](uint64_t handle, const std::string& how, double waited) {
          const std::lock_guard lock(_mutex);
          _ended = handle;
          _isComplete = how == "complete";
          _waited = waited * 1000;
          _hasEnded.notify_all();
        });
    _proxy->finishRegistration();
    _connection->enterEventLoopAsync();
  }
  ~Client() { _connection->leaveEventLoop(); }
  Client(const Client&) = delete;
  Client& operator=(const Client&) = delete;

  void searchUntil(SteadyClock::time_point end) {
    while (SteadyClock::now() < end) {
      std::string text = _words.word();
      if (searches.size() % 2 == 1) {
        text += " " + _words.word(3);
      }
      const auto start = SteadyClock::now();
      uint64_t handle = 0;
      try {
        _proxy->callMethod("StartSearch")
            .onInterface(zebd::ZEBBusInterface)
            .withArguments(text, Dictionary{{"limit", uint32_t{20}}})
            .storeResultsTo(handle);
      } catch (const sdbus::Error& error) {
        problem = error.getMessage();
        return;
      }
      std::unique_lock lock(_mutex);
      if (!_hasEnded.wait_for(lock, std::chrono::seconds(30), [&] { return _ended == handle; })) {
        problem = "a search did not end";
        return;
      }
      if (!_isComplete) {
        problem = "a search broke off";
        return;
      }
      searches.push_back(millisecondsSince(start));
      waits.push_back(_waited);
    }
  }

  /// Milliseconds from the request to the end, and what of it was spent waiting for others' turns.
  std::vector<double> searches;
  std::vector<double> waits;
  std::string problem;
  size_t resultCount() const {
    const std::lock_guard lock(_mutex);
    return _resultCount;
  }

 private:
  std::unique_ptr<sdbus::IConnection> _connection;
  std::unique_ptr<sdbus::IProxy> _proxy;
  MadeBooks _words;
  mutable std::mutex _mutex;
  std::condition_variable _hasEnded;
  uint64_t _ended = 0;
  bool _isComplete = false;
  double _waited = 0;
  size_t _resultCount = 0;
};

/// Megabytes that are resident, and those of them that belong to no file.
std::pair<double, double> memoryOf(pid_t process) {
  std::ifstream status("/proc/" + std::to_string(process) + "/status");
  std::string word;
  std::pair<double, double> memory;
  while (status >> word) {
    if (word == "VmRSS:") {
      status >> memory.first;
    } else if (word == "RssAnon:") {
      status >> memory.second;
    }
  }
  return {memory.first / 1024, memory.second / 1024};
}

double percentile(std::vector<double>& values, double share) {
  if (values.empty()) {
    return 0;
  }
  const auto at = static_cast<size_t>(share * static_cast<double>(values.size() - 1));
  std::nth_element(values.begin(), values.begin() + static_cast<ptrdiff_t>(at), values.end());
  return values[at];
}

std::string nameOfBook(int number) { return "book" + std::to_string(number); }

/// Has books come, change and go until the time is over; returns how often something did.
int churn(MadeBooks& books, SteadyClock::time_point end) {
  int changes = 0;
  while (SteadyClock::now() < end) {
    const int number = bookCount + changes / 3 % 8;
    switch (changes % 3) {
      case 0:
        books.write(nameOfBook(number), 10, wordsPerPage);
        break;
      case 1:
        books.touch(nameOfBook(changes / 3 % bookCount), 1, wordsPerPage);
        break;
      default:
        books.remove(nameOfBook(bookCount + (changes / 3 + 4) % 8));
        break;
    }
    ++changes;
    std::this_thread::sleep_for(std::chrono::milliseconds(700));
  }
  return changes;
}

}  // namespace

bool measureLoad(int clientCount, double seconds) {
  const tests::DaemonWorld world;
  MadeBooks books(world.folder.path("share/help/en"));
  for (int i = 0; i < bookCount; ++i) {
    books.write(nameOfBook(i), pagesPerBook, wordsPerPage);
  }
  if (!world.zeb({"scan"}).starts_with("0\n") || !world.waitUntilIdle()) {
    fmt::print(stderr, "the books could not be indexed\n");
    return false;
  }
  std::vector<std::unique_ptr<Client>> clients;
  clients.reserve(static_cast<size_t>(clientCount));
  for (int i = 0; i < clientCount; ++i) {
    clients.push_back(
        std::make_unique<Client>(world.bus.address(), static_cast<uint32_t>(i + 100)));
  }
  const pid_t daemon = world.daemonProcess();
  // What is mapped and cached at the first searches is no growth.
  clients.front()->searchUntil(SteadyClock::now() + std::chrono::seconds(2));
  clients.front()->searches.clear();
  clients.front()->waits.clear();
  const auto before = memoryOf(daemon);
  const auto start = SteadyClock::now();
  const auto end = start + std::chrono::duration_cast<SteadyClock::duration>(
                               std::chrono::duration<double>(seconds));
  std::vector<std::thread> threads;
  threads.reserve(clients.size());
  for (const auto& client : clients) {
    threads.emplace_back([&client, end] { client->searchUntil(end); });
  }
  const int changes = churn(books, end);
  for (std::thread& thread : threads) {
    thread.join();
  }
  const double took = millisecondsSince(start) / 1000;
  if (!world.waitUntilIdle() || world.daemonProcess() != daemon) {
    fmt::print(stderr, "the daemon did not survive\n");
    return false;
  }
  const auto after = memoryOf(daemon);
  std::vector<double> searches;
  std::vector<double> waits;
  size_t results = 0;
  for (const auto& client : clients) {
    if (!client->problem.empty()) {
      fmt::print(stderr, "a client: {}\n", client->problem);
      return false;
    }
    searches.insert(searches.end(), client->searches.begin(), client->searches.end());
    waits.insert(waits.end(), client->waits.begin(), client->waits.end());
    results += client->resultCount();
  }
  fmt::print(
      "{} clients for {:.0f} seconds; {} books of {} pages, {} changes of books meanwhile.\n\n",
      clientCount, took, bookCount, pagesPerBook, changes);
  fmt::print(
      "| searches | a second | p50, ms | p99, ms | of it waiting, p50 | p99 | results |"
      " memory at the start, MB | at the end | of no file, start | end |\n");
  fmt::print("|---:|---:|---:|---:|---:|---:|---:|---:|---:|---:|---:|\n");
  fmt::print(
      "| {} | {:.0f} | {:.1f} | {:.1f} | {:.1f} | {:.1f} | {} | {:.1f} | {:.1f} | {:.1f} | {:.1f} "
      "|\n",
      searches.size(), static_cast<double>(searches.size()) / took, percentile(searches, 0.5),
      percentile(searches, 0.99), percentile(waits, 0.5), percentile(waits, 0.99), results,
      before.first, after.first, before.second, after.second);
  return true;
}
