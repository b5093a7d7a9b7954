// Test collections out of real help books, as their packages install them.
#pragma once

#include <filesystem>
#include <functional>
#include <string>
#include <vector>

#include "bench/quality/Collection.h"

namespace quality {

/// One way to make a collection: what the author said about a page is taken out of it and becomes
/// the query that has to find it. A query that more than one page answers is left out; of the rest,
/// those whose hash is lowest are taken. Pages are read by the indexing tool's own reader.
struct HelpCollectionMaker {
  std::string name;
  std::string language;
  /// Debian packages that must be unpacked.
  std::vector<std::string> packages;
  /// Takes the root that packages were unpacked to.
  std::function<Collection(const std::filesystem::path& root)> make;
};

const std::vector<HelpCollectionMaker>& helpCollectionMakers();

/// The collections whose packages lie below `root`, in the order of the makers; the file
/// `versions` in `root`, one "package version" a line, gives their origins.
std::vector<Collection> helpCollections(const std::filesystem::path& root);

}  // namespace quality
