// How good the results are that reach the owner of the plug-in.
#pragma once

#include <filesystem>
#include <string>
#include <vector>

#include "bench/quality/Collection.h"

namespace pipeline {

/// The tables of docs/quality.md about collections: each is one book, its queries searched in three
/// ways.
std::string collectionTables(const std::vector<quality::Collection>& collections,
                             const std::filesystem::path& work);

/// The table about pages that one knows to be there, looked for in all installed books at once.
/// `packages` is the root that packages were unpacked to; `collections` are those made of them.
std::string knownPageTable(const std::vector<quality::Collection>& collections,
                           const std::filesystem::path& packages,
                           const std::filesystem::path& work);

}  // namespace pipeline
