// Work on several threads whose result does not depend on their number.
#pragma once

#include <cstddef>
#include <functional>

/// Calls `body(from, to)` for consecutive pieces of [0, count), `pieceLength` long but for the
/// last, on up to `threadCount` threads, the calling one among them, and returns when all is done.
/// Which pieces there are depends on `count` and `pieceLength` alone; which thread takes which, and
/// when, is open. What a piece throws is thrown again here, the first one's, after the others have
/// ended.
void LUXInParallel(size_t count, size_t pieceLength, size_t threadCount,
                   const std::function<void(size_t from, size_t to)>& body);

/// As many threads as there are processors.
size_t LUXThreadCount();
