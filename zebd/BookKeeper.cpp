#include "zebd/BookKeeper.h"

#include <algorithm>
#include <set>
#include <utility>

#include "host/Zebrine/RNXObjectManager.h"
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

/// Keeps the host from leaving until books are registered, and says so then on the main thread.
class Registration : public SearchReceiver {
 public:
  Registration(Owner& owner, std::function<void()> then) : _owner(owner), _then(std::move(then)) {
    _owner.disableShutdown();
  }

  void foundResults(const ZEBResultBatch& /*batch*/) override {}
  void searchEnded(bool /*finished*/) override {
    platform::RunLoop::main()->perform(std::move(_then));
    _owner.enableShutdown();
  }

 private:
  Owner& _owner;
  std::function<void()> _then;
};

}  // namespace

struct BookKeeper::Found {
  std::vector<CatalogueEntry> books;
  /// Of the folders that the request names.
  std::vector<std::string> folderBooks;
  std::vector<BookFailure> failures;
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

void BookKeeper::scan(ScanRequest request, Done done) {
  _waiting.push_back({std::move(request), std::move(done)});
  if (!_isScanning) {
    _startScan();
  }
}

void BookKeeper::_startScan() {
  _isScanning = true;
  ++_scanCount;
  _changes = {};
  do {
    _request = std::move(_waiting.front().request);
    _current.push_back(std::move(_waiting.front().done));
    _waiting.pop_front();
  } while (_request.isPlain() && !_waiting.empty() && _waiting.front().request.isPlain());
  if (!_request.languages.empty()) {
    _settings.languages = _request.languages;
  }
  _host.owner().disableShutdown();
  platform::startNamedThread(
      "book-scan",
      [weak = std::weak_ptr<BookKeeper*>(_self), settings = _settings, folders = _request.folders,
       installedBooks = _request.installedBooks, catalogue = _catalogue] {
        const auto found = std::make_shared<Found>();
        platform::runLoggingExceptions([&] {
          BookDiscovery discovery([](const std::string& folder, const std::string& reason) {
            ZEBLog(4, "Passed over %@: %@", folder, reason);
          });
          for (const ScanRequest::Folder& folder : folders) {
            std::string reason;
            if (auto bookID = discovery.add(folder.path, folder.bookID, {}, reason)) {
              found->folderBooks.push_back(std::move(*bookID));
            } else {
              found->failures.push_back({folder.path, reason});
            }
          }
          if (installedBooks) {
            discovery.addInstalled(settings.dataFolders, settings.languages);
          }
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
  bool isHeld = false;
  _lock = platform::FileLock::tryLock(_catalogue.lockPath(), &isHeld);
  // Where no lock can be had it goes on without: what then fails says so itself.
  if (isHeld) {
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
    platform::RunLoop::main()->performAfterDelay(
        newsLimit, [weak = std::weak_ptr<BookKeeper*>(_self), scan = _scanCount] {
          if (const auto self = weak.lock()) {
            (*self)->_giveUpWaiting(scan);
          }
        });
  }
  _finishScanWhenDone();
}

void BookKeeper::_applyLocked(const Found& found) {
  if (_request.change) {
    _request.change(_catalogue);
  }
  _changes.folderBooks = found.folderBooks;
  _changes.failures = found.failures;
  const std::set<std::string> ofFolders(found.folderBooks.begin(), found.folderBooks.end());
  std::set<std::string> known;
  for (const CatalogueEntry& entry : found.books) {
    known.insert(entry.bookID);
    _enter(entry, _request.allBooksEvenIfUnchanged ||
                      (_request.folderBooksEvenIfUnchanged && ofFolders.contains(entry.bookID)));
  }
  for (const CatalogueEntry& entry : _catalogue.entries()) {
    if (entry.isRemote() && known.insert(entry.bookID).second) {
      _enter(entry, false);
    }
  }
  for (const CatalogueEntry& entry : found.gone) {
    if (const auto error = _catalogue.remove(entry.bookID)) {
      ZEBLog(1, "Cannot forget the book %@: %@", entry.bookID, error->description);
      ++_changes.failed;
    }
  }
  for (const auto& book : _host.bookshelf().books()) {
    if (!known.contains(book.first)) {
      _forget(book.first);
    }
  }
}

void BookKeeper::_enter(CatalogueEntry entry, bool evenIfUnchanged) {
  const std::optional<CatalogueEntry> former = _catalogue.entry(entry.bookID);
  if (former && entry.type == ZEBHelpBookType3) {
    // The folder does not say that the user subscribed.
    entry.catalogueURL = former->catalogueURL;
  }
  const auto announced = _announced.find(entry.bookID);
  const bool isOnShelf = announced != _announced.end();
  if (former == entry && isOnShelf && announced->second == entry && !evenIfUnchanged) {
    ++_changes.unchanged;
    return;
  }
  const auto book = bookOfEntry(entry);
  if (book == nullptr) {
    ++_changes.failed;
    return;
  }
  ++_changes.changed;
  _changes.changedBooks.push_back(entry.bookID);
  _host.bookshelf().addBook(book);
  const bool isNewToUs = former == entry && !isOnShelf && !evenIfUnchanged;
  if (!isNewToUs && (former || isOnShelf || indexPathOfBook(*book))) {
    // What is remembered of a book by this name may be its index in another language or place.
    _dropping[entry.bookID] = entry;
    platform::Environment::current()->notificationCenter->postNotification(
        QWBookRegistrationNotification, entry.bookID);
  } else {
    _store(entry);
  }
}

void BookKeeper::_forget(const std::string& bookID) {
  ++_changes.forgotten;
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
  if (_request.isPlain()) {
    _host.plugin()->finishPopulatingBookWithID(entry.bookID);
  }
  // Others are registered at once when the scan ends. Announced as well, a book would be indexed
  // once for each.
}

void BookKeeper::_giveUpWaiting(uint64_t scan) {
  if (scan != _scanCount) {
    return;
  }
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
  const ScanRequest request = std::exchange(_request, {});
  const BookChanges changes = std::exchange(_changes, {});
  if (!request.isPlain()) {
    // Those that have changed, and those whose turn has not come yet.
    std::vector<std::string> bookIDs = changes.changedBooks;
    for (const auto& book : _host.bookshelf().books()) {
      if (!indexPathOfBook(*book.second)) {
        bookIDs.push_back(book.first);
      }
    }
    _registerNow(bookIDs, [] {});
  }
  ZEBLog(3, "Books: %@",
         std::to_string(changes.changed) + " changed, " + std::to_string(changes.unchanged) +
             " unchanged, " + std::to_string(changes.forgotten) + " forgotten, " +
             std::to_string(changes.failed) + " failed");
  const auto tell = [told = std::exchange(_current, {}), changes] {
    for (const Done& done : told) {
      if (done) {
        // Whatever becomes of one, the others are told, and the guard is given back.
        platform::runLoggingExceptions([&] { done(changes); });
      }
    }
  };
  if (request.asksServers) {
    _askServers(tell);
  } else {
    tell();
  }
  if (_scanned) {
    platform::runLoggingExceptions(_scanned);
  }
  _host.owner().enableShutdown();
  // One of them may have begun the next scan.
  if (!_isScanning && !_waiting.empty()) {
    _startScan();
  }
}

void BookKeeper::_registerNow(const std::vector<std::string>& bookIDs, std::function<void()> then) {
  if (bookIDs.empty()) {
    // That would mean all.
    then();
    return;
  }
  _host.registerBooks(bookIDs, std::make_shared<Registration>(_host.owner(), std::move(then)));
}

/// The plug-in asks servers when it looks at a book, and goes by what is known of the catalogues
/// then.
void BookKeeper::_askServers(std::function<void()> then) {
  std::set<std::string> addresses;
  std::vector<std::string> bookIDs;
  for (const auto& announced : _announced) {
    const CatalogueEntry& entry = announced.second;
    bookIDs.push_back(entry.bookID);
    if (entry.catalogueURL) {
      addresses.insert(*entry.catalogueURL);
    }
  }
  if (addresses.empty()) {
    then();
    return;
  }
  // Gives the guard back when the last answer has come, whatever it says.
  const std::shared_ptr<void> all(nullptr, [weak = std::weak_ptr<BookKeeper*>(_self), bookIDs,
                                            then = std::move(then)](const void* /*nothing*/) {
    platform::RunLoop::main()->perform([weak, bookIDs, then] {
      if (const auto self = weak.lock()) {
        forgetKnownIndices();
        (*self)->_host.lookAtBooksAnew();
        // Whoever waits for the servers' books would have to wait for the turns of all others.
        (*self)->_registerNow(bookIDs, then);
        (*self)->_host.owner().enableShutdown();
      }
    });
  });
  _host.owner().disableShutdown();
  for (const std::string& address : addresses) {
    if (const auto url = platform::URL::URLWithString(address)) {
      RNXObjectManager::sharedObjectManager()->loadCatalogue(
          *url, [all](const std::shared_ptr<const RNXCatalogue>& /*catalogue*/,
                      const std::optional<platform::Error>& /*error*/) {});
    }
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
