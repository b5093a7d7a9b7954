// The registry of every index that the plug-in knows, by help book.
#pragma once

#include <atomic>
#include <cstdint>
#include <functional>
#include <map>
#include <memory>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include "platform/Clock.h"
#include "platform/DispatchQueue.h"
#include "platform/DistributedNotificationCenter.h"
#include "platform/ThreadSafety.h"
#include "platform/URL.h"
#include "platform/Value.h"

class ZEBAssetDownloadOperation;
class ZEBBookInfoDiscoveryOperation;
class ZEBHelpBook;
class ZEBIndex;
class ZEBOperationQueue;
class ZEBPluginOwner;

/// What happened to a book's index. A higher kind stands for a lower one where changes are merged.
enum ZEBIndexChange : int32_t {
  /// Resolved and stored for the first time, or a downloaded index was added.
  ZEBIndexChangeAdded = 1,
  ZEBIndexChangeRemoved = 2,
  /// An existing record was refilled with new data.
  ZEBIndexChangeUpdated = 3,
};

/// Hears of every index that comes, goes or changes.
class ZEBIndexshelfObserver {
 public:
  virtual ~ZEBIndexshelfObserver() = default;

  /// Called on the thread that made the change. A removal is told under the shelf's lock: do not
  /// wait there for another thread that uses the shelf.
  virtual void indexDidChange(const std::shared_ptr<ZEBIndex>& index, ZEBIndexChange didChange) = 0;
};

/// What an update fetch works on.
struct ZEBIndexFetchParameters {
  std::shared_ptr<ZEBHelpBook> book;
  std::shared_ptr<ZEBIndex> existingIndex;
};

/// The shelf keeps the index records of every book, remembers them over restarts in a cache file,
/// and runs the background work that keeps them current: registration, generation with the indexing
/// tool, fetching of updates, downloads. indicesForBook() is the one place that decides where a
/// book's index comes from.
///
/// Lock order: the shelf's monitor, then the observers' monitor or a queue's, then the locks of
/// records, books and properties. The monitor of the pending books is never held with another.
/// Thread-safety: internally synchronised.
class ZEBIndexshelf : public std::enable_shared_from_this<ZEBIndexshelf> {
 public:
  using Indices = std::vector<std::shared_ptr<ZEBIndex>>;

  /// Number of processors, 1 where that cannot be told.
  static int32_t processorCoreCount();

  /// The owner is not kept alive.
  static std::shared_ptr<ZEBIndexshelf> initWithOwner(const std::shared_ptr<ZEBPluginOwner>& owner);
  ~ZEBIndexshelf();
  ZEBIndexshelf(const ZEBIndexshelf&) = delete;
  ZEBIndexshelf& operator=(const ZEBIndexshelf&) = delete;

  /// Null once the owner is gone.
  std::shared_ptr<ZEBPluginOwner> owner() const { return _owner.lock(); }

  const std::shared_ptr<ZEBOperationQueue>& indexGeneratingQueue() const {
    return _indexGeneratingQueue;
  }
  const std::shared_ptr<ZEBOperationQueue>& indexRegistrationQueue() const {
    return _indexRegistrationQueue;
  }
  const std::shared_ptr<ZEBOperationQueue>& indexFetchUpdateQueue() const {
    return _indexFetchUpdateQueue;
  }
  const std::shared_ptr<ZEBOperationQueue>& indexDownloadQueue() const {
    return _indexDownloadQueue;
  }
  const std::shared_ptr<ZEBOperationQueue>& assetDownloadQueue() const {
    return _assetDownloadQueue;
  }

  /// Lazy: one index is generated at a time; otherwise as many as there are processors.
  bool shouldBeLazy() const { return _shouldBeLazy; }
  void setShouldBeLazy(bool shouldBeLazy);

  /// Most background work is done for a logged-in user only.
  bool userLoggedIn() const { return _userLoggedIn; }
  void setUserLoggedIn(bool userLoggedIn) { _userLoggedIn = userLoggedIn; }

  /// The observer is kept for the life of the shelf, and told once for each time that it was added.
  void addObserver(const std::shared_ptr<ZEBIndexshelfObserver>& observer);

  // Registration and resolution (ZEBIndexshelf+Registration.cpp).

  /// Has the book registered in the background, at leisure. The book may be null.
  void addRegistrationOperationForBook(const std::shared_ptr<ZEBHelpBook>& book);
  /// Registers the book now if it is still waiting to be; otherwise does nothing.
  void ensureRegistrationForBook(const std::shared_ptr<ZEBHelpBook>& book);
  /// The book's records; none when there are none yet, with the work that will bring one queued.
  Indices indicesForBook(const std::shared_ptr<ZEBHelpBook>& book);
  /// Gives a book without a remote URL the remote root of its only index.
  void populateRemoteURLOfBook(const std::shared_ptr<ZEBHelpBook>& book);

  // Maintenance (ZEBIndexshelf+Maintenance.cpp).

  /// Forgets a book's index and deletes what was generated for it. Observers are told under the
  /// shelf's lock, also about a book that the shelf does not know.
  void removeIndexForBookID(const std::string& bookID);
  void clearIndexCache();

  // Remote books (plugin/remote).

  /// Whether a download of a type-4 book, or the start of a fetch of this very object of another
  /// book, is under way.
  bool isIndexDownloadingForBook(const std::shared_ptr<ZEBHelpBook>& book);
  /// Whether a download of a type-4 book that is under way ended within `timeout` seconds. One
  /// waiter is told of each download, and those who come after its end wait for nothing.
  bool waitForIndexDownloadCompletionForType4Book(const std::shared_ptr<ZEBHelpBook>& book,
                                                  double timeout);

  // Internal: used by the shelf's operations, the rest of the plug-in's own machinery, and tests.

  /// The records known now.
  std::map<std::string, Indices> _knownIndices() const;
  size_t _pendingBookCount() const;
  std::optional<std::string> _helpIndexCachePath() const;
  platform::Monitor& _shelfMonitor() RETURN_CAPABILITY(_monitor) { return _monitor; }

  void _notifyObserversOfChange(ZEBIndexChange change, const std::shared_ptr<ZEBIndex>& forIndex);
  void _addIndex(const std::shared_ptr<ZEBIndex>& index, const std::string& forBookID);
  // Where a book's generated files lie; absent without an identifier or a caches folder.
  std::optional<std::string> _generatedIndexPathForBookID(
      const std::optional<std::string>& bookID, const std::optional<std::string>& withLocalization);
  std::optional<std::string> _generatedExactMatchPathForBookID(
      const std::optional<std::string>& bookID, const std::optional<std::string>& withLocalization);
  std::optional<std::string> _generatedFilePathForBookID(
      const std::optional<std::string>& bookID, const std::optional<std::string>& withLocalization,
      std::string_view andExtension);

  void archiveKnownIndices();
  /// Absent when there is no cache file, or none that is fresh, readable and of the user's
  /// language.
  std::optional<std::map<std::string, Indices>> unarchiveKnownIndices();
  static bool _validateHelpIndexCacheVersion(const std::optional<std::string>& version,
                                             const std::optional<std::string>& language);

  void _registerNextBook();
  void _registerBook(const std::shared_ptr<ZEBHelpBook>& book);

  std::shared_ptr<ZEBIndex> _generateIndexForBook(const std::shared_ptr<ZEBHelpBook>& book,
                                                  const std::optional<std::string>& atPath,
                                                  bool onlyGenerateLUXIndex);

  void _helpBookDidChange(const platform::DistributedNotification& notification);
  void _resetForLanguageChange();

  /// Has the book's information, then its index and exact-match list, downloaded in the background,
  /// unless that is under way. The shelf lives at least until the download has ended. The record
  /// that the shelf has of the book, if any, counts as being downloaded meanwhile.
  void _addIndexDownloadOperationForType4Book(const std::shared_ptr<ZEBHelpBook>& book,
                                              const std::shared_ptr<ZEBIndex>& existingIndex);
  /// Downloads what the book's remote information names, and takes it over. The completion runs
  /// once, when all of that has ended, in whatever way.
  void _downloadAssetsForType4Book(const std::shared_ptr<ZEBHelpBook>& book,
                                   const std::shared_ptr<ZEBIndex>& existingIndex,
                                   std::function<void()> completionHandler);
  /// Looks for a newer version of the book's first index on the server. On the main thread.
  void _startFetchingUpdatedIndexForType3BookWithParams(const ZEBIndexFetchParameters& params);
  /// Begins to fetch an index that is to take the place of the record's contents. False, and
  /// nothing done, for a URL that cannot be asked for and without a record.
  bool _startIndexFetch(const platform::URL& url, platform::Seconds timeout,
                        const std::shared_ptr<ZEBHelpBook>& book,
                        const std::shared_ptr<ZEBIndex>& existingIndex);
  /// Has semantic data made for a record that has none.
  void _generateSemanticIndexIfMissing(const std::shared_ptr<ZEBHelpBook>& book,
                                       const std::shared_ptr<ZEBIndex>& existingIndex);

 private:
  explicit ZEBIndexshelf(const std::shared_ptr<ZEBPluginOwner>& owner) : _owner(owner) {}
  void _setUp();
  void _resolveIndicesForBook(const std::shared_ptr<ZEBHelpBook>& book, Indices& found);
  void _discoveryDidFinish(const std::shared_ptr<ZEBBookInfoDiscoveryOperation>& operation,
                           const std::shared_ptr<ZEBHelpBook>& book,
                           const std::shared_ptr<ZEBIndex>& existingIndex);
  void _exactMatchDownloadDidFinish(const ZEBAssetDownloadOperation& download,
                                    const std::shared_ptr<ZEBHelpBook>& book);
  void _searchIndexDownloadDidFinish(const ZEBAssetDownloadOperation& download,
                                     const std::shared_ptr<ZEBHelpBook>& book,
                                     const std::shared_ptr<ZEBIndex>& existingIndex);
  void _downloadDidFinish(const std::shared_ptr<ZEBHelpBook>& book,
                          const std::shared_ptr<ZEBIndex>& existingIndex);

  const std::weak_ptr<ZEBPluginOwner> _owner;

  mutable platform::Monitor _monitor;
  std::map<std::string, Indices> _indices GUARDED_BY(_monitor);
  std::optional<std::string> _cachePath GUARDED_BY(_monitor);

  mutable platform::Monitor _changeObserversMonitor;
  std::vector<std::shared_ptr<ZEBIndexshelfObserver>> _changeObservers
      GUARDED_BY(_changeObserversMonitor);

  mutable platform::Monitor _pendingMonitor;
  std::map<std::string, std::shared_ptr<ZEBHelpBook>> _booksToBeRegistered
      GUARDED_BY(_pendingMonitor);

  platform::Mutex _generatedIndexDirMutex;
  std::optional<std::string> _generatedIndexDir GUARDED_BY(_generatedIndexDirMutex);

  std::shared_ptr<ZEBOperationQueue> _indexGeneratingQueue;
  std::shared_ptr<ZEBOperationQueue> _indexRegistrationQueue;
  std::shared_ptr<ZEBOperationQueue> _indexFetchUpdateQueue;
  std::shared_ptr<ZEBOperationQueue> _indexDownloadQueue;
  std::shared_ptr<ZEBOperationQueue> _assetDownloadQueue;

  // Downloads under way, by book identifier; touched only by blocks on the sync queue.
  std::map<std::string, std::shared_ptr<platform::DispatchSemaphore>> _indicesToBeDownloaded;
  std::shared_ptr<platform::DispatchQueue> _indicesSyncQueue;

  // Held over the change of flag and limit, so that two changes at once leave them in step.
  platform::Mutex _lazyMutex;
  std::atomic<bool> _shouldBeLazy{true};
  std::atomic<bool> _userLoggedIn{false};
  platform::DistributedNotificationCenter::Observation _registrationObservation;
};
