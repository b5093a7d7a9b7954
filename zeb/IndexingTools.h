// Indexing tools that are at work for the user.
#pragma once

#include <cstddef>

namespace zeb {

/// How many processes of the indexing tool write into the user's folder of generated indexes,
/// whichever program has started them; 0 where that cannot be told. Those of other users, and those
/// that somebody runs by hand for a file elsewhere, are none of them. Thread-safety: internally
/// synchronised.
size_t runningIndexingToolCount();

}  // namespace zeb
