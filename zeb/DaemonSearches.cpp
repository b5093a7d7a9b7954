#include "zeb/DaemonSearches.h"

#include <sdbus-c++/sdbus-c++.h>

#include <algorithm>
#include <atomic>
#include <chrono>
#include <cstdint>
#include <map>
#include <utility>

#include "host/Zebrine/ZEBConstants.h"
#include "platform/RunLoop.h"
#include "platform/ThreadSafety.h"
#include "zebd/BusService.h"
#include "zebd/Host.h"

namespace zeb {

namespace {

using Dictionary = std::map<std::string, sdbus::Variant>;
using Dictionaries = std::vector<Dictionary>;
using Strings = std::vector<std::string>;

/// The bus may have to start the daemon first.
constexpr platform::Seconds answerLimit{25};

constexpr const char* busName = "org.freedesktop.DBus";

template <typename Content>
Content valueOf(const Dictionary& dictionary, const std::string& key) {
  const auto found = dictionary.find(key);
  return found == dictionary.end() ? Content() : found->second.get<Content>();
}

std::string kindOfName(const std::string& name) {
  if (name == "suggestions") {
    return ZEBHelpSuggestionResult;
  }
  if (name == "similar") {
    return ZEBHelpSimilarSuggestionResult;
  }
  return name == "actions" ? ZEBHelpActionResult : ZEBHelpArticleResult;
}

std::string nameOfKind(const std::string& kind) {
  if (kind == ZEBHelpSuggestionResult) {
    return "suggestions";
  }
  if (kind == ZEBHelpSimilarSuggestionResult) {
    return "similar";
  }
  return kind == ZEBHelpActionResult ? "actions" : "pages";
}

zebd::FoundItem itemOfDictionary(const Dictionary& dictionary) {
  zebd::FoundItem item;
  item.kind = kindOfName(valueOf<std::string>(dictionary, "kind"));
  item.title = valueOf<std::string>(dictionary, "title");
  item.relevance = valueOf<double>(dictionary, "relevance");
  item.url = valueOf<std::string>(dictionary, "url");
  item.bookID = valueOf<std::string>(dictionary, "book");
  item.bookTitle = valueOf<std::string>(dictionary, "bookTitle");
  item.isExactMatch = valueOf<bool>(dictionary, "exactMatch");
  if (dictionary.contains("abstract")) {
    item.abstract = valueOf<std::string>(dictionary, "abstract");
  }
  return item;
}

Dictionary optionsOf(const zebd::SearchRequest& request) {
  Strings kinds;
  for (const std::string& kind : request.kinds) {
    kinds.push_back(nameOfKind(kind));
  }
  return {{"kinds", kinds},
          {"books", request.bookIDs},
          {"anchor", request.isAnchor},
          {"limit", static_cast<uint32_t>(request.limit)},
          {"languages", request.languages}};
}

/// What signals tell of one search. They may arrive before the handle does.
struct Heard {
  std::vector<zebd::FoundItem> items;
  bool ended = false;
  bool finished = false;
};

}  // namespace

/// Shared with the thread that listens to the bus, and with searches.
struct DaemonSearches::Implementation {
  explicit Implementation(std::unique_ptr<sdbus::IConnection> toBus)
      : connection(std::move(toBus)),
        proxy(sdbus::createProxy(*connection, zebd::ZEBBusName, zebd::ZEBBusPath)),
        bus(sdbus::createProxy(*connection, busName, "/org/freedesktop/DBus")) {}

  bool daemonCanBeHad();
  void listen();
  /// The daemon is gone: what it owed does not come any more.
  void allEnded();

  platform::Mutex mutex;
  std::map<uint64_t, Heard> heard GUARDED_BY(mutex);

  const std::unique_ptr<sdbus::IConnection> connection;
  const std::unique_ptr<sdbus::IProxy> proxy;
  const std::unique_ptr<sdbus::IProxy> bus;
};

bool DaemonSearches::Implementation::daemonCanBeHad() {
  for (const char* member : {"ListNames", "ListActivatableNames"}) {
    Strings names;
    bus->callMethod(member).onInterface(busName).storeResultsTo(names);
    if (std::find(names.begin(), names.end(), zebd::ZEBBusName) != names.end()) {
      return true;
    }
  }
  return false;
}

void DaemonSearches::Implementation::allEnded() {
  {
    const platform::MutexLock lock(mutex);
    for (auto& entry : heard) {
      entry.second.ended = true;
    }
  }
  platform::RunLoop::main()->stop();
}

void DaemonSearches::Implementation::listen() {
  proxy->uponSignal("Found")
      .onInterface(zebd::ZEBBusInterface)
      .call([this](uint64_t handle, const Dictionaries& results) {
        std::vector<zebd::FoundItem> items;
        for (const Dictionary& result : results) {
          items.push_back(itemOfDictionary(result));
        }
        const platform::MutexLock lock(mutex);
        Heard& search = heard[handle];
        search.items.insert(search.items.end(), items.begin(), items.end());
      });
  proxy->uponSignal("Ended")
      .onInterface(zebd::ZEBBusInterface)
      .call([this](uint64_t handle, const std::string& how, double /*waited*/) {
        {
          const platform::MutexLock lock(mutex);
          heard[handle].ended = true;
          heard[handle].finished = how == "complete";
        }
        platform::RunLoop::main()->stop();
      });
  proxy->finishRegistration();
  bus->uponSignal("NameOwnerChanged")
      .onInterface(busName)
      .call([this](const std::string& name, const std::string& before, const std::string&) {
        if (name == zebd::ZEBBusName && !before.empty()) {
          allEnded();
        }
      });
  bus->finishRegistration();
  connection->enterEventLoopAsync();
}

namespace {

/// One whose request did not get through.
class FailedSearch : public RunningSearch {
 public:
  void cancel() override {}
  bool ended() const override { return true; }
  bool finished() const override { return false; }
  std::vector<zebd::FoundItem> items() const override { return {}; }
};

}  // namespace

std::unique_ptr<DaemonSearches> DaemonSearches::connect(const std::string& address) {
  try {
    auto connection = address.empty() ? sdbus::createSessionBusConnection()
                                      : sdbus::createSessionBusConnectionWithAddress(address);
    connection->setMethodCallTimeout(answerLimit);
    auto implementation = std::make_shared<Implementation>(std::move(connection));
    if (!implementation->daemonCanBeHad()) {
      return nullptr;
    }
    implementation->listen();
    return std::unique_ptr<DaemonSearches>(new DaemonSearches(std::move(implementation)));
  } catch (const sdbus::Error&) {
    return nullptr;
  }
}

DaemonSearches::DaemonSearches(std::shared_ptr<Implementation> implementation)
    : _implementation(std::move(implementation)) {}

DaemonSearches::~DaemonSearches() { _implementation->connection->leaveEventLoop(); }

class DaemonSearches::Running : public RunningSearch {
 public:
  Running(std::shared_ptr<Implementation> implementation, uint64_t handle)
      : _implementation(std::move(implementation)), _handle(handle) {}
  ~Running() override {
    const platform::MutexLock lock(_implementation->mutex);
    _implementation->heard.erase(_handle);
  }
  Running(const Running&) = delete;
  Running& operator=(const Running&) = delete;

  void cancel() override {
    try {
      _implementation->proxy->callMethodAsync("Complete")
          .onInterface(zebd::ZEBBusInterface)
          .withArguments(_handle)
          .uponReplyInvoke([](const sdbus::Error*) {});
    } catch (const sdbus::Error&) {
      // A daemon that is gone searches no more.
    }
  }
  bool ended() const override { return _heard().ended; }
  bool finished() const override { return _heard().finished; }
  std::vector<zebd::FoundItem> items() const override { return _heard().items; }

 private:
  Heard _heard() const {
    const platform::MutexLock lock(_implementation->mutex);
    return _implementation->heard[_handle];
  }

  const std::shared_ptr<Implementation> _implementation;
  const uint64_t _handle;
};

std::shared_ptr<RunningSearch> DaemonSearches::begin(const zebd::SearchRequest& request) {
  try {
    uint64_t handle = 0;
    _implementation->proxy->callMethod("StartSearch")
        .onInterface(zebd::ZEBBusInterface)
        .withArguments(request.text, optionsOf(request))
        .storeResultsTo(handle);
    return std::make_shared<Running>(_implementation, handle);
  } catch (const sdbus::Error&) {
    return std::make_shared<FailedSearch>();
  }
}

std::vector<std::string> DaemonSearches::booksWithoutIndex(
    const std::vector<std::string>& bookIDs) {
  Dictionaries books;
  try {
    _implementation->proxy->callMethod("Books")
        .onInterface(zebd::ZEBBusInterface)
        .storeResultsTo(books);
  } catch (const sdbus::Error&) {
    return {};
  }
  std::vector<std::string> missing;
  for (const Dictionary& book : books) {
    const std::string bookID = valueOf<std::string>(book, "id");
    const bool isWanted =
        bookIDs.empty() || std::find(bookIDs.begin(), bookIDs.end(), bookID) != bookIDs.end();
    const bool isRemote = valueOf<int32_t>(book, "type") == ZEBHelpBookType4;
    if (isWanted && !isRemote && !valueOf<bool>(book, "indexed")) {
      missing.push_back(bookID);
    }
  }
  return missing;
}

bool DaemonSearches::isBusy() const {
  Dictionary status;
  try {
    _implementation->proxy->callMethod("Status")
        .onInterface(zebd::ZEBBusInterface)
        .storeResultsTo(status);
  } catch (const sdbus::Error&) {
    return false;
  }
  return valueOf<bool>(status, "scanning") || valueOf<int64_t>(status, "guards") > 0;
}

bool DaemonSearches::rescan(platform::Seconds limit) {
  // The answer comes when the folders have been looked through.
  auto done = std::make_shared<std::atomic<int>>(0);
  try {
    _implementation->proxy->callMethodAsync("Rescan")
        .onInterface(zebd::ZEBBusInterface)
        .withTimeout(std::chrono::duration_cast<std::chrono::microseconds>(limit))
        .uponReplyInvoke([done](const sdbus::Error* error, uint32_t, uint32_t, uint32_t, uint32_t) {
          *done = error == nullptr ? 1 : -1;
          platform::RunLoop::main()->stop();
        });
  } catch (const sdbus::Error&) {
    return false;
  }
  zebd::Host::runMainLoopUntil([&] { return *done != 0; }, limit);
  return *done == 1;
}

}  // namespace zeb
