// Whether engines find the same.
#pragma once

#include <memory>
#include <vector>

#include "bench/engines/Engine.h"

namespace engines {

/// Asks all engines all questions. Throws std::runtime_error, saying what and where, at the first
/// difference between the pages that they find. Returns how many pages were found in all.
size_t requireSameResults(const std::vector<Engine*>& engines,
                          const std::vector<Question>& questions);

}  // namespace engines
