#include "platform/URLCacheFolder.h"

#include <algorithm>
#include <chrono>
#include <tuple>
#include <utility>
#include <vector>

#include "platform/AbandonedFiles.h"
#include "platform/Environment.h"
#include "platform/Files.h"

namespace platform {

namespace {

constexpr std::string_view suffix = ".answer";
constexpr size_t nameLength = 32 + suffix.size();

void appendHexadecimal(std::string& text, uint64_t number) {
  constexpr std::string_view digits = "0123456789abcdef";
  for (int shift = 60; shift >= 0; shift -= 4) {
    text += digits[(number >> shift) & 15];
  }
}

bool isNameOfAnswer(const std::string& name) {
  return name.size() == nameLength && name.ends_with(suffix);
}

/// Written by a process that was ended before it could give the file its name.
bool isNameOfLeftover(const std::string& name) {
  return name.starts_with('.') && name.ends_with(".tmp") && name.find(suffix) != std::string::npos;
}

/// No write takes that long, whoever has the number of the process that began it by now.
constexpr std::chrono::hours ageOfLeftovers{1};

std::shared_ptr<const FileManager> files() { return Environment::current()->files; }

}  // namespace

URLCacheFolder::URLCacheFolder(std::string path, size_t capacity)
    : _path(std::move(path)), _capacity(capacity) {}

std::string URLCacheFolder::_nameForKey(const std::string& key) {
  std::string name;
  appendHexadecimal(name, hashOfBytes(key, 1));
  appendHexadecimal(name, hashOfBytes(key, 2));
  return name.append(suffix);
}

std::string URLCacheFolder::_pathOfName(const std::string& name) const {
  return stringByAppendingPathComponent(_path, name);
}

std::shared_ptr<const URLCacheRecord> URLCacheFolder::recordForKey(const std::string& key) {
  const std::string name = _nameForKey(key);
  const std::string path = _pathOfName(name);
  // The mapping tells the length: a file that never fitted is not read.
  const std::optional<Data> mapped = files()->contentsMappedAtPath(path);
  if (!mapped) {
    return nullptr;
  }
  const std::optional<Data> bytes =
      mapped->length() <= capacity() ? files()->contentsAtPath(path) : std::nullopt;
  auto record = bytes ? URLCacheRecord::decoded(*bytes) : nullptr;
  if (record == nullptr) {
    const MutexLock writing(_writing);
    _removeFile(name);
    return nullptr;
  }
  // Two URLs may share a name; the later one is the one that is kept.
  if (record->key != key) {
    return nullptr;
  }
  _noteUseOfName(name);
  return record;
}

void URLCacheFolder::noteUse(const std::string& key) { _noteUseOfName(_nameForKey(key)); }

void URLCacheFolder::_noteUseOfName(const std::string& name) {
  const auto environment = Environment::current();
  // For the next process that opens the folder.
  environment->files->setModificationDate(_pathOfName(name), environment->clock->now());
  const MutexLock lock(_mutex);
  if (const auto entry = _entries.find(name); entry != _entries.end()) {
    entry->second.lastUse = ++_useCount;
  }
}

void URLCacheFolder::_becomeAcquainted() {
  const auto manager = files();
  if (!std::exchange(_knowsLeftovers, true)) {
    removeAbandonedFiles(_path);
  }
  std::vector<std::string> names =
      manager->namesInDirectory(_path).value_or(std::vector<std::string>());
  for (const std::string& name : names) {
    const std::string path = _pathOfName(name);
    const auto date = isNameOfLeftover(name) ? manager->modificationDate(path) : std::nullopt;
    if (date && *date + ageOfLeftovers < Environment::current()->clock->now()) {
      manager->removeItem(path);
    }
  }
  names.erase(std::remove_if(names.begin(), names.end(),
                             [](const std::string& name) { return !isNameOfAnswer(name); }),
              names.end());
  struct Stranger {
    std::chrono::system_clock::time_point date;
    std::string name;
    uint64_t size;
    bool operator<(const Stranger& other) const {
      return std::tie(date, name) < std::tie(other.date, other.name);
    }
  };
  std::vector<Stranger> strangers;
  {
    const MutexLock lock(_mutex);
    for (auto entry = _entries.begin(); entry != _entries.end();) {
      if (std::binary_search(names.begin(), names.end(), entry->first)) {
        ++entry;
      } else {
        _usage -= entry->second.size;
        entry = _entries.erase(entry);
      }
    }
    for (const std::string& name : names) {
      if (_entries.find(name) == _entries.end()) {
        strangers.push_back({{}, name, 0});
      }
    }
  }
  for (Stranger& stranger : strangers) {
    const std::string path = _pathOfName(stranger.name);
    stranger.date =
        manager->modificationDate(path).value_or(std::chrono::system_clock::time_point());
    const std::optional<Data> mapped = manager->contentsMappedAtPath(path);
    stranger.size = mapped ? mapped->length() : 0;
  }
  std::sort(strangers.begin(), strangers.end());
  const MutexLock lock(_mutex);
  for (const Stranger& stranger : strangers) {
    _entries[stranger.name] = {stranger.size, ++_useCount};
    _usage += stranger.size;
  }
}

void URLCacheFolder::_makeRoomFor(uint64_t size) {
  while (true) {
    std::string oldest;
    {
      const MutexLock lock(_mutex);
      if (_entries.empty() || _usage + size <= _capacity) {
        return;
      }
      oldest = std::min_element(_entries.begin(), _entries.end(), [](const auto& a, const auto& b) {
                 return a.second.lastUse < b.second.lastUse;
               })->first;
    }
    _removeFile(oldest);
  }
}

void URLCacheFolder::_removeFile(const std::string& name) {
  files()->removeItem(_pathOfName(name));
  const MutexLock lock(_mutex);
  if (const auto entry = _entries.find(name); entry != _entries.end()) {
    _usage -= entry->second.size;
    _entries.erase(entry);
  }
}

void URLCacheFolder::store(const URLCacheRecord& record) {
  const Data file = record.encoded();
  const std::string name = _nameForKey(record.key);
  const MutexLock writing(_writing);
  _becomeAcquainted();
  // Whatever comes of it, the earlier answer no longer holds.
  _removeFile(name);
  if (file.length() > capacity()) {
    return;
  }
  _makeRoomFor(file.length());
  const auto manager = files();
  if (manager->createDirectoryWithParents(_path) ||
      manager->writeAtomically(_pathOfName(name), file)) {
    return;
  }
  {
    const MutexLock lock(_mutex);
    _entries[name] = {file.length(), 0};
    _usage += file.length();
  }
  _noteUseOfName(name);
}

void URLCacheFolder::remove(const std::string& key) {
  const MutexLock writing(_writing);
  _removeFile(_nameForKey(key));
}

void URLCacheFolder::removeAll() {
  const MutexLock writing(_writing);
  _becomeAcquainted();
  std::vector<std::string> names;
  {
    const MutexLock lock(_mutex);
    for (const auto& entry : _entries) {
      names.push_back(entry.first);
    }
  }
  for (const std::string& name : names) {
    _removeFile(name);
  }
}

size_t URLCacheFolder::capacity() const {
  const MutexLock lock(_mutex);
  return _capacity;
}

void URLCacheFolder::setCapacity(size_t capacity) {
  const MutexLock writing(_writing);
  {
    const MutexLock lock(_mutex);
    _capacity = capacity;
  }
  _becomeAcquainted();
  _makeRoomFor(0);
}

size_t URLCacheFolder::usage() {
  const MutexLock writing(_writing);
  _becomeAcquainted();
  const MutexLock lock(_mutex);
  return _usage;
}

}  // namespace platform
