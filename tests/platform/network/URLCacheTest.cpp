#include "platform/URLCache.h"

#include <gmock/gmock.h>

#include <unistd.h>

#include <filesystem>
#include <fstream>
#include <thread>

#include "platform/URLCacheRecord.h"
#include "tests/platform/network/SessionFixture.h"

namespace {

using namespace platform;
using namespace tests;
namespace fs = std::filesystem;

constexpr auto inMemoryOnly = URLCacheStoragePolicy::allowedInMemoryOnly;

class URLCacheTest : public SessionTest {
 protected:
  URLCacheTest()
      : URLCacheTest(std::make_shared<SimulatedClock>(), std::make_shared<FailingFileManager>()) {}
  URLCacheTest(std::shared_ptr<SimulatedClock> simulated,
               std::shared_ptr<FailingFileManager> failing)
      : SessionTest(simulated, failing), clock(std::move(simulated)), files(std::move(failing)) {}

  static URLRequest request(const std::string& path) {
    return requestOf("http://books.example/" + path);
  }
  static std::shared_ptr<const CachedURLResponse> answer(
      const std::string& body, HTTPHeaderFields fields = {},
      URLCacheStoragePolicy policy = URLCacheStoragePolicy::allowed) {
    return CachedURLResponse::initWithResponse(
        URLResponse::initWithURL(urlOf("http://books.example/"), 200, "HTTP/1.1",
                                 std::move(fields)),
        Data::copy(body), policy);
  }
  std::shared_ptr<URLCache> cache(size_t memory = 1 << 20, size_t disk = 1 << 20) const {
    return URLCache::initWithMemoryCapacity(memory, disk, directory);
  }
  static std::string bodyIn(URLCache& cache, const URLRequest& asked) {
    const auto found = cache.cachedResponseForRequest(asked);
    return found == nullptr ? "(none)" : std::string(found->data().view());
  }
  std::vector<fs::path> filesOnDisk() const {
    std::vector<fs::path> paths;
    for (const auto& entry : fs::directory_iterator(directory)) {
      paths.push_back(entry.path());
    }
    return paths;
  }

  const std::shared_ptr<SimulatedClock> clock;
  const std::shared_ptr<FailingFileManager> files;
  const std::string directory = folder.path("caches/of/answers");
};

TEST_F(URLCacheTest, GivesBackWhatWasStored) {
  const auto kept = cache();
  clock->advance(Seconds(100));
  kept->storeCachedResponse(answer("body", {{"ETag", "\"1\""}}), request("a"));
  const auto found = kept->cachedResponseForRequest(request("a"));
  ASSERT_NE(found, nullptr);
  EXPECT_EQ(found->data().view(), "body");
  EXPECT_EQ(found->response()->valueForHTTPHeaderField("etag"), "\"1\"");
  EXPECT_EQ(found->date(), clock->now());
  EXPECT_EQ(kept->cachedResponseForRequest(request("b")), nullptr);
}

TEST_F(URLCacheTest, SurvivesTheProcess) {
  clock->setNow(std::chrono::system_clock::time_point(std::chrono::seconds(1700000000)));
  cache()->storeCachedResponse(
      answer(std::string("body\0with zero", 14), {{"ETag", "\"1\""}, {"X-Odd", "\xE4"}}),
      request("a"));
  const auto later = cache();
  const auto found = later->cachedResponseForRequest(request("a"));
  ASSERT_NE(found, nullptr);
  EXPECT_EQ(found->data().view(), std::string_view("body\0with zero", 14));
  EXPECT_EQ(found->response()->statusCode(), 200);
  EXPECT_EQ(found->response()->HTTPVersion(), "HTTP/1.1");
  EXPECT_EQ(found->response()->valueForHTTPHeaderField("x-odd"), "\xE4");
  EXPECT_EQ(found->date(), clock->now());
  EXPECT_EQ(filesOnDisk().size(), 1U);
}

TEST_F(URLCacheTest, KeepsOneAnswerForAURLWithoutItsFragment) {
  const auto kept = cache();
  kept->storeCachedResponse(answer("one"), request("a#top"));
  kept->storeCachedResponse(answer("two"), request("a#end"));
  EXPECT_EQ(bodyIn(*kept, request("a")), "two");
  EXPECT_EQ(bodyIn(*cache(), request("a")), "two");
  EXPECT_EQ(filesOnDisk().size(), 1U);
}

TEST_F(URLCacheTest, LetsTheLeastRecentlyUsedGoFromMemory) {
  const auto kept = URLCache::initWithMemoryCapacity(3500, 0, std::nullopt);
  for (const char* name : {"a", "b", "c"}) {
    kept->storeCachedResponse(answer(std::string(1000, *name)), request(name));
  }
  EXPECT_EQ(bodyIn(*kept, request("a")), std::string(1000, 'a'));
  kept->storeCachedResponse(answer(std::string(1000, 'd')), request("d"));
  EXPECT_EQ(bodyIn(*kept, request("b")), "(none)");
  EXPECT_EQ(bodyIn(*kept, request("a")), std::string(1000, 'a'));
  EXPECT_EQ(bodyIn(*kept, request("c")), std::string(1000, 'c'));
  EXPECT_LE(kept->currentMemoryUsage(), 3500U);
  EXPECT_EQ(kept->currentDiskUsage(), 0U);
}

TEST_F(URLCacheTest, LetsTheLeastRecentlyUsedGoFromDisk) {
  const auto kept = cache(0, 4200);
  for (const char* name : {"a", "b", "c"}) {
    clock->advance(Seconds(1));
    kept->storeCachedResponse(answer(std::string(1000, *name)), request(name));
  }
  EXPECT_EQ(bodyIn(*kept, request("a")), std::string(1000, 'a'));
  clock->advance(Seconds(1));
  kept->storeCachedResponse(answer(std::string(1000, 'd')), request("d"));
  EXPECT_EQ(bodyIn(*kept, request("b")), "(none)");
  EXPECT_EQ(bodyIn(*kept, request("a")), std::string(1000, 'a'));
  EXPECT_LE(kept->currentDiskUsage(), 4200U);
  EXPECT_EQ(filesOnDisk().size(), 3U);
}

TEST_F(URLCacheTest, RemembersTheOrderOfUseAcrossProcesses) {
  {
    const auto kept = cache(1 << 20, 4200);
    for (const char* name : {"a", "b", "c"}) {
      clock->advance(Seconds(1));
      kept->storeCachedResponse(answer(std::string(1000, *name)), request(name));
    }
    clock->advance(Seconds(1));
    // Both from memory and from disk.
    bodyIn(*kept, request("a"));
  }
  clock->advance(Seconds(1));
  const auto later = cache(0, 4200);
  later->storeCachedResponse(answer(std::string(1000, 'd')), request("d"));
  EXPECT_EQ(bodyIn(*later, request("b")), "(none)");
  EXPECT_EQ(bodyIn(*later, request("a")), std::string(1000, 'a'));
}

TEST_F(URLCacheTest, LetsGoAtOnceWhenACapacityShrinks) {
  const auto kept = cache();
  for (const char* name : {"a", "b", "c"}) {
    kept->storeCachedResponse(answer(std::string(1000, *name)), request(name));
  }
  kept->setMemoryCapacity(2500);
  kept->setDiskCapacity(2600);
  EXPECT_EQ(kept->memoryCapacity(), 2500U);
  EXPECT_EQ(kept->diskCapacity(), 2600U);
  EXPECT_LE(kept->currentMemoryUsage(), 2500U);
  EXPECT_GT(kept->currentMemoryUsage(), 1000U);
  EXPECT_LE(kept->currentDiskUsage(), 2600U);
  EXPECT_EQ(filesOnDisk().size(), 2U);
  EXPECT_EQ(bodyIn(*kept, request("a")), "(none)");
  EXPECT_EQ(bodyIn(*kept, request("c")), std::string(1000, 'c'));
}

TEST_F(URLCacheTest, KeepsNothingGreaterThanACapacity) {
  const auto kept = cache(1000, 2000);
  kept->storeCachedResponse(answer("small"), request("a"));
  kept->storeCachedResponse(answer(std::string(1500, 'x')), request("middle"));
  kept->storeCachedResponse(answer(std::string(5000, 'x')), request("a"));
  EXPECT_EQ(bodyIn(*kept, request("a")), "(none)");
  EXPECT_EQ(bodyIn(*kept, request("middle")), std::string(1500, 'x'));
  EXPECT_EQ(kept->currentMemoryUsage(), 0U);
}

TEST_F(URLCacheTest, RemovesOneOrAll) {
  const auto kept = cache();
  for (const char* name : {"a", "b", "c"}) {
    kept->storeCachedResponse(answer(name), request(name));
  }
  kept->removeCachedResponseForRequest(request("a"));
  EXPECT_EQ(bodyIn(*kept, request("a")), "(none)");
  EXPECT_EQ(bodyIn(*cache(), request("a")), "(none)");
  EXPECT_EQ(bodyIn(*kept, request("b")), "b");
  kept->removeAllCachedResponses();
  EXPECT_EQ(bodyIn(*kept, request("b")), "(none)");
  EXPECT_EQ(kept->currentMemoryUsage(), 0U);
  EXPECT_EQ(kept->currentDiskUsage(), 0U);
  EXPECT_TRUE(filesOnDisk().empty());
}

TEST_F(URLCacheTest, KeepsFromDiskWhatIsForMemoryOnly) {
  const auto kept = cache();
  kept->storeCachedResponse(answer("old"), request("a"));
  kept->storeCachedResponse(answer("new", {}, inMemoryOnly), request("a"));
  EXPECT_EQ(bodyIn(*kept, request("a")), "new");
  EXPECT_EQ(bodyIn(*cache(), request("a")), "(none)");
}

TEST_F(URLCacheTest, StoresNothingThatMayNotBeStored) {
  const auto kept = cache();
  kept->storeCachedResponse(answer("x", {}, URLCacheStoragePolicy::notAllowed), request("a"));
  URLRequest head = request("a");
  head.setHTTPMethod("HEAD");
  kept->storeCachedResponse(answer("x"), head);
  kept->storeCachedResponse(answer("x", {{"Vary", "Accept, *"}}), request("a"));
  kept->storeCachedResponse(nullptr, request("a"));
  EXPECT_EQ(bodyIn(*kept, request("a")), "(none)");
}

TEST_F(URLCacheTest, GivesAnAnswerOnlyToRequestsThatItWasGivenFor) {
  const auto kept = cache();
  URLRequest german = request("a");
  german.setValueForHTTPHeaderField("de", "Accept-Language");
  kept->storeCachedResponse(answer("Hallo", {{"Vary", "accept-language, X-None"}}), german);
  EXPECT_EQ(bodyIn(*kept, request("a")), "(none)");
  EXPECT_EQ(bodyIn(*kept, german), "Hallo");
  EXPECT_EQ(bodyIn(*cache(), german), "Hallo");
  EXPECT_EQ(bodyIn(*cache(), request("a")), "(none)");
}

TEST_F(URLCacheTest, KeepsNoSecretsOnDisk) {
  const auto kept = cache();
  URLRequest mine = request("a");
  mine.setCredential(URLCredential{URLCredential::Scheme::basic, "reader", "secret"});
  kept->storeCachedResponse(answer("x", {{"Vary", "Authorization"}}), mine);
  EXPECT_EQ(bodyIn(*kept, mine), "(none)");
  kept->storeCachedResponse(answer("x"), mine);
  ASSERT_EQ(filesOnDisk().size(), 1U);
  const auto bytes = files->contentsAtPath(filesOnDisk()[0].string(), nullptr);
  EXPECT_EQ(bytes->view().find("secret"), std::string_view::npos);
}

TEST_F(URLCacheTest, DeletesATornFile) {
  cache()->storeCachedResponse(answer("the whole body"), request("a"));
  const fs::path file = filesOnDisk().at(0);
  const std::string whole(files->contentsAtPath(file.string(), nullptr)->view());
  for (size_t length = 0; length < whole.size(); ++length) {
    fs::resize_file(file, length);
    EXPECT_EQ(bodyIn(*cache(), request("a")), "(none)") << length;
    EXPECT_FALSE(fs::exists(file)) << length;
    folder.write("caches/of/answers/" + file.filename().string(), whole);
  }
  EXPECT_EQ(bodyIn(*cache(), request("a")), "the whole body");
}

TEST_F(URLCacheTest, DeletesAFileWithAnyByteChanged) {
  cache()->storeCachedResponse(answer("the whole body"), request("a"));
  const fs::path file = filesOnDisk().at(0);
  const std::string whole(files->contentsAtPath(file.string(), nullptr)->view());
  for (size_t place = 0; place < whole.size(); ++place) {
    std::string changed = whole;
    changed[place] = static_cast<char>(changed[place] ^ 0x10);
    folder.write("caches/of/answers/" + file.filename().string(), changed);
    EXPECT_EQ(bodyIn(*cache(), request("a")), "(none)") << place;
    EXPECT_FALSE(fs::exists(file)) << place;
  }
}

TEST_F(URLCacheTest, DoesNotReadAFileThatNeverFitted) {
  cache()->storeCachedResponse(answer("body"), request("a"));
  const fs::path file = filesOnDisk().at(0);
  fs::resize_file(file, uint64_t{1} << 33);
  EXPECT_EQ(bodyIn(*cache(), request("a")), "(none)");
  EXPECT_FALSE(fs::exists(file));
}

TEST_F(URLCacheTest, TakesNoOtherURLsAnswerUnderItsName) {
  const auto kept = cache();
  kept->storeCachedResponse(answer("mine"), request("a"));
  const fs::path mine = filesOnDisk().at(0);
  fs::rename(mine, folder.path("aside"));
  kept->storeCachedResponse(answer("other"), request("b"));
  fs::rename(filesOnDisk().at(0), mine);
  EXPECT_EQ(bodyIn(*cache(), request("a")), "(none)");
}

TEST_F(URLCacheTest, WorksFromMemoryWhenTheDiskFails) {
  const auto kept = cache();
  files->fail(FailingFileManager::Operation::write, ENOSPC);
  kept->storeCachedResponse(answer("body"), request("a"));
  EXPECT_EQ(bodyIn(*kept, request("a")), "body");
  EXPECT_EQ(kept->currentDiskUsage(), 0U);
  files->recover();
  files->fail(FailingFileManager::Operation::createDirectory, EACCES);
  kept->storeCachedResponse(answer("body"), request("b"));
  EXPECT_EQ(bodyIn(*kept, request("b")), "body");
  files->recover();
  kept->storeCachedResponse(answer("body"), request("c"));
  files->fail(FailingFileManager::Operation::read, EIO);
  EXPECT_EQ(bodyIn(*cache(), request("c")), "(none)");
}

TEST_F(URLCacheTest, KeepsNoEarlierAnswerWhenTheDiskFails) {
  const auto kept = cache();
  kept->storeCachedResponse(answer("old"), request("a"));
  files->fail(FailingFileManager::Operation::write, ENOSPC);
  kept->storeCachedResponse(answer("new"), request("a"));
  EXPECT_EQ(bodyIn(*kept, request("a")), "new");
  EXPECT_EQ(bodyIn(*cache(), request("a")), "(none)");
}

TEST_F(URLCacheTest, SharesAFolderWithOtherProcesses) {
  const auto one = cache(0, 4200);
  const auto other = cache(0, 4200);
  for (const char* name : {"a", "b"}) {
    clock->advance(Seconds(1));
    one->storeCachedResponse(answer(std::string(1000, *name)), request(name));
    clock->advance(Seconds(1));
    other->storeCachedResponse(answer(std::string(1000, *name)),
                               request(std::string("other-") + name));
  }
  EXPECT_LE(one->currentDiskUsage(), 4200U);
  EXPECT_EQ(filesOnDisk().size(), 3U);
  EXPECT_EQ(bodyIn(*one, request("other-b")), std::string(1000, 'b'));
}

TEST_F(URLCacheTest, ClearsAwayWhatACrashedWriterLeft) {
  const auto kept = cache();
  kept->storeCachedResponse(answer("body"), request("a"));
  const std::string leftover = "." + filesOnDisk().at(0).filename().string() + ".1234.5.tmp";
  folder.write("caches/of/answers/" + leftover, "half");
  folder.write("caches/of/answers/notes.txt", "somebody's own");
  clock->setNow(std::chrono::system_clock::now());
  kept->storeCachedResponse(answer("body"), request("b"));
  EXPECT_TRUE(fs::exists(directory + "/" + leftover));
  clock->advance(Seconds(4000));
  kept->storeCachedResponse(answer("body"), request("c"));
  EXPECT_FALSE(fs::exists(directory + "/" + leftover));
  kept->removeAllCachedResponses();
  EXPECT_TRUE(fs::exists(directory + "/notes.txt"));
}

TEST_F(URLCacheTest, ClearsAwayAtOnceWhatAProcessLeftThatHasEnded) {
  cache()->storeCachedResponse(answer("body"), request("a"));
  const std::string name = directory + "/." + filesOnDisk().at(0).filename().string();
  const std::string running = name + "." + std::to_string(::getpid()) + ".5.tmp";
  // Greater than any process number is.
  const std::string ended = name + ".2000000000.5.tmp";
  std::ofstream(running) << "half";
  std::ofstream(ended) << "half";
  cache()->storeCachedResponse(answer("body"), request("b"));
  EXPECT_TRUE(fs::exists(running));
  EXPECT_FALSE(fs::exists(ended));
}

TEST_F(URLCacheTest, IsUsedByManyThreads) {
  const auto kept = cache(20000, 20000);
  std::vector<std::thread> threads;
  for (int thread = 0; thread < 4; ++thread) {
    threads.emplace_back([&, thread] {
      for (int i = 0; i < 30; ++i) {
        const std::string name = std::to_string((i * 7 + thread) % 10);
        kept->storeCachedResponse(answer(std::string(3000, name[0])), request(name));
        const auto found = kept->cachedResponseForRequest(request(name));
        if (found != nullptr) {
          EXPECT_EQ(found->data().view(), std::string(3000, name[0]));
        }
        if (i % 10 == 9) {
          kept->removeCachedResponseForRequest(request(name));
        }
      }
    });
  }
  for (std::thread& thread : threads) {
    thread.join();
  }
  EXPECT_LE(kept->currentMemoryUsage(), 20000U);
  EXPECT_LE(kept->currentDiskUsage(), 20000U);
}

TEST_F(URLCacheTest, IsSharedByTheProcess) {
  const auto shared = URLCache::sharedURLCache();
  EXPECT_EQ(shared, URLCache::sharedURLCache());
  shared->setMemoryCapacity(12345);
  shared->setDiskCapacity(54321);
  shared->storeCachedResponse(answer("body"), request("a"));
  EXPECT_FALSE(fs::is_empty(folder.path("caches/zeb/URLCache")));
  {
    const TemporaryFolder other;
    Environment environment = *Environment::current();
    environment.cachesDirectory = other.path();
    const EnvironmentOverride elsewhere(environment);
    EXPECT_EQ(bodyIn(*URLCache::sharedURLCache(), request("a")), "(none)");
    EXPECT_EQ(URLCache::sharedURLCache()->memoryCapacity(), 12345U);
    EXPECT_EQ(URLCache::sharedURLCache()->diskCapacity(), 54321U);
  }
  const auto own = cache();
  URLCache::setSharedURLCache(own);
  EXPECT_EQ(URLCache::sharedURLCache(), own);
  URLCache::setSharedURLCache(nullptr);
  EXPECT_NE(URLCache::sharedURLCache(), own);
}

TEST(URLCacheRecord, ReadsBackWhatItWrites) {
  const auto request = requestOf("http://books.example/a");
  const auto record = URLCacheRecord::recordWithCachedResponse(
      CachedURLResponse::initWithResponse(
          URLResponse::initWithURL(urlOf("http://books.example/a"), 203, "HTTP/1.0", {{"X", "1"}}),
          Data()),
      request);
  const auto again = URLCacheRecord::decoded(record->encoded());
  ASSERT_NE(again, nullptr);
  EXPECT_EQ(again->key, "http://books.example/a");
  EXPECT_EQ(again->cachedResponse->response()->statusCode(), 203);
  EXPECT_TRUE(again->cachedResponse->data().empty());
  EXPECT_EQ(again->encoded(), record->encoded());
}

TEST(URLCacheRecord, ReadsFilesOfVersionOne) {
  const auto file = systemFileManager()->contentsAtPath(
      ZEB_SOURCE_DIR "/tests/platform/network/files/url-cache-version-1.answer");
  ASSERT_TRUE(file.has_value());
  const auto record = URLCacheRecord::decoded(*file);
  ASSERT_NE(record, nullptr);
  EXPECT_EQ(record->key, "http://books.example/b?c");
  EXPECT_EQ(record->variedFields, (HTTPHeaderFields{{"Accept-Language", "de"}}));
  EXPECT_EQ(record->cachedResponse->data().view(), "Hallo");
  EXPECT_EQ(record->cachedResponse->response()->valueForHTTPHeaderField("Cache-Control"),
            "max-age=60");
  EXPECT_EQ(record->encoded(), *file);
}

TEST(URLCacheRecord, RefusesFilesOfOtherVersions) {
  const auto file = systemFileManager()->contentsAtPath(
      ZEB_SOURCE_DIR "/tests/platform/network/files/url-cache-version-1.answer");
  std::string later(file->view());
  later[8] = 2;
  URLCacheRecord::repairChecksum(later);
  EXPECT_EQ(URLCacheRecord::decoded(Data::copy(later)), nullptr);
}

TEST(URLCacheRecord, HashesTellShortStringsApart) {
  EXPECT_NE(hashOfBytes("", 1), hashOfBytes(std::string_view("\0", 1), 1));
  EXPECT_NE(hashOfBytes("a", 1), hashOfBytes("a", 2));
  EXPECT_NE(hashOfBytes("abcdefgh", 1), hashOfBytes("abcdefghi", 1));
  // The names of files depend on it.
  EXPECT_EQ(hashOfBytes("http://books.example/a", 1), 10436775510830078315U);
}

}  // namespace
