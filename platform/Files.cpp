#include "platform/Files.h"

#include <dirent.h>
#include <fcntl.h>
#include <sys/mman.h>
#include <sys/stat.h>
#include <unistd.h>

#include <fmt/format.h>
#include <algorithm>
#include <atomic>
#include <cerrno>
#include <filesystem>
#include <system_error>
#include <utility>

#include "platform/ThreadSafety.h"

namespace platform {

namespace {

bool nameless(const std::string& path) {
  return path.empty() || path.find('\0') != std::string::npos;
}

/// A file descriptor that closes itself.
class Descriptor {
 public:
  explicit Descriptor(int number) : _number(number) {}
  ~Descriptor() {
    if (_number >= 0) {
      ::close(_number);
    }
  }
  Descriptor(Descriptor&& other) noexcept : _number(std::exchange(other._number, -1)) {}
  Descriptor(const Descriptor&) = delete;
  Descriptor& operator=(const Descriptor&) = delete;

  int number() const { return _number; }

  /// Closes now and tells whether that worked: some file systems report failed writes only here.
  bool close() { return ::close(std::exchange(_number, -1)) == 0; }

 private:
  int _number;
};

template <typename Call>
auto retryingOnInterrupt(Call call) {
  auto result = call();
  while (result < 0 && errno == EINTR) {
    result = call();
  }
  return result;
}

void report(Error* error, int number, std::string_view what) {
  if (error != nullptr) {
    *error = posixError(number, what);
  }
}

/// Opens a regular file for reading and tells its length.
Descriptor openForReading(const std::string& path, size_t& length, Error* error) {
  if (nameless(path)) {
    report(error, ENOENT, path);
    return Descriptor(-1);
  }
  // Opening a pipe without O_NONBLOCK would wait for a writer.
  Descriptor file(
      retryingOnInterrupt([&] { return ::open(path.c_str(), O_RDONLY | O_CLOEXEC | O_NONBLOCK); }));
  struct stat status {};
  if (file.number() < 0 || ::fstat(file.number(), &status) != 0) {
    report(error, errno, path);
    return Descriptor(-1);
  }
  if (!S_ISREG(status.st_mode)) {
    report(error, S_ISDIR(status.st_mode) ? EISDIR : EINVAL, path);
    return Descriptor(-1);
  }
  length = static_cast<size_t>(status.st_size);
  return file;
}

std::optional<Data> readAll(const Descriptor& file, const std::string& path, size_t expectedLength,
                            Error* error) {
  std::string bytes;
  bytes.resize(expectedLength + 1);
  size_t length = 0;
  while (true) {
    const ssize_t count = retryingOnInterrupt(
        [&] { return ::read(file.number(), bytes.data() + length, bytes.size() - length); });
    if (count < 0) {
      report(error, errno, path);
      return std::nullopt;
    }
    if (count == 0) {
      break;
    }
    length += static_cast<size_t>(count);
    if (length == bytes.size()) {
      bytes.resize(bytes.size() * 2);
    }
  }
  bytes.resize(length);
  return Data::adopt(std::move(bytes));
}

/// Deletes the temporary file unless the rename made it permanent.
class TemporaryFile {
 public:
  explicit TemporaryFile(std::string path) : _path(std::move(path)) {}
  ~TemporaryFile() {
    if (!_path.empty()) {
      ::unlink(_path.c_str());
    }
  }
  TemporaryFile(const TemporaryFile&) = delete;
  TemporaryFile& operator=(const TemporaryFile&) = delete;

  const std::string& path() const { return _path; }
  void keep() { _path.clear(); }

 private:
  std::string _path;
};

std::string folderOf(const std::string& path) {
  const std::string folder = stringByDeletingLastPathComponent(path);
  return folder.empty() ? "." : folder;
}

Descriptor openFolder(const std::string& path) {
  return Descriptor(nameless(path) ? -1 : ::open(path.c_str(), O_RDONLY | O_DIRECTORY | O_CLOEXEC));
}

/// A lock over the whole of a file, of this kind.
struct flock lockOfKind(short kind) {
  struct flock lock {};
  lock.l_type = kind;
  lock.l_whence = SEEK_SET;
  return lock;
}

/// A lock that goes with the description of the open file: nobody can lose it by closing another
/// descriptor of the folder, and it ends with the process.
class LockedFolder : public FolderMark {
 public:
  explicit LockedFolder(Descriptor folder) : _folder(std::move(folder)) {}

 private:
  const Descriptor _folder;
};

}  // namespace

std::unique_ptr<FolderMark> FileManager::markFolder(const std::string& path) const {
  Descriptor folder = openFolder(path);
  // Folders are never open for writing, so the mark is a lock for readers.
  struct flock lock = lockOfKind(F_RDLCK);
  const bool isMarked = folder.number() >= 0 && ::fcntl(folder.number(), F_OFD_SETLK, &lock) == 0;
  return isMarked ? std::make_unique<LockedFolder>(std::move(folder)) : nullptr;
}

bool FileManager::folderIsMarked(const std::string& path) const {
  const Descriptor folder = openFolder(path);
  struct flock lock = lockOfKind(F_WRLCK);
  return folder.number() >= 0 && ::fcntl(folder.number(), F_OFD_GETLK, &lock) == 0 &&
         lock.l_type != F_UNLCK;
}

bool FileManager::fileExistsAtPath(const std::string& path, bool* isDirectory) const {
  struct stat status {};
  if (nameless(path) || ::stat(path.c_str(), &status) != 0) {
    return false;
  }
  if (isDirectory != nullptr) {
    *isDirectory = S_ISDIR(status.st_mode);
  }
  return true;
}

std::optional<Data> FileManager::contentsMappedAtPath(const std::string& path, Error* error) const {
  size_t length = 0;
  const Descriptor file = openForReading(path, length, error);
  if (file.number() < 0) {
    return std::nullopt;
  }
  if (length == 0) {
    // Nothing to map; also the files of the kernel, which have bytes but no length.
    return readAll(file, path, 0, error);
  }
  void* address = ::mmap(nullptr, length, PROT_READ, MAP_PRIVATE, file.number(), 0);
  if (address == MAP_FAILED && errno == ENOMEM) {
    // What has no room to be mapped has none to be read.
    report(error, ENOMEM, path);
    return std::nullopt;
  }
  if (address == MAP_FAILED) {
    return readAll(file, path, length, error);
  }
  return Data::wrap(address, length,
                    std::shared_ptr<const void>(address, [length](const void* mapped) {
                      ::munmap(const_cast<void*>(mapped), length);
                    }));
}

std::optional<Data> FileManager::contentsAtPath(const std::string& path, Error* error) const {
  size_t length = 0;
  const Descriptor file = openForReading(path, length, error);
  return file.number() < 0 ? std::nullopt : readAll(file, path, length, error);
}

std::optional<Error> FileManager::writeAtomically(const std::string& path, const Data& data) const {
  if (nameless(path)) {
    return posixError(ENOENT, path);
  }
  // The process number keeps processes apart, the counter threads.
  static std::atomic<unsigned> counter{0};
  std::string temporaryPath =
      fmt::format("{}/.{}.{}.{}.tmp", folderOf(path), lastPathComponent(path).substr(0, 200),
                  ::getpid(), counter.fetch_add(1));
  Descriptor file(retryingOnInterrupt([&] {
    return ::open(temporaryPath.c_str(), O_WRONLY | O_CREAT | O_EXCL | O_CLOEXEC, 0666);
  }));
  if (file.number() < 0) {
    return posixError(errno, path);
  }
  TemporaryFile temporary(std::move(temporaryPath));
  for (size_t done = 0; done < data.length();) {
    const ssize_t count = retryingOnInterrupt(
        [&] { return ::write(file.number(), data.bytes() + done, data.length() - done); });
    if (count < 0) {
      return posixError(errno, path);
    }
    done += static_cast<size_t>(count);
  }
  if (retryingOnInterrupt([&] { return ::fsync(file.number()); }) != 0 || !file.close()) {
    return posixError(errno, path);
  }
  if (::rename(temporary.path().c_str(), path.c_str()) != 0) {
    return posixError(errno, path);
  }
  temporary.keep();
  // The rename itself reaches the disk with the folder; a folder that cannot be synchronised does
  // not make the write a failure, the new file is in place.
  const Descriptor folder(::open(folderOf(path).c_str(), O_RDONLY | O_DIRECTORY | O_CLOEXEC));
  if (folder.number() >= 0) {
    ::fsync(folder.number());
  }
  return std::nullopt;
}

std::optional<Error> FileManager::createDirectoryWithParents(const std::string& path) const {
  if (nameless(path)) {
    return posixError(ENOENT, path);
  }
  std::error_code code;
  std::filesystem::create_directories(path, code);
  if (code) {
    return posixError(code.value(), path);
  }
  // The library is content with a file in the place of the last component.
  bool isDirectory = false;
  if (!fileExistsAtPath(path, &isDirectory) || !isDirectory) {
    return posixError(ENOTDIR, path);
  }
  return std::nullopt;
}

std::optional<Error> FileManager::createDirectory(const std::string& path) const {
  if (nameless(path)) {
    return posixError(ENOENT, path);
  }
  if (::mkdir(path.c_str(), 0777) != 0) {
    return posixError(errno, path);
  }
  return std::nullopt;
}

std::optional<Error> FileManager::copyItem(const std::string& from, const std::string& to) const {
  if (nameless(from) || nameless(to)) {
    return posixError(ENOENT, nameless(from) ? from : to);
  }
  bool isDirectory = false;
  if (!fileExistsAtPath(from, &isDirectory)) {
    return posixError(ENOENT, from);
  }
  if (isDirectory) {
    return posixError(EISDIR, from);
  }
  if (fileExistsAtPath(to)) {
    return posixError(EEXIST, to);
  }
  Error error;
  const std::optional<Data> data = FileManager::contentsMappedAtPath(from, &error);
  return data ? FileManager::writeAtomically(to, *data) : std::optional<Error>(error);
}

std::optional<Error> FileManager::removeItem(const std::string& path) const {
  if (nameless(path)) {
    return posixError(ENOENT, path);
  }
  std::error_code code;
  const auto count = std::filesystem::remove_all(path, code);
  if (code) {
    return posixError(code.value(), path);
  }
  return count == 0 ? std::optional<Error>(posixError(ENOENT, path)) : std::nullopt;
}

std::optional<std::chrono::system_clock::time_point> FileManager::modificationDate(
    const std::string& path) const {
  struct stat status {};
  if (nameless(path) || ::stat(path.c_str(), &status) != 0) {
    return std::nullopt;
  }
  return std::chrono::system_clock::time_point(std::chrono::seconds(status.st_mtim.tv_sec) +
                                               std::chrono::nanoseconds(status.st_mtim.tv_nsec));
}

std::optional<Error> FileManager::setModificationDate(
    const std::string& path, std::chrono::system_clock::time_point date) const {
  const auto sinceEpoch = date.time_since_epoch();
  const auto seconds = std::chrono::floor<std::chrono::seconds>(sinceEpoch);
  const auto rest = std::chrono::duration_cast<std::chrono::nanoseconds>(sinceEpoch - seconds);
  const timespec times[2] = {{0, UTIME_OMIT}, {seconds.count(), rest.count()}};
  if (nameless(path)) {
    return posixError(ENOENT, path);
  }
  if (::utimensat(AT_FDCWD, path.c_str(), times, 0) != 0) {
    return posixError(errno, path);
  }
  return std::nullopt;
}

std::optional<std::vector<std::string>> FileManager::namesInDirectory(
    const std::string& path) const {
  if (nameless(path)) {
    return std::nullopt;
  }
  DIR* folder = ::opendir(path.c_str());
  if (folder == nullptr) {
    return std::nullopt;
  }
  std::vector<std::string> names;
  // One stream, one thread: readdir is safe here.
  errno = 0;
  while (const dirent* entry = ::readdir(folder)) {  // NOLINT(concurrency-mt-unsafe)
    const std::string_view name = entry->d_name;
    if (name != "." && name != "..") {
      names.emplace_back(name);
    }
  }
  const bool complete = errno == 0;
  ::closedir(folder);
  if (!complete) {
    return std::nullopt;
  }
  std::sort(names.begin(), names.end());
  return names;
}

std::shared_ptr<FileManager> systemFileManager() {
  static const auto manager = std::make_shared<FileManager>();
  return manager;
}

struct FailingFileManager::Faults {
  struct Fault {
    Operation operation;
    int errorNumber;
    std::string pathPart;
  };

  Mutex mutex;
  std::vector<Fault> faults GUARDED_BY(mutex);
};

FailingFileManager::FailingFileManager() : _faults(std::make_unique<Faults>()) {}
FailingFileManager::~FailingFileManager() = default;

void FailingFileManager::fail(Operation operation, int errorNumber, std::string pathPart) {
  const MutexLock lock(_faults->mutex);
  _faults->faults.push_back({operation, errorNumber, std::move(pathPart)});
}

void FailingFileManager::recover() {
  const MutexLock lock(_faults->mutex);
  _faults->faults.clear();
}

std::optional<Error> FailingFileManager::_failure(Operation operation,
                                                  const std::string& path) const {
  const MutexLock lock(_faults->mutex);
  for (const Faults::Fault& fault : _faults->faults) {
    if (fault.operation == operation && path.find(fault.pathPart) != std::string::npos) {
      return posixError(fault.errorNumber, path);
    }
  }
  return std::nullopt;
}

std::optional<Data> FailingFileManager::contentsMappedAtPath(const std::string& path,
                                                             Error* error) const {
  if (const auto failure = _failure(Operation::read, path)) {
    if (error != nullptr) {
      *error = *failure;
    }
    return std::nullopt;
  }
  return FileManager::contentsMappedAtPath(path, error);
}

std::optional<Data> FailingFileManager::contentsAtPath(const std::string& path,
                                                       Error* error) const {
  if (const auto failure = _failure(Operation::read, path)) {
    if (error != nullptr) {
      *error = *failure;
    }
    return std::nullopt;
  }
  return FileManager::contentsAtPath(path, error);
}

std::optional<Error> FailingFileManager::writeAtomically(const std::string& path,
                                                         const Data& data) const {
  const auto failure = _failure(Operation::write, path);
  return failure ? failure : FileManager::writeAtomically(path, data);
}

std::optional<Error> FailingFileManager::createDirectoryWithParents(const std::string& path) const {
  const auto failure = _failure(Operation::createDirectory, path);
  return failure ? failure : FileManager::createDirectoryWithParents(path);
}

std::optional<Error> FailingFileManager::createDirectory(const std::string& path) const {
  const auto failure = _failure(Operation::createDirectory, path);
  return failure ? failure : FileManager::createDirectory(path);
}

std::optional<Error> FailingFileManager::copyItem(const std::string& from,
                                                  const std::string& to) const {
  auto failure = _failure(Operation::copy, from);
  if (!failure) {
    failure = _failure(Operation::copy, to);
  }
  return failure ? failure : FileManager::copyItem(from, to);
}

std::optional<Error> FailingFileManager::removeItem(const std::string& path) const {
  const auto failure = _failure(Operation::remove, path);
  return failure ? failure : FileManager::removeItem(path);
}

std::optional<std::chrono::system_clock::time_point> FailingFileManager::modificationDate(
    const std::string& path) const {
  return _failure(Operation::modificationDate, path) ? std::nullopt
                                                     : FileManager::modificationDate(path);
}

std::optional<std::vector<std::string>> FailingFileManager::namesInDirectory(
    const std::string& path) const {
  return _failure(Operation::list, path) ? std::nullopt : FileManager::namesInDirectory(path);
}

}  // namespace platform
