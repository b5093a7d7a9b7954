// Answers kept for the next time they are asked for, in memory and on disk.
#pragma once

#include <chrono>
#include <memory>
#include <optional>
#include <string>

#include "platform/Data.h"
#include "platform/HTTPHeaderFields.h"
#include "platform/URLRequest.h"
#include "platform/URLResponse.h"

namespace platform {

enum class URLCacheStoragePolicy { allowed, allowedInMemoryOnly, notAllowed };

/// An answer with its body. Thread-safety: immutable.
class CachedURLResponse {
 public:
  static std::shared_ptr<const CachedURLResponse> initWithResponse(
      std::shared_ptr<const URLResponse> response, Data data,
      URLCacheStoragePolicy storagePolicy = URLCacheStoragePolicy::allowed);

  /// Never null.
  const std::shared_ptr<const URLResponse>& response() const { return _response; }
  const Data& data() const { return _data; }
  URLCacheStoragePolicy storagePolicy() const { return _storagePolicy; }

  /// When the answer was received or last confirmed by the server: now, for a new object.
  std::chrono::system_clock::time_point date() const { return _date; }

 private:
  friend class URLCache;
  friend struct URLCacheRecord;
  CachedURLResponse(std::shared_ptr<const URLResponse> response, Data data,
                    URLCacheStoragePolicy storagePolicy,
                    std::chrono::system_clock::time_point date);

  const std::shared_ptr<const URLResponse> _response;
  const Data _data;
  const URLCacheStoragePolicy _storagePolicy;
  const std::chrono::system_clock::time_point _date;
};

/// Answers to GET requests, by URL (without fragment): one for each. Used by sessions as RFC 9111
/// tells private caches to; the cache itself knows nothing of freshness and gives back whatever it
/// has.
///
/// What is stored is in memory and on disk at once, each up to its capacity; what was used least
/// recently goes first, and an answer greater than a capacity is not kept there. On disk each
/// answer is one file, head and body together (docs/formats/url-cache.md), replaced in one step;
/// a file that is torn or altered counts as absent and is deleted. Several processes may use one
/// folder. A disk that fails costs the cache's service, never an error.
///
/// Thread-safety: internally synchronised. Calls read and write files on the calling thread.
class URLCache {
 public:
  /// The cache that sessions use unless they are told otherwise: in the folder "zeb/URLCache" of
  /// the environment's caches folder, in memory alone where there is none. One a process; it starts
  /// anew, with the same capacities, should the environment's folder change, as it does in tests.
  static std::shared_ptr<URLCache> sharedURLCache();
  /// Puts another in its place; null restores the one described above.
  static void setSharedURLCache(std::shared_ptr<URLCache> cache);

  static constexpr size_t defaultMemoryCapacity = 4 << 20;
  static constexpr size_t defaultDiskCapacity = 20 << 20;

  /// Capacities in bytes; without `directory`, memory alone. The folder is made on the first store.
  static std::shared_ptr<URLCache> initWithMemoryCapacity(
      size_t memoryCapacity, size_t diskCapacity, const std::optional<std::string>& directory);
  ~URLCache();

  /// Null when there is none: never stored, gone, or stored for other values of the header fields
  /// that the answer varies by. Counts as a use.
  std::shared_ptr<const CachedURLResponse> cachedResponseForRequest(const URLRequest& request);

  /// Replaces what is kept for the request's URL. Stores nothing, and removes nothing, for methods
  /// other than GET, an answer that varies by everything ("Vary: *"), and the policy notAllowed.
  void storeCachedResponse(const std::shared_ptr<const CachedURLResponse>& cachedResponse,
                           const URLRequest& forRequest);

  void removeCachedResponseForRequest(const URLRequest& request);
  void removeAllCachedResponses();

  size_t memoryCapacity() const;
  size_t diskCapacity() const;
  /// Lets go at once what no longer fits.
  void setMemoryCapacity(size_t capacity);
  void setDiskCapacity(size_t capacity);

  /// Bytes of bodies and heads that are kept.
  size_t currentMemoryUsage() const;
  size_t currentDiskUsage() const;

 private:
  struct Implementation;
  explicit URLCache(std::unique_ptr<Implementation> implementation);

  const std::unique_ptr<Implementation> _implementation;
};

}  // namespace platform
