#include "zeb/Scan.h"

#include <fmt/format.h>

#include <ostream>
#include <set>
#include <string>
#include <utility>
#include <vector>

#include "platform/Environment.h"
#include "platform/Files.h"
#include "zeb/BookFolder.h"
#include "zeb/HelpFolders.h"
#include "zeb/Indexing.h"
#include "zeb/Languages.h"
#include "zeb/Paths.h"
#include "zeb/RemoteBooks.h"

namespace zeb {

namespace {

/// The books to index, each identifier once.
class BookList {
 public:
  BookList(Console& console, int verbosity) : _console(console), _verbosity(verbosity) {}

  bool add(const std::string& folder, const std::optional<std::string>& bookID,
           const std::string& language, std::string& reason) {
    std::optional<CatalogueEntry> book = entryForFolder(folder, bookID, language, reason);
    if (!book) {
      return false;
    }
    if (!_bookIDs.insert(book->bookID).second) {
      if (!_folders.contains(folder)) {
        passedOver(folder, fmt::format("there is another book \"{}\"", book->bookID));
      }
      return true;
    }
    _folders.insert(folder);
    _books.push_back(std::move(*book));
    return true;
  }

  void addInstalled(const std::vector<HelpFolder>& folders) {
    for (const HelpFolder& found : folders) {
      std::string reason;
      if (!add(found.folder, found.bookID, found.language, reason)) {
        passedOver(found.folder, reason);
      }
    }
  }

  void passedOver(const std::string& folder, const std::string& reason) {
    if (_verbosity > 0) {
      _console.note(fmt::format("passed over {}: {}", folder, reason));
    }
  }

  bool contains(const std::string& bookID) const { return _bookIDs.contains(bookID); }
  const std::vector<CatalogueEntry>& books() const { return _books; }

 private:
  Console& _console;
  int _verbosity;
  std::set<std::string> _bookIDs;
  std::set<std::string> _folders;
  std::vector<CatalogueEntry> _books;
};

void addInstalledBooks(const ScanCommand& command, BookList& books) {
  const std::string root = absolutePath(command.root);
  const PassedOver passedOver = [&books](const std::string& folder, const std::string& reason) {
    books.passedOver(folder, reason);
  };
  const auto languages = languageFallbacks(
      command.languages.empty() ? platform::Environment::current()->preferredLanguages
                                : command.languages);
  books.addInstalled(applicationHelpFolders(root, languages, passedOver));
  books.addInstalled(manualFolders(root, passedOver));
}

/// Books that were added by name before are looked at again. Returns those whose folder is gone.
std::vector<CatalogueEntry> addKnownBooks(const Catalogue& catalogue, BookList& books) {
  std::vector<CatalogueEntry> gone;
  for (const CatalogueEntry& entry : catalogue.entries()) {
    if (entry.isRemote()) {
      continue;
    }
    bool isDirectory = false;
    if (!platform::Environment::current()->files->fileExistsAtPath(entry.folder, &isDirectory) ||
        !isDirectory) {
      gone.push_back(entry);
      continue;
    }
    std::string reason;
    if (!books.add(entry.folder, entry.bookID, entry.language, reason)) {
      books.passedOver(entry.folder, reason);
    }
  }
  return gone;
}

}  // namespace

ExitCode scan(const ScanCommand& command, const Catalogue& catalogue,
              const Installation& installation, const Waiting& waiting, Console& console,
              int verbosity) {
  BookList books(console, verbosity);
  size_t brokenCount = 0;
  for (const std::string& folder : command.folders) {
    std::string reason;
    const std::string path = absolutePath(folder);
    if (!books.add(path, std::nullopt, {}, reason)) {
      console.error(fmt::format("{}: {}", path, reason));
      ++brokenCount;
    }
  }
  if (command.installedBooks) {
    console.progress("looking for books");
    addInstalledBooks(command, books);
  }
  std::vector<CatalogueEntry> gone = addKnownBooks(catalogue, books);
  // One that was found in another place under its old name is not gone.
  std::erase_if(gone, [&](const CatalogueEntry& entry) { return books.contains(entry.bookID); });

  const IndexingCounts counts =
      Update(catalogue, waiting, console)
          .run(books.books(), gone, installation, command.evenIfUnchanged);
  const size_t failedCount = counts.failed + brokenCount;
  console.clearProgress();
  console.out() << fmt::format("{} indexed, {} unchanged, {} forgotten, {} failed", counts.indexed,
                               counts.unchanged, counts.forgotten, failedCount);
  if (const size_t remoteCount = refreshRemoteBooks(catalogue, installation, waiting, console);
      remoteCount > 0) {
    console.out() << fmt::format(", {} on servers", remoteCount);
  }
  if (counts.left > 0) {
    console.out() << fmt::format(", {} still to be indexed", counts.left);
  }
  console.out() << '\n';
  return failedCount == 0 ? ExitCode::success : ExitCode::failure;
}

}  // namespace zeb
