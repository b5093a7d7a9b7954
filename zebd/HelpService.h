// What a help daemon does for its clients, whatever they are connected by.
#pragma once

#include <cstdint>
#include <functional>
#include <memory>
#include <optional>
#include <string>
#include <utility>
#include <vector>

#include "zebd/BookKeeper.h"
#include "zebd/ClientSearches.h"
#include "zebd/FolderWatcher.h"
#include "zebd/Host.h"

struct RNXCatalogue;

namespace zebd {

/// A book as clients are told of it.
struct BookStatus {
  std::string bookID;
  std::string title;
  std::string language;
  std::string folder;
  int32_t type = 1;
  /// The help-index file; absent when there is none yet.
  std::optional<std::string> indexPath;
};

/// What is going on.
struct ServiceStatus {
  size_t bookCount = 0;
  size_t indexedBookCount = 0;
  /// Searches of clients that wait or run.
  size_t searchCount = 0;
  size_t watchedFolderCount = 0;
  bool isScanning = false;
  /// Work that keeps the daemon from leaving.
  int64_t guardCount = 0;
  /// Operations that run or wait; the latter hold no guard yet.
  uint64_t operationCount = 0;
  platform::Seconds running{0};
};

/// What became of a subscription.
struct AddedBooks {
  /// Why there is nothing of the publisher's; absent when there is.
  std::optional<std::string> problem;
  std::vector<CatalogueEntry> entries;
  std::vector<BookFailure> failures;
};

/// What became of forgetting books.
struct RemovedBooks {
  /// Why what there was could not be forgotten, or not be looked for; absent when all went well.
  std::optional<std::string> problem;
  /// Whether the catalogue was looked through.
  bool wasLookedFor = false;
  /// Whether there was anything of this name.
  bool wasFound = false;
  std::vector<std::string> bookIDs;
};

/// A host whose books are kept up to date and whose plug-in serves several clients.
/// Thread-safety: confined to the main thread, which has to run its loop.
class HelpService {
 public:
  /// Clients say no more than this in one request.
  static constexpr size_t maximumTextLength = 4096;
  static constexpr size_t maximumBookCount = 1000;
  static constexpr size_t maximumResultCount = 10'000;

  HelpService(std::unique_ptr<Host> host, BookKeeper::Settings books,
              std::shared_ptr<SearchListener> listener);
  ~HelpService();
  HelpService(const HelpService&) = delete;
  HelpService& operator=(const HelpService&) = delete;

  /// Begins to serve: the known books at once, others as they are found.
  void begin();

  /// Why the request cannot be taken; absent when it can.
  static std::optional<std::string> objection(const SearchRequest& request);

  ClientSearches& searches() { return _searches; }
  void scan(BookKeeper::Done done) { scan({}, std::move(done)); }
  void scan(ScanRequest request, BookKeeper::Done done) {
    _books.scan(std::move(request), std::move(done));
  }

  /// Subscribes to books of the catalogue at `address` (see subscribe()). `done` is called on the
  /// main thread when the books are on the bookshelf; their indexes are fetched after that.
  void addRemote(const std::string& address, WantedBooks wanted,
                 std::function<void(const AddedBooks& added)> done);
  /// Forgets books on servers (see unsubscribe()) and deletes what was fetched of them, a little
  /// later. Books that are on this computer stay.
  void removeRemote(const std::string& name, std::function<void(const RemovedBooks& removed)> done);

  /// Told, on the main thread, of each book whose index has changed; the identifier is empty for
  /// one that is no longer on the bookshelf.
  using BookObserver = std::function<void(const std::string& bookID, bool isIndexed)>;
  void setBookObserver(BookObserver observer) { *_observer = std::move(observer); }

  std::vector<BookStatus> books() const;
  ServiceStatus status() const;

  Owner& owner() { return _host->owner(); }
  /// Whether something is under way that has no shutdown guard.
  bool isInUse() const { return _searches.count() > 0 || _books.isScanning(); }

 private:
  void _watch();
  void _add(const platform::URL& address, const std::shared_ptr<const RNXCatalogue>& published,
            const std::optional<platform::Error>& error, WantedBooks wanted,
            const std::function<void(const AddedBooks& added)>& done);

  const std::unique_ptr<Host> _host;
  const platform::Clock::Instant _start;
  BookKeeper _books;
  ClientSearches _searches;
  FolderWatcher _watcher;
  /// What is posted to the main loop finds it, and finds it empty when this object is gone.
  const std::shared_ptr<BookObserver> _observer = std::make_shared<BookObserver>();
  const std::shared_ptr<HelpService*> _self;
};

}  // namespace zebd
