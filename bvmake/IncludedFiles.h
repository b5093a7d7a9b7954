// The files that a document may include.
#pragma once

#include <memory>
#include <optional>
#include <string>
#include <string_view>

#include "bvmake/DocBookPages.h"

namespace platform {
class FileManager;
}

namespace bvmake {

/// Reads files that documents name, as long as they lie in one folder: names are resolved as paths
/// from the file that has them, percent-escapes decoded; symbolic links count as what they lead to.
/// URLs of any scheme are refused. Thread-safety: immutable.
class IncludedFiles {
 public:
  IncludedFiles(const std::string& folder, std::shared_ptr<platform::FileManager> files);

  /// As DocBookLoader. The names of files are their paths, free of links.
  std::optional<DocBookFile> load(const std::string& from, std::string_view reference,
                                  std::string& why) const;

  /// What files that include others are called here: the path of `file`, free of links.
  static std::string nameOfFile(const std::string& file);

 private:
  /// With a slash at the end; empty where there is no such folder.
  std::string _inside;
  std::shared_ptr<platform::FileManager> _files;
};

}  // namespace bvmake
