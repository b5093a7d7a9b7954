// What the system's speed is compared with.
#pragma once

#include <cstddef>
#include <filesystem>
#include <memory>
#include <string>

#include "bench/quality/Collection.h"

class HelpLUXIndex;

namespace quality {

/// A database on disk, in the way people use it. Thread-safety: confined to one thread.
class SpeedPeer {
 public:
  virtual ~SpeedPeer() = default;
  /// The number of pages found, at most 50: OR of the stems of the text.
  virtual size_t search(const std::string& text) = 0;
  /// The number of pages found, at most 50, that have a word which begins so.
  virtual size_t complete(const std::string& prefix) = 0;
};

std::unique_ptr<SpeedPeer> xapianSpeedPeer(const Collection& pages,
                                           const std::filesystem::path& folder);
std::unique_ptr<SpeedPeer> sqliteSpeedPeer(const Collection& pages,
                                           const std::filesystem::path& folder);

/// Seconds that Spectra's Lanczos method takes for the truncated factorisation of the matrix of
/// pages and stems (weights as in the model, rank 4·√pages within 50 and 300), the matrix given:
/// the better of one thread and as many as there are processors.
double spectraSeconds(const HelpLUXIndex& index);

}  // namespace quality
