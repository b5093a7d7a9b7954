// Keeps a host's books those that there are.
#pragma once

#include <cstddef>
#include <functional>
#include <map>
#include <memory>
#include <optional>
#include <string>
#include <vector>

#include "platform/DistributedNotificationCenter.h"
#include "platform/FileLock.h"
#include "zebd/Catalogue.h"

namespace zebd {

class Host;

/// What a scan has changed.
struct BookChanges {
  /// Books that are new, or whose pages are not what they were.
  size_t changed = 0;
  size_t unchanged = 0;
  size_t forgotten = 0;
  /// Books that could not be entered into the catalogue.
  size_t failed = 0;
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
  /// called on the main thread when the books are on the bookshelf and announced; their indexes are
  /// made after that.
  void scan(Done done);
  bool isScanning() const { return _isScanning; }

  /// Folders that are to be watched for books that come and go, and trees for pages that change.
  std::vector<std::string> watchedFolders() const;
  std::vector<std::string> watchedTrees() const;

  const Catalogue& catalogue() const { return _catalogue; }

 private:
  struct Found;

  void _startScan();
  void _apply(const std::shared_ptr<const Found>& found);
  void _applyLocked(const Found& found);
  void _enter(CatalogueEntry entry, BookChanges& changes);
  void _forget(const std::string& bookID, BookChanges& changes);
  void _registrationChanged(const std::string& bookID);
  void _store(const CatalogueEntry& entry);
  void _finishScanWhenDone();
  void _giveUpWaiting();

  Host& _host;
  const Settings _settings;
  const Catalogue _catalogue;
  /// Lets what is posted to the main loop find out that this object is gone.
  const std::shared_ptr<BookKeeper*> _self;
  platform::DistributedNotificationCenter::Observation _observation;

  bool _isScanning = false;
  std::vector<Done> _waiting;
  std::vector<Done> _current;
  BookChanges _changes;
  std::optional<platform::FileLock> _lock;
  /// The books as the plug-in was told of them: other programs change the catalogue as well.
  std::map<std::string, CatalogueEntry> _announced;
  /// Books whose old indexes are being dropped.
  std::map<std::string, CatalogueEntry> _dropping;
};

}  // namespace zebd
