// Who carries searches out: a host in this process, or the daemon.
#pragma once

#include <memory>
#include <string>
#include <vector>

#include "zebd/ClientSearches.h"
#include "zebd/FoundItem.h"

namespace zeb {

/// A search that is under way. Thread-safety: internally synchronised.
class RunningSearch {
 public:
  virtual ~RunningSearch() = default;
  /// The answer is no longer wanted.
  virtual void cancel() = 0;
  virtual bool ended() const = 0;
  /// Whether all that was found is there; false while it runs, and for one that broke off.
  virtual bool finished() const = 0;
  /// What was found up to now.
  virtual std::vector<zebd::FoundItem> items() const = 0;
};

/// Thread-safety: confined to the main thread, which has to run its loop; that is woken at the end
/// of each search.
class SearchProvider {
 public:
  virtual ~SearchProvider() = default;
  virtual std::shared_ptr<RunningSearch> begin(const zebd::SearchRequest& request) = 0;
  /// Those of the books that have no index yet, by identifier; of all where the list is empty.
  virtual std::vector<std::string> booksWithoutIndex(const std::vector<std::string>& bookIDs) = 0;
};

}  // namespace zeb
