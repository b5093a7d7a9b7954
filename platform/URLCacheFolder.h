// The URL cache's files. Private to the cache.
#pragma once

#include <cstdint>
#include <map>
#include <memory>
#include <string>

#include "platform/ThreadSafety.h"
#include "platform/URLCacheRecord.h"

namespace platform {

/// One folder of answers, each a file whose name comes from its URL. Looks at the folder when it is
/// first used, and for files that other processes put there or took away whenever it stores.
/// Failures of the disk are those of a cache: nothing found, nothing kept.
/// Thread-safety: internally synchronised; files are written and deleted one at a time.
class URLCacheFolder {
 public:
  URLCacheFolder(std::string path, size_t capacity);

  /// Null when there is none that is whole.
  std::shared_ptr<const URLCacheRecord> recordForKey(const std::string& key);
  /// Notes a use that did not need the file.
  void noteUse(const std::string& key);
  void store(const URLCacheRecord& record);
  void remove(const std::string& key);
  void removeAll();

  size_t capacity() const;
  void setCapacity(size_t capacity);
  /// Bytes of all files.
  size_t usage();

 private:
  struct Entry {
    uint64_t size = 0;
    /// Greater for what was used later.
    uint64_t lastUse = 0;
  };

  static std::string _nameForKey(const std::string& key);
  std::string _pathOfName(const std::string& name) const;
  void _becomeAcquainted() REQUIRES(_writing);
  void _makeRoomFor(uint64_t size) REQUIRES(_writing);
  void _removeFile(const std::string& name) REQUIRES(_writing);
  void _noteUseOfName(const std::string& name);

  const std::string _path;
  /// Held over changes to files; comes before the other.
  Mutex _writing;
  /// Whether what processes left there that had ended before this one has been deleted.
  bool _knowsLeftovers GUARDED_BY(_writing) = false;
  mutable Mutex _mutex;
  std::map<std::string, Entry> _entries GUARDED_BY(_mutex);
  uint64_t _useCount GUARDED_BY(_mutex) = 0;
  uint64_t _usage GUARDED_BY(_mutex) = 0;
  size_t _capacity GUARDED_BY(_mutex);
};

}  // namespace platform
