#include "tests/plugin/shelf/ScheduleWorld.h"

#include <algorithm>
#include <cerrno>
#include <cstdio>
#include <filesystem>
#include <fstream>
#include <sstream>

#include "platform/Exception.h"
#include "plugin/records/ZEBIndex.h"

namespace tests {

std::optional<platform::Data> ScheduleFiles::contentsMappedAtPath(const std::string& path,
                                                                  platform::Error* error) const {
  if (readsFail) {
    if (error != nullptr) {
      *error = platform::posixError(EIO, path);
    }
    return std::nullopt;
  }
  return FileManager::contentsMappedAtPath(path, error);
}

std::optional<platform::Error> ScheduleFiles::writeAtomically(const std::string& path,
                                                              const platform::Data& data) const {
  if (diskIsFull) {
    return platform::posixError(ENOSPC, path);
  }
  if (path == _watchedPath) {
    allow(std::string(data.view()));
  }
  static std::atomic<int> counter{0};
  const std::string temporary = path + ".tmp" + std::to_string(counter++);
  std::ofstream file(temporary, std::ios::binary);
  file << data.view();
  file.close();
  std::error_code code;
  if (file) {
    std::filesystem::rename(temporary, path, code);
  }
  return file && !code ? std::nullopt : std::optional(platform::posixError(ENOENT, path));
}

std::optional<platform::Error> ScheduleFiles::createDirectoryWithParents(
    const std::string& path) const {
  return foldersFail ? std::optional(platform::posixError(EROFS, path))
                     : FileManager::createDirectoryWithParents(path);
}

std::optional<platform::Error> ScheduleFiles::copyItem(const std::string& from,
                                                       const std::string& to) const {
  const auto data = contentsMappedAtPath(from, nullptr);
  if (!data || fileExistsAtPath(to)) {
    return platform::posixError(EEXIST, to);
  }
  return writeAtomically(to, *data);
}

std::optional<platform::Error> ScheduleFiles::removeItem(const std::string& path) const {
  return removalsFail ? std::optional(platform::posixError(EACCES, path))
                      : FileManager::removeItem(path);
}

void ScheduleFiles::allow(std::string bytes) const {
  const std::lock_guard lock(_mutex);
  _allowed.insert(std::move(bytes));
}

bool ScheduleFiles::watchedFileIsWhole() const {
  std::ifstream file(_watchedPath, std::ios::binary);
  if (!file) {
    return true;
  }
  std::ostringstream bytes;
  bytes << file.rdbuf();
  const std::lock_guard lock(_mutex);
  return _allowed.contains(bytes.str());
}

ScheduleTool::ScheduleTool(uint64_t seed, std::shared_ptr<ScheduleFiles> files, Output output)
    : _die(seed), _files(std::move(files)), _output(std::move(output)) {}

int ScheduleTool::launchAndWait(const std::string& path,
                                const std::vector<std::string>& arguments) {
  const auto option = std::find(arguments.begin(), arguments.end(), "--file");
  const std::string& output = *(option + 1);
  const platform::Data bytes = _output(output);
  switch (_die.roll(8)) {
    case 0:
      return 1;
    case 1:
      throw platform::Exception("LaunchException", "cannot launch " + path);
    case 2:
      ++_kills;
      (void)_write(output, bytes.slice(0, bytes.length() / 2));
      return 128 + 9;
    case 3: {
      std::unique_lock lock(_mutex);
      _releasedCondition.wait(lock, [&] { return _released; });
      break;
    }
    default:
      break;
  }
  const int status = _write(output, bytes);
  _successes += status == 0 ? 1 : 0;
  return status;
}

int ScheduleTool::_write(const std::string& path, const platform::Data& bytes) const {
  return _files->writeAtomically(path, bytes) ? 1 : 0;
}

void ScheduleTool::release() {
  const std::lock_guard lock(_mutex);
  _released = true;
  _releasedCondition.notify_all();
}

int ScheduleProcesses::readProcesses(std::vector<platform::ProcessEntry>& entries) const {
  entries = {{1, "init"}};
  switch (_die.roll(10)) {
    case 0:
      return ENOMEM;
    case 1:
      return EPERM;
    case 2:
      entries.push_back({77, "bvmake"});
      return 0;
    default:
      return 0;
  }
}

std::optional<platform::Data> ScheduleProcesses::argumentsOfProcess(int /*processID*/) const {
  return platform::Data::adopt(std::string("bvmake\0--file\0", 14) + _busyPath + '\0');
}

void ScheduleLog::write(int level, std::string_view message) {
  const bool expected = level > 0 || message.starts_with("Task at ") ||
                        message.starts_with("Error trying to unarchive index data.");
  if (!expected) {
    const std::lock_guard lock(_mutex);
    _surprises.emplace_back(message);
  }
}

std::vector<std::string> ScheduleLog::surprises() const {
  const std::lock_guard lock(_mutex);
  return _surprises;
}

void CountingObserver::indexDidChange(const std::shared_ptr<ZEBIndex>& index, ZEBIndexChange kind) {
  const std::lock_guard lock(_mutex);
  ++_counts[{index->bookID().value_or("?"), kind}];
}

CountingObserver::Counts CountingObserver::counts() const {
  const std::lock_guard lock(_mutex);
  return _counts;
}

int CountingObserver::total() const {
  int total = 0;
  for (const auto& entry : counts()) {
    total += entry.second;
  }
  return total;
}

}  // namespace tests
