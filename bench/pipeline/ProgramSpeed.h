// How long the command line lets people wait.
#pragma once

#include <cstddef>
#include <filesystem>
#include <string>
#include <vector>

namespace pipeline {

/// Has the program of this build index the books in the folders, with `caches` as its caches
/// folder. Throws std::runtime_error when that fails.
void indexBooks(const std::vector<std::string>& folders, const std::filesystem::path& caches);

/// The table about typing in `zeb search` on a pseudo-terminal: from the key to the screen that
/// shows it, and to the screen that shows what it finds.
std::string keystrokeTable(const std::filesystem::path& caches);

/// The table about whole processes of `programs`, in turns; the first is this build's.
std::string processTable(const std::vector<std::string>& programs,
                         const std::filesystem::path& caches, size_t rounds);

}  // namespace pipeline
