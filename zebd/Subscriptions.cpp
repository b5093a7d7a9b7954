#include "zebd/Subscriptions.h"

#include <algorithm>
#include <chrono>
#include <set>

#include "host/Zebrine/RNXCatalogue.h"
#include "host/Zebrine/ZEBConstants.h"
#include "host/Zebrine/ZEBGeneratedFiles.h"
#include "host/Zebrine/ZEBHelpBook.h"
#include "host/Zebrine/ZEBStrings.h"
#include "platform/Environment.h"
#include "platform/FileLock.h"
#include "platform/Files.h"
#include "zebd/BookFolder.h"

namespace zebd {

namespace {

using platform::stringByAppendingPathComponent;

/// A publisher's new edition reaches a reader within this time, or with the next scan.
constexpr std::chrono::hours refreshInterval{4};
/// When the plug-in last looked at every book: the date of this file.
constexpr const char* markerName = "RemoteBooks.checked";

CatalogueEntry remoteEntry(const RNXCatalogueEntry& book, const platform::URL& address,
                           const std::vector<std::string>& languages) {
  CatalogueEntry entry;
  entry.bookID = book.identifier;
  entry.title = book.title;
  entry.type = ZEBHelpBookType4;
  // Where what is fetched of it is kept.
  entry.folder = stringByAppendingPathComponent(ZEBGeneratedRoot().value_or("/"), book.identifier);
  entry.accessPagePath = stringByAppendingPathComponent(entry.folder, "index.html");
  entry.language = book.locale.value_or("");
  entry.catalogueURL = address.absoluteString();
  entry.languages = languages;
  if (book.pages) {
    entry.pagesURL = book.pages->absoluteString();
  }
  return entry;
}

/// Stores what is to be remembered of the book; absent, with `reason` set, where that cannot be.
std::optional<CatalogueEntry> store(const RNXCatalogueEntry& book, const platform::URL& address,
                                    const WantedBooks& wanted, const Catalogue& catalogue,
                                    std::string& reason) {
  const std::optional<CatalogueEntry> former = catalogue.entry(book.identifier);
  CatalogueEntry entry = remoteEntry(book, address, wanted.languages);
  if (former && !former->isRemote()) {
    if (former->type != ZEBHelpBookType3) {
      reason = "there is a book of this identifier on this computer (" + former->folder + ")";
      return std::nullopt;
    }
    entry = *former;
    entry.catalogueURL = address.absoluteString();
  }
  if (const auto error = catalogue.store(entry)) {
    reason = error->description;
    return std::nullopt;
  }
  return entry;
}

std::optional<std::string> fileAmongHelpCaches(const std::string& name) {
  const std::optional<std::string> caches = platform::Environment::current()->cachesDirectory;
  return caches ? std::optional(stringByAppendingPathComponent(
                      stringByAppendingPathComponent(*caches, ZEBDaemonBundleID), name))
                : std::nullopt;
}

}  // namespace

std::optional<platform::URL> addressOfCatalogue(const std::string& typed) {
  const auto url = URLByEscapingString(addSSLAsNecessary(typed));
  const bool isWeb = url && (url->scheme() == "https" || url->scheme() == "http");
  return isWeb && !ZEBOriginOfURL(*url).empty() ? url : std::nullopt;
}

std::vector<CatalogueEntry> subscribe(const RNXCatalogue& published, const platform::URL& address,
                                      const WantedBooks& wanted, const Catalogue& catalogue,
                                      std::vector<BookFailure>& failures) {
  std::set<std::string> bookIDs(wanted.bookIDs.begin(), wanted.bookIDs.end());
  if (bookIDs.empty()) {
    for (const RNXCatalogueEntry& book : published.books) {
      bookIDs.insert(book.identifier);
    }
  }
  const std::vector<std::string> languages =
      wanted.languages.empty() ? platform::Environment::current()->preferredLanguages
                               : wanted.languages;
  std::vector<CatalogueEntry> entries;
  for (const std::string& bookID : bookIDs) {
    // No localization is asked for by name, so a book that has languages is chosen by them.
    const RNXCatalogueEntry* book = published.bookWithIdentifier(bookID, "", languages);
    if (book == nullptr) {
      failures.push_back({bookID, "the catalogue does not have this book"});
      continue;
    }
    std::string reason;
    if (std::optional<CatalogueEntry> entry = store(*book, address, wanted, catalogue, reason)) {
      entries.push_back(std::move(*entry));
    } else {
      failures.push_back({bookID, reason});
    }
  }
  return entries;
}

std::vector<CatalogueEntry> unsubscribe(const std::string& name, const Catalogue& catalogue,
                                        bool& wasFound) {
  std::vector<CatalogueEntry> gone;
  wasFound = false;
  const auto address = addressOfCatalogue(name);
  for (const CatalogueEntry& entry : catalogue.entries()) {
    const bool isOfCatalogue = address && entry.catalogueURL == address->absoluteString();
    if (entry.bookID == name || (isOfCatalogue && entry.isRemote())) {
      gone.push_back(entry);
      wasFound = true;
    } else if (isOfCatalogue) {
      CatalogueEntry unsubscribed = entry;
      unsubscribed.catalogueURL.reset();
      wasFound = !catalogue.store(unsubscribed) || wasFound;
    }
  }
  return gone;
}

void forgetKnownIndices() {
  const auto environment = platform::Environment::current();
  const auto known = fileAmongHelpCaches(ZEBKnownIndicesFileName);
  const auto marker = fileAmongHelpCaches(markerName);
  if (!known || !marker) {
    return;
  }
  if (environment->files->fileExistsAtPath(*known)) {
    (void)environment->files->removeItem(*known);
  }
  (void)environment->files->createDirectoryWithParents(
      platform::stringByDeletingLastPathComponent(*marker));
  (void)environment->files->writeAtomically(*marker, {});
}

void forgetKnownIndicesWhenDue(const std::vector<CatalogueEntry>& entries) {
  const bool concernsAny =
      std::any_of(entries.begin(), entries.end(), [](const CatalogueEntry& entry) {
        return entry.type == ZEBHelpBookType3 || entry.type == ZEBHelpBookType4;
      });
  const auto marker = fileAmongHelpCaches(markerName);
  if (!concernsAny || !marker) {
    return;
  }
  const auto environment = platform::Environment::current();
  const auto last = environment->files->modificationDate(*marker);
  const auto now = environment->clock->now();
  // A date to come is no date: clocks are set back.
  if (!last || *last > now || now - *last >= refreshInterval) {
    forgetKnownIndices();
  }
}

void followLanguages(const Catalogue& catalogue, std::vector<CatalogueEntry>& entries) {
  std::vector<CatalogueEntry> changed;
  for (CatalogueEntry& entry : entries) {
    const auto book = entry.isRemote() ? bookOfEntry(entry) : nullptr;
    if (book == nullptr || book->localization() == entry.language) {
      continue;
    }
    entry.language = book->localization();
    const std::optional<platform::URL> pages = book->remoteURL();
    entry.pagesURL = pages ? std::optional(pages->absoluteString()) : std::nullopt;
    changed.push_back(entry);
  }
  if (changed.empty()) {
    return;
  }
  forgetKnownIndices();
  // Whoever has the catalogue to himself may be removing one of them; the next time will do.
  if (const auto lock = platform::FileLock::tryLock(catalogue.lockPath())) {
    for (const CatalogueEntry& entry : changed) {
      if (catalogue.entry(entry.bookID)) {
        (void)catalogue.store(entry);
      }
    }
  }
}

}  // namespace zebd
