#include <exception>
#include <utility>

#include "host/Zebrine/ZEBConstants.h"
#include "host/Zebrine/ZEBHelpBook.h"
#include "host/Zebrine/ZEBLog.h"
#include "host/Zebrine/ZEBStrings.h"
#include "plugin/operations/ZEBOperationQueue.h"
#include "plugin/records/ZEBIndex.h"
#include "plugin/remote/ZEBIndexFetchUpdateOperation.h"
#include "plugin/shelf/ShutdownGuard.h"
#include "plugin/shelf/ZEBIndexGenerationOperation.h"
#include "plugin/shelf/ZEBIndexRegistrationOperation.h"
#include "plugin/shelf/ZEBIndexshelf.h"

void ZEBIndexshelf::addRegistrationOperationForBook(const std::shared_ptr<ZEBHelpBook>& book) {
  const auto operation = ZEBIndexRegistrationOperation::initWithIndexshelf(shared_from_this());
  if (book) {
    const platform::MonitorLock lock(_pendingMonitor);
    _booksToBeRegistered[book->bookID()] = book;
  }
  // Queued for a missing book too: it then finds whatever else is waiting, or nothing.
  const platform::MonitorLock lock(_indexRegistrationQueue->monitor());
  _indexRegistrationQueue->addOperation(operation);
}

void ZEBIndexshelf::ensureRegistrationForBook(const std::shared_ptr<ZEBHelpBook>& book) {
  if (!book) {
    return;
  }
  {
    const platform::MonitorLock lock(_pendingMonitor);
    if (_booksToBeRegistered.erase(book->bookID()) == 0) {
      return;
    }
  }
  _registerBook(book);
}

void ZEBIndexshelf::_registerNextBook() {
  std::shared_ptr<ZEBHelpBook> book;
  {
    const platform::MonitorLock lock(_pendingMonitor);
    const auto first = _booksToBeRegistered.begin();
    if (first == _booksToBeRegistered.end()) {
      return;
    }
    book = std::move(first->second);
    _booksToBeRegistered.erase(first);
  }
  _registerBook(book);
}

void ZEBIndexshelf::_registerBook(const std::shared_ptr<ZEBHelpBook>& book) {
  (void)indicesForBook(book);
}

ZEBIndexshelf::Indices ZEBIndexshelf::indicesForBook(const std::shared_ptr<ZEBHelpBook>& book) {
  const ShutdownGuard guard(owner());
  Indices found;
  try {
    _resolveIndicesForBook(book, found);
  } catch (const std::exception& exception) {
    ZEBLog(0, "%@", exception);
  }
  return found;
}

void ZEBIndexshelf::_resolveIndicesForBook(const std::shared_ptr<ZEBHelpBook>& book,
                                           Indices& found) {
  if (!book) {
    return;
  }
  {
    const platform::MonitorLock lock(_monitor);
    const auto known = _indices.find(book->bookID());
    if (known != _indices.end()) {
      found = known->second;
    }
  }
  if (!found.empty()) {
    return;
  }

  if (userLoggedIn()) {
    const auto path = _generatedIndexPathForBookID(book->bookID(), book->localization());
    if (const auto record = path ? ZEBIndex::indexWithPath(*path) : nullptr) {
      record->setBookID(book->bookID());
      record->setLoadedFromGeneratedCache(true);
      found = {record};
    }
  }
  const bool isRemote = book->type() == ZEBHelpBookType4;
  const std::vector<std::string> indexPaths = book->indexPaths();
  if (!isRemote && !indexPaths.empty()) {
    if (found.empty()) {
      if (const auto record = ZEBIndex::indexWithPath(indexPaths.front())) {
        record->setBookID(book->bookID());
        found = {record};
      }
    }
    if (!found.empty() && userLoggedIn()) {
      const auto operation = ZEBIndexFetchUpdateOperation::initWithIndexshelf(
          shared_from_this(), ZEBIndexFetchParameters{book, found.front()});
      const platform::MonitorLock lock(_indexFetchUpdateQueue->monitor());
      _indexFetchUpdateQueue->addOperation(operation);
    }
  }
  if (isRemote && userLoggedIn()) {
    _addIndexDownloadOperationForType4Book(book, found.empty() ? nullptr : found.back());
  } else if (found.empty() && userLoggedIn()) {
    const auto operation =
        ZEBIndexGenerationOperation::initWithBook(book, nullptr, shared_from_this(), false);
    const platform::MonitorLock lock(_monitor);
    _indexGeneratingQueue->addOperation(operation);
  }
  if (!found.empty()) {
    {
      const platform::MonitorLock lock(_monitor);
      _indices[book->bookID()] = found;
    }
    populateRemoteURLOfBook(book);
    _notifyObserversOfChange(ZEBIndexChangeAdded, found.front());
  }
}

void ZEBIndexshelf::populateRemoteURLOfBook(const std::shared_ptr<ZEBHelpBook>& book) {
  if (!book || book->remoteURL()) {
    return;
  }
  std::shared_ptr<ZEBIndex> only;
  {
    const platform::MonitorLock lock(_monitor);
    const auto known = _indices.find(book->bookID());
    if (known != _indices.end() && known->second.size() == 1) {
      only = known->second.front();
    }
  }
  const std::optional<std::string> root = only ? only->remoteRoot() : std::nullopt;
  const std::optional<platform::URL> escaped = root ? URLByEscapingString(*root) : std::nullopt;
  if (escaped) {
    book->setRemoteURL(platform::URL::URLWithString(escaped->absoluteString()));
  }
}
