// Where the server has what is installed here.
#pragma once

#include <memory>
#include <optional>

#include "platform/URL.h"

class ZEBHelpBook;

/// Knows the remote counterparts of local files of help books.
/// Thread-safety: internally synchronised.
class ZEBCacheManager {
 public:
  /// The address of a newer version of a book's local file; absent where the book has none. No book
  /// has one yet.
  static std::optional<platform::URL> remoteURLForLocalURL(
      const platform::URL& localURL, const std::shared_ptr<ZEBHelpBook>& inBook);
};
