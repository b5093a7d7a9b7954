#include <algorithm>

#include "host/Zebrine/ZEBConstants.h"
#include "host/Zebrine/ZEBHelpBook.h"
#include "host/Zebrine/ZEBLog.h"
#include "platform/Assertion.h"
#include "plugin/operations/ZEBOperationQueue.h"
#include "plugin/remote/ZEBIndexFetchUpdateOperation.h"
#include "plugin/shelf/ZEBIndexshelf.h"

void ZEBIndexshelf::_addIndexDownloadOperationForType4Book(
    const std::shared_ptr<ZEBHelpBook>& book, const std::shared_ptr<ZEBIndex>& /*existingIndex*/) {
  platform::assertCondition(book->type() == ZEBHelpBookType4, "book.type == ZEBHelpBookType4");
  // There is no content service to ask yet, so no download begins and none is ever under way.
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
