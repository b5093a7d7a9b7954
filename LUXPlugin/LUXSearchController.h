// The semantic half of every search, and the care for the language models behind it.
#pragma once

#include <atomic>
#include <cstdint>
#include <map>
#include <memory>
#include <optional>
#include <set>
#include <string>
#include <vector>

#include "LUXPlugin/LUXModelBuildOperation.h"
#include "host/Luxwell/LUXQuery.h"
#include "platform/Clock.h"
#include "platform/RunLoop.h"
#include "platform/ThreadSafety.h"
#include "plugin/shelf/ZEBIndexshelf.h"

class HelpLUXIndex;
class HelpLUXModel;
class ZEBHelpBook;
class ZEBPluginOwner;
class ZEBQuery;
class ZEBResult;

namespace platform {
class FolderMark;
class OperationQueue;
}  // namespace platform

/// Searches by meaning over language models, one for each group of books and language, and keeps
/// the models in step with the books: opens them ahead of time, builds missing and outdated ones in
/// the background, and follows the changes that the shelf tells of.
///
/// Queries, preload, builds and synchronisation all use the models. A model is handed out to one of
/// them at a time, for one activity; whoever got it works on it without any lock and hands it back
/// with finishedActivity().
///
/// The controller observes the shelf, and the shelf keeps its observers: the two keep each other
/// alive for the life of the process, as a plug-in is never unloaded.
///
/// Lock order: _syncModelsLock or the shelf's monitor (a removal is told under it), the pending
/// table's monitor, the monitor of the semantic indexes. The shelf is never asked under one of
/// these but _syncModelsLock. The controller's monitor and the registry's are never held with
/// another. Thread-safety: internally synchronised.
class LUXSearchController : public ZEBIndexshelfObserver,
                            public LUXQueryDelegate,
                            public std::enable_shared_from_this<LUXSearchController> {
 public:
  using Results = std::vector<std::shared_ptr<ZEBResult>>;
  using Indices = std::vector<std::shared_ptr<ZEBIndex>>;
  using BookTable = std::map<std::string, std::shared_ptr<ZEBHelpBook>>;

  /// Its timers fire on the run loop of the calling thread. The owner is not kept alive.
  static std::shared_ptr<LUXSearchController> initWithOwner(
      const std::shared_ptr<ZEBPluginOwner>& owner);
  /// A controller without an owner.
  static std::shared_ptr<LUXSearchController> init();
  ~LUXSearchController() override;
  LUXSearchController(const LUXSearchController&) = delete;
  LUXSearchController& operator=(const LUXSearchController&) = delete;

  /// Null once the owner is gone.
  std::shared_ptr<ZEBPluginOwner> owner() const { return _pluginOwner.lock(); }

  std::shared_ptr<ZEBIndexshelf> indexshelf() const;
  /// Observes the shelf from now on. To be called once.
  virtual void setIndexshelf(const std::shared_ptr<ZEBIndexshelf>& indexshelf);

  /// Whether searches wait one second for models and results, or 8 and 16.
  virtual void useShorterTimeouts(bool useShorterTimeouts);

  // The registry of models.

  /// The group's model for one activity; null while somebody holds it, and when there is none. It
  /// is made, and registered, where that is asked for.
  std::shared_ptr<HelpLUXModel> modelForGroupName(const std::string& modelGroupName,
                                                  const std::string& language,
                                                  bool createIfNecessary, int activity);

  /// The same, with creation, as soon as the model is free; null after `maxWaitInterval` seconds.
  /// For building, no other model may be building either.
  std::shared_ptr<HelpLUXModel> aquiredModelWithGroupName(const std::string& modelGroupName,
                                                          const std::string& language,
                                                          int forActivity, double maxWaitInterval);

  /// Hands a model back. Another activity than the one it is held for is logged and changes
  /// nothing; but the end of building always takes the model from the registry, so that the next
  /// user opens what was built.
  void finishedActivity(int activity, const std::string& modelGroupName,
                        const std::string& language);

  size_t activeModelCountWithActivity(int activity) const;

  /// The name of the folders with models of the user's language: the first that the semantic
  /// framework has of the user's languages, "English" where it has none.
  static std::string currentLanguageFolderName();

  // Searching (LUXSearchController+Query.cpp).

  /// Runs the query in every group that it concerns and merges the answers. `requestedResultType`
  /// is a kind of result; the indices are not used. `ignoringItems` are URLs of pages, or for
  /// similar suggestions titles, that are to be left out. The identifiers of the books that were
  /// searched are added to the set, where one is given. Blocks for the time-outs at most.
  virtual Results doSearchForQuery(const std::shared_ptr<ZEBQuery>& query,
                                   const std::string& requestedResultType, const Indices& inIndices,
                                   const std::vector<std::string>& ignoringItems,
                                   std::set<std::string>* passingBackSearchedHelpbookIDs);

  /// The host is done with the results of its query; which one does not matter.
  virtual void completeSearchQuery(const std::shared_ptr<ZEBQuery>& query);

  void queryDidFinishWithResults(const std::shared_ptr<LUXQuery>& query,
                                 const std::vector<std::shared_ptr<LUXHit>>& results) override;

  // Preloading (LUXSearchController+Preload.cpp).

  /// Opens the models of the user's language and reads them, so that the first query need not.
  /// Gives way to queries. Blocks for up to about a minute, and as long as the reading takes.
  virtual void loadLUXModels();

  // Building (LUXBuilder.cpp).

  /// Queues a build, which does nothing when the model is not to be had within five seconds.
  std::shared_ptr<LUXModelBuildOperation> startBuildingModelGroupName(
      const std::string& modelGroupName, const std::string& language);

  /// Builds the model, which has to be held for building, and hands it back. Always true.
  bool updateExistingModel(const std::shared_ptr<HelpLUXModel>& existingModelWithBuildingActivity,
                           const std::string& language,
                           const std::optional<std::string>& modelGroupName);

  // Keeping in step with the books (LUXSearchController+Synchronisation.cpp).

  void indexDidChange(const std::shared_ptr<ZEBIndex>& index, ZEBIndexChange didChange) override;
  void processPendingIndexEvents();

  // Internal: for the controller's own machinery and tests.

  int _activityForModelGroupName(const std::string& modelGroupName,
                                 const std::string& language) const;
  std::shared_ptr<HelpLUXIndex> _luxIndexForHelpbookIdentifier(
      const std::optional<std::string>& helpbookIdentifier);
  void _updateModelWithParams(const LUXModelBuildParameters& params);
  void _syncModelsWithIndexEvents();
  static bool _saveVersionedLUXIndexData(const std::optional<platform::Data>& data,
                                         const std::string& bookIdentifier,
                                         const std::string& atLUXModelPath);
  BookTable _copyAllBooksForLanguage(const std::string& language) const;
  static void _addBooksToTableFromAllApps(BookTable& table, const std::string& language);
  static void _addBooksToTableFromAppPaths(BookTable& table,
                                           const std::vector<std::string>& appPaths,
                                           const std::string& language);

  bool _queryInProgress() const { return _isQueryInProgress; }
  void _setQueryInProgress(bool inProgress) { _isQueryInProgress = inProgress; }
  bool _finalizedStartup() const { return _hasFinalizedStartup; }
  bool _loading() const { return _isLoading; }
  int64_t _acquisitionSeconds() const { return _acquisitionTimeout; }
  int64_t _searchSeconds() const { return _searchTimeout; }
  std::map<std::string, int32_t> _pendingIndexEvents() const;
  const std::shared_ptr<platform::OperationQueue>& _modelUpdateQueue() const {
    return _serialModelUpdateQueue;
  }
  /// Group, language and activity of every registered model.
  std::map<std::string, int> _registeredModels() const;

 protected:
  explicit LUXSearchController(const std::shared_ptr<ZEBPluginOwner>& owner);

 private:
  friend class LUXSearchRun;

  void _beginQuery(const std::string& queryID);
  /// None once another query has begun.
  std::map<std::string, Results> _answersOfQuery(const std::string& queryID) const;
  size_t _answerCount() const;

  Results _resultsOfHits(const LUXQuery& query, const std::vector<std::shared_ptr<LUXHit>>& hits);

  bool _waitForQuietRegistry() const;
  bool _openModels(const std::string& language, std::vector<std::string>& openedGroups);
  bool _loadModels(const std::string& language, const std::vector<std::string>& openedGroups);

  void _buildModel(const LUXModelBuildParameters& params);
  void _addBookToModel(const std::shared_ptr<ZEBHelpBook>& book,
                       const LUXModelBuildParameters& params,
                       platform::Value::Dictionary& thresholds);

  static std::string _savedIndexDataFolder(const std::string& modelPath);

  /// Lets other processes see that the model is being built, where its folder is there already.
  void _markAsBuilding(const HelpLUXModel& model, const std::string& modelGroupName,
                       const std::string& language);

  void _schedulePendingSync() REQUIRES(_pendingMonitor);
  void _synchronise();
  bool _synchroniseGroup(const std::string& modelGroupName,
                         const std::vector<std::string>& helpbookIDs,
                         const std::map<std::string, int32_t>& events, const std::string& language,
                         bool& rebuiltAny);

  // In the order of the system's own description of this class.
  const std::weak_ptr<ZEBPluginOwner> _pluginOwner;
  std::shared_ptr<ZEBIndexshelf> _indexshelf GUARDED_BY(_monitor);
  const std::shared_ptr<platform::RunLoop> _runLoop;
  platform::Mutex _syncModelsLock;
  std::map<std::string, std::shared_ptr<HelpLUXModel>> _activeLUXModels
      GUARDED_BY(_registryMonitor);
  std::map<std::string, int32_t> _pendingIndexEventsTable GUARDED_BY(_pendingMonitor);
  std::shared_ptr<platform::Timer> _pendingIndexModelSync GUARDED_BY(_pendingMonitor);
  std::map<std::string, std::shared_ptr<HelpLUXIndex>> _indexFileObjectForHelpbookTable
      GUARDED_BY(_indexFileObjectMonitor);
  std::atomic<bool> _isQueryInProgress{false};
  std::atomic<bool> _hasFinalizedStartup{false};
  std::atomic<bool> _isLoading{false};
  std::atomic<int64_t> _acquisitionTimeout{8};
  std::atomic<int64_t> _searchTimeout{16};
  std::map<std::string, Results> _searchResults GUARDED_BY(_monitor);
  std::optional<std::string> _currentQueryID GUARDED_BY(_monitor);
  const std::shared_ptr<platform::OperationQueue> _serialModelUpdateQueue;

  // Of models that are being built, by key of the registry; as long as the activity.
  std::map<std::string, std::unique_ptr<platform::FolderMark>> _buildMarks
      GUARDED_BY(_registryMonitor);

  mutable platform::Monitor _monitor;
  mutable platform::Monitor _registryMonitor;
  mutable platform::Monitor _pendingMonitor;
  mutable platform::Monitor _indexFileObjectMonitor;
};
