#include "zeb/Indexing.h"

#include <fmt/format.h>

#include <algorithm>
#include <memory>
#include <optional>
#include <ostream>
#include <string>

#include "host/Zebrine/ZEBConstants.h"
#include "host/Zebrine/ZEBHelpBook.h"
#include "platform/Environment.h"
#include "platform/FileLock.h"
#include "platform/Files.h"
#include "zeb/HelpSearch.h"
#include "zebd/BookFolder.h"

namespace zeb {

// An update removes indexes before it makes them anew, and must not find those gone that it has
// made. Without a lock, where none can be had, it goes on: what then fails says so itself.
std::optional<platform::FileLock> lockCatalogue(const Catalogue& catalogue, Console& console) {
  (void)platform::Environment::current()->files->createDirectoryWithParents(catalogue.folder());
  const std::string path = catalogue.lockPath();
  std::optional<platform::FileLock> lock = platform::FileLock::tryLock(path);
  if (!lock) {
    console.progress("waiting for another update to end");
    lock = platform::FileLock::lock(path);
    console.clearProgress();
  }
  return lock;
}

IndexingCounts Update::run(const std::vector<CatalogueEntry>& books,
                           const std::vector<CatalogueEntry>& gone,
                           const Installation& installation, bool evenIfUnchanged) {
  const std::optional<platform::FileLock> lock = lockCatalogue(_catalogue, _console);
  for (CatalogueEntry book : books) {
    const std::optional<CatalogueEntry> former = _catalogue.entry(book.bookID);
    if (former && book.type == ZEBHelpBookType3) {
      // The folder does not say that the user subscribed.
      book.catalogueURL = former->catalogueURL;
    }
    if (!evenIfUnchanged && _isUpToDate(book)) {
      ++_counts.unchanged;
    } else {
      _changed.push_back(book);
    }
  }
  if (_changed.empty() && gone.empty()) {
    return _counts;
  }
  std::vector<CatalogueEntry> concerned = _changed;
  concerned.insert(concerned.end(), gone.begin(), gone.end());
  platform::Error error;
  const std::unique_ptr<HelpSearch> search = HelpSearch::start(concerned, installation, error);
  if (search == nullptr) {
    _console.error(error.description);
    _counts.failed += _changed.size();
    return _counts;
  }
  _removeOldIndexes(*search, gone);
  const std::vector<std::string> bookIDs = _storeEntries();
  if (!_waiting.waits) {
    _counts.left += bookIDs.size();
  } else if (!bookIDs.empty()) {
    _makeIndexes(*search, bookIDs);
  }
  return _counts;
}

bool Update::_isUpToDate(const CatalogueEntry& entry) const {
  const std::shared_ptr<ZEBHelpBook> book = zebd::bookOfEntry(entry);
  return _catalogue.entry(entry.bookID) == entry && book != nullptr &&
         (book->type() == ZEBHelpBookType4 || zebd::indexPathOfBook(*book));
}

void Update::_removeOldIndexes(HelpSearch& search, const std::vector<CatalogueEntry>& gone) {
  std::vector<std::string> bookIDs;
  bookIDs.reserve(gone.size() + _changed.size());
  for (const CatalogueEntry& entry : gone) {
    bookIDs.push_back(entry.bookID);
  }
  for (const CatalogueEntry& entry : _changed) {
    const std::shared_ptr<ZEBHelpBook> book = zebd::bookOfEntry(entry);
    // What is remembered of a book by this name may be its index in another language or place.
    if (_catalogue.entry(entry.bookID) || (book != nullptr && zebd::indexPathOfBook(*book))) {
      bookIDs.push_back(entry.bookID);
    }
  }
  if (!bookIDs.empty() && !search.removeIndexes(bookIDs)) {
    _console.warning("not all indexes that are out of date could be removed");
  }
  for (const CatalogueEntry& entry : gone) {
    if (const auto error = _catalogue.remove(entry.bookID)) {
      _console.error(fmt::format("{}: {}", entry.bookID, error->description));
      ++_counts.failed;
    } else {
      ++_counts.forgotten;
    }
  }
}

std::vector<std::string> Update::_storeEntries() {
  std::vector<std::string> bookIDs;
  for (const CatalogueEntry& entry : _changed) {
    if (const auto error = _catalogue.store(entry)) {
      _console.error(fmt::format("{}: {}", entry.bookID, error->description));
      ++_counts.failed;
    } else {
      bookIDs.push_back(entry.bookID);
    }
  }
  return bookIDs;
}

void Update::_makeIndexes(HelpSearch& search, const std::vector<std::string>& bookIDs) {
  _console.progress(fmt::format("0 of {} books", bookIDs.size()));
  const HelpSearch::Indexing indexing = search.makeIndexes(
      bookIDs, platform::Seconds(_waiting.limit), [&](const std::string& bookID, size_t count) {
        _tellIndexed(bookID);
        _console.progress(fmt::format("{} of {} books", count, bookIDs.size()));
      });
  _console.clearProgress();
  _counts.indexed += bookIDs.size() - indexing.missing.size();
  if (!indexing.ended) {
    _counts.left += indexing.missing.size();
    _console.note(fmt::format("gave up waiting after {:g} seconds", _waiting.limit));
    return;
  }
  for (const std::string& bookID : indexing.missing) {
    _console.error(fmt::format("{}: it could not be indexed", bookID));
  }
  _counts.failed += indexing.missing.size();
}

void Update::_tellIndexed(const std::string& bookID) {
  const auto entry =
      std::find_if(_changed.begin(), _changed.end(),
                   [&](const CatalogueEntry& candidate) { return candidate.bookID == bookID; });
  if (entry == _changed.end()) {
    return;
  }
  _console.clearProgress();
  _console.out() << fmt::format("{}  {}{}\n", _console.styled(Style::book, singleLine(bookID)),
                                entry->language.empty() ? "" : entry->language + "  ",
                                singleLine(entry->title))
                 << std::flush;
}

}  // namespace zeb
