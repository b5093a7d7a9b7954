// One semantic query from start to end.
#pragma once

#include <map>
#include <memory>
#include <optional>
#include <set>
#include <string>
#include <utility>
#include <vector>

#include "LUXPlugin/LUXSearchController.h"

/// Finds the groups and the language of a query, gets hold of their models, starts a query in each
/// on a thread of its own, waits for the answers and merges them. At the end, models are handed
/// back, builds that were started and have not finished are cancelled, and so are the groups'
/// queries when the host has cancelled its own. Thread-safety: confined to one thread.
class LUXSearchRun {
 public:
  using Results = LUXSearchController::Results;

  LUXSearchRun(std::shared_ptr<LUXSearchController> controller, std::shared_ptr<ZEBQuery> query,
               std::string requestedResultType);

  Results run(const std::vector<std::string>& ignoringItems,
              std::set<std::string>* passingBackSearchedHelpbookIDs);

 private:
  bool _readRequest();
  std::vector<std::string> _groupNames() const;
  void _startQueries(const std::vector<std::string>& groups, bool notesBooks);
  /// Whether the group is done with: a query runs in it, or none is wanted.
  bool _tryGroup(const std::string& group, bool isOnlyGroup, bool notesBooks);
  void _startQuery(const std::string& group, const std::shared_ptr<HelpLUXModel>& model);
  void _startBuild(const std::string& group);
  void _waitForAnswers() const;
  void _finish();

  Results _mergedAnswers(const std::vector<std::string>& ignoringItems,
                         std::set<std::string>* passingBackSearchedHelpbookIDs) const;
  Results _mergedArticles(const std::map<std::string, Results>& answers) const;
  Results _mergedSuggestions(const std::map<std::string, Results>& answers) const;
  bool _isSuggestion() const;

  const std::shared_ptr<LUXSearchController> _controller;
  const std::shared_ptr<ZEBQuery> _query;
  const std::string _requestedResultType;
  bool _searchesAllBooks = false;
  std::shared_ptr<ZEBHelpBook> _scopeBook;
  std::optional<std::string> _focusedBookID;
  std::string _language;
  std::vector<std::string> _usedGroups;
  std::map<std::string, std::vector<std::string>> _bookIDsOfGroups;
  std::vector<std::shared_ptr<LUXModelBuildOperation>> _builds;
  std::vector<std::shared_ptr<LUXQuery>> _startedQueries;
};
