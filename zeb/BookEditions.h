// A help book in each of its languages.
#pragma once

#include <optional>
#include <string>
#include <vector>

namespace zeb {

/// One language of a book, as it lies on the disk.
struct BookEdition {
  std::string bookID;
  std::string title;
  /// As its folder is named; empty where there is only one.
  std::string language;
  /// The folder of its pages, and the page that opens it.
  std::string pagesFolder;
  std::optional<std::string> exactMatchPath;
  /// Files among the pages that are no part of them.
  std::vector<std::string> otherFiles;
};

/// The editions of the book in `folder`, in the order of their languages: of a help book, or else
/// of any folder of help pages (one edition, with the identifier and language given here, or the
/// name of the folder and none). None, with `reason` set, for what is no folder of pages.
std::vector<BookEdition> editionsOfFolder(const std::string& folder,
                                          const std::optional<std::string>& bookID,
                                          const std::string& language, std::string& reason);

}  // namespace zeb
