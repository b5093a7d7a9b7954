// The language models that there are on the disk.
#pragma once

#include <chrono>
#include <cstdint>
#include <optional>
#include <string>
#include <vector>

namespace zebd {

/// One model.
struct ListedModel {
  std::string group;
  /// Folder name ("English").
  std::string language;
  /// Full identifiers.
  std::vector<std::string> books;
  uint64_t pageCount = 0;
  /// Of the model file.
  uint64_t bytes = 0;
  std::optional<std::chrono::system_clock::time_point> built;
  /// Whether it is of no use as it is: torn, or from another version.
  bool needsBuild = false;
  /// Whether some process that runs, this one among them, has it marked as being built. After a
  /// build that broke off, that stays so until the process ends. What else processes do with a
  /// model only they know.
  bool isBeingBuilt = false;
};

/// Those of all groups and languages, by group, then language; with models that are being built for
/// the first time.
std::vector<ListedModel> savedModels();

}  // namespace zebd
