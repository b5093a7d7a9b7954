// Where the server has what is installed here.
#pragma once

#include <memory>
#include <optional>

#include "platform/URL.h"

class ZEBHelpBook;

/// Knows the remote counterparts of local files of help books, from the catalogues that the books
/// name. Thread-safety: internally synchronised.
class ZEBCacheManager {
 public:
  /// The address of the server's version of a book's local file: its first index, its exact-match
  /// list, or one of its pages. Absent where the book's catalogue does not have that for the book's
  /// localization, where no catalogue is known yet, and for an index that this machine has in the
  /// server's version already.
  ///
  /// Asks no server. It goes by what is known of the catalogue, and has that brought up to date in
  /// the background, for the next time. Nothing but the file that the catalogue names is taken from
  /// an address that was given.
  static std::optional<platform::URL> remoteURLForLocalURL(
      const platform::URL& localURL, const std::shared_ptr<ZEBHelpBook>& inBook);
};
