// The bookshelf of a small host: books, and what came of its searches.
#pragma once

#include <atomic>
#include <map>
#include <memory>
#include <optional>
#include <set>
#include <string>
#include <utility>
#include <variant>
#include <vector>

#include "host/Zebrine/ZEBHelpBook.h"
#include "host/Zebrine/ZEBPluginOwner.h"
#include "host/Zebrine/ZEBQuery.h"
#include "platform/Exception.h"
#include "platform/ThreadSafety.h"

namespace tests {

/// Thread-safety: internally synchronised; no lock is held while the plug-in is called.
class HostOwner : public ZEBPluginOwner {
 public:
  using Records = std::vector<std::shared_ptr<ZEBResult>>;

  explicit HostOwner(std::string caches) : _caches(std::move(caches)) {}

  void addBook(const std::shared_ptr<ZEBHelpBook>& book) {
    const platform::MutexLock lock(_mutex);
    _books[book->bookID()] = book;
  }

  bool userLoggedIn() const override { return true; }
  bool shouldBeLazy() const override { return false; }
  void setShouldBeLazy(bool) override {}
  bool isOnline() const override {
    if (throwsWhenAskedForTheNetwork) {
      throw platform::Exception("HostException", "the host does not know");
    }
    return false;
  }
  std::map<std::string, std::shared_ptr<ZEBHelpBook>> knownBooks() const override {
    const platform::MutexLock lock(_mutex);
    return _books;
  }
  std::shared_ptr<ZEBHelpBook> bookWithID(const std::string& bookID) const override {
    const platform::MutexLock lock(_mutex);
    const auto found = _books.find(bookID);
    return found == _books.end() ? nullptr : found->second;
  }
  void notifyBookshelfOfModificationsToBook(const std::shared_ptr<ZEBHelpBook>& book) override {
    if (book) {
      const platform::MutexLock lock(_mutex);
      _modifiedBooks.insert(book->bookID());
    }
  }
  void disableShutdown() override { ++_guards; }
  void enableShutdown() override { --_guards; }
  void setIdleTimeOutDelay(const platform::Value&) override {}
  std::optional<std::string> userHelpCachesDirectoryPath() const override { return _caches; }
  void pluginFoundResults(const std::shared_ptr<ZEBPlugin>&, const ZEBResultBatch& foundResults,
                          const std::shared_ptr<ZEBQuery>& forQuery) override {
    const platform::MutexLock lock(_mutex);
    _batches[forQuery->queryID()].push_back(foundResults);
  }
  void pluginFinishedSearchingForQuery(const std::shared_ptr<ZEBPlugin>&,
                                       const std::shared_ptr<ZEBQuery>& query) override {
    const platform::MutexLock lock(_mutex);
    _finishedQueries.insert(query->queryID());
  }

  /// All records that a query found, batch after batch.
  Records records(const ZEBQuery& query) const {
    Records all;
    for (const ZEBResultBatch& batch : _batchesOf(query)) {
      if (const auto* records = std::get_if<Records>(&batch)) {
        all.insert(all.end(), records->begin(), records->end());
      }
    }
    return all;
  }
  /// All plain texts that a query found.
  std::vector<std::string> texts(const ZEBQuery& query) const {
    std::vector<std::string> all;
    for (const ZEBResultBatch& batch : _batchesOf(query)) {
      if (const auto* texts = std::get_if<std::vector<std::string>>(&batch)) {
        all.insert(all.end(), texts->begin(), texts->end());
      }
    }
    return all;
  }
  bool finished(const ZEBQuery& query) const {
    const platform::MutexLock lock(_mutex);
    return _finishedQueries.contains(query.queryID());
  }
  std::set<std::string> modifiedBooks() const {
    const platform::MutexLock lock(_mutex);
    return _modifiedBooks;
  }
  int guards() const { return _guards; }

  std::atomic<bool> throwsWhenAskedForTheNetwork{false};

 private:
  std::vector<ZEBResultBatch> _batchesOf(const ZEBQuery& query) const {
    const platform::MutexLock lock(_mutex);
    const auto found = _batches.find(query.queryID());
    return found == _batches.end() ? std::vector<ZEBResultBatch>() : found->second;
  }

  const std::string _caches;
  mutable platform::Mutex _mutex;
  std::map<std::string, std::shared_ptr<ZEBHelpBook>> _books GUARDED_BY(_mutex);
  std::map<std::string, std::vector<ZEBResultBatch>> _batches GUARDED_BY(_mutex);
  std::set<std::string> _finishedQueries GUARDED_BY(_mutex);
  std::set<std::string> _modifiedBooks GUARDED_BY(_mutex);
  std::atomic<int> _guards{0};
};

}  // namespace tests
