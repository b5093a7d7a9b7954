// A host that writes down, in order, everything that the plug-in tells it.
#pragma once

#include <atomic>
#include <map>
#include <memory>
#include <optional>
#include <string>
#include <utility>
#include <variant>
#include <vector>

#include "host/Zebrine/ZEBHelpBook.h"
#include "host/Zebrine/ZEBPluginOwner.h"
#include "host/Zebrine/ZEBResult.h"
#include "platform/ThreadSafety.h"
#include "platform/Value.h"
#include "tests/plugin/Hook.h"

namespace tests {

/// Thread-safety: internally synchronised; the public members are for before the plug-in runs.
class RecordingOwner : public ZEBPluginOwner {
 public:
  using Records = std::vector<std::shared_ptr<ZEBResult>>;

  void addBook(const std::shared_ptr<ZEBHelpBook>& book) {
    const platform::MutexLock lock(_mutex);
    _books[book->bookID()] = book;
  }
  void forgetBook(const std::string& bookID) {
    const platform::MutexLock lock(_mutex);
    _books.erase(bookID);
  }

  bool userLoggedIn() const override {
    _asked("userLoggedIn");
    return loggedIn;
  }
  bool shouldBeLazy() const override {
    _asked("shouldBeLazy");
    return lazy;
  }
  void setShouldBeLazy(bool shouldBeLazy) override { lazy = shouldBeLazy; }
  bool isOnline() const override {
    _asked("isOnline");
    return online;
  }
  std::map<std::string, std::shared_ptr<ZEBHelpBook>> knownBooks() const override {
    _asked("knownBooks");
    const platform::MutexLock lock(_mutex);
    return _books;
  }
  std::shared_ptr<ZEBHelpBook> bookWithID(const std::string& bookID) const override {
    _asked("bookWithID " + bookID);
    const platform::MutexLock lock(_mutex);
    const auto found = _books.find(bookID);
    return found == _books.end() ? nullptr : found->second;
  }
  std::optional<std::string> userHelpCachesDirectoryPath() const override { return caches; }

  void notifyBookshelfOfModificationsToBook(const std::shared_ptr<ZEBHelpBook>& book) override {
    _told("modified " + (book ? book->bookID() : std::string("(null)")));
  }
  void disableShutdown() override {
    ++_guards;
    _told("disableShutdown");
  }
  void enableShutdown() override {
    // In this order: who waits for the last guard to go may then change what is called here.
    _told("enableShutdown");
    --_guards;
  }
  void setIdleTimeOutDelay(const platform::Value& delay) override {
    {
      const platform::MutexLock lock(_mutex);
      _idleTimeOutDelay = delay;
    }
    _told("setIdleTimeOutDelay");
  }
  void pluginFoundResults(const std::shared_ptr<ZEBPlugin>& plugin,
                          const ZEBResultBatch& foundResults,
                          const std::shared_ptr<ZEBQuery>& forQuery) override {
    {
      const platform::MutexLock lock(_mutex);
      _batches.push_back(foundResults);
      _lastPlugin = plugin;
      _lastQuery = forQuery;
    }
    _told(std::holds_alternative<Records>(foundResults) ? "found" : "found texts");
  }
  void pluginFinishedSearchingForQuery(const std::shared_ptr<ZEBPlugin>& plugin,
                                       const std::shared_ptr<ZEBQuery>& query) override {
    {
      const platform::MutexLock lock(_mutex);
      _lastPlugin = plugin;
      _lastQuery = query;
    }
    _told("finished");
  }

  /// Everything told so far.
  std::vector<std::string> messages() const {
    const platform::MutexLock lock(_mutex);
    return _messages;
  }
  /// Everything told so far but the shutdown guard's calls, which look-ups in the shelf make too.
  std::vector<std::string> deliveries() const {
    std::vector<std::string> kept;
    for (const std::string& message : messages()) {
      if (message != "disableShutdown" && message != "enableShutdown") {
        kept.push_back(message);
      }
    }
    return kept;
  }
  std::vector<std::string> questions() const {
    const platform::MutexLock lock(_mutex);
    return _questions;
  }
  std::vector<ZEBResultBatch> batches() const {
    const platform::MutexLock lock(_mutex);
    return _batches;
  }
  /// The records of one batch; none for a batch of texts or one that is not there.
  Records records(size_t batch) const {
    const auto all = batches();
    const Records* found = batch < all.size() ? std::get_if<Records>(&all[batch]) : nullptr;
    return found ? *found : Records();
  }
  std::vector<std::string> texts(size_t batch) const {
    const auto all = batches();
    const auto* found =
        batch < all.size() ? std::get_if<std::vector<std::string>>(&all[batch]) : nullptr;
    return found ? *found : std::vector<std::string>();
  }
  platform::Value idleTimeOutDelay() const {
    const platform::MutexLock lock(_mutex);
    return _idleTimeOutDelay;
  }
  std::shared_ptr<ZEBPlugin> lastPlugin() const {
    const platform::MutexLock lock(_mutex);
    return _lastPlugin.lock();
  }
  std::shared_ptr<ZEBQuery> lastQuery() const {
    const platform::MutexLock lock(_mutex);
    return _lastQuery;
  }
  void forgetMessages() {
    const platform::MutexLock lock(_mutex);
    _messages.clear();
    _questions.clear();
    _batches.clear();
  }

  /// How many calls of disableShutdown() have no enableShutdown() yet.
  int guards() const { return _guards; }

  std::atomic<bool> loggedIn{false};
  std::atomic<bool> lazy{true};
  std::atomic<bool> online{true};
  std::optional<std::string> caches;
  /// Called with each message and question after it was written down; may throw.
  Hook<void(const std::string& message)> onMessage;

 private:
  void _told(const std::string& message) {
    {
      const platform::MutexLock lock(_mutex);
      _messages.push_back(message);
    }
    if (const auto hook = onMessage.get()) {
      hook(message);
    }
  }
  void _asked(const std::string& question) const {
    {
      const platform::MutexLock lock(_mutex);
      _questions.push_back(question);
    }
    if (const auto hook = onMessage.get()) {
      hook(question);
    }
  }

  mutable platform::Mutex _mutex;
  std::map<std::string, std::shared_ptr<ZEBHelpBook>> _books GUARDED_BY(_mutex);
  std::vector<std::string> _messages GUARDED_BY(_mutex);
  mutable std::vector<std::string> _questions GUARDED_BY(_mutex);
  std::vector<ZEBResultBatch> _batches GUARDED_BY(_mutex);
  platform::Value _idleTimeOutDelay GUARDED_BY(_mutex);
  // Not owned: the plug-in owns this.
  std::weak_ptr<ZEBPlugin> _lastPlugin GUARDED_BY(_mutex);
  std::shared_ptr<ZEBQuery> _lastQuery GUARDED_BY(_mutex);
  std::atomic<int> _guards{0};
};

}  // namespace tests
