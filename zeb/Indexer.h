// Turns a folder of help pages into an index and an entry of the catalogue.
#pragma once

#include <cstddef>
#include <optional>
#include <string>
#include <vector>

#include "zeb/Catalogue.h"

namespace zeb {

/// A folder that is to become, or is, a book of the catalogue.
struct BookFolder {
  /// What the catalogue will say of it; what only the index can tell is still missing.
  CatalogueEntry entry;
  /// The folder whose pages are indexed: that of the access page.
  std::string pagesFolder;
  /// Whether the title is still to be taken from the access page.
  bool isUntitled = false;
};

/// Reads what a folder says of itself: a help book with an information list, or else any folder,
/// which then needs the identifier and language given here (the name of the folder when there is
/// none). A help book's own identifier wins. Absent, with `reason` set, for what is no folder,
/// for an information list that does not describe a book, and for an identifier that cannot be one.
/// The index is to go to the catalogue's folder; shipped indexes stay where they are.
std::optional<BookFolder> bookInFolder(const std::string& folder, const Catalogue& catalogue,
                                       const std::optional<std::string>& bookID,
                                       const std::string& language, std::string& reason);

/// What became of one folder.
struct IndexingOutcome {
  enum class Kind { indexed, unchanged, empty, failed };
  Kind kind = Kind::failed;
  std::string bookID;
  std::string title;
  std::string language;
  size_t pageCount = 0;
  double seconds = 0;
  /// Why it failed.
  std::vector<std::string> errors;
  /// Pages that could not be read, and the like.
  std::vector<std::string> warnings;
};

/// Indexes the book's pages and enters it into the catalogue. With `evenIfUnchanged` false a book
/// is left as it is whose entry and fingerprint are those of the last time and whose index can be
/// read. On failure the earlier index and entry stay as they were.
/// Thread-safety: different books may be indexed on different threads at once.
IndexingOutcome indexBook(const BookFolder& book, const Catalogue& catalogue, bool evenIfUnchanged);

}  // namespace zeb
