// Looks at every byte of a keyword index.
#pragma once

#include <cstddef>
#include <string>
#include <vector>

#include "SearchKit/SearchKit.h"

namespace searchkit {

/// What is wrong with an index that can be opened, one line of text each, in the order of its
/// sections and at most `maximumCount` of them; empty when it is what docs/formats/keyword-index.md
/// says: checksums, stored texts and the order of paths, block keys and offsets, order and extents
/// of the terms, documents, weights and positions of each, and the sums in the header. A section
/// whose checksum is wrong is reported as that and looked into all the same.
///
/// Takes time linear in the index's length, whatever its bytes. Thread-safety: any thread.
std::vector<std::string> indexProblems(const SKIndex& index, size_t maximumCount = 100);

}  // namespace searchkit
