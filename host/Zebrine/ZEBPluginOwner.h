// What a search plug-in asks of its host.
#pragma once

#include <map>
#include <memory>
#include <optional>
#include <string>
#include <variant>
#include <vector>

#include "platform/Value.h"

class ZEBHelpBook;
class ZEBPlugin;
class ZEBQuery;
class ZEBResult;

/// One delivery of results: records, or the plain texts of a book's own suggestion list.
using ZEBResultBatch =
    std::variant<std::vector<std::shared_ptr<ZEBResult>>, std::vector<std::string>>;

/// The host as a plug-in sees it.
/// Thread-safety: internally synchronised; plug-ins call from any thread, also during a call of the
/// host's own.
class ZEBPluginOwner {
 public:
  virtual ~ZEBPluginOwner() = default;

  /// Whether a user is logged in; may change, so ask each time.
  virtual bool userLoggedIn() const = 0;

  /// Whether background work that only makes later searches faster is unwanted.
  virtual bool shouldBeLazy() const = 0;
  virtual void setShouldBeLazy(bool shouldBeLazy) = 0;

  /// Whether the network can be reached.
  virtual bool isOnline() const = 0;

  /// Every book that the host knows, by identifier.
  virtual std::map<std::string, std::shared_ptr<ZEBHelpBook>> knownBooks() const = 0;

  /// The book, or null when the host does not know it.
  virtual std::shared_ptr<ZEBHelpBook> bookWithID(const std::string& bookID) const = 0;

  /// The indexes of a book changed. The book may be null: one that the host no longer knows.
  virtual void notifyBookshelfOfModificationsToBook(const std::shared_ptr<ZEBHelpBook>& book) = 0;

  /// Keeps the daemon from exiting for idleness until the matching enableShutdown(). Calls count.
  virtual void disableShutdown() = 0;
  virtual void enableShutdown() = 0;

  /// How many seconds of idleness, a number, the daemon waits before it exits.
  virtual void setIdleTimeOutDelay(const platform::Value& delay) = 0;

  /// The folder for what help keeps among the user's caches; absent when there is none.
  virtual std::optional<std::string> userHelpCachesDirectoryPath() const = 0;

  /// Delivers one batch, best first; there may be several a query.
  virtual void pluginFoundResults(const std::shared_ptr<ZEBPlugin>& plugin,
                                  const ZEBResultBatch& foundResults,
                                  const std::shared_ptr<ZEBQuery>& forQuery) = 0;

  /// The search is over; no batch follows.
  virtual void pluginFinishedSearchingForQuery(const std::shared_ptr<ZEBPlugin>& plugin,
                                               const std::shared_ptr<ZEBQuery>& query) = 0;
};
