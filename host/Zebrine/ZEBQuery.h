// What a user searches for.
#pragma once

#include <atomic>
#include <cstddef>
#include <memory>
#include <string>
#include <vector>

#include "platform/Value.h"

/// One search from the host: the text, where to look and what for.
///
/// Thread-safety: cancellation is internally synchronised; all else is filled in by the host before
/// it hands the query to a plug-in and immutable from then on.
class ZEBQuery {
 public:
  /// A query over all books, without options, that wants no kind of result yet. Its queryID is new.
  static std::shared_ptr<ZEBQuery> initWithQueryString(std::string queryString);

  /// Another query with the same content, the same queryID among it. It is cancelled if this one
  /// is; from then on each is cancelled by itself.
  std::shared_ptr<ZEBQuery> copy() const;

  ZEBQuery& operator=(const ZEBQuery&) = delete;

  /// The user's text, or an anchor's name.
  const std::string& queryString() const noexcept { return _queryString; }
  void setQueryString(std::string queryString) { _queryString = std::move(queryString); }

  /// A dictionary, or absent; ZEBQuery…OptionKey. Ask with options()[key].boolValue().
  const platform::Value& options() const noexcept { return _options; }
  void setOptions(platform::Value options) { _options = std::move(options); }

  /// The kinds of result that are wanted.
  const std::vector<std::string>& resultTypes() const noexcept { return _resultTypes; }
  void setResultTypes(std::vector<std::string> types) { _resultTypes = std::move(types); }

  /// Identifiers of the books to search; empty means all.
  const std::vector<std::string>& scope() const noexcept { return _scope; }
  void setScope(std::vector<std::string> scope) { _scope = std::move(scope); }

  /// Language tags, the favourite first; empty means those of the user's settings.
  const std::vector<std::string>& preferredLanguages() const noexcept {
    return _preferredLanguages;
  }
  void setPreferredLanguages(std::vector<std::string> languages) {
    _preferredLanguages = std::move(languages);
  }

  /// How many results are wanted at most; 0 leaves it to the plug-in.
  size_t limit() const noexcept { return _limit; }
  void setLimit(size_t limit) { _limit = limit; }

  /// Tells this query from every other of the process; the same for a query and its copies. Never
  /// empty, and nothing to be read into.
  const std::string& queryID() const noexcept { return _queryID; }

  /// Whether the answer is no longer wanted. May be asked and set from any thread at any time.
  bool cancelled() const noexcept { return _cancelled.load(std::memory_order_acquire); }
  bool isCancelled() const noexcept { return cancelled(); }
  void setCancelled(bool cancelled) noexcept {
    _cancelled.store(cancelled, std::memory_order_release);
  }
  void cancel() noexcept { setCancelled(true); }

  /// For logs.
  std::string description() const;

 private:
  explicit ZEBQuery(std::string queryString);
  ZEBQuery(const ZEBQuery& other);

  std::string _queryString;
  platform::Value _options;
  std::vector<std::string> _resultTypes;
  std::vector<std::string> _scope;
  std::vector<std::string> _preferredLanguages;
  size_t _limit = 0;
  const std::string _queryID;
  std::atomic<bool> _cancelled{false};
};
