// Keeps a host's books those that there are.
#pragma once

#include <cstddef>
#include <cstdint>
#include <deque>
#include <functional>
#include <map>
#include <memory>
#include <optional>
#include <string>
#include <vector>

#include "platform/DistributedNotificationCenter.h"
#include "platform/FileLock.h"
#include "zebd/Catalogue.h"
#include "zebd/Subscriptions.h"

namespace zebd {

class Host;

/// What is to be looked for. As it stands: whatever has changed. Who asks for more than that waits
/// for it: the indexes of books that have changed are then made or fetched at once, and not when
/// the plug-in finds the time.
struct ScanRequest {
  struct Folder {
    std::string path;
    /// Absent: as the folder itself says, or else its name.
    std::optional<std::string> bookID;
  };

  /// Folders that are to become books, beside those that are books already.
  std::vector<Folder> folders;
  /// Whether the help folders of the computer are looked through.
  bool installedBooks = true;
  /// From now on in place of the former ones, where there are any; best first.
  std::vector<std::string> languages;
  /// Whether indexes are made anew even where pages have not changed.
  bool folderBooksEvenIfUnchanged = false;
  bool allBooksEvenIfUnchanged = false;
  /// Whether servers are asked for what has changed of books that are from there.
  bool asksServers = false;
  /// Changes the catalogue while nobody else does, before the books are brought in line with it.
  std::function<void(const Catalogue& catalogue)> change;

  /// Whether one scan will do for this request and others like it.
  bool isPlain() const {
    return folders.empty() && installedBooks && languages.empty() && !allBooksEvenIfUnchanged &&
           !asksServers && change == nullptr;
  }
};

/// What a scan has changed.
struct BookChanges {
  /// Books that are new, or whose pages are not what they were.
  size_t changed = 0;
  size_t unchanged = 0;
  size_t forgotten = 0;
  /// Books that could not be entered into the catalogue.
  size_t failed = 0;

  std::vector<std::string> changedBooks;
  /// The books of the folders that the request names.
  std::vector<std::string> folderBooks;
  /// Folders that are no books.
  std::vector<BookFailure> failures;
};

/// Brings the bookshelf, the catalogue and, through the plug-in, the indexes in line with the help
/// folders of the computer, whenever it is told to look. An index that is out of date is dropped
/// before the catalogue says otherwise, so what is cut short is done again.
///
/// Books are looked for on a thread of their own; everything else happens on the main thread, which
/// this is confined to.
class BookKeeper {
 public:
  struct Settings {
    /// Folders like /usr/share, the user's own first.
    std::vector<std::string> dataFolders;
    std::string catalogueFolder;
    /// Language tags, best first.
    std::vector<std::string> languages;
  };
  using Done = std::function<void(const BookChanges& changes)>;

  /// The host must outlive it.
  BookKeeper(Host& host, Settings settings);
  ~BookKeeper();
  BookKeeper(const BookKeeper&) = delete;
  BookKeeper& operator=(const BookKeeper&) = delete;

  /// Puts the books of the catalogue on the bookshelf and announces them: what was known when the
  /// host last ran can be searched at once.
  void begin();

  /// Looks for what has changed, after a scan that is under way. `done`, where there is one, is
  /// called on the main thread when the books are on the bookshelf and announced, and servers that
  /// are asked have answered; indexes are made after that.
  void scan(Done done) { scan({}, std::move(done)); }
  void scan(ScanRequest request, Done done);
  bool isScanning() const { return _isScanning; }
  /// Told of the end of each scan, whoever asked for it: what is to be watched may be other than
  /// before.
  void setScanObserver(std::function<void()> observer) { _scanned = std::move(observer); }

  /// Folders that are to be watched for books that come and go, and trees for pages that change.
  std::vector<std::string> watchedFolders() const;
  std::vector<std::string> watchedTrees() const;

  const Catalogue& catalogue() const { return _catalogue; }

 private:
  struct Found;
  struct Waiting {
    ScanRequest request;
    Done done;
  };

  void _startScan();
  void _apply(const std::shared_ptr<const Found>& found);
  void _applyLocked(const Found& found);
  void _enter(CatalogueEntry entry, bool evenIfUnchanged);
  void _forget(const std::string& bookID);
  void _askServers(std::function<void()> then);
  void _registerNow(const std::vector<std::string>& bookIDs, std::function<void()> then);
  void _registrationChanged(const std::string& bookID);
  void _store(const CatalogueEntry& entry);
  void _finishScanWhenDone();
  void _giveUpWaiting(uint64_t scan);

  Host& _host;
  Settings _settings;
  const Catalogue _catalogue;
  /// Lets what is posted to the main loop find out that this object is gone.
  const std::shared_ptr<BookKeeper*> _self;
  platform::DistributedNotificationCenter::Observation _observation;

  std::function<void()> _scanned;
  bool _isScanning = false;
  /// How many there were; tells what is left of an earlier one from what belongs to this.
  uint64_t _scanCount = 0;
  std::deque<Waiting> _waiting;
  ScanRequest _request;
  std::vector<Done> _current;
  BookChanges _changes;
  std::optional<platform::FileLock> _lock;
  /// The books as the plug-in was told of them: other programs change the catalogue as well.
  std::map<std::string, CatalogueEntry> _announced;
  /// Books whose old indexes are being dropped.
  std::map<std::string, CatalogueEntry> _dropping;
};

}  // namespace zebd
