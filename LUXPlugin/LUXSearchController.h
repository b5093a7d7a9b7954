// The semantic half of every search, as the rest of the plug-in calls it.
#pragma once

#include <memory>
#include <optional>
#include <set>
#include <string>
#include <vector>

class ZEBIndex;
class ZEBIndexshelf;
class ZEBQuery;
class ZEBResult;

/// Searches by meaning. There is no implementation yet: whoever holds a pointer to one holds null,
/// and asks nothing of it.
class LUXSearchController {
 public:
  using Results = std::vector<std::shared_ptr<ZEBResult>>;

  virtual ~LUXSearchController() = default;

  virtual void setIndexshelf(std::shared_ptr<ZEBIndexshelf> indexshelf) = 0;
  virtual void useShorterTimeouts(bool useShorterTimeouts) = 0;

  /// Absent when the search could not be made. `ignoringItems` are URLs or titles, by the type
  /// asked for; the identifiers of the books that were searched go to the set, where one is given.
  virtual std::optional<Results> doSearchForQuery(
      const std::shared_ptr<ZEBQuery>& query, const std::string& requestedResultType,
      const std::vector<std::shared_ptr<ZEBIndex>>& inIndices,
      const std::vector<std::string>& ignoringItems,
      std::set<std::string>* passingBackSearchedHelpbookIDs) = 0;

  virtual void completeSearchQuery(const std::shared_ptr<ZEBQuery>& query) = 0;
  virtual void loadLUXModels() = 0;
};
