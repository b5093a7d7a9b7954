#include "zeb/Paths.h"

#include <filesystem>
#include <system_error>

#include "platform/Files.h"

namespace zeb {

std::string absolutePath(const std::string& path) {
  if (path.starts_with('/')) {
    return platform::stringByStandardizingPath(path);
  }
  std::error_code error;
  const std::filesystem::path workingFolder = std::filesystem::current_path(error);
  return platform::stringByStandardizingPath(
      platform::stringByAppendingPathComponent(workingFolder.string(), path));
}

}  // namespace zeb
