// The help books that a host knows.
#pragma once

#include <map>
#include <memory>
#include <string>

#include "platform/ThreadSafety.h"

class ZEBHelpBook;

namespace zebd {

/// Books by identifier. It knows nothing of indexes: those are the plug-in's.
/// Thread-safety: internally synchronised.
class Bookshelf {
 public:
  using Books = std::map<std::string, std::shared_ptr<ZEBHelpBook>>;

  /// Adds the book, in place of one of the same identifier. A null book is none.
  void addBook(std::shared_ptr<ZEBHelpBook> book);
  void removeBook(const std::string& bookID);

  /// Null when there is no such book.
  std::shared_ptr<ZEBHelpBook> bookWithID(const std::string& bookID) const;
  /// All books, as they are now.
  Books books() const;

 private:
  mutable platform::Mutex _mutex;
  Books _books GUARDED_BY(_mutex);
};

}  // namespace zebd
