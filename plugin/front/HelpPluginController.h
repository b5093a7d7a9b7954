// The plug-in's principal class.
#pragma once

#include <memory>
#include <string>
#include <utility>
#include <vector>

#include "host/Zebrine/ZEBPlugin.h"
#include "plugin/shelf/ZEBIndexshelf.h"

class LUXSearchController;
class ZEBHelpindexSearchController;

/// The entry point: owns the shelf and both search controllers, wires them to the owner, answers
/// searches and relays index changes to the owner.
///
/// Whether it observes the shelf, and whether it searches by meaning, is decided when it is made,
/// by whether a user is logged in then. A controller that observes the shelf and the shelf keep
/// each other alive for the life of the process: a plug-in is never unloaded. That is no leak, and
/// leak checkers are told so.
///
/// The host makes the controller, and asks for removals, on the thread that runs its main loop, and
/// keeps that loop running while searches and background work go on: parts of the latter wait for
/// it. Thread-safety: internally synchronised; see removeIndexForBookWithID() for the one call that
/// depends on its thread.
class HelpPluginController : public ZEBPlugin,
                             public ZEBIndexshelfObserver,
                             public std::enable_shared_from_this<HelpPluginController> {
 public:
  /// Never null. The owner is kept for the controller's life; without one the controller knows no
  /// books and finds nothing.
  static std::shared_ptr<HelpPluginController> initWithOwner(std::shared_ptr<ZEBPluginOwner> owner);
  ~HelpPluginController() override;
  HelpPluginController(const HelpPluginController&) = delete;
  HelpPluginController& operator=(const HelpPluginController&) = delete;

  void startSearchForQuery(const std::shared_ptr<ZEBQuery>& query) override;
  void completeSearchForQuery(const std::shared_ptr<ZEBQuery>& query) override;
  std::shared_ptr<ZEBPluginOwner> owner() const override { return _owner; }
  std::string pluginID() const override;
  std::vector<std::string> resultTypes() const override;
  void finishPopulatingBookWithID(const std::string& bookID) override;
  void finishPopulatingKnownBooks() override;

  /// Returns at once. The removal happens 0.1 seconds later on the run loop of the calling thread,
  /// so that the host can end its own removal first; on a thread that never runs its loop, never.
  void removeIndexForBookWithID(const std::string& bookID) override;
  void notifyEvent(int64_t event, const platform::Value& context) override;

  void indexDidChange(const std::shared_ptr<ZEBIndex>& index, ZEBIndexChange didChange) override;

  // Internal: for tests.
  const std::shared_ptr<ZEBIndexshelf>& _shelf() const { return _indexshelf; }
  /// Null where no user was logged in when the controller was made.
  const std::shared_ptr<LUXSearchController>& _luxController() const {
    return _luxSearchController;
  }
  /// Before the controller is used by others.
  void _setLuxSearchController(std::shared_ptr<LUXSearchController> controller) {
    _luxSearchController = std::move(controller);
  }

 private:
  explicit HelpPluginController(std::shared_ptr<ZEBPluginOwner> owner);
  void _setUp();

  const std::shared_ptr<ZEBPluginOwner> _owner;
  std::shared_ptr<ZEBIndexshelf> _indexshelf;
  std::shared_ptr<ZEBHelpindexSearchController> _helpindexSearchController;
  std::shared_ptr<LUXSearchController> _luxSearchController;
};
