// The host as its plug-in sees it.
#pragma once

#include <atomic>
#include <functional>
#include <map>
#include <memory>
#include <optional>
#include <string>

#include "host/Zebrine/ZEBPluginOwner.h"
#include "platform/Clock.h"
#include "platform/ThreadSafety.h"
#include "zebd/Bookshelf.h"

namespace zebd {

/// Gets the results of one search, batch by batch, on the thread of the search.
class SearchReceiver {
 public:
  virtual ~SearchReceiver() = default;

  virtual void foundResults(const ZEBResultBatch& batch) = 0;
  /// Nothing follows. `finished` is false for a search that broke off: what was found before that
  /// may not be all.
  virtual void searchEnded(bool finished) = 0;
};

/// What an owner answers from the start.
struct OwnerSettings {
  bool userLoggedIn = true;
  bool shouldBeLazy = false;
  /// Absent: the plug-in remembers nothing over restarts.
  std::optional<std::string> userHelpCachesDirectoryPath;
};

/// Answers every message of a plug-in: the books of a bookshelf, the settings, whether there is a
/// network; counts the shutdown guards; hands results to those who asked.
///
/// No message waits for the main loop, and no lock is held over a call to a receiver or handler.
/// Thread-safety: internally synchronised. Each lock is taken with no other held.
class Owner : public ZEBPluginOwner {
 public:
  /// Told, on the plug-in's thread, of each book whose indexes changed; null for a book that the
  /// bookshelf does not have (any more).
  using BookModified = std::function<void(const std::shared_ptr<ZEBHelpBook>& book)>;

  Owner(std::shared_ptr<Bookshelf> bookshelf, OwnerSettings settings);

  // ZEBPluginOwner.
  bool userLoggedIn() const override { return _userLoggedIn; }
  bool shouldBeLazy() const override { return _shouldBeLazy; }
  void setShouldBeLazy(bool shouldBeLazy) override { _shouldBeLazy = shouldBeLazy; }
  bool isOnline() const override;
  std::map<std::string, std::shared_ptr<ZEBHelpBook>> knownBooks() const override;
  std::shared_ptr<ZEBHelpBook> bookWithID(const std::string& bookID) const override;
  void notifyBookshelfOfModificationsToBook(const std::shared_ptr<ZEBHelpBook>& book) override;
  void disableShutdown() override;
  void enableShutdown() override;
  void setIdleTimeOutDelay(const platform::Value& delay) override;
  std::optional<std::string> userHelpCachesDirectoryPath() const override {
    return _userHelpCachesDirectoryPath;
  }
  void pluginFoundResults(const std::shared_ptr<ZEBPlugin>& plugin,
                          const ZEBResultBatch& foundResults,
                          const std::shared_ptr<ZEBQuery>& forQuery) override;
  void pluginFinishedSearchingForQuery(const std::shared_ptr<ZEBPlugin>& plugin,
                                       const std::shared_ptr<ZEBQuery>& query) override;

  // The host's side.

  void setUserLoggedIn(bool userLoggedIn) { _userLoggedIn = userLoggedIn; }
  void setBookModifiedHandler(BookModified handler);

  /// From now on the results of the query, and of its copies, go to the receiver, which is kept.
  void beginSearch(const std::string& queryID, std::shared_ptr<SearchReceiver> receiver);
  /// The search has returned: tells the receiver, and lets go of it.
  void endSearch(const std::string& queryID);

  /// How many guards are held now. Below zero when more were given back than taken: then something
  /// is amiss, and the host does not count as quiet.
  int64_t shutdownGuardCount() const;
  /// Whether no guard has been held for `span`, and no operation of the process waits or runs. Work
  /// begets work, with gaps between.
  bool isQuietFor(platform::Seconds span) const;

  /// What the plug-in last asked for; absent when it has not, or not with a number above 0.
  std::optional<platform::Seconds> idleTimeOutDelay() const;

 private:
  void _changeGuardCount(int64_t change);

  struct Search {
    std::shared_ptr<SearchReceiver> receiver;
    bool finished = false;
  };

  const std::shared_ptr<Bookshelf> _bookshelf;
  const std::optional<std::string> _userHelpCachesDirectoryPath;
  std::atomic<bool> _userLoggedIn;
  std::atomic<bool> _shouldBeLazy;

  mutable platform::Mutex _guardMutex;
  int64_t _guardCount GUARDED_BY(_guardMutex) = 0;
  platform::Clock::Instant _quietSince GUARDED_BY(_guardMutex);
  std::optional<platform::Seconds> _idleTimeOutDelay GUARDED_BY(_guardMutex);

  mutable platform::Mutex _searchMutex;
  std::map<std::string, Search> _searches GUARDED_BY(_searchMutex);

  mutable platform::Mutex _handlerMutex;
  BookModified _bookModified GUARDED_BY(_handlerMutex);
};

}  // namespace zebd
