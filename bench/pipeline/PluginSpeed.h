// How long whole searches of the plug-in take.
#pragma once

#include <cstddef>
#include <filesystem>
#include <string>
#include <vector>

namespace pipeline {

struct SpeedOptions {
  /// Folders with help pages.
  std::vector<std::string> roots;
  size_t articlePages = 28000;
  size_t suggestionPages = 20000;
  /// Over how many books the pages are spread.
  size_t bookCount = 14;
  size_t queryCount = 300;
};

/// The table of docs/quality.md.
std::string speedTable(const SpeedOptions& options, const std::filesystem::path& work);

}  // namespace pipeline
