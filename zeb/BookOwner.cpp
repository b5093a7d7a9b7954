#include "zeb/BookOwner.h"

#include "host/Zebrine/ZEBConstants.h"
#include "host/Zebrine/ZEBHelpBook.h"
#include "platform/Environment.h"
#include "platform/Files.h"

namespace zeb {

namespace {

std::shared_ptr<ZEBHelpBook> bookOfEntry(const CatalogueEntry& entry) {
  // Where a remote book's pages are, only its folder says; of the others the entry knows enough.
  if (entry.type == ZEBHelpBookType4) {
    if (std::shared_ptr<ZEBHelpBook> book = ZEBHelpBook::initWithPath(entry.folder);
        book != nullptr && book->bookID() == entry.bookID) {
      return book;
    }
  }
  std::shared_ptr<ZEBHelpBook> book =
      ZEBHelpBook::bookWithID(entry.bookID, entry.type, entry.folder);
  if (book != nullptr) {
    book->setTitle(entry.title);
    book->setLocalization(entry.language);
    book->setAccessPagePath(entry.accessPagePath);
    book->setIndexPaths({entry.indexPath});
  }
  return book;
}

}  // namespace

BookOwner::BookOwner(const std::vector<CatalogueEntry>& entries) {
  for (const CatalogueEntry& entry : entries) {
    if (std::shared_ptr<ZEBHelpBook> book = bookOfEntry(entry)) {
      _books.emplace(entry.bookID, std::move(book));
    }
  }
}

std::shared_ptr<ZEBHelpBook> BookOwner::bookWithID(const std::string& bookID) const {
  const auto found = _books.find(bookID);
  return found == _books.end() ? nullptr : found->second;
}

std::optional<std::string> BookOwner::userHelpCachesDirectoryPath() const {
  const std::optional<std::string> caches = platform::Environment::current()->cachesDirectory;
  if (!caches) {
    return std::nullopt;
  }
  return platform::stringByAppendingPathComponent(*caches, ZEBDaemonBundleID);
}

}  // namespace zeb
