#include <algorithm>
#include <atomic>
#include <utility>

#include "host/Zebrine/RNXBook.h"
#include "host/Zebrine/ZEBConstants.h"
#include "host/Zebrine/ZEBHelpBook.h"
#include "host/Zebrine/ZEBLog.h"
#include "host/Zebrine/ZEBPluginOwner.h"
#include "platform/Assertion.h"
#include "platform/Environment.h"
#include "platform/Files.h"
#include "plugin/operations/ZEBOperationQueue.h"
#include "plugin/records/ZEBIndex.h"
#include "plugin/remote/ZEBAssetDownloadOperation.h"
#include "plugin/remote/ZEBBookInfoDiscoveryOperation.h"
#include "plugin/remote/ZEBIndexFetchUpdateOperation.h"
#include "plugin/shelf/ZEBIndexshelf.h"

namespace {

void notifyOfModifications(const std::shared_ptr<ZEBPluginOwner>& owner,
                           const std::string& bookID) {
  if (owner) {
    owner->notifyBookshelfOfModificationsToBook(owner->bookWithID(bookID));
  }
}

/// What the service says of a book, as it is kept with the book.
platform::Value remoteBookInfo(const RNXBook& rnxBook) {
  const platform::Value& remoteSearchIndex =
      rnxBook.miscAttributes()[RNXBook::remoteSearchIndexKey];
  const platform::Value& remoteExactMatch = rnxBook.miscAttributes()[RNXBook::remoteExactMatchKey];
  platform::assertCondition(
      remoteSearchIndex.isAbsent() || remoteSearchIndex.urlIf() != nullptr,
      "(remoteSearchIndex == nil) || [remoteSearchIndex isKindOfClass:[NSURL class]]");
  platform::assertCondition(
      remoteExactMatch.isAbsent() || remoteExactMatch.urlIf() != nullptr,
      "(remoteExactMatch == nil) || [remoteExactMatch isKindOfClass:[NSURL class]]");
  platform::Value::Dictionary info;
  if (!remoteSearchIndex.isAbsent()) {
    info[ZEBBookIndexRemoteURLKey] = remoteSearchIndex;
  }
  if (!remoteExactMatch.isAbsent()) {
    info[ZEBBookEMRemoteURLKey] = remoteExactMatch;
  }
  if (rnxBook.locale()) {
    info[ZEBBookLocalizationKey] = *rnxBook.locale();
  }
  return info;
}

/// Runs a block once, at the latest when the operation that is to run it is over: a cancelled
/// operation never comes to it.
class FinishingOperation : public platform::BlockOperation {
 public:
  static std::shared_ptr<FinishingOperation> make(std::function<void()> block,
                                                  std::function<void()> completionHandler) {
    auto complete = [done = std::make_shared<std::atomic<bool>>(false),
                     handler = std::move(completionHandler)] {
      if (!done->exchange(true)) {
        handler();
      }
    };
    std::shared_ptr<FinishingOperation> operation(
        new FinishingOperation([block = std::move(block), complete] {
          block();
          complete();
        }));
    operation->setCompletionBlock(std::move(complete));
    return operation;
  }

 private:
  using BlockOperation::BlockOperation;
};

}  // namespace

void ZEBIndexshelf::_addIndexDownloadOperationForType4Book(
    const std::shared_ptr<ZEBHelpBook>& book, const std::shared_ptr<ZEBIndex>& existingIndex) {
  platform::assertCondition(book && book->type() == ZEBHelpBookType4,
                            "book.type == ZEBHelpBookType4");
  ZEBLog(3, "====== Start index downloading of type-4 book: %@", book->bookID());
  _indicesSyncQueue->barrierSync([&] {
    if (_indicesToBeDownloaded.contains(book->bookID())) {
      ZEBLog(4, "Index download for %@ already in progress", book->bookID());
      return;
    }
    if (const auto host = owner()) {
      host->disableShutdown();
    }
    if (existingIndex) {
      existingIndex->setIsDownloading(true);
    }
    const auto operation = ZEBBookInfoDiscoveryOperation::initWithBook(book);
    // The shelf is kept until the download has ended: whoever waits, and the guard, rely on that.
    operation->setCompletionBlock(
        [self = shared_from_this(), book, existingIndex, weak = std::weak_ptr(operation)] {
          self->_discoveryDidFinish(weak.lock(), book, existingIndex);
        });
    const auto sema = std::make_shared<platform::DispatchSemaphore>(0);
    platform::assertCondition(sema != nullptr, "sema != NULL");
    _indicesToBeDownloaded[book->bookID()] = sema;
    _indexDownloadQueue->addOperation(operation);
  });
}

void ZEBIndexshelf::_discoveryDidFinish(
    const std::shared_ptr<ZEBBookInfoDiscoveryOperation>& operation,
    const std::shared_ptr<ZEBHelpBook>& book, const std::shared_ptr<ZEBIndex>& existingIndex) {
  if (const auto error = operation ? operation->error() : std::nullopt) {
    ZEBLog(1, "Failed to make book request (%@): %@", book->bookID(), *error);
  } else if (const auto rnxBook = operation ? operation->rnxBook() : nullptr) {
    book->setRemoteBookInfo(remoteBookInfo(*rnxBook));
    notifyOfModifications(owner(), book->bookID());
  }
  _downloadAssetsForType4Book(book, existingIndex,
                              [self = shared_from_this(), book, existingIndex] {
                                self->_downloadDidFinish(book, existingIndex);
                              });
}

void ZEBIndexshelf::_downloadDidFinish(const std::shared_ptr<ZEBHelpBook>& book,
                                       const std::shared_ptr<ZEBIndex>& existingIndex) {
  _indicesSyncQueue->barrierSync([&] {
    ZEBLog(3, "====== Finished index downloading of type-4 book: %@", book->bookID());
    if (existingIndex) {
      existingIndex->setIsDownloading(false);
    }
    const auto found = _indicesToBeDownloaded.find(book->bookID());
    const auto sema = found == _indicesToBeDownloaded.end() ? nullptr : found->second;
    platform::assertCondition(sema != nullptr, "sema != NULL");
    _indicesToBeDownloaded.erase(found);
    sema->signal();
  });
  if (const auto host = owner()) {
    host->enableShutdown();
  }
}

void ZEBIndexshelf::_downloadAssetsForType4Book(const std::shared_ptr<ZEBHelpBook>& book,
                                                const std::shared_ptr<ZEBIndex>& existingIndex,
                                                std::function<void()> completionHandler) {
  const std::string& bookID = book->bookID();
  const platform::Value info = book->remoteBookInfo();
  const platform::URL* remoteSearchIndex = info[ZEBBookIndexRemoteURLKey].urlIf();
  const platform::URL* remoteExactMatch = info[ZEBBookEMRemoteURLKey].urlIf();
  const std::optional<std::string> localization = info[ZEBBookLocalizationKey].stringValue();

  const auto download =
      [&](const platform::URL* url,
          std::optional<std::string> destination) -> std::shared_ptr<ZEBAssetDownloadOperation> {
    if (url == nullptr) {
      return nullptr;
    }
    auto operation = ZEBAssetDownloadOperation::initWithBook(book, shared_from_this());
    operation->setRemoteURL(*url);
    operation->setDestinationFilePath(std::move(destination));
    return operation;
  };
  const auto searchIndexDownload =
      download(remoteSearchIndex, _generatedIndexPathForBookID(bookID, localization));
  const auto exactMatchDownload =
      download(remoteExactMatch, _generatedExactMatchPathForBookID(bookID, localization));

  const auto finishing = FinishingOperation::make(
      [self = shared_from_this(), book, existingIndex, searchIndexDownload, exactMatchDownload] {
        if (exactMatchDownload) {
          self->_exactMatchDownloadDidFinish(*exactMatchDownload, book);
        }
        if (searchIndexDownload) {
          self->_searchIndexDownloadDidFinish(*searchIndexDownload, book, existingIndex);
        }
      },
      std::move(completionHandler));
  for (const auto& operation : {searchIndexDownload, exactMatchDownload}) {
    if (operation) {
      finishing->addDependency(operation);
      _assetDownloadQueue->addOperation(operation);
    }
  }
  _assetDownloadQueue->addOperation(finishing);
}

void ZEBIndexshelf::_exactMatchDownloadDidFinish(const ZEBAssetDownloadOperation& download,
                                                 const std::shared_ptr<ZEBHelpBook>& book) {
  if (const auto error = download.error()) {
    ZEBLog(1, "Failed to download remote exactmatch.plist: %@", *error);
    return;
  }
  if (book->exactMatchPath() != download.destinationFilePath()) {
    book->setExactMatchPath(download.destinationFilePath());
    notifyOfModifications(owner(), book->bookID());
  }
}

void ZEBIndexshelf::_searchIndexDownloadDidFinish(const ZEBAssetDownloadOperation& download,
                                                  const std::shared_ptr<ZEBHelpBook>& book,
                                                  const std::shared_ptr<ZEBIndex>& existingIndex) {
  if (const auto error = download.error()) {
    ZEBLog(1, "Failed to download remote search index: %@", *error);
    return;
  }
  const std::optional<std::string> path = download.destinationFilePath();
  const std::shared_ptr<ZEBIndex> record = ZEBIndex::indexWithPath(path);
  if (!record) {
    // What was known of the book stays: an absent record is none to be searched or told of.
    return;
  }
  record->setBookID(book->bookID());
  record->setLoadedFromGeneratedCache(true);
  if (existingIndex && download.isUpdated()) {
    const auto data = platform::Environment::current()->files->contentsMappedAtPath(*path);
    const bool isRefilled = existingIndex->reinitializeWithData(data.value_or(platform::Data()));
    if (isRefilled && existingIndex->path() != path) {
      // The book is in another language now. What is remembered of a record over a restart is its
      // file, and that of before may have been written down meanwhile.
      (void)existingIndex->setPath(*path);
      archiveKnownIndices();
    }
    _notifyObserversOfChange(ZEBIndexChangeUpdated, record);
  } else {
    _addIndex(record, book->bookID());
    _notifyObserversOfChange(ZEBIndexChangeAdded, record);
  }
}

bool ZEBIndexshelf::isIndexDownloadingForBook(const std::shared_ptr<ZEBHelpBook>& book) {
  if (!book) {
    return false;
  }
  if (book->type() == ZEBHelpBookType4) {
    bool downloading = false;
    _indicesSyncQueue->sync([&] { downloading = _indicesToBeDownloaded.contains(book->bookID()); });
    return downloading;
  }
  const auto operations = _indexFetchUpdateQueue->operations();
  return std::any_of(operations.begin(), operations.end(), [&](const auto& operation) {
    const auto fetch = std::dynamic_pointer_cast<ZEBIndexFetchUpdateOperation>(operation);
    // The very string, not an equal one: another object of the same book has a fetch of its own.
    return fetch && fetch->bookID() == &book->bookID() && !fetch->isFinished();
  });
}

bool ZEBIndexshelf::waitForIndexDownloadCompletionForType4Book(
    const std::shared_ptr<ZEBHelpBook>& book, double timeout) {
  if (!book || book->type() != ZEBHelpBookType4) {
    return false;
  }
  std::shared_ptr<platform::DispatchSemaphore> semaphore;
  _indicesSyncQueue->sync([&] {
    const auto found = _indicesToBeDownloaded.find(book->bookID());
    if (found != _indicesToBeDownloaded.end()) {
      semaphore = found->second;
    }
  });
  if (!semaphore) {
    return false;
  }
  ZEBLog(3, "====== Waiting index download completion for %@", book->bookID());
  if (!semaphore->wait(platform::Seconds(timeout))) {
    ZEBLog(2, "====== Timed out waiting for index download completion for %@", book->bookID());
    return false;
  }
  return true;
}
