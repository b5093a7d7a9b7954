#include "zebd/BookFolder.h"

#include <fmt/format.h>

#include "bvmake/PageReader.h"
#include "host/Zebrine/RNXObjectManager.h"
#include "host/Zebrine/ZEBConstants.h"
#include "host/Zebrine/ZEBGeneratedFiles.h"
#include "host/Zebrine/ZEBHelpBook.h"
#include "platform/Environment.h"
#include "platform/Strings.h"
#include "zebd/HelpFolders.h"

namespace zebd {

namespace {

/// Part of every fingerprint: raised when indexes made so far should be made again although their
/// pages are the same.
constexpr int recipe = 2;

constexpr const char* informationListName = "Info.plist";

bool isFile(const std::string& path) {
  bool isDirectory = false;
  return platform::Environment::current()->files->fileExistsAtPath(path, &isDirectory) &&
         !isDirectory;
}

bool isFolder(const std::string& path) {
  bool isDirectory = false;
  return platform::Environment::current()->files->fileExistsAtPath(path, &isDirectory) &&
         isDirectory;
}

bool hasInformationList(const std::string& folder) {
  return isFile(platform::stringByAppendingPathComponent(folder, informationListName));
}

/// The page that opens a folder which does not say. It need not exist: what counts is its folder.
std::string accessPageIn(const std::string& folder) {
  for (const char* name : {"index.html", "index.page", "index.xhtml", "index.htm"}) {
    std::string path = platform::stringByAppendingPathComponent(folder, name);
    if (isFile(path)) {
      return path;
    }
  }
  return platform::stringByAppendingPathComponent(folder, "index.html");
}

/// Empty when there is no such page, or it has no title.
std::string titleOfPage(const std::string& path) {
  const auto kind = bvmake::pageKindOfFileName(platform::lastPathComponent(path));
  const auto bytes = platform::Environment::current()->files->contentsMappedAtPath(path);
  if (!kind || !bytes) {
    return {};
  }
  const auto page = bvmake::readPage(*kind, bytes->view());
  return page ? page->title : std::string();
}

}  // namespace

std::string pagesFolderOf(const CatalogueEntry& entry) {
  return platform::stringByDeletingLastPathComponent(entry.accessPagePath);
}

std::optional<CatalogueEntry> entryForFolder(const std::string& folder,
                                             const std::optional<std::string>& bookID,
                                             const std::string& language, std::string& reason,
                                             const std::string& accessPage) {
  if (!isFolder(folder)) {
    reason = "there is no such folder";
    return std::nullopt;
  }
  CatalogueEntry entry;
  entry.folder = folder;
  if (const std::shared_ptr<ZEBHelpBook> described = ZEBHelpBook::initWithPath(folder)) {
    entry.bookID = described->bookID();
    entry.title = described->title();
    entry.type = described->type();
    entry.language = described->localization();
    entry.accessPagePath = described->accessPagePath().value_or(accessPageIn(folder));
  } else if (hasInformationList(folder)) {
    reason = noBookReason;
    return std::nullopt;
  } else {
    entry.bookID =
        bookID.value_or(platform::stringByRepairingUTF8(platform::lastPathComponent(folder)));
    if (!ZEBHelpBook::isValidBookID(entry.bookID)) {
      reason = fmt::format("\"{}\" cannot be the identifier of a book", entry.bookID);
      return std::nullopt;
    }
    entry.language = language;
    entry.accessPagePath = accessPage.empty() ? accessPageIn(folder) : accessPage;
    entry.title = titleOfPage(entry.accessPagePath);
  }
  if (entry.title.empty()) {
    entry.title = entry.bookID;
  }
  if (entry.type != ZEBHelpBookType4 && !holdsPages(pagesFolderOf(entry))) {
    reason = noPagesReason;
    return std::nullopt;
  }
  entry.fingerprint = fmt::format("{}:{}", recipe, folderFingerprint(pagesFolderOf(entry)));
  return entry;
}

namespace {

/// The book of which only index and exact-match list come to this machine.
std::shared_ptr<ZEBHelpBook> remoteBookOfEntry(const CatalogueEntry& entry) {
  std::shared_ptr<ZEBHelpBook> book =
      ZEBHelpBook::bookWithID(entry.bookID, entry.type, entry.folder);
  if (book == nullptr) {
    return nullptr;
  }
  book->setTitle(entry.title);
  book->setLocalization(entry.language);
  book->setCatalogueURL(platform::URL::URLWithString(*entry.catalogueURL));
  book->setPreferredLanguages(entry.languages);
  book->setRemoteURL(platform::URL::URLWithString(entry.pagesURL.value_or("")));
  if (const std::optional<std::string> root = ZEBGeneratedRoot()) {
    const std::string list =
        ZEBGeneratedFilePath(*root, book->bookID(), entry.language, ZEBExactMatchListExtension);
    book->setExactMatchPath(isFile(list) ? std::optional(list) : std::nullopt);
  }
  // The user's languages may be others than when the book was added.
  RNXObjectManager::sharedObjectManager()->takeLocalization(book);
  return book;
}

}  // namespace

std::shared_ptr<ZEBHelpBook> bookOfEntry(const CatalogueEntry& entry) {
  if (entry.isRemote()) {
    return remoteBookOfEntry(entry);
  }
  if (hasInformationList(entry.folder)) {
    std::shared_ptr<ZEBHelpBook> described = ZEBHelpBook::initWithPath(entry.folder);
    if (described == nullptr || described->bookID() != entry.bookID) {
      return nullptr;
    }
    if (entry.catalogueURL) {
      described->setCatalogueURL(platform::URL::URLWithString(*entry.catalogueURL));
    }
    return described;
  }
  std::shared_ptr<ZEBHelpBook> book =
      ZEBHelpBook::bookWithID(entry.bookID, entry.type, entry.folder);
  if (book != nullptr) {
    book->setTitle(entry.title);
    book->setLocalization(entry.language);
    book->setAccessPagePath(entry.accessPagePath);
  }
  return book;
}

std::optional<std::string> indexPathOfBook(const ZEBHelpBook& book) {
  if (const std::optional<std::string> root = ZEBGeneratedRoot()) {
    std::string path =
        ZEBGeneratedFilePath(*root, book.bookID(), book.localization(), ZEBHelpindexExtension);
    if (isFile(path)) {
      return path;
    }
  }
  for (std::string& path : book.indexPaths()) {
    if (isFile(path)) {
      return std::move(path);
    }
  }
  return std::nullopt;
}

}  // namespace zebd
