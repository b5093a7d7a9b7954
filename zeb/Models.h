// The language models that there are on the disk.
#pragma once

#include <chrono>
#include <cstdint>
#include <optional>
#include <string>
#include <vector>

namespace zeb {

/// One saved model.
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
};

/// Those of all groups and languages, by group, then language.
std::vector<ListedModel> savedModels();

}  // namespace zeb
