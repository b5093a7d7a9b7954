#include "zebd/Bookshelf.h"

#include <utility>

#include "host/Zebrine/ZEBHelpBook.h"

namespace zebd {

void Bookshelf::addBook(std::shared_ptr<ZEBHelpBook> book) {
  if (book == nullptr) {
    return;
  }
  const platform::MutexLock lock(_mutex);
  _books[book->bookID()] = std::move(book);
}

void Bookshelf::removeBook(const std::string& bookID) {
  const platform::MutexLock lock(_mutex);
  _books.erase(bookID);
}

std::shared_ptr<ZEBHelpBook> Bookshelf::bookWithID(const std::string& bookID) const {
  const platform::MutexLock lock(_mutex);
  const auto found = _books.find(bookID);
  return found == _books.end() ? nullptr : found->second;
}

Bookshelf::Books Bookshelf::books() const {
  const platform::MutexLock lock(_mutex);
  return _books;
}

}  // namespace zebd
