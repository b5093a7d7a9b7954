#include "zeb/DaemonClient.h"

#include <sdbus-c++/sdbus-c++.h>

#include <algorithm>
#include <atomic>
#include <chrono>
#include <cstdint>
#include <exception>
#include <map>
#include <thread>
#include <utility>

#include "host/Zebrine/ZEBConstants.h"
#include "host/Zebrine/ZEBLog.h"
#include "platform/RunLoop.h"
#include "platform/ThreadSafety.h"
#include "zeb/CommandLine.h"
#include "zebd/BusService.h"
#include "zebd/Host.h"

namespace zeb {

namespace {

using Dictionary = std::map<std::string, sdbus::Variant>;
using Dictionaries = std::vector<Dictionary>;
using Strings = std::vector<std::string>;
using Failures = std::vector<sdbus::Struct<std::string, std::string>>;

static_assert(maximumLimit <= zebd::HelpService::maximumResultCount);
static_assert(maximumTextLength <= zebd::HelpService::maximumTextLength);

/// The bus may have to start the daemon first.
constexpr platform::Seconds answerLimit{25};

constexpr const char* busName = "org.freedesktop.DBus";

template <typename Content>
Content valueOf(const Dictionary& dictionary, const std::string& key) {
  const auto found = dictionary.find(key);
  return found == dictionary.end() ? Content() : found->second.get<Content>();
}

zebd::FoundItem itemOfDictionary(const Dictionary& dictionary) {
  zebd::FoundItem item;
  item.kind = zebd::kindOfName(valueOf<std::string>(dictionary, "kind")).value_or("");
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
    kinds.push_back(zebd::nameOfKind(kind));
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
struct DaemonClient::Implementation {
  explicit Implementation(std::unique_ptr<sdbus::IConnection> toBus)
      : connection(std::move(toBus)),
        proxy(sdbus::createProxy(*connection, zebd::ZEBBusName, zebd::ZEBBusPath)),
        bus(sdbus::createProxy(*connection, busName, "/org/freedesktop/DBus")) {}

  bool daemonCanBeHad();
  void listen();
  void stopListening();
  /// The daemon is gone: what it owed does not come any more.
  void allEnded();

  platform::Mutex mutex;
  std::map<uint64_t, Heard> heard GUARDED_BY(mutex);
  /// How often a daemon, or the bus, has gone.
  uint64_t goneCount GUARDED_BY(mutex) = 0;
  std::atomic<uint64_t> changeCount{0};

  const std::unique_ptr<sdbus::IConnection> connection;
  const std::unique_ptr<sdbus::IProxy> proxy;
  const std::unique_ptr<sdbus::IProxy> bus;
  std::thread loop;
};

bool DaemonClient::Implementation::daemonCanBeHad() {
  for (const char* member : {"ListNames", "ListActivatableNames"}) {
    Strings names;
    bus->callMethod(member).onInterface(busName).storeResultsTo(names);
    if (std::find(names.begin(), names.end(), zebd::ZEBBusName) != names.end()) {
      return true;
    }
  }
  return false;
}

void DaemonClient::Implementation::allEnded() {
  {
    const platform::MutexLock lock(mutex);
    ++goneCount;
    for (auto& entry : heard) {
      entry.second.ended = true;
    }
  }
  platform::RunLoop::main()->stop();
}

void DaemonClient::Implementation::listen() {
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
  proxy->uponSignal("BookChanged")
      .onInterface(zebd::ZEBBusInterface)
      .call([this](const std::string& /*book*/, bool /*isIndexed*/) { ++changeCount; });
  proxy->finishRegistration();
  bus->uponSignal("NameOwnerChanged")
      .onInterface(busName)
      .call([this](const std::string& name, const std::string& before, const std::string&) {
        if (name == zebd::ZEBBusName) {
          // Another daemon may have found other books.
          ++changeCount;
          if (!before.empty()) {
            allEnded();
          }
        }
      });
  bus->finishRegistration();
  // The library's own thread would end the process together with the bus.
  loop = std::thread([this] {
    try {
      connection->enterEventLoop();
    } catch (const std::exception& error) {
      ZEBLog(0, "The bus is gone: %@", error);
      ++changeCount;
      allEnded();
    }
  });
}

void DaemonClient::Implementation::stopListening() {
  connection->leaveEventLoop();
  loop.join();
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

std::unique_ptr<DaemonClient> DaemonClient::connect(const std::string& address) {
  try {
    auto connection = address.empty() ? sdbus::createSessionBusConnection()
                                      : sdbus::createSessionBusConnectionWithAddress(address);
    connection->setMethodCallTimeout(answerLimit);
    auto implementation = std::make_shared<Implementation>(std::move(connection));
    if (!implementation->daemonCanBeHad()) {
      return nullptr;
    }
    implementation->listen();
    return std::unique_ptr<DaemonClient>(new DaemonClient(std::move(implementation)));
  } catch (const sdbus::Error&) {
    return nullptr;
  }
}

DaemonClient::DaemonClient(std::shared_ptr<Implementation> implementation)
    : _implementation(std::move(implementation)) {}

DaemonClient::~DaemonClient() { _implementation->stopListening(); }

class DaemonClient::Running : public RunningSearch {
 public:
  /// `goneCount` is that of the implementation before the search was asked for.
  Running(std::shared_ptr<Implementation> implementation, uint64_t handle, uint64_t goneCount)
      : _implementation(std::move(implementation)), _handle(handle) {
    const platform::MutexLock lock(_implementation->mutex);
    Heard& heard = _implementation->heard[_handle];
    heard.ended = heard.ended || _implementation->goneCount != goneCount;
  }
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

std::shared_ptr<RunningSearch> DaemonClient::begin(const zebd::SearchRequest& request) {
  uint64_t goneCount = 0;
  {
    const platform::MutexLock lock(_implementation->mutex);
    goneCount = _implementation->goneCount;
  }
  try {
    uint64_t handle = 0;
    _implementation->proxy->callMethod("StartSearch")
        .onInterface(zebd::ZEBBusInterface)
        .withArguments(request.text, optionsOf(request))
        .storeResultsTo(handle);
    return std::make_shared<Running>(_implementation, handle, goneCount);
  } catch (const sdbus::Error& error) {
    ZEBLog(0, "The help daemon does not search: %@", error.getMessage());
    return std::make_shared<FailedSearch>();
  }
}

std::optional<std::vector<zebd::BookStatus>> DaemonClient::books() const {
  Dictionaries books;
  try {
    _implementation->proxy->callMethod("Books")
        .onInterface(zebd::ZEBBusInterface)
        .storeResultsTo(books);
  } catch (const sdbus::Error&) {
    return std::nullopt;
  }
  std::vector<zebd::BookStatus> list;
  for (const Dictionary& book : books) {
    zebd::BookStatus status;
    status.bookID = valueOf<std::string>(book, "id");
    status.title = valueOf<std::string>(book, "title");
    status.language = valueOf<std::string>(book, "language");
    status.folder = valueOf<std::string>(book, "folder");
    status.type = valueOf<int32_t>(book, "type");
    if (book.contains("index")) {
      status.indexPath = valueOf<std::string>(book, "index");
    }
    list.push_back(std::move(status));
  }
  return list;
}

std::vector<std::string> DaemonClient::booksWithoutIndex(const std::vector<std::string>& bookIDs) {
  std::vector<std::string> missing;
  for (const zebd::BookStatus& book : books().value_or(std::vector<zebd::BookStatus>())) {
    const bool isWanted =
        bookIDs.empty() || std::find(bookIDs.begin(), bookIDs.end(), book.bookID) != bookIDs.end();
    if (isWanted && book.type != ZEBHelpBookType4 && !book.indexPath) {
      missing.push_back(book.bookID);
    }
  }
  return missing;
}

std::optional<DaemonStatus> DaemonClient::status() const {
  Dictionary answer;
  try {
    _implementation->proxy->callMethod("Status")
        .onInterface(zebd::ZEBBusInterface)
        .storeResultsTo(answer);
  } catch (const sdbus::Error&) {
    return std::nullopt;
  }
  DaemonStatus status;
  status.process = valueOf<int64_t>(answer, "process");
  status.version = valueOf<std::string>(answer, "version");
  status.searchCount = valueOf<uint64_t>(answer, "searches");
  status.watchedFolderCount = valueOf<uint64_t>(answer, "watchedFolders");
  status.isScanning = valueOf<bool>(answer, "scanning");
  status.guardCount = valueOf<int64_t>(answer, "guards");
  status.operationCount = valueOf<uint64_t>(answer, "operations");
  status.running = platform::Seconds(valueOf<double>(answer, "running"));
  return status;
}

bool DaemonClient::isBusy() const {
  const std::optional<DaemonStatus> now = status();
  return now && (now->isScanning || now->guardCount > 0 || now->operationCount > 0);
}

std::optional<std::string> DaemonClient::start() {
  // The bus cannot start what it has no service file of, even where somebody else has started it.
  if (isRunning()) {
    return std::nullopt;
  }
  try {
    uint32_t how = 0;
    _implementation->bus->callMethod("StartServiceByName")
        .onInterface(busName)
        .withArguments(zebd::ZEBBusName, uint32_t{0})
        .storeResultsTo(how);
    return std::nullopt;
  } catch (const sdbus::Error& error) {
    return error.getMessage();
  }
}

bool DaemonClient::isRunning() const {
  bool isThere = false;
  try {
    _implementation->bus->callMethod("NameHasOwner")
        .onInterface(busName)
        .withArguments(zebd::ZEBBusName)
        .storeResultsTo(isThere);
  } catch (const sdbus::Error&) {
    return false;
  }
  return isThere;
}

uint64_t DaemonClient::changeCount() const { return _implementation->changeCount; }

/// Calls, and runs the main loop until the answer is there, which may take as long as a download.
/// Returns why there is none, or nothing.
std::optional<std::string> DaemonClient::_call(
    const char* member, platform::Seconds limit,
    const std::function<void(sdbus::MethodCall& call)>& fill,
    const std::function<void(sdbus::MethodReply& reply)>& read) {
  struct Answer {
    std::atomic<bool> isThere{false};
    std::optional<sdbus::MethodReply> reply;
    std::string problem;
  };
  const auto answer = std::make_shared<Answer>();
  try {
    sdbus::MethodCall call =
        _implementation->proxy->createMethodCall(zebd::ZEBBusInterface, member);
    fill(call);
    _implementation->proxy->callMethod(
        call,
        [answer](sdbus::MethodReply& reply, const sdbus::Error* error) {
          if (error != nullptr) {
            answer->problem = error->getMessage();
          } else {
            answer->reply = reply;
          }
          answer->isThere = true;
          platform::RunLoop::main()->stop();
        },
        std::chrono::duration_cast<std::chrono::microseconds>(limit));
    if (!zebd::Host::runMainLoopUntil([&] { return answer->isThere.load(); }, limit)) {
      return "there was no answer in time";
    }
    if (!answer->reply) {
      return answer->problem;
    }
    read(*answer->reply);
  } catch (const sdbus::Error& error) {
    return error.getMessage();
  }
  return std::nullopt;
}

namespace {

std::vector<zebd::BookFailure> failuresOf(const Failures& failures) {
  std::vector<zebd::BookFailure> list;
  for (const auto& failure : failures) {
    list.push_back({failure.get<0>(), failure.get<1>()});
  }
  return list;
}

}  // namespace

std::optional<zebd::BookChanges> DaemonClient::scan(const zebd::ScanRequest& request,
                                                    platform::Seconds limit, std::string& problem) {
  Strings folders;
  Strings bookIDs;
  for (const zebd::ScanRequest::Folder& folder : request.folders) {
    folders.push_back(folder.path);
    if (folder.bookID) {
      bookIDs.push_back(*folder.bookID);
    }
  }
  Dictionary options = {{"installed", request.installedBooks},
                        {"force", request.allBooksEvenIfUnchanged},
                        {"forceFolders", request.folderBooksEvenIfUnchanged},
                        {"servers", request.asksServers}};
  if (!bookIDs.empty()) {
    options["books"] = bookIDs;
  }
  if (!request.languages.empty()) {
    options["languages"] = request.languages;
  }
  Dictionary answer;
  const auto failed = _call(
      "Scan", limit, [&](sdbus::MethodCall& call) { call << folders << options; },
      [&](sdbus::MethodReply& reply) { reply >> answer; });
  if (failed) {
    problem = *failed;
    return std::nullopt;
  }
  zebd::BookChanges changes;
  changes.changedBooks = valueOf<Strings>(answer, "changed");
  changes.changed = changes.changedBooks.size();
  changes.folderBooks = valueOf<Strings>(answer, "folderBooks");
  changes.unchanged = valueOf<uint32_t>(answer, "unchanged");
  changes.forgotten = valueOf<uint32_t>(answer, "forgotten");
  changes.failed = valueOf<uint32_t>(answer, "failed");
  changes.failures = failuresOf(valueOf<Failures>(answer, "failures"));
  return changes;
}

zebd::AddedBooks DaemonClient::addRemote(const std::string& address,
                                         const zebd::WantedBooks& wanted, platform::Seconds limit) {
  Dictionaries entries;
  Failures failures;
  zebd::AddedBooks added;
  added.problem = _call(
      "AddRemote", limit,
      [&](sdbus::MethodCall& call) { call << address << wanted.bookIDs << wanted.languages; },
      [&](sdbus::MethodReply& reply) { reply >> entries >> failures; });
  for (const Dictionary& entry : entries) {
    zebd::CatalogueEntry book;
    book.bookID = valueOf<std::string>(entry, "id");
    book.title = valueOf<std::string>(entry, "title");
    book.language = valueOf<std::string>(entry, "language");
    added.entries.push_back(std::move(book));
  }
  added.failures = failuresOf(failures);
  return added;
}

std::optional<std::string> DaemonClient::removeRemote(const std::string& name,
                                                      platform::Seconds limit) {
  Strings removed;
  return _call(
      "RemoveRemote", limit, [&](sdbus::MethodCall& call) { call << name; },
      [&](sdbus::MethodReply& reply) { reply >> removed; });
}

}  // namespace zeb
