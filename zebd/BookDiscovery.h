// Which books there are.
#pragma once

#include <map>
#include <optional>
#include <string>
#include <vector>

#include "zebd/Catalogue.h"
#include "zebd/HelpFolders.h"

namespace zebd {

/// Collects books from folders, each identifier once: what is added first wins. It reads folders
/// and their opening pages, and looks at every file's date, but changes nothing.
/// Thread-safety: confined to one thread.
class BookDiscovery {
 public:
  explicit BookDiscovery(PassedOver passedOver) : _passedOver(std::move(passedOver)) {}

  /// The identifier of the book in the folder (see entryForFolder). Absent, with `reason` set,
  /// where there is none, or another folder has a book of that identifier.
  std::optional<std::string> add(const std::string& folder,
                                 const std::optional<std::string>& bookID,
                                 const std::string& language, std::string& reason,
                                 const std::string& accessPage = {});

  /// Help books, help of applications, manuals.
  void addInstalled(const std::vector<std::string>& dataFolders,
                    const std::vector<std::string>& preferredLanguages);

  /// Books that the catalogue has from before, remote ones left out. Returns those that are gone:
  /// the folder is no longer there, and no book of that identifier was found in another.
  std::vector<CatalogueEntry> addKnown(const Catalogue& catalogue);

  const std::vector<CatalogueEntry>& books() const { return _books; }

 private:
  void _addAll(const std::vector<HelpFolder>& folders);

  const PassedOver _passedOver;
  /// By identifier.
  std::map<std::string, std::string> _folders;
  std::vector<CatalogueEntry> _books;
};

}  // namespace zebd
