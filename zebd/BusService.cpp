#include "zebd/BusService.h"

#include <sdbus-c++/sdbus-c++.h>
#include <unistd.h>

#include <algorithm>
#include <cstdint>
#include <map>
#include <optional>
#include <thread>
#include <utility>
#include <vector>

#include "host/Zebrine/ZEBConstants.h"
#include "host/Zebrine/ZEBLog.h"
#include "platform/Environment.h"
#include "platform/RunLoop.h"
#include "platform/ThreadSafety.h"
#include "zebd/BusMessages.h"
#include "zebd/HelpService.h"
#include "zebd/Models.h"

#ifndef ZEB_VERSION
#define ZEB_VERSION "0"
#endif

namespace zebd {

using namespace busmessages;

namespace {

/// A message of the bus holds no more than this of what was found.
constexpr size_t itemsPerSignal = 100;

}  // namespace

/// Shared by this process's main thread, the thread that listens to the bus, and threads of
/// searches.
struct BusService::Implementation : SearchListener,
                                    std::enable_shared_from_this<BusService::Implementation> {
  explicit Implementation(std::unique_ptr<sdbus::IConnection> toBus)
      : connection(std::move(toBus)), object(sdbus::createObject(*connection, ZEBBusPath)) {}

  // SearchListener.
  void searchFound(const std::string& client, uint64_t handle,
                   const std::vector<FoundItem>& items) override;
  void searchEnded(const std::string& client, uint64_t handle, SearchEnding ending,
                   platform::Seconds waited) override;

  void registerMembers();
  void registerSearches();
  void registerQuestions();
  void registerChanges();
  void bookChanged(const std::string& bookID, bool isIndexed);
  void listen();
  void stop();
  void clientLeft(const std::string& client);

  /// Sends the answer, and counts it.
  using Done = std::function<void(const std::function<void()>& send)>;

  /// What a request is answered with, once: results or an error.
  template <typename... Answers>
  struct Reply {
    std::shared_ptr<sdbus::Result<Answers...>> result;
    Done done;

    void operator()(const Answers&... answers) const {
      done([&] {
        try {
          result->returnResults(answers...);
        } catch (const sdbus::Error& error) {
          // More than a message may hold: an error is better than no answer.
          result->returnError(sdbus::Error(failed, error.getMessage()));
        }
      });
    }
    void fail(const sdbus::Error& error) const {
      done([&] { result->returnError(error); });
    }
  };

  /// Has the request carried out on the main thread, if it may be. To be called while the bus hands
  /// the request over. What `carryOut` throws of sdbus::Error becomes the answer.
  template <typename... Answers, typename CarryOut>
  void take(sdbus::Result<Answers...>&& result, CarryOut carryOut) {
    const std::string client = object->getCurrentlyProcessedMessage()->getSender();
    if (const auto objection = objectionTo(client)) {
      result.returnError(sdbus::Error(refused, *objection));
      return;
    }
    auto answer = std::make_shared<sdbus::Result<Answers...>>(std::move(result));
    platform::RunLoop::main()->perform(
        [weak = weak_from_this(), client, answer, carryOut = std::move(carryOut)] {
          const auto self = weak.lock();
          if (self == nullptr || self->service == nullptr) {
            answer->returnError(sdbus::Error(refused, "the daemon is leaving"));
            return;
          }
          self->events.activity();
          const Done done = [weak, client](const std::function<void()>& send) {
            try {
              send();
            } catch (const sdbus::Error& error) {
              ZEBLog(1, "Cannot answer a client: %@", error.getMessage());
            }
            if (const auto still = weak.lock()) {
              still->requestEnded(client);
            }
          };
          try {
            carryOut(*self, client, Reply<Answers...>{answer, done});
          } catch (const sdbus::Error& error) {
            done([&] { answer->returnError(error); });
          } catch (const std::exception& exception) {
            ZEBLog(0, "%@", exception);
            done([&] { answer->returnError(sdbus::Error(failed, exception.what())); });
          }
        });
  }

  std::optional<std::string> objectionTo(const std::string& client);
  void requestEnded(const std::string& client);
  uint64_t start(const std::string& client, const SearchRequest& request) const;
  void send(const char* member, const std::string& client,
            const std::function<void(sdbus::Signal&)>& fill);

  const std::unique_ptr<sdbus::IConnection> connection;
  const std::unique_ptr<sdbus::IObject> object;
  sdbus::Slot departures;
  std::thread loop;

  /// Of the main thread; absent before and after the time of service.
  HelpService* service = nullptr;
  Events events;

  platform::Mutex clientsMutex;
  struct Client {
    bool isOurs = false;
    int requestCount = 0;
  };
  std::map<std::string, Client> clients GUARDED_BY(clientsMutex);
};

void BusService::Implementation::send(const char* member, const std::string& client,
                                      const std::function<void(sdbus::Signal&)>& fill) {
  try {
    sdbus::Signal signal = object->createSignal(ZEBBusInterface, member);
    fill(signal);
    signal.setDestination(client);
    object->emitSignal(signal);
  } catch (const sdbus::Error& error) {
    ZEBLog(1, "Cannot tell a client what was found: %@", error.getMessage());
  }
}

void BusService::Implementation::searchFound(const std::string& client, uint64_t handle,
                                             const std::vector<FoundItem>& items) {
  for (size_t begin = 0; begin < items.size(); begin += itemsPerSignal) {
    const size_t end = std::min(begin + itemsPerSignal, items.size());
    Dictionaries batch;
    for (size_t i = begin; i < end; ++i) {
      batch.push_back(dictionaryOfItem(items[i]));
    }
    send("Found", client, [&](sdbus::Signal& signal) { signal << handle << batch; });
  }
}

void BusService::Implementation::searchEnded(const std::string& client, uint64_t handle,
                                             SearchEnding ending, platform::Seconds waited) {
  send("Ended", client,
       [&](sdbus::Signal& signal) { signal << handle << nameOfEnding(ending) << waited.count(); });
  if (events.activity) {
    events.activity();
  }
}

std::optional<std::string> BusService::Implementation::objectionTo(const std::string& client) {
  {
    const platform::MutexLock lock(clientsMutex);
    const auto known = clients.find(client);
    if (known != clients.end()) {
      if (known->second.requestCount >= maximumRequestCount) {
        return "too many requests wait for an answer";
      }
      ++known->second.requestCount;
      return std::nullopt;
    }
  }
  uid_t user = 0;
  try {
    user = object->getCurrentlyProcessedMessage()->getCredsUid();
  } catch (const sdbus::Error&) {
    return "it is not known whose request this is";
  }
  if (user != ::getuid()) {
    return "this is another user's daemon";
  }
  const platform::MutexLock lock(clientsMutex);
  clients[client].requestCount = 1;
  return std::nullopt;
}

void BusService::Implementation::requestEnded(const std::string& client) {
  const platform::MutexLock lock(clientsMutex);
  const auto known = clients.find(client);
  if (known != clients.end()) {
    --known->second.requestCount;
  }
}

void BusService::Implementation::clientLeft(const std::string& client) {
  {
    const platform::MutexLock lock(clientsMutex);
    clients.erase(client);
  }
  if (service != nullptr) {
    service->searches().clientLeft(client);
  }
}

uint64_t BusService::Implementation::start(const std::string& client,
                                           const SearchRequest& request) const {
  if (const auto objection = HelpService::objection(request)) {
    throw sdbus::Error(badRequest, *objection);
  }
  const auto handle = service->searches().start(client, request);
  if (!handle) {
    throw sdbus::Error(refused, "too many clients search");
  }
  return *handle;
}

void BusService::Implementation::registerSearches() {
  object->registerMethod("StartSearch")
      .onInterface(ZEBBusInterface)
      .withInputParamNames("text", "options")
      .withOutputParamNames("handle")
      .implementedAs(
          [this](sdbus::Result<uint64_t>&& result, std::string text, Dictionary options) {
            take(std::move(result),
                 [text = std::move(text), options = std::move(options)](
                     Implementation& self, const std::string& client, const auto& answer) {
                   answer(self.start(client, requestWithOptions(text, options)));
                 });
          });
  object->registerMethod("LookUpAnchor")
      .onInterface(ZEBBusInterface)
      .withInputParamNames("name", "books")
      .withOutputParamNames("handle")
      .implementedAs([this](sdbus::Result<uint64_t>&& result, std::string name, Strings books) {
        SearchRequest request =
            requestFor(std::move(name), std::move(books), ZEBHelpArticleResult, 0);
        request.isAnchor = true;
        take(std::move(result), [request = std::move(request)](
                                    Implementation& self, const std::string& client,
                                    const auto& answer) { answer(self.start(client, request)); });
      });
  for (const auto& [member, kind] : {std::pair("Suggest", ZEBHelpSuggestionResult),
                                     std::pair("Similar", ZEBHelpSimilarSuggestionResult)}) {
    object->registerMethod(member)
        .onInterface(ZEBBusInterface)
        .withInputParamNames("text", "books", "limit")
        .withOutputParamNames("handle")
        .implementedAs([this, wanted = kind](sdbus::Result<uint64_t>&& result, std::string text,
                                             Strings books, uint32_t limit) {
          take(std::move(result),
               [request = requestFor(std::move(text), std::move(books), wanted, limit)](
                   Implementation& self, const std::string& client, const auto& answer) {
                 answer(self.start(client, request));
               });
        });
  }
  for (const char* member : {"Cancel", "Complete"}) {
    // A search is complete by itself; who says so before that takes it back.
    const bool mustBeUnderWay = std::string(member) == "Cancel";
    object->registerMethod(member)
        .onInterface(ZEBBusInterface)
        .withInputParamNames("handle")
        .implementedAs([this, mustBeUnderWay](sdbus::Result<>&& result, uint64_t handle) {
          take(std::move(result),
               [handle, mustBeUnderWay](Implementation& self, const std::string& client,
                                        const auto& answer) {
                 if (!self.service->searches().cancel(client, handle) && mustBeUnderWay) {
                   throw sdbus::Error(unknownHandle, "no such search is under way");
                 }
                 answer();
               });
        });
  }
  object->registerSignal("Found")
      .onInterface(ZEBBusInterface)
      .withParameters<uint64_t, Dictionaries>("handle", "results");
  object->registerSignal("Ended")
      .onInterface(ZEBBusInterface)
      .withParameters<uint64_t, std::string, double>("handle", "how", "waited");
}

void BusService::Implementation::registerQuestions() {
  object->registerMethod("Books")
      .onInterface(ZEBBusInterface)
      .withOutputParamNames("books")
      .implementedAs([this](sdbus::Result<Dictionaries>&& result) {
        take(std::move(result), [](Implementation& self, const std::string&, const auto& answer) {
          Dictionaries books;
          for (const BookStatus& book : self.service->books()) {
            books.push_back(dictionaryOfBook(book));
          }
          answer(books);
        });
      });
  object->registerMethod("Models")
      .onInterface(ZEBBusInterface)
      .withOutputParamNames("models")
      .implementedAs([this](sdbus::Result<Dictionaries>&& result) {
        take(std::move(result), [](Implementation&, const std::string&, const auto& answer) {
          Dictionaries models;
          for (const ListedModel& model : savedModels()) {
            models.push_back(dictionaryOfModel(model));
          }
          answer(models);
        });
      });
  object->registerMethod("Status")
      .onInterface(ZEBBusInterface)
      .withOutputParamNames("status")
      .implementedAs([this](sdbus::Result<Dictionary>&& result) {
        take(std::move(result), [](Implementation& self, const std::string&, const auto& answer) {
          const ServiceStatus status = self.service->status();
          answer({{"books", static_cast<uint64_t>(status.bookCount)},
                  {"indexed", static_cast<uint64_t>(status.indexedBookCount)},
                  {"searches", static_cast<uint64_t>(status.searchCount)},
                  {"watchedFolders", static_cast<uint64_t>(status.watchedFolderCount)},
                  {"scanning", status.isScanning},
                  {"guards", status.guardCount},
                  {"operations", status.operationCount},
                  {"running", status.running.count()},
                  {"process", static_cast<int64_t>(::getpid())},
                  {"version", std::string(ZEB_VERSION)}});
        });
      });
  object->registerMethod("Rescan")
      .onInterface(ZEBBusInterface)
      .withOutputParamNames("changed", "unchanged", "forgotten", "failed")
      .implementedAs([this](sdbus::Result<uint32_t, uint32_t, uint32_t, uint32_t>&& result) {
        take(std::move(result), [](Implementation& self, const std::string&, const auto& answer) {
          self.service->scan({}, [answer](const BookChanges& changes) {
            answer(static_cast<uint32_t>(changes.changed), static_cast<uint32_t>(changes.unchanged),
                   static_cast<uint32_t>(changes.forgotten), static_cast<uint32_t>(changes.failed));
          });
        });
      });
}

void BusService::Implementation::registerChanges() {
  object->registerMethod("Scan")
      .onInterface(ZEBBusInterface)
      .withInputParamNames("folders", "options")
      .withOutputParamNames("changes")
      .implementedAs([this](sdbus::Result<Dictionary>&& result, Strings folders,
                            Dictionary options) {
        take(std::move(result), [folders = std::move(folders), options = std::move(options)](
                                    Implementation& self, const std::string&, const auto& answer) {
          self.service->scan(scanWithOptions(folders, options),
                             [answer](const BookChanges& changes) {
                               answer({{"changed", changes.changedBooks},
                                       {"folderBooks", changes.folderBooks},
                                       {"unchanged", static_cast<uint32_t>(changes.unchanged)},
                                       {"forgotten", static_cast<uint32_t>(changes.forgotten)},
                                       {"failed", static_cast<uint32_t>(changes.failed)},
                                       {"failures", failuresOf(changes.failures)}});
                             });
        });
      });
  object->registerMethod("AddRemote")
      .onInterface(ZEBBusInterface)
      .withInputParamNames("address", "books", "languages")
      .withOutputParamNames("added", "failures")
      .implementedAs([this](sdbus::Result<Dictionaries, Failures>&& result, std::string address,
                            Strings books, Strings languages) {
        take(std::move(result), [address = std::move(address), books = std::move(books),
                                 languages = std::move(languages)](
                                    Implementation& self, const std::string&, const auto& answer) {
          checkTexts({address});
          checkBookIDs(books);
          checkTexts(languages);
          self.service->addRemote(address, {books, languages}, [answer](const AddedBooks& added) {
            if (added.problem) {
              answer.fail(sdbus::Error(unreachable, *added.problem));
              return;
            }
            Dictionaries entries;
            for (const CatalogueEntry& entry : added.entries) {
              entries.push_back(
                  {{"id", entry.bookID}, {"title", entry.title}, {"language", entry.language}});
            }
            answer(entries, failuresOf(added.failures));
          });
        });
      });
  object->registerMethod("RemoveRemote")
      .onInterface(ZEBBusInterface)
      .withInputParamNames("name")
      .withOutputParamNames("removed")
      .implementedAs([this](sdbus::Result<Strings>&& result, std::string name) {
        take(std::move(result), [name = std::move(name)](Implementation& self, const std::string&,
                                                         const auto& answer) {
          checkTexts({name});
          self.service->removeRemote(name, [answer, name](const RemovedBooks& removed) {
            if (removed.problem) {
              answer.fail(sdbus::Error(failed, *removed.problem));
              return;
            }
            if (!removed.wasFound) {
              answer.fail(sdbus::Error(unknownBook,
                                       "there is no book on a server called \"" + name + "\""));
              return;
            }
            answer(removed.bookIDs);
          });
        });
      });
}

void BusService::Implementation::registerMembers() {
  registerSearches();
  registerQuestions();
  registerChanges();
  object->registerSignal("BookChanged")
      .onInterface(ZEBBusInterface)
      .withParameters<std::string, bool>("book", "indexed");
  object->finishRegistration();
  departures = connection->addMatch(
      "type='signal',sender='org.freedesktop.DBus',interface='org.freedesktop.DBus',"
      "member='NameOwnerChanged'",
      [this](sdbus::Message& message) {
        std::string name;
        std::string before;
        std::string after;
        message >> name >> before >> after;
        if (!name.starts_with(':') || !after.empty()) {
          return;
        }
        platform::RunLoop::main()->perform([weak = weak_from_this(), name] {
          if (const auto self = weak.lock()) {
            self->clientLeft(name);
          }
        });
      });
}

void BusService::Implementation::bookChanged(const std::string& bookID, bool isIndexed) {
  try {
    object->emitSignal("BookChanged").onInterface(ZEBBusInterface).withArguments(bookID, isIndexed);
  } catch (const sdbus::Error& error) {
    ZEBLog(1, "Cannot tell clients of a book: %@", error.getMessage());
  }
}

void BusService::Implementation::listen() {
  try {
    connection->enterEventLoop();
  } catch (const std::exception& error) {
    ZEBLog(1, "The bus is gone: %@", std::string(error.what()));
    platform::RunLoop::main()->perform([weak = weak_from_this()] {
      if (const auto self = weak.lock(); self && self->events.disconnected) {
        self->events.disconnected();
      }
    });
  }
}

void BusService::Implementation::stop() {
  service = nullptr;
  events = {};
  if (loop.joinable()) {
    connection->leaveEventLoop();
    loop.join();
  }
}

BusService::BusService(std::shared_ptr<Implementation> implementation)
    : _implementation(std::move(implementation)) {}

BusService::~BusService() { _implementation->stop(); }

std::unique_ptr<BusService> BusService::connect(const std::string& address,
                                                platform::Error& error) {
  try {
    auto connection = address.empty() ? sdbus::createSessionBusConnection()
                                      : sdbus::createSessionBusConnectionWithAddress(address);
    return std::unique_ptr<BusService>(
        new BusService(std::make_shared<Implementation>(std::move(connection))));
  } catch (const sdbus::Error& reason) {
    error = {"zebd", 1, "there is no message bus: " + reason.getMessage()};
    return nullptr;
  }
}

std::shared_ptr<SearchListener> BusService::listener() const { return _implementation; }

bool BusService::serve(HelpService& service, Events events, platform::Error& error) {
  _implementation->service = &service;
  _implementation->events = std::move(events);
  service.setBookObserver([weak = std::weak_ptr<Implementation>(_implementation)](
                              const std::string& bookID, bool isIndexed) {
    if (const auto self = weak.lock()) {
      self->bookChanged(bookID, isIndexed);
    }
  });
  try {
    _implementation->registerMembers();
    _implementation->connection->requestName(ZEBBusName);
  } catch (const sdbus::Error& reason) {
    error = {"zebd", 2, "the name " + ZEBBusName + " cannot be had: " + reason.getMessage()};
    return false;
  }
  _implementation->loop = std::thread([implementation = _implementation.get()] {
    platform::setCurrentThreadName("bus");
    implementation->listen();
  });
  return true;
}

void BusService::releaseName() {
  try {
    _implementation->connection->releaseName(ZEBBusName);
  } catch (const sdbus::Error& reason) {
    ZEBLog(1, "Cannot give the name back: %@", reason.getMessage());
  }
}

bool BusService::requestName() {
  try {
    _implementation->connection->requestName(ZEBBusName);
    return true;
  } catch (const sdbus::Error&) {
    return false;
  }
}

}  // namespace zebd
