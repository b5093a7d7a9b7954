// From a folder of help pages to an entry of the catalogue, and to a book.
#pragma once

#include <memory>
#include <optional>
#include <string>

#include "zebd/Catalogue.h"

class ZEBHelpBook;

namespace zebd {

/// What the catalogue is to say of a folder: a help book with an information list, or else any
/// folder, which then needs the identifier and language given here (the name of the folder when
/// there is none). A help book's own identifier wins. The title of a folder is that of the page
/// that opens it. Absent, with `reason` set, for what is no folder, for one without help pages, for
/// an information list that does not describe a book, and for an identifier that cannot be one. A
/// help book names the page that opens it itself; of another folder that is `accessPage`, where it
/// is not empty, or else its index page.
std::optional<CatalogueEntry> entryForFolder(const std::string& folder,
                                             const std::optional<std::string>& bookID,
                                             const std::string& language, std::string& reason,
                                             const std::string& accessPage = {});

/// The folder of the pages of a book on this machine.
std::string pagesFolderOf(const CatalogueEntry& entry);

/// The book that the entry is about; one from a server in the language that suits its reader best
/// now, of those that are known and here. Null when the folder's information list is no longer that
/// of this book.
std::shared_ptr<ZEBHelpBook> bookOfEntry(const CatalogueEntry& entry);

/// The help-index file of the book that is there now: a generated one, or the one that it ships.
/// Absent when there is none yet.
std::optional<std::string> indexPathOfBook(const ZEBHelpBook& book);

}  // namespace zebd
