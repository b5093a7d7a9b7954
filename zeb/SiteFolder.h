// A folder that comes to hold certain files.
#pragma once

#include <cstddef>
#include <functional>
#include <optional>
#include <set>
#include <string>

#include "platform/Data.h"
#include "platform/Error.h"

namespace zeb {

/// Writes files into a folder, each in one step and only where it is not there with the same bytes
/// already, and counts. Thread-safety: confined to one thread.
class SiteFolder {
 public:
  explicit SiteFolder(std::string path) : _path(std::move(path)) {}

  const std::string& path() const noexcept { return _path; }
  std::string path(const std::string& name) const;

  /// `name` is relative to the folder and may have folders in it.
  std::optional<platform::Error> write(const std::string& name, const platform::Data& bytes);

  /// Writes all files in and below `source` for which `wanted` says yes, below the folder `name`.
  /// Hidden files and links that lead out of `source` are left alone.
  std::optional<platform::Error> copyTree(const std::string& source, const std::string& name,
                                          const std::function<bool(const std::string&)>& wanted);

  /// Removes all files but those written and those for which `keeps` (told the relative name) says
  /// yes, and the folders that are empty then.
  void removeOthers(const std::function<bool(const std::string&)>& keeps);

  size_t fileCount() const noexcept { return _names.size(); }
  size_t byteCount() const noexcept { return _byteCount; }
  size_t changeCount() const noexcept { return _changeCount; }
  /// Of names and contents of all files written.
  std::string digest() const;

 private:
  const std::string _path;
  std::set<std::string> _names;
  std::set<std::string> _digests;
  size_t _byteCount = 0;
  size_t _changeCount = 0;
};

}  // namespace zeb
