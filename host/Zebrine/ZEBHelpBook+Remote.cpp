// The type-4 books that are alive, and where a server has their pages.
#include <algorithm>
#include <map>
#include <vector>

#include "host/Zebrine/ZEBHelpBook.h"
#include "platform/ThreadSafety.h"

namespace {

using WeakBooks = std::vector<std::weak_ptr<ZEBHelpBook>>;

struct Type4Books {
  platform::Mutex mutex;
  /// In the order in which they were made.
  std::map<std::string, WeakBooks, std::less<>> byID GUARDED_BY(mutex);
};

Type4Books& type4Books() {
  // Never destroyed: books may outlive every other static object.
  static auto& books = *new Type4Books;
  return books;
}

WeakBooks booksWithID(std::string_view bookID) {
  Type4Books& books = type4Books();
  const platform::MutexLock lock(books.mutex);
  const auto found = books.byID.find(bookID);
  return found == books.byID.end() ? WeakBooks() : found->second;
}

/// Escapes may hide dots and slashes from us, but not from the server.
bool mayLeaveItsFolder(std::string_view path) {
  const std::string decoded = platform::stringByRemovingPercentEncoding(path);
  std::string_view rest = decoded;
  while (true) {
    const size_t slash = rest.find_first_of("/\\");
    if (rest.substr(0, slash) == "..") {
      return true;
    }
    if (slash == std::string_view::npos) {
      return decoded.find('\0') != std::string::npos;
    }
    rest.remove_prefix(slash + 1);
  }
}

std::optional<platform::URL> pageURL(const platform::URL& root, std::string_view path) {
  const std::string& spelled = root.absoluteString();
  std::string url = spelled.substr(0, spelled.find_first_of("?#"));
  while (url.ends_with('/')) {
    url.pop_back();
  }
  url += '/';
  path.remove_prefix(std::min(path.find_first_not_of('/'), path.size()));
  url += platform::stringByEscapingPath(path);
  return platform::URL::URLWithString(url);
}

}  // namespace

void ZEBHelpBook::_rememberType4Book(const std::shared_ptr<ZEBHelpBook>& book) {
  Type4Books& books = type4Books();
  const platform::MutexLock lock(books.mutex);
  books.byID[book->bookID()].push_back(book);
}

void ZEBHelpBook::_forgetDeadType4Books(const std::string& bookID) {
  Type4Books& books = type4Books();
  const platform::MutexLock lock(books.mutex);
  const auto found = books.byID.find(bookID);
  if (found == books.byID.end()) {
    return;
  }
  std::erase_if(found->second,
                [](const std::weak_ptr<ZEBHelpBook>& book) { return book.expired(); });
  if (found->second.empty()) {
    books.byID.erase(found);
  }
}

std::optional<platform::URL> ZEBHelpBook::_urlForType4HelpBookResult(std::string_view path,
                                                                     std::string_view bookID) {
  if (path.empty() || mayLeaveItsFolder(path)) {
    return std::nullopt;
  }
  // Outside the registry's lock: the last reference to a book may be the one taken here, and the
  // book asks the registry as it goes.
  const WeakBooks books = booksWithID(bookID);
  for (auto weak = books.rbegin(); weak != books.rend(); ++weak) {
    const std::shared_ptr<ZEBHelpBook> book = weak->lock();
    if (const auto root = book != nullptr ? book->remoteURL() : std::nullopt) {
      return pageURL(*root, path);
    }
  }
  return std::nullopt;
}
