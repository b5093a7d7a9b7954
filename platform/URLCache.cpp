#include "platform/URLCache.h"

#include <list>
#include <unordered_map>
#include <utility>

#include "platform/Environment.h"
#include "platform/Files.h"
#include "platform/ThreadSafety.h"
#include "platform/URLCacheFolder.h"
#include "platform/URLCacheRecord.h"

namespace platform {

namespace {

/// Records in memory, least recently used last. Confined to whoever holds it.
class RecentRecords {
 public:
  explicit RecentRecords(size_t capacity) : _capacity(capacity) {}

  std::shared_ptr<const URLCacheRecord> find(const std::string& key) {
    const auto found = _places.find(key);
    if (found == _places.end()) {
      return nullptr;
    }
    _records.splice(_records.begin(), _records, found->second);
    return _records.front();
  }

  void insert(const std::shared_ptr<const URLCacheRecord>& record) {
    remove(record->key);
    if (record->size() > _capacity) {
      return;
    }
    _records.push_front(record);
    _places[record->key] = _records.begin();
    _usage += record->size();
    _letGo();
  }

  void remove(const std::string& key) {
    if (const auto found = _places.find(key); found != _places.end()) {
      _usage -= (*found->second)->size();
      _records.erase(found->second);
      _places.erase(found);
    }
  }

  void removeAll() {
    _records.clear();
    _places.clear();
    _usage = 0;
  }

  size_t usage() const { return _usage; }
  size_t capacity() const { return _capacity; }
  void setCapacity(size_t capacity) {
    _capacity = capacity;
    _letGo();
  }

 private:
  void _letGo() {
    while (_usage > _capacity) {
      remove(std::string(_records.back()->key));
    }
  }

  std::list<std::shared_ptr<const URLCacheRecord>> _records;
  std::unordered_map<std::string, decltype(_records)::iterator> _places;
  size_t _usage = 0;
  size_t _capacity;
};

struct Shared {
  Mutex mutex;
  std::shared_ptr<URLCache> chosen GUARDED_BY(mutex);
  std::shared_ptr<URLCache> standard GUARDED_BY(mutex);
  std::optional<std::string> folder GUARDED_BY(mutex);
};

Shared& shared() {
  // Never destroyed: transfers may go on while the process ends.
  static auto& shared = *new Shared;
  return shared;
}

}  // namespace

std::shared_ptr<const CachedURLResponse> CachedURLResponse::initWithResponse(
    std::shared_ptr<const URLResponse> response, Data data, URLCacheStoragePolicy storagePolicy) {
  return std::shared_ptr<const CachedURLResponse>(new CachedURLResponse(
      std::move(response), std::move(data), storagePolicy, Environment::current()->clock->now()));
}

CachedURLResponse::CachedURLResponse(std::shared_ptr<const URLResponse> response, Data data,
                                     URLCacheStoragePolicy storagePolicy,
                                     std::chrono::system_clock::time_point date)
    : _response(std::move(response)),
      _data(std::move(data)),
      _storagePolicy(storagePolicy),
      _date(date) {}

struct URLCache::Implementation {
  Implementation(size_t memoryCapacity, size_t capacityOfDisk,
                 const std::optional<std::string>& directory)
      : records(memoryCapacity), diskCapacity(capacityOfDisk) {
    if (directory) {
      folder = std::make_unique<URLCacheFolder>(*directory, capacityOfDisk);
    }
  }

  mutable Mutex mutex;
  RecentRecords records GUARDED_BY(mutex);
  size_t diskCapacity GUARDED_BY(mutex);
  /// Null for memory alone.
  std::unique_ptr<URLCacheFolder> folder;
};

URLCache::URLCache(std::unique_ptr<Implementation> implementation)
    : _implementation(std::move(implementation)) {}
URLCache::~URLCache() = default;

std::shared_ptr<URLCache> URLCache::initWithMemoryCapacity(
    size_t memoryCapacity, size_t diskCapacity, const std::optional<std::string>& directory) {
  return std::shared_ptr<URLCache>(
      new URLCache(std::make_unique<Implementation>(memoryCapacity, diskCapacity, directory)));
}

std::shared_ptr<URLCache> URLCache::sharedURLCache() {
  const std::optional<std::string> caches = Environment::current()->cachesDirectory;
  Shared& all = shared();
  const MutexLock lock(all.mutex);
  if (all.chosen != nullptr) {
    return all.chosen;
  }
  if (all.standard == nullptr || all.folder != caches) {
    all.standard = initWithMemoryCapacity(
        all.standard == nullptr ? defaultMemoryCapacity : all.standard->memoryCapacity(),
        all.standard == nullptr ? defaultDiskCapacity : all.standard->diskCapacity(),
        caches ? std::optional(stringByAppendingPathComponent(*caches, "zeb/URLCache"))
               : std::nullopt);
    all.folder = caches;
  }
  return all.standard;
}

void URLCache::setSharedURLCache(std::shared_ptr<URLCache> cache) {
  Shared& all = shared();
  const MutexLock lock(all.mutex);
  all.chosen = std::move(cache);
}

std::shared_ptr<const CachedURLResponse> URLCache::cachedResponseForRequest(
    const URLRequest& request) {
  Implementation& cache = *_implementation;
  const std::string key = URLCacheRecord::keyForRequest(request);
  std::shared_ptr<const URLCacheRecord> record;
  {
    const MutexLock lock(cache.mutex);
    record = cache.records.find(key);
  }
  if (record == nullptr && cache.folder != nullptr) {
    record = cache.folder->recordForKey(key);
    if (record != nullptr) {
      const MutexLock lock(cache.mutex);
      // One that was stored meanwhile is newer.
      if (cache.records.find(key) == nullptr) {
        cache.records.insert(record);
      }
    }
  } else if (record != nullptr && cache.folder != nullptr) {
    cache.folder->noteUse(key);
  }
  return record != nullptr && record->matches(request) ? record->cachedResponse : nullptr;
}

void URLCache::storeCachedResponse(const std::shared_ptr<const CachedURLResponse>& cachedResponse,
                                   const URLRequest& forRequest) {
  if (cachedResponse == nullptr || forRequest.HTTPMethod() != "GET" ||
      cachedResponse->storagePolicy() == URLCacheStoragePolicy::notAllowed) {
    return;
  }
  const auto record = URLCacheRecord::recordWithCachedResponse(cachedResponse, forRequest);
  if (record == nullptr) {
    return;
  }
  Implementation& cache = *_implementation;
  {
    const MutexLock lock(cache.mutex);
    cache.records.insert(record);
  }
  if (cache.folder == nullptr) {
    return;
  }
  if (cachedResponse->storagePolicy() == URLCacheStoragePolicy::allowed) {
    cache.folder->store(*record);
  } else {
    cache.folder->remove(record->key);
  }
}

void URLCache::removeCachedResponseForRequest(const URLRequest& request) {
  const std::string key = URLCacheRecord::keyForRequest(request);
  {
    const MutexLock lock(_implementation->mutex);
    _implementation->records.remove(key);
  }
  if (_implementation->folder != nullptr) {
    _implementation->folder->remove(key);
  }
}

void URLCache::removeAllCachedResponses() {
  {
    const MutexLock lock(_implementation->mutex);
    _implementation->records.removeAll();
  }
  if (_implementation->folder != nullptr) {
    _implementation->folder->removeAll();
  }
}

size_t URLCache::memoryCapacity() const {
  const MutexLock lock(_implementation->mutex);
  return _implementation->records.capacity();
}

size_t URLCache::diskCapacity() const {
  const MutexLock lock(_implementation->mutex);
  return _implementation->diskCapacity;
}

void URLCache::setMemoryCapacity(size_t capacity) {
  const MutexLock lock(_implementation->mutex);
  _implementation->records.setCapacity(capacity);
}

void URLCache::setDiskCapacity(size_t capacity) {
  {
    const MutexLock lock(_implementation->mutex);
    _implementation->diskCapacity = capacity;
  }
  if (_implementation->folder != nullptr) {
    _implementation->folder->setCapacity(capacity);
  }
}

size_t URLCache::currentMemoryUsage() const {
  const MutexLock lock(_implementation->mutex);
  return _implementation->records.usage();
}

size_t URLCache::currentDiskUsage() const {
  return _implementation->folder == nullptr ? 0 : _implementation->folder->usage();
}

}  // namespace platform
