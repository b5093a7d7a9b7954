// A folder that a test has to itself and that is gone when the test is over.
#pragma once

#include <sys/statvfs.h>
#include <unistd.h>

#include <cstdint>
#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <stdexcept>
#include <string>
#include <string_view>

namespace tests {

class TemporaryFolder {
 public:
  TemporaryFolder() {
    std::string pattern = (_parent() / "zeb-test-XXXXXX").string();
    if (::mkdtemp(pattern.data()) == nullptr) {
      throw std::runtime_error("no temporary folder");
    }
    _path = pattern;
  }
  ~TemporaryFolder() {
    std::error_code ignored;
    std::filesystem::remove_all(_path, ignored);
  }
  TemporaryFolder(const TemporaryFolder&) = delete;
  TemporaryFolder& operator=(const TemporaryFolder&) = delete;

  const std::string& path() const { return _path; }
  std::string path(const std::string& name) const { return _path + "/" + name; }

  /// Writes a file, with its parent folders, and gives its path.
  std::string write(const std::string& name, std::string_view content) const {
    const std::filesystem::path file = path(name);
    std::filesystem::create_directories(file.parent_path());
    std::ofstream(file, std::ios::binary) << content;
    return file.string();
  }

 private:
  /// In memory where that can be had, as whatever is written atomically waits for a disk.
  static std::filesystem::path _parent() {
    constexpr const char* memory = "/dev/shm";
    constexpr uint64_t plenty = uint64_t{1} << 30U;
    struct statvfs status {};
    const bool isChosen = std::getenv("TMPDIR") != nullptr;  // NOLINT(concurrency-mt-unsafe)
    const bool willDo = !isChosen && ::statvfs(memory, &status) == 0 &&
                        status.f_bavail * status.f_frsize >= plenty &&
                        (status.f_flag & ST_NOEXEC) == 0 && ::access(memory, W_OK | X_OK) == 0;
    return willDo ? memory : std::filesystem::temp_directory_path();
  }

  std::string _path;
};

}  // namespace tests
