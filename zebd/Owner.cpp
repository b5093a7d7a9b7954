#include "zebd/Owner.h"

#include <utility>

#include "host/Zebrine/RNXObjectManager.h"
#include "host/Zebrine/ZEBHelpBook.h"
#include "host/Zebrine/ZEBLog.h"
#include "host/Zebrine/ZEBQuery.h"
#include "platform/Environment.h"
#include "platform/OperationQueue.h"
#include "platform/Value.h"

namespace zebd {

namespace {

platform::Clock::Instant elapsedNow() { return platform::Environment::current()->clock->elapsed(); }

}  // namespace

Owner::Owner(std::shared_ptr<Bookshelf> bookshelf, OwnerSettings settings)
    : _bookshelf(std::move(bookshelf)),
      _userHelpCachesDirectoryPath(std::move(settings.userHelpCachesDirectoryPath)),
      _userLoggedIn(settings.userLoggedIn),
      _shouldBeLazy(settings.shouldBeLazy),
      _quietSince(elapsedNow()) {}

bool Owner::isOnline() const { return platform::Environment::current()->networkIsReachable(); }

std::map<std::string, std::shared_ptr<ZEBHelpBook>> Owner::knownBooks() const {
  return _bookshelf->books();
}

std::shared_ptr<ZEBHelpBook> Owner::bookWithID(const std::string& bookID) const {
  return _bookshelf->bookWithID(bookID);
}

void Owner::setBookModifiedHandler(BookModified handler) {
  const platform::MutexLock lock(_handlerMutex);
  _bookModified = std::move(handler);
}

void Owner::notifyBookshelfOfModificationsToBook(const std::shared_ptr<ZEBHelpBook>& book) {
  // What has come may be the index in the language that the book was waiting for.
  RNXObjectManager::sharedObjectManager()->takeLocalization(book);
  BookModified handler;
  {
    const platform::MutexLock lock(_handlerMutex);
    handler = _bookModified;
  }
  if (handler) {
    handler(book);
  }
}

void Owner::disableShutdown() { _changeGuardCount(1); }

void Owner::enableShutdown() { _changeGuardCount(-1); }

void Owner::_changeGuardCount(int64_t change) {
  const platform::Clock::Instant now = elapsedNow();
  int64_t count = 0;
  {
    const platform::MutexLock lock(_guardMutex);
    count = _guardCount += change;
    if (count == 0) {
      _quietSince = now;
    }
  }
  if (count < 0) {
    ZEBLog(1, "enableShutdown without disableShutdown");
  }
}

int64_t Owner::shutdownGuardCount() const {
  const platform::MutexLock lock(_guardMutex);
  return _guardCount;
}

bool Owner::isQuietFor(platform::Seconds span) const {
  const platform::Clock::Instant now = elapsedNow();
  // What waits for a thread holds no guard yet.
  const bool isUnderWay = platform::OperationQueue::unfinishedOperationCount() > 0;
  const platform::MutexLock lock(_guardMutex);
  return !isUnderWay && _guardCount == 0 && now - _quietSince >= span;
}

void Owner::setIdleTimeOutDelay(const platform::Value& delay) {
  const double seconds = delay.doubleValue();
  const platform::MutexLock lock(_guardMutex);
  _idleTimeOutDelay =
      seconds > 0 ? std::optional<platform::Seconds>(platform::Seconds(seconds)) : std::nullopt;
}

std::optional<platform::Seconds> Owner::idleTimeOutDelay() const {
  const platform::MutexLock lock(_guardMutex);
  return _idleTimeOutDelay;
}

void Owner::beginSearch(const std::string& queryID, std::shared_ptr<SearchReceiver> receiver) {
  const platform::MutexLock lock(_searchMutex);
  _searches[queryID] = {std::move(receiver), false};
}

void Owner::endSearch(const std::string& queryID) {
  Search ended;
  {
    const platform::MutexLock lock(_searchMutex);
    const auto found = _searches.find(queryID);
    if (found == _searches.end()) {
      return;
    }
    ended = std::move(found->second);
    _searches.erase(found);
  }
  ended.receiver->searchEnded(ended.finished);
}

void Owner::pluginFoundResults(const std::shared_ptr<ZEBPlugin>& /*plugin*/,
                               const ZEBResultBatch& foundResults,
                               const std::shared_ptr<ZEBQuery>& forQuery) {
  if (forQuery == nullptr) {
    return;
  }
  std::shared_ptr<SearchReceiver> receiver;
  {
    const platform::MutexLock lock(_searchMutex);
    const auto found = _searches.find(forQuery->queryID());
    if (found != _searches.end()) {
      receiver = found->second.receiver;
    }
  }
  if (receiver != nullptr) {
    receiver->foundResults(foundResults);
  }
}

void Owner::pluginFinishedSearchingForQuery(const std::shared_ptr<ZEBPlugin>& /*plugin*/,
                                            const std::shared_ptr<ZEBQuery>& query) {
  if (query == nullptr) {
    return;
  }
  const platform::MutexLock lock(_searchMutex);
  const auto found = _searches.find(query->queryID());
  if (found != _searches.end()) {
    found->second.finished = true;
  }
}

}  // namespace zebd
