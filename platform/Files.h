// Files and folders, as far as the system touches them.
#pragma once

#include <chrono>
#include <memory>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include "platform/Data.h"
#include "platform/Error.h"

namespace platform {

/// A mark that this process has put on a folder; gone with this object, and with the process
/// however that ends. Leaves no trace in the folder.
class FolderMark {
 public:
  virtual ~FolderMark() = default;
};

/// The file system behind one replaceable object, so that tests can make any operation fail.
///
/// Paths are absolute or relative UTF-8 strings in which other bytes pass through untouched. A
/// path with an embedded NUL names nothing: look-ups answer no, changes fail.
/// Thread-safety: internally synchronised (it has no state of its own).
class FileManager {
 public:
  virtual ~FileManager() = default;

  /// Whether something exists at `path` (following symbolic links); `isDirectory`, when given, is
  /// set to whether that something is a folder.
  virtual bool fileExistsAtPath(const std::string& path, bool* isDirectory = nullptr) const;

  /// The whole file, mapped read-only where it is a regular file with bytes in it, so that reading
  /// costs nothing until pages are touched. The mapping lives as long as any slice of the data.
  /// Files that this system reads this way are replaced by renaming, never changed in place.
  /// Absent, with `error` set when given, for anything that cannot be read whole.
  virtual std::optional<Data> contentsMappedAtPath(const std::string& path,
                                                   Error* error = nullptr) const;

  /// The whole file as a private copy: for small files that others may rewrite in place.
  virtual std::optional<Data> contentsAtPath(const std::string& path, Error* error = nullptr) const;

  /// Replaces the file at `path` in one step: a temporary file in the same folder, synchronised to
  /// the disk, then renamed. The folder must exist. On failure the earlier file is untouched and
  /// no temporary file is left.
  virtual std::optional<Error> writeAtomically(const std::string& path, const Data& data) const;

  /// Creates the folder and every missing folder above it; fine when it is there already.
  virtual std::optional<Error> createDirectoryWithParents(const std::string& path) const;

  /// Creates the folder; fails when something is there already or the folder above it is missing.
  virtual std::optional<Error> createDirectory(const std::string& path) const;

  /// Copies one regular file, or fails when the target exists.
  virtual std::optional<Error> copyItem(const std::string& from, const std::string& to) const;

  /// Deletes a file, or a folder with all that is in it. Symbolic links are deleted, not followed.
  virtual std::optional<Error> removeItem(const std::string& path) const;

  virtual std::optional<std::chrono::system_clock::time_point> modificationDate(
      const std::string& path) const;

  /// Sets that date.
  virtual std::optional<Error> setModificationDate(
      const std::string& path, std::chrono::system_clock::time_point date) const;

  /// The names in a folder, sorted by bytes, without "." and "..". Absent when it cannot be read.
  virtual std::optional<std::vector<std::string>> namesInDirectory(const std::string& path) const;

  /// Marks the folder for everybody to see; several marks on one are fine. Null when there is no
  /// such folder or its file system knows no locks.
  virtual std::unique_ptr<FolderMark> markFolder(const std::string& path) const;

  /// Whether any process that runs, this one among them, has a mark on the folder.
  virtual bool folderIsMarked(const std::string& path) const;
};

/// The real file system.
std::shared_ptr<FileManager> systemFileManager();

/// The real file system in which chosen operations fail. For tests.
class FailingFileManager : public FileManager {
 public:
  enum class Operation { read, write, createDirectory, copy, remove, modificationDate, list };

  /// From now on `operation` fails with `errorNumber` for every path that contains `pathPart`.
  void fail(Operation operation, int errorNumber, std::string pathPart = {});

  /// Everything works again.
  void recover();

  std::optional<Data> contentsMappedAtPath(const std::string& path, Error* error) const override;
  std::optional<Data> contentsAtPath(const std::string& path, Error* error) const override;
  std::optional<Error> writeAtomically(const std::string& path, const Data& data) const override;
  std::optional<Error> createDirectory(const std::string& path) const override;
  std::optional<Error> createDirectoryWithParents(const std::string& path) const override;
  std::optional<Error> copyItem(const std::string& from, const std::string& to) const override;
  std::optional<Error> removeItem(const std::string& path) const override;
  std::optional<std::chrono::system_clock::time_point> modificationDate(
      const std::string& path) const override;
  std::optional<std::vector<std::string>> namesInDirectory(const std::string& path) const override;

  FailingFileManager();
  ~FailingFileManager() override;

 private:
  std::optional<Error> _failure(Operation operation, const std::string& path) const;

  struct Faults;
  std::unique_ptr<Faults> _faults;
};

// Paths as strings. None of these looks at the disk.

/// "/a/b" for "/a/b/c" and for "/a/b/c/"; "/" for "/a"; "" for "a".
std::string stringByDeletingLastPathComponent(std::string_view path);
/// "c" for "/a/b/c" and "/a/b/c/"; "/" for "/"; "" for "".
std::string lastPathComponent(std::string_view path);
/// What follows the last dot of the last component, without the dot; "" when there is none, when
/// the dot comes first (".profile") or last.
std::string pathExtension(std::string_view path);
/// `path` and `component` with exactly one slash between them; `component` alone for an empty path.
std::string stringByAppendingPathComponent(std::string_view path, std::string_view component);
/// `path` + "." + `extension`, trailing slashes of the path left out.
std::string stringByAppendingPathExtension(std::string_view path, std::string_view extension);
/// Without empty, "." and (in absolute paths, where it can) ".." components, and without a
/// trailing slash.
std::string stringByStandardizingPath(std::string_view path);

}  // namespace platform
