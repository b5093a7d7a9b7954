#include "zeb/SiteFolder.h"

#include <algorithm>
#include <filesystem>
#include <system_error>
#include <vector>

#include "platform/Digest.h"
#include "platform/Environment.h"
#include "platform/Files.h"

namespace zeb {

namespace {

namespace fs = std::filesystem;

bool isInside(const fs::path& path, const fs::path& folder) {
  const auto [mismatch, unused] =
      std::mismatch(folder.begin(), folder.end(), path.begin(), path.end());
  (void)unused;
  return mismatch == folder.end();
}

/// The regular files in and below a folder, by relative name, in the order of the names.
std::vector<std::string> filesBelow(const fs::path& folder) {
  std::vector<std::string> names;
  std::error_code error;
  const fs::path root = fs::canonical(folder, error);
  const auto options = fs::directory_options::skip_permission_denied;
  for (fs::recursive_directory_iterator entry(folder, options, error), end; !error && entry != end;
       entry.increment(error)) {
    if (entry->path().filename().native().starts_with('.')) {
      if (entry->is_directory(error)) {
        entry.disable_recursion_pending();
      }
      continue;
    }
    std::error_code broken;
    const fs::path target = fs::canonical(entry->path(), broken);
    if (!broken && isInside(target, root) && fs::is_regular_file(target, broken)) {
      names.push_back(entry->path().lexically_relative(folder).native());
    }
  }
  std::sort(names.begin(), names.end());
  return names;
}

}  // namespace

std::string SiteFolder::path(const std::string& name) const {
  return platform::stringByAppendingPathComponent(_path, name);
}

std::optional<platform::Error> SiteFolder::write(const std::string& name,
                                                 const platform::Data& bytes) {
  const auto files = platform::Environment::current()->files;
  const std::string file = path(name);
  _names.insert(name);
  _digests.insert(name + '\0' + platform::sha256Digest(bytes.view()));
  _byteCount += bytes.length();
  if (files->fileExistsAtPath(file) && files->contentsMappedAtPath(file) == bytes) {
    return std::nullopt;
  }
  ++_changeCount;
  const std::string folder = platform::stringByDeletingLastPathComponent(file);
  if (auto error = files->createDirectoryWithParents(folder)) {
    return error;
  }
  return files->writeAtomically(file, bytes);
}

std::optional<platform::Error> SiteFolder::copyTree(
    const std::string& source, const std::string& name,
    const std::function<bool(const std::string&)>& wanted) {
  for (const std::string& file : filesBelow(source)) {
    const std::string from = platform::stringByAppendingPathComponent(source, file);
    if (!wanted(from)) {
      continue;
    }
    platform::Error error;
    const auto bytes = platform::Environment::current()->files->contentsMappedAtPath(from, &error);
    if (!bytes) {
      return error;
    }
    if (auto failure = write(platform::stringByAppendingPathComponent(name, file), *bytes)) {
      return failure;
    }
  }
  return std::nullopt;
}

void SiteFolder::removeOthers(const std::function<bool(const std::string&)>& keeps) {
  const auto files = platform::Environment::current()->files;
  for (const std::string& name : filesBelow(_path)) {
    if (!_names.contains(name) && !keeps(name)) {
      ++_changeCount;
      (void)files->removeItem(path(name));
      std::error_code error;
      fs::path folder = fs::path(path(name)).parent_path();
      while (folder != fs::path(_path) && fs::is_empty(folder, error) && !error) {
        fs::remove(folder, error);
        folder = folder.parent_path();
      }
    }
  }
}

std::string SiteFolder::digest() const {
  std::string all;
  for (const std::string& digest : _digests) {
    all += digest + '\n';
  }
  return platform::sha256Digest(all);
}

}  // namespace zeb
