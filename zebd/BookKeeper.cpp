#include "zebd/BookKeeper.h"

#include <algorithm>
#include <set>
#include <utility>

#include "host/Zebrine/ZEBConstants.h"
#include "host/Zebrine/ZEBHelpBook.h"
#include "host/Zebrine/ZEBLog.h"
#include "host/Zebrine/ZEBPlugin.h"
#include "platform/AbandonedFiles.h"
#include "platform/Environment.h"
#include "platform/RunLoop.h"
#include "platform/WorkerThreads.h"
#include "zebd/BookDiscovery.h"
#include "zebd/BookFolder.h"
#include "zebd/Host.h"

namespace zebd {

namespace {

/// Another program that changes the catalogue has it for as long as its indexes take.
constexpr platform::Seconds lockPace{1};
/// The news of a changed book goes over the bus and back.
constexpr platform::Seconds newsLimit{5};

}  // namespace

struct BookKeeper::Found {
  std::vector<CatalogueEntry> books;
  std::vector<CatalogueEntry> gone;
  /// False when looking broke off: then what is missing here may well be there.
  bool isComplete = false;
};

BookKeeper::BookKeeper(Host& host, Settings settings)
    : _host(host),
      _settings(std::move(settings)),
      _catalogue(_settings.catalogueFolder),
      _self(std::make_shared<BookKeeper*>(this)) {
  // The plug-in, which was there before, hears of a book before this does.
  _observation = platform::Environment::current()->notificationCenter->addObserver(
      QWBookRegistrationNotification,
      [weak = std::weak_ptr<BookKeeper*>(_self)](const auto& notification) {
        if (const auto self = weak.lock(); self && notification.object) {
          (*self)->_registrationChanged(*notification.object);
        }
      });
}

BookKeeper::~BookKeeper() = default;

void BookKeeper::begin() {
  // Of a host that was killed.
  platform::removeAbandonedFiles(_catalogue.folder());
  for (const CatalogueEntry& entry : _catalogue.entries()) {
    _host.bookshelf().addBook(bookOfEntry(entry));
    _announced[entry.bookID] = entry;
  }
  _host.announceBooks();
}

void BookKeeper::scan(Done done) {
  _waiting.push_back(std::move(done));
  if (!_isScanning) {
    _startScan();
  }
}

void BookKeeper::_startScan() {
  _isScanning = true;
  _current = std::exchange(_waiting, {});
  _changes = {};
  _host.owner().disableShutdown();
  platform::startNamedThread("book-scan", [weak = std::weak_ptr<BookKeeper*>(_self),
                                           settings = _settings, catalogue = _catalogue] {
    const auto found = std::make_shared<Found>();
    platform::runLoggingExceptions([&] {
      BookDiscovery discovery([](const std::string& folder, const std::string& reason) {
        ZEBLog(4, "Passed over %@: %@", folder, reason);
      });
      discovery.addInstalled(settings.dataFolders, settings.languages);
      found->gone = discovery.addKnown(catalogue);
      found->books = discovery.books();
      found->isComplete = true;
    });
    platform::RunLoop::main()->perform([weak, found] {
      if (const auto self = weak.lock()) {
        (*self)->_apply(found);
      }
    });
  });
}

void BookKeeper::_apply(const std::shared_ptr<const Found>& found) {
  if (!found->isComplete) {
    ++_changes.failed;
    _finishScanWhenDone();
    return;
  }
  (void)platform::Environment::current()->files->createDirectoryWithParents(_catalogue.folder());
  _lock = platform::FileLock::tryLock(_catalogue.folder() + ".lock");
  if (!_lock && platform::Environment::current()->files->fileExistsAtPath(_catalogue.folder())) {
    platform::RunLoop::main()->performAfterDelay(lockPace,
                                                 [weak = std::weak_ptr<BookKeeper*>(_self), found] {
                                                   if (const auto self = weak.lock()) {
                                                     (*self)->_apply(found);
                                                   }
                                                 });
    return;
  }
  _applyLocked(*found);
  if (!_dropping.empty()) {
    platform::RunLoop::main()->performAfterDelay(newsLimit,
                                                 [weak = std::weak_ptr<BookKeeper*>(_self)] {
                                                   if (const auto self = weak.lock()) {
                                                     (*self)->_giveUpWaiting();
                                                   }
                                                 });
  }
  _finishScanWhenDone();
}

void BookKeeper::_applyLocked(const Found& found) {
  std::set<std::string> known;
  for (const CatalogueEntry& entry : found.books) {
    known.insert(entry.bookID);
    _enter(entry, _changes);
  }
  for (const CatalogueEntry& entry : _catalogue.entries()) {
    if (entry.isRemote() && known.insert(entry.bookID).second) {
      _enter(entry, _changes);
    }
  }
  for (const CatalogueEntry& entry : found.gone) {
    _catalogue.remove(entry.bookID);
  }
  for (const auto& book : _host.bookshelf().books()) {
    if (!known.contains(book.first)) {
      _forget(book.first, _changes);
    }
  }
}

void BookKeeper::_enter(CatalogueEntry entry, BookChanges& changes) {
  const std::optional<CatalogueEntry> former = _catalogue.entry(entry.bookID);
  if (former && entry.type == ZEBHelpBookType3) {
    // The folder does not say that the user subscribed.
    entry.catalogueURL = former->catalogueURL;
  }
  const auto announced = _announced.find(entry.bookID);
  const bool isOnShelf = announced != _announced.end();
  if (former == entry && isOnShelf && announced->second == entry) {
    ++changes.unchanged;
    return;
  }
  const auto book = bookOfEntry(entry);
  if (book == nullptr) {
    ++changes.failed;
    return;
  }
  ++changes.changed;
  _host.bookshelf().addBook(book);
  const bool isNewToUs = former == entry && !isOnShelf;
  if (!isNewToUs && (former || isOnShelf || indexPathOfBook(*book))) {
    // What is remembered of a book by this name may be its index in another language or place.
    _dropping[entry.bookID] = entry;
    platform::Environment::current()->notificationCenter->postNotification(
        QWBookRegistrationNotification, entry.bookID);
  } else {
    _store(entry);
  }
}

void BookKeeper::_forget(const std::string& bookID, BookChanges& changes) {
  ++changes.forgotten;
  _host.removeIndexOfBook(bookID);
  _host.bookshelf().removeBook(bookID);
  _announced.erase(bookID);
}

void BookKeeper::_registrationChanged(const std::string& bookID) {
  const auto dropped = _dropping.find(bookID);
  if (dropped == _dropping.end()) {
    // Somebody else had the index dropped.
    _host.plugin()->finishPopulatingBookWithID(bookID);
    return;
  }
  const CatalogueEntry entry = std::move(dropped->second);
  _dropping.erase(dropped);
  _store(entry);
  _finishScanWhenDone();
}

void BookKeeper::_store(const CatalogueEntry& entry) {
  if (const auto error = _catalogue.store(entry)) {
    ZEBLog(1, "Cannot remember the book %@: %@", entry.bookID, error->description);
    ++_changes.failed;
  }
  _announced[entry.bookID] = entry;
  _host.plugin()->finishPopulatingBookWithID(entry.bookID);
}

void BookKeeper::_giveUpWaiting() {
  const auto dropping = std::exchange(_dropping, {});
  for (const auto& dropped : dropping) {
    ZEBLog(1, "No news of the book %@ came back", dropped.first);
    _host.plugin()->removeIndexForBookWithID(dropped.first);
    ++_changes.failed;
  }
  _finishScanWhenDone();
}

void BookKeeper::_finishScanWhenDone() {
  if (!_isScanning || !_dropping.empty()) {
    return;
  }
  _isScanning = false;
  _lock.reset();
  const BookChanges changes = _changes;
  ZEBLog(3, "Books: %@",
         std::to_string(changes.changed) + " changed, " + std::to_string(changes.unchanged) +
             " unchanged, " + std::to_string(changes.forgotten) + " forgotten, " +
             std::to_string(changes.failed) + " failed");
  for (const Done& done : std::exchange(_current, {})) {
    if (done) {
      done(changes);
    }
  }
  _host.owner().enableShutdown();
  if (!_waiting.empty()) {
    _startScan();
  }
}

std::vector<std::string> BookKeeper::watchedFolders() const {
  std::vector<std::string> folders = placesOfHelpFolders(_settings.dataFolders);
  folders.push_back(_catalogue.folder());
  return folders;
}

std::vector<std::string> BookKeeper::watchedTrees() const {
  std::vector<std::string> trees;
  for (const CatalogueEntry& entry : _catalogue.entries()) {
    if (!entry.isRemote()) {
      trees.push_back(entry.folder);
    }
  }
  return trees;
}

}  // namespace zebd
