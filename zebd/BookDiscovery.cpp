#include "zebd/BookDiscovery.h"

#include <fmt/format.h>

#include <utility>

#include "platform/Environment.h"
#include "zebd/BookFolder.h"
#include "zebd/Languages.h"

namespace zebd {

std::optional<std::string> BookDiscovery::add(const std::string& folder,
                                              const std::optional<std::string>& bookID,
                                              const std::string& language, std::string& reason,
                                              const std::string& accessPage) {
  std::optional<CatalogueEntry> book = entryForFolder(folder, bookID, language, reason, accessPage);
  if (!book) {
    return std::nullopt;
  }
  std::string found = book->bookID;
  const auto [known, isNew] = _folders.emplace(found, folder);
  if (isNew) {
    _books.push_back(std::move(*book));
  } else if (known->second != folder) {
    reason = fmt::format("there is another book \"{}\"", found);
    return std::nullopt;
  }
  return found;
}

void BookDiscovery::_addAll(const std::vector<HelpFolder>& folders) {
  for (const HelpFolder& found : folders) {
    std::string reason;
    const auto bookID = found.bookID.empty() ? std::nullopt : std::optional(found.bookID);
    if (!add(found.folder, bookID, found.language, reason, found.accessPage)) {
      _passedOver(found.folder, reason);
    }
  }
}

void BookDiscovery::addInstalled(const std::vector<std::string>& dataFolders,
                                 const std::vector<std::string>& preferredLanguages) {
  _addAll(bookFolders(dataFolders));
  _addAll(applicationHelpFolders(dataFolders, languageFallbacks(preferredLanguages), _passedOver));
  _addAll(manualFolders(dataFolders, _passedOver));
}

std::vector<CatalogueEntry> BookDiscovery::addKnown(const Catalogue& catalogue) {
  std::vector<CatalogueEntry> gone;
  for (const CatalogueEntry& entry : catalogue.entries()) {
    if (entry.isRemote()) {
      continue;
    }
    const auto files = platform::Environment::current()->files;
    bool isDirectory = false;
    if (!files->fileExistsAtPath(entry.folder, &isDirectory) || !isDirectory) {
      gone.push_back(entry);
      continue;
    }
    const std::string accessPage =
        files->fileExistsAtPath(entry.accessPagePath) ? entry.accessPagePath : std::string();
    std::string reason;
    if (!_folders.contains(entry.bookID) &&
        !add(entry.folder, entry.bookID, entry.language, reason, accessPage)) {
      _passedOver(entry.folder, reason);
    }
  }
  std::erase_if(gone, [&](const CatalogueEntry& entry) { return _folders.contains(entry.bookID); });
  return gone;
}

}  // namespace zebd
