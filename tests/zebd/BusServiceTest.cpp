#include "zebd/BusService.h"

#include <gmock/gmock.h>
#include <sdbus-c++/sdbus-c++.h>
#include <unistd.h>

#include <algorithm>
#include <atomic>
#include <filesystem>
#include <fstream>
#include <iterator>
#include <map>
#include <regex>
#include <set>
#include <string>
#include <thread>
#include <vector>

#include "platform/RunLoop.h"
#include "tests/platform/services/PrivateBus.h"
#include "tests/platform/services/UnopenedBus.h"
#include "tests/support/ChildProcess.h"
#include "tests/zebd/HostWorld.h"
#include "zebd/HelpService.h"

namespace {

using testing::ElementsAre;
using testing::HasSubstr;
using testing::StartsWith;
using tests::ample;
using Dictionary = std::map<std::string, sdbus::Variant>;
using Dictionaries = std::vector<Dictionary>;
using Strings = std::vector<std::string>;

/// A program on the other side of the bus, which knows no more of us than the bus tells.
class Client {
 public:
  explicit Client(const std::string& address)
      : _connection(sdbus::createSessionBusConnectionWithAddress(address)),
        _proxy(sdbus::createProxy(*_connection, zebd::ZEBBusName, zebd::ZEBBusPath)) {
    _proxy->uponSignal("Found")
        .onInterface(zebd::ZEBBusInterface)
        .call([this](uint64_t handle, const Dictionaries& results) {
          const platform::MutexLock lock(_mutex);
          for (const Dictionary& result : results) {
            _titles[handle].push_back(result.at("title").get<std::string>());
          }
          _last = results.empty() ? Dictionary() : results.back();
          ++_batches;
          _largestBatch = std::max(_largestBatch, results.size());
        });
    _proxy->uponSignal("Ended")
        .onInterface(zebd::ZEBBusInterface)
        .call([this](uint64_t handle, const std::string& how, double waited) {
          const platform::MutexLock lock(_mutex);
          EXPECT_GE(waited, 0);
          _endings[handle] = how;
        });
    _proxy->uponSignal("BookChanged")
        .onInterface(zebd::ZEBBusInterface)
        .call([this](const std::string& book, bool isIndexed) {
          const platform::MutexLock lock(_mutex);
          _changedBooks.emplace(book, isIndexed);
        });
    _proxy->finishRegistration();
    _connection->enterEventLoopAsync();
  }
  ~Client() { leave(); }

  void leave() {
    if (_proxy != nullptr) {
      _connection->leaveEventLoop();
      _proxy.reset();
      _connection.reset();
    }
  }

  /// Calls while the main loop runs, as the service needs it. Returns the error's name, or nothing.
  template <typename Call>
  std::string call(const Call& toCall) {
    std::atomic<bool> isDone{false};
    std::string error;
    std::thread caller([&] {
      try {
        toCall(*_proxy);
      } catch (const sdbus::Error& failure) {
        error = failure.getName();
      }
      isDone = true;
    });
    EXPECT_TRUE(zebd::Host::runMainLoopUntil([&] { return isDone.load(); }, ample));
    caller.join();
    return error;
  }
  uint64_t startSearch(const std::string& text, const Dictionary& options = {}) {
    uint64_t handle = 0;
    EXPECT_EQ(call([&](sdbus::IProxy& proxy) {
                proxy.callMethod("StartSearch")
                    .onInterface(zebd::ZEBBusInterface)
                    .withArguments(text, options)
                    .storeResultsTo(handle);
              }),
              "");
    return handle;
  }
  std::string errorOfSearch(const std::string& text, const Dictionary& options) {
    return call([&](sdbus::IProxy& proxy) {
      proxy.callMethod("StartSearch")
          .onInterface(zebd::ZEBBusInterface)
          .withArguments(text, options);
    });
  }
  std::string errorOfHandle(const std::string& member, uint64_t handle) {
    return call([&](sdbus::IProxy& proxy) {
      proxy.callMethod(member).onInterface(zebd::ZEBBusInterface).withArguments(handle);
    });
  }

  bool waitForEnd(uint64_t handle) {
    return zebd::Host::runMainLoopUntil([&] { return !ending(handle).empty(); }, ample);
  }
  std::string ending(uint64_t handle) const {
    const platform::MutexLock lock(_mutex);
    const auto found = _endings.find(handle);
    return found == _endings.end() ? "" : found->second;
  }
  Strings titles(uint64_t handle) const {
    const platform::MutexLock lock(_mutex);
    const auto found = _titles.find(handle);
    return found == _titles.end() ? Strings() : found->second;
  }
  Dictionary lastResult() const {
    const platform::MutexLock lock(_mutex);
    return _last;
  }
  size_t batchCount() const {
    const platform::MutexLock lock(_mutex);
    return _batches;
  }
  size_t largestBatch() const {
    const platform::MutexLock lock(_mutex);
    return _largestBatch;
  }
  /// Book and whether it was indexed.
  std::set<std::pair<std::string, bool>> changedBooks() const {
    const platform::MutexLock lock(_mutex);
    return _changedBooks;
  }

 private:
  std::unique_ptr<sdbus::IConnection> _connection;
  std::unique_ptr<sdbus::IProxy> _proxy;
  mutable platform::Mutex _mutex;
  std::map<uint64_t, Strings> _titles GUARDED_BY(_mutex);
  std::map<uint64_t, std::string> _endings GUARDED_BY(_mutex);
  Dictionary _last GUARDED_BY(_mutex);
  size_t _batches GUARDED_BY(_mutex) = 0;
  size_t _largestBatch GUARDED_BY(_mutex) = 0;
  std::set<std::pair<std::string, bool>> _changedBooks GUARDED_BY(_mutex);
};

class BusServiceTest : public testing::Test, protected tests::HostWorld {
 protected:
  BusServiceTest() {
    writePage("share/help/en/garden/index.html", "Roses", "Cut roses in spring.");
    writePage("share/help/en/kitchen/index.html", "Boiling", "Put water into a pot.");
    platform::Error error;
    bus = zebd::BusService::connect(privateBus.address(), error);
    EXPECT_NE(bus, nullptr) << error.description;
    service = std::make_unique<zebd::HelpService>(
        startHost(),
        zebd::BookKeeper::Settings{{folder.path("share")}, folder.path("caches/zeb/books"), {"en"}},
        bus->listener());
    EXPECT_TRUE(
        bus->serve(*service, {[this] { ++activities; }, [this] { isDisconnected = true; }}, error))
        << error.description;
    service->begin();
    EXPECT_TRUE(runUntil([this] {
      return service->status().indexedBookCount == 2 &&
             service->owner().isQuietFor(platform::Seconds(2));
    }));
  }
  ~BusServiceTest() override { EXPECT_TRUE(waitUntilQuiet(service->owner())); }

  static bool runUntil(const std::function<bool()>& condition) {
    return zebd::Host::runMainLoopUntil(condition, ample);
  }
  /// What another program says that calls a member.
  std::string gdbus(const std::vector<std::string>& arguments, bool asNobody = false) {
    const std::string output = folder.path("output");
    std::filesystem::remove(output);
    std::vector<std::string> line = {"call",           "--address",      privateBus.address(),
                                     "--dest",         zebd::ZEBBusName, "--object-path",
                                     zebd::ZEBBusPath, "--method"};
    line.insert(line.end(), arguments.begin(), arguments.end());
    tests::ChildProcess process("/usr/bin/gdbus", line, output, asNobody);
    EXPECT_TRUE(runUntil([&] { return !process.isRunning(); }));
    std::ifstream file(output);
    return {std::istreambuf_iterator<char>(file), {}};
  }

  tests::PrivateBus privateBus;
  int activities = 0;
  bool isDisconnected = false;
  std::unique_ptr<zebd::BusService> bus;
  std::unique_ptr<zebd::HelpService> service;
};

TEST_F(BusServiceTest, SearchTellsItsClientWhatItFindsAndItsEnd) {
  Client client(privateBus.address());
  const uint64_t handle = client.startSearch("spring");
  EXPECT_GT(handle, 0U);
  EXPECT_TRUE(client.waitForEnd(handle));
  EXPECT_EQ(client.ending(handle), "complete");
  EXPECT_THAT(client.titles(handle), ElementsAre("Roses"));
  const Dictionary result = client.lastResult();
  EXPECT_EQ(result.at("kind").get<std::string>(), "pages");
  EXPECT_EQ(result.at("book").get<std::string>(), "garden");
  EXPECT_EQ(result.at("url").get<std::string>(),
            "file://" + folder.path("share/help/en/garden/index.html"));
  EXPECT_GT(result.at("relevance").get<double>(), 0);
  EXPECT_GT(activities, 0);
}

TEST_F(BusServiceTest, OptionsOfASearchAreHeeded) {
  Client client(privateBus.address());
  const uint64_t narrow = client.startSearch("spring", {{"books", Strings{"kitchen"}}});
  EXPECT_TRUE(client.waitForEnd(narrow));
  EXPECT_THAT(client.titles(narrow), testing::IsEmpty());
  const uint64_t anchor = client.startSearch("Boiling", {{"anchor", true}});
  EXPECT_TRUE(client.waitForEnd(anchor));
  EXPECT_THAT(client.titles(anchor), ElementsAre("Boiling"));
  const uint64_t all = client.startSearch("spring", {{"kinds", Strings{"pages", "suggestions"}},
                                                     {"limit", uint32_t{5}},
                                                     {"languages", Strings{"en"}}});
  EXPECT_TRUE(client.waitForEnd(all));
  EXPECT_EQ(client.ending(all), "complete");
}

TEST_F(BusServiceTest, AnchorsSuggestionsAndSimilarSearchesHaveMembersOfTheirOwn) {
  Client client(privateBus.address());
  uint64_t handle = 0;
  EXPECT_EQ(client.call([&](sdbus::IProxy& proxy) {
    proxy.callMethod("LookUpAnchor")
        .onInterface(zebd::ZEBBusInterface)
        .withArguments(std::string("Roses"), Strings())
        .storeResultsTo(handle);
  }),
            "");
  EXPECT_TRUE(client.waitForEnd(handle));
  EXPECT_THAT(client.titles(handle), ElementsAre("Roses"));
  for (const char* member : {"Suggest", "Similar"}) {
    EXPECT_EQ(client.call([&](sdbus::IProxy& proxy) {
      proxy.callMethod(member)
          .onInterface(zebd::ZEBBusInterface)
          .withArguments(std::string("ro"), Strings(), uint32_t{10})
          .storeResultsTo(handle);
    }),
              "");
    EXPECT_TRUE(client.waitForEnd(handle));
    EXPECT_EQ(client.ending(handle), "complete") << member;
  }
}

TEST_F(BusServiceTest, NobodyButTheClientHearsWhatItsSearchFinds) {
  Client client(privateBus.address());
  Client other(privateBus.address());
  const uint64_t handle = client.startSearch("spring");
  EXPECT_TRUE(client.waitForEnd(handle));
  const uint64_t own = other.startSearch("water");
  EXPECT_TRUE(other.waitForEnd(own));
  EXPECT_EQ(other.ending(handle), "");
  EXPECT_THAT(other.titles(handle), testing::IsEmpty());
}

TEST_F(BusServiceTest, CancelledSearchEndsAsSuch) {
  Client client(privateBus.address());
  const uint64_t first = client.startSearch("spring");
  const uint64_t second = client.startSearch("water");
  EXPECT_TRUE(client.waitForEnd(second));
  EXPECT_THAT(client.ending(first), testing::AnyOf("cancelled", "complete"));
  EXPECT_EQ(client.errorOfHandle("Cancel", second), "org.zeb.Help1.Error.UnknownHandle");
  EXPECT_EQ(client.errorOfHandle("Cancel", 999), "org.zeb.Help1.Error.UnknownHandle");
  EXPECT_EQ(client.errorOfHandle("Complete", second), "") << "that is how it is meant";
}

TEST_F(BusServiceTest, SearchOfAnotherClientCannotBeCancelled) {
  Client client(privateBus.address());
  Client other(privateBus.address());
  const uint64_t handle = client.startSearch("spring");
  EXPECT_EQ(other.errorOfHandle("Cancel", handle), "org.zeb.Help1.Error.UnknownHandle");
  EXPECT_TRUE(client.waitForEnd(handle));
  EXPECT_EQ(client.ending(handle), "complete");
}

TEST_F(BusServiceTest, RequestsThatAreNotUnderstoodAreErrorsOfTheClient) {
  Client client(privateBus.address());
  const std::string bad = "org.zeb.Help1.Error.BadRequest";
  EXPECT_EQ(client.errorOfSearch("a", {{"color", std::string("red")}}), bad);
  EXPECT_EQ(client.errorOfSearch("a", {{"kinds", Strings{"nonsense"}}}), bad);
  EXPECT_EQ(client.errorOfSearch("a", {{"kinds", Strings()}}), bad);
  EXPECT_EQ(client.errorOfSearch("a", {{"books", Strings{"../.."}}}), bad);
  EXPECT_EQ(client.errorOfSearch("a", {{"limit", uint32_t{4'000'000'000}}}), bad);
  EXPECT_EQ(client.errorOfSearch(std::string(5000, 'a'), {}), bad);
  EXPECT_NE(client.errorOfSearch("a", {{"limit", std::string("five")}}), "");
  EXPECT_EQ(client.errorOfSearch("", {}), "") << "finds nothing, and is no mistake";
}

TEST_F(BusServiceTest, ClientThatLeavesTakesItsSearchesWithIt) {
  Client client(privateBus.address());
  (void)client.startSearch("spring");
  client.leave();
  EXPECT_TRUE(runUntil([this] { return service->searches().count() == 0; }));
}

TEST_F(BusServiceTest, AnotherProgramAsksForBooksModelsAndStatus) {
  EXPECT_THAT(gdbus({"org.zeb.Help1.Books"}),
              testing::AllOf(HasSubstr("'id': <'garden'>"), HasSubstr("'indexed': <true>"),
                             HasSubstr("'title': <'Boiling'>")));
  EXPECT_THAT(gdbus({"org.zeb.Help1.Models"}), HasSubstr("'language': <'English'>"));
  EXPECT_THAT(gdbus({"org.zeb.Help1.Status"}),
              testing::AllOf(HasSubstr("'books': <uint64 2>"), HasSubstr("'indexed': <uint64 2>")));
  EXPECT_THAT(gdbus({"org.zeb.Help1.StartSearch", "spring", "{}"}), StartsWith("(uint64 "));
  EXPECT_THAT(gdbus({"org.zeb.Help1.StartSearch", "spring", "{'color': <'red'>}"}),
              HasSubstr("there is no option \"color\""));
}

TEST_F(BusServiceTest, BookWhoseFolderIsNoTextKeepsNoOtherFromBeingListed) {
  const std::string odd = "elsewhere/caf\xE9";
  writePage(odd + "/index.html", "Coffee", "Coffee is made of beans.");
  zebd::ScanRequest request;
  request.folders.push_back({folder.path(odd), std::nullopt});
  bool isScanned = false;
  service->scan(request, [&](const zebd::BookChanges&) { isScanned = true; });
  EXPECT_TRUE(runUntil([&] { return isScanned; }));
  EXPECT_THAT(gdbus({"org.zeb.Help1.Books"}),
              testing::AllOf(HasSubstr("'title': <'Coffee'>"), HasSubstr("'id': <'garden'>")));
}

TEST_F(BusServiceTest, RescanTellsWhatHasChanged) {
  EXPECT_THAT(gdbus({"org.zeb.Help1.Rescan"}), "(uint32 0, uint32 2, uint32 0, uint32 0)\n");
  std::filesystem::remove_all(folder.path("share/help/en/garden"));
  EXPECT_THAT(gdbus({"org.zeb.Help1.Rescan"}), HasSubstr("uint32 1, "));
  EXPECT_TRUE(runUntil([this] { return service->books().size() == 1; }));
}

TEST_F(BusServiceTest, OtherUsersAreRefused) {
  if (::getuid() != 0) {
    GTEST_SKIP() << "only root can be somebody else";
  }
  std::filesystem::permissions(std::filesystem::path(privateBus.socketPath()).parent_path(),
                               std::filesystem::perms::all);
  std::filesystem::permissions(privateBus.socketPath(), std::filesystem::perms::all);
  EXPECT_THAT(gdbus({"org.zeb.Help1.Books"}, true), HasSubstr("this is another user's daemon"));
}

TEST_F(BusServiceTest, SecondServiceOnTheBusIsRefused) {
  platform::Error error;
  const auto second = zebd::BusService::connect(privateBus.address(), error);
  ASSERT_NE(second, nullptr);
  EXPECT_FALSE(second->serve(*service, {[] {}, [] {}}, error));
  EXPECT_THAT(error.description, StartsWith("the name org.zeb.zebd cannot be had: "));
}

TEST_F(BusServiceTest, NameCanBeGivenBackAndTakenAgain) {
  bus->releaseName();
  EXPECT_THAT(gdbus({"org.zeb.Help1.Status"}), HasSubstr("Error"));
  EXPECT_TRUE(bus->requestName());
  EXPECT_THAT(gdbus({"org.zeb.Help1.Status"}), HasSubstr("'books'"));
}

TEST_F(BusServiceTest, ManyResultsComeInBatches) {
  for (int i = 0; i < 250; ++i) {
    writePage("share/help/en/garden/page" + std::to_string(i) + ".html", "Bed " + std::to_string(i),
              "Here grow tulips.");
  }
  EXPECT_THAT(gdbus({"org.zeb.Help1.Scan", "@as []", "{'force': <true>}"}), HasSubstr("garden"));
  EXPECT_TRUE(waitUntilQuiet(service->owner()));
  Client client(privateBus.address());
  const uint64_t handle = client.startSearch("+tulips", {{"limit", uint32_t{1000}}});
  EXPECT_TRUE(client.waitForEnd(handle));
  EXPECT_EQ(client.titles(handle).size(), 250U);
  EXPECT_LE(client.largestBatch(), 100U);
  EXPECT_GE(client.batchCount(), 3U);
}

TEST_F(BusServiceTest, ClientWithTooManyUnansweredRequestsIsRefusedMore) {
  // Nothing is answered before the main loop runs.
  const auto connection = sdbus::createSessionBusConnectionWithAddress(privateBus.address());
  const auto proxy = sdbus::createProxy(*connection, zebd::ZEBBusName, zebd::ZEBBusPath);
  proxy->finishRegistration();
  connection->enterEventLoopAsync();
  std::atomic<int> answered{0};
  std::atomic<int> refused{0};
  for (int i = 0; i < zebd::BusService::maximumRequestCount + 6; ++i) {
    proxy->callMethodAsync("Status")
        .onInterface(zebd::ZEBBusInterface)
        .uponReplyInvoke([&](const sdbus::Error* error, const Dictionary& /*status*/) {
          const bool isRefused =
              error != nullptr && error->getName() == "org.zeb.Help1.Error.Refused";
          ++(isRefused ? refused : answered);
        });
  }
  while (refused < 6) {
    std::this_thread::yield();
  }
  EXPECT_EQ(answered, 0);
  EXPECT_TRUE(runUntil([&] { return answered == zebd::BusService::maximumRequestCount; }));
  EXPECT_EQ(refused, 6);
  EXPECT_THAT(gdbus({"org.zeb.Help1.Status"}), HasSubstr("'books'"));
  connection->leaveEventLoop();
}

TEST_F(BusServiceTest, ClientThatReadsNothingHoldsUpNobody) {
  const auto deaf = sdbus::createSessionBusConnectionWithAddress(privateBus.address());
  const auto proxy = sdbus::createProxy(*deaf, zebd::ZEBBusName, zebd::ZEBBusPath);
  proxy->finishRegistration();
  Client client(privateBus.address());
  for (int i = 0; i < 40; ++i) {
    auto call = proxy->createMethodCall(zebd::ZEBBusInterface, "StartSearch");
    call << std::string("in") << Dictionary();
    proxy->callMethod(call, [](sdbus::MethodReply& /*reply*/, const sdbus::Error* /*error*/) {});
    const uint64_t handle = client.startSearch("spring");
    ASSERT_TRUE(client.waitForEnd(handle));
    ASSERT_EQ(client.ending(handle), "complete");
  }
  EXPECT_TRUE(runUntil([this] { return service->searches().count() == 0; }));
}

TEST_F(BusServiceTest, ChangesOfBooksAreToldToEverybody) {
  Client client(privateBus.address());
  EXPECT_THAT(gdbus({"org.zeb.Help1.Scan", "@as []", "{'force': <true>}"}), HasSubstr("garden"));
  EXPECT_TRUE(runUntil([&] { return client.changedBooks().contains({"garden", true}); }));
  std::filesystem::remove_all(folder.path("share/help/en/garden"));
  EXPECT_THAT(gdbus({"org.zeb.Help1.Rescan"}), HasSubstr("uint32 1, "));
  EXPECT_TRUE(runUntil([&] { return client.changedBooks().contains({"", false}); }));
}

/// What the service tells programs of itself is what docs/bus.md tells people.
TEST_F(BusServiceTest, IntrospectionIsAsDocumented) {
  const auto membersIn = [](const std::string& text) {
    std::set<std::string> members;
    std::string member;
    const std::regex tag("<(method|signal|arg) ([^>]*?)/?>");
    const std::regex attribute("(type|name|direction)=\"([^\"]*)\"");
    for (std::sregex_iterator found(text.begin(), text.end(), tag), end; found != end; ++found) {
      std::map<std::string, std::string> attributes;
      const std::string inside = (*found)[2];
      for (std::sregex_iterator one(inside.begin(), inside.end(), attribute); one != end; ++one) {
        attributes[(*one)[1]] = (*one)[2];
      }
      if ((*found)[1] == "arg") {
        member +=
            " " + attributes["direction"] + " " + attributes["name"] + " " + attributes["type"];
      } else {
        members.insert(member);
        member = attributes["name"] + ":";
      }
    }
    members.insert(member);
    members.erase("");
    return members;
  };
  std::ifstream page(ZEB_SOURCE_DIR "/docs/bus.md");
  const std::string documented{std::istreambuf_iterator<char>(page), {}};
  std::string told = gdbus({"org.freedesktop.DBus.Introspectable.Introspect"});
  told = told.substr(told.find("<interface name=\"org.zeb.Help1\""));
  told = told.substr(0, told.find("</interface>"));
  EXPECT_EQ(membersIn(told), membersIn(documented));
  EXPECT_EQ(membersIn(told).size(), 16U);
}

TEST_F(BusServiceTest, EndOfTheBusIsTold) {
  privateBus.stop();
  EXPECT_TRUE(runUntil([this] { return isDisconnected; }));
  EXPECT_THAT(log->messages(1), testing::Contains(StartsWith("The bus is gone: ")));
}

TEST(BusServiceWithoutBusTest, ThereIsNoServiceWithoutABus) {
  const tests::LostConnections lost;
  platform::Error error;
  EXPECT_EQ(zebd::BusService::connect("unix:path=/nonexistent/bus", error), nullptr);
  EXPECT_THAT(error.description, StartsWith("there is no message bus: "));
}

}  // namespace
