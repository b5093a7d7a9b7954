// One search from start to end.
#pragma once

#include <memory>
#include <optional>
#include <set>
#include <string>
#include <vector>

class LUXSearchController;
class ZEBHelpBook;
class ZEBHelpindexSearchController;
class ZEBIndex;
class ZEBIndexshelf;
class ZEBPlugin;
class ZEBPluginOwner;
class ZEBQuery;
class ZEBResult;

/// Finds the books in scope and their indexes, waits a bounded time for those that are being
/// downloaded, looks into the books' own lists, searches by meaning and by keyword, merges the
/// answers and delivers them in batches, best first. Everything runs on the calling thread; nothing
/// is kept. Thread-safety: confined to one thread.
class SearchRun {
 public:
  using Results = std::vector<std::shared_ptr<ZEBResult>>;
  using Indices = std::vector<std::shared_ptr<ZEBIndex>>;

  /// `luxSearchController` may be null: every semantic step then yields nothing. A null query finds
  /// nothing; so does a run without an owner, which tells nobody of it.
  SearchRun(std::shared_ptr<ZEBPlugin> plugin, std::shared_ptr<ZEBPluginOwner> owner,
            ZEBIndexshelf& indexshelf, ZEBHelpindexSearchController& keywordController,
            LUXSearchController* luxSearchController, std::shared_ptr<ZEBQuery> query);

  /// Keeps the daemon from exiting while it runs. What is thrown on the way ends the search, is
  /// logged at level 0, and keeps the message that the search has finished from being sent.
  void run();

 private:
  void _search();
  void _finish();
  void _readRequest();
  void _collectBookList();
  void _answerOffline();
  bool _isUnreachable() const;
  void _visitBook(const std::string& bookID);
  void _deliverSuggestionList(const ZEBHelpBook& book);
  std::optional<Indices> _indicesOfBook(const std::shared_ptr<ZEBHelpBook>& book);
  void _lookUpExactMatch(const ZEBHelpBook& book, const std::optional<Indices>& indices);
  void _lookUpSuggestionAnchor(const ZEBHelpBook& book, const std::optional<Indices>& indices);
  void _findArticles();
  std::optional<Results> _searchBothWays();
  void _deliverArticles(std::optional<Results> found);
  void _deliverSemantic(const std::string& resultType, const std::vector<std::string>& ignoring);
  void _deliver(Results results);
  bool _cancelled() const;

  const std::shared_ptr<ZEBPlugin> _plugin;
  const std::shared_ptr<ZEBPluginOwner> _owner;
  ZEBIndexshelf& _indexshelf;
  ZEBHelpindexSearchController& _keywordController;
  LUXSearchController* const _luxSearchController;
  const std::shared_ptr<ZEBQuery> _query;

  bool _anchorMode = false;
  bool _searchesAllBooks = false;
  bool _wantsSuggestions = false;
  bool _wantsSimilar = false;
  bool _wantsActions = false;
  bool _wantsArticles = false;
  /// The book whose results keep their relevance; absent when the only book of the scope is
  /// unknown.
  std::optional<std::string> _primaryBookID;
  std::vector<std::string> _bookList;
  Indices _allIndices;
  Results _exactResults;
  /// Titles of articles found: not to be suggested again.
  std::vector<std::string> _titles;
};
