// The list of books that can be searched, kept on the disk between runs. Their indexes are not its
// concern.
#pragma once

#include <cstdint>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include "platform/Error.h"

namespace zebd {

/// What is remembered of one book.
struct CatalogueEntry {
  /// A valid identifier (ZEBHelpBook::isValidBookID).
  std::string bookID;
  std::string title;
  /// One of ZEBHelpBookType….
  int32_t type = 1;
  /// The folder that was given or found: what to look at when the book is scanned again.
  std::string folder;
  /// The page that opens the book.
  std::string accessPagePath;
  /// As the folder of that language is named; empty where there is only one.
  std::string language;
  /// What the folder looked like when it was entered; see folderFingerprint().
  std::string fingerprint;
  /// Of a book from a server, and of an installed one that is renewed from there: where the
  /// publisher's catalogue is.
  std::optional<std::string> catalogueURL;
  /// In which languages a book from a server is wanted; empty for the user's own, whichever they
  /// are at the time.
  std::vector<std::string> languages;
  /// Where the server has the book's pages.
  std::optional<std::string> pagesURL;

  /// Whether nothing of the book but its index is on this machine.
  bool isRemote() const;

  friend bool operator==(const CatalogueEntry&, const CatalogueEntry&) = default;
};

/// The catalogue: one small property list a book in one folder, so that a damaged or half-removed
/// file costs one book, and programs that add different books at once do not undo each other.
///
/// Nothing is cached: each call reads the disk. A file that is no property list, or not one that
/// describes a book, is passed over as if it were not there.
/// Thread-safety: immutable; what is on the disk is replaced file by file in one step.
class Catalogue {
 public:
  /// The catalogue in `folder`, which is created when something is first stored.
  explicit Catalogue(std::string folder) : _folder(std::move(folder)) {}

  const std::string& folder() const noexcept { return _folder; }
  /// The file that programs lock (platform::FileLock) while they change more than one entry.
  std::string lockPath() const { return _folder + ".lock"; }

  /// All books, by identifier.
  std::vector<CatalogueEntry> entries() const;

  /// The book; absent when there is no usable file for it.
  std::optional<CatalogueEntry> entry(const std::string& bookID) const;

  /// Adds or replaces a book. On failure the earlier entry is untouched.
  std::optional<platform::Error> store(const CatalogueEntry& entry) const;

  /// Forgets a book, which need not be known.
  std::optional<platform::Error> remove(const std::string& bookID) const;

 private:
  std::string _entryPath(std::string_view bookID) const;

  std::string _folder;
};

}  // namespace zebd
