// What it costs to look whether remote books have changed that have not: requests, bytes and time,
// beside one curl process that fetches the same URLs.
//   bench_remote [BOOKS]
#include <fmt/format.h>

#include <algorithm>
#include <chrono>
#include <cstdlib>
#include <filesystem>
#include <string>
#include <vector>

#include "SearchKit/IndexWriter.h"
#include "host/Zebrine/RNXCatalogue.h"
#include "host/Zebrine/RNXObjectManager.h"
#include "host/Zebrine/ZEBConstants.h"
#include "host/Zebrine/ZEBHelpBook.h"
#include "platform/ClassicArchive.h"
#include "platform/Digest.h"
#include "platform/DistributedNotificationCenter.h"
#include "platform/Environment.h"
#include "platform/PropertyList.h"
#include "platform/RunLoop.h"
#include "plugin/operations/ZEBOperationQueue.h"
#include "plugin/shelf/ZEBIndexshelf.h"
#include "tests/plugin/HelpIndexWorld.h"
#include "tests/support/ChildProcess.h"
#include "tests/support/NginxServer.h"

namespace {

using Clock = std::chrono::steady_clock;

class Owner : public tests::BookOwner {
 public:
  bool userLoggedIn() const override { return true; }
};

double secondsOf(const std::function<void()>& work) {
  const auto start = Clock::now();
  work();
  return std::chrono::duration<double>(Clock::now() - start).count();
}

/// A book of some forty pages.
std::string indexBytes(size_t number) {
  std::vector<searchkit::Document> pages;
  for (size_t i = 0; i < 40; ++i) {
    std::string text;
    for (size_t word = 0; word < 300; ++word) {
      text += fmt::format("word{} ", (number * 31 + i * 17 + word * word) % 5000);
    }
    pages.push_back(tests::page(fmt::format("/p{}.html", i), fmt::format("Page {}", i), text));
  }
  return std::string(
      platform::classicArchiveWithRootObject(
          platform::Value::Dictionary{{"SKI_INDEX_DATA", tests::keywordIndex(std::move(pages))}})
          .view());
}

class Refresh {
 public:
  /// With `catalogueEach` every book has a publisher of its own, else all have the same.
  Refresh(size_t count, bool catalogueEach) : _count(count) {
    std::vector<RNXCatalogue> catalogues(catalogueEach ? count : 1);
    for (size_t i = 0; i < count; ++i) {
      const std::string index = indexBytes(i);
      const std::string list(platform::dataFromPropertyList(
                                 platform::Value::Dictionary{{"wifi", "network"}, {"n", bookID(i)}},
                                 platform::PropertyListFormat::xml)
                                 .view());
      RNXCatalogueEntry entry;
      entry.identifier = bookID(i);
      entry.version = "1";
      entry.locale = "en";
      entry.title = bookID(i);
      entry.searchIndex = _publish(fmt::format("{}.helpindex", i), index);
      entry.exactMatch = _publish(fmt::format("{}.plist", i), list);
      catalogues[catalogueEach ? i : 0].books.push_back(entry);
      _books.push_back(fmt::format("/{}.json", catalogueEach ? i : 0));
    }
    for (size_t i = 0; i < catalogues.size(); ++i) {
      const std::string name = fmt::format("{}.json", i);
      _server.write(name, catalogues[i].text());
      _urls.push_back(_server.URL("/" + name));
    }
  }

  static std::string bookID(size_t i) { return fmt::format("org.example.book{}", i); }

  /// As a host does that has just been started.
  double run() {
    RNXObjectManager::setSharedObjectManager(RNXObjectManager::init());
    const auto owner = std::make_shared<Owner>();
    std::vector<std::shared_ptr<ZEBHelpBook>> books;
    for (size_t i = 0; i < _count; ++i) {
      books.push_back(owner->addBook(bookID(i), ZEBHelpBookType4));
      books.back()->setLocalization("en");
      books.back()->setCatalogueURL(platform::URL::URLWithString(_server.URL(_books[i])));
    }
    const auto shelf = ZEBIndexshelf::initWithOwner(owner);
    shelf->setUserLoggedIn(true);
    return secondsOf([&] {
      for (const auto& book : books) {
        (void)shelf->indicesForBook(book);
      }
      const auto isBusy = [&](const auto& book) { return shelf->isIndexDownloadingForBook(book); };
      while (std::any_of(books.begin(), books.end(), isBusy)) {
        platform::RunLoop::main()->runFor(platform::Seconds(0.001));
      }
    });
  }

  double runCurl(bool conditionally) {
    std::string configuration = "silent\n";
    if (conditionally) {
      configuration += "header = \"If-Modified-Since: Fri, 01 Jan 2100 00:00:00 GMT\"\n";
    }
    for (const std::string& url : _urls) {
      configuration += fmt::format("url = \"{}\"\noutput = \"/dev/null\"\n", url);
    }
    const std::string file = _folder.write("curl.conf", configuration);
    return secondsOf([&] { tests::runToEnd("/usr/bin/curl", {"--config", file}); });
  }

  /// Requests and bytes of bodies since the last call, as the server has noted them.
  std::pair<size_t, size_t> takeTraffic() {
    // The server notes a request just after it has answered it.
    size_t known = 0;
    std::vector<std::string> log = _server.accessLog();
    do {
      known = log.size();
      platform::systemClock()->sleep(platform::Seconds(0.2));
      log = _server.accessLog();
    } while (log.size() != known);
    size_t bytes = 0;
    for (size_t i = _taken; i < log.size(); ++i) {
      bytes += std::stoull(log[i].substr(log[i].rfind(' ') + 1));
    }
    const size_t requests = log.size() - std::exchange(_taken, log.size());
    return {requests, bytes};
  }

 private:
  RNXAsset _publish(const std::string& name, const std::string& bytes) {
    _server.write(name, bytes);
    _urls.push_back(_server.URL("/" + name));
    return {*platform::URL::URLWithString(name), platform::sha256Digest(bytes)};
  }

  const size_t _count;
  const tests::TemporaryFolder _folder;
  // Whoever has seen it later than it was written has it.
  const tests::NginxServer _server{"if_modified_since before;"};
  std::vector<std::string> _urls;
  std::vector<std::string> _books;
  size_t _taken = 0;
};

void measure(const char* title, size_t count, bool catalogueEach) {
  const tests::TemporaryFolder folder;
  platform::Environment environment = platform::Environment::system();
  environment.cachesDirectory = folder.path("caches");
  environment.notificationCenter = platform::localNotificationCenter();
  const platform::EnvironmentOverride inForce(std::move(environment));
  Refresh refresh(count, catalogueEach);
  fmt::print("{}, {} books\n", title, count);
  const auto print = [&](const char* what, double seconds) {
    const auto [requests, bytes] = refresh.takeTraffic();
    fmt::print("  {:32} {:6} requests {:12} bytes {:8.3f} s\n", what, requests, bytes, seconds);
  };
  (void)refresh.takeTraffic();
  print("first download", refresh.run());
  std::vector<double> ours;
  std::vector<double> theirs;
  for (int i = 0; i < 5; ++i) {
    ours.push_back(refresh.run());
    print("nothing changed", ours.back());
    theirs.push_back(refresh.runCurl(true));
    print("curl, the same URLs, conditional", theirs.back());
  }
  print("curl, the same URLs", refresh.runCurl(false));
  std::sort(ours.begin(), ours.end());
  std::sort(theirs.begin(), theirs.end());
  fmt::print("  time as a share of curl's, conditional, medians: {:.2f}\n", ours[2] / theirs[2]);
}

}  // namespace

int main(int argc, char** argv) {
  const size_t count = argc > 1 ? std::strtoul(argv[1], nullptr, 10) : 200;
  measure("one catalogue", count, false);
  measure("a catalogue each", count, true);
  RNXObjectManager::setSharedObjectManager(nullptr);
  return 0;
}
