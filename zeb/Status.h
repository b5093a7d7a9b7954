// How things are: books and their indexes, models, the daemon, and what is being done.
#pragma once

#include <optional>
#include <string>
#include <vector>

#include "zeb/Console.h"
#include "zeb/DaemonClient.h"
#include "zeb/Output.h"

namespace zeb {

/// Where a book's index came from.
enum class IndexOrigin {
  none,
  /// It came with the book.
  book,
  /// It was made on this computer.
  generated,
  /// A server has it.
  fetched,
};

IndexOrigin originOfIndex(const ListedBook& book);

struct StatusReport {
  std::vector<ListedBook> books;
  size_t modelCount = 0;
  size_t buildingModelCount = 0;
  /// Indexing tools that run for the user.
  size_t indexingToolCount = 0;
  /// Whether there is a daemon to ask, running or not.
  bool canHaveDaemon = false;
  /// Absent where none runs.
  std::optional<DaemonStatus> daemon;
};

/// What is to be said of these books. Does not start a daemon; `daemon` may be null.
StatusReport statusReport(std::vector<ListedBook> books, const DaemonClient* daemon);

/// A line a book, then one each for their number, the models, the daemon and what is being done.
void printStatus(const StatusReport& report, Console& console);

/// One JSON object: "books" (each with "id", "title", "language", "origin": "book", "generated",
/// "fetched" or "none", and "index" where there is one), "models" ("count", "building"),
/// "indexingTools", "daemon" (null, or "process", "version", "seconds", "searches",
/// "watchedFolders", "scanning", "backgroundWork").
void printStatusAsJSON(const StatusReport& report, Console& console);

}  // namespace zeb
